// A mutual-exclusion lock with a bounded or unbounded wait.
#pragma once

#include <mutex>

namespace SD {

class Mutex {
public:
    Mutex() = default;
    // Waits at most timeoutMs milliseconds, or without bound when it is -1.
    // Returns whether the lock was taken.
    bool lock(int timeoutMs = -1);
    void unlock();

private:
    Mutex(Mutex const&) = delete;
    Mutex& operator=(Mutex const&) = delete;
    std::timed_mutex mutex_;
};

}  // namespace SD
