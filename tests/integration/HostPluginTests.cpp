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
              json::parse(R"({"kind": "version", "value": [2, 7]})"));
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

TEST(HostWithPlugin, NoDumpAndNoPhysicalMemoryLibraryGivesTwoNodesAndLogsTableSizeZero) {
    smbiostest::TempDir dataDir;
    smbiostest::TempDir codeDir;
    hosttest::Environment env;
    env.set["KESTREL_DATA_DIR"] = dataDir.path() + "/";
    env.set["KESTREL_CODE_DIR"] = codeDir.path() + "/";
    env.set["QNLOG_LEVEL"] = "5000";
    hosttest::RunResult result;
    json const doc = runJson({"--format", "json"}, env, result);
    ASSERT_FALSE(doc.is_discarded()) << hosttest::describe(result);
    json const& nodes = doc.at("nodes");
    ASSERT_EQ(nodes.size(), 2u) << result.out;
    EXPECT_EQ(nodes[0].at("type"), 15);
    EXPECT_EQ(nodes[0].at("properties").at("306"),
              json::parse(R"({"kind": "version", "value": [0, 0]})"));
    EXPECT_EQ(nodes[1].at("type"), 59);
    EXPECT_EQ(nodes[1].at("linked"), nodes[0].at("id"));
    EXPECT_NE(result.err.find("smbios table size zero"), std::string::npos) << result.err;
    EXPECT_NE(result.err.find("PMEM: could not load library"), std::string::npos) << result.err;
}

TEST(HostWithPlugin, TreeFormatShowsTheRootUnderTheManagementInterface) {
    smbiostest::TempDir dataDir;
    smbiostest::TempDir codeDir;
    hosttest::Environment env;
    env.set["KESTREL_DATA_DIR"] = dataDir.path() + "/";
    env.set["KESTREL_CODE_DIR"] = codeDir.path() + "/";
    hosttest::RunResult const result = hosttest::runHost({}, env);
    ASSERT_EQ(result.exitStatus, 0) << hosttest::describe(result);
    size_t const mi = result.out.find("Corvane SMBIOS Management Interface");
    size_t const root = result.out.find("ROOT Node");
    ASSERT_NE(mi, std::string::npos) << result.out;
    ASSERT_NE(root, std::string::npos) << result.out;
    EXPECT_LT(mi, root);
}
