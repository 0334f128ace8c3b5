// The receiver's one clock. Real time by default; deterministic when asked: a fixed start, a
// speed factor (the emulated time runs that many times faster than real time; 0 stops it, and
// only advance() moves it) and a seed for every value the receiver varies, so that fixed inputs
// give fixed outputs.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <mutex>

namespace dvbrx {

class Clock {
public:
    struct Settings {
        bool deterministic = false;
        int64_t startMillis = 0;  // UTC, milliseconds since 1970
        double speed = 1.0;
        uint64_t seed = 0;
    };

    // DVB_CLOCK_START (UTC seconds, or ISO 8601 "2024-03-01T20:00:00Z"), DVB_CLOCK_SPEED (factor)
    // and DVB_SEED; with none of them set, real time.
    static Settings fromEnvironment();
    // Parses UTC seconds or an ISO 8601 date and time (UTC); false for anything else.
    static bool parseStart(const char* text, int64_t* millis);

    explicit Clock(const Settings& settings);

    int64_t nowMillis() const;
    int64_t nowSeconds() const;
    uint64_t seed() const { return mSettings.seed; }
    double speed() const { return mSettings.speed; }
    bool deterministic() const { return mSettings.deterministic; }

    // Moves a deterministic clock forward; the real clock ignores it.
    void advance(int64_t millis);
    // Called after every advance(), so that a thread waiting for the emulated time wakes.
    void onAdvance(std::function<void()> callback);

    // Real time until the emulated time reaches `millis`; max() when it never will by itself.
    std::chrono::steady_clock::duration realDelay(int64_t millis) const;

private:
    Settings mSettings;
    std::chrono::steady_clock::time_point mOrigin;
    std::atomic<int64_t> mOffset{0};
    std::mutex mLock;
    std::function<void()> mOnAdvance;
};

// A deterministic value in [0, range) for a seed and a few keys: the receiver's only source of
// variation (signal jitter, PTS origins).
uint32_t mix(uint64_t seed, uint64_t a, uint64_t b = 0, uint32_t range = 0xFFFFFFFFu);

}  // namespace dvbrx
