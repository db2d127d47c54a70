// makeDiskControllerNodes: the on-board IDE bus, announced by the OEM string
// "$IS IDE Bus Enabled" or "$IS IDE Bus Disabled" (type 11), as a
// disk-controller node; every OEM Strings structure uses up a node id.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "BuilderFixture.h"
#include "QNLog/QNLogger.h"
#include "smbios/SmBios.h"

using namespace buildertest;

namespace {

char const* const DISK_LOGGER = "Quillon.IC.MI.SmBiosMI.SmBiosMIDiskCtrlr";
unsigned int const DISK_CONTROLLER_NODE = 50;
std::string const ENABLED = "$IS IDE Bus Enabled";
std::string const DISABLED = "$IS IDE Bus Disabled";

// The builder over a table, under a planar (node id 2; the next id is 3).
struct DiskRun : PlanarSetup {
    using PlanarSetup::PlanarSetup;

    std::vector<IC::Node*> run() {
        mi.makeDiskControllerNodes(lists.get(), planar->getNodeId());
        return nodesOfType(mi, DISK_CONTROLLER_NODE);
    }
};

// Every field of an IDE bus node but its id.
void expectIdeBusNode(IC::Node const* node, unsigned int parentId, unsigned int status) {
    EXPECT_EQ(parentId, node->getLinkedId());
    EXPECT_TRUE(hasNodeType(node, 50));
    EXPECT_EQ(1u, node->getIndex());
    EXPECT_EQ(status, node->getStatus());
    EXPECT_EQ("IDE Bus", node->getDescription());
    EXPECT_EQ((std::vector<unsigned int>{44, 81, 85, 125, 128, 185}), propertyIds(node));
    expectProperties(node,
                     {unsignedListProp(125, {1, 16}), unsignedProp(85, 0), unsignedProp(185, 36),
                      unsignedProp(81, 2), stringProp(128, "IDE Bus"), stringProp(44, "Other")});
}

// The one node the builder makes from a single OEM Strings structure holding
// the strings, or null.
IC::Node* ideNodeOf(DiskRun& setup) {
    std::vector<IC::Node*> const nodes = setup.run();
    return nodes.size() == 1 ? nodes[0] : nullptr;
}

// The run makes one node, of id `id` and status `status`, and the next
// node id is `nextId`.
void expectOneNode(DiskRun& setup, unsigned int id, unsigned int status, unsigned int nextId) {
    std::vector<IC::Node*> const nodes = setup.run();
    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(id, nodes[0]->getNodeId());
    EXPECT_EQ(status, nodes[0]->getStatus());
    EXPECT_EQ(nextId, setup.mi.nextNodeId);
}

}  // namespace

