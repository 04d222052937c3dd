#include <gtest/gtest.h>

#include <cerrno>
#include <thread>
#include <vector>

#include "support/FieldOrder.h"
#include "support/InChild.h"
#include "support/ScriptedPthread.h"
#include "support/Workers.h"
#include "util/Mutex.h"

namespace {

// What the cleanup function was given, in order; each case reads its own process's or thread's.
std::vector<void*> cleaned;
void clean(void* value) {
    cleaned.push_back(value);
}

class TspImplementorTest : public testing::Test {
protected:
    void SetUp() override { cleaned.clear(); }

    int _a = 0;
    int _b = 0;
};

TEST_F(TspImplementorTest, HasAValueOfItsOwnInEveryThread) {
    TSP_Implementor pointer(clean);
    EXPECT_EQ(nullptr, pointer.get());
    pointer.set(&_a);
    EXPECT_EQ(&_a, pointer.get());
    std::thread([&] {
        EXPECT_EQ(nullptr, pointer.get());
        pointer.set(&_b);
        EXPECT_EQ(&_b, pointer.get());
    }).join();
    EXPECT_EQ(&_a, pointer.get());
    EXPECT_EQ((std::vector<void*>{&_b}), cleaned);
}

TEST_F(TspImplementorTest, CleansUpWhenAThreadEndsUnlessItsValueIsNull) {
    TSP_Implementor pointer(clean);
    std::thread([&] { pointer.set(&_a); }).join();
    EXPECT_EQ((std::vector<void*>{&_a}), cleaned);
    std::thread([&] {
        pointer.set(&_b);
        EXPECT_EQ(&_b, pointer.release());
    }).join();
    EXPECT_EQ((std::vector<void*>{&_a}), cleaned);
}

TEST_F(TspImplementorTest, SetCleansUpAFormerValueThatDiffers) {
    TSP_Implementor pointer(clean);
    pointer.set(&_a);
    pointer.set(&_a);
    EXPECT_TRUE(cleaned.empty());
    pointer.set(&_b);
    EXPECT_EQ((std::vector<void*>{&_a}), cleaned);
    pointer.set(nullptr);
    EXPECT_EQ((std::vector<void*>{&_a, &_b}), cleaned);
    EXPECT_EQ(nullptr, pointer.get());
    pointer.set(nullptr);
    EXPECT_EQ(2U, cleaned.size());
}

TEST_F(TspImplementorTest, SetCleansUpBeforeItStores) {
    static TSP_Implementor* current;
    static void* atCleanup;
    TSP_Implementor pointer([](void*) { atCleanup = current->get(); });
    current = &pointer;
    pointer.set(&_a);
    pointer.set(&_b);
    EXPECT_EQ(&_a, atCleanup);
    pointer.release();
}

TEST_F(TspImplementorTest, SetOfTheSameValueStoresNothing) {
    TSP_Implementor pointer(clean);
    pointer.set(&_a);
    ScriptedCalls stores("pthread_setspecific");
    pointer.set(&_a);
    EXPECT_EQ(0U, stores.calls());
    pointer.release();
}

TEST_F(TspImplementorTest, ReleaseAndInternalSetDoNotCleanUp) {
    TSP_Implementor pointer(clean);
    pointer.internal_set(&_a);
    pointer.internal_set(&_b);
    EXPECT_EQ(&_b, pointer.release());
    EXPECT_EQ(nullptr, pointer.get());
    EXPECT_EQ(nullptr, pointer.release());
    EXPECT_TRUE(cleaned.empty());
}

TEST_F(TspImplementorTest, ManagesWithoutACleanupFunction) {
    TSP_Implementor pointer(nullptr);
    pointer.set(&_a);
    pointer.set(&_b);
    EXPECT_EQ(&_b, pointer.release());
    std::thread([&] { pointer.set(&_a); }).join();
    EXPECT_EQ(nullptr, pointer._cleanup_fn);
}

TEST_F(TspImplementorTest, KeepsItsFunctionAndDeletesItsKey) {
    ScriptedCalls creations("pthread_key_create");
    ScriptedCalls deletions("pthread_key_delete");
    {
        const TSP_Implementor pointer(clean);
        EXPECT_EQ(&clean, pointer._cleanup_fn);
        EXPECT_TRUE(standInOrder({&pointer._key, &pointer._cleanup_fn}));
    }
    EXPECT_EQ(1U, creations.calls());
    EXPECT_EQ(1U, deletions.calls());
}

TEST_F(TspImplementorTest, KeepsItsValueWhenAStoreFails) {
    TSP_Implementor pointer(clean);
    pointer.internal_set(&_a);
    const std::string text = pthreadFailure("pthread_setspecific", "Cannot allocate memory");
    expectFailure("pthread_setspecific", ENOMEM, text, [&] { pointer.internal_set(&_b); });
    EXPECT_EQ(&_a, pointer.get());
    expectFailure("pthread_setspecific", ENOMEM, text, [&] { pointer.release(); });
    EXPECT_EQ(&_a, pointer.get());
    EXPECT_TRUE(cleaned.empty());
    pointer.release();
}

TEST_F(TspImplementorTest, WithoutAKeyTouchesNobodyElses) {
    const ChildRun run = inChild([&] {
        TSP_Implementor other(nullptr);
        other.set(&_a);
        Thread::mainThreadDying();
        {
            ScriptedCalls creations("pthread_key_create");
            creations.give(EAGAIN);
            TSP_Implementor pointer(clean);
            EXPECT_EQ(nullptr, pointer.get());
            pointer.set(&_b);
            EXPECT_EQ(nullptr, pointer.get());
            EXPECT_EQ(nullptr, pointer.release());
        }
        EXPECT_EQ(&_a, other.get());
        other.set(&_b);
        EXPECT_EQ(&_b, other.get());
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(ThreadSpecificPointerTest, GivesItsValuesTheirType) {
    static int deleted;
    deleted = 0;
    ThreadSpecificPointer<int> pointer([](void* value) {
        delete static_cast<int*>(value);
        ++deleted;
    });
    EXPECT_EQ(nullptr, pointer.get());
    pointer.set(new int(1));
    pointer.set(new int(2));
    EXPECT_EQ(1, deleted);
    EXPECT_EQ(2, *pointer.get());
    int* const released = pointer.release();
    EXPECT_EQ(2, *released);
    EXPECT_EQ(nullptr, pointer.get());
    delete released;
    std::thread([&] { pointer.set(new int(3)); }).join();
    EXPECT_EQ(2, deleted);
}

}  // namespace
