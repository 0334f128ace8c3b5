// Teletext of the built-in broadcast: one magazine of level-1 pages. 100 is the index; 101
// the news, three subpages in rotation; 150 a newsflash; 200 sport results; 300 the weather
// with a mosaic map; 888 the subtitles, following the cues of the DVB subtitles. German pages
// use the German national subset.
#include <time.h>

#include <algorithm>
#include <cstdio>
#include <string_view>

#include "broadcast/BuiltinParts.h"

namespace dvbmodel::builtin {

namespace {

using namespace ttx;

// C12..C14 = 0 0 1: the German subset of the Latin G0 set.
constexpr uint16_t kGermanOption = 1 << 14;

// A mosaic character from its six cells, top left to bottom right (1: set).
constexpr uint8_t mosaic(int tl, int tr, int ml, int mr, int bl, int br) {
    return static_cast<uint8_t>(0x20 | tl | tr << 1 | ml << 2 | mr << 3 | bl << 4 | br << 6);
}

// Printable ASCII positions that the national subsets give other characters.
constexpr std::string_view kNationalPositions = "#$@[\\]^_`{|}~";

// A character in the G0 set with the page's national subset; '?' for what it lacks.
uint8_t g0(char32_t c, bool german) {
    if (c == U'[') c = U'(';
    if (c == U']') c = U')';
    if (german) {
        switch (c) {
            case U'§':
                return 0x40;
            case U'Ä':
                return 0x5B;
            case U'Ö':
                return 0x5C;
            case U'Ü':
                return 0x5D;
            case U'°':
                return 0x60;
            case U'ä':
                return 0x7B;
            case U'ö':
                return 0x7C;
            case U'ü':
                return 0x7D;
            case U'ß':
                return 0x7E;
            case U'#':
            case U'$':
            case U'^':
            case U'_':
                return static_cast<uint8_t>(c);
        }
    } else {
        switch (c) {
            case U'£':
                return 0x23;
            case U'#':
                return 0x5F;
            case U'$':
            case U'@':
                return static_cast<uint8_t>(c);
        }
    }
    if (c < 0x20 || c >= 0x7F ||
        kNationalPositions.find(static_cast<char>(c)) != kNationalPositions.npos)
        return '?';
    return static_cast<uint8_t>(c);
}

struct Localized {
    const char* de;
    const char* en;
};

class PageBuilder {
public:
    PageBuilder(uint16_t number, bool german) : german_(german) {
        page_.number = number;
        page_.controlBits = german ? kGermanOption : 0;
        for (auto& row : page_.rows) row.fill(' ');
        page_.links = {0x101, 0x200, 0x300, 0x150, 0, 0x100};
    }
    const char* pick(Localized s) const { return german_ ? s.de : s.en; }

