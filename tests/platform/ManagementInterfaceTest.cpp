// IC::ManagementInterface: initialization, node-list ownership and lookup.
#include <gtest/gtest.h>

#include "IC/ManagementInterface.h"
#include "IC/MutableNode.h"

using IC::Error;
using IC::ManagementInterface;
using IC::MutableNode;
using IC::Node;
using IC::Number;

namespace {

// Opens up the protected state so that the tests can check it.
class TestMI : public ManagementInterface {
public:
    unsigned int id() const { return miId; }
    unsigned int nextId() const { return nextNodeId; }
    std::vector<unsigned int> const& ids() const { return miIdList; }
};

// A node that counts its deletions.
class CountingNode : public MutableNode {
public:
    CountingNode(unsigned int nodeId, int& deletions)
        : MutableNode(nodeId, 0, {1}, 0, 0), deletions_(deletions) {}
    ~CountingNode() override { ++deletions_; }

private:
    int& deletions_;
};

Node* add(ManagementInterface& mi, Node* node) {
    EXPECT_EQ(0u, mi.addNewNode(node).getStatus());
    return node;
}

Error alertCallback(std::vector<IC::Alert> const&, void const*) { return Error(); }
Error loadCallback(Node* const&, void const*) { return Error(); }
Error findCallback(std::string const&, Node**) { return Error(); }

}  // namespace

TEST(ManagementInterface, ConstructorStartsEmpty) {
    TestMI mi;
    EXPECT_EQ(0u, mi.id());
    EXPECT_EQ(1u, mi.nextId());
    EXPECT_TRUE(mi.ids().empty());
    std::vector<Node*> nodes{nullptr};
    EXPECT_EQ(0u, mi.getMap(nodes).getStatus());
    EXPECT_TRUE(nodes.empty());
}

TEST(ManagementInterface, InitializeSetsIdListAndNextId) {
    TestMI mi;
    Error const error = mi.initialize(7, Number(1u), Number(2u));
    EXPECT_EQ(0u, error.getStatus());
    EXPECT_EQ("", error.getMessage());
    EXPECT_EQ(7u, mi.id());
    EXPECT_EQ((std::vector<unsigned int>{7}), mi.ids());
    EXPECT_EQ(8u, mi.nextId());
}

TEST(ManagementInterface, SecondInitializeDeletesEarlierNodes) {
    int deletions = 0;
    TestMI mi;
    mi.initialize(7, Number(0u), Number(0u));
    add(mi, new CountingNode(8, deletions));
    add(mi, new CountingNode(9, deletions));
    add(mi, new CountingNode(10, deletions));
    mi.initialize(20, Number(0u), Number(0u));
    EXPECT_EQ(3, deletions);
    std::vector<Node*> nodes;
    mi.getMap(nodes);
    EXPECT_TRUE(nodes.empty());
    EXPECT_EQ(20u, mi.id());
    EXPECT_EQ((std::vector<unsigned int>{20}), mi.ids());
    EXPECT_EQ(21u, mi.nextId());
}

TEST(ManagementInterface, GetMapCopiesNodesInCreationOrder) {
    ManagementInterface mi;
    Node* first = add(mi, new MutableNode(2, 0, {1}, 0, 0));
    Node* second = add(mi, new MutableNode(3, 0, {1}, 0, 0));
    std::vector<Node*> nodes;
    EXPECT_EQ(0u, mi.getMap(nodes).getStatus());
    EXPECT_EQ((std::vector<Node*>{first, second}), nodes);
}

TEST(ManagementInterface, AddNewNodeRejectsNull) {
    ManagementInterface mi;
    Node* node = nullptr;
    EXPECT_EQ(1u, mi.addNewNode(node).getStatus());
    std::vector<Node*> nodes;
    mi.getMap(nodes);
    EXPECT_TRUE(nodes.empty());
}

TEST(ManagementInterface, DeleteNodeRemovesAndDeletes) {
    int deletions = 0;
    ManagementInterface mi;
    Node* keep = add(mi, new CountingNode(2, deletions));
    Node* drop = add(mi, new CountingNode(3, deletions));
    EXPECT_EQ(0u, mi.deleteNode(drop).getStatus());
    EXPECT_EQ(1, deletions);
    std::vector<Node*> nodes;
    mi.getMap(nodes);
    EXPECT_EQ((std::vector<Node*>{keep}), nodes);
}

