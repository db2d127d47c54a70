// makeConnectorNodes: a port-connector node under the planar for each Port
// Connector Information structure (type 8) whose internal reference
// designator contains "Compute ITE", with the designator and the port type.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "BuilderFixture.h"
#include "QNLog/QNLogger.h"
#include "smbios/SmBios.h"

using namespace buildertest;

namespace {

char const* const CONNECTOR_LOGGER = "Quillon.IC.MI.SmBiosMI.SmBiosMIConnector";
unsigned int const CONNECTOR_NODE = 70;

// A Port Connector Information structure (length 9): internal designator
// (0x04), internal connector type, external designator (0x06), external
// connector type, port type (0x08).
Structure connector(uint16_t handle, std::string const& internal, uint8_t portType,
                    std::string const& external = "") {
    return Structure(8, handle)
        .str(internal)
        .byte(0x00)  // none
        .str(external)
        .byte(0x12)  // access bus (USB)
        .byte(portType);
}

// The connector nodes the builder makes from a table, under a planar.
struct ConnectorRun : PlanarSetup {
    using PlanarSetup::PlanarSetup;

    std::vector<IC::Node*> run() {
        mi.makeConnectorNodes(lists.get(), planar->getNodeId());
        return nodesOfType(mi, CONNECTOR_NODE);
    }
};

// One connector of the internal designator and port type makes one node
// with the designator (108) and the port type (128).
void expectOneConnector(std::string const& designator, uint8_t portType) {
    ConnectorRun setup(tableOf({connector(0x0800, designator, portType)}));
    std::vector<IC::Node*> const nodes = setup.run();
    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(hasString(nodes[0], 108, designator));
    EXPECT_TRUE(hasEnum(nodes[0], 128, 1, portType));
}

}  // namespace

