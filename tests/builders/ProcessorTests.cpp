// makeCpuNodes: one processor node per populated, enabled Processor
// Information structure (type 4) under the planar, its L1, L2 and L3 cache
// nodes and one node per core.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "BuilderFixture.h"

using namespace buildertest;

namespace {

char const* const CPU_LOGGER = "Quillon.IC.MI.SmBiosMI.SmBiosMICpu";
char const* const CACHE_LOGGER = "Quillon.IC.MI.SmBiosMI.SmBiosMICache";

// The formatted area of a structure written field by field, which can be cut
// to a shorter length (an older SMBIOS level) while every string stays in
// the string set.
class Fields {
public:
    Fields& byte(uint8_t value) {
        bytes_.push_back(value);
        return *this;
    }
    Fields& word(uint16_t value) {
        byte(static_cast<uint8_t>(value & 0xFF));
        return byte(static_cast<uint8_t>(value >> 8));
    }
    Fields& qword(uint64_t value) {
        for (unsigned int i = 0; i < 8; ++i) {
            byte(static_cast<uint8_t>((value >> (8 * i)) & 0xFF));
        }
        return *this;
    }
    // A string field: "" writes string number 0 and adds no string.
    Fields& str(std::string const& text) {
        if (text.empty()) {
            return byte(0);
        }
        strings_.push_back(text);
        return byte(static_cast<uint8_t>(strings_.size()));
    }

    // The structure with a formatted area of length bytes (header included).
    Structure structure(uint8_t type, uint16_t handle, size_t length) const {
        Structure out(type, handle);
        size_t const keep = length < 4 ? 0 : length - 4;
        out.bytes(std::vector<uint8_t>(
            bytes_.begin(), bytes_.begin() + static_cast<std::ptrdiff_t>(
                                                 keep < bytes_.size() ? keep : bytes_.size())));
        for (std::string const& text : strings_) {
            out.addString(text);
        }
        return out;
    }

private:
    std::vector<uint8_t> bytes_;
    std::vector<std::string> strings_;
};

// The fields of one Processor Information structure; the defaults describe a
// populated, enabled 64-bit processor with no cache handles and no cores.
struct Cpu {
    uint16_t handle = 0x0400;
    std::string socket = "CPU0";
    uint8_t processorType = 3, family = 0xB3;
    std::string manufacturer = "Corvane Silicon";
    uint64_t id = 0xBFEBFBFF000906EAull;
    std::string version = "Corvane X9 @ 3.00GHz";
    uint8_t voltage = 0x8C;
    uint16_t externalClock = 100, maxSpeed = 4000, currentSpeed = 3000;
    uint8_t status = 0x41, upgrade = 6;
    uint16_t l1 = 0xFFFF, l2 = 0xFFFF, l3 = 0xFFFF;
    std::string serial = "SN-0001", assetTag = "AT-42", partNumber = "PN-X9";
    uint8_t coreCount = 0, coreEnabled = 0, threadCount = 0;
    uint16_t characteristics = 0x0004;
    size_t length = 0x28;

