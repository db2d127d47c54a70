// The override dump file: the tokenizer, the import of the file into header
// and table tokens, and the decoding of those tokens into bytes, with their
// result codes and log lines.
//
// The tokenizer keeps its line and position in process-wide statics. Every
// test reads its files to the end (importSmBios always does), so that no
// half-read line is left for the next one.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "SD/PlatformUtilities.h"
#include "TestSupport.h"
#include "smbios/SmBiosInitializer.h"

using smbiostest::LogCapture;
using smbiostest::Structure;
using smbiostest::TableBuilder;
using smbiostest::TempDir;
using smbiostest::writeFile;

namespace {

typedef std::vector<unsigned char> Bytes;
typedef std::vector<std::string> Tokens;

// Two hexadecimal digits a byte, upper case, no blanks.
std::string hexUpper(Bytes const& bytes) {
    static char const digits[] = "0123456789ABCDEF";
    std::string text;
    for (unsigned char b : bytes) {
        text += digits[b >> 4];
        text += digits[b & 0x0F];
    }
    return text;
}

// Two hexadecimal digits a byte, lower case, a blank between every two digits.
std::string hexLowerSpaced(Bytes const& bytes) {
    static char const digits[] = "0123456789abcdef";
    std::string text;
    for (unsigned char b : bytes) {
        if (!text.empty()) {
            text += ' ';
        }
        text += digits[b >> 4];
        text += digits[b & 0x0F];
    }
    return text;
}

// A small valid entry point and table, as a real override file holds them.
Bytes sampleTable() {
    return TableBuilder()
        .add(Structure(0, 0x0000).str("Corvane").str("1.02").byte(0x0F))
        .add(Structure(1, 0x0001).str("Corvane").str("RS-7400").byte(6))
        .endOfTable(0x0002)
        .build();
}

Bytes sampleHeader() {
    Bytes const table = sampleTable();
    return smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(table.size()), 0x000F0000, 3,
                                        64);
}

// The start of an override file: the <SHOWSMBIOS> tag and the entry
// point's block, every line ended by "\n".
std::string fileStart(Bytes const& header) {
    return "<SHOWSMBIOS>\n<EPHEADER>\n" + hexUpper(header) + "\n</EPHEADER>\n";
}

// Writes the text into a fresh file and imports it.
struct Imported {
    int result = -1;
    Tokens head;
    Tokens tables;
};

Imported importText(TempDir const& dir, std::string const& text) {
    std::string const path = dir.file("smbios.txt");
    writeFile(path, text);
    Imported imported;
    imported.result = SD::importSmBios(path, imported.head, imported.tables);
    return imported;
}

// Writes the text into a fresh file and reads every token of it with the
// tokenizer, up to the end of the file.
Tokens tokenize(std::string const& text) {
    TempDir dir;
    std::string const path = dir.file("tokens.txt");
    writeFile(path, text);
    SD::_FileHandle* file = nullptr;
    Tokens tokens;
    if (SD::PlatformUtilities::openFile(path.c_str(), &file, 0, 0) != 0) {
        ADD_FAILURE() << "cannot open " << path;
        return tokens;
    }
    std::string token;
    int code = 0;
    while ((code = SD::readTableLine(file, token)) == 0) {
        tokens.push_back(token);
    }
    EXPECT_EQ(code, 8) << "the tokenizer ends with 8 at the end of the file";
    SD::PlatformUtilities::closeFile(&file);
    return tokens;
}

Tokens goodHead(Bytes const& header) {
    return Tokens{"<SHOWSMBIOS>", "<EPHEADER>", hexUpper(header), "</EPHEADER>"};
}

// The decoder (SD::readHead or SD::readTables) turns the tokens with code 0
// into exactly `expected`.
::testing::AssertionResult decodes(int (*decoder)(Bytes&, Tokens const&), Tokens const& tokens,
                                   Bytes const& expected) {
    Bytes bytes;
    int const code = decoder(bytes, tokens);
    if (code != 0) {
        return ::testing::AssertionFailure() << "code " << code << ", expected 0";
    }
    if (bytes != expected) {
        return ::testing::AssertionFailure()
               << "decoded " << hexUpper(bytes) << ", expected " << hexUpper(expected);
    }
    return ::testing::AssertionSuccess();
}

