// The firmware builder: one node per recognised OEM string (diagnostics and
// service-processor images) and one per BIOS Information structure, with the
// version and build id parsed from their texts, the ordinal they share, the
// UEFI naming, and an event-log node under each; and its two text utilities,
// trimstr and find_first_number.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "BuilderFixture.h"

using namespace buildertest;

namespace {

typedef std::vector<unsigned int> Ids;

// The plug-in with the SMBIOS version that initialize would have taken from
// the entry point.
struct VersionedMI : TestMI {
    VersionedMI(unsigned int major, unsigned int minor) {
        smbiosMajorVersion = major;
        smbiosMinorVersion = minor;
    }
};

// A BIOS Information structure (type 0) of the given formatted length (0x14,
// 0x16, 0x17 or 0x18): the fields up to that length.
Structure biosInformation(uint16_t handle, std::string const& vendor, std::string const& version,
                          std::string const& date, uint8_t length = 0x18, uint8_t ecMajor = 0x01,
                          uint8_t ecMinor = 0x02) {
    Structure structure(0, handle);
    structure.str(vendor)
        .str(version)
        .word(0xE800)                  // 6: starting address segment
        .str(date)                     // 8
        .byte(0x0F)                    // 9: ROM size
        .qword(0x0000000000000080ULL)  // 0x0A: characteristics
        .byte(0x03)                    // 0x12: extension byte 1
        .byte(0x0D);                   // 0x13: extension byte 2
    if (length >= 0x16) {
        structure.byte(0x02).byte(0x05);  // 0x14, 0x15: system BIOS release
    }
    if (length >= 0x17) {
        structure.byte(ecMajor);  // 0x16
    }
    if (length >= 0x18) {
        structure.byte(ecMinor);  // 0x17
    }
    return structure;
}

// A System Event Log structure (type 15) of a valid, not full log.
Structure eventLog(uint16_t handle) {
    return Structure(15, handle)
        .word(0x1000)  // 4: log area length
        .word(0x0000)  // 6: header start
        .word(0x0010)  // 8: data start
        .byte(0x03)    // 0x0A: access method
        .byte(0x01)    // 0x0B: log status: valid
        .dword(0x00000001)
        .dword(0xFFE00000)
        .byte(0x01)   // 0x14: header format
        .byte(0x00)   // 0x15: no descriptors
        .byte(0x02);  // 0x16: descriptor length
}

// The one event-log node hung under the node: type 35, index 0, the valid
// log of eventLog().
::testing::AssertionResult hasEventLogChild(TestMI const& mi, IC::Node const* parent,
                                            unsigned int expectedId) {
    std::vector<IC::Node*> const children = childrenOf(mi, parent->getNodeId());
    if (children.size() != 1) {
        return ::testing::AssertionFailure() << "node " << parent->getNodeId() << " has "
                                             << children.size() << " children, expected 1";
    }
    ::testing::AssertionResult shape =
        isNode(children[0], expectedId, parent->getNodeId(), 35, 0, 1, "SmBios System Event Log");
    if (!shape) {
        return shape;
    }
    return hasUnsigned(children[0], 37, 0x1000);
}

// A firmware node under the planar (node 2): type 3, status 1, its
// ordinal as index and its name as description.
::testing::AssertionResult isFirmware(IC::Node const* node, unsigned int id, unsigned int ordinal,
                                      std::string const& name) {
    return isNode(node, id, 2, 3, ordinal, 1, name);
}

// isFirmware, with the name in property 108 as well.
::testing::AssertionResult isNamedFirmware(IC::Node const* node, unsigned int id,
                                           unsigned int ordinal, std::string const& name) {
    ::testing::AssertionResult const shape = isFirmware(node, id, ordinal, name);
    return shape ? hasString(node, 108, name) : shape;
}

// The firmware nodes (type 3) in node-list order.
std::vector<IC::Node*> firmwareNodes(TestMI const& mi) { return nodesOfType(mi, 3); }

// The firmware builder run over a table of the structures, in that order,
// under a planar node (so the first firmware node gets id 3), on a plug-in
// with the SMBIOS version major.minor (none, 0.0, unless told). The log is
// captured from the run on; firmware holds the firmware nodes made.
struct FirmwareRun {
    explicit FirmwareRun(std::vector<Structure> const& structures, unsigned int major = 0,
                         unsigned int minor = 0)
        : mi(major, minor), parsed(tableOf(structures).build()), lists(parsed) {
        IC::MutableNode* planar = buildertest::addParent(mi);
        mi.makeFirmwareNodes(lists.get(), planar->getNodeId());
        firmware = firmwareNodes(mi);
    }

