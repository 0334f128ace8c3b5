// The real captures beside the project, their truth files (made by libdvbpsi, iconv, libzvbi,
// ffmpeg and TSDuck, not by this library) and a scratch folder, for the codec tests.
#pragma once
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "broadcast/DvbSubtitle.h"
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
