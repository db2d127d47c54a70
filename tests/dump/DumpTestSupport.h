// Helpers of the smbios-dump tests: running the built tool, reading what it
// wrote back through the plug-in's own import, the stand-in physical-memory
// libraries and small file-system checks.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "HostRunner.h"
#include "PluginRead.h"
#include "TestSupport.h"

namespace dumptest {

typedef std::vector<uint8_t> Bytes;

// The built smbios-dump in SMBIOS_OUT_DIR.
std::string toolPath();

// Runs the built smbios-dump.
hosttest::RunResult runDump(std::vector<std::string> const& args,
                            hosttest::Environment const& environment = hosttest::Environment());

// Runs `work` on a thread of its own and releases it should it wait on a
// FIFO (see smbiostest::waitedOnFifo).
using smbiostest::waitedOnFifo;

// Makes a FIFO; false when it cannot be made.
bool makeFifo(std::string const& path);

// The names in `folder` that look like a temporary file of the dump file
// `name` (".NAME.XXXXXX"), sorted.
std::vector<std::string> temporaryFilesOf(std::string const& folder, std::string const& name);

// A stand-in physical-memory library: "full" exports the five functions,
// "nosearch" all but PMemSearch.
std::string fakePMem(std::string const& variant);

// An override dump file read the way the plug-in reads it: importSmBios,
// then readHead and readTables (each result 0 on success).
using ReadBack = smbiosdump::PluginRead;
inline ReadBack readBackThroughPlugin(std::string const& path) {
    return smbiosdump::readOverrideFile(path);
}

// The names in a folder (without "." and ".."), sorted.
using smbiostest::folderEntries;

bool exists(std::string const& path);

// The whole file as text; "" when it cannot be read.
std::string readText(std::string const& path);

// smbios-inventory's JSON without the two values the plug-in reads from the
// clock (properties 126, the current date-time, and 127, the time-zone
// offset, of the computer-system nodes), so that two runs compare as text.
// `masked` counts the values removed. "" when the text is not JSON.
std::string inventoryWithoutClock(std::string const& json, unsigned& masked);

// The 8-bit sum of bytes[begin, end); the little-endian word and double word.
using smbiostest::byteSum;
using smbiostest::dword;
using smbiostest::word;

// A small table of three structures (BIOS, system, end of table).
Bytes sampleTable();

}  // namespace dumptest
