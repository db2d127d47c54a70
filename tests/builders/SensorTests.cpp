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

// A table of probes of one type, in order, with handles from 0x1C00
// (temperature) or 0x1A00 (voltage) up.
TableBuilder probes(uint8_t type, std::vector<Probe> const& list) {
    TableBuilder table;
    uint16_t handle = type == TEMPERATURE ? 0x1C00 : 0x1A00;
    for (Probe const& p : list) {
        table.add(probe(type, handle++, p));
    }
    return table;
}

Probe at(uint8_t locationAndStatus) {
    Probe p;
    p.locationAndStatus = locationAndStatus;
    return p;
}

// A probe at location 3, status OK, with the given nominal reading.
Probe nominal(uint16_t reading) {
    Probe p = at(0x63);
    p.nominal = reading;
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

// The temperature (type 28) or voltage (type 26) builder run over the
// table at `location`, under a planar node (id 2); nodes holds the sensor
// nodes it made (type 22 or 21). The log is captured from the call on.
struct SensorRun : BuilderSetup {
    SensorRun(uint8_t type, TableBuilder const& table, unsigned int location)
        : BuilderSetup(table) {
        if (type == TEMPERATURE) {
            mi.makeTemperatureSensorNodes(lists.get(), parent->getNodeId(), location);
        } else {
            mi.makeVoltageSensorNodes(lists.get(), parent->getNodeId(), location);
        }
        nodes = nodesOfType(mi, type == TEMPERATURE ? 22 : 21);
    }

    LogCapture log;
    std::vector<IC::Node*> nodes;
};

}  // namespace

// ------------------------------------------------------------ temperature

TEST(TemperatureSensorNodes, ProbeAtTheLocationSetsEveryField) {
    Probe p;
    p.description = "CPU 1 Temp";
    p.locationAndStatus = 0x63;  // OK, processor
    p.maximum = 0x0320;          // 80.0
    p.minimum = 0x0064;          // 10.0
    p.oem = {0x11, 0x22, 0x33, 0x44};
    p.nominal = 0x0190;  // 40.0
    SensorRun const run(TEMPERATURE, probes(TEMPERATURE, {p}), 3);
    ASSERT_EQ(0x16, run.parsed.getTables()[0].getLength());

    ASSERT_EQ(1u, run.nodes.size()) << run.log.dump();
    IC::Node const* node = run.nodes[0];
    EXPECT_TRUE(isNode(node, 3u, 2u, 22, 0u, 1u, "CPU 1 Temp"));
    EXPECT_EQ(std::vector<unsigned int>{1}, node->getMIIds());
    EXPECT_EQ((Ids{14, 23, 31, 33, 43, 125}), propertyIds(node));
    EXPECT_TRUE(hasUnsignedList(node, 125, SENSOR_STATUSES));
    EXPECT_TRUE(hasUnsigned(node, 31, 3));
    // The OEM-defined bytes reversed.
    expectProperties(node, {bytesProp(43, {0x44, 0x33, 0x22, 0x11}), doubleProp(14, 40.0),
                            doubleProp(23, 80.0), doubleProp(33, 10.0)});
    EXPECT_EQ(node, run.lists.storage[TEMPERATURE][0].node);
    EXPECT_EQ(2u, run.mi.nodeList.size());
    EXPECT_TRUE(childrenOf(run.mi, 3).empty());

    EXPECT_EQ((std::vector<std::string>{"makeTemperatureSensorNodes entry", "Table 28 length = 22",
                                        "Temperature in 0.1 degrees=400",
                                        "makeTemperatureSensorNodes exit"}),
              builderTexts())
        << run.log.dump();
}

