// The planar builder: the one planar node made from the preferred baseboard
// structure (type 2) under its chassis, the product and location it copies
// to the chassis, the takeover of the structure groups, the contained-handle
// and group-association logging, the two orders in which it runs the
// component builders, and a tree that does not depend on the log thresholds.
#include <gtest/gtest.h>

#include <cstdint>
#include <sstream>
#include <string>
#include <vector>

#include "BuilderFixture.h"
#include "LogLevels.h"
#include "TreeSnapshot.h"

using namespace buildertest;

namespace {

uint8_t const MOTHERBOARD = 0x0A;
uint8_t const SERVER_BLADE = 0x03;

// Board types from the most to the least preferred.
std::vector<uint8_t> const PRIORITY = {0x0A, 0x03, 0x0B, 0x0C, 0x06, 0x02, 0x09,
                                       0x05, 0x08, 0x07, 0x04, 0x0D, 0x01};

// The fields of a Baseboard Information structure.
struct BoardFields {
    std::string manufacturer = "Board Maker";
    std::string product = "MB-100";
    std::string version = "BV-1";
    std::string serial = "BRD-1";
    std::string assetTag = "BA-1";
    uint8_t featureFlags = 0x09;
    std::string location = "Slot A";
    uint16_t chassisHandle = 0x0300;
    uint8_t boardType = MOTHERBOARD;
    std::vector<uint16_t> handles;
    // Written as the handle count instead of the number of handles, when
    // not negative.
    int count = -1;
};

BoardFields boardOfType(uint8_t type, std::string const& product) {
    BoardFields fields;
    fields.boardType = type;
    fields.product = product;
    return fields;
}

Structure baseboard(uint16_t handle, BoardFields const& fields = BoardFields()) {
    Structure structure(2, handle);
    structure.str(fields.manufacturer).str(fields.product).str(fields.version);
    structure.str(fields.serial).str(fields.assetTag).byte(fields.featureFlags);
    structure.str(fields.location).word(fields.chassisHandle).byte(fields.boardType);
    structure.byte(static_cast<uint8_t>(fields.count >= 0 ? fields.count : fields.handles.size()));
    for (uint16_t contained : fields.handles) {
        structure.word(contained);
    }
    return structure;
}

Structure systemInformation(uint16_t handle, std::string const& manufacturer = "Corvane") {
    return Structure(1, handle)
        .str(manufacturer)
        .str("RS-7400")
        .str("V1.2")
        .str("SYS-0001")
        .bytes(std::vector<uint8_t>(16, 0x11))
        .byte(0x06)
        .str("SKU-77")
        .str("Server");
}

// An additional-information structure (type 40): no builder makes a node of
// it, and it gets no raw table node.
Structure additional(uint16_t handle) { return Structure(40, handle).byte(0); }

// The builder run over a table under a chassis-like parent (node id 2), or
// under the given parent id.
struct PlanarRun {
    explicit PlanarRun(TableBuilder const& table, unsigned int parentId = 0)
        : parsed(frametest::parse(table)), lists(parsed) {
        parent = buildertest::addParent(mi, 1);
        mi.makePlanarNodes(lists.get(), parentId != 0 ? parentId : parent->getNodeId());
    }

    std::vector<IC::Node*> planars() const { return nodesOfType(mi, 41); }
    bool sharedListsEmpty() const {
        for (unsigned int type = 0; type < 256; ++type) {
            if (!lists.storage[type].empty()) {
                return false;
            }
        }
        return true;
    }

    SD::SmBios parsed;
    StructureLists lists;
    TestMI mi;
    IC::MutableNode* parent = nullptr;
};

// The run made one planar node, of product `product` (property 39).
void expectOnlyPlanar(PlanarRun const& run, std::string const& product) {
    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size());
    EXPECT_TRUE(hasString(planars[0], 39, product));
}

