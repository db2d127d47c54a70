// The rendering library of smbios-inventory called directly on nodes made
// here: date-times, text escaping, type names, kind names and the shape of
// the tree and of the JSON document.

#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "IC/EnumValue.h"
#include "IC/MutableNode.h"
#include "IC/Number.h"
#include "IC/PropertyValue.h"
#include "inventory/Inventory.h"

namespace {

std::unique_ptr<IC::MutableNode> makeNode(unsigned int id, unsigned int linked, unsigned int type,
                                          std::string const& description) {
    auto node =
        std::make_unique<IC::MutableNode>(id, linked, std::vector<unsigned int>{1}, type, 0);
    node->setDescription(description);
    return node;
}

TEST(InventoryRender, FormatDateTimeGivesUtcCalendarTime) {
    EXPECT_EQ(inventory::formatDateTime(0), "1970-01-01 00:00:00");
    EXPECT_EQ(inventory::formatDateTime(951782400), "2000-02-29 00:00:00");
    EXPECT_EQ(inventory::formatDateTime(1795341600), "2026-11-22 10:00:00");
    EXPECT_EQ(inventory::formatDateTime(-1), "1969-12-31 23:59:59");
    // Beyond the reach of a 32-bit time_t.
    EXPECT_EQ(inventory::formatDateTime(INT64_C(4102444800)), "2100-01-01 00:00:00");
    EXPECT_EQ(inventory::formatDateTime(INT64_C(-62135596800)), "0001-01-01 00:00:00");
}

TEST(InventoryRender, Latin1ToUtf8MapsHighBytesToTheirCodePoints) {
    EXPECT_EQ(inventory::latin1ToUtf8("plain"), "plain");
    EXPECT_EQ(inventory::latin1ToUtf8("Caf\xE9"), "Caf\xC3\xA9");
    EXPECT_EQ(inventory::latin1ToUtf8(std::string("\x80\xFF", 2)), "\xC2\x80\xC3\xBF");
    EXPECT_EQ(inventory::latin1ToUtf8(std::string("a\0b", 3)), std::string("a\0b", 3));
}

TEST(InventoryRender, EscapeTextShowsControlCharactersAsHex) {
    EXPECT_EQ(inventory::escapeText("a\x01z", false), "a\\x01z");
    EXPECT_EQ(inventory::escapeText(std::string("\0\t\x7F\x85", 4), false), "\\x00\\x09\\x7F\\x85");
    EXPECT_EQ(inventory::escapeText("say \"hi\"\\", true), "\"say \\\"hi\\\"\\\\\"");
    EXPECT_EQ(inventory::escapeText("say \"hi\"", false), "say \"hi\"");
    EXPECT_EQ(inventory::escapeText("Caf\xE9", true), "\"Caf\xC3\xA9\"");
}

TEST(InventoryRender, NodeTypeLabelNamesTheKnownTypes) {
    struct Known {
        unsigned int type;
        char const* label;
    };
    Known const known[] = {
        {1, "type 1 chassis"},
        {3, "type 3 firmware"},
        {4, "type 4 processor"},
        {13, "type 13 BMC"},
        {15, "type 15 management interface"},
        {19, "type 19 memory device"},
        {21, "type 21 voltage sensor"},
        {22, "type 22 temperature sensor"},
        {31, "type 31 processor cache"},
        {32, "type 32 memory array"},
        {35, "type 35 system event log"},
        {40, "type 40 computer system"},
        {41, "type 41 planar"},
        {42, "type 42 processor core"},
        {50, "type 50 disk controller"},
        {53, "type 53 diagnostics firmware"},
        {55, "type 55 raw SMBIOS table"},
        {59, "type 59 root"},
        {62, "type 62 system slot"},
        {70, "type 70 port connector"},
    };
    for (Known const& entry : known) {
        EXPECT_EQ(inventory::nodeTypeLabel(entry.type), entry.label);
    }
    EXPECT_EQ(inventory::nodeTypeLabel(0), "type 0");
    EXPECT_EQ(inventory::nodeTypeLabel(2), "type 2");
    EXPECT_EQ(inventory::nodeTypeName(77), "");
}

TEST(InventoryRender, ValueKindNameFollowsKindAndWidth) {
    using IC::PropertyValue;
    EXPECT_EQ(inventory::valueKindName(
                  PropertyValue(IC::EnumValue(static_cast<unsigned char>(1)), false)),
              "enum8");
    EXPECT_EQ(inventory::valueKindName(PropertyValue(IC::EnumValue(static_cast<short>(-1)), false)),
              "enum16");
    EXPECT_EQ(inventory::valueKindName(PropertyValue(IC::EnumValue(-1), false)), "enum32");
    EXPECT_EQ(inventory::valueKindName(PropertyValue(IC::Number(IC::Number::DATETIME), false)),
              "datetime");
    EXPECT_EQ(inventory::valueKindName(PropertyValue()), "none");
    EXPECT_EQ(inventory::valueKindName(PropertyValue(PropertyValue::BYTES, false)), "kind");
}

TEST(InventoryRender, FormatValueGivesShortestDoublesAndSignedEnums) {
    using IC::PropertyValue;
    EXPECT_EQ(inventory::formatValue(PropertyValue(IC::Number(0.1), false)), "0.1");
    EXPECT_EQ(inventory::formatValue(PropertyValue(IC::Number(1e20), false)), "1e+20");
    EXPECT_EQ(inventory::formatValue(PropertyValue(IC::EnumValue(-5), false)), "-5");
    EXPECT_EQ(inventory::formatValue(PropertyValue(std::vector<unsigned char>{}, false)), "");
    EXPECT_EQ(inventory::formatValue(PropertyValue(std::vector<IC::Number>{}, false)), "{}");
    EXPECT_EQ(inventory::formatValue(PropertyValue(std::vector<std::string>{"a\n"}, false)),
              "{\"a\\x0A\"}");
}

TEST(InventoryRender, FormatValueWritesWholeDoublesWithoutExponent) {
    using IC::PropertyValue;
    EXPECT_EQ(inventory::formatValue(PropertyValue(IC::Number(40.0), false)), "40");
    EXPECT_EQ(inventory::formatValue(PropertyValue(IC::Number(100.0), false)), "100");
    EXPECT_EQ(inventory::formatValue(PropertyValue(IC::Number(3276.8), false)), "3276.8");
    EXPECT_EQ(inventory::formatValue(PropertyValue(IC::Number(0.0), false)), "0");
    EXPECT_EQ(inventory::formatValue(PropertyValue(IC::Number(1e-7), false)), "1e-07");
}

TEST(InventoryRender, JsonOfAnEmptyListIsAnEmptyNodeArray) {
    EXPECT_EQ(inventory::renderJson({}), "{\n  \"nodes\": []\n}\n");
}

TEST(InventoryRender, JsonGivesNegativeEnumsAndEmptyPropertiesObject) {
    auto node = makeNode(5, 0, 1, "Chassis");
    node->setProperty(3, IC::PropertyValue(IC::EnumValue(-5), false));
    auto bare = makeNode(6, 5, 3, "Firmware");
    std::string const json = inventory::renderJson({node.get(), bare.get()});
    EXPECT_NE(json.find("\"value\": -5"), std::string::npos) << json;
    EXPECT_NE(json.find("\"properties\": {}"), std::string::npos) << json;
}

TEST(InventoryRender, TreeListsChildrenInListOrderEvenBeforeTheirParent) {
    // The children come before their parent in the list.
    auto first = makeNode(11, 10, 4, "First CPU");
    auto second = makeNode(12, 10, 4, "Second CPU");
    auto board = makeNode(10, 0, 41, "Board");
    auto cache = makeNode(13, 11, 31, "Cache");
    std::string const tree =
        inventory::renderTree({first.get(), second.get(), board.get(), cache.get()});
    EXPECT_EQ(tree,
              "Board  [type 41 planar, index 0, id 10, status 0]\n"
              "  First CPU  [type 4 processor, index 0, id 11, status 0]\n"
              "    Cache  [type 31 processor cache, index 0, id 13, status 0]\n"
              "  Second CPU  [type 4 processor, index 0, id 12, status 0]\n");
}

TEST(InventoryRender, TreePrintsANodeLinkedToItselfOnce) {
    auto self = makeNode(8, 8, 62, "Loop");
    auto child = makeNode(9, 8, 70, "Port");
    std::string const tree = inventory::renderTree({self.get(), child.get()});
    EXPECT_EQ(tree,
              "Loop  [type 62 system slot, index 0, id 8, status 0, linked 8]\n"
              "  Port  [type 70 port connector, index 0, id 9, status 0]\n");
}

}  // namespace
