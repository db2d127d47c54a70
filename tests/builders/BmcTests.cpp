// The BMC builder: one node per IPMI Device Information structure, each with
// its own event-log node and its own firmware nodes (which carry event-log
// nodes of their own).
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "BuilderFixture.h"

using namespace buildertest;

namespace {

// An IPMI Device Information structure (type 38) of 0x12 bytes: a KCS
// interface.
Structure ipmiDevice(uint16_t handle) {
    return Structure(38, handle)
        .byte(0x01)                    // 4: interface type (KCS)
        .byte(0x20)                    // 5: IPMI revision 2.0
        .byte(0x20)                    // 6: I2C target address
        .byte(0xFF)                    // 7: NV storage device address
        .qword(0x0000000000000CA3ULL)  // 8: base address
        .byte(0x00)                    // 0x10: base address modifier
        .byte(0x00);                   // 0x11: interrupt number
}

Structure biosInformation(uint16_t handle) {
    return Structure(0, handle)
        .str("Corvane")
        .str("C1 [B1-1.0]")
        .word(0xE800)
        .str("03/14/2021")
        .byte(0x0F)
        .qword(0x0000000000000080ULL)
        .byte(0x03)
        .byte(0x0D)
        .byte(0x02)
        .byte(0x05)
        .byte(0x01)
        .byte(0x02);
}

// A System Event Log structure (type 15) of a valid, full log.
Structure eventLog(uint16_t handle) {
    return Structure(15, handle)
        .word(0x0800)
        .word(0x0000)
        .word(0x0010)
        .byte(0x03)
        .byte(0x03)  // valid and full
        .dword(0x00000001)
        .dword(0xFFE00000)
        .byte(0x01)
        .byte(0x00)
        .byte(0x02);
}

::testing::AssertionResult isEventLog(IC::Node const* node, unsigned int id,
                                      unsigned int linkedId) {
    ::testing::AssertionResult shape =
        isNode(node, id, linkedId, 35, 0, 31, "SmBios System Event Log");
    if (!shape) {
        return shape;
    }
    return hasUnsigned(node, 37, 0x0800);
}

// The position of the first logged text that contains text, or the number
// of logged texts.
size_t loggedPosition(std::string const& text) {
    std::vector<std::string> const texts = frametest::loggedTexts();
    for (size_t i = 0; i < texts.size(); ++i) {
        if (texts[i].find(text) != std::string::npos) {
            return i;
        }
    }
    return texts.size();
}

}  // namespace

TEST(BmcNodes, NoIpmiStructureMakesNoNodeAndRunsNeitherTheLogNorTheFirmwareBuilder) {
    TestMI mi;
    TableBuilder builder;
    // Structures the two builders would turn into nodes.
    builder.add(biosInformation(0x0000));
    builder.add(eventLog(0x0F00));
    ParentSetup setup(mi, builder);
    mi.makeBMCNodes(setup.built.lists.get(), setup.parent->getNodeId());

    EXPECT_EQ(1u, mi.nodeList.size());
    EXPECT_EQ((std::vector<std::string>{"makeBMCNodes entry", "makeBMCNodes exit"}),
              frametest::loggedTexts())
        << setup.log.dump();
    EXPECT_EQ(0u, loggedCount("makeLogNodes entry")) << setup.log.dump();
    EXPECT_EQ(0u, loggedCount("makeFirmwareNodes entry")) << setup.log.dump();
}

TEST(BmcNodes, IpmiStructureMakesABmcNodeWithItsEventLogAndFirmwareNodes) {
    TestMI mi;
    ParentSetup setup(mi, tableOf({biosInformation(0x0000), eventLog(0x0F00), ipmiDevice(0x2600)}));
    mi.makeBMCNodes(setup.built.lists.get(), setup.parent->getNodeId());

    std::vector<IC::Node*> const bmcs = nodesOfType(mi, 13);
    ASSERT_EQ(1u, bmcs.size()) << setup.log.dump();
    IC::Node const* bmc = bmcs[0];
    EXPECT_TRUE(isNode(bmc, 3, 2, 13, 0, 1, "BMC"));
    EXPECT_EQ(std::vector<unsigned int>{1}, bmc->getMIIds());
    EXPECT_TRUE(propertyIds(bmc).empty());

    // Under the BMC: its event-log node first, then the BIOS firmware node
    // (firmware ordinal 1) with an event-log node of its own.
    std::vector<IC::Node*> const children = childrenOf(mi, 3);
    ASSERT_EQ(2u, children.size());
    EXPECT_TRUE(isEventLog(children[0], 4, 3));
    EXPECT_TRUE(hasString(children[0], 108, "System Management BIOS System Event Log"));
    EXPECT_TRUE(isNode(children[1], 5, 3, 3, 1, 1, "BIOS"));
    EXPECT_TRUE(hasString(children[1], 70, "B1"));
    std::vector<IC::Node*> const firmwareChildren = childrenOf(mi, 5);
    ASSERT_EQ(1u, firmwareChildren.size());
    EXPECT_TRUE(isEventLog(firmwareChildren[0], 6, 5));
    EXPECT_EQ(5u, mi.nodeList.size());

    EXPECT_EQ(1u, loggedCount("Table 38 length = 18")) << setup.log.dump();
    // The event-log builder runs before the firmware builder.
    size_t const logEntry = loggedPosition("makeLogNodes entry");
    size_t const firmwareEntry = loggedPosition("makeFirmwareNodes entry");
    EXPECT_LT(loggedPosition("Table 38 length = 18"), logEntry) << setup.log.dump();
    EXPECT_LT(logEntry, firmwareEntry) << setup.log.dump();
    EXPECT_LT(firmwareEntry, loggedPosition("makeBMCNodes exit")) << setup.log.dump();
}

