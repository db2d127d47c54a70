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
#include <cstddef>
#include <cstring>
#include <string>
#include <vector>

namespace SD {

// What kind of file a mode says, as a message names it: "a FIFO",
// "a directory", ... ; "" for a regular file.
inline char const* fileKind(mode_t mode) {
    struct Kind {
        mode_t type;
        char const* name;
    };
    static Kind const kinds[] = {{S_IFREG, ""},
                                 {S_IFDIR, "a directory"},
                                 {S_IFIFO, "a FIFO"},
                                 {S_IFSOCK, "a socket"},
                                 {S_IFCHR, "a character device"},
                                 {S_IFBLK, "a block device"},
                                 {S_IFLNK, "a symbolic link"}};
    for (Kind const& kind : kinds) {
        if ((mode & S_IFMT) == kind.type) {
            return kind.name;
        }
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

// How a read of a file to its end came out.
enum class ReadEnd { Whole, TooLarge, Failed };

// Reads fd to its end into bytes, at most limit bytes (a read interrupted by
// a signal is taken again). TooLarge as soon as the file holds more than
// limit bytes; Failed with the read's errno in error.
inline ReadEnd readToEnd(int fd, std::size_t limit, std::vector<unsigned char>& bytes, int& error) {
    bytes.clear();
    std::vector<unsigned char> chunk(64 * 1024);
    for (;;) {
        ssize_t const count = ::read(fd, chunk.data(), chunk.size());
        if (count < 0) {
            if (errno == EINTR) {
                continue;
            }
            error = errno;
            return ReadEnd::Failed;
        }
        if (count == 0) {
            return ReadEnd::Whole;
        }
        std::size_t const size = static_cast<std::size_t>(count);
        if (size > limit - bytes.size()) {
            return ReadEnd::TooLarge;
        }
        bytes.insert(bytes.end(), chunk.begin(), chunk.begin() + static_cast<std::ptrdiff_t>(size));
    }
}

}  // namespace SD
