#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "TableBuilder.h"
#include "TestSupport.h"

using smbiostest::byteSum;
using smbiostest::dword;
using smbiostest::Structure;
using smbiostest::TableBuilder;
using smbiostest::word;

TEST(SmEntryPoint, FieldsLandAtTheirOffsets) {
    std::vector<uint8_t> const ep =
        smbiosdump::makeSmEntryPoint(2, 7, 0x1234, 0x000F0010, 0x0056, 0x0098);
    ASSERT_EQ(ep.size(), 31u);
    EXPECT_EQ(std::string(ep.begin(), ep.begin() + 4), "_SM_");
    EXPECT_EQ(ep[5], 0x1F);
    EXPECT_EQ(ep[6], 2);
    EXPECT_EQ(ep[7], 7);
    EXPECT_EQ(word(ep, 0x08), 0x0098);
    EXPECT_EQ(ep[0x0A], 0);
    for (size_t i = 0x0B; i < 0x10; ++i) {
        EXPECT_EQ(ep[i], 0) << "formatted area byte " << i;
    }
    EXPECT_EQ(std::string(ep.begin() + 0x10, ep.begin() + 0x15), "_DMI_");
    EXPECT_EQ(word(ep, 0x16), 0x1234);
    EXPECT_EQ(dword(ep, 0x18), 0x000F0010u);
    EXPECT_EQ(word(ep, 0x1C), 0x0056);
    EXPECT_EQ(ep[0x1E], 0x27);
}

TEST(SmEntryPoint, BothChecksumsSumToZero) {
    for (uint16_t length : {0x0001, 0x0ABC, 0xFFFF}) {
        for (uint32_t address : {0x00000020u, 0x000F0000u, 0xFFFFFFFFu}) {
            std::vector<uint8_t> const ep =
                smbiosdump::makeSmEntryPoint(2, 8, length, address, 27, 276);
            EXPECT_EQ(byteSum(ep, 0, ep[5]), 0) << length << " " << address;
            EXPECT_EQ(byteSum(ep, 0x10, 0x1F), 0) << length << " " << address;
        }
    }
}

TEST(SmEntryPoint, BcdRevisionIsZeroWhenMajorOrMinorAboveNine) {
    EXPECT_EQ(smbiosdump::makeSmEntryPoint(2, 4, 1, 0, 1, 1)[0x1E], 0x24);
    EXPECT_EQ(smbiosdump::makeSmEntryPoint(3, 2, 1, 0, 1, 1)[0x1E], 0x32);
    EXPECT_EQ(smbiosdump::makeSmEntryPoint(2, 10, 1, 0, 1, 1)[0x1E], 0);
    EXPECT_EQ(smbiosdump::makeSmEntryPoint(10, 0, 1, 0, 1, 1)[0x1E], 0);
    std::vector<uint8_t> const ep = smbiosdump::makeSmEntryPoint(2, 10, 1, 0, 1, 1);
    EXPECT_EQ(byteSum(ep, 0, 0x1F), 0);
}

TEST(DmiEntryPoint, FieldsLandAtTheirOffsetsAndChecksumSumsToZero) {
    std::vector<uint8_t> const ep = smbiosdump::makeDmiEntryPoint(0x21, 0x0ABC, 0x000E8000, 42);
    ASSERT_EQ(ep.size(), 15u);
    EXPECT_EQ(std::string(ep.begin(), ep.begin() + 5), "_DMI_");
    EXPECT_EQ(word(ep, 6), 0x0ABC);
    EXPECT_EQ(dword(ep, 8), 0x000E8000u);
    EXPECT_EQ(word(ep, 12), 42);
    EXPECT_EQ(ep[14], 0x21);
    EXPECT_EQ(byteSum(ep, 0, 15), 0);
}

