// Broadcast text: the character tables both ways, and the real captures' text against their truth.
#if DVB_RECEIVER
#include <broadcast/DvbText.h>
#include <dirent.h>
#include <gtest/gtest.h>

#include <fstream>
#include <map>

using dvbmodel::decodeText;
using dvbmodel::encodeText;
using dvbmodel::TextTable;

namespace {

// Bytes written in hex, spaces between them for the eye.
std::string unhex(std::string_view h) {
    std::string b;
    for (size_t i = 0; i + 1 < h.size(); i += h[i] == ' ' ? 1 : 2) {
        if (h[i] != ' ') b += char(std::stoi(std::string(h.substr(i, 2)), nullptr, 16));
    }
    return b;
}

// Every table: its selector, a round trip, and cuts at every length that re-encode as they were.
TEST(DvbText, EveryTableRoundTrips) {
    const std::tuple<TextTable, const char*, std::string> cases[] = {
            {TextTable::Iso6937, "", "Chérie à Noël: Łódź ß Æ ŉ ż"},
            {TextTable::Iso8859_1, "100001", "Télé Ñ ÿ ¤"},
            {TextTable::Iso8859_2, "100002", "Łódź ď ű"},
            {TextTable::Iso8859_3, "100003", "Ħal Ġ ŭ"},
            {TextTable::Iso8859_4, "100004", "Ķīļ ŧ"},
            {TextTable::Iso8859_5, "01", "Первый канал"},
            {TextTable::Iso8859_6, "02", "قناة"},
            {TextTable::Iso8859_7, "03", "Ελληνικά"},
            {TextTable::Iso8859_8, "04", "ערוץ"},
            {TextTable::Iso8859_9, "05", "Türkçe ğış"},
            {TextTable::Iso8859_10, "06", "Ŋŧ ĸ"},
            {TextTable::Iso8859_11, "07", "ไทย"},
            {TextTable::Iso8859_13, "09", "Ąžuolas ų"},
            {TextTable::Iso8859_14, "0a", "Ŵŷ ḃ"},
            {TextTable::Iso8859_15, "0b", "€ œ Ÿ"},
            {TextTable::Ucs2, "11", "日本 Ω"},
            {TextTable::Utf8, "15", "日本 😀"},
    };
    for (const auto& [table, selector, sample] : cases) {
        std::string text = "A\tb\n" + sample, bytes = encodeText(text, table),
                    sel = unhex(selector);
        SCOPED_TRACE(text);
        EXPECT_EQ(bytes.substr(0, sel.size()), sel);
        EXPECT_EQ(decodeText(bytes), text);
        for (size_t limit = 0; limit <= bytes.size(); ++limit) {
            size_t n = dvbmodel::fitText(bytes, limit);
            ASSERT_LE(n, limit);
            EXPECT_TRUE(limit < 8 || n + 4 > limit) << limit;
            std::string cut = bytes.substr(0, n);
            EXPECT_EQ(encodeText(decodeText(cut), table), cut) << limit;
        }
    }
}

TEST(DvbText, DecodesDiacriticsControlsAndDamage) {
    const std::pair<const char*, const char*> cases[] = {
            {"c265 74 c161 20 c86f cb63 ca61 cf63 c36f", "étà öçåčô"},
            {"6162 c2", "ab"},       // diacritic at the end
            {"c131 c1 c265", "1é"},  // diacritics on no letter
            {"61 a4 62", "ab"},      // byte of no character
            {"41 8a 42 86 43 87 92 0d 01", "A\nBC"},
            {"05 41 86 42 87 43 8a 44 92 45 09 46 01", "ABC\nDE\tF"},
            {"11 0041 e08a 0042 e086 008a", "A\nB\n"},
            {"15 41 ee828a 42 c286 43", "A\nBC"},
            {"10000f a4", "€"},
            {"100003 61 a5 62", "ab"},  // ISO 8859-3 has no 0xA5
            {"13 d6d0 cec4", "中文"},
            {"14 a4a4 a4e5", "中文"},
            {"12 c7d1 b1b9", "한국"},
            {"13 d641 d6", "A"},
            {"11 0041 00", "A"},  // odd length
            {"15 41 c3", "A"},    // cut sequence
            {"15 41 ff 42 c0af 43 eda080 44", "ABCD"},
    };
    for (const auto& [in, out] : cases) EXPECT_EQ(decodeText(unhex(in)), out) << in;
    for (auto in : {"11", "15", "10", "1000", "1f"}) EXPECT_EQ(decodeText(unhex(in)), "") << in;
    // Tables not supported keep printable ASCII: encoding ids, reserved, ISO 8859-12, 8859-257.
    for (auto in : {"1f01 61 e9 62 8a", "0c 61 e9 62", "08 61 e9 62", "10000c 6162", "100101 6162"})
        EXPECT_EQ(decodeText(unhex(in)), "ab") << in;
}

TEST(DvbText, EncodesWhatTheTableCannotHoldAsQuestionMarks) {
    const std::tuple<std::string, TextTable, const char*> cases[] = {
            {"é", TextTable::Iso6937, "c265"},
            {"日é", TextTable::Iso8859_1, "100001 3f e9"},
            {"a\x01\x7Fz\x8A", TextTable::Iso8859_9, "05 61 3f 3f 7a 3f"},
            {"\xFFz", TextTable::Utf8, "15 3f 7a"},
            {"😀", TextTable::Ucs2, "11 003f"},
            {"A\u0086", TextTable::Ucs2, "11 0041 e086"},
            {"A\u0086", TextTable::Iso8859_15, "0b 41 86"},
            {"", TextTable::Utf8, ""},
    };
    for (const auto& [in, table, out] : cases) EXPECT_EQ(encodeText(in, table), unhex(out)) << out;
    EXPECT_EQ(dvbmodel::fitUtf8("aé", 2), 1u);
    EXPECT_EQ(dvbmodel::fitText(unhex("13 d6d0 cec4"), 4), 3u);
    EXPECT_EQ(dvbmodel::fitText(unhex("13 d6d0"), 2), 0u);
}

// The truth files hold one member a line. An object's texts are its members "hex"/"utf8",
// "name_hex"/"name_utf8", "provider_hex"/"provider_utf8" ...
TEST(DvbText, DecodesTheCapturesAsTheirTruth) {
    std::string dir = DVB_TESTDATA_DIR "/truth";
    DIR* d = opendir(dir.c_str());
    if (!d) GTEST_SKIP() << "no broadcast captures at " << dir;
    size_t checked = 0;
    while (dirent* entry = readdir(d)) {
        std::string name = entry->d_name;
        if (name.size() < 5 || name.compare(name.size() - 5, 5, ".json") != 0) continue;
        std::ifstream json(dir + "/" + name);
        std::map<std::string, std::string> object;  // "name_hex" -> its value, until '{' or '}'
        for (std::string line; std::getline(json, line);) {
            if (line.find_first_of("{}") != std::string::npos) object.clear();
            size_t open = line.find('"'), colon = line.find("\": \"", open),
                   close = line.rfind('"');
            if (open == std::string::npos || colon == std::string::npos) continue;
            std::string key = line.substr(open + 1, colon - open - 1), value;
            std::string stem = key.substr(0, key.rfind('_') + 1), kind = key.substr(stem.size());
            if (kind != "hex" && kind != "utf8") continue;
            for (size_t i = colon + 4; i < close; ++i) {
                char c = line[i], e = c == '\\' ? line[++i] : 0;
                value += e == 'n' ? '\n' : e == 't' ? '\t' : e ? e : c;
            }
            object[key] = value;
            auto hex = object.find(stem + "hex"), utf8 = object.find(stem + "utf8");
            if (hex == object.end() || utf8 == object.end()) continue;
            EXPECT_EQ(decodeText(unhex(hex->second)), utf8->second) << hex->second;
            ++checked;
        }
    }
    closedir(d);
    EXPECT_GE(checked, 580u);  // service, provider, network and event texts of four captures
}

}  // namespace
#endif
