// The chassis builder: one chassis node per System Enclosure structure
// (type 3) under the computer system, the chassis-type table, the fallbacks
// to the System Information texts, and the choice of the chassis that the
// planar hangs under.
#include <gtest/gtest.h>

#include <cstdint>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "BuilderFixture.h"

using namespace buildertest;

namespace {

std::string const NO_SYSTEM = "Bios system information table does not exist";

uint8_t const DESKTOP = 0x03;
uint8_t const TOWER = 0x07;
uint8_t const MAIN_SERVER = 0x11;
uint8_t const EXPANSION = 0x12;
uint8_t const RACK_MOUNT = 0x17;
uint8_t const BLADE = 0x1C;
uint8_t const BLADE_ENCLOSURE = 0x1D;

uint8_t const SERVER_BLADE_ELEMENT = 0x03;
uint8_t const DAUGHTER_BOARD_ELEMENT = 0x09;
uint8_t const MOTHERBOARD_ELEMENT = 0x0A;

// A System Information structure (type 1).
Structure systemInformation(uint16_t handle, std::string const& product = "RS-7400 [7947AC1]",
                            std::string const& serial = "SYS-0001") {
    return Structure(1, handle)
        .str("Corvane")
        .str(product)
        .str("V1.2")
        .str(serial)
        .bytes(std::vector<uint8_t>(16, 0x11))
        .byte(0x06)
        .str("SKU-77")
        .str("Server");
}

// The fields of a System Enclosure structure (SMBIOS 2.3 layout).
struct ChassisFields {
    std::string manufacturer = "Chassis Maker";
    uint8_t type = DESKTOP;
    std::string version = "CV-1";
    std::string serial = "CH-0001";
    std::string assetTag = "AT-9";
    uint8_t bootUpState = 3, powerSupplyState = 4, thermalState = 5, securityStatus = 2;
    uint32_t oemDefined = 0x04030201;
    uint8_t height = 2, powerCords = 1;
    // The first byte of each contained element record; each record is
    // recordLength bytes long (the rest: minimum and maximum counts).
    std::vector<uint8_t> elements;
    uint8_t recordLength = 3;
};

ChassisFields ofType(uint8_t type, std::vector<uint8_t> const& elements = {}) {
    ChassisFields fields;
    fields.type = type;
    fields.elements = elements;
    return fields;
}

Structure chassis(uint16_t handle, ChassisFields const& fields) {
    Structure structure(3, handle);
    structure.str(fields.manufacturer).byte(fields.type);
    structure.str(fields.version).str(fields.serial).str(fields.assetTag);
    structure.byte(fields.bootUpState).byte(fields.powerSupplyState).byte(fields.thermalState);
    structure.byte(fields.securityStatus).dword(fields.oemDefined);
    structure.byte(fields.height).byte(fields.powerCords);
    structure.byte(static_cast<uint8_t>(fields.elements.size()))
        .byte(fields.elements.empty() ? 0 : fields.recordLength);
    for (uint8_t element : fields.elements) {
        structure.byte(element);
        for (unsigned int i = 1; i < fields.recordLength; ++i) {
            structure.byte(1);
        }
    }
    return structure;
}

// A table of a System Information structure (handle 0x0100) and one System
// Enclosure structure per fields, in order, with handles from 0x0300 on.
TableBuilder systemAndChassis(std::vector<ChassisFields> const& enclosures) {
    TableBuilder table;
    table.add(systemInformation(0x0100));
    uint16_t handle = 0x0300;
    for (ChassisFields const& fields : enclosures) {
        table.add(chassis(handle++, fields));
    }
    return table;
}

// A baseboard (type 2) with a product and a location.
Structure baseboard(uint16_t handle) {
    return Structure(2, handle)
        .str("Board Maker")
        .str("MB-100")
        .str("")
        .str("BRD-1")
        .str("")
        .byte(0x01)
        .str("Slot A")
        .word(0x0300)
        .byte(0x0A)
        .byte(0);
}

// The builder run over a table under a computer-system parent (node id 2);
// the planar builder and everything below it run as well.
struct ChassisRun {
    explicit ChassisRun(TableBuilder const& table)
        : parsed(frametest::parse(table)), lists(parsed) {
        computer = buildertest::addParent(mi, 40);
        mi.makeChassisNodes(lists.get(), computer->getNodeId());
    }