// readHead refuses every one of the header token lists with `code`,
// decodes no byte and logs `logged`.
void expectHeadRefused(std::vector<Tokens> const& heads, int code, std::string const& logged) {
    for (Tokens const& head : heads) {
        LogCapture log;
        Bytes bytes;
        EXPECT_EQ(SD::readHead(bytes, head), code) << head.size() << " tokens";
        EXPECT_TRUE(bytes.empty()) << head.size() << " tokens";
        EXPECT_TRUE(log.contains(logged)) << log.dump();
    }
}

}  // namespace

// ---------------------------------------------------------------------------
// A whole file

TEST(SmBiosImport, WellFormedFileDecodesToHeaderAndTable) {
    TempDir dir;
    Bytes const header = sampleHeader();
    Bytes const table = sampleTable();
    std::string const text = fileStart(header) + "<SIZE>\n" + std::to_string(table.size()) +
                             "\n</SIZE>\n" + hexUpper(table) + "\n</SHOWSMBIOS>\n";
    LogCapture log;
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0) << log.dump();
    EXPECT_EQ(imported.head, goodHead(header));
    EXPECT_EQ(imported.tables, (Tokens{"<SIZE>", std::to_string(table.size()), "</SIZE>",
                                       hexUpper(table), "</SHOWSMBIOS>"}));
    EXPECT_TRUE(decodes(SD::readHead, imported.head, header));
    EXPECT_TRUE(decodes(SD::readTables, imported.tables, table));
    EXPECT_TRUE(log.contains("importSmBios() checking for " + dir.file("smbios.txt")))
        << log.dump();
    EXPECT_TRUE(log.contains("importSmBios() header='<SHOWSMBIOS>'")) << log.dump();
    EXPECT_TRUE(log.contains("importSmBios() header='</EPHEADER>'")) << log.dump();
    EXPECT_TRUE(log.contains("importSmBios() table='</SHOWSMBIOS>'")) << log.dump();
    EXPECT_TRUE(log.contains("importSmBios() file close code 0")) << log.dump();
    EXPECT_TRUE(log.contains("readHead() exit code 0")) << log.dump();
}

TEST(SmBiosImport, LowerCaseTagAndBlanksInsideBracketsAreAccepted) {
    TempDir dir;
    Bytes const header = sampleHeader();
    Bytes const table = sampleTable();
    std::string const text = "<showsmbios>\n< EPHEADER >\n" + hexUpper(header) + "\n</EPHEADER>\n" +
                             hexUpper(table) + "\n</ShowSmBios>\n";
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0);
    EXPECT_EQ(imported.head, goodHead(header));
    EXPECT_TRUE(decodes(SD::readHead, imported.head, header));
    EXPECT_TRUE(decodes(SD::readTables, imported.tables, table));
}

TEST(SmBiosImport, HeaderDataRunSplitOverTwoLinesIsOneToken) {
    TempDir dir;
    Bytes const header = sampleHeader();
    std::string const digits = hexUpper(header);
    std::string const text = "<SHOWSMBIOS>\n<EPHEADER>\n" + digits.substr(0, 8) + "\n" +
                             digits.substr(8) + "\n</EPHEADER>\n" + hexUpper(sampleTable()) +
                             "\n</SHOWSMBIOS>\n";
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0);
    ASSERT_EQ(imported.head.size(), 4u);
    EXPECT_EQ(imported.head[2], digits);
    EXPECT_TRUE(decodes(SD::readHead, imported.head, header));
}

