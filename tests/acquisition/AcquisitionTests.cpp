// The one acquisition of the SMBIOS table per process: the override dump
// file first, else the entry point and table in physical memory through
// libpmem.so (here a stand-in whose fake memory each test maps). Every test
// runs in a process of its own, because the table is acquired once per
// process.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "TestSupport.h"
#include "smbios/PMem.h"
#include "smbios/SmBios.h"
#include "smbios/SmBiosInitializer.h"

using smbiostest::LogCapture;
using smbiostest::ScopedEnv;
using smbiostest::Structure;
using smbiostest::TableBuilder;
using smbiostest::TempDir;

namespace {

std::string const kFakeFull = std::string(FAKE_PMEM_DIR) + "/full/";
std::string const kFakeNoSearch = std::string(FAKE_PMEM_DIR) + "/nosearch/";

unsigned long const kSmAnchor = 0xF5A30;  // 16-byte aligned, inside the BIOS area
unsigned long const kTableAddress = 0x7F6E0000;

// The stand-in library, loaded from the same file the plug-in loads, so that
// both see the same fake memory.
class FakePMem {
public:
    explicit FakePMem(std::string const& dir) {
        handle_ = dlopen((dir + "libpmem.so").c_str(), RTLD_NOW | RTLD_LOCAL);
        if (handle_ == nullptr) {
            ADD_FAILURE() << "cannot load the fake physical-memory library: " << dlerror();
            return;
        }
        reset_ = fn<void (*)()>("FakePMemReset");
        map_ = fn<int (*)(unsigned long, unsigned char const*, unsigned long)>("FakePMemMap");
        setInitialized_ = fn<void (*)(int)>("FakePMemSetInitialized");
        setOpenResult_ = fn<void (*)(int)>("FakePMemSetOpenResult");
        failRead_ = fn<void (*)(int)>("FakePMemFailRead");
        setReadFailure_ = fn<void (*)(int)>("FakePMemSetReadFailure");
        peekAfterReadAt_ = fn<void (*)(unsigned long)>("FakePMemPeekAfterReadAt");
        peeked_ = fn<void (*)(long*, int*, int*)>("FakePMemPeeked");
        setOpenDelay_ = fn<void (*)(int)>("FakePMemSetOpenDelay");
        counts_ = fn<void (*)(int*, int*, int*, int*)>("FakePMemCounts");
        reset_();
    }
    ~FakePMem() {
        if (handle_ != nullptr) {
            dlclose(handle_);
        }
    }

    void map(unsigned long base, std::vector<uint8_t> const& bytes) {
        EXPECT_EQ(map_(base, bytes.data(), static_cast<unsigned long>(bytes.size())), 1)
            << "the region at " << base << " could not be placed";
    }
    void setInitialized(int value) { setInitialized_(value); }
    void setOpenResult(int value) { setOpenResult_(value); }
    void failRead(int nth) { failRead_(nth); }
    void setReadFailure(int code) { setReadFailure_(code); }
    void peekAfterReadAt(unsigned long address) { peekAfterReadAt_(address); }
    // The count of the read at the peeked address and the two bytes after it
    // in the caller's buffer (-1 each before such a read).
    void peeked(long& count, int& tail0, int& tail1) const { peeked_(&count, &tail0, &tail1); }
    void setOpenDelay(int ms) { setOpenDelay_(ms); }
    int opens() const { return count(0); }
    int closes() const { return count(1); }
    int reads() const { return count(2); }

private:
    template <typename Fn>
    Fn fn(char const* name) {
        return reinterpret_cast<Fn>(dlsym(handle_, name));
    }
    int count(int which) const {
        int values[4] = {};
        counts_(&values[0], &values[1], &values[2], &values[3]);
        return values[which];
    }