    std::vector<IC::Node*> chassisNodes() const { return nodesOfType(mi, 1); }
    // The id the planar hangs under, or 0 when there is no planar.
    unsigned int planarParent() const {
        std::vector<IC::Node*> const planars = nodesOfType(mi, 41);
        return planars.size() == 1 ? planars[0]->getLinkedId() : 0;
    }

    SD::SmBios parsed;
    StructureLists lists;
    TestMI mi;
    IC::MutableNode* computer = nullptr;
};

// The numbers logged after "Contained Elements=", in order.
std::vector<unsigned int> loggedElements() {
    std::string const line = frametest::firstLogged("Contained Elements=");
    std::vector<unsigned int> numbers;
    if (line.empty()) {
        return numbers;
    }
    std::istringstream in(line.substr(line.find('=') + 1));
    unsigned int number = 0;
    while (in >> number) {
        numbers.push_back(number);
    }
    return numbers;
}

// What the chassis-type table gives for a chassis type.
struct Expected {
    std::string name;
    unsigned int packageType;
    unsigned int enclosure;
    bool mainChassis;
};

Expected expectedFor(unsigned int type) {
    static std::map<unsigned int, Expected> const named = {
        {0x07, {"Tower Chassis", 0x07, 3, true}},
        {0x11, {"Main Server Chassis", 0x11, 3, true}},
        {0x17, {"Rack Mount Chassis", 0x11, 3, true}},
        {0x19, {"Multi System Chassis", 0x01, 3, true}},
        {0x1C, {"Blade Chassis", 0x11, 16, true}},
        {0x1D, {"Blade Enclosure Chassis", 0x1C, 17, false}},
    };
    auto const found = named.find(type);
    if (found != named.end()) {
        return found->second;
    }
    if (type <= 0x02 || type > 0x1D) {
        return {"Chassis", 0, 3, false};
    }
    return {"Chassis", type, 3, false};
}

// A text field of a tower's structure, set to the first text of each case
// in a table with the default System Information structure, gives the
// second text in property `id` (the system's text filling in where the
// chassis has none).
void expectFallback(std::string ChassisFields::*field, unsigned int id, std::string const& what,
                    std::vector<std::pair<std::string, std::string>> const& cases) {
    for (std::pair<std::string, std::string> const& c : cases) {
        SCOPED_TRACE(what + " \"" + c.first + "\"");
        ChassisFields fields = ofType(TOWER);
        fields.*field = c.first;
        ChassisRun run(systemAndChassis({fields}));
        std::vector<IC::Node*> const nodes = run.chassisNodes();
        ASSERT_EQ(1u, nodes.size());
        EXPECT_TRUE(hasString(nodes[0], id, c.second));
    }
}

// A desktop chassis, then one of `type`: the second's node passes
// `checks`, and the planar hangs under the second when it is a main chassis
// (`main`), else under the first.
void expectSecondChassis(uint8_t type, std::vector<PropertyCheck> const& checks, bool main) {
    ChassisRun run(systemAndChassis({ofType(DESKTOP), ofType(type)}));
    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(2u, nodes.size());
    expectProperties(nodes[1], checks);
    EXPECT_EQ(nodes[main ? 1 : 0]->getNodeId(), run.planarParent());
}

// A table of the default System Information structure and the enclosures
// makes `count` chassis nodes, and the planar hangs under the one at
// `home`.
void expectPlanarHome(std::vector<ChassisFields> const& enclosures, size_t count, size_t home) {
    ChassisRun run(systemAndChassis(enclosures));
    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(count, nodes.size());
    EXPECT_EQ(nodes[home]->getNodeId(), run.planarParent());
}

}  // namespace

// ---------------------------------------------------------------------------
// The node and its properties

