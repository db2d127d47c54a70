// makeLogNodes: one system-event-log node per System Event Log structure
// (type 15) under the given parent, its status from the log area length and
// the log status bits, and the header fields written to the log, each read
// whatever the log thresholds.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "BuilderFixture.h"
#include "IC/PropertyValue.h"
#include "LogLevels.h"
#include "QNLog/QNLogger.h"
#include "TreeSnapshot.h"

using namespace buildertest;

namespace {

char const* const LOG_LOGGER = "Quillon.IC.MI.SmBiosMI.SmBiosMILog";
unsigned int const EVENT_LOG_NODE = 35;
unsigned int const FIRMWARE_NODE = 3;
std::string const LOG_NAME = "System Management BIOS System Event Log";

typedef std::vector<unsigned char> Bytes;

// The header of a System Event Log structure.
struct EventLog {
    uint16_t handle = 0x0F00;
    uint16_t areaLength = 0x1000;
    uint16_t headerStart = 0x0000;
    uint16_t dataStart = 0x0010;
    uint8_t accessMethod = 0x03;  // memory-mapped physical 32-bit address
    uint8_t status = 0x01;        // valid, not full
    uint32_t changeToken = 0x12345678;
    uint32_t accessAddress = 0xFFE00000;
    uint8_t headerFormat = 0x01;
    uint8_t descriptorCount = 2;
    uint8_t descriptorLength = 2;
    Bytes descriptors = {0x01, 0x00, 0x02, 0x00};
};

// The structure (SMBIOS 2.1 layout): fields from 0x04 to 0x16, then the
// descriptor bytes from 0x17.
Structure eventLog(EventLog const& log) {
    return Structure(15, log.handle)
        .word(log.areaLength)
        .word(log.headerStart)
        .word(log.dataStart)
        .byte(log.accessMethod)
        .byte(log.status)
        .dword(log.changeToken)
        .dword(log.accessAddress)
        .byte(log.headerFormat)
        .byte(log.descriptorCount)
        .byte(log.descriptorLength)
        .bytes(log.descriptors);
}

Structure eventLog(uint16_t areaLength, uint8_t status) {
    EventLog log;
    log.areaLength = areaLength;
    log.status = status;
    return eventLog(log);
}

// The default structure with `count` log type descriptors of `length` bytes
// announced and `bytes` as the descriptor bytes that follow.
Structure withDescriptors(uint8_t count, uint8_t length, Bytes const& bytes) {
    EventLog log;
    log.descriptorCount = count;
    log.descriptorLength = length;
    log.descriptors = bytes;
    return eventLog(log);
}

// The text a byte vector has as a property value.
std::string bytesText(Bytes const& bytes) { return IC::PropertyValue(bytes, true).toString(); }

// The builder's logged line that starts with label, or "".
std::string loggedLine(std::string const& label) {
    for (std::string const& text : loggedBy(LOG_LOGGER)) {
        if (text.compare(0, label.size(), label) == 0) {
            return text;
        }
    }
    return "";
}

// Each text is the builder's logged line that starts with its label (the
// text up to its first '=').
void expectLoggedLines(std::vector<std::string> const& texts) {
    for (std::string const& text : texts) {
        EXPECT_EQ(text, loggedLine(text.substr(0, text.find('=') + 1)));
    }
}

// The builder over a table, under a firmware node (node id 2; the next id
// is 3).
struct LogRun {
    explicit LogRun(TableBuilder const& table) : parsed(table.build()), lists(parsed) {
        firmware = addParent(mi, FIRMWARE_NODE);
    }

    std::vector<IC::Node*> run() {
        mi.makeLogNodes(lists.get(), firmware->getNodeId());
        return nodesOfType(mi, EVENT_LOG_NODE);
    }

    SD::SmBios parsed;
    StructureLists lists;
    TestMI mi;
    IC::MutableNode* firmware = nullptr;
};

// The status of the one event-log node made from a structure of the given
// log area length and log status.
unsigned int statusOf(uint16_t areaLength, uint8_t status) {
    LogRun setup(tableOf({eventLog(areaLength, status)}));
    std::vector<IC::Node*> const nodes = setup.run();
    EXPECT_EQ(1u, nodes.size());
    return nodes.empty() ? 0xFFFFFFFFu : nodes[0]->getStatus();
}

}  // namespace

