// The rendering library of smbios-inventory called directly on nodes made
// here: date-times, text escaping, type names, kind names, the shape of the
// tree and of the JSON document, the catalog's names, units and meanings on
// each property, and the streaming of both texts.

#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <limits>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "IC/EnumValue.h"
#include "IC/MutableNode.h"
#include "IC/Number.h"
#include "IC/PropertyValue.h"
#include "inventory/Inventory.h"
#include "inventory/PropertyNames.h"

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

// ---- names, units and meanings ---------------------------------------------

// The catalog's name of a property, which the tests do not spell again.
std::string nameOf(unsigned int type, unsigned int id) {
    inventory::PropertyInfo const* const info = inventory::findProperty(type, id);
    return info != nullptr ? info->name : "(not in the catalog)";
}

std::string meaningOf(unsigned int type, unsigned int id, std::uint32_t value) {
    inventory::PropertyInfo const* const info = inventory::findProperty(type, id);
    char const* const meaning = info != nullptr ? inventory::valueMeaning(*info, value) : nullptr;
    return meaning != nullptr ? meaning : "(no meaning)";
}

TEST(InventoryRender, TreePropertyLineGivesNameValueUnitAndMeaning) {
    auto cache = makeNode(7, 0, 31, "Processor Cache");
    cache->setProperty(73, IC::PropertyValue(IC::Number(1024u), true));
    cache->setProperty(9, IC::PropertyValue(IC::EnumValue(3u), true));
    cache->setProperty(53, IC::PropertyValue("L2-Cache", true));
    // An id the catalog does not know for this node type keeps its kind.
    cache->setProperty(999, IC::PropertyValue(std::vector<unsigned char>{0xAB, 0x01}, true));
    std::string const tree = inventory::renderTree({cache.get()});
    EXPECT_EQ(tree,
              "Processor Cache  [type 31 processor cache, index 0, id 7, status 0]\n"
              "  9 " +
                  nameOf(31, 9) + "  3 (" + meaningOf(31, 9, 3) + ")\n" + "  53 " + nameOf(31, 53) +
                  "  \"L2-Cache\"\n" + "  73 " + nameOf(31, 73) + "  1024 KB\n" +
                  "  999 bytes  AB 01\n");
    EXPECT_NE(tree.find("  73 Installed size  1024 KB\n"), std::string::npos) << tree;
}

TEST(InventoryRender, TreeGivesNoMeaningForAValueWithoutOneAndNoUnitForText) {
    auto chassis = makeNode(4, 0, 1, "Chassis");
    // Boot-up state 9 is not an SMBIOS state; -1 is no value at all.
    chassis->setProperty(4, IC::PropertyValue(IC::EnumValue(static_cast<unsigned char>(9)), true));
    chassis->setProperty(46, IC::PropertyValue(IC::EnumValue(-1), true));
    chassis->setProperty(21, IC::PropertyValue("2", true));
    std::string const tree = inventory::renderTree({chassis.get()});
    EXPECT_NE(tree.find("\n  4 " + nameOf(1, 4) + "  9\n"), std::string::npos) << tree;
    EXPECT_NE(tree.find("\n  46 " + nameOf(1, 46) + "  -1\n"), std::string::npos) << tree;
    EXPECT_NE(tree.find("\n  21 " + nameOf(1, 21) + "  \"2\"\n"), std::string::npos) << tree;
}

TEST(InventoryRender, TreeGivesTheUnitOfADouble) {
    auto sensor = makeNode(30, 0, 21, "CPU1 Vcore");
    sensor->setProperty(14, IC::PropertyValue(IC::Number(1.2), true));
    std::string const tree = inventory::renderTree({sensor.get()});
    EXPECT_NE(tree.find("\n  14 " + nameOf(21, 14) + "  1.2 V\n"), std::string::npos) << tree;
}

