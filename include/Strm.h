// Stream module of the DVB service: stream playback, its settings, status and components,
// present/following events and the event database.
#pragma once

#include <utils/RefBase.h>

#include "Cfg.h"
#include "Record.h"

struct STRM_OpenSettings {
    int32_t frontend;
    int32_t demux;
    int32_t video;
    int32_t audio;
    char szPath[128];  // zero-ended, at most 127 bytes
};
DVB_RECORD_SIZE(STRM_OpenSettings, 144);
DVB_RECORD_FIELD(STRM_OpenSettings, frontend, 0);
DVB_RECORD_FIELD(STRM_OpenSettings, demux, 4);
DVB_RECORD_FIELD(STRM_OpenSettings, video, 8);
DVB_RECORD_FIELD(STRM_OpenSettings, audio, 12);
DVB_RECORD_FIELD(STRM_OpenSettings, szPath, 16);

struct STRM_Settings {
    ANT_FrontendParameters fe;
    int16_t orbital_position;
    uint8_t reserved78[2];
    uint16_t svcId;
    uint16_t videoPid;
    uint8_t videoType;
    uint8_t reserved85;
    uint16_t audioPid;
    uint8_t audioType;
    uint8_t reserved89;
    uint16_t pcrPid;
    uint16_t pmtPid;
    uint16_t caSysId0;
    uint16_t caSysId1;
    uint16_t caSysId2;
    uint8_t reserved100[8];
    int32_t tsIndex;
    uint8_t reserved112[16];
    char langCode0[4];  // three bytes and a zero byte
    char langCode1[4];
    uint8_t reserved136[4];
    int32_t playSpeed;
    int32_t playSpeedDiv;
    int32_t posTime;
};
DVB_RECORD_SIZE(STRM_Settings, 152);
DVB_RECORD_FIELD(STRM_Settings, fe, 0);
DVB_RECORD_FIELD(STRM_Settings, orbital_position, 76);
DVB_RECORD_FIELD(STRM_Settings, reserved78, 78);
DVB_RECORD_FIELD(STRM_Settings, svcId, 80);
DVB_RECORD_FIELD(STRM_Settings, videoPid, 82);
DVB_RECORD_FIELD(STRM_Settings, videoType, 84);
DVB_RECORD_FIELD(STRM_Settings, audioPid, 86);
DVB_RECORD_FIELD(STRM_Settings, audioType, 88);
DVB_RECORD_FIELD(STRM_Settings, pcrPid, 90);
DVB_RECORD_FIELD(STRM_Settings, pmtPid, 92);
DVB_RECORD_FIELD(STRM_Settings, caSysId0, 94);
DVB_RECORD_FIELD(STRM_Settings, caSysId1, 96);
DVB_RECORD_FIELD(STRM_Settings, caSysId2, 98);
DVB_RECORD_FIELD(STRM_Settings, reserved100, 100);
DVB_RECORD_FIELD(STRM_Settings, tsIndex, 108);
DVB_RECORD_FIELD(STRM_Settings, reserved112, 112);
DVB_RECORD_FIELD(STRM_Settings, langCode0, 128);
DVB_RECORD_FIELD(STRM_Settings, langCode1, 132);
DVB_RECORD_FIELD(STRM_Settings, reserved136, 136);
DVB_RECORD_FIELD(STRM_Settings, playSpeed, 140);
DVB_RECORD_FIELD(STRM_Settings, playSpeedDiv, 144);
DVB_RECORD_FIELD(STRM_Settings, posTime, 148);

