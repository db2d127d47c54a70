// The host's check of a dump file, called directly: which files it refuses,
// and the warning for a table that is not whole.

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

}  // namespace