    // The three core fields in one go.
    Cpu& cores(uint8_t count, uint8_t enabled, uint8_t threads) {
        coreCount = count;
        coreEnabled = enabled;
        threadCount = threads;
        return *this;
    }
    // The L1, L2 and L3 cache handles in one go.
    Cpu& caches(uint16_t level1, uint16_t level2, uint16_t level3) {
        l1 = level1;
        l2 = level2;
        l3 = level3;
        return *this;
    }
};

Structure cpu(Cpu const& c) {
    Fields fields;
    fields.str(c.socket).byte(c.processorType).byte(c.family).str(c.manufacturer).qword(c.id);
    fields.str(c.version).byte(c.voltage);
    fields.word(c.externalClock).word(c.maxSpeed).word(c.currentSpeed);
    fields.byte(c.status).byte(c.upgrade).word(c.l1).word(c.l2).word(c.l3);
    fields.str(c.serial).str(c.assetTag).str(c.partNumber);
    fields.byte(c.coreCount).byte(c.coreEnabled).byte(c.threadCount).word(c.characteristics);
    return fields.structure(4, c.handle, c.length);
}

// A Cache Information structure (SMBIOS 2.1 layout): enabled, write back,
// the given level, 32 KB.
Structure cache(uint16_t handle, std::string const& socket, unsigned int level) {
    Structure out(7, handle);
    out.str(socket).word(static_cast<uint16_t>(0x0180 | ((level - 1) & 7)));
    out.word(32).word(32).word(0x0002).word(0x0002);
    out.byte(0).byte(5).byte(5).byte(7);
    return out;
}

// The three caches a processor's handles 0x0700 to 0x0702 name, L1 to L3.
std::vector<Structure> threeCaches() {
    return {cache(0x0700, "L1-Cache", 1), cache(0x0701, "L2-Cache", 2),
            cache(0x0702, "L3-Cache", 3)};
}

// A default processor "CPU1" at handle 0x0401, to follow one at the default
// handle.
Structure secondCpu() {
    Cpu c;
    c.handle = 0x0401;
    c.socket = "CPU1";
    return cpu(c);
}

// A table of one default processor per value, with handles from 0x0400 up,
// each with its value set by set(cpu, value).
template <typename Value, typename Set>
TableBuilder oneCpuPerValue(std::vector<Value> const& values, Set set) {
    TableBuilder table;
    uint16_t handle = 0x0400;
    for (Value value : values) {
        Cpu c;
        c.handle = handle++;
        set(c, value);
        table.add(cpu(c));
    }
    return table;
}

// makeCpuNodes run over the table, under a planar node added first (node
// id 2); cpus holds the processor nodes (type 4) it made, in order.
struct CpuRun : PlanarSetup {
    explicit CpuRun(TableBuilder const& table) : PlanarSetup(table) {
        mi.makeCpuNodes(lists.get(), planar->getNodeId());
        cpus = nodesOfType(mi, 4);
    }
    // A table of the one processor.
    explicit CpuRun(Cpu const& c) : CpuRun(tableOf({cpu(c)})) {}
    std::vector<IC::Node*> cpus;
};

// A processor of Status byte `status` is selected: its node "CPU 1" has
// status 1 and property 55 (populated) true.
void expectSelected(uint8_t status) {
    Cpu c;
    c.status = status;
    CpuRun const run(c);
    ASSERT_EQ(1u, run.cpus.size());
    EXPECT_EQ(1u, run.cpus[0]->getStatus());
    EXPECT_EQ("CPU 1", run.cpus[0]->getDescription());
    EXPECT_TRUE(hasBool(run.cpus[0], 55, true));
}

}  // namespace

