// The diagnostics firmware builder: the preboot diagnostics image's OEM
// string, found by its eye-catcher, its version grammar with each rejection
// and its log text, and the one node per OEM Strings structure.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "BuilderFixture.h"

using namespace buildertest;

namespace {

std::string const EYE = "$DS Corvane Preboot Diagnostics (KVD)";
std::string const DESCRIPTION = "Corvane Preboot Diagnostics (KVD)";

std::string const MISSING_MAJOR = "KVD string missing major version info: ";
std::string const NOT_XY = "KVD string version number is not x.y form: ";
std::string const NO_BLANK = "KVD string version number missing blank termination: ";
std::string const NO_BUILD = "KVD version string missing build id: ";
std::string const NO_BUILD_END = "KVD version string missing build id end ']-': ";

// The diagnostics nodes (type 53) in node-list order.
std::vector<IC::Node*> kvdNodes(TestMI const& mi) { return nodesOfType(mi, 53); }

// Whether the exact text was logged (through the log output).
bool loggedExactly(std::string const& text) {
    for (std::string const& logged : loggedTexts()) {
        if (logged == text) {
            return true;
        }
    }
    return false;
}

// The builder run on mi over a table, under a planar added first (node id
// 2); the log is captured from the run on, and nodes holds the diagnostics
// nodes made.
struct KvdRun {
    KvdRun(TestMI& mi, TableBuilder const& table) : built(table), planar(addParent(mi)) {
        mi.makeKVDNode(built.lists.get(), planar->getNodeId());
        nodes = kvdNodes(mi);
    }

    ParsedTable built;
    IC::MutableNode* planar;
    LogCapture log;
    std::vector<IC::Node*> nodes;
};

// A table of OEM Strings structures, one per list of strings, with handles
// from 0x0B00 up.
TableBuilder oemTable(std::vector<std::vector<std::string>> const& structures) {
    TableBuilder table;
    uint16_t handle = 0x0B00;
    for (std::vector<std::string> const& strings : structures) {
        table.add(oemStrings(handle++, strings));
    }
    return table;
}

}  // namespace

TEST(KvdNode, ExampleStringMakesOneNodeWithEveryField) {
    TestMI mi;
    std::string const text = EYE + " 3.10 -[AB12C-3.10]-";
    KvdRun const run(mi, oemTable({{"Corvane Systems", text}}));
    LogCapture const& log = run.log;
    StructureLists const& lists = run.built.lists;

    std::vector<IC::Node*> const& nodes = run.nodes;
    ASSERT_EQ(1u, nodes.size()) << log.dump();
    IC::Node const* node = nodes[0];
    EXPECT_TRUE(isNode(node, 3u, 2u, 53, 0u, 1u, DESCRIPTION));
    EXPECT_EQ(std::vector<unsigned int>{1}, node->getMIIds());
    EXPECT_EQ((std::vector<unsigned int>{104, 107, 134, 171}), propertyIds(node));
    expectProperties(node, {stringProp(134, "3.10 -[AB12C-3.10]-"), unsignedProp(104, 3),
                            unsignedProp(107, 10), stringProp(171, "AB12C-3.10")});
    EXPECT_EQ(node, lists.storage[11][0].node);
    EXPECT_EQ(2u, mi.nodeList.size());
    EXPECT_TRUE(childrenOf(mi, 3).empty());

    // The scan, in order, at the detail level.
    std::vector<std::string> const expected = {
        "makeKVDNodes entry",
        "String count = 2",
        "Reading ix = 1",
        "Read string 1: Corvane Systems",
        "Reading ix = 2",
        "Read string 2: " + text,
        "Found KVD string: " + text,
        "Found KVD version string: 3.10 -[AB12C-3.10]-",
        "Table 11 length = 5",
        "makeKVDNodes exit",
    };
    std::vector<std::string> scan;
    for (std::string const& logged : loggedTexts()) {
        if (logged.rfind("Table::", 0) != 0) {
            scan.push_back(logged);
        }
    }
    EXPECT_EQ(expected, scan) << log.dump();
    EXPECT_EQ((std::vector<int>{3000}), loggedLevels("Found KVD version string: "));
}

