#include <gtest/gtest.h>

#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "TableBuilder.h"

using smbiosdump::formatOverride;
using smbiosdump::parseOverride;
using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

// Parses `text`, expecting a refusal whose message contains `what`; the
// outputs stay untouched.
void expectRefused(std::string const& text, std::string const& what) {
    std::vector<uint8_t> header = {0x01};
    std::vector<uint8_t> table = {0x02};
    std::string error;
    EXPECT_FALSE(parseOverride(text, header, table, error)) << text;
    EXPECT_NE(error.find(what), std::string::npos) << "message: " << error << "\ntext:\n" << text;
    EXPECT_EQ(header, std::vector<uint8_t>{0x01});
    EXPECT_EQ(table, std::vector<uint8_t>{0x02});
}

std::string const GOOD_HEAD = "<SHOWSMBIOS>\n<EPHEADER>\nAABB\n</EPHEADER>\n";

}  // namespace

TEST(FormatOverride, WritesExactLayout) {
    std::string const text =
        formatOverride({0x5F, 0x53, 0xab}, {0, 1, 2, 3, 4, 5, 6, 0xFE, 0xFF}, 4);
    EXPECT_EQ(text,
              "<SHOWSMBIOS>\n"
              "<EPHEADER>\n"
              "5F53AB\n"
              "</EPHEADER>\n"
              "<SIZE>\n"
              "9\n"
              "</SIZE>\n"
              "00010203\n"
              "040506FE\n"
              "FF\n"
              "</SHOWSMBIOS>\n");
}

TEST(FormatOverride, DefaultsToThirtyTwoBytesPerLine) {
    std::vector<uint8_t> const table(70, 0xA5);
    std::string const text = formatOverride({0x01}, table);
    std::string row;
    for (int i = 0; i < 32; ++i) {
        row += "A5";
    }
    EXPECT_EQ(text, "<SHOWSMBIOS>\n<EPHEADER>\n01\n</EPHEADER>\n<SIZE>\n70\n</SIZE>\n" + row +
                        "\n" + row + "\nA5A5A5A5A5A5\n</SHOWSMBIOS>\n");
}

TEST(FormatOverride, ZeroBytesPerLinePutsTableOnOneLine) {
    EXPECT_EQ(formatOverride({0x01}, {0x10, 0x20, 0x30}, 0),
              "<SHOWSMBIOS>\n<EPHEADER>\n01\n</EPHEADER>\n<SIZE>\n3\n</SIZE>\n102030\n"
              "</SHOWSMBIOS>\n");
}

TEST(ParseOverride, ReadsBlanksMixedCaseAndRunsSpanningLines) {
    std::string const text =
        "  <showsmbios>\n"
        "< EPHeader >\n"
        "5f 53\n"
        "4D5f\n"
        "</ephEADER>\n"
        "00 0a\n"
        "<size> 1234\n"
        "</SIZE>\n"
        "0b0C\n"
        "  </ShowSmbios >  \n";
    std::vector<uint8_t> header;
    std::vector<uint8_t> table;
    std::string error;
    ASSERT_TRUE(parseOverride(text, header, table, error)) << error;
    EXPECT_EQ(header, (std::vector<uint8_t>{0x5F, 0x53, 0x4D, 0x5F}));
    EXPECT_EQ(table, (std::vector<uint8_t>{0x00, 0x0A, 0x0B, 0x0C}));
}

TEST(ParseOverride, SizeBlockIsOptionalAndItsContentIgnored) {
    std::vector<uint8_t> header;
    std::vector<uint8_t> table;
    std::string error;
    ASSERT_TRUE(parseOverride(GOOD_HEAD + "0102\n</SHOWSMBIOS>", header, table, error)) << error;
    EXPECT_EQ(table, (std::vector<uint8_t>{0x01, 0x02}));
    ASSERT_TRUE(parseOverride(GOOD_HEAD + "<SIZE>not a number: xyz\n</SIZE>03\n</SHOWSMBIOS>",
                              header, table, error))
        << error;
    EXPECT_EQ(header, (std::vector<uint8_t>{0xAA, 0xBB}));
    EXPECT_EQ(table, (std::vector<uint8_t>{0x03}));
}

TEST(ParseOverride, RefusesMissingStartTag) {
    expectRefused("", "expected <SHOWSMBIOS>, found the end of the file");
    expectRefused("00<SHOWSMBIOS>", "expected <SHOWSMBIOS>, found a data run");
    expectRefused("<EPHEADER>", "expected <SHOWSMBIOS>, found <EPHEADER>");
}

TEST(ParseOverride, RefusesMissingEndTag) {
    expectRefused(GOOD_HEAD + "0102\n", "ends without </SHOWSMBIOS>");
}

TEST(ParseOverride, RefusesAnythingAfterEndTag) {
    expectRefused(GOOD_HEAD + "0102\n</SHOWSMBIOS>\n03\n", "a data run after </SHOWSMBIOS>");
    expectRefused(GOOD_HEAD + "0102\n</SHOWSMBIOS><SHOWSMBIOS>", "after </SHOWSMBIOS>");
}