TEST(SmBiosImport, LowerCaseHexWithBlanksDecodesLikeUpperCaseWithout) {
    TempDir dir;
    Bytes const header = sampleHeader();
    Bytes const table = sampleTable();
    Imported const upper =
        importText(dir, fileStart(header) + hexUpper(table) + "\n</SHOWSMBIOS>\n");
    Imported const lower =
        importText(dir, "<SHOWSMBIOS>\n<EPHEADER>\n" + hexLowerSpaced(header) + "\n</EPHEADER>\n" +
                            hexLowerSpaced(table) + "\n</SHOWSMBIOS>\n");
    ASSERT_EQ(upper.result, 0);
    ASSERT_EQ(lower.result, 0);
    EXPECT_TRUE(decodes(SD::readHead, upper.head, header));
    EXPECT_TRUE(decodes(SD::readHead, lower.head, header));
    EXPECT_TRUE(decodes(SD::readTables, upper.tables, table));
    EXPECT_TRUE(decodes(SD::readTables, lower.tables, table));
}

TEST(SmBiosImport, TableDataRunSpanningLinesIsOneRun) {
    TempDir dir;
    Bytes const table = sampleTable();
    std::string const digits = hexUpper(table);
    std::string text = fileStart(sampleHeader());
    for (size_t pos = 0; pos < digits.size(); pos += 10) {
        text += digits.substr(pos, 10) + "\n";
    }
    text += "</SHOWSMBIOS>\n";
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0);
    EXPECT_EQ(imported.tables, (Tokens{digits, "</SHOWSMBIOS>"}));
    EXPECT_TRUE(decodes(SD::readTables, imported.tables, table));
}

TEST(SmBiosImport, LostFinalDataRunMakesReadTables55) {
    TempDir dir;
    std::string const text = fileStart(sampleHeader()) + "0102\n<OTHER>\n0304\n";
    LogCapture log;
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0) << log.dump();
    // The last run reached the end of the file without a following tag.
    EXPECT_EQ(imported.tables, (Tokens{"0102", "<OTHER>"}));
    Bytes tableBytes;
    EXPECT_EQ(SD::readTables(tableBytes, imported.tables), 55);
    EXPECT_EQ(tableBytes, (Bytes{0x01, 0x02}));
    EXPECT_TRUE(log.contains("readTables() terminating </SHOWSMBIOS> was not found 55"))
        << log.dump();
}

TEST(SmBiosImport, SizeBlockBetweenTableRunsContributesNoBytes) {
    TempDir dir;
    std::string const text =
        fileStart(sampleHeader()) + "0102\n<SIZE>\nAABB\n</SIZE>\n0304\n</SHOWSMBIOS>\n";
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0);
    EXPECT_EQ(imported.tables,
              (Tokens{"0102", "<SIZE>", "AABB", "</SIZE>", "0304", "</SHOWSMBIOS>"}));
    EXPECT_TRUE(decodes(SD::readTables, imported.tables, Bytes{0x01, 0x02, 0x03, 0x04}));
}

TEST(SmBiosImport, OnlyTheFourHeaderTokensMakeImport8) {
    TempDir dir;
    LogCapture log;
    Imported const imported = importText(dir, fileStart(sampleHeader()));
    EXPECT_EQ(imported.result, 8);
    EXPECT_EQ(imported.head.size(), 4u);
    EXPECT_TRUE(imported.tables.empty());
    EXPECT_TRUE(log.contains("importSmBios() file ended before tables read, no tables made"))
        << log.dump();
    EXPECT_FALSE(log.contains("importSmBios() </EPHEADER> not found"));
}

TEST(SmBiosImport, MissingEndOfHeaderMakesImport8) {
    TempDir dir;
    LogCapture log;
    Imported const imported =
        importText(dir, "<SHOWSMBIOS>\n<EPHEADER>\n" + hexUpper(sampleHeader()) + "\n<EPHEADER>\n" +
                            hexUpper(sampleTable()) + "\n</SHOWSMBIOS>\n");
    EXPECT_EQ(imported.result, 8);
    EXPECT_TRUE(imported.tables.empty());
    EXPECT_EQ(imported.head.size(), 6u);
    EXPECT_TRUE(log.contains("importSmBios() </EPHEADER> not found, no tables made")) << log.dump();
    EXPECT_FALSE(log.contains("importSmBios() file ended before tables read"));
}