    void* handle_ = nullptr;
    void (*reset_)() = nullptr;
    int (*map_)(unsigned long, unsigned char const*, unsigned long) = nullptr;
    void (*setInitialized_)(int) = nullptr;
    void (*setOpenResult_)(int) = nullptr;
    void (*failRead_)(int) = nullptr;
    void (*setReadFailure_)(int) = nullptr;
    void (*peekAfterReadAt_)(unsigned long) = nullptr;
    void (*peeked_)(long*, int*, int*) = nullptr;
    void (*setOpenDelay_)(int) = nullptr;
    void (*counts_)(int*, int*, int*, int*) = nullptr;
};

// Structures out of handle order, two with the same handle, and the
// end-of-table structure before the last one.
std::vector<uint8_t> sampleTable() {
    TableBuilder table;
    table.add(Structure(1, 0x0100).str("Corvane").str("RS-7400").str("1.0").str("SN0001"));
    table.add(Structure(0, 0x0000).str("Corvane").str("CVE1.05").word(0xE800).str("01/02/2026"));
    table.add(Structure(4, 0x0100).str("CPU1").byte(3).byte(0xB3));
    table.endOfTable(0x0180);
    table.add(Structure(17, 0x0200).word(0x1000).str("DIMM_A1"));
    return table.build();
}

std::vector<uint8_t> smEntryPoint(std::vector<uint8_t> const& table, uint8_t major, uint8_t minor) {
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
    return smbiosdump::makeSmEntryPoint(major, minor, static_cast<uint16_t>(table.size()),
                                        kTableAddress, stats.count, stats.maxSize);
}

// The whole BIOS area (0xF0000-0xFFFFF), zero but for the entry point at
// the anchor: the acquisition reads 64 bytes there, more than the entry
// point holds.
std::vector<uint8_t> biosAreaWith(std::vector<uint8_t> const& entry, unsigned long anchor) {
    std::vector<uint8_t> area(0x10000, 0);
    std::copy(entry.begin(), entry.end(), area.begin() + static_cast<long>(anchor - 0xF0000));
    return area;
}

std::vector<unsigned int> typesOf(SD::SmBios const& smbios) {
    std::vector<unsigned int> types;
    for (SD::SmBios::Table const& t : smbios.getTables()) {
        types.push_back(t.getType());
    }
    return types;
}

// The types of the sample table in handle order, the end-of-table structure
// at its handle's place.
std::vector<unsigned int> const kSampleTypes = {0, 1, 4, 127, 17};

// Each test starts with no acquisition made in its process, an empty data
// directory (no override file) and the code directory it names.
class Acquisition : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_EQ(SD::SMBIOS_CLASS::_smbios, nullptr)
            << "the SMBIOS table is acquired once per process: run each test in a process of "
               "its own (ctest does)";
    }
    void useCodeDir(std::string const& dir) {
        codeDir_.reset(new ScopedEnv("KESTREL_CODE_DIR", dir));
    }

    // The stand-in library's fake memory, loaded (and emptied) on first use;
    // the code directory then names the library's folder.
    FakePMem& memory() {
        if (!fake_) {
            fake_.reset(new FakePMem(kFakeFull));
            useCodeDir(kFakeFull);
        }
        return *fake_;
    }
    // Fake memory holding `region` at `address` and `table` at kTableAddress.
    FakePMem& machineWith(unsigned long address, std::vector<uint8_t> const& region,
                          std::vector<uint8_t> const& table) {
        FakePMem& fake = memory();
        fake.map(address, region);
        fake.map(kTableAddress, table);
        return fake;
    }
    // A machine whose BIOS area holds `entry` at kSmAnchor, the sample table
    // at kTableAddress.
    FakePMem& biosMachine(std::vector<uint8_t> const& entry) {
        return machineWith(0xF0000, biosAreaWith(entry, kSmAnchor), table_);
    }
    // A machine whose BIOS area holds a valid 2.<minor> "_SM_" entry point
    // of the sample table.
    FakePMem& smMachine(uint8_t minor) { return biosMachine(smEntryPoint(table_, 2, minor)); }
    // The legacy "_DMI_" entry point of the sample table (5 structures at
    // `address`), BCD revision `bcd`.
    std::vector<uint8_t> legacyEntry(uint8_t bcd, uint32_t address) const {
        return smbiosdump::makeDmiEntryPoint(bcd, static_cast<uint16_t>(table_.size()), address, 5);
    }

    // The override file of the sample table with `entry` as its header.
    void writeOverride(std::vector<uint8_t> const& entry) {
        smbiostest::writeOverrideDir(dataDir_.path(), entry, table_);
    }
    // An override file of the text `text`.
    void writeOverrideText(std::string const& text) {
        writeOverride(smEntryPoint(table_, 2, 7));
        smbiostest::writeFile(overridePath(), text);
    }
    std::string overridePath() const { return dataDir_.path() + "/SmBiosOverride/smbios.txt"; }

    // Starts capturing the log, then acquires the table.
    SD::SmBios acquire() {
        captureLog();
        return SD::SmBios();
    }
    void captureLog() { log_.reset(new LogCapture); }
    void expectLogged(std::string const& line) const {
        EXPECT_TRUE(log_->contains(line)) << log_->dump();
    }
    void expectNotLogged(std::string const& line) const {
        EXPECT_FALSE(log_->contains(line)) << log_->dump();
    }
    // An acquisition that came out empty, with `line` in its log.
    void expectEmpty(SD::SmBios const& smbios, std::string const& line) const {
        EXPECT_TRUE(smbios.getTables().empty());
        expectLogged(line);
    }
    // An override file with `entry` as its header that is rejected with
    // `line` in the log.
    void expectOverrideRejected(std::vector<uint8_t> const& entry, std::string const& line) {
        writeOverride(entry);
        expectEmpty(acquire(), line);
    }
    void expectAllLogged(std::vector<std::string> const& lines) const {
        for (std::string const& line : lines) {
            expectLogged(line);
        }
    }
    // An override file that gives no table leaves the acquisition to
    // memory, which holds a 2.<minor> table.
    static void expectMemoryTable(SD::SmBios const& smbios, FakePMem const& fake, int minor) {
        EXPECT_EQ(smbios.getMinorVersion(), minor);
        EXPECT_EQ(smbios.getTables().size(), 5u);
        EXPECT_EQ(fake.opens(), 1);
    }
    // The sample table acquired through a legacy entry point of BCD revision
    // 0x24, with `lines` in the log.
    void expectLegacyTable(SD::SmBios const& smbios, std::vector<std::string> const& lines) const {
        expectVersion(smbios, 2, 4, 0);
        EXPECT_EQ(smbios.getTables().size(), 5u);
        expectAllLogged(lines);
    }
    static void expectVersion(SD::SmBios const& smbios, int major, int minor, int revision) {
        EXPECT_EQ(smbios.getMajorVersion(), major);
        EXPECT_EQ(smbios.getMinorVersion(), minor);
        EXPECT_EQ(smbios.getRevision(), revision);
    }

    std::vector<uint8_t> const table_ = sampleTable();
    TempDir dataDir_;
    ScopedEnv dataEnv_{"KESTREL_DATA_DIR", dataDir_.path() + "/"};
    std::unique_ptr<ScopedEnv> codeDir_;
    std::unique_ptr<FakePMem> fake_;
    std::unique_ptr<LogCapture> log_;
};

}  // namespace

