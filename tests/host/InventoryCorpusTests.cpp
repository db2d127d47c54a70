// The renderers on the whole trees the plug-in's builders make from the
// example server and from every real machine of the corpus (with the sensor
// nodes of every probe location and the BMC nodes): every property has a
// name in the catalog, and the streamed JSON is, key for key and value for
// value, the document a JSON library builds from the same nodes, with only
// the catalog's keys added.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdio>
#include <iostream>
#include <nlohmann/json.hpp>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "DumpFormat.h"
#include "HostRunner.h"
#include "IC/MutableNode.h"
#include "InventoryJson.h"
#include "PluginRead.h"
#include "TestSupport.h"
#include "inventory/Inventory.h"
#include "inventory/PropertyNames.h"
#include "mi/SmBiosMI.h"
#include "smbios/SmBios.h"

namespace {

using hosttest::Json;

unsigned int const kPlanarType = 41;
unsigned int const kRootType = 59;
unsigned int const kComputerSystemType = 40;
unsigned int const kLastProbeLocation = 31;

// The plug-in's builders run on one table, as initialize runs them, then the
// sensor nodes of every probe location and the BMC nodes, as the host makes
// them when asked.
class TreeOfTable : public IC::SmBiosMI {
public:
    explicit TreeOfTable(std::vector<unsigned char> const& raw) : parsed_(raw) {
        IC::ManagementInterface::initialize(1, IC::Number(0u), IC::Number(0u));
        IC::StructureGroups groups(parsed_);
        makeRootNode(groups.lists());
        unsigned int parent = firstOfType(kPlanarType);
        parent = parent != 0 ? parent : firstOfType(kRootType);
        IC::StructureGroups extra(parsed_);
        for (unsigned int location = 0; location <= kLastProbeLocation; ++location) {
            makeTemperatureSensorNodes(extra.lists(), parent, location);
            makeVoltageSensorNodes(extra.lists(), parent, location);
        }
        makeBMCNodes(extra.lists(), parent);
    }

    std::vector<IC::Node*> nodes() {
        std::vector<IC::Node*> list;
        getMap(list);
        return list;
    }

private:
    unsigned int firstOfType(unsigned int type) const {
        for (IC::Node const* node : nodeList) {
            auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
            if (mutableNode != nullptr && mutableNode->getNodeType() == type) {
                return mutableNode->getNodeId();
            }
        }
        return 0;
    }

