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
    uint8_t location = 3, use = 3, errorCorrection = 6;
    uint32_t maximumCapacity = 0x02000000;
    uint16_t errorHandle = 0xFFFE, deviceCount = 4;
    size_t length = 0x0F;
};

Structure array(Array const& a) {
    Structure full(16, a.handle);
    full.byte(a.location).byte(a.use).byte(a.errorCorrection);
    full.dword(a.maximumCapacity).word(a.errorHandle).word(a.deviceCount);
    return cutTo(full, a.length, {});
}

// The fields of one Memory Device structure (SMBIOS 2.3 layout, 0x1B
// bytes): an 8 GB DDR3 DIMM.
struct Device {
    uint16_t handle = 0x1100, arrayHandle = 0x1000, errorHandle = 0xFFFE;
    uint16_t totalWidth = 72, dataWidth = 64, size = 0x2000;
    uint8_t formFactor = 0x09, deviceSet = 0;
    std::string deviceLocator = "DIMM_A1", bankLocator = "BANK 0";
    uint8_t memoryType = 0x18;
    uint16_t typeDetail = 0x0080, speed = 1600;
    std::string manufacturer = "Corvane Memory", serial = "0001A2B3";
    std::string assetTag = "AT-M1", partNumber = "CM3-8G-1600";
    size_t length = 0x1B;
};

Structure device(Device const& d) {
    Structure full(17, d.handle);
    full.word(d.arrayHandle).word(d.errorHandle).word(d.totalWidth).word(d.dataWidth);
    full.word(d.size).byte(d.formFactor).byte(d.deviceSet);
    full.str(d.deviceLocator).str(d.bankLocator).byte(d.memoryType);
    full.word(d.typeDetail).word(d.speed);
    full.str(d.manufacturer).str(d.serial).str(d.assetTag).str(d.partNumber);
    return cutTo(
        full, d.length,
        {d.deviceLocator, d.bankLocator, d.manufacturer, d.serial, d.assetTag, d.partNumber});
}

// The builder run over a table under a planar node (id 2).
struct DimmRun : PlanarSetup {
    explicit DimmRun(TableBuilder const& table) : PlanarSetup(table) {
        mi.makeDimmNodes(lists.get(), planar->getNodeId());
        arrays = nodesOfType(mi, 32);
        devices = nodesOfType(mi, 19);
    }
    std::vector<IC::Node*> arrays, devices;
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

// What a device node shows of its structure's fields.
struct DeviceFields {
    unsigned int kilobytes;                        // 112 and 73
    unsigned int totalWidth, dataWidth;            // 61, 15
    long long formFactor;                          // 85
    std::string locator;                           // 68
    long long memoryType;                          // 295
    bool registered;                               // 135
    unsigned int speed;                            // 57
    std::string manufacturer, serial, partNumber;  // 36, 50, 45
};

void expectDeviceFields(IC::Node const* node, DeviceFields const& f) {
    expectProperties(node, {unsignedProp(112, f.kilobytes), unsignedProp(73, f.kilobytes),
                            unsignedProp(61, f.totalWidth), unsignedProp(15, f.dataWidth),
                            enumProp(85, 1, f.formFactor), stringProp(68, f.locator),
                            enumProp(295, 1, f.memoryType), boolProp(135, f.registered),
                            unsignedProp(57, f.speed), stringProp(36, f.manufacturer),
                            stringProp(50, f.serial), stringProp(45, f.partNumber)});
}

// One device with these two locators must give one node whose property 68
// and description both read `joined`.
void expectLocatorText(std::string const& deviceLocator, std::string const& bankLocator,
                       std::string const& joined) {
    DimmRun run(deviceVariants(1, [&](Device& d, size_t) {
        d.deviceLocator = deviceLocator;
        d.bankLocator = bankLocator;
    }));
    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(hasString(run.devices[0], 68, joined));
    EXPECT_EQ(joined, run.devices[0]->getDescription());
}

// One device whose Size word is `word` gives a node of `kilobytes` in both
// size properties.
void expectSizeKilobytes(uint16_t word, unsigned int kilobytes) {
    DimmRun run(deviceVariants(1, [word](Device& d, size_t) { d.size = word; }));
    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(hasUnsigned(run.devices[0], 112, kilobytes));
    EXPECT_TRUE(hasUnsigned(run.devices[0], 73, kilobytes));
}

// Every byte of `bytes` (from 0 to `last`, then those in `beyond`) in the
// device field `field`, one device each, gives the enumerated value at the
// same place of `values` in the 1-byte property `id`.
void expectEnumRows(uint8_t Device::*field, unsigned int last, std::vector<uint8_t> const& beyond,
                    unsigned int id, std::vector<long long> const& values,
                    std::string const& what) {
    std::vector<uint8_t> bytes;
    for (unsigned int b = 0; b <= last; ++b) {
        bytes.push_back(static_cast<uint8_t>(b));
    }
    bytes.insert(bytes.end(), beyond.begin(), beyond.end());
    DimmRun run(deviceVariants(bytes.size(), [&](Device& d, size_t i) { d.*field = bytes[i]; }));
    expectEnumPerNode(run.devices, bytes, what, id, values);
}

}  // namespace

