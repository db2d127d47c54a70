#include "RegionMemory.h"

#include <climits>
#include <cstring>
#include <iterator>
#include <utility>

namespace pmem {

bool RegionMemory::place(unsigned long base, std::vector<unsigned char> bytes) {
    if (bytes.empty()) {
        return true;
    }
    // The last byte's address, unless it would lie past ULONG_MAX.
    unsigned long long const span = static_cast<unsigned long long>(bytes.size()) - 1;
    if (span > ULONG_MAX - base) {
        return false;
    }
    unsigned long const last = base + static_cast<unsigned long>(span);
    auto next = regions_.lower_bound(base);
    if (next != regions_.end() && next->first <= last) {
        return false;
    }
    if (next != regions_.begin() && std::prev(next)->second.last >= base) {
        return false;
    }
    regions_.emplace_hint(next, base, Region{last, std::move(bytes)});
    return true;
}

RegionMemory::Region const* RegionMemory::regionAt(unsigned long address,
                                                   unsigned long& first) const {
    auto it = regions_.upper_bound(address);
    if (it == regions_.begin()) {
        return nullptr;
    }
    --it;
    if (address > it->second.last) {
        return nullptr;
    }
    first = it->first;
    return &it->second;
}

template <typename Visit>
bool RegionMemory::walk(unsigned long address, unsigned long count, Visit visit) const {
    unsigned long done = 0;
    while (done < count) {
        unsigned long const at = address + done;  // the caller keeps the range below ULONG_MAX
        unsigned long first = 0;
        Region const* region = regionAt(at, first);
        if (region == nullptr) {
            return false;
        }
        // Bytes of the region from `at` on, less one: region->last - at + 1
        // would wrap for a region that ends at ULONG_MAX and starts at 0.
        unsigned long const moreThere = region->last - at;
        unsigned long const wanted = count - done;
        unsigned long const n = (wanted - 1 <= moreThere) ? wanted : moreThere + 1;
        if (!visit(region->bytes.data() + (at - first), done, n)) {
            return false;
        }
        done += n;
    }
    return true;
}

bool RegionMemory::read(unsigned char* out, unsigned long address, unsigned long count) {
    // Copy only when every byte is there, so that a failed read leaves the
    // caller's buffer as it was.
    auto const present = [](unsigned char const*, unsigned long, unsigned long) { return true; };
    if (!walk(address, count, present)) {
        return false;
    }
    return walk(address, count,
                [out](unsigned char const* bytes, unsigned long offset, unsigned long n) {
                    std::memcpy(out + offset, bytes, n);
                    return true;
                });
}

unsigned long RegionMemory::search(unsigned char const* pattern, unsigned long length,
                                   unsigned long start, unsigned long end, unsigned long step) {
    auto const matches = [pattern](unsigned char const* bytes, unsigned long offset,
                                   unsigned long n) {
        return std::memcmp(bytes, pattern + offset, n) == 0;
    };
    unsigned long address = start;
    for (;;) {
        auto next = regions_.upper_bound(address);  // the first region after `address`
        bool const inside = next != regions_.begin() && address <= std::prev(next)->second.last;
        if (inside) {
            if (length - 1 <= ULONG_MAX - address && walk(address, length, matches)) {
                return address;
            }
            if (end - address < step) {
                return 0;
            }
            address += step;
            continue;
        }
        // In a hole: go straight to the first candidate at or after the next
        // region, so that the time a search takes follows the bytes present,
        // not the width of the range.
        if (next == regions_.end()) {
            return 0;
        }
        unsigned long const gap = next->first - address;
        unsigned long const steps = gap / step + (gap % step != 0 ? 1 : 0);
        if (steps > (end - address) / step) {
            return 0;
        }
        address += steps * step;
    }
}

}  // namespace pmem