// The run made one planar node, of product `product` (property 39) and
// board type `type` (property 128).
void expectOnlyPlanar(PlanarRun const& run, std::string const& product, unsigned int type) {
    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size());
    EXPECT_TRUE(hasString(planars[0], 39, product));
    EXPECT_TRUE(hasUnsigned(planars[0], 128, type));
}

// A System Information structure (0x0100) and a baseboard (0x0200) of the
// fields.
TableBuilder boardTable(BoardFields const& fields = BoardFields()) {
    return tableOf({systemInformation(0x0100), baseboard(0x0200, fields)});
}

// The default fields with one text field empty.
BoardFields emptied(std::string BoardFields::*field) {
    BoardFields fields;
    fields.*field = "";
    return fields;
}

// The entry lines of the component builders that the planar calls, in the
// order they were logged.
std::vector<std::string> childBuilderOrder() {
    std::vector<std::string> const markers = {"makeCpuNodes entry",
                                              "makeSlotNodes entry",
                                              "makeConnectorNodes entry",
                                              "makeDimmNodes entry",
                                              "makeDiskControllerNodes entry",
                                              "makeSMBIOSTableNodes entry",
                                              "makeFirmwareNodes entry",
                                              "makeKVDNodes entry"};
    std::vector<std::string> order;
    for (std::string const& text : frametest::loggedTexts()) {
        for (std::string const& marker : markers) {
            if (text == marker) {
                order.push_back(marker);
            }
        }
    }
    return order;
}

// The numbers of the "Handles=" line, or {} when there is none.
std::vector<unsigned int> loggedHandles(bool& closed) {
    std::string const line = frametest::firstLogged("Handles=");
    std::vector<unsigned int> numbers;
    closed = false;
    if (line.empty()) {
        return numbers;
    }
    std::string const prefix = "Handles={ ";
    if (line.compare(0, prefix.size(), prefix) != 0 || line.back() != '}') {
        return numbers;
    }
    closed = true;
    std::istringstream in(line.substr(prefix.size(), line.size() - prefix.size() - 1));
    unsigned int number = 0;
    while (in >> number) {
        numbers.push_back(number);
    }
    return numbers;
}

}  // namespace

// ---------------------------------------------------------------------------
// The planar node

TEST(PlanarBuilder, FullStructureGivesOnePlanarNodeWithEveryProperty) {
    smbiostest::LogCapture log;
    PlanarRun run(endedTableOf({systemInformation(0x0100), baseboard(0x0200)}));

    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size()) << log.dump();
    IC::Node const* node = planars[0];
    EXPECT_TRUE(isNode(node, 3u, run.parent->getNodeId(), 41, 0u, 1u, "Planar"));
    EXPECT_EQ(run.mi.miIdList, node->getMIIds());

    // The version string is not read.
    EXPECT_EQ((std::vector<unsigned int>{2, 31, 36, 39, 44, 50, 128, 172}), propertyIds(node));
    expectProperties(
        node, {stringProp(36, "Board Maker"), stringProp(39, "MB-100"), stringProp(172, "MB-100"),
               stringProp(50, "BRD-1"), stringProp(2, "BA-1"), enumProp(44, 1, 0x09),
               stringProp(31, "Slot A"), unsignedProp(128, 0x0A)});

    // The product and the location also go to the parent.
    EXPECT_EQ((std::vector<unsigned int>{31, 172}), propertyIds(run.parent));
    EXPECT_TRUE(hasString(run.parent, 172, "MB-100"));
    EXPECT_TRUE(hasString(run.parent, 31, "Slot A"));

    EXPECT_TRUE(frametest::loggedTimes(
        log, 2,
        {"makePlanarNodes entry", "makePlanarNodes exit",
         "makePlanarNodes system manufacturer = Corvane", "Table 2 length = 15", "Handle=768",
         "Count of contained object handles=0"}));
    EXPECT_EQ(0u, log.count("Handles=")) << log.dump();
    EXPECT_EQ(0u, log.count("No Table 2 for Planar")) << log.dump();
}