TEST(MemoryNodes, ArraysAndInstalledDevicesFieldByField) {
    smbiostest::LogCapture log;
    Array first;  // handle 0x1000
    first.errorHandle = 0x1234;
    // Handle, location, use, error correction, maximum capacity.
    Array const second{0x1001, 0x0A, 4, 3, 0x00400000};
    Device a1;  // handle 0x1100
    a1.typeDetail = 0x1080;
    Device empty;
    empty.handle = 0x1101;
    empty.size = 0;
    empty.deviceLocator = "DIMM_A2";
    Device b1;
    b1.handle = 0x1102;
    b1.arrayHandle = 0x1001;
    b1.deviceLocator = "DIMM_B1";
    b1.totalWidth = b1.dataWidth = 64;
    b1.size = 0x8200;
    b1.bankLocator = "BANK 1";
    b1.formFactor = 0x0D;
    b1.memoryType = 0x13;
    b1.manufacturer = "Other Memory";
    b1.typeDetail = 0x0080;
    b1.speed = 800;
    b1.serial = "FFEE";
    b1.partNumber = "SO-512";
    DimmRun run(tableOf({array(first), array(second), device(a1), device(empty), device(b1)}));

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
        EXPECT_TRUE(isNode(node, 3u + i, 2, 32, i, 1, "Memory Array"));
        EXPECT_EQ(run.mi.miIdList, node->getMIIds());
        EXPECT_EQ(arrayIds[i], propertyIds(node));
    }
    expectProperties(run.arrays[0], {enumProp(302, 1, 3), enumProp(303, 1, 3), enumProp(300, 1, 6),
                                     unsignedProp(37, 0x02000000), unsignedProp(301, 0x1234)});
    expectProperties(run.arrays[1],
                     {enumProp(302, 1, 0x0A), enumProp(303, 1, 4), enumProp(300, 1, 3),
                      unsignedProp(37, 0x00400000), unsignedProp(301, 0xFFFE)});

    ASSERT_EQ(2u, run.devices.size());
    std::vector<unsigned int> const deviceIds = {15, 36, 45, 50,  57,  61,  68,
                                                 69, 73, 85, 112, 125, 135, 295};
    std::string const descriptions[] = {"DIMM_A1:BANK 0", "DIMM_B1:BANK 1"};
    for (unsigned int i = 0; i < 2; ++i) {
        SCOPED_TRACE("device " + std::to_string(i));
        IC::Node const* node = run.devices[i];
        EXPECT_EQ(run.mi.nodeList[3 + i], node);
        // Devices hang under the planar (2), not under their array.
        EXPECT_TRUE(isNode(node, 5u + i, 2, 19, i, 1, descriptions[i]));
        EXPECT_EQ(run.mi.miIdList, node->getMIIds());
        EXPECT_EQ(deviceIds, propertyIds(node));
        EXPECT_TRUE(hasUnsignedList(node, 125, {1, 14}));
        EXPECT_TRUE(hasUnsigned(node, 69, 1024));
    }
    expectDeviceFields(run.devices[0], {8388608, 72, 64, 8, "DIMM_A1:BANK 0", 24, true, 1600,
                                        "Corvane Memory", "0001A2B3", "CM3-8G-1600"});
    expectDeviceFields(run.devices[1], {512, 64, 64, 12, "DIMM_B1:BANK 1", 21, false, 800,
                                        "Other Memory", "FFEE", "SO-512"});

    EXPECT_TRUE(loggedExactly(DIMM_LOGGER,
                              {"makeDimmNodes entry", "Table 5 count =0", "Table 6 count =0",
                               "Table 16 count =2", "Table 16 length = 15", "Table 16 length = 15",
                               "Table 17 count =3", "Table 17 length = 27", "Table 17 length = 27",
                               "Table 17 length = 27", "makeDimmNodes exit"}));
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
    ASSERT_EQ(0x0A, run.parsed.getTables()[0].getLength());
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
    Array shortArray;
    shortArray.handle = 0x1001;
    shortArray.length = 0x0C;
    DimmRun run(tableOf({array(a), array(shortArray)}));

    ASSERT_EQ(2u, run.arrays.size());
    EXPECT_TRUE(hasUnsigned(run.arrays[0], 301, 0x0123));
    // A structure ending inside the word gets none, and the writer logs it.
    EXPECT_TRUE(lacksProperty(run.arrays[1], 301));
    EXPECT_NE("", frametest::firstLogged("propNumber16 offset=11 length=12")) << log.dump();
}

