// The stream module: playing services, their status, components and events.
#include <algorithm>
#include <cstring>

#include "Modules.h"
#include "broadcast/TsReader.h"

namespace dvbrx {
namespace {

// An audio frame of 1152 samples at 48 kHz lasts 24 ms: 2160 ticks of 90 kHz.
constexpr int64_t kAudioFrameTicks = 2160;

void fillEvent(const dvbmodel::Event& ev, uint8_t runStatus, EpgEvent* e, ExtEpgEvent* x) {
    e->evtId = ev.id;
    e->startTime = static_cast<int32_t>(ev.start);
    e->duration = static_cast<int32_t>(ev.duration);
    e->runStatus = runStatus;
    e->parentalRating = ev.parentalRating;
    e->content = ev.content;
    copyBroadcastText(e->name, ev.name);
    copyBroadcastText(e->text, ev.text);
    e->extendedFlag = !ev.extendedText.empty() || !ev.items.empty() ? 1 : 0;
    if (x == nullptr) return;
    size_t n = std::min<size_t>(ev.items.size(), kExtEpgItems);
    x->itemCount = static_cast<uint32_t>(n);
    for (size_t i = 0; i < n; ++i) {
        copyDisplayText(x->items[i].itemDesc, ev.items[i].description);
        copyDisplayText(x->items[i].itemText, ev.items[i].text);
    }
    copyDisplayText(x->text, ev.extendedText);
}

const dvbmodel::Component* component(const dvbmodel::Service& svc, dvbmodel::Kind kind,
                                     uint16_t pid) {
    for (const auto& c : svc.components) {
        if (c.kind == kind && c.pid == pid) return &c;
    }
    return nullptr;
}

}  // namespace

int32_t ReceiverStrm::Init() {
    return kOk;
}

int32_t ReceiverStrm::Open(const STRM_OpenSettings* settings) {
    if (settings == nullptr || !mRx->validFrontend(settings->frontend) || settings->demux < 0 ||
        memchr(settings->szPath, 0, sizeof settings->szPath) == nullptr)
        return kErrBadParameter;
    // A path names a transport stream to play back (a recording, a dump, a capture): read
    // outside the lock, as every file is.
    std::shared_ptr<dvbmodel::Broadcast> playback;
    if (settings->szPath[0] != '\0') {
        dvbmodel::TsCapture capture;
        dvbmodel::TsReadStats stats;
        std::string error;
        if (!dvbmodel::readTransportStreamFile(settings->szPath, capture, error, stats) ||
            !capture.hasActual)
            return kErrPath;
        playback = std::make_shared<dvbmodel::Broadcast>();
        playback->networks = std::move(capture.networks);
        playback->loopMillis = capture.durationMs;
        playback->start = capture.firstUtc;
    }
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (mRx->streams.size() >= kMaxHandles) return kErrTooMany;
    int32_t h = mRx->newHandle();
    Stream& s = mRx->streams[h];
    s.frontend = settings->frontend;
    s.demux = settings->demux;
    s.playback = std::move(playback);
    return h;
}

// A stream on a file starts the file's service `svcId` from the file's start; the front end
// and its settings play no part.
int32_t ReceiverStrm::startPlayback(Stream& s, const STRM_Settings& settings, int64_t now) {
    s.settings = settings;
    s.started = false;
    for (const auto& net : s.playback->networks) {
        for (const auto& tp : net.transports) {
            for (const auto& candidate : tp.services) {
                if (candidate.id != settings.svcId || candidate.components.empty()) continue;
                s.started = true;
                s.frozen = false;
                s.startedAt = now;
                s.network = &net;
                s.transport = &tp;
                s.service = &candidate;
                s.reportedEvent = -1;
                s.shifting = false;
                return kOk;
            }
        }
    }
    return kErrNoService;
}

int32_t ReceiverStrm::Close(int32_t handle) {
    RecordingStop stop;
    std::lock_guard<std::mutex> lock(mRx->mLock);
    auto it = mRx->streams.find(handle);
    if (it == mRx->streams.end()) return kErrBadHandle;
    stopRecording(it->second, stop);
    mRx->streams.erase(it);
    // Decoders fed by the stream end with it.
    for (auto* decoders : {&mRx->subtitles, &mRx->teletexts}) {
        for (auto it = decoders->begin(); it != decoders->end();) {
            it = it->second.stream == handle ? decoders->erase(it) : std::next(it);
        }
    }
    return kOk;
}

int32_t ReceiverStrm::Start(int32_t handle, const STRM_Settings* settings) {
    RecordingStop stop;
    std::lock_guard<std::mutex> lock(mRx->mLock);
    auto it = mRx->streams.find(handle);
    if (it == mRx->streams.end()) return kErrBadHandle;
    Stream& s = it->second;
    if (settings != nullptr && s.playback) {
        stopRecording(s, stop);
        return startPlayback(s, *settings, mRx->clock().nowMillis());
    }
    if (settings == nullptr || !Receiver::plausible(settings->fe)) return kErrBadParameter;
    stopRecording(s, stop);
    int64_t now = mRx->clock().nowMillis();
    // Starting a service tunes the stream's front end, as a receiver does.
    mRx->tune(s.frontend, settings->fe);
    s.settings = *settings;
    s.started = false;
    Signal sig = mRx->signal(settings->fe, now, now);
    if (sig.transport == nullptr) return kErrNoSignal;
    const dvbmodel::Service* svc = nullptr;
    for (const auto& candidate : sig.transport->services) {
        if (candidate.id == settings->svcId) svc = &candidate;
    }
    if (svc == nullptr) return kErrNoService;
    s.started = true;
    s.frozen = false;
    s.startedAt = now;
    s.network = sig.network;
    s.transport = sig.transport;
    s.service = svc;
    s.reportedEvent = -1;
    s.shifting = false;
    return kOk;
}

int32_t ReceiverStrm::Stop(int32_t handle, int32_t flag) {
    RecordingStop stop;
    std::lock_guard<std::mutex> lock(mRx->mLock);
    auto it = mRx->streams.find(handle);
    if (it == mRx->streams.end()) return kErrBadHandle;
    if (!it->second.started) return kErrNotStarted;
    stopRecording(it->second, stop);
    it->second.started = false;
    it->second.shifting = false;
    // Flag 1 keeps the last picture on the screen; 0 blanks it.
    it->second.frozen = flag == 1;
    return kOk;
}

int32_t ReceiverStrm::GetSettings(int32_t handle, STRM_Settings* settings) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (settings == nullptr) return kErrBadParameter;
    auto it = mRx->streams.find(handle);
    if (it == mRx->streams.end()) return kErrBadHandle;
    *settings = it->second.settings;
    return kOk;
}

