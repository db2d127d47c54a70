// makeSlotNodes and the slot-type map: one system-slot node per System Slots
// structure (type 9) under the planar, its designation, its slot type in the
// agent's numbering and its slot id; getCIMSlotType and the 42 pairs of
// IC::SMBIOS_MI_SLOT::slotMap.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

#include "BuilderFixture.h"
#include "QNLog/QNLogger.h"

using namespace buildertest;

namespace {

char const* const SLOT_LOGGER = "Quillon.IC.MI.SmBiosMI.SmBiosMISlot";
unsigned int const SLOT_NODE = 62;

// The SMBIOS slot types the agent knows, by the agent's slot type they
// get, as (SMBIOS slot type, agent slot type) pairs in the order of the
// SMBIOS slot types; every other SMBIOS slot type is reported as 1 (other).
std::vector<std::pair<unsigned int, unsigned int>> expectedSlotMap() {
    std::map<unsigned int, std::vector<unsigned int>> const byAgentType = {
        {0, {0x02}},
        {1,
         {0x01, 0x03, 0x04, 0x05, 0x07, 0x08, 0x09, 0x0D, 0x0F, 0x10, 0x11, 0x13, 0xA0, 0xA1, 0xA2,
          0xA3, 0xA4}},
        {7, {0x0A, 0x0B, 0x0C}},
        {16, {0x06, 0x0E}},
        {17, {0x12}},
        {18, {0xA5, 0xAB, 0xB1}},
        {19, {0xA6, 0xAC, 0xB2}},
        {20, {0xA7, 0xAD, 0xB3}},
        {21, {0xA8, 0xAE, 0xB4}},
        {22, {0xA9, 0xAF, 0xB5}},
        {23, {0xAA, 0xB0, 0xB6}},
    };
    std::vector<std::pair<unsigned int, unsigned int>> pairs;
    for (auto const& agentType : byAgentType) {
        for (unsigned int smbiosType : agentType.second) {
            pairs.emplace_back(smbiosType, agentType.first);
        }
    }
    std::sort(pairs.begin(), pairs.end());
    return pairs;
}

std::vector<std::pair<unsigned int, unsigned int>> const EXPECTED_SLOT_MAP = expectedSlotMap();

// A System Slots structure of SMBIOS 2.1 (length 0x0D): designation (0x04),
// slot type (0x05), data bus width, current usage, slot length, slot id
// (word at 0x09), characteristics 1 and 2.
Structure slot(uint16_t handle, std::string const& designation, uint8_t slotType, uint16_t slotId) {
    return Structure(9, handle)
        .str(designation)
        .byte(slotType)
        .byte(0x0D)  // x16
        .byte(0x03)  // available
        .byte(0x04)  // long
        .word(slotId)
        .byte(0x0C)
        .byte(0x00);
}

// The slot nodes the builder makes from a table, under a planar.
struct SlotRun : PlanarSetup {
    explicit SlotRun(TableBuilder const& table) : PlanarSetup(table) {
        mi.makeSlotNodes(lists.get(), planar->getNodeId());
        nodes = nodesOfType(mi, SLOT_NODE);
    }

    std::vector<IC::Node*> nodes;
};

// The agent's slot type the builder reports for one slot of the SMBIOS type.
::testing::AssertionResult slotTypeBecomes(uint8_t smbiosType, unsigned int expected) {
    SlotRun run(tableOf({slot(0x0900, "SLOT1", smbiosType, 1)}));
    if (run.nodes.size() != 1) {
        return ::testing::AssertionFailure() << run.nodes.size() << " slot nodes, expected 1";
    }
    return hasEnum(run.nodes[0], 128, 4, expected);
}

}  // namespace

TEST(SlotBuilder, SlotNodeFieldByField) {
    smbiostest::LogCapture log;
    SlotRun run(tableOf({slot(0x0900, "PCIE1", 0xA8, 0x0102)}));

    ASSERT_EQ(1u, run.nodes.size());
    IC::Node const* node = run.nodes[0];
    EXPECT_TRUE(isNode(node, 3u, run.planar->getNodeId(), 62, 0u, 1u, "System Slot"));
    EXPECT_EQ(run.mi.miIdList, node->getMIIds());
    EXPECT_EQ((std::vector<unsigned int>{108, 128, 270}), propertyIds(node));
    expectProperties(node,
                     {stringProp(108, "PCIE1"), enumProp(128, 4, 21), unsignedProp(270, 0x0102)});

    EXPECT_TRUE(holdsNodes(run.mi, 2, 4));
    EXPECT_TRUE(loggedExactly(
        SLOT_LOGGER, {"makeSlotNodes entry", "Table 9 length = 13", "makeSlotNodes exit"}));
}

