#include "DumpInput.h"

#include <cerrno>
#include <cstdio>

#include "DumpFormat.h"
#include "ToolSupport.h"

namespace smbiosdump {

namespace {

std::string hex(uint64_t value) {
    char text[32];
    std::snprintf(text, sizeof text, "0x%llX", static_cast<unsigned long long>(value));
    return text;
}

// A number 0-255 in decimal, at least one digit.
bool parseByte(std::string const& text, uint8_t& value) {
    if (text.empty() || text.size() > 3) {
        return false;
    }
    unsigned number = 0;
    for (char c : text) {
        if (c < '0' || c > '9') {
            return false;
        }
        number = number * 10 + static_cast<unsigned>(c - '0');
    }
    if (number > 0xFF) {
        return false;
    }
    value = static_cast<uint8_t>(number);
    return true;
}

// Reads `count` bytes at `address` through the library.
bool readMemory(PMemFunctions const& pmem, unsigned long address, size_t count,
                std::vector<uint8_t>& bytes, char const* what, std::string& error) {
    bytes.assign(count, 0);
    int const result = pmem.read(bytes.data(), address, static_cast<long>(count));
    if (result != 0) {
        error = std::string("PMemRead of the ") + what + " (" + std::to_string(count) +
                " bytes at " + hex(address) + ") failed with " + std::to_string(result);
        return false;
    }
    return true;
}

// The entry point and table found in memory, read with the library open.
bool readFromOpenMemory(PMemFunctions const& pmem, Capture& capture, std::string& error) {
    uint32_t tableAddress = 0;
    uint16_t tableLength = 0;
    unsigned long const sm = pmem.search("_SM_", SM_SEARCH_START, SM_SEARCH_END, SEARCH_STEP);
    if (sm != 0) {
        if (!readMemory(pmem, sm, SM_ENTRY_POINT_SIZE, capture.header, "_SM_ entry point", error)) {
            return false;
        }
        // The entry point is as long as its length byte says (0x1E on some
        // firmware, more on none seen yet); a length below that is not
        // believed and the 31 bytes are kept.
        uint8_t const length = capture.header[5];
        if (length > SM_ENTRY_POINT_SIZE) {
            if (!readMemory(pmem, sm, length, capture.header, "_SM_ entry point", error)) {
                return false;
            }
        } else if (length >= SM_ENTRY_POINT_SIZE - 1) {
            capture.header.resize(length);
        }
        capture.major = capture.header[6];
        capture.minor = capture.header[7];
        tableLength = getWord(capture.header, 0x16);
        tableAddress = getDword(capture.header, 0x18);
    } else {
        unsigned long const dmi =
            pmem.search("_DMI_", DMI_SEARCH_START, DMI_SEARCH_END, SEARCH_STEP);
        if (dmi == 0) {
            error = "no _SM_ entry point in " + hex(SM_SEARCH_START) + "-" + hex(SM_SEARCH_END) +
                    " and no _DMI_ entry point in " + hex(DMI_SEARCH_START) + "-" +
                    hex(DMI_SEARCH_END);
            return false;
        }
        if (!readMemory(pmem, dmi, DMI_ENTRY_POINT_SIZE, capture.header, "_DMI_ entry point",
                        error)) {
            return false;
        }
        uint8_t const bcd = capture.header[14];
        capture.major = static_cast<uint8_t>(bcd >> 4);
        capture.minor = static_cast<uint8_t>(bcd & 0x0F);
        tableLength = getWord(capture.header, 6);
        tableAddress = getDword(capture.header, 8);
    }
    if (tableLength == 0) {
        error = "the entry point gives an empty structure table";
        return false;
    }
    return readMemory(pmem, tableAddress, tableLength, capture.table, "structure table", error);
}

}  // namespace

bool parseSmbiosVersion(std::string const& text, uint8_t& major, uint8_t& minor) {
    size_t const dot = text.find('.');
    if (dot == std::string::npos) {
        return false;
    }
    uint8_t newMajor = 0;
    uint8_t newMinor = 0;
    if (!parseByte(text.substr(0, dot), newMajor) || !parseByte(text.substr(dot + 1), newMinor)) {
        return false;
    }
    major = newMajor;
    minor = newMinor;
    return true;
}

bool captureFromDumpBin(std::vector<uint8_t> const& file, Capture& out, std::string& error) {
    DumpImage image;
    if (!readDumpBin(file, image, error)) {
        error = "not a usable dmidecode --dump-bin image: " + error;
        return false;
    }
    out.header = std::move(image.header);
    out.table = std::move(image.table);
    out.major = image.major;
    out.minor = image.minor;
    out.cut = image.cut;
    out.wholeTableBytes = image.wholeTableBytes;
    out.wholeTableStructures = image.wholeTableStructures;
    return true;
}

bool captureFromTable(std::vector<uint8_t> const& table, uint8_t major, uint8_t minor, Capture& out,
                      std::string& error) {
    if (table.empty()) {
        error = "the structure table is empty";
        return false;
    }
    if (table.size() > 0xFFFF) {
        error = "the structure table's " + std::to_string(table.size()) +
                " bytes do not fit the 16-bit length of a _SM_ entry point (65535 at most)";
        return false;
    }
    TableStats const stats = tableStats(table);
    if (stats.count == 0) {
        error = "no whole SMBIOS structure at the start of the table";
        if (table.size() >= 2) {
            error +=
                " (type " + std::to_string(table[0]) + ", length " + std::to_string(table[1]) + ")";
        }
        return false;
    }
    out.header = makeSmEntryPoint(major, minor, static_cast<uint16_t>(table.size()),
                                  DUMP_BIN_TABLE_OFFSET, stats.count, stats.maxSize);
    out.table = table;
    out.major = major;
    out.minor = minor;
    return true;
}

bool captureFromMemory(PMemFunctions const& pmem, Capture& out, std::string& error) {
    if (pmem.isInitialized() == 0) {
        error = "PMemIsInitialized returned 0: the library has no usable source of physical memory";
        return false;
    }
    if (pmem.open() == 0) {
        error = "PMemOpen returned 0: physical memory could not be opened";
        return false;
    }
    Capture capture;
    bool const read = readFromOpenMemory(pmem, capture, error);
    bool const closed = pmem.close() != 0;
    if (!read) {
        return false;
    }
    if (!closed) {
        error = "PMemClose returned 0";
        return false;
    }
    out = std::move(capture);
    return true;
}

bool captureFromMachine(std::string const& libraryPath, Capture& out, std::string& error) {
    std::string const path = smbiostool::libraryFile(libraryPath);
    pmem::BoundLibrary library(path);
    if (!library.loadAndBind()) {
        error =
            library.missing() != nullptr
                ? "the physical-memory library " + path + " does not export " + library.missing()
                : "cannot load the physical-memory library " + path + ": " + library.getLastError();
        return false;
    }
    bool const captured = captureFromMemory(library.functions(), out, error);
    if (!captured) {
        error = path + ": " + error;
    }
    return captured;
}

std::string defaultPMemPath(std::string const& programFolder) {
    return smbiostool::installedLibrary(programFolder, "libpmem.so");
}

}  // namespace smbiosdump
