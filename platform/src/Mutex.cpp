// SD::Mutex: a timed mutex behind the agent's lock interface.
#include "SD/Mutex.h"

#include <chrono>

namespace SD {

bool Mutex::lock(int timeoutMs) {
    if (timeoutMs < 0) {
        mutex_.lock();
        return true;
    }
    return mutex_.try_lock_for(std::chrono::milliseconds(timeoutMs));
}

void Mutex::unlock() { mutex_.unlock(); }

}  // namespace SD
