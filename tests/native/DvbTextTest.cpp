// Broadcast text: the character tables both ways, and the real captures' text against their truth.
#if DVB_RECEIVER
#include <broadcast/DvbText.h>
#include <gtest/gtest.h>
#include "Captures.h"

#include <sstream>

using namespace dvbmodel;
using testdata::unhex;

namespace {

// Every table: its selector, a round trip, and cuts at every length that re-encode as they were.
TEST(DvbText, EveryTableRoundTrips) {
    // A sample of each table, in the order of TextTable, and the selector it must get.
    std::istringstream samples(
            "Chérie à Noël: Łódź ß Æ ŉ ż|Télé Ñ ÿ ¤|Łódź ď ű|Ħal Ġ ŭ|Ķīļ ŧ|Первый канал|قناة|"
            "Ελληνικά|ערוץ|Türkçe ğış|Ŋŧ ĸ|ไทย|Ąžuolas ų|Ŵŷ ḃ|€ œ Ÿ|日本 Ω|日本 😀");
    const char* selectors[] = {"",   "100001", "100002", "100003", "100004", "01", "02", "03", "04",
                               "05", "06",     "07",     "09",     "0a",     "0b", "11", "15"};
    static_assert(std::size(selectors) == size_t(TextTable::Utf8) + 1);
    size_t t = 0;
    for (std::string sample; std::getline(samples, sample, '|'); ++t) {
        ASSERT_LT(t, std::size(selectors));
        TextTable table = TextTable(t);
        std::string text = "A\tb\n" + sample, bytes = encodeText(text, table);
        SCOPED_TRACE(text);
        EXPECT_EQ(bytes.rfind(unhex(selectors[t]), 0), 0u);  // starts with its selector
        EXPECT_EQ(decodeText(bytes), text);
        for (size_t limit = 0; limit <= bytes.size(); ++limit) {
            size_t n = fitText(bytes, limit);
            ASSERT_LE(n, limit);
            EXPECT_TRUE(limit < 8 || n + 4 > limit) << limit;
            std::string cut = bytes.substr(0, n);
            EXPECT_EQ(encodeText(decodeText(cut), table), cut) << limit;
        }
    }
    EXPECT_EQ(t, std::size(selectors));
}

TEST(DvbText, KeepsToItsRulesForDiacriticsControlsAndDamage) {
    const std::pair<const char*, const char*> cases[] = {
            {"c265 74 c161 20 c86f cb63 ca61 cf63 c36f 8a 86 87 92 0d 01", "étà öçåčô\n"},
            {"61 a4 c131 c1 c265 c2", "a1é"},  // byte of no character, diacritics on no letter
            {"05 41 86 42 87 43 8a 44 92 45 09 46 01", "ABC\nDE\tF"},
            {"11 0041 e08a 0042 e086 008a 00", "A\nB\n"},  // odd length
            {"15 41 ee828a 42 c286 43", "A\nBC"},
            {"10000f a4", "€"},
            {"100003 61 a5 62", "ab"},  // ISO 8859-3 has no 0xA5
            {"13 d6d0 cec4 d641 d6", "中文A"},
            {"14 a4a4 a4e5", "中文"},
            {"12 c7d1 b1b9", "한국"},
            {"15 41 ff 42 c0af 43 eda080 44 fc808080 c3",
             "ABCD"},  // bad byte, overlong, surrogate, cut
    };
    for (const auto& [in, out] : cases) EXPECT_EQ(decodeText(unhex(in)), out) << in;
    for (auto in : {"11", "15", "10", "1000", "1f"}) EXPECT_EQ(decodeText(unhex(in)), "") << in;
    // Tables not supported keep printable ASCII: encoding ids, reserved, ISO 8859-12, 8859-257.
    for (auto in : {"1f01 61 e9 62 8a", "0c 61 e9 62", "08 61 e9 62", "10000c 6162", "100101 6162"})
        EXPECT_EQ(decodeText(unhex(in)), "ab") << in;
    // Encoding: what the table cannot hold becomes '?'.
    const std::tuple<std::string, TextTable, const char*> encodings[] = {
            {"é", TextTable::Iso6937, "c265"},
            {"日é", TextTable::Iso8859_1, "100001 3f e9"},
            {"a\x01\x7Fz\x8A", TextTable::Iso8859_9, "05 61 3f 3f 7a 3f"},
            {"\xFFz", TextTable::Utf8, "15 3f 7a"},
            {"😀", TextTable::Ucs2, "11 003f"},
            {"A\u0086", TextTable::Ucs2, "11 0041 e086"},
            {"A\u0086", TextTable::Iso8859_15, "0b 41 86"},
            {"", TextTable::Utf8, ""},
    };
    for (const auto& [in, table, out] : encodings)
        EXPECT_EQ(encodeText(in, table), unhex(out)) << out;
    // Cuts never split a character: a lead byte of 0x81 takes two in the two-byte tables.
    EXPECT_EQ(
            std::vector<size_t>({fitUtf8("aé", 2), fitUtf8("é", 1),
                                 fitText(unhex("13 d6d0 cec4"), 4), fitText(unhex("13 8140"), 2)}),
            std::vector<size_t>({1, 0, 3, 0}));
}

// Each "hex" of an object with its "utf8", "name_hex" with "name_utf8" and so on, at any depth.
size_t checkTexts(const nlohmann::json& j) {
    size_t checked = 0;
    for (const auto& [key, value] : j.items()) {
        checked += value.is_structured() ? checkTexts(value) : 0;
        const size_t stem = key.size() - 3;
        if (!j.is_object() || key.size() < 3 || key.compare(stem, 3, "hex") != 0) continue;
        auto utf8 = j.find(key.substr(0, stem) + "utf8");
        if (utf8 == j.end()) continue;
        EXPECT_EQ(decodeText(unhex(value.get<std::string>())), utf8->get<std::string>()) << value;
        ++checked;
    }
    return checked;
}

TEST(DvbText, DecodesTheCapturesAsTheirTruth) {
    const std::filesystem::path dir = DVB_TESTDATA_DIR "/truth";
    if (!std::filesystem::is_directory(dir)) GTEST_SKIP() << "no broadcast captures at " << dir;
    size_t checked = 0;
    for (const auto& file : std::filesystem::directory_iterator(dir)) {
        if (file.path().extension() != ".json") continue;
        std::ifstream json(file.path());
        checked += checkTexts(nlohmann::json::parse(json));
    }
    EXPECT_GE(checked, 580u);  // service, provider, network and event texts of four captures
}

}  // namespace
#endif
