#include <gtest/gtest.h>

#include <cstdint>
#include <stdexcept>
#include <string>
#include <vector>

#include "TableBuilder.h"

using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

std::vector<uint8_t> concat(std::vector<std::vector<uint8_t>> const& parts) {
    std::vector<uint8_t> out;
    for (auto const& part : parts) {
        out.insert(out.end(), part.begin(), part.end());
    }
    return out;
}

std::vector<uint8_t> text(std::string const& s) { return std::vector<uint8_t>(s.begin(), s.end()); }

}  // namespace

TEST(StructureBuilder, WritesHeaderAndLittleEndianFields) {
    std::vector<uint8_t> const bytes = Structure(0x11, 0x1234)
                                           .byte(0xAB)
                                           .word(0x0102)
                                           .dword(0x03040506)
                                           .qword(0x0708090A0B0C0D0Eull)
                                           .build();
    std::vector<uint8_t> const expected = {0x11, 0x13, 0x34, 0x12,  // type, length 4+15, handle
                                           0xAB,                    // byte
                                           0x02, 0x01,              // word
                                           0x06, 0x05, 0x04, 0x03,  // dword
                                           0x0E, 0x0D, 0x0C, 0x0B, 0x0A, 0x09, 0x08, 0x07,  // qword
                                           0x00, 0x00};  // no strings
    EXPECT_EQ(bytes, expected);
}

TEST(StructureBuilder, NoFieldsNoStringsIsFourBytesAndTwoNuls) {
    EXPECT_EQ(Structure(127, 0xFEFF).build(),
              (std::vector<uint8_t>{0x7F, 0x04, 0xFF, 0xFE, 0x00, 0x00}));
}

TEST(StructureBuilder, StringFieldsAreNumberedInOrderAndEmptyWritesZero) {
    std::vector<uint8_t> const bytes = Structure(1, 2)
                                           .str("Corvane")
                                           .str("")
                                           .str("RS")
                                           .strNumber(7)
                                           .addString("extra")
                                           .str("Corvane")
                                           .build();
    std::vector<uint8_t> const expected =
        concat({{0x01, 0x09, 0x02, 0x00, 0x01, 0x00, 0x02, 0x07, 0x04},
                text("Corvane"),
                {0},
                text("RS"),
                {0},
                text("extra"),
                {0},
                text("Corvane"),
                {0},
                {0}});
    EXPECT_EQ(bytes, expected);
}

TEST(StructureBuilder, StringsEndWithSingleExtraNul) {
    std::vector<uint8_t> const bytes = Structure(3, 1).str("A").build();
    EXPECT_EQ(bytes, (std::vector<uint8_t>{0x03, 0x05, 0x01, 0x00, 0x01, 'A', 0x00, 0x00}));
}

TEST(StructureBuilder, BytesAppendsFieldsInOrder) {
    std::vector<uint8_t> const bytes = Structure(1, 0).bytes({1, 2, 3}).byte(4).build();
    EXPECT_EQ(bytes, (std::vector<uint8_t>{0x01, 0x08, 0x00, 0x00, 1, 2, 3, 4, 0, 0}));
}

TEST(StructureBuilder, ForcedLengthReplacesComputedLengthButKeepsFields) {
    std::vector<uint8_t> const bytes = Structure(4, 0x0010).word(0xBEEF).length(0x28).build();
    EXPECT_EQ(bytes, (std::vector<uint8_t>{0x04, 0x28, 0x10, 0x00, 0xEF, 0xBE, 0x00, 0x00}));
    std::vector<uint8_t> const shorter = Structure(4, 0x0010).word(0xBEEF).length(2).build();
    EXPECT_EQ(shorter[1], 2);
    EXPECT_EQ(shorter.size(), 8u);
}

TEST(StructureBuilder, NoTerminatorOmitsDoubleNulWithoutStrings) {
    EXPECT_EQ(Structure(2, 1).byte(9).noTerminator().build(),
              (std::vector<uint8_t>{0x02, 0x05, 0x01, 0x00, 0x09}));
}

TEST(StructureBuilder, NoTerminatorEndsAfterLastStringText) {
    std::vector<uint8_t> const bytes = Structure(2, 1).str("AB").str("C").noTerminator().build();
    EXPECT_EQ(bytes,
              (std::vector<uint8_t>{0x02, 0x06, 0x01, 0x00, 0x01, 0x02, 'A', 'B', 0x00, 'C'}));
}

TEST(StructureBuilder, OversizedFormattedAreaThrowsUnlessLengthForced) {
    Structure big(200, 1);
    big.bytes(std::vector<uint8_t>(252, 0x55));  // 4 + 252 = 256 bytes
    EXPECT_THROW(big.build(), std::length_error);
    big.length(0xFF);
    std::vector<uint8_t> const bytes = big.build();
    EXPECT_EQ(bytes.size(), 256u + 2u);
    EXPECT_EQ(bytes[1], 0xFF);
    EXPECT_EQ(Structure(200, 1).bytes(std::vector<uint8_t>(251, 0)).build()[1], 0xFF);
}

TEST(StructureBuilder, ReportsTypeHandleAndSizes) {
    Structure s(17, 0x1100);
    s.word(1).str("DIMM_A1").addString("x");
    EXPECT_EQ(s.type(), 17);
    EXPECT_EQ(s.handle(), 0x1100);
    EXPECT_EQ(s.formattedSize(), 7u);
    EXPECT_EQ(s.stringCount(), 2u);
}

TEST(TableBuilder, ConcatenatesStructuresInOrderAndCountsThem) {
    Structure const first = Structure(0, 0x0000).str("Corvane");
    Structure const second = Structure(1, 0x0001).byte(6);
    std::vector<uint8_t> const raw = {0xDD, 0x05, 0x02, 0x00, 0x01, 0x00, 0x00};
    TableBuilder table;
    table.add(first).add(second).addRaw(raw).endOfTable(0x0003);
    std::vector<uint8_t> const expected =
        concat({first.build(), second.build(), raw, {0x7F, 0x04, 0x03, 0x00, 0x00, 0x00}});
    EXPECT_EQ(table.build(), expected);
    EXPECT_EQ(table.count(), 4);
    EXPECT_EQ(table.size(), expected.size());
    EXPECT_EQ(table.maxSize(), first.build().size());
}

TEST(TableBuilder, EmptyBuilderIsEmpty) {
    TableBuilder table;
    EXPECT_TRUE(table.build().empty());
    EXPECT_EQ(table.count(), 0);
    EXPECT_EQ(table.maxSize(), 0);
}
