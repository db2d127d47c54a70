// smbios-dump on real machines' dumps (SMBIOS_CORPUS_DIR): every --dump-bin
// image becomes an override file that the plug-in's own import reads back to
// the image's table bytes and to the version dmidecode prints, and that
// gives the same inventory as the host's own reading of the image.
#include <gtest/gtest.h>

#include <fstream>
#include <functional>
#include <regex>
#include <string>
#include <utility>
#include <vector>

#include "DumpFormat.h"
#include "DumpTestSupport.h"
#include "HostRunner.h"
#include "TestSupport.h"

using dumptest::Bytes;
using hosttest::describe;
using hosttest::RunResult;

namespace {

struct Decoding {
    unsigned major = 0;
    unsigned minor = 0;
    bool hasSummary = false;  // "N structures occupying M bytes."
    unsigned structures = 0;
    unsigned bytes = 0;
};

// What dmidecode printed for the dump: "SMBIOS 2.7 present." (3.x: "SMBIOS
// 3.1.1 present.") and, for 2.x, the summary line.
Decoding dmidecodeDecoding(std::string const& name) {
    std::ifstream in(smbiostest::corpusDir() + "/" + name + ".orig.txt");
    std::regex const present(R"(^SMBIOS (\d+)\.(\d+)(\.\d+)? present\.)");
    std::regex const summary(R"(^(\d+) structures occupying (\d+) bytes\.)");
    Decoding decoding;
    bool found = false;
    std::string line;
    while (std::getline(in, line)) {
        std::smatch m;
        if (std::regex_search(line, m, present)) {
            decoding.major = static_cast<unsigned>(std::stoul(m[1]));
            decoding.minor = static_cast<unsigned>(std::stoul(m[2]));
            found = true;
        } else if (std::regex_search(line, m, summary)) {
            decoding.hasSummary = true;
            decoding.structures = static_cast<unsigned>(std::stoul(m[1]));
            decoding.bytes = static_cast<unsigned>(std::stoul(m[2]));
        }
    }
    EXPECT_TRUE(found) << "no version line in " << name << ".orig.txt";
    return decoding;
}

std::string binPath(std::string const& name) {
    return smbiostest::corpusDir() + "/" + name + ".bin";
}

// smbios-dump --from-bin on the corpus dump `name`, writing `out`.
RunResult dumpFromBin(std::string const& name, std::string const& out) {
    return dumptest::runDump({"--from-bin", binPath(name), "-o", out});
}

// Runs `check` on every corpus dump, under its name, with a folder for what
// it writes. Skips the test without a corpus; fails it when the corpus holds
// no dump.
void forEachDump(
    std::function<void(std::string const& name, smbiostest::TempDir const& dir)> const& check) {
    SMBIOS_REQUIRE_CORPUS("to capture");
    smbiostest::TempDir dir;
    for (std::string const& name : smbiostest::corpusNames()) {
        SCOPED_TRACE(name);
        check(name, dir);
    }
}

// Whether the built host offers --from-bin (another change adds it).
bool hostReadsDumpBin() {
    RunResult const help = hosttest::runHost({"--help"});
    return help.exitStatus == 0 && help.out.find("--from-bin") != std::string::npos;
}

}  // namespace

