// The temperature and voltage sensor builders: one node per probe at the
// chosen location, the status switch with its fall-through, the readings
// scaled by each kind's divisor with their "unknown" values, and the logs of
// each kind.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "BuilderFixture.h"

using namespace buildertest;

namespace {

typedef std::vector<unsigned int> Ids;

uint8_t const TEMPERATURE = 28;
uint8_t const VOLTAGE = 26;

// A probe structure (type 28 or 26, one layout) of 0x16 bytes.
struct Probe {
    std::string description = "Probe";
    uint8_t locationAndStatus = 0x63;  // OK, processor
    uint16_t maximum = 0x0320;
    uint16_t minimum = 0x0064;
    std::vector<uint8_t> oem = {0x01, 0x02, 0x03, 0x04};
    uint16_t nominal = 0x0190;
};

Structure probe(uint8_t type, uint16_t handle, Probe const& p) {
    return Structure(type, handle)
        .str(p.description)         // 4
        .byte(p.locationAndStatus)  // 5
        .word(p.maximum)            // 6
        .word(p.minimum)            // 8
        .word(0x0001)               // 0x0A: resolution
        .word(0x0005)               // 0x0C: tolerance
        .word(0x0010)               // 0x0E: accuracy
        .bytes(p.oem)               // 0x10: OEM-defined
        .word(p.nominal);           // 0x14
}

Probe at(uint8_t locationAndStatus) {
    Probe p;
    p.locationAndStatus = locationAndStatus;
    return p;
}

std::vector<unsigned int> const SENSOR_STATUSES = {1, 0, 21, 24, 27};

// The builder's own log texts, without the structure model's string-lookup
// lines.
std::vector<std::string> builderTexts() {
    std::vector<std::string> texts;
    for (std::string const& logged : frametest::loggedTexts()) {
        if (logged.rfind("Table::", 0) != 0) {
            texts.push_back(logged);
        }
    }
    return texts;
}

}  // namespace

// ------------------------------------------------------------ temperature

TEST(TemperatureSensorNodes, ProbeAtTheLocationSetsEveryField) {
    TestMI mi;
    Probe p;
    p.description = "CPU 1 Temp";
    p.locationAndStatus = 0x63;  // OK, processor
    p.maximum = 0x0320;          // 80.0
    p.minimum = 0x0064;          // 10.0
    p.oem = {0x11, 0x22, 0x33, 0x44};
    p.nominal = 0x0190;  // 40.0
    ParentSetup setup(mi, tableOf({probe(TEMPERATURE, 0x1C00, p)}));
    ASSERT_EQ(0x16, setup.built.parsed.getTables()[0].getLength());
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 22);
    ASSERT_EQ(1u, nodes.size()) << setup.log.dump();
    IC::Node const* node = nodes[0];
    EXPECT_TRUE(isNode(node, 3u, 2u, 22, 0u, 1u, "CPU 1 Temp"));
    EXPECT_EQ(std::vector<unsigned int>{1}, node->getMIIds());
    EXPECT_EQ((Ids{14, 23, 31, 33, 43, 125}), propertyIds(node));
    EXPECT_TRUE(hasUnsignedList(node, 125, SENSOR_STATUSES));
    EXPECT_TRUE(hasUnsigned(node, 31, 3));
    // The OEM-defined bytes reversed.
    expectProperties(node, {bytesProp(43, {0x44, 0x33, 0x22, 0x11}), doubleProp(14, 40.0),
                            doubleProp(23, 80.0), doubleProp(33, 10.0)});
    EXPECT_EQ(node, setup.built.lists.storage[TEMPERATURE][0].node);
    EXPECT_EQ(2u, mi.nodeList.size());
    EXPECT_TRUE(childrenOf(mi, 3).empty());

    EXPECT_EQ((std::vector<std::string>{"makeTemperatureSensorNodes entry", "Table 28 length = 22",
                                        "Temperature in 0.1 degrees=400",
                                        "makeTemperatureSensorNodes exit"}),
              builderTexts())
        << setup.log.dump();
}

TEST(TemperatureSensorNodes, OnlyProbesAtTheLocationMakeNodesAndIndexesCountSkippedOnes) {
    TestMI mi;
    TableBuilder builder;
    Probe first = at(0x63);
    first.description = "first";
    Probe third = at(0x63);
    third.description = "third";
    builder.add(probe(TEMPERATURE, 0x1C00, first));
    builder.add(probe(TEMPERATURE, 0x1C01, at(0x64)));  // location 4
    builder.add(probe(TEMPERATURE, 0x1C02, third));
    ParentSetup setup(mi, builder);
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 22);
    ASSERT_EQ(2u, nodes.size());
    EXPECT_TRUE(hasIdAndIndex(nodes[0], 3, 0));
    EXPECT_EQ("first", nodes[0]->getDescription());
    EXPECT_TRUE(hasIdAndIndex(nodes[1], 4, 2));
    EXPECT_EQ("third", nodes[1]->getDescription());
    EXPECT_EQ(nullptr, setup.built.lists.storage[TEMPERATURE][1].node);
    // Every structure is logged, the skipped one too.
    EXPECT_EQ(3u, loggedCount("Table 28 length = 22")) << setup.log.dump();
}