TEST(SmBiosImport, HeaderEndsAtATokenThatContainsTheEndTag) {
    TempDir dir;
    LogCapture log;
    Imported const imported =
        importText(dir, "<SHOWSMBIOS>\n<EPHEADER>\n" + hexUpper(sampleHeader()) +
                            "\n<X</EPHEADER>\n0102\n</SHOWSMBIOS>\n");
    ASSERT_EQ(imported.result, 0) << log.dump();
    ASSERT_EQ(imported.head.size(), 4u);
    EXPECT_EQ(imported.head[3], "<X</EPHEADER>");
    EXPECT_EQ(imported.tables, (Tokens{"0102", "</SHOWSMBIOS>"}));
    // The header check compares whole tokens.
    Bytes headBytes;
    EXPECT_EQ(SD::readHead(headBytes, imported.head), 12);
    EXPECT_TRUE(log.contains("readHead() fourth line '</EPHEADER>' missing ")) << log.dump();
}

TEST(SmBiosImport, EmptyFileMakesImport8) {
    TempDir dir;
    LogCapture log;
    Imported const imported = importText(dir, "");
    EXPECT_EQ(imported.result, 8);
    EXPECT_TRUE(imported.head.empty());
    EXPECT_TRUE(imported.tables.empty());
    EXPECT_TRUE(log.contains("importSmBios() </EPHEADER> not found, no tables made")) << log.dump();
}

TEST(SmBiosImport, MissingFileReturnsTheOpenCode) {
    TempDir dir;
    std::string const path = dir.file("SmBiosOverride/smbios.txt");
    Tokens head;
    Tokens tables;
    LogCapture log;
    int const result = SD::importSmBios(path, head, tables);
    EXPECT_NE(result, 0);
    EXPECT_EQ(result, ENOENT);
    EXPECT_TRUE(head.empty());
    EXPECT_TRUE(tables.empty());
    EXPECT_TRUE(log.contains("importSmBios() checking for " + path)) << log.dump();
    EXPECT_TRUE(log.contains("importSmBios() file not found, using machine SMBios" +
                             std::to_string(ENOENT)))
        << log.dump();
    EXPECT_FALSE(log.contains("importSmBios() file close code"));
}

TEST(SmBiosImport, CrLfLineEndsAreHandled) {
    TempDir dir;
    Bytes const header = sampleHeader();
    Bytes const table = sampleTable();
    std::string const digits = hexUpper(table);
    std::string const text = "<SHOWSMBIOS>\r\n<EPHEADER>\r\n" + hexUpper(header) +
                             "\r\n</EPHEADER>\r\n" + digits.substr(0, 16) + "\r\n" +
                             digits.substr(16) + "\r\n</SHOWSMBIOS>\r\n";
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0);
    EXPECT_EQ(imported.head, goodHead(header));
    EXPECT_EQ(imported.tables, (Tokens{digits, "</SHOWSMBIOS>"}));
    EXPECT_TRUE(decodes(SD::readHead, imported.head, header));
    EXPECT_TRUE(decodes(SD::readTables, imported.tables, table));
}

TEST(SmBiosImport, TagsInTheMiddleOfTableDataAreIgnored) {
    TempDir dir;
    std::string const text =
        fileStart(sampleHeader()) + "01 02<NOTE>03\n04<Comment >05 06\n</SHOWSMBIOS>\n";
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0);
    EXPECT_EQ(imported.tables,
              (Tokens{"0102", "<NOTE>", "0304", "<COMMENT>", "0506", "</SHOWSMBIOS>"}));
    EXPECT_TRUE(decodes(SD::readTables, imported.tables, Bytes{1, 2, 3, 4, 5, 6}));
}

