// makeCacheNodes: the cache node(s) of one cache handle named by a
// processor, made from the Cache Information structures (type 7) with that
// handle.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "BuilderFixture.h"

using namespace buildertest;

namespace {

char const* const CACHE_LOGGER = "Quillon.IC.MI.SmBiosMI.SmBiosMICache";

// The fields of one Cache Information structure (SMBIOS 2.1 layout, 0x13
// bytes); the defaults describe an enabled, write-back level 2 cache of
// 512 KB. A shorter length cuts the formatted area and keeps the string.
struct Cache {
    uint16_t handle = 0x0700;
    std::string socket = "Internal L2 Cache";
    uint16_t configuration = 0x0181;
    uint16_t maximumSize = 0x0200;
    uint16_t installedSize = 0x0200;
    uint16_t supportedSram = 0x0002;
    uint16_t currentSram = 0x0002;
    uint8_t speed = 0;
    uint8_t errorCorrection = 5;
    uint8_t systemType = 5;
    uint8_t associativity = 7;
    size_t length = 0x13;
};

Structure cache(Cache const& c) {
    Structure full(7, c.handle);
    full.str(c.socket)
        .word(c.configuration)
        .word(c.maximumSize)
        .word(c.installedSize)
        .word(c.supportedSram)
        .word(c.currentSram)
        .byte(c.speed)
        .byte(c.errorCorrection)
        .byte(c.systemType)
        .byte(c.associativity);
    // Cut to the length: the string number of the socket stays at offset 4
    // (when the length reaches it), its text in the set.
    return cutTo(full, c.length, {c.socket});
}

// The cache nodes of one call for handle, under a processor node (id 2).
struct CacheRun {
    CacheRun(TableBuilder const& table, unsigned int handle) : built(table) {
        processor = buildertest::addParent(mi, 4);
        mi.makeCacheNodes(built.lists.get(), processor->getNodeId(), handle);
        nodes = nodesOfType(mi, 31);
    }
    ParsedTable built;
    TestMI mi;
    IC::MutableNode* processor = nullptr;
    std::vector<IC::Node*> nodes;
};

// Structures that differ in one field, all with the same handle so that one
// call makes a node of each, in table order.
template <typename Setter>
TableBuilder variants(size_t count, Setter set) {
    TableBuilder table;
    for (size_t i = 0; i < count; ++i) {
        Cache c;
        set(c, i);
        table.add(cache(c));
    }
    return table;
}

}  // namespace

TEST(ProcessorCacheNodes, MatchingCacheFieldByField) {
    smbiostest::LogCapture log;
    TableBuilder table;
    Cache l1;
    l1.handle = 0x0700;
    l1.socket = "L1-Cache";
    Cache l2;
    l2.handle = 0x0701;
    l2.socket = "L2-Cache";
    l2.configuration = 0x0181;
    l2.maximumSize = 0x0200;
    l2.installedSize = 0x0100;
    l2.speed = 4;
    l2.systemType = 5;
    l2.associativity = 7;
    Cache l3;
    l3.handle = 0x0702;
    l3.socket = "L3-Cache";
    table.add(cache(l1)).add(cache(l2)).add(cache(l3));
    CacheRun run(table, 0x0701);

    ASSERT_EQ(1u, run.nodes.size());
    ASSERT_EQ(2u, run.mi.nodeList.size());
    EXPECT_EQ(4u, run.mi.nextNodeId);
    IC::Node const* node = run.nodes[0];
    EXPECT_EQ(node, run.mi.nodeList[1]);
    EXPECT_TRUE(hasNodeType(node, 31));
    EXPECT_EQ(3u, node->getNodeId());
    EXPECT_EQ(2u, node->getLinkedId());
    // The index is the structure's position among the cache structures.
    EXPECT_EQ(1u, node->getIndex());
    EXPECT_EQ(1u, node->getStatus());
    EXPECT_EQ("Processor Cache", node->getDescription());
    EXPECT_EQ(run.mi.miIdList, node->getMIIds());
    EXPECT_EQ((std::vector<unsigned int>{5, 9, 30, 37, 53, 57, 69, 72, 73, 112, 125, 173}),
              propertyIds(node));
    EXPECT_TRUE(hasUnsignedList(node, 125, {1, 14, 16}));
    EXPECT_TRUE(hasString(node, 53, "L2-Cache"));
    EXPECT_TRUE(hasEnum(node, 72, 1, 1));
    EXPECT_TRUE(hasUnsigned(node, 30, 2));
    EXPECT_TRUE(hasUnsigned(node, 69, 1024));
    EXPECT_TRUE(hasUnsigned(node, 112, 512));
    EXPECT_TRUE(hasUnsigned(node, 37, 512));
    EXPECT_TRUE(hasUnsigned(node, 73, 256));
    EXPECT_TRUE(hasUnsigned(node, 173, 256));
    EXPECT_TRUE(hasEnum(node, 9, 1, 3));
    EXPECT_TRUE(hasEnum(node, 5, 1, 5));
    EXPECT_TRUE(hasDouble(node, 57, 250.0));

    EXPECT_EQ(
        (std::vector<std::string>{"makeCacheNodes entry handle=1793", "Table 7 count =3",
                                  "Table 7 length = 19 handle = 1793", "makeCacheNodes exit"}),
        loggedBy(CACHE_LOGGER))
        << log.dump();
}

