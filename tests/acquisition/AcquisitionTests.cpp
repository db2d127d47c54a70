// The one acquisition of the SMBIOS table per process: the override dump
// file first, else the entry point and table in physical memory through
// libpmem.so (here a stand-in whose fake memory each test maps). Every test
// runs in a process of its own, because the table is acquired once per
// process.
#include <dlfcn.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <future>
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

// Acquires the table on a thread of its own. When the acquisition has not
// ended within 10 s it is taken to wait on the FIFO `fifo` for a writer: one
// opens the FIFO and goes at once (again every 100 ms until the acquisition
// ends), which releases the reader, and `waited` is set, so that the test
// fails instead of hanging.
SD::SmBios acquireReleasingFifo(std::string const& fifo, bool& waited) {
    std::future<SD::SmBios> acquiring = std::async(std::launch::async, [] { return SD::SmBios(); });
    waited = false;
    std::chrono::milliseconds patience(10000);
    while (acquiring.wait_for(patience) != std::future_status::ready) {
        waited = true;
        patience = std::chrono::milliseconds(100);
        int const writer = open(fifo.c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC);
        if (writer >= 0) {
            close(writer);
        }
    }
    return acquiring.get();
}

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

    TempDir dataDir_;
    ScopedEnv dataEnv_{"KESTREL_DATA_DIR", dataDir_.path() + "/"};
    std::unique_ptr<ScopedEnv> codeDir_;
};

}  // namespace

TEST_F(Acquisition, NoOverrideAndNoLibraryGivesEmptyTableAndLogsLibraryMessage) {
    TempDir emptyCodeDir;
    useCodeDir(emptyCodeDir.path() + "/");
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_EQ(smbios.getMinorVersion(), 0);
    std::string const expected = "Constructor Exception=PMEM: could not load library '" +
                                 emptyCodeDir.path() + "/libpmem.so'.";
    EXPECT_TRUE(log.contains(expected)) << log.dump();
    EXPECT_TRUE(log.contains(" Type=")) << log.dump();
    EXPECT_TRUE(log.contains("Constructor could not load library '" + emptyCodeDir.path() +
                             "/libpmem.so' - exception return"))
        << log.dump();
    EXPECT_TRUE(log.contains("importSmBios() file not found, using machine SMBios")) << log.dump();
}

TEST_F(Acquisition, BrokenLibraryFileIsReportedAsNotLoadable) {
    TempDir codeDir;
    smbiostest::writeFile(codeDir.file("libpmem.so"), "this is not a shared library\n");
    useCodeDir(codeDir.path() + "/");
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("PMEM: could not load library '" + codeDir.path() + "/libpmem.so'."))
        << log.dump();
}

TEST_F(Acquisition, LibraryThatDoesNotInitializeIsUnloadedAndReported) {
    // No handle of the test's own on the library: its unload must be seen.
    std::string const library = kFakeFull + "libpmem.so";
    ASSERT_EQ(dlopen(library.c_str(), RTLD_NOW | RTLD_NOLOAD), nullptr)
        << "the library is loaded before the test";
    ScopedEnv const notInitialized("FAKE_PMEM_INITIALIZED", "0");
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor Exception=PMEM: library '" + kFakeFull +
                             "libpmem.so' did not initialize."))
        << log.dump();
    EXPECT_TRUE(log.contains("Constructor library '" + kFakeFull +
                             "libpmem.so' did not initialize - exception return"))
        << log.dump();
    void* const still = dlopen(library.c_str(), RTLD_NOW | RTLD_NOLOAD);
    EXPECT_EQ(still, nullptr) << "the library stayed loaded";
    if (still != nullptr) {
        dlclose(still);
    }
}