TEST(PlanarBuilder, ShortBaseboardSetsBoardTypeZeroAndLacksTheLaterFields) {
    smbiostest::LogCapture log;
    PlanarRun run(
        tableOf({systemInformation(0x0100),
                 Structure(2, 0x0200).str("Board Maker").str("MB-100").str("BV-1").str("BRD-1")}));
    ASSERT_EQ(8u, run.parsed.getTables()[1].getLength());

    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size()) << log.dump();
    EXPECT_EQ((std::vector<unsigned int>{36, 39, 50, 128, 172}), propertyIds(planars[0]));
    EXPECT_TRUE(hasUnsigned(planars[0], 128, 0));
    EXPECT_TRUE(hasString(planars[0], 50, "BRD-1"));
    EXPECT_EQ((std::vector<unsigned int>{172}), propertyIds(run.parent));
    EXPECT_EQ(2u, log.count("Count of contained object handles=0")) << log.dump();
}

TEST(PlanarBuilder, EmptyProductSetsEmpty39AndNo172OnEitherNode) {
    PlanarRun run(boardTable(emptied(&BoardFields::product)));

    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size());
    EXPECT_TRUE(hasString(planars[0], 39, ""));
    EXPECT_TRUE(lacksProperty(planars[0], 172));
    EXPECT_TRUE(lacksProperty(run.parent, 172));
    EXPECT_TRUE(hasString(planars[0], 31, "Slot A"));
    EXPECT_TRUE(hasString(run.parent, 31, "Slot A"));
}

TEST(PlanarBuilder, EmptyLocationSetsNo31OnEitherNode) {
    PlanarRun run(boardTable(emptied(&BoardFields::location)));

    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size());
    EXPECT_TRUE(lacksProperty(planars[0], 31));
    EXPECT_TRUE(lacksProperty(run.parent, 31));
    EXPECT_TRUE(hasString(planars[0], 172, "MB-100"));
    EXPECT_EQ((std::vector<unsigned int>{172}), propertyIds(run.parent));
}

// ---------------------------------------------------------------------------
// Which baseboard becomes the planar

TEST(PlanarBoardType, MotherboardListedAfterAServerBladeBecomesThePlanar) {
    PlanarRun run(tableOf({baseboard(0x0200, boardOfType(SERVER_BLADE, "Blade")),
                           baseboard(0x0201, boardOfType(MOTHERBOARD, "Motherboard"))}));

    expectOnlyPlanar(run, "Motherboard", MOTHERBOARD);
}

TEST(PlanarBoardType, EachBoardTypeWinsOverTheNextInThePriorityList) {
    for (size_t i = 0; i + 1 < PRIORITY.size(); ++i) {
        SCOPED_TRACE("board type " + std::to_string(PRIORITY[i]) + " before " +
                     std::to_string(PRIORITY[i + 1]));
        TableBuilder table;
        table.add(baseboard(0x0200, boardOfType(PRIORITY[i + 1], "Less preferred")));
        table.add(baseboard(0x0201, boardOfType(PRIORITY[i], "Preferred")));
        PlanarRun run(table);
        expectOnlyPlanar(run, "Preferred", PRIORITY[i]);
    }
}

TEST(PlanarBoardType, MotherboardWinsOverEveryOtherBoardType) {
    TableBuilder table;
    uint16_t handle = 0x0200;
    for (size_t i = PRIORITY.size(); i-- > 0;) {
        table.add(baseboard(handle++, boardOfType(PRIORITY[i], "Board " + std::to_string(i))));
    }
    PlanarRun run(table);
    expectOnlyPlanar(run, "Board 0", MOTHERBOARD);
}

TEST(PlanarBoardType, FirstOfTwoEqualBoardsBecomesThePlanar) {
    PlanarRun run(tableOf({baseboard(0x0200, boardOfType(MOTHERBOARD, "First")),
                           baseboard(0x0201, boardOfType(MOTHERBOARD, "Second"))}));
    expectOnlyPlanar(run, "First");
}

