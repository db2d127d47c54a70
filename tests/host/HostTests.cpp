// smbios-inventory run as a child process on the fake plug-in: its JSON and
// tree output, its command line, its exit statuses, the environment it sets
// up for the plug-in, its logging options and where it looks for the
// plug-in.

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <ctime>
#include <filesystem>
#include <nlohmann/json.hpp>
#include <regex>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "FakePluginIds.h"
#include "HostRunner.h"
#include "TestSupport.h"

namespace {

using namespace fakeplugin;
using hosttest::Environment;
using hosttest::RunResult;
using Json = nlohmann::ordered_json;

std::string fakePlugin() { return hosttest::outDir() + "/" + HOST_FAKE_PLUGIN_FROM_OUT; }

size_t countLines(std::string const& text) {
    size_t lines = 0;
    for (char c : text) {
        if (c == '\n') {
            ++lines;
        }
    }
    return lines;
}

size_t countOccurrences(std::string const& text, std::string const& part) {
    size_t count = 0;
    for (size_t at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) {
        ++count;
    }
    return count;
}

class HostTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_FALSE(hosttest::outDir().empty())
            << "SMBIOS_OUT_DIR is not set; run the tests through ctest";
        ASSERT_TRUE(std::filesystem::exists(hosttest::hostPath()))
            << "smbios-inventory is not built: " << hosttest::hostPath();
        ASSERT_TRUE(std::filesystem::exists(fakePlugin()))
            << "the fake plug-in is not built: " << fakePlugin();
    }

    // Runs the host on the fake plug-in with the JSON format and parses its
    // standard output, which must be one JSON document and nothing else.
    void runJson(std::vector<std::string> const& extra, Environment const& environment) {
        std::vector<std::string> args = {"--plugin", fakePlugin(), "--format", "json"};
        args.insert(args.end(), extra.begin(), extra.end());
        run_ = hosttest::runHost(args, environment);
        ASSERT_EQ(run_.exitStatus, 0) << hosttest::describe(run_);
        ASSERT_NO_THROW(doc_ = Json::parse(run_.out)) << hosttest::describe(run_);
        ASSERT_TRUE(doc_.is_object()) << run_.out;
        ASSERT_TRUE(doc_.contains("nodes")) << run_.out;
        ASSERT_TRUE(doc_["nodes"].is_array()) << run_.out;
    }

    void runJson() { runJson({}, Environment()); }

    // Runs the host on the fake plug-in with the default (tree) format.
    void runTree(Environment const& environment = Environment()) {
        run_ = hosttest::runHost({"--plugin", fakePlugin()}, environment);
        ASSERT_EQ(run_.exitStatus, 0) << hosttest::describe(run_);
    }

    // The node with the given id in the parsed document.
    Json const& node(unsigned int id) {
        for (Json const& entry : doc_["nodes"]) {
            if (entry.value("id", 0u) == id) {
                return entry;
            }
        }
        ADD_FAILURE() << "no node with id " << id << " in\n" << run_.out;
        static Json const missing = Json::object();
        return missing;
    }

    // The value object of a property of a node.
    Json const& property(unsigned int nodeId, unsigned int propertyId) {
        Json const& entry = node(nodeId);
        std::string const key = std::to_string(propertyId);
        if (entry.contains("properties") && entry["properties"].contains(key)) {
            return entry["properties"][key];
        }
        ADD_FAILURE() << "node " << nodeId << " has no property " << propertyId << " in\n"
                      << run_.out;
        static Json const missing = Json::object();
        return missing;
    }

    // Expects a usage error: status 2, one line on standard error, nothing on
    // standard output.
    void expectUsageError(std::vector<std::string> const& args, std::string const& mention) {
        RunResult run = hosttest::runHost(args);
        EXPECT_EQ(run.exitStatus, 2) << hosttest::describe(run);
        EXPECT_EQ(countLines(run.err), 1u) << hosttest::describe(run);
        EXPECT_NE(run.err.find(mention), std::string::npos) << "expected '" << mention << "' in\n"
                                                            << hosttest::describe(run);
        EXPECT_EQ(run.out, "") << hosttest::describe(run);
    }

    RunResult run_;
    Json doc_;
};

// ---- JSON -------------------------------------------------------------------