TEST(BmcNodes, TwoIpmiStructuresMakeTwoBmcNodesEachWithItsOwnLogAndFirmwareNodes) {
    TestMI mi;
    ParentSetup setup(
        mi, tableOf({ipmiDevice(0x2600), oemStrings(0x0B00, {"Corvane Diagnostics -[D1-2.10]-"}),
                     biosInformation(0x0000), eventLog(0x0F00), ipmiDevice(0x2601)}));
    mi.makeBMCNodes(setup.built.lists.get(), setup.parent->getNodeId());

    std::vector<IC::Node*> const bmcs = nodesOfType(mi, 13);
    ASSERT_EQ(2u, bmcs.size()) << setup.log.dump();
    // Per BMC: the BMC, its event log, the diagnostics firmware node and its
    // event log, the BIOS node and its event log: six node ids.
    for (unsigned int k = 0; k < 2; ++k) {
        unsigned int const bmcId = 3 + 6 * k;
        EXPECT_TRUE(isNode(bmcs[k], bmcId, 2, 13, k, 1, "BMC")) << k;
        EXPECT_TRUE(propertyIds(bmcs[k]).empty()) << k;

        std::vector<IC::Node*> const children = childrenOf(mi, bmcId);
        ASSERT_EQ(3u, children.size()) << k;
        EXPECT_TRUE(isEventLog(children[0], bmcId + 1, bmcId)) << k;
        // The firmware ordinal starts at 1 again in each call.
        EXPECT_TRUE(isNode(children[1], bmcId + 2, bmcId, 3, 1, 1, "Diagnostics")) << k;
        EXPECT_TRUE(hasString(children[1], 70, "D1")) << k;
        EXPECT_TRUE(isNode(children[2], bmcId + 4, bmcId, 3, 2, 1, "BIOS")) << k;

        std::vector<IC::Node*> const diagnosticsChildren = childrenOf(mi, bmcId + 2);
        ASSERT_EQ(1u, diagnosticsChildren.size()) << k;
        EXPECT_TRUE(isEventLog(diagnosticsChildren[0], bmcId + 3, bmcId + 2)) << k;
        std::vector<IC::Node*> const biosChildren = childrenOf(mi, bmcId + 4);
        ASSERT_EQ(1u, biosChildren.size()) << k;
        EXPECT_TRUE(isEventLog(biosChildren[0], bmcId + 5, bmcId + 4)) << k;
    }
    EXPECT_EQ(13u, mi.nodeList.size());
    EXPECT_EQ(2u, childrenOf(mi, 2).size());
    EXPECT_EQ(2u, loggedCount("Table 38 length = 18")) << setup.log.dump();
    EXPECT_EQ(2u, loggedCount("makeFirmwareNodes entry")) << setup.log.dump();
    EXPECT_EQ(6u, loggedCount("makeLogNodes entry")) << setup.log.dump();
}

TEST(BmcNodes, WithoutEventLogAndFirmwareStructuresTheBmcNodeStandsAlone) {
    TestMI mi;
    ParentSetup setup(mi, tableOf({ipmiDevice(0x2600)}));
    mi.makeBMCNodes(setup.built.lists.get(), setup.parent->getNodeId());

    std::vector<IC::Node*> const bmcs = nodesOfType(mi, 13);
    ASSERT_EQ(1u, bmcs.size());
    EXPECT_TRUE(isNode(bmcs[0], 3, 2, 13, 0, 1, "BMC"));
    EXPECT_EQ(2u, mi.nodeList.size());
    // Both builders still ran, and found nothing.
    EXPECT_EQ(1u, loggedCount("makeLogNodes entry")) << setup.log.dump();
    EXPECT_EQ(1u, loggedCount("makeFirmwareNodes entry")) << setup.log.dump();
}