TEST_F(Acquisition, NoOverrideAndNoLibraryGivesEmptyTableAndLogsLibraryMessage) {
    TempDir emptyCodeDir;
    useCodeDir(emptyCodeDir.path() + "/");
    std::string const library = emptyCodeDir.path() + "/libpmem.so";
    SD::SmBios const smbios = acquire();
    expectEmpty(smbios, "Constructor Exception=PMEM: could not load library '" + library + "'.");
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_EQ(smbios.getMinorVersion(), 0);
    expectLogged(" Type=");
    expectLogged("Constructor could not load library '" + library + "' - exception return");
    expectLogged("importSmBios() file not found, using machine SMBios");
}

TEST_F(Acquisition, BrokenLibraryFileIsReportedAsNotLoadable) {
    TempDir codeDir;
    smbiostest::writeFile(codeDir.file("libpmem.so"), "this is not a shared library\n");
    useCodeDir(codeDir.path() + "/");
    expectEmpty(acquire(), "PMEM: could not load library '" + codeDir.path() + "/libpmem.so'.");
}

TEST_F(Acquisition, LibraryThatDoesNotInitializeIsUnloadedAndReported) {
    // No handle of the test's own on the library: its unload must be seen.
    std::string const library = kFakeFull + "libpmem.so";
    ASSERT_EQ(dlopen(library.c_str(), RTLD_NOW | RTLD_NOLOAD), nullptr)
        << "the library is loaded before the test";
    ScopedEnv const notInitialized("FAKE_PMEM_INITIALIZED", "0");
    useCodeDir(kFakeFull);
    expectEmpty(acquire(),
                "Constructor Exception=PMEM: library '" + library + "' did not initialize.");
    expectLogged("Constructor library '" + library + "' did not initialize - exception return");
    void* const still = dlopen(library.c_str(), RTLD_NOW | RTLD_NOLOAD);
    EXPECT_EQ(still, nullptr) << "the library stayed loaded";
    if (still != nullptr) {
        dlclose(still);
    }
}

