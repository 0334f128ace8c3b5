#include <gtest/gtest.h>

#include "Context.h"

namespace {

// Only the object's address is used as a key: no object needs to exist.
android::DVB* fake(uintptr_t n) {
    return reinterpret_cast<android::DVB*>(n * 64);
}

constexpr bool kAddresses = sizeof(void*) == 4;  // a 32-bit context is the address itself

TEST(Context, BindResolvesAndReleaseForgets) {
    android::DVB* a = fake(1);
    jint ctx = dvbjni::contextBind(a);
    ASSERT_NE(ctx, 0);
    EXPECT_EQ(dvbjni::contextObject(ctx), a);
    if (kAddresses) {
        EXPECT_EQ(static_cast<uintptr_t>(static_cast<uint32_t>(ctx)), 64u);
    }
    dvbjni::contextRelease(a);
    if (!kAddresses) {
        EXPECT_EQ(dvbjni::contextObject(ctx), nullptr);
    }
    EXPECT_EQ(dvbjni::contextObject(0), nullptr);
}

TEST(Context, BindingTwiceNeedsTwoReleases) {
    if (kAddresses) GTEST_SKIP() << "a 32-bit context is the address itself";
    android::DVB* a = fake(2);
    jint first = dvbjni::contextBind(a);
    jint second = dvbjni::contextBind(a);
    EXPECT_EQ(first, second);
    dvbjni::contextRelease(a);
    EXPECT_EQ(dvbjni::contextObject(first), a);
    dvbjni::contextRelease(a);
    EXPECT_EQ(dvbjni::contextObject(first), nullptr);
}

TEST(Context, StaleValueDoesNotReachALaterObject) {
    if (kAddresses) GTEST_SKIP() << "a 32-bit context is the address itself";
    // Bind and release many objects: no value is ever handed out twice while some earlier
    // value of the same slot could still sit in a Java object.
    std::vector<jint> seen;
    for (uintptr_t i = 0; i < 10000; ++i) {
        android::DVB* d = fake(100 + i);
        jint ctx = dvbjni::contextBind(d);
        ASSERT_GT(ctx, 0);
        seen.push_back(ctx);
        dvbjni::contextRelease(d);
        EXPECT_EQ(dvbjni::contextObject(ctx), nullptr);
    }
    std::sort(seen.begin(), seen.end());
    EXPECT_EQ(std::adjacent_find(seen.begin(), seen.end()), seen.end());
}

}  // namespace