TEST(ConnectorBuilder, ConnectorNodeFieldByField) {
    smbiostest::LogCapture log;
    ConnectorRun setup(tableOf({connector(0x0800, "Compute ITE 1", 0x10, "USB 1")}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    IC::Node const* node = nodes[0];
    EXPECT_TRUE(isNode(node, 3u, setup.planar->getNodeId(), 70, 0u, 1u, "Port Connector"));
    EXPECT_EQ(setup.mi.miIdList, node->getMIIds());
    EXPECT_EQ((std::vector<unsigned int>{108, 128}), propertyIds(node));
    EXPECT_TRUE(hasString(node, 108, "Compute ITE 1"));
    EXPECT_TRUE(hasEnum(node, 128, 1, 0x10));

    EXPECT_TRUE(holdsNodes(setup.mi, 2, 4));
    EXPECT_TRUE(loggedExactly(CONNECTOR_LOGGER, {"makeConnectorNodes entry", "Table 8 length = 9",
                                                 "makeConnectorNodes exit"}));
}

TEST(ConnectorBuilder, DesignatorBeginningWithComputeITEAndANumberBecomesANode) {
    expectOneConnector("Compute ITE 12", 0x09);
}

TEST(ConnectorBuilder, DesignatorWithWordsBeforeComputeITEBecomesANodeWithTheWholeText) {
    expectOneConnector("Rear Panel Compute ITE 3 (LAN)", 0x1F);
}

TEST(ConnectorBuilder, LowerCaseComputeIteMakesNoNode) {
    ConnectorRun setup(
        tableOf({connector(0x0800, "compute ite 1", 0x09), connector(0x0801, "COMPUTE ITE 2", 0x09),
                 connector(0x0802, "Compute Ite 3", 0x09)}));

    EXPECT_TRUE(setup.run().empty());
    EXPECT_EQ(3u, setup.mi.nextNodeId);
}

TEST(ConnectorBuilder, DesignatorWithoutComputeITEMakesNoNode) {
    smbiostest::LogCapture log;
    ConnectorRun setup(
        tableOf({connector(0x0800, "J9", 0x09, "Compute ITE"), connector(0x0801, "Compute", 0x09),
                 connector(0x0802, "ComputeITE 1", 0x09)}));

    EXPECT_TRUE(setup.run().empty());
    EXPECT_TRUE(holdsNodes(setup.mi, 1, 3));
    // Every structure is looked at, each with its own line.
    EXPECT_EQ(3u, frametest::loggedLevels("Table 8 length = 9").size()) << log.dump();
}

TEST(ConnectorBuilder, MissingDesignatorStringMakesNoNode) {
    ConnectorRun setup(tableOf(
        {Structure(8, 0x0800).strNumber(0).byte(0).str("Compute ITE 1").byte(0).byte(0x09)}));

    EXPECT_TRUE(setup.run().empty());
    EXPECT_EQ(3u, setup.mi.nextNodeId);
}

TEST(ConnectorBuilder, OnlyTheThirdOfThreeQualifiesGivesOneNodeWithIndexTwo) {
    ConnectorRun setup(tableOf({connector(0x0800, "J1", 0x09), connector(0x0801, "J2", 0x09),
                                connector(0x0802, "Compute ITE 7", 0x0E)}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(2u, nodes[0]->getIndex());
    // Skipped structures use up no node id.
    EXPECT_EQ(3u, nodes[0]->getNodeId());
    EXPECT_EQ(setup.planar->getNodeId(), nodes[0]->getLinkedId());
    EXPECT_TRUE(hasString(nodes[0], 108, "Compute ITE 7"));
    EXPECT_TRUE(hasEnum(nodes[0], 128, 1, 0x0E));
    EXPECT_EQ(4u, setup.mi.nextNodeId);
}

TEST(ConnectorBuilder, TwoQualifyingConnectorsKeepTheirGroupPositions) {
    ConnectorRun setup(
        tableOf({connector(0x0800, "Compute ITE 1", 0x09), connector(0x0801, "J2", 0x09),
                 connector(0x0802, "Compute ITE 2", 0x0D)}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(2u, nodes.size());
    EXPECT_TRUE(hasIdAndIndex(nodes[0], 3, 0));
    EXPECT_TRUE(hasIdAndIndex(nodes[1], 4, 2));
    EXPECT_TRUE(hasEnum(nodes[1], 128, 1, 0x0D));
}

TEST(ConnectorBuilder, PortTypeFFIsPassedThroughAsEnumeratedValue255) {
    ConnectorRun setup(tableOf({connector(0x0800, "Compute ITE 1", 0xFF)}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    IC::PropertyValue value;
    ASSERT_EQ(0u, nodes[0]->getProperty(128, value).getStatus());
    ASSERT_EQ(IC::PropertyValue::ENUM, value.getKind());
    EXPECT_EQ(IC::EnumValue(static_cast<unsigned char>(255)), value.getEnum());
    EXPECT_TRUE(hasEnum(nodes[0], 128, 1, 255));
}

TEST(ConnectorBuilder, EmptyConnectorGroupMakesNoNodesAndLogsOnlyEntryAndExit) {
    ConnectorRun setup(tableOf({Structure(9, 0x0900).str("SLOT1").byte(0xA5)}));

    smbiostest::LogCapture log;
    EXPECT_TRUE(setup.run().empty());
    EXPECT_TRUE(holdsNodes(setup.mi, 1, 3));
    EXPECT_TRUE(loggedOnly({"makeConnectorNodes entry", "makeConnectorNodes exit"}));
}

TEST(ConnectorBuilder, FailureInOneConnectorIsLoggedAndTheNextStillGetsANode) {
    smbiostest::LogCapture log;
    ConnectorRun setup(tableOf({connector(0x0801, "Compute ITE 2", 0x09)}));
    // A structure whose length byte promises more than its bytes hold: its
    // string set lies beyond its data, so the designator lookup throws.
    SD::SmBios::Table const broken(
        connector(0x0800, "Compute ITE 1", 0x09).length(0x40).noTerminator().build());
    ASSERT_EQ(0x40, broken.getLength());
    putFirst(setup.lists, broken);

    std::vector<IC::Node*> const nodes = setup.run();

    EXPECT_TRUE(loggedOutOfRangeAt("Table 8 index =0")) << log.dump();
    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(hasIdAndIndex(nodes[0], 3, 1));
    EXPECT_TRUE(hasString(nodes[0], 108, "Compute ITE 2"));
    std::vector<std::string> const texts = loggedBy(CONNECTOR_LOGGER);
    ASSERT_FALSE(texts.empty());
    EXPECT_EQ("makeConnectorNodes exit", texts.back());
}