TEST(ParseOverride, RefusesOddNumberOfHexDigits) {
    expectRefused(GOOD_HEAD + "010\n</SHOWSMBIOS>\n", "line 5: data run has an odd number");
    expectRefused("<SHOWSMBIOS><EPHEADER>ABC</EPHEADER>01</SHOWSMBIOS>", "odd number");
}

TEST(ParseOverride, RefusesForeignCharacters) {
    expectRefused(GOOD_HEAD + "01G2\n</SHOWSMBIOS>\n", "line 5: unexpected character 'G'");
    expectRefused(GOOD_HEAD + "01\t02\n</SHOWSMBIOS>\n", "unexpected character 0x09");
    expectRefused(GOOD_HEAD + "0102\r\n</SHOWSMBIOS>\n", "unexpected character 0x0D");
    expectRefused(GOOD_HEAD + "x\n</SHOWSMBIOS>\n", "unexpected character 'x'");
}

TEST(ParseOverride, RefusesUnknownOrMisplacedTags) {
    expectRefused(GOOD_HEAD + "01\n<FOO>\n</SHOWSMBIOS>\n", "unexpected tag <FOO>");
    expectRefused(GOOD_HEAD + "01\n<EPHEADER>\n</SHOWSMBIOS>\n", "unexpected tag <EPHEADER>");
    expectRefused(GOOD_HEAD + "01\n</SIZE>\n</SHOWSMBIOS>\n", "unexpected tag </SIZE>");
    expectRefused("<SHOWSMBIOS>\n<EPHEADER>\nAA\n<SIZE>\n", "expected </EPHEADER>, found <SIZE>");
}

TEST(ParseOverride, RefusesEmptyEntryPoint) {
    expectRefused("<SHOWSMBIOS>\n<EPHEADER>\n</EPHEADER>\n01\n</SHOWSMBIOS>\n",
                  "expected the entry point's bytes, found </EPHEADER>");
}

TEST(ParseOverride, RefusesEmptyTable) {
    expectRefused(GOOD_HEAD + "<SIZE>0</SIZE>\n</SHOWSMBIOS>\n", "the table section holds no data");
}

TEST(ParseOverride, RefusesSecondSizeBlock) {
    expectRefused(GOOD_HEAD + "<SIZE>1</SIZE>01<SIZE>1</SIZE></SHOWSMBIOS>",
                  "a second <SIZE> block");
}

TEST(ParseOverride, RefusesUnclosedSizeBlock) {
    expectRefused(GOOD_HEAD + "01<SIZE>1\n</SHOWSMBIOS>", "expected </SIZE>, found </SHOWSMBIOS>");
}

TEST(ParseOverride, RefusesUnclosedTags) {
    expectRefused("<SHOWSMBIOS\n>", "line 1: tag not closed on its line");
    expectRefused(GOOD_HEAD + "01</SHOWSMBIOS", "tag not closed at the end of the file");
    expectRefused("<SHOW<SMBIOS>", "'<' inside a tag");
}

TEST(OverrideRoundTrip, RandomTablesSurviveFormatAndParse) {
    std::mt19937 random(20240611u);
    auto below = [&random](uint32_t n) { return static_cast<uint32_t>(random() % n); };
    for (int round = 0; round < 200; ++round) {
        SCOPED_TRACE("round " + std::to_string(round));
        TableBuilder builder;
        uint32_t const structures = 1 + below(24);
        for (uint32_t i = 0; i < structures; ++i) {
            Structure s(static_cast<uint8_t>(below(127)), static_cast<uint16_t>(i));
            uint32_t const fields = below(40);
            for (uint32_t f = 0; f < fields; ++f) {
                s.byte(static_cast<uint8_t>(below(256)));
            }
            uint32_t const strings = below(5);
            for (uint32_t k = 0; k < strings; ++k) {
                std::string text;
                uint32_t const length = 1 + below(24);
                for (uint32_t c = 0; c < length; ++c) {
                    text += static_cast<char>(1 + below(255));  // any byte but NUL
                }
                s.str(text);
            }
            builder.add(s);
        }
        builder.endOfTable(static_cast<uint16_t>(structures));
        std::vector<uint8_t> const table = builder.build();
        std::vector<uint8_t> header;
        if (round % 2 == 0) {
            header = smbiosdump::makeSmEntryPoint(2, static_cast<uint8_t>(below(9)),
                                                  static_cast<uint16_t>(table.size()), 0x20,
                                                  builder.count(), builder.maxSize());
        } else {
            header.resize(1 + below(40));
            for (uint8_t& b : header) {
                b = static_cast<uint8_t>(below(256));
            }
        }
        size_t const bytesPerLine = round % 3 == 0 ? 32 : below(80);
        std::string const text = formatOverride(header, table, bytesPerLine);
        std::vector<uint8_t> readHeader;
        std::vector<uint8_t> readTable;
        std::string error;
        ASSERT_TRUE(parseOverride(text, readHeader, readTable, error)) << error;
        EXPECT_EQ(readHeader, header);
        EXPECT_EQ(readTable, table);
        EXPECT_EQ(smbiosdump::tableStats(readTable).count, structures + 1);
    }
}
