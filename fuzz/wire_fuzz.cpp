// The wire's decoder on any input: the first byte picks the API version, the second
// what the rest is read as (a request, the response of a method the third byte
// picks, a fault, a value). Invariants: input is either accepted or refused with a
// fault of its own (a MethodFault exception), never anything else; what is accepted
// encodes again, and that text decodes and encodes to itself.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "orbit/Orbit.h"
#include "orbit/wire/Codec.h"

namespace {

struct World {
    std::vector<Orbit::Version*> versions;
    std::vector<Orbit::ManagedMethod*> methods;
    World() {
        versions = Orbit::GetVersionMap()->GetVersions();
        for (Orbit::Type* type : Orbit::GetTypeMap()->GetTypes())
            if (auto* managed = dynamic_cast<Orbit::ManagedObjectType*>(type))
                for (const auto& member : managed->GetMembers()) methods.push_back(member.Get());
    }
};

[[noreturn]] void Finding(const std::string& what, const std::string& text) {
    std::fprintf(stderr, "wire fuzzer: %s\n%s\n", what.c_str(), text.c_str());
    std::abort();
}

// Encodes what was decoded; the text must then be a fixed point.
template <class Decode, class Encode>
void Stable(const std::string& body, Decode decode, Encode encode) {
    std::string once;
    try {
        once = encode(decode(body));
    } catch (const Orbit::MethodFault::Exception&) {
        return;
    }
    std::string twice;
    try {
        twice = encode(decode(once));
    } catch (const std::exception& e) {
        Finding(std::string("what the codec wrote does not read back: ") + e.what(), once);
    }
    if (once != twice) Finding("encoding what was decoded is not stable", once + "\n" + twice);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const World world;
    if (size < 3) return 0;
    Orbit::Version* version = world.versions[data[0] % world.versions.size()];
    const Orbit::Wire::Codec codec(*version, Orbit::Wire::Limits{1u << 16, 24, 4096});
    const std::string body(reinterpret_cast<const char*>(data + 3), size - 3);
    switch (data[1] % 4) {
    case 0:
        Stable(body, [&](const std::string& b) { return codec.DecodeRequest(b); },
               [&](const Orbit::Wire::Request& r) { return codec.EncodeRequest(*r.target, *r.method, r.args); });
        break;
    case 1: {
        Orbit::ManagedMethod* method = world.methods[data[2] % world.methods.size()];
        Stable(body, [&](const std::string& b) { return codec.DecodeResponse(b, *method); },
               [&](const Kernite::Ref<Orbit::Any>& r) { return codec.EncodeResponse(*method, r.Get()); });
        break;
    }
    case 2:
        Stable(body, [&](const std::string& b) { return codec.DecodeFault(b); },
               [&](const Kernite::Ref<Orbit::MethodFault>& f) { return codec.EncodeFault(*f); });
        break;
    default:
        Stable(body, [&](const std::string& b) { return codec.DecodeValue(b); },
               [&](const Kernite::Ref<Orbit::Any>& v) { return codec.EncodeValue(v.Get()); });
        break;
    }
    return 0;
}
