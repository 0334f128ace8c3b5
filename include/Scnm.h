// Scan module of the DVB service: channel search, its results, system start-up and shut-down.
#pragma once

#include <utils/RefBase.h>

#include "Cfg.h"
#include "Record.h"

struct SCNM_OpenSettings {
    int32_t frontend;
    int32_t demux;
};
DVB_RECORD_SIZE(SCNM_OpenSettings, 8);
DVB_RECORD_FIELD(SCNM_OpenSettings, frontend, 0);
DVB_RECORD_FIELD(SCNM_OpenSettings, demux, 4);

struct SCNM_StartSettings {
    ANT_FrontendParameters fe;
    uint32_t reserved76;
    uint32_t reserved80;
    int32_t scanType;
    int32_t scanNetwrok;
    char langCode[4];  // three bytes and a zero byte
};
DVB_RECORD_SIZE(SCNM_StartSettings, 96);
DVB_RECORD_FIELD(SCNM_StartSettings, fe, 0);
DVB_RECORD_FIELD(SCNM_StartSettings, reserved76, 76);
DVB_RECORD_FIELD(SCNM_StartSettings, reserved80, 80);
DVB_RECORD_FIELD(SCNM_StartSettings, scanType, 84);
DVB_RECORD_FIELD(SCNM_StartSettings, scanNetwrok, 88);
DVB_RECORD_FIELD(SCNM_StartSettings, langCode, 92);

struct SCNM_GetStatus {
    int32_t feStatus;
    int32_t sfStatus;
    int32_t result;
};
DVB_RECORD_SIZE(SCNM_GetStatus, 12);
DVB_RECORD_FIELD(SCNM_GetStatus, feStatus, 0);
DVB_RECORD_FIELD(SCNM_GetStatus, sfStatus, 4);
DVB_RECORD_FIELD(SCNM_GetStatus, result, 8);

// One service found by a search: a node of the module's list and an entry of s_SvcExt. The
// bytes between the named fields belong to the module and travel with the node.
struct SCNM_ServiceInfo {
    int32_t svcType;
    uint16_t svcId;
    uint16_t videoPid;
    uint8_t videoType;
    uint8_t module9;
    uint16_t audioPid;
    uint8_t audioType;
    uint8_t module13;
    uint16_t pcrPid;
    uint16_t pmtPid;
    uint16_t caSysId0;
    uint16_t caSysId1;
    uint16_t caSysId2;
    uint8_t module24[12];
    char svcName[64];  // zero-ended when shorter than the field
    uint16_t tsId;
    uint16_t onId;
    uint32_t lcn;
    uint8_t content;
    uint8_t module109[3];
    uint32_t next;  // link to the next node, see dvbListNext()
    uint8_t module116[8];
};
DVB_RECORD_SIZE(SCNM_ServiceInfo, 124);
DVB_RECORD_FIELD(SCNM_ServiceInfo, svcType, 0);
DVB_RECORD_FIELD(SCNM_ServiceInfo, svcId, 4);
DVB_RECORD_FIELD(SCNM_ServiceInfo, videoPid, 6);
DVB_RECORD_FIELD(SCNM_ServiceInfo, videoType, 8);
DVB_RECORD_FIELD(SCNM_ServiceInfo, audioPid, 10);
DVB_RECORD_FIELD(SCNM_ServiceInfo, audioType, 12);
DVB_RECORD_FIELD(SCNM_ServiceInfo, pcrPid, 14);
DVB_RECORD_FIELD(SCNM_ServiceInfo, pmtPid, 16);
DVB_RECORD_FIELD(SCNM_ServiceInfo, caSysId0, 18);
DVB_RECORD_FIELD(SCNM_ServiceInfo, caSysId1, 20);
DVB_RECORD_FIELD(SCNM_ServiceInfo, caSysId2, 22);
DVB_RECORD_FIELD(SCNM_ServiceInfo, module24, 24);
DVB_RECORD_FIELD(SCNM_ServiceInfo, svcName, 36);
DVB_RECORD_FIELD(SCNM_ServiceInfo, tsId, 100);
DVB_RECORD_FIELD(SCNM_ServiceInfo, onId, 102);
DVB_RECORD_FIELD(SCNM_ServiceInfo, lcn, 104);
DVB_RECORD_FIELD(SCNM_ServiceInfo, content, 108);
DVB_RECORD_FIELD(SCNM_ServiceInfo, next, 112);
DVB_RECORD_FIELD(SCNM_ServiceInfo, module116, 116);