TEST_F(HostTest, JsonListsNodesInListOrderWithTheirFields) {
    ASSERT_NO_FATAL_FAILURE(runJson());
    Json const& nodes = doc_["nodes"];
    ASSERT_EQ(nodes.size(), 6u) << run_.out;

    unsigned int const ids[] = {kMiNode, kRootNode, kKindsNode, kCpuNode, kCoreNode, kPlainNode};
    unsigned int const linked[] = {0, kMiNode, kRootNode, kRootNode, kCpuNode, kMissingNode};
    unsigned int const types[] = {15, 59, 40, 4, 42, 0};
    unsigned int const indexes[] = {0, 0, 0, 1, 0, 5};
    unsigned int const statuses[] = {1, 1, 1, 1, 1, 2};
    char const* const descriptions[] = {kMiDescription,  kRootDescription, kKindsDescription,
                                        kCpuDescription, kCoreDescription, kPlainDescription};
    for (size_t i = 0; i < nodes.size(); ++i) {
        SCOPED_TRACE("node " + std::to_string(i));
        EXPECT_EQ(nodes[i]["id"], ids[i]);
        EXPECT_EQ(nodes[i]["linked"], linked[i]);
        EXPECT_EQ(nodes[i]["type"], types[i]);
        EXPECT_EQ(nodes[i]["index"], indexes[i]);
        EXPECT_EQ(nodes[i]["status"], statuses[i]);
        EXPECT_EQ(nodes[i]["description"], descriptions[i]);
        EXPECT_TRUE(nodes[i]["properties"].is_object());
    }
    // The fields of a node come in a fixed order.
    std::vector<std::string> keys;
    for (auto const& item : nodes[3].items()) {
        keys.push_back(item.key());
    }
    EXPECT_EQ(keys, (std::vector<std::string>{"id", "linked", "type", "index", "status",
                                              "description", "path", "parent", "properties"}));
}

TEST_F(HostTest, JsonGivesEveryPropertyKindItsExactValue) {
    std::time_t const before = std::time(nullptr);
    ASSERT_NO_FATAL_FAILURE(runJson());
    std::time_t const after = std::time(nullptr);

    EXPECT_EQ(property(kKindsNode, kStringProperty),
              Json::parse(R"({"kind": "string", "value": "Caf\u00e9"})"));
    EXPECT_EQ(property(kKindsNode, kBoolProperty),
              Json::parse(R"({"kind": "bool", "value": true})"));
    EXPECT_EQ(property(kKindsNode, kUnsignedProperty),
              Json::parse(R"({"kind": "unsigned", "value": 4294967295})"));
    EXPECT_EQ(property(kKindsNode, kDoubleProperty),
              Json::parse(R"({"kind": "double", "value": 2.5})"));
    EXPECT_TRUE(property(kKindsNode, kDoubleProperty)["value"].is_number_float());
    EXPECT_EQ(property(kKindsNode, kVersionProperty),
              Json::parse(R"({"kind": "version", "value": [3, 14]})"));
    EXPECT_EQ(property(kKindsNode, kNoneNumberProperty),
              Json::parse(R"({"kind": "none", "value": null})"));
    EXPECT_EQ(property(kKindsNode, kNoneProperty),
              Json::parse(R"({"kind": "none", "value": null})"));
    EXPECT_EQ(property(kKindsNode, kEnum8Property),
              Json::parse(R"({"kind": "enum8", "value": 200})"));
    EXPECT_EQ(property(kKindsNode, kEnum16Property),
              Json::parse(R"({"kind": "enum16", "value": 60000})"));
    EXPECT_EQ(property(kKindsNode, kEnum32Property),
              Json::parse(R"({"kind": "enum32", "value": 70000})"));
    EXPECT_EQ(property(kKindsNode, kByteProperty),
              Json::parse(R"({"kind": "byte", "value": 171})"));
    EXPECT_EQ(property(kKindsNode, kBytesProperty),
              Json::parse(R"({"kind": "bytes", "value": "001FABFF", "name": "Family"})"));
    EXPECT_EQ(property(kKindsNode, kNumbersProperty), Json::parse(R"({"kind": "numbers", "value": [
                  {"kind": "unsigned", "value": 1},
                  {"kind": "bool", "value": true},
                  {"kind": "double", "value": 2.5},
                  {"kind": "version", "value": [1, 2]},
                  {"kind": "none", "value": null}]})"));
    EXPECT_EQ(property(kKindsNode, kStringsProperty),
              Json::parse(R"({"kind": "strings", "value": ["alpha", "Caf\u00e9", ""]})"));
    EXPECT_EQ(property(kKindsNode, kKindProperty), Json::parse(R"({"kind": "kind", "value": 7})"));

    // The date-time is the time the plug-in made it: during the run.
    Json const& dateTime = property(kKindsNode, kDateTimeProperty);
    EXPECT_EQ(dateTime["kind"], "datetime");
    ASSERT_TRUE(dateTime["value"].is_number_integer()) << dateTime.dump();
    EXPECT_GE(dateTime["value"].get<std::int64_t>(), static_cast<std::int64_t>(before));
    EXPECT_LE(dateTime["value"].get<std::int64_t>(), static_cast<std::int64_t>(after));

    // The Latin-1 byte 0xE9 is written as the UTF-8 of U+00E9.
    EXPECT_NE(run_.out.find("\"Caf\xC3\xA9\""), std::string::npos) << run_.out;
    EXPECT_EQ(node(kKindsNode)["properties"].size(), 16u);
}

