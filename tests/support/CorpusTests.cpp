// The dump-format library on real machines' dumps (SMBIOS_CORPUS_DIR):
// every dump reads, and its structure count agrees with dmidecode's decoding
// of the same file (NAME.orig.txt).
#include <gtest/gtest.h>

#include <cstdint>
#include <fstream>
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

uint16_t word(std::vector<uint8_t> const& b, size_t at) {
    return static_cast<uint16_t>(b[at] | (b[at + 1] << 8));
}

uint8_t sum(std::vector<uint8_t> const& bytes, size_t begin, size_t end) {
    uint8_t total = 0;
    for (size_t i = begin; i < end; ++i) {
        total = static_cast<uint8_t>(total + bytes[i]);
    }
    return total;
}

}  // namespace

TEST(CorpusDumps, Sm2DumpsMatchDmidecodeStructureCountAndSize) {
    SMBIOS_REQUIRE_CORPUS("to read");
    int checked = 0;
    for (std::string const& name : smbiostest::corpusNames()) {
        SCOPED_TRACE(name);
        std::string const base = smbiostest::corpusDir() + "/" + name;
        smbiosdump::DumpImage image;
        std::string error;
        ASSERT_TRUE(smbiosdump::readDumpBin(smbiostest::fileBytes(base + ".bin"), image, error))
            << error;
        if (image.anchor == "_SM3_") {
            continue;
        }
        Decoding const decoding = readDecoding(base + ".orig.txt");
        ASSERT_TRUE(decoding.hasSummary) << "no 'N structures occupying M bytes.' line";
        EXPECT_EQ(image.anchor, "_SM_");
        EXPECT_EQ(word(image.header, 0x1C), decoding.structures);
        EXPECT_EQ(smbiosdump::tableStats(image.table).count, decoding.structures);
        EXPECT_EQ(image.table.size(), decoding.bytes);
        EXPECT_EQ(decoding.handles, decoding.structures);
        ++checked;
    }
    EXPECT_GT(checked, 0) << "the corpus holds no 2.x dump";
}

TEST(CorpusDumps, Sm3DumpsConvertWithDmidecodeStructureCount) {
    SMBIOS_REQUIRE_CORPUS("to read");
    int checked = 0;
    for (std::string const& name : smbiostest::corpusNames()) {
        SCOPED_TRACE(name);
        std::string const base = smbiostest::corpusDir() + "/" + name;
        std::vector<uint8_t> const file = smbiostest::fileBytes(base + ".bin");
        smbiosdump::DumpImage image;
        std::string error;
        ASSERT_TRUE(smbiosdump::readDumpBin(file, image, error)) << error;
        if (image.anchor != "_SM3_") {
            continue;
        }
        // dmidecode states no summary line for these: count its decoded
        // structures. The table may run on past the end-of-table structure;
        // tableStats counts up to and including it.
        Decoding const decoding = readDecoding(base + ".orig.txt");
        ASSERT_GT(decoding.handles, 0u);
        smbiosdump::TableStats const stats = smbiosdump::tableStats(image.table);
        EXPECT_EQ(stats.count, decoding.handles);
        ASSERT_EQ(image.header.size(), 31u);
        EXPECT_EQ(word(image.header, 0x1C), decoding.handles);
        EXPECT_EQ(word(image.header, 0x08), stats.maxSize);
        EXPECT_EQ(word(image.header, 0x16), image.table.size());
        EXPECT_EQ(sum(image.header, 0, 0x1F), 0);
        EXPECT_EQ(sum(image.header, 0x10, 0x1F), 0);
        EXPECT_EQ(image.header[6], file[7]);
        EXPECT_EQ(image.header[7], file[8]);
        ++checked;
    }
    EXPECT_GT(checked, 0) << "the corpus holds no _SM3_ dump";
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
