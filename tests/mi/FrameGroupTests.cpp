// findGroup: the other members of every group association (type 14) that
// holds a given structure.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "FrameFixture.h"

using frametest::group;
using frametest::StructureLists;
using frametest::tableOf;
using frametest::TestMI;
using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

typedef std::vector<std::pair<unsigned char, unsigned int>> Members;

// The lookup over a table of the given structures.
struct GroupLookup {
    explicit GroupLookup(TableBuilder const& table)
        : parsed(frametest::parse(table)), lists(parsed) {}
    explicit GroupLookup(std::vector<Structure> const& structures)
        : GroupLookup(tableOf(structures)) {}

    Members find(unsigned int type, unsigned int handle) {
        return mi.findGroup(lists.get(), type, handle);
    }

    SD::SmBios parsed;
    StructureLists lists;
    TestMI mi;
};

}  // namespace

TEST(FrameGroup, NoGroupAssociationYieldsNothing) {
    smbiostest::LogCapture log;
    GroupLookup lookup(
        {Structure(1, 0x0100).str("Corvane"), Structure(3, 0x0300).str("Corvane").byte(0x17)});

    EXPECT_TRUE(lookup.find(1, 0x0100).empty());
    EXPECT_EQ(2u, log.count("findGroup entry")) << log.dump();
    EXPECT_EQ(2u, log.count("findGroup exit")) << log.dump();
    EXPECT_EQ(0u, log.count("Table 14 length = ")) << log.dump();
    EXPECT_TRUE(lookup.mi.nodeList.empty());
    EXPECT_EQ(2u, lookup.mi.nextNodeId);
}

TEST(FrameGroup, GroupWithoutItemsIsLoggedAndContributesNothing) {
    smbiostest::LogCapture log;
    GroupLookup lookup({Structure(1, 0x0100).str("Corvane"), group(0x0E00, "Empty", {})});
    ASSERT_EQ(5u, lookup.parsed.getTables()[1].getLength());

    EXPECT_TRUE(lookup.find(1, 0x0100).empty());
    EXPECT_EQ(2u, log.count("Table 14 length = 5 entries=0")) << log.dump();
    EXPECT_EQ(0u, log.count("  Target ")) << log.dump();
    EXPECT_EQ(0u, log.count("  Member ")) << log.dump();
}

TEST(FrameGroup, TargetYieldsTheOtherMembersInItemOrder) {
    smbiostest::LogCapture log;
    GroupLookup lookup({group(0x0E00, "Cluster", {{1, 0x0100}, {3, 0x0300}, {2, 0x0200}})});

    EXPECT_EQ((Members{{3, 0x0300}, {2, 0x0200}}), lookup.find(1, 0x0100));
    EXPECT_TRUE(
        frametest::loggedTimes(log, 2,
                               {"Table 14 length = 14 entries=3",
                                "  Target 1 handle 256 found in group Cluster handle 3584",
                                "  Member 3 handle 768 found in group Cluster handle 3584",
                                "  Member 2 handle 512 found in group Cluster handle 3584"}));
    EXPECT_EQ(4u, log.count("  Member ")) << log.dump();

    // The members are logged in the order they are returned.
    std::vector<std::string> members;
    for (std::string const& text : frametest::loggedTexts()) {
        if (text.compare(0, 9, "  Member ") == 0) {
            members.push_back(text.substr(0, 10));
        }
    }
    EXPECT_EQ((std::vector<std::string>{"  Member 3", "  Member 2"}), members) << log.dump();
}

TEST(FrameGroup, HandleNotInAnyGroupYieldsNothing) {
    smbiostest::LogCapture log;
    GroupLookup lookup({group(0x0E00, "Cluster", {{1, 0x0100}, {3, 0x0300}, {2, 0x0200}})});

    EXPECT_TRUE(lookup.find(1, 0x0101).empty());
    EXPECT_EQ(0u, log.count("  Target ")) << log.dump();
    EXPECT_EQ(0u, log.count("  Member ")) << log.dump();
}

