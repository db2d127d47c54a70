// The dump-format library on real machines' dumps (SMBIOS_CORPUS_DIR):
// every dump reads, and its structure count agrees with dmidecode's decoding
// of the same file (NAME.orig.txt).
#include <gtest/gtest.h>

#include <cstdint>
#include <fstream>
#include <functional>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "PluginRead.h"
#include "TestSupport.h"

namespace {

struct Decoding {
    bool hasSummary = false;  // dmidecode's "N structures occupying M bytes." line
    uint32_t structures = 0;
    uint32_t bytes = 0;
    uint32_t handles = 0;  // structures decoded: "Handle 0x..." lines
};

Decoding readDecoding(std::string const& path) {
    std::ifstream in(path);
    if (!in) {
        throw std::runtime_error("cannot open " + path);
    }
    Decoding decoding;
    std::regex const summary("^([0-9]+) structures occupying ([0-9]+) bytes\\.");
    std::string line;
    std::smatch match;
    while (std::getline(in, line)) {
        if (std::regex_search(line, match, summary)) {
            decoding.hasSummary = true;
            decoding.structures = static_cast<uint32_t>(std::stoul(match[1]));
            decoding.bytes = static_cast<uint32_t>(std::stoul(match[2]));
        } else if (line.rfind("Handle 0x", 0) == 0) {
            ++decoding.handles;
        }
    }
    return decoding;
}

typedef std::vector<uint8_t> Bytes;

// Calls `check` on every corpus dump whose entry point is (`sm3`) or is not
// a "_SM3_" one, under the dump's name, with the path of its files without
// their endings, the --dump-bin file and the image read from it; fails the
// test for a dump that does not read. Returns how many were checked.
size_t forEachImage(bool sm3, std::function<void(std::string const&, Bytes const&,
                                                 smbiosdump::DumpImage const&)> const& check) {
    size_t checked = 0;
    for (std::string const& name : smbiostest::corpusNames()) {
        SCOPED_TRACE(name);
        std::string const base = smbiostest::corpusDir() + "/" + name;
        Bytes const file = smbiostest::fileBytes(base + ".bin");
        smbiosdump::DumpImage image;
        std::string error;
        bool const read = smbiosdump::readDumpBin(file, image, error);
        EXPECT_TRUE(read) << error;
        if (read && (image.anchor == "_SM3_") == sm3) {
            check(base, file, image);
            ++checked;
        }
    }
    return checked;
}

}  // namespace

TEST(CorpusDumps, Sm2DumpsMatchDmidecodeStructureCountAndSize) {
    SMBIOS_REQUIRE_CORPUS("to read");
    size_t const checked = forEachImage(
        false, [](std::string const& base, Bytes const&, smbiosdump::DumpImage const& image) {
            Decoding const decoding = readDecoding(base + ".orig.txt");
            ASSERT_TRUE(decoding.hasSummary) << "no 'N structures occupying M bytes.' line";
            EXPECT_EQ(image.anchor, "_SM_");
            EXPECT_EQ(smbiostest::word(image.header, 0x1C), decoding.structures);
            EXPECT_EQ(smbiosdump::tableStats(image.table).count, decoding.structures);
            EXPECT_EQ(image.table.size(), decoding.bytes);
            EXPECT_EQ(decoding.handles, decoding.structures);
        });
    EXPECT_GT(checked, 0u) << "the corpus holds no 2.x dump";
}

TEST(CorpusDumps, Sm3DumpsConvertWithDmidecodeStructureCount) {
    SMBIOS_REQUIRE_CORPUS("to read");
    size_t const checked = forEachImage(
        true, [](std::string const& base, Bytes const& file, smbiosdump::DumpImage const& image) {
            // dmidecode states no summary line for these: count its decoded
            // structures. The table may run on past the end-of-table structure;
            // tableStats counts up to and including it.
            Decoding const decoding = readDecoding(base + ".orig.txt");
            ASSERT_GT(decoding.handles, 0u);
            smbiosdump::TableStats const stats = smbiosdump::tableStats(image.table);
            EXPECT_EQ(stats.count, decoding.handles);
            ASSERT_EQ(image.header.size(), 31u);
            EXPECT_EQ(smbiostest::word(image.header, 0x1C), decoding.handles);
            EXPECT_EQ(smbiostest::word(image.header, 0x08), stats.maxSize);
            EXPECT_EQ(smbiostest::word(image.header, 0x16), image.table.size());
            EXPECT_EQ(smbiostest::byteSum(image.header, 0, 0x1F), 0);
            EXPECT_EQ(smbiostest::byteSum(image.header, 0x10, 0x1F), 0);
            EXPECT_EQ(image.header[6], file[7]);
            EXPECT_EQ(image.header[7], file[8]);
        });
    EXPECT_GT(checked, 0u) << "the corpus holds no _SM3_ dump";
}

TEST(CorpusDumps, EveryDumpSurvivesOverrideRoundTrip) {
    SMBIOS_REQUIRE_CORPUS("to read");
    for (std::string const& name : smbiostest::corpusNames()) {
        SCOPED_TRACE(name);
        smbiosdump::DumpImage image;
        std::string error;
        ASSERT_TRUE(smbiosdump::readDumpBin(
            smbiostest::fileBytes(smbiostest::corpusDir() + "/" + name + ".bin"), image, error))
            << error;
        smbiosdump::PluginRead const back =
            smbiosdump::readOverrideText(smbiosdump::formatOverride(image.header, image.table));
        ASSERT_TRUE(back.ok()) << back.imported << " " << back.head << " " << back.tables;
        EXPECT_EQ(back.header, image.header);
        EXPECT_EQ(back.table, image.table);
    }
}
