// dmidecode's --dump-bin image: the entry point at offset 0, its table
// address rewritten to 0x20, the structure table from offset 0x20.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace smbiosformat {

struct DumpImage {
    std::vector<uint8_t> header;  // a "_SM_" or "_DMI_" entry point
    std::vector<uint8_t> table;   // the structure table
    uint8_t major = 0;
    uint8_t minor = 0;
    std::string anchor;  // the anchor the image started with: "_SM_", "_DMI_" or "_SM3_"
    // A 3.x table over 65535 bytes is kept as the whole structures of its
    // first 65535 bytes; then cut is set, with the whole table's figures.
    bool cut = false;
    size_t wholeTableBytes = 0;
    unsigned wholeTableStructures = 0;
};

// Reads a dmidecode --dump-bin image.
//  "_SM_":  header = the entry point's first (byte 5) bytes, table = the
//           table-length bytes at the table address.
//  "_DMI_": header = the 15 bytes, table as above, version from the BCD byte.
//  "_SM3_": table = up to the maximum-size bytes at the table address (what
//           the file holds of them); header = an equivalent "_SM_" entry point
//           of the same version, table address 0x20, structure count and
//           largest size from tableStats. Of a table of more than 65535
//           bytes, which that entry point cannot describe, the whole
//           structures of its first 65535 bytes are kept (cut says so).
// Checksums are not checked: the image is taken as it is, so that damaged
// entry points can be carried into override files too.
// Returns false and a message in `error` on malformed input; `out` is then
// left unchanged.
bool readDumpBin(std::vector<uint8_t> const& file, DumpImage& out, std::string& error);

}  // namespace smbiosformat
