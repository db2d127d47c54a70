#include "smbios/PMem.h"

#include <stdexcept>

#include "SD/PlatformUtilities.h"
#include "SD/StringConversion.h"
#include "smbios/Logging.h"

namespace SD {

PMemOpenFn _PMemOpen = nullptr;
PMemCloseFn _PMemClose = nullptr;
PMemReadFn _PMemRead = nullptr;
PMemSearchFn _PMemSearch = nullptr;

QNLog::QNLogger loggerPMem("Quillon.IC.SmBios.SmBiosInitializer.PMem");

std::wstring _getFileName() {
    return make_wstring(PlatformUtilities::getKestrelCodeDir()) + L"libpmem.so";
}

namespace {

// The library name, after the constructor's entry line.
std::wstring enterConstructor() {
    SMBIOS_DETAIL(loggerPMem, "Constructor (void) entry");
    return _getFileName();
}

}  // namespace

PMem::PMem() : DynamicLibrary(enterConstructor()) {
    std::string const name = make_string(getFileName());
    if (!load()) {
        SMBIOS_ERROR(loggerPMem,
                     "Constructor could not load library '" << name << "' - exception return");
        throw std::runtime_error("PMEM: could not load library '" + name + "'.");
    }
    pmem::Functions bound;
    bool const complete = pmem::bindFunctions(getHandle(), bound) == nullptr;
    if (bound.isInitialized == nullptr || bound.isInitialized() == 0) {
        unload();
        SMBIOS_ERROR(loggerPMem,
                     "Constructor library '" << name << "' did not initialize - exception return");
        throw std::runtime_error("PMEM: library '" + name + "' did not initialize.");
    }
    _PMemOpen = bound.open;
    _PMemClose = bound.close;
    _PMemRead = bound.read;
    _PMemSearch = bound.search;
    if (!complete) {
        unload();
        SMBIOS_ERROR(loggerPMem, "Constructor could not export all symbols - exception return");
        throw std::runtime_error("PMEM: could not export all symbols.");
    }
    SMBIOS_DETAIL(loggerPMem, "Constructor successful return");
}

PMem::~PMem() {
    SMBIOS_DETAIL(loggerPMem, "Destructor entry");
    unload();
    SMBIOS_DETAIL(loggerPMem, "Destructor return");
}

bool PMem::open() {
    SMBIOS_DETAIL(loggerPMem, "open entry-exit ");
    return _PMemOpen() != 0;
}

bool PMem::close() {
    SMBIOS_DETAIL(loggerPMem, "close entry-return");
    return _PMemClose() != 0;
}

int PMem::read(void* buffer, unsigned long address, long count) {
    SMBIOS_DETAIL(loggerPMem, "read entry-return");
    return _PMemRead(buffer, address, count);
}

unsigned long PMem::search(char const* anchor, unsigned long start, unsigned long end, long step) {
    SMBIOS_DETAIL(loggerPMem, "search entry-return");
    return _PMemSearch(anchor, start, end, step);
}

}  // namespace SD
