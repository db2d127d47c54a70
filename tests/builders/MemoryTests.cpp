// makeDimmNodes: one node per Physical Memory Array (type 16) and one per
// installed Memory Device (type 17), all directly under the planar.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "BuilderFixture.h"

using namespace buildertest;

namespace {

char const* const DIMM_LOGGER = "Quillon.IC.MI.SmBiosMI.SmBiosMIDimm";

// The fields of one Physical Memory Array structure (SMBIOS 2.1 layout,
// 0x0F bytes): on the system board, system memory, multi-bit ECC, 32 GB.
struct Array {
    uint16_t handle = 0x1000;
    uint8_t location = 3;
    uint8_t use = 3;
    uint8_t errorCorrection = 6;
    uint32_t maximumCapacity = 0x02000000;
    uint16_t errorHandle = 0xFFFE;
    uint16_t deviceCount = 4;
    size_t length = 0x0F;
};

Structure array(Array const& a) {
    Structure full(16, a.handle);
    full.byte(a.location)
        .byte(a.use)
        .byte(a.errorCorrection)
        .dword(a.maximumCapacity)
        .word(a.errorHandle)
        .word(a.deviceCount);
    return cutTo(full, a.length, {});
}

// The fields of one Memory Device structure (SMBIOS 2.3 layout, 0x1B
// bytes): an 8 GB DDR3 DIMM.
struct Device {
    uint16_t handle = 0x1100;
    uint16_t arrayHandle = 0x1000;
    uint16_t errorHandle = 0xFFFE;
    uint16_t totalWidth = 72;
    uint16_t dataWidth = 64;
    uint16_t size = 0x2000;
    uint8_t formFactor = 0x09;
    uint8_t deviceSet = 0;
    std::string deviceLocator = "DIMM_A1";
    std::string bankLocator = "BANK 0";
    uint8_t memoryType = 0x18;
    uint16_t typeDetail = 0x0080;
    uint16_t speed = 1600;
    std::string manufacturer = "Corvane Memory";
    std::string serial = "0001A2B3";
    std::string assetTag = "AT-M1";
    std::string partNumber = "CM3-8G-1600";
    size_t length = 0x1B;
};

Structure device(Device const& d) {
    Structure full(17, d.handle);
    full.word(d.arrayHandle)
        .word(d.errorHandle)
        .word(d.totalWidth)
        .word(d.dataWidth)
        .word(d.size)
        .byte(d.formFactor)
        .byte(d.deviceSet)
        .str(d.deviceLocator)
        .str(d.bankLocator)
        .byte(d.memoryType)
        .word(d.typeDetail)
        .word(d.speed)
        .str(d.manufacturer)
        .str(d.serial)
        .str(d.assetTag)
        .str(d.partNumber);
    return cutTo(
        full, d.length,
        {d.deviceLocator, d.bankLocator, d.manufacturer, d.serial, d.assetTag, d.partNumber});
}

// The builder run over a table under a planar node (id 2).
struct DimmRun {
    explicit DimmRun(TableBuilder const& table) : built(table) {
        planar = buildertest::addParent(mi);
        mi.makeDimmNodes(built.lists.get(), planar->getNodeId());
        arrays = nodesOfType(mi, 32);
        devices = nodesOfType(mi, 19);
    }
    ParsedTable built;
    TestMI mi;
    IC::MutableNode* planar = nullptr;
    std::vector<IC::Node*> arrays;
    std::vector<IC::Node*> devices;
};

// Devices that differ in one field, one node each, in table order.
template <typename Setter>
TableBuilder deviceVariants(size_t count, Setter set) {
    TableBuilder table;
    for (size_t i = 0; i < count; ++i) {
        Device d;
        d.handle = static_cast<uint16_t>(0x1100 + i);
        set(d, i);
        table.add(device(d));
    }
    return table;
}

}  // namespace