TEST(EventLogBuilder, EventLogNodeFieldByField) {
    LogRun setup(tableOf({eventLog(0x1000, 0x01)}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    IC::Node const* node = nodes[0];
    EXPECT_TRUE(
        isNode(node, 3u, setup.firmware->getNodeId(), 35, 0u, 1u, "SmBios System Event Log"));
    EXPECT_EQ(setup.mi.miIdList, node->getMIIds());
    EXPECT_EQ((std::vector<unsigned int>{37, 108, 125}), propertyIds(node));
    expectProperties(node, {stringProp(108, LOG_NAME), unsignedProp(37, 0x1000),
                            unsignedListProp(125, {30, 1, 16, 31})});
    IC::MutableNode const* mutableNode = frametest::asMutable(node);
    ASSERT_NE(nullptr, mutableNode);
    EXPECT_EQ("", mutableNode->getPath());
    EXPECT_EQ("", mutableNode->getParent());
    // The node is recorded in its structure's entry.
    EXPECT_EQ(node, setup.lists.storage[15][0].node);
    EXPECT_TRUE(holdsNodes(setup.mi, 2, 4));
}

TEST(EventLogBuilder, LogAreaLengthIsTheWordAtOffset4) {
    LogRun setup(tableOf({eventLog(0xABCD, 0x01)}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(hasUnsigned(nodes[0], 37, 0xABCD));
}

TEST(EventLogBuilder, HeaderFieldsAreLoggedInOrderWithTheirLabels) {
    smbiostest::LogCapture capture;
    // Every field but the handle as the defaults have it: header start 0,
    // data start 0x10, access method 3, status 1, change token 0x12345678,
    // access address 0xFFE00000, header format 1, two descriptors of two
    // bytes, 01 00 02 00.
    EventLog log;
    log.handle = 0x0031;
    LogRun setup(tableOf({eventLog(log)}));
    setup.run();

    // Change token and access address in their memory order.
    EXPECT_EQ((std::vector<std::string>{
                  "makeLogNodes entry",
                  "Table 15 length = 27",
                  "Handle=49",
                  "Log Header Start offset=0",
                  "Log Data Start offset=16",
                  "Access Method=3",
                  "Log Status=1",
                  "Log Change Status=" + bytesText({0x78, 0x56, 0x34, 0x12}),
                  "Access Method Address=" + bytesText({0x00, 0x00, 0xE0, 0xFF}),
                  "Log Header Format=1",
                  "Number of Log Type Descriptors=2",
                  "Log Type Descriptor Length=2",
                  "Log Type Descriptors=" + bytesText({0x01, 0x00, 0x02, 0x00}),
                  "makeLogNodes exit",
              }),
              loggedBy(LOG_LOGGER))
        << capture.dump();
    EXPECT_EQ("78 56 34 12", bytesText({0x78, 0x56, 0x34, 0x12}));
}

TEST(EventLogBuilder, HeaderNumbersAreLoggedInDecimal) {
    smbiostest::LogCapture capture;
    EventLog log;
    log.handle = 0xFEDC;
    log.headerStart = 0x0100;
    log.dataStart = 0x0ABC;
    log.accessMethod = 0x04;
    log.status = 0x03;
    log.headerFormat = 0xFF;
    LogRun setup(tableOf({eventLog(log)}));
    setup.run();

    expectLoggedLines({"Handle=65244", "Log Header Start offset=256", "Log Data Start offset=2748",
                       "Access Method=4", "Log Status=3", "Log Header Format=255"});
}

TEST(EventLogBuilder, NoEventLogStructureMakesNoNodeAndLogsOnlyEntryAndExit) {
    LogRun setup(
        tableOf({Structure(0, 0x0000).str("Corvane").str("1.0").word(0xE800).str("01/01/2020")}));

    smbiostest::LogCapture capture;
    EXPECT_TRUE(setup.run().empty());
    EXPECT_TRUE(holdsNodes(setup.mi, 1, 3));
    EXPECT_TRUE(loggedOnly({"makeLogNodes entry", "makeLogNodes exit"}));
}

TEST(EventLogBuilder, LogAreaLengthZeroWithLogStatus3GivesStatus16) {
    EXPECT_EQ(16u, statusOf(0, 0x03));
}

TEST(EventLogBuilder, LogAreaLength0x1000WithLogStatus1GivesStatus1) {
    EXPECT_EQ(1u, statusOf(0x1000, 0x01));
}

TEST(EventLogBuilder, LogAreaLength0x1000WithLogStatus3GivesStatus31) {
    EXPECT_EQ(31u, statusOf(0x1000, 0x03));
}

TEST(EventLogBuilder, LogAreaLength0x1000WithLogStatus0GivesStatus30) {
    EXPECT_EQ(30u, statusOf(0x1000, 0x00));
}

TEST(EventLogBuilder, LogFullWithoutValidGivesStatus30) { EXPECT_EQ(30u, statusOf(0x1000, 0x02)); }

TEST(EventLogBuilder, OtherLogStatusBitsAreIgnored) {
    EXPECT_EQ(1u, statusOf(0x0001, 0xFD));
    EXPECT_EQ(31u, statusOf(0xFFFF, 0xFF));
    EXPECT_EQ(30u, statusOf(0x1000, 0xFC));
}

TEST(EventLogBuilder, TwoFirmwareParentsGiveTwoEventLogNodesEachWithIndexZero) {
    LogRun setup(tableOf({eventLog(0x0800, 0x03)}));
    IC::MutableNode* secondFirmware = addParent(setup.mi, FIRMWARE_NODE);
    setup.mi.makeLogNodes(setup.lists.get(), setup.firmware->getNodeId());
    IC::Node const* first = setup.mi.nodeList.back();
    setup.mi.makeLogNodes(setup.lists.get(), secondFirmware->getNodeId());

    std::vector<IC::Node*> const nodes = nodesOfType(setup.mi, EVENT_LOG_NODE);
    ASSERT_EQ(2u, nodes.size());
    EXPECT_EQ(first, nodes[0]);
    EXPECT_EQ(4u, nodes[0]->getNodeId());
    EXPECT_EQ(setup.firmware->getNodeId(), nodes[0]->getLinkedId());
    EXPECT_EQ(5u, nodes[1]->getNodeId());
    EXPECT_EQ(secondFirmware->getNodeId(), nodes[1]->getLinkedId());
    for (IC::Node const* node : nodes) {
        EXPECT_EQ(0u, node->getIndex());
        EXPECT_EQ(31u, node->getStatus());
        EXPECT_TRUE(hasUnsigned(node, 37, 0x0800));
        EXPECT_TRUE(hasString(node, 108, LOG_NAME));
    }
    // The later call's node replaces the earlier one in the entry.
    EXPECT_EQ(nodes[1], setup.lists.storage[15][0].node);
}

TEST(EventLogBuilder, TwoEventLogStructuresGetIndexesZeroAndOne) {
    LogRun setup(tableOf(
        {eventLog(0x1000, 0x01), Structure(0, 0x0000).str("Corvane"), eventLog(0x0000, 0x01)}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(2u, nodes.size());
    EXPECT_TRUE(hasIdIndexAndStatus(nodes[0], 3, 0, 1));
    EXPECT_TRUE(hasIdIndexAndStatus(nodes[1], 4, 1, 16));
    EXPECT_EQ(nodes[0], setup.lists.storage[15][0].node);
    EXPECT_EQ(nodes[1], setup.lists.storage[15][1].node);
}

TEST(EventLogBuilder, DescriptorCountZeroLogsAnEmptyDescriptorList) {
    smbiostest::LogCapture capture;
    LogRun setup(tableOf({withDescriptors(0, 2, {0x01, 0x00})}));
    setup.run();

    EXPECT_EQ("Number of Log Type Descriptors=0", loggedLine("Number of Log Type Descriptors="));
    EXPECT_EQ("Log Type Descriptors=" + bytesText({}), loggedLine("Log Type Descriptors="))
        << capture.dump();
    EXPECT_EQ("Log Type Descriptors=", loggedLine("Log Type Descriptors="));
}

TEST(EventLogBuilder, DescriptorListRunningPastTheStructureReadsWhatIsThereThenZeros) {
    smbiostest::LogCapture capture;
    // Four descriptors of two bytes announced, one present; the string set
    // ("AB") and the end of the structure follow it.
    LogRun setup(tableOf({withDescriptors(4, 2, {0x05, 0x01}).addString("AB")}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(1u, nodes[0]->getStatus());
    EXPECT_EQ("Log Type Descriptors=" + bytesText({0x05, 0x01, 'A', 'B', 0, 0, 0, 0}),
              loggedLine("Log Type Descriptors="))
        << capture.dump();
    EXPECT_EQ("makeLogNodes exit", loggedBy(LOG_LOGGER).back());
}

TEST(EventLogBuilder, LargestDescriptorListIsReadWithoutACrash) {
    smbiostest::LogCapture capture;
    LogRun setup(tableOf({withDescriptors(0xFF, 0xFF, {0x07, 0x08})}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    Bytes expected(0xFFu * 0xFFu, 0);
    expected[0] = 0x07;
    expected[1] = 0x08;
    EXPECT_EQ("Log Type Descriptors=" + bytesText(expected), loggedLine("Log Type Descriptors="));
    EXPECT_EQ("makeLogNodes exit", loggedBy(LOG_LOGGER).back());
}

TEST(EventLogBuilder, StructureOfLength4GivesStatus16) {
    smbiostest::LogCapture capture;
    LogRun setup(tableOf({Structure(15, 0x0F00)}));
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    IC::Node const* node = nodes[0];
    EXPECT_EQ(16u, node->getStatus());
    EXPECT_EQ("SmBios System Event Log", node->getDescription());
    EXPECT_EQ((std::vector<unsigned int>{37, 108, 125}), propertyIds(node));
    EXPECT_TRUE(hasUnsigned(node, 37, 0));
    EXPECT_TRUE(hasUnsignedList(node, 125, {30, 1, 16, 31}));
    EXPECT_TRUE(capture.contains("getNumber16 offset=4 length=4")) << capture.dump();
    // The header fields beyond the structure are logged as 0 or empty.
    expectLoggedLines({"Handle=3840", "Log Header Start offset=0", "Log Status=0",
                       "Log Change Status=" + bytesText({}), "Log Type Descriptors="});
    EXPECT_EQ(0u, capture.count("Exception=")) << capture.dump();
}

TEST(EventLogBuilder, ShortStructureWithoutLogStatusGivesStatusFromTheLengthAlone) {
    smbiostest::LogCapture capture;
    TableBuilder table;
    // Length 0x0A: the log area length is there, the log status is not.
    table.add(Structure(15, 0x0F00).word(0x0400).word(0).byte(0x10).byte(0x00));
    LogRun setup(table);
    std::vector<IC::Node*> const nodes = setup.run();

    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(30u, nodes[0]->getStatus());
    EXPECT_TRUE(hasUnsigned(nodes[0], 37, 0x0400));
    EXPECT_TRUE(capture.contains("getBool8 offset=11 length=10")) << capture.dump();
}

TEST(EventLogBuilder, FailureInOneStructureIsLoggedAndTheNextStructureGoesOn) {
    smbiostest::LogCapture capture;
    TableBuilder table;
    // Length 5: the log area length's first byte is the last byte of the
    // formatted area, so the reader's check passes and the word read fails.
    table.add(Structure(15, 0x0F00).byte(0x10));
    table.add(eventLog(0x1000, 0x03));
    LogRun setup(table);
    std::vector<IC::Node*> const nodes = setup.run();

    EXPECT_TRUE(loggedOutOfRangeAt("Table 15 index =0")) << capture.dump();

    ASSERT_EQ(2u, nodes.size());
    EXPECT_EQ(0u, nodes[0]->getIndex());
    EXPECT_TRUE(lacksProperty(nodes[0], 37));
    EXPECT_TRUE(hasIdIndexAndStatus(nodes[1], 4, 1, 31));
    EXPECT_TRUE(hasUnsigned(nodes[1], 37, 0x1000));
    EXPECT_TRUE(hasUnsignedList(nodes[1], 125, {30, 1, 16, 31}));
    EXPECT_EQ("makeLogNodes exit", loggedBy(LOG_LOGGER).back());
}

// ---------------------------------------------------------------------------
// The log thresholds: the header fields are read whatever they are.

namespace {

// The full structure's formatted area cut to length bytes, the length byte
// rewritten (it has no strings: the double NUL follows).
std::vector<uint8_t> cutEventLog(size_t length) {
    std::vector<uint8_t> bytes = eventLog(EventLog()).build();
    bytes.resize(length);
    bytes[1] = static_cast<uint8_t>(length);
    bytes.push_back(0);
    bytes.push_back(0);
    return bytes;
}

// The builder over the cut structure under a firmware node; the tree as
// text.
std::string cutEventLogTree(size_t length) {
    TableBuilder table;
    table.addRaw(cutEventLog(length));
    LogRun setup(table);
    setup.run();
    return buildertest::treeSnapshot(setup.mi.nodeList);
}

// Where a word field of the header straddles the end of a structure of this
// length: the log area length (0x04), the header start (0x06) and the data
// start (0x08). The handle (0x02) always fits; the other fields are bytes,
// or byte runs read only when they fit whole.
bool wordStraddles(size_t length) { return length == 0x05 || length == 0x07 || length == 0x09; }

}  // namespace

TEST(EventLogLogLevels, HeaderCutAtEachFieldGivesTheSameTreeAndFailureAtEveryLevel) {
    buildertest::ScopedLogLevels const restore;
    buildertest::LogToFile file;
    size_t const full = eventLog(EventLog()).formattedSize();
    ASSERT_EQ(0x1Bu, full);
    for (size_t length = 4; length < full; ++length) {
        SCOPED_TRACE("length " + std::to_string(length));
        bool const straddles = wordStraddles(length);

        // At the default levels: one event-log node, with what was set
        // before a straddling word ended the structure's handling.
        buildertest::ScopedLogLevels::set(QNLog::LEVEL_OFF, QNLog::LEVEL_OFF);
        TableBuilder table;
        table.addRaw(cutEventLog(length));
        LogRun setup(table);
        std::vector<IC::Node*> const nodes = setup.run();
        ASSERT_EQ(1u, nodes.size());
        ASSERT_EQ(length, setup.parsed.getTables()[0].getLength());
        IC::Node const* node = nodes[0];
        if (length == 0x05) {
            // The log area length itself straddles: nothing after the name.
            EXPECT_EQ((std::vector<unsigned int>{108}), propertyIds(node));
            EXPECT_EQ(0u, node->getStatus());
        } else {
            EXPECT_EQ((std::vector<unsigned int>{37, 108, 125}), propertyIds(node));
            EXPECT_TRUE(hasUnsigned(node, 37, length == 4 ? 0 : 0x1000));
            // The log status (0x0B: valid) counts only when it is there.
            unsigned int const status = length == 4 ? 16 : length > 0x0B ? 1 : 30;
            EXPECT_EQ(status, node->getStatus());
        }
        std::string const atDefault = buildertest::treeSnapshot(setup.mi.nodeList);
        EXPECT_EQ(atDefault, cutEventLogTree(length));

        // With every level on: the same tree, and the failure of a
        // straddling word logged at error level.
        {
            smbiostest::LogCapture log;
            std::string const everyLevelOn = cutEventLogTree(length);
            EXPECT_EQ(atDefault, everyLevelOn) << buildertest::snapshotDifference(
                atDefault, everyLevelOn, "default levels", "every level on");
            std::string const failure = frametest::firstLogged("Exception=");
            if (straddles) {
                EXPECT_TRUE(loggedOutOfRangeAt("Table 15 index =0")) << log.dump();
            } else {
                EXPECT_EQ("", failure) << log.dump();
                EXPECT_EQ("makeLogNodes exit", loggedBy(LOG_LOGGER).back()) << log.dump();
            }
            // The header lines stop before the straddling field's own.
            EXPECT_EQ(length != 0x05, loggedLine("Handle=") != "") << log.dump();
            EXPECT_EQ(length != 0x05 && length != 0x07,
                      loggedLine("Log Header Start offset=") != "")
                << log.dump();
            EXPECT_EQ(!straddles, loggedLine("Log Data Start offset=") != "") << log.dump();
            EXPECT_EQ(!straddles, loggedLine("Log Type Descriptors=") != "") << log.dump();
        }

        // At the agent's thresholds (warnings and errors, no details) the
        // header is read as well: the same failure is written to the log.
        buildertest::LevelComparison const result =
            buildertest::compareLevels([length] { return cutEventLogTree(length); }, file);
        EXPECT_TRUE(result.same()) << result.difference();
        EXPECT_EQ(atDefault, result.atDefault);
        ASSERT_EQ(straddles ? 1u : 0u, result.agentMessages.size()) << result.difference();
        if (straddles) {
            EXPECT_NE(std::string::npos,
                      result.agentMessages[0].find(std::string("log 6000 ") + LOG_LOGGER +
                                                   " makeLogNodes SmBiosMILog.cpp:"))
                << result.agentMessages[0];
            EXPECT_NE(std::string::npos, result.agentMessages[0].find("Exception= Type="))
                << result.agentMessages[0];
        }
    }
}
