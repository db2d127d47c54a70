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
// What it found of each source it tried, and what it cut from a table too
// large for a 2.x entry point, it keeps for the tools (PMemSourceReport,
// PMemTableCut).
// Every file is opened without waiting, and only when it is a regular file
// (or, for devmem, a character device): a FIFO, socket, folder or other
// device makes its source unusable, as an unreadable file does.
// The library prints nothing: failures are results.
#include <climits>
#include <cstdlib>
#include <cstring>
#include <exception>
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

// What choosing a source found: one line per source tried, and what the
// sysfs source cut from a table too large for a 2.x entry point.
struct Findings {
    std::string report;
    TableCut cut;

    void note(char const* source, std::string const& text) {
        report += std::string(source) + ": " + text + "\n";
    }
};

// Whether the memory holds an entry point where the plug-in looks: "_SM_" on
// a 16-byte boundary in 0xF0000-0xFFFFF, else "_DMI_" in the first megabyte.
bool holdsEntryPoint(Source& memory) {
    unsigned char const sm[] = {'_', 'S', 'M', '_'};
    unsigned char const dmi[] = {'_', 'D', 'M', 'I', '_'};
    return memory.search(sm, sizeof sm, 0xF0000, 0xFFFFF, 16) != 0 ||
           memory.search(dmi, sizeof dmi, 0, 0xFFFFF, 16) != 0;
}

std::unique_ptr<Source> imageSource(Findings& findings) {
    char const* list = std::getenv("PMEM_IMAGE");
    if (list == nullptr) {
        findings.note("image", "PMEM_IMAGE is not set");
        return nullptr;
    }
    std::unique_ptr<RegionMemory> memory(new RegionMemory());
    std::string why;
    if (!loadImage(list, *memory, why)) {
        findings.note("image", why);
        return nullptr;
    }
    findings.note("image", holdsEntryPoint(*memory)
                               ? std::string("serves ") + list
                               : std::string("serves ") + list +
                                     ", which holds no entry point in 0xF0000-0xFFFFF "
                                     "(nor a _DMI_ one in the first megabyte)");
    return memory;
}

std::unique_ptr<Source> sysfsSource(Findings& findings) {
    std::string folder = environment("PMEM_SYSFS_DIR");
    if (folder.empty()) {
        folder = "/sys/firmware/dmi/tables";
    }
    std::unique_ptr<RegionMemory> memory(new RegionMemory());
    std::string why;
    if (!loadSysfsTables(folder, *memory, why, findings.cut)) {
        findings.note("sysfs", why);
        return nullptr;
    }
    findings.note("sysfs", "serves " + folder);
    return memory;
}

std::unique_ptr<Source> devmemSource(Findings& findings) {
    std::string path = environment("PMEM_DEVMEM_FILE");
    if (path.empty()) {
        path = "/dev/mem";
    }
    std::string why;
    if (!DevMem::canOpen(path, why)) {
        findings.note("devmem", why);
        return nullptr;
    }
    findings.note("devmem", "serves " + path);
    return std::unique_ptr<Source>(new DevMem(path));
}

// A source that cannot be made (a file too large to hold, say) is unusable.
std::unique_ptr<Source> attempt(std::unique_ptr<Source> (*make)(Findings&), char const* name,
                                Findings& findings) {
    try {
        return make(findings);
    } catch (std::exception const& e) {
        findings.note(name, e.what());
    } catch (...) {
        findings.note(name, "cannot be used");
    }
    return nullptr;
}

std::unique_ptr<Source> chooseSource(Findings& findings) {
    struct Candidate {
        char const* name;
        std::unique_ptr<Source> (*make)(Findings&);
    };
    Candidate const candidates[] = {
        {"image", imageSource}, {"sysfs", sysfsSource}, {"devmem", devmemSource}};
    std::string const forced = environment("PMEM_SOURCE");
    for (Candidate const& candidate : candidates) {
        if (forced.empty() || forced == candidate.name) {
            if (std::unique_ptr<Source> source =
                    attempt(candidate.make, candidate.name, findings)) {
                return source;
            }
        }
    }
    if (!forced.empty() && forced != "image" && forced != "sysfs" && forced != "devmem") {
        // An unknown source serves nothing.
        findings.note("PMEM_SOURCE", "'" + forced + "' names no source (image, sysfs, devmem)");
    }
    return nullptr;
}

struct Library {
    Library() : source(chooseSource(findings)) {}

    std::mutex mutex;
    Findings findings;
    std::unique_ptr<Source> source;
};

// Made on first use, which is when the library is loaded (below); undone
// when it is unloaded.
Library& library() {
    static Library instance;
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

namespace {

// Runs use on the chosen source under the library's lock, and gives
// fallback when there is no source or anything throws: nothing may escape
// into a C caller.
template <typename Result, typename Use>
Result withSource(Result fallback, Use use) {
    try {
        pmem::Library& lib = library();
        std::lock_guard<std::mutex> lock(lib.mutex);
        return lib.source ? use(*lib.source) : fallback;
    } catch (...) {
        return fallback;
    }
}

}  // namespace

int PMemOpen(void) {
    return withSource(0, [](pmem::Source& source) { return source.open() ? 1 : 0; });
}

int PMemClose(void) {
    return withSource(0, [](pmem::Source& source) { return source.close() ? 1 : 0; });
}

// 0 when exactly `count` bytes were copied; -1 otherwise. A read of no
// bytes succeeds when a source serves.
int PMemRead(void* buffer, unsigned long address, long count) {
    if (buffer == nullptr || count < 0) {
        return -1;
    }
    return withSource(-1, [&](pmem::Source& source) {
        if (count == 0) {
            return 0;
        }
        unsigned long const n = static_cast<unsigned long>(count);
        if (n - 1 > ULONG_MAX - address) {
            return -1;  // past the last address
        }
        return source.read(static_cast<unsigned char*>(buffer), address, n) ? 0 : -1;
    });
}

// The first address from `start`, advancing by `step` while not past `end`,
// where the anchor's characters (without its terminating NUL) all occur; 0
// when there is none, and for an empty anchor or a step below 1.
unsigned long PMemSearch(char const* anchor, unsigned long start, unsigned long end, long step) {
    if (anchor == nullptr || *anchor == '\0' || step <= 0 || start > end) {
        return 0;
    }
    return withSource(0ul, [&](pmem::Source& source) {
        unsigned long const length = static_cast<unsigned long>(std::strlen(anchor));
        return source.search(reinterpret_cast<unsigned char const*>(anchor), length, start, end,
                             static_cast<unsigned long>(step));
    });
}

// What the library found when it chose its source, for the tools to show a
// person; the plug-in never calls it.
char const* PMemSourceReport(void) {
    try {
        return library().findings.report.c_str();
    } catch (...) {
        return "";
    }
}

int PMemTableCut(unsigned long* tableBytes, unsigned long* tableStructures,
                 unsigned long* servedBytes, unsigned long* servedStructures) {
    try {
        pmem::TableCut const& cut = library().findings.cut;
        if (!cut.cut || tableBytes == nullptr || tableStructures == nullptr ||
            servedBytes == nullptr || servedStructures == nullptr) {
            return 0;
        }
        *tableBytes = static_cast<unsigned long>(cut.tableBytes);
        *tableStructures = cut.tableStructures;
        *servedBytes = static_cast<unsigned long>(cut.servedBytes);
        *servedStructures = cut.servedStructures;
        return 1;
    } catch (...) {
        return 0;
    }
}