    VersionedMI mi;
    SD::SmBios parsed;
    StructureLists lists;
    LogCapture log;
    std::vector<IC::Node*> firmware;
};

// The run made one firmware node per name, in order, each named in its
// description and property 108: ids from 3 up, ordinals from 1.
void expectNamedFirmware(FirmwareRun const& run, std::vector<std::string> const& names) {
    ASSERT_EQ(names.size(), run.firmware.size());
    for (unsigned int i = 0; i < names.size(); ++i) {
        EXPECT_TRUE(isNamedFirmware(run.firmware[i], 3 + i, 1 + i, names[i]));
    }
}

// trimstr gives the second text of each pair for the first.
void expectTrimmed(std::vector<std::pair<std::string, std::string>> const& cases) {
    for (std::pair<std::string, std::string> const& trim : cases) {
        EXPECT_EQ(trim.second, IC::trimstr(trim.first)) << "\"" << trim.first << "\"";
    }
}

// find_first_number finds `expected` in the text.
::testing::AssertionResult findsNumber(std::string const& text, unsigned expected) {
    TestMI mi;
    unsigned out = 0;
    if (!mi.find_first_number(text.c_str(), &out) || out != expected) {
        return ::testing::AssertionFailure()
               << "\"" << text << "\" gives " << out << ", expected " << expected;
    }
    return ::testing::AssertionSuccess();
}

// find_first_number finds no number in the text and leaves its output as
// it was.
::testing::AssertionResult findsNoNumber(std::string const& text) {
    TestMI mi;
    unsigned out = 77;
    if (mi.find_first_number(text.c_str(), &out) || out != 77u) {
        return ::testing::AssertionFailure()
               << "\"" << text << "\" gives a number, or changed the output to " << out;
    }
    return ::testing::AssertionSuccess();
}

// An OEM Strings structure of the one string `text` makes one firmware
// node, whose properties pass `checks`.
void expectOemStringNode(std::string const& text, std::vector<PropertyCheck> const& checks) {
    FirmwareRun const run({oemStrings(0x0B00, {text})});
    ASSERT_EQ(1u, run.firmware.size()) << run.log.dump();
    expectProperties(run.firmware[0], checks);
}

std::string const VERSION_ERROR =
    "Error reading standard format of version and build number for Planar Firmware";

}  // namespace

// ---------------------------------------------------------------- trimstr

TEST(FirmwareTrimstr, WithoutLeadingBlanksDropsTheTrailingBlanks) {
    expectTrimmed({{"ab  ", "ab"}, {"AB-1.2 ", "AB-1.2"}});
}

TEST(FirmwareTrimstr, LeadingBlanksKeepTheLastOneAndTheLengthCountsFromIt) {
    // "  ab ": start = 1 (the last leading blank), last = 3: substr(1, 4).
    // "  AB-1.2": start = 1, last = 7: substr(1, 8) runs to the end.
    expectTrimmed({{"  ab ", " ab "}, {"  AB-1.2", " AB-1.2"}});
}

TEST(FirmwareTrimstr, OneLeadingBlankIsKept) {
    expectTrimmed({{" ab", " ab"}, {" AB-1.2", " AB-1.2"}});
}

TEST(FirmwareTrimstr, AllBlanksGiveOneBlank) { expectTrimmed({{"   ", " "}, {" ", " "}}); }

TEST(FirmwareTrimstr, EmptyGivesEmpty) { EXPECT_EQ("", IC::trimstr("")); }

TEST(FirmwareTrimstr, TextWithoutBlanksOrWithInnerBlanksOnlyIsUnchanged) {
    expectTrimmed({{"abc", "abc"}, {"a b", "a b"}, {"x", "x"}});
}

TEST(FirmwareTrimstr, TheWalkEndsAtTheFirstNul) {
    // Only the characters before the NUL are walked: last = 1.
    EXPECT_EQ("ab", IC::trimstr(std::string("ab\0cd", 5)));
}

// ------------------------------------------------------ find_first_number

TEST(FirmwareFindFirstNumber, EmptyTextIsFalseAndLeavesTheOutputAlone) {
    EXPECT_TRUE(findsNoNumber(""));
}

TEST(FirmwareFindFirstNumber, TextWithoutDigitsIsFalseAndLeavesTheOutputAlone) {
    EXPECT_TRUE(findsNoNumber("abc"));
    EXPECT_TRUE(findsNoNumber("v.-"));
}

TEST(FirmwareFindFirstNumber, ReadsTheDecimalNumberFromTheFirstDigit) {
    EXPECT_TRUE(findsNumber("v12.5", 12));
    EXPECT_TRUE(findsNumber("42", 42));
    // A sign before the first digit is not part of the number.
    EXPECT_TRUE(findsNumber("rev -7b", 7));
    // Base 10 even with a leading zero.
    EXPECT_TRUE(findsNumber("x010", 10));
}

// ------------------------------------------------------ OEM-string nodes