TEST(TemperatureSensorNodes, LocationIsTheLowFiveBitsOfItsByte) {
    TestMI mi;
    TableBuilder builder;
    builder.add(probe(TEMPERATURE, 0x1C00, at(0x7F)));  // status 3, location 31
    builder.add(probe(TEMPERATURE, 0x1C01, at(0x83)));  // status 4, location 3
    ParentSetup setup(mi, builder);
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 0x1F);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 22);
    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(0u, nodes[0]->getIndex());
    EXPECT_TRUE(hasUnsigned(nodes[0], 31, 0x1F));
    EXPECT_EQ(1u, nodes[0]->getStatus());
}

TEST(TemperatureSensorNodes, StatusFallsThroughToOtherForCriticalAndNonRecoverable) {
    TestMI mi;
    TableBuilder builder;
    std::vector<uint8_t> const bytes = {0x63, 0x83, 0xA3, 0xC3, 0x23, 0xE3, 0x03, 0x43};
    for (size_t i = 0; i < bytes.size(); ++i) {
        builder.add(probe(TEMPERATURE, static_cast<uint16_t>(0x1C00 + i), at(bytes[i])));
    }
    ParentSetup setup(mi, builder);
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 22);
    ASSERT_EQ(bytes.size(), nodes.size());
    // OK: 1; non-critical: 21; critical (24, 27, 0) and non-recoverable
    // (27, 0) end at 0; every other status (1, 7, 0, 2) is 0.
    std::vector<unsigned int> const expected = {1, 21, 0, 0, 0, 0, 0, 0};
    for (size_t i = 0; i < nodes.size(); ++i) {
        EXPECT_EQ(expected[i], nodes[i]->getStatus()) << "byte 0x" << std::hex << +bytes[i];
        EXPECT_TRUE(hasUnsigned(nodes[i], 31, 3)) << i;
    }
}

TEST(TemperatureSensorNodes, NominalIsInTenthsOfADegreeAndUnknownOnlyAt0x800) {
    TestMI mi;
    TableBuilder builder;
    Probe p400 = at(0x63);
    p400.nominal = 0x0190;
    Probe unknown = at(0x63);
    unknown.nominal = 0x0800;
    Probe high = at(0x63);
    high.nominal = 0x8000;
    builder.add(probe(TEMPERATURE, 0x1C00, p400));
    builder.add(probe(TEMPERATURE, 0x1C01, unknown));
    builder.add(probe(TEMPERATURE, 0x1C02, high));
    ParentSetup setup(mi, builder);
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 22);
    ASSERT_EQ(3u, nodes.size());
    EXPECT_TRUE(hasDouble(nodes[0], 14, 40.0));
    EXPECT_TRUE(lacksProperty(nodes[1], 14));
    EXPECT_TRUE(hasDouble(nodes[2], 14, 3276.8));
    EXPECT_EQ(1u, loggedCount("Temperature in 0.1 degrees=400")) << setup.log.dump();
    EXPECT_EQ(0u, loggedCount("Temperature in 0.1 degrees=2048")) << setup.log.dump();
    EXPECT_EQ(1u, loggedCount("Temperature in 0.1 degrees=32768")) << setup.log.dump();
    EXPECT_EQ(2u, loggedCount("Temperature in 0.1 degrees=")) << setup.log.dump();
}

TEST(TemperatureSensorNodes, NegativeReadingIsTakenAsALargeUnsignedValue) {
    TestMI mi;
    TableBuilder builder;
    Probe p = at(0x63);
    p.nominal = 0xFF9C;  // -100 as a two's-complement word
    p.minimum = 0xFE0C;  // -500
    builder.add(probe(TEMPERATURE, 0x1C00, p));
    ParentSetup setup(mi, builder);
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 22);
    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(hasDouble(nodes[0], 14, 6543.6));
    EXPECT_TRUE(hasDouble(nodes[0], 33, 6503.6));
}

