// A transport stream written to a file as the emulated time passes: a recording of one service
// (its PIDs, a PAT of that one program and its PMT) or a dump of a whole transponder. The
// receiver decides under its lock what is on the air; the writing happens outside it, on the
// service thread as the clock moves and in the thread that stops the recording, which brings
// the file up to that moment and closes it.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "broadcast/Broadcast.h"
#include "broadcast/TsWriter.h"

namespace dvbrx {

class Recording {
public:
    // Creates (or empties) the file at `path`; null when it cannot be written. `only`: the
    // service a recording keeps, null for a dump of the whole transponder. It starts at UTC
    // `startMs`.
    static std::shared_ptr<Recording> create(const std::string& path,
                                             const dvbmodel::Broadcast& broadcast,
                                             const dvbmodel::Service* only, int64_t startMs);
    ~Recording();
    Recording(const Recording&) = delete;
    Recording& operator=(const Recording&) = delete;

    // The stream from where the last plan ended up to UTC `untilMs` comes from `transport` (of
    // `network`); a null transport lets the span pass without packets (no signal). Planned
    // under the receiver's lock, so plans keep the order of the receiver's changes, and
    // written by whichever thread calls catchUp() or finish() next.
    void plan(int64_t untilMs, const dvbmodel::Network* network,
              const dvbmodel::Transport* transport);
    // Writes what is planned, in order.
    void catchUp();
    // catchUp, then closes the file; later writes do nothing.
    void finish();

    // Closes the file and removes it.
    void discard();

    const std::string& path() const { return mPath; }
    int64_t startedAt() const { return mStart; }
    // Bytes in the file and the emulated milliseconds they cover.
    int64_t bytes() const { return mBytes.load(); }
    int64_t millis() const { return mWritten.load() - mStart; }
    // A write failed (a full disk): the file ends there.
    bool failed() const { return mFailed.load(); }

private:
    Recording(std::string path, int fd, const dvbmodel::Broadcast& broadcast,
              const dvbmodel::Service* only, int64_t startMs);

    struct Plan {
        int64_t until;
        const dvbmodel::Network* network;
        const dvbmodel::Transport* transport;
    };
    void write(const Plan& plan);  // under mLock

    const std::string mPath;
    const dvbmodel::Broadcast& mBroadcast;
    const dvbmodel::Service* const mOnly;
    const int64_t mStart;
    std::mutex mLock;      // one writer at a time; never taken under the receiver's lock
    std::mutex mPlanLock;  // held only to add or take plans, under the receiver's lock too
    std::vector<Plan> mPlans;
    int mFd;
    dvbmodel::TsWriterState mState;
    std::vector<uint8_t> mBuffer;
    std::atomic<int64_t> mWritten, mBytes{0};
    std::atomic<bool> mFailed{false};
};

}  // namespace dvbrx