TEST(ChassisBuilder, FullStructureGivesOneChassisNodeWithEveryProperty) {
    smbiostest::LogCapture log;
    ChassisFields fields = ofType(0x80 | RACK_MOUNT);
    ChassisRun run(endedTableOf({systemInformation(0x0100), chassis(0x0300, fields)}));

    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(1u, nodes.size()) << log.dump();
    IC::Node const* node = nodes[0];
    EXPECT_TRUE(isNode(node, 3u, run.computer->getNodeId(), 1, 0u, 1u, "Chassis"));
    EXPECT_EQ(run.mi.miIdList, node->getMIIds());
    EXPECT_EQ(node, run.lists.storage[3][0].node);

    EXPECT_EQ((std::vector<unsigned int>{2, 4, 10, 11, 21, 36, 39, 42, 43, 45, 46, 49, 50, 60, 108,
                                         213, 307}),
              propertyIds(node));
    EXPECT_TRUE(hasString(node, 36, "Chassis Maker"));
    EXPECT_TRUE(hasString(node, 45, "7947"));
    EXPECT_TRUE(buildertest::hasBool(node, 10, true));
    expectProperties(
        node, {stringProp(108, "Rack Mount Chassis"), stringProp(39, "RS-7400 [7947AC1]"),
               enumProp(11, 4, 17), enumProp(213, 4, 3), stringProp(307, "CV-1"),
               stringProp(50, "CH-0001"), stringProp(2, "AT-9"), enumProp(4, 1, 3),
               enumProp(46, 1, 4), enumProp(60, 1, 5), enumProp(49, 1, 2),
               bytesProp(43, {0x04, 0x03, 0x02, 0x01}), unsignedProp(21, 2), unsignedProp(42, 1)});

    // The planar (no baseboard structure: a bare one) hangs under it.
    EXPECT_EQ(node->getNodeId(), run.planarParent()) << log.dump();
    EXPECT_EQ(2u, log.count("makeChassisNodes entry")) << log.dump();
    EXPECT_EQ(2u, log.count("makeChassisNodes exit")) << log.dump();
    EXPECT_EQ(2u, log.count("makeChassisNodes System model = RS-7400 [7947AC1] system "
                            "serial = SYS-0001"))
        << log.dump();
    EXPECT_TRUE(frametest::loggedTimes(
        log, 2, {"Table 3 length = 21", "Chassis Type = 23", "makePlanarNodes entry"}));
}

TEST(ChassisBuilder, LockBitClearSetsProperty10False) {
    ChassisRun run(systemAndChassis({ofType(TOWER)}));
    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(buildertest::hasBool(nodes[0], 10, false));
    EXPECT_TRUE(hasString(nodes[0], 108, "Tower Chassis"));
}

TEST(ChassisBuilder, NoChassisStructureMakesNoChassisAndNoPlanar) {
    smbiostest::LogCapture log;
    ChassisRun run(endedTableOf({systemInformation(0x0100), baseboard(0x0200)}));

    ASSERT_EQ(1u, run.mi.nodeList.size());
    EXPECT_EQ(run.computer, run.mi.nodeList[0]);
    EXPECT_EQ(3u, run.mi.nextNodeId);
    EXPECT_EQ(2u, log.count("makeChassisNodes exit")) << log.dump();
    EXPECT_EQ(0u, log.count("makePlanarNodes entry")) << log.dump();
    EXPECT_EQ(0u, log.count("makeCpuNodes entry")) << log.dump();
    EXPECT_EQ(1u, run.lists.storage[2].size());
}

