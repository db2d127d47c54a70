#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "PluginRead.h"
#include "TableBuilder.h"
#include "TestSupport.h"

using smbiosdump::formatOverride;
using smbiosdump::PluginRead;
using smbiosdump::readOverrideFile;
using smbiosdump::readOverrideText;
using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

typedef std::vector<uint8_t> Bytes;

// The codes of the import, the header and the table section, for messages.
std::string codes(PluginRead const& read) {
    return "import " + std::to_string(read.imported) + ", header " + std::to_string(read.head) +
           ", table " + std::to_string(read.tables);
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

// ---------------------------------------------------------------------------
// Override text read as the plug-in reads it, in the shapes an edited or
// damaged file may take: the import, header and table codes say what the
// plug-in does with each (8: it reads the machine's own table instead; any
// other failure: an empty table).

TEST(PluginReadOfText, ReadsBlanksMixedCaseAndRunsSpanningLines) {
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
    PluginRead const read = readOverrideText(text);
    ASSERT_TRUE(read.ok()) << codes(read);
    EXPECT_EQ(read.header, (Bytes{0x5F, 0x53, 0x4D, 0x5F}));
    EXPECT_EQ(read.table, (Bytes{0x00, 0x0A, 0x0B, 0x0C}));
}

TEST(PluginReadOfText, SizeBlockIsOptionalAndItsContentIgnored) {
    PluginRead const without = readOverrideText(GOOD_HEAD + "0102\n</SHOWSMBIOS>");
    ASSERT_TRUE(without.ok()) << codes(without);
    EXPECT_EQ(without.table, (Bytes{0x01, 0x02}));
    PluginRead const notNumber =
        readOverrideText(GOOD_HEAD + "<SIZE>not a number: xyz\n</SIZE>03\n</SHOWSMBIOS>");
    ASSERT_TRUE(notNumber.ok()) << codes(notNumber);
    EXPECT_EQ(notNumber.header, (Bytes{0xAA, 0xBB}));
    EXPECT_EQ(notNumber.table, (Bytes{0x03}));
}

TEST(PluginReadOfText, SecondSizeBlockIsSkippedLikeTheFirst) {
    PluginRead const read =
        readOverrideText(GOOD_HEAD + "<SIZE>1</SIZE>01<SIZE>1</SIZE>02</SHOWSMBIOS>");
    ASSERT_TRUE(read.ok()) << codes(read);
    EXPECT_EQ(read.table, (Bytes{0x01, 0x02}));
}

TEST(PluginReadOfText, TextWithoutEndOfHeaderIsNotImported) {
    // Import code 8: the plug-in reads the machine's own table instead.
    for (std::string const& text : {std::string("00<SHOWSMBIOS>"), std::string("<EPHEADER>"),
                                    std::string("<SHOWSMBIOS>\n<EPHEADER>\nAA\n<SIZE>\n"),
                                    std::string("<SHOWSMBIOS\n>"), std::string("<SHOW<SMBIOS>")}) {
        PluginRead const read = readOverrideText(text);
        EXPECT_EQ(read.imported, 8) << text;
        EXPECT_EQ(read.head, -1) << text;
    }
}

TEST(PluginReadOfText, NothingReadAfterTheHeaderIsNotImported) {
    // The table's run reaches the end of the text without a tag after it,
    // so the tokenizer never delivers it.
    PluginRead const read = readOverrideText(GOOD_HEAD + "0102\n");
    EXPECT_EQ(read.imported, 8);
    EXPECT_EQ(read.head, -1);
}

TEST(PluginReadOfText, MissingOrWrongStartTagIsHead4) {
    for (std::string const& start : {std::string(""), std::string("00")}) {
        PluginRead const read =
            readOverrideText(start + "<EPHEADER>\nAABB\n</EPHEADER>\n01\n</SHOWSMBIOS>\n");
        EXPECT_EQ(read.imported, 0) << start;
        EXPECT_EQ(read.head, 4) << start;
        EXPECT_TRUE(read.header.empty()) << start;
        EXPECT_EQ(read.tables, 0) << start;
    }
}

TEST(PluginReadOfText, EmptyEntryPointIsHead12) {
    PluginRead const read =
        readOverrideText("<SHOWSMBIOS>\n<EPHEADER>\n</EPHEADER>\n01\n</SHOWSMBIOS>\n");
    EXPECT_EQ(read.imported, 0);
    EXPECT_EQ(read.head, 12);
    EXPECT_TRUE(read.header.empty());
}

TEST(PluginReadOfText, OddEntryPointIsHead16) {
    PluginRead const read = readOverrideText("<SHOWSMBIOS><EPHEADER>ABC</EPHEADER>01</SHOWSMBIOS>");
    EXPECT_EQ(read.imported, 0);
    EXPECT_EQ(read.head, 16);
    EXPECT_TRUE(read.header.empty());
    EXPECT_EQ(read.tables, 0);
    EXPECT_EQ(read.table, (Bytes{0x01}));
}

TEST(PluginReadOfText, UnclosedEndTagIsTables55) {
    PluginRead const read = readOverrideText(GOOD_HEAD + "01</SHOWSMBIOS");
    EXPECT_EQ(read.imported, 0);
    EXPECT_EQ(read.head, 0);
    EXPECT_EQ(read.tables, 55);
    EXPECT_EQ(read.table, (Bytes{0x01}));
}

TEST(PluginReadOfText, UnclosedSizeBlockIsTables55) {
    PluginRead const read = readOverrideText(GOOD_HEAD + "01<SIZE>1\n</SHOWSMBIOS>");
    EXPECT_EQ(read.imported, 0);
    EXPECT_EQ(read.tables, 55);
    EXPECT_EQ(read.table, (Bytes{0x01}));
}

TEST(PluginReadOfText, TextAfterTheEndTagIsIgnored) {
    for (std::string const& after : {std::string("\n03\n"), std::string("<SHOWSMBIOS>")}) {
        PluginRead const read = readOverrideText(GOOD_HEAD + "0102\n</SHOWSMBIOS>" + after);
        ASSERT_TRUE(read.ok()) << codes(read) << " after " << after;
        EXPECT_EQ(read.table, (Bytes{0x01, 0x02})) << after;
    }
}

TEST(PluginReadOfText, OddRunPairsItsDigitsFromItsStart) {
    // The last digit is dropped; a digit missing in the middle shifts every
    // byte after it.
    PluginRead const last = readOverrideText(GOOD_HEAD + "010\n</SHOWSMBIOS>\n");
    ASSERT_TRUE(last.ok()) << codes(last);
    EXPECT_EQ(last.table, (Bytes{0x01}));
    PluginRead const middle = readOverrideText(GOOD_HEAD + "0102 3 0405\n</SHOWSMBIOS>\n");
    ASSERT_TRUE(middle.ok()) << codes(middle);
    EXPECT_EQ(middle.table, (Bytes{0x01, 0x02, 0x30, 0x40}));
}

TEST(PluginReadOfText, ForeignCharacterInTheTableIsTables55) {
    struct Case {
        std::string run;
        Bytes before;  // what was decoded before the character
    };
    for (Case const& c : {Case{"01G2", {0x01}}, Case{"01\t02", {0x01}}, Case{"x", {}}}) {
        PluginRead const read = readOverrideText(GOOD_HEAD + c.run + "\n</SHOWSMBIOS>\n");
        EXPECT_EQ(read.imported, 0) << c.run;
        EXPECT_EQ(read.head, 0) << c.run;
        EXPECT_EQ(read.tables, 55) << c.run;
        EXPECT_EQ(read.table, c.before) << c.run;
    }
}

TEST(PluginReadOfText, CarriageReturnsAreLineEnds) {
    PluginRead const read = readOverrideText(GOOD_HEAD + "0102\r\n</SHOWSMBIOS>\r\n");
    ASSERT_TRUE(read.ok()) << codes(read);
    EXPECT_EQ(read.table, (Bytes{0x01, 0x02}));
}

TEST(PluginReadOfText, UnknownOrMisplacedTagsInTheTableAreSkipped) {
    for (std::string const& tag :
         {std::string("<FOO>"), std::string("<EPHEADER>"), std::string("</SIZE>")}) {
        PluginRead const read = readOverrideText(GOOD_HEAD + "01\n" + tag + "\n02</SHOWSMBIOS>\n");
        ASSERT_TRUE(read.ok()) << codes(read) << " with " << tag;
        EXPECT_EQ(read.table, (Bytes{0x01, 0x02})) << tag;
    }
}

TEST(PluginReadOfText, EmptyTableSectionReadsAsNoBytes) {
    PluginRead const read = readOverrideText(GOOD_HEAD + "<SIZE>0</SIZE>\n</SHOWSMBIOS>\n");
    ASSERT_TRUE(read.ok()) << codes(read);
    EXPECT_EQ(read.header, (Bytes{0xAA, 0xBB}));
    EXPECT_TRUE(read.table.empty());
}

TEST(PluginReadOfText, TemporaryFileIsRemoved) {
    smbiostest::TempDir tmp;
    smbiostest::ScopedEnv env("TMPDIR", tmp.path());
    PluginRead const read = readOverrideText(GOOD_HEAD + "01\n</SHOWSMBIOS>\n");
    ASSERT_TRUE(read.ok()) << codes(read);
    EXPECT_TRUE(smbiostest::folderEntries(tmp.path()).empty());
}

TEST(PluginReadOfFile, MissingFileGivesTheOpenCodeAndDecodesNothing) {
    smbiostest::TempDir dir;
    PluginRead const read = readOverrideFile(dir.file("absent.txt"));
    EXPECT_EQ(read.imported, ENOENT);
    EXPECT_EQ(read.head, -1);
    EXPECT_EQ(read.tables, -1);
    EXPECT_FALSE(read.ok());
}

TEST(OverrideRoundTrip, RandomTablesSurviveFormatAndPluginRead) {
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
        PluginRead const read = readOverrideText(text);
        ASSERT_TRUE(read.ok()) << codes(read);
        EXPECT_EQ(read.header, header);
        EXPECT_EQ(read.table, table);
        EXPECT_EQ(smbiosdump::tableStats(read.table).count, structures + 1);
    }
}