TEST(MemoryNodes, ArraysAndInstalledDevicesFieldByField) {
    smbiostest::LogCapture log;
    TableBuilder table;
    Array first;
    first.handle = 0x1000;
    first.errorHandle = 0x1234;
    Array second;
    second.handle = 0x1001;
    second.location = 0x0A;
    second.use = 4;
    second.errorCorrection = 3;
    second.maximumCapacity = 0x00400000;
    table.add(array(first)).add(array(second));
    Device a1;
    a1.handle = 0x1100;
    a1.typeDetail = 0x1080;
    Device empty;
    empty.handle = 0x1101;
    empty.size = 0;
    empty.deviceLocator = "DIMM_A2";
    Device b1;
    b1.handle = 0x1102;
    b1.arrayHandle = 0x1001;
    b1.totalWidth = 64;
    b1.dataWidth = 64;
    b1.size = 0x8200;
    b1.formFactor = 0x0D;
    b1.deviceLocator = "DIMM_B1";
    b1.bankLocator = "BANK 1";
    b1.memoryType = 0x13;
    b1.typeDetail = 0x0080;
    b1.speed = 800;
    b1.manufacturer = "Other Memory";
    b1.serial = "FFEE";
    b1.partNumber = "SO-512";
    table.add(device(a1)).add(device(empty)).add(device(b1));
    DimmRun run(table);

    // Planar, two arrays, two devices (the empty socket makes none).
    ASSERT_EQ(5u, run.mi.nodeList.size());
    EXPECT_EQ(7u, run.mi.nextNodeId);
    ASSERT_EQ(2u, run.arrays.size());
    std::vector<unsigned int> const arrayIds[] = {{37, 300, 301, 302, 303},
                                                  {37, 300, 301, 302, 303}};
    for (unsigned int i = 0; i < 2; ++i) {
        SCOPED_TRACE("array " + std::to_string(i));
        IC::Node const* node = run.arrays[i];
        EXPECT_EQ(run.mi.nodeList[1 + i], node);
        EXPECT_TRUE(hasNodeType(node, 32));
        EXPECT_EQ(3u + i, node->getNodeId());
        EXPECT_EQ(2u, node->getLinkedId());
        EXPECT_EQ(i, node->getIndex());
        EXPECT_EQ(1u, node->getStatus());
        EXPECT_EQ("Memory Array", node->getDescription());
        EXPECT_EQ(run.mi.miIdList, node->getMIIds());
        EXPECT_EQ(arrayIds[i], propertyIds(node));
    }
    EXPECT_TRUE(hasEnum(run.arrays[0], 302, 1, 3));
    EXPECT_TRUE(hasEnum(run.arrays[0], 303, 1, 3));
    EXPECT_TRUE(hasEnum(run.arrays[0], 300, 1, 6));
    EXPECT_TRUE(hasUnsigned(run.arrays[0], 37, 0x02000000));
    EXPECT_TRUE(hasUnsigned(run.arrays[0], 301, 0x1234));
    EXPECT_TRUE(hasEnum(run.arrays[1], 302, 1, 0x0A));
    EXPECT_TRUE(hasEnum(run.arrays[1], 303, 1, 4));
    EXPECT_TRUE(hasEnum(run.arrays[1], 300, 1, 3));
    EXPECT_TRUE(hasUnsigned(run.arrays[1], 37, 0x00400000));
    EXPECT_TRUE(hasUnsigned(run.arrays[1], 301, 0xFFFE));

    ASSERT_EQ(2u, run.devices.size());
    std::vector<unsigned int> const deviceIds = {15, 36, 45, 50,  57,  61,  68,
                                                 69, 73, 85, 112, 125, 135, 295};
    for (unsigned int i = 0; i < 2; ++i) {
        SCOPED_TRACE("device " + std::to_string(i));
        IC::Node const* node = run.devices[i];
        EXPECT_EQ(run.mi.nodeList[3 + i], node);
        EXPECT_TRUE(hasNodeType(node, 19));
        EXPECT_EQ(5u + i, node->getNodeId());
        // Devices hang under the planar, not under their array.
        EXPECT_EQ(2u, node->getLinkedId());
        EXPECT_EQ(i, node->getIndex());
        EXPECT_EQ(1u, node->getStatus());
        EXPECT_EQ(run.mi.miIdList, node->getMIIds());
        EXPECT_EQ(deviceIds, propertyIds(node));
        EXPECT_TRUE(hasUnsignedList(node, 125, {1, 14}));
        EXPECT_TRUE(hasUnsigned(node, 69, 1024));
    }
    IC::Node const* d0 = run.devices[0];
    EXPECT_EQ("DIMM_A1:BANK 0", d0->getDescription());
    EXPECT_TRUE(hasUnsigned(d0, 112, 8388608));
    EXPECT_TRUE(hasUnsigned(d0, 73, 8388608));
    EXPECT_TRUE(hasUnsigned(d0, 61, 72));
    EXPECT_TRUE(hasUnsigned(d0, 15, 64));
    EXPECT_TRUE(hasEnum(d0, 85, 1, 8));
    EXPECT_TRUE(hasString(d0, 68, "DIMM_A1:BANK 0"));
    EXPECT_TRUE(hasEnum(d0, 295, 1, 24));
    EXPECT_TRUE(hasBool(d0, 135, true));
    EXPECT_TRUE(hasUnsigned(d0, 57, 1600));
    EXPECT_TRUE(hasString(d0, 36, "Corvane Memory"));
    EXPECT_TRUE(hasString(d0, 50, "0001A2B3"));
    EXPECT_TRUE(hasString(d0, 45, "CM3-8G-1600"));
    IC::Node const* d1 = run.devices[1];
    EXPECT_EQ("DIMM_B1:BANK 1", d1->getDescription());
    EXPECT_TRUE(hasUnsigned(d1, 112, 512));
    EXPECT_TRUE(hasUnsigned(d1, 73, 512));
    EXPECT_TRUE(hasUnsigned(d1, 61, 64));
    EXPECT_TRUE(hasUnsigned(d1, 15, 64));
    EXPECT_TRUE(hasEnum(d1, 85, 1, 12));
    EXPECT_TRUE(hasString(d1, 68, "DIMM_B1:BANK 1"));
    EXPECT_TRUE(hasEnum(d1, 295, 1, 21));
    EXPECT_TRUE(hasBool(d1, 135, false));
    EXPECT_TRUE(hasUnsigned(d1, 57, 800));
    EXPECT_TRUE(hasString(d1, 36, "Other Memory"));
    EXPECT_TRUE(hasString(d1, 50, "FFEE"));
    EXPECT_TRUE(hasString(d1, 45, "SO-512"));

    EXPECT_EQ((std::vector<std::string>{
                  "makeDimmNodes entry", "Table 5 count =0", "Table 6 count =0",
                  "Table 16 count =2", "Table 16 length = 15", "Table 16 length = 15",
                  "Table 17 count =3", "Table 17 length = 27", "Table 17 length = 27",
                  "Table 17 length = 27", "makeDimmNodes exit"}),
              loggedBy(DIMM_LOGGER))
        << log.dump();
}