TEST(ChassisBuilder, ShortSmbios20StructureLacksTheLaterFields) {
    smbiostest::LogCapture log;
    ChassisRun run(tableOf({systemInformation(0x0100), Structure(3, 0x0300)
                                                           .str("Chassis Maker")
                                                           .byte(MAIN_SERVER)
                                                           .str("CV-1")
                                                           .str("CH-7")
                                                           .str("AT-9")}));
    ASSERT_EQ(9u, run.parsed.getTables()[1].getLength());

    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ((std::vector<unsigned int>{2, 10, 11, 36, 39, 45, 50, 108, 213, 307}),
              propertyIds(nodes[0]));
    EXPECT_TRUE(hasString(nodes[0], 108, "Main Server Chassis"));
    EXPECT_TRUE(hasString(nodes[0], 50, "CH-7"));
    for (unsigned int id : {4u, 46u, 60u, 49u, 43u, 21u, 42u}) {
        EXPECT_TRUE(lacksProperty(nodes[0], id)) << "property " << id;
    }
    EXPECT_TRUE(log.contains("Contained Element Record count=0")) << log.dump();
    EXPECT_TRUE(log.contains("Contained Element Record Length=0")) << log.dump();
    EXPECT_TRUE(log.contains(" < NONE > ")) << log.dump();
    EXPECT_EQ(nodes[0]->getNodeId(), run.planarParent());
}

TEST(ChassisBuilder, BaseboardAddsItsProductAndLocationToTheHomeChassis) {
    ChassisRun run(tableOf({systemInformation(0x0100), chassis(0x0300, ofType(DESKTOP)),
                            chassis(0x0301, ofType(MAIN_SERVER)), baseboard(0x0200)}));

    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(2u, nodes.size());
    EXPECT_EQ(nodes[1]->getNodeId(), run.planarParent());
    EXPECT_TRUE(hasString(nodes[1], 172, "MB-100"));
    EXPECT_TRUE(hasString(nodes[1], 31, "Slot A"));
    EXPECT_TRUE(lacksProperty(nodes[0], 172));
    EXPECT_TRUE(lacksProperty(nodes[0], 31));
}

// ---------------------------------------------------------------------------
// The chassis-type table

TEST(ChassisType, EveryChassisTypeMapsAsTheTableSays) {
    for (unsigned int type = 0; type < 0x80; ++type) {
        SCOPED_TRACE("chassis type " + std::to_string(type));
        // A Desktop first, the type under test second: a main chassis takes
        // the planar from the Desktop.
        ChassisRun run(systemAndChassis({ofType(DESKTOP), ofType(static_cast<uint8_t>(type))}));
        std::vector<IC::Node*> const nodes = run.chassisNodes();
        if (type == EXPANSION) {
            ASSERT_EQ(1u, nodes.size());
            EXPECT_EQ(0u, nodes[0]->getIndex());
            EXPECT_EQ(nodes[0]->getNodeId(), run.planarParent());
            continue;
        }
        ASSERT_EQ(2u, nodes.size());
        IC::Node const* node = nodes[1];
        Expected const expected = expectedFor(type);
        EXPECT_EQ(1u, node->getIndex());
        expectProperties(
            node, {enumProp(11, 4, expected.packageType), enumProp(213, 4, expected.enclosure),
                   stringProp(108, expected.name)});
        EXPECT_TRUE(buildertest::hasBool(node, 10, false));
        EXPECT_EQ(expected.mainChassis ? node->getNodeId() : nodes[0]->getNodeId(),
                  run.planarParent());
    }
}

TEST(ChassisType, LockBitIsMaskedOffTheChassisType) {
    ChassisRun run(systemAndChassis({ofType(0x80 | BLADE_ENCLOSURE)}));
    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(buildertest::hasBool(nodes[0], 10, true));
    EXPECT_TRUE(hasEnum(nodes[0], 11, 4, 0x1C));
    EXPECT_TRUE(hasString(nodes[0], 108, "Blade Enclosure Chassis"));
}

TEST(ChassisType, RackMountChassisGetsPackageType17AndItsName) {
    // A main chassis: it takes the planar.
    expectSecondChassis(
        RACK_MOUNT,
        {enumProp(11, 4, 17), enumProp(213, 4, 3), stringProp(108, "Rack Mount Chassis")}, true);
}

TEST(ChassisType, BladeGetsPackageType17AndEnclosureKind16) {
    expectSecondChassis(
        BLADE, {enumProp(11, 4, 0x11), enumProp(213, 4, 16), stringProp(108, "Blade Chassis")},
        true);
}

TEST(ChassisType, BladeEnclosureGetsPackageType0x1CAndEnclosureKind17AndIsNotMain) {
    // Not a main chassis: the planar stays with the first chassis.
    expectSecondChassis(
        BLADE_ENCLOSURE,
        {enumProp(11, 4, 0x1C), enumProp(213, 4, 17), stringProp(108, "Blade Enclosure Chassis")},
        false);
}