TEST(ProcessorNodes, PopulatedEnabledProcessorWithCachesAndCoresFieldByField) {
    smbiostest::LogCapture log;
    Cpu c;
    c.caches(0x0700, 0x0701, 0x0702).cores(2, 2, 4).characteristics = 0x00FC;
    std::vector<Structure> structures = threeCaches();
    structures.push_back(cpu(c));
    CpuRun const run(tableOf(structures));
    ASSERT_EQ(2u, run.planar->getNodeId());

    // Planar, processor, three caches, two cores.
    ASSERT_EQ(7u, run.mi.nodeList.size());
    EXPECT_EQ(9u, run.mi.nextNodeId);
    ASSERT_EQ(1u, run.cpus.size());
    IC::Node const* node = run.cpus[0];
    EXPECT_EQ(node, run.mi.nodeList[1]);
    EXPECT_TRUE(isNode(node, 3u, 2u, 4, 0u, 1u, "CPU 1"));
    EXPECT_EQ(run.mi.miIdList, node->getMIIds());
    EXPECT_EQ((std::vector<unsigned int>{2,  15, 19,  36,  38,  45,  50,  53,  55,  80,
                                         87, 89, 124, 125, 189, 190, 296, 298, 304, 307}),
              propertyIds(node));
    expectProperties(node, {unsignedListProp(125, {0, 1, 16, 24, 7}),
                            stringProp(53, "CPU0"),
                            enumProp(296, 1, 3),
                            unsignedProp(298, 0xB3),
                            stringProp(36, "Corvane Silicon"),
                            bytesProp(89, {0xBF, 0xEB, 0xFB, 0xFF, 0x00, 0x09, 0x06, 0xEA}),
                            stringProp(124, "10"),
                            stringProp(307, "Corvane X9 @ 3.00GHz"),
                            unsignedProp(19, 100),
                            unsignedProp(38, 4000),
                            unsignedProp(80, 3000),
                            boolProp(55, true),
                            enumProp(304, 1, 4),
                            stringProp(50, "SN-0001"),
                            stringProp(2, "AT-42"),
                            stringProp(45, "PN-X9"),
                            unsignedProp(15, 64),
                            unsignedProp(190, 2),
                            unsignedProp(189, 2),
                            unsignedProp(87, 4)});

    // The caches come right after the processor, L1 to L3, then the cores.
    std::vector<IC::Node*> const children = childrenOf(run.mi, 3);
    ASSERT_EQ(5u, children.size());
    for (unsigned int level = 0; level < 3; ++level) {
        SCOPED_TRACE("cache L" + std::to_string(level + 1));
        IC::Node const* cacheNode = children[level];
        EXPECT_TRUE(hasNodeType(cacheNode, 31));
        EXPECT_EQ(4u + level, cacheNode->getNodeId());
        EXPECT_EQ(level, cacheNode->getIndex());
        EXPECT_EQ("Processor Cache", cacheNode->getDescription());
        EXPECT_TRUE(hasString(cacheNode, 53, "L" + std::to_string(level + 1) + "-Cache"));
        EXPECT_TRUE(hasUnsigned(cacheNode, 30, level + 1));
    }
    for (unsigned int core = 0; core < 2; ++core) {
        SCOPED_TRACE("core " + std::to_string(core));
        IC::Node const* coreNode = children[3 + core];
        EXPECT_TRUE(hasNodeType(coreNode, 42));
        EXPECT_EQ(7u + core, coreNode->getNodeId());
        EXPECT_EQ(3u, coreNode->getLinkedId());
        EXPECT_EQ(core, coreNode->getIndex());
        EXPECT_EQ(1u, coreNode->getStatus());
        EXPECT_EQ("CPU Core Information", coreNode->getDescription());
        EXPECT_EQ(run.mi.miIdList, coreNode->getMIIds());
        EXPECT_EQ((std::vector<unsigned int>{87, 125, 128}), propertyIds(coreNode));
        expectProperties(
            coreNode, {unsignedListProp(125, {1, 16}), enumProp(128, 1, 0), unsignedProp(87, 4)});
    }

    std::vector<std::string> const texts = loggedBy(CPU_LOGGER);
    ASSERT_EQ(10u, texts.size()) << log.dump();
    EXPECT_EQ("makeCpuNodes entry", texts[0]);
    EXPECT_EQ("Table 4 count =1", texts[1]);
    EXPECT_EQ("Table 4 length = 40", texts[2]);
    EXPECT_EQ("Processor ID byte1 10", texts[3]);
    EXPECT_EQ(" L1 Cache handle = 1792", texts[4]);
    EXPECT_EQ(" L2 Cache handle = 1793", texts[5]);
    EXPECT_EQ(" L3 Cache handle = 1794", texts[6]);
    EXPECT_EQ(0u, texts[7].find(" 64 bit = ")) << texts[7];
    EXPECT_EQ(" Cores =2 enabled=2 thread count=4", texts[8]);
    EXPECT_EQ("makeCpuNodes exit", texts[9]);
}

TEST(ProcessorNodes, StatusPopulatedAndEnabledMakesANode) { expectSelected(0x41); }

