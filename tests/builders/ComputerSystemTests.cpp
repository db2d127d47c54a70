// The computer-system builder: one computer-system node per System
// Information structure (type 1), with the UUID text rewritten by the table's
// version, the part number cut from the product name, the time and time-zone
// properties the node computes when they are read, and the group members
// written to standard output.
//
// The builder's UUID rewrite reads the process's SMBIOS table, so every test
// that reaches it brings its own override file; CTest runs each test case in
// a process of its own, where that file is the one acquired.
#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <ctime>
#include <memory>
#include <ostream>
#include <sstream>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "BuilderFixture.h"

using namespace buildertest;

namespace {

std::vector<uint8_t> const UUID_BYTES = {0x00, 0x11, 0x22, 0x33, 0x44, 0x55, 0x66, 0x77,
                                         0x88, 0x99, 0xAA, 0xBB, 0xCC, 0xDD, 0xEE, 0xFF};
std::string const UUID_AS_FORMATTED = "00112233-4455-6677-8899-AABBCCDDEEFF";
std::string const UUID_REORDERED = "33221100-5544-7766-8899-AABBCCDDEEFF";

// A complete System Information structure (length 0x1B): manufacturer,
// product, version, serial, UUID, wake-up type 6 (power switch), SKU, family.
Structure systemInformation(uint16_t handle, std::string const& product = "RS-7400 [7947AC1]") {
    return Structure(1, handle)
        .str("Corvane")
        .str(product)
        .str("V1.2")
        .str("SYS-0001")
        .bytes(UUID_BYTES)
        .byte(0x06)
        .str("SKU-77")
        .str("Server");
}

// A chassis (type 3) of the given chassis type, up to its power cords, with
// no contained elements.
Structure chassis(uint16_t handle, uint8_t type) {
    return Structure(3, handle)
        .str("Corvane")
        .byte(type)
        .str("CV-1")
        .str("CH-0001")
        .str("AT-1")
        .byte(3)
        .byte(3)
        .byte(3)
        .byte(3)
        .dword(0)
        .byte(2)
        .byte(1)
        .byte(0)
        .byte(0);
}

// A baseboard (type 2) of board type Motherboard.
Structure baseboard(uint16_t handle) {
    return Structure(2, handle)
        .str("Corvane")
        .str("MB-100")
        .str("")
        .str("BRD-1")
        .str("")
        .byte(0x01)
        .str("")
        .word(0x0300)
        .byte(0x0A)
        .byte(0);
}

// Two System Information structures, "First [1111AB1]" (0x0100) and
// "Second [2222AB2]" (0x0101), then the other structures.
std::vector<Structure> twoSystemsAnd(std::vector<Structure> const& others) {
    std::vector<Structure> structures = {systemInformation(0x0100, "First [1111AB1]"),
                                         systemInformation(0x0101, "Second [2222AB2]")};
    structures.insert(structures.end(), others.begin(), others.end());
    return structures;
}

// Sets the process's time zone while the object lives, then restores it.
class ScopedTimeZone {
public:
    explicit ScopedTimeZone(char const* zone) : env_(new smbiostest::ScopedEnv("TZ", zone)) {
        tzset();
    }
    ~ScopedTimeZone() {
        env_.reset();
        tzset();
    }
    ScopedTimeZone(ScopedTimeZone const&) = delete;
    ScopedTimeZone& operator=(ScopedTimeZone const&) = delete;

private:
    std::unique_ptr<smbiostest::ScopedEnv> env_;
};

// The local offset from UTC in seconds under the current time zone; used
// only to tell whether the system knows a named zone.
long localOffsetSeconds() {
    std::time_t const now = std::time(nullptr);
    std::tm local = {};
    localtime_r(&now, &local);
    return local.tm_gmtoff;
}

// The builder run over a table under a root-like parent.
struct ComputerRun {
    explicit ComputerRun(TableBuilder const& table)
        : parsed(frametest::parse(table)), lists(parsed) {
        root = buildertest::addParent(mi, 59);
        mi.makeComputerNodes(lists.get(), root->getNodeId());
    }

    SD::SmBios parsed;
    StructureLists lists;
    TestMI mi;
    IC::MutableNode* root = nullptr;
};

// The builder run over a table that the process also acquires, at the given
// SMBIOS version, from its override file; the log is captured from the run
// on, and computers holds the computer-system nodes made.
struct AcquiredComputerRun {
    AcquiredComputerRun(TableBuilder const& table, uint8_t major, uint8_t minor)
        : override(table.build(), major, minor), run(table) {
        computers = nodesOfType(run.mi, 40);
    }

    // The length of the first structure as the table model parsed it.
    unsigned int firstLength() const { return run.parsed.getTables()[0].getLength(); }

