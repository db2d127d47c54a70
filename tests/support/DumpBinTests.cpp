#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "TableBuilder.h"
#include "TestSupport.h"

using smbiosdump::DumpImage;
using smbiosdump::readDumpBin;
using smbiostest::byteSum;
using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

std::vector<uint8_t> sampleTable() {
    TableBuilder table;
    table.add(Structure(0, 0).str("Corvane").str("CVE1.05").word(0xF000).str("06/14/2013"))
        .add(Structure(1, 1).str("Corvane").str("RS-7400").bytes(std::vector<uint8_t>(16, 0x11)))
        .add(Structure(4, 2).str("CPU1").byte(3).byte(0xB3))
        .endOfTable(3);
    return table.build();
}

// A --dump-bin image: the entry point, zeros up to `address`, the table.
std::vector<uint8_t> image(std::vector<uint8_t> const& header, std::vector<uint8_t> const& table,
                           size_t address = 0x20) {
    std::vector<uint8_t> file = header;
    file.resize(address, 0);
    file.insert(file.end(), table.begin(), table.end());
    return file;
}

// A "_SM3_" entry point (document revision 1); checksum set.
std::vector<uint8_t> sm3EntryPoint(uint8_t major, uint8_t minor, uint32_t maxSize,
                                   uint64_t address) {
    return smbiostest::sm3EntryPoint(major, minor, 1, maxSize, address);
}

// readDumpBin reads the file as an image of the entry point `header` with
// the anchor, the table and the version major.minor.
::testing::AssertionResult readsImage(std::vector<uint8_t> const& file, std::string const& anchor,
                                      std::vector<uint8_t> const& header,
                                      std::vector<uint8_t> const& table, int major, int minor) {
    DumpImage out;
    std::string error;
    if (!readDumpBin(file, out, error)) {
        return ::testing::AssertionFailure() << "refused: " << error;
    }
    if (out.anchor != anchor || out.header != header || out.table != table) {
        return ::testing::AssertionFailure()
               << "read an image of anchor " << out.anchor << ", " << out.header.size()
               << " header bytes and " << out.table.size() << " table bytes; expected " << anchor
               << ", " << header.size() << " and " << table.size();
    }
    if (out.major != major || out.minor != minor) {
        return ::testing::AssertionFailure()
               << "read version " << int(out.major) << "." << int(out.minor) << ", expected "
               << major << "." << minor;
    }
    return ::testing::AssertionSuccess();
}

// Expects readDumpBin to refuse the file with a message containing `what`,
// leaving the output untouched.
void expectRefused(std::vector<uint8_t> const& file, std::string const& what) {
    DumpImage out;
    out.anchor = "untouched";
    out.table = {0xAA};
    std::string error;
    EXPECT_FALSE(readDumpBin(file, out, error));
    EXPECT_NE(error.find(what), std::string::npos) << "message: " << error;
    EXPECT_EQ(out.anchor, "untouched");
    EXPECT_EQ(out.table, std::vector<uint8_t>{0xAA});
}

}  // namespace

TEST(ReadDumpBin, ReadsSmImage) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> const header =
        smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(table.size()), 0x20, 4, 40);
    EXPECT_TRUE(readsImage(image(header, table), "_SM_", header, table, 2, 7));
}

TEST(ReadDumpBin, SmImageTableIsTakenAtStatedAddressAndLength) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> const header =
        smbiosdump::makeSmEntryPoint(2, 8, static_cast<uint16_t>(table.size()), 0x40, 4, 40);
    std::vector<uint8_t> file = image(header, table, 0x40);
    file.insert(file.end(), {0xEE, 0xEE, 0xEE});  // bytes past the table are not part of it
    std::fill(file.begin() + 0x20, file.begin() + 0x40, 0xCC);
    DumpImage out;
    std::string error;
    ASSERT_TRUE(readDumpBin(file, out, error)) << error;
    EXPECT_EQ(out.table, table);
    EXPECT_EQ(out.minor, 8);
}

TEST(ReadDumpBin, SmHeaderIsEntryPointLengthBytes) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> header =
        smbiosdump::makeSmEntryPoint(2, 1, static_cast<uint16_t>(table.size()), 0x20, 4, 40);
    header[5] = 0x1E;  // stated by some firmware for the same 31 bytes
    DumpImage out;
    std::string error;
    ASSERT_TRUE(readDumpBin(image(header, table), out, error)) << error;
    EXPECT_EQ(out.header, std::vector<uint8_t>(header.begin(), header.begin() + 0x1E));
    EXPECT_EQ(out.table, table);
}

TEST(ReadDumpBin, ReadsLegacyDmiImage) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> const header =
        smbiosdump::makeDmiEntryPoint(0x21, static_cast<uint16_t>(table.size()), 0x20, 4);
    EXPECT_TRUE(readsImage(image(header, table), "_DMI_", header, table, 2, 1));
}