// One network (transponder) found by a search: a node of the module's list and an entry of
// s_SvcNet.
struct SCNMNET_FrontEndSettings {
    int32_t type;
    int32_t frequency;
    int32_t symbolRate;
    int32_t fecInner;
    int32_t modulation;
    int32_t polarization;
    int32_t rolloff;
    uint8_t module28[56];
    uint32_t next;  // link to the next node, see dvbListNext()
    uint8_t module88[8];
};
DVB_RECORD_SIZE(SCNMNET_FrontEndSettings, 96);
DVB_RECORD_FIELD(SCNMNET_FrontEndSettings, type, 0);
DVB_RECORD_FIELD(SCNMNET_FrontEndSettings, frequency, 4);
DVB_RECORD_FIELD(SCNMNET_FrontEndSettings, symbolRate, 8);
DVB_RECORD_FIELD(SCNMNET_FrontEndSettings, fecInner, 12);
DVB_RECORD_FIELD(SCNMNET_FrontEndSettings, modulation, 16);
DVB_RECORD_FIELD(SCNMNET_FrontEndSettings, polarization, 20);
DVB_RECORD_FIELD(SCNMNET_FrontEndSettings, rolloff, 24);
DVB_RECORD_FIELD(SCNMNET_FrontEndSettings, next, 84);

struct DVB_Config {
    int32_t displayMode;
    int32_t sdkMode;
};
DVB_RECORD_SIZE(DVB_Config, 8);
DVB_RECORD_FIELD(DVB_Config, displayMode, 0);
DVB_RECORD_FIELD(DVB_Config, sdkMode, 4);

// The `next` link of a scan-result node is 4 bytes wide. On the device's 32-bit build it is
// the next node's address. A 64-bit address does not fit, so on 64-bit builds the link holds
// the next node's distance from this node in bytes (the service keeps a list in one block);
// 0 ends the list on both.
template <typename Node>
inline const Node* dvbListNext(const Node* node) {
    if (node->next == 0) return nullptr;
    if constexpr (sizeof(void*) == 4) {
        return reinterpret_cast<const Node*>(static_cast<uintptr_t>(node->next));
    } else {
        return reinterpret_cast<const Node*>(reinterpret_cast<const char*>(node) +
                                             static_cast<int32_t>(node->next));
    }
}

// Writes the link from `node` to `next` (null ends the list). On 64-bit builds both nodes
// must lie within 2 GiB of each other.
template <typename Node>
inline void dvbListLink(Node* node, const Node* next) {
    if (next == nullptr) {
        node->next = 0;
    } else if constexpr (sizeof(void*) == 4) {
        node->next = static_cast<uint32_t>(reinterpret_cast<uintptr_t>(next));
    } else {
        node->next = static_cast<uint32_t>(static_cast<int32_t>(
                reinterpret_cast<const char*>(next) - reinterpret_cast<const char*>(node)));
    }
}

namespace android {

class Scnm : public RefBase {
public:
    virtual int32_t Reserved1() = 0;  // never called by this library
    virtual int32_t Init() = 0;
    virtual int32_t Open(const SCNM_OpenSettings* settings) = 0;
    virtual int32_t Close(int32_t handle) = 0;
    virtual int32_t Start(int32_t handle, const SCNM_StartSettings* settings) = 0;
    virtual int32_t Stop(int32_t handle) = 0;
    virtual int32_t GetStatus(int32_t handle, SCNM_GetStatus* status) = 0;
    virtual int32_t CreateServiceList(int32_t handle, SCNM_ServiceInfo** head) = 0;
    virtual int32_t Reserved9() = 0;  // never called by this library
    virtual int32_t CreateNetworkList(int32_t handle, SCNMNET_FrontEndSettings** head) = 0;
    virtual int32_t Reserved11() = 0;  // never called by this library
    virtual int32_t Dvb_SystemInit(const DVB_Config* config) = 0;
    virtual int32_t Dvb_SystemUnInit(const DVB_Config* config) = 0;
};

}  // namespace android
