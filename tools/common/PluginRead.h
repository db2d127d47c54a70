// An override dump file read the way the plug-in reads it: SD::importSmBios
// takes the file's tokens, SD::readHead decodes the entry point and
// SD::readTables the table section. The tests and the fuzz targets check
// the override text they read or write against this one grammar, the
// plug-in's own, so that they cannot drift from it.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace smbiosdump {

struct PluginRead {
    int imported = -1;  // importSmBios: 0, its open code, or 8; -1: the text was not written
    int head = -1;      // readHead: 0, 4, 8, 12, 16 or 32; -1 when the import failed
    int tables = -1;    // readTables: 0 or 55; -1 when the import failed
    std::vector<uint8_t> header;  // what readHead decoded, up to where it stopped
    std::vector<uint8_t> table;   // what readTables decoded, up to where it stopped

    bool ok() const { return imported == 0 && head == 0 && tables == 0; }
};

// The override file at `path`.
PluginRead readOverrideFile(std::string const& path);

// The text, written to a temporary file (under TMPDIR, else /tmp) that is
// removed again.
PluginRead readOverrideText(std::string const& text);

}  // namespace smbiosdump