TEST(ReadDumpBin, Sm3ImageGetsEquivalentSmHeader) {
    std::vector<uint8_t> const table = sampleTable();
    // The maximum size is an upper bound: the file holds less.
    std::vector<uint8_t> const file = image(sm3EntryPoint(3, 2, 0x1000, 0x20), table);
    DumpImage out;
    std::string error;
    ASSERT_TRUE(readDumpBin(file, out, error)) << error;
    EXPECT_EQ(out.anchor, "_SM3_");
    EXPECT_EQ(out.table, table);
    EXPECT_EQ(out.major, 3);
    EXPECT_EQ(out.minor, 2);
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
    ASSERT_EQ(out.header.size(), 31u);
    EXPECT_EQ(out.header, smbiosdump::makeSmEntryPoint(3, 2, static_cast<uint16_t>(table.size()),
                                                       0x20, stats.count, stats.maxSize));
    EXPECT_EQ(std::string(out.header.begin(), out.header.begin() + 4), "_SM_");
    EXPECT_EQ(byteSum(out.header, 0, out.header[5]), 0);
    EXPECT_EQ(byteSum(out.header, 0x10, 0x1F), 0);
    EXPECT_EQ(out.header[6], 3);
    EXPECT_EQ(out.header[7], 2);
    EXPECT_EQ(out.header[0x1E], 0x32);
    EXPECT_EQ(out.header[0x1C], 4);
}

TEST(ReadDumpBin, Sm3TableIsCutAtMaximumSize) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> file =
        image(sm3EntryPoint(3, 0, static_cast<uint32_t>(table.size()), 0x20), table);
    file.insert(file.end(), 100, 0xEE);
    DumpImage out;
    std::string error;
    ASSERT_TRUE(readDumpBin(file, out, error)) << error;
    EXPECT_EQ(out.table, table);
    EXPECT_EQ(out.header[0x16] | (out.header[0x17] << 8), static_cast<int>(table.size()));
}

// Of a 3.x table over 65535 bytes, which a 2.x entry point cannot describe,
// the whole structures of its first 65535 bytes are kept, and the image
// says what the whole table was.
TEST(ReadDumpBin, Sm3TableOver65535BytesKeepsTheWholeStructuresThatFit) {
    std::vector<uint8_t> const table = smbiostest::largeServerTable(1100);
    size_t const head = smbiostest::largeServerTable(0).size() - 6;
    size_t const device = smbiostest::largeServerTable(1).size() - 6 - head;
    size_t const kept = head + (0xFFFF - head) / device * device;
    DumpImage out;
    std::string error;
    ASSERT_TRUE(readDumpBin(
        image(sm3EntryPoint(3, 3, static_cast<uint32_t>(table.size()), 0x20), table), out, error))
        << error;
    EXPECT_EQ(out.table, std::vector<uint8_t>(table.begin(), table.begin() + kept));
    EXPECT_TRUE(out.cut);
    EXPECT_EQ(out.wholeTableBytes, table.size());
    EXPECT_EQ(out.wholeTableStructures, 5u + 1100u + 1u);
    EXPECT_EQ(out.header[0x16] | (out.header[0x17] << 8), static_cast<int>(kept));
    EXPECT_EQ(out.header[0x1C] | (out.header[0x1D] << 8),
              static_cast<int>(5 + (kept - head) / device));
}

// A table of exactly 65535 bytes is kept whole, not cut.
TEST(ReadDumpBin, Sm3TableThatFitsIsNotCut) {
    std::vector<uint8_t> const table = smbiostest::largeServerTable(700);
    ASSERT_LE(table.size(), 0xFFFFu);
    DumpImage out;
    std::string error;
    ASSERT_TRUE(readDumpBin(
        image(sm3EntryPoint(3, 3, static_cast<uint32_t>(table.size()), 0x20), table), out, error))
        << error;
    EXPECT_EQ(out.table, table);
    EXPECT_FALSE(out.cut);
}

TEST(ReadDumpBin, Sm3TableOver65535BytesWithoutAWholeStructureIsRefused) {
    std::vector<uint8_t> const table(70000, 0);
    expectRefused(image(sm3EntryPoint(3, 3, 0x20000, 0x20), table),
                  "SMBIOS 3.x table of 70000 bytes has no whole structure in its first 65535 "
                  "bytes");
}

TEST(ReadDumpBin, RefusesEmptyFile) { expectRefused({}, "too short"); }

TEST(ReadDumpBin, RefusesUnknownAnchor) {
    expectRefused(std::vector<uint8_t>(64, 0x41), "no entry point anchor");
    expectRefused({'_', 'S', 'M', '4', '_', 0, 0, 0}, "no entry point anchor");
}

