// The override dump file: the text the plug-in reads instead of physical
// memory when it finds OVERRIDE_FOLDER/OVERRIDE_FILE
// ("SmBiosOverride/smbios.txt") in the agent's data directory.
//
// The text is made of tags "<...>" and data runs (hex digits, two a byte,
// which may span lines); the reader drops blanks and takes letters in any
// case:
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

namespace smbiosformat {

// The folder under the agent's data directory and the file in it.
constexpr char const OVERRIDE_FOLDER[] = "SmBiosOverride";
constexpr char const OVERRIDE_FILE[] = "smbios.txt";

// The override file's text for an entry point and a table: the entry point
// on one line, the table in lines of bytesPerLine bytes (0: all on one
// line), upper-case hex, every line ended by "\n".
std::string formatOverride(std::vector<uint8_t> const& header, std::vector<uint8_t> const& table,
                           size_t bytesPerLine = 32);

}  // namespace smbiosformat
