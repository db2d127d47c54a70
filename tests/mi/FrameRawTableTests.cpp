// makeSMBIOSTableNodes: one raw-table node per structure of types 0 to 31,
// with the structure's header fields, formatted bytes and non-empty strings.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "FrameFixture.h"

using frametest::hasNodeType;
using frametest::hasStrings;
using frametest::hasUnsigned;
using frametest::hasUnsignedList;
using frametest::lacksProperty;
using frametest::StructureLists;
using frametest::TestMI;
using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

unsigned int const PARENT_ID = 7;

// The formatted area of a built structure: its first `length` bytes.
std::vector<unsigned int> formattedBytes(Structure const& structure) {
    std::vector<uint8_t> const bytes = structure.build();
    return std::vector<unsigned int>(bytes.begin(), bytes.begin() + bytes[1]);
}

// Runs makeSMBIOSTableNodes over the structure lists of the parsed table,
// under the parent PARENT_ID.
void makeRawTableNodes(TestMI& mi, SD::SmBios const& parsed) {
    StructureLists lists(parsed);
    mi.makeSMBIOSTableNodes(lists.get(), PARENT_ID);
}

// Every text of the "Table <type> count =<n>" lines, in the order logged.
std::vector<std::string> countLines() {
    std::vector<std::string> lines;
    for (std::string const& text : frametest::loggedTexts()) {
        if (text.compare(0, 6, "Table ") == 0 && text.find(" count =") != std::string::npos) {
            lines.push_back(text);
        }
    }
    return lines;
}

}  // namespace

TEST(FrameRawTable, FullStructureGetsHeaderFieldsFormattedBytesAndStrings) {
    smbiostest::LogCapture log;
    Structure const bios = Structure(0, 0x0A1B)
                               .str("Corvane Systems")
                               .str("R1.07")
                               .word(0xE800)
                               .str("03/14/2024")
                               .byte(0x0F)
                               .qword(0x0000000000010A90ull)
                               .bytes({0x03, 0x0D})
                               .byte(1)
                               .byte(7)
                               .byte(0xFF)
                               .byte(0xFF);
    ASSERT_EQ(24u, bios.formattedSize());
    TableBuilder table;
    table.add(bios);
    SD::SmBios const parsed = frametest::parse(table);
    TestMI mi;

    makeRawTableNodes(mi, parsed);

    ASSERT_EQ(1u, mi.nodeList.size()) << log.dump();
    IC::Node const* node = mi.nodeList[0];
    EXPECT_TRUE(hasNodeType(node, 55));
    EXPECT_EQ(2u, node->getNodeId());
    EXPECT_EQ(PARENT_ID, node->getLinkedId());
    EXPECT_EQ(0u, node->getIndex());
    EXPECT_EQ(1u, node->getStatus());
    EXPECT_EQ("SMBIOS Table", node->getDescription());
    EXPECT_EQ(std::vector<unsigned int>{1}, node->getMIIds());

    EXPECT_TRUE(hasUnsigned(node, 177, 0));
    EXPECT_TRUE(hasUnsigned(node, 178, 0x0A1B));
    EXPECT_TRUE(hasUnsigned(node, 176, 24));
    EXPECT_TRUE(hasUnsignedList(node, 180, formattedBytes(bios)));
    EXPECT_TRUE(hasStrings(node, 179, {"Corvane Systems", "R1.07", "03/14/2024"}));
    EXPECT_TRUE(hasUnsigned(node, 181, 3));
    EXPECT_EQ(6u, node->getProperties().size());
    EXPECT_EQ(3u, mi.nextNodeId);

    EXPECT_EQ(2u, log.count("makeSMBIOSTableNodes entry")) << log.dump();
    EXPECT_EQ(2u, log.count("makeSMBIOSTableNodes exit")) << log.dump();
}

