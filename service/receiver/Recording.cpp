// Recordings and transport-stream dumps written as the emulated time passes; see Recording.h.
#include "Recording.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

namespace dvbrx {
namespace {

// The stream is made and written in pieces of this much emulated time, so that a clock moved
// forward by hours costs a bounded buffer.
constexpr int64_t kPieceMillis = 500;

bool writeAll(int fd, const uint8_t* p, size_t n) {
    while (n > 0) {
        ssize_t w = ::write(fd, p, n);
        if (w < 0 && errno == EINTR) continue;
        if (w <= 0) return false;
        p += w;
        n -= static_cast<size_t>(w);
    }
    return true;
}

}  // namespace

std::shared_ptr<Recording> Recording::create(const std::string& path,
                                             const dvbmodel::Broadcast& broadcast,
                                             const dvbmodel::Service* only, int64_t startMs) {
    int fd = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC,
                    S_IRUSR | S_IWUSR | S_IRGRP | S_IROTH);
    if (fd < 0) return nullptr;
    return std::shared_ptr<Recording>(new Recording(path, fd, broadcast, only, startMs));
}

Recording::Recording(std::string path, int fd, const dvbmodel::Broadcast& broadcast,
                     const dvbmodel::Service* only, int64_t startMs)
    : mPath(std::move(path)),
      mBroadcast(broadcast),
      mOnly(only),
      mStart(startMs),
      mFd(fd),
      mWritten(startMs) {}

Recording::~Recording() {
    if (mFd >= 0) ::close(mFd);
}

void Recording::plan(int64_t untilMs, const dvbmodel::Network* network,
                     const dvbmodel::Transport* transport) {
    std::lock_guard<std::mutex> lock(mPlanLock);
    mPlans.push_back({untilMs, network, transport});
}

void Recording::catchUp() {
    std::lock_guard<std::mutex> lock(mLock);
    std::vector<Plan> plans;
    {
        // Taken under mLock: a second writer waits, then writes the plans made after these.
        std::lock_guard<std::mutex> planLock(mPlanLock);
        plans.swap(mPlans);
    }
    for (const Plan& p : plans) write(p);
}

void Recording::write(const Plan& plan) {
    dvbmodel::TsWriterOptions options;
    options.only = mOnly;
    for (int64_t at = mWritten.load(); at < plan.until && mFd >= 0 && !mFailed;) {
        int64_t span = std::min(kPieceMillis, plan.until - at);
        if (plan.transport != nullptr && plan.network != nullptr) {
            mBuffer.clear();
            dvbmodel::writeTransport(mBroadcast, *plan.network, *plan.transport, at, span, mBuffer,
                                     mState, options);
            if (!writeAll(mFd, mBuffer.data(), mBuffer.size())) {
                mFailed = true;
                break;
            }
            mBytes += static_cast<int64_t>(mBuffer.size());
        }
        at += span;
        mWritten = at;
    }
}

void Recording::finish() {
    catchUp();
    std::lock_guard<std::mutex> lock(mLock);
    if (mFd >= 0) ::close(mFd);
    mFd = -1;
}

void Recording::discard() {
    std::lock_guard<std::mutex> lock(mLock);
    if (mFd >= 0) ::close(mFd);
    mFd = -1;
    ::unlink(mPath.c_str());
}

}  // namespace dvbrx
