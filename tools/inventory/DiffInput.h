// The files `smbios-inventory diff` compares: a JSON inventory written by
// --format json, an override dump file, or a dmidecode --dump-bin file,
// told apart by their content. A JSON inventory is read as it is. A dump
// is run through the plug-in in a child process (this program again, with
// --dump or --from-bin and --format json): the plug-in acquires its SMBIOS
// table once per process, so one process cannot read two tables.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "inventory/InventoryDiff.h"

namespace inventory {

enum class InputKind {
    JSON_INVENTORY,  // "{" after any white space
    OVERRIDE_DUMP,   // text with the "<EPHEADER>" tag
    DUMP_BIN,        // an entry point's anchor ("_SM_", "_SM3_", "_DMI_") at offset 0
    UNKNOWN,
};

InputKind classifyInput(std::vector<std::uint8_t> const& bytes);

// What the child run of a dump is given besides the file: the plug-in and
// the agent's code directory, when the command line names them ("" when
// not).
struct ChildOptions {
    std::string pluginPath;
    std::string codeDir;
};

// The command line (without the program) that makes this program write
// the inventory of a dump of the given kind as JSON.
std::vector<std::string> childArguments(InputKind kind, std::string const& path,
                                        ChildOptions const& options);

// Reads the inventory of the file at path. A file that is not a regular
// file, or is over 16 MiB, is refused without being waited on. Returns false
// and says why in `why` (the file's name first) when the file is none of
// the three kinds, a JSON inventory does not have the host's shape, or the
// child run of a dump fails (it says why on standard error itself).
bool readInventoryFile(std::string const& path, ChildOptions const& options,
                       std::vector<InventoryNode>& nodes, std::string& why);

}  // namespace inventory