TEST(ProcessorCacheNodes, HandleMatchingNothingMakesNoNodeAndLogsOnlyEntryCountAndExit) {
    smbiostest::LogCapture log;
    TableBuilder table;
    Cache l1;
    l1.handle = 0x0700;
    Cache l2;
    l2.handle = 0x0701;
    table.add(cache(l1)).add(cache(l2));
    CacheRun run(table, 0xFFFF);

    EXPECT_TRUE(run.nodes.empty());
    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_EQ(3u, run.mi.nextNodeId);
    EXPECT_EQ((std::vector<std::string>{"makeCacheNodes entry handle=65535", "Table 7 count =2",
                                        "makeCacheNodes exit"}),
              loggedBy(CACHE_LOGGER))
        << log.dump();
}

TEST(ProcessorCacheNodes, NoCacheStructuresLogCountZero) {
    smbiostest::LogCapture log;
    CacheRun run(tableOf({Structure(4, 0x0400).str("CPU0")}), 0x0700);

    EXPECT_TRUE(run.nodes.empty());
    EXPECT_EQ((std::vector<std::string>{"makeCacheNodes entry handle=1792", "Table 7 count =0",
                                        "makeCacheNodes exit"}),
              loggedBy(CACHE_LOGGER))
        << log.dump();
}

TEST(ProcessorCacheNodes, TwoStructuresSharingTheHandleMakeTwoNodesUnderTheProcessor) {
    smbiostest::LogCapture log;
    TableBuilder table;
    Cache first;
    first.handle = 0x0700;
    first.socket = "First";
    Cache other;
    other.handle = 0x0701;
    other.socket = "Other";
    Cache second;
    second.handle = 0x0700;
    second.socket = "Second";
    table.add(cache(first)).add(cache(other)).add(cache(second));
    CacheRun run(table, 0x0700);

    std::vector<IC::Node*> const children = childrenOf(run.mi, run.processor->getNodeId());
    ASSERT_EQ(2u, children.size());
    EXPECT_TRUE(hasString(children[0], 53, "First"));
    EXPECT_EQ(3u, children[0]->getNodeId());
    EXPECT_EQ(0u, children[0]->getIndex());
    EXPECT_TRUE(hasString(children[1], 53, "Second"));
    EXPECT_EQ(4u, children[1]->getNodeId());
    EXPECT_EQ(2u, children[1]->getIndex());
    for (IC::Node const* child : children) {
        EXPECT_TRUE(hasNodeType(child, 31));
        EXPECT_EQ("Processor Cache", child->getDescription());
    }
    EXPECT_EQ(2u, frametest::loggedLevels("Table 7 length = 19 handle = 1792").size())
        << log.dump();
}

