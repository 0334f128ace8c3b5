// The configuration module: front ends, the dish positioner, A/V outputs and device services.
#include <fcntl.h>
#include <unistd.h>

#include <cmath>
#include <cstring>

#include "Modules.h"

namespace dvbrx {

int32_t ReceiverCfg::TryTune(int32_t dev, const ANT_FrontendParameters* params) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || params == nullptr || !Receiver::plausible(*params))
        return kErrBadParameter;
    int64_t now = mRx->clock().nowMillis();
    return mRx->signal(*params, now, now).transport != nullptr ? kOk : kErrNoSignal;
}

int32_t ReceiverCfg::Tune(int32_t dev, const ANT_FrontendParameters* params) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || params == nullptr || !Receiver::plausible(*params))
        return kErrBadParameter;
    mRx->tune(dev, *params);
    return kOk;
}

int32_t ReceiverCfg::GetStatus(int32_t dev, ANT_Status* status) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || status == nullptr) return kErrBadParameter;
    const Frontend& fe = mRx->frontends[dev];
    if (!fe.tuned) return kOk;
    Signal s = mRx->signal(fe.params, fe.tunedAt, mRx->clock().nowMillis());
    status->feStatus = s.status;
    status->strength = s.strength;
    status->extStatus = s.snr;
    status->quality = s.quality;
    return kOk;
}

// ---- the dish positioner -----------------------------------------------------------------

int32_t ReceiverCfg::Reset(int32_t dev) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev)) return kErrBadParameter;
    mRx->moveDish(0.0);
    return kOk;
}

int32_t ReceiverCfg::GotoPosition(int32_t dev, uint8_t position) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev)) return kErrBadParameter;
    Dish& dish = mRx->dish;
    if (position != 0 && !dish.isStored[position]) return kErrBadParameter;
    mRx->moveDish(position == 0 ? 0.0 : dish.stored[position]);
    return kOk;
}

int32_t ReceiverCfg::StorePosition(int32_t dev, uint8_t position) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    // Position 0 is the reference, due south; it cannot be stored over.
    if (!mRx->validFrontend(dev) || position == 0) return kErrBadParameter;
    Dish& dish = mRx->dish;
    dish.stored[position] = dish.at(mRx->clock().nowMillis());
    dish.isStored[position] = true;
    return kOk;
}

int32_t ReceiverCfg::Recalculate(int32_t dev, uint8_t position) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev)) return kErrBadParameter;
    Dish& dish = mRx->dish;
    if (position == 0 || !dish.isStored[position]) return kErrBadParameter;
    // The dish now points where `position` should be: every stored position moves as much.
    double shift = dish.at(mRx->clock().nowMillis()) - dish.stored[position];
    for (size_t i = 1; i < dish.stored.size(); ++i) {
        if (dish.isStored[i]) dish.stored[i] += shift;
    }
    return kOk;
}

int32_t ReceiverCfg::Drive(int32_t dev, uint8_t direction, uint8_t mode, uint8_t value) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || direction > 1) return kErrBadParameter;
    Dish& dish = mRx->dish;
    int64_t now = mRx->clock().nowMillis();
    double sign = direction == 0 ? 1.0 : -1.0;
    double here = dish.at(now);
    switch (mode) {
        case 0:
            mRx->moveDish(sign * kMotorTravel);
            break;
        case 1:
            mRx->moveDish(here + sign * value * kMotorDegreesPerSecond);
            break;
        case 2:
            mRx->moveDish(here + sign * value * 0.1);
            break;
        default:
            return kErrBadParameter;
    }
    return kOk;
}

int32_t ReceiverCfg::Stop(int32_t dev) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev)) return kErrBadParameter;
    int64_t now = mRx->clock().nowMillis();
    mRx->moveDish(mRx->dish.at(now));
    return kOk;
}

int32_t ReceiverCfg::SetLimit(int32_t dev, uint8_t limit) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || limit > 1) return kErrBadParameter;
    Dish& dish = mRx->dish;
    (limit == 0 ? dish.east : dish.west) = dish.at(mRx->clock().nowMillis());
    dish.limitsOn = true;
    return kOk;
}

int32_t ReceiverCfg::DisableLimit(int32_t dev) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev)) return kErrBadParameter;
    mRx->dish.limitsOn = false;
    return kOk;
}

int32_t ReceiverCfg::EnableLimit(int32_t dev) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev)) return kErrBadParameter;
    mRx->dish.limitsOn = true;
    return kOk;
}

int32_t ReceiverCfg::GotoSatellite(int32_t dev, int16_t satLongitude, int16_t myLongitude,
                                   int16_t myLatitude) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || std::abs(satLongitude) > 1800 || std::abs(myLongitude) > 1800 ||
        std::abs(myLatitude) > 900)
        return kErrBadParameter;
    Site site{myLongitude / 10.0, myLatitude / 10.0};
    double angle = usalsAngle(satLongitude / 10.0, site);
    if (std::isnan(angle) || std::fabs(angle) > kMotorTravel) return kErrBadParameter;
    mRx->moveDish(angle);
    mRx->site = site;
    return kOk;
}

// ---- outputs -----------------------------------------------------------------------------

int32_t ReceiverCfg::SetMuteAudio(int32_t dev, uint8_t mute) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || mute > 1) return kErrBadParameter;
    mRx->outputs.audioMuted = mute != 0;
    return kOk;
}