TEST(SmBiosImport, NothingAfterTheEndTagIsDecoded) {
    TempDir dir;
    std::string const text = fileStart(sampleHeader()) + "0A0B\n</SHOWSMBIOS>\nZZ not hex\n<X>\n";
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0);
    LogCapture log;
    EXPECT_TRUE(decodes(SD::readTables, imported.tables, Bytes{0x0A, 0x0B}));
    EXPECT_FALSE(log.contains("byteHex: Invalid hexadecimal digit")) << log.dump();
}

TEST(SmBiosImport, TabsAreKeptAndFailAsHexDigits) {
    TempDir dir;
    std::string const text = fileStart(sampleHeader()) + "01\t02\n</SHOWSMBIOS>\n";
    Imported const imported = importText(dir, text);
    ASSERT_EQ(imported.result, 0);
    ASSERT_FALSE(imported.tables.empty());
    EXPECT_EQ(imported.tables[0], "01\t02");
    LogCapture log;
    Bytes tableBytes;
    EXPECT_EQ(SD::readTables(tableBytes, imported.tables), 55);
    EXPECT_EQ(tableBytes, (Bytes{0x01}));
    EXPECT_TRUE(log.contains("byteHex: Invalid hexadecimal digit \t at offset 2")) << log.dump();
}

// ---------------------------------------------------------------------------
// The tokenizer

TEST(SmBiosTokenizer, DeliversTagsAndDataRunsAndEightAtTheEnd) {
    EXPECT_EQ(tokenize("  <a b>01 02<C>\n\n   \n0 3\n04\n<D>\n"),
              (Tokens{"<AB>", "0102", "<C>", "0304", "<D>"}));
}

TEST(SmBiosTokenizer, TagSpanningLinesIsOneToken) {
    EXPECT_EQ(tokenize("<SHOW\nSMBIOS>\n"), (Tokens{"<SHOWSMBIOS>"}));
}

TEST(SmBiosTokenizer, UnfinishedDataRunAtTheEndIsNotDelivered) {
    EXPECT_EQ(tokenize("<A>\n0102\n0304"), (Tokens{"<A>"}));
}

TEST(SmBiosTokenizer, FileWithoutLineEndAtTheEndDeliversItsLastTag) {
    EXPECT_EQ(tokenize("<A>0102<B>"), (Tokens{"<A>", "0102", "<B>"}));
}

// ---------------------------------------------------------------------------
// The header

TEST(SmBiosReadHead, DecodesTheEntryPointAndIgnoresLaterTokens) {
    Bytes const header = sampleHeader();
    Tokens head = goodHead(header);
    head.push_back("<EXTRA>");
    Bytes bytes;
    LogCapture log;
    EXPECT_EQ(SD::readHead(bytes, head), 0);
    EXPECT_EQ(bytes, header);
    EXPECT_TRUE(log.contains("readHead() exit code 0")) << log.dump();
}

TEST(SmBiosReadHead, MissingOrWrongFirstTokenIs4) {
    expectHeadRefused({Tokens{}, Tokens{"<EPHEADER>", "<EPHEADER>", "00", "</EPHEADER>"},
                       Tokens{"<SHOWSMBIOS >", "<EPHEADER>", "00", "</EPHEADER>"}},
                      4, "readHead() first line '<SHOWSMBIOS>' missing ");
}

TEST(SmBiosReadHead, MissingOrWrongSecondTokenIs8) {
    expectHeadRefused(
        {Tokens{"<SHOWSMBIOS>"}, Tokens{"<SHOWSMBIOS>", "<SIZE>", "00", "</EPHEADER>"}}, 8,
        "readHead() second line '<EPHEADER>' missing ");
}

TEST(SmBiosReadHead, MissingOrWrongFourthTokenIs12) {
    expectHeadRefused(
        {Tokens{"<SHOWSMBIOS>", "<EPHEADER>"}, Tokens{"<SHOWSMBIOS>", "<EPHEADER>", "0102"},
         Tokens{"<SHOWSMBIOS>", "<EPHEADER>", "0102", "<SIZE>"}},
        12, "readHead() fourth line '</EPHEADER>' missing ");
}

