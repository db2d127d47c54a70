// smbios-inventory with the real plug-in and the options that ask it for
// the nodes its initialize does not make: --sensors LOCATION and --bmc on
// the example server, and --from-bin, which must give what --dump gives on
// the override file made from the same image.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "HostRunner.h"
#include "InventoryJson.h"
#include "PluginRead.h"
#include "TableBuilder.h"
#include "TestSupport.h"

namespace {

using hosttest::Json;
using hosttest::RunResult;

unsigned int const kRootType = 59;
unsigned int const kPlanarType = 41;
unsigned int const kFirmwareType = 3;
unsigned int const kEventLogType = 35;
unsigned int const kBmcType = 13;
unsigned int const kVoltageType = 21;
unsigned int const kTemperatureType = 22;

std::string realPlugin() { return hosttest::outDir() + "/libsmbiosmi.so"; }

std::string demoDump() { return hosttest::sourceDir() + "/examples/demo-server.smbios.txt"; }

Json numberValue(char const* kind, Json value) { return Json({{"kind", kind}, {"value", value}}); }

// Property 125 of every sensor node: the statuses a sensor can take.
Json sensorStatuses() {
    Json values = Json::array();
    for (unsigned int status : {1u, 0u, 21u, 24u, 27u}) {
        values.push_back(numberValue("unsigned", status));
    }
    return numberValue("numbers", values);
}

// What a sensor node made from a probe must hold.
struct ExpectedSensor {
    unsigned int type;
    unsigned int index;
    unsigned int status;
    char const* description;
    unsigned int location;
    double nominal;
    double maximum;
    double minimum;
};

void expectSensor(Json const& node, unsigned int parentId, ExpectedSensor const& expected) {
    SCOPED_TRACE(expected.description);
    EXPECT_EQ(node["type"], expected.type);
    EXPECT_EQ(node["index"], expected.index);
    EXPECT_EQ(node["linked"], parentId);
    EXPECT_EQ(node["status"], expected.status);
    EXPECT_EQ(node["description"], expected.description);
    Json properties = Json::object();
    properties["14"] = numberValue("double", expected.nominal);
    properties["23"] = numberValue("double", expected.maximum);
    properties["31"] = numberValue("unsigned", expected.location);
    properties["33"] = numberValue("double", expected.minimum);
    properties["43"] = numberValue("bytes", "00000000");
    properties["125"] = sensorStatuses();
    EXPECT_EQ(hosttest::withoutLabels(node["properties"]), properties);
    // The readings in degrees Celsius or in volts.
    char const* const unit = expected.type == kTemperatureType ? "\u00B0C" : "V";
    for (char const* id : {"14", "23", "33"}) {
        EXPECT_EQ(node["properties"][id].value("unit", ""), unit) << id;
    }
}

// The processor probes of the example: two temperature probes, the second
// one non-critical, and one voltage probe.
ExpectedSensor const kCpu1Temperature = {kTemperatureType, 0, 1, "CPU1 Temp", 3, 40.0, 100.0, 0.0};
ExpectedSensor const kCpu2Temperature = {kTemperatureType, 1, 21, "CPU2 Temp", 3, 40.0, 100.0, 0.0};
ExpectedSensor const kCpu1Voltage = {kVoltageType, 0, 1, "CPU1 Vcore", 3, 1.2, 1.5, 0.9};
// The disk probe: one voltage probe.
ExpectedSensor const kBackplaneVoltage = {kVoltageType, 1, 1, "Backplane 12V", 4, 12.0, 13.2, 10.8};

class HostExtraNodes : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_FALSE(hosttest::outDir().empty())
            << "SMBIOS_OUT_DIR is not set; run the tests through ctest";
        ASSERT_TRUE(std::filesystem::exists(realPlugin())) << realPlugin();
        ASSERT_TRUE(std::filesystem::exists(demoDump())) << demoDump();
    }

    // Runs the host with the real plug-in, JSON output, and parses it.
    void runJson(std::vector<std::string> const& extra) {
        std::vector<std::string> args = {"--plugin", realPlugin(), "--format", "json"};
        args.insert(args.end(), extra.begin(), extra.end());
        run_ = hosttest::runHost(args);
        ASSERT_EQ(run_.exitStatus, 0) << hosttest::describe(run_);
        ASSERT_NO_THROW(doc_ = Json::parse(run_.out)) << hosttest::describe(run_);
    }

    void runDemo(std::vector<std::string> const& extra) {
        std::vector<std::string> args = {"--dump", demoDump()};
        args.insert(args.end(), extra.begin(), extra.end());
        runJson(args);
    }

    // The id of the one node of a type.
    unsigned int onlyNodeId(unsigned int type) {
        std::vector<Json> const nodes = hosttest::nodesOfType(doc_, type);
        EXPECT_EQ(nodes.size(), 1u) << "nodes of type " << type;
        return nodes.empty() ? 0 : nodes[0]["id"].get<unsigned int>();
    }

    // The types of the nodes after the first `count` nodes, in list order.
    std::vector<unsigned int> typesAfter(size_t count) {
        std::vector<unsigned int> types;
        Json const& nodes = doc_["nodes"];
        for (size_t i = count; i < nodes.size(); ++i) {
            types.push_back(nodes[i]["type"].get<unsigned int>());
        }
        return types;
    }

    RunResult run_;
    Json doc_;
};

