// Where and how smbios-dump writes the override dump file: the install
// location under the agent's data directory, the all-or-nothing write, and
// the one-line account of what was written.
#pragma once

#include <string>

#include "AtomicFile.h"
#include "DumpInput.h"

namespace smbiosdump {

// The all-or-nothing write, shared with the inventory host.
using smbiostool::mayReplace;
using smbiostool::writeFileAtomically;
using smbiostool::WriteResult;

// The agent's data directory when none is named on the command line.
constexpr char const DEFAULT_DATA_DIR[] = "/var/lib/kestrel/";

// The data directory: `option` when it is not empty, else KESTREL_DATA_DIR
// when that is set and not empty, else DEFAULT_DATA_DIR.
std::string dataDirectory(std::string const& option);

// dataDir/SmBiosOverride, where the plug-in looks for its override file
// (dataDir may end with '/' or not).
std::string overrideFolder(std::string const& dataDir);
// overrideFolder(dataDir)/smbios.txt
std::string overridePath(std::string const& dataDir);

// Creates overrideFolder(dataDir) unless it is there. The data directory
// itself must exist: it is the agent's, not ours to make.
bool makeOverrideFolder(std::string const& dataDir, std::string& error);

// "SMBIOS 2.7, 115 structures, 4631 bytes": the version the entry point
// states, the structures of the table (up to and including the end-of-table
// structure) and the table's size.
std::string describeCapture(Capture const& capture);

}  // namespace smbiosdump
