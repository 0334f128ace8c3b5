// A week of schedule per service of the built-in broadcast: programmes drawn from a small
// catalogue by the service's profile, back to back from midnight to midnight.
#include <algorithm>
#include <iterator>
#include <string>

#include "broadcast/BuiltinParts.h"

namespace dvbmodel::builtin {

namespace {

enum class Genre : uint8_t { News, Film, Sport, Kids, Documentary, Series, Show, Music, Shopping };

// Credits an event of a genre carries as extended items.
enum class Credits : uint8_t { None, Film, Presenter, Commentary };

struct Programme {
    Genre genre;
    const char* name[2];  // German, English
    const char* text[2];
    const char* more[2];  // the first sentence of the extended description
    uint8_t content;      // content nibbles, EN 300 468 table 29
    uint8_t minimumAge;   // 0: no rating
    uint16_t minMinutes, maxMinutes;
    Credits credits;
};

// clang-format off
const Programme kCatalogue[] = {
    {Genre::News, {"Nachrichten", "News"},
     {"Aktuelle Meldungen aus aller Welt.", "The latest reports from around the world."},
     {"Politik, Wirtschaft und Kultur im Überblick.", "Politics, business and culture at a glance."},
     0x21, 0, 10, 30, Credits::Presenter},
    {Genre::News, {"Wetter", "Weather"},
     {"Die Aussichten für die nächsten Tage.", "The outlook for the coming days."},
     {"Mit Reisewetter und Pollenflug.", "With travel weather and pollen count."},
     0x21, 0, 5, 10, Credits::Presenter},
    {Genre::News, {"Weltspiegel", "World Mirror"},
     {"Reportagen von Korrespondenten.", "Reports from our correspondents."},
     {"Geschichten hinter den Schlagzeilen.", "The stories behind the headlines."},
     0x22, 0, 30, 45, Credits::Presenter},
    {Genre::Film, {"Der letzte Zug nach Süden", "The Last Train South"},
     {"Drama, zwei Fremde auf einer langen Reise.", "Drama: two strangers on a long journey."},
     {"Ein Winterabend, ein verspäteter Zug und eine Begegnung, die alles ändert.",
      "A winter night, a late train and a meeting that changes everything."},
     0x13, 12, 95, 120, Credits::Film},
    {Genre::Film, {"Schatten über der Stadt", "Shadows over the City"},
     {"Krimi: eine Kommissarin ermittelt.", "Crime: a detective investigates."},
     {"Eine Serie von Einbrüchen führt in die feinsten Kreise der Stadt.",
      "A string of burglaries leads into the city's finest circles."},
     0x11, 16, 90, 110, Credits::Film},
    {Genre::Film, {"Sommer am Fluss", "Summer by the River"},
     {"Komödie über eine turbulente Familienfeier.", "Comedy about a chaotic family reunion."},
     {"Drei Generationen, ein Ferienhaus und zu wenig Betten.",
      "Three generations, one holiday house and too few beds."},
     0x14, 6, 85, 100, Credits::Film},
    {Genre::Film, {"Die Expedition", "The Expedition"},
     {"Abenteuer im ewigen Eis.", "Adventure in the eternal ice."},
     {"Eine Forscherin sucht die verschollene Station ihres Vaters.",
      "A scientist searches for her father's lost research station."},
     0x12, 12, 100, 130, Credits::Film},
    {Genre::Sport, {"Fußball live", "Football live"},
     {"Das Spitzenspiel des Spieltags.", "The top match of the round."},
     {"Mit Vorberichten, Analysen und Stimmen zum Spiel.",
      "With previews, analysis and reactions."},
     0x43, 0, 105, 120, Credits::Commentary},
    {Genre::Sport, {"Sportschau", "Sports Round-up"},
     {"Ergebnisse und Höhepunkte.", "Results and highlights."},
     {"Alle Tore, alle Tabellen.", "Every goal, every table."},
     0x41, 0, 30, 60, Credits::Presenter},
    {Genre::Sport, {"Radsport: Rundfahrt", "Cycling: Tour Stage"},
     {"Die Bergetappe live.", "The mountain stage live."},
     {"Über drei Pässe ins Ziel.", "Over three passes to the finish."},
     0x4B, 0, 120, 180, Credits::Commentary},
    {Genre::Kids, {"Die kleine Eule", "The Little Owl"},
     {"Zeichentrick für die Kleinsten.", "Cartoon for the little ones."},
     {"Die kleine Eule lernt fliegen.", "The little owl learns to fly."},
     0x51, 0, 10, 25, Credits::None},
    {Genre::Kids, {"Frag doch mal!", "Just Ask!"},
     {"Wissen für Kinder.", "Science for kids."},
     {"Warum ist der Himmel blau?", "Why is the sky blue?"},
     0x55, 0, 25, 30, Credits::Presenter},
    {Genre::Documentary, {"Wildes Europa", "Wild Europe"},
     {"Naturdokumentation.", "Nature documentary."},
     {"Von den Alpen bis zur Ostsee: Tiere in ihrer Heimat.",
      "From the Alps to the Baltic: animals at home."},
     0x91, 0, 45, 60, Credits::None},
    {Genre::Documentary, {"Das Geheimnis der Pyramiden", "Secrets of the Pyramids"},
     {"Geschichte und Archäologie.", "History and archaeology."},
     {"Neue Funde werfen alte Fragen auf.", "New finds raise old questions."},
     0x23, 6, 45, 60, Credits::None},
    {Genre::Series, {"Hafenklinik", "Harbour Hospital"},
     {"Serie: Notaufnahme am Hafen.", "Series: the emergency room by the docks."},
     {"Ein Unfall auf der Fähre bringt das Team an seine Grenzen.",
      "An accident on the ferry pushes the team to its limits."},
     0x15, 12, 45, 50, Credits::Film},
    {Genre::Show, {"Das große Quiz", "The Big Quiz"},
     {"Kandidaten raten um den Hauptgewinn.", "Contestants play for the jackpot."},
     {"Wer weiß mehr: das Publikum oder die Profis?",
      "Who knows more: the audience or the experts?"},
     0x31, 0, 45, 75, Credits::Presenter},
    {Genre::Music, {"Klassik am Abend", "Evening Classics"},
     {"Sinfonien und Kammermusik.", "Symphonies and chamber music."},
     {"Mit Werken von Brahms, Dvořák und Schumann.",
      "With works by Brahms, Dvořák and Schumann."},
     0x64, 0, 50, 50, Credits::Presenter},
    {Genre::Music, {"Die Hitparade", "The Hit Parade"},
     {"Die Lieder der Woche.", "The songs of the week."},
     {"Neu eingestiegen und ganz oben.", "New entries and the top spot."},
     0x61, 0, 50, 50, Credits::Presenter},
    {Genre::Music, {"Jazz-Nacht", "Jazz Night"},
     {"Live-Aufnahmen aus den Clubs.", "Live recordings from the clubs."},
     {"Von Swing bis Bebop.", "From swing to bebop."},
     0x63, 0, 50, 50, Credits::Presenter},
    {Genre::Shopping, {"Einkaufsbummel", "Shopping Hour"},
     {"Angebote rund um Haus und Garten.", "Offers for house and garden."},
     {"Bestellen Sie bequem von zu Hause.", "Order from the comfort of your home."},
     0xA6, 0, 60, 60, Credits::Presenter},
};
// clang-format on

const char* const kPeople[] = {"Anna Berger",    "Jonas Weber",  "Mira Kowalski",
                               "Lukas Brandt",   "Sofia Marino", "Emil Novák",
                               "Clara Hoffmann", "David Kaya",   "Elena Papadaki",
                               "Paul Lindqvist", "Nora Schmitt", "Felix Wagner"};

// How often a profile draws each genre, in the order of Genre.
using Weights = uint8_t[9];
const Weights& weightsOf(Profile profile) {
    static const Weights table[] = {
            /* General   */ {3, 3, 1, 1, 2, 3, 2, 0, 0},
            /* News      */ {8, 0, 1, 0, 3, 0, 1, 0, 0},
            /* Film      */ {0, 8, 0, 0, 1, 2, 0, 0, 0},
            /* Sport     */ {1, 0, 8, 0, 1, 0, 0, 0, 0},
            /* Kids      */ {0, 1, 0, 8, 1, 0, 0, 0, 0},
            /* Knowledge */ {1, 0, 0, 1, 8, 0, 1, 0, 0},
            /* Radio     */ {0, 0, 0, 0, 0, 0, 0, 1, 0},
            /* Shopping  */ {1, 0, 0, 0, 0, 0, 0, 0, 8},
    };
    return table[static_cast<int>(profile)];
}

const Programme& draw(Prng& prng, Profile profile) {
    const Weights& w = weightsOf(profile);
    uint32_t total = 0;
    for (const Programme& p : kCatalogue) total += w[static_cast<int>(p.genre)];
    uint32_t pick = prng.below(total);
    for (const Programme& p : kCatalogue) {
        const uint32_t weight = w[static_cast<int>(p.genre)];
        if (pick < weight) return p;
        pick -= weight;
    }
    return kCatalogue[0];
}

// News titles in the languages whose services otherwise carry English texts.
const char* localNews(Language language) {
    switch (language) {
        case Language::Turkish:
            return "Haberler";
        case Language::Greek:
            return "Ειδήσεις";
        case Language::Czech:
            return "Zprávy";
        case Language::Italian:
            return "Telegiornale";
        case Language::Polish:
            return "Wiadomości";
        default:
            return nullptr;
    }
}

Event makeEvent(const Programme& p, Prng& prng, Language language, Charset table) {
    const int l = language == Language::German ? 0 : 1;
    Event e;
    e.language = l == 0 ? "deu" : "eng";
    const char* news = &p == &kCatalogue[0] ? localNews(language) : nullptr;
    e.name = encodeText(table, news ? news : p.name[l]);
    e.text = encodeText(table, p.text[l]);
    std::string more = p.more[l];
    const char* a = kPeople[prng.below(std::size(kPeople))];
    const char* b = kPeople[prng.below(std::size(kPeople))];
    auto item = [&](const char* de, const char* en, std::string value) {
        e.items.push_back({encodeText(table, l == 0 ? de : en), encodeText(table, value)});
    };
    switch (p.credits) {
        case Credits::Film:
            item("Regie", "Director", a);
            item("Darsteller", "Cast", std::string(b) + ", " + kPeople[prng.below(12)]);
            item("Jahr", "Year", std::to_string(1990 + prng.below(35)));
            if (p.genre == Genre::Film) {
                more += l == 0 ? " Ein Film von " : " A film by ";
                more += a;
                more += '.';
            }
            break;
        case Credits::Presenter:
            item("Moderation", "Presenter", a);
            break;
        case Credits::Commentary:
            item("Kommentar", "Commentary", a);
            item("Ort", "Venue", l == 0 ? "Olympiastadion" : "Olympic Stadium");
            break;
        case Credits::None:
            break;
    }
    e.extendedText = encodeText(table, more);
    e.content = p.content;
    e.parentalRating = p.minimumAge ? static_cast<uint8_t>(p.minimumAge - 3) : 0;
    return e;
}

}  // namespace

std::vector<Event> weekSchedule(uint16_t serviceId, Profile profile, Language language,
                                Charset table, int64_t firstDay) {
    std::vector<Event> events;
    uint16_t id = 1;
    for (int d = 0; d < kScheduleDays; ++d) {
        const int64_t dayStart = firstDay + d * kDaySeconds;
        const int64_t dayEnd = dayStart + kDaySeconds;
        // A day's programmes depend on the service and the day only.
        Prng prng((uint64_t(serviceId) << 32) ^ uint64_t(dayStart / kDaySeconds));
        int64_t t = dayStart;
        const Programme* previous = nullptr;
        while (t < dayEnd) {
            // Radio: the news on the hour, then music until the next hour.
            const bool hourNews = profile == Profile::Radio && t % 3600 == 0;
            const Programme* p = hourNews ? &kCatalogue[0] : &draw(prng, profile);
            // The same programme twice in a row only where the profile offers nothing else.
            for (int tries = 0; !hourNews && p == previous && tries < 4; ++tries)
                p = &draw(prng, profile);
            previous = p;
            Event e = makeEvent(*p, prng, language, table);
            uint32_t minutes = p->minMinutes;
            if (hourNews) {
                minutes = 10;
            } else if (profile == Profile::Radio) {
                minutes = 50;
            } else if (p->maxMinutes > p->minMinutes) {
                minutes += 5 * prng.below((p->maxMinutes - p->minMinutes) / 5 + 1);
            }
            e.id = id++;
            e.start = t;
            e.duration = static_cast<uint32_t>(std::min<int64_t>(minutes * 60, dayEnd - t));
            t += e.duration;
            events.push_back(std::move(e));
        }
    }
    return events;
}

}  // namespace dvbmodel::builtin
