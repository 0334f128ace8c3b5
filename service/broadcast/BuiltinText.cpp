// Texts of the built-in broadcast: the encoder into the broadcast character tables (glibc
// iconv), the language codes and the subtitle lines.
#include <errno.h>
#include <iconv.h>

#include <algorithm>
#include <memory>

#include "broadcast/BuiltinParts.h"

namespace dvbmodel::builtin {

namespace {

struct Table {
    const char* iconvName;
    std::string_view selector;
};

Table tableOf(Charset table) {
    using namespace std::string_view_literals;
    switch (table) {
        case Charset::Greek:
            return {"ISO-8859-7", "\x03"sv};
        case Charset::Turkish:
            return {"ISO-8859-9", "\x05"sv};
        case Charset::Central:
            return {"ISO-8859-2", "\x10\x00\x02"sv};
        case Charset::Utf8:
            return {"UTF-8", "\x15"sv};
        case Charset::Latin:
            break;
    }
    return {"ISO6937", {}};
}

// Length of the UTF-8 sequence that starts with `lead`, at least 1.
size_t sequenceLength(unsigned char lead) {
    if (lead >= 0xF0) return 4;
    if (lead >= 0xE0) return 3;
    if (lead >= 0xC0) return 2;
    return 1;
}

}  // namespace

std::string encodeText(Charset table, std::string_view utf8) {
    const Table t = tableOf(table);
    std::string out(t.selector);
    if (table == Charset::Utf8) return out.append(utf8);
    iconv_t cd = iconv_open(t.iconvName, "UTF-8");
    if (cd == reinterpret_cast<iconv_t>(-1)) return out.append(utf8.size(), '?');
    std::unique_ptr<void, int (*)(iconv_t)> closer(cd, iconv_close);
    // ISO 6937 spends two bytes on an accented letter; no table here spends more than that
    // on a character that takes one or more bytes in UTF-8.
    char buffer[2];
    auto* in = const_cast<char*>(utf8.data());
    size_t inLeft = utf8.size();
    while (inLeft > 0) {
        char* outPtr = buffer;
        size_t outLeft = sizeof buffer;
        // One character at a time, so that a character the table lacks costs only itself.
        size_t length = std::min(sequenceLength(static_cast<unsigned char>(*in)), inLeft);
        size_t charLeft = length;
        if (iconv(cd, &in, &charLeft, &outPtr, &outLeft) == static_cast<size_t>(-1)) {
            iconv(cd, nullptr, nullptr, nullptr, nullptr);
            out.push_back('?');
            in += charLeft;
            inLeft -= length;
            continue;
        }
        out.append(buffer, static_cast<size_t>(outPtr - buffer));
        inLeft -= length;
    }
    return out;
}

const char* languageCode(Language language) {
    switch (language) {
        case Language::German:
            return "deu";
        case Language::Turkish:
            return "tur";
        case Language::Greek:
            return "ell";
        case Language::Czech:
            return "ces";
        case Language::Italian:
            return "ita";
        case Language::Polish:
            return "pol";
        case Language::English:
            break;
    }
    return "eng";
}

const Cue* subtitleCues(Language language) {
    static const Cue german[kCues] = {
            {"Guten Abend, meine Damen", "und Herren.", false},
            {"Wo warst du so lange?", "Ich habe auf dich gewartet.", true},
            {"Der Zug hatte Verspätung.", "Schon wieder.", false},
            {"Möchtest du noch einen Kaffee?", "", true},
            {"Gern, mit Milch und ohne Zucker.", "", false},
            {"Hast du die Nachrichten gehört?", "Über der Nordsee zieht Sturm auf.", true},
            {"Dann bleiben wir heute zu Hause.", "", false},
            {"[Donnergrollen]", "", false},
            {"Die Fenster! Schließ die Fenster!", "", true},
            {"Zu spät, der Regen ist schon da.", "", false},
            {"Weißt du noch, letzten Sommer", "am See in Österreich?", true},
            {"Natürlich. Die Hütte am Ufer.", "", false},
            {"Wir sollten wieder hinfahren.", "Vielleicht im Juli?", true},
            {"Ich frage morgen im Büro.", "", false},
            {"[Telefon klingelt]", "", false},
            {"Ja, bitte? ... Nein, heute nicht.", "", true},
            {"Wer war das?", "", false},
            {"Nur die Nachbarin", "aus dem dritten Stock.", true},
            {"Sie fragt, ob wir Kerzen haben.", "", true},
            {"Natürlich haben wir Kerzen.", "Bring ihr welche vorbei.", false},
    };
    static const Cue english[kCues] = {
            {"Good evening, ladies", "and gentlemen.", false},
            {"Where have you been?", "I've been waiting for you.", true},
            {"The train was late.", "Again.", false},
            {"Would you like another coffee?", "", true},
            {"Yes please, with milk, no sugar.", "", false},
            {"Did you hear the news?", "A storm is coming over the sea.", true},
            {"Then we're staying in tonight.", "", false},
            {"[Thunder rumbles]", "", false},
            {"The windows! Close the windows!", "", true},
            {"Too late, the rain", "is already here.", false},
            {"Do you remember last summer,", "at the lake in the mountains?", true},
            {"Of course. The cabin on the shore.", "", false},
            {"We should go back.", "Maybe in July?", true},
            {"I'll ask at the office tomorrow.", "", false},
            {"[Phone rings]", "", false},
            {"Hello? ... No, not today.", "", true},
            {"Who was that?", "", false},
            {"Only the neighbour", "from the third floor.", true},
            {"She's asking whether", "we have candles.", true},
            {"Of course we have candles.", "Take her some.", false},
    };
    return language == Language::German ? german : english;
}

}  // namespace dvbmodel::builtin