TEST(TemperatureSensorNodes, MaximumAndMinimumUnknownAt0x8000AreNotSet) {
    TestMI mi;
    TableBuilder builder;
    Probe both = at(0x63);
    both.maximum = 0x8000;
    both.minimum = 0x8000;
    Probe atNominalUnknown = at(0x63);
    atNominalUnknown.maximum = 0x0800;  // only the nominal value knows 0x800
    atNominalUnknown.minimum = 0x0000;
    builder.add(probe(TEMPERATURE, 0x1C00, both));
    builder.add(probe(TEMPERATURE, 0x1C01, atNominalUnknown));
    ParentSetup setup(mi, builder);
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 22);
    ASSERT_EQ(2u, nodes.size());
    EXPECT_EQ((Ids{14, 31, 43, 125}), propertyIds(nodes[0]));
    EXPECT_TRUE(hasDouble(nodes[1], 23, 204.8));
    EXPECT_TRUE(hasDouble(nodes[1], 33, 0.0));
}

TEST(TemperatureSensorNodes, ShortStructureReadsTheMissingNominalAsZeroAndSetsIt) {
    TestMI mi;
    TableBuilder builder;
    // Up to the OEM-defined bytes: 0x14 bytes, no nominal value.
    builder.add(Structure(TEMPERATURE, 0x1C00)
                    .str("Short")
                    .byte(0x63)
                    .word(0x0320)
                    .word(0x0064)
                    .word(0x0001)
                    .word(0x0005)
                    .word(0x0010)
                    .bytes({0x01, 0x02, 0x03, 0x04}));
    ParentSetup setup(mi, builder);
    ASSERT_EQ(0x14, setup.built.parsed.getTables()[0].getLength());
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 22);
    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(hasDouble(nodes[0], 14, 0.0));
    EXPECT_TRUE(hasBytes(nodes[0], 43, {0x04, 0x03, 0x02, 0x01}));
    EXPECT_TRUE(setup.log.contains("getNumber16 offset=20 length=20")) << setup.log.dump();
    EXPECT_EQ(1u, loggedCount("Temperature in 0.1 degrees=0")) << setup.log.dump();
}

TEST(TemperatureSensorNodes, NoProbeStructureMakesNoNode) {
    TestMI mi;
    TableBuilder builder;
    // A voltage probe is not a temperature probe.
    builder.add(probe(VOLTAGE, 0x1A00, at(0x63)));
    ParentSetup setup(mi, builder);
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    EXPECT_EQ(1u, mi.nodeList.size());
    EXPECT_EQ((std::vector<std::string>{"makeTemperatureSensorNodes entry",
                                        "makeTemperatureSensorNodes exit"}),
              builderTexts())
        << setup.log.dump();
}

TEST(TemperatureSensorNodes, FailureLogsTable28AndTheIndexAndGoesOn) {
    TestMI mi;
    TableBuilder builder;
    builder.add(probe(TEMPERATURE, 0x1C00, at(0x63)));
    // The last structure claims a formatted area longer than its bytes, so
    // its description string cannot be found: the lookup throws.
    builder.add(probe(TEMPERATURE, 0x1C01, at(0x63)).length(0x40));
    ParentSetup setup(mi, builder);
    ASSERT_EQ(2u, setup.built.parsed.getTables().size());
    mi.makeTemperatureSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::string const logged = frametest::firstLogged("Exception=");
    EXPECT_EQ(0u, logged.find("Exception=")) << setup.log.dump();
    EXPECT_NE(std::string::npos, logged.find(" Type=")) << logged;
    EXPECT_NE(std::string::npos, logged.find("Table 28 index =1")) << logged;
    EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels("Exception=")) << setup.log.dump();

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 22);
    ASSERT_EQ(2u, nodes.size());
    EXPECT_EQ((Ids{14, 23, 31, 33, 43, 125}), propertyIds(nodes[0]));
    // The failed node keeps its status and the list set before the lookup.
    EXPECT_EQ(1u, nodes[1]->getIndex());
    EXPECT_EQ(1u, nodes[1]->getStatus());
    EXPECT_EQ((Ids{125}), propertyIds(nodes[1]));
    EXPECT_EQ(1u, loggedCount("makeTemperatureSensorNodes exit")) << setup.log.dump();
}

// ---------------------------------------------------------------- voltage

TEST(VoltageSensorNodes, ProbeAtTheLocationSetsEveryFieldInVolts) {
    TestMI mi;
    Probe p;
    p.description = "12V Rail";
    p.locationAndStatus = 0x84;  // non-critical, location 4
    p.maximum = 12600;
    p.minimum = 11400;
    p.oem = {0xA0, 0xB0, 0xC0, 0xD0};
    p.nominal = 12000;
    ParentSetup setup(mi, tableOf({probe(VOLTAGE, 0x1A00, p)}));
    mi.makeVoltageSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 4);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 21);
    ASSERT_EQ(1u, nodes.size()) << setup.log.dump();
    IC::Node const* node = nodes[0];
    EXPECT_TRUE(isNode(node, 3u, 2u, 21, 0u, 21u, "12V Rail"));
    EXPECT_EQ(std::vector<unsigned int>{1}, node->getMIIds());
    EXPECT_EQ((Ids{14, 23, 31, 33, 43, 125}), propertyIds(node));
    expectProperties(node, {unsignedListProp(125, SENSOR_STATUSES), unsignedProp(31, 4),
                            bytesProp(43, {0xD0, 0xC0, 0xB0, 0xA0}), doubleProp(14, 12.0),
                            doubleProp(23, 12.6), doubleProp(33, 11.4)});
    EXPECT_EQ(node, setup.built.lists.storage[VOLTAGE][0].node);
    EXPECT_EQ(2u, mi.nodeList.size());

    EXPECT_EQ((std::vector<std::string>{"makeVoltageSensorNodes entry", "Table 26 length = 22",
                                        "Millivolts=12000", "makeVoltageSensorNodes exit"}),
              builderTexts())
        << setup.log.dump();
}