TEST(FirmwareOemNodes, DiagnosticsStringWithDashInBracketsSetsEveryField) {
    FirmwareRun const run(
        {oemStrings(0x0B00, {"Corvane Diagnostics -[ABCD12X-2.10]-"}), eventLog(0x0F00)});

    ASSERT_EQ(1u, run.firmware.size()) << run.log.dump();
    IC::Node const* node = run.firmware[0];
    EXPECT_TRUE(isFirmware(node, 3, 1, "Diagnostics"));
    EXPECT_EQ(std::vector<unsigned int>{1}, node->getMIIds());
    EXPECT_EQ((Ids{36, 70, 104, 107, 108, 134, 307}), propertyIds(node));
    expectProperties(node, {stringProp(108, "Diagnostics"), stringProp(36, "Corvane"),
                            stringProp(307, "-[ABCD12X-2.10]-"), stringProp(70, "ABCD12X"),
                            stringProp(134, "2.10"), unsignedProp(104, 2), unsignedProp(107, 10)});
    // The node is recorded in its structure's entry.
    EXPECT_EQ(node, run.lists.storage[11][0].node);

    EXPECT_TRUE(hasEventLogChild(run.mi, node, 4));
    EXPECT_EQ(3u, run.mi.nodeList.size());
    EXPECT_EQ(1u, loggedCount("makeFirmwareNodes entry")) << run.log.dump();
    EXPECT_EQ(1u, loggedCount("makeFirmwareNodes exit")) << run.log.dump();
}

TEST(FirmwareOemNodes, OstrelStringIsNamedOTL) {
    FirmwareRun const run({oemStrings(0x0B00, {"Corvane Ostrel -[SP77-1.3]-"})});

    ASSERT_EQ(1u, run.firmware.size());
    EXPECT_TRUE(isFirmware(run.firmware[0], 3, 1, "OTL"));
    expectProperties(run.firmware[0],
                     {stringProp(108, "OTL"), stringProp(36, "Corvane"), stringProp(70, "SP77"),
                      stringProp(134, "1.3"), unsignedProp(104, 1), unsignedProp(107, 3)});
}

TEST(FirmwareOemNodes, StringsWithoutAKnownNameMakeNoNode) {
    // Case-sensitive: "diagnostics" and "uefi" are not recognised.
    FirmwareRun const run({oemStrings(0x0B00, {"Corvane Systems", "diagnostics -[A-1.0]-", "uefi"}),
                           biosInformation(0x0000, "Corvane", "1.05", "03/14/2021")});

    ASSERT_EQ(1u, run.firmware.size());
    EXPECT_TRUE(isFirmware(run.firmware[0], 3, 1, "BIOS"));
    EXPECT_EQ(nullptr, run.lists.storage[11][0].node);
}

TEST(FirmwareOemNodes, DiagnosticsAndUefiInOneStringMakeADiagnosticsNodeAndBiosStaysBios) {
    FirmwareRun const run({oemStrings(0x0B00, {"Corvane UEFI Diagnostics -[D1-4.0]-"}),
                           biosInformation(0x0000, "Corvane", "C1 [B9-1.2]", "03/14/2021")});

    expectNamedFirmware(run, {"Diagnostics", "BIOS"});
}

TEST(FirmwareOemNodes, UefiStringAloneMakesNoNodeAndNamesTheBiosNodesUefi) {
    FirmwareRun const run({oemStrings(0x0B00, {"Corvane Systems"}),
                           // The flag set by a later structure still names every BIOS node.
                           oemStrings(0x0B01, {"Boot mode UEFI"}),
                           biosInformation(0x0000, "Corvane", "C1 [B9-1.2]", "03/14/2021"),
                           biosInformation(0x0001, "Corvane", "C2 [B9-1.3]", "04/14/2021")});

    expectNamedFirmware(run, {"UEFI", "UEFI"});
    EXPECT_EQ(nullptr, run.lists.storage[11][1].node);
}

TEST(FirmwareOemNodes, UefiTakesPrecedenceOverOstrelInOneString) {
    FirmwareRun const run({oemStrings(0x0B00, {"Ostrel UEFI -[SP-1.0]-"}),
                           biosInformation(0x0000, "Corvane", "C1 [B9-1.2]", "03/14/2021")});

    ASSERT_EQ(1u, run.firmware.size());
    EXPECT_TRUE(isFirmware(run.firmware[0], 3, 1, "UEFI"));
}

