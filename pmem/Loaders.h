// Fills an in-process memory from files: the image source (files placed at
// the addresses PMEM_IMAGE names) and the sysfs source (the kernel's
// copy of the SMBIOS entry point and structure table).
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "RegionMemory.h"
#include "format/EntryPoint.h"

namespace pmem {

// Where the sysfs source presents the entry point: the start of the area
// 0xF0000-0xFFFFF that readers search for "_SM_", which it presents whole
// (zero but for the entry point), as firmware does.
constexpr unsigned long kBiosAreaFirst = smbiosformat::SM_SEARCH_START;
constexpr unsigned long kBiosAreaSize = smbiosformat::SM_SEARCH_END - kBiosAreaFirst + 1;
// Where it serves a table that cannot stay at the address its entry point
// names: right above the first megabyte.
constexpr unsigned long kMovedTableAddress = 0x100000;

// The whole file, when it is a regular file (anything else is refused
// without being opened, or waited for), can be read and holds at most
// `limit` bytes. Otherwise false, and why says so, naming the file
// ("/sys/firmware/dmi/tables/DMI: Permission denied").
bool readWholeFile(std::string const& path, size_t limit, std::vector<unsigned char>& bytes,
                   std::string& why);

// Places the files of "FILE@BASE[,FILE@BASE...]" (BASE hexadecimal, with or
// without 0x). False when an item lacks its '@', file or base, a base is not
// hexadecimal or does not fit an address, a file cannot be read, or two
// files would overlap; why then says which item failed and how.
bool loadImage(std::string const& list, RegionMemory& memory, std::string& why);

// Presents `folder`/smbios_entry_point at 0xF0000 and `folder`/DMI at the
// address the presented entry point names. A 2.x "_SM_" or a legacy "_DMI_"
// entry point is presented as it is; when its table would overlap it (or
// not fit below the last address) the table is served at 0x100000 instead
// and the entry point's address and checksums are made to say so. A 3.x
// "_SM3_" entry point is presented as the equivalent "_SM_" one (same
// version, both checksums correct), its table at its own address when that
// lies below 4 GiB, else at 0x100000. A 3.x table longer than a 2.x entry
// point can state (65535 bytes) is served as the whole structures of its
// start that fit, and cut says so (cut is set only when the source can
// serve). False, with why, when a file is missing,
// unreadable or empty, or the entry point is unknown or short.
struct TableCut {
    bool cut = false;              // the table served is the start of a larger one
    size_t tableBytes = 0;         // the whole table's length ...
    unsigned tableStructures = 0;  // ... and structures
    size_t servedBytes = 0;        // what the presented entry point describes
    unsigned servedStructures = 0;
};
bool loadSysfsTables(std::string const& folder, RegionMemory& memory, std::string& why,
                     TableCut& cut);

}  // namespace pmem
