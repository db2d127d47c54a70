// The host's check of a dump file, called directly: which files it refuses,
// and the warning for a table that is not whole, from the file or from the
// entry point and table the host writes into one itself.

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "DumpFormat.h"
#include "TableBuilder.h"
#include "TestSupport.h"
#include "inventory/DumpCheck.h"

namespace {

using smbiostest::Structure;
using smbiostest::TableBuilder;

inventory::DumpCheck check(std::string const& text) {
    smbiostest::TempDir folder;
    std::string const path = folder.file("smbios.txt");
    smbiostest::writeFile(path, text);
    return inventory::checkOverrideFile(path, text);
}

std::vector<uint8_t> twoStructures() {
    return TableBuilder().add(Structure(0, 0).str("Vendor")).endOfTable(1).build();
}

TEST(DumpCheck, WholeFileIsTakenWithoutWarning) {
    std::vector<uint8_t> const table = twoStructures();
    inventory::DumpCheck const result = check(smbiosdump::formatOverride(
        smbiosdump::makeSmEntryPoint(2, 8, static_cast<uint16_t>(table.size()), 0x20, 2, 16),
        table));
    EXPECT_EQ(result.refusal, "");
    EXPECT_EQ(result.warning, "");
}

TEST(DumpCheck, LegacyEntryPointCountIsCompared) {
    std::vector<uint8_t> const table = twoStructures();
    inventory::DumpCheck const result = check(smbiosdump::formatOverride(
        smbiosdump::makeDmiEntryPoint(0x21, static_cast<uint16_t>(table.size()), 0x20, 5), table));
    EXPECT_EQ(result.refusal, "");
    EXPECT_EQ(result.warning, "warning: the entry point announces 5 structures; the table holds 2");
}

TEST(DumpCheck, MoreStructuresThanAnnouncedIsNoWarning) {
    std::vector<uint8_t> const table = twoStructures();
    inventory::DumpCheck const result = check(smbiosdump::formatOverride(
        smbiosdump::makeSmEntryPoint(2, 8, static_cast<uint16_t>(table.size()), 0x20, 1, 16),
        table));
    EXPECT_EQ(result.warning, "");
}

TEST(DumpCheck, HeaderThePluginCannotDecodeGivesNeitherRefusalNorWarning) {
    // The plug-in takes the file and makes an empty table of it, which the
    // inventory shows for itself.
    inventory::DumpCheck const result =
        check("<SHOWSMBIOS>\n<EPHEADER>\n5F4E4F5F\n</EPHEADER>\n00\n</SHOWSMBIOS>\n");
    EXPECT_EQ(result.refusal, "");
    EXPECT_EQ(result.warning, "");
}

TEST(DumpCheck, SecondOddRunIsNamedByItsOwnDigitCount) {
    std::string const text = smbiosdump::formatOverride(
        smbiosdump::makeSmEntryPoint(2, 8, 4, 0x20, 1, 16), std::vector<uint8_t>());
    std::string odd = text;
    odd.replace(odd.find("</SHOWSMBIOS>"), 0, "0102\n<SIZE>\n1\n</SIZE>\nABCDE\n");
    EXPECT_EQ(check(odd).refusal, "table text has an odd number of hex digits (5)");
}

TEST(DumpCheck, HeaderEndOnTheLastLineWithoutALineEndIsNamed) {
    EXPECT_EQ(check("<SHOWSMBIOS><EPHEADER>5F534D5F</EPHEADER>").refusal,
              "line 1: nothing after </EPHEADER>");
}

TEST(DumpCheck, MissingHeaderEndNamesTheLastLineEvenWithoutALineEnd) {
    EXPECT_EQ(check("<SHOWSMBIOS>\n<EPHEADER>").refusal, "line 2: no </EPHEADER>");
}

// The entry point and table of an image give the warning that the override
// file the host writes from them gives.
TEST(DumpCheck, ImageGivesTheWarningOfTheFileMadeFromIt) {
    std::vector<uint8_t> const whole = twoStructures();
    std::vector<uint8_t> cut = whole;
    cut.resize(cut.size() - 3);
    struct Case {
        std::vector<uint8_t> header;
        std::vector<uint8_t> table;
        char const* warning;
    };
    Case const cases[] = {
        {smbiosdump::makeSmEntryPoint(2, 8, static_cast<uint16_t>(whole.size()), 0x20, 2, 16),
         whole, ""},
        {smbiosdump::makeSmEntryPoint(2, 8, static_cast<uint16_t>(whole.size()), 0x20, 9, 16),
         whole, "warning: the entry point announces 9 structures; the table holds 2"},
        {smbiosdump::makeDmiEntryPoint(0x21, static_cast<uint16_t>(whole.size()), 0x20, 5), whole,
         "warning: the entry point announces 5 structures; the table holds 2"},
        {smbiosdump::makeSmEntryPoint(2, 8, static_cast<uint16_t>(cut.size()), 0x20, 2, 16), cut,
         "warning: the entry point announces 2 structures; the table holds 1 and ends inside the "
         "next one"},
        {smbiosdump::makeSmEntryPoint(2, 8, static_cast<uint16_t>(cut.size()), 0x20, 1, 16), cut,
         "warning: the table ends inside a structure, after 1 whole ones"},
    };
    for (Case const& c : cases) {
        SCOPED_TRACE(c.warning);
        inventory::DumpCheck const fromImage = inventory::checkImage(c.header, c.table);
        inventory::DumpCheck const fromFile = check(smbiosdump::formatOverride(c.header, c.table));
        EXPECT_EQ(fromImage.refusal, "");
        EXPECT_EQ(fromImage.warning, c.warning);
        EXPECT_EQ(fromFile.refusal, "");
        EXPECT_EQ(fromFile.warning, fromImage.warning);
    }
}

}  // namespace