struct STRM_GetStatus {
    int32_t feStatus;
    int32_t feStrength;
    int32_t feBer;
    int32_t feSnr;
    int32_t videoPts;
    int32_t audioPts;
    int32_t localPts;
    int32_t fpsInteger;
    int32_t fpsDecimal;
    int32_t pictureStatus;
    int32_t recstate;
    int32_t recduration;
    int64_t recsize;
    int32_t recevent;
    int32_t recstartTime;
    int32_t recendTime;  // the end time comes before the current time here
    int32_t reccurTime;
    int32_t pbstate;
    int32_t pbposition;
    int32_t pbevent;  // the event comes before the start and end times here
    int32_t pbstartTime;
    int32_t pbendTime;
    int32_t result;
};
DVB_RECORD_SIZE(STRM_GetStatus, 96);
DVB_RECORD_FIELD(STRM_GetStatus, feStatus, 0);
DVB_RECORD_FIELD(STRM_GetStatus, feStrength, 4);
DVB_RECORD_FIELD(STRM_GetStatus, feBer, 8);
DVB_RECORD_FIELD(STRM_GetStatus, feSnr, 12);
DVB_RECORD_FIELD(STRM_GetStatus, videoPts, 16);
DVB_RECORD_FIELD(STRM_GetStatus, audioPts, 20);
DVB_RECORD_FIELD(STRM_GetStatus, localPts, 24);
DVB_RECORD_FIELD(STRM_GetStatus, fpsInteger, 28);
DVB_RECORD_FIELD(STRM_GetStatus, fpsDecimal, 32);
DVB_RECORD_FIELD(STRM_GetStatus, pictureStatus, 36);
DVB_RECORD_FIELD(STRM_GetStatus, recstate, 40);
DVB_RECORD_FIELD(STRM_GetStatus, recduration, 44);
DVB_RECORD_FIELD(STRM_GetStatus, recsize, 48);
DVB_RECORD_FIELD(STRM_GetStatus, recevent, 56);
DVB_RECORD_FIELD(STRM_GetStatus, recstartTime, 60);
DVB_RECORD_FIELD(STRM_GetStatus, recendTime, 64);
DVB_RECORD_FIELD(STRM_GetStatus, reccurTime, 68);
DVB_RECORD_FIELD(STRM_GetStatus, pbstate, 72);
DVB_RECORD_FIELD(STRM_GetStatus, pbposition, 76);
DVB_RECORD_FIELD(STRM_GetStatus, pbevent, 80);
DVB_RECORD_FIELD(STRM_GetStatus, pbstartTime, 84);
DVB_RECORD_FIELD(STRM_GetStatus, pbendTime, 88);
DVB_RECORD_FIELD(STRM_GetStatus, result, 92);

struct VideoContent {
    uint16_t pid;
    uint8_t type;
    uint8_t reserved3;
};
DVB_RECORD_SIZE(VideoContent, 4);
DVB_RECORD_FIELD(VideoContent, pid, 0);
DVB_RECORD_FIELD(VideoContent, type, 2);

struct AudioContent {
    uint16_t pid;
    uint8_t isDolbyAC3;
    uint8_t type;
    char langCode0[4];
    char langCode1[4];
    uint8_t componetTag;
    char streamName[33];
};
DVB_RECORD_SIZE(AudioContent, 46);
DVB_RECORD_FIELD(AudioContent, pid, 0);
DVB_RECORD_FIELD(AudioContent, isDolbyAC3, 2);
DVB_RECORD_FIELD(AudioContent, type, 3);
DVB_RECORD_FIELD(AudioContent, langCode0, 4);
DVB_RECORD_FIELD(AudioContent, langCode1, 8);
DVB_RECORD_FIELD(AudioContent, componetTag, 12);
DVB_RECORD_FIELD(AudioContent, streamName, 13);

struct SubtitleContent {
    uint16_t pid;
    uint8_t type;
    char langCode[4];
    uint8_t magazineNumber;
    uint8_t pageNumber;
    uint8_t reserved9;
    uint16_t compositionPageId;
    uint16_t ancillaryPageId;
};
DVB_RECORD_SIZE(SubtitleContent, 14);
DVB_RECORD_FIELD(SubtitleContent, pid, 0);
DVB_RECORD_FIELD(SubtitleContent, type, 2);
DVB_RECORD_FIELD(SubtitleContent, langCode, 3);
DVB_RECORD_FIELD(SubtitleContent, magazineNumber, 7);
DVB_RECORD_FIELD(SubtitleContent, pageNumber, 8);
DVB_RECORD_FIELD(SubtitleContent, compositionPageId, 10);
DVB_RECORD_FIELD(SubtitleContent, ancillaryPageId, 12);

