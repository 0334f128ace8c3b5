#include <gtest/gtest.h>

#include <algorithm>

#include "Context.h"

namespace {

// Only the object's address is used as a key: no object needs to exist.
android::DVB* fake(uintptr_t n) {
    return reinterpret_cast<android::DVB*>(n * 64);
}

TEST(Context, ResolvesUntilTheLastReleaseAndNeverHandsAValueOutTwice) {
    EXPECT_EQ(dvbjni::contextObject(0), nullptr);
    if (sizeof(void*) == 4) {  // a 32-bit context is the address itself
        EXPECT_EQ(dvbjni::contextBind(fake(1)), 64);
        EXPECT_EQ(dvbjni::contextObject(64), fake(1));
        return;
    }
    android::DVB* a = fake(2);
    const jint first = dvbjni::contextBind(a);
    EXPECT_EQ(dvbjni::contextBind(a), first);
    dvbjni::contextRelease(a);
    EXPECT_EQ(dvbjni::contextObject(first), a);
    dvbjni::contextRelease(a);
    EXPECT_EQ(dvbjni::contextObject(first), nullptr);
    // Bind and release many objects: no value is ever handed out twice while some earlier
    // value of the same slot could still sit in a Java object.
    std::vector<jint> seen = {first};
    for (uintptr_t i = 0; i < 10000; ++i) {
        android::DVB* d = fake(100 + i);
        const jint ctx = dvbjni::contextBind(d);
        ASSERT_GT(ctx, 0);
        EXPECT_EQ(dvbjni::contextObject(ctx), d);
        EXPECT_EQ(dvbjni::contextObject(first), nullptr);  // when its slot holds `d` too
        seen.push_back(ctx);
        dvbjni::contextRelease(d);
        EXPECT_EQ(dvbjni::contextObject(ctx), nullptr);
    }
    std::sort(seen.begin(), seen.end());
    EXPECT_EQ(std::adjacent_find(seen.begin(), seen.end()), seen.end());
}

}  // namespace