int32_t ReceiverStrm::SetSettings(int32_t handle, const STRM_Settings* settings) {
    RecordingStop stop;
    std::string path;
    int64_t since = 0;
    const dvbmodel::Service* service = nullptr;
    {
        std::lock_guard<std::mutex> lock(mRx->mLock);
        if (settings == nullptr) return kErrBadParameter;
        auto it = mRx->streams.find(handle);
        if (it == mRx->streams.end()) return kErrBadHandle;
        Stream& s = it->second;
        if (!s.started) return kErrNotStarted;
        // Settings wait for the time shift file being made: a second file of the same second
        // would truncate it, and a discarded one would remove it.
        if (s.shiftOpening) return kErrBusy;
        bool live =
                settings->playSpeed == 0 && settings->playSpeedDiv == 0 && settings->posTime == 0;
        if (!live && (settings->playSpeedDiv <= 0 || settings->posTime < 0))
            return kErrBadParameter;
        // A file played back is not recorded again.
        if (!live && s.playback) return kErrNotSupported;
        int64_t now = mRx->clock().nowMillis();
        if (live) {
            s.settings = *settings;
            s.shifting = false;
            stopRecording(s, stop);
            return kOk;
        }
        if (s.shifting) {
            s.settings = *settings;
            shift(s, *settings, now);
            return kOk;
        }
        // Time shift starts: the recording's file is made below, outside the lock.
        since = now;
        service = s.service;
        path = mRx->recordingPath(s, now);
        // Another stream's time shift of this service from this second has (or is making)
        // this file: a second one would truncate it.
        for (const auto& [oh, o] : mRx->streams) {
            if ((o.recording || o.shiftOpening) && mRx->recordingPath(o, o.shiftSince) == path)
                return kErrBusy;
        }
        s.shiftOpening = true;
        s.shiftSince = since;
    }
    std::shared_ptr<Recording> recording =
            Recording::create(path, mRx->broadcast(), service, since);
    std::lock_guard<std::mutex> lock(mRx->mLock);
    auto it = mRx->streams.find(handle);
    if (it != mRx->streams.end()) it->second.shiftOpening = false;
    if (it == mRx->streams.end() || !it->second.started || it->second.service != service) {
        // Closed, stopped or retuned meanwhile: the file is not wanted.
        stop.recording = std::move(recording);
        stop.discard = true;
        return it == mRx->streams.end() ? kErrBadHandle : kErrNotStarted;
    }
    if (recording == nullptr) return kErrPath;
    Stream& s = it->second;
    s.shifting = true;  // from shiftSince, set when the file was reserved
    s.recording = std::move(recording);
    s.settings = *settings;
    shift(s, *settings, mRx->clock().nowMillis());
    return kOk;
}