TEST(FirmwareOemNodes, EmptyStringInPosition2Of5EndsTheStructure) {
    // Count 5 but one string: string 2 is empty (names no string), so 3 to 5
    // are never read.
    Structure first(11, 0x0B00);
    first.byte(5).addString("Corvane Ostrel -[SP1-1.0]-");
    FirmwareRun const run({first, oemStrings(0x0B01, {"Corvane Diagnostics -[D2-2.0]-"})});

    EXPECT_EQ(1u, loggedCount("OEM string is NULL")) << run.log.dump();
    EXPECT_TRUE(run.log.contains("Table::getString index 2 ")) << run.log.dump();
    EXPECT_FALSE(run.log.contains("Table::getString index 3 ")) << run.log.dump();
    EXPECT_FALSE(run.log.contains("Table::getString index 5 ")) << run.log.dump();
    // The next structure is examined all the same.
    ASSERT_EQ(2u, run.firmware.size());
    EXPECT_TRUE(isFirmware(run.firmware[0], 3, 1, "OTL"));
    EXPECT_TRUE(isFirmware(run.firmware[1], 4, 2, "Diagnostics"));
}

TEST(FirmwareOemNodes, EmptyFirstStringSkipsTheStringsAfterIt) {
    // A set that starts with an empty string followed by a real one.
    Structure structure(11, 0x0B00);
    structure.byte(2).addString("").addString("Corvane Diagnostics -[D2-2.0]-");
    FirmwareRun const run({structure});
    ASSERT_EQ(1u, run.parsed.getTables().size());
    ASSERT_STREQ("", run.parsed.getTables()[0].getString(1));
    ASSERT_STREQ("Corvane Diagnostics -[D2-2.0]-", run.parsed.getTables()[0].getString(2));

    EXPECT_EQ(1u, loggedCount("OEM string is NULL")) << run.log.dump();
    EXPECT_TRUE(run.firmware.empty());
}

TEST(FirmwareOemNodes, CountZeroReadsNoString) {
    Structure structure(11, 0x0B00);
    structure.byte(0).addString("Corvane Diagnostics -[D2-2.0]-");
    FirmwareRun const run({structure});

    EXPECT_TRUE(run.firmware.empty());
    EXPECT_FALSE(run.log.contains("OEM string is NULL")) << run.log.dump();
    EXPECT_FALSE(run.log.contains("Table::getString")) << run.log.dump();
}

TEST(FirmwareOemNodes, BracketsWithoutDashAndCloseParenBeforeDashRebuild307) {
    // ") " at r, the first "-" at e: the version is s.substr(r + 2, e - r - 3).
    FirmwareRun const run(
        {oemStrings(0x0B00, {"Corvane Ostrel (OTL) 1.25 -[XYZ99]-"}), eventLog(0x0F00)});

    ASSERT_EQ(1u, run.firmware.size());
    IC::Node const* node = run.firmware[0];
    EXPECT_TRUE(isFirmware(node, 3, 1, "OTL"));
    EXPECT_EQ((Ids{36, 70, 104, 107, 108, 134, 307}), propertyIds(node));
    expectProperties(node, {stringProp(307, "-[XYZ99-1.25]-"), stringProp(70, "XYZ99"),
                            stringProp(134, "1.25"), unsignedProp(104, 1), unsignedProp(107, 25)});
    EXPECT_TRUE(hasEventLogChild(run.mi, node, 4));
}

TEST(FirmwareOemNodes, CloseParenWithoutBlankAfterItTakesTheVersionFromTwoPastIt) {
    // r + 2 skips one character after ")", whatever it is; the length stops
    // two characters before the first "-".
    FirmwareRun const run({oemStrings(0x0B00, {"Corvane Diagnostics (D)v3.4  -[Q1]-"})});

    ASSERT_EQ(1u, run.firmware.size());
    expectProperties(run.firmware[0], {stringProp(134, "3.4 "), stringProp(307, "-[Q1-3.4 ]-"),
                                       unsignedProp(104, 3), unsignedProp(107, 4)});
}

TEST(FirmwareOemNodes, BracketsWithoutDashAndWithoutCloseParenSetAnEmptyVersion) {
    FirmwareRun const run({oemStrings(0x0B00, {"Corvane Ostrel -[XYZ99]-"})});

    ASSERT_EQ(1u, run.firmware.size());
    IC::Node const* node = run.firmware[0];
    EXPECT_EQ((Ids{36, 70, 108, 134, 307}), propertyIds(node));
    expectProperties(node,
                     {stringProp(307, "-[XYZ99]-"), stringProp(70, "XYZ99"), stringProp(134, "")});
}

TEST(FirmwareOemNodes, BracketsWithoutAnyDashAndWithCloseParenSetAnEmptyVersion) {
    // ")" but no "-" anywhere: neither 307 nor a rebuilt one.
    FirmwareRun const run({oemStrings(0x0B00, {"Corvane Diagnostics (D) 2.0 [ XYZ ]"})});

    ASSERT_EQ(1u, run.firmware.size());
    IC::Node const* node = run.firmware[0];
    EXPECT_EQ((Ids{36, 70, 108, 134}), propertyIds(node));
    // The inner text is trimmed: " XYZ " keeps its one leading blank (start
    // 0) and loses the trailing one.
    EXPECT_TRUE(hasString(node, 70, " XYZ"));
    EXPECT_TRUE(hasString(node, 134, ""));
}