TEST(SmBiosReadHead, ThirtyOneHexDigitsAre16) {
    std::string const digits = hexUpper(sampleHeader()).substr(0, 31);
    ASSERT_EQ(digits.size(), 31u);
    expectHeadRefused({Tokens{"<SHOWSMBIOS>", "<EPHEADER>", digits, "</EPHEADER>"}}, 16,
                      "readHead() third line odd number of hex digits ");
}

TEST(SmBiosReadHead, BadHexDigitIs32) {
    LogCapture log;
    Bytes bytes;
    EXPECT_EQ(SD::readHead(bytes, Tokens{"<SHOWSMBIOS>", "<EPHEADER>", "5F53XY", "</EPHEADER>"}),
              32);
    EXPECT_EQ(bytes, (Bytes{0x5F, 0x53}));
    EXPECT_TRUE(log.contains("readHead() exit code 32")) << log.dump();
}

// ---------------------------------------------------------------------------
// The table section

TEST(SmBiosReadTables, OddRunsAreAcceptedAndTheLoneDigitDropped) {
    Bytes bytes;
    EXPECT_EQ(SD::readTables(bytes, Tokens{"0102", "030", "</SHOWSMBIOS>"}), 0);
    EXPECT_EQ(bytes, (Bytes{0x01, 0x02, 0x03}));
}

TEST(SmBiosReadTables, UnterminatedSizeBlockIs55WithBothLogLines) {
    LogCapture log;
    Bytes bytes;
    EXPECT_EQ(SD::readTables(bytes, Tokens{"0102", "<SIZE>", "0304", "</SHOWSMBIOS>"}), 55);
    EXPECT_EQ(bytes, (Bytes{0x01, 0x02}));
    EXPECT_TRUE(log.contains("readTables() terminating </SIZE> was not found 53")) << log.dump();
    EXPECT_TRUE(log.contains("readTables() terminating </SHOWSMBIOS> was not found 55"))
        << log.dump();
}

TEST(SmBiosReadTables, MissingEndTagIs55) {
    LogCapture log;
    Bytes bytes;
    EXPECT_EQ(SD::readTables(bytes, Tokens{"0102", "<SIZE>", "9", "</SIZE>", "0304"}), 55);
    EXPECT_EQ(bytes, (Bytes{1, 2, 3, 4}));
    EXPECT_TRUE(log.contains("readTables() terminating </SHOWSMBIOS> was not found 55"))
        << log.dump();
    EXPECT_FALSE(log.contains("readTables() terminating </SIZE> was not found"));
    EXPECT_TRUE(log.contains("readTables() exit")) << log.dump();
}

TEST(SmBiosReadTables, BadHexDigitEndsTheWalkWith55) {
    LogCapture log;
    Bytes bytes;
    EXPECT_EQ(SD::readTables(bytes, Tokens{"0102", "03G4", "0506", "</SHOWSMBIOS>"}), 55);
    EXPECT_EQ(bytes, (Bytes{0x01, 0x02, 0x03}));
    EXPECT_TRUE(log.contains("byteHex: Invalid hexadecimal digit G at offset 2")) << log.dump();
    EXPECT_TRUE(log.contains("readTables() terminating </SHOWSMBIOS> was not found 55"))
        << log.dump();
}

TEST(SmBiosReadTables, EmptySectionIs55) {
    Bytes bytes;
    EXPECT_EQ(SD::readTables(bytes, Tokens{}), 55);
    EXPECT_TRUE(bytes.empty());
}

TEST(SmBiosReadTables, SizeBlockContentIsIgnoredEvenWhenItIsNotHex) {
    LogCapture log;
    Bytes bytes;
    EXPECT_EQ(
        SD::readTables(bytes, Tokens{"<SIZE>", "ZZ", "<X>", "</SIZE>", "0A", "</SHOWSMBIOS>"}), 0);
    EXPECT_EQ(bytes, (Bytes{0x0A}));
    EXPECT_FALSE(log.contains("byteHex: Invalid hexadecimal digit")) << log.dump();
    EXPECT_FALSE(log.contains("was not found")) << log.dump();
}

