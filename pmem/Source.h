// What libpmem.so serves physical memory from: an image of files, the
// kernel's copy of the SMBIOS tables, or /dev/mem. The exported functions
// check their arguments; a source only ever sees well-formed requests.
#pragma once

namespace pmem {

class Source {
public:
    virtual ~Source() = default;

    // Makes the memory readable; true when it is.
    virtual bool open() = 0;
    // Ends what open() started; true on success.
    virtual bool close() = 0;
    // Copies the `count` bytes from `address` on into `out`; false unless
    // every one of them is there. count >= 1 and address + count - 1 does
    // not pass the last address.
    virtual bool read(unsigned char* out, unsigned long address, unsigned long count) = 0;
    // The first address start + k * step not past `end` where all `length`
    // bytes of `pattern` occur; 0 when there is none. length >= 1, step >= 1,
    // start <= end.
    virtual unsigned long search(unsigned char const* pattern, unsigned long length,
                                 unsigned long start, unsigned long end, unsigned long step) = 0;
};

}  // namespace pmem