    SD::SmBios const parsed_;
};

// ---- The document as a JSON library builds it ----------------------------------
// What the host wrote before it streamed its output, kept here to compare
// with: every value read through getProperty, one document built in memory.

Json referenceNumber(IC::Number const& number) {
    Json value;
    switch (number.getKind()) {
        case IC::Number::BOOL:
            value = number.getBool();
            break;
        case IC::Number::UNSIGNED:
            value = number.getUnsigned();
            break;
        case IC::Number::DOUBLE:
            value = number.getDouble();
            break;
        case IC::Number::VERSION:
            value = Json::array({number.getVersion().getMajor(), number.getVersion().getMinor()});
            break;
        case IC::Number::DATETIME:
            value = number.getDateTime();
            break;
        case IC::Number::NONE:
            break;
    }
    return Json({{"kind", inventory::numberKindName(number)}, {"value", value}});
}

Json referenceValue(IC::PropertyValue const& property) {
    if (property.getKind() == IC::PropertyValue::NUMBER) {
        return referenceNumber(property.getNumber());
    }
    Json value;
    switch (property.getKind()) {
        case IC::PropertyValue::STRING:
            value = inventory::latin1ToUtf8(property.getString());
            break;
        case IC::PropertyValue::ENUM:
            value = property.getEnum().getValue();
            break;
        case IC::PropertyValue::BYTE:
            value = static_cast<unsigned int>(property.getByte());
            break;
        case IC::PropertyValue::BYTES: {
            std::string hex;
            char digits[3];
            for (unsigned char byte : property.getBytes()) {
                std::snprintf(digits, sizeof digits, "%02X", byte);
                hex += digits;
            }
            value = hex;
            break;
        }
        case IC::PropertyValue::NUMBERS:
            value = Json::array();
            for (IC::Number const& number : property.getNumbers()) {
                value.push_back(referenceNumber(number));
            }
            break;
        case IC::PropertyValue::STRINGS:
            value = Json::array();
            for (std::string const& text : property.getStrings()) {
                value.push_back(inventory::latin1ToUtf8(text));
            }
            break;
        case IC::PropertyValue::KIND:
            value = static_cast<unsigned int>(property.getKindValue());
            break;
        case IC::PropertyValue::NUMBER:
        case IC::PropertyValue::NONE:
            break;
    }
    return Json({{"kind", inventory::valueKindName(property)}, {"value", value}});
}

Json referenceDocument(std::vector<IC::Node*> const& nodes) {
    Json list = Json::array();
    for (IC::Node const* node : nodes) {
        auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
        Json entry;
        entry["id"] = node->getNodeId();
        entry["linked"] = node->getLinkedId();
        entry["type"] = mutableNode != nullptr ? mutableNode->getNodeType() : 0u;
        entry["index"] = node->getIndex();
        entry["status"] = node->getStatus();
        entry["description"] = inventory::latin1ToUtf8(node->getDescription());
        if (mutableNode != nullptr && !mutableNode->getPath().empty()) {
            entry["path"] = inventory::latin1ToUtf8(mutableNode->getPath());
        }
        if (mutableNode != nullptr && !mutableNode->getParent().empty()) {
            entry["parent"] = inventory::latin1ToUtf8(mutableNode->getParent());
        }
        Json properties = Json::object();
        for (auto const& stored : node->getProperties()) {
            IC::PropertyValue value;
            IC::Error const error = node->getProperty(stored.first, value);
            properties[std::to_string(stored.first)] =
                referenceValue(error.getStatus() == 0 ? value : stored.second);
        }
        entry["properties"] = std::move(properties);
        list.push_back(std::move(entry));
    }
    Json document;
    document["nodes"] = std::move(list);
    return document;
}

// The computer systems' current time, which the two documents read at two
// moments, set to 0.
void maskCurrentTime(Json& document) {
    for (Json& node : document["nodes"]) {
        if (node["type"] == kComputerSystemType && node["properties"].contains("126")) {
            node["properties"]["126"]["value"] = 0;
        }
    }
}

// ---- The tables -------------------------------------------------------------------

struct NamedTable {
    std::string name;
    std::vector<unsigned char> raw;
};

std::vector<NamedTable> tables() {
    std::vector<NamedTable> found;
    smbiosdump::PluginRead const demo =
        smbiosdump::readOverrideFile(hosttest::sourceDir() + "/examples/demo-server.smbios.txt");
    EXPECT_TRUE(demo.ok()) << "the example server's dump file cannot be read";
    found.push_back(
        {"demo-server", std::vector<unsigned char>(demo.table.begin(), demo.table.end())});
    for (std::string const& name : smbiostest::corpusNames()) {
        smbiosdump::DumpImage image;
        std::string error;
        std::vector<uint8_t> const bytes =
            smbiostest::fileBytes(smbiostest::corpusDir() + "/" + name + ".bin");
        EXPECT_TRUE(smbiosdump::readDumpBin(bytes, image, error)) << name << ": " << error;
        found.push_back({name, std::vector<unsigned char>(image.table.begin(), image.table.end())});
    }
    return found;
}

class InventoryCorpus : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_FALSE(hosttest::sourceDir().empty())
            << "SMBIOS_SOURCE_DIR is not set; run the tests through ctest";
        if (smbiostest::corpusDir().empty()) {
            std::cout << "no corpus of real SMBIOS dumps (SMBIOS_CORPUS_DIR): the example "
                         "server only\n";
        }
    }

    // Neither this machine's table nor its memory: the plug-in's one
    // acquisition in this process (the computer-system builder asks for the
    // table's version) finds an empty data folder and no memory library.
    smbiostest::TempDir empty_;
    smbiostest::ScopedEnv dataDir_{"KESTREL_DATA_DIR", empty_.path() + "/"};
    smbiostest::ScopedEnv codeDir_{"KESTREL_CODE_DIR", empty_.path() + "/"};
};

TEST_F(InventoryCorpus, EveryPropertyOfEveryTreeHasANameInTheCatalog) {
    std::set<std::pair<unsigned int, unsigned int>> seen;
    for (NamedTable const& table : tables()) {
        SCOPED_TRACE(table.name);
        TreeOfTable tree(table.raw);
        for (IC::Node const* node : tree.nodes()) {
            auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
            ASSERT_NE(mutableNode, nullptr);
            for (auto const& property : node->getProperties()) {
                unsigned int const type = mutableNode->getNodeType();
                seen.emplace(type, property.first);
                EXPECT_NE(inventory::findProperty(type, property.first), nullptr)
                    << "node type " << type << " property " << property.first << " ("
                    << node->getDescription() << ") has no name";
            }
        }
    }
    // The trees hold properties of every builder.
    EXPECT_GT(seen.size(), 130u);
}

TEST_F(InventoryCorpus, StreamedJsonIsTheLibrarysDocumentWithTheCatalogsKeysAdded) {
    for (NamedTable const& table : tables()) {
        SCOPED_TRACE(table.name);
        TreeOfTable tree(table.raw);
        std::vector<IC::Node*> const nodes = tree.nodes();
        std::string streamed;
        inventory::writeJson(
            nodes, [&](char const* data, std::size_t size) { streamed.append(data, size); });
        Json reference = referenceDocument(nodes);

        Json document;
        ASSERT_NO_THROW(document = Json::parse(streamed));
        // The layout is the library's own.
        EXPECT_TRUE(document.dump(2) + "\n" == streamed)
            << hosttest::firstDifference(document.dump(2) + "\n", streamed);
        // Every property has its name; taken out with the unit and meaning,
        // what is left is the library's document.
        for (Json const& node : document["nodes"]) {
            for (auto const& property : node["properties"].items()) {
                EXPECT_TRUE(property.value().contains("name"))
                    << "type " << node["type"] << " property " << property.key();
            }
        }
        Json stripped = hosttest::withoutLabels(document);
        maskCurrentTime(stripped);
        maskCurrentTime(reference);
        EXPECT_TRUE(stripped == reference)
            << hosttest::firstDifference(reference.dump(2), stripped.dump(2));
    }
}

}  // namespace