TEST(ChassisType, MultiSystemChassisGetsPackageType1AndIsMain) {
    ChassisRun run(systemAndChassis({ofType(DESKTOP), ofType(0x19)}));
    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(2u, nodes.size());
    EXPECT_TRUE(hasEnum(nodes[1], 11, 4, 1));
    EXPECT_TRUE(hasString(nodes[1], 108, "Multi System Chassis"));
    EXPECT_EQ(nodes[1]->getNodeId(), run.planarParent());
}

TEST(ChassisType, ExpansionChassisGetsNoNodeButKeepsItsIndexPosition) {
    smbiostest::LogCapture log;
    ChassisRun run(systemAndChassis({ofType(TOWER), ofType(EXPANSION), ofType(DESKTOP)}));

    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(2u, nodes.size()) << log.dump();
    EXPECT_EQ(0u, nodes[0]->getIndex());
    EXPECT_EQ(2u, nodes[1]->getIndex());
    // The expansion chassis takes no node id either.
    EXPECT_EQ(nodes[0]->getNodeId() + 1, nodes[1]->getNodeId());
    EXPECT_EQ(nullptr, run.lists.storage[3][1].node);
    EXPECT_EQ(6u, log.count("Table 3 length = ")) << log.dump();
    EXPECT_EQ(0u, log.count("Chassis Type = 18")) << log.dump();
}

// ---------------------------------------------------------------------------
// Texts taken from the System Information structure

TEST(ChassisFallback, NoSystemInformationStructureFallsBackToTheMissingTableSentence) {
    smbiostest::LogCapture log;
    ChassisFields fields = ofType(TOWER);
    fields.manufacturer = "";
    fields.serial = "";
    TableBuilder table;
    table.add(chassis(0x0300, fields));
    ChassisRun run(table);

    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(1u, nodes.size());
    expectProperties(nodes[0], {stringProp(36, NO_SYSTEM), stringProp(39, NO_SYSTEM),
                                stringProp(50, NO_SYSTEM), noProp(45)});
    EXPECT_EQ(2u, log.count("makeChassisNodes Smbios required system information table does "
                            "not exist"))
        << log.dump();
    EXPECT_EQ(0u, log.count("makeChassisNodes System model = ")) << log.dump();
}

TEST(ChassisFallback, NoSystemInformationStructureKeepsTheChassisOwnTexts) {
    ChassisRun run(tableOf({chassis(0x0300, ofType(TOWER))}));
    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(1u, nodes.size());
    expectProperties(nodes[0], {stringProp(36, "Chassis Maker"), stringProp(39, NO_SYSTEM),
                                stringProp(50, "CH-0001")});
}

TEST(ChassisFallback, ManufacturerFallsBackOnEmptyBlankAndLowerCaseNoneOnly) {
    expectFallback(&ChassisFields::manufacturer, 36, "chassis manufacturer",
                   {{"", "Corvane"},
                    {" ", "Corvane"},
                    {"none", "Corvane"},
                    {"NONE", "NONE"},
                    {"None", "None"},
                    {"  ", "  "},
                    {"none ", "none "},
                    {"Chassis Maker", "Chassis Maker"}});
}

TEST(ChassisFallback, SerialFallsBackOnEmptyBlankAndNoneInAnyCase) {
    expectFallback(&ChassisFields::serial, 50, "chassis serial",
                   {{"", "SYS-0001"},
                    {" ", "SYS-0001"},
                    {"none", "SYS-0001"},
                    {"NONE", "SYS-0001"},
                    {"NoNe", "SYS-0001"},
                    {"  ", "  "},
                    {"NONE1", "NONE1"},
                    {"CH-0001", "CH-0001"}});
}