TEST(KvdNode, NoOemStringsStructureMakesNoNode) {
    TestMI mi;
    TableBuilder builder;
    builder.add(Structure(1, 0x0100).str("Corvane"));
    KvdRun const run(mi, builder);
    LogCapture const& log = run.log;

    EXPECT_EQ(1u, mi.nodeList.size());
    EXPECT_EQ((std::vector<std::string>{"makeKVDNodes entry", "makeKVDNodes exit"}), loggedTexts())
        << log.dump();
}

TEST(KvdNode, OemStringsWithoutTheEyeCatcherMakeNoNode) {
    TestMI mi;
    TableBuilder builder;
    // The eye-catcher is matched letter for letter, case included.
    builder.add(oemStrings(0x0B00, {"Corvane Preboot Diagnostics (KVD) 3.10 -[AB12C-3.10]-",
                                    "$ds corvane preboot diagnostics (kvd) 3.10 -[AB12C-3.10]-"}));
    KvdRun const run(mi, builder);
    LogCapture const& log = run.log;

    EXPECT_TRUE(kvdNodes(mi).empty());
    EXPECT_EQ(1u, loggedCount("Reading ix = 2")) << log.dump();
    EXPECT_EQ(0u, loggedCount("Found KVD string: ")) << log.dump();
}

TEST(KvdNode, CountZeroReadsNoString) {
    TestMI mi;
    TableBuilder builder;
    Structure structure(11, 0x0B00);
    structure.byte(0).addString(EYE + " 3.10 -[AB12C-3.10]-");
    builder.add(structure);
    KvdRun const run(mi, builder);
    LogCapture const& log = run.log;

    EXPECT_TRUE(kvdNodes(mi).empty());
    EXPECT_EQ(1u, loggedCount("String count = 0")) << log.dump();
    EXPECT_EQ(0u, loggedCount("Reading ix = ")) << log.dump();
}

// A string with the eye-catcher that the version grammar rejects: the
// reason logged (followed by the string), and a text further logged exactly
// or never logged, where the case says so.
struct Rejection {
    char const* name;  // for the test's name
    std::string text;
    std::string reason;
    std::string alsoLogged;
    std::string neverLogged;
};

void PrintTo(Rejection const& r, std::ostream* out) { *out << "\"" << r.text << "\""; }

class KvdRejection : public ::testing::TestWithParam<Rejection> {};

TEST_P(KvdRejection, MakesNoNodeAndLogsTheReasonWithTheString) {
    Rejection const& rejection = GetParam();
    TestMI mi;
    KvdRun const run(mi, oemTable({{rejection.text}}));
    LogCapture const& log = run.log;
    EXPECT_TRUE(run.nodes.empty());
    EXPECT_TRUE(loggedExactly(rejection.reason + rejection.text)) << log.dump();
    EXPECT_EQ((std::vector<int>{3000}), loggedLevels(rejection.reason));
    if (!rejection.alsoLogged.empty()) {
        EXPECT_TRUE(loggedExactly(rejection.alsoLogged)) << log.dump();
    }
    if (!rejection.neverLogged.empty()) {
        EXPECT_EQ(0u, loggedCount(rejection.neverLogged)) << log.dump();
    }
}