TEST_F(HostTest, JsonPropertyKeysAscendNumerically) {
    ASSERT_NO_FATAL_FAILURE(runJson());
    std::vector<std::string> keys;
    for (auto const& item : node(kKindsNode)["properties"].items()) {
        keys.push_back(item.key());
    }
    EXPECT_EQ(keys, (std::vector<std::string>{"2", "3", "4", "5", "6", "7", "8", "9", "10", "11",
                                              "12", "13", "20", "30", "100", "101"}));
    // The same order in the text itself.
    size_t const two = run_.out.find("\"2\": {\n          \"kind\": \"string\"");
    size_t const ten = run_.out.find("\"10\": {");
    size_t const hundred = run_.out.find("\"100\": {");
    ASSERT_NE(two, std::string::npos) << run_.out;
    ASSERT_NE(ten, std::string::npos) << run_.out;
    ASSERT_NE(hundred, std::string::npos) << run_.out;
    EXPECT_LT(two, ten);
    EXPECT_LT(ten, hundred);
}

TEST_F(HostTest, JsonHasPathAndParentOnlyWhenSet) {
    ASSERT_NO_FATAL_FAILURE(runJson());
    EXPECT_EQ(node(kCpuNode)["path"], kCpuPath);
    EXPECT_EQ(node(kCpuNode)["parent"], kCpuParent);
    for (unsigned int id : {kMiNode, kRootNode, kKindsNode, kCoreNode, kPlainNode}) {
        SCOPED_TRACE("node " + std::to_string(id));
        EXPECT_FALSE(node(id).contains("path"));
        EXPECT_FALSE(node(id).contains("parent"));
    }
}

TEST_F(HostTest, JsonReadsValuesThroughGetProperty) {
    ASSERT_NO_FATAL_FAILURE(runJson());
    EXPECT_EQ(property(kCoreNode, kComputedProperty),
              Json({{"kind", "string"}, {"value", kComputedValue}}));
    EXPECT_EQ(run_.out.find("\"stored\""), std::string::npos) << run_.out;
}

TEST_F(HostTest, JsonGivesTypeZeroForNodeThatIsNotMutableNode) {
    ASSERT_NO_FATAL_FAILURE(runJson());
    Json const& plain = node(kPlainNode);
    EXPECT_EQ(plain["type"], 0);
    EXPECT_EQ(plain["linked"], kMissingNode);
    EXPECT_EQ(plain["properties"], Json::parse(R"({"1": {"kind": "string", "value": "plain"}})"));
}

TEST_F(HostTest, JsonIsTwoSpaceIndentedWithFinalNewline) {
    ASSERT_NO_FATAL_FAILURE(runJson());
    EXPECT_EQ(run_.out.compare(0, 14, "{\n  \"nodes\": ["), 0) << run_.out;
    ASSERT_FALSE(run_.out.empty());
    EXPECT_EQ(run_.out.back(), '\n');
    EXPECT_EQ(run_.out, doc_.dump(2) + "\n");
}

// Standard output that takes nothing (/dev/full) is an error that the host
// names, whichever format it writes.
TEST_F(HostTest, InventoryThatCannotBeWrittenIsAnError) {
    if (!std::filesystem::exists("/dev/full")) {
        GTEST_SKIP() << "no /dev/full on this machine";
    }
    for (char const* format : {"tree", "json"}) {
        SCOPED_TRACE(format);
        std::vector<std::string> args = {"-c", "exec \"$0\" \"$@\" >/dev/full"};
        for (std::string const& part : smbiostest::commandLine(
                 hosttest::hostPath(), {"--plugin", fakePlugin(), "--format", format})) {
            args.push_back(part);
        }
        RunResult const run = hosttest::runProgram("/bin/sh", args);
        EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
        EXPECT_NE(run.err.find("smbios-inventory: cannot write the inventory to standard output"),
                  std::string::npos)
            << hosttest::describe(run);
    }
}

