// The private folder that stands in for the agent's data directory when the
// host runs the plug-in on a dump file: a temporary folder whose
// SmBiosOverride/smbios.txt is a copy of the dump. It is removed with
// everything in it when the run ends, whichever way it ends: normally, by
// an error, or by SIGINT, SIGTERM or SIGHUP.
#pragma once

#include <string>

namespace inventory {

class PrivateDataDir {
public:
    PrivateDataDir() = default;
    PrivateDataDir(PrivateDataDir const&) = delete;
    PrivateDataDir& operator=(PrivateDataDir const&) = delete;
    ~PrivateDataDir();

    // Makes the folder under $TMPDIR, or when that is not set in memory
    // (/dev/shm) and else under /tmp, and writes content as its override
    // file, with the end signals held meanwhile; from then on an end signal
    // removes the folder before it ends the process. Returns false and sets
    // why when it cannot.
    bool create(std::string const& content, std::string& why);

    // The folder, with a trailing slash, as the data directory is named.
    std::string dataDir() const { return path_ + "/"; }
    std::string const& overrideFile() const { return overrideFile_; }

private:
    // The folder and its file in base; false and why when they cannot be
    // made (what was made stays for removeFolder).
    bool createIn(std::string const& base, std::string const& content, std::string& why);
    // Removes what createIn made.
    void removeFolder();

    std::string path_;
    std::string overrideFile_;
};

}  // namespace inventory
