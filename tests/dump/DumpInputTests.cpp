// The readers of smbios-dump, called directly: the SMBIOS version of the
// command line, raw tables, --dump-bin images, and physical memory through
// the library's five functions (here functions of this test over a fake
// memory, so that every call can be counted and every result chosen).
#include <gtest/gtest.h>

#include <cstring>
#include <map>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "DumpTestSupport.h"
#include "TestSupport.h"
#include "dump/DumpInput.h"

using dumptest::Bytes;
using dumptest::byteSum;
using dumptest::dword;
using dumptest::word;
using smbiosdump::Capture;

namespace {

// The capture holds the entry point `header`, the table `table` and the
// version major.minor.
::testing::AssertionResult isCapture(smbiosdump::Capture const& capture, Bytes const& header,
                                     Bytes const& table, int major, int minor) {
    if (capture.header != header || capture.table != table) {
        return ::testing::AssertionFailure()
               << "captured a header of " << capture.header.size() << " bytes and a table of "
               << capture.table.size() << " bytes, expected " << header.size() << " and "
               << table.size() << (capture.header != header ? " (the header differs)" : "")
               << (capture.table != table ? " (the table differs)" : "");
    }
    if (capture.major != major || capture.minor != minor) {
        return ::testing::AssertionFailure()
               << "captured version " << int(capture.major) << "." << int(capture.minor)
               << ", expected " << major << "." << minor;
    }
    return ::testing::AssertionSuccess();
}

// --- the SMBIOS version -----------------------------------------------------

TEST(DumpVersion, ParsesMajorDotMinor) {
    uint8_t major = 0;
    uint8_t minor = 0;
    ASSERT_TRUE(smbiosdump::parseSmbiosVersion("2.7", major, minor));
    EXPECT_EQ(major, 2);
    EXPECT_EQ(minor, 7);
    ASSERT_TRUE(smbiosdump::parseSmbiosVersion("3.10", major, minor));
    EXPECT_EQ(major, 3);
    EXPECT_EQ(minor, 10);
    ASSERT_TRUE(smbiosdump::parseSmbiosVersion("255.0", major, minor));
    EXPECT_EQ(major, 255);
    EXPECT_EQ(minor, 0);
}

TEST(DumpVersion, RefusesAnythingElseAndKeepsTheOldValues) {
    for (char const* text : {"", "2", "2.", ".7", "2.7.1", "256.0", "2.256", "2.x", "+2.7", " 2.7",
                             "2.7 ", "-1.0", "0002.7"}) {
        uint8_t major = 9;
        uint8_t minor = 9;
        EXPECT_FALSE(smbiosdump::parseSmbiosVersion(text, major, minor)) << "'" << text << "'";
        EXPECT_EQ(major, 9) << text;
        EXPECT_EQ(minor, 9) << text;
    }
}

// --- raw tables ---------------------------------------------------------------

TEST(DumpFromTable, MakesSmEntryPointDescribingTheTable) {
    Bytes const table = dumptest::sampleTable();
    Capture capture;
    std::string error;
    ASSERT_TRUE(smbiosdump::captureFromTable(table, 2, 8, capture, error)) << error;
    EXPECT_EQ(capture.table, table);
    EXPECT_EQ(capture.major, 2);
    EXPECT_EQ(capture.minor, 8);
    Bytes const& ep = capture.header;
    ASSERT_EQ(ep.size(), 31u);
    EXPECT_EQ(std::string(ep.begin(), ep.begin() + 4), "_SM_");
    EXPECT_EQ(ep[5], 0x1F);
    EXPECT_EQ(ep[6], 2);
    EXPECT_EQ(ep[7], 8);
    EXPECT_EQ(word(ep, 0x16), table.size());
    EXPECT_EQ(dword(ep, 0x18), smbiosdump::DUMP_BIN_TABLE_OFFSET);
    EXPECT_EQ(word(ep, 0x1C), 3);
    EXPECT_EQ(word(ep, 0x08), smbiosdump::tableStats(table).maxSize);
    EXPECT_EQ(ep[0x1E], 0x28);
    EXPECT_EQ(byteSum(ep, 0, 0x1F), 0);
    EXPECT_EQ(byteSum(ep, 0x10, 0x1F), 0);
}

TEST(DumpFromTable, RefusesEmptyTable) {
    Capture capture;
    capture.major = 7;
    std::string error;
    EXPECT_FALSE(smbiosdump::captureFromTable(Bytes(), 2, 7, capture, error));
    EXPECT_NE(error.find("empty"), std::string::npos) << error;
    EXPECT_EQ(capture.major, 7);
    EXPECT_TRUE(capture.header.empty());
}

TEST(DumpFromTable, RefusesTableLongerThanSixteenBitLength) {
    // Structures of 255-byte formatted areas up to just past 65535 bytes.
    smbiostest::TableBuilder builder;
    uint16_t handle = 0;
    while (builder.size() <= 0xFFFF) {
        builder.add(smbiostest::Structure(0x80, handle++).bytes(Bytes(251, 0xA5)));
    }
    Bytes const table = builder.build();
    Capture capture;
    std::string error;
    EXPECT_FALSE(smbiosdump::captureFromTable(table, 3, 0, capture, error));
    EXPECT_NE(error.find(std::to_string(table.size())), std::string::npos) << error;
    EXPECT_NE(error.find("65535"), std::string::npos) << error;

    // The largest table that fits is taken.
    Bytes fitting(table.begin(), table.begin() + 0xFFFF);
    EXPECT_TRUE(smbiosdump::captureFromTable(fitting, 3, 0, capture, error)) << error;
    EXPECT_EQ(word(capture.header, 0x16), 0xFFFF);
}

TEST(DumpFromTable, RefusesTableWithoutWholeFirstStructure) {
    Capture capture;
    std::string error;
    // A length byte below 4.
    EXPECT_FALSE(smbiosdump::captureFromTable(Bytes{0x01, 0x02, 0x00, 0x00, 0x00, 0x00}, 2, 7,
                                              capture, error));
    EXPECT_NE(error.find("type 1, length 2"), std::string::npos) << error;
    // A formatted area that runs past the end.
    EXPECT_FALSE(
        smbiosdump::captureFromTable(Bytes{0x01, 0x1B, 0x00, 0x01, 0x00}, 2, 7, capture, error));
    EXPECT_NE(error.find("no whole SMBIOS structure"), std::string::npos) << error;
    // Text that is no table at all.
    std::string const text = "<SHOWSMBIOS>";
    EXPECT_FALSE(
        smbiosdump::captureFromTable(Bytes(text.begin(), text.end()), 2, 7, capture, error));
    EXPECT_TRUE(capture.header.empty());
}

// --- --dump-bin images ----------------------------------------------------------

TEST(DumpFromBin, TakesEntryPointAndTableOfImage) {
    Bytes const table = dumptest::sampleTable();
    Bytes image = smbiosdump::makeSmEntryPoint(2, 6, static_cast<uint16_t>(table.size()),
                                               smbiosdump::DUMP_BIN_TABLE_OFFSET, 3, 40);
    image.resize(smbiosdump::DUMP_BIN_TABLE_OFFSET, 0);
    Bytes const header(image.begin(), image.begin() + 31);
    image.insert(image.end(), table.begin(), table.end());
    Capture capture;
    std::string error;
    ASSERT_TRUE(smbiosdump::captureFromDumpBin(image, capture, error)) << error;
    EXPECT_TRUE(isCapture(capture, header, table, 2, 6));
}

TEST(DumpFromBin, SaysWhyImageIsRefused) {
    Capture capture;
    std::string error;
    std::string const text = "SMBIOS 2.7 present.\n";
    EXPECT_FALSE(smbiosdump::captureFromDumpBin(Bytes(text.begin(), text.end()), capture, error));
    EXPECT_EQ(error.rfind("not a usable dmidecode --dump-bin image: ", 0), 0u) << error;
    EXPECT_NE(error.find("no entry point anchor"), std::string::npos) << error;

    // The entry point names more table than the file holds.
    Bytes image = smbiosdump::makeSmEntryPoint(2, 7, 500, smbiosdump::DUMP_BIN_TABLE_OFFSET, 3, 40);
    image.resize(0x40, 0);
    EXPECT_FALSE(smbiosdump::captureFromDumpBin(image, capture, error));
    EXPECT_NE(error.find("runs past the end"), std::string::npos) << error;
    EXPECT_TRUE(capture.table.empty());
}

// --- physical memory --------------------------------------------------------------

struct SearchCall {
    std::string anchor;
    unsigned long start;
    unsigned long end;
    long step;
};

// The fake memory behind the functions below.
struct FakeMemory {
    std::map<unsigned long, Bytes> regions;
    int initialized = 1;
    int openResult = 1;
    int closeResult = 1;
    int opens = 0;
    int closes = 0;
    std::vector<std::pair<unsigned long, long>> reads;
    std::vector<SearchCall> searches;