    // Raw bytes (attributes, mosaic characters) at a row and column; what passes column 39
    // is cut.
    PageBuilder& put(int row, int col, std::initializer_list<uint8_t> bytes) {
        for (uint8_t b : bytes)
            if (col < 40) page_.rows[row][col++] = b;
        return *this;
    }
    PageBuilder& fill(int row, int from, int to, uint8_t byte) {
        std::fill(page_.rows[row].begin() + from, page_.rows[row].begin() + to, byte);
        return *this;
    }
    // UTF-8 text in the page's G0 set; returns the column after it.
    int text(int row, int col, std::string_view utf8) {
        for (size_t i = 0; i < utf8.size() && col < 40;) {
            const auto lead = static_cast<unsigned char>(utf8[i]);
            char32_t c = lead;
            size_t length = 1;
            if (lead >= 0xC0 && i + 1 < utf8.size()) {  // two-byte sequences cover the subsets
                c = (lead & 0x1F) << 6 | (static_cast<unsigned char>(utf8[i + 1]) & 0x3F);
                length = lead >= 0xE0 ? (lead >= 0xF0 ? 4 : 3) : 2;
                if (length > 2) c = '?';
            }
            i += length;
            page_.rows[row][col++] = g0(c, german_);
        }
        return col;
    }
    PageBuilder& line(int row, int col, uint8_t attribute, std::string_view utf8) {
        put(row, col, {attribute});
        text(row, col + 1, utf8);
        return *this;
    }
    // The colour-key prompts of row 24, matching the links.
    PageBuilder& prompts() {
        line(24, 0, kRed, pick({"Nachricht", "News"}));
        line(24, 10, kGreen, "Sport");
        line(24, 20, kYellow, pick({"Wetter", "Weather"}));
        line(24, 30, kCyan, pick({"Eilmeld.", "Flash"}));
        return *this;
    }
    // The header row: title, page number, date and clock of the transmission time.
    TeletextPage done(std::string_view title, int64_t utc, int64_t millis, uint16_t subcode,
                      uint16_t extraBits) {
        page_.time = millis;
        page_.subcode = subcode;
        page_.controlBits |= extraBits;
        const time_t t = static_cast<time_t>(utc + millis / 1000);
        struct tm tm {};
        gmtime_r(&t, &tm);
        char stamp[64];
        snprintf(stamp, sizeof stamp, "%03X %02d%c%02d%c%02d %02d:%02d:%02d", page_.number,
                 tm.tm_mday, german_ ? '.' : '/', tm.tm_mon + 1, german_ ? '.' : '/',
                 tm.tm_year % 100, tm.tm_hour, tm.tm_min, tm.tm_sec);
        text(0, 8, title);
        text(0, 19, stamp);
        return page_;
    }

private:
    TeletextPage page_;
    bool german_;
};

const Localized kIndex[] = {
        {"Nachrichten", "News"}, {"Eilmeldung", "Newsflash"}, {"Sport", "Sport"},
        {"Wetter", "Weather"},   {"Untertitel", "Subtitles"},
};
const uint16_t kIndexPages[] = {0x101, 0x150, 0x200, 0x300, 0x888};

const Localized kNews[3][3] = {
        {{"Neue Brücke über den Fluss eröffnet", "New bridge over the river opens"},
         {"Nach drei Jahren Bauzeit rollt der", "After three years of work the first"},
         {"erste Verkehr über die Brücke.", "traffic crosses the new bridge."}},
        {{"Stadt plant mehr Grünflächen", "City plans more green spaces"},
         {"Zwölf neue Parks sollen bis 2030", "Twelve new parks are to be ready"},
         {"entstehen, sagt der Bürgermeister.", "by 2030, the mayor says."}},
        {{"Orchester geht auf Tournee", "Orchestra goes on tour"},
         {"Die Philharmonie spielt im Herbst", "The philharmonic plays in Asia"},
         {"in Asien und Südamerika.", "and South America this autumn."}},
};

TeletextPage indexPage(std::string_view title, bool german, int64_t start) {
    PageBuilder p(0x100, german);
    // A blue band with the title in double height, then a mosaic stripe under it.
    p.put(1, 0, {kBlue, kNewBackground, kWhite, kDoubleHeight});
    p.text(1, 5, title);
    p.put(2, 0, {kBlue, kNewBackground});
    p.put(3, 0, {kMosaicYellow}).fill(3, 1, 40, mosaic(1, 1, 1, 1, 0, 0));
    p.put(4, 0, {kMosaicRed, kSeparated}).fill(4, 2, 40, mosaic(1, 0, 0, 1, 1, 0));
    int row = 6;
    for (size_t i = 0; i < std::size(kIndex); ++i, row += 2) {
        p.line(row, 1, kCyan, p.pick(kIndex[i]));
        // Page numbers are 0x100 .. 0x8FF: three hexadecimal digits.
        char number[8];
        snprintf(number, sizeof number, "%03X", kIndexPages[i]);
        p.line(row, 33, kYellow, number);
    }
    p.line(20, 1, kGreen, p.pick({"Seite wählen: drei Ziffern", "Choose a page: three digits"}));
    return p.prompts().done(title, start, 0, 0, 0);
}

TeletextPage newsPage(std::string_view title, bool german, int64_t start, int64_t millis,
                      int story) {
    PageBuilder p(0x101, german);
    p.put(1, 0, {kRed, kNewBackground, kWhite});
    p.text(1, 4, p.pick({"NACHRICHTEN", "NEWS"}));
    char counter[16];  // "1/3": room for any int, which the compiler cannot rule out
    snprintf(counter, sizeof counter, "%d/3", story + 1);
    p.text(1, 36, counter);
    p.line(3, 0, kDoubleHeight, p.pick(kNews[story][0]));
    p.line(6, 1, kWhite, p.pick(kNews[story][1]));
    p.line(7, 1, kWhite, p.pick(kNews[story][2]));
    p.line(22, 1, kFlash, p.pick({"Weiter in 20 Sekunden", "More in 20 seconds"}));
    return p.prompts().done(title, start, millis, static_cast<uint16_t>(story + 1), 0);
}

TeletextPage newsflashPage(std::string_view title, bool german, int64_t start) {
    PageBuilder p(0x150, german);
    // Only the boxed rows show over the picture.
    for (int row : {20, 22}) p.put(row, 0, {kDoubleHeight, kStartBox, kStartBox, kYellow});
    p.text(20, 5, p.pick({"EILMELDUNG: Sturm über der Küste", "NEWSFLASH: Storm hits the coast"}));
    p.text(22, 5, p.pick({"Fähren fahren heute nicht", "Ferries cancelled for today"}));
    for (int row : {20, 22}) p.put(row, 38, {kEndBox, kEndBox});
    return p.prompts().done(title, start, 0, 0, kNewsflash | kSuppressHeader);
}

TeletextPage sportPage(std::string_view title, bool german, int64_t start) {
    PageBuilder p(0x200, german);
    p.put(1, 0, {kGreen, kNewBackground, kBlue});
    p.text(1, 4, p.pick({"SPORT - ERGEBNISSE", "SPORT - RESULTS"}));
    const char* results[][3] = {{"Nordstadt", "Südhafen", "2:1"},
                                {"Bergdorf", "Flussau", "0:0"},
                                {"Altmarkt", "Seeheim", "3:2"},
                                {"Waldberg", "Neuburg", "1:4"}};
    int row = 4;
    for (const auto& r : results) {
        p.line(row, 1, kWhite, r[0]);
        p.line(row, 15, kCyan, r[1]);
        p.line(row, 30, kYellow, r[2]);
        row += 2;
    }
    return p.prompts().done(title, start, 0, 0, 0);
}

TeletextPage weatherPage(std::string_view title, bool german, int64_t start) {
    PageBuilder p(0x300, german);
    p.put(1, 0, {kYellow, kNewBackground, kBlue});
    p.text(1, 4, p.pick({"WETTER MORGEN", "WEATHER TOMORROW"}));
    // A coast: land in green mosaic, sea in blue, widening row by row.
    for (int r = 0; r < 12; ++r) {
        const int coast = 8 + r;
        p.put(3 + r, 0, {kMosaicGreen, kContiguous});
        p.fill(3 + r, 2, coast, mosaic(1, 1, 1, 1, 1, 1));
        p.put(3 + r, coast, {kMosaicBlue});
        p.fill(3 + r, coast + 1, 24, mosaic(1, 1, 1, 1, 1, 1));
    }
    p.line(5, 25, kYellow, p.pick({"Nord 14°", "North 14C"}));
    p.line(9, 25, kYellow, p.pick({"Mitte 17°", "Centre 17C"}));
    p.line(13, 25, kYellow, p.pick({"Süd 21°", "South 21C"}));
    p.line(17, 1, kWhite,
           p.pick({"Morgen sonnig, abends Gewitter.", "Sunny, thunderstorms at night."}));
    return p.prompts().done(title, start, 0, 0, 0);
}

// Page 888: each cue in boxed double-height rows near the bottom, erased when it ends.
TeletextPage subtitlePage(std::string_view title, bool german, int64_t start, const Cue* cue,
                          int64_t millis) {
    PageBuilder p(0x888, german);
    if (cue) {
        int row = cue->second[0] ? 20 : 22;
        for (const char* text : {cue->first, cue->second}) {
            if (!text[0]) continue;
            p.put(row, 1,
                  {kDoubleHeight, cue->otherSpeaker ? kYellow : kWhite, kStartBox, kStartBox});
            p.put(row, std::min(p.text(row, 5, text), 38), {kEndBox, kEndBox});
            row += 2;
        }
    }
    return p.done(title, start, millis, 0, kErasePage | kSubtitle | kSuppressHeader);
}

}  // namespace

std::vector<TeletextPage> teletextLoop(Language language, std::string_view title, int64_t start) {
    const bool german = language == Language::German;
    std::vector<TeletextPage> pages;
    pages.push_back(indexPage(title, german, start));
    pages.push_back(newsflashPage(title, german, start));
    pages.push_back(sportPage(title, german, start));
    pages.push_back(weatherPage(title, german, start));
    // The news stories take turns every 20 seconds.
    constexpr int64_t kStoryMillis = 20000;
    for (int64_t t = 0; t < kLoopMillis; t += kStoryMillis)
        pages.push_back(newsPage(title, german, start, t, static_cast<int>(t / kStoryMillis % 3)));
    const Cue* cues = subtitleCues(language);
    for (int i = 0; i < kCues; ++i) {
        pages.push_back(subtitlePage(title, german, start, &cues[i], i * kCueMillis));
        pages.push_back(
                subtitlePage(title, german, start, nullptr, i * kCueMillis + kCueShownMillis));
    }
    std::stable_sort(pages.begin(), pages.end(),
                     [](const TeletextPage& a, const TeletextPage& b) { return a.time < b.time; });
    return pages;
}

}  // namespace dvbmodel::builtin