TEST_F(HostTest, StdoutHoldsOnlyTheInventoryAndPluginOutputGoesToStderr) {
    ASSERT_NO_FATAL_FAILURE(runJson());
    for (char const* line : {kStdoutLine, kStdoutLineCpp, kOpenStdoutLine}) {
        EXPECT_NE(run_.err.find(line), std::string::npos) << hosttest::describe(run_);
        EXPECT_EQ(run_.out.find(line), std::string::npos) << hosttest::describe(run_);
    }
    // The whole of standard output is the one document.
    EXPECT_EQ(run_.out, doc_.dump(2) + "\n");
}

// ---- tree -------------------------------------------------------------------

TEST_F(HostTest, TreeIsTheDefaultAndIndentsByLinkedIdWithTypeNames) {
    ASSERT_NO_FATAL_FAILURE(runTree());
    std::string const& out = run_.out;
    std::vector<std::string> const lines = {
        "Fake Management Interface  [type 15 management interface, index 0, id 2, status 1]\n",
        "\n  Fake Root  [type 59 root, index 0, id 3, status 1]\n",
        "\n    Every Kind  [type 40 computer system, index 0, id 4, status 1]\n",
        "\n    Fake CPU\\x01  [type 4 processor, index 1, id 5, status 1, path \"/fake/cpu0\", "
        "parent \"/fake\"]\n",
        "\n      Computed Core  [type 42 processor core, index 0, id 6, status 1]\n",
        "\nPlain Node  [type 0, index 5, id 7, status 2, linked 99]\n",
    };
    size_t last = 0;
    for (std::string const& line : lines) {
        size_t at = out.find(line);
        ASSERT_NE(at, std::string::npos) << "missing " << line << " in\n" << out;
        EXPECT_GE(at, last) << "out of order: " << line << " in\n" << out;
        EXPECT_EQ(countOccurrences(out, line), 1u) << line;
        last = at;
    }
    EXPECT_EQ(out.compare(0, lines[0].size(), lines[0]), 0) << out;
    EXPECT_EQ(out.find("\"nodes\""), std::string::npos) << out;
}

TEST_F(HostTest, TreeShowsEveryPropertyKindBeneathItsNode) {
    ASSERT_NO_FATAL_FAILURE(runTree());
    std::string const& out = run_.out;
    std::string const block =
        "    Every Kind  [type 40 computer system, index 0, id 4, status 1]\n"
        "      2 string  \"Caf\xC3\xA9\"\n"
        "      3 bool  true\n"
        "      4 unsigned  4294967295\n"
        "      5 double  2.5\n"
        "      6 version  3.14\n";
    EXPECT_NE(out.find(block), std::string::npos) << out;
    std::string const rest =
        "      8 none  (none)\n"
        "      9 none  (none)\n"
        "      10 enum8  200\n"
        "      11 enum16  60000\n"
        "      12 enum32  70000\n"
        "      13 byte  171\n"
        "      20 Family  00 1F AB FF\n"
        "      30 numbers  {1, true, 2.5, 1.2, (none)}\n"
        "      100 strings  {\"alpha\", \"Caf\xC3\xA9\", \"\"}\n"
        "      101 kind  7\n";
    EXPECT_NE(out.find(rest), std::string::npos) << out;
    std::regex const dateTime(
        "\n      7 datetime  [0-9]{4}-[0-9]{2}-[0-9]{2} [0-9]{2}:[0-9]{2}:"
        "[0-9]{2}\n");
    EXPECT_TRUE(std::regex_search(out, dateTime)) << out;
    // The computed value, read through getProperty, two levels deeper.
    EXPECT_NE(out.find("\n        7 string  \"computed at read\"\n"), std::string::npos) << out;
    EXPECT_NE(out.find("\n  1 string  \"plain\"\n"), std::string::npos) << out;
}