TEST(PlanarBoardType, BoardTypeOutsideTheListIsStillTakenWhenAlone) {
    PlanarRun run(tableOf({baseboard(0x0200, boardOfType(0x20, "Odd board"))}));
    expectOnlyPlanar(run, "Odd board", 0x20);
}

TEST(PlanarBoardType, FirstStructureIsTakenWhenNoBoardTypeIsInTheList) {
    PlanarRun run(tableOf({baseboard(0x0200, boardOfType(0x20, "First")),
                           baseboard(0x0201, boardOfType(0x00, "Second")),
                           baseboard(0x0202, boardOfType(0x0E, "Third"))}));
    expectOnlyPlanar(run, "First");
}

TEST(PlanarBoardType, UnknownBoardTypeWinsOverATypeOutsideTheList) {
    PlanarRun run(tableOf({baseboard(0x0200, boardOfType(0x20, "Odd")),
                           baseboard(0x0201, boardOfType(0x01, "Unknown"))}));
    expectOnlyPlanar(run, "Unknown");
}

// ---------------------------------------------------------------------------
// The takeover of the structure groups and the component builders

TEST(PlanarTakeover, AfterTheBuilderEverySharedListIsEmpty) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(Structure(0, 0x0000).str("Corvane").str("1.0").word(0xE800).str("01/01/2020"));
    table.add(systemInformation(0x0100));
    table.add(baseboard(0x0200));
    table.add(Structure(3, 0x0300).str("Chassis Maker").byte(0x17));
    table.add(group(0x0E00, "Cluster", {{3, 0x0300}}));
    table.add(additional(0x2800));
    table.add(additional(0x2801));
    table.endOfTable(0xFEFF);
    PlanarRun run(table);

    EXPECT_TRUE(run.sharedListsEmpty());
    EXPECT_EQ(1u, run.planars().size());
    // What no component builder consumed is logged and then dropped.
    EXPECT_EQ(2u, log.count("Table(s) for index 40")) << log.dump();
    EXPECT_EQ(2u, log.count("Table(s) for index 127")) << log.dump();
    // Each left-over entry with its length: the two additional-information
    // structures (5 bytes) and the end of table (4 bytes).
    size_t fiveBytes = 0;
    size_t fourBytes = 0;
    for (std::string const& text : frametest::loggedTexts()) {
        if (text.compare(0, 13, "   Pointer = ") != 0) {
            continue;
        }
        size_t const at = text.find(" length = ");
        std::string const tail = at == std::string::npos ? "" : text.substr(at);
        fiveBytes += tail == " length = 5" ? 1 : 0;
        fourBytes += tail == " length = 4" ? 1 : 0;
    }
    EXPECT_EQ(2u, fiveBytes) << log.dump();
    EXPECT_EQ(1u, fourBytes) << log.dump();
}

TEST(PlanarTakeover, RawTableNodesHangUnderThePlanar) {
    PlanarRun run(
        endedTableOf({systemInformation(0x0100), baseboard(0x0200),
                      Structure(3, 0x0300).str("Chassis Maker").byte(0x17), additional(0x2800)}));

    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size());
    std::vector<IC::Node*> const raw = nodesOfType(run.mi, 55);
    // Types 1, 2 and 3; types 40 and 127 get no raw node.
    ASSERT_EQ(3u, raw.size());
    for (IC::Node const* node : raw) {
        EXPECT_EQ(planars[0]->getNodeId(), node->getLinkedId());
    }
    EXPECT_TRUE(hasUnsigned(raw[0], 177, 1));
    EXPECT_TRUE(hasUnsigned(raw[1], 177, 2));
    EXPECT_TRUE(hasUnsigned(raw[2], 177, 3));
    EXPECT_EQ(raw, childrenOf(run.mi, planars[0]->getNodeId()));
}

