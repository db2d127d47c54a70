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
    uint16_t configuration = 0x0181, maximumSize = 0x0200, installedSize = 0x0200;
    uint16_t supportedSram = 0x0002, currentSram = 0x0002;
    uint8_t speed = 0, errorCorrection = 5, systemType = 5, associativity = 7;
    size_t length = 0x13;
};

// A cache of the default fields with its own handle and socket text.
Cache cacheAt(uint16_t handle, std::string const& socket) {
    Cache c;
    c.handle = handle;
    c.socket = socket;
    return c;
}

Structure cache(Cache const& c) {
    Structure full(7, c.handle);
    full.str(c.socket).word(c.configuration).word(c.maximumSize).word(c.installedSize);
    full.word(c.supportedSram).word(c.currentSram);
    full.byte(c.speed).byte(c.errorCorrection).byte(c.systemType).byte(c.associativity);
    // Cut to the length: the string number of the socket stays at offset 4
    // (when the length reaches it), its text in the set.
    return cutTo(full, c.length, {c.socket});
}

// The cache nodes of one call for handle (0x0700 unless told otherwise),
// under a processor node (id 2).
struct CacheRun : BuilderSetup {
    explicit CacheRun(TableBuilder const& table, unsigned int handle = 0x0700)
        : BuilderSetup(table, 4) {
        mi.makeCacheNodes(lists.get(), parent->getNodeId(), handle);
        nodes = nodesOfType(mi, 31);
    }
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
    // Configuration 0x0181, maximum size 0x0200, system type 5 and
    // associativity 7 as the defaults have them.
    Cache l2 = cacheAt(0x0701, "L2-Cache");
    l2.installedSize = 0x0100;
    l2.speed = 4;
    CacheRun run(tableOf({cache(cacheAt(0x0700, "L1-Cache")), cache(l2),
                          cache(cacheAt(0x0702, "L3-Cache"))}),
                 0x0701);

    ASSERT_EQ(1u, run.nodes.size());
    ASSERT_EQ(2u, run.mi.nodeList.size());
    EXPECT_EQ(4u, run.mi.nextNodeId);
    IC::Node const* node = run.nodes[0];
    EXPECT_EQ(node, run.mi.nodeList[1]);
    // Index 1: the structure's position among the cache structures.
    EXPECT_TRUE(isNode(node, 3, 2, 31, 1, 1, "Processor Cache"));
    EXPECT_EQ(run.mi.miIdList, node->getMIIds());
    EXPECT_EQ((std::vector<unsigned int>{5, 9, 30, 37, 53, 57, 69, 72, 73, 112, 125, 173}),
              propertyIds(node));
    expectProperties(
        node, {unsignedListProp(125, {1, 14, 16}), stringProp(53, "L2-Cache"), enumProp(72, 1, 1),
               unsignedProp(30, 2), unsignedProp(69, 1024), unsignedProp(112, 512),
               unsignedProp(37, 512), unsignedProp(73, 256), unsignedProp(173, 256),
               enumProp(9, 1, 3), enumProp(5, 1, 5), doubleProp(57, 250.0)});

    EXPECT_TRUE(
        loggedExactly(CACHE_LOGGER, {"makeCacheNodes entry handle=1793", "Table 7 count =3",
                                     "Table 7 length = 19 handle = 1793", "makeCacheNodes exit"}));
}

TEST(ProcessorCacheNodes, HandleMatchingNothingMakesNoNodeAndLogsOnlyEntryCountAndExit) {
    smbiostest::LogCapture log;
    Cache l2;
    l2.handle = 0x0701;
    CacheRun run(tableOf({cache(Cache()), cache(l2)}), 0xFFFF);

    EXPECT_TRUE(run.nodes.empty());
    EXPECT_TRUE(holdsNodes(run.mi, 1, 3));
    EXPECT_TRUE(loggedExactly(CACHE_LOGGER, {"makeCacheNodes entry handle=65535",
                                             "Table 7 count =2", "makeCacheNodes exit"}));
}

TEST(ProcessorCacheNodes, NoCacheStructuresLogCountZero) {
    smbiostest::LogCapture log;
    CacheRun run(tableOf({Structure(4, 0x0400).str("CPU0")}));

    EXPECT_TRUE(run.nodes.empty());
    EXPECT_TRUE(loggedExactly(CACHE_LOGGER, {"makeCacheNodes entry handle=1792", "Table 7 count =0",
                                             "makeCacheNodes exit"}));
}

TEST(ProcessorCacheNodes, TwoStructuresSharingTheHandleMakeTwoNodesUnderTheProcessor) {
    smbiostest::LogCapture log;
    CacheRun run(tableOf({cache(cacheAt(0x0700, "First")), cache(cacheAt(0x0701, "Other")),
                          cache(cacheAt(0x0700, "Second"))}));

    std::vector<IC::Node*> const children = childrenOf(run.mi, run.parent->getNodeId());
    ASSERT_EQ(2u, children.size());
    EXPECT_TRUE(hasString(children[0], 53, "First"));
    EXPECT_TRUE(hasIdAndIndex(children[0], 3, 0));
    EXPECT_TRUE(hasString(children[1], 53, "Second"));
    EXPECT_TRUE(hasIdAndIndex(children[1], 4, 2));
    for (IC::Node const* child : children) {
        EXPECT_TRUE(hasNodeType(child, 31));
        EXPECT_EQ("Processor Cache", child->getDescription());
    }
    EXPECT_EQ(2u, frametest::loggedLevels("Table 7 length = 19 handle = 1792").size())
        << log.dump();
}

