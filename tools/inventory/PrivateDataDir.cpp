#include "inventory/PrivateDataDir.h"

#include <fcntl.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <vector>

#include "format/OverrideText.h"

namespace inventory {

namespace {

// The signals that end a run early; the folder must not outlive them.
int const kEndSignals[] = {SIGINT, SIGTERM, SIGHUP};

// What the signal handler removes: the override copy, its folder and the
// data directory, set before the handler is installed so that the handler
// itself only calls unlink and rmdir. A signal handler reaches nothing but
// static data.
struct SignalCleanup {
    std::string file;
    std::string folder;
    std::string dataDir;
};
SignalCleanup gSignalCleanup;
volatile sig_atomic_t gSignalCleanupReady = 0;

extern "C" void removeDataDirAndEnd(int signalNumber) {
    if (gSignalCleanupReady != 0) {
        unlink(gSignalCleanup.file.c_str());
        rmdir(gSignalCleanup.folder.c_str());
        rmdir(gSignalCleanup.dataDir.c_str());
    }
    // The handler was reset to the default on entry and the signal is not
    // blocked inside it: raising it again ends the process as the signal
    // would have, with the status 128 + its number that a shell reports.
    raise(signalNumber);
}

// Holds the end signals back while the folder is made and its cleanup
// prepared; a signal that came meanwhile is delivered at the end.
class EndSignalsHeld {
public:
    EndSignalsHeld() {
        sigset_t held;
        sigemptyset(&held);
        for (int signalNumber : kEndSignals) {
            sigaddset(&held, signalNumber);
        }
        active_ = sigprocmask(SIG_BLOCK, &held, &saved_) == 0;
    }
    EndSignalsHeld(EndSignalsHeld const&) = delete;
    EndSignalsHeld& operator=(EndSignalsHeld const&) = delete;
    ~EndSignalsHeld() {
        if (active_) {
            sigprocmask(SIG_SETMASK, &saved_, nullptr);
        }
    }

private:
    sigset_t saved_;
    bool active_ = false;
};

// From here on an end signal removes the folder first. Signals that the
// caller ignores (a background job's SIGINT) stay ignored.
void removeOnEndSignals(std::string const& dataDir, std::string const& folder,
                        std::string const& file) {
    gSignalCleanup.dataDir = dataDir;
    gSignalCleanup.folder = folder;
    gSignalCleanup.file = file;
    gSignalCleanupReady = 1;
    for (int signalNumber : kEndSignals) {
        struct sigaction previous;
        if (sigaction(signalNumber, nullptr, &previous) == 0 && previous.sa_handler == SIG_IGN) {
            continue;
        }
        struct sigaction action;
        std::memset(&action, 0, sizeof action);
        action.sa_handler = removeDataDirAndEnd;
        sigemptyset(&action.sa_mask);
        action.sa_flags = SA_RESETHAND | SA_NODEFER;
        sigaction(signalNumber, &action, nullptr);
    }
}

// Where the folder may go, in order: $TMPDIR when it is set; else a folder
// in memory, /dev/shm, where making and removing it costs a fraction of
// what it costs on a disk (on an ext4 disk mounted with discard, removing
// the two folders alone can take milliseconds), then /tmp.
std::vector<std::string> temporaryBases() {
    char const* base = std::getenv("TMPDIR");
    if (base != nullptr && *base != '\0') {
        return {base};
    }
    return {"/dev/shm", "/tmp"};
}

// A new folder in base; "" and why when it cannot be made.
std::string makeTemporaryFolder(std::string base, std::string& why) {
    if (base.back() != '/') {
        base += '/';
    }
    std::string const pattern = base + "smbios-inventory.XXXXXX";
    std::vector<char> buffer(pattern.begin(), pattern.end());
    buffer.push_back('\0');
    if (mkdtemp(buffer.data()) == nullptr) {
        why = "cannot create a temporary folder from " + pattern + ": " + std::strerror(errno);
        return "";
    }
    return buffer.data();
}

bool writeWholeFile(std::string const& path, std::string const& content, std::string& why) {
    int const fd = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666);
    if (fd < 0) {
        why = "cannot write " + path + ": " + std::strerror(errno);
        return false;
    }
    char const* data = content.data();
    size_t left = content.size();
    while (left > 0) {
        ssize_t const written = write(fd, data, left);
        if (written < 0 && errno == EINTR) {
            continue;
        }
        if (written <= 0) {
            why = "cannot write " + path + ": " + std::strerror(errno);
            close(fd);
            return false;
        }
        data += written;
        left -= static_cast<size_t>(written);
    }
    if (close(fd) != 0) {
        why = "cannot write " + path + ": " + std::strerror(errno);
        return false;
    }
    return true;
}

}  // namespace

PrivateDataDir::~PrivateDataDir() { removeFolder(); }

bool PrivateDataDir::create(std::string const& content, std::string& why) {
    EndSignalsHeld held;
    for (std::string const& base : temporaryBases()) {
        // A base that takes the folder but not the file (a full /dev/shm)
        // gives way to the next one.
        if (createIn(base, content, why)) {
            return true;
        }
        removeFolder();
    }
    return false;
}

bool PrivateDataDir::createIn(std::string const& base, std::string const& content,
                              std::string& why) {
    path_ = makeTemporaryFolder(base, why);
    if (path_.empty()) {
        return false;
    }
    std::string const overrideDir = path_ + "/" + smbiosformat::OVERRIDE_FOLDER;
    if (mkdir(overrideDir.c_str(), 0777) != 0) {
        why = "cannot create " + overrideDir + ": " + std::strerror(errno);
        return false;
    }
    overrideFile_ = overrideDir + "/" + smbiosformat::OVERRIDE_FILE;
    removeOnEndSignals(path_, overrideDir, overrideFile_);
    return writeWholeFile(overrideFile_, content, why);
}

void PrivateDataDir::removeFolder() {
    if (path_.empty()) {
        return;
    }
    // What createIn made, file and folders, is removed by name; only when
    // something else is left in them is the whole folder walked.
    std::string const overrideDir = path_ + "/" + smbiosformat::OVERRIDE_FOLDER;
    if (!overrideFile_.empty()) {
        unlink(overrideFile_.c_str());
    }
    if ((rmdir(overrideDir.c_str()) != 0 && errno != ENOENT) || rmdir(path_.c_str()) != 0) {
        std::error_code ignored;
        std::filesystem::remove_all(path_, ignored);
    }
    path_.clear();
    overrideFile_.clear();
}

}  // namespace inventory
