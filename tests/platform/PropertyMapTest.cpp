// IC::PropertyMap: the properties of a node by id, read as a map is read.
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "IC/PropertyMap.h"

using IC::Number;
using IC::PropertyMap;
using IC::PropertyValue;

namespace {

std::vector<unsigned int> idsOf(PropertyMap const& properties) {
    std::vector<unsigned int> ids;
    for (auto const& entry : properties) {
        ids.push_back(entry.first);
    }
    return ids;
}

}  // namespace

TEST(PropertyMap, StartsEmpty) {
    PropertyMap const properties;
    EXPECT_TRUE(properties.empty());
    EXPECT_EQ(0u, properties.size());
    EXPECT_EQ(properties.end(), properties.begin());
    EXPECT_EQ(properties.end(), properties.find(0));
    EXPECT_EQ(0u, properties.count(0));
}

TEST(PropertyMap, SetKeepsAscendingIdOrderWhateverTheOrderOfSetting) {
    PropertyMap properties;
    for (unsigned int id : {177u, 178u, 176u, 180u, 179u, 181u, 0u, 4000000000u}) {
        properties.set(id, PropertyValue(Number(id), true));
    }
    EXPECT_EQ((std::vector<unsigned int>{0, 176, 177, 178, 179, 180, 181, 4000000000u}),
              idsOf(properties));
    for (auto const& entry : properties) {
        EXPECT_EQ(PropertyValue(Number(entry.first), true), entry.second);
    }
}

TEST(PropertyMap, LaterSetReplacesEarlierValue) {
    PropertyMap properties;
    properties.set(10, PropertyValue("first", false));
    properties.set(5, PropertyValue("other", false));
    properties.set(10, PropertyValue(std::vector<Number>{Number(1u)}, true));
    EXPECT_EQ(2u, properties.size());
    EXPECT_EQ(PropertyValue(std::vector<Number>{Number(1u)}, true), properties.at(10));
}

TEST(PropertyMap, FindCountAndAtAnswerForSetIdsOnly) {
    PropertyMap properties;
    properties.set(20, PropertyValue("b", false));
    properties.set(10, PropertyValue("a", false));
    ASSERT_NE(properties.end(), properties.find(20));
    EXPECT_EQ(20u, properties.find(20)->first);
    EXPECT_EQ(PropertyValue("b", false), properties.find(20)->second);
    EXPECT_EQ(properties.end(), properties.find(15));
    EXPECT_EQ(properties.end(), properties.find(30));
    EXPECT_EQ(1u, properties.count(10));
    EXPECT_EQ(0u, properties.count(11));
    EXPECT_EQ(PropertyValue("a", false), properties.at(10));
    EXPECT_THROW(properties.at(11), std::out_of_range);
}

TEST(PropertyMap, IndexingAddsAnEmptyValueOnce) {
    PropertyMap properties;
    properties[7] = PropertyValue("seven", true);
    properties[3];
    EXPECT_EQ((std::vector<unsigned int>{3, 7}), idsOf(properties));
    EXPECT_EQ(PropertyValue(), properties.at(3));
    EXPECT_EQ(PropertyValue("seven", true), properties[7]);
    EXPECT_EQ(2u, properties.size());
}

TEST(PropertyMap, SettingAValueOfItsOwnEntryKeepsIt) {
    PropertyMap properties;
    properties.set(1, PropertyValue(std::string(40, 'a'), true));
    // Each set grows the vector past the entry the value is read from.
    for (unsigned int id = 2; id < 40; ++id) {
        properties.set(id, properties.at(1));
    }
    for (auto const& entry : properties) {
        EXPECT_EQ(PropertyValue(std::string(40, 'a'), true), entry.second);
    }
    properties.set(1, properties.at(1));
    EXPECT_EQ(PropertyValue(std::string(40, 'a'), true), properties.at(1));
}

TEST(PropertyMap, CopiesCompareEqualAndStayApart) {
    PropertyMap properties;
    properties.set(2, PropertyValue("two", true));
    PropertyMap copy = properties;
    EXPECT_EQ(properties, copy);
    copy.set(2, PropertyValue("changed", true));
    EXPECT_NE(properties, copy);
    EXPECT_EQ(PropertyValue("two", true), properties.at(2));
    copy.clear();
    EXPECT_TRUE(copy.empty());
}
