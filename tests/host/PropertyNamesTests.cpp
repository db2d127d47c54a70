// The catalog of property names: ordered and without duplicates, so that it
// can be searched by halves, every entry with a name, every table of value
// meanings ordered too, and the lookups answering for what it holds and for
// nothing else.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <set>
#include <string>
#include <utility>

#include "inventory/PropertyNames.h"

namespace {

using inventory::PropertyInfo;
using inventory::ValueMeaning;

// The node types the builders make: every catalog entry names one of them.
std::set<unsigned int> const kNodeTypes = {1,  3,  4,  13, 15, 19, 21, 22, 31, 32,
                                           35, 40, 41, 42, 50, 53, 55, 59, 62, 70};

TEST(PropertyNames, CatalogIsOrderedByNodeTypeThenIdWithoutDuplicates) {
    std::size_t count = 0;
    PropertyInfo const* const catalog = inventory::propertyCatalog(count);
    ASSERT_NE(catalog, nullptr);
    ASSERT_GT(count, 100u);
    for (std::size_t i = 1; i < count; ++i) {
        std::pair<unsigned int, unsigned int> const previous(catalog[i - 1].nodeType,
                                                             catalog[i - 1].id);
        std::pair<unsigned int, unsigned int> const current(catalog[i].nodeType, catalog[i].id);
        EXPECT_LT(previous, current)
            << "entry " << i << ": type " << current.first << " id " << current.second
            << " after type " << previous.first << " id " << previous.second;
    }
}

TEST(PropertyNames, EveryEntryHasANameAUnitTextAndAKnownNodeType) {
    std::size_t count = 0;
    PropertyInfo const* const catalog = inventory::propertyCatalog(count);
    for (std::size_t i = 0; i < count; ++i) {
        PropertyInfo const& entry = catalog[i];
        SCOPED_TRACE("type " + std::to_string(entry.nodeType) + " id " + std::to_string(entry.id));
        EXPECT_EQ(kNodeTypes.count(entry.nodeType), 1u);
        ASSERT_NE(entry.name, nullptr);
        EXPECT_GT(std::strlen(entry.name), 1u);
        ASSERT_NE(entry.unit, nullptr);
        EXPECT_EQ(entry.meanings == nullptr, entry.meaningCount == 0);
    }
}

TEST(PropertyNames, EveryMeaningTableIsOrderedByValueWithoutDuplicates) {
    std::size_t count = 0;
    PropertyInfo const* const catalog = inventory::propertyCatalog(count);
    std::size_t tables = 0;
    for (std::size_t i = 0; i < count; ++i) {
        PropertyInfo const& entry = catalog[i];
        SCOPED_TRACE("type " + std::to_string(entry.nodeType) + " id " + std::to_string(entry.id));
        for (std::size_t k = 0; k < entry.meaningCount; ++k) {
            ASSERT_NE(entry.meanings[k].meaning, nullptr);
            EXPECT_GT(std::strlen(entry.meanings[k].meaning), 1u);
            if (k > 0) {
                EXPECT_LT(entry.meanings[k - 1].value, entry.meanings[k].value) << "row " << k;
            }
        }
        tables += entry.meaningCount != 0 ? 1 : 0;
    }
    EXPECT_GE(tables, 25u);
}

TEST(PropertyNames, FindPropertyFindsEveryEntryAndNothingElse) {
    std::size_t count = 0;
    PropertyInfo const* const catalog = inventory::propertyCatalog(count);
    for (std::size_t i = 0; i < count; ++i) {
        EXPECT_EQ(inventory::findProperty(catalog[i].nodeType, catalog[i].id), &catalog[i]);
    }
    EXPECT_EQ(inventory::findProperty(0, 0), nullptr);
    EXPECT_EQ(inventory::findProperty(40, 21), nullptr);
    EXPECT_EQ(inventory::findProperty(59, 1), nullptr);
    EXPECT_EQ(inventory::findProperty(1000, 36), nullptr);
}

TEST(PropertyNames, NamesUnitsAndMeaningsOfSomeWellKnownProperties) {
    PropertyInfo const* const maker = inventory::findProperty(40, 36);
    ASSERT_NE(maker, nullptr);
    EXPECT_STREQ(maker->name, "Manufacturer");
    EXPECT_STREQ(maker->unit, "");

    PropertyInfo const* const installed = inventory::findProperty(31, 73);
    ASSERT_NE(installed, nullptr);
    EXPECT_STREQ(installed->name, "Installed size");
    EXPECT_STREQ(installed->unit, "KB");

    PropertyInfo const* const speed = inventory::findProperty(4, 38);
    ASSERT_NE(speed, nullptr);
    EXPECT_STREQ(speed->unit, "MHz");

    PropertyInfo const* const voltage = inventory::findProperty(21, 14);
    ASSERT_NE(voltage, nullptr);
    EXPECT_STREQ(voltage->unit, "V");

    // A value the chassis builder maps, and the SMBIOS meaning of a field
    // it passes on unchanged.
    PropertyInfo const* const chassisType = inventory::findProperty(1, 11);
    ASSERT_NE(chassisType, nullptr);
    EXPECT_STREQ(inventory::valueMeaning(*chassisType, 7), "Tower");
    PropertyInfo const* const bootUp = inventory::findProperty(1, 4);
    ASSERT_NE(bootUp, nullptr);
    EXPECT_STREQ(inventory::valueMeaning(*bootUp, 3), "Safe");
    EXPECT_EQ(inventory::valueMeaning(*bootUp, 0), nullptr);
    EXPECT_EQ(inventory::valueMeaning(*bootUp, 7), nullptr);

    PropertyInfo const* const family = inventory::findProperty(4, 298);
    ASSERT_NE(family, nullptr);
    EXPECT_STREQ(inventory::valueMeaning(*family, 0xB3), "Xeon");

    // A property without value meanings answers none for any value.
    EXPECT_EQ(inventory::valueMeaning(*maker, 1), nullptr);
}

}  // namespace
