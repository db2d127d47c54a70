#include "InventoryJson.h"

#include <sstream>
#include <utility>

namespace hosttest {

namespace {

unsigned int const kComputerSystemType = 40;
char const kRunTimeProperty[] = "126";
char const kRunTimeZoneProperty[] = "127";

// Replaces the value of a property when it has the expected kind.
void mask(Json& properties, char const* id, char const* kind, char const* placeholder,
          unsigned int& masked) {
    if (!properties.contains(id)) {
        return;
    }
    Json& property = properties[id];
    if (property.value("kind", "") == kind) {
        property["value"] = placeholder;
        ++masked;
    }
}

std::vector<std::string> splitLines(std::string const& text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    std::string line;
    while (std::getline(in, line)) {
        lines.push_back(line);
    }
    return lines;
}

}  // namespace

char const kRunTimePlaceholder[] = "<date-time of the run>";
char const kRunTimeZonePlaceholder[] = "<time-zone offset of the run>";

std::string maskRunValues(std::string const& text, unsigned int& masked) {
    masked = 0;
    Json document = Json::parse(text);
    for (Json& node : document["nodes"]) {
        if (node.value("type", 0u) != kComputerSystemType || !node.contains("properties")) {
            continue;
        }
        Json& properties = node["properties"];
        mask(properties, kRunTimeProperty, "datetime", kRunTimePlaceholder, masked);
        mask(properties, kRunTimeZoneProperty, "double", kRunTimeZonePlaceholder, masked);
    }
    // The host writes its document this way too.
    return document.dump(2) + "\n";
}

char const* const kLabelKeys[3] = {"name", "unit", "meaning"};

Json withoutLabels(Json value) {
    if (!value.is_object()) {
        return value;
    }
    if (value.contains("nodes")) {
        for (Json& node : value["nodes"]) {
            node = withoutLabels(std::move(node));
        }
    } else if (value.contains("properties")) {
        value["properties"] = withoutLabels(std::move(value["properties"]));
    } else if (value.contains("kind")) {
        for (char const* key : kLabelKeys) {
            value.erase(key);
        }
    } else {
        // A node's properties, by id.
        for (auto& item : value.items()) {
            item.value() = withoutLabels(std::move(item.value()));
        }
    }
    return value;
}

std::vector<Json> nodesOfType(Json const& document, unsigned int type) {
    std::vector<Json> nodes;
    for (Json const& node : document.at("nodes")) {
        if (node.value("type", 0u) == type) {
            nodes.push_back(node);
        }
    }
    return nodes;
}

Json propertyOf(Json const& node, unsigned int id) {
    std::string const key = std::to_string(id);
    if (node.contains("properties") && node["properties"].contains(key)) {
        return node["properties"][key];
    }
    return Json();
}

std::string firstDifference(std::string const& expected, std::string const& actual) {
    std::vector<std::string> const want = splitLines(expected);
    std::vector<std::string> const got = splitLines(actual);
    size_t line = 0;
    while (line < want.size() && line < got.size() && want[line] == got[line]) {
        ++line;
    }
    std::ostringstream text;
    text << "first difference at line " << line + 1 << " (expected " << want.size()
         << " lines, actual " << got.size() << " lines)\n";
    for (size_t i = line; i < line + 5; ++i) {
        text << "  expected: " << (i < want.size() ? want[i] : "(end)") << "\n";
        text << "  actual:   " << (i < got.size() ? got[i] : "(end)") << "\n";
    }
    return text.str();
}

}  // namespace hosttest