TEST(MemoryNodes, LegacyControllerAndModuleStructuresAreOnlyCounted) {
    smbiostest::LogCapture log;
    DimmRun run(tableOf({Structure(5, 0x0500).byte(3).byte(6).byte(1).byte(3),
                         Structure(5, 0x0501).byte(3).byte(6).byte(1).byte(3),
                         Structure(6, 0x0600).str("BANK_0").byte(0x01).byte(0).word(0x0001),
                         device(Device())}));

    EXPECT_EQ(2u, run.mi.nodeList.size());
    EXPECT_TRUE(run.arrays.empty());
    EXPECT_EQ(1u, run.devices.size());
    std::vector<std::string> const texts = loggedBy(DIMM_LOGGER);
    ASSERT_LE(4u, texts.size()) << log.dump();
    EXPECT_EQ("Table 5 count =2", texts[1]);
    EXPECT_EQ("Table 6 count =1", texts[2]);
    EXPECT_EQ("Table 16 count =0", texts[3]);
}

TEST(MemoryNodes, ArrayMaximumCapacitySetOnlyWhenLongerThanTenAndKnown) {
    TableBuilder table;
    std::vector<size_t> const lengths = {0x0A, 0x0B, 0x0F, 0x0F, 0x0F};
    std::vector<uint32_t> const capacities = {0x00100000, 0x00100000, 0x80000000, 0x7FFFFFFF,
                                              0x80000001};
    for (size_t i = 0; i < lengths.size(); ++i) {
        Array a;
        a.handle = static_cast<uint16_t>(0x1000 + i);
        a.length = lengths[i];
        a.maximumCapacity = capacities[i];
        table.add(array(a));
    }
    DimmRun run(table);

    ASSERT_EQ(lengths.size(), run.arrays.size());
    ASSERT_EQ(0x0A, run.built.parsed.getTables()[0].getLength());
    EXPECT_TRUE(lacksProperty(run.arrays[0], 37));
    EXPECT_TRUE(hasUnsigned(run.arrays[1], 37, 0x00100000));
    EXPECT_TRUE(lacksProperty(run.arrays[2], 37));
    EXPECT_TRUE(hasUnsigned(run.arrays[3], 37, 0x7FFFFFFF));
    EXPECT_TRUE(hasUnsigned(run.arrays[4], 37, 0x80000001));
    // The short structures still get the enumerated values.
    EXPECT_EQ((std::vector<unsigned int>{300, 302, 303}), propertyIds(run.arrays[0]));
    EXPECT_EQ((std::vector<unsigned int>{37, 300, 302, 303}), propertyIds(run.arrays[1]));
}