    bool byteAt(unsigned long address, uint8_t& value) const {
        auto it = regions.upper_bound(address);
        if (it == regions.begin()) {
            return false;
        }
        --it;
        unsigned long const offset = address - it->first;
        if (offset >= it->second.size()) {
            return false;
        }
        value = it->second[offset];
        return true;
    }
};

FakeMemory* gMemory = nullptr;

int fakeIsInitialized() { return gMemory->initialized; }
int fakeOpen() {
    ++gMemory->opens;
    return gMemory->openResult;
}
int fakeClose() {
    ++gMemory->closes;
    return gMemory->closeResult;
}
int fakeRead(void* buffer, unsigned long address, long count) {
    gMemory->reads.emplace_back(address, count);
    uint8_t* out = static_cast<uint8_t*>(buffer);
    for (long i = 0; i < count; ++i) {
        if (!gMemory->byteAt(address + static_cast<unsigned long>(i), out[i])) {
            return 5;
        }
    }
    return 0;
}
unsigned long fakeSearch(char const* anchor, unsigned long start, unsigned long end, long step) {
    gMemory->searches.push_back({anchor, start, end, step});
    size_t const length = std::strlen(anchor);
    for (unsigned long address = start; address <= end;
         address += static_cast<unsigned long>(step)) {
        bool match = true;
        for (size_t i = 0; i < length && match; ++i) {
            uint8_t value = 0;
            match = gMemory->byteAt(address + i, value) && value == static_cast<uint8_t>(anchor[i]);
        }
        if (match) {
            return address;
        }
    }
    return 0;
}

unsigned long const kAnchor = 0xF5A30;
uint32_t const kTable = 0x7F6E0000;

class DumpFromMemory : public ::testing::Test {
protected:
    void SetUp() override {
        gMemory = &memory;
        functions.isInitialized = &fakeIsInitialized;
        functions.open = &fakeOpen;
        functions.close = &fakeClose;
        functions.read = &fakeRead;
        functions.search = &fakeSearch;
    }
    void TearDown() override { gMemory = nullptr; }