TEST(PlanarTakeover, ChildBuildersRunInTheFirstOrderWithABaseboard) {
    smbiostest::LogCapture log;
    PlanarRun run(boardTable());
    EXPECT_EQ((std::vector<std::string>{
                  "makeCpuNodes entry", "makeSlotNodes entry", "makeConnectorNodes entry",
                  "makeDimmNodes entry", "makeDiskControllerNodes entry",
                  "makeSMBIOSTableNodes entry", "makeFirmwareNodes entry", "makeKVDNodes entry"}),
              childBuilderOrder())
        << log.dump();
}

TEST(PlanarTakeover, ChildBuildersRunInTheSecondOrderWithoutABaseboard) {
    smbiostest::LogCapture log;
    PlanarRun run(tableOf({systemInformation(0x0100)}));
    EXPECT_EQ((std::vector<std::string>{"makeCpuNodes entry", "makeSlotNodes entry",
                                        "makeConnectorNodes entry", "makeDimmNodes entry",
                                        "makeFirmwareNodes entry", "makeDiskControllerNodes entry",
                                        "makeKVDNodes entry", "makeSMBIOSTableNodes entry"}),
              childBuilderOrder())
        << log.dump();
}

TEST(PlanarTakeover, NoBaseboardMakesABarePlanarAndLeavesTheSharedListsAsTheyAre) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(systemInformation(0x0100));
    table.add(Structure(3, 0x0300).str("Chassis Maker").byte(0x17));
    table.add(additional(0x2800));
    table.endOfTable(0xFEFF);
    PlanarRun run(table);

    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size()) << log.dump();
    IC::Node const* node = planars[0];
    EXPECT_TRUE(isNode(node, 3u, run.parent->getNodeId(), 41, 0u, 1u, "Planar"));
    EXPECT_EQ(run.mi.miIdList, node->getMIIds());
    EXPECT_TRUE(propertyIds(node).empty());
    EXPECT_TRUE(propertyIds(run.parent).empty());

    EXPECT_EQ(2u, log.count("No Table 2 for Planar")) << log.dump();
    EXPECT_EQ(2u, log.count("makePlanarNodes exit")) << log.dump();
    EXPECT_EQ(0u, log.count("Table 2 length = ")) << log.dump();
    EXPECT_EQ(0u, log.count("Count of contained object handles=")) << log.dump();
    EXPECT_EQ(1u, run.lists.storage[1].size());
    EXPECT_EQ(1u, run.lists.storage[3].size());
    EXPECT_EQ(1u, run.lists.storage[40].size());
    EXPECT_EQ(1u, run.lists.storage[127].size());

    // The raw table nodes hang under the bare planar.
    std::vector<IC::Node*> const raw = nodesOfType(run.mi, 55);
    ASSERT_EQ(2u, raw.size());
    for (IC::Node const* rawNode : raw) {
        EXPECT_EQ(node->getNodeId(), rawNode->getLinkedId());
    }
}

// ---------------------------------------------------------------------------
// Failures and the log

TEST(PlanarBuilder, ParentNotFoundBuildsNothing) {
    smbiostest::LogCapture log;
    PlanarRun run(boardTable(), 99);

    EXPECT_TRUE(holdsNodes(run.mi, 1, 3));
    EXPECT_TRUE(propertyIds(run.parent).empty());
    EXPECT_EQ(2u, log.count("makePlanarNodes Exit: failed to find parent node for nodeid 99"))
        << log.dump();
    EXPECT_TRUE(childBuilderOrder().empty()) << log.dump();
    EXPECT_EQ(0u, log.count("makePlanarNodes exit")) << log.dump();
    // Nothing was taken over.
    EXPECT_EQ(1u, run.lists.storage[1].size());
    EXPECT_EQ(1u, run.lists.storage[2].size());
}

