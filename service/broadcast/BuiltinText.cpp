// Texts of the built-in broadcast: the character table of each kind of name and text, the
// language codes and the subtitle lines.
#include "broadcast/BuiltinParts.h"
#include "broadcast/DvbText.h"

namespace dvbmodel::builtin {

std::string encodeText(Charset table, std::string_view utf8) {
    switch (table) {
        case Charset::Greek:
            return dvbmodel::encodeText(utf8, TextTable::Iso8859_7);
        case Charset::Turkish:
            return dvbmodel::encodeText(utf8, TextTable::Iso8859_9);
        case Charset::Central:
            return dvbmodel::encodeText(utf8, TextTable::Iso8859_2);
        case Charset::Utf8:
            return dvbmodel::encodeText(utf8, TextTable::Utf8);
        case Charset::Latin:
            break;
    }
    return dvbmodel::encodeText(utf8, TextTable::Iso6937);
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
