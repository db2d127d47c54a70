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

#include "format/EntryPoint.h"

namespace smbiosdump {

// The entry-point layouts, little-endian fields and table walk live in the
// format library; the tools and tests keep calling them by these names.
using smbiosformat::DMI_ENTRY_POINT_SIZE;
using smbiosformat::DUMP_BIN_TABLE_OFFSET;
using smbiosformat::getDword;
using smbiosformat::getWord;
using smbiosformat::makeDmiEntryPoint;
using smbiosformat::makeSmEntryPoint;
using smbiosformat::SM3_ENTRY_POINT_SIZE;
using smbiosformat::SM_ENTRY_POINT_SIZE;
using smbiosformat::TableStats;
using smbiosformat::tableStats;

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
