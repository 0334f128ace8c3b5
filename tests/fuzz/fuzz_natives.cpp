// Every native that the five module classes register (but Dvb_SystemInit, which waits for the
// event database for good), called through the test spy in a checking fake JNI environment.
// The input gives each call's arguments (ints and longs at any value or near a cache's room,
// objects or null, strings of any length, Java arrays of any size), every Java field the
// library reads, the module's results, bytes it writes anywhere into its out-records (counts
// out of range, text without a zero byte), and scan lists longer than a cache, ending early or
// looping back. The oracles are the sanitizers and the environment's checks.
#include <DVB.h>

#include "Context.h"
#include "Harness.h"
#include "Registration.h"
#include "spy/Spy.h"

using android::sp;

namespace {

// What the module's next scan list links to: node i to next[i], the end when past the list.
std::vector<size_t> gNext;

template <typename Node>
int32_t relink(Node** head, int32_t result) {
    for (size_t i = 0; *head != nullptr && i < gNext.size(); ++i)
        dvbListLink(&(*head)[i], gNext[i] < gNext.size() ? &(*head)[gNext[i]] : nullptr);
    return result;
}

// The spy's scan module, with lists relinked as the input says: the spy itself links in order.
struct LinkedScnm : android::Scnm {
    sp<android::Scnm> s;
    explicit LinkedScnm(sp<android::Scnm> spy) : s(std::move(spy)) {}
    int32_t Reserved1() override { return s->Reserved1(); }
    int32_t Init() override { return s->Init(); }
    int32_t Open(const SCNM_OpenSettings* o) override { return s->Open(o); }
    int32_t Close(int32_t h) override { return s->Close(h); }
    int32_t Start(int32_t h, const SCNM_StartSettings* o) override { return s->Start(h, o); }
    int32_t Stop(int32_t h) override { return s->Stop(h); }
    int32_t GetStatus(int32_t h, SCNM_GetStatus* o) override { return s->GetStatus(h, o); }
    int32_t CreateServiceList(int32_t h, SCNM_ServiceInfo** head) override {
        return relink(head, s->CreateServiceList(h, head));
    }
    int32_t Reserved9() override { return s->Reserved9(); }
    int32_t CreateNetworkList(int32_t h, SCNMNET_FrontEndSettings** head) override {
        return relink(head, s->CreateNetworkList(h, head));
    }
    int32_t Reserved11() override { return s->Reserved11(); }
    int32_t Dvb_SystemInit(const DVB_Config* c) override { return s->Dvb_SystemInit(c); }
    int32_t Dvb_SystemUnInit(const DVB_Config* c) override { return s->Dvb_SystemUnInit(c); }
};

// Up to three caches' worth of nodes, each the input's pattern stamped with its number; node i
// links to i + 1, to the end, or to any node, itself and earlier ones included (on a 64-bit
// build a link is a distance and 0 ends the list, so no node links to itself there).
template <typename Node>
void plantList(FuzzedDataProvider& in, const char* op) {
    const size_t count = in.ConsumeIntegralInRange<size_t>(0, 600);
    std::vector<uint8_t> node = in.ConsumeBytes<uint8_t>(sizeof(Node));
    node.resize(sizeof(Node));
    std::vector<std::vector<uint8_t>> nodes(count, node);
    gNext.assign(count, 0);
    for (size_t i = 0; i < count; ++i) {
        memcpy(nodes[i].data(), &i, 4);
        const auto link = in.ConsumeIntegral<uint16_t>();
        gNext[i] = link == 0 ? i + 1 : link == 1 ? count : (link - 2u) % count;
        if (gNext[i] == i && sizeof(void*) == 8) gNext[i] = count;
    }
    dvbspy::setList(op, nodes);
}

// The operations each native reached when called with zeros, with their argument counts, by
// its place in gNatives: none while they are learnt.
std::vector<std::vector<std::pair<std::string, int>>> gOps;

jlong argument(FuzzedDataProvider& in, const std::string& sig, size_t& i) {
    const int mode = in.ConsumeIntegralInRange(0, 3);
    if (sig[i] == 'I' || sig[i] == 'J') {
        // From -1 to about a cache's or a buffer's room (0 once the input is used up), or any.
        const int room = mode == 2 ? 201 : 17, n = in.ConsumeIntegralInRange(0, room + 1);
        if (mode != 3) return n > room ? -1 : n;
        return sig[i] == 'I' ? in.ConsumeIntegral<jint>() : in.ConsumeIntegral<jlong>();
    }
    if (sig[i] == 'Z') return mode;
    const size_t end = sig[i] == '[' ? i + 1 : sig.find(';', i);
    const std::string cls = sig[i] == '[' ? "B" : sig.substr(i + 1, end - i - 1);  // [B only
    i = end;
    if (mode == 3 && in.ConsumeBool()) return 0;
    if (cls == "B") {
        fuzz::Object* a = fuzz::make(&fuzz::gJni, fuzz::Kind::ByteArray);
        a->data.resize(in.ConsumeIntegralInRange(0, 300));
        a->fromJava = true;
        return reinterpret_cast<jlong>(a);
    }
    if (cls == "java/lang/String") return reinterpret_cast<jlong>(fuzz::javaString());
    return reinterpret_cast<jlong>(fuzz::make(&fuzz::gJni, fuzz::Kind::Instance, cls));
}

// The natives take at most six arguments after `this`, each a jint, jlong, jboolean or a
// reference: on the x86-64 and AArch64 calling conventions each travels in a register of its
// own, of which the callee reads the width it declared. So any native can be called with six
// 64-bit words.
using AnyNative = jlong (*)(JNIEnv*, jobject, jlong, jlong, jlong, jlong, jlong, jlong);

__attribute__((no_sanitize("function"))) void callOne(FuzzedDataProvider& in, size_t which) {
    const fuzz::Native& n = fuzz::gNatives[which];
    dvbspy::reset();
    fuzz::reset(&in);
    for (const auto& [op, argc] : gOps[which]) {
        if (in.ConsumeBool()) dvbspy::setResult(op, in.ConsumeIntegral<int32_t>());
        for (int k = argc == 0 ? 0 : in.ConsumeIntegralInRange(0, 4); k > 0; --k) {
            // Into any argument (the spy drops a value's), in the first KiB or anywhere in 2 MiB,
            // on an int's boundary as counts and sizes lie. Up to 8 bytes, then one of them
            // repeated: long text is cheap.
            const int arg = in.ConsumeIntegralInRange(0, argc - 1);
            const size_t room = in.ConsumeBool() ? 1024 : 2 << 20;
            const size_t offset = in.ConsumeIntegral<uint32_t>() % room & ~size_t{3};
            const size_t length = in.ConsumeIntegralInRange<size_t>(1, 512);
            std::vector<uint8_t> bytes = in.ConsumeBytes<uint8_t>(8);
            bytes.resize(length, bytes.empty() ? 0 : bytes[length % bytes.size()]);
            dvbspy::setOut(op, arg, offset, bytes);
        }
    }
    // While the operations are learnt the input is empty, and so is the list planted.
    if (n.name == "Scnm_CreateServiceList")
        plantList<SCNM_ServiceInfo>(in, "Scnm::CreateServiceList");
    else if (n.name == "Scnm_CreateNetworkList")
        plantList<SCNMNET_FrontEndSettings>(in, "Scnm::CreateNetworkList");
    jlong args[6] = {};
    for (size_t i = 1, k = 0; n.signature[i] != ')'; ++i, ++k)
        args[k] = argument(in, n.signature, i);
    // Teltxt_GetData stages `count` bytes before it looks at the array: a count of gigabytes
    // only costs time and memory.
    if (n.name == "Teltxt_GetData") args[2] = jint(args[2]) % 65536;
    jobject thiz = reinterpret_cast<jobject>(fuzz::make(&fuzz::gJni, fuzz::Kind::Instance, n.cls));
    reinterpret_cast<AnyNative>(n.fn)(&fuzz::gJni, thiz, args[0], args[1], args[2], args[3],
                                      args[4], args[5]);
}

// Registers the five classes, binds a DVB object with the spy's modules and one without any,
// and learns what each native reaches.
bool setUp() {
    JNIEnv* env = fuzz::jni();
    for (auto reg : {register_android_dvb_Scnm, register_android_dvb_Strm, register_android_dvb_Cfg,
                     register_android_dvb_Subttl, register_android_dvb_Teltxt})
        FUZZ_CHECK(reg(env) == 0 && fuzz::gThrown.empty());
    fuzz::gNatives.erase(std::remove_if(fuzz::gNatives.begin(), fuzz::gNatives.end(),
                                        [](auto& n) { return n.name == "Dvb_SystemInit"; }),
                         fuzz::gNatives.end());
    dvbsvc::setBackend(&dvbspy::backend());
    sp<android::DVB> full = new android::DVB();
    full->mScnm = new LinkedScnm(full->mScnm);
    dvbspy::omitModules({"Scnm", "Strm", "Cfg", "Subttl", "Teltxt"});
    sp<android::DVB> none = new android::DVB();
    for (const sp<android::DVB>& dvb : {full, none}) {
        dvb->incStrong(&fuzz::gJni);  // held for the process, as a bound Java object holds it
        fuzz::gContexts.push_back(dvbjni::contextBind(dvb.get()));
    }
    fuzz::gContexts.push_back(0);
    gOps.resize(fuzz::gNatives.size());
    for (size_t i = 0; i < gOps.size(); ++i) {
        FuzzedDataProvider zeros(nullptr, 0);
        callOne(zeros, i);
        for (const dvbspy::Call& c : dvbspy::calls()) {
            const std::pair<std::string, int> op{c.op, int(c.args.size())};
            if (std::count(gOps[i].begin(), gOps[i].end(), op) == 0) gOps[i].push_back(op);
        }
    }
    return true;
}

}  // namespace

// Up to eight calls of the natives of one class: what one fills, the next may read.
extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const bool ready = setUp();
    FuzzedDataProvider in(data, size);
    const auto& natives = fuzz::gNatives;
    const std::string cls = natives[in.ConsumeIntegralInRange<size_t>(0, natives.size() - 1)].cls;
    std::vector<size_t> own;
    for (size_t i = 0; i < natives.size(); ++i)
        if (natives[i].cls == cls) own.push_back(i);
    for (int calls = in.ConsumeIntegralInRange(1, 8); ready && calls > 0; --calls)
        callOne(in, own[in.ConsumeIntegralInRange<size_t>(0, own.size() - 1)]);
    return 0;
}
