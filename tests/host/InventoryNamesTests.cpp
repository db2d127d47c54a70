// What a person reads in smbios-inventory's output: every property of the
// example server and of every real machine of the corpus, with the sensor
// nodes of every probe location and the BMC nodes, carries its name from the
// catalog, in the JSON document and in the tree, with its unit and the
// meaning of its value where the catalog has them.
#include <gtest/gtest.h>

#include <cstdint>
#include <filesystem>
#include <iostream>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

#include "HostRunner.h"
#include "InventoryJson.h"
#include "TestSupport.h"
#include "inventory/PropertyNames.h"

namespace {

using hosttest::Json;
using hosttest::RunResult;

std::string realPlugin() { return hosttest::outDir() + "/libsmbiosmi.so"; }

std::string demoDump() { return hosttest::sourceDir() + "/examples/demo-server.smbios.txt"; }

// --sensors for every probe location, and --bmc.
std::vector<std::string> everyExtraNode() {
    std::vector<std::string> args;
    for (unsigned int location = 0; location <= 31; ++location) {
        args.push_back("--sensors");
        args.push_back(std::to_string(location));
    }
    args.push_back("--bmc");
    return args;
}

// One source of a table: the arguments that name it.
struct Source {
    std::string name;
    std::vector<std::string> args;
};

std::vector<Source> sources() {
    std::vector<Source> list;
    // As `make demo` runs it, and with every probe location.
    list.push_back(
        {"demo as make demo runs it",
         {"--dump", demoDump(), "--sensors", "processor", "--sensors", "disk", "--bmc"}});
    std::vector<std::string> demoAll = {"--dump", demoDump()};
    for (std::string const& arg : everyExtraNode()) {
        demoAll.push_back(arg);
    }
    list.push_back({"demo with every probe location", demoAll});
    for (std::string const& name : smbiostest::corpusNames()) {
        std::vector<std::string> args = {"--from-bin",
                                         smbiostest::corpusDir() + "/" + name + ".bin"};
        for (std::string const& arg : everyExtraNode()) {
            args.push_back(arg);
        }
        list.push_back({name, args});
    }
    return list;
}

RunResult runHost(Source const& source, char const* format) {
    std::vector<std::string> args = {"--plugin", realPlugin(), "--format", format};
    args.insert(args.end(), source.args.begin(), source.args.end());
    return hosttest::runHost(args);
}

class InventoryNames : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_FALSE(hosttest::outDir().empty())
            << "SMBIOS_OUT_DIR is not set; run the tests through ctest";
        ASSERT_TRUE(std::filesystem::exists(realPlugin())) << realPlugin();
        if (smbiostest::corpusDir().empty()) {
            std::cout << "no corpus of real SMBIOS dumps (SMBIOS_CORPUS_DIR): the example "
                         "server only\n";
        }
    }
};

TEST_F(InventoryNames, EveryPropertyInTheJsonHasTheCatalogsNameUnitAndMeaning) {
    for (Source const& source : sources()) {
        SCOPED_TRACE(source.name);
        RunResult const run = runHost(source, "json");
        ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
        Json const document = Json::parse(run.out);
        size_t properties = 0;
        for (Json const& node : document.at("nodes")) {
            unsigned int const type = node.at("type");
            for (auto const& item : node.at("properties").items()) {
                ++properties;
                Json const& property = item.value();
                std::string const where =
                    "node type " + std::to_string(type) + " property " + item.key();
                inventory::PropertyInfo const* const info =
                    inventory::findProperty(type, std::stoul(item.key()));
                ASSERT_NE(info, nullptr) << where << " is not in the catalog";
                ASSERT_TRUE(property.contains("name")) << where << " has no name";
                EXPECT_EQ(property["name"], info->name) << where;
                if (property.contains("unit")) {
                    EXPECT_EQ(property["unit"], info->unit) << where;
                }
                if (property.contains("meaning")) {
                    char const* const meaning =
                        inventory::valueMeaning(*info, property["value"].get<std::uint32_t>());
                    ASSERT_NE(meaning, nullptr) << where;
                    EXPECT_EQ(property["meaning"], meaning) << where;
                }
            }
        }
        EXPECT_GT(properties, 100u);
    }
}

// A property line of the tree: indentation, id, then what follows the id.
std::regex const kPropertyLine("^ +([0-9]+) (.*)$");

TEST_F(InventoryNames, EveryPropertyLineOfTheTreeStartsWithItsName) {
    char const* const kindNames[] = {"string",   "bool",  "unsigned", "double",  "version",
                                     "datetime", "none",  "enum8",    "enum16",  "enum32",
                                     "byte",     "bytes", "numbers",  "strings", "kind"};
    for (Source const& source : sources()) {
        SCOPED_TRACE(source.name);
        RunResult const run = runHost(source, "tree");
        ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
        std::istringstream lines(run.out);
        std::string line;
        size_t properties = 0;
        while (std::getline(lines, line)) {
            std::smatch match;
            if (!std::regex_match(line, match, kPropertyLine)) {
                continue;
            }
            ++properties;
            std::string const rest = match[2];
            for (char const* kind : kindNames) {
                EXPECT_NE(rest.rfind(std::string(kind) + "  ", 0), 0u)
                    << "a property line without a name: " << line;
            }
        }
        EXPECT_GT(properties, 100u);
    }
}

TEST_F(InventoryNames, DemoTreeShowsNamesUnitsAndMeanings) {
    RunResult const run = runHost(sources()[0], "tree");
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    std::string const& out = run.out;
    for (char const* line : {
             "\n      36 Manufacturer  \"Corvane\"\n",
             "\n      65 Wake-up type  6 (Power Switch)\n",
             "\n        11 Chassis type  17 (Main server chassis (also rack mount and blade))\n",
             "\n        21 Height  2 U\n",
             "\n          128 Board type  10 (Motherboard)\n",
             "\n            38 Maximum speed  4000 MHz\n",
             "\n            298 Family  179 (Xeon)\n",
             "\n              73 Installed size  32 KB\n",
             "\n              72 Write policy  1 (Write back)\n",
         }) {
        EXPECT_NE(out.find(line), std::string::npos) << "missing" << line << "in\n" << out;
    }
    // The sensors' readings in degrees Celsius and in volts.
    EXPECT_NE(out.find(" 14 Nominal value  40 \xC2\xB0"
                       "C\n"),
              std::string::npos)
        << out;
    EXPECT_NE(out.find(" 14 Nominal value  1.2 V\n"), std::string::npos) << out;
    EXPECT_NE(out.find(" 31 Location  3 (Processor)\n"), std::string::npos) << out;
}

}  // namespace