TEST(DumpCorpus, FromBinReadsBackThroughPluginImportToImageTable) {
    forEachDump([](std::string const& name, smbiostest::TempDir const& dir) {
        std::string const out = dir.file(name + ".smbios.txt");
        RunResult const run = dumpFromBin(name, out);
        ASSERT_EQ(run.exitStatus, 0) << describe(run);

        smbiosdump::DumpImage image;
        std::string error;
        ASSERT_TRUE(smbiosdump::readDumpBin(smbiostest::fileBytes(binPath(name)), image, error))
            << error;
        dumptest::ReadBack const back = dumptest::readBackThroughPlugin(out);
        ASSERT_TRUE(back.ok()) << back.imported << " " << back.head << " " << back.tables;
        EXPECT_EQ(back.table, image.table);
        EXPECT_EQ(back.header, image.header);

        // The header is what the plug-in accepts: "_SM_", both checksums
        // good, and the version dmidecode prints.
        Bytes const& ep = back.header;
        ASSERT_GE(ep.size(), 0x1Eu);
        EXPECT_EQ(std::string(ep.begin(), ep.begin() + 4), "_SM_");
        EXPECT_EQ(dumptest::byteSum(ep, 0, ep[5]), 0);
        EXPECT_EQ(dumptest::byteSum(ep, 0x10, 0x1F), 0);
        Decoding const decoding = dmidecodeDecoding(name);
        EXPECT_EQ(ep[6], decoding.major);
        EXPECT_EQ(ep[7], decoding.minor);
        EXPECT_EQ(dumptest::word(ep, 0x16), back.table.size());

        // What it says it wrote.
        std::string const said = "smbios-dump: wrote " + out + ": SMBIOS " +
                                 std::to_string(decoding.major) + "." +
                                 std::to_string(decoding.minor) + ", " +
                                 std::to_string(smbiosdump::tableStats(image.table).count) +
                                 " structures, " + std::to_string(image.table.size()) + " bytes\n";
        EXPECT_EQ(run.err, said);
        if (decoding.hasSummary) {
            EXPECT_NE(run.err.find(", " + std::to_string(decoding.structures) + " structures, " +
                                   std::to_string(decoding.bytes) + " bytes"),
                      std::string::npos)
                << run.err;
        }
    });
}

TEST(DumpCorpus, FromTableOfImageReadsBackToSameTable) {
    forEachDump([](std::string const& name, smbiostest::TempDir const& dir) {
        smbiosdump::DumpImage image;
        std::string error;
        ASSERT_TRUE(smbiosdump::readDumpBin(smbiostest::fileBytes(binPath(name)), image, error))
            << error;
        std::string const raw = dir.file(name + ".table");
        smbiostest::writeFile(raw, image.table);
        std::string const version = std::to_string(image.major) + "." + std::to_string(image.minor);
        std::string const out = dir.file(name + ".smbios.txt");
        RunResult const run =
            dumptest::runDump({"--from-table", raw, "--version", version, "-o", out});
        ASSERT_EQ(run.exitStatus, 0) << describe(run);
        dumptest::ReadBack const back = dumptest::readBackThroughPlugin(out);
        ASSERT_TRUE(back.ok());
        EXPECT_EQ(back.table, image.table);
        EXPECT_EQ(back.header[6], image.major);
        EXPECT_EQ(back.header[7], image.minor);
        EXPECT_EQ(dumptest::word(back.header, 0x1C), smbiosdump::tableStats(image.table).count);
    });
}

TEST(DumpCorpus, InventoryOfWrittenFileEqualsInventoryFromBin) {
    SMBIOS_REQUIRE_CORPUS("to capture");
    if (!hostReadsDumpBin()) {
        GTEST_SKIP() << "smbios-inventory has no --from-bin option in this build; nothing to "
                        "compare the written files with";
    }
    forEachDump([](std::string const& name, smbiostest::TempDir const& dir) {
        std::string const out = dir.file(name + ".smbios.txt");
        RunResult const dumped = dumpFromBin(name, out);
        ASSERT_EQ(dumped.exitStatus, 0) << describe(dumped);
        RunResult const fromFile = hosttest::runHost({"--dump", out, "--format", "json"});
        RunResult const fromBin =
            hosttest::runHost({"--from-bin", binPath(name), "--format", "json"});
        ASSERT_EQ(fromFile.exitStatus, 0) << describe(fromFile);
        ASSERT_EQ(fromBin.exitStatus, 0) << describe(fromBin);
        // The two runs agree but for the clock the plug-in reads.
        unsigned maskedFile = 0;
        unsigned maskedBin = 0;
        std::string const fileInventory = dumptest::inventoryWithoutClock(fromFile.out, maskedFile);
        std::string const binInventory = dumptest::inventoryWithoutClock(fromBin.out, maskedBin);
        EXPECT_GT(fileInventory.size(), 1000u) << describe(fromFile);
        EXPECT_EQ(maskedFile, maskedBin);
        EXPECT_EQ(fileInventory, binInventory);
    });
}