TEST_F(HostTest, TreePrintsEachNodeOnceWhenLinkedIdsFormACycle) {
    Environment environment;
    environment.set["FAKE_MI_CYCLE"] = "1";
    ASSERT_NO_FATAL_FAILURE(runTree(environment));
    std::string const& out = run_.out;
    std::string const slot =
        "Cycle Slot  [type 62 system slot, index 0, id 20, status 0, linked 21]\n";
    std::string const port = "  Cycle Port  [type 70 port connector, index 0, id 21, status 0]\n";
    EXPECT_EQ(countOccurrences(out, slot), 1u) << out;
    EXPECT_EQ(countOccurrences(out, port), 1u) << out;
    EXPECT_NE(out.find(slot + port), std::string::npos) << out;
    EXPECT_EQ(countOccurrences(out, "Fake Root  ["), 1u) << out;
}

// ---- command line -----------------------------------------------------------

TEST_F(HostTest, UnknownOptionExitsTwo) { expectUsageError({"--bogus"}, "--bogus"); }

TEST_F(HostTest, UnexpectedArgumentExitsTwo) {
    expectUsageError({"--plugin", fakePlugin(), "stray"}, "stray");
}

TEST_F(HostTest, BadFormatExitsTwo) {
    expectUsageError({"--plugin", fakePlugin(), "--format", "xml"}, "--format");
}

TEST_F(HostTest, MissingOptionValueExitsTwo) { expectUsageError({"--format"}, "--format"); }

TEST_F(HostTest, MissingDumpFileExitsTwo) {
    smbiostest::TempDir folder;
    std::string const missing = folder.file("no-such-dump.txt");
    expectUsageError({"--plugin", fakePlugin(), "--dump", missing}, "no-such-dump.txt");
}

TEST_F(HostTest, DumpThatIsAFolderExitsTwo) {
    smbiostest::TempDir folder;
    expectUsageError({"--plugin", fakePlugin(), "--dump", folder.path()}, "--dump");
}

TEST_F(HostTest, DumpWithDataDirExitsTwo) {
    smbiostest::TempDir folder;
    std::string const dump = folder.file("smbios.txt");
    smbiostest::writeFile(dump, "<SHOWSMBIOS>\n</SHOWSMBIOS>\n");
    expectUsageError({"--plugin", fakePlugin(), "--dump", dump, "--data-dir", folder.path()},
                     "--data-dir");
    EXPECT_EQ(smbiostest::folderEntries(folder.path()), std::vector<std::string>{"smbios.txt"});
}

TEST_F(HostTest, BadLogLevelExitsTwo) {
    expectUsageError({"--plugin", fakePlugin(), "--log-level", "loud"}, "loud");
}

TEST_F(HostTest, BadTraceLevelExitsTwo) {
    expectUsageError({"--plugin", fakePlugin(), "--trace-level", "12x"}, "12x");
}

TEST_F(HostTest, VersionPrintsNameAndVersionAndExitsZero) {
    RunResult run = hosttest::runHost({"--version"});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(run.out, std::string("smbios-inventory ") + PROJECT_VERSION + "\n");
}

TEST_F(HostTest, HelpListsTheOptionsAndExitsZero) {
    RunResult run = hosttest::runHost({"--help"});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    for (char const* option : {"--dump", "--data-dir", "--code-dir", "--plugin", "--format",
                               "--log", "--log-level", "--trace-level", "--version"}) {
        EXPECT_NE(run.out.find(option), std::string::npos) << option << " in\n" << run.out;
    }
}

// ---- --sensors, --bmc and --from-bin on the command line --------------------

TEST_F(HostTest, SensorsWithUnknownLocationExitsTwo) {
    for (char const* location :
         {"cpu", "Processor", "32", "0x20", "-1", "3x", "0x", "0x1g", "", " 3", "0x0000020"}) {
        SCOPED_TRACE(std::string("location '") + location + "'");
        expectUsageError({"--plugin", fakePlugin(), "--sensors", location}, "--sensors");
    }
}

TEST_F(HostTest, SensorsWithoutLocationExitsTwo) {
    expectUsageError({"--plugin", fakePlugin(), "--sensors"}, "--sensors");
}

TEST_F(HostTest, HelpListsTheExtraNodeOptionsAndLocationNames) {
    RunResult run = hosttest::runHost({"--help"});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    for (char const* text : {"--sensors", "--bmc", "--from-bin", "processor", "drive-back-plane"}) {
        EXPECT_NE(run.out.find(text), std::string::npos) << text << " in\n" << run.out;
    }
}

