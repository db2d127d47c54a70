// The readers of smbios-dump: each turns one kind of input into an entry
// point and a structure table ready for the override dump file.
//  - a dmidecode --dump-bin image (a 3.x image gets the equivalent 2.x
//    "_SM_" entry point, as readDumpBin makes it),
//  - a raw structure table and the SMBIOS version it belongs to (the "_SM_"
//    entry point is made for it),
//  - this machine's physical memory, through the five functions of the
//    physical-memory library libpmem.so.
// None of them writes anything; they fail with a message instead.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "ToolSupport.h"
#include "format/EntryPoint.h"
#include "pmem/PMemContract.h"

namespace smbiosdump {

// What goes into an override dump file.
struct Capture {
    std::vector<uint8_t> header;  // the entry point, "_SM_" or "_DMI_"
    std::vector<uint8_t> table;   // the structure table
    uint8_t major = 0;            // the SMBIOS version the entry point states
    uint8_t minor = 0;
    // A --dump-bin image's 3.x table over 65535 bytes is kept as the whole
    // structures of its first 65535 bytes; then cut is set, with the whole
    // table's figures.
    bool cut = false;
    size_t wholeTableBytes = 0;
    unsigned wholeTableStructures = 0;
};

// The whole input file, up to the tools' common limit.
using smbiostool::MAX_INPUT_FILE_SIZE;
using smbiostool::readInputFile;

// Parses "MAJ.MIN" (each a decimal number 0-255).
bool parseSmbiosVersion(std::string const& text, uint8_t& major, uint8_t& minor);

// A dmidecode --dump-bin image.
bool captureFromDumpBin(std::vector<uint8_t> const& file, Capture& out, std::string& error);

// A raw structure table of SMBIOS version major.minor. It must hold at
// least one whole structure and fit the 16-bit length of a "_SM_" entry
// point; the entry point gets the table's structure count and largest
// structure, table address 0x20 (where a --dump-bin image holds it).
bool captureFromTable(std::vector<uint8_t> const& table, uint8_t major, uint8_t minor, Capture& out,
                      std::string& error);

// The physical-memory library's functions, as its contract declares them.
// Non-zero means success for the first three, 0 for read; search returns 0
// when the anchor is not found.
using PMemFunctions = pmem::Functions;

// Where the entry points are looked for in physical memory: "_SM_" on
// 16-byte boundaries of the BIOS area, else the legacy "_DMI_" anywhere in
// the first megabyte, as the plug-in itself searches.
using smbiosformat::DMI_SEARCH_END;
using smbiosformat::DMI_SEARCH_START;
using smbiosformat::SEARCH_STEP;
using smbiosformat::SM_SEARCH_END;
using smbiosformat::SM_SEARCH_START;

// Reads the entry point and the table through the library's functions:
// checks that it initialized, opens, searches, reads, closes. Any function
// that fails ends the capture with a message naming it.
bool captureFromMemory(PMemFunctions const& pmem, Capture& out, std::string& error);

// Loads the physical-memory library from `libraryPath` (a name without '/'
// means the file in the current folder), binds its five functions, runs
// captureFromMemory and unloads it.
bool captureFromMachine(std::string const& libraryPath, Capture& out, std::string& error);

// The library smbios-dump uses when --pmem is not given: libpmem.so in
// `programFolder` when it is there, else in programFolder/../lib (an
// installed program in PREFIX/bin, the libraries in PREFIX/lib).
std::string defaultPMemPath(std::string const& programFolder);

}  // namespace smbiosdump