TEST(ProcessorCacheNodes, MaximumSizeWithGranularityBitCountsSixtyFourKilobyteUnits) {
    TableBuilder table =
        variants(2, [](Cache& c, size_t i) { c.maximumSize = i == 0 ? 0x8100 : 0x0200; });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 112, 16384));
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 37, 16384));
    EXPECT_TRUE(hasUnsigned(run.nodes[1], 112, 512));
    EXPECT_TRUE(hasUnsigned(run.nodes[1], 37, 512));
}

TEST(ProcessorCacheNodes, InstalledSizeConvertedLikeTheMaximumSize) {
    std::vector<uint16_t> const words = {0x8010, 0x0040, 0xFFFF, 0x7FFF};
    std::vector<unsigned int> const sizes = {1024, 64, 0x7FFF * 64, 0x7FFF};
    TableBuilder table = variants(words.size(), [&words](Cache& c, size_t i) {
        c.installedSize = words[i];
        c.maximumSize = words[i];
    });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(words.size(), run.nodes.size());
    for (size_t i = 0; i < words.size(); ++i) {
        SCOPED_TRACE("size word " + std::to_string(words[i]));
        EXPECT_TRUE(hasUnsigned(run.nodes[i], 73, sizes[i]));
        EXPECT_TRUE(hasUnsigned(run.nodes[i], 173, sizes[i]));
        EXPECT_TRUE(hasUnsigned(run.nodes[i], 112, sizes[i]));
        EXPECT_TRUE(hasUnsigned(run.nodes[i], 37, sizes[i]));
        EXPECT_EQ(1u, run.nodes[i]->getStatus());
    }
}

TEST(ProcessorCacheNodes, InstalledSizeZeroEndsWithStatus14EvenWhenEnabled) {
    TableBuilder table = variants(1, [](Cache& c, size_t) {
        c.configuration = 0x0180;
        c.installedSize = 0;
    });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(1u, run.nodes.size());
    EXPECT_EQ(14u, run.nodes[0]->getStatus());
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 73, 0));
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 173, 0));
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 112, 512));
}

// The status comes from the enabled bit first; an installed size of 0
// overrides either value with 14.
TEST(ProcessorCacheNodes, StatusFromEnabledBitThenFourteenWhenNotInstalled) {
    std::vector<uint16_t> const configurations = {0x0180, 0x0100, 0x0180, 0x0100, 0x8000};
    std::vector<uint16_t> const installed = {0x0200, 0x0200, 0x0000, 0x0000, 0x8000};
    std::vector<unsigned int> const statuses = {1, 16, 14, 14, 14};
    TableBuilder table = variants(configurations.size(), [&](Cache& c, size_t i) {
        c.configuration = configurations[i];
        c.installedSize = installed[i];
    });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(configurations.size(), run.nodes.size());
    for (size_t i = 0; i < configurations.size(); ++i) {
        SCOPED_TRACE("configuration " + std::to_string(configurations[i]) + " installed " +
                     std::to_string(installed[i]));
        EXPECT_EQ(statuses[i], run.nodes[i]->getStatus());
    }
}

TEST(ProcessorCacheNodes, CacheSpeedZeroSetsNoPropertyAndFourGivesTwoHundredFifty) {
    std::vector<uint8_t> const speeds = {0, 4, 3, 255};
    TableBuilder table =
        variants(speeds.size(), [&speeds](Cache& c, size_t i) { c.speed = speeds[i]; });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(speeds.size(), run.nodes.size());
    EXPECT_TRUE(lacksProperty(run.nodes[0], 57));
    EXPECT_TRUE(hasDouble(run.nodes[1], 57, 250.0));
    EXPECT_TRUE(hasDouble(run.nodes[2], 57, 1000.0 / 3.0));
    EXPECT_TRUE(hasDouble(run.nodes[3], 57, 1000.0 / 255.0));
}

TEST(ProcessorCacheNodes, ConfigurationWord0180IsEnabledWriteBackLevelOne) {
    TableBuilder table = variants(1, [](Cache& c, size_t) { c.configuration = 0x0180; });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(1u, run.nodes.size());
    EXPECT_EQ(1u, run.nodes[0]->getStatus());
    EXPECT_TRUE(hasEnum(run.nodes[0], 72, 1, 1));
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 30, 1));
}