void ReceiverStrm::shift(Stream& s, const STRM_Settings& settings, int64_t now) {
    // Plays from posTime seconds into the recording at playSpeed / playSpeedDiv.
    s.shiftPos = std::min(int64_t{settings.posTime} * 1000, now - s.shiftSince);
    s.shiftAt = now;
}

void ReceiverStrm::stopRecording(Stream& s, RecordingStop& stop) {
    if (!s.recording) return;
    mRx->planRecording(*s.recording, s, mRx->clock().nowMillis());
    stop.recording = std::move(s.recording);
}

int32_t ReceiverStrm::GetStatus(int32_t handle, STRM_GetStatus* status) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (status == nullptr) return kErrBadParameter;
    auto it = mRx->streams.find(handle);
    if (it == mRx->streams.end()) return status->result = kErrBadHandle;
    const Stream& s = it->second;
    if (!s.started) {
        status->pictureStatus = s.frozen ? kFrozen : kNoPicture;
        return status->result = kErrNotStarted;
    }
    const Frontend& fe = mRx->frontends[s.frontend];
    int64_t now = mRx->clock().nowMillis();
    Signal sig = mRx->signal(fe.params, fe.tunedAt, now);
    status->feStatus = sig.status;
    status->feStrength = sig.strength;
    status->feBer = sig.ber;
    status->feSnr = sig.snr;
    const dvbmodel::Service& svc = *s.service;
    bool onAir = s.playback || (sig.transport == s.transport && (sig.status & kFeLock) != 0);
    bool blocked = svc.scrambled && mRx->outputs.caStandby;
    const auto* video = component(svc, dvbmodel::Kind::Video, s.settings.videoPid);
    const auto* audio = component(svc, dvbmodel::Kind::Audio, s.settings.audioPid);
    status->pictureStatus = onAir && blocked ? kScrambled : kNoPicture;
    if (onAir && !blocked) {
        int64_t from = s.playback ? s.startedAt : std::max(s.startedAt, sig.lockedAt);
        int64_t pts = mRx->ptsAt(s, from, now);
        status->localPts = static_cast<int32_t>(static_cast<uint32_t>(pts));
        if (video != nullptr && video->frameRateMilli > 0) {
            int64_t frame = int64_t{90000} * 1000 / video->frameRateMilli;
            status->videoPts = static_cast<int32_t>(static_cast<uint32_t>(pts / frame * frame));
            status->fpsInteger = static_cast<int32_t>(video->frameRateMilli / 1000);
            status->fpsDecimal = static_cast<int32_t>(video->frameRateMilli % 1000);
            status->pictureStatus = kDecoding;
        }
        if (audio != nullptr) {
            status->audioPts = static_cast<int32_t>(
                    static_cast<uint32_t>(pts / kAudioFrameTicks * kAudioFrameTicks));
        }
    }
    if (s.playback) {
        // A file plays in a loop from where the stream started.
        int64_t loop = s.playback->loopMillis, pos = now - s.startedAt;
        status->pbstate = kPvrActive;
        status->pbposition = static_cast<int32_t>((loop > 0 ? pos % loop : pos) / 1000);
        status->pbstartTime = static_cast<int32_t>(s.startedAt / 1000);
        status->pbendTime = static_cast<int32_t>((s.startedAt + loop) / 1000);
    }
    if (s.shifting) {
        // What the file holds so far: the service thread writes it as the clock moves. Play
        // back reaches no further than that.
        int64_t recorded = s.recording ? s.recording->millis() : 0;
        status->recstate = kPvrActive;
        status->recduration = static_cast<int32_t>(recorded / 1000);
        status->recsize = s.recording ? s.recording->bytes() : 0;
        const dvbmodel::Event* recEvent = dvbmodel::eventAt(svc, s.shiftSince / 1000);
        status->recevent = recEvent != nullptr ? recEvent->id : 0;
        status->recstartTime = static_cast<int32_t>(s.shiftSince / 1000);
        status->reccurTime = static_cast<int32_t>(now / 1000);
        int32_t num = s.settings.playSpeed, div = s.settings.playSpeedDiv;
        int64_t pos = std::clamp(s.shiftPos + (now - s.shiftAt) * num / div, int64_t{0}, recorded);
        status->pbstate = num == 0 ? kPvrPaused : num == div ? kPvrActive : kPvrTrick;
        status->pbposition = static_cast<int32_t>(pos / 1000);
        const dvbmodel::Event* pbEvent = dvbmodel::eventAt(svc, (s.shiftSince + pos) / 1000);
        status->pbevent = pbEvent != nullptr ? pbEvent->id : 0;
        status->pbstartTime = status->recstartTime;
        status->pbendTime = status->reccurTime;
    }
    return status->result = kOk;
}