    OverrideTable override;
    LogCapture log;
    ComputerRun run;
    std::vector<IC::Node*> computers;
};

// The builder run over a table that the process also acquires (SMBIOS
// 2.4), with what it writes to standard output meanwhile; the log is
// captured from before the run on.
struct PrintingComputerRun {
    explicit PrintingComputerRun(TableBuilder const& table) : override(table.build(), 2, 4) {
        ::testing::internal::CaptureStdout();
        run.reset(new ComputerRun(table));
        output = ::testing::internal::GetCapturedStdout();
    }

    OverrideTable override;
    LogCapture log;
    std::unique_ptr<ComputerRun> run;
    std::string output;
};

// A System Information structure up to the serial number (SMBIOS 2.0,
// length 8), to which a test adds the later fields.
Structure systemUpToSerial(std::string const& product = "RS-7400") {
    return Structure(1, 0x0100).str("Corvane").str(product).str("V1.2").str("SYS-0001");
}

// How many captured messages contain each text (every output counted, as
// LogCapture::count does), all checked at once: each pair is the expected
// count and the text.
::testing::AssertionResult loggedCounts(
    LogCapture const& log, std::vector<std::pair<size_t, std::string>> const& expected) {
    std::ostringstream wrong;
    for (auto const& entry : expected) {
        size_t const count = log.count(entry.second);
        if (count != entry.first) {
            wrong << "\n  \"" << entry.second << "\" " << count << " time(s), expected "
                  << entry.first;
        }
    }
    if (!wrong.str().empty()) {
        return ::testing::AssertionFailure() << "captured messages:" << wrong.str() << "\n"
                                             << log.dump();
    }
    return ::testing::AssertionSuccess();
}

// The property as stored on the node (not computed by getProperty).
IC::PropertyValue stored(IC::Node const* node, unsigned int id) {
    auto const& properties = node->getProperties();
    auto const found = properties.find(id);
    return found == properties.end() ? IC::PropertyValue() : found->second;
}

// The date-time a read of property 126 yields, or -1 when it is not one.
std::int64_t readDateTime(IC::Node const* node) {
    IC::PropertyValue value;
    if (node->getProperty(126, value).getStatus() != 0 || !value.getFlag() ||
        value.getKind() != IC::PropertyValue::NUMBER ||
        value.getNumber().getKind() != IC::Number::DATETIME) {
        return -1;
    }
    return value.getNumber().getDateTime();
}

// The lines of text that contain marker.
std::vector<std::string> linesWith(std::string const& text, std::string const& marker) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    std::string line;
    while (std::getline(in, line)) {
        if (line.find(marker) != std::string::npos) {
            lines.push_back(line);
        }
    }
    return lines;
}

// The UUID text after reverse_uuid_byte_order under the process's table.
std::string rewritten(std::string uuid) {
    TestMI mi;
    mi.reverse_uuid_byte_order(uuid);
    return uuid;
}

// The table the UUID rewrite tests acquire: one System Information structure.
std::vector<uint8_t> uuidTable() { return endedTableOf({systemInformation(0x0100)}).build(); }

}  // namespace

// ---------------------------------------------------------------------------
// makeComputerNodes

TEST(ComputerSystemBuilder, FullStructureGivesOneComputerSystemNodeWithEveryProperty) {
    REQUIRE_FRESH_TABLE();
    TableBuilder const table = endedTableOf({systemInformation(0x0100)});
    OverrideTable override(table.build(), 2, 6);
    ScopedTimeZone zone("<-0230>2:30");
    smbiostest::LogCapture log;

    std::int64_t const before = static_cast<std::int64_t>(std::time(nullptr));
    ComputerRun run(table);
    std::int64_t const after = static_cast<std::int64_t>(std::time(nullptr));

    std::vector<IC::Node*> const computers = nodesOfType(run.mi, 40);
    ASSERT_EQ(1u, computers.size()) << log.dump();
    IC::Node const* node = computers[0];
    EXPECT_NE(nullptr, dynamic_cast<IC::CmptrNode const*>(node));
    EXPECT_TRUE(isNode(node, 3u, run.root->getNodeId(), 40, 0u, 1u, "Computer System"));
    EXPECT_EQ(run.mi.miIdList, node->getMIIds());
    EXPECT_TRUE(holdsNodes(run.mi, 2, 4));

    EXPECT_EQ((std::vector<unsigned int>{20, 36, 39, 45, 50, 52, 64, 65, 125, 126, 127, 307}),
              propertyIds(node));
    EXPECT_TRUE(hasUnsignedList(node, 125, {1, 9, 12}));
    std::int64_t const time = readDateTime(node);
    EXPECT_GE(time, before);
    EXPECT_LE(time, static_cast<std::int64_t>(std::time(nullptr)));
    expectProperties(
        node, {doubleProp(127, -2.0), stringProp(36, "Corvane"),
               stringProp(39, "RS-7400 [7947AC1]"), stringProp(45, "7947"), stringProp(307, "V1.2"),
               stringProp(50, "SYS-0001"), stringProp(64, UUID_REORDERED), enumProp(65, 1, 6),
               stringProp(52, "SKU-77"), stringProp(20, "Server")});

    // What the builder stored: 126 a date-time made when the node was built,
    // 127 the offset at build time.
    IC::PropertyValue const time126 = stored(node, 126);
    EXPECT_TRUE(time126.getFlag());
    ASSERT_EQ(IC::PropertyValue::NUMBER, time126.getKind());
    EXPECT_EQ(IC::Number::DATETIME, time126.getNumber().getKind());
    EXPECT_GE(time126.getNumber().getDateTime(), before);
    EXPECT_LE(time126.getNumber().getDateTime(), after);
    IC::PropertyValue const zone127 = stored(node, 127);
    EXPECT_TRUE(zone127.getFlag());
    ASSERT_EQ(IC::PropertyValue::NUMBER, zone127.getKind());
    EXPECT_EQ(IC::Number::DOUBLE, zone127.getNumber().getKind());
    EXPECT_DOUBLE_EQ(-2.0, zone127.getNumber().getDouble());

    EXPECT_TRUE(loggedCounts(log, {{2, "makeComputerNodes entry"},
                                   {2, "makeComputerNodes exit"},
                                   {2, "Table 1 length = 27"},
                                   {0, "PlatformUtilities::uuid_unparse error"}}));
    // No chassis structure: the chassis builder ran and made nothing.
    EXPECT_EQ(2u, log.count("makeChassisNodes entry")) << log.dump();
    EXPECT_EQ(0u, log.count("makePlanarNodes entry")) << log.dump();
}

