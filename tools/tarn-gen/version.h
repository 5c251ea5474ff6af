// The version of this generator, which is the version of the runtime its output is
// generated for. The build passes it in (TARN_VERSION, "0.4.0").
#pragma once

#ifndef TARN_VERSION
#error "the build gives tarn-gen its version: -DTARN_VERSION=\"major.minor.patch\""
#endif

namespace tarngen {

inline constexpr const char* kGeneratorVersion = TARN_VERSION;

// "0.4.0" -> 400, as orbit/Version.h spells ORBIT_VERSION_NUMBER.
constexpr long VersionNumber(const char* text) {
    long parts[3] = {0, 0, 0};
    int part = 0;
    for (const char* c = text; *c && part < 3; ++c) {
        if (*c == '.') ++part;
        else parts[part] = parts[part] * 10 + (*c - '0');
    }
    return parts[0] * 10000 + parts[1] * 100 + parts[2];
}

inline constexpr long kRuntimeVersionNumber = VersionNumber(TARN_VERSION);

}  // namespace tarngen