TEST(SlotBuilder, SlotTypesA8AndB4Give21_06Gives16_12Gives17) {
    SlotRun run(
        tableOf({slot(0x0900, "PCIE x4 gen1", 0xA8, 1), slot(0x0901, "PCIE x4 gen3", 0xB4, 2),
                 slot(0x0902, "PCI", 0x06, 3), slot(0x0903, "PCI-X", 0x12, 4)}));

    ASSERT_EQ(4u, run.nodes.size());
    EXPECT_TRUE(hasEnum(run.nodes[0], 128, 4, 21));
    EXPECT_TRUE(hasEnum(run.nodes[1], 128, 4, 21));
    EXPECT_TRUE(hasEnum(run.nodes[2], 128, 4, 16));
    EXPECT_TRUE(hasEnum(run.nodes[3], 128, 4, 17));
}

TEST(SlotBuilder, SlotType02UnknownGivesZero) {
    EXPECT_TRUE(slotTypeBecomes(0x02, 0));
    EXPECT_EQ(0u, IC::SmBiosMI::getCIMSlotType(0x02));
}

TEST(SlotBuilder, SlotTypesMissingFromTheMapGiveOne) {
    for (uint8_t const smbiosType : {0x00, 0x14, 0x9F, 0xB7, 0xFF}) {
        SCOPED_TRACE(static_cast<unsigned int>(smbiosType));
        EXPECT_TRUE(slotTypeBecomes(smbiosType, 1));
        EXPECT_EQ(1u, IC::SmBiosMI::getCIMSlotType(smbiosType));
    }
}

TEST(SlotBuilder, EmptySlotGroupMakesNoNodesAndLogsOnlyEntryAndExit) {
    TableBuilder table;
    table.add(Structure(8, 0x0800).str("Compute ITE 1").byte(0).str("").byte(0).byte(0x09));
    SD::SmBios parsed(table.build());
    StructureLists lists(parsed);
    TestMI mi;
    IC::MutableNode* planar = addParent(mi);

    smbiostest::LogCapture log;
    mi.makeSlotNodes(lists.get(), planar->getNodeId());

    EXPECT_TRUE(holdsNodes(mi, 1, 3));
    EXPECT_TRUE(nodesOfType(mi, SLOT_NODE).empty());
    EXPECT_TRUE(loggedOnly({"makeSlotNodes entry", "makeSlotNodes exit"}));
}

TEST(SlotBuilder, TwoSlotsGetIndexesZeroAndOneInGroupOrder) {
    SlotRun run(tableOf({slot(0x0900, "SLOT A", 0xA6, 0x0001),
                         Structure(8, 0x0800).str("J1").byte(0).str("").byte(0).byte(0x09),
                         slot(0x0901, "SLOT B", 0xAA, 0x0002)}));

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_TRUE(hasIdAndIndex(run.nodes[0], 3, 0));
    expectProperties(run.nodes[0],
                     {stringProp(108, "SLOT A"), enumProp(128, 4, 19), unsignedProp(270, 1)});
    EXPECT_TRUE(hasIdAndIndex(run.nodes[1], 4, 1));
    expectProperties(run.nodes[1],
                     {stringProp(108, "SLOT B"), enumProp(128, 4, 23), unsignedProp(270, 2)});
    for (IC::Node const* node : run.nodes) {
        EXPECT_EQ(run.planar->getNodeId(), node->getLinkedId());
    }
}

TEST(SlotBuilder, SlotTypeIsAFourByteEnumeratedValue) {
    SlotRun run(tableOf({slot(0x0900, "PCI1", 0x0E, 7)}));

    ASSERT_EQ(1u, run.nodes.size());
    IC::PropertyValue value;
    ASSERT_EQ(0u, run.nodes[0]->getProperty(128, value).getStatus());
    ASSERT_EQ(IC::PropertyValue::ENUM, value.getKind());
    EXPECT_EQ(4u, value.getEnum().getWidth());
    EXPECT_EQ(IC::EnumValue(16u), value.getEnum());
}

TEST(SlotBuilder, SlotIdIsTheWordAtOffset9) {
    SlotRun run(tableOf({slot(0x0900, "SLOT1", 0xA5, 270), slot(0x0901, "SLOT2", 0xA5, 0xBEEF)}));

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 270, 270));
    EXPECT_TRUE(hasUnsigned(run.nodes[1], 270, 0xBEEF));
}

TEST(SlotBuilder, SlotNodeForEveryListedSlotTypeCarriesItsMappedType) {
    TableBuilder table;
    uint16_t handle = 0x0900;
    for (auto const& pair : EXPECTED_SLOT_MAP) {
        table.add(slot(handle++, "S" + std::to_string(pair.first), static_cast<uint8_t>(pair.first),
                       static_cast<uint16_t>(pair.first)));
    }
    SlotRun run(table);

    ASSERT_EQ(EXPECTED_SLOT_MAP.size(), run.nodes.size());
    for (size_t i = 0; i < run.nodes.size(); ++i) {
        SCOPED_TRACE("SMBIOS slot type " + std::to_string(EXPECTED_SLOT_MAP[i].first));
        EXPECT_EQ(i, run.nodes[i]->getIndex());
        EXPECT_TRUE(hasEnum(run.nodes[i], 128, 4, EXPECTED_SLOT_MAP[i].second));
        EXPECT_TRUE(hasUnsigned(run.nodes[i], 270, EXPECTED_SLOT_MAP[i].first));
    }
}