TEST_F(Acquisition, LibraryLackingPMemSearchCannotExportAllSymbols) {
    useCodeDir(kFakeNoSearch);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor Exception=PMEM: could not export all symbols."))
        << log.dump();
    EXPECT_TRUE(log.contains("Constructor could not export all symbols - exception return"))
        << log.dump();
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
    FakePMem fake(kFakeFull);
    fake.map(0x1000, {1, 2, 3, 4});
    useCodeDir(kFakeFull);
    SD::PMem pmem;
    ASSERT_TRUE(pmem.open());
    unsigned char buffer[4] = {};
    EXPECT_EQ(pmem.read(buffer, 0x1000, 4), 0);
    EXPECT_EQ(buffer[3], 4);
    EXPECT_EQ(pmem.read(buffer, 0x2000, 4), -1);
    // Not mapped to a failure value of its own: the library's code arrives.
    fake.setReadFailure(-7);
    EXPECT_EQ(pmem.read(buffer, 0x2000, 4), -7);
    fake.setReadFailure(3);
    EXPECT_EQ(pmem.read(buffer, 0x2000, 4), 3);
    EXPECT_EQ(pmem.search("\x03\x04", 0x1000, 0x1010, 1), 0x1002ul);
    EXPECT_EQ(pmem.search("\x09", 0x1000, 0x1010, 1), 0ul);
    EXPECT_TRUE(pmem.close());
}

TEST_F(Acquisition, SmEntryPointInBiosAreaGivesVersionAndSortedTables) {
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_EQ(smbios.getMajorVersion(), 2);
    EXPECT_EQ(smbios.getMinorVersion(), 7);
    EXPECT_EQ(smbios.getRevision(), 0);
    ASSERT_EQ(smbios.getTables().size(), 5u);
    std::vector<unsigned int> handles;
    for (SD::SmBios::Table const& t : smbios.getTables()) {
        handles.push_back(t.getHandle());
    }
    EXPECT_EQ(handles, (std::vector<unsigned int>{0x0000, 0x0100, 0x0100, 0x0180, 0x0200}));
    EXPECT_TRUE(log.contains("Constructor found _SM_ header at " + std::to_string(kSmAnchor)))
        << log.dump();
    EXPECT_TRUE(log.contains("Constructor success")) << log.dump();
    EXPECT_EQ(fake.opens(), 1);
    EXPECT_EQ(fake.closes(), 1);
}

TEST_F(Acquisition, DuplicateHandlesAreBothKept) {
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    SD::SmBios smbios;
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
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    SD::SmBios smbios;
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
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, memoryBytes);
    fake.peekAfterReadAt(kTableAddress);
    useCodeDir(kFakeFull);
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
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> entry = smEntryPoint(table, 2, 5);
    entry[5] = 0;      // entry-point length 0: nothing is summed
    entry[4] ^= 0x5A;  // and the checksum byte no longer matches
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(entry, kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_EQ(smbios.getMinorVersion(), 5);
    EXPECT_FALSE(log.contains("Constructor checksum 1 failed")) << log.dump();
}

TEST_F(Acquisition, SmEntryPointWithBadChecksumLeavesTableEmpty) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> entry = smEntryPoint(table, 2, 7);
    entry[4] ^= 0x01;
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(entry, kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_TRUE(log.contains("Constructor checksum 1 failed")) << log.dump();
    EXPECT_EQ(fake.closes(), 1);
}

TEST_F(Acquisition, OnlyLegacyDmiEntryPointGivesBcdVersion) {
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0x9FC00, smbiosdump::makeDmiEntryPoint(0x24, static_cast<uint16_t>(table.size()),
                                                    kTableAddress, 5));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_EQ(smbios.getMajorVersion(), 2);
    EXPECT_EQ(smbios.getMinorVersion(), 4);
    EXPECT_EQ(smbios.getRevision(), 0);
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_TRUE(log.contains("Constructo found _DMI_ header at 9fc00")) << log.dump();
    EXPECT_TRUE(log.contains("Constructor success")) << log.dump();
}

TEST_F(Acquisition, SmAnchorBelowBiosAreaIsFoundThroughItsLegacyPart) {
    // The "_SM_" anchor at 0xE0000 is outside the first search; the legacy
    // search finds the "_DMI_" part 16 bytes into it and uses its fields:
    // its BCD revision (2.6) wins over the 2.x header's 2.7.
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> entry = smEntryPoint(table, 2, 7);
    entry[0x1E] = 0x26;
    unsigned int sum = 0;
    for (size_t i = 0x10; i < 0x1F; ++i) {
        if (i != 0x15) {
            sum += entry[i];
        }
    }
    entry[0x15] = static_cast<uint8_t>(0x100 - (sum & 0xFF));
    FakePMem fake(kFakeFull);
    fake.map(0xE0000, entry);
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_FALSE(log.contains("Constructor found _SM_ header at")) << log.dump();
    EXPECT_TRUE(log.contains("Constructo found _DMI_ header at e0010")) << log.dump();
    EXPECT_EQ(smbios.getMajorVersion(), 2);
    EXPECT_EQ(smbios.getMinorVersion(), 6);
    EXPECT_EQ(smbios.getTables().size(), 5u);
}

