// What a module's text field must become in Java, worked out apart from the library: the
// bytes up to the first zero byte or the field's end (at most the first 4096 bytes), decoded
// as modified UTF-8, each byte that starts no well-formed sequence turned into U+FFFD.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace fuzzref {

constexpr size_t kMaxTextWidth = 4096;

struct Text {
    size_t length;         // bytes of text in the field
    bool wellFormed;       // no byte had to be replaced
    std::u16string chars;  // the Java string
};

inline Text expectedText(const uint8_t* field, size_t width) {
    Text t{0, true, {}};
    size_t end = width < kMaxTextWidth ? width : kMaxTextWidth;
    while (t.length < end && field[t.length] != 0) ++t.length;
    const size_t n = t.length;
    for (size_t i = 0; i < n;) {
        const uint8_t lead = field[i];
        if (lead < 0x80) {
            t.chars.push_back(lead);
            ++i;
            continue;
        }
        // Lead bytes 110xxxxx and 1110xxxx start two- and three-byte forms; the shortest
        // value each may carry keeps encodings unique, but for C0 80, which stands for U+0000.
        size_t extra = lead >= 0xC0 && lead < 0xE0 ? 1 : lead >= 0xE0 && lead < 0xF0 ? 2 : 0;
        uint32_t least = extra == 1 ? 0x80 : 0x800;
        uint32_t value = lead & (extra == 1 ? 0x1F : 0x0F);
        bool ok = extra != 0 && i + extra < n;
        for (size_t k = 1; ok && k <= extra; ++k) {
            ok = (field[i + k] & 0xC0) == 0x80;
            value = (value << 6) | (field[i + k] & 0x3F);
        }
        if (ok && (value >= least || (extra == 1 && value == 0))) {
            t.chars.push_back(static_cast<char16_t>(value));
            i += 1 + extra;
        } else {
            t.chars.push_back(u'\uFFFD');
            t.wellFormed = false;
            ++i;
        }
    }
    return t;
}

}  // namespace fuzzref