TEST(ProcessorCacheNodes, EveryOperationalModeRow) {
    // Write through, write back, varies with memory address, unknown.
    std::vector<uint16_t> const configurations = {0x0080, 0x0180, 0x0280, 0x0380};
    std::vector<long long> const modes = {2, 1, 3, 0};
    TableBuilder table = variants(configurations.size(), [&configurations](Cache& c, size_t i) {
        c.configuration = configurations[i];
    });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(configurations.size(), run.nodes.size());
    for (size_t i = 0; i < configurations.size(); ++i) {
        SCOPED_TRACE("configuration " + std::to_string(configurations[i]));
        EXPECT_TRUE(hasEnum(run.nodes[i], 72, 1, modes[i]));
        EXPECT_TRUE(hasUnsigned(run.nodes[i], 30, 1));
    }
}

TEST(ProcessorCacheNodes, LevelIsBitsZeroToTwoPlusOne) {
    // Levels 1 to 8, then the socketed bit (3), a location (bits 5-6) and
    // every other bit set beside level bits 2.
    std::vector<uint16_t> const configurations = {0x0180, 0x0181, 0x0182, 0x0183, 0x0184, 0x0185,
                                                  0x0186, 0x0187, 0x0188, 0x01A2, 0xFFFA};
    std::vector<unsigned int> const levels = {1, 2, 3, 4, 5, 6, 7, 8, 1, 3, 3};
    TableBuilder table = variants(configurations.size(), [&configurations](Cache& c, size_t i) {
        c.configuration = configurations[i];
    });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(configurations.size(), run.nodes.size());
    for (size_t i = 0; i < configurations.size(); ++i) {
        SCOPED_TRACE("configuration " + std::to_string(configurations[i]));
        EXPECT_TRUE(hasUnsigned(run.nodes[i], 30, levels[i]));
    }
}

TEST(ProcessorCacheNodes, EverySystemCacheTypeRow) {
    // Undefined, other, unknown, instruction, data, unified, beyond.
    std::vector<uint8_t> const types = {0, 1, 2, 3, 4, 5, 6, 0xFF};
    std::vector<long long> const values = {0, 0, 0, 1, 2, 3, 0, 0};
    TableBuilder table =
        variants(types.size(), [&types](Cache& c, size_t i) { c.systemType = types[i]; });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(types.size(), run.nodes.size());
    for (size_t i = 0; i < types.size(); ++i) {
        SCOPED_TRACE("system cache type " + std::to_string(types[i]));
        EXPECT_TRUE(hasEnum(run.nodes[i], 9, 1, values[i]));
    }
}

TEST(ProcessorCacheNodes, EveryAssociativityRow) {
    // Undefined, other, unknown, direct mapped, 2-way, 4-way, fully
    // associative, 8-way, 16-way, then 12-, 24-, 32-, 48-, 64-, 20-way and
    // a byte beyond the SMBIOS values.
    std::vector<uint8_t> const bytes = {0, 1,    2,    3,    4,    5,    6,    7,
                                        8, 0x09, 0x0A, 0x0B, 0x0C, 0x0D, 0x0E, 0xFF};
    std::vector<long long> const values = {0, 0, 0, 1, 3, 4, 2, 5, 6, 0, 0, 0, 0, 0, 0, 0};
    TableBuilder table =
        variants(bytes.size(), [&bytes](Cache& c, size_t i) { c.associativity = bytes[i]; });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(bytes.size(), run.nodes.size());
    for (size_t i = 0; i < bytes.size(); ++i) {
        SCOPED_TRACE("associativity " + std::to_string(bytes[i]));
        EXPECT_TRUE(hasEnum(run.nodes[i], 5, 1, values[i]));
    }
}

