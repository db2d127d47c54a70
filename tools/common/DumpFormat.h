// The file formats around an SMBIOS table:
//  - the entry points that describe a table ("_SM_", the legacy "_DMI_"),
//  - dmidecode's --dump-bin image (the entry point at offset 0, its table
//    address rewritten to 0x20, the structure table from offset 0x20),
//  - the override dump file ("smbios.txt") that the plug-in reads instead of
//    physical memory when it finds one in its data folder.
//
// The override file is text. Blanks are ignored and letters are
// case-insensitive; the tokens are tags "<...>" and data runs (hex digits,
// two a byte, which may span lines):
//
//   <SHOWSMBIOS>
//   <EPHEADER>
//   5F534D5F...            the entry point's bytes, one data run
//   </EPHEADER>
//   <SIZE>                 optional, its content is ignored
//   2158
//   </SIZE>
//   00180000...            the structure table's bytes, in one or more runs
//   </SHOWSMBIOS>
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace smbiosdump {

// Sizes of the entry points and the offset at which a --dump-bin image
// holds its structure table.
constexpr size_t SM_ENTRY_POINT_SIZE = 0x1F;
constexpr size_t DMI_ENTRY_POINT_SIZE = 0x0F;
constexpr size_t SM3_ENTRY_POINT_SIZE = 0x18;
constexpr uint32_t DUMP_BIN_TABLE_OFFSET = 0x20;

// The little-endian 16- and 32-bit values at offset; the caller keeps the
// field inside bytes.
uint16_t getWord(std::vector<uint8_t> const& bytes, size_t offset);
uint32_t getDword(std::vector<uint8_t> const& bytes, size_t offset);

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

struct DumpImage {
    std::vector<uint8_t> header;  // a "_SM_" or "_DMI_" entry point
    std::vector<uint8_t> table;   // the structure table
    uint8_t major = 0;
    uint8_t minor = 0;
    std::string anchor;  // the anchor the image started with: "_SM_", "_DMI_" or "_SM3_"
};

// Reads a dmidecode --dump-bin image.
//  "_SM_":  header = the entry point's first (byte 5) bytes, table = the
//           table-length bytes at the table address.
//  "_DMI_": header = the 15 bytes, table as above, version from the BCD byte.
//  "_SM3_": table = up to the maximum-size bytes at the table address (what
//           the file holds of them); header = an equivalent "_SM_" entry point
//           of the same version, table address 0x20, structure count and
//           largest size from tableStats. A table of more than 65535 bytes
//           cannot be described that way and is refused.
// Checksums are not checked: the image is taken as it is, so that damaged
// entry points can be carried into override files too.
// Returns false and a message in `error` on malformed input; `out` is then
// left unchanged.
bool readDumpBin(std::vector<uint8_t> const& file, DumpImage& out, std::string& error);

// The override file's text for an entry point and a table: the entry point
// on one line, the table in lines of bytesPerLine bytes (0: all on one
// line), upper-case hex, every line ended by "\n".
std::string formatOverride(std::vector<uint8_t> const& header, std::vector<uint8_t> const& table,
                           size_t bytesPerLine = 32);

// Reads an override file's text. Strict: besides the grammar above (blanks
// and line ends between tokens, any case), anything else is refused: other
// characters, unknown or misplaced tags, an odd number of hex digits in a
// run, an empty entry point or table, more than one <SIZE> block, text after
// </SHOWSMBIOS>. Returns false and a message naming the line on error.
bool parseOverride(std::string const& text, std::vector<uint8_t>& header,
                   std::vector<uint8_t>& table, std::string& error);

}  // namespace smbiosdump