TEST(ComputerSystemBuilder, NoSystemInformationStructureMakesNoNodeAndNothingBelowIt) {
    smbiostest::LogCapture log;
    ComputerRun run(endedTableOf({chassis(0x0300, 0x17), baseboard(0x0200)}));

    ASSERT_EQ(1u, run.mi.nodeList.size());
    EXPECT_EQ(run.root, run.mi.nodeList[0]);
    EXPECT_EQ(3u, run.mi.nextNodeId);
    EXPECT_TRUE(nodesOfType(run.mi, 40).empty());
    EXPECT_TRUE(nodesOfType(run.mi, 1).empty());
    EXPECT_TRUE(nodesOfType(run.mi, 41).empty());
    EXPECT_EQ(0u, log.count("makeChassisNodes entry")) << log.dump();
    EXPECT_EQ(0u, log.count("makePlanarNodes entry")) << log.dump();
    // The shared lists are left as they were.
    EXPECT_EQ(1u, run.lists.storage[3].size());
    EXPECT_EQ(1u, run.lists.storage[2].size());
}

TEST(ComputerSystemBuilder,
     TwoSystemStructuresWithoutBaseboardGetIndexesZeroAndOneEachWithItsOwnChassis) {
    REQUIRE_FRESH_TABLE();
    AcquiredComputerRun const acquired(endedTableOf(twoSystemsAnd({chassis(0x0300, 0x17)})), 2, 4);
    ComputerRun const& run = acquired.run;
    LogCapture const& log = acquired.log;
    std::vector<IC::Node*> const& computers = acquired.computers;
    ASSERT_EQ(2u, computers.size()) << log.dump();
    EXPECT_EQ(0u, computers[0]->getIndex());
    EXPECT_EQ(1u, computers[1]->getIndex());
    EXPECT_TRUE(hasString(computers[0], 39, "First [1111AB1]"));
    EXPECT_TRUE(hasString(computers[1], 39, "Second [2222AB2]"));
    EXPECT_TRUE(hasString(computers[0], 45, "1111"));
    EXPECT_TRUE(hasString(computers[1], 45, "2222"));
    for (IC::Node const* computer : computers) {
        EXPECT_EQ(run.root->getNodeId(), computer->getLinkedId());
        EXPECT_EQ("Computer System", computer->getDescription());
    }

    // Each computer system has a chassis of its own, and each chassis a
    // planar of its own.
    std::vector<IC::Node*> const chassisNodes = nodesOfType(run.mi, 1);
    ASSERT_EQ(2u, chassisNodes.size()) << log.dump();
    EXPECT_EQ(computers[0]->getNodeId(), chassisNodes[0]->getLinkedId());
    EXPECT_EQ(computers[1]->getNodeId(), chassisNodes[1]->getLinkedId());
    std::vector<IC::Node*> const planars = nodesOfType(run.mi, 41);
    ASSERT_EQ(2u, planars.size()) << log.dump();
    EXPECT_EQ(chassisNodes[0]->getNodeId(), planars[0]->getLinkedId());
    EXPECT_EQ(chassisNodes[1]->getNodeId(), planars[1]->getLinkedId());
    // The second subtree comes after the first.
    EXPECT_LT(planars[0]->getNodeId(), computers[1]->getNodeId());
    EXPECT_EQ(2u, run.lists.storage[1].size());
}

