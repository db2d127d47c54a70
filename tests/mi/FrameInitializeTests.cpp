// The plug-in's entry point and its initialize, end to end: the table comes
// from an override file written for the test, the nodes are read back through
// the interface the agent uses (getMap). Each test case runs in a process of
// its own (CTest), so each brings its own table.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "FrameFixture.h"

using frametest::hasNodeType;
using frametest::hasVersion;
using frametest::lacksProperty;
using frametest::OverrideTable;
using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

// What the agent sees of a node, for comparing two initializations.
struct NodeShape {
    unsigned int id;
    unsigned int linkedId;
    unsigned int type;
    unsigned int index;
    unsigned int status;
    std::string description;
    size_t propertyCount;

    bool operator==(NodeShape const& other) const {
        return id == other.id && linkedId == other.linkedId && type == other.type &&
               index == other.index && status == other.status && description == other.description &&
               propertyCount == other.propertyCount;
    }
};

std::ostream& operator<<(std::ostream& out, NodeShape const& shape) {
    return out << "{id " << shape.id << ", linked " << shape.linkedId << ", type " << shape.type
               << ", index " << shape.index << ", status " << shape.status << ", \""
               << shape.description << "\", " << shape.propertyCount << " properties}";
}

std::vector<NodeShape> shapes(std::vector<IC::Node*> const& nodes) {
    std::vector<NodeShape> result;
    for (IC::Node const* node : nodes) {
        IC::MutableNode const* mutableNode = frametest::asMutable(node);
        result.push_back(NodeShape{node->getNodeId(), node->getLinkedId(),
                                   mutableNode != nullptr ? mutableNode->getNodeType() : 0u,
                                   node->getIndex(), node->getStatus(), node->getDescription(),
                                   node->getProperties().size()});
    }
    return result;
}

// A small table that no component builder turns into nodes: two additional
// information structures (type 40) and the end-of-table structure.
std::vector<uint8_t> smallTable() {
    TableBuilder table;
    table.add(Structure(40, 0x0028).byte(1).bytes({0x06, 0x00, 0x00, 0x05, 0x00}).str("Slot"));
    table.add(Structure(40, 0x0029).byte(0));
    table.endOfTable(0xFEFF);
    return table.build();
}

IC::ManagementInterface* openPlugin() {
    IC::ManagementInterface* mi = nullptr;
    IC::Error* err = nullptr;
    EXPECT_EQ(0, OpenMI(&mi, &err));
    return mi;
}

// Initializes the interface as the agent does (own id 1, no codes) and
// returns the nodes getMap then hands out.
std::vector<IC::Node*> initializedNodes(IC::ManagementInterface* mi) {
    mi->initialize(1, IC::Number(0u), IC::Number(0u));
    std::vector<IC::Node*> nodes;
    mi->getMap(nodes);
    return nodes;
}

}  // namespace

TEST(FrameOpenMI, CalledTwiceHandsOutTheSameInterfaceAndErrorRecord) {
    smbiostest::LogCapture log;
    IC::ManagementInterface* mi1 = nullptr;
    IC::Error* err1 = nullptr;
    IC::ManagementInterface* mi2 = nullptr;
    IC::Error* err2 = nullptr;
    EXPECT_EQ(0, OpenMI(&mi1, &err1));
    EXPECT_EQ(0, OpenMI(&mi2, &err2));
    ASSERT_NE(nullptr, mi1);
    ASSERT_NE(nullptr, err1);
    EXPECT_EQ(mi1, mi2);
    EXPECT_EQ(err1, err2);
    EXPECT_EQ(static_cast<IC::ManagementInterface*>(&IC::mysmbiosmi), mi1);
    EXPECT_EQ(&IC::myerr, err1);
    EXPECT_EQ(4u, log.count("OpenMI entry")) << log.dump();
    EXPECT_EQ(4u, log.count("OpenMI exit")) << log.dump();
}