TEST_F(HostTest, FromBinWithDumpOrDataDirExitsTwo) {
    smbiostest::TempDir folder;
    std::string const file = folder.file("machine.bin");
    smbiostest::writeFile(file, "_SM_");
    for (std::string const excluded : {"--dump", "--data-dir"}) {
        SCOPED_TRACE(excluded);
        expectUsageError({"--plugin", fakePlugin(), "--from-bin", file, excluded,
                          excluded == "--dump" ? file : folder.path()},
                         excluded);
    }
    // Nothing was written beside the file.
    EXPECT_EQ(smbiostest::folderEntries(folder.path()), std::vector<std::string>{"machine.bin"});
}

TEST_F(HostTest, MissingFromBinFileExitsTwo) {
    smbiostest::TempDir folder;
    expectUsageError({"--plugin", fakePlugin(), "--from-bin", folder.file("no-such-dump.bin")},
                     "no-such-dump.bin");
}

TEST_F(HostTest, FromBinFileThatIsNoDumpBinExitsTwoWithItsReason) {
    smbiostest::TempDir folder;
    std::string const file = folder.file("notes.bin");
    std::string const content = "these are notes, not a table\n";
    smbiostest::writeFile(file, content);
    smbiosdump::DumpImage image;
    std::string reason;
    ASSERT_FALSE(smbiosdump::readDumpBin(std::vector<uint8_t>(content.begin(), content.end()),
                                         image, reason));
    ASSERT_FALSE(reason.empty());
    expectUsageError({"--plugin", fakePlugin(), "--from-bin", file}, reason);
    EXPECT_NE(hosttest::runHost({"--plugin", fakePlugin(), "--from-bin", file}).err.find(file),
              std::string::npos);
}

TEST_F(HostTest, SensorsWithAnotherPluginExitsOne) {
    RunResult run = hosttest::runHost({"--plugin", fakePlugin(), "--sensors", "processor"});
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("need the SMBIOS plug-in this program is built with"), std::string::npos)
        << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
}

TEST_F(HostTest, BmcWithAnotherPluginExitsOne) {
    RunResult run = hosttest::runHost({"--plugin", fakePlugin(), "--format", "json", "--bmc"});
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("need the SMBIOS plug-in this program is built with"), std::string::npos)
        << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
}

// ---- failures of the plug-in ------------------------------------------------

TEST_F(HostTest, MissingPluginExitsOneAndSaysWhy) {
    smbiostest::TempDir folder;
    std::string const missing = folder.file("libnothing.so");
    RunResult run = hosttest::runHost({"--plugin", missing});
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("cannot load"), std::string::npos) << hosttest::describe(run);
    EXPECT_NE(run.err.find(missing), std::string::npos) << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
}

TEST_F(HostTest, PluginWithoutOpenMIExitsOne) {
    // The platform library is a shared library without the entry point.
    std::string const library = hosttest::outDir() + "/libkestrel.so";
    ASSERT_TRUE(std::filesystem::exists(library)) << library;
    RunResult run = hosttest::runHost({"--plugin", library});
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("no OpenMI"), std::string::npos) << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
}

TEST_F(HostTest, OpenMIFailureExitsOneWithItsStatus) {
    Environment environment;
    environment.set["FAKE_MI_OPEN"] = "fail";
    RunResult run = hosttest::runHost({"--plugin", fakePlugin()}, environment);
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("returned 5"), std::string::npos) << hosttest::describe(run);
    EXPECT_NE(run.err.find(kOpenFailMessage), std::string::npos) << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
}

TEST_F(HostTest, OpenMIWithoutInterfaceExitsOne) {
    Environment environment;
    environment.set["FAKE_MI_OPEN"] = "null";
    RunResult run = hosttest::runHost({"--plugin", fakePlugin()}, environment);
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("no management interface"), std::string::npos)
        << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
}

TEST_F(HostTest, InitializeFailureExitsOneWithStatusAndMessage) {
    Environment environment;
    environment.set["FAKE_MI_FAIL"] = "1";
    RunResult run = hosttest::runHost({"--plugin", fakePlugin(), "--format", "json"}, environment);
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("status 3"), std::string::npos) << hosttest::describe(run);
    EXPECT_NE(run.err.find(kFailMessage), std::string::npos) << hosttest::describe(run);
    // What the plug-in wrote before failing stays on standard error.
    EXPECT_NE(run.err.find(kStdoutLine), std::string::npos) << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
}

// ---- environment of the plug-in ---------------------------------------------