TEST(ProcessorNodes, StatusNotPopulatedOrDisabledByBiosMakesNoNodeAndNoCacheNodes) {
    smbiostest::LogCapture log;
    for (uint8_t status : {uint8_t{0x01}, uint8_t{0x43}}) {
        SCOPED_TRACE("status " + std::to_string(status));
        QNLog::QNLogger::clearCapture();
        Cpu c;
        c.caches(0x0700, 0x0701, 0x0702).cores(2, 2, 0).status = status;
        std::vector<Structure> structures = threeCaches();
        structures.push_back(cpu(c));
        CpuRun const run(tableOf(structures));

        EXPECT_TRUE(holdsNodes(run.mi, 1, 3));
        EXPECT_TRUE(loggedBy(CACHE_LOGGER).empty()) << log.dump();
        // The structure is still looked at: its length is logged.
        EXPECT_EQ(1u, loggedCount("Table 4 length = 40")) << log.dump();
        EXPECT_EQ(0u, loggedCount("Processor ID byte1 ")) << log.dump();
    }
}

TEST(ProcessorNodes, StatusWithReservedBit7SetStillMakesANode) { expectSelected(0xC1); }

// CPU status 2 (disabled by the user), 3 (disabled by firmware) and 4 (idle)
// would map to node statuses 16, 24 and 7, but the selection lets only CPU
// status 1 through: those processors get no node at all.
TEST(ProcessorNodes, StatusesDisabledByUserOrFirmwareOrIdleMakeNoNode) {
    smbiostest::LogCapture log;
    std::vector<uint8_t> const statuses = {uint8_t{0x42}, uint8_t{0x43}, uint8_t{0x44}};
    CpuRun const run(
        oneCpuPerValue(statuses, [](Cpu& c, uint8_t status) { c.cores(1, 1, 0).status = status; }));

    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_TRUE(run.cpus.empty());
    EXPECT_TRUE(nodesOfType(run.mi, 42).empty());
    EXPECT_EQ(3u, loggedCount("Table 4 length = ")) << log.dump();
    EXPECT_EQ(0u, loggedCount("makeCacheNodes entry")) << log.dump();
}

// Only status 1 reaches the node-status mapping; every other combination of
// the populated bit and the CPU status bits is left out.
TEST(ProcessorNodes, OnlyPopulatedWithCpuStatusOneIsSelected) {
    std::vector<uint8_t> const statuses = {0x00, 0x01, 0x02, 0x07, 0x40, 0x41, 0x45,
                                           0x46, 0x47, 0x49, 0x61, 0x81, 0xC1, 0xFF};
    CpuRun const run(oneCpuPerValue(statuses, [](Cpu& c, uint8_t status) {
        c.status = status;
        c.socket = "Socket " + std::to_string(status);
    }));

    // 0x41, 0x49 (bit 3 is outside the mask), 0x61 (bit 5 likewise) and 0xC1.
    ASSERT_EQ(4u, run.cpus.size());
    std::vector<std::string> const sockets = {"Socket 65", "Socket 73", "Socket 97", "Socket 193"};
    for (size_t i = 0; i < run.cpus.size(); ++i) {
        SCOPED_TRACE(sockets[i]);
        EXPECT_TRUE(hasString(run.cpus[i], 53, sockets[i]));
        EXPECT_EQ(1u, run.cpus[i]->getStatus());
        EXPECT_EQ(i, run.cpus[i]->getIndex());
    }
}

TEST(ProcessorNodes, FirstProcessorSkippedSecondGetsIndexZeroAndDescriptionEndingInOne) {
    Cpu absent;  // handle 0x0400, "CPU0"
    absent.status = 0x00;
    CpuRun const run(tableOf({cpu(absent), secondCpu()}));

    ASSERT_EQ(1u, run.cpus.size());
    EXPECT_TRUE(hasString(run.cpus[0], 53, "CPU1"));
    EXPECT_EQ(0u, run.cpus[0]->getIndex());
    EXPECT_EQ("CPU 1", run.cpus[0]->getDescription());
    EXPECT_EQ(3u, run.cpus[0]->getNodeId());
}

