// The SMBIOS formats at the ground floor, shared by the physical-memory
// library, the tools, the examples and the tests: the entry points that
// describe a table ("_SM_", the legacy "_DMI_", "_SM3_"), where they are
// searched for in physical memory, their little-endian fields and checksums,
// and the walk of a structure table. It needs nothing but the standard
// library.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace smbiosformat {

// Sizes of the entry points and the offset at which a --dump-bin image
// holds its structure table.
constexpr size_t SM_ENTRY_POINT_SIZE = 0x1F;
constexpr size_t DMI_ENTRY_POINT_SIZE = 0x0F;
constexpr size_t SM3_ENTRY_POINT_SIZE = 0x18;
constexpr uint32_t DUMP_BIN_TABLE_OFFSET = 0x20;

// Where the entry points are looked for in physical memory: "_SM_" on
// 16-byte boundaries of the BIOS area 0xF0000-0xFFFFF, else the legacy
// "_DMI_" on 16-byte boundaries of the whole first megabyte (kept wider than
// the BIOS area: old firmware that places it lower is still found).
constexpr unsigned long SM_SEARCH_START = 0xF0000;
constexpr unsigned long SM_SEARCH_END = 0xFFFFF;
constexpr unsigned long DMI_SEARCH_START = 0x0;
constexpr unsigned long DMI_SEARCH_END = 0xFFFFF;
constexpr long SEARCH_STEP = 16;

// Little-endian fields at offset; the caller keeps the field inside bytes.
uint16_t getWord(uint8_t const* bytes, size_t offset);
uint32_t getDword(uint8_t const* bytes, size_t offset);
uint16_t getWord(std::vector<uint8_t> const& bytes, size_t offset);
uint32_t getDword(std::vector<uint8_t> const& bytes, size_t offset);
uint64_t getQword(std::vector<uint8_t> const& bytes, size_t offset);
void putWord(std::vector<uint8_t>& bytes, size_t offset, uint16_t value);
void putDword(std::vector<uint8_t>& bytes, size_t offset, uint32_t value);

// The byte that makes the 8-bit sum of bytes[begin, end) zero, given that
// the checksum byte itself (inside the range) is still 0.
uint8_t checksumFor(std::vector<uint8_t> const& bytes, size_t begin, size_t end);

// The 31-byte "_SM_" entry point, both checksums set, entry-point revision
// 0. Its BCD revision is major*16+minor when both are below 10, else 0.
std::vector<uint8_t> makeSmEntryPoint(uint8_t major, uint8_t minor, uint16_t tableLength,
                                      uint32_t tableAddress, uint16_t structureCount,
                                      uint16_t maxStructureSize);

// The 15-byte legacy "_DMI_" entry point, checksum set.
std::vector<uint8_t> makeDmiEntryPoint(uint8_t bcdRevision, uint16_t tableLength,
                                       uint32_t tableAddress, uint16_t structureCount);

struct TableStats {
    uint16_t count = 0;    // structures, up to and including the end-of-table one
    uint16_t maxSize = 0;  // the largest structure: formatted area plus string set
    bool cut = false;      // the data ends inside a structure, or at a malformed one
};

// Walks the structures of a table from its first byte. The walk ends after
// the end-of-table structure (type 127), at the end of the data, or at the
// first structure that is malformed (length below 4) or truncated (its
// formatted area or string set runs past the end); such a structure is not
// counted, and the walk says the table is cut. Both counts saturate at
// 0xFFFF.
TableStats tableStats(std::vector<uint8_t> const& table);

// The most a 2.x entry point can say a table holds: its length is a word.
constexpr size_t MAX_2X_TABLE_LENGTH = 0xFFFF;

struct TablePrefix {
    size_t bytes = 0;      // the length of the whole structures taken
    uint16_t count = 0;    // how many, saturating at 0xFFFF
    uint16_t maxSize = 0;  // the largest one
};

// The whole structures at the start of a table, walked as tableStats walks
// them, that end within its first `limit` bytes: what of a table larger
// than a 2.x entry point can describe that such an entry point can still
// describe (limit MAX_2X_TABLE_LENGTH). A structure that would end past the
// limit is not taken, nor anything after it.
TablePrefix wholeStructuresWithin(std::vector<uint8_t> const& table, size_t limit);

}  // namespace smbiosformat
