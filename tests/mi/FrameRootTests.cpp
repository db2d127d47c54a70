// makeRootNode: the root of the inventory tree under the management-interface
// node, from which the computer-system builder is started.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "FrameFixture.h"

using frametest::hasNodeType;
using frametest::StructureLists;
using frametest::TestMI;

namespace {

// Every test runs makeRootNode over a table without structures, with the
// log captured.
class FrameRoot : public ::testing::Test {
protected:
    smbiostest::LogCapture log;
    SD::SmBios const parsed{std::vector<unsigned char>{}};
    StructureLists lists{parsed};
};

}  // namespace

TEST_F(FrameRoot, WithoutStructuresMakesOnlyTheRootUnderTheInterfaceNode) {
    TestMI mi;
    ASSERT_TRUE(parsed.getTables().empty());

    mi.makeRootNode(lists.get());

    ASSERT_EQ(1u, mi.nodeList.size()) << log.dump();
    EXPECT_TRUE(frametest::isFirstRootNode(mi.nodeList[0]));
    EXPECT_EQ(3u, mi.nextNodeId);

    EXPECT_EQ(2u, log.count("makeRootNode entry")) << log.dump();
    EXPECT_EQ(2u, log.count("makeRootNode exit")) << log.dump();
    EXPECT_EQ(0u, log.count("Error in node creation")) << log.dump();
}

TEST_F(FrameRoot, TakesTheNextNodeIdAndLinksToTheInterfaceOwnId) {
    TestMI mi(5);
    mi.nextNodeId = 12;

    mi.makeRootNode(lists.get());

    ASSERT_EQ(1u, mi.nodeList.size()) << log.dump();
    IC::Node const* root = mi.nodeList[0];
    EXPECT_TRUE(hasNodeType(root, 59));
    EXPECT_EQ(12u, root->getNodeId());
    EXPECT_EQ(5u, root->getLinkedId());
    EXPECT_EQ(std::vector<unsigned int>{5}, root->getMIIds());
    EXPECT_EQ(13u, mi.nextNodeId);
}

TEST_F(FrameRoot, StartsTheComputerSystemBuilderAfterMakingTheRoot) {
    TestMI mi;

    mi.makeRootNode(lists.get());

    // The computer-system builder runs inside makeRootNode, after the root
    // node is made.
    std::vector<std::string> const texts = frametest::loggedTexts();
    size_t rootEntry = texts.size();
    size_t computerEntry = texts.size();
    size_t rootExit = texts.size();
    for (size_t i = 0; i < texts.size(); ++i) {
        if (texts[i].find("makeRootNode entry") != std::string::npos && rootEntry == texts.size()) {
            rootEntry = i;
        }
        if (texts[i].find("makeComputerNodes entry") != std::string::npos &&
            computerEntry == texts.size()) {
            computerEntry = i;
        }
        if (texts[i].find("makeRootNode exit") != std::string::npos) {
            rootExit = i;
        }
    }
    ASSERT_LT(rootEntry, texts.size()) << log.dump();
    ASSERT_LT(computerEntry, texts.size()) << log.dump();
    ASSERT_LT(rootExit, texts.size()) << log.dump();
    EXPECT_LT(rootEntry, computerEntry) << log.dump();
    EXPECT_LT(computerEntry, rootExit) << log.dump();
}