struct TeletextContent {
    uint16_t pid;
    uint8_t type;
    char langCode[4];
    uint8_t magazineNumber;
    uint8_t pageNumber;
    uint8_t componetTag;
    char streamName[32];
};
DVB_RECORD_SIZE(TeletextContent, 42);
DVB_RECORD_FIELD(TeletextContent, pid, 0);
DVB_RECORD_FIELD(TeletextContent, type, 2);
DVB_RECORD_FIELD(TeletextContent, langCode, 3);
DVB_RECORD_FIELD(TeletextContent, magazineNumber, 7);
DVB_RECORD_FIELD(TeletextContent, pageNumber, 8);
DVB_RECORD_FIELD(TeletextContent, componetTag, 9);
DVB_RECORD_FIELD(TeletextContent, streamName, 10);

// Entries per component list, in the record and in each exported cache.
constexpr int kStreamComponents = 16;

struct STRM_StreamInfo {
    int32_t videoCount;
    VideoContent video[kStreamComponents];
    int32_t audioCount;
    AudioContent audio[kStreamComponents];
    int32_t teletextCount;
    TeletextContent teletext[kStreamComponents];
    int32_t subtitleCount;
    SubtitleContent subtitle[kStreamComponents];
    uint16_t pcrPid;
    uint16_t caSysId[3];
    uint8_t reserved1720[8];
};
DVB_RECORD_SIZE(STRM_StreamInfo, 1728);
DVB_RECORD_FIELD(STRM_StreamInfo, videoCount, 0);
DVB_RECORD_FIELD(STRM_StreamInfo, video, 4);
DVB_RECORD_FIELD(STRM_StreamInfo, audioCount, 68);
DVB_RECORD_FIELD(STRM_StreamInfo, audio, 72);
DVB_RECORD_FIELD(STRM_StreamInfo, teletextCount, 808);
DVB_RECORD_FIELD(STRM_StreamInfo, teletext, 812);
DVB_RECORD_FIELD(STRM_StreamInfo, subtitleCount, 1484);
DVB_RECORD_FIELD(STRM_StreamInfo, subtitle, 1488);
DVB_RECORD_FIELD(STRM_StreamInfo, pcrPid, 1712);
DVB_RECORD_FIELD(STRM_StreamInfo, caSysId, 1714);
DVB_RECORD_FIELD(STRM_StreamInfo, reserved1720, 1720);

struct EpgEvent {
    uint16_t evtId;
    uint8_t reserved2[2];
    int32_t startTime;
    int32_t duration;
    uint8_t runStatus;
    uint8_t parentalRating;
    uint8_t content;
    uint8_t reserved15;
    uint16_t refSvcId;
    uint16_t refEvtId;
    char name[52];
    char text[256];
    uint8_t extendedFlag;
    uint8_t reserved329[7];
};
DVB_RECORD_SIZE(EpgEvent, 336);
DVB_RECORD_FIELD(EpgEvent, evtId, 0);
DVB_RECORD_FIELD(EpgEvent, startTime, 4);
DVB_RECORD_FIELD(EpgEvent, duration, 8);
DVB_RECORD_FIELD(EpgEvent, runStatus, 12);
DVB_RECORD_FIELD(EpgEvent, parentalRating, 13);
DVB_RECORD_FIELD(EpgEvent, content, 14);
DVB_RECORD_FIELD(EpgEvent, refSvcId, 16);
DVB_RECORD_FIELD(EpgEvent, refEvtId, 18);
DVB_RECORD_FIELD(EpgEvent, name, 20);
DVB_RECORD_FIELD(EpgEvent, text, 72);
DVB_RECORD_FIELD(EpgEvent, extendedFlag, 328);