TEST_F(HostExtraNodes, SensorsProcessorMakesTemperatureAndVoltageNodesUnderThePlanar) {
    ASSERT_NO_FATAL_FAILURE(runDemo({"--sensors", "processor"}));
    unsigned int const planar = onlyNodeId(kPlanarType);
    std::vector<Json> const temperatures = hosttest::nodesOfType(doc_, kTemperatureType);
    std::vector<Json> const voltages = hosttest::nodesOfType(doc_, kVoltageType);
    ASSERT_EQ(temperatures.size(), 2u) << run_.out;
    ASSERT_EQ(voltages.size(), 1u) << run_.out;
    expectSensor(temperatures[0], planar, kCpu1Temperature);
    expectSensor(temperatures[1], planar, kCpu2Temperature);
    expectSensor(voltages[0], planar, kCpu1Voltage);
}

TEST_F(HostExtraNodes, SensorsLocationByCodeHexAndNameGiveTheSameNodes) {
    for (char const* location : {"4", "0x04", "disk"}) {
        SCOPED_TRACE(location);
        ASSERT_NO_FATAL_FAILURE(runDemo({"--sensors", location}));
        EXPECT_TRUE(hosttest::nodesOfType(doc_, kTemperatureType).empty());
        std::vector<Json> const voltages = hosttest::nodesOfType(doc_, kVoltageType);
        ASSERT_EQ(voltages.size(), 1u) << run_.out;
        expectSensor(voltages[0], onlyNodeId(kPlanarType), kBackplaneVoltage);
    }
}

TEST_F(HostExtraNodes, RepeatedSensorsLocationMakesItsNodesOnce) {
    ASSERT_NO_FATAL_FAILURE(runDemo({"--sensors", "processor", "--sensors", "3"}));
    EXPECT_EQ(hosttest::nodesOfType(doc_, kTemperatureType).size(), 2u);
    EXPECT_EQ(hosttest::nodesOfType(doc_, kVoltageType).size(), 1u);
}

TEST_F(HostExtraNodes, SensorsAtLocationWithoutProbesMakeNoNodes) {
    ASSERT_NO_FATAL_FAILURE(runDemo({}));
    size_t const plain = doc_["nodes"].size();
    ASSERT_NO_FATAL_FAILURE(runDemo({"--sensors", "motherboard", "--sensors", "31"}));
    EXPECT_EQ(doc_["nodes"].size(), plain);
}

TEST_F(HostExtraNodes, ExtraNodesFollowTheInitializeNodesInTheOrderAsked) {
    ASSERT_NO_FATAL_FAILURE(runDemo({}));
    size_t const plain = doc_["nodes"].size();
    unsigned int const lastId = doc_["nodes"][plain - 1]["id"].get<unsigned int>();
    ASSERT_NO_FATAL_FAILURE(runDemo({"--bmc", "--sensors", "disk", "--sensors", "processor"}));
    std::vector<unsigned int> const types = typesAfter(plain);
    // Per location its temperature then its voltage sensors; the BMC last.
    ASSERT_GE(types.size(), 5u);
    EXPECT_EQ(std::vector<unsigned int>(types.begin(), types.begin() + 5),
              (std::vector<unsigned int>{kVoltageType, kTemperatureType, kTemperatureType,
                                         kVoltageType, kBmcType}));
    EXPECT_EQ(doc_["nodes"][plain]["id"], lastId + 1);
    EXPECT_EQ(doc_["nodes"][plain]["description"], "Backplane 12V");
}