TEST(FirmwareOemNodes, WithoutBracketsOnlyNameVendorAndIdentificationAreSet) {
    FirmwareRun const run(
        {oemStrings(0x0B00, {"Corvane Diagnostics - build 7", "Corvane Ostrel"})});

    ASSERT_EQ(2u, run.firmware.size());
    EXPECT_EQ((Ids{36, 108, 307}), propertyIds(run.firmware[0]));
    EXPECT_TRUE(hasString(run.firmware[0], 307, "- build 7"));
    EXPECT_EQ((Ids{36, 108}), propertyIds(run.firmware[1]));
    EXPECT_TRUE(hasString(run.firmware[1], 108, "OTL"));
}

TEST(FirmwareOemNodes, DashPositionFromTheUntrimmedTextIsAppliedToTheTrimmedText) {
    // "[  AB-1.2]": d = 4 in "  AB-1.2"; trimmed " AB-1.2"; 70 = substr(0, 4),
    // 134 = substr(5).
    FirmwareRun const run({oemStrings(0x0B00, {"Corvane Diagnostics [  AB-1.2]"}),
                           // "[ AB-1.2]": d = 3 in " AB-1.2", which trimming leaves as it is.
                           oemStrings(0x0B01, {"Corvane Ostrel [ AB-1.2]"})});

    ASSERT_EQ(2u, run.firmware.size());
    expectProperties(run.firmware[0],
                     {stringProp(307, "-1.2]"), stringProp(70, " AB-"), stringProp(134, ".2"),
                      unsignedProp(104, 0), unsignedProp(107, 2)});

    expectProperties(run.firmware[1],
                     {stringProp(307, "-1.2]"), stringProp(70, " AB"), stringProp(134, "1.2"),
                      unsignedProp(104, 1), unsignedProp(107, 2)});
}

TEST(FirmwareOemNodes, VersionWithoutDotGivesMinorZero) {
    expectOemStringNode("Corvane Diagnostics -[ABC-7]-",
                        {stringProp(134, "7"), unsignedProp(104, 7), unsignedProp(107, 0)});
}

TEST(FirmwareOemNodes, VersionBeginningWithALetterGivesMajorZero) {
    expectOemStringNode("Corvane Diagnostics -[ABC-v2.3]-",
                        {stringProp(134, "v2.3"), unsignedProp(104, 0), unsignedProp(107, 3)});
}

TEST(FirmwareOemNodes, CloseParenAsLastCharacterRaisesOutOfRangeAndAbandonsTheStructure) {
    FirmwareRun const run(
        {oemStrings(0x0B00, {"Corvane Diagnostics -[D1-1.0]-", "Corvane Ostrel -[SP9])",
                             "Corvane Diagnostics -[D3-3.0]-"}),
         oemStrings(0x0B01, {"Corvane Ostrel -[SP2-2.0]-"}),
         biosInformation(0x0000, "Corvane", "C1 [B9-1.2]", "03/14/2021"), eventLog(0x0F00)});

    // The failing string is the second node (ordinal 2): printed as table 0,
    // index ordinal - 1 with the ordinal already moved on.
    std::string const logged = frametest::firstLogged("Exception=");
    EXPECT_NE(std::string::npos, logged.find("Exception=basic_string::substr")) << run.log.dump();
    EXPECT_NE(std::string::npos, logged.find(" Type=")) << logged;
    EXPECT_NE(std::string::npos, logged.find("Table 0 index =2")) << logged;
    EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels("Exception=")) << run.log.dump();

    ASSERT_EQ(4u, run.firmware.size()) << run.log.dump();
    EXPECT_TRUE(isFirmware(run.firmware[0], 3, 1, "Diagnostics"));
    EXPECT_TRUE(hasEventLogChild(run.mi, run.firmware[0], 4));
    // The failed node keeps what was set before the failure and gets no
    // event-log node.
    EXPECT_TRUE(isFirmware(run.firmware[1], 5, 2, "OTL"));
    EXPECT_EQ((Ids{36, 108, 307}), propertyIds(run.firmware[1]));
    EXPECT_TRUE(hasString(run.firmware[1], 307, "-[SP9])"));
    EXPECT_TRUE(childrenOf(run.mi, 5).empty());
    // The third string of that structure is never examined; the next
    // structure and the BIOS phase go on.
    EXPECT_TRUE(isFirmware(run.firmware[2], 6, 3, "OTL"));
    EXPECT_TRUE(hasString(run.firmware[2], 70, "SP2"));
    EXPECT_TRUE(isFirmware(run.firmware[3], 8, 4, "BIOS"));
}

