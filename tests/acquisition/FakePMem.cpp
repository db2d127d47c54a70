// A stand-in for the physical-memory library, for the acquisition tests. It
// exports the library's five functions over a fake physical memory made of
// regions that the test maps, and control functions through which the test
// (which loads the same file) sets it up and reads what was called.
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <map>
#include <mutex>
#include <thread>
#include <vector>

#define FAKE_EXPORT extern "C" __attribute__((visibility("default")))

namespace {

struct FakeMemory {
    std::mutex mutex;
    std::map<unsigned long, std::vector<unsigned char>> regions;
    int initialized = 1;
    int openResult = 1;
    int failRead = 0;      // the n-th read (1-based) fails; 0: none
    int readFailure = -1;  // what a failed read returns
    // A read at peekAddress records its count and the two bytes that follow
    // the count in the caller's buffer (0: no peeking). Only for a caller
    // whose buffer is known to be longer: the table read.
    unsigned long peekAddress = 0;
    long peekedCount = -1;
    int peekedTail[2] = {-1, -1};
    int openDelayMs = 0;
    int opens = 0;
    int closes = 0;
    int reads = 0;
    int searches = 0;
};

FakeMemory& memory() {
    static FakeMemory fake;
    return fake;
}

// The byte at a physical address, false when no region holds it.
bool byteAt(FakeMemory& fake, unsigned long address, unsigned char& value) {
    auto it = fake.regions.upper_bound(address);
    if (it == fake.regions.begin()) {
        return false;
    }
    --it;
    unsigned long const offset = address - it->first;
    if (offset >= it->second.size()) {
        return false;
    }
    value = it->second[offset];
    return true;
}

}  // namespace

FAKE_EXPORT void FakePMemReset() {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    fake.regions.clear();
    fake.initialized = 1;
    fake.openResult = 1;
    fake.failRead = 0;
    fake.readFailure = -1;
    fake.peekAddress = 0;
    fake.peekedCount = -1;
    fake.peekedTail[0] = fake.peekedTail[1] = -1;
    fake.openDelayMs = 0;
    fake.opens = fake.closes = fake.reads = fake.searches = 0;
}

FAKE_EXPORT void FakePMemMap(unsigned long base, unsigned char const* bytes, unsigned long size) {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    fake.regions[base].assign(bytes, bytes + size);
}

FAKE_EXPORT void FakePMemSetInitialized(int value) { memory().initialized = value; }
FAKE_EXPORT void FakePMemSetOpenResult(int value) { memory().openResult = value; }
FAKE_EXPORT void FakePMemFailRead(int nth) { memory().failRead = nth; }
// A distinctive result for failed reads, so that a test sees the library's
// own code arrive rather than any failure value.
FAKE_EXPORT void FakePMemSetReadFailure(int code) { memory().readFailure = code; }

FAKE_EXPORT void FakePMemPeekAfterReadAt(unsigned long address) { memory().peekAddress = address; }

FAKE_EXPORT void FakePMemPeeked(long* count, int* tail0, int* tail1) {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    *count = fake.peekedCount;
    *tail0 = fake.peekedTail[0];
    *tail1 = fake.peekedTail[1];
}
FAKE_EXPORT void FakePMemSetOpenDelay(int ms) { memory().openDelayMs = ms; }

FAKE_EXPORT void FakePMemCounts(int* opens, int* closes, int* reads, int* searches) {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    *opens = fake.opens;
    *closes = fake.closes;
    *reads = fake.reads;
    *searches = fake.searches;
}

// FAKE_PMEM_INITIALIZED, when set, answers instead of FakePMemSetInitialized:
// a test that must see the library unloaded cannot hold a handle on it.
FAKE_EXPORT int PMemIsInitialized() {
    char const* value = std::getenv("FAKE_PMEM_INITIALIZED");
    return value != nullptr ? std::atoi(value) : memory().initialized;
}

FAKE_EXPORT int PMemOpen() {
    FakeMemory& fake = memory();
    if (fake.openDelayMs > 0) {
        std::this_thread::sleep_for(std::chrono::milliseconds(fake.openDelayMs));
    }
    std::lock_guard<std::mutex> lock(fake.mutex);
    ++fake.opens;
    return fake.openResult;
}

FAKE_EXPORT int PMemClose() {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    ++fake.closes;
    return 1;
}

FAKE_EXPORT int PMemRead(void* buffer, unsigned long address, long count) {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    ++fake.reads;
    if (fake.failRead == fake.reads || count < 0) {
        return fake.readFailure;
    }
    unsigned char* out = static_cast<unsigned char*>(buffer);
    for (long i = 0; i < count; ++i) {
        if (!byteAt(fake, address + static_cast<unsigned long>(i), out[i])) {
            return fake.readFailure;
        }
    }
    if (fake.peekAddress != 0 && address == fake.peekAddress) {
        fake.peekedCount = count;
        fake.peekedTail[0] = out[count];
        fake.peekedTail[1] = out[count + 1];
    }
    return 0;
}

#ifndef FAKE_PMEM_NO_SEARCH
FAKE_EXPORT unsigned long PMemSearch(char const* anchor, unsigned long start, unsigned long end,
                                     long step) {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    ++fake.searches;
    size_t const length = std::strlen(anchor);
    if (step <= 0) {
        return 0;
    }
    for (unsigned long address = start; address <= end;
         address += static_cast<unsigned long>(step)) {
        bool match = true;
        for (size_t i = 0; i < length && match; ++i) {
            unsigned char value = 0;
            match =
                byteAt(fake, address + i, value) && value == static_cast<unsigned char>(anchor[i]);
        }
        if (match) {
            return address;
        }
        if (end - address < static_cast<unsigned long>(step)) {
            break;
        }
    }
    return 0;
}
#endif
