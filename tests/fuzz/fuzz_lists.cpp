// Scan results as the scan module hands them over: node graphs in one heap block of exactly
// their size, linked by dvbListNext (longer than the cache, looping, ending early, or no list
// at all), copied by the library's own Scnm_CreateServiceList / Scnm_CreateNetworkList and
// read back one entry at a time, at any index, through Scnm_GetServiceList /
// Scnm_GetNetworkList. The natives are the ones register_android_dvb_Scnm registers.
#include <DVB.h>
#include <fuzzer/FuzzedDataProvider.h>

#include <cstring>
#include <memory>
#include <vector>

#include "FakeJni.h"
#include "Registration.h"

// The library's result caches, exported by name.
extern SCNM_ServiceInfo s_SvcExt[100];
extern SCNMNET_FrontEndSettings s_SvcNet[200];

namespace {

// A scan module whose lists are whatever the fuzzer built.
class FuzzScnm : public android::Scnm {
public:
    int32_t Reserved1() override { return 0; }
    int32_t Init() override { return 0; }
    int32_t Open(const SCNM_OpenSettings*) override { return 0; }
    int32_t Close(int32_t) override { return 0; }
    int32_t Start(int32_t, const SCNM_StartSettings*) override { return 0; }
    int32_t Stop(int32_t) override { return 0; }
    int32_t GetStatus(int32_t, SCNM_GetStatus*) override { return 0; }
    int32_t CreateServiceList(int32_t, SCNM_ServiceInfo** head) override {
        *head = services;
        return 0;
    }
    int32_t Reserved9() override { return 0; }
    int32_t CreateNetworkList(int32_t, SCNMNET_FrontEndSettings** head) override {
        *head = networks;
        return 0;
    }
    int32_t Reserved11() override { return 0; }
    int32_t Dvb_SystemInit(const DVB_Config*) override { return 0; }
    int32_t Dvb_SystemUnInit(const DVB_Config*) override { return 0; }