TEST(MemoryNodes, ArrayErrorHandleIsTakenFromOffset0B) {
    smbiostest::LogCapture log;
    Array a;
    a.errorHandle = 0x0123;
    a.deviceCount = 4;
    TableBuilder table;
    table.add(array(a));
    Array shortArray;
    shortArray.handle = 0x1001;
    shortArray.length = 0x0C;
    table.add(array(shortArray));
    DimmRun run(table);

    ASSERT_EQ(2u, run.arrays.size());
    EXPECT_TRUE(hasUnsigned(run.arrays[0], 301, 0x0123));
    // A structure ending inside the word gets none, and the writer logs it.
    EXPECT_TRUE(lacksProperty(run.arrays[1], 301));
    EXPECT_NE("", frametest::firstLogged("propNumber16 offset=11 length=12")) << log.dump();
}

TEST(MemoryNodes, SizeOf1024MegabytesIs1048576Kilobytes) {
    TableBuilder table = deviceVariants(1, [](Device& d, size_t) { d.size = 0x0400; });
    DimmRun run(table);

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(hasUnsigned(run.devices[0], 112, 1048576));
    EXPECT_TRUE(hasUnsigned(run.devices[0], 73, 1048576));
}

TEST(MemoryNodes, SizeWithBit15SetCountsKilobytes) {
    TableBuilder table = deviceVariants(1, [](Device& d, size_t) { d.size = 0x8200; });
    DimmRun run(table);

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(hasUnsigned(run.devices[0], 112, 512));
    EXPECT_TRUE(hasUnsigned(run.devices[0], 73, 512));
}

TEST(MemoryNodes, SizeZeroOrUnknownMakesNoNode) {
    smbiostest::LogCapture log;
    // No size, unknown, and 0 KB.
    std::vector<uint16_t> const sizes = {0x0000, 0xFFFF, 0x8000};
    TableBuilder table =
        deviceVariants(sizes.size(), [&sizes](Device& d, size_t i) { d.size = sizes[i]; });
    DimmRun run(table);

    EXPECT_TRUE(run.devices.empty());
    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_EQ(3u, run.mi.nextNodeId);
    EXPECT_EQ(3u, frametest::loggedLevels("Table 17 length = 27").size()) << log.dump();
}

