// The whole inventory of the example server, with the sensor and BMC nodes
// that only the host asks for, pinned as the host prints it in JSON:
// tests/host/golden/demo-server.json. The two values the plug-in reads from
// the clock (the computer system's current time and time-zone offset) stand
// there as placeholders.
//
// After a deliberate change of the inventory, regenerate the golden file
// and review its diff:
//
//   SMBIOS_UPDATE_GOLDEN=1 ctest --test-dir build -R DemoGolden
//
// With SMBIOS_UPDATE_GOLDEN=1 the comparing test writes the file instead of
// comparing with it.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <set>
#include <string>
#include <vector>

#include "HostFixture.h"
#include "HostRunner.h"
#include "InventoryJson.h"
#include "TestSupport.h"

namespace {

using hosttest::Json;

std::string goldenPath() { return hosttest::sourceDir() + "/tests/host/golden/demo-server.json"; }

bool updating() {
    char const* update = std::getenv("SMBIOS_UPDATE_GOLDEN");
    return update != nullptr && std::string(update) == "1";
}

class DemoGolden : public hosttest::BuiltProgramsTest {
protected:
    // The host's JSON of the example with the processor probes and the BMC,
    // its clock values masked.
    std::string maskedDemoInventory() {
        hosttest::RunResult const run =
            hosttest::runHost({"--plugin", hosttest::outDir() + "/libsmbiosmi.so", "--dump",
                               hosttest::sourceDir() + "/examples/demo-server.smbios.txt",
                               "--format", "json", "--sensors", "processor", "--bmc"});
        EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
        // Reading the text back and writing it again changes nothing, so
        // the masking changes no more than the two values.
        EXPECT_EQ(Json::parse(run.out).dump(2) + "\n", run.out);
        unsigned int masked = 0;
        std::string const text = hosttest::maskRunValues(run.out, masked);
        EXPECT_EQ(masked, 2u) << "one computer system with its time and time-zone offset";
        return text;
    }
};

TEST_F(DemoGolden, DemoServerWithSensorsAndBmcMatchesTheGoldenFile) {
    std::string const actual = maskedDemoInventory();
    ASSERT_FALSE(HasFailure());
    if (updating()) {
        smbiostest::writeFile(goldenPath(), actual);
        EXPECT_EQ(smbiostest::fileText(goldenPath()), actual);
        std::cout << "wrote " << goldenPath() << "\n";
        return;
    }
    ASSERT_TRUE(std::filesystem::exists(goldenPath()))
        << goldenPath() << " is missing; make it with SMBIOS_UPDATE_GOLDEN=1";
    std::string const golden = smbiostest::fileText(goldenPath());
    EXPECT_TRUE(golden == actual) << hosttest::firstDifference(golden, actual)
                                  << "regenerate with SMBIOS_UPDATE_GOLDEN=1 if the change is "
                                     "deliberate";
}

// The golden file itself holds a node of every kind the builders make, and
// the placeholders once each, so that a regenerated file cannot quietly
// lose a builder's nodes.
TEST_F(DemoGolden, GoldenFileHoldsEveryBuildersNodes) {
    ASSERT_TRUE(std::filesystem::exists(goldenPath())) << goldenPath();
    std::string const golden = smbiostest::fileText(goldenPath());
    Json const document = Json::parse(golden);
    std::set<unsigned int> types;
    for (Json const& node : document.at("nodes")) {
        types.insert(node.at("type").get<unsigned int>());
    }
    // Management interface, root, computer system, chassis, planar,
    // processor, core, cache, memory array and device, slot, connector, disk
    // controller, firmware, event log, diagnostics, raw table, temperature
    // and voltage sensors, BMC.
    for (unsigned int type : {15u, 59u, 40u, 1u, 41u, 4u,  42u, 31u, 32u, 19u,
                              62u, 70u, 50u, 3u, 35u, 53u, 55u, 22u, 21u, 13u}) {
        EXPECT_EQ(types.count(type), 1u) << "no node of type " << type;
    }
    std::vector<Json> const systems = hosttest::nodesOfType(document, 40);
    ASSERT_EQ(systems.size(), 1u);
    Json const& system = systems[0];
    EXPECT_EQ(hosttest::withoutLabels(hosttest::propertyOf(system, 126)),
              Json({{"kind", "datetime"}, {"value", std::string(hosttest::kRunTimePlaceholder)}}));
    EXPECT_EQ(
        hosttest::withoutLabels(hosttest::propertyOf(system, 127)),
        Json({{"kind", "double"}, {"value", std::string(hosttest::kRunTimeZonePlaceholder)}}));
}

}  // namespace