TEST(InventoryRender, JsonPropertyHasNameUnitAndMeaningAfterKindAndValue) {
    auto cache = makeNode(7, 0, 31, "Processor Cache");
    cache->setProperty(73, IC::PropertyValue(IC::Number(1024u), true));
    cache->setProperty(9, IC::PropertyValue(IC::EnumValue(3u), true));
    cache->setProperty(999, IC::PropertyValue("unnamed", true));
    std::string const json = inventory::renderJson({cache.get()});
    std::string const installed =
        "        \"73\": {\n"
        "          \"kind\": \"unsigned\",\n"
        "          \"value\": 1024,\n"
        "          \"name\": \"" +
        nameOf(31, 73) +
        "\",\n"
        "          \"unit\": \"KB\"\n"
        "        }";
    EXPECT_NE(json.find(installed), std::string::npos) << json;
    std::string const type =
        "        \"9\": {\n"
        "          \"kind\": \"enum32\",\n"
        "          \"value\": 3,\n"
        "          \"name\": \"" +
        nameOf(31, 9) +
        "\",\n"
        "          \"meaning\": \"" +
        meaningOf(31, 9, 3) +
        "\"\n"
        "        }";
    EXPECT_NE(json.find(type), std::string::npos) << json;
    std::string const unnamed =
        "        \"999\": {\n"
        "          \"kind\": \"string\",\n"
        "          \"value\": \"unnamed\"\n"
        "        }";
    EXPECT_NE(json.find(unnamed), std::string::npos) << json;
}

// The streamed document is laid out exactly as the JSON library lays out
// the same document: parsing it and writing it again gives the same text.
void expectLibraryLayout(std::string const& json) {
    nlohmann::ordered_json document;
    ASSERT_NO_THROW(document = nlohmann::ordered_json::parse(json)) << json;
    EXPECT_EQ(document.dump(2) + "\n", json);
}

TEST(InventoryRender, JsonDoublesAreWrittenAsTheJsonLibraryWritesThem) {
    double const values[] = {0.0,
                             -0.0,
                             2.5,
                             40.0,
                             0.1,
                             1.2,
                             3276.8,
                             1e15,
                             1e16,
                             123456789012345.0,
                             1e20,
                             1e-4,
                             1e-5,
                             0.00012,
                             1.5e-7,
                             1000.0 / 3.0,
                             -250.0,
                             1e300,
                             5e-324,
                             std::numeric_limits<double>::max(),
                             std::numeric_limits<double>::quiet_NaN(),
                             std::numeric_limits<double>::infinity()};
    for (double value : values) {
        SCOPED_TRACE(value);
        auto node = makeNode(1, 0, 22, "Probe");
        node->setProperty(14, IC::PropertyValue(IC::Number(value), true));
        node->setProperty(125, IC::PropertyValue(std::vector<IC::Number>{IC::Number(value)}, true));
        std::string const json = inventory::renderJson({node.get()});
        expectLibraryLayout(json);
        std::string const expected =
            std::isfinite(value) ? nlohmann::json(value).dump() : std::string("null");
        EXPECT_NE(json.find("\"value\": " + expected + ",\n"), std::string::npos) << json;
    }
}

TEST(InventoryRender, JsonTextOfEveryByteIsWrittenAsTheJsonLibraryWritesIt) {
    std::string every;
    for (int byte = 1; byte < 256; ++byte) {
        every += static_cast<char>(byte);
    }
    every += std::string(1, '\0');
    auto node = makeNode(1, 0, 1, every);
    node->setPath(every);
    node->setParent("\"quoted\" \\ back");
    node->setProperty(36, IC::PropertyValue(every, true));
    node->setProperty(179, IC::PropertyValue(std::vector<std::string>{every, "", "a"}, true));
    node->setProperty(180, IC::PropertyValue(std::vector<std::string>{}, true));
    node->setProperty(181, IC::PropertyValue(std::vector<IC::Number>{}, true));
    node->setProperty(182, IC::PropertyValue(IC::Number(IC::Version2(3, 14)), true));
    node->setProperty(183,
                      IC::PropertyValue(std::vector<IC::Number>{IC::Number(IC::Version2(1, 2)),
                                                                IC::Number(true), IC::Number()},
                                        true));
    node->setProperty(184, IC::PropertyValue(IC::PropertyValue::BYTES, true));
    node->setProperty(185, IC::PropertyValue());
    node->setProperty(186, IC::PropertyValue(static_cast<unsigned char>(171), true));
    node->setProperty(187, IC::PropertyValue(IC::Number(IC::Number::DATETIME), true));
    auto bare = makeNode(2, 1, 59, "");
    std::string const json = inventory::renderJson({node.get(), bare.get()});
    expectLibraryLayout(json);
    nlohmann::ordered_json const document = nlohmann::ordered_json::parse(json);
    EXPECT_EQ(document["nodes"][0]["description"], inventory::latin1ToUtf8(every));
    EXPECT_EQ(document["nodes"][0]["properties"]["36"]["value"], inventory::latin1ToUtf8(every));
    EXPECT_EQ(document["nodes"][1]["properties"], nlohmann::ordered_json::object());
}

