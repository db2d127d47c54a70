// Opening files that must be regular files, without ever blocking on one
// that is not. A FIFO opened for reading waits for a writer, a device may do
// anything on open; both would hang or mislead a program that only wanted
// the bytes of a file. Header-only, so that the physical-memory library and
// the tools can use it without linking the platform library.
#pragma once

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

namespace SD {

// What kind of file a mode says, as a message names it: "a FIFO",
// "a directory", ... ; "" for a regular file.
inline char const* fileKind(mode_t mode) {
    if (S_ISREG(mode)) {
        return "";
    }
    if (S_ISDIR(mode)) {
        return "a directory";
    }
    if (S_ISFIFO(mode)) {
        return "a FIFO";
    }
    if (S_ISSOCK(mode)) {
        return "a socket";
    }
    if (S_ISCHR(mode)) {
        return "a character device";
    }
    if (S_ISBLK(mode)) {
        return "a block device";
    }
    if (S_ISLNK(mode)) {
        return "a symbolic link";
    }
    return "not a regular file";
}

// Which kinds of file an open accepts besides regular files.
enum class FileKinds { RegularOnly, RegularOrCharacterDevice };

// Opens path read-only without blocking and returns the descriptor, in
// blocking mode again once it is known to be a file of an accepted kind.
// Returns -1 and sets why ("No such file or directory", "a FIFO, not a
// regular file") otherwise; the file is never opened when it is already
// known to be of the wrong kind.
inline int openRegularFile(char const* path, std::string& why,
                           FileKinds kinds = FileKinds::RegularOnly) {
    auto accepted = [kinds](mode_t mode) {
        return S_ISREG(mode) || (kinds == FileKinds::RegularOrCharacterDevice && S_ISCHR(mode));
    };
    auto refuse = [&why](mode_t mode) {
        why = std::string(fileKind(mode)) + ", not a regular file";
        return -1;
    };
    struct stat info;
    if (::stat(path, &info) != 0) {
        why = std::strerror(errno);
        return -1;
    }
    if (!accepted(info.st_mode)) {
        return refuse(info.st_mode);
    }
    int const fd = ::open(path, O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
    if (fd < 0) {
        why = std::strerror(errno);
        return -1;
    }
    // The path may have been replaced between the stat and the open.
    if (::fstat(fd, &info) != 0 || !accepted(info.st_mode)) {
        int const error = errno;
        ::close(fd);
        if (!accepted(info.st_mode)) {
            return refuse(info.st_mode);
        }
        why = std::strerror(error);
        return -1;
    }
    int const flags = ::fcntl(fd, F_GETFL);
    if (flags >= 0) {
        ::fcntl(fd, F_SETFL, flags & ~O_NONBLOCK);
    }
    return fd;
}

}  // namespace SD
