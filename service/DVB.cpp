#include <DVB.h>

#include <android_runtime/AndroidRuntime.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <thread>

#include "Service.h"
#include "spy/Spy.h"
#ifdef DVB_RECEIVER
#include "receiver/Receiver.h"
#endif

namespace dvbsvc {
namespace {

struct Entry {
    android::DVB* dvb;
    android::wp<android::DVB> ref;
    // Set once a listener has been installed, which happens through a strong reference. Until
    // then the object may still be under construction with no strong reference at all, and
    // promoting it would take and drop the first one, destroying it.
    bool published;
};

std::mutex gRegistryLock;
std::vector<Entry> gLive;
std::vector<android::wp<android::DVBListener>> gListeners;
Backend* gBackend = nullptr;

void noteListener(android::DVB* dvb, const android::sp<android::DVBListener>& listener) {
    std::lock_guard<std::mutex> lock(gRegistryLock);
    for (Entry& e : gLive) {
        if (e.dvb == dvb) e.published = true;
    }
    if (listener != nullptr) gListeners.emplace_back(listener);
}

// With DVB_SERVICE_HEARTBEAT_MS set, the service raises event (kHeartbeatEvent, n, 0) on every
// live DVB object every that many milliseconds, from one thread of its own attached to the
// Java VM: a steady event stream for apps to try their listeners on without a receiver.
constexpr int kHeartbeatEvent = 100;

void startHeartbeat() {
    static std::once_flag once;
    std::call_once(once, [] {
        const char* value = getenv("DVB_SERVICE_HEARTBEAT_MS");
        long ms = value != nullptr ? strtol(value, nullptr, 10) : 0;
        if (ms <= 0) return;
        std::thread([ms] {
            JavaVM* vm = android::AndroidRuntime::getJavaVM();
            JNIEnv* env = nullptr;
            if (vm == nullptr || vm->AttachCurrentThreadAsDaemon(&env, nullptr) != JNI_OK) return;
            for (int n = 1;; ++n) {
                std::this_thread::sleep_for(std::chrono::milliseconds(ms));
                for (const auto& dvb : liveDvbs()) raiseEvent(*dvb, kHeartbeatEvent, n, 0);
            }
        }).detach();
    });
}

// The backend of DVB objects when none was set: the emulated receiver where it is built in,
// else the spy; DVB_SERVICE=spy or DVB_SERVICE=receiver chooses.
Backend& defaultBackend() {
#ifdef DVB_RECEIVER
    const char* choice = getenv("DVB_SERVICE");
    if (choice != nullptr && strcmp(choice, "spy") == 0) return dvbspy::backend();
    return dvbrx::backend();
#else
    return dvbspy::backend();
#endif
}

}  // namespace

void setBackend(Backend* backend) {
    std::lock_guard<std::mutex> lock(gRegistryLock);
    gBackend = backend;
}

std::vector<android::sp<android::DVB>> liveDvbs() {
    std::lock_guard<std::mutex> lock(gRegistryLock);
    std::vector<android::sp<android::DVB>> out;
    for (Entry& e : gLive) {
        // An object whose last strong reference is gone stays listed until its destructor
        // has run; promoting fails for it instead of reviving it.
        if (!e.published) continue;
        android::sp<android::DVB> dvb = e.ref.promote();
        if (dvb != nullptr) out.push_back(dvb);
    }
    return out;
}

size_t liveDvbCount() {
    std::lock_guard<std::mutex> lock(gRegistryLock);
    return gLive.size();
}

size_t liveListenerCount() {
    std::lock_guard<std::mutex> lock(gRegistryLock);
    size_t n = 0;
    for (auto it = gListeners.begin(); it != gListeners.end();) {
        if (it->promote() != nullptr) {
            ++n;
            ++it;
        } else {
            it = gListeners.erase(it);
        }
    }
    return n;
}

void raiseEvent(android::DVB& dvb, int msg, int ext1, int ext2) {
    android::sp<android::DVBListener> listener;
    pthread_mutex_lock(&dvb.mLock);
    listener = dvb.mListener;
    pthread_mutex_unlock(&dvb.mLock);
    if (listener != nullptr) listener->notify(msg, ext1, ext2, nullptr);
}

}  // namespace dvbsvc

namespace android {

DVB::DVB() : mService(nullptr), mFlags(0) {
    pthread_mutex_init(&mLock, nullptr);
    dvbsvc::Backend* backend;
    {
        std::lock_guard<std::mutex> lock(dvbsvc::gRegistryLock);
        backend = dvbsvc::gBackend;
        dvbsvc::gLive.push_back({this, wp<DVB>(this), false});
    }
    if (backend == nullptr) backend = &dvbsvc::defaultBackend();
    backend->createModules(*this);
    dvbsvc::startHeartbeat();
}

DVB::~DVB() {
    {
        std::lock_guard<std::mutex> lock(dvbsvc::gRegistryLock);
        auto& live = dvbsvc::gLive;
        live.erase(std::remove_if(live.begin(), live.end(),
                                  [this](const dvbsvc::Entry& e) { return e.dvb == this; }),
                   live.end());
    }
    // The listener may call into Java as it goes, and the modules may still take the lock.
    mListener.clear();
    mScnm.clear();
    mStrm.clear();
    mCfg.clear();
    mSubttl.clear();
    mTeltxt.clear();
    pthread_mutex_destroy(&mLock);
}

status_t DVB::setListener(const sp<DVBListener>& listener) {
    sp<DVBListener> old;
    pthread_mutex_lock(&mLock);
    old = mListener;
    mListener = listener;
    pthread_mutex_unlock(&mLock);
    dvbsvc::noteListener(this, listener);
    // `old` goes here, outside the lock: its destructor calls into Java.
    return OK;
}

}  // namespace android
