// Physical memory through the kernel's memory device (/dev/mem), read-only:
// it is opened with O_RDONLY (without waiting, and only when it is a
// character device or a regular file), read with pread, never mapped or
// written.
#pragma once

#include <string>
#include <utility>

#include "Source.h"

namespace pmem {

class DevMem : public Source {
public:
    explicit DevMem(std::string path) : path_(std::move(path)) {}
    ~DevMem() override;
    DevMem(DevMem const&) = delete;
    DevMem& operator=(DevMem const&) = delete;

    // Whether the device can be opened for reading now (opened and closed
    // again at once). Only a character device or a regular file can; why
    // then names the file and the reason.
    static bool canOpen(std::string const& path, std::string& why);

    // Opens the device (once; opening it again keeps it open); false for
    // anything but a character device or a regular file.
    bool open() override;
    // Closes the device; true also when it was not open.
    bool close() override;
    // Read and search need the device open.
    bool read(unsigned char* out, unsigned long address, unsigned long count) override;
    unsigned long search(unsigned char const* pattern, unsigned long length, unsigned long start,
                         unsigned long end, unsigned long step) override;

private:
    std::string path_;
    int fd_ = -1;
};

}  // namespace pmem
