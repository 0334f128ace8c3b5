// Pins the vtable slot of every module operation: the service library's binary interface.
// On the Itanium C++ ABI a pointer to a virtual member function holds 1 + the byte offset of
// its slot (on ARM, the offset itself, with the flag in the adjustment). Every module starts
// with RefBase's six slots (two destructor entries, onFirstRef, onLastStrongRef,
// onIncStrongAttempted, onLastWeakRef); operation k of the module's own order is slot 5 + k.
#include <DVB.h>
#include <gtest/gtest.h>

#include <cstring>

namespace {

template <typename F>
long slotOf(F member) {
    static_assert(sizeof(F) == 2 * sizeof(void*), "Itanium member function pointer");
    uintptr_t raw[2];
    memcpy(raw, &member, sizeof raw);
#if defined(__arm__) || defined(__aarch64__)
    EXPECT_EQ(raw[1] & 1u, 1u) << "not a virtual function";
    return static_cast<long>(raw[0] / sizeof(void*));
#else
    EXPECT_EQ(raw[0] & 1u, 1u) << "not a virtual function";
    return static_cast<long>((raw[0] - 1) / sizeof(void*));
#endif
}

// The operations of `Class` in the device's order, one slot after another from slot 6.
#define EXPECT_ORDER(Class, ...)                                \
    do {                                                        \
        using M = android::Class;                               \
        long got[] = {__VA_ARGS__};                             \
        for (size_t k = 0; k < sizeof got / sizeof got[0]; ++k) \
            EXPECT_EQ(got[k], static_cast<long>(6 + k)) << k;   \
    } while (0)
#define S(op) slotOf(&M::op)

// RefBase's hooks are protected: a subclass may name them.
struct Probe : android::RefBase {
    static long first() { return slotOf(&Probe::onFirstRef); }
    static long last() { return slotOf(&Probe::onLastWeakRef); }
};

TEST(Vtable, EveryModuleOperationKeepsItsPlace) {
    EXPECT_ORDER(Scnm, S(Reserved1), S(Init), S(Open), S(Close), S(Start), S(Stop), S(GetStatus),
                 S(CreateServiceList), S(Reserved9), S(CreateNetworkList), S(Reserved11),
                 S(Dvb_SystemInit), S(Dvb_SystemUnInit));
    EXPECT_ORDER(Strm, S(Init), S(Open), S(Close), S(Start), S(Stop), S(GetSettings),
                 S(SetSettings), S(GetStatus), S(CreatStreamInfo), S(GetAllEvent), S(GetEvent),
                 S(GetTime), S(CheckService), S(EPG_GetEvent), S(EpgMd_AddService),
                 S(EpgMd_ClearService));
    // Cfg::GetVideoPos stands late in the order, not beside Cfg::SetVideoPos.
    EXPECT_ORDER(Cfg, S(Reset), S(GotoPosition), S(StorePosition), S(Recalculate), S(Drive),
                 S(Stop), S(SetLimit), S(DisableLimit), S(EnableLimit), S(GotoSatellite),
                 S(TryTune), S(Tune), S(GetStatus), S(SetMuteAudio), S(SetAudioVolume),
                 S(SetMuteVideo), S(SetVideoPos), S(CaGetStatus), S(CaStandby), S(GpioSet),
                 S(Reserved21), S(BlindScanStart), S(BlindScanStop), S(TSDumpStart), S(TSDumpStop),
                 S(GetVideoPos), S(SetWakeup));
    EXPECT_ORDER(Subttl, S(Init), S(Start), S(Stop), S(GetData));
    EXPECT_ORDER(Teltxt, S(Start), S(Stop), S(SetData), S(GetData));
    EXPECT_EQ(std::make_pair(Probe::first(), Probe::last()), std::make_pair(2L, 5L));
    // DVBListener has RefBase as a virtual base: its own notify is its first slot.
    EXPECT_EQ(slotOf(&android::DVBListener::notify), 0);
}

}  // namespace