TEST(ComputerSystemBuilder, WithBaseboardOnlyTheFirstOfTwoSystemStructuresGetsANode) {
    REQUIRE_FRESH_TABLE();
    AcquiredComputerRun const acquired(
        endedTableOf(twoSystemsAnd({chassis(0x0300, 0x17), baseboard(0x0200)})), 2, 4);
    ComputerRun const& run = acquired.run;
    LogCapture const& log = acquired.log;

    // The planar builder takes every structure over while the first
    // computer system's subtree is built; the walk then finds the list empty.
    std::vector<IC::Node*> const& computers = acquired.computers;
    ASSERT_EQ(1u, computers.size()) << log.dump();
    EXPECT_EQ(0u, computers[0]->getIndex());
    EXPECT_TRUE(hasString(computers[0], 39, "First [1111AB1]"));
    EXPECT_EQ(1u, nodesOfType(run.mi, 1).size());
    EXPECT_EQ(1u, nodesOfType(run.mi, 41).size());
    EXPECT_TRUE(run.lists.storage[1].empty());
    EXPECT_EQ(2u, log.count("Table 1 length = ")) << log.dump();
}

TEST(ComputerSystemBuilder, Smbios21StructureOfLength0x19LacksSkuAndFamily) {
    REQUIRE_FRESH_TABLE();
    AcquiredComputerRun const acquired(
        endedTableOf({systemUpToSerial().bytes(UUID_BYTES).byte(0x06)}), 2, 3);
    LogCapture const& log = acquired.log;
    ASSERT_EQ(0x19u, acquired.firstLength());
    ASSERT_EQ(1u, acquired.computers.size());
    IC::Node const* node = acquired.computers[0];
    EXPECT_EQ((std::vector<unsigned int>{36, 39, 45, 50, 64, 65, 125, 126, 127, 307}),
              propertyIds(node));
    expectProperties(
        node, {noProp(52), noProp(20), enumProp(65, 1, 6), stringProp(64, UUID_AS_FORMATTED)});
    // A product without a part number still sets 45, empty.
    EXPECT_TRUE(hasString(node, 45, ""));
    EXPECT_EQ(2u, log.count("propString offset=25 length=25")) << log.dump();
    EXPECT_EQ(2u, log.count("propString offset=26 length=25")) << log.dump();
}

TEST(ComputerSystemBuilder, Smbios20StructureOfLength8LacksUuidAndWakeUpType) {
    AcquiredComputerRun const acquired(endedTableOf({systemUpToSerial("8837 Blade")}), 2, 0);
    LogCapture const& log = acquired.log;
    ASSERT_EQ(8u, acquired.firstLength());
    ASSERT_EQ(1u, acquired.computers.size());
    IC::Node const* node = acquired.computers[0];
    EXPECT_EQ((std::vector<unsigned int>{36, 39, 45, 50, 125, 126, 127, 307}), propertyIds(node));
    expectProperties(
        node, {stringProp(36, "Corvane"), stringProp(39, "8837 Blade"), stringProp(45, "8837"),
               stringProp(307, "V1.2"), stringProp(50, "SYS-0001"), noProp(64), noProp(65)});
    EXPECT_EQ(2u, log.count("PlatformUtilities::uuid_unparse error ")) << log.dump();
    EXPECT_EQ(0u, log.count("reverse_uuid_byte_order entry")) << log.dump();
}

TEST(ComputerSystemBuilder, StructureTooShortForTheUuidGetsNoUuidProperty) {
    // Length 0x17: the UUID field lacks its last byte.
    std::vector<uint8_t> const fifteen(UUID_BYTES.begin(), UUID_BYTES.begin() + 15);
    AcquiredComputerRun const acquired(endedTableOf({systemUpToSerial().bytes(fifteen)}), 2, 6);
    LogCapture const& log = acquired.log;
    ASSERT_EQ(0x17u, acquired.firstLength());
    ASSERT_EQ(1u, acquired.computers.size());
    IC::Node const* node = acquired.computers[0];
    expectProperties(node, {noProp(64), noProp(65), stringProp(50, "SYS-0001")});
    EXPECT_EQ(2u, log.count("PlatformUtilities::uuid_unparse error ")) << log.dump();
    EXPECT_EQ(0u, log.count("reverse_uuid_byte_order entry")) << log.dump();
}

