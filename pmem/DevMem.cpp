#include "DevMem.h"

#include <sys/types.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "SD/RegularFile.h"

namespace pmem {

namespace {

// The memory device is a character device; a regular file stands in for it
// in tests. Anything else (a FIFO, a socket, a folder, a block device) is
// refused without being opened, so that neither loading the library nor
// PMemOpen can wait on it. why says what failed.
int openDevice(std::string const& path, std::string& why) {
    return SD::openRegularFile(path.c_str(), why, SD::FileKinds::RegularOrCharacterDevice);
}

static_assert(sizeof(off_t) == 8, "libpmem.so is built with 64-bit file offsets");

// A search reads the device piece by piece, each piece within one page, so
// that a page the kernel refuses costs only its own bytes.
constexpr unsigned long kPage = 4096;
// What a search reads at once when its steps are small.
constexpr unsigned long kWindow = 64 * 1024;
// The largest single read.
constexpr unsigned long kReadPiece = 1024 * 1024;

// The device offset of a physical address; false when off_t cannot hold it
// (only above 2^63, so never for a 32-bit address).
bool offsetOf(unsigned long address, off_t& offset) {
    uint64_t const wide = address;
    if (wide > static_cast<uint64_t>(INT64_MAX)) {
        return false;
    }
    offset = static_cast<off_t>(wide);
    return true;
}

enum class Outcome {
    All,      // every byte read
    End,      // the memory ends within the bytes: nothing from there on is served
    Refused,  // the kernel refused these bytes (others may still be served)
};

// Reads the n bytes from `address` on as far as they go; `got` tells how
// many were read. The kernel answers EFAULT for an address past the memory
// it serves, and a plain file standing in for the device ends where it ends.
Outcome readAt(int fd, unsigned char* out, unsigned long address, unsigned long n,
               unsigned long& got) {
    got = 0;
    while (got < n) {
        off_t offset = 0;
        if (!offsetOf(address + got, offset)) {
            return Outcome::End;
        }
        ssize_t const r = ::pread(fd, out + got, n - got, offset);
        if (r < 0) {
            if (errno == EINTR) {
                continue;
            }
            return errno == EFAULT ? Outcome::End : Outcome::Refused;
        }
        if (r == 0) {
            return Outcome::End;
        }
        got += static_cast<unsigned long>(r);
    }
    return Outcome::All;
}

// The bytes of the device from one address to another, with what of them
// was served.
class Window {
public:
    bool holds(unsigned long first, unsigned long last) const {
        return loaded_ && first >= first_ && last <= last_;
    }

    // Reads the bytes from first to last (a range small enough to allocate).
    // When the memory turns out to end inside it, `ended` is set and
    // `endAddress` is the first address not served.
    void load(int fd, unsigned long first, unsigned long last, bool& ended,
              unsigned long& endAddress) {
        unsigned long const size = last - first + 1;
        bytes_.assign(size, 0);
        present_.assign(size, 0);
        first_ = first;
        last_ = last;
        loaded_ = true;
        unsigned long at = first;
        for (;;) {
            unsigned long const pageLast = at | (kPage - 1);
            unsigned long const pieceLast = std::min(pageLast, last);
            unsigned long got = 0;
            Outcome const outcome =
                readAt(fd, bytes_.data() + (at - first), at, pieceLast - at + 1, got);
            std::fill_n(present_.begin() + static_cast<std::ptrdiff_t>(at - first), got, 1);
            if (outcome == Outcome::End) {
                ended = true;
                endAddress = at + got;
                return;
            }
            if (pieceLast == last) {
                return;
            }
            at = pieceLast + 1;
        }
    }

    // Whether the pattern's bytes were all served, from `address` on, and
    // are the pattern's. The window holds the whole range.
    bool matches(unsigned long address, unsigned char const* pattern, unsigned long length) const {
        unsigned long const offset = address - first_;
        for (unsigned long i = 0; i < length; ++i) {
            if (present_[offset + i] == 0 || bytes_[offset + i] != pattern[i]) {
                return false;
            }
        }
        return true;
    }

private:
    bool loaded_ = false;
    unsigned long first_ = 0;
    unsigned long last_ = 0;
    std::vector<unsigned char> bytes_;
    std::vector<unsigned char> present_;
};

}  // namespace

DevMem::~DevMem() { close(); }

bool DevMem::canOpen(std::string const& path, std::string& why) {
    int const fd = openDevice(path, why);
    if (fd < 0) {
        why = path + ": " + why;
        return false;
    }
    ::close(fd);
    return true;
}

bool DevMem::open() {
    if (fd_ < 0) {
        std::string why;
        fd_ = openDevice(path_, why);
    }
    return fd_ >= 0;
}

bool DevMem::close() {
    if (fd_ >= 0) {
        ::close(fd_);
        fd_ = -1;
    }
    return true;
}

bool DevMem::read(unsigned char* out, unsigned long address, unsigned long count) {
    if (fd_ < 0) {
        return false;
    }
    unsigned long done = 0;
    while (done < count) {
        unsigned long const n = std::min(count - done, kReadPiece);
        unsigned long got = 0;
        if (readAt(fd_, out + done, address + done, n, got) != Outcome::All) {
            return false;
        }
        done += n;
    }
    return true;
}

unsigned long DevMem::search(unsigned char const* pattern, unsigned long length,
                             unsigned long start, unsigned long end, unsigned long step) {
    if (fd_ < 0) {
        return 0;
    }
    // The last byte that any candidate needs: the search reads nothing past it.
    unsigned long const lastNeeded =
        (length - 1 > ULONG_MAX - end) ? ULONG_MAX : end + (length - 1);
    Window window;
    bool ended = false;
    unsigned long endAddress = 0;
    unsigned long address = start;
    for (;;) {
        // A pattern that would run past the last address cannot occur there,
        // nor at any later candidate.
        if (length - 1 > ULONG_MAX - address) {
            return 0;
        }
        unsigned long const last = address + (length - 1);
        if (ended && last >= endAddress) {
            return 0;
        }
        if (!window.holds(address, last)) {
            unsigned long windowLast = last;
            if (step < kWindow) {
                unsigned long const full =
                    (kWindow - 1 > ULONG_MAX - address) ? ULONG_MAX : address + (kWindow - 1);
                windowLast = std::max(last, std::min(full, lastNeeded));
            }
            window.load(fd_, address, windowLast, ended, endAddress);
        }
        if (window.matches(address, pattern, length)) {
            return address;
        }
        if (end - address < step) {
            return 0;
        }
        address += step;
    }
}

}  // namespace pmem