TEST(FrameInitialize, EmptyTableLogsSizeZeroAndStillMakesInterfaceAndRootNodes) {
    REQUIRE_FRESH_TABLE();
    // A table section of two zero bytes: too short for any structure.
    OverrideTable override({0x00, 0x00}, 2, 7);
    smbiostest::LogCapture log;
    IC::ManagementInterface* mi = openPlugin();
    ASSERT_NE(nullptr, mi);
    IC::Error const result = mi->initialize(1, IC::Number(0u), IC::Number(0u));
    EXPECT_EQ(0u, result.getStatus());

    EXPECT_EQ((std::vector<int>{5000}), frametest::loggedLevels("smbios table size zero"))
        << log.dump();

    std::vector<IC::Node*> nodes;
    mi->getMap(nodes);
    ASSERT_EQ(2u, nodes.size()) << log.dump();

    IC::Node const* miNode = nodes[0];
    EXPECT_TRUE(frametest::isNode(miNode, 1, 0, 15, 0, 1, "Corvane SMBIOS Management Interface"));
    EXPECT_EQ(std::vector<unsigned int>{1}, miNode->getMIIds());
    EXPECT_TRUE(hasVersion(miNode, 306, 2, 7));
    EXPECT_TRUE(lacksProperty(miNode, 307));
    EXPECT_EQ(1u, miNode->getProperties().size());

    EXPECT_TRUE(frametest::isFirstRootNode(nodes[1]));
}

TEST(FrameInitialize, ZeroRevisionSetsNoProperty307AndLogsIt) {
    REQUIRE_FRESH_TABLE();
    // The acquisition stores a revision of 0 whatever the entry point says.
    OverrideTable override(smallTable(), 3, 2);
    smbiostest::LogCapture log;
    IC::ManagementInterface* mi = openPlugin();
    ASSERT_NE(nullptr, mi);
    std::vector<IC::Node*> const nodes = initializedNodes(mi);
    ASSERT_GE(nodes.size(), 1u);
    EXPECT_TRUE(hasNodeType(nodes[0], 15));
    EXPECT_TRUE(hasVersion(nodes[0], 306, 3, 2));
    EXPECT_TRUE(lacksProperty(nodes[0], 307));
    EXPECT_EQ(2u, log.count("SmBiosMI Revision is 0 or NULL")) << log.dump();
    EXPECT_EQ(0u, log.count("smbios table size zero")) << log.dump();
    EXPECT_TRUE(log.contains("SmBios Major Version = 3")) << log.dump();
    EXPECT_TRUE(log.contains("SmBios Minor Version = 2")) << log.dump();
    EXPECT_TRUE(log.contains("SmBios Version = ")) << log.dump();
    EXPECT_EQ(3u, IC::mysmbiosmi.getSmBiosMajorVersion());
    EXPECT_EQ(2u, IC::mysmbiosmi.getSmBiosMinorVersion());
}

TEST(FrameInitialize, TwoStructuresOfOneTypeAreListedInTableOrderWithTheirLengths) {
    REQUIRE_FRESH_TABLE();
    // Written with the larger handle first; the acquired table is in
    // ascending handle order, and that is the order of the type's list.
    TableBuilder table;
    table.add(Structure(40, 0x0031).byte(0).bytes({0xAA, 0xBB, 0xCC, 0xDD}));       // length 9
    table.add(Structure(40, 0x0030).byte(0).bytes(std::vector<uint8_t>(6, 0x11)));  // length 11
    table.add(Structure(41, 0x0032)
                  .str("Onboard LAN")
                  .byte(0x85)
                  .byte(1)
                  .word(0)
                  .byte(0)
                  .byte(0x19));  // length 11
    table.endOfTable(0x0040);
    OverrideTable override(table.build(), 2, 8);
    smbiostest::LogCapture log;
    IC::ManagementInterface* mi = openPlugin();
    ASSERT_NE(nullptr, mi);
    mi->initialize(1, IC::Number(0u), IC::Number(0u));

    // After the builders ran, initialize lists every non-empty type with one
    // line per structure, in list order.
    std::vector<std::string> const texts = frametest::loggedTexts();
    size_t at = texts.size();
    for (size_t i = 0; i < texts.size(); ++i) {
        if (texts[i] == "Table(s) for index 40") {
            at = i;
        }
    }
    ASSERT_LT(at + 2, texts.size()) << log.dump();
    EXPECT_NE(std::string::npos, texts[at + 1].find("   Pointer = ")) << log.dump();
    EXPECT_NE(std::string::npos, texts[at + 1].find(" length = 11")) << log.dump();
    EXPECT_NE(std::string::npos, texts[at + 2].find("   Pointer = ")) << log.dump();
    EXPECT_NE(std::string::npos, texts[at + 2].find(" length = 9")) << log.dump();
    if (at + 3 < texts.size()) {
        EXPECT_EQ(std::string::npos, texts[at + 3].find("   Pointer = "))
            << "a third structure listed under type 40\n"
            << log.dump();
    }
    EXPECT_EQ(2u, log.count("Table(s) for index 41")) << log.dump();
    EXPECT_EQ(2u, log.count("Table(s) for index 127")) << log.dump();
    EXPECT_EQ(0u, log.count("Table(s) for index 0")) << log.dump();
    EXPECT_EQ(8u, log.count("   Pointer = ")) << log.dump();
}