TEST_F(Acquisition, LibraryLackingPMemSearchCannotExportAllSymbols) {
    useCodeDir(kFakeNoSearch);
    expectEmpty(acquire(), "Constructor Exception=PMEM: could not export all symbols.");
    expectLogged("Constructor could not export all symbols - exception return");
}

TEST_F(Acquisition, PMemConstructionErrorsAreRuntimeErrorsWithTheLibraryMessage) {
    TempDir emptyCodeDir;
    useCodeDir(emptyCodeDir.path() + "/");
    try {
        SD::PMem pmem;
        FAIL() << "a missing library must throw";
    } catch (std::runtime_error const& e) {
        EXPECT_EQ(std::string(e.what()),
                  "PMEM: could not load library '" + emptyCodeDir.path() + "/libpmem.so'.");
    }
}

TEST_F(Acquisition, PMemReadPassesTheLibraryResultThroughUnchanged) {
    memory().map(0x1000, {1, 2, 3, 4});
    SD::PMem pmem;
    ASSERT_TRUE(pmem.open());
    unsigned char buffer[4] = {};
    EXPECT_EQ(pmem.read(buffer, 0x1000, 4), 0);
    EXPECT_EQ(buffer[3], 4);
    EXPECT_EQ(pmem.read(buffer, 0x2000, 4), -1);
    // Not mapped to a failure value of its own: the library's code arrives.
    memory().setReadFailure(-7);
    EXPECT_EQ(pmem.read(buffer, 0x2000, 4), -7);
    memory().setReadFailure(3);
    EXPECT_EQ(pmem.read(buffer, 0x2000, 4), 3);
    EXPECT_EQ(pmem.search("\x03\x04", 0x1000, 0x1010, 1), 0x1002ul);
    EXPECT_EQ(pmem.search("\x09", 0x1000, 0x1010, 1), 0ul);
    EXPECT_TRUE(pmem.close());
}

TEST_F(Acquisition, SmEntryPointInBiosAreaGivesVersionAndSortedTables) {
    FakePMem const& fake = smMachine(7);
    SD::SmBios const smbios = acquire();
    expectVersion(smbios, 2, 7, 0);
    ASSERT_EQ(smbios.getTables().size(), 5u);
    std::vector<unsigned int> handles;
    for (SD::SmBios::Table const& t : smbios.getTables()) {
        handles.push_back(t.getHandle());
    }
    EXPECT_EQ(handles, (std::vector<unsigned int>{0x0000, 0x0100, 0x0100, 0x0180, 0x0200}));
    expectLogged("Constructor found _SM_ header at " + std::to_string(kSmAnchor));
    expectLogged("Constructor success");
    EXPECT_EQ(fake.opens(), 1);
    EXPECT_EQ(fake.closes(), 1);
}

