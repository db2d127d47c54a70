// SD::Mutex: unbounded and bounded waits.
#include <gtest/gtest.h>

#include <future>
#include <thread>

#include "SD/Mutex.h"

TEST(Mutex, UnboundedLockTakesFreeLock) {
    SD::Mutex mutex;
    EXPECT_TRUE(mutex.lock());
    mutex.unlock();
    EXPECT_TRUE(mutex.lock(-1));
    mutex.unlock();
}

TEST(Mutex, ZeroTimeoutTakesFreeLock) {
    SD::Mutex mutex;
    EXPECT_TRUE(mutex.lock(0));
    mutex.unlock();
}

TEST(Mutex, TimedLockFailsWhileAnotherThreadHoldsIt) {
    SD::Mutex mutex;
    std::promise<void> taken;
    std::promise<void> release;
    std::thread holder([&] {
        mutex.lock();
        taken.set_value();
        release.get_future().wait();
        mutex.unlock();
    });
    taken.get_future().wait();
    EXPECT_FALSE(mutex.lock(50));
    EXPECT_FALSE(mutex.lock(0));
    release.set_value();
    holder.join();
    EXPECT_TRUE(mutex.lock(50));
    mutex.unlock();
}

TEST(Mutex, UnboundedLockWaitsForRelease) {
    SD::Mutex mutex;
    ASSERT_TRUE(mutex.lock());
    std::promise<bool> result;
    std::thread waiter([&] {
        bool const taken = mutex.lock(-1);
        if (taken) {
            mutex.unlock();
        }
        result.set_value(taken);
    });
    std::future<bool> outcome = result.get_future();
    EXPECT_EQ(std::future_status::timeout, outcome.wait_for(std::chrono::milliseconds(50)));
    mutex.unlock();
    EXPECT_TRUE(outcome.get());
    waiter.join();
}
