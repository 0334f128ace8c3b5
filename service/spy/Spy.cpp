#include "Spy.h"

#include <android_runtime/AndroidRuntime.h>

#include <algorithm>
#include <atomic>
#include <cstring>
#include <map>
#include <mutex>
#include <set>
#include <thread>

namespace dvbspy {
namespace {

struct Patch {
    int arg;
    size_t offset;
    std::vector<uint8_t> bytes;
};

struct State {
    std::mutex lock;
    std::vector<Call> calls;
    std::map<std::string, int32_t> results;
    std::map<std::string, std::vector<Patch>> patches;
    std::map<std::string, std::vector<std::vector<uint8_t>>> lists;
    std::set<std::string> omitted;
    // Nodes handed out by the last list call of each kind; the module owns them.
    std::vector<SCNM_ServiceInfo> serviceNodes;
    std::vector<SCNMNET_FrontEndSettings> networkNodes;
    void (*attachHook)(JNIEnv*) = nullptr;
};

std::atomic<bool> gQuiet{false};

State& state() {
    static State* s = new State;  // never destroyed: service threads may outlive main()
    return *s;
}

// One argument of a recorded call: a value, or a pointer with the size of what it points at.
struct Arg {
    int64_t value;
    void* ptr;
    size_t size;
};

Arg V(int64_t v) {
    return {v, nullptr, 0};
}
template <typename T>
Arg P(const T* p) {
    return {0, const_cast<T*>(p), p != nullptr ? sizeof(T) : 0};
}
Arg P(const void* p, size_t size) {
    return {0, const_cast<void*>(p), p != nullptr ? size : 0};
}

int32_t record(const char* op, const android::DVB* owner, std::initializer_list<Arg> args,
               std::vector<uint8_t>* extraRecord = nullptr) {
    if (gQuiet.load(std::memory_order_relaxed)) return 0;
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    Call call{op, owner, {}, {}};
    for (const Arg& a : args) {
        call.args.push_back(a.value);
        if (a.size != 0) {
            const auto* b = static_cast<const uint8_t*>(a.ptr);
            call.records.emplace_back(b, b + a.size);
        }
    }
    if (extraRecord != nullptr) call.records.push_back(std::move(*extraRecord));
    s.calls.push_back(std::move(call));

    auto patches = s.patches.find(op);
    if (patches != s.patches.end()) {
        std::vector<Arg> list(args);
        for (const Patch& p : patches->second) {
            if (p.arg < 0 || static_cast<size_t>(p.arg) >= list.size()) continue;
            const Arg& a = list[p.arg];
            if (a.ptr == nullptr || p.offset >= a.size) continue;
            size_t n = std::min(p.bytes.size(), a.size - p.offset);
            memcpy(static_cast<uint8_t*>(a.ptr) + p.offset, p.bytes.data(), n);
        }
    }
    auto result = s.results.find(op);
    return result == s.results.end() ? 0 : result->second;
}

template <typename Node>
void handOutList(const char* op, std::vector<Node>& block, Node** head) {
    if (gQuiet.load(std::memory_order_relaxed)) return;
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    block.clear();
    auto it = s.lists.find(op);
    if (it != s.lists.end()) {
        block.resize(it->second.size());
        for (size_t i = 0; i < block.size(); ++i) {
            memset(&block[i], 0, sizeof(Node));
            memcpy(&block[i], it->second[i].data(), std::min(sizeof(Node), it->second[i].size()));
        }
        for (size_t i = 0; i < block.size(); ++i) {
            dvbListLink(&block[i], i + 1 < block.size() ? &block[i + 1] : nullptr);
        }
    }
    *head = block.empty() ? nullptr : block.data();
}

class SpyScnm : public android::Scnm {
public:
    explicit SpyScnm(const android::DVB* owner) : mOwner(owner) {}
    int32_t Reserved1() override { return record("Scnm::Reserved1", mOwner, {}); }
    int32_t Init() override { return record("Scnm::Init", mOwner, {}); }
    int32_t Open(const SCNM_OpenSettings* s) override {
        return record("Scnm::Open", mOwner, {P(s)});
    }
    int32_t Close(int32_t h) override { return record("Scnm::Close", mOwner, {V(h)}); }
    int32_t Start(int32_t h, const SCNM_StartSettings* s) override {
        return record("Scnm::Start", mOwner, {V(h), P(s)});
    }
    int32_t Stop(int32_t h) override { return record("Scnm::Stop", mOwner, {V(h)}); }
    int32_t GetStatus(int32_t h, SCNM_GetStatus* s) override {
        return record("Scnm::GetStatus", mOwner, {V(h), P(s)});
    }
    int32_t CreateServiceList(int32_t h, SCNM_ServiceInfo** head) override {
        int32_t r = record("Scnm::CreateServiceList", mOwner, {V(h), P(head, sizeof(*head))});
        handOutList("Scnm::CreateServiceList", state().serviceNodes, head);
        return r;
    }
    int32_t Reserved9() override { return record("Scnm::Reserved9", mOwner, {}); }
    int32_t CreateNetworkList(int32_t h, SCNMNET_FrontEndSettings** head) override {
        int32_t r = record("Scnm::CreateNetworkList", mOwner, {V(h), P(head, sizeof(*head))});
        handOutList("Scnm::CreateNetworkList", state().networkNodes, head);
        return r;
    }
    int32_t Reserved11() override { return record("Scnm::Reserved11", mOwner, {}); }
    int32_t Dvb_SystemInit(const DVB_Config* c) override {
        return record("Scnm::Dvb_SystemInit", mOwner, {P(c)});
    }
    int32_t Dvb_SystemUnInit(const DVB_Config* c) override {
        return record("Scnm::Dvb_SystemUnInit", mOwner, {P(c)});
    }

private:
    const android::DVB* mOwner;
};

class SpyStrm : public android::Strm {
public:
    explicit SpyStrm(const android::DVB* owner) : mOwner(owner) {}
    int32_t Init() override { return record("Strm::Init", mOwner, {}); }
    int32_t Open(const STRM_OpenSettings* s) override {
        return record("Strm::Open", mOwner, {P(s)});
    }
    int32_t Close(int32_t h) override { return record("Strm::Close", mOwner, {V(h)}); }
    int32_t Start(int32_t h, const STRM_Settings* s) override {
        return record("Strm::Start", mOwner, {V(h), P(s)});
    }
    int32_t Stop(int32_t h, int32_t flag) override {
        return record("Strm::Stop", mOwner, {V(h), V(flag)});
    }
    int32_t GetSettings(int32_t h, STRM_Settings* s) override {
        return record("Strm::GetSettings", mOwner, {V(h), P(s)});
    }
    int32_t SetSettings(int32_t h, const STRM_Settings* s) override {
        return record("Strm::SetSettings", mOwner, {V(h), P(s)});
    }
    int32_t GetStatus(int32_t h, STRM_GetStatus* s) override {
        return record("Strm::GetStatus", mOwner, {V(h), P(s)});
    }
    int32_t CreatStreamInfo(int32_t h, STRM_StreamInfo* i) override {
        return record("Strm::CreatStreamInfo", mOwner, {V(h), P(i)});
    }
    int32_t GetAllEvent(int32_t h, EpgEvent* p, EpgEvent* f, ExtEpgEvent* pe,
                        ExtEpgEvent* fe) override {
        return record("Strm::GetAllEvent", mOwner, {V(h), P(p), P(f), P(pe), P(fe)});
    }
    int32_t GetEvent(int32_t h, EpgEvent* e) override {
        return record("Strm::GetEvent", mOwner, {V(h), P(e)});
    }
    int32_t GetTime(int32_t h, uint32_t* t) override {
        return record("Strm::GetTime", mOwner, {V(h), P(t)});
    }
    int32_t CheckService(const ServiceCheck* c) override {
        return record("Strm::CheckService", mOwner, {P(c)});
    }
    int32_t EPG_GetEvent(const EpgSvc* svc, int32_t h, EpgEvent* e, ExtEpgEvent* x) override {
        return record("Strm::EPG_GetEvent", mOwner, {P(svc), V(h), P(e), P(x)});
    }
    int32_t EpgMd_AddService(const EpgSvc* svc) override {
        return record("Strm::EpgMd_AddService", mOwner, {P(svc)});
    }
    int32_t EpgMd_ClearService() override { return record("Strm::EpgMd_ClearService", mOwner, {}); }

private:
    const android::DVB* mOwner;
};

class SpyCfg : public android::Cfg {
public:
    explicit SpyCfg(const android::DVB* owner) : mOwner(owner) {}
    int32_t Reset(int32_t d) override { return record("Cfg::Reset", mOwner, {V(d)}); }
    int32_t GotoPosition(int32_t d, uint8_t p) override {
        return record("Cfg::GotoPosition", mOwner, {V(d), V(p)});
    }
    int32_t StorePosition(int32_t d, uint8_t p) override {
        return record("Cfg::StorePosition", mOwner, {V(d), V(p)});
    }
    int32_t Recalculate(int32_t d, uint8_t p) override {
        return record("Cfg::Recalculate", mOwner, {V(d), V(p)});
    }
    int32_t Drive(int32_t d, uint8_t a, uint8_t b, uint8_t c) override {
        return record("Cfg::Drive", mOwner, {V(d), V(a), V(b), V(c)});
    }
    int32_t Stop(int32_t d) override { return record("Cfg::Stop", mOwner, {V(d)}); }
    int32_t SetLimit(int32_t d, uint8_t l) override {
        return record("Cfg::SetLimit", mOwner, {V(d), V(l)});
    }
    int32_t DisableLimit(int32_t d) override { return record("Cfg::DisableLimit", mOwner, {V(d)}); }
    int32_t EnableLimit(int32_t d) override { return record("Cfg::EnableLimit", mOwner, {V(d)}); }
    int32_t GotoSatellite(int32_t d, int16_t a, int16_t b, int16_t c) override {
        return record("Cfg::GotoSatellite", mOwner, {V(d), V(a), V(b), V(c)});
    }
    int32_t TryTune(int32_t d, const ANT_FrontendParameters* p) override {
        return record("Cfg::TryTune", mOwner, {V(d), P(p)});
    }
    int32_t Tune(int32_t d, const ANT_FrontendParameters* p) override {
        return record("Cfg::Tune", mOwner, {V(d), P(p)});
    }
    int32_t GetStatus(int32_t d, ANT_Status* s) override {
        return record("Cfg::GetStatus", mOwner, {V(d), P(s)});
    }
    int32_t SetMuteAudio(int32_t d, uint8_t m) override {
        return record("Cfg::SetMuteAudio", mOwner, {V(d), V(m)});
    }
    int32_t SetAudioVolume(int32_t v) override {
        return record("Cfg::SetAudioVolume", mOwner, {V(v)});
    }
    int32_t SetMuteVideo(int32_t d, uint8_t m) override {
        return record("Cfg::SetMuteVideo", mOwner, {V(d), V(m)});
    }
    int32_t SetVideoPos(int32_t d, const Video_Position* p) override {
        return record("Cfg::SetVideoPos", mOwner, {V(d), P(p)});
    }
    int32_t CaGetStatus(int32_t d, int32_t* source, int32_t* lastCwSet) override {
        return record("Cfg::CaGetStatus", mOwner, {V(d), P(source), P(lastCwSet)});
    }
    int32_t CaStandby(int32_t d) override { return record("Cfg::CaStandby", mOwner, {V(d)}); }
    int32_t GpioSet(int32_t l, int32_t v) override {
        return record("Cfg::GpioSet", mOwner, {V(l), V(v)});
    }
    int32_t Reserved21() override { return record("Cfg::Reserved21", mOwner, {}); }
    int32_t BlindScanStart(int32_t d, int32_t a, int32_t b, int32_t c, int32_t e) override {
        return record("Cfg::BlindScanStart", mOwner, {V(d), V(a), V(b), V(c), V(e)});
    }
    int32_t BlindScanStop(int32_t d) override {
        return record("Cfg::BlindScanStop", mOwner, {V(d)});
    }
    int32_t TSDumpStart(int32_t d, int32_t a, int32_t b, const char* path) override {
        return record("Cfg::TSDumpStart", mOwner, {V(d), V(a), V(b), P(path, kTSDumpPathSize)});
    }
    int32_t TSDumpStop() override { return record("Cfg::TSDumpStop", mOwner, {}); }
    int32_t GetVideoPos(int32_t d, Video_Position* p) override {
        return record("Cfg::GetVideoPos", mOwner, {V(d), P(p)});
    }
    int32_t SetWakeup(int32_t v) override { return record("Cfg::SetWakeup", mOwner, {V(v)}); }

private:
    const android::DVB* mOwner;
};

class SpySubttl : public android::Subttl {
public:
    explicit SpySubttl(const android::DVB* owner) : mOwner(owner) {}
    int32_t Init() override { return record("Subttl::Init", mOwner, {}); }
    int32_t Start(const SUBTTL_Settings* s) override {
        return record("Subttl::Start", mOwner, {P(s)});
    }
    int32_t Stop(int32_t h) override { return record("Subttl::Stop", mOwner, {V(h)}); }
    // Records, instead of the buffer's 1930792 bytes, one byte: 1 when it was all zero on
    // entry. Scripted patches are written into the buffer.
    int32_t GetData(int32_t h, void* data) override {
        if (gQuiet.load(std::memory_order_relaxed)) return 0;
        const auto* b = static_cast<const uint8_t*>(data);
        bool zero = data != nullptr && b[0] == 0 && memcmp(b, b + 1, sizeof(SUBTTL_Data) - 1) == 0;
        std::vector<uint8_t> flag{static_cast<uint8_t>(zero ? 1 : 0)};
        Arg buffer{0, data, data != nullptr ? sizeof(SUBTTL_Data) : 0};
        buffer.size = 0;  // not copied into the call record
        int32_t r = record("Subttl::GetData", mOwner, {V(h), buffer}, &flag);
        patchBuffer("Subttl::GetData", 1, data, sizeof(SUBTTL_Data));
        return r;
    }

private:
    static void patchBuffer(const char* op, int arg, void* data, size_t size) {
        if (data == nullptr) return;
        State& s = state();
        std::lock_guard<std::mutex> lock(s.lock);
        auto it = s.patches.find(op);
        if (it == s.patches.end()) return;
        for (const Patch& p : it->second) {
            if (p.arg != arg || p.offset >= size) continue;
            memcpy(static_cast<uint8_t*>(data) + p.offset, p.bytes.data(),
                   std::min(p.bytes.size(), size - p.offset));
        }
    }
    const android::DVB* mOwner;
};

class SpyTeltxt : public android::Teltxt {
public:
    explicit SpyTeltxt(const android::DVB* owner) : mOwner(owner) {}
    int32_t Start(const TELTXT_Settings* s) override {
        return record("Teltxt::Start", mOwner, {P(s)});
    }
    int32_t Stop(int32_t h) override { return record("Teltxt::Stop", mOwner, {V(h)}); }
    int32_t SetData(int32_t h, int32_t a, int32_t b, int32_t* p100, int32_t* p10, int32_t* n10,
                    int32_t* n100) override {
        return record("Teltxt::SetData", mOwner,
                      {V(h), V(a), V(b), P(p100), P(p10), P(n10), P(n100)});
    }
    // Writes the predictable teletextByte() stream; the destination is not recorded.
    int32_t GetData(int32_t h, int32_t offset, int32_t count, uint8_t* dst) override {
        if (gQuiet.load(std::memory_order_relaxed)) return 0;
        int32_t r = record("Teltxt::GetData", mOwner, {V(h), V(offset), V(count), V(0)});
        if (dst != nullptr) {
            int32_t n = std::clamp(count, 0, kTeltxtChunk);
            for (int32_t i = 0; i < n; ++i) dst[i] = teletextByte(int64_t{offset} + i);
        }
        return r;
    }

private:
    const android::DVB* mOwner;
};

class SpyBackend : public dvbsvc::Backend {
public:
    void createModules(android::DVB& dvb) override {
        std::set<std::string> omitted;
        {
            State& s = state();
            std::lock_guard<std::mutex> lock(s.lock);
            omitted = s.omitted;
        }
        if (!omitted.count("Scnm")) dvb.mScnm = new SpyScnm(&dvb);
        if (!omitted.count("Strm")) dvb.mStrm = new SpyStrm(&dvb);
        if (!omitted.count("Cfg")) dvb.mCfg = new SpyCfg(&dvb);
        if (!omitted.count("Subttl")) dvb.mSubttl = new SpySubttl(&dvb);
        if (!omitted.count("Teltxt")) dvb.mTeltxt = new SpyTeltxt(&dvb);
    }
};

}  // namespace

dvbsvc::Backend& backend() {
    static SpyBackend* b = new SpyBackend;
    return *b;
}

void reset() {
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    s.calls.clear();
    s.results.clear();
    s.patches.clear();
    s.lists.clear();
    s.omitted.clear();
}

std::vector<Call> calls() {
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    return s.calls;
}

size_t callCount() {
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    return s.calls.size();
}

void omitModules(const std::vector<std::string>& modules) {
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    s.omitted.clear();
    s.omitted.insert(modules.begin(), modules.end());
}

void setResult(const std::string& op, int32_t result) {
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    s.results[op] = result;
}

void setOut(const std::string& op, int arg, size_t offset, const std::vector<uint8_t>& bytes) {
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    s.patches[op].push_back({arg, offset, bytes});
}

void setList(const std::string& op, const std::vector<std::vector<uint8_t>>& nodes) {
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    s.lists[op] = nodes;
}

void setQuiet(bool quiet) {
    gQuiet.store(quiet);
}

void setAttachHook(void (*hook)(JNIEnv*)) {
    State& s = state();
    std::lock_guard<std::mutex> lock(s.lock);
    s.attachHook = hook;
}

void raiseEvents(int msg, int ext1, int ext2, int count, int threads) {
    void (*hook)(JNIEnv*);
    {
        State& s = state();
        std::lock_guard<std::mutex> lock(s.lock);
        hook = s.attachHook;
    }
    std::vector<std::thread> workers;
    for (int t = 0; t < threads; ++t) {
        workers.emplace_back([=] {
            JavaVM* vm = android::AndroidRuntime::getJavaVM();
            JNIEnv* env = nullptr;
            if (vm == nullptr || vm->AttachCurrentThread(&env, nullptr) != JNI_OK) return;
            if (hook != nullptr) hook(env);
            for (int i = 0; i < count; ++i) {
                for (const auto& dvb : dvbsvc::liveDvbs())
                    dvbsvc::raiseEvent(*dvb, msg, ext1, ext2);
            }
            vm->DetachCurrentThread();
        });
    }
    for (auto& w : workers) w.join();
}

}  // namespace dvbspy