int32_t ReceiverStrm::CreatStreamInfo(int32_t handle, STRM_StreamInfo* info) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (info == nullptr) return kErrBadParameter;
    auto it = mRx->streams.find(handle);
    if (it == mRx->streams.end()) return kErrBadHandle;
    if (!it->second.started) return kErrNotStarted;
    const dvbmodel::Service& svc = *it->second.service;
    for (const auto& c : svc.components) {
        switch (c.kind) {
            case dvbmodel::Kind::Video:
                if (info->videoCount < kStreamComponents) {
                    VideoContent& v = info->video[info->videoCount++];
                    v.pid = c.pid;
                    v.type = c.streamType;
                }
                break;
            case dvbmodel::Kind::Audio:
                if (info->audioCount < kStreamComponents) {
                    AudioContent& a = info->audio[info->audioCount++];
                    a.pid = c.pid;
                    a.isDolbyAC3 = c.ac3 || c.eac3 ? 1 : 0;
                    a.type = c.streamType;
                    copyDisplayText(a.langCode0, c.language);
                    a.componetTag = c.componentTag;
                    copyDisplayText(a.streamName, c.name);
                }
                break;
            case dvbmodel::Kind::Subtitle:
                if (info->subtitleCount < kStreamComponents) {
                    SubtitleContent& t = info->subtitle[info->subtitleCount++];
                    t.pid = c.pid;
                    t.type = c.subtitlingType;
                    copyDisplayText(t.langCode, c.language);
                    t.compositionPageId = c.compositionPageId;
                    t.ancillaryPageId = c.ancillaryPageId;
                }
                break;
            case dvbmodel::Kind::Teletext:
                // One entry per page that the teletext descriptor announces.
                for (const auto& page : c.pages) {
                    if (info->teletextCount >= kStreamComponents) break;
                    TeletextContent& t = info->teletext[info->teletextCount++];
                    t.pid = c.pid;
                    t.type = page.type;
                    copyDisplayText(t.langCode, c.language);
                    t.magazineNumber = page.magazine;
                    t.pageNumber = page.page;
                    t.componetTag = c.componentTag;
                    copyDisplayText(t.streamName, c.name);
                }
                break;
            case dvbmodel::Kind::Data:
                break;
        }
    }
    info->pcrPid = svc.pcrPid;
    for (size_t i = 0; i < 3 && i < svc.caSystems.size(); ++i) info->caSysId[i] = svc.caSystems[i];
    return kOk;
}

int32_t ReceiverStrm::GetAllEvent(int32_t handle, EpgEvent* present, EpgEvent* following,
                                  ExtEpgEvent* presentExt, ExtEpgEvent* followingExt) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (present == nullptr || following == nullptr || presentExt == nullptr ||
        followingExt == nullptr)
        return kErrBadParameter;
    auto it = mRx->streams.find(handle);
    if (it == mRx->streams.end()) return kErrBadHandle;
    if (!it->second.started) return kErrNotStarted;
    int64_t seconds = mRx->eventSeconds(it->second, mRx->clock().nowMillis());
    const dvbmodel::Service& svc = *it->second.service;
    // EN 300 468 running status: 4 running, 1 not running.
    if (const auto* ev = dvbmodel::eventAt(svc, seconds)) fillEvent(*ev, 4, present, presentExt);
    if (const auto* ev = dvbmodel::eventAfter(svc, seconds))
        fillEvent(*ev, 1, following, followingExt);
    return kOk;
}