TEST_F(HostExtraNodes, BmcMakesBmcNodeWithItsEventLogAndFirmwareUnderThePlanar) {
    ASSERT_NO_FATAL_FAILURE(runDemo({}));
    size_t const plain = doc_["nodes"].size();
    std::vector<Json> const firmware = hosttest::nodesOfType(doc_, kFirmwareType);
    ASSERT_FALSE(firmware.empty()) << run_.out;

    ASSERT_NO_FATAL_FAILURE(runDemo({"--bmc"}));
    unsigned int const planar = onlyNodeId(kPlanarType);
    std::vector<Json> const bmcs = hosttest::nodesOfType(doc_, kBmcType);
    ASSERT_EQ(bmcs.size(), 1u) << run_.out;
    Json const& bmc = bmcs[0];
    EXPECT_EQ(bmc["linked"], planar);
    EXPECT_EQ(bmc["index"], 0);
    EXPECT_EQ(bmc["status"], 1);
    EXPECT_EQ(bmc["description"], "BMC");
    EXPECT_EQ(bmc["properties"], Json::object());
    unsigned int const bmcId = bmc["id"].get<unsigned int>();

    // Under the BMC: its event log, then the firmware nodes again, each with
    // an event log of its own.
    Json const& nodes = doc_["nodes"];
    ASSERT_EQ(nodes.size(), plain + 1 + 1 + 2 * firmware.size()) << run_.out;
    EXPECT_EQ(nodes[plain]["id"], bmcId);
    Json const& log = nodes[plain + 1];
    EXPECT_EQ(log["type"], kEventLogType);
    EXPECT_EQ(log["linked"], bmcId);
    for (size_t i = 0; i < firmware.size(); ++i) {
        SCOPED_TRACE("firmware " + std::to_string(i));
        Json const& node = nodes[plain + 2 + 2 * i];
        Json const& nodeLog = nodes[plain + 3 + 2 * i];
        EXPECT_EQ(node["type"], kFirmwareType);
        EXPECT_EQ(node["linked"], bmcId);
        EXPECT_EQ(node["description"], firmware[i]["description"]);
        EXPECT_EQ(node["properties"], firmware[i]["properties"]);
        EXPECT_EQ(nodeLog["type"], kEventLogType);
        EXPECT_EQ(nodeLog["linked"], node["id"]);
    }
}

TEST_F(HostExtraNodes, SensorsOnTableWithoutPlanarHangUnderTheRoot) {
    // One temperature probe (status OK, processor) and nothing that makes a
    // planar node.
    smbiostest::TableBuilder table;
    table.add(smbiostest::Structure(28, 0x0010)
                  .str("Ambient Temp")
                  .byte(0x63)
                  .word(0x0258)       // maximum: 60.0
                  .word(0x0064)       // minimum: 10.0
                  .word(0x8000)       // resolution
                  .word(0x8000)       // tolerance
                  .word(0x8000)       // accuracy
                  .dword(0x0403020A)  // OEM-defined
                  .word(0x00FA));     // nominal: 25.0
    table.endOfTable(0x0011);
    std::vector<uint8_t> const bytes = table.build();
    std::vector<uint8_t> const header = smbiosdump::makeSmEntryPoint(
        2, 7, static_cast<uint16_t>(bytes.size()), 0x000F0000, table.count(), table.maxSize());
    smbiostest::TempDir data;
    smbiostest::writeOverrideDir(data.path(), header, bytes);

    ASSERT_NO_FATAL_FAILURE(runJson({"--data-dir", data.path() + "/", "--sensors", "3"}));
    EXPECT_TRUE(hosttest::nodesOfType(doc_, kPlanarType).empty());
    std::vector<Json> const temperatures = hosttest::nodesOfType(doc_, kTemperatureType);
    ASSERT_EQ(temperatures.size(), 1u) << run_.out;
    Json const& node = temperatures[0];
    EXPECT_EQ(node["linked"], onlyNodeId(kRootType));
    EXPECT_EQ(node["description"], "Ambient Temp");
    EXPECT_EQ(node["status"], 1);
    EXPECT_EQ(hosttest::withoutLabels(hosttest::propertyOf(node, 14)), numberValue("double", 25.0));
    EXPECT_EQ(hosttest::withoutLabels(hosttest::propertyOf(node, 23)), numberValue("double", 60.0));
    EXPECT_EQ(hosttest::withoutLabels(hosttest::propertyOf(node, 33)), numberValue("double", 10.0));
    EXPECT_EQ(hosttest::withoutLabels(hosttest::propertyOf(node, 43)),
              numberValue("bytes", "0403020A"));
}

// ---- --from-bin ---------------------------------------------------------------

// The host's JSON with its clock values masked.
std::string maskedJson(RunResult const& run) {
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    unsigned int masked = 0;
    try {
        return hosttest::maskRunValues(run.out, masked);
    } catch (std::exception const& error) {
        ADD_FAILURE() << error.what() << "\n" << hosttest::describe(run);
    }
    return std::string();
}