TEST(TemperatureSensorNodes, OnlyProbesAtTheLocationMakeNodesAndIndexesCountSkippedOnes) {
    Probe first = at(0x63);
    first.description = "first";
    Probe third = at(0x63);
    third.description = "third";
    // The second probe is at location 4.
    SensorRun const run(TEMPERATURE, probes(TEMPERATURE, {first, at(0x64), third}), 3);

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_TRUE(hasIdAndIndex(run.nodes[0], 3, 0));
    EXPECT_EQ("first", run.nodes[0]->getDescription());
    EXPECT_TRUE(hasIdAndIndex(run.nodes[1], 4, 2));
    EXPECT_EQ("third", run.nodes[1]->getDescription());
    EXPECT_EQ(nullptr, run.lists.storage[TEMPERATURE][1].node);
    // Every structure is logged, the skipped one too.
    EXPECT_EQ(3u, loggedCount("Table 28 length = 22")) << run.log.dump();
}

TEST(TemperatureSensorNodes, LocationIsTheLowFiveBitsOfItsByte) {
    // Status 3, location 31; then status 4, location 3.
    SensorRun const run(TEMPERATURE, probes(TEMPERATURE, {at(0x7F), at(0x83)}), 0x1F);

    ASSERT_EQ(1u, run.nodes.size());
    EXPECT_EQ(0u, run.nodes[0]->getIndex());
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 31, 0x1F));
    EXPECT_EQ(1u, run.nodes[0]->getStatus());
}

TEST(TemperatureSensorNodes, StatusFallsThroughToOtherForCriticalAndNonRecoverable) {
    std::vector<uint8_t> const bytes = {0x63, 0x83, 0xA3, 0xC3, 0x23, 0xE3, 0x03, 0x43};
    std::vector<Probe> list;
    for (uint8_t byte : bytes) {
        list.push_back(at(byte));
    }
    SensorRun const run(TEMPERATURE, probes(TEMPERATURE, list), 3);

    ASSERT_EQ(bytes.size(), run.nodes.size());
    // OK: 1; non-critical: 21; critical (24, 27, 0) and non-recoverable
    // (27, 0) end at 0; every other status (1, 7, 0, 2) is 0.
    std::vector<unsigned int> const expected = {1, 21, 0, 0, 0, 0, 0, 0};
    for (size_t i = 0; i < run.nodes.size(); ++i) {
        EXPECT_EQ(expected[i], run.nodes[i]->getStatus()) << "byte 0x" << std::hex << +bytes[i];
        EXPECT_TRUE(hasUnsigned(run.nodes[i], 31, 3)) << i;
    }
}

TEST(TemperatureSensorNodes, NominalIsInTenthsOfADegreeAndUnknownOnlyAt0x800) {
    SensorRun const run(
        TEMPERATURE, probes(TEMPERATURE, {nominal(0x0190), nominal(0x0800), nominal(0x8000)}), 3);

    ASSERT_EQ(3u, run.nodes.size());
    EXPECT_TRUE(hasDouble(run.nodes[0], 14, 40.0));
    EXPECT_TRUE(lacksProperty(run.nodes[1], 14));
    EXPECT_TRUE(hasDouble(run.nodes[2], 14, 3276.8));
    EXPECT_EQ(1u, loggedCount("Temperature in 0.1 degrees=400")) << run.log.dump();
    EXPECT_EQ(0u, loggedCount("Temperature in 0.1 degrees=2048")) << run.log.dump();
    EXPECT_EQ(1u, loggedCount("Temperature in 0.1 degrees=32768")) << run.log.dump();
    EXPECT_EQ(2u, loggedCount("Temperature in 0.1 degrees=")) << run.log.dump();
}

TEST(TemperatureSensorNodes, NegativeReadingIsTakenAsALargeUnsignedValue) {
    Probe p = nominal(0xFF9C);  // -100 as a two's-complement word
    p.minimum = 0xFE0C;         // -500
    SensorRun const run(TEMPERATURE, probes(TEMPERATURE, {p}), 3);

    ASSERT_EQ(1u, run.nodes.size());
    EXPECT_TRUE(hasDouble(run.nodes[0], 14, 6543.6));
    EXPECT_TRUE(hasDouble(run.nodes[0], 33, 6503.6));
}

