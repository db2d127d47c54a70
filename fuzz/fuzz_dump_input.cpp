// Arbitrary bytes through the input readers of smbios-dump: as a dmidecode
// --dump-bin image, as a raw structure table, and as physical memory read
// through the library's five functions (the bytes repeat over the whole
// address space, so that every search and read lands somewhere). Whatever a
// reader accepts must come back unchanged from the override file written
// for it, read with the plug-in's own grammar.
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "PluginRead.h"
#include "QNLog/QNLogger.h"
#include "dump/DumpInput.h"

namespace {

uint8_t const* gData = nullptr;
size_t gSize = 0;

uint8_t memoryAt(unsigned long address) { return gData[address % gSize]; }

int fakeIsInitialized() { return 1; }
int fakeOpen() { return 1; }
int fakeClose() { return 1; }

int fakeRead(void* buffer, unsigned long address, long count) {
    if (count < 0) {
        return -1;
    }
    uint8_t* out = static_cast<uint8_t*>(buffer);
    for (long i = 0; i < count; ++i) {
        out[i] = memoryAt(address + static_cast<unsigned long>(i));
    }
    return 0;
}

unsigned long fakeSearch(char const* anchor, unsigned long start, unsigned long end, long step) {
    size_t const length = std::strlen(anchor);
    // The memory repeats every gSize bytes, so after gSize steps every
    // position has been seen.
    size_t steps = 0;
    for (unsigned long address = start; address <= end && steps < gSize;
         address += static_cast<unsigned long>(step), ++steps) {
        size_t i = 0;
        while (i < length && memoryAt(address + i) == static_cast<uint8_t>(anchor[i])) {
            ++i;
        }
        if (i == length) {
            return address;
        }
    }
    return 0;
}

// The override file written for a capture reads back to the same bytes.
void checkRoundTrip(smbiosdump::Capture const& capture) {
    if (capture.header.empty() || capture.table.empty()) {
        __builtin_trap();
    }
    smbiosdump::PluginRead const back =
        smbiosdump::readOverrideText(smbiosdump::formatOverride(capture.header, capture.table));
    if (!back.ok() || back.header != capture.header || back.table != capture.table) {
        __builtin_trap();
    }
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    // The plug-in's reader logs every token it reads.
    QNLog::QNLogger::setLogLevel(QNLog::LEVEL_OFF);
    QNLog::QNLogger::setTraceLevel(QNLog::LEVEL_OFF);
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(uint8_t const* data, size_t size) {
    std::vector<uint8_t> const bytes(data, data + size);
    std::string error;

    smbiosdump::Capture fromBin;
    if (smbiosdump::captureFromDumpBin(bytes, fromBin, error)) {
        checkRoundTrip(fromBin);
    }

    smbiosdump::Capture fromTable;
    uint8_t const major = size > 0 ? data[0] : 2;
    if (smbiosdump::captureFromTable(bytes, major, 7, fromTable, error)) {
        checkRoundTrip(fromTable);
        if (fromTable.header.size() != smbiosdump::SM_ENTRY_POINT_SIZE) {
            __builtin_trap();
        }
    }

    if (size > 0) {
        gData = data;
        gSize = size;
        smbiosdump::PMemFunctions pmem;
        pmem.isInitialized = &fakeIsInitialized;
        pmem.open = &fakeOpen;
        pmem.close = &fakeClose;
        pmem.read = &fakeRead;
        pmem.search = &fakeSearch;
        smbiosdump::Capture fromMemory;
        if (smbiosdump::captureFromMemory(pmem, fromMemory, error)) {
            checkRoundTrip(fromMemory);
        }
    }
    return 0;
}