TEST(ProcessorCacheNodes, MaximumSizeWithGranularityBitCountsSixtyFourKilobyteUnits) {
    CacheRun run(variants(2, [](Cache& c, size_t i) { c.maximumSize = i == 0 ? 0x8100 : 0x0200; }));

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 112, 16384));
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 37, 16384));
    EXPECT_TRUE(hasUnsigned(run.nodes[1], 112, 512));
    EXPECT_TRUE(hasUnsigned(run.nodes[1], 37, 512));
}

TEST(ProcessorCacheNodes, InstalledSizeConvertedLikeTheMaximumSize) {
    std::vector<uint16_t> const words = {0x8010, 0x0040, 0xFFFF, 0x7FFF};
    std::vector<unsigned int> const sizes = {1024, 64, 0x7FFF * 64, 0x7FFF};
    CacheRun run(variants(words.size(), [&words](Cache& c, size_t i) {
        c.installedSize = words[i];
        c.maximumSize = words[i];
    }));

    ASSERT_EQ(words.size(), run.nodes.size());
    for (size_t i = 0; i < words.size(); ++i) {
        SCOPED_TRACE("size word " + std::to_string(words[i]));
        expectProperties(run.nodes[i], {unsignedProp(73, sizes[i]), unsignedProp(173, sizes[i]),
                                        unsignedProp(112, sizes[i]), unsignedProp(37, sizes[i])});
        EXPECT_EQ(1u, run.nodes[i]->getStatus());
    }
}

TEST(ProcessorCacheNodes, InstalledSizeZeroEndsWithStatus14EvenWhenEnabled) {
    CacheRun run(variants(1, [](Cache& c, size_t) {
        c.configuration = 0x0180;
        c.installedSize = 0;
    }));

    ASSERT_EQ(1u, run.nodes.size());
    EXPECT_EQ(14u, run.nodes[0]->getStatus());
    expectProperties(run.nodes[0],
                     {unsignedProp(73, 0), unsignedProp(173, 0), unsignedProp(112, 512)});
}

// The status comes from the enabled bit first; an installed size of 0
// overrides either value with 14.
TEST(ProcessorCacheNodes, StatusFromEnabledBitThenFourteenWhenNotInstalled) {
    std::vector<uint16_t> const configurations = {0x0180, 0x0100, 0x0180, 0x0100, 0x8000};
    std::vector<uint16_t> const installed = {0x0200, 0x0200, 0x0000, 0x0000, 0x8000};
    std::vector<unsigned int> const statuses = {1, 16, 14, 14, 14};
    CacheRun run(variants(configurations.size(), [&](Cache& c, size_t i) {
        c.configuration = configurations[i];
        c.installedSize = installed[i];
    }));

    ASSERT_EQ(configurations.size(), run.nodes.size());
    for (size_t i = 0; i < configurations.size(); ++i) {
        SCOPED_TRACE("configuration " + std::to_string(configurations[i]) + " installed " +
                     std::to_string(installed[i]));
        EXPECT_EQ(statuses[i], run.nodes[i]->getStatus());
    }
}

TEST(ProcessorCacheNodes, CacheSpeedZeroSetsNoPropertyAndFourGivesTwoHundredFifty) {
    std::vector<uint8_t> const speeds = {0, 4, 3, 255};
    CacheRun run(variants(speeds.size(), [&speeds](Cache& c, size_t i) { c.speed = speeds[i]; }));

    ASSERT_EQ(speeds.size(), run.nodes.size());
    EXPECT_TRUE(lacksProperty(run.nodes[0], 57));
    EXPECT_TRUE(hasDouble(run.nodes[1], 57, 250.0));
    EXPECT_TRUE(hasDouble(run.nodes[2], 57, 1000.0 / 3.0));
    EXPECT_TRUE(hasDouble(run.nodes[3], 57, 1000.0 / 255.0));
}

TEST(ProcessorCacheNodes, ConfigurationWord0180IsEnabledWriteBackLevelOne) {
    CacheRun run(variants(1, [](Cache& c, size_t) { c.configuration = 0x0180; }));

    ASSERT_EQ(1u, run.nodes.size());
    EXPECT_EQ(1u, run.nodes[0]->getStatus());
    EXPECT_TRUE(hasEnum(run.nodes[0], 72, 1, 1));
    EXPECT_TRUE(hasUnsigned(run.nodes[0], 30, 1));
}