TEST(ProcessorNodes, DescriptionCountsFromOneWhileIndexCountsFromZero) {
    TableBuilder table;
    for (uint16_t i = 0; i < 3; ++i) {
        Cpu c;
        c.handle = static_cast<uint16_t>(0x0400 + i);
        c.socket = "CPU" + std::to_string(i);
        table.add(cpu(c));
    }
    CpuRun const run(table);

    ASSERT_EQ(3u, run.cpus.size());
    for (unsigned int i = 0; i < 3; ++i) {
        SCOPED_TRACE("processor " + std::to_string(i));
        EXPECT_EQ(i, run.cpus[i]->getIndex());
        EXPECT_EQ("CPU " + std::to_string(i + 1), run.cpus[i]->getDescription());
        EXPECT_EQ(3u + i, run.cpus[i]->getNodeId());
        EXPECT_EQ(2u, run.cpus[i]->getLinkedId());
    }
}

TEST(ProcessorNodes, ProcessorIdIsStoredAsItsEightBytesReversed) {
    Cpu c;
    c.id = 0x0123456789ABCDEFull;
    CpuRun const run(c);
    ASSERT_EQ(0xEF, run.parsed.getTables()[0].getByte(0x08));

    ASSERT_EQ(1u, run.cpus.size());
    EXPECT_TRUE(hasBytes(run.cpus[0], 89, {0x01, 0x23, 0x45, 0x67, 0x89, 0xAB, 0xCD, 0xEF}));
    // Stepping: the low nibble of the first byte, 0xF, as decimal text.
    EXPECT_TRUE(hasString(run.cpus[0], 124, "15"));
}

TEST(ProcessorNodes, SteppingIsTheLowNibbleOfTheFirstIdByteAsDecimalText) {
    smbiostest::LogCapture log;
    std::vector<uint8_t> const firstBytes = {0x00, 0x07, 0xA9, 0x5C};
    std::vector<std::string> const steppings = {"0", "7", "9", "12"};
    CpuRun const run(oneCpuPerValue(
        firstBytes, [](Cpu& c, uint8_t first) { c.id = 0xBFEBFBFF00090600ull | first; }));

    ASSERT_EQ(4u, run.cpus.size());
    for (size_t i = 0; i < run.cpus.size(); ++i) {
        SCOPED_TRACE("first ID byte " + std::to_string(firstBytes[i]));
        EXPECT_TRUE(hasString(run.cpus[i], 124, steppings[i]));
        EXPECT_EQ(1u, loggedCount("Processor ID byte1 " + steppings[i])) << log.dump();
    }
}

TEST(ProcessorNodes, UpgradeOtherAndUnknownGiveZeroThreeGivesOneAbove22GiveZero) {
    std::vector<uint8_t> const upgrades = {1, 2, 3, 22, 23, 0x2B};
    CpuRun const run(
        oneCpuPerValue(upgrades, [](Cpu& c, uint8_t upgrade) { c.upgrade = upgrade; }));

    expectEnumPerNode(run.cpus, upgrades, "upgrade", 304, {0, 0, 1, 20, 0, 0});
}

TEST(ProcessorNodes, CharacteristicsBit2GivesSixtyFourElseThirtyTwo) {
    std::vector<uint16_t> const words = {0x0004, 0x0006, 0x00FB, 0x0000, 0xFFFF};
    CpuRun const run(
        oneCpuPerValue(words, [](Cpu& c, uint16_t word) { c.characteristics = word; }));

    expectUnsignedPerNode(run.cpus, words, "characteristics", 15, {64, 64, 32, 32, 64});
}