TEST_F(Acquisition, LegacyEntryPointWithBadChecksumLeavesTableEmpty) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> entry =
        smbiosdump::makeDmiEntryPoint(0x24, static_cast<uint16_t>(table.size()), kTableAddress, 5);
    entry[14] = 0x25;
    FakePMem fake(kFakeFull);
    fake.map(0x9FC00, entry);
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor checksum 2 failed")) << log.dump();
}

TEST_F(Acquisition, NoAnchorInMemoryIsASignatureFailure) {
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, std::vector<uint8_t>(0x10000, 0x00));
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor _SM_ or _DMI_ signature failed")) << log.dump();
    EXPECT_EQ(fake.closes(), 1);
}

TEST_F(Acquisition, OpenFailureLeavesTableEmpty) {
    FakePMem fake(kFakeFull);
    fake.setOpenResult(0);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor pmem.open failed")) << log.dump();
}

TEST_F(Acquisition, EntryPointReadFailureIsRead1) {
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, table);
    fake.failRead(1);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor pmem.read 1 failed")) << log.dump();
    EXPECT_EQ(fake.closes(), 1);
}

TEST_F(Acquisition, LegacyEntryPointReadFailureIsRead2) {
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0x9FC00, smbiosdump::makeDmiEntryPoint(0x24, static_cast<uint16_t>(table.size()),
                                                    kTableAddress, 5));
    fake.map(kTableAddress, table);
    fake.failRead(1);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor pmem.read 2 failed")) << log.dump();
}

TEST_F(Acquisition, TableReadFailureIsRead3) {
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    // The table is not mapped: reading it fails.
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_TRUE(log.contains("Constructor pmem.read 3 failed")) << log.dump();
    EXPECT_EQ(fake.closes(), 1);
}

TEST_F(Acquisition, FailedAcquisitionIsNotRetried) {
    FakePMem fake(kFakeFull);
    fake.setOpenResult(0);
    useCodeDir(kFakeFull);
    SD::SmBios first;
    SD::SmBios second;
    EXPECT_TRUE(second.getTables().empty());
    EXPECT_EQ(fake.opens(), 1);
}

TEST_F(Acquisition, LaterTablesAreCopiesOfTheFirstAcquisition) {
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    SD::SmBios first;
    SD::SmBios second;
    EXPECT_EQ(typesOf(first), typesOf(second));
    EXPECT_EQ(second.getMinorVersion(), 7);
    EXPECT_EQ(fake.opens(), 1);
    EXPECT_EQ(fake.reads(), 2);
}

TEST_F(Acquisition, FirstAcquisitionFromSeveralThreadsHappensExactlyOnce) {
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, table);
    fake.setOpenDelay(50);  // widens the window in which the threads race
    useCodeDir(kFakeFull);
    unsigned int const threadCount = 8;
    std::vector<std::vector<unsigned int>> seen(threadCount);
    std::vector<std::thread> threads;
    for (unsigned int i = 0; i < threadCount; ++i) {
        threads.emplace_back([&seen, i]() {
            SD::SmBios smbios;
            seen[i] = typesOf(smbios);
        });
    }
    for (std::thread& t : threads) {
        t.join();
    }
    EXPECT_EQ(fake.opens(), 1);
    for (unsigned int i = 0; i < threadCount; ++i) {
        EXPECT_EQ(seen[i], (std::vector<unsigned int>{0, 1, 4, 127, 17})) << "thread " << i;
    }
}

// The override dump file.

