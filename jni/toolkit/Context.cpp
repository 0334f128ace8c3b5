#include "Context.h"

#include <atomic>
#include <cstdint>

namespace dvbjni {

#if UINTPTR_MAX == 0xFFFFFFFFu

jint contextBind(android::DVB* dvb) {
    return static_cast<jint>(reinterpret_cast<uintptr_t>(dvb));
}

void contextRelease(android::DVB*) {}

android::DVB* contextObject(jint context) {
    return reinterpret_cast<android::DVB*>(static_cast<uintptr_t>(static_cast<uint32_t>(context)));
}

#else

namespace {

// A token is (generation << kSlotBits) | slot. The generation moves on each time a slot is
// reused, so a stale token left in a Java object does not reach the slot's next object.
constexpr uint32_t kSlotBits = 12;
constexpr uint32_t kSlots = 1u << kSlotBits;
constexpr uint32_t kGenerations = 1u << (31 - kSlotBits);  // keeps every token positive

struct Slot {
    std::atomic<uint32_t> token{0};  // 0 while free
    std::atomic<android::DVB*> dvb{nullptr};
    uint32_t generation = 0;
    uint32_t binds = 0;
};

Slot gSlots[kSlots];
uint32_t gCursor = 0;  // where the search for a free slot starts: spreads reuse out

Slot* slotOf(android::DVB* dvb) {
    for (Slot& s : gSlots) {
        if (s.binds != 0 && s.dvb.load(std::memory_order_relaxed) == dvb) return &s;
    }
    return nullptr;
}

}  // namespace

jint contextBind(android::DVB* dvb) {
    if (dvb == nullptr) return 0;
    if (Slot* s = slotOf(dvb)) {
        ++s->binds;
        return static_cast<jint>(s->token.load(std::memory_order_relaxed));
    }
    for (uint32_t i = 0; i < kSlots; ++i) {
        uint32_t index = (gCursor + i) % kSlots;
        Slot& s = gSlots[index];
        if (s.binds != 0) continue;
        gCursor = index + 1;
        s.generation = s.generation % (kGenerations - 1) + 1;  // 1 .. kGenerations-1
        s.binds = 1;
        s.dvb.store(dvb, std::memory_order_relaxed);
        uint32_t token = (s.generation << kSlotBits) | index;
        s.token.store(token, std::memory_order_release);
        return static_cast<jint>(token);
    }
    return 0;
}

void contextRelease(android::DVB* dvb) {
    Slot* s = slotOf(dvb);
    if (s == nullptr || --s->binds != 0) return;
    s->token.store(0, std::memory_order_release);
    s->dvb.store(nullptr, std::memory_order_relaxed);
}

android::DVB* contextObject(jint context) {
    auto token = static_cast<uint32_t>(context);
    if (token == 0) return nullptr;
    Slot& s = gSlots[token & (kSlots - 1)];
    if (s.token.load(std::memory_order_acquire) != token) return nullptr;
    return s.dvb.load(std::memory_order_relaxed);
}

#endif

}  // namespace dvbjni