TEST(PlanarBuilder, MissingSystemInformationIsLoggedAndNotFatal) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(baseboard(0x0200));
    PlanarRun run(table);

    EXPECT_EQ(2u, log.count("makePlanarNodes Smbios required system information table does "
                            "not exist"))
        << log.dump();
    EXPECT_EQ(0u, log.count("makePlanarNodes system manufacturer = ")) << log.dump();
    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size());
    EXPECT_TRUE(hasString(planars[0], 36, "Board Maker"));
    EXPECT_EQ(2u, log.count("makePlanarNodes exit")) << log.dump();
}

TEST(PlanarBuilder, EmptySystemManufacturerIsTakenFromTheParentForTheLog) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(systemInformation(0x0100, ""));
    table.add(baseboard(0x0200));
    SD::SmBios parsed(table.build());
    StructureLists lists(parsed);
    TestMI mi;
    IC::MutableNode* parent = buildertest::addParent(mi, 1);
    parent->setProperty(36, IC::PropertyValue("Chassis Maker", true));
    mi.makePlanarNodes(lists.get(), parent->getNodeId());

    EXPECT_EQ(2u, log.count("makePlanarNodes chassis manufacturer = Chassis Maker")) << log.dump();
    // The text serves the log only: the planar keeps its own manufacturer.
    std::vector<IC::Node*> const planars = nodesOfType(mi, 41);
    ASSERT_EQ(1u, planars.size());
    EXPECT_TRUE(hasString(planars[0], 36, "Board Maker"));
    EXPECT_TRUE(hasString(parent, 36, "Chassis Maker"));
}

// ---------------------------------------------------------------------------
// Contained object handles

TEST(PlanarContainedHandles, HandlesAreLookedUpInEveryGroup) {
    smbiostest::LogCapture log;
    BoardFields fields;
    fields.handles = {0x2800, 0x0999, 0x0200};
    TableBuilder table;
    table.add(systemInformation(0x0100));
    table.add(baseboard(0x0200, fields));
    table.add(additional(0x2800));
    PlanarRun run(table);

    EXPECT_EQ(2u, log.count("Count of contained object handles=3")) << log.dump();
    bool closed = false;
    EXPECT_EQ((std::vector<unsigned int>{10240, 2457, 512}), loggedHandles(closed)) << log.dump();
    EXPECT_TRUE(closed) << log.dump();
    EXPECT_TRUE(
        frametest::loggedTimes(log, 2,
                               {"Planar contained element handle 10240 found in Bios table 40",
                                "Planar contained element handle 2457 not found in Bios tables ",
                                "Planar contained element handle 512 found in Bios table 2"}));
    // The handles do not limit what the component builders see.
    EXPECT_EQ(2u, nodesOfType(run.mi, 55).size());
}

TEST(PlanarContainedHandles, CountOf120NeedsExactly255BytesAndIsListed) {
    smbiostest::LogCapture log;
    BoardFields fields;
    for (uint16_t i = 0; i < 120; ++i) {
        fields.handles.push_back(static_cast<uint16_t>(0x1000 + i));
    }
    TableBuilder table;
    table.add(baseboard(0x0200, fields));
    PlanarRun run(table);
    ASSERT_EQ(255u, run.parsed.getTables()[0].getLength());

    EXPECT_EQ(2u, log.count("Count of contained object handles=120")) << log.dump();
    EXPECT_EQ(0u, log.count("exceeds 255 table length")) << log.dump();
    bool closed = false;
    std::vector<unsigned int> const handles = loggedHandles(closed);
    ASSERT_EQ(120u, handles.size()) << log.dump();
    EXPECT_TRUE(closed);
    EXPECT_EQ(0x1000u, handles.front());
    EXPECT_EQ(0x1000u + 119, handles.back());
    EXPECT_EQ(240u, log.count(" not found in Bios tables ")) << log.dump();
    EXPECT_EQ(2u, log.count("Planar contained element handle 4215 not found in Bios tables "))
        << log.dump();
}

