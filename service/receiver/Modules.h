// The receiver's five modules. Each answers its operations from the shared receiver; every
// operation takes the receiver's lock for its whole length and raises no event itself (the
// receiver's service thread does).
#pragma once

#include <DVB.h>

#include <cstring>
#include <memory>
#include <string>

#include "Receiver.h"
#include "broadcast/DvbText.h"

namespace dvbrx {

// Broadcast text into a zero-ended record field that reaches Java as bytes (names and short
// event texts): the broadcast bytes, cut at a whole character. Text whose table puts zero bytes
// in it (UCS-2, the 0x10 0x00 NN selectors) goes as UTF-8 behind that table's selector, 0x15.
template <size_t N>
void copyBroadcastText(char (&field)[N], const std::string& text) {
    std::string bytes =
            text.find('\0') == std::string::npos
                    ? text
                    : dvbmodel::encodeText(dvbmodel::decodeText(text), dvbmodel::TextTable::Utf8);
    size_t n = dvbmodel::fitText(bytes, N - 1);
    memcpy(field, bytes.data(), n);
    field[n] = '\0';
}

// Broadcast text into a field that reaches Java as a string (extended texts and items, track
// names): decoded to UTF-8, cut at a whole character.
template <size_t N>
void copyDisplayText(char (&field)[N], const std::string& text) {
    std::string utf8 = dvbmodel::decodeText(text);
    size_t n = dvbmodel::fitUtf8(utf8, N - 1);
    memcpy(field, utf8.data(), n);
    field[n] = '\0';
}

class ReceiverScnm : public android::Scnm {
public:
    explicit ReceiverScnm(std::shared_ptr<Receiver> rx) : mRx(std::move(rx)) {}
    int32_t Reserved1() override { return kErrNotSupported; }
    int32_t Init() override;
    int32_t Open(const SCNM_OpenSettings* settings) override;
    int32_t Close(int32_t handle) override;
    int32_t Start(int32_t handle, const SCNM_StartSettings* settings) override;
    int32_t Stop(int32_t handle) override;
    int32_t GetStatus(int32_t handle, SCNM_GetStatus* status) override;
    int32_t CreateServiceList(int32_t handle, SCNM_ServiceInfo** head) override;
    int32_t Reserved9() override { return kErrNotSupported; }
    int32_t CreateNetworkList(int32_t handle, SCNMNET_FrontEndSettings** head) override;
    int32_t Reserved11() override { return kErrNotSupported; }
    int32_t Dvb_SystemInit(const DVB_Config* config) override;
    int32_t Dvb_SystemUnInit(const DVB_Config* config) override;

private:
    std::shared_ptr<Receiver> mRx;
};

class ReceiverStrm : public android::Strm {
public:
    explicit ReceiverStrm(std::shared_ptr<Receiver> rx) : mRx(std::move(rx)) {}
    int32_t Init() override;
    int32_t Open(const STRM_OpenSettings* settings) override;
    int32_t Close(int32_t handle) override;
    int32_t Start(int32_t handle, const STRM_Settings* settings) override;
    int32_t Stop(int32_t handle, int32_t flag) override;
    int32_t GetSettings(int32_t handle, STRM_Settings* settings) override;
    int32_t SetSettings(int32_t handle, const STRM_Settings* settings) override;
    int32_t GetStatus(int32_t handle, STRM_GetStatus* status) override;
    int32_t CreatStreamInfo(int32_t handle, STRM_StreamInfo* info) override;
    int32_t GetAllEvent(int32_t handle, EpgEvent* present, EpgEvent* following,
                        ExtEpgEvent* presentExt, ExtEpgEvent* followingExt) override;
    int32_t GetEvent(int32_t handle, EpgEvent* event) override;
    int32_t GetTime(int32_t handle, uint32_t* time) override;
    int32_t CheckService(const ServiceCheck* check) override;
    int32_t EPG_GetEvent(const EpgSvc* service, int32_t handle, EpgEvent* event,
                         ExtEpgEvent* ext) override;
    int32_t EpgMd_AddService(const EpgSvc* service) override;
    int32_t EpgMd_ClearService() override;

private:
    // Time shift's play position from `settings` at `now`. Under the lock.
    void shift(Stream& s, const STRM_Settings& settings, int64_t now);
    int32_t startPlayback(Stream& s, const STRM_Settings& settings, int64_t now);
    // Hands the stream's recording to `stop`, which closes it once the lock is released.
    void stopRecording(Stream& s, RecordingStop& stop);