TEST(ComputerSystemBuilder, StructureEndingRightAfterTheUuidGetsTheUuidButNoWakeUpType) {
    REQUIRE_FRESH_TABLE();
    AcquiredComputerRun const acquired(endedTableOf({systemUpToSerial().bytes(UUID_BYTES)}), 2, 6);
    LogCapture const& log = acquired.log;
    ASSERT_EQ(0x18u, acquired.firstLength());
    ASSERT_EQ(1u, acquired.computers.size());
    IC::Node const* node = acquired.computers[0];
    EXPECT_TRUE(hasString(node, 64, UUID_REORDERED));
    EXPECT_TRUE(lacksProperty(node, 65));
    EXPECT_EQ(0u, log.count("PlatformUtilities::uuid_unparse error")) << log.dump();
}

TEST(ComputerSystemBuilder, Smbios24TableSetsTheUuidAsFormatted) {
    REQUIRE_FRESH_TABLE();
    AcquiredComputerRun const acquired(endedTableOf({systemInformation(0x0100)}), 2, 4);
    ASSERT_EQ(1u, acquired.computers.size());
    EXPECT_TRUE(hasString(acquired.computers[0], 64, UUID_AS_FORMATTED));
    EXPECT_EQ(0u, acquired.log.count("Entering if condition UUID = ")) << acquired.log.dump();
    EXPECT_EQ(2u, acquired.run.mi.getSmBiosMajorVersion());
    EXPECT_EQ(4u, acquired.run.mi.getSmBiosMinorVersion());
}

TEST(ComputerSystemBuilder, Smbios26TableSetsTheUuidWithItsFirstThreeFieldsByteReversed) {
    REQUIRE_FRESH_TABLE();
    AcquiredComputerRun const acquired(endedTableOf({systemInformation(0x0100)}), 2, 6);
    ASSERT_EQ(1u, acquired.computers.size());
    EXPECT_TRUE(hasString(acquired.computers[0], 64, UUID_REORDERED));
    EXPECT_EQ(2u, acquired.log.count("Entering if condition UUID = " + UUID_AS_FORMATTED))
        << acquired.log.dump();
    EXPECT_EQ(2u, acquired.log.count("Exiting if condition UUID = " + UUID_REORDERED))
        << acquired.log.dump();
}

TEST(ComputerSystemBuilder, ProductWithoutPartNumberAndEmptyTextsAreStillSet) {
    REQUIRE_FRESH_TABLE();
    TableBuilder table;
    table.add(Structure(1, 0x0100)
                  .str("")
                  .str("")
                  .str("")
                  .str("")
                  .bytes(UUID_BYTES)
                  .byte(0x00)
                  .str("")
                  .str(""));
    table.endOfTable(0xFEFF);
    OverrideTable override(table.build(), 2, 4);
    ComputerRun run(table);

    std::vector<IC::Node*> const computers = nodesOfType(run.mi, 40);
    ASSERT_EQ(1u, computers.size());
    IC::Node const* node = computers[0];
    EXPECT_EQ((std::vector<unsigned int>{20, 36, 39, 45, 50, 52, 64, 65, 125, 126, 127, 307}),
              propertyIds(node));
    for (unsigned int id : {36u, 39u, 45u, 307u, 50u, 52u, 20u}) {
        EXPECT_TRUE(hasString(node, id, "")) << "property " << id;
    }
    EXPECT_TRUE(hasEnum(node, 65, 1, 0));
}

TEST(ComputerSystemBuilder, GroupMembersAreWrittenToStandardOutput) {
    REQUIRE_FRESH_TABLE();
    PrintingComputerRun const printing(
        endedTableOf({systemInformation(0x0100),
                      group(0x0E00, "Cluster", {{3, 0x0300}, {1, 0x0100}, {4, 0x0400}}),
                      group(0x0E01, "Other", {{7, 0x0700}})}));
    std::string const& output = printing.output;
    LogCapture const& log = printing.log;
    EXPECT_EQ(1u, nodesOfType(printing.run->mi, 40).size());

    EXPECT_EQ((std::vector<std::string>{"Computer Node group member  Type=3 Handle=768",
                                        "Computer Node group member  Type=4 Handle=1024"}),
              linesWith(output, "Computer Node group member"))
        << output;
    // Standard output only: the log does not carry the lines.
    EXPECT_EQ(0u, log.count("Computer Node group member")) << log.dump();
    EXPECT_EQ(2u, log.count("  Target 1 handle 256 found in group Cluster")) << log.dump();
}

TEST(ComputerSystemBuilder, WithBaseboardTheGroupLookupSeesTheEmptiedListsAndWritesNothing) {
    REQUIRE_FRESH_TABLE();
    PrintingComputerRun const printing(
        endedTableOf({systemInformation(0x0100), chassis(0x0300, 0x17), baseboard(0x0200),
                      group(0x0E00, "Cluster", {{3, 0x0300}, {1, 0x0100}, {4, 0x0400}})}));
    std::string const& output = printing.output;
    LogCapture const& log = printing.log;
    EXPECT_EQ(1u, nodesOfType(printing.run->mi, 41).size()) << log.dump();

    EXPECT_TRUE(linesWith(output, "Computer Node group member").empty()) << output;
    EXPECT_EQ(0u, log.count("  Target 1 handle 256")) << log.dump();
}