// ---------------------------------------------------------------------------
// byteHex

TEST(SmBiosByteHex, DecodesBothCasesAndAppends) {
    Bytes bytes = {0x99};
    LogCapture log;
    EXPECT_EQ(SD::byteHex("00aBfF7e", bytes), 0);
    EXPECT_EQ(bytes, (Bytes{0x99, 0x00, 0xAB, 0xFF, 0x7E}));
    EXPECT_TRUE(log.contains("byteHex() entry for '00aBfF7e'")) << log.dump();
    EXPECT_TRUE(log.contains("byteHex() exit")) << log.dump();
}

TEST(SmBiosByteHex, BadDigitIs32AndKeepsTheBytesBeforeIt) {
    Bytes bytes;
    LogCapture log;
    EXPECT_EQ(SD::byteHex("0102G3", bytes), 32);
    EXPECT_EQ(bytes, (Bytes{0x01, 0x02}));
    EXPECT_TRUE(log.contains("byteHex: Invalid hexadecimal digit G at offset 4")) << log.dump();
}

TEST(SmBiosByteHex, BadLowDigitDropsTheHalfByte) {
    Bytes bytes;
    LogCapture log;
    EXPECT_EQ(SD::byteHex("AB1g", bytes), 32);
    EXPECT_EQ(bytes, (Bytes{0xAB}));
    EXPECT_TRUE(log.contains("byteHex: Invalid hexadecimal digit g at offset 3")) << log.dump();
}

TEST(SmBiosByteHex, FinalUnpairedDigitIsDropped) {
    Bytes bytes;
    EXPECT_EQ(SD::byteHex("030", bytes), 0);
    EXPECT_EQ(bytes, (Bytes{0x03}));
}

TEST(SmBiosByteHex, EmptyTextAppendsNothing) {
    Bytes bytes = {0x42};
    EXPECT_EQ(SD::byteHex("", bytes), 0);
    EXPECT_EQ(bytes, (Bytes{0x42}));
}

// ---- odd hex runs: the host refuses a file that has one --------------------

TEST(SmBiosOddHexRun, EvenRunsGiveZero) {
    EXPECT_EQ(SD::oddHexRun({"0102", "<SIZE>", "3", "</SIZE>", "AABB", "</SHOWSMBIOS>"}), 0u);
    EXPECT_EQ(SD::oddHexRun({}), 0u);
}

TEST(SmBiosOddHexRun, GivesTheDigitCountOfTheFirstOddRun) {
    EXPECT_EQ(SD::oddHexRun({"0102", "ABC", "12345", "</SHOWSMBIOS>"}), 3u);
}

TEST(SmBiosOddHexRun, SizeBlockContentIsNotTableText) {
    EXPECT_EQ(SD::oddHexRun({"<SIZE>", "123", "</SIZE>", "0102", "</SHOWSMBIOS>"}), 0u);
    // An unterminated size block swallows the rest, as readTables does.
    EXPECT_EQ(SD::oddHexRun({"<SIZE>", "0102", "ABC"}), 0u);
}

TEST(SmBiosOddHexRun, NothingAfterTheEndTagOrABadDigitCounts) {
    EXPECT_EQ(SD::oddHexRun({"0102", "</SHOWSMBIOS>", "ABC"}), 0u);
    // readTables stops at the run with a bad digit: the table is empty anyway.
    EXPECT_EQ(SD::oddHexRun({"01G2", "ABC", "</SHOWSMBIOS>"}), 0u);
}

TEST(SmBiosOddHexRun, AnOddRunReallyLosesItsLastDigit) {
    // What the refusal protects against: byteHex drops the odd digit.
    std::vector<unsigned char> bytes;
    ASSERT_EQ(SD::byteHex("ABC", bytes), 0);
    EXPECT_EQ(bytes, std::vector<unsigned char>{0xAB});
}
