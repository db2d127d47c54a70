// IC::MutableNode and the text form IC::Node gives every node.
#include <gtest/gtest.h>

#include "IC/MutableNode.h"

using IC::Error;
using IC::MutableNode;
using IC::Number;
using IC::PropertyValue;

TEST(MutableNode, KeepsConstructorValues) {
    MutableNode node(5, 2, {1, 3}, 40, 6);
    EXPECT_EQ(5u, node.getNodeId());
    EXPECT_EQ(2u, node.getLinkedId());
    EXPECT_EQ((std::vector<unsigned int>{1, 3}), node.getMIIds());
    EXPECT_EQ(40u, node.getNodeType());
    EXPECT_EQ(6u, node.getIndex());
}

TEST(MutableNode, DefaultStatusIsZeroAndDescriptionEmpty) {
    MutableNode node(1, 0, {1}, 0, 0);
    EXPECT_EQ(0u, node.getStatus());
    EXPECT_EQ("", node.getDescription());
    EXPECT_EQ("", node.getPath());
    EXPECT_EQ("", node.getParent());
    EXPECT_TRUE(node.getProperties().empty());
}

TEST(MutableNode, SettersStoreValuesAndReturnSuccess) {
    MutableNode node(1, 0, {1}, 0, 0);
    EXPECT_EQ(0u, node.setStatus(3).getStatus());
    EXPECT_EQ(0u, node.setDescription("Memory Device").getStatus());
    EXPECT_EQ(0u, node.setPath("1.4.2").getStatus());
    EXPECT_EQ(0u, node.setParent("1.4").getStatus());
    EXPECT_EQ(3u, node.getStatus());
    EXPECT_EQ("Memory Device", node.getDescription());
    EXPECT_EQ("1.4.2", node.getPath());
    EXPECT_EQ("1.4", node.getParent());
}

TEST(MutableNode, GetPropertyCopiesStoredValue) {
    MutableNode node(1, 0, {1}, 0, 0);
    EXPECT_EQ(0u, node.setProperty(10, PropertyValue("Intel", true)).getStatus());
    PropertyValue value;
    Error const error = node.getProperty(10, value);
    EXPECT_EQ(0u, error.getStatus());
    EXPECT_EQ(PropertyValue("Intel", true), value);
}

TEST(MutableNode, LaterSetReplacesEarlierValue) {
    MutableNode node(1, 0, {1}, 0, 0);
    node.setProperty(10, PropertyValue(Number(1u), false));
    node.setProperty(10, PropertyValue(Number(2u), true));
    PropertyValue value;
    ASSERT_EQ(0u, node.getProperty(10, value).getStatus());
    EXPECT_EQ(PropertyValue(Number(2u), true), value);
    EXPECT_EQ(1u, node.getProperties().size());
}

TEST(MutableNode, MissingPropertyFailsAndLeavesValueUntouched) {
    MutableNode node(1, 0, {1}, 0, 0);
    node.setProperty(10, PropertyValue("set", false));
    PropertyValue value("before", true);
    Error const error = node.getProperty(42, value);
    EXPECT_NE(0u, error.getStatus());
    EXPECT_EQ("property 42 not set", error.getMessage());
    EXPECT_EQ(PropertyValue("before", true), value);
}

TEST(MutableNode, PropertiesAreInAscendingIdOrder) {
    MutableNode node(1, 0, {1}, 0, 0);
    node.setProperty(30, PropertyValue("c", false));
    node.setProperty(10, PropertyValue("a", false));
    node.setProperty(20, PropertyValue("b", false));
    std::vector<unsigned int> ids;
    for (auto const& entry : node.getProperties()) {
        ids.push_back(entry.first);
    }
    EXPECT_EQ((std::vector<unsigned int>{10, 20, 30}), ids);
    EXPECT_EQ(PropertyValue("b", false), node.getProperties().at(20));
}

TEST(MutableNode, AddMIAppendsOnlyNewIds) {
    MutableNode node(1, 0, {1}, 0, 0);
    EXPECT_EQ(0u, node.addMI(4).getStatus());
    EXPECT_EQ(0u, node.addMI(1).getStatus());
    EXPECT_EQ((std::vector<unsigned int>{1, 4}), node.getMIIds());
}

TEST(MutableNode, DelMIRemovesIdAndFailsWhenAbsent) {
    MutableNode node(1, 0, {1, 4, 9}, 0, 0);
    EXPECT_EQ(0u, node.delMI(4).getStatus());
    EXPECT_EQ((std::vector<unsigned int>{1, 9}), node.getMIIds());
    EXPECT_EQ(1u, node.delMI(4).getStatus());
    EXPECT_EQ((std::vector<unsigned int>{1, 9}), node.getMIIds());
}

TEST(MutableNode, TextFormNamesIdsStatusAndDescription) {
    MutableNode node(5, 2, {1}, 0, 0);
    node.setStatus(1);
    node.setDescription("Computer System");
    IC::Node const& asNode = node;
    EXPECT_EQ("Node id=5 linked=2 index=0 status=1 \"Computer System\"",
              static_cast<std::string>(asNode));
}