TEST_F(Acquisition, OverrideFileIsUsedInsteadOfMemory) {
    std::vector<uint8_t> const table = sampleTable();
    smbiostest::writeOverrideDir(dataDir_.path(), smEntryPoint(table, 2, 8), table);
    FakePMem fake(kFakeFull);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_EQ(smbios.getMajorVersion(), 2);
    EXPECT_EQ(smbios.getMinorVersion(), 8);
    EXPECT_EQ(typesOf(smbios), (std::vector<unsigned int>{0, 1, 4, 127, 17}));
    std::string const path = dataDir_.path() + "/SmBiosOverride/smbios.txt";
    EXPECT_TRUE(log.contains("Constructor checking for " + path + " import smbios file"))
        << log.dump();
    EXPECT_TRUE(
        log.contains("Constructor using " + path + " instead of this machine's SmBios Tables"))
        << log.dump();
    EXPECT_TRUE(log.contains("Constructor found _SM_ header length=31")) << log.dump();
    EXPECT_TRUE(log.contains("Constructor checksum 1 good")) << log.dump();
    EXPECT_TRUE(log.contains("Constructor version good")) << log.dump();
    EXPECT_TRUE(log.contains("Constructor going to SmBios.getTables()")) << log.dump();
    EXPECT_TRUE(log.contains("Constructor success")) << log.dump();
    EXPECT_EQ(fake.opens(), 0);
}

TEST_F(Acquisition, OverrideFileWithLegacyHeaderBcd24GivesVersion24Revision0) {
    std::vector<uint8_t> const table = sampleTable();
    smbiostest::writeOverrideDir(
        dataDir_.path(),
        smbiosdump::makeDmiEntryPoint(0x24, static_cast<uint16_t>(table.size()), 0xF0000, 5),
        table);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_EQ(smbios.getMajorVersion(), 2);
    EXPECT_EQ(smbios.getMinorVersion(), 4);
    EXPECT_EQ(smbios.getRevision(), 0);
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_TRUE(log.contains("Constructor found _DMI_ header length=0xf")) << log.dump();
    EXPECT_TRUE(log.contains("Constructor checksum 2 good")) << log.dump();
}

TEST_F(Acquisition, OverrideFileWithBadChecksumEmptiesTableWithoutConsultingMemory) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> entry = smEntryPoint(table, 2, 7);
    entry[4] ^= 0x10;
    smbiostest::writeOverrideDir(dataDir_.path(), entry, table);
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_TRUE(log.contains("Constructor checksum 1 failed")) << log.dump();
    EXPECT_EQ(fake.opens(), 0);
}

TEST_F(Acquisition, OverrideFileWithLegacyBadChecksumFailsChecksum2) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> entry =
        smbiosdump::makeDmiEntryPoint(0x27, static_cast<uint16_t>(table.size()), 0xF0000, 5);
    entry[6] ^= 0x01;
    smbiostest::writeOverrideDir(dataDir_.path(), entry, table);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor checksum 2 failed")) << log.dump();
}

TEST_F(Acquisition, OverrideFileWithUnknownSignatureEmptiesTable) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> entry = smEntryPoint(table, 2, 7);
    entry[1] = 'X';
    smbiostest::writeOverrideDir(dataDir_.path(), entry, table);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor _SM_ or _DMI_ signature failed")) << log.dump();
}

TEST_F(Acquisition, OverrideFileWithShortSmHeaderIsASignatureFailure) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> const entry = {'_', 'S', 'M', '_', 0x00, 0x1F};
    smbiostest::writeOverrideDir(dataDir_.path(), entry, table);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor _SM_ or _DMI_ signature failed")) << log.dump();
}

TEST_F(Acquisition, OverrideFileWithShortLegacyHeaderFailsChecksum2) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> const entry = {'_', 'D', 'M', 'I', '_', 0x00};
    smbiostest::writeOverrideDir(dataDir_.path(), entry, table);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor checksum 2 failed")) << log.dump();
}

TEST_F(Acquisition, OverrideFileWithSmLengthBeyondHeaderFailsChecksum1) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> entry = smEntryPoint(table, 2, 7);
    entry.resize(16);  // byte 5 still says 31
    smbiostest::writeOverrideDir(dataDir_.path(), entry, table);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor checksum 1 failed")) << log.dump();
}

TEST_F(Acquisition, OverrideFileWithBadHeaderTokensLogsReadHeadCode) {
    std::vector<uint8_t> const table = sampleTable();
    smbiostest::writeOverrideDir(dataDir_.path(), smEntryPoint(table, 2, 7), table);
    smbiostest::writeFile(dataDir_.path() + "/SmBiosOverride/smbios.txt",
                          "<SHOWSMBIOS>\n<HEADER>\n5F534D5F\n</EPHEADER>\n0000\n</SHOWSMBIOS>\n");
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_TRUE(log.contains("Constructor readHead() return code 8")) << log.dump();
}

