// Configuration module of the DVB service: tuning and front-end status, the dish positioner,
// audio and video output, and device services.
#pragma once

#include <utils/RefBase.h>

#include "Record.h"

// Front-end parameter block: the form in which the service takes a tuning request. The scan
// start settings and the stream settings open with the same block.
struct ANT_FrontendParameters {
    int32_t type;  // 1, 2, or 0 for every other kind of front end
    int32_t frequency;
    union {
        int32_t symbolRate;  // codes 0 and 1
        int32_t bandwidth;   // code 2
    };
    int32_t fecInner;      // codes 0 and 1
    int32_t modulation;    // codes 0 and 1
    int32_t polarization;  // code 0
    int32_t rolloff;       // code 0
    uint8_t reserved28[8];
    int32_t diseqctype;
    uint8_t tone;
    uint8_t lnbpower;
    uint8_t reserved42[2];
    int32_t lnbLowLO;
    int32_t lnbHigLO;
    uint8_t port;
    uint8_t port16;
    uint8_t posIndex;
    uint8_t reserved55;
    int32_t satPosition;
    int32_t myLongitude;
    int32_t myLatitude;
    uint8_t toneBurst;
    uint8_t ubSlot;
    uint16_t ubFreq;
    uint8_t ubSat;
    uint8_t out5v;
    uint8_t reserved74[2];
};
DVB_RECORD_SIZE(ANT_FrontendParameters, 76);
DVB_RECORD_FIELD(ANT_FrontendParameters, type, 0);
DVB_RECORD_FIELD(ANT_FrontendParameters, frequency, 4);
DVB_RECORD_FIELD(ANT_FrontendParameters, symbolRate, 8);
DVB_RECORD_FIELD(ANT_FrontendParameters, bandwidth, 8);
DVB_RECORD_FIELD(ANT_FrontendParameters, fecInner, 12);
DVB_RECORD_FIELD(ANT_FrontendParameters, modulation, 16);
DVB_RECORD_FIELD(ANT_FrontendParameters, polarization, 20);
DVB_RECORD_FIELD(ANT_FrontendParameters, rolloff, 24);
DVB_RECORD_FIELD(ANT_FrontendParameters, reserved28, 28);
DVB_RECORD_FIELD(ANT_FrontendParameters, diseqctype, 36);
DVB_RECORD_FIELD(ANT_FrontendParameters, tone, 40);
DVB_RECORD_FIELD(ANT_FrontendParameters, lnbpower, 41);
DVB_RECORD_FIELD(ANT_FrontendParameters, reserved42, 42);
DVB_RECORD_FIELD(ANT_FrontendParameters, lnbLowLO, 44);
DVB_RECORD_FIELD(ANT_FrontendParameters, lnbHigLO, 48);
DVB_RECORD_FIELD(ANT_FrontendParameters, port, 52);
DVB_RECORD_FIELD(ANT_FrontendParameters, port16, 53);
DVB_RECORD_FIELD(ANT_FrontendParameters, posIndex, 54);
DVB_RECORD_FIELD(ANT_FrontendParameters, reserved55, 55);
DVB_RECORD_FIELD(ANT_FrontendParameters, satPosition, 56);
DVB_RECORD_FIELD(ANT_FrontendParameters, myLongitude, 60);
DVB_RECORD_FIELD(ANT_FrontendParameters, myLatitude, 64);
DVB_RECORD_FIELD(ANT_FrontendParameters, toneBurst, 68);
DVB_RECORD_FIELD(ANT_FrontendParameters, ubSlot, 69);
DVB_RECORD_FIELD(ANT_FrontendParameters, ubFreq, 70);
DVB_RECORD_FIELD(ANT_FrontendParameters, ubSat, 72);
DVB_RECORD_FIELD(ANT_FrontendParameters, out5v, 73);
DVB_RECORD_FIELD(ANT_FrontendParameters, reserved74, 74);

struct ANT_Status {
    int32_t feStatus;
    int32_t strength;
    int32_t extStatus;  // a further status word of the service; not passed to Java
    int32_t quality;
};
DVB_RECORD_SIZE(ANT_Status, 16);
DVB_RECORD_FIELD(ANT_Status, feStatus, 0);
DVB_RECORD_FIELD(ANT_Status, strength, 4);
DVB_RECORD_FIELD(ANT_Status, extStatus, 8);
DVB_RECORD_FIELD(ANT_Status, quality, 12);

struct Video_Position {
    int32_t x;
    int32_t y;
    int32_t w;
    int32_t h;
};
DVB_RECORD_SIZE(Video_Position, 16);
DVB_RECORD_FIELD(Video_Position, x, 0);
DVB_RECORD_FIELD(Video_Position, y, 4);
DVB_RECORD_FIELD(Video_Position, w, 8);
DVB_RECORD_FIELD(Video_Position, h, 12);

// Size of the path buffer handed to Cfg::TSDumpStart, terminating zero included.
constexpr size_t kTSDumpPathSize = 256;

namespace android {

// The order of the virtual operations is the service library's binary interface: every
// slot is declared, also the one this library never calls.
class Cfg : public RefBase {
public:
    virtual int32_t Reset(int32_t dev) = 0;
    virtual int32_t GotoPosition(int32_t dev, uint8_t position) = 0;
    virtual int32_t StorePosition(int32_t dev, uint8_t position) = 0;
    virtual int32_t Recalculate(int32_t dev, uint8_t position) = 0;
    virtual int32_t Drive(int32_t dev, uint8_t direction, uint8_t mode, uint8_t value) = 0;
    virtual int32_t Stop(int32_t dev) = 0;
    virtual int32_t SetLimit(int32_t dev, uint8_t limit) = 0;
    virtual int32_t DisableLimit(int32_t dev) = 0;
    virtual int32_t EnableLimit(int32_t dev) = 0;
    virtual int32_t GotoSatellite(int32_t dev, int16_t satLongitude, int16_t myLongitude,
                                  int16_t myLatitude) = 0;
    virtual int32_t TryTune(int32_t dev, const ANT_FrontendParameters* params) = 0;
    virtual int32_t Tune(int32_t dev, const ANT_FrontendParameters* params) = 0;
    virtual int32_t GetStatus(int32_t dev, ANT_Status* status) = 0;
    virtual int32_t SetMuteAudio(int32_t dev, uint8_t mute) = 0;
    virtual int32_t SetAudioVolume(int32_t volume) = 0;
    virtual int32_t SetMuteVideo(int32_t dev, uint8_t mute) = 0;
    virtual int32_t SetVideoPos(int32_t dev, const Video_Position* pos) = 0;
    virtual int32_t CaGetStatus(int32_t dev, int32_t* source, int32_t* lastCwSet) = 0;
    virtual int32_t CaStandby(int32_t dev) = 0;
    virtual int32_t GpioSet(int32_t line, int32_t value) = 0;
    virtual int32_t Reserved21() = 0;  // never called by this library
    virtual int32_t BlindScanStart(int32_t dev, int32_t a, int32_t b, int32_t c, int32_t d) = 0;
    virtual int32_t BlindScanStop(int32_t dev) = 0;
    virtual int32_t TSDumpStart(int32_t dev, int32_t a, int32_t b, const char* path) = 0;
    virtual int32_t TSDumpStop() = 0;
    virtual int32_t GetVideoPos(int32_t dev, Video_Position* pos) = 0;
    virtual int32_t SetWakeup(int32_t value) = 0;
};

}  // namespace android