// The Extended Size field is never read: 0x7FFF megabytes is taken as it
// stands.
TEST(MemoryNodes, SizeRuleFromTheSizeWordAlone) {
    std::vector<uint16_t> const sizes = {0x7FFF, 0x0001, 0xFFFE, 0x8001};
    std::vector<unsigned int> const kilobytes = {32767u * 1024u, 1024, 0x7FFE, 1};
    TableBuilder table =
        deviceVariants(sizes.size(), [&sizes](Device& d, size_t i) { d.size = sizes[i]; });
    DimmRun run(table);

    ASSERT_EQ(sizes.size(), run.devices.size());
    for (size_t i = 0; i < sizes.size(); ++i) {
        SCOPED_TRACE("size word " + std::to_string(sizes[i]));
        EXPECT_TRUE(hasUnsigned(run.devices[i], 112, kilobytes[i]));
        EXPECT_TRUE(hasUnsigned(run.devices[i], 73, kilobytes[i]));
    }
}

TEST(MemoryNodes, TwoSocketsFirstEmptyGiveOneDeviceNodeWithIndexZero) {
    TableBuilder table = deviceVariants(2, [](Device& d, size_t i) {
        d.size = i == 0 ? 0 : 0x1000;
        d.deviceLocator = i == 0 ? "DIMM_A1" : "DIMM_A2";
    });
    DimmRun run(table);

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_EQ(0u, run.devices[0]->getIndex());
    EXPECT_EQ(3u, run.devices[0]->getNodeId());
    EXPECT_TRUE(hasString(run.devices[0], 68, "DIMM_A2:BANK 0"));
}

TEST(MemoryNodes, EmptySocketsDoNotUseUpDeviceIndexes) {
    std::vector<uint16_t> const sizes = {0x1000, 0, 0xFFFF, 0x1000, 0, 0x0800};
    TableBuilder table = deviceVariants(sizes.size(), [&sizes](Device& d, size_t i) {
        d.size = sizes[i];
        d.deviceLocator = "DIMM" + std::to_string(i);
        d.bankLocator = "";
    });
    DimmRun run(table);

    ASSERT_EQ(3u, run.devices.size());
    std::vector<std::string> const locators = {"DIMM0", "DIMM3", "DIMM5"};
    for (unsigned int i = 0; i < 3; ++i) {
        SCOPED_TRACE(locators[i]);
        EXPECT_EQ(i, run.devices[i]->getIndex());
        EXPECT_EQ(3u + i, run.devices[i]->getNodeId());
        EXPECT_EQ(locators[i], run.devices[i]->getDescription());
    }
}

TEST(MemoryNodes, BothLocatorsJoinedByAColonWithNoBlank) {
    TableBuilder table = deviceVariants(1, [](Device& d, size_t) {
        d.deviceLocator = "ChannelA-DIMM0";
        d.bankLocator = "BANK 0";
    });
    DimmRun run(table);

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(hasString(run.devices[0], 68, "ChannelA-DIMM0:BANK 0"));
    EXPECT_EQ("ChannelA-DIMM0:BANK 0", run.devices[0]->getDescription());
}

TEST(MemoryNodes, OnlyBankLocatorGivesTheBankLocatorAloneWithNoColon) {
    TableBuilder table = deviceVariants(1, [](Device& d, size_t) {
        d.deviceLocator = "";
        d.bankLocator = "BANK 3";
    });
    DimmRun run(table);

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(hasString(run.devices[0], 68, "BANK 3"));
    EXPECT_EQ("BANK 3", run.devices[0]->getDescription());
}

TEST(MemoryNodes, OnlyDeviceLocatorGivesTheDeviceLocatorAlone) {
    TableBuilder table = deviceVariants(1, [](Device& d, size_t) {
        d.deviceLocator = "DIMM_C2";
        d.bankLocator = "";
    });
    DimmRun run(table);

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(hasString(run.devices[0], 68, "DIMM_C2"));
    EXPECT_EQ("DIMM_C2", run.devices[0]->getDescription());
}

TEST(MemoryNodes, NoLocatorSetsNeitherPropertyNorDescription) {
    TableBuilder table = deviceVariants(1, [](Device& d, size_t) {
        d.deviceLocator = "";
        d.bankLocator = "";
    });
    DimmRun run(table);

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(lacksProperty(run.devices[0], 68));
    EXPECT_EQ("", run.devices[0]->getDescription());
    EXPECT_TRUE(hasString(run.devices[0], 36, "Corvane Memory"));
}