TEST_F(HostExtraNodes, FromBinOfTheDemoTableGivesTheDemoInventory) {
    // The example's entry point and table laid out as dmidecode --dump-bin
    // does: the entry point at 0 with its table address set to 0x20 (and
    // its checksums set again), the table from 0x20.
    smbiosdump::PluginRead const demo = smbiosdump::readOverrideFile(demoDump());
    ASSERT_TRUE(demo.ok()) << demo.imported << " " << demo.head << " " << demo.tables;
    std::vector<uint8_t> const& header = demo.header;
    std::vector<uint8_t> const& table = demo.table;
    ASSERT_EQ(header.size(), smbiosdump::SM_ENTRY_POINT_SIZE);
    uint16_t const structureCount = static_cast<uint16_t>(header[0x1C] | header[0x1D] << 8);
    uint16_t const maxSize = static_cast<uint16_t>(header[0x08] | header[0x09] << 8);
    std::vector<uint8_t> bin =
        smbiosdump::makeSmEntryPoint(header[6], header[7], static_cast<uint16_t>(table.size()),
                                     smbiosdump::DUMP_BIN_TABLE_OFFSET, structureCount, maxSize);
    bin.resize(smbiosdump::DUMP_BIN_TABLE_OFFSET, 0);
    bin.insert(bin.end(), table.begin(), table.end());
    smbiostest::TempDir folder;
    std::string const binFile = folder.file("demo-server.bin");
    smbiostest::writeFile(binFile, bin);

    std::string const fromDump = maskedJson(hosttest::runHost(
        {"--plugin", realPlugin(), "--format", "json", "--dump", demoDump(), "--bmc"}));
    std::string const fromBin = maskedJson(hosttest::runHost(
        {"--plugin", realPlugin(), "--format", "json", "--from-bin", binFile, "--bmc"}));
    ASSERT_FALSE(fromDump.empty());
    EXPECT_TRUE(fromBin == fromDump) << hosttest::firstDifference(fromDump, fromBin);
}

TEST_F(HostExtraNodes, FromBinGivesTheSameJsonAsDumpOfItsOverrideFileForEveryCorpusDump) {
    std::vector<std::string> const names = smbiostest::corpusNames();
    if (names.empty()) {
        GTEST_SKIP() << "no corpus of real SMBIOS dumps (SMBIOS_CORPUS_DIR)";
    }
    smbiostest::TempDir folder;
    for (std::string const& name : names) {
        SCOPED_TRACE(name);
        std::string const binFile = smbiostest::corpusDir() + "/" + name + ".bin";
        smbiosdump::DumpImage image;
        std::string error;
        ASSERT_TRUE(smbiosdump::readDumpBin(smbiostest::fileBytes(binFile), image, error)) << error;
        std::string const dumpFile = folder.file(name + ".smbios.txt");
        smbiostest::writeFile(dumpFile, smbiosdump::formatOverride(image.header, image.table));

        std::string const fromDump = maskedJson(
            hosttest::runHost({"--plugin", realPlugin(), "--format", "json", "--dump", dumpFile}));
        std::string const fromBin = maskedJson(hosttest::runHost(
            {"--plugin", realPlugin(), "--format", "json", "--from-bin", binFile}));
        ASSERT_FALSE(fromDump.empty());
        EXPECT_TRUE(fromBin == fromDump) << hosttest::firstDifference(fromDump, fromBin);
    }
}

}  // namespace

// Each name --sensors takes stands for the SMBIOS location code of the same
// name (the low five bits of a probe's Location and Status byte): a table
// with one voltage probe at every code from 1 to 15, each named after its
// code, gives each location name the one probe of its code.
TEST_F(HostExtraNodes, SensorLocationNamesAreTheSmbiosLocationCodes) {
    smbiostest::TableBuilder table;
    for (uint8_t code = 1; code <= 15; ++code) {
        table.add(smbiostest::Structure(26, code)
                      .str("probe " + std::to_string(code))
                      .byte(static_cast<uint8_t>((3 << 5) | code))  // status OK
                      .word(1500)
                      .word(900)
                      .word(10)
                      .word(50)
                      .word(100)
                      .dword(0)
                      .word(1200));
    }
    table.endOfTable(0x100);
    smbiostest::TempDir scratch;
    std::string const bin = scratch.file("probes.bin");
    smbiostest::writeFile(bin, smbiostest::sm3DumpBin(table.build()));
    std::pair<char const*, unsigned int> const names[] = {
        {"other", 1},       {"unknown", 2},        {"processor", 3},
        {"disk", 4},        {"peripheral-bay", 5}, {"system-management-module", 6},
        {"motherboard", 7}, {"memory-module", 8},  {"processor-module", 9},
        {"power-unit", 10}, {"add-in-card", 11},   {"front-panel", 12},
        {"back-panel", 13}, {"power-system", 14},  {"drive-back-plane", 15},
    };
    for (auto const& name : names) {
        SCOPED_TRACE(name.first);
        ASSERT_NO_FATAL_FAILURE(runJson({"--from-bin", bin, "--sensors", name.first}));
        std::vector<Json> const sensors = hosttest::nodesOfType(doc_, kVoltageType);
        ASSERT_EQ(sensors.size(), 1u);
        EXPECT_EQ(sensors[0]["description"], "probe " + std::to_string(name.second));
    }
}
