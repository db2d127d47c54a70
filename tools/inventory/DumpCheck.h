// The host's check of the dump file it is asked to run the plug-in on. The
// plug-in reads its override file with its own grammar and, for some broken
// files, quietly reads the machine's memory instead; the host must only ever
// answer about the file it was given, so it reads the file with that same
// grammar first and refuses what the plug-in would not take as its table.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace inventory {

struct DumpCheck {
    // Why the file is not a usable dump ("" when it is): the plug-in would
    // not take it as its table ("line 3: no </EPHEADER>", "line 4: nothing
    // after </EPHEADER>"), or its table text has an odd number of hex digits
    // and every byte after the odd one would shift.
    std::string refusal;
    // A usable file whose table is not whole: fewer structures than the
    // entry point announces, or the data ends inside a structure ("" when
    // it is whole). The inventory of what is there is still worth printing.
    std::string warning;
};

// Checks the override file at path, whose content is text (for the line
// numbers of the messages).
DumpCheck checkOverrideFile(std::string const& path, std::string const& text);

// The same check for the entry point and table that the host itself writes
// into an override file (from a dmidecode --dump-bin image). Such a file is
// always one the plug-in takes, so only the warning can be set; it is
// found from the bytes, without reading the file back.
DumpCheck checkImage(std::vector<std::uint8_t> const& header,
                     std::vector<std::uint8_t> const& table);

}  // namespace inventory
