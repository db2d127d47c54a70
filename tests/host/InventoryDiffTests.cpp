// The comparison of smbios-inventory diff called directly on small JSON
// documents made here: how components are paired (never by node id), which
// lines and JSON entries the differences give, how values are written, and
// how the files given to diff are told apart.

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <stdexcept>
#include <string>
#include <vector>

#include "inventory/DiffInput.h"
#include "inventory/InventoryDiff.h"
#include "inventory/PropertyNames.h"

namespace {

using inventory::DiffJson;
using Json = inventory::DiffJson;

Json text(std::string const& value) { return Json({{"kind", "string"}, {"value", value}}); }
Json number(std::uint64_t value) { return Json({{"kind", "unsigned"}, {"value", value}}); }

Json node(unsigned int id, unsigned int linked, unsigned int type, std::string const& description,
          Json properties = Json::object()) {
    return Json({{"id", id},
                 {"linked", linked},
                 {"type", type},
                 {"index", 0},
                 {"status", 1},
                 {"description", description},
                 {"properties", std::move(properties)}});
}

// The property's name as diff shows it: from the catalog, else its id.
std::string nameOf(unsigned int type, unsigned int id) {
    inventory::PropertyInfo const* info = inventory::findProperty(type, id);
    return info != nullptr ? std::string(info->name) : "property " + std::to_string(id);
}

// " KB" and the like: the catalog's unit after a value, "" when it has none.
std::string unitOf(unsigned int type, unsigned int id) {
    inventory::PropertyInfo const* info = inventory::findProperty(type, id);
    return info != nullptr && info->unit[0] != '\0' ? std::string(" ") + info->unit : "";
}

// A small server: the frame nodes, computer system, chassis, planar, two
// processors with a cache each, two slots, two memory devices, the BIOS
// and a raw structure.
Json server() {
    Json nodes = Json::array();
    nodes.push_back(node(1, 0, 15, "Corvane SMBIOS Management Interface"));
    nodes.push_back(node(2, 1, 59, "ROOT Node"));
    nodes.push_back(node(3, 2, 40, "Computer System", {{"36", text("Corvane")}}));
    nodes.push_back(node(4, 3, 1, "Chassis"));
    nodes.push_back(node(5, 4, 41, "Planar"));
    nodes.push_back(node(6, 5, 4, "CPU 1", {{"53", text("SOCKET 0")}, {"80", number(2600)}}));
    nodes.push_back(node(7, 6, 31, "Processor Cache", {{"53", text("L1 Cache")}}));
    nodes.push_back(node(8, 5, 4, "CPU 2", {{"53", text("SOCKET 1")}, {"80", number(2600)}}));
    nodes.push_back(node(9, 8, 31, "Processor Cache", {{"53", text("L1 Cache")}}));
    nodes.push_back(node(10, 5, 62, "System Slot", {{"108", text("SLOT1")}}));
    nodes.push_back(node(11, 5, 62, "System Slot", {{"108", text("SLOT2")}}));
    nodes.push_back(node(12, 5, 19, "DIMM_A1:BANK 0", {{"68", text("DIMM_A1:BANK 0")}}));
    nodes.push_back(node(13, 5, 19, "DIMM_B1:BANK 1", {{"68", text("DIMM_B1:BANK 1")}}));
    nodes.push_back(node(14, 5, 3, "BIOS", {{"108", text("BIOS")}, {"307", text("1.05")}}));
    nodes.push_back(node(15, 5, 55, "SMBIOS Table",
                         {{"177", number(17)}, {"178", number(0x2F)}, {"181", number(2)}}));
    return Json({{"nodes", nodes}});
}

// The node of the document with that id.
Json& nodeWithId(Json& document, unsigned int id) {
    for (Json& entry : document["nodes"]) {
        if (entry["id"] == id) {
            return entry;
        }
    }
    throw std::runtime_error("no node " + std::to_string(id));
}

void removeNode(Json& document, unsigned int id) {
    Json& nodes = document["nodes"];
    for (size_t i = 0; i < nodes.size(); ++i) {
        if (nodes[i]["id"] == id) {
            nodes.erase(i);
            return;
        }
    }
    throw std::runtime_error("no node " + std::to_string(id));
}

std::vector<inventory::InventoryNode> parsed(Json const& document) {
    std::vector<inventory::InventoryNode> nodes;
    std::string why;
    EXPECT_TRUE(inventory::parseInventory(document, nodes, why)) << why;
    return nodes;
}

std::vector<inventory::Difference> differences(Json const& before, Json const& after) {
    return inventory::compareInventories(parsed(before), parsed(after));
}

std::string diffText(Json const& before, Json const& after) {
    return inventory::renderDiffText(differences(before, after));
}

std::string planar() { return "Computer System/Chassis/Planar"; }

// ---- Reading documents ---------------------------------------------------------

TEST(InventoryDiff, ParseReadsTheHostsDocument) {
    Json document = server();
    nodeWithId(document, 3)["path"] = "/sys";
    nodeWithId(document, 3)["properties"]["36"]["name"] = "Manufacturer";
    std::vector<inventory::InventoryNode> const nodes = parsed(document);
    ASSERT_EQ(nodes.size(), 15u);
    EXPECT_EQ(nodes[2].id, 3u);
    EXPECT_EQ(nodes[2].linked, 2u);
    EXPECT_EQ(nodes[2].type, 40u);
    EXPECT_EQ(nodes[2].status, 1u);
    EXPECT_EQ(nodes[2].description, "Computer System");
    EXPECT_EQ(nodes[2].path, "/sys");
    EXPECT_EQ(nodes[2].parent, "");
    ASSERT_EQ(nodes[2].properties.count(36), 1u);
    EXPECT_EQ(nodes[2].properties.at(36)["value"], "Corvane");
    EXPECT_EQ(nodes[14].properties.size(), 3u);
}

TEST(InventoryDiff, ParseTakesPropertiesAsAListWithIds) {
    Json document = server();
    nodeWithId(document, 3)["properties"] =
        Json::array({{{"id", 36}, {"kind", "string"}, {"value", "Corvane"}}});
    std::vector<inventory::InventoryNode> const nodes = parsed(document);
    ASSERT_EQ(nodes[2].properties.count(36), 1u);
    EXPECT_EQ(nodes[2].properties.at(36)["value"], "Corvane");
    EXPECT_TRUE(diffText(server(), document).empty());
}

TEST(InventoryDiff, ParseRefusesDocumentsOfAnotherShape) {
    struct Case {
        Json document;
        char const* why;
    };
    Json noType = server();
    nodeWithId(noType, 4).erase("type");
    Json negativeId = server();
    nodeWithId(negativeId, 4)["id"] = -4;
    Json badId = server();
    nodeWithId(badId, 3)["properties"]["x6"] = text("a");
    Json noKind = server();
    nodeWithId(noKind, 3)["properties"]["36"] = Json({{"value", "a"}});
    Json noDescription = server();
    nodeWithId(noDescription, 5)["description"] = 5;
    std::vector<Case> const cases = {
        {Json::array(), "no \"nodes\" list"},
        {Json({{"nodes", Json::object()}}), "no \"nodes\" list"},
        {Json({{"nodes", Json::array({1})}}), "node 1 of the list: not an object"},
        {noType, "node 4 of the list: \"type\" is not an unsigned number"},
        {negativeId, "node 4 of the list: \"id\" is not an unsigned number"},
        {badId, "node 3 of the list: property id \"x6\" is not a decimal number"},
        {noKind, "node 3 of the list: property 36 is not a {\"kind\", \"value\"} object"},
        {noDescription, "node 5 of the list: \"description\" is not a text"},
    };
    for (Case const& c : cases) {
        std::vector<inventory::InventoryNode> nodes;
        std::string why;
        EXPECT_FALSE(inventory::parseInventory(c.document, nodes, why)) << c.why;
        EXPECT_EQ(why, c.why);
    }
}

// ---- Pairing -------------------------------------------------------------------

TEST(InventoryDiff, EqualInventoriesHaveNoDifferences) {
    EXPECT_TRUE(differences(server(), server()).empty());
    EXPECT_EQ(inventory::renderDiffText({}), "");
}

TEST(InventoryDiff, NodeIdsDoNotPairComponents) {
    // The same inventory with every id moved by 100: nothing differs.
    Json moved = server();
    for (Json& entry : moved["nodes"]) {
        entry["id"] = entry["id"].get<unsigned int>() + 100;
        if (entry["linked"] != 0) {
            entry["linked"] = entry["linked"].get<unsigned int>() + 100;
        }
    }
    EXPECT_EQ(diffText(server(), moved), "");
    // Slots listed the other way round keep their designations.
    Json swapped = server();
    nodeWithId(swapped, 10)["properties"]["108"] = text("SLOT2");
    nodeWithId(swapped, 11)["properties"]["108"] = text("SLOT1");
    EXPECT_EQ(diffText(server(), swapped), "");
}

TEST(InventoryDiff, ChangedPropertyIsOneLineWithItsName) {
    ASSERT_NE(inventory::findProperty(40, 36), nullptr);
    Json after = server();
    nodeWithId(after, 3)["properties"]["36"] = text("Kestrel");
    nodeWithId(after, 14)["properties"]["307"] = text("1.06");
    EXPECT_EQ(diffText(server(), after),
              "~ Computer System: " + nameOf(40, 36) + ": \"Corvane\" -> \"Kestrel\"\n" + "~ " +
                  planar() + "/BIOS: " + nameOf(3, 307) + ": \"1.05\" -> \"1.06\"\n");
}

TEST(InventoryDiff, PropertyWithoutANameShowsItsId) {
    ASSERT_EQ(inventory::findProperty(40, 999), nullptr);
    Json after = server();
    nodeWithId(after, 3)["properties"]["999"] = number(7);
    EXPECT_EQ(diffText(server(), after), "~ Computer System: property 999: (absent) -> 7\n");
    EXPECT_EQ(diffText(after, server()), "~ Computer System: property 999: 7 -> (absent)\n");
}

TEST(InventoryDiff, ClockReadingsOfTheComputerSystemAreLeftOut) {
    Json before = server();
    nodeWithId(before, 3)["properties"]["126"] = Json({{"kind", "datetime"}, {"value", 1000}});
    nodeWithId(before, 3)["properties"]["127"] = Json({{"kind", "double"}, {"value", 1.0}});
    Json after = server();
    nodeWithId(after, 3)["properties"]["126"] = Json({{"kind", "datetime"}, {"value", 2000}});
    nodeWithId(after, 3)["properties"]["127"] = Json({{"kind", "double"}, {"value", 2.0}});
    EXPECT_EQ(diffText(before, after), "");
    // The same ids on another node type are compared.
    nodeWithId(after, 4)["properties"]["126"] = number(1);
    EXPECT_EQ(diffText(before, after),
              "~ Computer System/Chassis: " + nameOf(1, 126) + ": (absent) -> 1\n");
}

TEST(InventoryDiff, ProcessorsPairBySocketNotByTheirNumber) {
    // The first processor disabled: the second is now "CPU 1" and keeps
    // its socket; its cache's change is reported under it.
    Json after = server();
    removeNode(after, 6);
    removeNode(after, 7);
    nodeWithId(after, 8)["description"] = "CPU 1";
    nodeWithId(after, 9)["status"] = 16;
    EXPECT_EQ(diffText(server(), after), "- " + planar() + "/CPU \"SOCKET 0\"\n" + "~ " + planar() +
                                             "/CPU \"SOCKET 1\"/Processor Cache \"L1 Cache\": "
                                             "Status: 1 -> 16\n");
}

TEST(InventoryDiff, RemovedComponentStandsWhereItWasAndAddedWhereItIs) {
    Json after = server();
    removeNode(after, 12);  // DIMM_A1
    Json& nodes = after["nodes"];
    // A slot between the two slots, and a memory device after the last.
    nodes.insert(nodes.begin() + 10, node(40, 5, 62, "System Slot", {{"108", text("SLOT1A")}}));
    nodes.push_back(node(41, 5, 19, "DIMM_C1:BANK 2", {{"68", text("DIMM_C1:BANK 2")}}));
    EXPECT_EQ(diffText(server(), after), "+ " + planar() + "/System Slot \"SLOT1A\"\n" + "- " +
                                             planar() + "/DIMM_A1:BANK 0\n" + "+ " + planar() +
                                             "/DIMM_C1:BANK 2\n");
    std::vector<inventory::Difference> const found = differences(server(), after);
    ASSERT_EQ(found.size(), 3u);
    EXPECT_EQ(found[0].change, inventory::Difference::ADDED);
    EXPECT_EQ(found[0].nodeType, 62u);
    EXPECT_EQ(found[1].change, inventory::Difference::REMOVED);
    EXPECT_EQ(found[1].description, "DIMM_A1:BANK 0");
}

TEST(InventoryDiff, WhatHangsBelowAnAddedComponentIsNotListedAgain) {
    Json after = server();
    after["nodes"].push_back(
        node(50, 5, 4, "CPU 3", {{"53", text("SOCKET 2")}, {"80", number(2600)}}));
    after["nodes"].push_back(node(51, 50, 31, "Processor Cache", {{"53", text("L1 Cache")}}));
    after["nodes"].push_back(node(52, 50, 42, "CPU Core Information"));
    EXPECT_EQ(diffText(server(), after), "+ " + planar() + "/CPU \"SOCKET 2\"\n");
}

TEST(InventoryDiff, SiblingsThatTieAreNumberedInListOrder) {
    Json before = server();
    for (unsigned int id : {20u, 21u, 22u}) {
        before["nodes"].push_back(node(id, 5, 32, "Memory Array", {{"37", number(id)}}));
    }
    Json after = before;
    nodeWithId(after, 21)["properties"]["37"] = number(99);
    removeNode(after, 22);
    EXPECT_EQ(diffText(before, after), "~ " + planar() + "/Memory Array #2: " + nameOf(32, 37) +
                                           ": 21" + unitOf(32, 37) + " -> 99" + unitOf(32, 37) +
                                           "\n" + "- " + planar() + "/Memory Array #3\n");
}

TEST(InventoryDiff, MemoryDevicesPairByDeviceLocatorAndByBankWhereThoseTie) {
    // A new bank locator of a device whose device locator is its own: the
    // same device, with a changed locator property.
    Json after = server();
    nodeWithId(after, 13)["description"] = "DIMM_B1:NODE 1";
    nodeWithId(after, 13)["properties"]["68"] = text("DIMM_B1:NODE 1");
    EXPECT_EQ(diffText(server(), after), "~ " + planar() + "/DIMM_B1:NODE 1: " + nameOf(19, 68) +
                                             ": \"DIMM_B1:BANK 1\" -> \"DIMM_B1:NODE 1\"\n");

    // Two devices in socket DIMM_A1 of two banks: the bank tells them
    // apart, also when only one of them is left.
    Json before = server();
    before["nodes"].push_back(node(30, 5, 19, "DIMM_A1:BANK 1", {{"68", text("DIMM_A1:BANK 1")}}));
    Json emptied = before;
    removeNode(emptied, 12);  // DIMM_A1:BANK 0
    nodeWithId(emptied, 30)["status"] = 14;
    EXPECT_EQ(diffText(before, emptied), "- " + planar() + "/DIMM_A1:BANK 0\n" + "~ " + planar() +
                                             "/DIMM_A1:BANK 1: Status: 1 -> 14\n");
    EXPECT_EQ(diffText(emptied, before), "+ " + planar() + "/DIMM_A1:BANK 0\n" + "~ " + planar() +
                                             "/DIMM_A1:BANK 1: Status: 14 -> 1\n");
}

TEST(InventoryDiff, RawStructuresPairByTypeAndHandle) {
    Json after = server();
    nodeWithId(after, 15)["properties"]["181"] = number(3);
    Json other = server();
    nodeWithId(other, 15)["properties"]["178"] = number(0x30);
    EXPECT_EQ(diffText(server(), after), "~ " + planar() + "/SMBIOS Table type 17 handle 0x002F: " +
                                             nameOf(55, 181) + ": 2 -> 3\n");
    EXPECT_EQ(diffText(server(), other), "- " + planar() + "/SMBIOS Table type 17 handle 0x002F\n" +
                                             "+ " + planar() +
                                             "/SMBIOS Table type 17 handle 0x0030\n");
}

TEST(InventoryDiff, FrameNodesAreNamedOnlyForTheirOwnChanges) {
    Json after = server();
    nodeWithId(after, 1)["properties"]["306"] = Json({{"kind", "version"}, {"value", {3, 0}}});
    nodeWithId(after, 2)["status"] = 16;
    EXPECT_EQ(diffText(server(), after),
              "~ Corvane SMBIOS Management Interface: " + nameOf(15, 306) +
                  ": (absent) -> 3.0\n~ ROOT Node: Status: 1 -> 16\n");
}

TEST(InventoryDiff, NodeFieldsAreCompared) {
    Json after = server();
    nodeWithId(after, 10)["status"] = 16;
    nodeWithId(after, 10)["path"] = "/slots/1";
    EXPECT_EQ(diffText(server(), after),
              "~ " + planar() + "/System Slot \"SLOT1\": Status: 1 -> 16\n" + "~ " + planar() +
                  "/System Slot \"SLOT1\": Path: \"\" -> \"/slots/1\"\n");
}

TEST(InventoryDiff, NodesLinkedInACycleAreStillCompared) {
    Json before = server();
    before["nodes"].push_back(node(60, 61, 62, "System Slot", {{"108", text("LOOP")}}));
    before["nodes"].push_back(node(61, 60, 19, "LOOPED"));
    Json after = before;
    nodeWithId(after, 61)["status"] = 14;
    EXPECT_EQ(diffText(before, after), "~ System Slot \"LOOP\"/LOOPED: Status: 1 -> 14\n");
}

TEST(InventoryDiff, AVeryDeepTreeIsWalkedWithoutRecursion) {
    // 50,000 nodes each under the one before: the walk, the paths and
    // their end neither recurse nor hold a path for every node.
    unsigned int const depth = 50000;
    Json before = Json({{"nodes", Json::array()}});
    for (unsigned int id = 1; id <= depth; ++id) {
        before["nodes"].push_back(node(id, id - 1, 62, "S"));
    }
    Json after = before;
    nodeWithId(after, depth)["status"] = 16;
    std::vector<inventory::Difference> const found = differences(before, after);
    ASSERT_EQ(found.size(), 1u);
    EXPECT_EQ(found[0].path.size(), 2 * depth - 1);
    EXPECT_EQ(found[0].path.substr(0, 6), "S/S/S/");
}

TEST(InventoryDiff, NamesAndMeaningsTheDocumentAddsAreNotCompared) {
    Json after = server();
    nodeWithId(after, 3)["properties"]["36"]["name"] = "Manufacturer";
    nodeWithId(after, 6)["properties"]["80"]["unit"] = "MHz";
    EXPECT_EQ(diffText(server(), after), "");
    // A value of another kind is another value.
    nodeWithId(after, 6)["properties"]["80"]["kind"] = "double";
    std::vector<inventory::Difference> const found = differences(server(), after);
    ASSERT_EQ(found.size(), 1u);
    EXPECT_EQ(found[0].property, 80u);
    EXPECT_EQ(found[0].before["kind"], "unsigned");
    EXPECT_EQ(found[0].after["kind"], "double");
}

// ---- Values --------------------------------------------------------------------

TEST(InventoryDiff, ValuesAreWrittenAsTheTreeWritesThem) {
    auto const shown = [](char const* kind, Json value) {
        return inventory::formatPropertyValue(41, 999, Json({{"kind", kind}, {"value", value}}));
    };
    EXPECT_EQ(shown("string", "Caf\xC3\xA9 \"x\"\x01"), "\"Caf\xC3\xA9 \\\"x\\\"\\x01\"");
    EXPECT_EQ(shown("string", "\xE2\x82\xAC"), "\"\xE2\x82\xAC\"");
    EXPECT_EQ(shown("bool", true), "true");
    EXPECT_EQ(shown("unsigned", 4096), "4096");
    EXPECT_EQ(shown("double", 40.0), "40");
    EXPECT_EQ(shown("double", 0.1), "0.1");
    EXPECT_EQ(shown("version", Json::array({2, 7})), "2.7");
    EXPECT_EQ(shown("datetime", 951782400), "2000-02-29 00:00:00");
    EXPECT_EQ(shown("enum8", 3), "3");
    EXPECT_EQ(shown("bytes", "BFEBFBFF"), "BF EB FB FF");
    EXPECT_EQ(shown("numbers", Json::array({Json({{"kind", "unsigned"}, {"value", 1}}),
                                            Json({{"kind", "double"}, {"value", 2.5}})})),
              "{1, 2.5}");
    EXPECT_EQ(shown("strings", Json::array({"a", "b\"c"})), "{\"a\", \"b\\\"c\"}");
    EXPECT_EQ(shown("none", nullptr), "(none)");
    EXPECT_EQ(inventory::formatPropertyValue(41, 999, Json()), "(absent)");
}

TEST(InventoryDiff, ValuesGetTheirUnitAndMeaningFromTheCatalog) {
    inventory::PropertyInfo const* wakeUp = inventory::findProperty(40, 65);
    ASSERT_NE(wakeUp, nullptr);
    ASSERT_NE(inventory::valueMeaning(*wakeUp, 6), nullptr);
    EXPECT_EQ(inventory::formatPropertyValue(40, 65, Json({{"kind", "enum8"}, {"value", 6}})),
              std::string("6 (") + inventory::valueMeaning(*wakeUp, 6) + ")");
    inventory::PropertyInfo const* zone = inventory::findProperty(40, 127);
    ASSERT_NE(zone, nullptr);
    ASSERT_STRNE(zone->unit, "");
    EXPECT_EQ(inventory::formatPropertyValue(40, 127, Json({{"kind", "double"}, {"value", 2.0}})),
              std::string("2 ") + zone->unit);
}

// ---- JSON output ---------------------------------------------------------------

TEST(InventoryDiff, JsonOutputHasOneEntryADifference) {
    Json after = server();
    nodeWithId(after, 3)["properties"]["36"] = text("Kestrel");
    nodeWithId(after, 10)["status"] = 16;
    removeNode(after, 13);
    after["nodes"].push_back(node(30, 5, 62, "System Slot", {{"108", text("SLOT\"3")}}));
    std::string const out = inventory::renderDiffJson(differences(server(), after));
    Json const document = Json::parse(out);
    ASSERT_EQ(document.size(), 1u);
    Json const& list = document["differences"];
    ASSERT_EQ(list.size(), 4u) << out;
    EXPECT_EQ(list[0], Json::parse(R"({"change": "changed", "path": "Computer System",
        "type": 40, "description": "Computer System", "property": 36, "name": ")" +
                                   nameOf(40, 36) + R"(",
        "old": {"kind": "string", "value": "Corvane"},
        "new": {"kind": "string", "value": "Kestrel"}})"));
    EXPECT_EQ(list[1], Json::parse(R"({"change": "changed",
        "path": "Computer System/Chassis/Planar/System Slot \"SLOT1\"", "type": 62,
        "description": "System Slot", "field": "status", "old": 1, "new": 16})"));
    // The removed device where it stood, the slot added at the end.
    EXPECT_EQ(list[2], Json::parse(R"({"change": "removed",
        "path": "Computer System/Chassis/Planar/DIMM_B1:BANK 1", "type": 19,
        "description": "DIMM_B1:BANK 1"})"));
    EXPECT_EQ(list[3], Json::parse(R"({"change": "added",
        "path": "Computer System/Chassis/Planar/System Slot \"SLOT\\\"3\"", "type": 62,
        "description": "System Slot"})"));
    // One difference a line, between the brackets of the list.
    EXPECT_EQ(std::count(out.begin(), out.end(), '\n'), 6);
    EXPECT_EQ(inventory::renderDiffJson({}), "{\"differences\": []}\n");
}

TEST(InventoryDiff, JsonOutputNamesOnlyPropertiesTheCatalogKnows) {
    Json after = server();
    nodeWithId(after, 3)["properties"]["999"] = number(1);
    Json const document = Json::parse(inventory::renderDiffJson(differences(server(), after)));
    ASSERT_EQ(document["differences"].size(), 1u);
    Json const& entry = document["differences"][0];
    EXPECT_EQ(entry["property"], 999);
    EXPECT_FALSE(entry.contains("name"));
    EXPECT_EQ(entry["old"], nullptr);
    EXPECT_EQ(entry["new"], number(1));
}

// ---- Input files ---------------------------------------------------------------

std::vector<std::uint8_t> bytesOf(std::string const& content) {
    return std::vector<std::uint8_t>(content.begin(), content.end());
}

TEST(InventoryDiff, InputsAreToldApartByContent) {
    using inventory::InputKind;
    EXPECT_EQ(inventory::classifyInput(bytesOf("_SM_\x1F")), InputKind::DUMP_BIN);
    EXPECT_EQ(inventory::classifyInput(bytesOf("_SM3_\x18")), InputKind::DUMP_BIN);
    EXPECT_EQ(inventory::classifyInput(bytesOf("_DMI_\x00")), InputKind::DUMP_BIN);
    EXPECT_EQ(inventory::classifyInput(bytesOf("{\"nodes\": []}")), InputKind::JSON_INVENTORY);
    EXPECT_EQ(inventory::classifyInput(bytesOf(" \n\t{")), InputKind::JSON_INVENTORY);
    EXPECT_EQ(inventory::classifyInput(bytesOf("<SHOWSMBIOS>\n<EPHEADER>\n5F534D5F\n")),
              InputKind::OVERRIDE_DUMP);
    EXPECT_EQ(inventory::classifyInput(bytesOf("")), InputKind::UNKNOWN);
    EXPECT_EQ(inventory::classifyInput(bytesOf("hello")), InputKind::UNKNOWN);
    EXPECT_EQ(inventory::classifyInput(bytesOf("[1, 2]")), InputKind::UNKNOWN);
    EXPECT_EQ(inventory::classifyInput(bytesOf("_SM")), InputKind::UNKNOWN);
    EXPECT_EQ(inventory::classifyInput(bytesOf(std::string("\0<EPHEADER>", 11))),
              InputKind::UNKNOWN);
}

TEST(InventoryDiff, ADumpIsReadByAChildRunWithTheSameLibraries) {
    using inventory::InputKind;
    EXPECT_EQ(inventory::childArguments(InputKind::DUMP_BIN, "a.bin", {}),
              (std::vector<std::string>{"--format=json", "--from-bin=a.bin"}));
    EXPECT_EQ(inventory::childArguments(InputKind::OVERRIDE_DUMP, "-odd.txt", {"p.so", "lib"}),
              (std::vector<std::string>{"--format=json", "--dump=-odd.txt", "--plugin=p.so",
                                        "--code-dir=lib"}));
}

}  // namespace