int32_t ReceiverCfg::SetAudioVolume(int32_t volume) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (volume < 0 || volume > 100) return kErrBadParameter;
    mRx->outputs.volume = volume;
    return kOk;
}

int32_t ReceiverCfg::SetMuteVideo(int32_t dev, uint8_t mute) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || mute > 1) return kErrBadParameter;
    mRx->outputs.videoMuted = mute != 0;
    return kOk;
}

int32_t ReceiverCfg::SetVideoPos(int32_t dev, const Video_Position* pos) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    // The window lies on the 1920 x 1080 output plane.
    if (!mRx->validFrontend(dev) || pos == nullptr || pos->x < 0 || pos->y < 0 || pos->w <= 0 ||
        pos->h <= 0 || pos->w > 1920 - pos->x || pos->h > 1080 - pos->y)
        return kErrBadParameter;
    mRx->outputs.window = *pos;
    return kOk;
}

int32_t ReceiverCfg::GetVideoPos(int32_t dev, Video_Position* pos) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || pos == nullptr) return kErrBadParameter;
    *pos = mRx->outputs.window;
    return kOk;
}

// ---- device services ---------------------------------------------------------------------

int32_t ReceiverCfg::CaGetStatus(int32_t dev, int32_t* source, int32_t* lastCwSet) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || source == nullptr || lastCwSet == nullptr)
        return kErrBadParameter;
    *source = mRx->outputs.caStandby ? 0 : 1;
    *lastCwSet = 0;
    if (mRx->outputs.caStandby) return kOk;
    for (const auto& entry : mRx->streams) {
        const Stream& s = entry.second;
        if (s.started && s.frontend == dev && s.service != nullptr && s.service->scrambled) {
            // Control words change with every crypto-period of 10 seconds.
            *lastCwSet = static_cast<int32_t>(mRx->clock().nowSeconds() / 10 * 10);
        }
    }
    return kOk;
}

int32_t ReceiverCfg::CaStandby(int32_t state) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (state < 0 || state > 1) return kErrBadParameter;
    // What recordings of scrambled services received up to now is theirs.
    mRx->planWrites(mRx->clock().nowMillis());
    mRx->outputs.caStandby = state == 1;
    return kOk;
}

int32_t ReceiverCfg::GpioSet(int32_t line, int32_t value) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (line < 0 || line >= static_cast<int32_t>(mRx->outputs.gpio.size()) || value < 0 ||
        value > 1)
        return kErrBadParameter;
    mRx->outputs.gpio[line] = value;
    return kOk;
}

int32_t ReceiverCfg::BlindScanStart(int32_t dev, int32_t startMHz, int32_t stopMHz, int32_t,
                                    int32_t) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev) || startMHz < 0 || stopMHz < startMHz) return kErrBadParameter;
    if (mRx->outputs.blindScan) return kErrBusy;
    mRx->outputs.blindScan = true;
    mRx->outputs.blindScanDev = dev;
    return kOk;
}

int32_t ReceiverCfg::BlindScanStop(int32_t dev) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (!mRx->validFrontend(dev)) return kErrBadParameter;
    if (!mRx->outputs.blindScan || mRx->outputs.blindScanDev != dev) return kErrNotStarted;
    mRx->outputs.blindScan = false;
    return kOk;
}

int32_t ReceiverCfg::TSDumpStart(int32_t dev, int32_t, int32_t, const char* path) {
    {
        std::lock_guard<std::mutex> lock(mRx->mLock);
        if (!mRx->validFrontend(dev)) return kErrBadParameter;
        if (path == nullptr || memchr(path, 0, kTSDumpPathSize) == nullptr || path[0] == '\0')
            return kErrPath;
        if (mRx->outputs.dump || mRx->outputs.dumpOpening) return kErrBusy;
        if (!mRx->frontends[dev].tuned) return kErrNotStarted;
        // Held while the file is made outside the lock: a second start meanwhile is busy and
        // never creates or truncates a file of its own.
        mRx->outputs.dumpOpening = true;
    }
    int64_t since = mRx->clock().nowMillis();
    auto dump = Recording::create(path, mRx->broadcast(), nullptr, since);
    std::lock_guard<std::mutex> lock(mRx->mLock);
    mRx->outputs.dumpOpening = false;
    if (dump == nullptr) return kErrPath;
    mRx->outputs.dumpFrontend = dev;
    mRx->outputs.dump = std::move(dump);
    return kOk;
}

int32_t ReceiverCfg::TSDumpStop() {
    RecordingStop stop;
    std::lock_guard<std::mutex> lock(mRx->mLock);
    // A dump still making its file has not started yet: stopping it now is busy, not "not
    // started", so that a caller may try again.
    if (mRx->outputs.dumpOpening) return kErrBusy;
    if (!mRx->outputs.dump) return kErrNotStarted;
    // The file gets the packets up to now and is closed once the lock is released.
    mRx->planDump(mRx->clock().nowMillis());
    stop.recording = std::move(mRx->outputs.dump);
    return kOk;
}

int32_t ReceiverCfg::SetWakeup(int32_t value) {
    std::lock_guard<std::mutex> lock(mRx->mLock);
    if (value < 0) return kErrBadParameter;
    mRx->outputs.wakeup = value;
    return kOk;
}

}  // namespace dvbrx