INSTANTIATE_TEST_SUITE_P(
    Grammar, KvdRejection,
    ::testing::Values(
        Rejection{"EyeCatcherFollowedOnlyByBlanksIsMissingMajorVersionInfo", EYE + "   ",
                  MISSING_MAJOR, "", "Found KVD version string: "},
        Rejection{"EyeCatcherAtTheVeryEndIsMissingMajorVersionInfo", "Corvane " + EYE,
                  MISSING_MAJOR, "", ""},
        Rejection{"MajorWithoutDotIsNotXYForm", EYE + " 3 -[X]-", NOT_XY,
                  "Found KVD version string: 3 -[X]-", ""},
        Rejection{"MajorRunningToTheEndIsNotXYForm", EYE + " 31", NOT_XY, "", ""},
        Rejection{"MinorNotFollowedByABlankIsMissingBlankTermination", EYE + " 3.1-[X]-", NO_BLANK,
                  "", ""},
        Rejection{"MinorRunningToTheEndIsMissingBlankTermination", EYE + " 3.1", NO_BLANK, "", ""},
        Rejection{"BuildIdNotOpenedByDashBracketIsMissingBuildId", EYE + " 3.1 [X]-", NO_BUILD, "",
                  ""},
        Rejection{"BlanksToTheEndAfterTheVersionAreMissingBuildId", EYE + " 3.1   ", NO_BUILD, "",
                  ""},
        Rejection{"UnclosedBuildIdIsMissingBuildIdEnd", EYE + " 3.1 -[XYZ", NO_BUILD_END, "", ""},
        // "-[X" leaves p + 4 equal to the length: the build-id start check
        // rejects it before "]-" is looked for.
        Rejection{"UnclosedOneCharacterBuildIdFailsTheLengthCheckBeforeTheEndSearch",
                  EYE + " 3.1 -[X", NO_BUILD, "", NO_BUILD_END},
        // "-[]-" after the blanks: p + 4 is the length, so the start check
        // already fails.
        Rejection{"EmptyBuildIdIsRejected", EYE + " 3.1 -[]-", NO_BUILD, "", ""},
        // Long enough for the start check; "]-" sits at q, where the search
        // does not look, and there is no later one.
        Rejection{"EndSearchStartsOnePastTheBuildIdStartSoAnEmptyBuildIdIsNotFound",
                  EYE + " 3.1 -[]- ", NO_BUILD_END, "", ""}),
    [](::testing::TestParamInfo<Rejection> const& info) { return std::string(info.param.name); });

TEST(KvdNode, EndSearchStartingOnePastTheBuildIdStartFindsALaterEnd) {
    TestMI mi;
    // The "]-" at q is skipped; the one after it ends a build id of "]-".
    KvdRun const run(mi, oemTable({{EYE + " 3.1 -[]-]-"}}));
    ASSERT_EQ(1u, run.nodes.size());
    IC::Node const* node = run.nodes[0];
    EXPECT_TRUE(hasString(node, 171, "]-"));
    EXPECT_TRUE(hasString(node, 134, "3.1 -[]-]-"));
}

TEST(KvdNode, VersionTextStartsAtTheFirstNonBlankAndRunsToTheEnd) {
    TestMI mi;
    // The eye-catcher may sit inside the string; several blanks before the
    // version and before the build id; text after the build id's end stays
    // in the version text.
    KvdRun const run(mi, oemTable({{"OEM: " + EYE + "    12.345   -[Z-9]- tail"}}));
    ASSERT_EQ(1u, run.nodes.size());
    IC::Node const* node = run.nodes[0];
    expectProperties(node, {stringProp(134, "12.345   -[Z-9]- tail"), unsignedProp(104, 12),
                            unsignedProp(107, 345), stringProp(171, "Z-9")});
}

TEST(KvdNode, MissingDigitsGiveZero) {
    TestMI mi;
    KvdRun const run(mi, oemTable({{EYE + " .5 -[B1]-"}, {EYE + " 7. -[B2]-"}}));

    std::vector<IC::Node*> const& nodes = run.nodes;
    ASSERT_EQ(2u, nodes.size());
    expectProperties(nodes[0], {unsignedProp(104, 0), unsignedProp(107, 5), stringProp(171, "B1")});
    expectProperties(nodes[1], {unsignedProp(104, 7), unsignedProp(107, 0), stringProp(171, "B2")});
}

TEST(KvdNode, RejectedStringDoesNotEndTheScan) {
    TestMI mi;
    KvdRun const run(mi, oemTable({{EYE + " 3 -[X]-", EYE + " 4.2 -[GOOD]-"}}));
    LogCapture const& log = run.log;

    std::vector<IC::Node*> const& nodes = run.nodes;
    ASSERT_EQ(1u, nodes.size()) << log.dump();
    expectProperties(nodes[0], {stringProp(134, "4.2 -[GOOD]-"), unsignedProp(104, 4),
                                unsignedProp(107, 2), stringProp(171, "GOOD")});
    EXPECT_EQ(1u, loggedCount(NOT_XY)) << log.dump();
}

