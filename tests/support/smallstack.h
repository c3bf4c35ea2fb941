#pragma once
// Runs a body on a thread with a stack of 256 KiB (where the system goes below its default): deep trees must fit on it.

#include <gtest/gtest.h>
#include <pthread.h>

namespace support {

template <class Body> void OnSmallStack(Body body) {
    pthread_attr_t attributes;
    ASSERT_EQ(pthread_attr_init(&attributes), 0);
    ASSERT_EQ(pthread_attr_setstacksize(&attributes, 256 * 1024), 0);
    pthread_t thread;
    const auto run = [](void* body) -> void* {
        (*static_cast<Body*>(body))();
        return nullptr;
    };
    ASSERT_EQ(pthread_create(&thread, &attributes, run, &body), 0);
    pthread_join(thread, nullptr);
    pthread_attr_destroy(&attributes);
}

} // namespace support
