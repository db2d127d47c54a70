// libpmem.so: read access to physical memory for the SMBIOS plug-in, which
// loads it from its code directory and calls its five functions. It serves
// one source, chosen when the library is loaded:
//   image   PMEM_IMAGE=FILE@BASE[,FILE@BASE...]: each file as the memory
//           from BASE (hexadecimal) on; nothing between the files
//   sysfs   the kernel's copy of the SMBIOS entry point and table, in
//           PMEM_SYSFS_DIR (default /sys/firmware/dmi/tables)
//   devmem  the kernel's memory device, PMEM_DEVMEM_FILE (default /dev/mem)
// PMEM_SOURCE=image|sysfs|devmem takes that source or none; without it the
// first usable one in that order serves (image only when PMEM_IMAGE is set).
// Every file is opened without waiting, and only when it is a regular file
// (or, for devmem, a character device): a FIFO, socket, folder or other
// device makes its source unusable, as an unreadable file does.
// The library prints nothing: failures are results.
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <mutex>
#include <string>

#include "DevMem.h"
#include "Loaders.h"
#include "RegionMemory.h"
#include "Source.h"
#include "pmem/PMemContract.h"

namespace pmem {

namespace {

std::string environment(char const* name) {
    char const* value = std::getenv(name);
    return value == nullptr ? std::string() : std::string(value);
}

std::unique_ptr<Source> imageSource() {
    char const* list = std::getenv("PMEM_IMAGE");
    if (list == nullptr) {
        return nullptr;
    }
    std::unique_ptr<RegionMemory> memory(new RegionMemory());
    return loadImage(list, *memory) ? std::move(memory) : nullptr;
}

std::unique_ptr<Source> sysfsSource() {
    std::string folder = environment("PMEM_SYSFS_DIR");
    if (folder.empty()) {
        folder = "/sys/firmware/dmi/tables";
    }
    std::unique_ptr<RegionMemory> memory(new RegionMemory());
    return loadSysfsTables(folder, *memory) ? std::move(memory) : nullptr;
}

std::unique_ptr<Source> devmemSource() {
    std::string path = environment("PMEM_DEVMEM_FILE");
    if (path.empty()) {
        path = "/dev/mem";
    }
    if (!DevMem::canOpen(path)) {
        return nullptr;
    }
    return std::unique_ptr<Source>(new DevMem(path));
}

// A source that cannot be made (a file too large to hold, say) is unusable.
template <typename Make>
std::unique_ptr<Source> attempt(Make make) {
    try {
        return make();
    } catch (...) {
        return nullptr;
    }
}

std::unique_ptr<Source> chooseSource() {
    std::string const forced = environment("PMEM_SOURCE");
    if (forced == "image") {
        return attempt(imageSource);
    }
    if (forced == "sysfs") {
        return attempt(sysfsSource);
    }
    if (forced == "devmem") {
        return attempt(devmemSource);
    }
    if (!forced.empty()) {
        return nullptr;  // an unknown source serves nothing
    }
    if (std::unique_ptr<Source> source = attempt(imageSource)) {
        return source;
    }
    if (std::unique_ptr<Source> source = attempt(sysfsSource)) {
        return source;
    }
    return attempt(devmemSource);
}

struct Library {
    std::mutex mutex;
    std::unique_ptr<Source> source;
};

// Made on first use, which is when the library is loaded (below); undone
// when it is unloaded.
Library& library() {
    static Library instance{{}, chooseSource()};
    return instance;
}

__attribute__((constructor)) void chooseSourceAtLoad() { library(); }

}  // namespace

}  // namespace pmem

using pmem::library;

// The five functions of the contract, which declares them with C linkage and
// exported.

int PMemIsInitialized(void) {
    try {
        return library().source ? 1 : 0;
    } catch (...) {
        return 0;
    }
}

int PMemOpen(void) {
    try {
        pmem::Library& lib = library();
        std::lock_guard<std::mutex> lock(lib.mutex);
        return lib.source && lib.source->open() ? 1 : 0;
    } catch (...) {
        return 0;
    }
}

int PMemClose(void) {
    try {
        pmem::Library& lib = library();
        std::lock_guard<std::mutex> lock(lib.mutex);
        return lib.source && lib.source->close() ? 1 : 0;
    } catch (...) {
        return 0;
    }
}

// 0 when exactly `count` bytes were copied; -1 otherwise. A read of no
// bytes succeeds when a source serves.
int PMemRead(void* buffer, unsigned long address, long count) {
    if (buffer == nullptr || count < 0) {
        return -1;
    }
    try {
        pmem::Library& lib = library();
        std::lock_guard<std::mutex> lock(lib.mutex);
        if (!lib.source) {
            return -1;
        }
        if (count == 0) {
            return 0;
        }
        unsigned long const n = static_cast<unsigned long>(count);
        if (n - 1 > ULONG_MAX - address) {
            return -1;  // past the last address
        }
        return lib.source->read(static_cast<unsigned char*>(buffer), address, n) ? 0 : -1;
    } catch (...) {
        return -1;
    }
}

// The first address from `start`, advancing by `step` while not past `end`,
// where the anchor's characters (without its terminating NUL) all occur; 0
// when there is none, and for an empty anchor or a step below 1.
unsigned long PMemSearch(char const* anchor, unsigned long start, unsigned long end, long step) {
    if (anchor == nullptr || *anchor == '\0' || step <= 0 || start > end) {
        return 0;
    }
    try {
        pmem::Library& lib = library();
        std::lock_guard<std::mutex> lock(lib.mutex);
        if (!lib.source) {
            return 0;
        }
        unsigned long const length = static_cast<unsigned long>(std::strlen(anchor));
        return lib.source->search(reinterpret_cast<unsigned char const*>(anchor), length, start,
                                  end, static_cast<unsigned long>(step));
    } catch (...) {
        return 0;
    }
}