struct ExtEpgEventItem {
    char itemDesc[32];
    char itemText[64];  // reaches Java as ExtEpgEventItem.type
};
DVB_RECORD_SIZE(ExtEpgEventItem, 96);
DVB_RECORD_FIELD(ExtEpgEventItem, itemDesc, 0);
DVB_RECORD_FIELD(ExtEpgEventItem, itemText, 32);

// Items per extended event, in the record and in each exported cache.
constexpr int kExtEpgItems = 16;

struct ExtEpgEvent {
    uint32_t itemCount;
    ExtEpgEventItem items[kExtEpgItems];
    char text[2048];
};
DVB_RECORD_SIZE(ExtEpgEvent, 3588);
DVB_RECORD_FIELD(ExtEpgEvent, itemCount, 0);
DVB_RECORD_FIELD(ExtEpgEvent, items, 4);
DVB_RECORD_FIELD(ExtEpgEvent, text, 1540);

struct EpgSvc {
    uint16_t svcId;
    uint16_t tsId;
    uint16_t onId;
    uint8_t reserved6[2];
    uint32_t tpIndex;
    uint32_t netIndex;
    uint32_t netType;
};
DVB_RECORD_SIZE(EpgSvc, 20);
DVB_RECORD_FIELD(EpgSvc, svcId, 0);
DVB_RECORD_FIELD(EpgSvc, tsId, 2);
DVB_RECORD_FIELD(EpgSvc, onId, 4);
DVB_RECORD_FIELD(EpgSvc, tpIndex, 8);
DVB_RECORD_FIELD(EpgSvc, netIndex, 12);
DVB_RECORD_FIELD(EpgSvc, netType, 16);

struct ServiceCheck {
    int32_t satPosition;
    int32_t freq;
    int32_t tsid;
    int32_t sid;
};
DVB_RECORD_SIZE(ServiceCheck, 16);
DVB_RECORD_FIELD(ServiceCheck, satPosition, 0);
DVB_RECORD_FIELD(ServiceCheck, freq, 4);
DVB_RECORD_FIELD(ServiceCheck, tsid, 8);
DVB_RECORD_FIELD(ServiceCheck, sid, 12);

namespace android {

class Strm : public RefBase {
public:
    virtual int32_t Init() = 0;
    virtual int32_t Open(const STRM_OpenSettings* settings) = 0;
    virtual int32_t Close(int32_t handle) = 0;
    virtual int32_t Start(int32_t handle, const STRM_Settings* settings) = 0;
    virtual int32_t Stop(int32_t handle, int32_t flag) = 0;
    virtual int32_t GetSettings(int32_t handle, STRM_Settings* settings) = 0;
    virtual int32_t SetSettings(int32_t handle, const STRM_Settings* settings) = 0;
    virtual int32_t GetStatus(int32_t handle, STRM_GetStatus* status) = 0;
    virtual int32_t CreatStreamInfo(int32_t handle, STRM_StreamInfo* info) = 0;
    virtual int32_t GetAllEvent(int32_t handle, EpgEvent* present, EpgEvent* following,
                                ExtEpgEvent* presentExt, ExtEpgEvent* followingExt) = 0;
    virtual int32_t GetEvent(int32_t handle, EpgEvent* event) = 0;
    virtual int32_t GetTime(int32_t handle, uint32_t* time) = 0;
    virtual int32_t CheckService(const ServiceCheck* check) = 0;
    virtual int32_t EPG_GetEvent(const EpgSvc* service, int32_t handle, EpgEvent* event,
                                 ExtEpgEvent* ext) = 0;
    virtual int32_t EpgMd_AddService(const EpgSvc* service) = 0;
    virtual int32_t EpgMd_ClearService() = 0;
};

}  // namespace android