TEST(ChassisFallback, SystemTextsComeFromTheFirstSystemInformationStructure) {
    TableBuilder table;
    table.add(systemInformation(0x0100, "First [1111AB1]", "SYS-1"));
    table.add(systemInformation(0x0101, "Second [2222AB2]", "SYS-2"));
    ChassisFields fields = ofType(TOWER);
    fields.serial = "NONE";
    table.add(chassis(0x0300, fields));
    ChassisRun run(table);
    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(1u, nodes.size());
    expectProperties(nodes[0], {stringProp(39, "First [1111AB1]"), stringProp(45, "1111"),
                                stringProp(50, "SYS-1")});
}

TEST(ChassisFallback, ProductWithoutPartNumberSetsNoProperty45) {
    ChassisRun run(tableOf({systemInformation(0x0100, "RS-7400"), chassis(0x0300, ofType(TOWER))}));
    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(lacksProperty(nodes[0], 45));
    EXPECT_TRUE(hasString(nodes[0], 39, "RS-7400"));
}

// ---------------------------------------------------------------------------
// The chassis the planar hangs under

TEST(ChassisPlanarHome, SingleChassisThatIsNotMainHoldsThePlanar) {
    expectPlanarHome({ofType(DESKTOP)}, 1, 0);
}

TEST(ChassisPlanarHome, SecondChassisBeingMainServerHoldsThePlanar) {
    expectPlanarHome({ofType(DESKTOP), ofType(MAIN_SERVER)}, 2, 1);
}

TEST(ChassisPlanarHome, FirstMainChassisWinsOverALaterOne) {
    expectPlanarHome({ofType(DESKTOP), ofType(TOWER), ofType(RACK_MOUNT)}, 3, 1);
}

TEST(ChassisPlanarHome, MotherboardElementInTheFirstWinsOverALaterMainChassis) {
    expectPlanarHome({ofType(DESKTOP, {MOTHERBOARD_ELEMENT}), ofType(MAIN_SERVER)}, 2, 0);
}

TEST(ChassisPlanarHome, LaterChassisWithABaseboardElementWinsOverAnEarlierOne) {
    expectPlanarHome({ofType(DESKTOP, {MOTHERBOARD_ELEMENT}), ofType(MAIN_SERVER),
                      ofType(DESKTOP, {DAUGHTER_BOARD_ELEMENT})},
                     3, 2);
}

TEST(ChassisPlanarHome, ServerBladeElementWinsOverAnEarlierMainChassis) {
    expectPlanarHome({ofType(MAIN_SERVER), ofType(BLADE_ENCLOSURE, {0x83, SERVER_BLADE_ELEMENT})},
                     2, 1);
}

TEST(ChassisPlanarHome, OtherElementsAndStructureTypesDoNotMakeAHome) {
    // 0x04 is a connectivity switch; 0x83, 0x89 and 0x8A name SMBIOS
    // structure types 3, 9 and 10, not baseboards.
    expectPlanarHome({ofType(DESKTOP), ofType(DESKTOP, {0x04, 0x83, 0x89, 0x8A, 0x01, 0x02})}, 2,
                     0);
}

TEST(ChassisPlanarHome, NoMainChassisAndNoElementLeavesTheFirstChassis) {
    expectPlanarHome({ofType(0x01), ofType(DESKTOP), ofType(BLADE_ENCLOSURE)}, 3, 0);
}

TEST(ChassisPlanarHome, ExpansionChassisFirstLeavesTheHomeAtZeroAndThePlanarFindsNoParent) {
    smbiostest::LogCapture log;
    ChassisRun run(systemAndChassis({ofType(EXPANSION), ofType(DESKTOP)}));

    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(1u, nodes[0]->getIndex());
    EXPECT_TRUE(nodesOfType(run.mi, 41).empty());
    EXPECT_EQ(2u, log.count("makePlanarNodes Exit: failed to find parent node for nodeid 0"))
        << log.dump();
    EXPECT_EQ(0u, log.count("makeCpuNodes entry")) << log.dump();
}

TEST(ChassisPlanarHome, ExpansionChassisFirstThenMainChassisHoldsThePlanar) {
    expectPlanarHome({ofType(EXPANSION), ofType(TOWER)}, 1, 0);
}

