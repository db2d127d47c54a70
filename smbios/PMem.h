// Read access to physical memory through the run-time-loaded library
// "libpmem.so" in the agent's code directory, which exports five plain
// functions: PMemIsInitialized, PMemOpen, PMemClose, PMemRead, PMemSearch.
#pragma once

#include <string>

#include "QNLog/QNLogger.h"
#include "SD/DynamicLibrary.h"
#include "pmem/PMemContract.h"

namespace SD {

// The library's function types, as its contract declares them.
typedef pmem::IsInitializedFn PMemIsInitializedFn;
typedef pmem::OpenFn PMemOpenFn;
typedef pmem::CloseFn PMemCloseFn;
typedef pmem::ReadFn PMemReadFn;
typedef pmem::SearchFn PMemSearchFn;

// Bound by every successful construction of a PMem; only meaningful while a
// PMem holds the library loaded.
extern PMemOpenFn _PMemOpen;
extern PMemCloseFn _PMemClose;
extern PMemReadFn _PMemRead;
extern PMemSearchFn _PMemSearch;

extern QNLog::QNLogger loggerPMem;

// The code directory immediately followed by "libpmem.so".
std::wstring _getFileName();

class PMem : public DynamicLibrary {
public:
    // Loads the library and binds its functions; std::runtime_error when the
    // library cannot be loaded, does not initialize, or lacks a function.
    PMem();
    ~PMem() override;

    bool open();
    bool close();
    // 0 when exactly count bytes were copied to buffer.
    int read(void* buffer, unsigned long address, long count);
    // The first address from start, by step, not past end, where the anchor
    // occurs; 0 when there is none.
    unsigned long search(char const* anchor, unsigned long start, unsigned long end, long step);
};

}  // namespace SD