TEST(SlotBuilder, ShortSlotWithoutSlotTypeGivesOtherAndSlotIdZero) {
    smbiostest::LogCapture log;
    TableBuilder table;
    // Designation only: the formatted area ends before the slot type.
    table.add(Structure(9, 0x0900).str("STUB"));
    SlotRun run(table);

    ASSERT_EQ(1u, run.nodes.size());
    IC::Node const* node = run.nodes[0];
    EXPECT_EQ(1u, node->getStatus());
    EXPECT_EQ("System Slot", node->getDescription());
    EXPECT_EQ((std::vector<unsigned int>{108, 128, 270}), propertyIds(node));
    expectProperties(node, {stringProp(108, "STUB"), enumProp(128, 4, 1), unsignedProp(270, 0)});
    EXPECT_TRUE(log.contains("getNumber8 offset=5 length=5")) << log.dump();
    EXPECT_TRUE(log.contains("getNumber16 offset=9 length=5")) << log.dump();
}

TEST(SlotBuilder, FailureInOneSlotIsLoggedAndTheNextSlotStillGetsANode) {
    smbiostest::LogCapture log;
    TableBuilder table;
    // Length 10: the slot id's first byte is the last byte of the formatted
    // area, so the reader's check passes and the word read fails.
    table.add(
        Structure(9, 0x0900).str("CUT").byte(0xA5).byte(0x0D).byte(0x03).byte(0x04).byte(0x01));
    table.add(slot(0x0901, "WHOLE", 0xA9, 5));
    SlotRun run(table);

    EXPECT_TRUE(log.contains("Exception=")) << log.dump();
    std::string const failure = frametest::firstLogged("Exception=");
    EXPECT_EQ(0u, failure.find("Exception= Type=")) << failure;
    EXPECT_NE(std::string::npos, failure.find("out_of_range")) << failure;
    EXPECT_NE(std::string::npos, failure.find("Table 9 index =0")) << failure;
    EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels("Exception="));

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_EQ(0u, run.nodes[0]->getIndex());
    EXPECT_TRUE(hasString(run.nodes[0], 108, "CUT"));
    EXPECT_TRUE(lacksProperty(run.nodes[0], 270));
    EXPECT_TRUE(hasIdAndIndex(run.nodes[1], 4, 1));
    expectProperties(run.nodes[1],
                     {stringProp(108, "WHOLE"), enumProp(128, 4, 22), unsignedProp(270, 5)});
    std::vector<std::string> const texts = loggedBy(SLOT_LOGGER);
    ASSERT_FALSE(texts.empty());
    EXPECT_EQ("makeSlotNodes exit", texts.back());
}

TEST(SlotMap, HoldsExactlyTheFortyTwoListedPairs) {
    std::map<unsigned int, unsigned int> const expected(EXPECTED_SLOT_MAP.begin(),
                                                        EXPECTED_SLOT_MAP.end());
    ASSERT_EQ(42u, expected.size());
    EXPECT_EQ(42u, IC::SMBIOS_MI_SLOT::slotMap.size());
    EXPECT_EQ(expected, IC::SMBIOS_MI_SLOT::slotMap);
}

TEST(SlotMap, GetCIMSlotTypeGivesTheMappedValueOfEveryListedType) {
    for (auto const& pair : EXPECTED_SLOT_MAP) {
        EXPECT_EQ(pair.second, IC::SmBiosMI::getCIMSlotType(pair.first))
            << "SMBIOS slot type " << pair.first;
    }
}

TEST(SlotMap, GetCIMSlotTypeGivesOneForEveryUnlistedType) {
    std::map<unsigned int, unsigned int> const expected(EXPECTED_SLOT_MAP.begin(),
                                                        EXPECTED_SLOT_MAP.end());
    unsigned int unlisted = 0;
    for (unsigned int smbiosType = 0; smbiosType < 0x200; ++smbiosType) {
        if (expected.count(smbiosType) == 0) {
            ++unlisted;
            EXPECT_EQ(1u, IC::SmBiosMI::getCIMSlotType(smbiosType))
                << "SMBIOS slot type " << smbiosType;
        }
    }
    EXPECT_EQ(0x200u - 42u, unlisted);
    EXPECT_EQ(1u, IC::SmBiosMI::getCIMSlotType(0xFFFFFFFFu));
}