TEST(ChassisPlanarHome, ExpansionChassisFirstThenBaseboardElementHoldsThePlanar) {
    expectPlanarHome({ofType(EXPANSION), ofType(DESKTOP, {MOTHERBOARD_ELEMENT})}, 1, 0);
}

TEST(ChassisPlanarHome, EveryChassisAnExpansionChassisCallsThePlanarBuilderWithParentZero) {
    smbiostest::LogCapture log;
    ChassisRun run(systemAndChassis({ofType(EXPANSION), ofType(0x80 | EXPANSION)}));

    EXPECT_TRUE(run.chassisNodes().empty());
    EXPECT_EQ(1u, run.mi.nodeList.size());
    EXPECT_EQ(2u, log.count("makePlanarNodes entry")) << log.dump();
    EXPECT_EQ(2u, log.count("makePlanarNodes Exit: failed to find parent node for nodeid 0"))
        << log.dump();
}

// ---------------------------------------------------------------------------
// Contained elements

TEST(ChassisContainedElements, StructureTypesAreLoggedAsTheirLowSevenBits) {
    smbiostest::LogCapture log;
    ChassisRun run(systemAndChassis({ofType(TOWER, {0x83, 0x0A, 0x91, 0x04, 0xFF})}));

    EXPECT_EQ(2u, log.count("Contained Element Record count=5")) << log.dump();
    EXPECT_EQ(2u, log.count("Contained Element Record Length=3")) << log.dump();
    EXPECT_EQ((std::vector<unsigned int>{3, 10, 17, 4, 127}), loggedElements()) << log.dump();
    EXPECT_EQ(0u, log.count(" < NONE > ")) << log.dump();
}

TEST(ChassisContainedElements, NoRecordsLogNone) {
    smbiostest::LogCapture log;
    ChassisRun run(systemAndChassis({ofType(TOWER)}));
    EXPECT_EQ(2u, log.count("Contained Element Record count=0")) << log.dump();
    EXPECT_EQ(2u, log.count(" < NONE > ")) << log.dump();
    EXPECT_EQ(0u, log.count("Contained Elements=")) << log.dump();
}

TEST(ChassisContainedElements, RecordCountWithoutRecordLengthLogsNone) {
    smbiostest::LogCapture log;
    ChassisFields fields = ofType(DESKTOP, {MOTHERBOARD_ELEMENT, MOTHERBOARD_ELEMENT});
    fields.recordLength = 0;
    ChassisRun run(systemAndChassis({fields, ofType(TOWER)}));

    EXPECT_EQ(2u, log.count("Contained Element Record count=2")) << log.dump();
    // Both chassis log a record length of 0 and no records.
    EXPECT_EQ(4u, log.count("Contained Element Record Length=0")) << log.dump();
    EXPECT_EQ(4u, log.count(" < NONE > ")) << log.dump();
    // The records were not read: the main chassis holds the planar.
    std::vector<IC::Node*> const nodes = run.chassisNodes();
    ASSERT_EQ(2u, nodes.size());
    EXPECT_EQ(nodes[1]->getNodeId(), run.planarParent());
}

TEST(ChassisContainedElements, RecordsRunningPastTheStructureAreReadAsTheyStand) {
    smbiostest::LogCapture log;
    // Two records of one byte, of which only the first lies in the
    // formatted area; the second is the first byte of the string set, the
    // 'C' (67) of "Corvane".
    ChassisRun run(tableOf({systemInformation(0x0100), Structure(3, 0x0300)
                                                           .str("Corvane")
                                                           .byte(DESKTOP)
                                                           .str("")
                                                           .str("")
                                                           .str("")
                                                           .byte(3)
                                                           .byte(3)
                                                           .byte(3)
                                                           .byte(3)
                                                           .dword(0)
                                                           .byte(0)
                                                           .byte(1)
                                                           .byte(2)
                                                           .byte(1)
                                                           .byte(0x91)}));
    ASSERT_EQ(0x16u, run.parsed.getTables()[1].getLength());
    EXPECT_EQ((std::vector<unsigned int>{17, 67}), loggedElements()) << log.dump();
    EXPECT_EQ(1u, run.chassisNodes().size());
}
