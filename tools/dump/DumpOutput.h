// Where and how smbios-dump writes the override dump file: the install
// location under the agent's data directory, the all-or-nothing write, and
// the one-line account of what was written.
#pragma once

#include <string>

#include "DumpInput.h"

namespace smbiosdump {

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

// Whether whatever is at `path` may be replaced by the dump file: true when
// nothing is there, or a regular file, or a symbolic link (the link itself
// is replaced, never what it points to). Anything else (a folder, a FIFO, a
// socket, a device) is never replaced, --force or not: false, and `error`
// names the path and what it is ("/dev/full is a character device, not a
// regular file; nothing written").
bool mayReplace(std::string const& path, std::string& error);

enum class WriteResult {
    WRITTEN,
    EXISTS,  // the file is there and may not be replaced; nothing was changed
    FAILED,  // nothing was changed; `error` says why
};

// Writes `content` to `path` all or nothing: into a temporary file in the
// same folder, which is then renamed into place, so that `path` never holds
// a part of it. Without `replace` an existing `path` is left alone; with it
// only what mayReplace accepts is replaced (looked at before anything is
// written and again right before the rename). The temporary file is removed
// whatever fails. The new file gets the mode 0666 less the umask.
WriteResult writeFileAtomically(std::string const& path, std::string const& content, bool replace,
                                std::string& error);

// "SMBIOS 2.7, 115 structures, 4631 bytes": the version the entry point
// states, the structures of the table (up to and including the end-of-table
// structure) and the table's size.
std::string describeCapture(Capture const& capture);

}  // namespace smbiosdump