TEST(KvdNode, TwoValidStringsInOneStructureOnlyTheFirstMakesANode) {
    TestMI mi;
    KvdRun const run(mi, oemTable({{EYE + " 1.1 -[FIRST]-", EYE + " 2.2 -[SECOND]-", "Other"}}));
    LogCapture const& log = run.log;

    std::vector<IC::Node*> const& nodes = run.nodes;
    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(hasString(nodes[0], 171, "FIRST"));
    EXPECT_TRUE(hasUnsigned(nodes[0], 104, 1));
    // The scan stops at the accepted string.
    EXPECT_EQ(1u, loggedCount("Reading ix = 1")) << log.dump();
    EXPECT_EQ(0u, loggedCount("Reading ix = 2")) << log.dump();
    EXPECT_EQ(1u, loggedCount("Table 11 length = ")) << log.dump();
}

TEST(KvdNode, SameStringsInTwoStructuresMakeTwoNodesWithIndex0And1) {
    TestMI mi;
    KvdRun const run(mi, oemTable({{EYE + " 1.1 -[FIRST]-", EYE + " 2.2 -[SECOND]-"},
                                   {EYE + " 1.1 -[FIRST]-", EYE + " 2.2 -[SECOND]-"}}));
    StructureLists const& lists = run.built.lists;

    std::vector<IC::Node*> const& nodes = run.nodes;
    ASSERT_EQ(2u, nodes.size());
    for (unsigned int i = 0; i < 2; ++i) {
        EXPECT_EQ(3u + i, nodes[i]->getNodeId());
        EXPECT_EQ(2u, nodes[i]->getLinkedId());
        EXPECT_EQ(i, nodes[i]->getIndex());
        EXPECT_EQ(1u, nodes[i]->getStatus());
        EXPECT_EQ(DESCRIPTION, nodes[i]->getDescription());
        EXPECT_TRUE(hasString(nodes[i], 171, "FIRST"));
        EXPECT_EQ(nodes[i], lists.storage[11][i].node);
    }
}

TEST(KvdNode, IndexIsThePositionOfTheStructureAmongTheOemStrings) {
    TestMI mi;
    KvdRun const run(mi,
                     oemTable({{"Corvane Systems"}, {EYE + " 3 -[bad]-"}, {EYE + " 5.0 -[K5]-"}}));
    StructureLists const& lists = run.built.lists;

    std::vector<IC::Node*> const& nodes = run.nodes;
    ASSERT_EQ(1u, nodes.size());
    EXPECT_TRUE(hasIdAndIndex(nodes[0], 3, 2));
    EXPECT_TRUE(hasString(nodes[0], 171, "K5"));
    EXPECT_EQ(nullptr, lists.storage[11][0].node);
    EXPECT_EQ(nullptr, lists.storage[11][1].node);
    EXPECT_EQ(nodes[0], lists.storage[11][2].node);
}

TEST(KvdNode, FailureLogsTable11TheStructureIndexAndTheStringIndex) {
    TestMI mi;
    TableBuilder builder;
    builder.add(oemStrings(0x0B00, {EYE + " 1.0 -[OK]-"}));
    // The last structure claims a formatted area longer than its bytes, so
    // its first string cannot be found: the string lookup throws.
    builder.add(oemStrings(0x0B01, {EYE + " 2.0 -[LOST]-"}).length(0x40));
    KvdRun const run(mi, builder);
    ASSERT_EQ(2u, run.built.parsed.getTables().size());
    LogCapture const& log = run.log;

    std::string const logged = firstLogged("Exception=");
    EXPECT_EQ(0u, logged.find("Exception=")) << log.dump();
    EXPECT_NE(std::string::npos, logged.find(" Type=")) << logged;
    EXPECT_NE(std::string::npos, logged.find(" Table 11 index =1")) << logged;
    EXPECT_NE(std::string::npos, logged.find("string index = 1")) << logged;
    EXPECT_EQ((std::vector<int>{6000}), loggedLevels("Exception=")) << log.dump();

    std::vector<IC::Node*> const& nodes = run.nodes;
    ASSERT_EQ(1u, nodes.size());
    EXPECT_EQ(0u, nodes[0]->getIndex());
    EXPECT_TRUE(hasString(nodes[0], 171, "OK"));
    EXPECT_EQ(1u, loggedCount("makeKVDNodes exit")) << log.dump();
}