TEST_F(HostTest, DumpRunsOnACopyInAPrivateDataDirThatIsRemovedAfterwards) {
    smbiostest::TempDir input;
    smbiostest::TempDir temporary;
    smbiostest::TempDir realData;
    std::string const content =
        "<SHOWSMBIOS> first line of the dump\n<EPHEADER>\n5F534D5F\n</EPHEADER>\n</SHOWSMBIOS>\n";
    std::string const dump = input.file("machine.txt");
    smbiostest::writeFile(dump, content);

    Environment environment;
    environment.set["TMPDIR"] = temporary.path();
    environment.set["KESTREL_DATA_DIR"] = realData.path() + "/";
    ASSERT_NO_FATAL_FAILURE(runJson({"--dump", dump}, environment));

    Json const& dataDir = property(kRootNode, kDataDirProperty);
    ASSERT_TRUE(dataDir["value"].is_string()) << run_.out;
    std::string const dir = dataDir["value"].get<std::string>();
    std::string const prefix = temporary.path() + "/smbios-inventory.";
    EXPECT_EQ(dir.compare(0, prefix.size(), prefix), 0) << dir;
    ASSERT_FALSE(dir.empty());
    EXPECT_EQ(dir.back(), '/');
    EXPECT_EQ(property(kRootNode, kOverrideLineProperty)["value"],
              "<SHOWSMBIOS> first line of the dump");
    EXPECT_EQ(property(kRootNode, kOverrideSizeProperty)["value"], content.size());

    // Gone after the run; the real data directory was never touched.
    EXPECT_FALSE(std::filesystem::exists(dir)) << dir;
    EXPECT_TRUE(smbiostest::folderEntries(temporary.path()).empty());
    EXPECT_TRUE(smbiostest::folderEntries(realData.path()).empty());
    EXPECT_EQ(smbiostest::fileText(dump), content);
}

// Without TMPDIR the private data directory is made in memory, in /dev/shm,
// where making and removing it is quick, and removed afterwards too.
TEST_F(HostTest, DumpWithoutTmpdirRunsInAFolderInMemory) {
    struct stat shm;
    if (stat("/dev/shm", &shm) != 0 || !S_ISDIR(shm.st_mode) || access("/dev/shm", W_OK) != 0) {
        GTEST_SKIP() << "no writable /dev/shm on this machine";
    }
    smbiostest::TempDir input;
    std::string const dump = input.file("machine.txt");
    smbiostest::writeFile(dump, "<SHOWSMBIOS>\n<EPHEADER>\n5F534D5F\n</EPHEADER>\n</SHOWSMBIOS>\n");
    Environment environment;
    environment.unset.push_back("TMPDIR");
    ASSERT_NO_FATAL_FAILURE(runJson({"--dump", dump}, environment));
    std::string const dir = property(kRootNode, kDataDirProperty)["value"].get<std::string>();
    std::string const prefix = "/dev/shm/smbios-inventory.";
    EXPECT_EQ(dir.compare(0, prefix.size(), prefix), 0) << dir;
    EXPECT_FALSE(std::filesystem::exists(dir)) << dir;
}

TEST_F(HostTest, DumpTemporaryFolderIsRemovedWhenThePluginFails) {
    smbiostest::TempDir input;
    smbiostest::TempDir temporary;
    std::string const dump = input.file("machine.txt");
    smbiostest::writeFile(dump, "<SHOWSMBIOS>\n<EPHEADER>\n5F534D5F\n</EPHEADER>\n</SHOWSMBIOS>\n");

    Environment environment;
    environment.set["TMPDIR"] = temporary.path();
    environment.set["FAKE_MI_FAIL"] = "1";
    RunResult run = hosttest::runHost({"--plugin", fakePlugin(), "--dump", dump}, environment);
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_TRUE(smbiostest::folderEntries(temporary.path()).empty());
}

TEST_F(HostTest, DataDirAndCodeDirReachThePlugin) {
    smbiostest::TempDir data;
    smbiostest::TempDir code;
    ASSERT_NO_FATAL_FAILURE(
        runJson({"--data-dir", data.path() + "/", "--code-dir", code.path() + "/"}, Environment()));
    EXPECT_EQ(property(kRootNode, kDataDirProperty)["value"], data.path() + "/");
    EXPECT_EQ(property(kRootNode, kCodeDirProperty)["value"], code.path() + "/");
    // No override file there: the plug-in found none.
    EXPECT_FALSE(node(kRootNode)["properties"].contains(std::to_string(kOverrideLineProperty)));
}