TEST(ComputerSystemBuilder, TimeZoneOffsetIsStoredAtBuildTime) {
    REQUIRE_FRESH_TABLE();
    TableBuilder const table = endedTableOf({systemInformation(0x0100)});
    OverrideTable override(table.build(), 2, 4);
    std::unique_ptr<ComputerRun> run;
    {
        ScopedTimeZone zone("<+0530>-5:30");
        run.reset(new ComputerRun(table));
    }
    std::vector<IC::Node*> const computers = nodesOfType(run->mi, 40);
    ASSERT_EQ(1u, computers.size());
    IC::Node const* node = computers[0];
    IC::PropertyValue const zone127 = stored(node, 127);
    ASSERT_EQ(IC::PropertyValue::NUMBER, zone127.getKind());
    ASSERT_EQ(IC::Number::DOUBLE, zone127.getNumber().getKind());
    EXPECT_DOUBLE_EQ(5.0, zone127.getNumber().getDouble());
    // Read under another zone, the node answers with the zone of the read.
    ScopedTimeZone other("<-0230>2:30");
    EXPECT_TRUE(hasDouble(node, 127, -2.0));
}

// ---------------------------------------------------------------------------
// IC::CmptrNode::getProperty

TEST(ComputerSystemNode, Property126IsADateTimeMadeAfreshAtEachRead) {
    smbiostest::LogCapture log;
    IC::CmptrNode node(7, 2, {1}, 40, 0);
    // A date-time stored long ago is never what a read yields.
    node.setProperty(126, IC::PropertyValue(IC::Number(IC::Number::NONE), true));

    std::int64_t const before = static_cast<std::int64_t>(std::time(nullptr));
    std::int64_t const first = readDateTime(&node);
    ASSERT_GE(first, before);
    // Wait until the clock has moved on by a second.
    while (static_cast<std::int64_t>(std::time(nullptr)) <= first) {
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
    }
    std::int64_t const second = readDateTime(&node);
    EXPECT_GT(second, first);
    EXPECT_LE(second, static_cast<std::int64_t>(std::time(nullptr)));
    EXPECT_EQ(4u, log.count("   Time=")) << log.dump();
    EXPECT_EQ(4u, log.count("getProperty entry")) << log.dump();
}

TEST(ComputerSystemNode, Properties126And127AreAnsweredEvenWhenNeverSet) {
    ScopedTimeZone zone("<-0230>2:30");
    IC::CmptrNode node(7, 2, {1}, 40, 0);
    ASSERT_TRUE(node.getProperties().empty());
    IC::PropertyValue value;
    IC::Error const time = node.getProperty(126, value);
    EXPECT_EQ(0u, time.getStatus());
    EXPECT_TRUE(value.getFlag());
    ASSERT_EQ(IC::PropertyValue::NUMBER, value.getKind());
    EXPECT_EQ(IC::Number::DATETIME, value.getNumber().getKind());

    IC::Error const offset = node.getProperty(127, value);
    EXPECT_EQ(0u, offset.getStatus());
    EXPECT_TRUE(hasDouble(&node, 127, -2.0));
    EXPECT_TRUE(node.getProperties().empty());
}

TEST(ComputerSystemNode, Property127ForKolkataIsFiveHours) {
    ScopedTimeZone zone("Asia/Kolkata");
    if (localOffsetSeconds() != 19800) {
        GTEST_SKIP() << "the system does not know the time zone Asia/Kolkata";
    }
    smbiostest::LogCapture log;
    IC::CmptrNode node(7, 2, {1}, 40, 0);
    EXPECT_TRUE(hasDouble(&node, 127, 5.0));
    EXPECT_EQ(2u, log.count("   Timezone=")) << log.dump();
}

TEST(ComputerSystemNode, Property127ForStJohnsTruncatesTowardZero) {
    ScopedTimeZone zone("America/St_Johns");
    long const offset = localOffsetSeconds();
    // Newfoundland: -3:30 in winter, -2:30 in summer.
    if (offset != -12600 && offset != -9000) {
        GTEST_SKIP() << "the system does not know the time zone America/St_Johns";
    }
    IC::CmptrNode node(7, 2, {1}, 40, 0);
    EXPECT_TRUE(hasDouble(&node, 127, offset == -12600 ? -3.0 : -2.0));
}

// A fixed time zone and the whole hours property 127 gives under it: the
// offset truncated toward zero.
struct ZoneCase {
    char const* name;  // for the test's name
    char const* zone;
    double hours;
};

void PrintTo(ZoneCase const& c, std::ostream* out) { *out << c.zone << " gives " << c.hours; }

class ComputerSystemNodeZone : public ::testing::TestWithParam<ZoneCase> {};

