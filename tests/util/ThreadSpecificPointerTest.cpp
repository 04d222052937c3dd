#include <gtest/gtest.h>

#include <string>
#include <thread>

#include "support/Workers.h"
#include "util/Mutex.h"

namespace {

// The values that the cleanup function was given, in order.
std::string cleaned;
void clean(void* value) {
    cleaned += *static_cast<const char*>(value);
}

class ThreadSpecificPointerTest : public testing::Test {
protected:
    ThreadSpecificPointerTest() { cleaned.clear(); }
    ~ThreadSpecificPointerTest() override { _pointer.release(); }

    char _a = 'a';
    char _b = 'b';
    ThreadSpecificPointer<char> _pointer{clean};
};

TEST_F(ThreadSpecificPointerTest, HasOneValuePerThreadAndCleansUpWhenAThreadEnds) {
    EXPECT_EQ(nullptr, _pointer.get());
    _pointer.set(&_a);
    std::thread([&] {
        EXPECT_EQ(nullptr, _pointer.get());
        _pointer.set(&_b);
        EXPECT_EQ(&_b, _pointer.get());
    }).join();
    EXPECT_EQ(&_a, _pointer.get());
    EXPECT_EQ("b", cleaned);
}

TEST_F(ThreadSpecificPointerTest, SetCleansUpADifferentValue) {
    _pointer.set(&_a);
    _pointer.set(&_a);
    EXPECT_EQ("", cleaned);
    _pointer.set(&_b);
    EXPECT_EQ("a", cleaned);
    _pointer.set(nullptr);
    EXPECT_EQ("ab", cleaned);
    _pointer.set(nullptr);
    EXPECT_EQ("ab", cleaned);
    EXPECT_EQ(nullptr, _pointer.get());
}

TEST_F(ThreadSpecificPointerTest, SetCleansUpBeforeItStores) {
    static TSP_Implementor* current;
    static void* atCleanup;
    TSP_Implementor pointer([](void*) { atCleanup = current->get(); });
    current = &pointer;
    pointer.set(&_a);
    pointer.set(&_b);
    EXPECT_EQ(&_a, atCleanup);
    pointer.release();
}

TEST_F(ThreadSpecificPointerTest, ReleaseReturnsTheValueAndStoresNullWithoutCleanup) {
    _pointer.set(&_a);
    EXPECT_EQ(&_a, _pointer.release());
    EXPECT_EQ(nullptr, _pointer.get());
    EXPECT_EQ(nullptr, _pointer.release());
    std::thread([&] {
        _pointer.set(&_b);
        EXPECT_EQ(&_b, _pointer.release());
    }).join();
    EXPECT_EQ("", cleaned);
}

TEST_F(ThreadSpecificPointerTest, NeedsNoCleanupFunction) {
    ThreadSpecificPointer<char> pointer(nullptr);
    pointer.set(&_a);
    pointer.set(&_b);
    EXPECT_EQ(&_b, pointer.release());
    std::thread([&] { pointer.set(&_a); }).join();
}

}  // namespace
