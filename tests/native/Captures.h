// The real captures beside the project, their truth files (made by libdvbpsi, iconv, libzvbi,
// ffmpeg and TSDuck, not by this library), ffprobe's reading of a written transport stream and a
// scratch folder, for the codec, writer and receiver tests.
#pragma once
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <nlohmann/json.hpp>
#include <set>
#include <string>
#include <vector>

#include "broadcast/DvbSubtitle.h"
#include "broadcast/DvbText.h"
#include "broadcast/Ts.h"

namespace testdata {

namespace fs = std::filesystem;
using Packets = std::vector<std::vector<uint8_t>>;

inline const std::string kDir = DVB_TESTDATA_DIR;

#define NEED_CAPTURE(name)                        \
    if (!fs::exists(testdata::kDir + "/" + name)) \
    GTEST_SKIP() << "capture " << name << " absent: " << testdata::kDir << " is not there"

inline nlohmann::json truth(const std::string& capture) {
    std::ifstream in(kDir + "/truth/" + capture + ".json");
    return nlohmann::json::parse(in);
}

// The PES packets of one PID of a capture, the last one as far as the capture holds it.
inline Packets pes(const std::string& capture, uint16_t pid) {
    std::ifstream in(kDir + "/" + capture, std::ios::binary);
    std::vector<uint8_t> ts{std::istreambuf_iterator<char>(in), {}};
    Packets out;
    dvbmodel::PesAssembler a(pid);
    a.feed(ts.data(), ts.size(), out);
    a.flush(out);
    return out;
}

// Bytes written in hex, spaces between them for the eye.
inline std::string unhex(const std::string& h) {
    std::string b;
    for (size_t i = 0; i + 1 < h.size(); i += h[i] == ' ' ? 1 : 2)
        if (h[i] != ' ') b += char(std::stoi(h.substr(i, 2), nullptr, 16));
    return b;
}

#define NEED_FFPROBE()                                                 \
    if (std::system("ffprobe -version >/dev/null 2>&1") != 0)          \
    GTEST_SKIP() << "ffprobe is not on PATH (Debian package ffmpeg): " \
                    "no independent reader of transport streams"

inline std::string run(const std::string& command) {
    std::string out;
    FILE* p = popen(command.c_str(), "r");
    char buf[4096];
    for (size_t n; p != nullptr && (n = fread(buf, 1, sizeof buf, p)) > 0;) out.append(buf, n);
    if (p != nullptr) pclose(p);
    return out;
}

// One line per program (number, PMT and PCR PIDs, name) and per stream (PID, stream type, what
// its descriptors make of a private stream, languages), as ffprobe reads the file.
inline std::set<std::string> probe(const std::string& file) {
    auto j = nlohmann::json::parse(run("ffprobe -v error -show_programs -of json '" + file + "'"));
    std::set<std::string> out;
    for (const auto& p : j["programs"]) {
        if (p["program_num"] == 0) continue;  // services that only the SDT names
        out.insert("program " + p["program_num"].dump() + " pmt " + p["pmt_pid"].dump() + " pcr " +
                   p["pcr_pid"].dump() + " " + p.value("/tags/service_name"_json_pointer, ""));
        for (const auto& s : p["streams"]) {
            std::string tag = s.value("codec_tag", ""), codec = s.value("codec_name", "");
            out.insert(s.value("id", "") + " " + tag + (tag == "0x0006" ? " " + codec : "") + " " +
                       s.value("/tags/language"_json_pointer, ""));
        }
    }
    return out;
}

// The same lines from the model, of its transport `tp` or of one service of it.
inline std::set<std::string> expected(const dvbmodel::Transport& tp,
                                      const dvbmodel::Service* only = nullptr) {
    std::set<std::string> out;
    char line[160];
    for (const auto& s : tp.services) {
        if (only != nullptr && &s != only) continue;
        snprintf(line, sizeof line, "program %u pmt %u pcr %u %s", s.id, s.pmtPid, s.pcrPid,
                 dvbmodel::decodeText(s.name).c_str());
        out.insert(line);
        for (const auto& c : s.components) {
            const char* codec = c.kind == dvbmodel::Kind::Subtitle   ? " dvb_subtitle"
                                : c.kind == dvbmodel::Kind::Teletext ? " dvb_teletext"
                                : c.ac3                              ? " ac3"
                                : c.eac3                             ? " eac3"
                                                                     : "";
            std::string languages = c.language;
            for (size_t i = 1; c.kind == dvbmodel::Kind::Teletext && i < c.pages.size(); ++i)
                languages += "," + c.language;
            snprintf(line, sizeof line, "0x%x 0x%04x%s %s", c.pid, c.streamType,
                     c.streamType == 0x06 ? codec : "", languages.c_str());
            out.insert(line);
        }
    }
    return out;
}

// A folder of its own for the test, removed with everything in it at the end.
struct TempDir {
    fs::path path = fs::temp_directory_path() /
                    (::testing::UnitTest::GetInstance()->current_test_info()->name() +
                     std::to_string(getpid()));
    TempDir() { fs::create_directories(path); }
    ~TempDir() { fs::remove_all(path); }
    std::string operator/(const std::string& name) const { return (path / name).string(); }
    // A file of the folder holding `bytes` (a string or a byte vector); its path.
    template <typename Bytes>
    std::string write(const std::string& name, const Bytes& bytes) const {
        std::ofstream(path / name, std::ios::binary)
                .write(reinterpret_cast<const char*>(bytes.data()), bytes.size());
        return *this / name;
    }
};

}  // namespace testdata