TEST(PlanarContainedHandles, CountOf121ExceedsTheTableLengthAndIsNotListed) {
    smbiostest::LogCapture log;
    BoardFields fields;
    fields.handles = {0x0200, 0x0100};
    fields.count = 121;
    TableBuilder table;
    table.add(systemInformation(0x0100));
    table.add(baseboard(0x0200, fields));
    PlanarRun run(table);

    EXPECT_EQ(2u, log.count("Count of contained object handles=121")) << log.dump();
    EXPECT_EQ(2u, log.count("Length of contained object handles 257 exceeds 255 table length"))
        << log.dump();
    EXPECT_EQ(0u, log.count("Handles=")) << log.dump();
    EXPECT_EQ(0u, log.count("Planar contained element handle")) << log.dump();
    EXPECT_EQ(1u, run.planars().size());
}

// ---------------------------------------------------------------------------
// Group associations: the lookup is asked with the baseboard's handle as
// the type and 2 as the handle.

TEST(PlanarGroup, GroupHoldingTheBaseboardHandleAsATypeIsReported) {
    smbiostest::LogCapture log;
    PlanarRun run(
        tableOf({systemInformation(0x0100), baseboard(0x0020),
                 group(0x0E00, "Board group", {{0x20, 0x0002}, {4, 0x0400}, {7, 0x0700}})}));

    EXPECT_TRUE(frametest::loggedTimes(
        log, 2,
        {" Planar Group Associations Exist: ", "    Table Type=4 Handle=1024",
         "    Table Type=7 Handle=1792"}));
    EXPECT_EQ(1u, run.planars().size());
}

TEST(PlanarGroup, GroupHoldingTheBaseboardByTypeAndHandleIsNotReported) {
    smbiostest::LogCapture log;
    PlanarRun run(tableOf({systemInformation(0x0100), baseboard(0x0020),
                           group(0x0E00, "Board group", {{2, 0x0020}, {4, 0x0400}})}));

    EXPECT_EQ(0u, log.count(" Planar Group Associations Exist: ")) << log.dump();
    EXPECT_EQ(0u, log.count("    Table Type=")) << log.dump();
    // The lookup itself ran over the group.
    EXPECT_EQ(2u, log.count("Table 14 length = ")) << log.dump();
}

// ---------------------------------------------------------------------------
// The log thresholds: the chassis handle at 0x0B is read whatever they are.

namespace {

// The table the planar would hand on to its component builders: a BIOS, the
// system, the short baseboard, a slot and the end of the table.
TableBuilder straddlingTable() {
    TableBuilder table;
    table.add(Structure(0, 0x0000)
                  .str("Corvane")
                  .str("1.05 -[CVE1-1.05]-")
                  .word(0xE800)
                  .str("01/01/2020"));
    table.add(systemInformation(0x0100));
    table.add(straddlingBaseboard(0x0200));
    table.add(Structure(9, 0x0900)
                  .str("PCIe Slot 1")
                  .byte(0xA5)
                  .byte(0x0D)
                  .byte(0x04)
                  .byte(0x01)
                  .word(0x0001)
                  .byte(0x0C)
                  .byte(0x01));
    table.endOfTable(0xFEFF);
    return table;
}

// The planar builder over the table under a chassis-like parent; the tree
// as text.
std::string straddlingTree() {
    PlanarRun run(straddlingTable());
    return buildertest::treeSnapshot(run.mi.nodeList);
}

}  // namespace