    // A machine with its "_SM_" entry point at `anchor` (extra bytes after
    // its 31 up to `span`) and the sample table at `tableAddress`.
    Bytes mapSmMachine(unsigned long anchor, uint32_t tableAddress, size_t span = 31) {
        table = dumptest::sampleTable();
        Bytes ep = smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(table.size()),
                                                tableAddress, 3, 40);
        ep.resize(span, 0xEE);
        memory.regions[anchor] = ep;
        memory.regions[tableAddress] = table;
        return ep;
    }

    // The capture from memory fails, with an error message that contains
    // each of `texts`.
    ::testing::AssertionResult failsSaying(Capture& capture,
                                           std::vector<std::string> const& texts) {
        std::string error;
        if (smbiosdump::captureFromMemory(functions, capture, error)) {
            return ::testing::AssertionFailure() << "the capture succeeded";
        }
        for (std::string const& text : texts) {
            if (error.find(text) == std::string::npos) {
                return ::testing::AssertionFailure() << "no \"" << text << "\" in: " << error;
            }
        }
        return ::testing::AssertionSuccess();
    }

    // On the sample machine, the library's answer `step` is 0: the capture
    // fails naming the call, before any search, and the library's count
    // `untouched` (opens or closes) stays 0.
    void expectFailsBeforeSearching(int FakeMemory::*step, std::string const& call,
                                    int FakeMemory::*untouched) {
        mapSmMachine(kAnchor, kTable);
        memory.*step = 0;
        Capture capture;
        EXPECT_TRUE(failsSaying(capture, {call}));
        EXPECT_EQ(memory.*untouched, 0);
        EXPECT_TRUE(memory.searches.empty());
    }

    FakeMemory memory;
    smbiosdump::PMemFunctions functions;
    Bytes table;
};

TEST_F(DumpFromMemory, ReadsSmEntryPointAndTable) {
    Bytes const ep = mapSmMachine(kAnchor, kTable);
    Capture capture;
    std::string error;
    ASSERT_TRUE(smbiosdump::captureFromMemory(functions, capture, error)) << error;
    EXPECT_TRUE(isCapture(capture, ep, table, 2, 7));
    EXPECT_EQ(memory.opens, 1);
    EXPECT_EQ(memory.closes, 1);
    ASSERT_EQ(memory.searches.size(), 1u);
    EXPECT_EQ(memory.searches[0].anchor, "_SM_");
    EXPECT_EQ(memory.searches[0].start, 0xF0000u);
    EXPECT_EQ(memory.searches[0].end, 0xFFFFFu);
    EXPECT_EQ(memory.searches[0].step, 16);
    ASSERT_EQ(memory.reads.size(), 2u);
    EXPECT_EQ(memory.reads[1].first, kTable);
    EXPECT_EQ(memory.reads[1].second, static_cast<long>(table.size()));
}

