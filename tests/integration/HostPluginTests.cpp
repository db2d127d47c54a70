// smbios-inventory with the real plug-in: on override dumps made from real
// machines' tables, and without any dump on a machine that has no
// physical-memory library.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <utility>

#include "DumpFormat.h"
#include "HostRunner.h"
#include "TestSupport.h"

using nlohmann::json;

namespace {

// An override dump file made from a corpus --dump-bin image.
std::string overrideFromCorpus(std::string const& name, smbiostest::TempDir const& dir) {
    smbiosdump::DumpImage image;
    std::string error;
    std::vector<uint8_t> const bin =
        smbiostest::fileBytes(smbiostest::corpusDir() + "/" + name + ".bin");
    EXPECT_TRUE(smbiosdump::readDumpBin(bin, image, error)) << name << ": " << error;
    std::string const path = dir.file(name + ".smbios.txt");
    smbiostest::writeFile(path, smbiosdump::formatOverride(image.header, image.table));
    return path;
}

// The version dmidecode reports: "SMBIOS 2.7 present." gives {2, 7}.
std::pair<unsigned int, unsigned int> dmidecodeVersion(std::string const& name) {
    std::pair<unsigned int, unsigned int> version(0, 0);
    EXPECT_TRUE(smbiostest::dmidecodeVersion(name, version.first, version.second))
        << "no version line in " << name << ".orig.txt";
    return version;
}

json runJson(std::vector<std::string> const& args, hosttest::Environment const& env,
             hosttest::RunResult& result) {
    result = hosttest::runHost(args, env);
    EXPECT_EQ(result.exitStatus, 0) << hosttest::describe(result);
    return json::parse(result.out, nullptr, false);
}

}  // namespace

TEST(HostWithPlugin, SuperMicroDumpGivesManagementInterfaceAndRootNodes) {
    if (smbiostest::corpusDir().empty()) {
        GTEST_SKIP() << "no SMBIOS corpus folder (SMBIOS_CORPUS_DIR); nothing to read";
    }
    smbiostest::TempDir dir;
    std::string const dump = overrideFromCorpus("SuperMicro-X9DBL", dir);
    hosttest::RunResult result;
    json const doc = runJson({"--dump", dump, "--format", "json"}, {}, result);
    ASSERT_FALSE(doc.is_discarded()) << hosttest::describe(result);
    json const& nodes = doc.at("nodes");
    ASSERT_GE(nodes.size(), 2u);
    json const& mi = nodes[0];
    EXPECT_EQ(mi.at("type"), 15);
    EXPECT_EQ(mi.at("id"), 1);
    EXPECT_EQ(mi.at("linked"), 0);
    EXPECT_EQ(mi.at("status"), 1);
    EXPECT_EQ(mi.at("description"), "Corvane SMBIOS Management Interface");
    EXPECT_EQ(mi.at("properties").at("306"),
              json::parse(R"({"kind": "version", "value": [2, 7], "name": "SMBIOS version"})"));
    EXPECT_FALSE(mi.at("properties").contains("307"));
    json const& root = nodes[1];
    EXPECT_EQ(root.at("type"), 59);
    EXPECT_EQ(root.at("linked"), mi.at("id"));
    EXPECT_EQ(root.at("description"), "ROOT Node");
    EXPECT_EQ(root.at("status"), 1);
}

TEST(HostWithPlugin, EveryCorpusDumpReportsDmidecodesVersion) {
    std::vector<std::string> const names = smbiostest::corpusNames();
    if (names.empty()) {
        GTEST_SKIP() << "no SMBIOS corpus folder (SMBIOS_CORPUS_DIR); nothing to read";
    }
    smbiostest::TempDir dir;
    for (std::string const& name : names) {
        std::string const dump = overrideFromCorpus(name, dir);
        hosttest::RunResult result;
        json const doc = runJson({"--dump", dump, "--format", "json"}, {}, result);
        ASSERT_FALSE(doc.is_discarded()) << name << "\n" << hosttest::describe(result);
        std::pair<unsigned int, unsigned int> const version = dmidecodeVersion(name);
        EXPECT_EQ(doc.at("nodes")[0].at("properties").at("306").at("value"),
                  json::array({version.first, version.second}))
            << name;
        EXPECT_EQ(result.err.find("smbios table size zero"), std::string::npos) << name;
    }
}

// Without a dump and without the physical-memory library the plug-in's tree
// is the management-interface node and an empty root; the host prints no
// such non-answer, says that the machine gave no table, and exits 1. The
// plug-in's log, when asked for, says why.
TEST(HostWithPlugin, NoDumpAndNoPhysicalMemoryLibraryIsNoTableAndLogsTableSizeZero) {
    smbiostest::TempDir dataDir;
    smbiostest::TempDir codeDir;
    hosttest::Environment env;
    env.set["KESTREL_DATA_DIR"] = dataDir.path() + "/";
    env.set["KESTREL_CODE_DIR"] = codeDir.path() + "/";
    env.set["QNLOG_LEVEL"] = "5000";
    hosttest::RunResult const result = hosttest::runHost({"--format", "json"}, env);
    EXPECT_EQ(result.exitStatus, 1) << hosttest::describe(result);
    EXPECT_EQ(result.out, "");
    EXPECT_NE(result.err.find("smbios table size zero"), std::string::npos) << result.err;
    EXPECT_NE(result.err.find("PMEM: could not load library"), std::string::npos) << result.err;
    EXPECT_NE(
        result.err.find("smbios-inventory: no SMBIOS table could be read from this machine\n"),
        std::string::npos)
        << result.err;
}

// The tree: the management interface's line before the root's.
TEST(HostWithPlugin, TreeFormatShowsTheRootUnderTheManagementInterface) {
    smbiostest::TempDir dataDir;
    smbiostest::TableBuilder table;
    table.add(smbiostest::Structure(1, 0x0001).str("Corvane").str("RS-7400"));
    table.endOfTable(0x0002);
    std::vector<uint8_t> const bytes = table.build();
    smbiostest::writeOverrideDir(
        dataDir.path(),
        smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(bytes.size()), 0, 2, 20), bytes);
    hosttest::Environment env;
    env.set["KESTREL_DATA_DIR"] = dataDir.path() + "/";
    hosttest::RunResult const result = hosttest::runHost({}, env);
    ASSERT_EQ(result.exitStatus, 0) << hosttest::describe(result);
    size_t const mi = result.out.find("Corvane SMBIOS Management Interface");
    size_t const root = result.out.find("ROOT Node");
    ASSERT_NE(mi, std::string::npos) << result.out;
    ASSERT_NE(root, std::string::npos) << result.out;
    EXPECT_LT(mi, root);
}
