// Writing a file all or nothing, so that a reader never sees a part of it:
// the dump tool's override file and the inventory host's --output.
#pragma once

#include <string>

namespace smbiostool {

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

}  // namespace smbiostool