TEST_F(Acquisition, DuplicateHandlesAreBothKept) {
    smMachine(7);
    SD::SmBios const smbios;
    std::vector<unsigned int> typesAt0100;
    for (SD::SmBios::Table const& t : smbios.getTables()) {
        if (t.getHandle() == 0x0100) {
            typesAt0100.push_back(t.getType());
        }
    }
    std::sort(typesAt0100.begin(), typesAt0100.end());
    EXPECT_EQ(typesAt0100, (std::vector<unsigned int>{1, 4}));
}

TEST_F(Acquisition, EndOfTableStructureStandsAtItsHandlesPlace) {
    smMachine(7);
    SD::SmBios const smbios;
    ASSERT_EQ(smbios.getTables().size(), 5u);
    EXPECT_EQ(smbios.getTables()[3].getType(), 127);
    EXPECT_EQ(smbios.getTables()[4].getType(), 17);
}

TEST_F(Acquisition, TableReadOfLengthLGivesTheParserTwoMoreZeroBytes) {
    // The last structure's string set has no terminator in memory: only the
    // two zero bytes after the table end it.
    TableBuilder builder;
    builder.add(Structure(1, 0x0001).str("Corvane"));
    builder.add(Structure(2, 0x0002).str("Board").noTerminator());
    std::vector<uint8_t> const table = builder.build();
    std::vector<uint8_t> memoryBytes = table;
    memoryBytes.push_back(0xEE);  // what follows the table in memory is not read
    memoryBytes.push_back(0xEE);
    FakePMem& fake =
        machineWith(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor), memoryBytes);
    fake.peekAfterReadAt(kTableAddress);
    SD::SmBios smbios;
    // What the acquisition hands the parser: L bytes read from memory into a
    // buffer of L + 2 whose last two bytes are zero (the sanitizer build
    // reports a buffer of only L bytes).
    long count = 0;
    int tail0 = 0;
    int tail1 = 0;
    fake.peeked(count, tail0, tail1);
    EXPECT_EQ(count, static_cast<long>(table.size()));
    EXPECT_EQ(tail0, 0);
    EXPECT_EQ(tail1, 0);
    ASSERT_EQ(smbios.getTables().size(), 2u);
    SD::SmBios::Table const& board = smbios.getTables()[1];
    EXPECT_EQ(std::string(board.getString(1)), "Board");
    EXPECT_EQ(board.getStrCount(), 1u);
    std::vector<unsigned char> const& data = board.getData();
    ASSERT_GE(data.size(), 2u);
    EXPECT_EQ(data[data.size() - 1], 0);
    EXPECT_EQ(data[data.size() - 2], 0);
}

TEST_F(Acquisition, SmEntryPointWithLengthZeroPassesTheChecksum) {
    std::vector<uint8_t> entry = smEntryPoint(table_, 2, 5);
    entry[5] = 0;      // entry-point length 0: nothing is summed
    entry[4] ^= 0x5A;  // and the checksum byte no longer matches
    biosMachine(entry);
    SD::SmBios const smbios = acquire();
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_EQ(smbios.getMinorVersion(), 5);
    expectNotLogged("Constructor checksum 1 failed");
}

TEST_F(Acquisition, SmEntryPointWithBadChecksumLeavesTableEmpty) {
    std::vector<uint8_t> entry = smEntryPoint(table_, 2, 7);
    entry[4] ^= 0x01;
    FakePMem const& fake = biosMachine(entry);
    SD::SmBios const smbios = acquire();
    expectEmpty(smbios, "Constructor checksum 1 failed");
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_EQ(fake.closes(), 1);
}