    std::shared_ptr<Receiver> mRx;
};

class ReceiverCfg : public android::Cfg {
public:
    explicit ReceiverCfg(std::shared_ptr<Receiver> rx) : mRx(std::move(rx)) {}
    int32_t Reset(int32_t dev) override;
    int32_t GotoPosition(int32_t dev, uint8_t position) override;
    int32_t StorePosition(int32_t dev, uint8_t position) override;
    int32_t Recalculate(int32_t dev, uint8_t position) override;
    int32_t Drive(int32_t dev, uint8_t direction, uint8_t mode, uint8_t value) override;
    int32_t Stop(int32_t dev) override;
    int32_t SetLimit(int32_t dev, uint8_t limit) override;
    int32_t DisableLimit(int32_t dev) override;
    int32_t EnableLimit(int32_t dev) override;
    int32_t GotoSatellite(int32_t dev, int16_t satLongitude, int16_t myLongitude,
                          int16_t myLatitude) override;
    int32_t TryTune(int32_t dev, const ANT_FrontendParameters* params) override;
    int32_t Tune(int32_t dev, const ANT_FrontendParameters* params) override;
    int32_t GetStatus(int32_t dev, ANT_Status* status) override;
    int32_t SetMuteAudio(int32_t dev, uint8_t mute) override;
    int32_t SetAudioVolume(int32_t volume) override;
    int32_t SetMuteVideo(int32_t dev, uint8_t mute) override;
    int32_t SetVideoPos(int32_t dev, const Video_Position* pos) override;
    int32_t CaGetStatus(int32_t dev, int32_t* source, int32_t* lastCwSet) override;
    int32_t CaStandby(int32_t dev) override;
    int32_t GpioSet(int32_t line, int32_t value) override;
    int32_t Reserved21() override { return kErrNotSupported; }
    int32_t BlindScanStart(int32_t dev, int32_t a, int32_t b, int32_t c, int32_t d) override;
    int32_t BlindScanStop(int32_t dev) override;
    int32_t TSDumpStart(int32_t dev, int32_t a, int32_t b, const char* path) override;
    int32_t TSDumpStop() override;
    int32_t GetVideoPos(int32_t dev, Video_Position* pos) override;
    int32_t SetWakeup(int32_t value) override;

private:
    std::shared_ptr<Receiver> mRx;
};

class ReceiverSubttl : public android::Subttl {
public:
    explicit ReceiverSubttl(std::shared_ptr<Receiver> rx) : mRx(std::move(rx)) {}
    int32_t Init() override { return kOk; }
    int32_t Start(const SUBTTL_Settings* settings) override;
    int32_t Stop(int32_t handle) override;
    int32_t GetData(int32_t handle, void* data) override;

private:
    std::shared_ptr<Receiver> mRx;
};

class ReceiverTeltxt : public android::Teltxt {
public:
    explicit ReceiverTeltxt(std::shared_ptr<Receiver> rx) : mRx(std::move(rx)) {}
    int32_t Start(const TELTXT_Settings* settings) override;
    int32_t Stop(int32_t handle) override;
    int32_t SetData(int32_t handle, int32_t page, int32_t subpage, int32_t* prev100,
                    int32_t* prev10, int32_t* next10, int32_t* next100) override;
    int32_t GetData(int32_t handle, int32_t offset, int32_t count, uint8_t* dst) override;

private:
    std::shared_ptr<Receiver> mRx;
};

}  // namespace dvbrx