// A structure that ends one byte into the Processor Characteristics word:
// the 64-bit read passes the reader's offset check but the word read
// throws. The processor keeps what was set before, gets no core data, and
// the failure is logged with the structure's position.
TEST(ProcessorNodes, StructureEndingInsideCharacteristicsKeepsPropertiesSetSoFar) {
    smbiostest::LogCapture log;
    Cpu c;
    c.cores(2, 2, 2).length = 0x27;
    c.l1 = 0x0700;
    CpuRun const run(tableOf({cache(0x0700, "L1-Cache", 1), cpu(c)}));
    ASSERT_EQ(0x27, run.parsed.getTables()[1].getLength());

    ASSERT_EQ(1u, run.cpus.size());
    IC::Node const* node = run.cpus[0];
    EXPECT_EQ(1u, node->getStatus());
    EXPECT_EQ("CPU 1", node->getDescription());
    EXPECT_EQ((std::vector<unsigned int>{2, 19, 36, 38, 45, 50, 53, 55, 80, 89, 124, 125, 296, 298,
                                         304, 307}),
              propertyIds(node));
    expectProperties(node, {stringProp(45, "PN-X9"), noProp(15), noProp(190)});
    // The cache was made before the failure; no cores after it.
    EXPECT_EQ(1u, nodesOfType(run.mi, 31).size());
    EXPECT_TRUE(nodesOfType(run.mi, 42).empty());
    std::string const failure = frametest::firstLogged("Exception=");
    // The position is the one in the processor structures' list.
    EXPECT_NE(std::string::npos, failure.find("Table 4 index =0")) << log.dump();
    EXPECT_EQ(std::vector<int>{6000}, frametest::loggedLevels("Exception="));
    EXPECT_EQ(0u, loggedCount(" Cores =")) << log.dump();
    EXPECT_EQ(1u, loggedCount("makeCpuNodes exit")) << log.dump();
}

TEST(ProcessorNodes, FailingProcessorDoesNotStopTheNextOne) {
    smbiostest::LogCapture log;
    Cpu broken;  // handle 0x0400
    broken.length = 0x27;
    CpuRun const run(tableOf({cpu(broken), secondCpu()}));

    ASSERT_EQ(2u, run.cpus.size());
    EXPECT_TRUE(lacksProperty(run.cpus[0], 15));
    EXPECT_TRUE(hasString(run.cpus[1], 53, "CPU1"));
    EXPECT_EQ(1u, run.cpus[1]->getIndex());
    EXPECT_EQ("CPU 2", run.cpus[1]->getDescription());
    EXPECT_TRUE(hasUnsigned(run.cpus[1], 15, 64));
    EXPECT_NE(std::string::npos, frametest::firstLogged("Exception=").find("Table 4 index =0"))
        << log.dump();
}

TEST(ProcessorNodes, ThreeCacheCallsPerProcessorAndHandleFFFFMatchesNothing) {
    smbiostest::LogCapture log;
    Cpu c;
    c.caches(0x0700, 0xFFFF, 0xFFFF);
    CpuRun const run(tableOf({cache(0x0700, "L1-Cache", 1), cache(0x0701, "L2-Cache", 2), cpu(c)}));

    EXPECT_EQ(3u, loggedCount("makeCacheNodes entry handle=")) << log.dump();
    EXPECT_EQ(1u, loggedCount("makeCacheNodes entry handle=1792")) << log.dump();
    EXPECT_EQ(2u, loggedCount("makeCacheNodes entry handle=65535")) << log.dump();
    EXPECT_EQ(1u, loggedCount(" L2 Cache handle = 65535")) << log.dump();
    EXPECT_EQ(1u, loggedCount(" L3 Cache handle = 65535")) << log.dump();
    std::vector<IC::Node*> const caches = nodesOfType(run.mi, 31);
    ASSERT_EQ(1u, caches.size());
    EXPECT_TRUE(hasString(caches[0], 53, "L1-Cache"));
    EXPECT_EQ(3u, caches[0]->getLinkedId());
    EXPECT_EQ(0u, caches[0]->getIndex());
}