TEST(ManagementInterface, DeleteNodeFailsForNodeNotInList) {
    int deletions = 0;
    ManagementInterface mi;
    add(mi, new CountingNode(2, deletions));
    CountingNode stranger(9, deletions);
    EXPECT_EQ(1u, mi.deleteNode(&stranger).getStatus());
    EXPECT_EQ(1u, mi.deleteNode(nullptr).getStatus());
    EXPECT_EQ(0, deletions);
}

TEST(ManagementInterface, UnloadDeletesEveryNode) {
    int deletions = 0;
    ManagementInterface mi;
    add(mi, new CountingNode(2, deletions));
    add(mi, new CountingNode(3, deletions));
    EXPECT_EQ(0u, mi.unload().getStatus());
    EXPECT_EQ(2, deletions);
    std::vector<Node*> nodes;
    mi.getMap(nodes);
    EXPECT_TRUE(nodes.empty());
}

TEST(ManagementInterface, DestructorDeletesNodes) {
    int deletions = 0;
    {
        ManagementInterface mi;
        add(mi, new CountingNode(2, deletions));
        add(mi, new CountingNode(3, deletions));
        EXPECT_EQ(0, deletions);
    }
    EXPECT_EQ(2, deletions);
}

TEST(ManagementInterface, DeletesThroughBasePointerWithNodes) {
    int deletions = 0;
    ManagementInterface* mi = new TestMI;
    add(*mi, new CountingNode(2, deletions));
    delete mi;
    EXPECT_EQ(1, deletions);
}

TEST(ManagementInterface, GetNodeFindsByPath) {
    ManagementInterface mi;
    auto* root = new MutableNode(2, 0, {1}, 0, 0);
    root->setPath("1");
    auto* child = new MutableNode(3, 0, {1}, 0, 0);
    child->setPath("1.4");
    add(mi, root);
    add(mi, child);
    Node* found = nullptr;
    EXPECT_EQ(0u, mi.getNode("1.4", found).getStatus());
    EXPECT_EQ(child, found);
}

TEST(ManagementInterface, GetNodeFindsByDecimalId) {
    ManagementInterface mi;
    add(mi, new MutableNode(2, 0, {1}, 0, 0));
    Node* second = add(mi, new MutableNode(13, 0, {1}, 0, 0));
    Node* found = nullptr;
    EXPECT_EQ(0u, mi.getNode("13", found).getStatus());
    EXPECT_EQ(second, found);
}

TEST(ManagementInterface, GetNodePrefersPathOverId) {
    ManagementInterface mi;
    Node* byId = add(mi, new MutableNode(12, 0, {1}, 0, 0));
    auto* byPath = new MutableNode(30, 0, {1}, 0, 0);
    byPath->setPath("12");
    add(mi, byPath);
    Node* found = nullptr;
    EXPECT_EQ(0u, mi.getNode("12", found).getStatus());
    EXPECT_EQ(byPath, found);
    EXPECT_NE(byId, found);
}

TEST(ManagementInterface, GetNodeFailsWhenNothingMatches) {
    ManagementInterface mi;
    add(mi, new MutableNode(2, 0, {1}, 0, 0));
    MutableNode sentinel(50, 0, {1}, 0, 0);
    Node* found = &sentinel;
    EXPECT_EQ(1u, mi.getNode("99", found).getStatus());
    EXPECT_EQ(nullptr, found);
}

TEST(ManagementInterface, CallbackRegistrationSucceeds) {
    ManagementInterface mi;
    int context = 0;
    EXPECT_EQ(0u, mi.registerForAlerts(&alertCallback, &context).getStatus());
    EXPECT_EQ(0u, mi.setLoadCallBack(&loadCallback, &context, &findCallback).getStatus());
    EXPECT_EQ(0u, mi.deRegisterForAlerts().getStatus());
}

TEST(ManagementInterface, TextFormNamesIdAndNodeCount) {
    ManagementInterface mi;
    mi.initialize(1, Number(0u), Number(0u));
    add(mi, new MutableNode(2, 0, {1}, 0, 0));
    add(mi, new MutableNode(3, 0, {1}, 0, 0));
    EXPECT_EQ("ManagementInterface id=1 nodes=2", static_cast<std::string>(mi));
}