// Length 7 holds the configuration word: the level is set, but no size.
// The speed lies beyond the structure (no property 57); the two type bytes
// lie in the string set, whose letters map to 0.
TEST(ProcessorCacheNodes, StructureLongerThanSixButNotTenGetsLevelButNoSizes) {
    std::vector<size_t> const lengths = {7, 0x0A};
    TableBuilder table = variants(lengths.size(), [&lengths](Cache& c, size_t i) {
        c.length = lengths[i];
        c.configuration = 0x0182;
        c.installedSize = 0;
        c.speed = 4;
    });
    ParsedTable check(table);
    ASSERT_EQ(7, check.parsed.getTables()[0].getLength());
    ASSERT_EQ(0x0A, check.parsed.getTables()[1].getLength());
    CacheRun run(table, 0x0700);

    ASSERT_EQ(2u, run.nodes.size());
    for (size_t i = 0; i < lengths.size(); ++i) {
        SCOPED_TRACE("length " + std::to_string(lengths[i]));
        IC::Node const* node = run.nodes[i];
        EXPECT_EQ((std::vector<unsigned int>{5, 9, 30, 53, 72, 125}), propertyIds(node));
        EXPECT_TRUE(hasUnsigned(node, 30, 3));
        EXPECT_TRUE(hasEnum(node, 72, 1, 1));
        EXPECT_TRUE(hasString(node, 53, "Internal L2 Cache"));
        EXPECT_TRUE(hasEnum(node, 9, 1, 0));
        EXPECT_TRUE(hasEnum(node, 5, 1, 0));
        // The installed size is not read, so the enabled bit decides.
        EXPECT_EQ(1u, node->getStatus());
    }
}

TEST(ProcessorCacheNodes, StructureLongerThanTenGetsSizes) {
    TableBuilder table = variants(1, [](Cache& c, size_t) {
        c.length = 0x0B;
        c.maximumSize = 0x8002;
        c.installedSize = 0x0040;
    });
    ParsedTable check(table);
    ASSERT_EQ(0x0B, check.parsed.getTables()[0].getLength());
    CacheRun run(table, 0x0700);

    ASSERT_EQ(1u, run.nodes.size());
    IC::Node const* node = run.nodes[0];
    EXPECT_EQ((std::vector<unsigned int>{5, 9, 30, 37, 53, 69, 72, 73, 112, 125, 173}),
              propertyIds(node));
    EXPECT_TRUE(hasUnsigned(node, 69, 1024));
    EXPECT_TRUE(hasUnsigned(node, 112, 128));
    EXPECT_TRUE(hasUnsigned(node, 37, 128));
    EXPECT_TRUE(hasUnsigned(node, 73, 64));
    EXPECT_TRUE(hasUnsigned(node, 173, 64));
    EXPECT_EQ(1u, node->getStatus());
}

// Length 6 stops inside the configuration word: the enabled-bit read passes
// the reader's offset check and the word read throws, so the node is made
// but gets nothing, and the failure is logged with the position.
TEST(ProcessorCacheNodes, StructureEndingInsideConfigurationWordFailsAfterTheNodeIsMade) {
    smbiostest::LogCapture log;
    TableBuilder table = variants(2, [](Cache& c, size_t i) {
        c.length = i == 0 ? 6 : 0x13;
        c.socket = i == 0 ? "Short" : "Whole";
    });
    CacheRun run(table, 0x0700);

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_EQ(3u, run.nodes[0]->getNodeId());
    EXPECT_EQ(0u, run.nodes[0]->getIndex());
    EXPECT_TRUE(propertyIds(run.nodes[0]).empty());
    EXPECT_EQ("", run.nodes[0]->getDescription());
    EXPECT_TRUE(hasString(run.nodes[1], 53, "Whole"));
    EXPECT_EQ(1u, run.nodes[1]->getIndex());
    std::string const failure = frametest::firstLogged("Exception=");
    EXPECT_NE(std::string::npos, failure.find("Table 7 index =0")) << log.dump();
    EXPECT_EQ(std::vector<int>{6000}, frametest::loggedLevels("Exception="));
    EXPECT_EQ("makeCacheNodes exit", loggedBy(CACHE_LOGGER).back());
}