TEST(ProcessorCacheNodes, EveryOperationalModeRow) {
    // Write through, write back, varies with memory address, unknown.
    std::vector<uint16_t> const configurations = {0x0080, 0x0180, 0x0280, 0x0380};
    CacheRun run(variants(configurations.size(), [&configurations](Cache& c, size_t i) {
        c.configuration = configurations[i];
    }));

    expectEnumPerNode(run.nodes, configurations, "configuration", 72, {2, 1, 3, 0});
    expectUnsignedPerNode(run.nodes, configurations, "configuration", 30, {1, 1, 1, 1});
}

TEST(ProcessorCacheNodes, LevelIsBitsZeroToTwoPlusOne) {
    // Levels 1 to 8, then the socketed bit (3), a location (bits 5-6) and
    // every other bit set beside level bits 2.
    std::vector<uint16_t> const configurations = {0x0180, 0x0181, 0x0182, 0x0183, 0x0184, 0x0185,
                                                  0x0186, 0x0187, 0x0188, 0x01A2, 0xFFFA};
    CacheRun run(variants(configurations.size(), [&configurations](Cache& c, size_t i) {
        c.configuration = configurations[i];
    }));

    expectUnsignedPerNode(run.nodes, configurations, "configuration", 30,
                          {1, 2, 3, 4, 5, 6, 7, 8, 1, 3, 3});
}

TEST(ProcessorCacheNodes, EverySystemCacheTypeRow) {
    // Undefined, other, unknown, instruction, data, unified, beyond.
    std::vector<uint8_t> const types = {0, 1, 2, 3, 4, 5, 6, 0xFF};
    CacheRun run(variants(types.size(), [&types](Cache& c, size_t i) { c.systemType = types[i]; }));

    expectEnumPerNode(run.nodes, types, "system cache type", 9, {0, 0, 0, 1, 2, 3, 0, 0});
}

TEST(ProcessorCacheNodes, EveryAssociativityRow) {
    // Undefined, other, unknown, direct mapped, 2-way, 4-way, fully
    // associative, 8-way, 16-way, then 12-, 24-, 32-, 48-, 64-, 20-way and
    // a byte beyond the SMBIOS values.
    std::vector<uint8_t> const bytes = {0, 1,    2,    3,    4,    5,    6,    7,
                                        8, 0x09, 0x0A, 0x0B, 0x0C, 0x0D, 0x0E, 0xFF};
    CacheRun run(
        variants(bytes.size(), [&bytes](Cache& c, size_t i) { c.associativity = bytes[i]; }));

    expectEnumPerNode(run.nodes, bytes, "associativity", 5,
                      {0, 0, 0, 1, 3, 4, 2, 5, 6, 0, 0, 0, 0, 0, 0, 0});
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
    CacheRun run(table);

    ASSERT_EQ(2u, run.nodes.size());
    for (size_t i = 0; i < lengths.size(); ++i) {
        SCOPED_TRACE("length " + std::to_string(lengths[i]));
        IC::Node const* node = run.nodes[i];
        EXPECT_EQ((std::vector<unsigned int>{5, 9, 30, 53, 72, 125}), propertyIds(node));
        expectProperties(
            node, {unsignedProp(30, 3), enumProp(72, 1, 1), stringProp(53, "Internal L2 Cache"),
                   enumProp(9, 1, 0), enumProp(5, 1, 0)});
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
    CacheRun run(table);

    ASSERT_EQ(1u, run.nodes.size());
    IC::Node const* node = run.nodes[0];
    EXPECT_EQ((std::vector<unsigned int>{5, 9, 30, 37, 53, 69, 72, 73, 112, 125, 173}),
              propertyIds(node));
    expectProperties(node, {unsignedProp(69, 1024), unsignedProp(112, 128), unsignedProp(37, 128),
                            unsignedProp(73, 64), unsignedProp(173, 64)});
    EXPECT_EQ(1u, node->getStatus());
}

// Length 6 stops inside the configuration word: the enabled-bit read passes
// the reader's offset check and the word read throws, so the node is made
// but gets nothing, and the failure is logged with the position.
TEST(ProcessorCacheNodes, StructureEndingInsideConfigurationWordFailsAfterTheNodeIsMade) {
    smbiostest::LogCapture log;
    CacheRun run(variants(2, [](Cache& c, size_t i) {
        c.length = i == 0 ? 6 : 0x13;
        c.socket = i == 0 ? "Short" : "Whole";
    }));

    ASSERT_EQ(2u, run.nodes.size());
    EXPECT_TRUE(hasIdAndIndex(run.nodes[0], 3, 0));
    EXPECT_TRUE(propertyIds(run.nodes[0]).empty());
    EXPECT_EQ("", run.nodes[0]->getDescription());
    EXPECT_TRUE(hasString(run.nodes[1], 53, "Whole"));
    EXPECT_EQ(1u, run.nodes[1]->getIndex());
    std::string const failure = frametest::firstLogged("Exception=");
    EXPECT_NE(std::string::npos, failure.find("Table 7 index =0")) << log.dump();
    EXPECT_EQ(std::vector<int>{6000}, frametest::loggedLevels("Exception="));
    EXPECT_EQ("makeCacheNodes exit", loggedBy(CACHE_LOGGER).back());
}