TEST(DiskControllerBuilder, EnabledIdeStringMakesAnEnabledNodeFieldByField) {
    smbiostest::LogCapture log;
    DiskRun setup(tableOf({oemStrings(0x0B00, {"Corvane RS-7400", ENABLED})}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    IC::Node const* node = nodes[0];
    EXPECT_EQ(3u, node->getNodeId());
    EXPECT_EQ(setup.mi.miIdList, node->getMIIds());
    expectIdeBusNode(node, setup.planar->getNodeId(), 1);
    // Property 125 lists 1 and 16, in that order, as unsigned numbers.
    IC::PropertyValue statuses;
    ASSERT_EQ(0u, node->getProperty(125, statuses).getStatus());
    ASSERT_EQ(IC::PropertyValue::NUMBERS, statuses.getKind());
    EXPECT_EQ((std::vector<IC::Number>{IC::Number(1u), IC::Number(16u)}), statuses.getNumbers());
    // 128 is text, not an enumerated value.
    IC::PropertyValue busType;
    ASSERT_EQ(0u, node->getProperty(128, busType).getStatus());
    EXPECT_EQ(IC::PropertyValue::STRING, busType.getKind());

    EXPECT_TRUE(holdsNodes(setup.mi, 2, 4));
    std::vector<std::string> const texts = loggedBy(DISK_LOGGER);
    ASSERT_FALSE(texts.empty()) << log.dump();
    EXPECT_EQ("makeDiskControllerNodes entry", texts.front()) << log.dump();
    EXPECT_EQ("makeDiskControllerNodes exit", texts.back()) << log.dump();
}

TEST(DiskControllerBuilder, DisabledIdeStringMakesANodeWithStatus16) {
    DiskRun setup(tableOf({oemStrings(0x0B00, {DISABLED})}));
    IC::Node* node = ideNodeOf(setup);

    ASSERT_NE(nullptr, node);
    EXPECT_EQ(3u, node->getNodeId());
    expectIdeBusNode(node, setup.planar->getNodeId(), 16);
}

TEST(DiskControllerBuilder, IdeStringWithTrailingBlanksMatches) {
    DiskRun setup(tableOf({oemStrings(0x0B00, {"$IS IDE Bus Enabled   "})}));
    IC::Node* node = ideNodeOf(setup);

    ASSERT_NE(nullptr, node);
    expectIdeBusNode(node, setup.planar->getNodeId(), 1);
}

TEST(DiskControllerBuilder, DisabledIdeStringWithTrailingBlanksMatches) {
    DiskRun setup(tableOf({oemStrings(0x0B00, {"$IS IDE Bus Disabled "})}));
    IC::Node* node = ideNodeOf(setup);

    ASSERT_NE(nullptr, node);
    EXPECT_EQ(16u, node->getStatus());
}

TEST(DiskControllerBuilder, IdeStringWithALeadingBlankDoesNotMatch) {
    DiskRun setup(tableOf({oemStrings(0x0B00, {" $IS IDE Bus Enabled"})}));

    EXPECT_TRUE(setup.run().empty());
    EXPECT_EQ(1u, setup.mi.nodeList.size());
}

TEST(DiskControllerBuilder, IdeStringInLowerCaseDoesNotMatch) {
    DiskRun setup(tableOf({oemStrings(0x0B00, {"$is IDE Bus Enabled", "$IS IDE BUS DISABLED"})}));

    EXPECT_TRUE(setup.run().empty());
    EXPECT_EQ(1u, setup.mi.nodeList.size());
}

TEST(DiskControllerBuilder, IdeStringWithMoreTextAfterItDoesNotMatch) {
    DiskRun setup(
        tableOf({oemStrings(0x0B00, {"$IS IDE Bus Enabled.", "$IS IDE Bus Disabled x"})}));

    EXPECT_TRUE(setup.run().empty());
}

TEST(DiskControllerBuilder, IdeStringOnlyInTheSecondStructureGetsTheSecondReservedId) {
    DiskRun setup(tableOf({oemStrings(0x0B00, {"Corvane", "no bus here"}),
                           oemStrings(0x0B01, {"Corvane", ENABLED})}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(4u, nodes[0]->getNodeId());
    expectIdeBusNode(nodes[0], setup.planar->getNodeId(), 1);
    // The first structure's id (3) is never used.
    for (IC::Node const* node : setup.mi.nodeList) {
        EXPECT_NE(3u, node->getNodeId());
    }
    EXPECT_TRUE(holdsNodes(setup.mi, 2, 5));
}

TEST(DiskControllerBuilder, BothIdeStringsInOneStructureOnlyTheFirstFoundMakesANode) {
    DiskRun setup(tableOf({oemStrings(0x0B00, {"Corvane", DISABLED, ENABLED})}));

    expectOneNode(setup, 3, 16, 4);
}

TEST(DiskControllerBuilder, NoOemStringsStructureMakesNoNodeAndUsesNoId) {
    DiskRun setup(tableOf({Structure(8, 0x0800).str("IDE1").byte(0).str("").byte(0).byte(0x09)}));

    smbiostest::LogCapture log;
    EXPECT_TRUE(setup.run().empty());
    EXPECT_TRUE(holdsNodes(setup.mi, 1, 3));
    EXPECT_TRUE(loggedOnly({"makeDiskControllerNodes entry", "makeDiskControllerNodes exit"}));
}

TEST(DiskControllerBuilder, StructureWithoutTheIdeStringStillUsesUpANodeId) {
    DiskRun setup(tableOf({oemStrings(0x0B00, {"Corvane", "RS-7400"})}));

    EXPECT_TRUE(setup.run().empty());
    EXPECT_TRUE(holdsNodes(setup.mi, 1, 4));
}

TEST(DiskControllerBuilder, StructureWithCountZeroStillUsesUpANodeId) {
    TableBuilder table;
    // Count 0, though a string follows: the strings are not looked at.
    table.add(Structure(11, 0x0B00).byte(0).addString(ENABLED));
    table.add(oemStrings(0x0B01, {ENABLED}));
    DiskRun setup(table);
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(4u, nodes[0]->getNodeId());
    EXPECT_EQ(5u, setup.mi.nextNodeId);
}

TEST(DiskControllerBuilder, StructureTooShortForItsCountUsesUpANodeIdOnly) {
    smbiostest::LogCapture log;
    TableBuilder table;
    // Length 4: the Count byte lies beyond the formatted area and reads as 0.
    table.add(Structure(11, 0x0B00).addString(ENABLED));
    DiskRun setup(table);

    EXPECT_TRUE(setup.run().empty());
    EXPECT_EQ(4u, setup.mi.nextNodeId);
    EXPECT_TRUE(log.contains("getNumber8 offset=4 length=4")) << log.dump();
}

TEST(DiskControllerBuilder, OnlyTheFirstCountStringsAreScanned) {
    TableBuilder table;
    // Count 1, but the IDE string is string 2.
    table.add(Structure(11, 0x0B00).byte(1).addString("Corvane").addString(ENABLED));
    DiskRun setup(table);

    EXPECT_TRUE(setup.run().empty());
    EXPECT_EQ(4u, setup.mi.nextNodeId);
}

TEST(DiskControllerBuilder, CountBeyondTheStringsReadsMissingStringsAsEmpty) {
    TableBuilder table;
    // Count 4 with one string: strings 2 to 4 name nothing.
    table.add(Structure(11, 0x0B00).byte(4).addString(DISABLED));
    table.add(Structure(11, 0x0B01).byte(4).addString("Corvane"));
    DiskRun setup(table);

    expectOneNode(setup, 3, 16, 5);
}

TEST(DiskControllerBuilder, IndexIsAlwaysOne) {
    DiskRun setup(tableOf({oemStrings(0x0B00, {ENABLED}), oemStrings(0x0B01, {"Corvane"}),
                           oemStrings(0x0B02, {"Corvane", DISABLED})}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(2u, nodes.size());
    EXPECT_TRUE(hasIdIndexAndStatus(nodes[0], 3, 1, 1));
    EXPECT_TRUE(hasIdIndexAndStatus(nodes[1], 5, 1, 16));
    expectIdeBusNode(nodes[1], setup.planar->getNodeId(), 16);
    EXPECT_EQ(6u, setup.mi.nextNodeId);
}

TEST(DiskControllerBuilder, FailureIsLoggedNamingTable8AndTheNextStructureGoesOn) {
    smbiostest::LogCapture log;
    DiskRun setup(tableOf({oemStrings(0x0B01, {ENABLED})}));
    // Count 1, but the length byte promises more than the structure's bytes
    // hold: its string set lies beyond its data, so the string lookup throws.
    SD::SmBios::Table const broken(
        Structure(11, 0x0B00).byte(1).addString(ENABLED).length(0x40).noTerminator().build());
    ASSERT_EQ(0x40, broken.getLength());
    putFirst(setup.lists, broken);

    std::vector<IC::Node*> const nodes = setup.run();

    EXPECT_TRUE(loggedOutOfRangeAt("Table 8 index =0")) << log.dump();
    std::string const failure = firstLogged("Exception=");
    EXPECT_EQ(std::string::npos, failure.find("Table 11")) << failure;
    // The failed structure had its id reserved already.
    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(4u, nodes[0]->getNodeId());
    expectIdeBusNode(nodes[0], setup.planar->getNodeId(), 1);
    std::vector<std::string> const texts = loggedBy(DISK_LOGGER);
    ASSERT_FALSE(texts.empty());
    EXPECT_EQ("makeDiskControllerNodes exit", texts.back());
}
