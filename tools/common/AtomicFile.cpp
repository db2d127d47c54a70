#include "AtomicFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "SD/RegularFile.h"

namespace smbiostool {

namespace {

// The folder part of a path ("." for a bare file name) and the name part.
void splitPath(std::string const& path, std::string& folder, std::string& name) {
    size_t const slash = path.rfind('/');
    if (slash == std::string::npos) {
        folder = ".";
        name = path;
    } else {
        folder = slash == 0 ? std::string("/") : path.substr(0, slash);
        name = path.substr(slash + 1);
    }
}

bool writeAll(int fd, std::string const& content) {
    char const* data = content.data();
    size_t left = content.size();
    while (left > 0) {
        ssize_t const written = write(fd, data, left);
        if (written < 0) {
            if (errno == EINTR) {
                continue;
            }
            return false;
        }
        data += written;
        left -= static_cast<size_t>(written);
    }
    return true;
}

bool exists(std::string const& path) {
    struct stat info;
    return lstat(path.c_str(), &info) == 0;
}

// The temporary file, removed when it was not renamed into place.
class TemporaryFile {
public:
    TemporaryFile() = default;
    TemporaryFile(TemporaryFile const&) = delete;
    TemporaryFile& operator=(TemporaryFile const&) = delete;
    ~TemporaryFile() {
        if (fd_ >= 0) {
            ::close(fd_);
        }
        if (!path_.empty()) {
            unlink(path_.c_str());
        }
    }

    bool create(std::string const& folder, std::string const& name, std::string& error) {
        std::string const pattern = folder + "/." + name + ".XXXXXX";
        std::vector<char> buffer(pattern.begin(), pattern.end());
        buffer.push_back('\0');
        fd_ = mkstemp(buffer.data());
        if (fd_ < 0) {
            error = "cannot create a temporary file in " + folder + ": " + std::strerror(errno);
            return false;
        }
        path_ = buffer.data();
        return true;
    }

    bool fill(std::string const& content, std::string& error) {
        mode_t const mask = umask(0);
        umask(mask);
        if (!writeAll(fd_, content) || fchmod(fd_, 0666 & ~mask) != 0 || fsync(fd_) != 0) {
            error = "cannot write " + path_ + ": " + std::strerror(errno);
            return false;
        }
        int const closed = ::close(fd_);
        fd_ = -1;
        if (closed != 0) {
            error = "cannot write " + path_ + ": " + std::strerror(errno);
            return false;
        }
        return true;
    }

    std::string const& path() const { return path_; }
    // The file is in place under another name: nothing left to remove.
    void release() { path_.clear(); }

private:
    int fd_ = -1;
    std::string path_;
};

}  // namespace

bool mayReplace(std::string const& path, std::string& error) {
    struct stat info;
    // A path that cannot be looked at is left to the write, which says why
    // it fails.
    if (lstat(path.c_str(), &info) != 0 || S_ISREG(info.st_mode) || S_ISLNK(info.st_mode)) {
        return true;
    }
    error = path + " is " + SD::fileKind(info.st_mode) + ", not a regular file; nothing written";
    return false;
}

WriteResult writeFileAtomically(std::string const& path, std::string const& content, bool replace,
                                std::string& error) {
    std::string folder;
    std::string name;
    splitPath(path, folder, name);
    if (name.empty()) {
        error = path + " names a folder, not a file";
        return WriteResult::FAILED;
    }
    if (!mayReplace(path, error)) {
        return WriteResult::FAILED;
    }
    if (!replace && exists(path)) {
        return WriteResult::EXISTS;
    }
    TemporaryFile temporary;
    if (!temporary.create(folder, name, error) || !temporary.fill(content, error)) {
        return WriteResult::FAILED;
    }
    if (replace) {
        // The rename replaces whatever is there by then: look once more.
        if (!mayReplace(path, error)) {
            return WriteResult::FAILED;
        }
        if (rename(temporary.path().c_str(), path.c_str()) != 0) {
            error =
                "cannot rename " + temporary.path() + " to " + path + ": " + std::strerror(errno);
            return WriteResult::FAILED;
        }
        temporary.release();
        return WriteResult::WRITTEN;
    }
    // A hard link puts the file in place only when the name is free, with
    // no moment at which another writer's file could be replaced.
    if (link(temporary.path().c_str(), path.c_str()) == 0) {
        return WriteResult::WRITTEN;  // the temporary name goes with the object
    }
    int const linkErrno = errno;
    if (linkErrno == EEXIST) {
        return WriteResult::EXISTS;
    }
    if (linkErrno != EPERM && linkErrno != EOPNOTSUPP && linkErrno != ENOSYS &&
        linkErrno != EMLINK) {
        error = "cannot create " + path + ": " + std::strerror(linkErrno);
        return WriteResult::FAILED;
    }
    // A file system without hard links: check, then rename.
    if (exists(path)) {
        return WriteResult::EXISTS;
    }
    if (rename(temporary.path().c_str(), path.c_str()) != 0) {
        error = "cannot rename " + temporary.path() + " to " + path + ": " + std::strerror(errno);
        return WriteResult::FAILED;
    }
    temporary.release();
    return WriteResult::WRITTEN;
}

}  // namespace smbiostool