TEST(TemperatureSensorNodes, MaximumAndMinimumUnknownAt0x8000AreNotSet) {
    Probe both = at(0x63);
    both.maximum = 0x8000;
    both.minimum = 0x8000;
    Probe atNominalUnknown = at(0x63);
    atNominalUnknown.maximum = 0x0800;  // only the nominal value knows 0x800
    atNominalUnknown.minimum = 0x0000;
    SensorRun const run(TEMPERATURE, probes(TEMPERATURE, {both, atNominalUnknown}), 3);

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_EQ((Ids{14, 31, 43, 125}), propertyIds(run.nodes[0]));
    EXPECT_TRUE(hasDouble(run.nodes[1], 23, 204.8));
    EXPECT_TRUE(hasDouble(run.nodes[1], 33, 0.0));
}

TEST(TemperatureSensorNodes, ShortStructureReadsTheMissingNominalAsZeroAndSetsIt) {
    // Up to the OEM-defined bytes: 0x14 bytes, no nominal value.
    Structure shortProbe(TEMPERATURE, 0x1C00);
    shortProbe.str("Short").byte(0x63).word(0x0320).word(0x0064);
    shortProbe.word(0x0001).word(0x0005).word(0x0010).bytes({0x01, 0x02, 0x03, 0x04});
    SensorRun const run(TEMPERATURE, tableOf({shortProbe}), 3);
    ASSERT_EQ(0x14, run.parsed.getTables()[0].getLength());

    ASSERT_EQ(1u, run.nodes.size());
    EXPECT_TRUE(hasDouble(run.nodes[0], 14, 0.0));
    EXPECT_TRUE(hasBytes(run.nodes[0], 43, {0x04, 0x03, 0x02, 0x01}));
    EXPECT_TRUE(run.log.contains("getNumber16 offset=20 length=20")) << run.log.dump();
    EXPECT_EQ(1u, loggedCount("Temperature in 0.1 degrees=0")) << run.log.dump();
}

TEST(TemperatureSensorNodes, NoProbeStructureMakesNoNode) {
    // A voltage probe is not a temperature probe.
    SensorRun const run(TEMPERATURE, probes(VOLTAGE, {at(0x63)}), 3);

    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_EQ((std::vector<std::string>{"makeTemperatureSensorNodes entry",
                                        "makeTemperatureSensorNodes exit"}),
              builderTexts())
        << run.log.dump();
}

TEST(TemperatureSensorNodes, FailureLogsTable28AndTheIndexAndGoesOn) {
    TableBuilder table = probes(TEMPERATURE, {at(0x63)});
    // The last structure claims a formatted area longer than its bytes, so
    // its description string cannot be found: the lookup throws.
    table.add(probe(TEMPERATURE, 0x1C01, at(0x63)).length(0x40));
    SensorRun const run(TEMPERATURE, table, 3);
    ASSERT_EQ(2u, run.parsed.getTables().size());

    std::string const logged = frametest::firstLogged("Exception=");
    EXPECT_EQ(0u, logged.find("Exception=")) << run.log.dump();
    EXPECT_NE(std::string::npos, logged.find(" Type=")) << logged;
    EXPECT_NE(std::string::npos, logged.find("Table 28 index =1")) << logged;
    EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels("Exception=")) << run.log.dump();

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_EQ((Ids{14, 23, 31, 33, 43, 125}), propertyIds(run.nodes[0]));
    // The failed node keeps its status and the list set before the lookup.
    EXPECT_EQ(1u, run.nodes[1]->getIndex());
    EXPECT_EQ(1u, run.nodes[1]->getStatus());
    EXPECT_EQ((Ids{125}), propertyIds(run.nodes[1]));
    EXPECT_EQ(1u, loggedCount("makeTemperatureSensorNodes exit")) << run.log.dump();
}

// ---------------------------------------------------------------- voltage