TEST(FrameRawTable, Type40GetsNoRawNodeAndType31Does) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(Structure(40, 0x0040).byte(1).bytes({0x06, 0x00, 0x00, 0x05, 0x00}).str("Slot"));
    table.add(Structure(31, 0x0031).bytes({0x10, 0x20, 0x30, 0x40, 0x50, 0x60}));
    table.add(Structure(32, 0x0032).bytes({0, 0, 0, 0, 0, 0, 0}));
    table.add(Structure(200, 0x00C8).byte(1));
    table.endOfTable(0x007F);
    SD::SmBios const parsed = frametest::parse(table);
    TestMI mi;

    makeRawTableNodes(mi, parsed);

    ASSERT_EQ(1u, mi.nodeList.size()) << log.dump();
    IC::Node const* node = mi.nodeList[0];
    EXPECT_TRUE(hasNodeType(node, 55));
    EXPECT_EQ(0u, node->getIndex());
    EXPECT_TRUE(hasUnsigned(node, 177, 31));
    EXPECT_TRUE(hasUnsigned(node, 178, 0x0031));
    EXPECT_TRUE(hasUnsigned(node, 176, 10));
    EXPECT_TRUE(
        hasUnsignedList(node, 180, {31, 10, 0x31, 0x00, 0x10, 0x20, 0x30, 0x40, 0x50, 0x60}));
    EXPECT_EQ(0u, log.count("Table 32 count =")) << log.dump();
    EXPECT_EQ(0u, log.count("Table 40 count =")) << log.dump();
}

TEST(FrameRawTable, EmptyMiddleStringIsLeftOutOfStringsAndCount) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(Structure(11, 0x0B00).byte(3).addString("a").addString("b").addString("c"));
    SD::SmBios const parsed = frametest::parse(table);
    ASSERT_EQ(1u, parsed.getTables().size());
    SD::SmBios::Table const& oem = parsed.getTables()[0];
    ASSERT_EQ(3u, oem.getStrCount());
    ASSERT_EQ(5u, oem.getLength());
    ASSERT_EQ('b', oem.getData()[7]);
    // A parsed structure cannot hold an empty string between two others (a
    // double NUL ends its string set), so the 'b' of the second string is
    // removed from the parsed data: the string count stays 3 and the second
    // string is now empty.
    std::vector<unsigned char>& data = const_cast<std::vector<unsigned char>&>(oem.getData());
    data.erase(data.begin() + 7);
    TestMI mi;

    makeRawTableNodes(mi, parsed);

    ASSERT_EQ(1u, mi.nodeList.size()) << log.dump();
    IC::Node const* node = mi.nodeList[0];
    EXPECT_TRUE(hasNodeType(node, 55));
    EXPECT_TRUE(hasUnsigned(node, 177, 11));
    EXPECT_TRUE(hasStrings(node, 179, {"a", "c"}));
    EXPECT_TRUE(hasUnsigned(node, 181, 2));
}

TEST(FrameRawTable, StructureWithoutStringsGetsEmptyStringListAndCountZero) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(Structure(24, 0x2400).byte(0x5A));
    SD::SmBios const parsed = frametest::parse(table);
    ASSERT_EQ(1u, parsed.getTables().size());
    ASSERT_EQ(1u, parsed.getTables()[0].getStrCount());
    TestMI mi;

    makeRawTableNodes(mi, parsed);

    ASSERT_EQ(1u, mi.nodeList.size()) << log.dump();
    IC::Node const* node = mi.nodeList[0];
    EXPECT_TRUE(hasUnsigned(node, 177, 24));
    EXPECT_TRUE(hasUnsignedList(node, 180, {24, 5, 0x00, 0x24, 0x5A}));
    EXPECT_TRUE(hasStrings(node, 179, {}));
    EXPECT_TRUE(hasUnsigned(node, 181, 0));
}

TEST(FrameRawTable, IndexRunsAcrossTypesInTypeOrderAndIdsFollowCreation) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(Structure(17, 0x1100).word(0x1000).str("DIMM A"));
    table.add(Structure(0, 0x0000).str("Corvane").str("1.0"));
    table.add(Structure(17, 0x1101).word(0x1000).str("DIMM B"));
    SD::SmBios const parsed = frametest::parse(table);
    TestMI mi;

    makeRawTableNodes(mi, parsed);

    ASSERT_EQ(3u, mi.nodeList.size()) << log.dump();
    struct Expected {
        unsigned int id;
        unsigned int type;
        unsigned int handle;
        char const* text;
    };
    Expected const expected[] = {
        {2, 0, 0x0000, "Corvane"}, {3, 17, 0x1100, "DIMM A"}, {4, 17, 0x1101, "DIMM B"}};
    for (unsigned int i = 0; i < 3; ++i) {
        IC::Node const* node = mi.nodeList[i];
        EXPECT_TRUE(hasNodeType(node, 55)) << "node " << i;
        EXPECT_EQ(i, node->getIndex()) << "node " << i;
        EXPECT_EQ(expected[i].id, node->getNodeId()) << "node " << i;
        EXPECT_EQ(PARENT_ID, node->getLinkedId()) << "node " << i;
        EXPECT_TRUE(hasUnsigned(node, 177, expected[i].type)) << "node " << i;
        EXPECT_TRUE(hasUnsigned(node, 178, expected[i].handle)) << "node " << i;
        IC::PropertyValue strings;
        ASSERT_TRUE(frametest::readProperty(node, 179, strings)) << "node " << i;
        ASSERT_FALSE(strings.getStrings().empty()) << "node " << i;
        EXPECT_EQ(expected[i].text, strings.getStrings()[0]) << "node " << i;
    }
    EXPECT_EQ(5u, mi.nextNodeId);
}

