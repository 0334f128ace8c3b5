// Scan results as the scan module hands them over: node graphs in one heap block of exactly
// their size, linked by dvbListNext (longer than the cache, looping, ending early, or no list
// at all), copied by Scnm_CreateServiceList / Scnm_CreateNetworkList and read back at any
// index, among calls of every other native that register_android_dvb_Scnm registers but
// Dvb_SystemInit, which waits for the event database for good.
#include "Harness.h"
#include "Registration.h"

// The library's result caches, exported by name.
extern SCNM_ServiceInfo s_SvcExt[100];
extern SCNMNET_FrontEndSettings s_SvcNet[200];

namespace {

// Up to three caches' worth of nodes from the input. Node i links to i + 1 unless the input
// says otherwise: to the end, or to any node of the block, itself and earlier ones included.
// The library must copy the walk from the head, cut at the cache's room, and return its length.
template <typename Node, size_t N>
Node* makeList(std::unique_ptr<Node[]>& block, Node (&cache)[N]) {
    FuzzedDataProvider& in = *fuzz::now.input;
    const size_t count = in.ConsumeIntegralInRange<size_t>(0, 3 * N);
    std::vector<uint8_t> pattern = in.ConsumeBytes<uint8_t>(sizeof(Node));
    pattern.resize(sizeof(Node));
    block.reset(new Node[count]);
    std::vector<size_t> next(count);  // count ends the list
    for (size_t i = 0; i < count; ++i) {
        memcpy(static_cast<void*>(&block[i]), pattern.data(), sizeof(Node));
        const auto stamp = static_cast<uint32_t>(i);  // tells the copies apart
        memcpy(static_cast<void*>(&block[i]), &stamp, sizeof stamp);
        const auto link = in.ConsumeIntegral<uint16_t>();
        next[i] = link == 0 ? i + 1 : link == 1 ? count : (link - 2u) % count;
        // On a 64-bit build a link is a distance, so 0 ends the list: no node links to itself.
        if (next[i] == i && sizeof(void*) == 8) next[i] = count;
    }
    for (size_t i = 0; i < count; ++i) {
        dvbListLink(&block[i], next[i] < count ? &block[next[i]] : nullptr);
    }
    const size_t head = count == 0 ? 0 : in.ConsumeIntegralInRange<size_t>(0, count - 1);
    size_t copied = 0;
    for (size_t i = head; i < count && copied < N; i = next[i]) {
        fuzz::shadow(cache)[copied++] = block[i];
    }
    fuzz::now.want = copied;
    return count == 0 ? nullptr : &block[head];
}

class FuzzScnm : public android::Scnm {
public:
    int32_t Reserved1() override { return fuzz::op(); }
    int32_t Init() override { return fuzz::op(); }
    int32_t Open(const SCNM_OpenSettings*) override { return fuzz::op(); }
    int32_t Close(int32_t) override { return fuzz::op(); }
    int32_t Start(int32_t, const SCNM_StartSettings*) override { return fuzz::op(); }
    int32_t Stop(int32_t) override { return fuzz::op(); }
    int32_t GetStatus(int32_t, SCNM_GetStatus* s) override { return (fuzz::fill(s), 0); }
    int32_t CreateServiceList(int32_t, SCNM_ServiceInfo** head) override {
        *head = makeList(mServices, s_SvcExt);
        return fuzz::op();
    }
    int32_t Reserved9() override { return fuzz::op(); }
    int32_t CreateNetworkList(int32_t, SCNMNET_FrontEndSettings** head) override {
        *head = makeList(mNetworks, s_SvcNet);
        return fuzz::op();
    }
    int32_t Reserved11() override { return fuzz::op(); }
    int32_t Dvb_SystemInit(const DVB_Config*) override { return fuzz::op(); }
    int32_t Dvb_SystemUnInit(const DVB_Config*) override { return fuzz::op(); }

private:
    std::unique_ptr<SCNM_ServiceInfo[]> mServices;
    std::unique_ptr<SCNMNET_FrontEndSettings[]> mNetworks;
};

const fuzz::Target& target() {
    static const fuzz::Target t(
            register_android_dvb_Scnm, [](android::DVB& dvb) { dvb.mScnm = new FuzzScnm; },
            fuzz::Mapping{{{"SCNM_ServiceInfo", 16},
                           {"SCNMNET_FrontEndSettings", 7},
                           {"SCNM_GetStatus", 3}}},
            {fuzz::cacheReader<s_SvcExt>("Scnm_GetServiceList"),
             fuzz::cacheReader<s_SvcNet>("Scnm_GetNetworkList")},
            true, "Dvb_SystemInit");
    return t;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const fuzz::Target& t = target();
    FuzzedDataProvider fdp(data, size);
    fuzz::zeroCaches();
    for (int calls = fdp.ConsumeIntegralInRange(1, 6); calls > 0; --calls) fuzz::callOne(fdp, t);
    return 0;
}