TEST_P(ComputerSystemNodeZone, Property127IsTheOffsetInWholeHoursTruncatedTowardZero) {
    ScopedTimeZone zone(GetParam().zone);
    IC::CmptrNode node(7, 2, {1}, 40, 0);
    EXPECT_TRUE(hasDouble(&node, 127, GetParam().hours));
}

INSTANTIATE_TEST_SUITE_P(Zones, ComputerSystemNodeZone,
                         ::testing::Values(ZoneCase{"PlusFiveThirty", "<+0530>-5:30", 5.0},
                                           ZoneCase{"PlusFiveFortyFive", "<+0545>-5:45", 5.0},
                                           ZoneCase{"MinusThreeThirty", "<-0330>3:30", -3.0},
                                           ZoneCase{"MinusTwoThirty", "<-0230>2:30", -2.0},
                                           ZoneCase{"Utc", "UTC0", 0.0}),
                         [](::testing::TestParamInfo<ZoneCase> const& info) {
                             return std::string(info.param.name);
                         });

TEST(ComputerSystemNode, OtherIdsAreAnsweredByTheStoredProperties) {
    IC::CmptrNode node(7, 2, {1}, 40, 3);
    IC::MutableNode plain(7, 2, {1}, 40, 3);
    node.setProperty(36, IC::PropertyValue("Corvane", true));
    node.setProperty(125, IC::PropertyValue(std::vector<IC::Number>{IC::Number(1u)}, true));

    EXPECT_TRUE(hasString(&node, 36, "Corvane"));
    EXPECT_TRUE(hasUnsignedList(&node, 125, {1}));
    IC::PropertyValue value;
    IC::PropertyValue plainValue;
    IC::Error const missing = node.getProperty(999, value);
    IC::Error const plainMissing = plain.getProperty(999, plainValue);
    EXPECT_NE(0u, missing.getStatus());
    EXPECT_EQ(plainMissing.getStatus(), missing.getStatus());
    EXPECT_EQ(plainMissing.getMessage(), missing.getMessage());

    // The rest of the node is the ordinary node's.
    EXPECT_EQ(7u, node.getNodeId());
    EXPECT_EQ(2u, node.getLinkedId());
    EXPECT_EQ(3u, node.getIndex());
    EXPECT_TRUE(hasNodeType(&node, 40));
}

// ---------------------------------------------------------------------------
// IC::getPartNum

// One rule of the part number cut from a product name: the names it covers,
// each with the part number it yields.
struct PartNumberRule {
    char const* name;  // for the test's name
    std::vector<std::pair<std::string, std::string>> yields;
};

void PrintTo(PartNumberRule const& rule, std::ostream* out) { *out << rule.name; }

class ComputerSystemPartNumberRule : public ::testing::TestWithParam<PartNumberRule> {};

TEST_P(ComputerSystemPartNumberRule, YieldsThePartNumberOfEachName) {
    for (auto const& name : GetParam().yields) {
        EXPECT_EQ(name.second, IC::getPartNum(name.first)) << "\"" << name.first << "\"";
    }
}

INSTANTIATE_TEST_SUITE_P(
    Rules, ComputerSystemPartNumberRule,
    ::testing::Values(
        PartNumberRule{"BracketedModelCodeYieldsItsFourDigits",
                       {{"[7947AC1]", "7947"}, {"System x3650 M3 -[7947AC1]-", "7947"}}},
        PartNumberRule{"NameBeginningWithFourDigitsYieldsThem",
                       {{"8837", "8837"}, {"8837 Blade", "8837"}, {"88371234", "8837"}}},
        PartNumberRule{"BracketFollowedByNonDigitsYieldsEmptyWithoutFallingBack",
                       {{"8837 [AB12345]", ""}, {"8837 [794A123]", ""}}},
        PartNumberRule{"OnlyTheFirstBracketCounts",
                       {{"1234 [AB]-[5678CC1]", ""}, {"[5678]-[AB12345]", "5678"}}},
        PartNumberRule{"ShortNameOrNameWithoutDigitsYieldsEmpty",
                       {{"", ""}, {"8", ""}, {"883", ""}, {"883A", ""}, {"RS-7400", ""}}},
        // "[" at 4 in a name of 9 characters: 4 + 5 is not less than 9; one
        // character more and the bracket counts.
        PartNumberRule{"BracketTooNearTheEndFallsBackToTheStart",
                       {{"8837[1234", "8837"},
                        {"8837 [12]", "8837"},
                        {"Blade [1234", ""},
                        {"[1234", ""},
                        {"8837[12345", "1234"}}}),
    [](::testing::TestParamInfo<PartNumberRule> const& info) {
        return std::string(info.param.name);
    });