TEST(FrameRawTable, LogsTheCountOfEveryTypeFrom0To31) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(Structure(0, 0x0000).str("Corvane"));
    table.add(Structure(17, 0x1100).word(0x1000));
    table.add(Structure(17, 0x1101).word(0x1000));
    table.add(Structure(31, 0x0031).byte(0));
    table.add(Structure(32, 0x0032).bytes({0, 0, 0, 0, 0, 0, 0}));
    table.endOfTable(0x007F);
    SD::SmBios const parsed = frametest::parse(table);
    TestMI mi;

    makeRawTableNodes(mi, parsed);

    std::vector<std::string> expected;
    for (unsigned int type = 0; type <= 31; ++type) {
        unsigned int const count = type == 0 ? 1u : type == 17 ? 2u : type == 31 ? 1u : 0u;
        expected.push_back("Table " + std::to_string(type) + " count =" + std::to_string(count));
    }
    EXPECT_EQ(expected, countLines()) << log.dump();
    EXPECT_EQ(4u, mi.nodeList.size()) << log.dump();
}

TEST(FrameRawTable, WithoutStructuresMakesNoNodeAndStillLogsEveryCount) {
    smbiostest::LogCapture log;
    SD::SmBios const parsed(std::vector<unsigned char>{});
    TestMI mi;

    makeRawTableNodes(mi, parsed);

    EXPECT_TRUE(mi.nodeList.empty());
    EXPECT_EQ(2u, mi.nextNodeId);
    EXPECT_EQ(32u, countLines().size()) << log.dump();
    EXPECT_EQ(2u, log.count("makeSMBIOSTableNodes exit")) << log.dump();
}

TEST(FrameRawTable, FailingStructureIsLoggedWithItsPositionAndTheNextOneGetsItsNode) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(Structure(11, 0x0B00).byte(3).addString("a").addString("b").addString("c"));
    table.add(Structure(11, 0x0B01).byte(2).addString("x").addString("y"));
    SD::SmBios const parsed = frametest::parse(table);
    ASSERT_EQ(2u, parsed.getTables().size());
    SD::SmBios::Table const& broken = parsed.getTables()[0];
    ASSERT_EQ(3u, broken.getStrCount());
    ASSERT_EQ('b', broken.getData()[7]);
    // Cuts "b\0c" out of the parsed string set, leaving "a\0\0\0" under a
    // string count of 3: the third string then runs past the end of the
    // structure and its lookup throws std::out_of_range.
    std::vector<unsigned char>& data = const_cast<std::vector<unsigned char>&>(broken.getData());
    data.erase(data.begin() + 7, data.begin() + 10);
    TestMI mi;

    makeRawTableNodes(mi, parsed);

    std::string const failure = frametest::firstLogged("Exception=");
    EXPECT_EQ(0u, failure.find("Exception=")) << log.dump();
    EXPECT_NE(std::string::npos, failure.find(" Type=")) << failure;
    EXPECT_NE(std::string::npos, failure.find("out_of_range")) << failure;
    EXPECT_NE(std::string::npos, failure.find(" index =0")) << failure;
    EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels("Exception=")) << log.dump();

    // The failing structure's node was made before its strings were read.
    ASSERT_EQ(2u, mi.nodeList.size()) << log.dump();
    EXPECT_TRUE(hasUnsigned(mi.nodeList[0], 177, 11));
    EXPECT_TRUE(lacksProperty(mi.nodeList[0], 181));
    IC::Node const* next = mi.nodeList[1];
    EXPECT_EQ(1u, next->getIndex());
    EXPECT_TRUE(hasUnsigned(next, 178, 0x0B01));
    EXPECT_TRUE(hasStrings(next, 179, {"x", "y"}));
    EXPECT_TRUE(hasUnsigned(next, 181, 2));
}