TEST(MemoryNodes, SizeOf1024MegabytesIs1048576Kilobytes) { expectSizeKilobytes(0x0400, 1048576); }

TEST(MemoryNodes, SizeWithBit15SetCountsKilobytes) { expectSizeKilobytes(0x8200, 512); }

TEST(MemoryNodes, SizeZeroOrUnknownMakesNoNode) {
    smbiostest::LogCapture log;
    // No size, unknown, and 0 KB.
    std::vector<uint16_t> const sizes = {0x0000, 0xFFFF, 0x8000};
    DimmRun run(deviceVariants(sizes.size(), [&sizes](Device& d, size_t i) { d.size = sizes[i]; }));

    EXPECT_TRUE(run.devices.empty());
    EXPECT_TRUE(holdsNodes(run.mi, 1, 3));
    EXPECT_EQ(3u, frametest::loggedLevels("Table 17 length = 27").size()) << log.dump();
}

// The Extended Size field is never read: 0x7FFF megabytes is taken as it
// stands.
TEST(MemoryNodes, SizeRuleFromTheSizeWordAlone) {
    std::vector<uint16_t> const sizes = {0x7FFF, 0x0001, 0xFFFE, 0x8001};
    std::vector<unsigned int> const kilobytes = {32767u * 1024u, 1024, 0x7FFE, 1};
    DimmRun run(deviceVariants(sizes.size(), [&sizes](Device& d, size_t i) { d.size = sizes[i]; }));

    expectUnsignedPerNode(run.devices, sizes, "size word", 112, kilobytes);
    expectUnsignedPerNode(run.devices, sizes, "size word", 73, kilobytes);
}

TEST(MemoryNodes, TwoSocketsFirstEmptyGiveOneDeviceNodeWithIndexZero) {
    DimmRun run(deviceVariants(2, [](Device& d, size_t i) {
        d.size = i == 0 ? 0 : 0x1000;
        d.deviceLocator = i == 0 ? "DIMM_A1" : "DIMM_A2";
    }));

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(hasIdAndIndex(run.devices[0], 3, 0));
    EXPECT_TRUE(hasString(run.devices[0], 68, "DIMM_A2:BANK 0"));
}

TEST(MemoryNodes, EmptySocketsDoNotUseUpDeviceIndexes) {
    std::vector<uint16_t> const sizes = {0x1000, 0, 0xFFFF, 0x1000, 0, 0x0800};
    DimmRun run(deviceVariants(sizes.size(), [&sizes](Device& d, size_t i) {
        d.size = sizes[i];
        d.deviceLocator = "DIMM" + std::to_string(i);
        d.bankLocator = "";
    }));

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
    expectLocatorText("ChannelA-DIMM0", "BANK 0", "ChannelA-DIMM0:BANK 0");
}

TEST(MemoryNodes, OnlyBankLocatorGivesTheBankLocatorAloneWithNoColon) {
    expectLocatorText("", "BANK 3", "BANK 3");
}

TEST(MemoryNodes, OnlyDeviceLocatorGivesTheDeviceLocatorAlone) {
    expectLocatorText("DIMM_C2", "", "DIMM_C2");
}

TEST(MemoryNodes, NoLocatorSetsNeitherPropertyNorDescription) {
    DimmRun run(deviceVariants(1, [](Device& d, size_t) {
        d.deviceLocator = "";
        d.bankLocator = "";
    }));

    ASSERT_EQ(1u, run.devices.size());
    EXPECT_TRUE(lacksProperty(run.devices[0], 68));
    EXPECT_EQ("", run.devices[0]->getDescription());
    EXPECT_TRUE(hasString(run.devices[0], 36, "Corvane Memory"));
}