int32_t ReceiverStrm::GetEvent(int32_t handle, EpgEvent* event) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (event == nullptr) return kErrBadParameter;
    auto it = mRx->streams.find(handle);
    if (it == mRx->streams.end()) return kErrBadHandle;
    if (!it->second.started) return kErrNotStarted;
    const auto* ev = dvbmodel::eventAt(*it->second.service,
                                       mRx->eventSeconds(it->second, mRx->clock().nowMillis()));
    if (ev == nullptr) return kErrNoData;
    fillEvent(*ev, 4, event, nullptr);
    return kOk;
}

int32_t ReceiverStrm::GetTime(int32_t handle, uint32_t* time) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (time == nullptr) return kErrBadParameter;
    if (mRx->streams.count(handle) == 0) return kErrBadHandle;
    *time = static_cast<uint32_t>(mRx->clock().nowSeconds());
    return kOk;
}

int32_t ReceiverStrm::CheckService(const ServiceCheck* check) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (check == nullptr) return kErrBadParameter;
    for (const auto& net : mRx->broadcast().networks) {
        for (const auto& tp : net.transports) {
            const dvbmodel::Tuning& t = tp.tuning;
            if (tp.tsid != check->tsid || std::llabs(int64_t{check->freq} - t.frequencyKHz) >
                                                  Receiver::toleranceKHz(t.delivery))
                continue;
            if (t.delivery == dvbmodel::Delivery::Satellite &&
                std::abs(check->satPosition - t.orbitalPosition) > 3)
                continue;
            for (const auto& svc : tp.services) {
                if (svc.id != check->sid) continue;
                // On the air there; its guide is ready when the database has its events.
                int64_t now = mRx->clock().nowSeconds();
                bool guide = mRx->epg != nullptr &&
                             mRx->epg->eventAt({tp.onid, tp.tsid, svc.id}, now).has_value();
                return guide ? kOk : kErrNoData;
            }
        }
    }
    return kErrNoService;
}

int32_t ReceiverStrm::EPG_GetEvent(const EpgSvc* service, int32_t handle, EpgEvent* event,
                                   ExtEpgEvent* ext) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (service == nullptr || event == nullptr || ext == nullptr) return kErrBadParameter;
    auto it = mRx->streams.find(handle);
    if (it == mRx->streams.end()) return kErrBadHandle;
    if (mRx->epg == nullptr) return kErrNotStarted;
    Stream& s = it->second;
    ServiceKey key{service->onId, service->tsId, service->svcId};
    int64_t now = mRx->clock().nowSeconds();
    // Each handle walks one service's schedule: the event running now (or the next) first,
    // then on each call the one that starts after the last given. Another service, or the
    // end of the walk, starts over.
    bool walking = s.epgWalking && s.epgService == key;
    std::optional<dvbmodel::Event> ev =
            walking ? mRx->epg->nextAfter(key, s.epgLast) : mRx->epg->eventAt(key, now);
    s.epgWalking = ev.has_value();
    if (!ev) return kErrNoData;
    s.epgService = key;
    s.epgLast = ev->start;
    bool running = ev->start <= now && now < ev->start + static_cast<int64_t>(ev->duration);
    fillEvent(*ev, running ? 4 : 1, event, ext);
    return kOk;
}

int32_t ReceiverStrm::EpgMd_AddService(const EpgSvc* service) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (service == nullptr) return kErrBadParameter;
    if (mRx->findService(service->onId, service->tsId, service->svcId) == nullptr)
        return kErrNoService;
    auto& list = mRx->epgServices;
    auto same = [service](const EpgSvc& e) {
        return e.svcId == service->svcId && e.tsId == service->tsId && e.onId == service->onId;
    };
    auto known = std::find_if(list.begin(), list.end(), same);
    if (known != list.end()) {
        *known = *service;  // new indexes, same place
    } else if (list.size() >= kMaxEpgServices) {
        return kErrTooMany;
    } else {
        list.push_back(*service);
    }
    mRx->requestEpgSync();
    return kOk;
}

int32_t ReceiverStrm::EpgMd_ClearService() {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    mRx->epgServices.clear();
    mRx->epgCleared = true;
    mRx->requestEpgSync();
    return kOk;
}

}  // namespace dvbrx
