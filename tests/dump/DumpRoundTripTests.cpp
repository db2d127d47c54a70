// 200 random structure tables (a fixed seed, so that a failure repeats)
// through smbios-dump --from-table and back through the plug-in's own
// import: the same table bytes, and an entry point the plug-in accepts.
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "DumpTestSupport.h"
#include "HostRunner.h"
#include "TestSupport.h"

using dumptest::Bytes;
using hosttest::describe;
using hosttest::RunResult;

namespace {

// A random table: up to 40 structures of random types, fields and strings
// (any byte but NUL), mostly closed by an end-of-table structure.
Bytes randomTable(std::mt19937& random) {
    auto pick = [&random](int low, int high) {
        return std::uniform_int_distribution<int>(low, high)(random);
    };
    smbiostest::TableBuilder builder;
    int const structures = pick(1, 40);
    for (int i = 0; i < structures; ++i) {
        smbiostest::Structure structure(static_cast<uint8_t>(pick(0, 126)),
                                        static_cast<uint16_t>(pick(0, 0xFFFF)));
        int const fields = pick(0, 60);
        for (int f = 0; f < fields; ++f) {
            structure.byte(static_cast<uint8_t>(pick(0, 255)));
        }
        int const strings = pick(0, 4);
        for (int s = 0; s < strings; ++s) {
            std::string text(static_cast<size_t>(pick(1, 24)), ' ');
            for (char& c : text) {
                c = static_cast<char>(pick(1, 255));
            }
            structure.addString(text);
        }
        builder.add(structure);
    }
    if (pick(0, 9) != 0) {
        builder.endOfTable(static_cast<uint16_t>(pick(0, 0xFFFF)));
    }
    return builder.build();
}

}  // namespace

TEST(DumpRoundTrip, RandomTablesReadBackThroughPluginImport) {
    std::mt19937 random(20240611u);
    smbiostest::TempDir dir;
    std::string const input = dir.file("table.bin");
    std::string const out = dir.file("smbios.txt");
    for (int round = 0; round < 200; ++round) {
        Bytes const table = randomTable(random);
        unsigned const major = std::uniform_int_distribution<unsigned>(2, 3)(random);
        unsigned const minor = std::uniform_int_distribution<unsigned>(0, 12)(random);
        SCOPED_TRACE("round " + std::to_string(round) + ", " + std::to_string(table.size()) +
                     " bytes, SMBIOS " + std::to_string(major) + "." + std::to_string(minor));
        smbiostest::writeFile(input, table);
        RunResult const run = dumptest::runDump(
            {"--from-table", input, "--version",
             std::to_string(major) + "." + std::to_string(minor), "-o", out, "--force"});
        ASSERT_EQ(run.exitStatus, 0) << describe(run);
        smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
        EXPECT_NE(run.err.find(", " + std::to_string(stats.count) + " structures, " +
                               std::to_string(table.size()) + " bytes"),
                  std::string::npos)
            << run.err;

        dumptest::ReadBack const back = dumptest::readBackThroughPlugin(out);
        ASSERT_TRUE(back.ok()) << back.imported << " " << back.head << " " << back.tables;
        ASSERT_EQ(back.table, table);
        Bytes const& ep = back.header;
        ASSERT_EQ(ep.size(), 31u);
        EXPECT_EQ(ep[6], major);
        EXPECT_EQ(ep[7], minor);
        EXPECT_EQ(dumptest::byteSum(ep, 0, 31), 0);
        EXPECT_EQ(dumptest::word(ep, 0x16), table.size());
        EXPECT_EQ(dumptest::word(ep, 0x1C), stats.count);
        EXPECT_EQ(dumptest::word(ep, 0x08), stats.maxSize);
    }
}
