#include "broadcast/BroadcastSource.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <set>
#include <sstream>
#include <vector>

#include "broadcast/Builtin.h"

namespace dvbmodel {

namespace {

namespace fs = std::filesystem;

bool number(const std::string& word, uint64_t max, uint32_t& out) {
    if (word.empty() || word.size() > 10) return false;
    for (char c : word) {
        if (c < '0' || c > '9') return false;
    }
    const uint64_t v = std::strtoull(word.c_str(), nullptr, 10);
    if (v == 0 || v > max) return false;
    out = uint32_t(v);
    return true;
}

// "19.2E" / "30W" to tenths of a degree, east positive.
bool orbit(const std::string& word, int16_t& out) {
    if (word.size() < 2) return false;
    const char side = char(toupper(word.back()));
    if (side != 'E' && side != 'W') return false;
    const std::string deg = word.substr(0, word.size() - 1);
    const size_t dot = deg.find('.');
    uint32_t whole = 0, tenth = 0;
    const std::string w = deg.substr(0, dot),
                      t = dot == std::string::npos ? "" : deg.substr(dot + 1);
    if (!(w == "0" || number(w, 180, whole)) || t.size() > 1) return false;
    if (!t.empty() && !(t == "0" || number(t, 9, tenth))) return false;
    const int v = int(whole) * 10 + int(tenth);
    if (v > 1800) return false;
    out = int16_t(side == 'E' ? v : -v);
    return true;
}

struct Capture {
    std::string path;
    BroadcastLine line;
    TsCapture ts;
};

constexpr uint32_t kUhf21 = 474000, kUhfStep = 8000, kCableFirst = 306000, kCableStep = 8000,
                   kSatFirst = 10714000, kSatStep = 20000;

Tuning ruleTuning(Delivery delivery, uint32_t frequency) {
    Tuning t;
    t.delivery = delivery;
    t.frequencyKHz = frequency;
    if (delivery == Delivery::Terrestrial) {
        t.bandwidthKHz = 8000;
    } else if (delivery == Delivery::Cable) {
        t.symbolRate = 6900000, t.modulation = Modulation::Qam256;
    } else {
        t.symbolRate = 27500000, t.modulation = Modulation::Qpsk, t.orbitalPosition = 192;
    }
    return t;
}

// Folds one capture into the broadcast: its networks and transports, the actual transport's
// whole, others' services and events where the broadcast does not have them yet.
void merge(Broadcast& b, std::vector<std::vector<bool>>& tuned,
           std::vector<std::vector<bool>>& actual, Capture& c) {
    TsCapture& ts = c.ts;
    for (size_t ni = 0; ni < ts.networks.size(); ++ni) {
        Network& from = ts.networks[ni];
        auto net = std::find_if(b.networks.begin(), b.networks.end(),
                                [&](const Network& n) { return n.id == from.id; });
        if (net == b.networks.end()) {
            // The network without its transports, which are merged one by one below.
            net = b.networks.insert(b.networks.end(),
                                    Network{from.id, from.name, from.delivery, {}});
            tuned.emplace_back(), actual.emplace_back();
        } else if (net->name.empty()) {
            net->name = from.name;
        }
        const size_t nIndex = size_t(net - b.networks.begin());
        for (size_t ti = 0; ti < from.transports.size(); ++ti) {
            Transport& t = from.transports[ti];
            const bool isActual =
                    ts.hasActual && ni == ts.actualNetwork && ti == ts.actualTransport;
            bool isTuned = ts.tuned[ni][ti];
            if (isActual && c.line.tuned) t.tuning = c.line.tuning, isTuned = true;
            // Find this transport anywhere in the broadcast.
            Transport* have = nullptr;
            size_t hn = 0, ht = 0;
            for (size_t i = 0; i < b.networks.size() && have == nullptr; ++i) {
                for (size_t k = 0; k < b.networks[i].transports.size(); ++k) {
                    Transport& x = b.networks[i].transports[k];
                    if (x.tsid == t.tsid && x.onid == t.onid) have = &x, hn = i, ht = k;
                }
            }
            if (have == nullptr) {
                b.networks[nIndex].transports.push_back(std::move(t));
                tuned[nIndex].push_back(isTuned);
                actual[nIndex].push_back(isActual);
                continue;
            }
            if (isActual && !actual[hn][ht]) {
                const Tuning keep = have->tuning;
                const bool keepTuned = tuned[hn][ht];
                // Events that another capture's EIT other gave, where this one has none.
                for (Service& s : t.services) {
                    for (Service& was : have->services) {
                        if (was.id == s.id && s.events.empty()) s.events = std::move(was.events);
                    }
                }
                *have = std::move(t);
                actual[hn][ht] = true;
                if (!isTuned && keepTuned) have->tuning = keep;
                tuned[hn][ht] = isTuned || keepTuned;
                continue;
            }
            if (!tuned[hn][ht] && isTuned) have->tuning = t.tuning, tuned[hn][ht] = true;
            if (actual[hn][ht]) continue;
            for (Service& s : t.services) {
                auto same = std::find_if(have->services.begin(), have->services.end(),
                                         [&](const Service& x) { return x.id == s.id; });
                if (same == have->services.end()) {
                    have->services.push_back(std::move(s));
                } else if (same->events.empty()) {
                    same->events = std::move(s.events);
                }
            }
        }
    }
}

// The frequency rule (see the header) for every transport still without a tuning.
void assignTunings(Broadcast& b, const std::vector<std::vector<bool>>& tuned) {
    std::set<std::pair<Delivery, uint32_t>> used;
    for (size_t i = 0; i < b.networks.size(); ++i) {
        for (size_t k = 0; k < b.networks[i].transports.size(); ++k) {
            const Tuning& t = b.networks[i].transports[k].tuning;
            if (tuned[i][k]) used.insert({t.delivery, t.frequencyKHz});
        }
    }
    for (size_t i = 0; i < b.networks.size(); ++i) {
        for (size_t k = 0; k < b.networks[i].transports.size(); ++k) {
            if (tuned[i][k]) continue;
            Transport& tr = b.networks[i].transports[k];
            const Delivery d = tr.tuning.delivery;
            const uint32_t first = d == Delivery::Terrestrial ? kUhf21
                                   : d == Delivery::Cable     ? kCableFirst
                                                              : kSatFirst;
            const uint32_t step = d == Delivery::Terrestrial ? kUhfStep
                                  : d == Delivery::Cable     ? kCableStep
                                                             : kSatStep;
            uint32_t f = first;
            while (used.count({d, f}) != 0) f += step;
            used.insert({d, f});
            tr.tuning = ruleTuning(d, f);
        }
    }
}

bool readBroadcastFile(const std::string& path, std::vector<Capture>& captures,
                       std::string& error) {
    std::ifstream in(path);
    if (!in) {
        error = path + ": cannot read: " + strerror(errno);
        return false;
    }
    const fs::path dir = fs::path(path).parent_path();
    int lineNo = 0;
    for (std::string text; std::getline(in, text);) {
        ++lineNo;
        Capture c;
        std::string why;
        if (!parseBroadcastLine(text, c.line, why)) {
            if (why.empty()) continue;
            error = path + ":" + std::to_string(lineNo) + ": " + why;
            return false;
        }
        const fs::path p(c.line.path);
        c.path = p.is_absolute() ? p.string() : (dir / p).string();
        captures.push_back(std::move(c));
    }
    if (captures.empty()) {
        error = path + ": lists no capture";
        return false;
    }
    return true;
}

bool isTransportStreamName(const std::string& path) {
    std::string ext = fs::path(path).extension().string();
    std::transform(ext.begin(), ext.end(), ext.begin(), ::tolower);
    return ext == ".ts" || ext == ".mts" || ext == ".trp";
}

}  // namespace

bool parseBroadcastLine(const std::string& line, BroadcastLine& out, std::string& error) {
    out = BroadcastLine{};
    error.clear();
    std::istringstream words(line.substr(0, line.find('#')));
    std::vector<std::string> w;
    for (std::string x; words >> x;) w.push_back(x);
    if (w.empty()) return false;
    out.path = w[0];
    if (w.size() == 1) return true;
    const std::string& kind = w[1];
    Tuning& t = out.tuning;
    auto fail = [&](const std::string& why) { return error = why, false; };
    if (w.size() < 3) return fail("'" + kind + "' needs a frequency in kHz");
    if (kind == "terrestrial") {
        t = ruleTuning(Delivery::Terrestrial, 0);
        if (!number(w[2], 1000000, t.frequencyKHz)) return fail("bad frequency '" + w[2] + "'");
        if (w.size() > 3 && (!number(w[3], 10000, t.bandwidthKHz) || t.bandwidthKHz % 1000 != 0))
            return fail("bad bandwidth '" + w[3] + "' (kHz: 6000, 7000, 8000)");
        if (w.size() > 4) return fail("too many fields for terrestrial");
    } else if (kind == "cable") {
        t = ruleTuning(Delivery::Cable, 0);
        if (!number(w[2], 1100000, t.frequencyKHz)) return fail("bad frequency '" + w[2] + "'");
        if (w.size() > 3 && !number(w[3], 100000000, t.symbolRate))
            return fail("bad symbol rate '" + w[3] + "'");
        if (w.size() > 4) {
            static const char* kQam[] = {"qam16", "qam32", "qam64", "qam128", "qam256"};
            auto q = std::find(std::begin(kQam), std::end(kQam), w[4]);
            if (q == std::end(kQam)) return fail("bad modulation '" + w[4] + "' (qam16..qam256)");
            t.modulation = Modulation(uint8_t(Modulation::Qam16) + (q - std::begin(kQam)));
        }
        if (w.size() > 5) return fail("too many fields for cable");
    } else if (kind == "satellite") {
        t = ruleTuning(Delivery::Satellite, 0);
        if (!number(w[2], 100000000, t.frequencyKHz)) return fail("bad frequency '" + w[2] + "'");
        if (w.size() < 5) return fail("satellite needs a symbol rate and a polarization");
        if (!number(w[3], 100000000, t.symbolRate)) return fail("bad symbol rate '" + w[3] + "'");
        static const std::string kPol = "hvlr";
        if (w[4].size() != 1 || kPol.find(char(tolower(w[4][0]))) == std::string::npos)
            return fail("bad polarization '" + w[4] + "' (h, v, l or r)");
        t.polarization = Polarization(kPol.find(char(tolower(w[4][0]))));
        if (w.size() > 5 && !orbit(w[5], t.orbitalPosition))
            return fail("bad orbital position '" + w[5] + "' (like 19.2E)");
        if (w.size() > 6) return fail("too many fields for satellite");
    } else {
        return fail("unknown delivery '" + kind + "' (terrestrial, cable or satellite)");
    }
    out.tuned = true;
    return true;
}

bool loadBroadcast(const std::string& setting, int64_t start, Broadcast& out, std::string& error,
                   TsReadStats* stats) {
    out = Broadcast{};
    if (setting.empty() || setting == "builtin") {
        out = builtinBroadcast(start);
        return true;
    }
    std::error_code ec;
    const fs::file_status status = fs::status(setting, ec);
    if (ec || !fs::exists(status)) {
        error = setting + ": no such file or folder";
        return false;
    }
    std::vector<Capture> captures;
    if (fs::is_directory(status)) {
        for (const auto& entry : fs::directory_iterator(setting, ec)) {
            if (entry.is_regular_file() && isTransportStreamName(entry.path().string()))
                captures.push_back({entry.path().string(), {}, {}});
        }
        std::sort(captures.begin(), captures.end(),
                  [](const Capture& a, const Capture& b) { return a.path < b.path; });
        if (captures.empty()) {
            error = setting + ": folder holds no .ts capture";
            return false;
        }
    } else {
        // A broadcast file is text; a capture starts with a sync byte or has a capture's name.
        std::ifstream probe(setting, std::ios::binary);
        const int first = probe.get();
        if (isTransportStreamName(setting) || first == 0x47) {
            captures.push_back({setting, {}, {}});
        } else if (!readBroadcastFile(setting, captures, error)) {
            return false;
        }
    }
    TsReadStats local;
    Broadcast b;
    std::vector<std::vector<bool>> tuned, actual;
    int64_t first = 0;
    for (Capture& c : captures) {
        if (!readTransportStreamFile(c.path, c.ts, error, stats != nullptr ? *stats : local))
            return false;
        if (first == 0 && c.ts.firstUtc != 0) first = c.ts.firstUtc;
        b.loopMillis = std::max(b.loopMillis, c.ts.durationMs);
        merge(b, tuned, actual, c);
    }
    assignTunings(b, tuned);
    if (first == 0) {
        struct stat st {};
        if (stat(captures[0].path.c_str(), &st) == 0) first = st.st_mtime;
    }
    b.start = first != 0 ? first : start;
    out = std::move(b);
    return true;
}

}  // namespace dvbmodel
