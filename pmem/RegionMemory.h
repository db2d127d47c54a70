// Physical memory held in this process: byte ranges placed at addresses,
// with nothing between them. The image and sysfs sources are made of it.
#pragma once

#include <map>
#include <vector>

#include "Source.h"

namespace pmem {

class RegionMemory : public Source {
public:
    // Places the bytes from `base` on. False, and nothing placed, when they
    // would run past the last address or overlap bytes already placed.
    // Placing no bytes succeeds and presents nothing.
    bool place(unsigned long base, std::vector<unsigned char> bytes);

    // The bytes are always there: opening and closing just succeed.
    bool open() override { return true; }
    bool close() override { return true; }
    bool read(unsigned char* out, unsigned long address, unsigned long count) override;
    unsigned long search(unsigned char const* pattern, unsigned long length, unsigned long start,
                         unsigned long end, unsigned long step) override;

private:
    struct Region {
        unsigned long last;  // address of the region's last byte
        std::vector<unsigned char> bytes;
    };

    // The region holding `address`, or null.
    Region const* regionAt(unsigned long address, unsigned long& first) const;
    // Calls visit(bytes, offset, n) for each run of `count` bytes from
    // `address` on, in order, while they are all present; false at the first
    // absent byte or when visit returns false.
    template <typename Visit>
    bool walk(unsigned long address, unsigned long count, Visit visit) const;

    std::map<unsigned long, Region> regions_;  // by the address of the first byte
};

}  // namespace pmem