// ---- logging ----------------------------------------------------------------

TEST_F(HostTest, LogOptionsSendPluginMessagesToTheLogFile) {
    smbiostest::TempDir folder;
    std::string const log = folder.file("host.log");
    ASSERT_NO_FATAL_FAILURE(
        runJson({"--log", log, "--log-level", "0", "--trace-level", "off"}, Environment()));
    std::string const text = smbiostest::fileText(log);
    EXPECT_NE(text.find(kLogText), std::string::npos) << text;
    EXPECT_EQ(text.find(kTraceText), std::string::npos) << text;
    EXPECT_EQ(run_.err.find(kLogText), std::string::npos) << run_.err;
}

TEST_F(HostTest, TraceLevelSendsTraceMessagesToTheLogFile) {
    smbiostest::TempDir folder;
    std::string const log = folder.file("host.log");
    ASSERT_NO_FATAL_FAILURE(
        runJson({"--log", log, "--log-level", "off", "--trace-level", "5000"}, Environment()));
    std::string const text = smbiostest::fileText(log);
    EXPECT_NE(text.find(kTraceText), std::string::npos) << text;
    EXPECT_EQ(text.find(kLogText), std::string::npos) << text;
}

TEST_F(HostTest, LogLevelAboveTheMessagesWritesNone) {
    smbiostest::TempDir folder;
    std::string const log = folder.file("host.log");
    ASSERT_NO_FATAL_FAILURE(
        runJson({"--log", log, "--log-level", "5001", "--trace-level", "off"}, Environment()));
    std::string const text = smbiostest::fileText(log);
    EXPECT_EQ(text.find(kLogText), std::string::npos) << text;
}

// ---- where the plug-in is looked for ----------------------------------------

// An installed layout in a private folder: PREFIX/bin/smbios-inventory and
// the fake plug-in under the real plug-in's name.
class InstalledHostTest : public HostTest {
protected:
    void SetUp() override {
        ASSERT_NO_FATAL_FAILURE(HostTest::SetUp());
        namespace fs = std::filesystem;
        fs::create_directories(prefix_.file("bin"));
        fs::create_directories(prefix_.file("lib"));
        host_ = prefix_.file("bin/smbios-inventory");
        fs::copy_file(hosttest::hostPath(), host_);
        ASSERT_EQ(chmod(host_.c_str(), 0755), 0);
        // The platform library stays where it was built.
        environment_.set["LD_LIBRARY_PATH"] = hosttest::outDir();
    }

    std::string pluginFileOf(RunResult const& run) {
        Json doc;
        try {
            doc = Json::parse(run.out);
        } catch (std::exception const& error) {
            ADD_FAILURE() << error.what() << "\n" << hosttest::describe(run);
            return std::string();
        }
        for (Json const& entry : doc["nodes"]) {
            if (entry["id"] == kRootNode) {
                std::string const file =
                    entry["properties"][std::to_string(kPluginFileProperty)]["value"];
                return std::filesystem::weakly_canonical(file).string();
            }
        }
        ADD_FAILURE() << "no root node in\n" << run.out;
        return std::string();
    }

    smbiostest::TempDir prefix_;
    std::string host_;
    Environment environment_;
};

TEST_F(InstalledHostTest, FindsThePluginBesideItself) {
    std::filesystem::copy_file(fakePlugin(), prefix_.file("bin/libsmbiosmi.so"));
    std::filesystem::copy_file(fakePlugin(), prefix_.file("lib/libsmbiosmi.so"));
    RunResult run = hosttest::runProgram(host_, {"--format", "json"}, environment_);
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(pluginFileOf(run),
              std::filesystem::weakly_canonical(prefix_.file("bin/libsmbiosmi.so")).string());
}

TEST_F(InstalledHostTest, FindsThePluginInTheLibFolderOfItsPrefix) {
    std::filesystem::copy_file(fakePlugin(), prefix_.file("lib/libsmbiosmi.so"));
    RunResult run = hosttest::runProgram(host_, {"--format", "json"}, environment_);
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(pluginFileOf(run),
              std::filesystem::weakly_canonical(prefix_.file("lib/libsmbiosmi.so")).string());
}

TEST_F(InstalledHostTest, NoPluginInEitherPlaceExitsOne) {
    RunResult run = hosttest::runProgram(host_, {}, environment_);
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("lib/libsmbiosmi.so"), std::string::npos) << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
}

}  // namespace