TEST(VoltageSensorNodes, ProbeAtTheLocationSetsEveryFieldInVolts) {
    Probe p;
    p.description = "12V Rail";
    p.locationAndStatus = 0x84;  // non-critical, location 4
    p.maximum = 12600;
    p.minimum = 11400;
    p.oem = {0xA0, 0xB0, 0xC0, 0xD0};
    p.nominal = 12000;
    SensorRun const run(VOLTAGE, probes(VOLTAGE, {p}), 4);

    ASSERT_EQ(1u, run.nodes.size()) << run.log.dump();
    IC::Node const* node = run.nodes[0];
    EXPECT_TRUE(isNode(node, 3u, 2u, 21, 0u, 21u, "12V Rail"));
    EXPECT_EQ(std::vector<unsigned int>{1}, node->getMIIds());
    EXPECT_EQ((Ids{14, 23, 31, 33, 43, 125}), propertyIds(node));
    expectProperties(node, {unsignedListProp(125, SENSOR_STATUSES), unsignedProp(31, 4),
                            bytesProp(43, {0xD0, 0xC0, 0xB0, 0xA0}), doubleProp(14, 12.0),
                            doubleProp(23, 12.6), doubleProp(33, 11.4)});
    EXPECT_EQ(node, run.lists.storage[VOLTAGE][0].node);
    EXPECT_EQ(2u, run.mi.nodeList.size());

    EXPECT_EQ((std::vector<std::string>{"makeVoltageSensorNodes entry", "Table 26 length = 22",
                                        "Millivolts=12000", "makeVoltageSensorNodes exit"}),
              builderTexts())
        << run.log.dump();
}

TEST(VoltageSensorNodes, Nominal12000Is12VoltsAndMaximum0x8000IsNotSet) {
    Probe p = nominal(12000);
    p.maximum = 0x8000;
    p.minimum = 0x8000;
    SensorRun const run(VOLTAGE, probes(VOLTAGE, {p}), 3);

    ASSERT_EQ(1u, run.nodes.size());
    expectProperties(run.nodes[0], {doubleProp(14, 12.0), noProp(23), noProp(33)});
}

TEST(VoltageSensorNodes, NominalUnknownOnlyAt0x800) {
    SensorRun const run(VOLTAGE, probes(VOLTAGE, {nominal(0x0800), nominal(0x8000)}), 3);

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_TRUE(lacksProperty(run.nodes[0], 14));
    EXPECT_TRUE(hasDouble(run.nodes[1], 14, 32.768));
    EXPECT_EQ(1u, loggedCount("Millivolts=")) << run.log.dump();
    EXPECT_EQ(1u, loggedCount("Millivolts=32768")) << run.log.dump();
}

TEST(VoltageSensorNodes, LocationFilterAndStatusesAreThoseOfTheTemperatureProbes) {
    // Critical at location 5, then location 3, non-recoverable at 5, OK at 5.
    SensorRun const run(VOLTAGE, probes(VOLTAGE, {at(0xA5), at(0x63), at(0xC5), at(0x65)}), 5);

    ASSERT_EQ(3u, run.nodes.size());
    EXPECT_EQ(0u, run.nodes[0]->getIndex());
    EXPECT_EQ(0u, run.nodes[0]->getStatus());
    EXPECT_EQ(2u, run.nodes[1]->getIndex());
    EXPECT_EQ(0u, run.nodes[1]->getStatus());
    EXPECT_EQ(3u, run.nodes[2]->getIndex());
    EXPECT_EQ(1u, run.nodes[2]->getStatus());
    EXPECT_EQ(4u, loggedCount("Table 26 length = 22")) << run.log.dump();
}

TEST(VoltageSensorNodes, NoProbeStructureMakesNoNode) {
    // A temperature probe is not a voltage probe.
    SensorRun const run(VOLTAGE, probes(TEMPERATURE, {at(0x63)}), 3);

    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_TRUE(loggedOnly({"makeVoltageSensorNodes entry", "makeVoltageSensorNodes exit"}));
}

TEST(VoltageSensorNodes, FailureLogsTable26AndTheIndex) {
    SensorRun const run(VOLTAGE, tableOf({probe(VOLTAGE, 0x1A00, at(0x63)).length(0x40)}), 3);

    std::string const logged = frametest::firstLogged("Exception=");
    EXPECT_NE(std::string::npos, logged.find("Table 26 index =0")) << run.log.dump();
    EXPECT_EQ(1u, loggedCount("makeVoltageSensorNodes exit")) << run.log.dump();
}