TEST(FirmwareOemNodes, OrdinalIsSharedByOemAndBiosNodesInCreationOrder) {
    FirmwareRun const run(
        {biosInformation(0x0000, "Corvane", "C1 [B1-1.0]", "03/14/2021"),
         oemStrings(0x0B00, {"Corvane Diagnostics -[D1-1.0]-", "Corvane Ostrel -[S1-1.0]-"}),
         biosInformation(0x0001, "Corvane", "C2 [B2-2.0]", "04/14/2021"), eventLog(0x0F00)});

    // OEM nodes first, then BIOS nodes; each followed by its event-log node.
    ASSERT_EQ(4u, run.firmware.size());
    EXPECT_TRUE(isFirmware(run.firmware[0], 3, 1, "Diagnostics"));
    EXPECT_TRUE(isFirmware(run.firmware[1], 5, 2, "OTL"));
    EXPECT_TRUE(isFirmware(run.firmware[2], 7, 3, "BIOS"));
    EXPECT_TRUE(hasString(run.firmware[2], 70, "B1"));
    EXPECT_TRUE(isFirmware(run.firmware[3], 9, 4, "BIOS"));
    EXPECT_TRUE(hasString(run.firmware[3], 70, "B2"));
    for (size_t i = 0; i < run.firmware.size(); ++i) {
        EXPECT_TRUE(hasEventLogChild(run.mi, run.firmware[i], run.firmware[i]->getNodeId() + 1))
            << i;
    }
    // Both OEM nodes came from one structure: its entry keeps the last.
    EXPECT_EQ(run.firmware[1], run.lists.storage[11][0].node);
    EXPECT_EQ(run.firmware[2], run.lists.storage[0][0].node);
    EXPECT_EQ(run.firmware[3], run.lists.storage[0][1].node);
}

TEST(FirmwareOemNodes, WithoutEventLogStructureFirmwareNodesHaveNoChildren) {
    FirmwareRun const run({oemStrings(0x0B00, {"Corvane Diagnostics -[D1-1.0]-"}),
                           biosInformation(0x0000, "Corvane", "C1 [B1-1.0]", "03/14/2021")});

    ASSERT_EQ(2u, run.firmware.size());
    EXPECT_TRUE(isFirmware(run.firmware[0], 3, 1, "Diagnostics"));
    EXPECT_TRUE(isFirmware(run.firmware[1], 4, 2, "BIOS"));
    EXPECT_EQ(3u, run.mi.nodeList.size());
    // The event-log builder still ran once per firmware node.
    EXPECT_EQ(2u, loggedCount("makeLogNodes entry")) << run.log.dump();
}

// ------------------------------------------------------------ BIOS nodes

TEST(FirmwareBiosNodes, BracketedVersionSetsEveryProperty) {
    FirmwareRun const run(
        {biosInformation(0x0000, "Corvane Ltd.", "C1S [R5B3-1.06]", "03/14/2021", 0x18, 0x03, 0x11),
         eventLog(0x0F00)},
        2, 7);

    ASSERT_EQ(1u, run.firmware.size()) << run.log.dump();
    IC::Node const* node = run.firmware[0];
    EXPECT_TRUE(isFirmware(node, 3, 1, "BIOS"));
    EXPECT_EQ(std::vector<unsigned int>{1}, node->getMIIds());
    EXPECT_EQ((Ids{36, 70, 104, 107, 108, 134, 164, 175, 187, 188, 307}), propertyIds(node));
    expectProperties(node, {stringProp(36, "Corvane Ltd."), stringProp(164, "03/14/2021"),
                            stringProp(108, "BIOS"), stringProp(307, "C1S [R5B3-1.06]"),
                            stringProp(134, "1.06"), stringProp(70, "R5B3")});
    // The SMBIOS version, not a number parsed from the BIOS version.
    expectProperties(node, {versionProp(175, 2, 7), unsignedProp(104, 2), unsignedProp(107, 7),
                            unsignedProp(187, 3), unsignedProp(188, 0x11)});
    EXPECT_EQ(node, run.lists.storage[0][0].node);
    EXPECT_TRUE(hasEventLogChild(run.mi, node, 4));

    EXPECT_TRUE(run.log.contains("Table 0 length = 24")) << run.log.dump();
    EXPECT_FALSE(run.log.contains(VERSION_ERROR)) << run.log.dump();
}

