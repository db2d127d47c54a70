// A stand-in for the physical-memory library libpmem.so, for the tests of
// what loads it: the plug-in's acquisition, in the test's own process, and
// smbios-dump --from-machine, in a child process. It exports the contract's
// five functions over a fake physical memory, the library's own
// pmem::RegionMemory, and is set up two ways.
//
// Control functions (FakePMem*, below), for a test that loads the same file
// as the plug-in does and so shares its state: the regions it maps, the
// results it chooses, the counts of the calls it reads back.
//
// The environment, read at each call, for a test that cannot hold the
// library (its child process loads it, or it must see the library unloaded):
//   FAKE_PMEM_IMAGE        FILE@BASE[,FILE@BASE...]: PMemOpen makes the
//                          memory of these files, each from BASE
//                          (hexadecimal) on, as libpmem.so's PMEM_IMAGE does;
//                          the open fails when one cannot be placed
//   FAKE_PMEM_INITIALIZED  PMemIsInitialized returns this number instead of
//                          what FakePMemSetInitialized chose
//   FAKE_PMEM_OPEN         "0": PMemOpen returns 0
//   FAKE_PMEM_CLOSE        "0": PMemClose returns 0
// Built with FAKE_PMEM_NO_SEARCH it does not export PMemSearch.
#include <chrono>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include "Loaders.h"
#include "RegionMemory.h"
#include "pmem/PMemContract.h"

#define FAKE_EXPORT extern "C" __attribute__((visibility("default")))

namespace {

struct FakeMemory {
    std::mutex mutex;
    std::unique_ptr<pmem::RegionMemory> regions{new pmem::RegionMemory()};
    int initialized = 1;
    int openResult = 1;
    int failRead = 0;      // the n-th read (1-based) fails; 0: none
    int readFailure = -1;  // what a failed read returns
    // A read at peekAddress records its count and the two bytes that follow
    // the count in the caller's buffer (0: no peeking). Only for a caller
    // whose buffer is known to be longer: the plug-in's table read.
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

bool isSet(char const* name, char const* value) {
    char const* text = std::getenv(name);
    return text != nullptr && std::strcmp(text, value) == 0;
}

}  // namespace

FAKE_EXPORT void FakePMemReset() {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    fake.regions.reset(new pmem::RegionMemory());
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

// 1 when the bytes are placed from `base` on; 0 when they would overlap
// bytes already placed or run past the last address.
FAKE_EXPORT int FakePMemMap(unsigned long base, unsigned char const* bytes, unsigned long size) {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    return fake.regions->place(base, std::vector<unsigned char>(bytes, bytes + size)) ? 1 : 0;
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

// The contract's functions (declared with C linkage and exported there).

int PMemIsInitialized(void) {
    char const* value = std::getenv("FAKE_PMEM_INITIALIZED");
    return value != nullptr ? std::atoi(value) : memory().initialized;
}

int PMemOpen(void) {
    FakeMemory& fake = memory();
    if (fake.openDelayMs > 0) {
        std::this_thread::sleep_for(std::chrono::milliseconds(fake.openDelayMs));
    }
    std::lock_guard<std::mutex> lock(fake.mutex);
    ++fake.opens;
    if (fake.openResult == 0 || isSet("FAKE_PMEM_OPEN", "0")) {
        return 0;
    }
    if (char const* image = std::getenv("FAKE_PMEM_IMAGE")) {
        std::unique_ptr<pmem::RegionMemory> regions(new pmem::RegionMemory());
        std::string why;
        if (!pmem::loadImage(image, *regions, why)) {
            return 0;
        }
        fake.regions = std::move(regions);
    }
    return fake.openResult;
}

int PMemClose(void) {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    ++fake.closes;
    return isSet("FAKE_PMEM_CLOSE", "0") ? 0 : 1;
}

int PMemRead(void* buffer, unsigned long address, long count) {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    ++fake.reads;
    if (fake.failRead == fake.reads || buffer == nullptr || count < 0) {
        return fake.readFailure;
    }
    unsigned char* out = static_cast<unsigned char*>(buffer);
    if (count > 0) {
        unsigned long const n = static_cast<unsigned long>(count);
        if (n - 1 > ULONG_MAX - address || !fake.regions->read(out, address, n)) {
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
unsigned long PMemSearch(char const* anchor, unsigned long start, unsigned long end, long step) {
    FakeMemory& fake = memory();
    std::lock_guard<std::mutex> lock(fake.mutex);
    ++fake.searches;
    if (anchor == nullptr || *anchor == '\0' || step <= 0 || start > end) {
        return 0;
    }
    return fake.regions->search(reinterpret_cast<unsigned char const*>(anchor),
                                static_cast<unsigned long>(std::strlen(anchor)), start, end,
                                static_cast<unsigned long>(step));
}
#endif
