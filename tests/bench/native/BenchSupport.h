// What the native benchmarks share: a scratch folder, removing an SQLite database with its
// journal files, and a reporter that keeps each benchmark's median times for the ratios they
// print after the table.
#pragma once

#include <benchmark/benchmark.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

namespace bench {

// A folder of this run's own under the temporary directory, made on first use.
inline const std::string& folder() {
    static const std::string dir = [] {
        std::string tmpl = std::filesystem::temp_directory_path().string() + "/dvb-bench-XXXXXX";
        if (!mkdtemp(tmpl.data())) std::abort();
        return tmpl;
    }();
    return dir;
}

inline void removeDatabase(const std::string& path) {
    for (const char* suffix : {"", "-wal", "-shm"}) std::filesystem::remove(path + suffix);
}

// A run that is too long to repeat within one measurement: one iteration, in milliseconds,
// repeated `repetitions` times for the median.
inline benchmark::internal::Benchmark* once(benchmark::internal::Benchmark* b, int repetitions) {
    return b->Unit(benchmark::kMillisecond)->Iterations(1)->Repetitions(repetitions);
}

// Keeps the median times of each benchmark besides printing the usual table.
class Medians : public benchmark::ConsoleReporter {
public:
    Medians() : ConsoleReporter(isatty(STDOUT_FILENO) ? OO_ColorTabular : OO_Tabular) {}
    void ReportRuns(const std::vector<Run>& runs) override {
        for (const Run& r : runs) {
            if (r.run_type == Run::RT_Aggregate && r.aggregate_name == "median") {
                median[r.run_name.function_name] = {r.GetAdjustedRealTime(),
                                                    r.GetAdjustedCPUTime()};
            }
        }
        ConsoleReporter::ReportRuns(runs);
    }
    struct Times {
        double real, cpu;
    };
    std::map<std::string, Times> median;
};

}  // namespace bench