    SCNM_ServiceInfo* services = nullptr;
    SCNMNET_FrontEndSettings* networks = nullptr;
};

using CreateList = jint (*)(JNIEnv*, jobject, jlong);
using GetEntry = jint (*)(JNIEnv*, jobject, jint, jobject);

constexpr const char* kScnm = "android/DVB/Scnm";
constexpr const char* kServiceClass = "android/DVB/Scnm$SCNM_ServiceInfo";
constexpr const char* kNetworkClass = "android/DVB/Scnm$SCNMNET_FrontEndSettings";

struct Harness {
    FuzzScnm* scnm;
    jint context;
    CreateList createServices, createNetworks;
    GetEntry getService, getNetwork;
};

FuzzScnm* gInstalled;

Harness& harness() {
    static Harness h = [] {
        fakejni::Env& env = fakejni::env();
        FUZZ_CHECK(register_android_dvb_Scnm(env.get()) == 0 && !env.pending());
        Harness s;
        s.context = fakejni::bindDvb([](android::DVB& dvb) {
            gInstalled = new FuzzScnm;
            dvb.mScnm = gInstalled;
        });
        s.scnm = gInstalled;
        s.createServices =
                reinterpret_cast<CreateList>(env.native(kScnm, "Scnm_CreateServiceList", "(J)I"));
        s.createNetworks =
                reinterpret_cast<CreateList>(env.native(kScnm, "Scnm_CreateNetworkList", "(J)I"));
        s.getService = reinterpret_cast<GetEntry>(env.native(
                kScnm, "Scnm_GetServiceList", "(ILandroid/DVB/Scnm$SCNM_ServiceInfo;)I"));
        s.getNetwork = reinterpret_cast<GetEntry>(env.native(
                kScnm, "Scnm_GetNetworkList", "(ILandroid/DVB/Scnm$SCNMNET_FrontEndSettings;)I"));
        return s;
    }();
    return h;
}

fakejni::Env& env() {
    return fakejni::env();
}

void expectInt(jobject out, const char* name, jint want) {
    const fakejni::Value* v = env().value(out, name);
    FUZZ_CHECK(v != nullptr && v->type == 'I' && v->i == want);
}

// Every field of the Java entry, from the cache entry's own members.
size_t expectEntry(jobject out, const SCNM_ServiceInfo& e) {
    expectInt(out, "svcType", e.svcType);
    expectInt(out, "svcId", e.svcId);
    expectInt(out, "videoPid", e.videoPid);
    expectInt(out, "videoType", e.videoType);
    expectInt(out, "audioPid", e.audioPid);
    expectInt(out, "audioType", e.audioType);
    expectInt(out, "pcrPid", e.pcrPid);
    expectInt(out, "pmtPid", e.pmtPid);
    expectInt(out, "tsId", e.tsId);
    expectInt(out, "onId", e.onId);
    const fakejni::Value* lcn = env().value(out, "lcn");
    FUZZ_CHECK(lcn != nullptr && lcn->type == 'J' && lcn->j == jlong{e.lcn});
    expectInt(out, "content", e.content);
    expectInt(out, "caSysId0", e.caSysId0);
    expectInt(out, "caSysId1", e.caSysId1);
    expectInt(out, "caSysId2", e.caSysId2);
    // The name's bytes up to its zero byte or the field's end, copied from the field itself.
    const fakejni::Value* name = env().value(out, "svcName");
    FUZZ_CHECK(name != nullptr && name->object != nullptr);
    FUZZ_CHECK(name->object->kind == fakejni::Kind::ByteArray);
    size_t length = strnlen(e.svcName, sizeof e.svcName);
    FUZZ_CHECK(name->object->bytes.size() == length);
    FUZZ_CHECK(length == 0 || memcmp(name->object->bytes.data(), e.svcName, length) == 0);
    for (const fakejni::Copy& c : env().copies()) {
        const char* from = static_cast<const char*>(c.source);
        FUZZ_CHECK(from >= e.svcName && from + c.bytes <= e.svcName + sizeof e.svcName);
    }
    return 16;
}

size_t expectEntry(jobject out, const SCNMNET_FrontEndSettings& e) {
    expectInt(out, "type", e.type);
    expectInt(out, "frequency", e.frequency);
    expectInt(out, "symbolRate", e.symbolRate);
    expectInt(out, "fecInner", e.fecInner);
    expectInt(out, "modulation", e.modulation);
    expectInt(out, "polarization", e.polarization);
    expectInt(out, "rolloff", e.rolloff);
    FUZZ_CHECK(env().copies().empty());
    return 7;
}

// An index near the cache's bounds most of the time, any int otherwise.
jint pickIndex(FuzzedDataProvider& fdp, size_t room) {
    if (fdp.ConsumeBool()) return fdp.ConsumeIntegral<jint>();
    return fdp.ConsumeIntegralInRange<jint>(-2, static_cast<jint>(room) + 1);
}

template <typename Node, size_t N>
void fuzzList(FuzzedDataProvider& fdp, Node*& moduleHead, Node (&cache)[N], CreateList create,
              GetEntry get, const char* entryClass, const char* simpleName) {
    // Up to three caches' worth of nodes. Node i links to i + 1 unless the input says
    // otherwise: to the end, or to any node of the block, itself and earlier ones included.
    const size_t count = fdp.ConsumeIntegralInRange<size_t>(0, 3 * N);
    std::vector<uint8_t> pattern = fdp.ConsumeBytes<uint8_t>(sizeof(Node));
    pattern.resize(sizeof(Node));
    std::unique_ptr<Node[]> block(count != 0 ? new Node[count] : nullptr);
    std::vector<size_t> next(count);  // index of the next node; count ends the list
    for (size_t i = 0; i < count; ++i) {
        memcpy(&block[i], pattern.data(), sizeof(Node));
        auto stamp = static_cast<uint32_t>(i);  // tells the copies apart
        memcpy(&block[i], &stamp, sizeof stamp);
        auto link = fdp.ConsumeIntegral<uint16_t>();
        next[i] = link == 0 ? i + 1 : link == 1 ? count : (link - 2u) % count;
        // On a 64-bit build a link is a distance, and a node cannot link to itself: 0 ends
        // the list.
        if (next[i] == i && sizeof(void*) == 8) next[i] = count;
    }
    for (size_t i = 0; i < count; ++i) {
        dvbListLink(&block[i], next[i] < count ? &block[next[i]] : nullptr);
    }
    const size_t head = count == 0 ? 0 : fdp.ConsumeIntegralInRange<size_t>(0, count - 1);
    moduleHead = count == 0 ? nullptr : &block[head];

    std::vector<Node> before(cache, cache + N);
    jobject thiz = env().newInstance(kScnm);
    jint copied = create(env().get(), thiz, fdp.ConsumeIntegral<jlong>());
    moduleHead = nullptr;
    FUZZ_CHECK(!env().pending());

    // The list as the module means it, cut at the cache's room.
    std::vector<size_t> walk;
    for (size_t i = count == 0 ? count : head; i < count && walk.size() < N; i = next[i]) {
        walk.push_back(i);
    }
    FUZZ_CHECK(copied == static_cast<jint>(walk.size()));
    for (size_t k = 0; k < N; ++k) {
        const Node& want = k < walk.size() ? block[walk[k]] : before[k];
        FUZZ_CHECK(memcmp(&cache[k], &want, sizeof(Node)) == 0);
    }

    // Reads of the cache: any index, sometimes no object to fill.
    const int reads = fdp.ConsumeIntegralInRange(0, 4);
    for (int r = 0; r < reads; ++r) {
        jint index = pickIndex(fdp, N);
        bool noObject = fdp.ConsumeIntegralInRange(0, 7) == 0;
        env().reset();
        thiz = env().newInstance(kScnm);
        jobject out = noObject ? nullptr : env().newInstance(entryClass);
        jint result = get(env().get(), thiz, index, out);
        if (index < 0 || index >= static_cast<jint>(N)) {
            FUZZ_CHECK(result == -1 && env().pending());
            FUZZ_CHECK(env().exceptionClass() == "java/lang/IndexOutOfBoundsException");
            FUZZ_CHECK(env().exceptionMessage() == fakejni::indexMessage(index, N));
            FUZZ_CHECK(out == nullptr || env().setCount(out) == 0);
        } else if (out == nullptr) {
            FUZZ_CHECK(result == -1 && env().pending());
            FUZZ_CHECK(env().exceptionClass() == "java/lang/NullPointerException");
            FUZZ_CHECK(env().exceptionMessage() == std::string(simpleName) + " is null");
        } else {
            FUZZ_CHECK(result == 0 && !env().pending());
            FUZZ_CHECK(env().setCount(out) == expectEntry(out, cache[index]));
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Harness& h = harness();
    env().reset();
    env().setContext(h.context);
    FuzzedDataProvider fdp(data, size);
    if (fdp.ConsumeBool()) {
        fuzzList(fdp, h.scnm->services, s_SvcExt, h.createServices, h.getService, kServiceClass,
                 "SCNM_ServiceInfo");
    } else {
        fuzzList(fdp, h.scnm->networks, s_SvcNet, h.createNetworks, h.getNetwork, kNetworkClass,
                 "SCNMNET_FrontEndSettings");
    }
    return 0;
}
