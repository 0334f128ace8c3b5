// The DVB service object and its listener interface.
#pragma once

#include <pthread.h>
#include <utils/Errors.h>
#include <utils/RefBase.h>
#include <utils/StrongPointer.h>

#include "Cfg.h"
#include "Scnm.h"
#include "Strm.h"
#include "Subttl.h"
#include "Teltxt.h"

namespace android {

class Parcel;

// Receives the service's events, on the service's own threads.
class DVBListener : virtual public RefBase {
public:
    virtual void notify(int msg, int ext1, int ext2, const Parcel* obj) = 0;
};

// One DVB service instance with its five modules. The members up to mLock are read by the
// native layer and are part of the binary interface.
class DVB : public RefBase {
public:
    DVB();
    status_t setListener(const sp<DVBListener>& listener);

    sp<Scnm> mScnm;
    sp<Strm> mStrm;
    sp<Cfg> mCfg;
    sp<Subttl> mSubttl;
    sp<Teltxt> mTeltxt;
    sp<DVBListener> mListener;
    void* mService;
    pthread_mutex_t mLock;
    int32_t mFlags;

protected:
    ~DVB() override;
};

}  // namespace android
