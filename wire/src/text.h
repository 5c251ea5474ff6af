// Character-level rules of XML 1.0 text in UTF-8, shared by the writer and the
// decoder's first pass.
#pragma once

#include <cstddef>
#include <cstdint>

namespace Orbit::Wire {

// Whether XML 1.0 can carry the code point.
inline bool IsXmlChar(std::uint32_t c) {
    if (c < 0x20) return c == 0x9 || c == 0xA || c == 0xD;
    if (c < 0xD800) return true;
    if (c < 0xE000) return false;
    if (c < 0xFFFE) return true;
    return c >= 0x10000 && c <= 0x10FFFF;
}

// The length of the well-formed UTF-8 sequence of an XML character at `p` (whose
// first byte is at least 0x80), or 0 when there is none.
inline std::size_t Utf8Sequence(const unsigned char* p, const unsigned char* end) {
    const unsigned char lead = *p;
    std::size_t length;
    std::uint32_t c;
    if (lead >= 0xC2 && lead <= 0xDF) {
        length = 2;
        c = lead & 0x1F;
    } else if (lead >= 0xE0 && lead <= 0xEF) {
        length = 3;
        c = lead & 0x0F;
    } else if (lead >= 0xF0 && lead <= 0xF4) {
        length = 4;
        c = lead & 0x07;
    } else {
        return 0;
    }
    if (static_cast<std::size_t>(end - p) < length) return 0;
    for (std::size_t i = 1; i < length; ++i) {
        if ((p[i] & 0xC0) != 0x80) return 0;
        c = (c << 6) | (p[i] & 0x3F);
    }
    // Overlong forms.
    if ((length == 3 && c < 0x800) || (length == 4 && c < 0x10000)) return 0;
    return IsXmlChar(c) ? length : 0;
}

}  // namespace Orbit::Wire
