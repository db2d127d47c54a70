#include "format/DumpBin.h"

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <utility>

#include "format/EntryPoint.h"

namespace smbiosformat {

namespace {

bool startsWith(std::vector<uint8_t> const& bytes, size_t offset, char const* anchor) {
    size_t const n = std::strlen(anchor);
    if (bytes.size() < offset || bytes.size() - offset < n) {
        return false;
    }
    return std::memcmp(bytes.data() + offset, anchor, n) == 0;
}

std::string hex(uint64_t value) {
    static char const digits[] = "0123456789ABCDEF";
    std::string text;
    do {
        text.insert(text.begin(), digits[value & 0xF]);
        value >>= 4;
    } while (value != 0);
    if (text.size() % 2 != 0) {
        text.insert(text.begin(), '0');
    }
    return "0x" + text;
}

// The table of `length` bytes at `address` in the image, when it lies
// wholly inside the file.
bool cutTable(std::vector<uint8_t> const& file, uint64_t address, uint64_t length,
              std::vector<uint8_t>& table, std::string& error) {
    uint64_t const size = file.size();
    if (length == 0) {
        error = "the entry point gives an empty structure table";
        return false;
    }
    if (address > size || length > size - address) {
        error = "structure table of " + std::to_string(length) + " bytes at " + hex(address) +
                " runs past the end of the " + std::to_string(size) + "-byte file";
        return false;
    }
    table.assign(file.begin() + static_cast<std::ptrdiff_t>(address),
                 file.begin() + static_cast<std::ptrdiff_t>(address + length));
    return true;
}

std::string tooShort(std::vector<uint8_t> const& file, size_t needed, char const* anchor) {
    return "file of " + std::to_string(file.size()) + " bytes is too short for the " +
           std::to_string(needed) + "-byte " + anchor + " entry point";
}

bool readSm(std::vector<uint8_t> const& file, DumpImage& image, std::string& error) {
    if (file.size() < SM_ENTRY_POINT_SIZE) {
        error = tooShort(file, SM_ENTRY_POINT_SIZE, "_SM_");
        return false;
    }
    uint8_t const length = file[5];
    // 0x1E is accepted as well: some firmware states it for the 31-byte
    // entry point.
    if (length < 0x1E) {
        error = "_SM_ entry point length " + hex(length) + " is below 0x1E";
        return false;
    }
    if (!startsWith(file, 0x10, "_DMI_")) {
        error = "_SM_ entry point has no _DMI_ anchor at offset 0x10";
        return false;
    }
    size_t const headerSize = std::min<size_t>(length, file.size());
    image.header.assign(file.begin(), file.begin() + static_cast<std::ptrdiff_t>(headerSize));
    image.major = file[6];
    image.minor = file[7];
    return cutTable(file, getDword(file, 0x18), getWord(file, 0x16), image.table, error);
}

bool readDmi(std::vector<uint8_t> const& file, DumpImage& image, std::string& error) {
    if (file.size() < DMI_ENTRY_POINT_SIZE) {
        error = tooShort(file, DMI_ENTRY_POINT_SIZE, "_DMI_");
        return false;
    }
    image.header.assign(file.begin(),
                        file.begin() + static_cast<std::ptrdiff_t>(DMI_ENTRY_POINT_SIZE));
    uint8_t const bcd = file[14];
    image.major = static_cast<uint8_t>(bcd >> 4);
    image.minor = static_cast<uint8_t>(bcd & 0x0F);
    return cutTable(file, getDword(file, 8), getWord(file, 6), image.table, error);
}

bool readSm3(std::vector<uint8_t> const& file, DumpImage& image, std::string& error) {
    if (file.size() < SM3_ENTRY_POINT_SIZE) {
        error = tooShort(file, SM3_ENTRY_POINT_SIZE, "_SM3_");
        return false;
    }
    uint8_t const length = file[6];
    if (length < SM3_ENTRY_POINT_SIZE) {
        error = "_SM3_ entry point length " + hex(length) + " is below 0x18";
        return false;
    }
    uint64_t const maxSize = getDword(file, 0x0C);
    uint64_t const address = getQword(file, 0x10);
    uint64_t const size = file.size();
    if (maxSize == 0) {
        error = "the entry point gives an empty structure table";
        return false;
    }
    if (address >= size) {
        error = "structure table at " + hex(address) + " starts past the end of the " +
                std::to_string(size) + "-byte file";
        return false;
    }
    // The maximum size is an upper bound: take what the file holds of it.
    uint64_t const tableSize = std::min(maxSize, size - address);
    if (!cutTable(file, address, tableSize, image.table, error)) {
        return false;
    }
    if (image.table.size() > MAX_2X_TABLE_LENGTH) {
        // A 2.x entry point states at most 65535 bytes: keep the whole
        // structures of the table's start that fit, and say what was left.
        TablePrefix const prefix = wholeStructuresWithin(image.table, MAX_2X_TABLE_LENGTH);
        if (prefix.bytes == 0) {
            error = "SMBIOS 3.x table of " + std::to_string(image.table.size()) +
                    " bytes has no whole structure in its first 65535 bytes";
            return false;
        }
        image.cut = true;
        image.wholeTableBytes = image.table.size();
        image.wholeTableStructures = tableStats(image.table).count;
        image.table.resize(prefix.bytes);
    }
    image.major = file[7];
    image.minor = file[8];
    TableStats const stats = tableStats(image.table);
    image.header =
        makeSmEntryPoint(image.major, image.minor, static_cast<uint16_t>(image.table.size()),
                         DUMP_BIN_TABLE_OFFSET, stats.count, stats.maxSize);
    return true;
}

}  // namespace

bool readDumpBin(std::vector<uint8_t> const& file, DumpImage& out, std::string& error) {
    DumpImage image;
    bool ok = false;
    if (startsWith(file, 0, "_SM3_")) {
        image.anchor = "_SM3_";
        ok = readSm3(file, image, error);
    } else if (startsWith(file, 0, "_SM_")) {
        image.anchor = "_SM_";
        ok = readSm(file, image, error);
    } else if (startsWith(file, 0, "_DMI_")) {
        image.anchor = "_DMI_";
        ok = readDmi(file, image, error);
    } else if (file.size() < 5) {
        error = "file of " + std::to_string(file.size()) + " bytes is too short for an entry point";
    } else {
        error = "no entry point anchor (_SM_, _SM3_ or _DMI_) at offset 0";
    }
    if (ok) {
        out = std::move(image);
    }
    return ok;
}

}  // namespace smbiosformat
