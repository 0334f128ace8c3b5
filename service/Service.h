// The substitute DVB service's internals: the backend seam behind android::DVB, the registry
// of live service objects, and event delivery to a DVB object's listener.
#pragma once

#include <DVB.h>

#include <vector>

namespace dvbsvc {

// A backend gives each new android::DVB its modules. It may leave any module out.
class Backend {
public:
    virtual ~Backend() = default;
    virtual void createModules(android::DVB& dvb) = 0;
};

// Makes `backend` the one that later DVB objects get their modules from (null: the default).
void setBackend(Backend* backend);

// The DVB objects alive now that have had a listener installed, in creation order. Each
// entry is a strong reference.
std::vector<android::sp<android::DVB>> liveDvbs();
size_t liveDvbCount();

// How many of the listeners ever installed with setListener are still alive.
size_t liveListenerCount();

// Calls the listener installed on `dvb`, if any, on the calling thread. The listener is taken
// under the object's lock and called without it, as the device's service does.
void raiseEvent(android::DVB& dvb, int msg, int ext1, int ext2);

}  // namespace dvbsvc