TEST(FirmwareBiosNodes, SmbiosVersionComesFromTheAcquiredTable) {
    REQUIRE_FRESH_TABLE();
    TableBuilder builder;
    builder.add(biosInformation(0x0000, "Corvane", "C1 [B1-1.0]", "03/14/2021"));
    builder.endOfTable(0xFEFF);
    smbiostest::TempDir dir;
    smbiostest::ScopedEnv env("KESTREL_DATA_DIR", dir.path() + "/");
    frametest::writeOverride(dir.path(), builder.build(), 3, 2);

    TestMI mi;
    mi.initialize(1, IC::Number(0u), IC::Number(0u));
    ASSERT_EQ(3u, mi.getSmBiosMajorVersion());
    ASSERT_EQ(2u, mi.getSmBiosMinorVersion());

    SD::SmBios parsed(builder.build());
    StructureLists lists(parsed);
    IC::MutableNode* parent = buildertest::addParent(mi);
    mi.makeFirmwareNodes(lists.get(), parent->getNodeId());

    std::vector<IC::Node*> const children = childrenOf(mi, parent->getNodeId());
    ASSERT_EQ(1u, children.size());
    EXPECT_TRUE(hasNodeType(children[0], 3));
    EXPECT_EQ("BIOS", children[0]->getDescription());
    expectProperties(children[0],
                     {versionProp(175, 3, 2), unsignedProp(104, 3), unsignedProp(107, 2)});
}

TEST(FirmwareBiosNodes, VersionWithoutBracketsLogsTheErrorAndSetsTheWholeVersion) {
    FirmwareRun const run({biosInformation(0x0000, "Corvane", "1.05", "03/14/2021")}, 2, 4);

    ASSERT_EQ(1u, run.firmware.size());
    IC::Node const* node = run.firmware[0];
    expectProperties(node, {stringProp(134, "1.05"), stringProp(307, "1.05"), noProp(70)});
    EXPECT_EQ((Ids{36, 104, 107, 108, 134, 164, 175, 187, 188, 307}), propertyIds(node));
    EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels(VERSION_ERROR)) << run.log.dump();
}

TEST(FirmwareBiosNodes, BracketsWithoutDashAreAnUnreadableVersion) {
    FirmwareRun const run({biosInformation(0x0000, "Corvane", "C1 [R5B3 1.06]", "03/14/2021")}, 2,
                          4);

    ASSERT_EQ(1u, run.firmware.size());
    EXPECT_TRUE(hasString(run.firmware[0], 134, "C1 [R5B3 1.06]"));
    EXPECT_TRUE(lacksProperty(run.firmware[0], 70));
    EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels(VERSION_ERROR)) << run.log.dump();
}

TEST(FirmwareBiosNodes, DashOutsideTheBracketsIsNotABuildId) {
    // Character searches, no trimming: the inner text " R5 " has no dash.
    FirmwareRun const run({biosInformation(0x0000, "Corvane", "C1-A [ R5 ]", "03/14/2021"),
                           biosInformation(0x0001, "Corvane", "X [ R5 - 2.1 ]", "03/14/2021")},
                          2, 4);

    ASSERT_EQ(2u, run.firmware.size());
    EXPECT_TRUE(hasString(run.firmware[0], 134, "C1-A [ R5 ]"));
    EXPECT_TRUE(lacksProperty(run.firmware[0], 70));
    EXPECT_TRUE(hasString(run.firmware[1], 70, " R5 "));
    EXPECT_TRUE(hasString(run.firmware[1], 134, " 2.1 "));
    EXPECT_EQ(1u, loggedCount(VERSION_ERROR)) << run.log.dump();
}

TEST(FirmwareBiosNodes, EmptyVersionStringNumberIsUnreadable) {
    FirmwareRun const run({biosInformation(0x0000, "", "", "")}, 2, 4);

    ASSERT_EQ(1u, run.firmware.size());
    // Strings that name no string are set as empty texts.
    expectProperties(run.firmware[0], {stringProp(36, ""), stringProp(164, ""), stringProp(307, ""),
                                       stringProp(134, "")});
    EXPECT_EQ(1u, loggedCount(VERSION_ERROR)) << run.log.dump();
}

TEST(FirmwareBiosNodes, Length0x14HasNoSmbiosVersionAndNoEcRelease) {
    FirmwareRun const run({biosInformation(0x0000, "Corvane", "C1 [B1-1.0]", "03/14/2021", 0x14)},
                          2, 4);
    ASSERT_EQ(0x14, run.parsed.getTables()[0].getLength());

    ASSERT_EQ(1u, run.firmware.size());
    EXPECT_EQ((Ids{36, 70, 108, 134, 164, 307}), propertyIds(run.firmware[0]));
    expectProperties(run.firmware[0],
                     {noProp(175), noProp(104), noProp(107), noProp(187), noProp(188)});
}