TEST(ProcessorNodes, EachProcessorGetsItsOwnCachesAndCoresWithIdsInCreationOrder) {
    TableBuilder table;
    table.add(cache(0x0700, "P0-L1", 1));
    table.add(cache(0x0701, "P1-L1", 1));
    table.add(cache(0x0702, "Shared-L3", 3));
    for (uint16_t i = 0; i < 2; ++i) {
        Cpu c;
        c.handle = static_cast<uint16_t>(0x0400 + i);
        c.caches(static_cast<uint16_t>(0x0700 + i), 0xFFFF, 0x0702).cores(1, 1, 2);
        table.add(cpu(c));
    }
    CpuRun const run(table);

    // Processor 3: L1 4, L3 5, core 6. Processor 7: L1 8, L3 9, core 10.
    ASSERT_EQ(9u, run.mi.nodeList.size());
    std::vector<unsigned int> const types = {41, 4, 31, 31, 42, 4, 31, 31, 42};
    std::vector<unsigned int> const links = {1, 2, 3, 3, 3, 2, 7, 7, 7};
    for (size_t i = 0; i < run.mi.nodeList.size(); ++i) {
        SCOPED_TRACE("node " + std::to_string(i));
        EXPECT_EQ(i + 2, run.mi.nodeList[i]->getNodeId());
        EXPECT_TRUE(hasNodeType(run.mi.nodeList[i], types[i]));
        EXPECT_EQ(links[i], run.mi.nodeList[i]->getLinkedId());
    }
    EXPECT_TRUE(hasString(run.mi.nodeList[2], 53, "P0-L1"));
    EXPECT_TRUE(hasString(run.mi.nodeList[3], 53, "Shared-L3"));
    EXPECT_TRUE(hasString(run.mi.nodeList[6], 53, "P1-L1"));
    EXPECT_TRUE(hasString(run.mi.nodeList[7], 53, "Shared-L3"));
    // A cache's index is its position among the cache structures.
    EXPECT_EQ(0u, run.mi.nodeList[2]->getIndex());
    EXPECT_EQ(1u, run.mi.nodeList[6]->getIndex());
    EXPECT_EQ(2u, run.mi.nodeList[3]->getIndex());
    EXPECT_EQ(2u, run.mi.nodeList[7]->getIndex());
    // Core indexes count per processor.
    EXPECT_EQ(0u, run.mi.nodeList[4]->getIndex());
    EXPECT_EQ(0u, run.mi.nodeList[8]->getIndex());
}

TEST(ProcessorNodes, FourCoresTwoEnabledEightThreads) {
    Cpu c;
    c.cores(4, 2, 8);
    CpuRun const run(c);

    ASSERT_EQ(1u, run.cpus.size());
    expectProperties(run.cpus[0],
                     {unsignedProp(190, 4), unsignedProp(189, 2), unsignedProp(87, 8)});
    std::vector<IC::Node*> const cores = childrenOf(run.mi, run.cpus[0]->getNodeId());
    ASSERT_EQ(4u, cores.size());
    for (unsigned int i = 0; i < 4; ++i) {
        SCOPED_TRACE("core " + std::to_string(i));
        EXPECT_TRUE(hasNodeType(cores[i], 42));
        EXPECT_EQ(i, cores[i]->getIndex());
        EXPECT_EQ(4u + i, cores[i]->getNodeId());
        EXPECT_EQ(i < 2 ? 1u : 16u, cores[i]->getStatus());
        EXPECT_EQ("CPU Core Information", cores[i]->getDescription());
        // Each core carries the processor's whole thread count.
        expectProperties(
            cores[i], {unsignedProp(87, 8), unsignedListProp(125, {1, 16}), enumProp(128, 1, 0)});
    }
}

