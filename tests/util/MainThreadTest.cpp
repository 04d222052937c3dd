// What a process can do once only, each case in a process of its own.

#include <gtest/gtest.h>

#include <cerrno>

#include "support/InChild.h"
#include "support/ScriptedPthread.h"
#include "util/Logger.h"
#include "util/Thread.h"

namespace {

TEST(MainThreadTest, MustBeMadeBeforeAnyWorker) {
    const ChildRun run = inChild([] {
        ScriptedCalls creations("pthread_create");
        EXPECT_EQ("Thread created before main thread!", thrownBy([] { Thread worker("Early"); }));
        EXPECT_EQ(0U, creations.calls());
        Thread main;
        Thread worker("Later");
        EXPECT_EQ(1U, creations.calls());
        worker.go();
        worker.join();
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(MainThreadTest, CannotBeMadeTwice) {
    const ChildRun run = inChild([] {
        {
            const Thread main;
            EXPECT_EQ("Main Thread created twice!", thrownBy([] { Thread second; }));
        }
        EXPECT_EQ("Main Thread created twice!", thrownBy([] { Thread third; }));
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(MainThreadTest, IsRefusedEvenWhileDying) {
    const ChildRun run = inChild([] {
        Thread::mainThreadDying();
        EXPECT_EQ("Thread created before main thread!", thrownBy([] { Thread worker("Early"); }));
        const Thread main;
        EXPECT_EQ("Main Thread created twice!", thrownBy([] { Thread second; }));
    });
    EXPECT_EQ(0, run.status);
}

TEST(MainThreadTest, NeedsAttributesForItsWorkers) {
    const ChildRun run = inChild([] {
        expectFailure("pthread_attr_init", ENOMEM,
                      pthreadFailure("pthread_attr_init", "Cannot allocate memory"),
                      [] { Thread main; });
        // The attempt counts; workers have the default attributes then.
        EXPECT_EQ("Main Thread created twice!", thrownBy([] { Thread second; }));
        Thread worker("Sorter");
        EXPECT_EQ(nullptr, seenByPthread.attributes);
        worker.go();
        worker.join();
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(MainThreadTest, ManagesWithoutAttributesWhileDying) {
    const ChildRun run = inChild([] {
        Thread::mainThreadDying();
        ScriptedCalls inits("pthread_attr_init");
        inits.give(ENOMEM);
        ScriptedCalls sizes("pthread_attr_setstacksize");
        const Thread main;
        EXPECT_EQ(0U, sizes.calls());
        Thread worker("Sorter");
        EXPECT_EQ(nullptr, seenByPthread.attributes);
        worker.go();
        worker.join();
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("", run.err);
}

TEST(MainThreadTest, OnlyWarnsAboutAStackSizeThatCannotBeSet) {
    const ChildRun run = inChild([] {
        pthread_attr_t defaults;
        std::size_t defaultSize = 0;
        ::pthread_attr_init(&defaults);
        ::pthread_attr_getstacksize(&defaults, &defaultSize);
        ::pthread_attr_destroy(&defaults);

        ScriptedCalls sizes("pthread_attr_setstacksize");
        sizes.give(EINVAL);
        errno = ENOENT;
        EXPECT_NO_THROW(Thread main);
        Thread worker("Sorter");
        EXPECT_EQ(defaultSize, seenByPthread.stackSize);
        worker.go();
        worker.join();
    });
    EXPECT_EQ(0, run.status);
    EXPECT_EQ("cannot override thread stack size: pthread_attr_setstacksize(): Invalid argument\n",
              run.err);
}

TEST(MainThreadTest, WarnsAboutTheStackSizeOnTheLoggerNamedThread) {
    for (const bool shown : {true, false}) {
        const ChildRun run = inChild([&] {
            Logger::setChannelLevel(nullptr, shown ? "ERROR" : "DEBUG");
            Logger::setChannelLevel("Thread", shown ? "WARN" : "ERROR");
            Logger::initialize();
            ScriptedCalls sizes("pthread_attr_setstacksize");
            sizes.give(EINVAL);
            const Thread main;
        });
        EXPECT_EQ(0, run.status);
        EXPECT_EQ(shown ? "cannot override thread stack size: pthread_attr_setstacksize(): "
                          "Invalid argument\n"
                        : "",
                  run.err);
    }
}

}  // namespace
