// The subtitle and teletext modules: decoders started on a component of a playing stream. They
// keep their state here; the display sets and pages come from the model, each the one sent last
// by the receiver's clock.
#include <time.h>

#include <algorithm>
#include <bitset>
#include <cstdio>
#include <cstring>

#include "Modules.h"
#include "SubtitleData.h"
#include "Teletext.h"

namespace dvbrx {
namespace {

constexpr int32_t kFirstPage = 0x100, kLastPage = 0x8FF, kLastSubcode = 0x3F7F;
using PageSet = std::bitset<kLastPage - kFirstPage + 1>;

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

// The stream that feeds decoder `d`, when it plays a service with the decoder's component
// (a stream started again may play another service).
int32_t feed(const Receiver& rx, const Decoder& d, dvbmodel::Kind kind, const Stream** stream) {
    auto it = rx.streams.find(d.stream);
    if (it == rx.streams.end()) return kErrBadHandle;
    if (!it->second.started) return kErrNotStarted;
    for (const auto& c : it->second.service->components) {
        if (c.kind != kind || c.pid != d.pid) continue;
        *stream = &it->second;
        return kOk;
    }
    return kErrNoComponent;
}

int64_t floorDiv(int64_t a, int64_t b) {
    return a / b - (a % b != 0 && a < 0 ? 1 : 0);
}

template <typename T>
struct Sent {
    const T* item = nullptr;
    Sending sending;
};

// The item of a timed list of stream `s`'s service (in time order, times in ms from the loop's
// start) that was sent last by `now` (UTC ms) among those `keep` accepts; the list repeats with
// the broadcast's loop, before its start as after.
template <typename T, typename Keep>
Sent<T> lastSent(const Receiver& rx, const Stream& s, const std::vector<T>& items, int64_t now,
                 Keep keep) {
    const dvbmodel::Broadcast& b = rx.broadcastOf(s);
    // A file plays from the very millisecond its stream started, which its broadcast's start
    // (whole seconds) does not tell.
    int64_t origin = s.playback ? s.startedAt : b.start * 1000;
    if (b.loopMillis > 0) origin += floorDiv(now - origin, b.loopMillis) * b.loopMillis;
    for (int loop = 0; loop < 2; ++loop) {
        for (size_t i = items.size(); i-- > 0;) {
            if (origin + items[i].time <= now && keep(items[i]))
                return {&items[i], {i, origin + items[i].time}};
        }
        // Before the first of this loop: the last of the loop before.
        if (b.loopMillis <= 0) break;
        origin -= b.loopMillis;
    }
    return {};
}

Sent<dvbmodel::DisplaySet> currentSet(const Receiver& rx, const Stream& s, const Decoder& d,
                                      int64_t now, int64_t* from) {
    if (!rx.decoding(s, now, from)) return {};
    return lastSent(rx, s, s.service->subtitles, now, [&](const dvbmodel::DisplaySet& set) {
        return set.pageId == d.compositionPageId;
    });
}

bool selected(const Decoder& d, const dvbmodel::TeletextPage& p) {
    return p.number == d.page && (d.subpage == 0 || p.subcode == d.subpage);
}

Sent<dvbmodel::TeletextPage> currentPage(const Receiver& rx, const Stream& s, const Decoder& d,
                                         int64_t now) {
    int64_t from;
    if (!rx.decoding(s, now, &from)) return {};
    return lastSent(rx, s, s.service->teletext, now,
                    [&](const dvbmodel::TeletextPage& p) { return selected(d, p); });
}

// The first page present in the nearest group of `size` pages (0x10 or 0x100) before
// (direction -1) or after (+1) the group of `page`, round the range 0x100..0x8FF; the first
// page of its own group when no other group has one, `page` when none is present at all.
int32_t neighbour(const PageSet& present, int32_t page, int32_t size, int direction) {
    const int32_t groups = static_cast<int32_t>(present.size()) / size;
    const int32_t group = (page - kFirstPage) / size;
    for (int32_t k = 1; k <= groups; ++k) {
        const int32_t g = ((group + direction * k) % groups + groups) % groups;
        for (int32_t i = g * size; i < (g + 1) * size; ++i) {
            if (present[i]) return kFirstPage + i;
        }
    }
    return page;
}

// C12..C14 of the control bits as the national option number (C12 the highest bit).
int nationalOption(uint16_t controlBits) {
    return (controlBits >> 12 & 1) << 2 | (controlBits >> 13 & 1) << 1 | (controlBits >> 14 & 1);
}

bool isDigit(uint8_t c) {
    return c >= '0' && c <= '9';
}

// The header row as the decoder shows it: the page number in columns 1..4 where the page
// address travels, and the receiver's clock over a clock "hh:mm:ss" that ends the row.
void stampHeader(std::array<uint8_t, 40>& row, uint16_t number, int64_t now) {
    char text[16];
    snprintf(text, sizeof text, "P%03X", number);
    memcpy(&row[1], text, 4);
    for (int c : {32, 33, 35, 36, 38, 39}) {
        if (!isDigit(row[c])) return;
    }
    if (isDigit(row[34]) || row[34] != row[37]) return;
    const time_t t = static_cast<time_t>(floorDiv(now, 1000));
    struct tm tm {};
    gmtime_r(&t, &tm);
    snprintf(text, sizeof text, "%02d:%02d:%02d", tm.tm_hour, tm.tm_min, tm.tm_sec);
    for (int i = 0; i < 8; ++i) {
        if (i != 2 && i != 5) row[32 + i] = static_cast<uint8_t>(text[i]);
    }
}

void buildImage(const Receiver& rx, const Stream* s, const Decoder& d, int64_t now,
                TeltxtImage* image) {
    image->page = static_cast<uint16_t>(d.page);
    image->subpageSelected = static_cast<uint16_t>(d.subpage);
    image->time = static_cast<uint32_t>(floorDiv(now, 1000));
    if (s == nullptr) return;
    std::bitset<0x10000> subcodes;
    for (const auto& p : s->service->teletext) {
        if (p.number == d.page) subcodes.set(p.subcode);
    }
    image->subpages = static_cast<uint16_t>(subcodes.count());
    Sent<dvbmodel::TeletextPage> sent = currentPage(rx, *s, d, now);
    if (sent.item == nullptr) return;
    const dvbmodel::TeletextPage& p = *sent.item;
    const int option = nationalOption(p.controlBits);
    image->status = kTtxShown;
    image->subcode = p.subcode;
    image->controlBits = p.controlBits;
    image->nationalOption = static_cast<uint8_t>(option);
    TeletextRows rows = p.rows;
    stampHeader(rows[0], p.number, now);
    const TeletextCells cells = renderTeletext(rows, option);
    for (int r = 0; r < 25; ++r) {
        for (int c = 0; c < 40; ++c) {
            const TeletextCell& cell = cells[r][c];
            image->cells[r][c] = {static_cast<uint32_t>(cell.ch), cell.foreground, cell.background,
                                  cell.flags};
        }
    }
}

}  // namespace

void Receiver::collectDecoderEvents(int64_t now, std::vector<std::array<int, 3>>& out) {
    for (auto& [handle, d] : subtitles) {
        const Stream* s = nullptr;
        int64_t from;
        Sent<dvbmodel::DisplaySet> sent;
        if (feed(*this, d, dvbmodel::Kind::Subtitle, &s) == kOk)
            sent = currentSet(*this, *s, d, now, &from);
        if (sent.sending == d.reported) continue;
        d.reported = sent.sending;
        if (sent.item == nullptr) continue;
        const size_t regions = std::min<size_t>(sent.item->regions.size(), kSubttlRegions);
        out.push_back({kEvtSubtitle, handle, static_cast<int>(regions)});
    }
    for (auto& [handle, d] : teletexts) {
        const Stream* s = nullptr;
        Sent<dvbmodel::TeletextPage> sent;
        if (feed(*this, d, dvbmodel::Kind::Teletext, &s) == kOk)
            sent = currentPage(*this, *s, d, now);
        if (sent.sending == d.reported) continue;
        d.reported = sent.sending;
        if (sent.item == nullptr) continue;
        out.push_back({kEvtTeletext, handle, sent.item->number << 16 | sent.item->subcode});
    }
}

int32_t ReceiverSubttl::Start(const SUBTTL_Settings* settings) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (settings == nullptr) return kErrBadParameter;
    // hstrm names the stream whose subtitle component the decoder takes; one past INT32_MAX
    // names none (it would read as negative, which means any stream).
    if (settings->hstrm > INT32_MAX) return kErrBadHandle;
    int32_t stream = streamWith(*mRx, dvbmodel::Kind::Subtitle, settings->pid,
                                static_cast<int32_t>(settings->hstrm));
    if (stream < 0) return stream;
    if (mRx->subtitles.size() >= kMaxHandles) return kErrTooMany;
    int32_t h = mRx->newHandle();
    Decoder& d = mRx->subtitles[h];
    d.stream = stream;
    d.pid = settings->pid;
    d.compositionPageId = settings->compositionPageId;
    d.ancillaryPageId = settings->ancillaryPageId;
    return h;
}