TEST(ProcessorNodes, ThreadCountZeroLeavesCoresWithoutThreadProperty) {
    smbiostest::LogCapture log;
    Cpu c;
    c.cores(2, 1, 0);
    CpuRun const run(c);

    ASSERT_EQ(1u, run.cpus.size());
    EXPECT_TRUE(hasUnsigned(run.cpus[0], 87, 0));
    std::vector<IC::Node*> const cores = nodesOfType(run.mi, 42);
    ASSERT_EQ(2u, cores.size());
    for (IC::Node const* core : cores) {
        EXPECT_EQ((std::vector<unsigned int>{125, 128}), propertyIds(core));
    }
    EXPECT_EQ(1u, cores[0]->getStatus());
    EXPECT_EQ(16u, cores[1]->getStatus());
    EXPECT_EQ(" Cores =2 enabled=1 thread count=0", frametest::firstLogged(" Cores ="))
        << log.dump();
}

TEST(ProcessorNodes, Level20StructureHasNoCoreDataAndLogsTheNoCoreSuffix) {
    smbiostest::LogCapture log;
    Cpu c;
    c.cores(4, 4, 8).length = 0x1A;
    CpuRun const run(c);
    ASSERT_EQ(0x1A, run.parsed.getTables()[0].getLength());

    ASSERT_EQ(1u, run.cpus.size());
    IC::Node const* node = run.cpus[0];
    // No serial, asset tag or part number fields; the 64-bit bit reads as
    // clear; the core fields read as 0 and are set all the same.
    EXPECT_EQ((std::vector<unsigned int>{15, 19, 36, 38, 53, 55, 80, 87, 89, 124, 125, 189, 190,
                                         296, 298, 304, 307}),
              propertyIds(node));
    expectProperties(node, {unsignedProp(15, 32), unsignedProp(190, 0), unsignedProp(189, 0),
                            unsignedProp(87, 0), enumProp(304, 1, 4)});
    EXPECT_TRUE(nodesOfType(run.mi, 42).empty());
    EXPECT_EQ(2u, run.mi.nodeList.size());
    EXPECT_EQ(" Cores =0 enabled=0 thread count=0 - no core data in smbios tables",
              frametest::firstLogged(" Cores ="))
        << log.dump();
    // The missing cache handle fields read as 0 and are passed on as such.
    EXPECT_EQ(3u, loggedCount("makeCacheNodes entry handle=0")) << log.dump();
}

TEST(ProcessorNodes, CoreCountZeroMakesNoCoreNodes) {
    smbiostest::LogCapture log;
    Cpu c;
    c.cores(0, 0, 4);
    CpuRun const run(c);

    EXPECT_TRUE(nodesOfType(run.mi, 42).empty());
    ASSERT_EQ(1u, run.cpus.size());
    EXPECT_TRUE(hasUnsigned(run.cpus[0], 190, 0));
    EXPECT_TRUE(hasUnsigned(run.cpus[0], 87, 4));
    EXPECT_EQ(" Cores =0 enabled=0 thread count=4 - no core data in smbios tables",
              frametest::firstLogged(" Cores ="))
        << log.dump();
}

TEST(ProcessorNodes, EmptyStringsAreSetAsEmptyText) {
    Cpu c;
    c.socket = "";
    c.manufacturer = "";
    c.version = "";
    c.serial = "";
    c.assetTag = "";
    c.partNumber = "";
    CpuRun const run(c);

    ASSERT_EQ(1u, run.cpus.size());
    for (unsigned int id : {53u, 36u, 307u, 50u, 2u, 45u}) {
        SCOPED_TRACE("property " + std::to_string(id));
        EXPECT_TRUE(hasString(run.cpus[0], id, ""));
    }
}

TEST(ProcessorNodes, NoProcessorStructuresLogCountZeroAndMakeNothing) {
    smbiostest::LogCapture log;
    CpuRun const run(tableOf({cache(0x0700, "L1-Cache", 1)}));

    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_TRUE(
        loggedExactly(CPU_LOGGER, {"makeCpuNodes entry", "Table 4 count =0", "makeCpuNodes exit"}));
}