TEST(ComputerSystemPartNumber, EntryIsLogged) {
    smbiostest::LogCapture log;
    IC::getPartNum("RS-7400 [7947AC1]");
    EXPECT_TRUE(log.contains("getPartNum entry ")) << log.dump();
}

// ---------------------------------------------------------------------------
// reverse_uuid_byte_order: the rewrite applies from SMBIOS 2.6 to 2.8, above
// 2.60, and from 3.0 on.

TEST(ComputerSystemUuid, Version24KeepsTheTextAsFormatted) {
    REQUIRE_FRESH_TABLE();
    OverrideTable override(uuidTable(), 2, 4);
    smbiostest::LogCapture log;
    EXPECT_EQ(UUID_AS_FORMATTED, rewritten(UUID_AS_FORMATTED));
    EXPECT_TRUE(loggedCounts(log, {{0, "Entering if condition UUID = "},
                                   {2, "reverse_uuid_byte_order entry"},
                                   {2, "reverse_uuid_byte_order exit"},
                                   {2, "SmBios Major Version = 2"},
                                   {2, "SmBios Minor Version = 4"}}));
}

TEST(ComputerSystemUuid, Version26ReordersTheFirstThreeFields) {
    REQUIRE_FRESH_TABLE();
    OverrideTable override(uuidTable(), 2, 6);
    smbiostest::LogCapture log;
    EXPECT_EQ(UUID_REORDERED, rewritten(UUID_AS_FORMATTED));
    EXPECT_EQ(2u, log.count("Entering if condition UUID = " + UUID_AS_FORMATTED)) << log.dump();
    EXPECT_EQ(2u, log.count("Exiting if condition UUID = " + UUID_REORDERED)) << log.dump();
}

// The table's version, and whether the UUID's first three fields are
// reordered at it.
struct UuidVersionCase {
    uint8_t major;
    uint8_t minor;
    bool reordered;
};

void PrintTo(UuidVersionCase const& c, std::ostream* out) {
    *out << "SMBIOS " << int(c.major) << "." << int(c.minor)
         << (c.reordered ? " reorders" : " keeps the text");
}

class ComputerSystemUuidVersion : public ::testing::TestWithParam<UuidVersionCase> {};

TEST_P(ComputerSystemUuidVersion, ReordersTheFirstThreeFieldsOnlyWhereTheVersionSaysSo) {
    REQUIRE_FRESH_TABLE();
    OverrideTable override(uuidTable(), GetParam().major, GetParam().minor);
    EXPECT_EQ(GetParam().reordered ? UUID_REORDERED : UUID_AS_FORMATTED,
              rewritten(UUID_AS_FORMATTED));
}

INSTANTIATE_TEST_SUITE_P(
    Versions, ComputerSystemUuidVersion,
    ::testing::Values(UuidVersionCase{1, 9, false}, UuidVersionCase{2, 5, false},
                      UuidVersionCase{2, 7, true}, UuidVersionCase{2, 8, true},
                      UuidVersionCase{2, 9, false}, UuidVersionCase{2, 60, false},
                      UuidVersionCase{2, 61, true}, UuidVersionCase{3, 0, true}),
    [](::testing::TestParamInfo<UuidVersionCase> const& info) {
        return "V" + std::to_string(info.param.major) + "_" + std::to_string(info.param.minor);
    });

TEST(ComputerSystemUuid, RewriteStoresTheTableVersionInThePlugIn) {
    REQUIRE_FRESH_TABLE();
    OverrideTable override(uuidTable(), 3, 2);
    TestMI mi;
    EXPECT_EQ(0u, mi.getSmBiosMajorVersion());
    std::string uuid = UUID_AS_FORMATTED;
    mi.reverse_uuid_byte_order(uuid);
    EXPECT_EQ(3u, mi.getSmBiosMajorVersion());
    EXPECT_EQ(2u, mi.getSmBiosMinorVersion());
}

TEST(ComputerSystemUuid, TextOf19CharactersIsNotRewritten) {
    REQUIRE_FRESH_TABLE();
    OverrideTable override(uuidTable(), 3, 0);
    EXPECT_EQ("00112233-4455-6677-", rewritten("00112233-4455-6677-"));
    EXPECT_EQ("", rewritten(""));
}

TEST(ComputerSystemUuid, TextOf20CharactersIsRewritten) {
    REQUIRE_FRESH_TABLE();
    OverrideTable override(uuidTable(), 3, 0);
    EXPECT_EQ("33221100-5544-7766-8", rewritten("00112233-4455-6677-8"));
}

TEST(ComputerSystemUuid, LowerCaseTextIsRewrittenTheSameWay) {
    REQUIRE_FRESH_TABLE();
    OverrideTable override(uuidTable(), 2, 7);
    EXPECT_EQ("d4c3b2a1-f6e5-0807-090a-0b0c0d0e0f10",
              rewritten("a1b2c3d4-e5f6-0708-090a-0b0c0d0e0f10"));
}
