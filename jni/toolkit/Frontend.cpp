#include "Frontend.h"

#include <nativehelper/scoped_local_ref.h>

namespace dvbjni {

const JavaField kFrontendFields[24] = {
        JF_INT(FrontendValues, type, "type"),
        JF_INT(FrontendValues, frequency, "frequency"),
        JF_INT(FrontendValues, symbolRate, "symbolRate"),
        JF_INT(FrontendValues, fecInner, "fecInner"),
        JF_INT(FrontendValues, modulation, "modulation"),
        JF_INT(FrontendValues, polarization, "polarization"),
        JF_INT(FrontendValues, rolloff, "rolloff"),
        JF_INT(FrontendValues, diseqctype, "diseqctype"),
        JF_INT(FrontendValues, tone, "tone"),
        JF_INT(FrontendValues, lnbpower, "lnbpower"),
        JF_INT(FrontendValues, lnbLowLO, "lnbLowLO"),
        JF_INT(FrontendValues, lnbHigLO, "lnbHigLO"),
        JF_INT(FrontendValues, port, "port"),
        JF_INT(FrontendValues, port16, "port16"),
        JF_INT(FrontendValues, posIndex, "posIndex"),
        JF_INT(FrontendValues, satPosition, "satPosition"),
        JF_INT(FrontendValues, myLongitude, "myLongitude"),
        JF_INT(FrontendValues, myLatitude, "myLatitude"),
        JF_INT(FrontendValues, toneBurst, "toneBurst"),
        JF_INT(FrontendValues, ubSlot, "ubSlot"),
        JF_INT(FrontendValues, ubFreq, "ubFreq"),
        JF_INT(FrontendValues, ubSat, "ubSat"),
        JF_INT(FrontendValues, out5v, "out5v"),
        JF_INT(FrontendValues, bandwidth, "bandwidth"),
};

void fillFrontend(const FrontendValues& v, ANT_FrontendParameters* fe) {
    if (v.type == 1) {
        fe->type = 1;
        fe->symbolRate = v.symbolRate;
        fe->fecInner = v.fecInner;
        fe->modulation = v.modulation;
    } else if (v.type == 2) {
        fe->type = 2;
        fe->bandwidth = v.bandwidth;
    } else {
        fe->type = 0;
        fe->symbolRate = v.symbolRate;
        fe->fecInner = v.fecInner;
        fe->modulation = v.modulation;
        fe->polarization = v.polarization;
        fe->rolloff = v.rolloff;
    }
    fe->frequency = v.frequency;
    fe->diseqctype = v.diseqctype;
    fe->tone = static_cast<uint8_t>(v.tone);
    fe->lnbpower = static_cast<uint8_t>(v.lnbpower);
    fe->lnbLowLO = v.lnbLowLO;
    fe->lnbHigLO = v.lnbHigLO;
    fe->port = static_cast<uint8_t>(v.port);
    fe->port16 = static_cast<uint8_t>(v.port16);
    fe->posIndex = static_cast<uint8_t>(v.posIndex);
    fe->satPosition = v.satPosition;
    fe->myLongitude = v.myLongitude;
    fe->myLatitude = v.myLatitude;
    fe->toneBurst = static_cast<uint8_t>(v.toneBurst);
    fe->ubSlot = static_cast<uint8_t>(v.ubSlot);
    fe->ubFreq = static_cast<uint16_t>(v.ubFreq);
    fe->ubSat = static_cast<uint8_t>(v.ubSat);
    fe->out5v = static_cast<uint8_t>(v.out5v);
}

bool readFrontend(JNIEnv* env, jobject object, const char* className, ANT_FrontendParameters* fe,
                  const JavaField* extra, size_t extraCount, void* extraRecord) {
    if (!requireObject(env, object, className)) return false;
    ScopedLocalRef<jclass> cls(env, env->FindClass(className));
    FieldIds ids;
    FieldIds extraIds;
    FrontendValues values;
    constexpr size_t kCount = sizeof kFrontendFields / sizeof kFrontendFields[0];
    if (cls.get() == nullptr || !ids.lookup(env, cls.get(), kFrontendFields, kCount) ||
        !extraIds.lookup(env, cls.get(), extra, extraCount) ||
        !readRecord(env, object, className, kFrontendFields, ids, kCount, &values) ||
        !readRecord(env, object, className, extra, extraIds, extraCount, extraRecord)) {
        return false;
    }
    fillFrontend(values, fe);
    return true;
}

}  // namespace dvbjni
