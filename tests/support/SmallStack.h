#ifndef QUELTA_TESTS_SUPPORT_SMALLSTACK_H_
#define QUELTA_TESTS_SUPPORT_SMALLSTACK_H_

// Runs a test body on a thread with a stack of 512 KiB, so that deep recursion crashes.

#include <pthread.h>

#include <functional>

#include <gtest/gtest.h>

inline void onSmallStack(std::function<void()> body) {
    pthread_attr_t attributes;
    ASSERT_EQ(0, pthread_attr_init(&attributes));
    ASSERT_EQ(0, pthread_attr_setstacksize(&attributes, 512 * 1024));
    pthread_t thread;
    const auto run = [](void* argument) -> void* {
        (*static_cast<std::function<void()>*>(argument))();
        return nullptr;
    };
    ASSERT_EQ(0, pthread_create(&thread, &attributes, run, &body));
    ASSERT_EQ(0, pthread_join(thread, nullptr));
    ASSERT_EQ(0, pthread_attr_destroy(&attributes));
}

#endif  // QUELTA_TESTS_SUPPORT_SMALLSTACK_H_
