#include "Clock.h"

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>

namespace dvbrx {

bool Clock::parseStart(const char* text, int64_t* millis) {
    if (text == nullptr || *text == '\0') return false;
    char* end = nullptr;
    long long seconds = strtoll(text, &end, 10);
    if (*end == '\0') {
        *millis = seconds * 1000;
        return true;
    }
    struct tm tm {};
    int n = 0;
    if (sscanf(text, "%4d-%2d-%2dT%2d:%2d:%2d%n", &tm.tm_year, &tm.tm_mon, &tm.tm_mday, &tm.tm_hour,
               &tm.tm_min, &tm.tm_sec, &n) != 6)
        return false;
    const char* rest = text + n;
    if (strcmp(rest, "") != 0 && strcmp(rest, "Z") != 0) return false;
    if (tm.tm_mon < 1 || tm.tm_mon > 12 || tm.tm_mday < 1 || tm.tm_mday > 31 || tm.tm_hour > 23 ||
        tm.tm_min > 59 || tm.tm_sec > 60)
        return false;
    tm.tm_year -= 1900;
    tm.tm_mon -= 1;
    *millis = static_cast<int64_t>(timegm(&tm)) * 1000;
    return true;
}

Clock::Settings Clock::fromEnvironment() {
    Settings s;
    const char* start = getenv("DVB_CLOCK_START");
    const char* speed = getenv("DVB_CLOCK_SPEED");
    const char* seed = getenv("DVB_SEED");
    if (parseStart(start, &s.startMillis)) s.deterministic = true;
    if (speed != nullptr && *speed != '\0') {
        double v = strtod(speed, nullptr);
        // A factor that is no number, negative or absurd leaves the clock at real speed.
        if (std::isfinite(v) && v >= 0 && v <= 1e6) s.speed = v;
        s.deterministic = true;
    }
    if (seed != nullptr && *seed != '\0') {
        s.seed = strtoull(seed, nullptr, 10);
        s.deterministic = true;
    }
    if (s.deterministic && !parseStart(start, &s.startMillis)) {
        s.startMillis = std::chrono::duration_cast<std::chrono::milliseconds>(
                                std::chrono::system_clock::now().time_since_epoch())
                                .count();
    }
    return s;
}

Clock::Clock(const Settings& settings)
    : mSettings(settings), mOrigin(std::chrono::steady_clock::now()) {}

int64_t Clock::nowMillis() const {
    if (!mSettings.deterministic) {
        return std::chrono::duration_cast<std::chrono::milliseconds>(
                       std::chrono::system_clock::now().time_since_epoch())
                .count();
    }
    int64_t run = 0;
    if (mSettings.speed > 0) {
        auto real = std::chrono::duration_cast<std::chrono::microseconds>(
                std::chrono::steady_clock::now() - mOrigin);
        run = static_cast<int64_t>(static_cast<double>(real.count()) * mSettings.speed / 1000.0);
    }
    return mSettings.startMillis + mOffset.load() + run;
}

int64_t Clock::nowSeconds() const {
    int64_t ms = nowMillis();
    return ms >= 0 ? ms / 1000 : -((-ms + 999) / 1000);
}

void Clock::advance(int64_t millis) {
    if (!mSettings.deterministic || millis <= 0) return;
    mOffset.fetch_add(millis);
    std::function<void()> callback;
    {
        std::lock_guard<std::mutex> lock(mLock);
        callback = mOnAdvance;
    }
    if (callback) callback();
}

void Clock::onAdvance(std::function<void()> callback) {
    std::lock_guard<std::mutex> lock(mLock);
    mOnAdvance = std::move(callback);
}

std::chrono::steady_clock::duration Clock::realDelay(int64_t millis) const {
    int64_t ahead = millis - nowMillis();
    if (ahead <= 0) return std::chrono::steady_clock::duration::zero();
    double speed = mSettings.deterministic ? mSettings.speed : 1.0;
    if (speed <= 0) return std::chrono::steady_clock::duration::max();
    return std::chrono::duration_cast<std::chrono::steady_clock::duration>(
            std::chrono::microseconds(static_cast<int64_t>(ahead * 1000.0 / speed)));
}

uint32_t mix(uint64_t seed, uint64_t a, uint64_t b, uint32_t range) {
    // splitmix64 over the three words.
    uint64_t z = seed * 0x9E3779B97F4A7C15ull ^
                 (a + 0x632BE59BD9B4E019ull) * 0xBF58476D1CE4E5B9ull ^
                 (b + 0x8CB92BA72F3D8DD7ull) * 0x94D049BB133111EBull;
    z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9ull;
    z = (z ^ (z >> 27)) * 0x94D049BB133111EBull;
    z ^= z >> 31;
    return range == 0 ? 0 : static_cast<uint32_t>(z % range);
}

}  // namespace dvbrx