TEST_F(Acquisition, OnlyLegacyDmiEntryPointGivesBcdVersion) {
    machineWith(0x9FC00, legacyEntry(0x24, kTableAddress), table_);
    expectLegacyTable(acquire(), {"Constructo found _DMI_ header at 9fc00", "Constructor success"});
}

TEST_F(Acquisition, SmAnchorBelowBiosAreaIsFoundThroughItsLegacyPart) {
    // The "_SM_" anchor at 0xE0000 is outside the first search; the legacy
    // search finds the "_DMI_" part 16 bytes into it and uses its fields:
    // its BCD revision (2.6) wins over the 2.x header's 2.7.
    std::vector<uint8_t> entry = smEntryPoint(table_, 2, 7);
    entry[0x1E] = 0x26;
    unsigned int sum = 0;
    for (size_t i = 0x10; i < 0x1F; ++i) {
        if (i != 0x15) {
            sum += entry[i];
        }
    }
    entry[0x15] = static_cast<uint8_t>(0x100 - (sum & 0xFF));
    machineWith(0xE0000, entry, table_);
    SD::SmBios const smbios = acquire();
    expectNotLogged("Constructor found _SM_ header at");
    expectLogged("Constructo found _DMI_ header at e0010");
    EXPECT_EQ(smbios.getMajorVersion(), 2);
    EXPECT_EQ(smbios.getMinorVersion(), 6);
    EXPECT_EQ(smbios.getTables().size(), 5u);
}

TEST_F(Acquisition, LegacyEntryPointWithBadChecksumLeavesTableEmpty) {
    std::vector<uint8_t> entry = legacyEntry(0x24, kTableAddress);
    entry[14] = 0x25;
    machineWith(0x9FC00, entry, table_);
    expectEmpty(acquire(), "Constructor checksum 2 failed");
}

TEST_F(Acquisition, NoAnchorInMemoryIsASignatureFailure) {
    memory().map(0xF0000, std::vector<uint8_t>(0x10000, 0x00));
    expectEmpty(acquire(), "Constructor _SM_ or _DMI_ signature failed");
    EXPECT_EQ(memory().closes(), 1);
}

TEST_F(Acquisition, OpenFailureLeavesTableEmpty) {
    memory().setOpenResult(0);
    expectEmpty(acquire(), "Constructor pmem.open failed");
}

// Each read the acquisition makes fails on its own: the entry point (read
// 1), the legacy entry point (read 2) and the table (read 3).

TEST_F(Acquisition, EntryPointReadFailureIsRead1) {
    smMachine(7).failRead(1);
    expectEmpty(acquire(), "Constructor pmem.read 1 failed");
    EXPECT_EQ(memory().closes(), 1);
}

TEST_F(Acquisition, LegacyEntryPointReadFailureIsRead2) {
    machineWith(0x9FC00, legacyEntry(0x24, kTableAddress), table_).failRead(1);
    expectEmpty(acquire(), "Constructor pmem.read 2 failed");
}

TEST_F(Acquisition, TableReadFailureIsRead3) {
    // The table is not mapped: reading it fails.
    memory().map(0xF0000, biosAreaWith(smEntryPoint(table_, 2, 7), kSmAnchor));
    SD::SmBios const smbios = acquire();
    expectEmpty(smbios, "Constructor pmem.read 3 failed");
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_EQ(memory().closes(), 1);
}

TEST_F(Acquisition, FailedAcquisitionIsNotRetried) {
    memory().setOpenResult(0);
    SD::SmBios const first;
    SD::SmBios const second;
    EXPECT_TRUE(second.getTables().empty());
    EXPECT_EQ(memory().opens(), 1);
}

