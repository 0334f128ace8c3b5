// The front-end parameter block, filled by one rule for tuning, scanning and streams.
#pragma once

#include <Cfg.h>

#include "Fields.h"

namespace dvbjni {

// The 24 Java values that a front-end block is made from, in the order they are read.
struct FrontendValues {
    int32_t type;
    int32_t frequency;
    int32_t symbolRate;
    int32_t fecInner;
    int32_t modulation;
    int32_t polarization;
    int32_t rolloff;
    int32_t diseqctype;
    int32_t tone;
    int32_t lnbpower;
    int32_t lnbLowLO;
    int32_t lnbHigLO;
    int32_t port;
    int32_t port16;
    int32_t posIndex;
    int32_t satPosition;
    int32_t myLongitude;
    int32_t myLatitude;
    int32_t toneBurst;
    int32_t ubSlot;
    int32_t ubFreq;
    int32_t ubSat;
    int32_t out5v;
    int32_t bandwidth;
};

// The same 24 field names in every Java class that carries front-end settings
// (Cfg$ANT_FrontendParameters, Scnm$SCNM_StartSettings, Strm$STRM_FrontEnd).
extern const JavaField kFrontendFields[24];

// Fills `fe`, which the caller has zeroed. The type code is 1 or 2 for those Java types and 0
// for every other; each code carries its own parameters and leaves the others 0. Narrow
// fields take the low bits of the Java value.
void fillFrontend(const FrontendValues& v, ANT_FrontendParameters* fe);

// Reads the front-end fields of `object` (of class `className`) and fills `fe` with them.
// `extra` maps further fields of the same class into `extraRecord`, with the same class
// look-up.
bool readFrontend(JNIEnv* env, jobject object, const char* className, ANT_FrontendParameters* fe,
                  const JavaField* extra = nullptr, size_t extraCount = 0,
                  void* extraRecord = nullptr);

}  // namespace dvbjni