TEST(FrameGroup, TypeMustMatchAsWellAsHandle) {
    smbiostest::LogCapture log;
    GroupLookup lookup({group(0x0E00, "Cluster", {{1, 0x0100}, {3, 0x0300}})});

    EXPECT_TRUE(lookup.find(2, 0x0100).empty());
    EXPECT_EQ(0u, log.count("  Target ")) << log.dump();
}

TEST(FrameGroup, MemberOfTwoGroupsIsReturnedTwiceGroupAfterGroup) {
    smbiostest::LogCapture log;
    GroupLookup lookup({group(0x0E00, "First", {{1, 0x0100}, {4, 0x0400}}),
                        group(0x0E01, "Unrelated", {{4, 0x0400}, {9, 0x0900}}),
                        group(0x0E02, "Second", {{4, 0x0400}, {1, 0x0100}, {7, 0x0700}})});

    EXPECT_EQ((Members{{4, 0x0400}, {4, 0x0400}, {7, 0x0700}}), lookup.find(1, 0x0100));
    EXPECT_EQ(2u, log.count("  Member 4 handle 1024 found in group First handle 3584"))
        << log.dump();
    EXPECT_EQ(2u, log.count("  Member 4 handle 1024 found in group Second handle 3586"))
        << log.dump();
    EXPECT_EQ(0u, log.count("found in group Unrelated")) << log.dump();
}

TEST(FrameGroup, TargetTwiceInOneGroupIsLeftOutBothTimes) {
    smbiostest::LogCapture log;
    GroupLookup lookup({group(0x0E00, "Cluster", {{1, 0x0100}, {3, 0x0300}, {1, 0x0100}})});

    EXPECT_EQ((Members{{3, 0x0300}}), lookup.find(1, 0x0100));
    EXPECT_EQ(4u, log.count("  Target 1 handle 256 found in group Cluster handle 3584"))
        << log.dump();
    EXPECT_EQ(2u, log.count("  Member ")) << log.dump();
}

TEST(FrameGroup, FailingGroupIsLoggedAndTheOtherGroupsStillCount) {
    smbiostest::LogCapture log;
    TableBuilder table;
    table.add(group(0x0E00, "Before", {{1, 0x0100}, {3, 0x0300}}));
    // It holds the target and one member, then an item cut after its type:
    // that item's handle word starts at the last byte of the formatted area,
    // passes the offset check and then runs past the formatted area, so the
    // word read throws and the member collected before it is dropped.
    table.add(Structure(14, 0x0E01)
                  .str("Broken")
                  .byte(1)
                  .word(0x0100)
                  .byte(8)
                  .word(0x0800)
                  .byte(5)
                  .byte(0x00));
    table.add(group(0x0E02, "After", {{1, 0x0100}, {6, 0x0600}}));
    GroupLookup lookup(table);
    ASSERT_EQ(13u, lookup.parsed.getTables()[1].getLength());

    EXPECT_EQ((Members{{3, 0x0300}, {6, 0x0600}}), lookup.find(1, 0x0100));

    std::string const failure = frametest::firstLogged("Exception=");
    EXPECT_EQ(0u, failure.find("Exception=")) << log.dump();
    EXPECT_NE(std::string::npos, failure.find(" Type=")) << failure;
    EXPECT_NE(std::string::npos, failure.find("out_of_range")) << failure;
    EXPECT_NE(std::string::npos, failure.find("Table 14 index =1")) << failure;
    EXPECT_EQ((std::vector<int>{6000}), frametest::loggedLevels("Exception=")) << log.dump();
    EXPECT_EQ(0u, log.count("  Member 8 ")) << log.dump();
    EXPECT_EQ(4u, log.count("  Member ")) << log.dump();
    EXPECT_EQ(2u, log.count("findGroup exit")) << log.dump();
}