TEST(VoltageSensorNodes, Nominal12000Is12VoltsAndMaximum0x8000IsNotSet) {
    TestMI mi;
    Probe p = at(0x63);
    p.nominal = 12000;
    p.maximum = 0x8000;
    p.minimum = 0x8000;
    ParentSetup setup(mi, tableOf({probe(VOLTAGE, 0x1A00, p)}));
    mi.makeVoltageSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 21);
    ASSERT_EQ(1u, nodes.size());
    expectProperties(nodes[0], {doubleProp(14, 12.0), noProp(23), noProp(33)});
}

TEST(VoltageSensorNodes, NominalUnknownOnlyAt0x800) {
    TestMI mi;
    Probe unknown = at(0x63);
    unknown.nominal = 0x0800;
    Probe high = at(0x63);
    high.nominal = 0x8000;
    ParentSetup setup(mi, tableOf({probe(VOLTAGE, 0x1A00, unknown), probe(VOLTAGE, 0x1A01, high)}));
    mi.makeVoltageSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 21);
    ASSERT_EQ(2u, nodes.size());
    EXPECT_TRUE(lacksProperty(nodes[0], 14));
    EXPECT_TRUE(hasDouble(nodes[1], 14, 32.768));
    EXPECT_EQ(1u, loggedCount("Millivolts=")) << setup.log.dump();
    EXPECT_EQ(1u, loggedCount("Millivolts=32768")) << setup.log.dump();
}

TEST(VoltageSensorNodes, LocationFilterAndStatusesAreThoseOfTheTemperatureProbes) {
    TestMI mi;
    TableBuilder builder;
    builder.add(probe(VOLTAGE, 0x1A00, at(0xA5)));  // critical, location 5
    builder.add(probe(VOLTAGE, 0x1A01, at(0x63)));  // location 3
    builder.add(probe(VOLTAGE, 0x1A02, at(0xC5)));  // non-recoverable, location 5
    builder.add(probe(VOLTAGE, 0x1A03, at(0x65)));  // OK, location 5
    ParentSetup setup(mi, builder);
    mi.makeVoltageSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 5);

    std::vector<IC::Node*> const nodes = nodesOfType(mi, 21);
    ASSERT_EQ(3u, nodes.size());
    EXPECT_EQ(0u, nodes[0]->getIndex());
    EXPECT_EQ(0u, nodes[0]->getStatus());
    EXPECT_EQ(2u, nodes[1]->getIndex());
    EXPECT_EQ(0u, nodes[1]->getStatus());
    EXPECT_EQ(3u, nodes[2]->getIndex());
    EXPECT_EQ(1u, nodes[2]->getStatus());
    EXPECT_EQ(4u, loggedCount("Table 26 length = 22")) << setup.log.dump();
}

TEST(VoltageSensorNodes, NoProbeStructureMakesNoNode) {
    TestMI mi;
    TableBuilder builder;
    // A temperature probe is not a voltage probe.
    builder.add(probe(TEMPERATURE, 0x1C00, at(0x63)));
    ParentSetup setup(mi, builder);
    mi.makeVoltageSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    EXPECT_EQ(1u, mi.nodeList.size());
    EXPECT_EQ(
        (std::vector<std::string>{"makeVoltageSensorNodes entry", "makeVoltageSensorNodes exit"}),
        frametest::loggedTexts())
        << setup.log.dump();
}

TEST(VoltageSensorNodes, FailureLogsTable26AndTheIndex) {
    TestMI mi;
    ParentSetup setup(mi, tableOf({probe(VOLTAGE, 0x1A00, at(0x63)).length(0x40)}));
    mi.makeVoltageSensorNodes(setup.built.lists.get(), setup.parent->getNodeId(), 3);

    std::string const logged = frametest::firstLogged("Exception=");
    EXPECT_NE(std::string::npos, logged.find("Table 26 index =0")) << setup.log.dump();
    EXPECT_EQ(1u, loggedCount("makeVoltageSensorNodes exit")) << setup.log.dump();
}