TEST_F(Acquisition, LaterTablesAreCopiesOfTheFirstAcquisition) {
    FakePMem const& fake = smMachine(7);
    SD::SmBios const first;
    SD::SmBios const second;
    EXPECT_EQ(typesOf(first), typesOf(second));
    EXPECT_EQ(second.getMinorVersion(), 7);
    EXPECT_EQ(fake.opens(), 1);
    EXPECT_EQ(fake.reads(), 2);
}

TEST_F(Acquisition, FirstAcquisitionFromSeveralThreadsHappensExactlyOnce) {
    smMachine(7).setOpenDelay(50);  // widens the window in which the threads race
    unsigned int const threadCount = 8;
    std::vector<std::vector<unsigned int>> seen(threadCount);
    std::vector<std::thread> threads;
    for (unsigned int i = 0; i < threadCount; ++i) {
        threads.emplace_back([&seen, i]() { seen[i] = typesOf(SD::SmBios()); });
    }
    for (std::thread& t : threads) {
        t.join();
    }
    EXPECT_EQ(memory().opens(), 1);
    for (unsigned int i = 0; i < threadCount; ++i) {
        EXPECT_EQ(seen[i], kSampleTypes) << "thread " << i;
    }
}

// The override dump file.

TEST_F(Acquisition, OverrideFileIsUsedInsteadOfMemory) {
    writeOverride(smEntryPoint(table_, 2, 8));
    FakePMem const& fake = memory();
    SD::SmBios const smbios = acquire();
    EXPECT_EQ(smbios.getMajorVersion(), 2);
    EXPECT_EQ(smbios.getMinorVersion(), 8);
    EXPECT_EQ(typesOf(smbios), kSampleTypes);
    expectAllLogged(
        {"Constructor checking for " + overridePath() + " import smbios file",
         "Constructor using " + overridePath() + " instead of this machine's SmBios Tables",
         "Constructor found _SM_ header length=31", "Constructor checksum 1 good",
         "Constructor version good", "Constructor going to SmBios.getTables()",
         "Constructor success"});
    EXPECT_EQ(fake.opens(), 0);
}

TEST_F(Acquisition, OverrideFileWithLegacyHeaderBcd24GivesVersion24Revision0) {
    writeOverride(legacyEntry(0x24, 0xF0000));
    expectLegacyTable(acquire(),
                      {"Constructor found _DMI_ header length=0xf", "Constructor checksum 2 good"});
}

TEST_F(Acquisition, OverrideFileWithBadChecksumEmptiesTableWithoutConsultingMemory) {
    std::vector<uint8_t> entry = smEntryPoint(table_, 2, 7);
    entry[4] ^= 0x10;
    writeOverride(entry);
    FakePMem const& fake = smMachine(7);
    SD::SmBios const smbios = acquire();
    expectEmpty(smbios, "Constructor checksum 1 failed");
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_EQ(fake.opens(), 0);
}

TEST_F(Acquisition, OverrideFileWithLegacyBadChecksumFailsChecksum2) {
    std::vector<uint8_t> entry = legacyEntry(0x27, 0xF0000);
    entry[6] ^= 0x01;
    expectOverrideRejected(entry, "Constructor checksum 2 failed");
}

TEST_F(Acquisition, OverrideFileWithUnknownSignatureEmptiesTable) {
    std::vector<uint8_t> entry = smEntryPoint(table_, 2, 7);
    entry[1] = 'X';
    expectOverrideRejected(entry, "Constructor _SM_ or _DMI_ signature failed");
}

TEST_F(Acquisition, OverrideFileWithShortSmHeaderIsASignatureFailure) {
    expectOverrideRejected({'_', 'S', 'M', '_', 0x00, 0x1F},
                           "Constructor _SM_ or _DMI_ signature failed");
}

TEST_F(Acquisition, OverrideFileWithShortLegacyHeaderFailsChecksum2) {
    expectOverrideRejected({'_', 'D', 'M', 'I', '_', 0x00}, "Constructor checksum 2 failed");
}

