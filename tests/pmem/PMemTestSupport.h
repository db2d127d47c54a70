// Helpers of the libpmem.so tests. The library chooses its source when it is
// loaded, from the environment; every test case runs in a process of its
// own, sets the environment first and then loads the built library from
// SMBIOS_OUT_DIR (PMemTest::load), which it unloads at the end.
#pragma once

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "TestSupport.h"
#include "pmem/PMemContract.h"
#include "smbios/SmBios.h"

namespace pmemtest {

// What PMemTableCut says of a table too large for a 2.x entry point.
struct TableCutFigures {
    unsigned long tableBytes = 0;
    unsigned long tableStructures = 0;
    unsigned long servedBytes = 0;
    unsigned long servedStructures = 0;
};

// SMBIOS_OUT_DIR, the folder of the built libraries; "" when unset.
std::string outDir();
// The built libpmem.so.
std::string libraryPath();

// libpmem.so loaded and its five functions bound, through the contract's
// binder. When it cannot be loaded or lacks a function the test fails and
// the functions answer as an unusable library.
class PMemLibrary : smbiostest::NonCopyable {
public:
    PMemLibrary();
    ~PMemLibrary();

    // Whether the library was loaded and its five functions bound.
    bool loaded() const { return functions_.isInitialized != nullptr; }
    int isInitialized() const;
    int open() const;
    int close() const;
    int read(void* buffer, unsigned long address, long count) const;
    unsigned long search(char const* anchor, unsigned long start, unsigned long end,
                         long step) const;
    // PMemSourceReport's text.
    std::string sourceReport() const;
    // PMemTableCut: true, with its figures, when the table served is cut.
    bool tableCut(TableCutFigures& figures) const;
    // `n` bytes read at `address`; `status` is PMemRead's result.
    std::vector<uint8_t> bytes(unsigned long address, size_t n, int& status) const;

private:
    pmem::BoundLibrary library_;
    pmem::Functions functions_;  // all null unless every one was bound
};

// PMemRead of expected.size() bytes at `address` succeeds and gives exactly
// `expected`.
::testing::AssertionResult readsBytes(PMemLibrary const& pm, unsigned long address,
                                      std::vector<uint8_t> const& expected);

// Children of a test, from the shared test support.
using smbiostest::kChildFailed;
using smbiostest::kChildHung;
using smbiostest::kChildSeconds;
using smbiostest::kNoUnprivilegedUser;
using smbiostest::runAsUnprivilegedUser;
using smbiostest::runInChild;

// What isInitializedInChild returns when the library could not be loaded.
constexpr int kNotLoaded = 3;

// PMemIsInitialized (1 or 0) of the library loaded afresh in a child
// process with this process's environment; kNotLoaded, kChildHung or
// kChildFailed otherwise.
int isInitializedInChild();

// Every test starts with no PMEM_SOURCE and no PMEM_IMAGE, an empty folder
// as the sysfs folder and a memory device that does not exist, so that this
// machine's own tables never take part; it adds what it needs with env()
// and then calls load().
class PMemTest : public ::testing::Test {
protected:
    void env(std::string const& name, char const* value);
    void env(std::string const& name, std::string const& value) { env(name, value.c_str()); }
    // Writes a file into the test's folder; returns its path.
    std::string file(std::string const& name, std::vector<uint8_t> const& bytes);
    // A folder holding smbios_entry_point and DMI (each only when given).
    std::string sysfsFolder(std::vector<uint8_t> const* entryPoint,
                            std::vector<uint8_t> const* table);
    // The memory image (PMEM_IMAGE) of a machine: the BIOS area with
    // `entryPoint` at kAnchor, and `table` at kTableAddress.
    void serveImage(std::vector<uint8_t> const& entryPoint, std::vector<uint8_t> const& table);
    // serveImage of the sample table under a 2.7 "_SM_" entry point; the
    // entry point.
    std::vector<uint8_t> serveSampleImage();
    PMemLibrary& load();

    smbiostest::TempDir work_;
    smbiostest::TempDir emptySysfs_;
    smbiostest::ScopedEnv source_{"PMEM_SOURCE", nullptr};
    smbiostest::ScopedEnv image_{"PMEM_IMAGE", nullptr};
    smbiostest::ScopedEnv sysfs_{"PMEM_SYSFS_DIR", emptySysfs_.path()};
    smbiostest::ScopedEnv devmem_{"PMEM_DEVMEM_FILE", work_.file("no-such-device")};
    std::vector<std::unique_ptr<smbiostest::ScopedEnv>> envs_;
    std::unique_ptr<PMemLibrary> library_;
};

// "0x" and the address in hexadecimal.
std::string hex(unsigned long address);
// An item of PMEM_IMAGE: "path@BASE".
std::string imageItem(std::string const& path, unsigned long base);

// Addresses the tests use.
constexpr unsigned long kBiosArea = 0xF0000;
constexpr unsigned long kAnchor = 0xF5A30;  // 16-byte aligned, inside the BIOS area
constexpr unsigned long kTableAddress = 0x7F6E0000;

// The 64 KiB area 0xF0000-0xFFFFF, zero but for `entry` at `anchor`.
std::vector<uint8_t> biosArea(std::vector<uint8_t> const& entry, unsigned long anchor);
// A small structure table: four structures out of handle order, then the
// end-of-table structure.
std::vector<uint8_t> sampleTable();
// A "_SM_" entry point for the table at `address`.
std::vector<uint8_t> smEntryPoint(std::vector<uint8_t> const& table, uint8_t major, uint8_t minor,
                                  uint32_t address);
// The 24-byte "_SM3_" entry point, its checksum set.
using smbiostest::sm3EntryPoint;

using smbiostest::byteSum;
using smbiostest::dword;
using smbiostest::word;
void putDword(std::vector<uint8_t>& bytes, size_t at, uint32_t value);
void putQword(std::vector<uint8_t>& bytes, size_t at, uint64_t value);
// Sets bytes[at] so that the 8-bit sum of bytes[begin, end) is zero.
void setChecksum(std::vector<uint8_t>& bytes, size_t at, size_t begin, size_t end);
std::vector<uint8_t> slice(std::vector<uint8_t> const& bytes, size_t begin, size_t end);

// What one acquisition of the SMBIOS table gave.
struct Acquired {
    std::string failure;  // why it could not be run; "" when it ran
    unsigned int major = 0;
    unsigned int minor = 0;
    unsigned int revision = 0;
    // One line a structure, in the table's order: "type handle hex-bytes".
    std::vector<std::string> structures;
};

// The structures of a table, one line each as in Acquired.
std::vector<std::string> describeStructures(SD::SmBios const& smbios);

// Runs the plug-in's acquisition (an SD::SmBios) in a child process whose
// environment has these variables set in addition, so that one test can
// compare several acquisitions (the table is acquired once per process).
Acquired acquireInChild(std::vector<std::pair<std::string, std::string>> const& environment);

}  // namespace pmemtest