TEST(FrameInitialize, NodeIdsFollowCreationOrderFromTheInterfaceNode) {
    REQUIRE_FRESH_TABLE();
    TableBuilder table;
    table.add(Structure(0, 0x0000)
                  .str("Corvane")
                  .str("1.0")
                  .word(0xE800)
                  .str("01/02/2024")
                  .byte(0x0F)
                  .qword(0x0000000000010A90ull));
    table.add(Structure(1, 0x0001)
                  .str("Corvane")
                  .str("RS-7400")
                  .str("A1")
                  .str("SN123")
                  .bytes(std::vector<uint8_t>(16, 0x5A))
                  .byte(6));
    table.endOfTable(0x0002);
    OverrideTable override(table.build(), 2, 4);
    smbiostest::LogCapture log;
    IC::ManagementInterface* mi = openPlugin();
    ASSERT_NE(nullptr, mi);
    std::vector<IC::Node*> const nodes = initializedNodes(mi);
    ASSERT_GE(nodes.size(), 2u);
    EXPECT_TRUE(hasNodeType(nodes[0], 15));
    EXPECT_TRUE(hasNodeType(nodes[1], 59));
    EXPECT_EQ(1u, nodes[1]->getLinkedId());
    for (size_t i = 0; i < nodes.size(); ++i) {
        EXPECT_EQ(i + 1, nodes[i]->getNodeId()) << "node at position " << i;
        if (i > 0) {
            // Every node hangs under a node made before it.
            EXPECT_LT(nodes[i]->getLinkedId(), nodes[i]->getNodeId()) << "node at position " << i;
            EXPECT_GE(nodes[i]->getLinkedId(), 1u) << "node at position " << i;
        }
    }
}

TEST(FrameInitialize, ReturnsStatusZeroAndCopiesItIntoTheErrorRecord) {
    REQUIRE_FRESH_TABLE();
    OverrideTable override(smallTable(), 2, 6);
    smbiostest::LogCapture log;
    IC::ManagementInterface* mi = nullptr;
    IC::Error* err = nullptr;
    ASSERT_EQ(0, OpenMI(&mi, &err));
    ASSERT_NE(nullptr, mi);
    ASSERT_NE(nullptr, err);
    // Left over from an earlier call: initialize must overwrite it.
    *err = IC::Error(7, IC::Number(3u), "stale");

    IC::Error const result = mi->initialize(1, IC::Number(0u), IC::Number(0u));
    EXPECT_EQ(0u, result.getStatus());
    EXPECT_EQ(IC::Number(0u), result.getCode());
    EXPECT_EQ("", result.getMessage());
    EXPECT_EQ(0u, err->getStatus());
    EXPECT_EQ(IC::Number(0u), err->getCode());
    EXPECT_EQ("", err->getMessage());
    EXPECT_EQ(2u, log.count("initialize entry")) << log.dump();
    EXPECT_EQ(2u, log.count("initialize exit")) << log.dump();
}

TEST(FrameInitialize, SecondInitializeRebuildsTheNodeList) {
    REQUIRE_FRESH_TABLE();
    OverrideTable override(smallTable(), 2, 6);
    smbiostest::LogCapture log;
    IC::ManagementInterface* mi = openPlugin();
    ASSERT_NE(nullptr, mi);

    std::vector<NodeShape> const firstShapes = shapes(initializedNodes(mi));
    ASSERT_GE(firstShapes.size(), 2u);

    // The nodes of the first call are gone (not kept beside the new ones),
    // and the new list has the same shape, ids included.
    EXPECT_EQ(firstShapes, shapes(initializedNodes(mi)));
    EXPECT_EQ(4u, log.count("initialize exit")) << log.dump();
}