TEST(ReadDumpBin, RefusesSmFileShorterThanEntryPoint) {
    std::vector<uint8_t> header = smbiosdump::makeSmEntryPoint(2, 7, 10, 0x20, 1, 10);
    header.resize(20);
    expectRefused(header, "too short for the 31-byte _SM_ entry point");
}

TEST(ReadDumpBin, RefusesSmEntryPointLengthBelow0x1E) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> header =
        smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(table.size()), 0x20, 4, 40);
    header[5] = 0x10;
    expectRefused(image(header, table), "_SM_ entry point length 0x10 is below 0x1E");
}

TEST(ReadDumpBin, RefusesSmWithoutIntermediateAnchor) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> header =
        smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(table.size()), 0x20, 4, 40);
    header[0x11] = 'X';
    expectRefused(image(header, table), "no _DMI_ anchor");
}

TEST(ReadDumpBin, RefusesSmTableBeyondFile) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> const header =
        smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(table.size() + 1), 0x20, 4, 40);
    expectRefused(image(header, table), "runs past the end");
    std::vector<uint8_t> const far = smbiosdump::makeSmEntryPoint(2, 7, 16, 0xFFFFFFF8u, 4, 40);
    expectRefused(image(far, table), "runs past the end");
}

TEST(ReadDumpBin, RefusesEmptyTable) {
    std::vector<uint8_t> const header = smbiosdump::makeSmEntryPoint(2, 7, 0, 0x20, 0, 0);
    expectRefused(image(header, sampleTable()), "empty structure table");
}

TEST(ReadDumpBin, RefusesShortDmiFile) {
    std::vector<uint8_t> header = smbiosdump::makeDmiEntryPoint(0x21, 10, 0x20, 1);
    header.resize(12);
    expectRefused(header, "too short for the 15-byte _DMI_ entry point");
}

TEST(ReadDumpBin, RefusesDmiTableBeyondFile) {
    std::vector<uint8_t> const table = sampleTable();
    std::vector<uint8_t> const header =
        smbiosdump::makeDmiEntryPoint(0x21, static_cast<uint16_t>(table.size()), 0x30, 4);
    std::vector<uint8_t> file = image(header, table);
    expectRefused(file, "runs past the end");
}

TEST(ReadDumpBin, RefusesShortSm3File) {
    std::vector<uint8_t> ep = sm3EntryPoint(3, 0, 100, 0x20);
    ep.resize(0x10);
    expectRefused(ep, "too short for the 24-byte _SM3_ entry point");
}

TEST(ReadDumpBin, RefusesSm3EntryPointLengthBelow0x18) {
    std::vector<uint8_t> ep = sm3EntryPoint(3, 0, 100, 0x20);
    ep[6] = 0x10;
    expectRefused(image(ep, sampleTable()), "_SM3_ entry point length 0x10 is below 0x18");
}

TEST(ReadDumpBin, RefusesSm3TableBeyondFile) {
    std::vector<uint8_t> const table = sampleTable();
    expectRefused(image(sm3EntryPoint(3, 0, 100, 0x20 + table.size()), table),
                  "starts past the end");
    expectRefused(image(sm3EntryPoint(3, 0, 100, 0x100000000ull), table), "starts past the end");
}

TEST(ReadDumpBin, RefusesSm3ZeroMaximumSize) {
    expectRefused(image(sm3EntryPoint(3, 0, 0, 0x20), sampleTable()), "empty structure table");
}

TEST(ReadDumpBin, EveryTruncationOfValidImagesIsRefusedSafely) {
    std::vector<uint8_t> const table = sampleTable();
    uint16_t const length = static_cast<uint16_t>(table.size());
    std::vector<std::vector<uint8_t>> const files = {
        image(smbiosdump::makeSmEntryPoint(2, 7, length, 0x20, 4, 40), table),
        image(smbiosdump::makeDmiEntryPoint(0x27, length, 0x20, 4), table),
    };
    for (std::vector<uint8_t> const& file : files) {
        for (size_t cut = 0; cut < file.size(); ++cut) {
            std::vector<uint8_t> const part(file.begin(), file.begin() + cut);
            DumpImage out;
            std::string error;
            EXPECT_FALSE(readDumpBin(part, out, error)) << "cut at " << cut;
            EXPECT_FALSE(error.empty()) << "cut at " << cut;
        }
    }
    // A "_SM3_" image keeps what its file holds once the table has started.
    std::vector<uint8_t> const sm3 = image(sm3EntryPoint(3, 0, length, 0x20), table);
    for (size_t cut = 0; cut < sm3.size(); ++cut) {
        std::vector<uint8_t> const part(sm3.begin(), sm3.begin() + cut);
        DumpImage out;
        std::string error;
        bool const ok = readDumpBin(part, out, error);
        EXPECT_EQ(ok, cut > 0x20) << "cut at " << cut << ": " << error;
        if (ok) {
            EXPECT_EQ(out.table.size(), cut - 0x20);
        }
    }
}
