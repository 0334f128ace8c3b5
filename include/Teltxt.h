// Teletext module of the DVB service: teletext decoding and pages.
#pragma once

#include <utils/RefBase.h>

#include "Record.h"

struct TELTXT_Settings {
    uint32_t devId;
    uint16_t pid;
    uint8_t type;
    char langCode[4];  // no terminator of its own
    uint8_t magazineNumber;
    uint8_t pageNumber;
    uint8_t componetTag;
    char streamName[32];  // no terminator of its own
    uint16_t pidCopy;     // the PID again
};
DVB_RECORD_SIZE(TELTXT_Settings, 48);
DVB_RECORD_FIELD(TELTXT_Settings, devId, 0);
DVB_RECORD_FIELD(TELTXT_Settings, pid, 4);
DVB_RECORD_FIELD(TELTXT_Settings, type, 6);
DVB_RECORD_FIELD(TELTXT_Settings, langCode, 7);
DVB_RECORD_FIELD(TELTXT_Settings, magazineNumber, 11);
DVB_RECORD_FIELD(TELTXT_Settings, pageNumber, 12);
DVB_RECORD_FIELD(TELTXT_Settings, componetTag, 13);
DVB_RECORD_FIELD(TELTXT_Settings, streamName, 14);
DVB_RECORD_FIELD(TELTXT_Settings, pidCopy, 46);

// Largest piece of data that one Teltxt::GetData call delivers.
constexpr int32_t kTeltxtChunk = 0x80000;

namespace android {

class Teltxt : public RefBase {
public:
    virtual int32_t Start(const TELTXT_Settings* settings) = 0;
    virtual int32_t Stop(int32_t handle) = 0;
    virtual int32_t SetData(int32_t handle, int32_t a, int32_t b, int32_t* prev100, int32_t* prev10,
                            int32_t* next10, int32_t* next100) = 0;
    // Writes `count` bytes (at most kTeltxtChunk) of the decoder's data, from `offset` on.
    virtual int32_t GetData(int32_t handle, int32_t offset, int32_t count, uint8_t* dst) = 0;
};

}  // namespace android
