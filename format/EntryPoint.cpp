#include "format/EntryPoint.h"

#include <algorithm>
#include <cstring>

namespace smbiosformat {

uint16_t getWord(uint8_t const* bytes, size_t offset) {
    return static_cast<uint16_t>(bytes[offset] | (bytes[offset + 1] << 8));
}

uint32_t getDword(uint8_t const* bytes, size_t offset) {
    uint32_t value = 0;
    for (size_t i = 0; i < 4; ++i) {
        value |= static_cast<uint32_t>(bytes[offset + i]) << (8 * i);
    }
    return value;
}

uint16_t getWord(std::vector<uint8_t> const& bytes, size_t offset) {
    return getWord(bytes.data(), offset);
}

uint32_t getDword(std::vector<uint8_t> const& bytes, size_t offset) {
    return getDword(bytes.data(), offset);
}

void putWord(std::vector<uint8_t>& bytes, size_t offset, uint16_t value) {
    bytes[offset] = static_cast<uint8_t>(value & 0xFF);
    bytes[offset + 1] = static_cast<uint8_t>(value >> 8);
}

void putDword(std::vector<uint8_t>& bytes, size_t offset, uint32_t value) {
    for (size_t i = 0; i < 4; ++i) {
        bytes[offset + i] = static_cast<uint8_t>((value >> (8 * i)) & 0xFF);
    }
}

uint64_t getQword(std::vector<uint8_t> const& bytes, size_t offset) {
    return static_cast<uint64_t>(getDword(bytes, offset)) |
           (static_cast<uint64_t>(getDword(bytes, offset + 4)) << 32);
}

// The byte that makes the 8-bit sum of bytes[begin, end) zero, given that
// the checksum byte itself (inside the range) is still 0.
uint8_t checksumFor(std::vector<uint8_t> const& bytes, size_t begin, size_t end) {
    uint8_t sum = 0;
    for (size_t i = begin; i < end; ++i) {
        sum = static_cast<uint8_t>(sum + bytes[i]);
    }
    return static_cast<uint8_t>(0x100 - sum);
}

std::vector<uint8_t> makeSmEntryPoint(uint8_t major, uint8_t minor, uint16_t tableLength,
                                      uint32_t tableAddress, uint16_t structureCount,
                                      uint16_t maxStructureSize) {
    std::vector<uint8_t> ep(SM_ENTRY_POINT_SIZE, 0);
    std::memcpy(ep.data(), "_SM_", 4);
    ep[5] = static_cast<uint8_t>(SM_ENTRY_POINT_SIZE);
    ep[6] = major;
    ep[7] = minor;
    putWord(ep, 0x08, maxStructureSize);
    ep[0x0A] = 0;  // entry-point revision; the formatted area 0x0B-0x0F stays 0
    std::memcpy(ep.data() + 0x10, "_DMI_", 5);
    putWord(ep, 0x16, tableLength);
    putDword(ep, 0x18, tableAddress);
    putWord(ep, 0x1C, structureCount);
    ep[0x1E] = (major < 10 && minor < 10) ? static_cast<uint8_t>(major * 16 + minor) : 0;
    // The intermediate checksum covers 0x10-0x1E and is part of the whole.
    ep[0x15] = checksumFor(ep, 0x10, 0x1F);
    ep[4] = checksumFor(ep, 0, ep[5]);
    return ep;
}

std::vector<uint8_t> makeDmiEntryPoint(uint8_t bcdRevision, uint16_t tableLength,
                                       uint32_t tableAddress, uint16_t structureCount) {
    std::vector<uint8_t> ep(DMI_ENTRY_POINT_SIZE, 0);
    std::memcpy(ep.data(), "_DMI_", 5);
    putWord(ep, 6, tableLength);
    putDword(ep, 8, tableAddress);
    putWord(ep, 12, structureCount);
    ep[14] = bcdRevision;
    ep[5] = checksumFor(ep, 0, DMI_ENTRY_POINT_SIZE);
    return ep;
}

namespace {

// A walk over the whole structures at the start of a table.
struct Walk {
    size_t end = 0;        // the offset after the last whole structure taken
    uint16_t count = 0;    // structures taken, saturating at 0xFFFF
    uint16_t maxSize = 0;  // the largest one taken
    bool cut = false;      // the data ends inside a structure, or at a malformed one
};

// Takes whole structures from the table's first byte until the end-of-table
// structure (type 127, taken), the end of the data, the first malformed or
// truncated structure (not taken: the walk is cut), or the first structure
// that would end past `limit` bytes (not taken, not cut).
Walk walkStructures(std::vector<uint8_t> const& table, size_t limit) {
    Walk walk;
    size_t const size = table.size();
    size_t pos = 0;
    bool ended = false;
    while (size - pos >= 4) {
        uint8_t const type = table[pos];
        uint8_t const length = table[pos + 1];
        if (length < 4 || length > size - pos) {
            walk.cut = true;
            break;
        }
        // The string set ends with two NULs; with no strings those two NULs
        // directly follow the formatted area.
        size_t end = pos + length;
        while (end + 1 < size && !(table[end] == 0 && table[end + 1] == 0)) {
            ++end;
        }
        if (end + 1 >= size) {
            walk.cut = true;
            break;
        }
        end += 2;
        if (end > limit) {
            walk.end = pos;
            return walk;
        }
        size_t const structureSize = end - pos;
        if (walk.count < 0xFFFF) {
            ++walk.count;
        }
        if (structureSize > walk.maxSize) {
            walk.maxSize = static_cast<uint16_t>(std::min<size_t>(structureSize, 0xFFFF));
        }
        pos = end;
        if (type == 127) {
            ended = true;
            break;
        }
    }
    // One to three bytes after the last whole structure start one more.
    if (!ended && pos < size && size - pos < 4) {
        walk.cut = true;
    }
    walk.end = pos;
    return walk;
}

}  // namespace

TableStats tableStats(std::vector<uint8_t> const& table) {
    Walk const walk = walkStructures(table, table.size());
    TableStats stats;
    stats.count = walk.count;
    stats.maxSize = walk.maxSize;
    stats.cut = walk.cut;
    return stats;
}

TablePrefix wholeStructuresWithin(std::vector<uint8_t> const& table, size_t limit) {
    Walk const walk = walkStructures(table, limit);
    TablePrefix prefix;
    prefix.bytes = walk.end;
    prefix.count = walk.count;
    prefix.maxSize = walk.maxSize;
    return prefix;
}

}  // namespace smbiosformat