TEST(FirmwareBiosNodes, Length0x16HasTheSmbiosVersionButNoEcRelease) {
    FirmwareRun const run({biosInformation(0x0000, "Corvane", "C1 [B1-1.0]", "03/14/2021", 0x16)},
                          2, 4);

    ASSERT_EQ(1u, run.firmware.size());
    EXPECT_EQ((Ids{36, 70, 104, 107, 108, 134, 164, 175, 307}), propertyIds(run.firmware[0]));
    expectProperties(run.firmware[0],
                     {versionProp(175, 2, 4), unsignedProp(104, 2), unsignedProp(107, 4)});
}

TEST(FirmwareBiosNodes, Length0x17ReadsTheMissingEcMinorAsZero) {
    FirmwareRun const run(
        {biosInformation(0x0000, "Corvane", "C1 [B1-1.0]", "03/14/2021", 0x17, 0x05)}, 2, 4);

    // Longer than 22 bytes, so both release bytes are read; the reader's own
    // check turns the byte at 0x17 into 0.
    ASSERT_EQ(1u, run.firmware.size());
    EXPECT_TRUE(hasUnsigned(run.firmware[0], 187, 5));
    EXPECT_TRUE(hasUnsigned(run.firmware[0], 188, 0));
    EXPECT_TRUE(run.log.contains("getNumber8 offset=23 length=23")) << run.log.dump();
}

TEST(FirmwareBiosNodes, Length0x18WithEcBytesFFSetsTheVersionButNoEcRelease) {
    FirmwareRun const run(
        {biosInformation(0x0000, "Corvane", "C1 [B1-1.0]", "03/14/2021", 0x18, 0xFF, 0xFF),
         // One byte 0xFF is enough to leave both out.
         biosInformation(0x0001, "Corvane", "C1 [B1-1.0]", "03/14/2021", 0x18, 0x01, 0xFF),
         biosInformation(0x0002, "Corvane", "C1 [B1-1.0]", "03/14/2021", 0x18, 0xFF, 0x01),
         // 254 is the largest release number.
         biosInformation(0x0003, "Corvane", "C1 [B1-1.0]", "03/14/2021", 0x18, 0xFE, 0x00)},
        2, 8);

    ASSERT_EQ(4u, run.firmware.size());
    for (size_t i = 0; i < 3; ++i) {
        EXPECT_TRUE(hasVersion(run.firmware[i], 175, 2, 8)) << i;
        EXPECT_TRUE(hasUnsigned(run.firmware[i], 104, 2)) << i;
        EXPECT_TRUE(hasUnsigned(run.firmware[i], 107, 8)) << i;
        EXPECT_TRUE(lacksProperty(run.firmware[i], 187)) << i;
        EXPECT_TRUE(lacksProperty(run.firmware[i], 188)) << i;
    }
    EXPECT_TRUE(hasUnsigned(run.firmware[3], 187, 254));
    EXPECT_TRUE(hasUnsigned(run.firmware[3], 188, 0));
}

TEST(FirmwareBiosNodes, FailureInABiosStructureLogsTable0AndTheLoopIndex) {
    FirmwareRun const run(
        {biosInformation(0x0000, "Corvane", "C1 [B1-1.0]", "03/14/2021"),
         // The last structure claims a formatted area longer than its bytes, so
         // its strings cannot be found: the vendor lookup throws.
         biosInformation(0x0001, "Corvane", "C2 [B2-2.0]", "04/14/2021").length(0x40)},
        2, 4);
    ASSERT_EQ(2u, run.parsed.getTables().size());

    std::string const logged = frametest::firstLogged("Exception=");
    EXPECT_NE(std::string::npos, logged.find(" Type=")) << run.log.dump();
    EXPECT_NE(std::string::npos, logged.find("Table 0 index =1")) << logged;
    EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels("Exception=")) << run.log.dump();

    ASSERT_EQ(2u, run.firmware.size());
    EXPECT_TRUE(isFirmware(run.firmware[0], 3, 1, "BIOS"));
    EXPECT_TRUE(hasString(run.firmware[0], 70, "B1"));
    // The node made before the failure stays, with what it had by then.
    EXPECT_TRUE(isFirmware(run.firmware[1], 4, 2, "BIOS"));
    EXPECT_TRUE(propertyIds(run.firmware[1]).empty());
    EXPECT_TRUE(run.log.contains("makeFirmwareNodes exit")) << run.log.dump();
}

TEST(FirmwareBuilder, NoOemAndNoBiosStructuresMakeNoNodeAndLogOnlyEntryAndExit) {
    FirmwareRun const run({eventLog(0x0F00)});

    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_EQ((std::vector<std::string>{"makeFirmwareNodes entry", "makeFirmwareNodes exit"}),
              frametest::loggedTexts())
        << run.log.dump();
    std::vector<int> const levels = frametest::loggedLevels("makeFirmwareNodes");
    EXPECT_EQ((std::vector<int>{3000, 3000}), levels);
}