// The locators are read only when the structure is longer than 0x11 bytes:
// at 0x11 the Device Locator is there but unused; at 0x12 both are read.
TEST(MemoryNodes, LocatorsReadOnlyWhenLongerThan0x11) {
    DimmRun run(deviceVariants(2, [](Device& d, size_t i) {
        d.length = i == 0 ? 0x11 : 0x12;
        d.deviceLocator = "DIMM_D" + std::to_string(i);
    }));

    ASSERT_EQ(0x11, run.parsed.getTables()[0].getLength());
    ASSERT_EQ(0x12, run.parsed.getTables()[1].getLength());
    ASSERT_EQ(2u, run.devices.size());
    EXPECT_TRUE(lacksProperty(run.devices[0], 68));
    EXPECT_EQ("", run.devices[0]->getDescription());
    EXPECT_TRUE(hasString(run.devices[1], 68, "DIMM_D1:BANK 0"));
    EXPECT_EQ("DIMM_D1:BANK 0", run.devices[1]->getDescription());
}

TEST(MemoryNodes, StructureOfLength0DMakesNoNode) {
    smbiostest::LogCapture log;
    DimmRun run(deviceVariants(1, [](Device& d, size_t) { d.length = 0x0D; }));

    ASSERT_EQ(0x0D, run.parsed.getTables()[0].getLength());
    EXPECT_TRUE(run.devices.empty());
    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_EQ(1u, frametest::loggedLevels("Table 17 length = 13").size()) << log.dump();
}

// Length 0x0E holds the Size word and nothing after it: the later fields
// read as 0 through the readers, the string fields set nothing.
TEST(MemoryNodes, StructureOfLength0EMakesANodeFromTheFieldsItHolds) {
    DimmRun run(deviceVariants(1, [](Device& d, size_t) {
        d.length = 0x0E;
        d.size = 0x0200;
    }));

    ASSERT_EQ(1u, run.devices.size());
    IC::Node const* node = run.devices[0];
    EXPECT_EQ((std::vector<unsigned int>{15, 61, 69, 73, 85, 112, 125, 135, 295}),
              propertyIds(node));
    expectProperties(node, {unsignedProp(112, 524288), unsignedProp(61, 72), unsignedProp(15, 64),
                            enumProp(85, 1, 0), enumProp(295, 1, 1), boolProp(135, false)});
    EXPECT_EQ("", node->getDescription());
}

TEST(MemoryNodes, TypeDetailBit12GivesProperty135) {
    std::vector<uint16_t> const details = {0x1000, 0x0080, 0xEFFF, 0xFFFF, 0x0000};
    std::vector<bool> const registered = {true, false, false, true, false};
    DimmRun run(deviceVariants(details.size(),
                               [&details](Device& d, size_t i) { d.typeDetail = details[i]; }));

    ASSERT_EQ(details.size(), run.devices.size());
    for (size_t i = 0; i < details.size(); ++i) {
        SCOPED_TRACE("type detail " + std::to_string(details[i]));
        EXPECT_TRUE(hasBool(run.devices[i], 135, registered[i]));
    }
}

TEST(MemoryNodes, EveryFormFactorRow) {
    // 0x00 to 0x0F, then bytes beyond the table.
    expectEnumRows(&Device::formFactor, 0x0F, {0x10, 0xFF}, 85,
                   {0, 1, 0, 7, 2, 1, 3, 4, 6, 8, 9, 1, 11, 12, 13, 1, 0, 0}, "form factor");
}

TEST(MemoryNodes, EveryMemoryTypeRow) {
    // 0x00 to 0x19, then bytes beyond the table.
    expectEnumRows(&Device::memoryType, 0x19, {0x1A, 0x22, 0xFF}, 295,
                   {1,  1,  0,  2,  6,  7,  8, 9, 10, 11, 12, 13, 2, 15, 1,
                    17, 18, 19, 20, 21, 23, 1, 1, 1,  24, 25, 1,  1, 1},
                   "memory type");
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
    DimmRun run(deviceVariants(1, [](Device& d, size_t) {
        d.manufacturer = "";
        d.serial = "";
        d.partNumber = "";
    }));

    ASSERT_EQ(1u, run.devices.size());
    expectProperties(run.devices[0], {stringProp(36, ""), stringProp(50, ""), stringProp(45, "")});
}

// A structure ending one byte into the Type Detail word: the bit read passes
// the reader's offset check but the word read throws. The device keeps the
// properties set before, and the next device is still made.
TEST(MemoryNodes, DeviceEndingInsideTypeDetailKeepsPropertiesSetSoFar) {
    smbiostest::LogCapture log;
    DimmRun run(deviceVariants(2, [](Device& d, size_t i) {
        d.length = i == 0 ? 0x14 : 0x1B;
        d.deviceLocator = "DIMM" + std::to_string(i);
    }));

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