int32_t ReceiverSubttl::Stop(int32_t handle) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    return mRx->subtitles.erase(handle) != 0 ? kOk : kErrBadHandle;
}

int32_t ReceiverSubttl::GetData(int32_t handle, void* data) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (data == nullptr) return kErrBadParameter;
    auto it = mRx->subtitles.find(handle);
    if (it == mRx->subtitles.end()) return kErrBadHandle;
    const Stream* s = nullptr;
    int32_t result = feed(*mRx, it->second, dvbmodel::Kind::Subtitle, &s);
    if (result != kOk) return result;
    int64_t now = mRx->clock().nowMillis(), from;
    Sent<dvbmodel::DisplaySet> sent = currentSet(*mRx, *s, it->second, now, &from);
    // No display set yet (or no signal): the buffer keeps what it holds.
    if (sent.item == nullptr) return kErrNoData;
    const auto pts = static_cast<uint32_t>(mRx->ptsAt(*s, from, sent.sending.at));
    fillSubtitleData(*sent.item, pts, static_cast<SUBTTL_Data*>(data));
    return kOk;
}

int32_t ReceiverTeltxt::Start(const TELTXT_Settings* settings) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (settings == nullptr) return kErrBadParameter;
    int32_t stream = streamWith(*mRx, dvbmodel::Kind::Teletext, settings->pid, 0);
    if (stream < 0) return stream;
    if (mRx->teletexts.size() >= kMaxHandles) return kErrTooMany;
    int32_t h = mRx->newHandle();
    Decoder& d = mRx->teletexts[h];
    d.stream = stream;
    d.pid = settings->pid;
    // The page the settings name (magazine 1..8, page two BCD digits), else the component's
    // initial page.
    if (settings->magazineNumber >= 1 && settings->magazineNumber <= 8) {
        d.page = settings->magazineNumber << 8 | settings->pageNumber;
    } else {
        for (const auto& c : mRx->streams[stream].service->components) {
            if (c.kind != dvbmodel::Kind::Teletext || c.pid != d.pid) continue;
            for (const auto& ref : c.pages) {
                if (ref.type == 1 && ref.magazine >= 1 && ref.magazine <= 8)
                    d.page = ref.magazine << 8 | ref.page;
            }
        }
    }
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
    if (page < kFirstPage || page > kLastPage || subpage < 0 || subpage > kLastSubcode)
        return kErrBadParameter;
    Decoder& d = it->second;
    d.page = page;
    d.subpage = subpage;
    const Stream* s = nullptr;
    int32_t result = feed(*mRx, d, dvbmodel::Kind::Teletext, &s);
    if (result != kOk) return result;
    // The page asked for is news to nobody: only its later sendings raise events.
    Sent<dvbmodel::TeletextPage> sent = currentPage(*mRx, *s, d, mRx->clock().nowMillis());
    d.reported = sent.sending;
    PageSet present;
    const dvbmodel::TeletextPage* links = sent.item;
    for (const auto& p : s->service->teletext) {
        if (p.number < kFirstPage || p.number > kLastPage) continue;
        present.set(p.number - kFirstPage);
        if (links == nullptr && selected(d, p)) links = &p;
    }
    const bool found = links != nullptr;
    // The colour keys' links in their order on the remote control (red, green, yellow, cyan);
    // where the page has none, the nearest pages present in the groups around it.
    const int32_t sizes[4] = {0x100, 0x10, 0x10, 0x100}, directions[4] = {-1, -1, 1, 1};
    int32_t* out[4] = {prev100, prev10, next10, next100};
    for (int k = 0; k < 4; ++k) {
        const int32_t link = links != nullptr ? links->links[k] : 0;
        const bool linked = link >= kFirstPage && link <= kLastPage && (link & 0xFF) != 0xFF;
        *out[k] = linked ? link : neighbour(present, page, sizes[k], directions[k]);
    }
    return found ? kOk : kErrNoData;
}

int32_t ReceiverTeltxt::GetData(int32_t handle, int32_t offset, int32_t count, uint8_t* dst) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    auto it = mRx->teletexts.find(handle);
    if (it == mRx->teletexts.end()) return kErrBadHandle;
    if (dst == nullptr || offset < 0 || count < 0 || count > kTeltxtChunk) return kErrBadParameter;
    const Stream* s = nullptr;
    int32_t result = feed(*mRx, it->second, dvbmodel::Kind::Teletext, &s);
    TeltxtImage image{};
    buildImage(*mRx, s, it->second, mRx->clock().nowMillis(), &image);
    // Bytes beyond the image read 0.
    const size_t from = std::min(static_cast<size_t>(offset), sizeof image);
    const size_t n = std::min(static_cast<size_t>(count), sizeof image - from);
    memcpy(dst, reinterpret_cast<const uint8_t*>(&image) + from, n);
    memset(dst + n, 0, static_cast<size_t>(count) - n);
    return result;
}

}  // namespace dvbrx