TEST(TableStats, CountsStructuresAndFindsLargestOnBuiltTable) {
    Structure const large = Structure(4, 2).word(1).str("Intel(R) Xeon(R)").str("CPU1");
    TableBuilder table;
    table.add(Structure(0, 0).str("Corvane"))
        .add(Structure(1, 1).bytes(std::vector<uint8_t>(23, 0)))
        .add(large)
        .endOfTable(3);
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table.build());
    EXPECT_EQ(stats.count, 4);
    EXPECT_EQ(stats.maxSize, large.build().size());
    EXPECT_FALSE(stats.cut);
}

TEST(TableStats, StopsAfterEndOfTableStructure) {
    TableBuilder table;
    table.add(Structure(0, 0)).endOfTable(1).add(Structure(1, 2).str("after the end"));
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table.build());
    EXPECT_EQ(stats.count, 2);
    EXPECT_EQ(stats.maxSize, 6);
    EXPECT_FALSE(stats.cut) << "what follows the end-of-table structure is not read";
}

TEST(TableStats, CountsWholeTableWithoutEndOfTable) {
    TableBuilder table;
    table.add(Structure(0, 0)).add(Structure(1, 1).str("A")).add(Structure(2, 2));
    EXPECT_EQ(smbiosdump::tableStats(table.build()).count, 3);
    EXPECT_FALSE(smbiosdump::tableStats(table.build()).cut);
}

TEST(TableStats, StopsBeforeUnterminatedStructure) {
    TableBuilder table;
    table.add(Structure(0, 0).str("ok")).add(Structure(1, 1).str("cut").noTerminator());
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table.build());
    EXPECT_EQ(stats.count, 1);
    EXPECT_EQ(stats.maxSize, 9);
    EXPECT_TRUE(stats.cut);
}

TEST(TableStats, StopsBeforeStructureWhoseLengthPassesTheEnd) {
    TableBuilder table;
    table.add(Structure(0, 0)).add(Structure(1, 1).byte(0).length(0x40));
    EXPECT_EQ(smbiosdump::tableStats(table.build()).count, 1);
    EXPECT_TRUE(smbiosdump::tableStats(table.build()).cut);
}

TEST(TableStats, StopsAtLengthBelowFour) {
    TableBuilder table;
    table.add(Structure(0, 0)).add(Structure(1, 1).length(3)).add(Structure(2, 2));
    EXPECT_EQ(smbiosdump::tableStats(table.build()).count, 1);
    EXPECT_TRUE(smbiosdump::tableStats(table.build()).cut);
}

TEST(TableStats, EmptyAndTinyTablesCountNothing) {
    EXPECT_EQ(smbiosdump::tableStats({}).count, 0);
    EXPECT_EQ(smbiosdump::tableStats({0x00, 0x04, 0x00}).count, 0);
    EXPECT_EQ(smbiosdump::tableStats({0x00, 0x04, 0x00, 0x00, 0x00}).count, 0);
    EXPECT_EQ(smbiosdump::tableStats({0x00, 0x04, 0x00, 0x00, 0x00, 0x00}).count, 1);
    EXPECT_FALSE(smbiosdump::tableStats({}).cut);
    EXPECT_TRUE(smbiosdump::tableStats({0x00, 0x04, 0x00}).cut);
    EXPECT_TRUE(smbiosdump::tableStats({0x00, 0x04, 0x00, 0x00, 0x00}).cut);
    EXPECT_FALSE(smbiosdump::tableStats({0x00, 0x04, 0x00, 0x00, 0x00, 0x00}).cut);
}

TEST(TableStats, OneToThreeBytesAfterTheLastStructureAreACutOne) {
    std::vector<uint8_t> table = TableBuilder().add(Structure(0, 0).str("ok")).build();
    for (uint8_t extra = 1; extra <= 3; ++extra) {
        table.push_back(0x01);
        smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
        EXPECT_EQ(stats.count, 1) << int(extra);
        EXPECT_TRUE(stats.cut) << int(extra);
    }
}