// A list of nodes whose text is several times the pieces the renderers hand
// on.
std::vector<std::unique_ptr<IC::MutableNode>> manyNodes() {
    std::vector<std::unique_ptr<IC::MutableNode>> nodes;
    for (unsigned int i = 0; i < 400; ++i) {
        auto node = makeNode(i + 1, i, 55, "SMBIOS Table");
        std::vector<IC::Number> bytes;
        for (unsigned int b = 0; b < 40; ++b) {
            bytes.emplace_back(b * i % 256);
        }
        node->setProperty(180, IC::PropertyValue(bytes, true));
        node->setProperty(177, IC::PropertyValue(IC::Number(i % 32), true));
        nodes.push_back(std::move(node));
    }
    return nodes;
}

std::vector<IC::Node*> listOf(std::vector<std::unique_ptr<IC::MutableNode>> const& nodes) {
    std::vector<IC::Node*> list;
    for (auto const& node : nodes) {
        list.push_back(node.get());
    }
    return list;
}

TEST(InventoryRender, WriteJsonAndWriteTreeHandOnTheWholeTextInPieces) {
    std::vector<std::unique_ptr<IC::MutableNode>> const nodes = manyNodes();
    std::vector<IC::Node*> const list = listOf(nodes);
    struct Collected {
        std::string text;
        std::size_t pieces = 0;
        std::size_t largest = 0;
    };
    auto collect = [](Collected& into) {
        return [&into](char const* data, std::size_t size) {
            into.text.append(data, size);
            ++into.pieces;
            into.largest = std::max(into.largest, size);
        };
    };
    Collected json;
    inventory::writeJson(list, collect(json));
    EXPECT_EQ(json.text, inventory::renderJson(list));
    EXPECT_GT(json.pieces, 4u);
    EXPECT_LT(json.largest, json.text.size() / 4);
    expectLibraryLayout(json.text);

    Collected tree;
    inventory::writeTree(list, collect(tree));
    EXPECT_EQ(tree.text, inventory::renderTree(list));
    EXPECT_GT(tree.pieces, 1u);
    EXPECT_NE(
        tree.text.find("\n    177 " + nameOf(55, 177) + "  1 (" + meaningOf(55, 177, 1) + ")\n"),
        std::string::npos);
}

TEST(InventoryRender, VisitPropertiesReadsAnOrdinaryNodesValuesWhereTheyAreKept) {
    auto node = makeNode(3, 0, 40, "Computer System");
    node->setProperty(36, IC::PropertyValue("Corvane", true));
    node->setProperty(50, IC::PropertyValue("KQ7X4R2", true));
    std::vector<unsigned int> ids;
    inventory::visitProperties(*node, [&](unsigned int id, IC::PropertyValue const& value) {
        ids.push_back(id);
        EXPECT_EQ(&value, &node->getProperties().at(id)) << "property " << id << " was copied";
    });
    EXPECT_EQ(ids, (std::vector<unsigned int>{36, 50}));
}

// A node of a class of its own that computes one value when it is read and
// does not answer for another.
class ComputingNode : public IC::MutableNode {
public:
    using IC::MutableNode::MutableNode;
    IC::Error getProperty(unsigned int id, IC::PropertyValue& value) const override {
        if (id == 126) {
            value = IC::PropertyValue("computed", true);
            return IC::Error(0, IC::Number(0u), "");
        }
        if (id == 50) {
            return IC::Error(1, IC::Number(0u), "no answer");
        }
        return IC::MutableNode::getProperty(id, value);
    }
};

TEST(InventoryRender, VisitPropertiesAsksANodeOfItsOwnClassForEveryValue) {
    ComputingNode node(3, 0, std::vector<unsigned int>{1}, 40, 0);
    node.setProperty(36, IC::PropertyValue("Corvane", true));
    node.setProperty(50, IC::PropertyValue("stored serial", true));
    node.setProperty(126, IC::PropertyValue("stored time", true));
    std::vector<std::pair<unsigned int, std::string>> seen;
    inventory::visitProperties(node, [&](unsigned int id, IC::PropertyValue const& value) {
        seen.emplace_back(id, value.getString());
    });
    EXPECT_EQ(seen, (std::vector<std::pair<unsigned int, std::string>>{
                        {36, "Corvane"}, {50, "stored serial"}, {126, "computed"}}));
    std::string const tree = inventory::renderTree({&node});
    EXPECT_NE(tree.find("  126 " + nameOf(40, 126) + "  \"computed\"\n"), std::string::npos)
        << tree;
    EXPECT_NE(inventory::renderJson({&node}).find("\"value\": \"computed\""), std::string::npos);
}

}  // namespace