// The locators are read only when the structure is longer than 0x11 bytes:
// at 0x11 the Device Locator is there but unused; at 0x12 both are read.
TEST(MemoryNodes, LocatorsReadOnlyWhenLongerThan0x11) {
    TableBuilder table = deviceVariants(2, [](Device& d, size_t i) {
        d.length = i == 0 ? 0x11 : 0x12;
        d.deviceLocator = "DIMM_D" + std::to_string(i);
    });
    DimmRun run(table);

    ASSERT_EQ(0x11, run.built.parsed.getTables()[0].getLength());
    ASSERT_EQ(0x12, run.built.parsed.getTables()[1].getLength());
    ASSERT_EQ(2u, run.devices.size());
    EXPECT_TRUE(lacksProperty(run.devices[0], 68));
    EXPECT_EQ("", run.devices[0]->getDescription());
    EXPECT_TRUE(hasString(run.devices[1], 68, "DIMM_D1:BANK 0"));
    EXPECT_EQ("DIMM_D1:BANK 0", run.devices[1]->getDescription());
}

TEST(MemoryNodes, StructureOfLength0DMakesNoNode) {
    smbiostest::LogCapture log;
    TableBuilder table = deviceVariants(1, [](Device& d, size_t) { d.length = 0x0D; });
    DimmRun run(table);

    ASSERT_EQ(0x0D, run.built.parsed.getTables()[0].getLength());
    EXPECT_TRUE(run.devices.empty());
    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_EQ(1u, frametest::loggedLevels("Table 17 length = 13").size()) << log.dump();
}

// Length 0x0E holds the Size word and nothing after it: the later fields
// read as 0 through the readers, the string fields set nothing.
TEST(MemoryNodes, StructureOfLength0EMakesANodeFromTheFieldsItHolds) {
    TableBuilder table = deviceVariants(1, [](Device& d, size_t) {
        d.length = 0x0E;
        d.size = 0x0200;
    });
    DimmRun run(table);

    ASSERT_EQ(1u, run.devices.size());
    IC::Node const* node = run.devices[0];
    EXPECT_EQ((std::vector<unsigned int>{15, 61, 69, 73, 85, 112, 125, 135, 295}),
              propertyIds(node));
    EXPECT_TRUE(hasUnsigned(node, 112, 524288));
    EXPECT_TRUE(hasUnsigned(node, 61, 72));
    EXPECT_TRUE(hasUnsigned(node, 15, 64));
    EXPECT_TRUE(hasEnum(node, 85, 1, 0));
    EXPECT_TRUE(hasEnum(node, 295, 1, 1));
    EXPECT_TRUE(hasBool(node, 135, false));
    EXPECT_EQ("", node->getDescription());
}

TEST(MemoryNodes, TypeDetailBit12GivesProperty135) {
    std::vector<uint16_t> const details = {0x1000, 0x0080, 0xEFFF, 0xFFFF, 0x0000};
    std::vector<bool> const registered = {true, false, false, true, false};
    TableBuilder table = deviceVariants(
        details.size(), [&details](Device& d, size_t i) { d.typeDetail = details[i]; });
    DimmRun run(table);

    ASSERT_EQ(details.size(), run.devices.size());
    for (size_t i = 0; i < details.size(); ++i) {
        SCOPED_TRACE("type detail " + std::to_string(details[i]));
        EXPECT_TRUE(hasBool(run.devices[i], 135, registered[i]));
    }
}

TEST(MemoryNodes, EveryFormFactorRow) {
    // 0x00 to 0x0F, then bytes beyond the table.
    std::vector<uint8_t> bytes;
    for (unsigned int b = 0; b <= 0x0F; ++b) {
        bytes.push_back(static_cast<uint8_t>(b));
    }
    bytes.push_back(0x10);
    bytes.push_back(0xFF);
    std::vector<long long> const values = {0, 1, 0, 7, 2, 1, 3, 4, 6, 8, 9, 1, 11, 12, 13, 1, 0, 0};
    TableBuilder table =
        deviceVariants(bytes.size(), [&bytes](Device& d, size_t i) { d.formFactor = bytes[i]; });
    DimmRun run(table);

    ASSERT_EQ(bytes.size(), run.devices.size());
    for (size_t i = 0; i < bytes.size(); ++i) {
        SCOPED_TRACE("form factor " + std::to_string(bytes[i]));
        EXPECT_TRUE(hasEnum(run.devices[i], 85, 1, values[i]));
    }
}

