#include "Loaders.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdint>
#include <cstring>
#include <utility>

#include "SD/RegularFile.h"
#include "format/EntryPoint.h"
#include "format/Hex.h"

namespace pmem {

namespace {

// Image files and the kernel's tables are small; anything larger is refused
// rather than read into memory.
constexpr size_t kImageFileLimit = 64 * 1024 * 1024;
constexpr size_t kEntryPointFileLimit = 4096;
constexpr size_t kTableFileLimit = 16 * 1024 * 1024;
// The bytes from 0xF0000 on that belong to the presented entry point: the
// plug-in reads 64 bytes at the anchor, so a table is never served there.
constexpr size_t kEntryPointZone = 0x40;

bool parseBase(std::string const& text, unsigned long& value) {
    size_t pos = 0;
    if (text.size() >= 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X')) {
        pos = 2;
    }
    if (pos == text.size()) {
        return false;
    }
    unsigned long result = 0;
    for (; pos < text.size(); ++pos) {
        int const digit = smbiosformat::hexValue(text[pos]);
        if (digit < 0) {
            return false;
        }
        if (result > (ULONG_MAX >> 4)) {
            return false;
        }
        result = (result << 4) | static_cast<unsigned long>(digit);
    }
    value = result;
    return true;
}

bool startsWith(std::vector<unsigned char> const& bytes, char const* anchor) {
    size_t const n = std::strlen(anchor);
    return bytes.size() >= n && std::memcmp(bytes.data(), anchor, n) == 0;
}

// Sets bytes[at] so that the 8-bit sum of bytes[begin, end) is zero; `at`
// lies in that range and the range is cut at the end of the bytes (what the
// entry point lacks is presented as zero, which adds nothing).
void setChecksum(std::vector<unsigned char>& bytes, size_t at, size_t begin, size_t end) {
    bytes[at] = 0;
    bytes[at] = smbiosformat::checksumFor(bytes, begin, std::min(end, bytes.size()));
}

// Whether a table of `size` bytes (size >= 1) can be served at `address`:
// its last byte at or below `limit` and none of it on the entry point.
bool canServeAt(uint64_t address, size_t size, uint64_t limit, size_t entryPointSize) {
    uint64_t const span = static_cast<uint64_t>(size) - 1;
    if (address > limit || span > limit - address) {
        return false;
    }
    uint64_t const last = address + span;
    uint64_t const zoneLast = kBiosAreaFirst + std::max(kEntryPointZone, entryPointSize) - 1;
    return last < kBiosAreaFirst || address > zoneLast;
}

// Places the area 0xF0000-0xFFFFF, zero but for the entry point at its
// start, and the table at `address` (which canServeAt accepted). When the
// table shares addresses with the area the two are placed as one run, the
// table's bytes over the area's zeros.
bool placeEntryPointAndTable(RegionMemory& memory, std::vector<unsigned char> const& entryPoint,
                             unsigned long address, std::vector<unsigned char> table) {
    std::vector<unsigned char> area(kBiosAreaSize, 0);
    std::copy(entryPoint.begin(), entryPoint.end(), area.begin());
    unsigned long const areaLast = kBiosAreaFirst + (kBiosAreaSize - 1);
    unsigned long const tableLast = address + static_cast<unsigned long>(table.size() - 1);
    if (tableLast < kBiosAreaFirst || address > areaLast) {
        return memory.place(kBiosAreaFirst, std::move(area)) &&
               memory.place(address, std::move(table));
    }
    unsigned long const first = std::min(address, kBiosAreaFirst);
    unsigned long const last = std::max(tableLast, areaLast);
    std::vector<unsigned char> bytes(last - first + 1, 0);
    std::copy(area.begin(), area.end(), bytes.begin() + (kBiosAreaFirst - first));
    std::copy(table.begin(), table.end(), bytes.begin() + (address - first));
    return memory.place(first, std::move(bytes));
}

// What the sysfs source presents: an entry point at 0xF0000 and the address
// at which its table is served.
struct Presentation {
    std::vector<unsigned char> entryPoint;
    unsigned long address = kMovedTableAddress;
};

uint64_t const kBelow4GiB = 0xFFFFFFFFu;
uint64_t const kLastAddress = ULONG_MAX;

// A 2.x entry point states at most 65535 bytes: of a larger table, keeps
// the whole structures of its start that fit, and says so in cut. False
// when not one fits.
bool fitTo2x(std::vector<unsigned char>& table, TableCut& cut) {
    if (table.size() <= smbiosformat::MAX_2X_TABLE_LENGTH) {
        return true;
    }
    smbiosformat::TablePrefix const prefix =
        smbiosformat::wholeStructuresWithin(table, smbiosformat::MAX_2X_TABLE_LENGTH);
    cut.cut = true;
    cut.tableBytes = table.size();
    cut.tableStructures = smbiosformat::tableStats(table).count;
    cut.servedBytes = prefix.bytes;
    cut.servedStructures = prefix.count;
    table.resize(prefix.bytes);
    return prefix.bytes != 0;
}

// "_SM3_": 0x06 length, 0x07 major, 0x08 minor, 0x0C maximum table size,
// 0x10 the 64-bit table address. Presented as the equivalent "_SM_" entry
// point, its table at its own address when that lies below 4 GiB. False
// when the entry point is short.
bool presentSm3(std::vector<unsigned char> const& entryPoint,
                std::vector<unsigned char> const& table, Presentation& out) {
    if (entryPoint.size() < smbiosformat::SM3_ENTRY_POINT_SIZE ||
        entryPoint[6] < smbiosformat::SM3_ENTRY_POINT_SIZE) {
        return false;
    }
    uint64_t const stated = smbiosformat::getQword(entryPoint, 0x10);
    if (canServeAt(stated, table.size(), std::min(kBelow4GiB, kLastAddress),
                   smbiosformat::SM_ENTRY_POINT_SIZE)) {
        out.address = static_cast<unsigned long>(stated);
    }
    smbiosformat::TableStats const stats = smbiosformat::tableStats(table);
    out.entryPoint = smbiosformat::makeSmEntryPoint(
        entryPoint[7], entryPoint[8], static_cast<uint16_t>(table.size()),
        static_cast<uint32_t>(out.address), stats.count, stats.maxSize);
    return true;
}

// Presents a 2.x entry point whose 32-bit table address stands at
// addressOffset: as it is when its table can be served at the address it
// states (false), otherwise with out.address written in its place (true:
// the caller sets the checksums again).
bool movesTable(std::vector<unsigned char> const& entryPoint,
                std::vector<unsigned char> const& table, size_t addressOffset, Presentation& out) {
    out.entryPoint = entryPoint;
    uint32_t const stated = smbiosformat::getDword(entryPoint, addressOffset);
    if (canServeAt(stated, table.size(), kLastAddress, entryPoint.size())) {
        out.address = static_cast<unsigned long>(stated);
        return false;
    }
    smbiosformat::putDword(out.entryPoint, addressOffset, static_cast<uint32_t>(out.address));
    return true;
}

// "_SM_": 0x05 length, 0x15 intermediate checksum over 0x10-0x1E, 0x18 the
// 32-bit table address. The kernel copies 30 to 32 bytes. Presented as it
// is, amended when its table must move. False when it is short.
bool presentSm(std::vector<unsigned char> const& entryPoint,
               std::vector<unsigned char> const& table, Presentation& out) {
    if (entryPoint.size() < 0x1E) {
        return false;
    }
    if (movesTable(entryPoint, table, 0x18, out)) {
        setChecksum(out.entryPoint, 0x15, 0x10, 0x1F);
        setChecksum(out.entryPoint, 0x04, 0, out.entryPoint[5]);
    }
    return true;
}

// "_DMI_": 15 bytes, 0x05 checksum, 0x08 the 32-bit table address.
// Presented as it is, amended when its table must move. False when short.
bool presentDmi(std::vector<unsigned char> const& entryPoint,
                std::vector<unsigned char> const& table, Presentation& out) {
    if (entryPoint.size() < smbiosformat::DMI_ENTRY_POINT_SIZE) {
        return false;
    }
    if (movesTable(entryPoint, table, 0x08, out)) {
        setChecksum(out.entryPoint, 0x05, 0, smbiosformat::DMI_ENTRY_POINT_SIZE);
    }
    return true;
}

}  // namespace

bool readWholeFile(std::string const& path, size_t limit, std::vector<unsigned char>& bytes,
                   std::string& why) {
    // Only a regular file is read: a FIFO would make the load of the library
    // wait for a writer, a device would be read to its limit.
    int const fd = SD::openRegularFile(path.c_str(), why);
    if (fd < 0) {
        why = path + ": " + why;
        return false;
    }
    int error = 0;
    SD::ReadEnd const end = SD::readToEnd(fd, limit, bytes, error);
    ::close(fd);
    if (end == SD::ReadEnd::Failed) {
        why = path + ": " + std::strerror(error);
    } else if (end == SD::ReadEnd::TooLarge) {
        why = path + ": larger than " + std::to_string(limit) + " bytes";
    }
    return end == SD::ReadEnd::Whole;
}

bool loadImage(std::string const& list, RegionMemory& memory, std::string& why) {
    size_t begin = 0;
    for (;;) {
        size_t const comma = list.find(',', begin);
        std::string const item =
            list.substr(begin, comma == std::string::npos ? std::string::npos : comma - begin);
        // The last '@': a file name may hold one, a base never does.
        size_t const at = item.rfind('@');
        if (at == std::string::npos || at == 0) {
            why = "PMEM_IMAGE item '" + item + "' is not FILE@BASE";
            return false;
        }
        unsigned long base = 0;
        if (!parseBase(item.substr(at + 1), base)) {
            why = "PMEM_IMAGE item '" + item + "': the base is not a hexadecimal address";
            return false;
        }
        std::vector<unsigned char> bytes;
        if (!readWholeFile(item.substr(0, at), kImageFileLimit, bytes, why)) {
            return false;
        }
        if (!memory.place(base, std::move(bytes))) {
            why = "PMEM_IMAGE item '" + item + "' overlaps another file or passes the last address";
            return false;
        }
        if (comma == std::string::npos) {
            return true;
        }
        begin = comma + 1;
    }
}

bool loadSysfsTables(std::string const& folder, RegionMemory& memory, std::string& why,
                     TableCut& cut) {
    std::vector<unsigned char> entryPoint;
    std::vector<unsigned char> table;
    std::string const entryPointPath = folder + "/smbios_entry_point";
    if (!readWholeFile(entryPointPath, kEntryPointFileLimit, entryPoint, why) ||
        !readWholeFile(folder + "/DMI", kTableFileLimit, table, why)) {
        return false;
    }
    if (table.empty()) {
        why = folder + "/DMI: empty";
        return false;
    }
    Presentation presented;
    TableCut fitted;
    bool known = true;
    bool whole = false;
    if (startsWith(entryPoint, "_SM3_")) {
        if (!fitTo2x(table, fitted)) {
            why = folder + "/DMI: no whole structure in its first 65535 bytes";
            return false;
        }
        whole = presentSm3(entryPoint, table, presented);
    } else if (startsWith(entryPoint, "_SM_")) {
        whole = presentSm(entryPoint, table, presented);
    } else if (startsWith(entryPoint, "_DMI_")) {
        whole = presentDmi(entryPoint, table, presented);
    } else {
        known = false;
    }
    if (!known || !whole) {
        why = entryPointPath + (known ? ": shorter than its entry point"
                                      : ": neither a _SM3_, _SM_ nor _DMI_ entry point");
        return false;
    }
    if (!placeEntryPointAndTable(memory, presented.entryPoint, presented.address,
                                 std::move(table))) {
        why = folder + "/DMI: cannot be served at its address";
        return false;
    }
    cut = fitted;
    return true;
}

}  // namespace pmem