TEST_F(Acquisition, OverrideFileWithoutClosingTagLogsReadTablesCode) {
    std::vector<uint8_t> const table = sampleTable();
    std::string text = smbiosdump::formatOverride(smEntryPoint(table, 2, 7), table);
    text = text.substr(0, text.find("</SHOWSMBIOS>")) + "<END>\n";
    smbiostest::writeOverrideDir(dataDir_.path(), smEntryPoint(table, 2, 7), table);
    smbiostest::writeFile(dataDir_.path() + "/SmBiosOverride/smbios.txt", text);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_TRUE(log.contains("Constructor readTables() return code 55")) << log.dump();
}

TEST_F(Acquisition, OverrideFileWithOnlyHeaderFallsBackToMemory) {
    std::vector<uint8_t> const table = sampleTable();
    std::string text = smbiosdump::formatOverride(smEntryPoint(table, 2, 7), table);
    text = text.substr(0, text.find("</EPHEADER>") + std::string("</EPHEADER>").size()) + "\n";
    smbiostest::writeOverrideDir(dataDir_.path(), smEntryPoint(table, 2, 7), table);
    smbiostest::writeFile(dataDir_.path() + "/SmBiosOverride/smbios.txt", text);
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 6), kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_EQ(smbios.getMinorVersion(), 6);
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_EQ(fake.opens(), 1);
    EXPECT_TRUE(log.contains("importSmBios() file ended before tables read, no tables made"))
        << log.dump();
}

TEST_F(Acquisition, MissingOverrideFileFallsBackToMemory) {
    std::vector<uint8_t> const table = sampleTable();
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_EQ(fake.opens(), 1);
    EXPECT_TRUE(log.contains("importSmBios() file not found, using machine SMBios")) << log.dump();
}

TEST_F(Acquisition, OverrideFileThatIsAFifoFallsBackToMemoryWithoutWaiting) {
    std::vector<uint8_t> const table = sampleTable();
    std::string const folder = dataDir_.path() + "/SmBiosOverride";
    std::string const fifo = folder + "/smbios.txt";
    ASSERT_EQ(mkdir(folder.c_str(), 0755), 0);
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 7), kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    bool waited = false;
    SD::SmBios const smbios = acquireReleasingFifo(fifo, waited);
    EXPECT_FALSE(waited) << "the acquisition waited for a writer on the override FIFO";
    EXPECT_TRUE(log.contains("importSmBios() file not found, using machine SMBios")) << log.dump();
    EXPECT_EQ(smbios.getMinorVersion(), 7);
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_EQ(fake.opens(), 1);
    struct stat info;
    ASSERT_EQ(lstat(fifo.c_str(), &info), 0);
    EXPECT_TRUE(S_ISFIFO(info.st_mode)) << "the override FIFO was replaced";
}

TEST_F(Acquisition, OverrideFileThatIsAFolderFallsBackToMemory) {
    std::vector<uint8_t> const table = sampleTable();
    std::string const folder = dataDir_.path() + "/SmBiosOverride";
    ASSERT_EQ(mkdir(folder.c_str(), 0755), 0);
    ASSERT_EQ(mkdir((folder + "/smbios.txt").c_str(), 0755), 0);
    FakePMem fake(kFakeFull);
    fake.map(0xF0000, biosAreaWith(smEntryPoint(table, 2, 6), kSmAnchor));
    fake.map(kTableAddress, table);
    useCodeDir(kFakeFull);
    LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(log.contains("importSmBios() file not found, using machine SMBios")) << log.dump();
    EXPECT_EQ(smbios.getMinorVersion(), 6);
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_EQ(fake.opens(), 1);
}

TEST_F(Acquisition, InitializerDestructorLogsItsLine) {
    TempDir emptyCodeDir;
    useCodeDir(emptyCodeDir.path() + "/");
    LogCapture log;
    {
        SD::SmBiosInitializer initializer;
        EXPECT_TRUE(initializer.getTables().empty());
    }
    EXPECT_TRUE(log.contains("Destructor entry-return")) << log.dump();
}