TEST(MemoryNodes, EveryMemoryTypeRow) {
    // 0x00 to 0x19, then bytes beyond the table.
    std::vector<uint8_t> bytes;
    for (unsigned int b = 0; b <= 0x19; ++b) {
        bytes.push_back(static_cast<uint8_t>(b));
    }
    bytes.push_back(0x1A);
    bytes.push_back(0x22);
    bytes.push_back(0xFF);
    std::vector<long long> const values = {1,  1,  0,  2,  6,  7,  8, 9, 10, 11, 12, 13, 2, 15, 1,
                                           17, 18, 19, 20, 21, 23, 1, 1, 1,  24, 25, 1,  1, 1};
    ASSERT_EQ(bytes.size(), values.size());
    TableBuilder table =
        deviceVariants(bytes.size(), [&bytes](Device& d, size_t i) { d.memoryType = bytes[i]; });
    DimmRun run(table);

    ASSERT_EQ(bytes.size(), run.devices.size());
    for (size_t i = 0; i < bytes.size(); ++i) {
        SCOPED_TRACE("memory type " + std::to_string(bytes[i]));
        EXPECT_TRUE(hasEnum(run.devices[i], 295, 1, values[i]));
    }
}

TEST(MemoryNodes, ArrayAndDeviceNodesBothHangDirectlyUnderTheParent) {
    TableBuilder table;
    Array a;
    a.handle = 0x1000;
    table.add(array(a));
    Device d;
    d.arrayHandle = 0x1000;
    table.add(device(d));
    DimmRun run(table);

    std::vector<IC::Node*> const children = childrenOf(run.mi, run.planar->getNodeId());
    ASSERT_EQ(2u, children.size());
    EXPECT_TRUE(hasNodeType(children[0], 32));
    EXPECT_TRUE(hasNodeType(children[1], 19));
    EXPECT_TRUE(childrenOf(run.mi, children[0]->getNodeId()).empty());
}

TEST(MemoryNodes, EmptyStringFieldsAreSetAsEmptyText) {
    TableBuilder table = deviceVariants(1, [](Device& d, size_t) {
        d.manufacturer = "";
        d.serial = "";
        d.partNumber = "";
    });
    DimmRun run(table);

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(hasString(run.devices[0], 36, ""));
    EXPECT_TRUE(hasString(run.devices[0], 50, ""));
    EXPECT_TRUE(hasString(run.devices[0], 45, ""));
}

// A structure ending one byte into the Type Detail word: the bit read passes
// the reader's offset check but the word read throws. The device keeps the
// properties set before, and the next device is still made.
TEST(MemoryNodes, DeviceEndingInsideTypeDetailKeepsPropertiesSetSoFar) {
    smbiostest::LogCapture log;
    TableBuilder table = deviceVariants(2, [](Device& d, size_t i) {
        d.length = i == 0 ? 0x14 : 0x1B;
        d.deviceLocator = "DIMM" + std::to_string(i);
    });
    DimmRun run(table);

    ASSERT_EQ(2u, run.devices.size());
    EXPECT_EQ((std::vector<unsigned int>{15, 61, 68, 69, 73, 85, 112, 125, 295}),
              propertyIds(run.devices[0]));
    EXPECT_TRUE(hasEnum(run.devices[0], 295, 1, 24));
    EXPECT_TRUE(hasBool(run.devices[1], 135, false));
    EXPECT_EQ(1u, run.devices[1]->getIndex());
    std::string const failure = frametest::firstLogged("Exception=");
    EXPECT_NE(std::string::npos, failure.find("Table 17 index =0")) << log.dump();
    EXPECT_EQ(std::vector<int>{6000}, frametest::loggedLevels("Exception="));
}
