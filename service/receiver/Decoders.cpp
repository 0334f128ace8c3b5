// The subtitle and teletext modules: decoders started on a component of a playing stream. They
// keep their state here; the display sets and pages themselves come from the model.
#include <cstring>

#include "Modules.h"

namespace dvbrx {
namespace {

// The playing stream whose service carries a component of `kind` on `pid`: its handle, or an
// error result.
int32_t streamWith(const Receiver& rx, dvbmodel::Kind kind, uint16_t pid, int32_t only) {
    int32_t result = only > 0 && rx.streams.count(only) == 0 ? kErrBadHandle : kErrNoComponent;
    for (const auto& [handle, s] : rx.streams) {
        if (only > 0 && handle != only) continue;
        if (!s.started) {
            if (only > 0) result = kErrNotStarted;
            continue;
        }
        for (const auto& c : s.service->components) {
            if (c.kind == kind && c.pid == pid) return handle;
        }
    }
    return result;
}

// Teletext page numbers run from 100 to 899; navigation wraps round inside them.
int32_t wrapPage(int32_t page) {
    return (page - 100 + 800) % 800 + 100;
}

}  // namespace

int32_t ReceiverSubttl::Start(const SUBTTL_Settings* settings) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (settings == nullptr) return kErrBadParameter;
    // hstrm names the stream whose subtitle component the decoder takes.
    int32_t stream = streamWith(*mRx, dvbmodel::Kind::Subtitle, settings->pid,
                                static_cast<int32_t>(settings->hstrm));
    if (stream < 0) return stream;
    if (mRx->subtitles.size() >= kMaxHandles) return kErrTooMany;
    int32_t h = mRx->newHandle();
    mRx->subtitles[h] = {stream, settings->pid};
    return h;
}

int32_t ReceiverSubttl::Stop(int32_t handle) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    return mRx->subtitles.erase(handle) != 0 ? kOk : kErrBadHandle;
}

int32_t ReceiverSubttl::GetData(int32_t handle, void* data) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (data == nullptr) return kErrBadParameter;
    if (mRx->subtitles.count(handle) == 0) return kErrBadHandle;
    // No display set has been decoded: the buffer keeps what it holds.
    return kErrNoData;
}

int32_t ReceiverTeltxt::Start(const TELTXT_Settings* settings) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (settings == nullptr) return kErrBadParameter;
    int32_t stream = streamWith(*mRx, dvbmodel::Kind::Teletext, settings->pid, 0);
    if (stream < 0) return stream;
    if (mRx->teletexts.size() >= kMaxHandles) return kErrTooMany;
    int32_t h = mRx->newHandle();
    mRx->teletexts[h] = {stream, settings->pid};
    return h;
}

int32_t ReceiverTeltxt::Stop(int32_t handle) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    return mRx->teletexts.erase(handle) != 0 ? kOk : kErrBadHandle;
}

int32_t ReceiverTeltxt::SetData(int32_t handle, int32_t page, int32_t subpage, int32_t* prev100,
                                int32_t* prev10, int32_t* next10, int32_t* next100) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (prev100 == nullptr || prev10 == nullptr || next10 == nullptr || next100 == nullptr)
        return kErrBadParameter;
    auto it = mRx->teletexts.find(handle);
    if (it == mRx->teletexts.end()) return kErrBadHandle;
    // A page number 100..899 and a subpage 0..79 (0: the subpages rotate).
    if (page < 100 || page > 899 || subpage < 0 || subpage > 79) return kErrBadParameter;
    it->second.page = page;
    it->second.subpage = subpage;
    *prev100 = wrapPage(page - 100);
    *prev10 = wrapPage(page - 10);
    *next10 = wrapPage(page + 10);
    *next100 = wrapPage(page + 100);
    return kOk;
}

int32_t ReceiverTeltxt::GetData(int32_t handle, int32_t offset, int32_t count, uint8_t* dst) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (mRx->teletexts.count(handle) == 0) return kErrBadHandle;
    if (dst == nullptr || offset < 0 || count < 0 || count > kTeltxtChunk) return kErrBadParameter;
    // No page has been received yet: a blank page.
    memset(dst, 0, static_cast<size_t>(count));
    return kOk;
}

}  // namespace dvbrx
