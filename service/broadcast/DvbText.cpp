#include "DvbText.h"

#include <iconv.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <utility>
#include <vector>

namespace dvbmodel {
namespace {

constexpr char32_t kBad = 0xFFFFFFFF;  // bytes that start no well-formed UTF-8 sequence

// Table 00's non-spacing diacritics, 0xC1..0xCF, each written before the letter it goes on.
constexpr bool isDiacritic(uint8_t b) {
    return b >= 0xC1 && b <= 0xCF;
}

// A single-byte table, read once from glibc iconv: the character of each byte (0 for none) and,
// for encoding, each character's code sorted by character: one byte, or for a letter with a
// diacritic (table 00) the diacritic << 8 | the letter.
struct ByteTable {
    bool loaded = false;
    std::array<char16_t, 256> chars{};
    std::vector<std::pair<char32_t, uint16_t>> codes;
};

// Table 00's letters with a diacritic: [diacritic - 0xC1][letter - 0x20], 0 where none.
using Combined = std::array<std::array<char16_t, 96>, 15>;

struct Tables {
    std::array<ByteTable, 16> iso8859;  // by part number; 0 and 12 stay empty
    ByteTable iso6937;
    Combined combined{};
};

// The one BMP character iconv makes of in[0, n), or 0 when it makes none or more than one.
char16_t convertOne(iconv_t cd, const char* in, size_t n) {
    iconv(cd, nullptr, nullptr, nullptr, nullptr);
    wchar_t out[2];
    char* src = const_cast<char*>(in);
    char* dst = reinterpret_cast<char*>(out);
    size_t srcLeft = n, dstLeft = sizeof out;
    if (iconv(cd, &src, &srcLeft, &dst, &dstLeft) == size_t(-1) || srcLeft != 0 ||
        dstLeft != sizeof out - sizeof(wchar_t) || uint32_t(out[0]) > 0xFFFF) {
        return 0;
    }
    return char16_t(out[0]);
}

void load(ByteTable& table, const char* name, Combined* combined) {
    iconv_t cd = iconv_open("WCHAR_T", name);
    if (cd == iconv_t(-1)) return;  // ISO 8859-12, or a C library without the table
    for (int b = 1; b < 256; ++b) {
        char in[2] = {char(b), 0};
        if (char16_t c = convertOne(cd, in, 1)) {
            table.chars[b] = c;
            table.codes.emplace_back(c, b);
        }
        if (!combined || !isDiacritic(b)) continue;
        for (int letter = 0x20; letter < 0x80; ++letter) {
            in[1] = char(letter);
            char16_t c = convertOne(cd, in, 2);
            (*combined)[b - 0xC1][letter - 0x20] = c;
            if (c) table.codes.emplace_back(c, b << 8 | letter);
        }
    }
    iconv_close(cd);
    // A character with a code of one byte and one of two is written with the one byte.
    std::sort(table.codes.begin(), table.codes.end());
    table.loaded = true;
}

const Tables& tables() {
    static const Tables* const t = [] {
        auto* t = new Tables;  // lives as long as the process: no destruction order to mind
        char name[16];
        for (int n = 1; n <= 15; ++n) {
            std::snprintf(name, sizeof name, "ISO-8859-%d", n);
            if (n != 12) load(t->iso8859[n], name, nullptr);
        }
        load(t->iso6937, "ISO_6937", &t->combined);
        return t;
    }();
    return *t;
}

void appendUtf8(std::string& out, char32_t c) {
    if (c < 0x80) {
        out += char(c);
    } else if (c < 0x800) {
        out += char(0xC0 | c >> 6);
        out += char(0x80 | (c & 0x3F));
    } else if (c < 0x10000) {
        out += char(0xE0 | c >> 12);
        out += char(0x80 | (c >> 6 & 0x3F));
        out += char(0x80 | (c & 0x3F));
    } else {
        out += char(0xF0 | c >> 18);
        out += char(0x80 | (c >> 12 & 0x3F));
        out += char(0x80 | (c >> 6 & 0x3F));
        out += char(0x80 | (c & 0x3F));
    }
}

// The character of the well-formed UTF-8 sequence at s[i], with i moved past it; or kBad, with
// i moved past that one byte.
char32_t nextUtf8(std::string_view s, size_t& i) {
    uint8_t b = s[i++];
    if (b < 0x80) return b;
    int n = b >= 0xF8 ? 0 : b >= 0xF0 ? 3 : b >= 0xE0 ? 2 : b >= 0xC0 ? 1 : 0;  // 0xF8.. lead none
    if (n == 0 || i + n > s.size()) return kBad;
    char32_t c = b & (0x3F >> n);
    for (int k = 0; k < n; ++k) {
        uint8_t next = s[i + k];
        if ((next & 0xC0) != 0x80) return kBad;
        c = c << 6 | (next & 0x3F);
    }
    static constexpr char32_t kLeast[] = {0, 0x80, 0x800, 0x10000};
    if (c < kLeast[n] || c > 0x10FFFF || (c >= 0xD800 && c <= 0xDFFF)) return kBad;
    i += n;
    return c;
}

// One decoded character for display: CR/LF controls become "\n", TAB stays, other controls
// vanish.
void put(std::string& out, char32_t c) {
    if (c == 0x0A || c == 0x8A || c == 0xE08A) {
        out += '\n';
    } else if (c == 0x09 ||
               !(c < 0x20 || (c >= 0x7F && c <= 0x9F) || (c >= 0xE080 && c <= 0xE09F) ||
                 (c >= 0xD800 && c <= 0xDFFF) || c > 0x10FFFF)) {
        appendUtf8(out, c);
    }
}

void decodeBytes(std::string& out, std::string_view s, const ByteTable& table,
                 const Combined* combined) {
    for (size_t i = 0; i < s.size(); ++i) {
        uint8_t b = s[i];
        if (combined && isDiacritic(b)) {
            uint8_t letter = i + 1 < s.size() ? s[i + 1] : 0;
            char16_t c = letter >= 0x20 && letter < 0x80 ? (*combined)[b - 0xC1][letter - 0x20] : 0;
            // A diacritic that goes on no letter here is dropped; the byte after it stands alone.
            if (c) {
                put(out, c);
                ++i;
            }
        } else if (table.chars[b]) {
            put(out, table.chars[b]);
        }
    }
}

void decodeAscii(std::string& out, std::string_view s) {
    for (char b : s) {
        if (b >= 0x20 && b < 0x7F) out += b;
    }
}

// The multi-byte tables that glibc has and broadcasts rarely use: a converter per call.
void decodeIconv(std::string& out, std::string_view s, const char* name) {
    iconv_t cd = iconv_open("WCHAR_T", name);
    if (cd == iconv_t(-1)) return decodeAscii(out, s);
    char* src = const_cast<char*>(s.data());
    size_t left = s.size();
    while (left > 0) {
        wchar_t buf[128];
        char* dst = reinterpret_cast<char*>(buf);
        size_t room = sizeof buf;
        size_t r = iconv(cd, &src, &left, &dst, &room);
        for (wchar_t* w = buf; w < reinterpret_cast<wchar_t*>(dst); ++w) put(out, char32_t(*w));
        if (r != size_t(-1)) break;
        if (errno == EILSEQ) {
            ++src, --left;  // a byte that starts no character of the table
        } else if (errno != E2BIG) {
            break;  // EINVAL: a character cut at the end
        }
    }
    iconv_close(cd);
}

// Bytes in front of the text: none for table 00, the selector, its two bytes after 0x10, the
// encoding id after 0x1F.
}  // namespace

size_t selectorLength(std::string_view bytes) {
    if (bytes.empty()) return 0;
    const uint8_t first = bytes[0];
    return first >= 0x20 ? 0 : first == 0x10 ? 3 : first == 0x1F ? 2 : 1;
}

std::string decodeText(std::string_view bytes) {
    std::string out;
    if (bytes.empty()) return out;
    const Tables& t = tables();
    uint8_t first = bytes[0];
    size_t skip = selectorLength(bytes);
    if (bytes.size() < skip) return out;
    std::string_view s = bytes.substr(skip);
    out.reserve(s.size() + s.size() / 4);
    if (first >= 0x20) {
        decodeBytes(out, s, t.iso6937, &t.combined);
    } else if ((first >= 0x01 && first <= 0x0B) || first == 0x10) {
        unsigned n = first == 0x10 ? uint8_t(bytes[1]) << 8 | uint8_t(bytes[2]) : first + 4u;
        if (n < t.iso8859.size() && t.iso8859[n].loaded) {
            decodeBytes(out, s, t.iso8859[n], nullptr);
        } else {
            decodeAscii(out, s);
        }
    } else if (first == 0x11) {
        for (size_t i = 0; i + 1 < s.size(); i += 2)
            put(out, uint8_t(s[i]) << 8 | uint8_t(s[i + 1]));
    } else if (first == 0x12) {
        decodeIconv(out, s, "EUC-KR");
    } else if (first == 0x13) {
        decodeIconv(out, s, "GB2312");
    } else if (first == 0x14) {
        decodeIconv(out, s, "BIG5");
    } else if (first == 0x15) {
        for (size_t i = 0; i < s.size();) {
            char32_t c = nextUtf8(s, i);
            if (c != kBad) put(out, c);
        }
    } else {
        decodeAscii(out, s);
    }
    return out;
}

std::string encodeText(std::string_view utf8, TextTable table) {
    std::string out;
    if (utf8.empty()) return out;
    const ByteTable* bytes = nullptr;
    if (table == TextTable::Ucs2) {
        out += '\x11';
    } else if (table == TextTable::Utf8) {
        out += '\x15';
    } else if (table == TextTable::Iso6937) {
        bytes = &tables().iso6937;
    } else {
        unsigned n = unsigned(table) - unsigned(TextTable::Iso8859_1) + 1;
        if (n >= 12) ++n;  // no part 12
        bytes = &tables().iso8859[n];
        if (n >= 5) {
            out += char(n - 4);
        } else {
            out.append({'\x10', '\0', char(n)});
        }
    }
    out.reserve(out.size() + utf8.size() * (table == TextTable::Ucs2 ? 2 : 1));
    for (size_t i = 0; i < utf8.size();) {
        char32_t c = nextUtf8(utf8, i);
        if (c == '\n') {
            c = 0x8A;
        } else if ((c < 0x20 && c != '\t') || c == 0x7F || c == kBad) {
            c = '?';
        }
        if (bytes) {
            auto it = std::lower_bound(bytes->codes.begin(), bytes->codes.end(),
                                       std::pair<char32_t, uint16_t>(c, 0));
            uint16_t code = it != bytes->codes.end() && it->first == c ? it->second : '?';
            if (code > 0xFF) out += char(code >> 8);
            out += char(code);
            continue;
        }
        if (c >= 0x80 && c <= 0x9F) c += 0xE000;  // the two-byte tables' control codes
        if (table == TextTable::Utf8) {
            appendUtf8(out, c);
        } else {
            if (c > 0xFFFF) c = '?';
            out += char(c >> 8);
            out += char(c);
        }
    }
    return out;
}

size_t fitUtf8(std::string_view utf8, size_t limit) {
    if (utf8.size() <= limit) return utf8.size();
    size_t n = limit;
    while (n > 0 && (uint8_t(utf8[n]) & 0xC0) == 0x80) --n;
    return n;
}

size_t fitText(std::string_view bytes, size_t limit) {
    if (bytes.size() <= limit) return bytes.size();
    uint8_t first = bytes[0];
    size_t start = selectorLength(bytes), n = limit;
    if (limit <= start) return 0;
    if (first >= 0x20) {
        if (isDiacritic(bytes[n - 1])) --n;
    } else if (first == 0x11) {
        n -= (n - start) % 2;
    } else if (first == 0x15) {
        n = start + fitUtf8(bytes.substr(start), limit - start);
    } else if (first >= 0x12 && first <= 0x14) {
        // Every byte from 0x81 up leads a character of two bytes in these three tables.
        for (n = start; n < limit;) {
            size_t next = n + (uint8_t(bytes[n]) >= 0x81 ? 2 : 1);
            if (next > limit) break;
            n = next;
        }
    }
    return n > start ? n : 0;
}

}  // namespace dvbmodel