TEST_F(DumpFromMemory, EntryPointLengthByteDecidesHeaderSize) {
    mapSmMachine(kAnchor, kTable, 40);
    Capture capture;
    std::string error;

    // 0x1E, which some firmware states: 30 bytes.
    memory.regions[kAnchor][5] = 0x1E;
    ASSERT_TRUE(smbiosdump::captureFromMemory(functions, capture, error)) << error;
    EXPECT_EQ(capture.header.size(), 0x1Eu);

    // Longer than 31: as many bytes as it says.
    memory.regions[kAnchor][5] = 0x24;
    ASSERT_TRUE(smbiosdump::captureFromMemory(functions, capture, error)) << error;
    ASSERT_EQ(capture.header.size(), 0x24u);
    EXPECT_EQ(capture.header[0x23], 0xEE);

    // A length that cannot be right: the 31 bytes are kept.
    memory.regions[kAnchor][5] = 0;
    ASSERT_TRUE(smbiosdump::captureFromMemory(functions, capture, error)) << error;
    EXPECT_EQ(capture.header.size(), 31u);
    EXPECT_EQ(capture.table, table);
}

TEST_F(DumpFromMemory, FallsBackToDmiAnywhereInFirstMegabyte) {
    table = dumptest::sampleTable();
    unsigned long const anchor = 0x9A0;
    memory.regions[anchor] =
        smbiosdump::makeDmiEntryPoint(0x26, static_cast<uint16_t>(table.size()), 0x1000, 3);
    memory.regions[0x1000] = table;
    Capture capture;
    std::string error;
    ASSERT_TRUE(smbiosdump::captureFromMemory(functions, capture, error)) << error;
    EXPECT_TRUE(isCapture(capture, memory.regions[anchor], table, 2, 6));
    ASSERT_EQ(memory.searches.size(), 2u);
    EXPECT_EQ(memory.searches[1].anchor, "_DMI_");
    EXPECT_EQ(memory.searches[1].start, 0u);
    EXPECT_EQ(memory.searches[1].end, 0xFFFFFu);
    EXPECT_EQ(memory.searches[1].step, 16);
}

TEST_F(DumpFromMemory, NoEntryPointIsAnErrorAndClosesMemory) {
    memory.regions[0x1000] = Bytes(64, 0);
    Capture capture;
    EXPECT_TRUE(failsSaying(capture, {"no _SM_ entry point", "no _DMI_ entry point"}));
    EXPECT_EQ(memory.closes, 1);
    EXPECT_TRUE(capture.header.empty());
}

TEST_F(DumpFromMemory, LibraryThatDidNotInitializeIsNeverOpened) {
    expectFailsBeforeSearching(&FakeMemory::initialized, "PMemIsInitialized", &FakeMemory::opens);
}

TEST_F(DumpFromMemory, FailedOpenIsAnError) {
    expectFailsBeforeSearching(&FakeMemory::openResult, "PMemOpen", &FakeMemory::closes);
}

TEST_F(DumpFromMemory, FailedTableReadNamesItAndClosesMemory) {
    mapSmMachine(kAnchor, kTable);
    memory.regions.erase(kTable);
    Capture capture;
    EXPECT_TRUE(
        failsSaying(capture, {"PMemRead of the structure table", "0x7F6E0000", "failed with 5"}));
    EXPECT_EQ(memory.closes, 1);
    EXPECT_TRUE(capture.table.empty());
}

TEST_F(DumpFromMemory, FailedCloseIsAnError) {
    mapSmMachine(kAnchor, kTable);
    memory.closeResult = 0;
    Capture capture;
    EXPECT_TRUE(failsSaying(capture, {"PMemClose"}));
    EXPECT_TRUE(capture.table.empty());
}

TEST_F(DumpFromMemory, EmptyTableIsAnError) {
    memory.regions[kAnchor] = smbiosdump::makeSmEntryPoint(2, 7, 0, kTable, 0, 0);
    memory.regions[kTable] = dumptest::sampleTable();
    Capture capture;
    EXPECT_TRUE(failsSaying(capture, {"empty structure table"}));
    EXPECT_EQ(memory.closes, 1);
}

TEST(DumpFromMachine, MissingLibraryIsNamed) {
    Capture capture;
    std::string error;
    EXPECT_FALSE(smbiosdump::captureFromMachine("no-such-folder/libpmem.so", capture, error));
    EXPECT_NE(error.find("cannot load the physical-memory library no-such-folder/libpmem.so"),
              std::string::npos)
        << error;
}

TEST(DumpFromMachine, DefaultLibraryIsBesideProgramElseInLibFolder) {
    smbiostest::TempDir dir;
    EXPECT_EQ(smbiosdump::defaultPMemPath(dir.path()), dir.path() + "/../lib/libpmem.so");
    smbiostest::writeFile(dir.file("libpmem.so"), "");
    EXPECT_EQ(smbiosdump::defaultPMemPath(dir.path()), dir.path() + "/libpmem.so");
}

}  // namespace
