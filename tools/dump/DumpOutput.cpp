#include "DumpOutput.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "DumpFormat.h"
#include "SD/RegularFile.h"

namespace smbiosdump {

namespace {

std::string withSeparator(std::string folder) {
    if (folder.empty() || folder.back() != '/') {
        folder += '/';
    }
    return folder;
}

}  // namespace

std::string dataDirectory(std::string const& option) {
    if (!option.empty()) {
        return option;
    }
    char const* fromEnvironment = std::getenv("KESTREL_DATA_DIR");
    if (fromEnvironment != nullptr && *fromEnvironment != '\0') {
        return fromEnvironment;
    }
    return DEFAULT_DATA_DIR;
}

std::string overrideFolder(std::string const& dataDir) {
    return withSeparator(dataDir) + smbiosformat::OVERRIDE_FOLDER;
}

std::string overridePath(std::string const& dataDir) {
    return overrideFolder(dataDir) + "/" + smbiosformat::OVERRIDE_FILE;
}

bool makeOverrideFolder(std::string const& dataDir, std::string& error) {
    struct stat info;
    if (stat(dataDir.c_str(), &info) != 0) {
        error = "cannot use the data directory " + dataDir + ": " + std::strerror(errno);
        return false;
    }
    if (!S_ISDIR(info.st_mode)) {
        error = "the data directory " + dataDir + " is not a folder";
        return false;
    }
    std::string const folder = overrideFolder(dataDir);
    if (mkdir(folder.c_str(), 0755) != 0) {
        int const mkdirErrno = errno;
        if (mkdirErrno != EEXIST || stat(folder.c_str(), &info) != 0 || !S_ISDIR(info.st_mode)) {
            error = "cannot create " + folder + ": " +
                    std::strerror(mkdirErrno == EEXIST ? ENOTDIR : mkdirErrno);
            return false;
        }
    }
    return true;
}

std::string describeCapture(Capture const& capture) {
    TableStats const stats = tableStats(capture.table);
    return "SMBIOS " + std::to_string(capture.major) + "." + std::to_string(capture.minor) + ", " +
           std::to_string(stats.count) + " structures, " + std::to_string(capture.table.size()) +
           " bytes";
}

}  // namespace smbiosdump
