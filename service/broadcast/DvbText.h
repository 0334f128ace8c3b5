// Broadcast text: the character tables of EN 300 468 annex A, between the bytes a broadcast
// carries (a table selector first, where the text has one) and UTF-8 for display.
//
// Decoding never fails and never reads outside its input. Its rules, one each:
// - Selector: a first byte of 0x20 or above means table 00 (ISO/IEC 6937, a non-spacing
//   diacritic byte before its base letter); 0x01..0x0B ISO 8859-5..15; 0x10 0x00 NN ISO 8859-NN;
//   0x11 UCS-2 big-endian; 0x12 KS X 1001 (as EUC-KR); 0x13 GB2312; 0x14 Big5; 0x15 UTF-8.
//   A selector cut short (0x10 without its two bytes, 0x1F without its encoding id) gives "".
// - Unsupported tables (0x1F encoding ids, ISO 8859-12 and other NN, reserved selectors): only
//   the printable ASCII bytes 0x20..0x7E of the text are kept.
// - Control codes (0x80..0x9F in single-byte tables, U+0080..U+009F and U+E080..U+E09F in the
//   others): CR/LF (0x8A, U+E08A) and a plain LF become "\n"; every other control, emphasis on
//   and off included, and every C0 control but TAB, and DEL, is dropped.
// - Damaged text is dropped, never replaced: a byte (or byte pair) with no character in its
//   table, a diacritic without a base letter it combines with (the letter stays), an odd last
//   byte of UCS-2, a byte that starts no well-formed UTF-8 sequence, a sequence cut at the end.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace dvbmodel {

// The tables text can be written in. ISO 8859-12 was never published.
enum class TextTable : uint8_t {
    Iso6937,  // table 00, no selector
    Iso8859_1,
    Iso8859_2,
    Iso8859_3,
    Iso8859_4,
    Iso8859_5,
    Iso8859_6,
    Iso8859_7,
    Iso8859_8,
    Iso8859_9,
    Iso8859_10,
    Iso8859_11,
    Iso8859_13,
    Iso8859_14,
    Iso8859_15,
    Ucs2,
    Utf8,
};

// Broadcast bytes, selector included, to UTF-8 for display (rules above).
std::string decodeText(std::string_view bytes);

// UTF-8 to broadcast bytes in `table`, with its selector: ISO 8859-1..4 as 0x10 0x00 NN, 5..15 as
// 0x01..0x0B, UCS-2 as 0x11, UTF-8 as 0x15, table 00 with none. "\n" becomes the CR/LF control;
// U+0080..U+009F become the table's control codes (0x86 emphasis on, ...). A character the table
// cannot hold, a C0 control other than LF and TAB, DEL, and a byte of `utf8` that is not
// well-formed UTF-8 each become '?'. Empty text gives no bytes at all (not even a selector).
std::string encodeText(std::string_view utf8, TextTable table);

// Length of the character-table selector that starts broadcast text: 0 for table 00 (and
// for no text), 3 for 0x10 0x00 NN, 2 for 0x1F NN, 1 for the other tables.
size_t selectorLength(std::string_view bytes);

// Length of the longest prefix of broadcast text, at most `limit` bytes, that ends on a whole
// character of its table (a diacritic stays with its letter, a UCS-2 pair or multi-byte
// character stays whole). 0 when not even the selector and one character fit.
// Records whose text field is zero-ended (SCNM_ServiceInfo.svcName) cannot hold UCS-2 or the
// 0x10 0x00 NN selectors, which carry zero bytes: write those decoded (fitUtf8) instead.
size_t fitText(std::string_view bytes, size_t limit);

// The same for UTF-8 (decoded text): the prefix never ends inside a character.
size_t fitUtf8(std::string_view utf8, size_t limit);

}  // namespace dvbmodel