TEST(PlanarLogLevels, BaseboardOfLength0x0CGivesTheSameTreeAtTheDefaultLevelsAndWithEveryLevelOn) {
    buildertest::ScopedLogLevels const restore;
    TableBuilder const table = straddlingTable();
    ASSERT_EQ(0x0C, frametest::parse(table).getTables()[2].getLength());

    // At the default levels (nothing enabled, no capture) the chassis handle
    // is read all the same: the word straddles the end, the read throws, and
    // the failure ends the planar builder for this structure. The planar
    // node keeps what was set before the read, the board type (set after it)
    // is missing, the shared lists are not taken over and no component
    // builder runs: no slot, firmware or raw-table node.
    buildertest::ScopedLogLevels::set(QNLog::LEVEL_OFF, QNLog::LEVEL_OFF);
    PlanarRun run(table);
    ASSERT_EQ(2u, run.mi.nodeList.size()) << buildertest::treeSnapshot(run.mi.nodeList);
    EXPECT_EQ(run.parent, run.mi.nodeList[0]);
    std::vector<IC::Node*> const planars = run.planars();
    ASSERT_EQ(1u, planars.size());
    IC::Node const* planar = planars[0];
    EXPECT_EQ(3u, planar->getNodeId());
    EXPECT_EQ(run.parent->getNodeId(), planar->getLinkedId());
    EXPECT_EQ(1u, planar->getStatus());
    EXPECT_EQ("Planar", planar->getDescription());
    EXPECT_EQ((std::vector<unsigned int>{2, 31, 36, 39, 44, 50, 172}), propertyIds(planar));
    EXPECT_TRUE(lacksProperty(planar, 128));
    EXPECT_TRUE(hasString(planar, 31, "Slot A"));
    EXPECT_EQ((std::vector<unsigned int>{31, 172}), propertyIds(run.parent));
    EXPECT_EQ(planar, run.lists.storage[2][0].node);
    EXPECT_EQ(1u, run.lists.storage[0].size());
    EXPECT_EQ(1u, run.lists.storage[9].size());
    EXPECT_FALSE(run.sharedListsEmpty());
    EXPECT_TRUE(nodesOfType(run.mi, 62).empty());
    EXPECT_TRUE(nodesOfType(run.mi, 55).empty());
    EXPECT_TRUE(nodesOfType(run.mi, 3).empty());
    std::string const atDefault = buildertest::treeSnapshot(run.mi.nodeList);
    EXPECT_EQ(atDefault, straddlingTree());

    // With every level on through the capture: the same tree, and the
    // failure logged at error level; the chassis handle's detail line is
    // never reached.
    {
        smbiostest::LogCapture log;
        std::string const everyLevelOn = straddlingTree();
        EXPECT_EQ(atDefault, everyLevelOn) << buildertest::snapshotDifference(
            atDefault, everyLevelOn, "default levels", "every level on");
        std::string const failure = frametest::firstLogged("Exception=");
        EXPECT_NE(std::string::npos, failure.find("out_of_range")) << log.dump();
        EXPECT_NE(std::string::npos, failure.find("Table 2 index =0")) << failure;
        EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels("Exception="));
        EXPECT_EQ(0u, log.count("Handle=")) << log.dump();
        EXPECT_EQ(0u, log.count("Count of contained object handles=")) << log.dump();
        EXPECT_EQ(2u, log.count("makePlanarNodes exit")) << log.dump();
    }

    // With both thresholds at 0, written to a file: the same tree again.
    {
        buildertest::LogToFile file;
        buildertest::ScopedLogLevels const everyLevel(buildertest::EVERY_LEVEL,
                                                      buildertest::EVERY_LEVEL);
        std::string const everyLevelOn = straddlingTree();
        EXPECT_EQ(atDefault, everyLevelOn) << buildertest::snapshotDifference(
            atDefault, everyLevelOn, "default levels", "thresholds 0");
        std::vector<std::string> const errors = file.takeMessages(SD::LOG_ERROR);
        ASSERT_EQ(1u, errors.size());
        EXPECT_NE(std::string::npos, errors[0].find("Exception=")) << errors[0];
    }

    // And through the comparison of the log-independence tests: the three
    // settings agree, and at the agent's thresholds (warnings and errors)
    // the failure is logged as it is with every level on.
    buildertest::LogToFile file;
    buildertest::LevelComparison const result = buildertest::compareLevels(straddlingTree, file);
    EXPECT_TRUE(result.same()) << result.difference();
    EXPECT_EQ(atDefault, result.atDefault);
    ASSERT_EQ(1u, result.agentMessages.size()) << result.difference();
    EXPECT_NE(std::string::npos, result.agentMessages[0].find("Exception="));
}