TEST_F(Acquisition, OverrideFileWithSmLengthBeyondHeaderFailsChecksum1) {
    std::vector<uint8_t> entry = smEntryPoint(table_, 2, 7);
    entry.resize(16);  // byte 5 still says 31
    expectOverrideRejected(entry, "Constructor checksum 1 failed");
}

TEST_F(Acquisition, OverrideFileWithBadHeaderTokensLogsReadHeadCode) {
    writeOverrideText("<SHOWSMBIOS>\n<HEADER>\n5F534D5F\n</EPHEADER>\n0000\n</SHOWSMBIOS>\n");
    expectEmpty(acquire(), "Constructor readHead() return code 8");
}

TEST_F(Acquisition, OverrideFileWithoutClosingTagLogsReadTablesCode) {
    std::string const text = smbiosdump::formatOverride(smEntryPoint(table_, 2, 7), table_);
    writeOverrideText(text.substr(0, text.find("</SHOWSMBIOS>")) + "<END>\n");
    SD::SmBios const smbios = acquire();
    expectEmpty(smbios, "Constructor readTables() return code 55");
    EXPECT_EQ(smbios.getMajorVersion(), 0);
}

TEST_F(Acquisition, OverrideFileWithOnlyHeaderFallsBackToMemory) {
    std::string const text = smbiosdump::formatOverride(smEntryPoint(table_, 2, 7), table_);
    writeOverrideText(text.substr(0, text.find("</EPHEADER>") + std::string("</EPHEADER>").size()) +
                      "\n");
    FakePMem const& fake = smMachine(6);
    expectMemoryTable(acquire(), fake, 6);
    expectLogged("importSmBios() file ended before tables read, no tables made");
}

TEST_F(Acquisition, MissingOverrideFileFallsBackToMemory) {
    FakePMem const& fake = smMachine(7);
    SD::SmBios const smbios = acquire();
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_EQ(fake.opens(), 1);
    expectLogged("importSmBios() file not found, using machine SMBios");
}

TEST_F(Acquisition, OverrideFileThatIsAFifoFallsBackToMemoryWithoutWaiting) {
    std::string const folder = dataDir_.path() + "/SmBiosOverride";
    ASSERT_EQ(mkdir(folder.c_str(), 0755), 0);
    ASSERT_EQ(mkfifo(overridePath().c_str(), 0600), 0);
    FakePMem const& fake = smMachine(7);
    captureLog();
    std::unique_ptr<SD::SmBios> smbios;
    EXPECT_FALSE(smbiostest::waitedOnFifo(overridePath(), [&smbios] {
        smbios.reset(new SD::SmBios());
    })) << "the acquisition waited for a writer on the override FIFO";
    expectLogged("importSmBios() file not found, using machine SMBios");
    expectMemoryTable(*smbios, fake, 7);
    struct stat info;
    ASSERT_EQ(lstat(overridePath().c_str(), &info), 0);
    EXPECT_TRUE(S_ISFIFO(info.st_mode)) << "the override FIFO was replaced";
}

TEST_F(Acquisition, OverrideFileThatIsAFolderFallsBackToMemory) {
    std::string const folder = dataDir_.path() + "/SmBiosOverride";
    ASSERT_EQ(mkdir(folder.c_str(), 0755), 0);
    ASSERT_EQ(mkdir(overridePath().c_str(), 0755), 0);
    FakePMem const& fake = smMachine(6);
    SD::SmBios const smbios = acquire();
    expectLogged("importSmBios() file not found, using machine SMBios");
    expectMemoryTable(smbios, fake, 6);
}

TEST_F(Acquisition, InitializerDestructorLogsItsLine) {
    TempDir emptyCodeDir;
    useCodeDir(emptyCodeDir.path() + "/");
    captureLog();
    {
        SD::SmBiosInitializer initializer;
        EXPECT_TRUE(initializer.getTables().empty());
    }
    expectLogged("Destructor entry-return");
}
