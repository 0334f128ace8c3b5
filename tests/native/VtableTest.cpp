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
    // The ARM variant keeps the virtual flag in the low bit of the adjustment and the plain
    // byte offset in the pointer.
    EXPECT_EQ(raw[1] & 1u, 1u) << "not a virtual function";
    return static_cast<long>(raw[0] / sizeof(void*));
#else
    EXPECT_EQ(raw[0] & 1u, 1u) << "not a virtual function";
    return static_cast<long>((raw[0] - 1) / sizeof(void*));
#endif
}

constexpr long kFirstOwnSlot = 6;  // RefBase's slots come first

#define EXPECT_ORDER(Class, op, k) EXPECT_EQ(slotOf(&android::Class::op), kFirstOwnSlot + (k)-1)

TEST(Vtable, Scnm) {
    EXPECT_ORDER(Scnm, Reserved1, 1);
    EXPECT_ORDER(Scnm, Init, 2);
    EXPECT_ORDER(Scnm, Open, 3);
    EXPECT_ORDER(Scnm, Close, 4);
    EXPECT_ORDER(Scnm, Start, 5);
    EXPECT_ORDER(Scnm, Stop, 6);
    EXPECT_ORDER(Scnm, GetStatus, 7);
    EXPECT_ORDER(Scnm, CreateServiceList, 8);
    EXPECT_ORDER(Scnm, Reserved9, 9);
    EXPECT_ORDER(Scnm, CreateNetworkList, 10);
    EXPECT_ORDER(Scnm, Reserved11, 11);
    EXPECT_ORDER(Scnm, Dvb_SystemInit, 12);
    EXPECT_ORDER(Scnm, Dvb_SystemUnInit, 13);
}

TEST(Vtable, Strm) {
    EXPECT_ORDER(Strm, Init, 1);
    EXPECT_ORDER(Strm, Open, 2);
    EXPECT_ORDER(Strm, Close, 3);
    EXPECT_ORDER(Strm, Start, 4);
    EXPECT_ORDER(Strm, Stop, 5);
    EXPECT_ORDER(Strm, GetSettings, 6);
    EXPECT_ORDER(Strm, SetSettings, 7);
    EXPECT_ORDER(Strm, GetStatus, 8);
    EXPECT_ORDER(Strm, CreatStreamInfo, 9);
    EXPECT_ORDER(Strm, GetAllEvent, 10);
    EXPECT_ORDER(Strm, GetEvent, 11);
    EXPECT_ORDER(Strm, GetTime, 12);
    EXPECT_ORDER(Strm, CheckService, 13);
    EXPECT_ORDER(Strm, EPG_GetEvent, 14);
    EXPECT_ORDER(Strm, EpgMd_AddService, 15);
    EXPECT_ORDER(Strm, EpgMd_ClearService, 16);
}

TEST(Vtable, Cfg) {
    EXPECT_ORDER(Cfg, Reset, 1);
    EXPECT_ORDER(Cfg, GotoPosition, 2);
    EXPECT_ORDER(Cfg, StorePosition, 3);
    EXPECT_ORDER(Cfg, Recalculate, 4);
    EXPECT_ORDER(Cfg, Drive, 5);
    EXPECT_ORDER(Cfg, Stop, 6);
    EXPECT_ORDER(Cfg, SetLimit, 7);
    EXPECT_ORDER(Cfg, DisableLimit, 8);
    EXPECT_ORDER(Cfg, EnableLimit, 9);
    EXPECT_ORDER(Cfg, GotoSatellite, 10);
    EXPECT_ORDER(Cfg, TryTune, 11);
    EXPECT_ORDER(Cfg, Tune, 12);
    EXPECT_ORDER(Cfg, GetStatus, 13);
    EXPECT_ORDER(Cfg, SetMuteAudio, 14);
    EXPECT_ORDER(Cfg, SetAudioVolume, 15);
    EXPECT_ORDER(Cfg, SetMuteVideo, 16);
    EXPECT_ORDER(Cfg, SetVideoPos, 17);
    EXPECT_ORDER(Cfg, CaGetStatus, 18);
    EXPECT_ORDER(Cfg, CaStandby, 19);
    EXPECT_ORDER(Cfg, GpioSet, 20);
    EXPECT_ORDER(Cfg, Reserved21, 21);
    EXPECT_ORDER(Cfg, BlindScanStart, 22);
    EXPECT_ORDER(Cfg, BlindScanStop, 23);
    EXPECT_ORDER(Cfg, TSDumpStart, 24);
    EXPECT_ORDER(Cfg, TSDumpStop, 25);
    EXPECT_ORDER(Cfg, GetVideoPos, 26);  // late in the order, not beside SetVideoPos
    EXPECT_ORDER(Cfg, SetWakeup, 27);
}

TEST(Vtable, Subttl) {
    EXPECT_ORDER(Subttl, Init, 1);
    EXPECT_ORDER(Subttl, Start, 2);
    EXPECT_ORDER(Subttl, Stop, 3);
    EXPECT_ORDER(Subttl, GetData, 4);
}

TEST(Vtable, Teltxt) {
    EXPECT_ORDER(Teltxt, Start, 1);
    EXPECT_ORDER(Teltxt, Stop, 2);
    EXPECT_ORDER(Teltxt, SetData, 3);
    EXPECT_ORDER(Teltxt, GetData, 4);
}

TEST(Vtable, ListenerNotifyComesFirst) {
    // DVBListener has RefBase as a virtual base: its own notify is its first slot.
    EXPECT_EQ(slotOf(&android::DVBListener::notify), 0);
}

// RefBase's hooks are protected: a subclass may name them.
struct Probe : android::RefBase {
    static long first() { return slotOf(&Probe::onFirstRef); }
    static long last() { return slotOf(&Probe::onLastWeakRef); }
};

TEST(Vtable, RefBaseHasTheSixSlotsThatModulesFollow) {
    EXPECT_EQ(Probe::first(), 2);
    EXPECT_EQ(Probe::last(), 5);
}

}  // namespace
