#include "Inventory.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <nlohmann/json.hpp>
#include <utility>

#include "IC/MutableNode.h"

namespace inventory {

namespace {

using Json = nlohmann::ordered_json;

}  // namespace

NodeFacts readFacts(IC::Node const& node) {
    NodeFacts facts;
    facts.id = node.getNodeId();
    facts.linked = node.getLinkedId();
    facts.index = node.getIndex();
    facts.status = node.getStatus();
    facts.description = node.getDescription();
    if (auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(&node)) {
        facts.type = mutableNode->getNodeType();
        facts.path = mutableNode->getPath();
        facts.parent = mutableNode->getParent();
    }
    return facts;
}

namespace {

char const kHexDigits[] = "0123456789ABCDEF";

void appendHexByte(std::string& out, unsigned char byte) {
    out += kHexDigits[byte >> 4];
    out += kHexDigits[byte & 0x0F];
}

std::string formatDouble(double value) {
    // The shortest text that reads back as the same value, without an
    // exponent when one of up to 17 digits does (40 rather than 4e+01).
    std::string shortest;
    char buffer[64];
    for (int precision = 1; precision <= 17; ++precision) {
        std::snprintf(buffer, sizeof buffer, "%.*g", precision, value);
        if (std::strtod(buffer, nullptr) != value) {
            continue;
        }
        if (std::strchr(buffer, 'e') == nullptr) {
            return buffer;
        }
        if (shortest.empty()) {
            shortest = buffer;
        }
    }
    return shortest.empty() ? std::string(buffer) : shortest;
}

std::string formatNumber(IC::Number const& number) {
    switch (number.getKind()) {
        case IC::Number::BOOL:
            return number.getBool() ? "true" : "false";
        case IC::Number::UNSIGNED:
            return std::to_string(number.getUnsigned());
        case IC::Number::DOUBLE:
            return formatDouble(number.getDouble());
        case IC::Number::VERSION:
            return std::to_string(number.getVersion().getMajor()) + "." +
                   std::to_string(number.getVersion().getMinor());
        case IC::Number::DATETIME:
            return formatDateTime(number.getDateTime());
        case IC::Number::NONE:
            break;
    }
    return "(none)";
}

Json numberJson(IC::Number const& number) {
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
    Json result;
    result["kind"] = numberKindName(number);
    result["value"] = std::move(value);
    return result;
}

Json valueJson(IC::PropertyValue const& property) {
    if (property.getKind() == IC::PropertyValue::NUMBER) {
        return numberJson(property.getNumber());
    }
    Json value;
    switch (property.getKind()) {
        case IC::PropertyValue::STRING:
            value = latin1ToUtf8(property.getString());
            break;
        case IC::PropertyValue::ENUM:
            value = property.getEnum().getValue();
            break;
        case IC::PropertyValue::BYTE:
            value = static_cast<unsigned int>(property.getByte());
            break;
        case IC::PropertyValue::BYTES: {
            std::string hex;
            for (unsigned char byte : property.getBytes()) {
                appendHexByte(hex, byte);
            }
            value = hex;
            break;
        }
        case IC::PropertyValue::NUMBERS:
            value = Json::array();
            for (IC::Number const& number : property.getNumbers()) {
                value.push_back(numberJson(number));
            }
            break;
        case IC::PropertyValue::STRINGS:
            value = Json::array();
            for (std::string const& text : property.getStrings()) {
                value.push_back(latin1ToUtf8(text));
            }
            break;
        case IC::PropertyValue::KIND:
            value = static_cast<unsigned int>(property.getKindValue());
            break;
        case IC::PropertyValue::NUMBER:
        case IC::PropertyValue::NONE:
            break;
    }
    Json result;
    result["kind"] = valueKindName(property);
    result["value"] = std::move(value);
    return result;
}

std::string nodeLine(NodeFacts const& facts, bool topLevel) {
    std::string line = escapeText(facts.description, false);
    line += "  [" + nodeTypeLabel(facts.type) + ", index " + std::to_string(facts.index) + ", id " +
            std::to_string(facts.id) + ", status " + std::to_string(facts.status);
    if (topLevel && facts.linked != 0) {
        // Linked to a node that is not in the list.
        line += ", linked " + std::to_string(facts.linked);
    }
    if (!facts.path.empty()) {
        line += ", path " + escapeText(facts.path, true);
    }
    if (!facts.parent.empty()) {
        line += ", parent " + escapeText(facts.parent, true);
    }
    line += "]";
    return line;
}

}  // namespace

std::string latin1ToUtf8(std::string const& text) {
    std::string out;
    out.reserve(text.size());
    for (char c : text) {
        auto byte = static_cast<unsigned char>(c);
        if (byte < 0x80) {
            out += c;
        } else {
            out += static_cast<char>(0xC0 | (byte >> 6));
            out += static_cast<char>(0x80 | (byte & 0x3F));
        }
    }
    return out;
}

std::string escapeText(std::string const& text, bool quoted) {
    std::string out;
    if (quoted) {
        out += '"';
    }
    for (char c : text) {
        auto byte = static_cast<unsigned char>(c);
        if (byte == '\\' || (quoted && byte == '"')) {
            out += '\\';
            out += c;
        } else if (byte < 0x20 || byte == 0x7F || (byte >= 0x80 && byte < 0xA0)) {
            out += "\\x";
            appendHexByte(out, byte);
        } else if (byte >= 0xA0) {
            out += latin1ToUtf8(std::string(1, c));
        } else {
            out += c;
        }
    }
    if (quoted) {
        out += '"';
    }
    return out;
}

std::string nodeTypeName(unsigned int type) {
    static std::map<unsigned int, char const*> const names = {
        {1, "chassis"},
        {3, "firmware"},
        {4, "processor"},
        {13, "BMC"},
        {15, "management interface"},
        {19, "memory device"},
        {21, "voltage sensor"},
        {22, "temperature sensor"},
        {31, "processor cache"},
        {32, "memory array"},
        {35, "system event log"},
        {40, "computer system"},
        {41, "planar"},
        {42, "processor core"},
        {50, "disk controller"},
        {53, "diagnostics firmware"},
        {55, "raw SMBIOS table"},
        {59, "root"},
        {62, "system slot"},
        {70, "port connector"},
    };
    auto found = names.find(type);
    return found == names.end() ? std::string() : std::string(found->second);
}

std::string nodeTypeLabel(unsigned int type) {
    std::string label = "type " + std::to_string(type);
    std::string name = nodeTypeName(type);
    if (!name.empty()) {
        label += " " + name;
    }
    return label;
}

std::string numberKindName(IC::Number const& number) {
    switch (number.getKind()) {
        case IC::Number::BOOL:
            return "bool";
        case IC::Number::UNSIGNED:
            return "unsigned";
        case IC::Number::DOUBLE:
            return "double";
        case IC::Number::VERSION:
            return "version";
        case IC::Number::DATETIME:
            return "datetime";
        case IC::Number::NONE:
            break;
    }
    return "none";
}

std::string valueKindName(IC::PropertyValue const& value) {
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            return "string";
        case IC::PropertyValue::NUMBER:
            return numberKindName(value.getNumber());
        case IC::PropertyValue::ENUM:
            switch (value.getEnum().getWidth()) {
                case 1:
                    return "enum8";
                case 2:
                    return "enum16";
                default:
                    return "enum32";
            }
        case IC::PropertyValue::BYTE:
            return "byte";
        case IC::PropertyValue::BYTES:
            return "bytes";
        case IC::PropertyValue::NUMBERS:
            return "numbers";
        case IC::PropertyValue::STRINGS:
            return "strings";
        case IC::PropertyValue::KIND:
            return "kind";
        case IC::PropertyValue::NONE:
            break;
    }
    return "none";
}

std::string formatDateTime(std::int64_t seconds) {
    // Whole days since 1970-01-01 and the time of that day, then the civil
    // date of the day count (400-year eras of 146097 days, years starting
    // on 1 March so that the leap day ends the year).
    std::int64_t days = seconds / 86400;
    std::int64_t rest = seconds % 86400;
    if (rest < 0) {
        rest += 86400;
        days -= 1;
    }
    std::int64_t const shifted = days + 719468;
    std::int64_t const era = (shifted >= 0 ? shifted : shifted - 146096) / 146097;
    std::int64_t const dayOfEra = shifted - era * 146097;
    std::int64_t const yearOfEra =
        (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
    std::int64_t const dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
    std::int64_t const monthIndex = (5 * dayOfYear + 2) / 153;
    std::int64_t const day = dayOfYear - (153 * monthIndex + 2) / 5 + 1;
    std::int64_t const month = monthIndex < 10 ? monthIndex + 3 : monthIndex - 9;
    std::int64_t const year = yearOfEra + era * 400 + (month <= 2 ? 1 : 0);

    char buffer[64];
    std::snprintf(buffer, sizeof buffer, "%04lld-%02lld-%02lld %02lld:%02lld:%02lld",
                  static_cast<long long>(year), static_cast<long long>(month),
                  static_cast<long long>(day), static_cast<long long>(rest / 3600),
                  static_cast<long long>(rest % 3600 / 60), static_cast<long long>(rest % 60));
    return buffer;
}

std::string formatValue(IC::PropertyValue const& value) {
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            return escapeText(value.getString(), true);
        case IC::PropertyValue::NUMBER:
            return formatNumber(value.getNumber());
        case IC::PropertyValue::ENUM:
            return std::to_string(value.getEnum().getValue());
        case IC::PropertyValue::BYTE:
            return std::to_string(static_cast<unsigned int>(value.getByte()));
        case IC::PropertyValue::BYTES: {
            std::string hex;
            for (unsigned char byte : value.getBytes()) {
                if (!hex.empty()) {
                    hex += ' ';
                }
                appendHexByte(hex, byte);
            }
            return hex;
        }
        case IC::PropertyValue::NUMBERS: {
            std::string list = "{";
            for (IC::Number const& number : value.getNumbers()) {
                if (list.size() > 1) {
                    list += ", ";
                }
                list += formatNumber(number);
            }
            return list + "}";
        }
        case IC::PropertyValue::STRINGS: {
            std::string list = "{";
            bool first = true;
            for (std::string const& text : value.getStrings()) {
                if (!first) {
                    list += ", ";
                }
                first = false;
                list += escapeText(text, true);
            }
            return list + "}";
        }
        case IC::PropertyValue::KIND:
            return std::to_string(static_cast<unsigned int>(value.getKindValue()));
        case IC::PropertyValue::NONE:
            break;
    }
    return "(none)";
}

std::vector<std::pair<unsigned int, IC::PropertyValue>> readProperties(IC::Node const& node) {
    std::vector<std::pair<unsigned int, IC::PropertyValue>> properties;
    for (auto const& stored : node.getProperties()) {
        IC::PropertyValue value;
        IC::Error error = node.getProperty(stored.first, value);
        // A node that lists an id but does not answer for it keeps the
        // stored value.
        properties.emplace_back(stored.first, error.getStatus() == 0 ? value : stored.second);
    }
    return properties;
}

std::string renderJson(std::vector<IC::Node*> const& nodes) {
    Json list = Json::array();
    for (IC::Node const* node : nodes) {
        if (node == nullptr) {
            continue;
        }
        NodeFacts const facts = readFacts(*node);
        Json entry;
        entry["id"] = facts.id;
        entry["linked"] = facts.linked;
        entry["type"] = facts.type;
        entry["index"] = facts.index;
        entry["status"] = facts.status;
        entry["description"] = latin1ToUtf8(facts.description);
        if (!facts.path.empty()) {
            entry["path"] = latin1ToUtf8(facts.path);
        }
        if (!facts.parent.empty()) {
            entry["parent"] = latin1ToUtf8(facts.parent);
        }
        // The ids come in ascending numeric order and the ordered object
        // keeps them in that order.
        Json properties = Json::object();
        for (auto const& property : readProperties(*node)) {
            properties[std::to_string(property.first)] = valueJson(property.second);
        }
        entry["properties"] = std::move(properties);
        list.push_back(std::move(entry));
    }
    Json document;
    document["nodes"] = std::move(list);
    return document.dump(2) + "\n";
}

TreeShape treeShape(std::vector<IC::Node*> const& nodes) {
    TreeShape shape;
    for (IC::Node const* node : nodes) {
        if (node != nullptr) {
            shape.list.push_back(node);
        }
    }
    // The first node with an id is the one its linked nodes hang under.
    std::map<unsigned int, size_t> byId;
    for (size_t i = 0; i < shape.list.size(); ++i) {
        byId.emplace(shape.list[i]->getNodeId(), i);
    }
    shape.children.resize(shape.list.size());
    shape.topLevel.assign(shape.list.size(), false);
    for (size_t i = 0; i < shape.list.size(); ++i) {
        auto parent = byId.find(shape.list[i]->getLinkedId());
        if (parent == byId.end()) {
            shape.topLevel[i] = true;
        } else {
            shape.children[parent->second].push_back(i);
        }
    }
    return shape;
}

namespace {

// One node's line and its property lines beneath it, indented by depth.
void printNode(IC::Node const& node, size_t depth, std::string& out) {
    NodeFacts const facts = readFacts(node);
    std::string const indent(2 * depth, ' ');
    out += indent + nodeLine(facts, depth == 0) + "\n";
    for (auto const& property : readProperties(node)) {
        out += indent + "  " + std::to_string(property.first) + " " +
               valueKindName(property.second) + "  " + formatValue(property.second) + "\n";
    }
}

// The node at `start` and everything below it that is not printed yet.
void printSubtree(TreeShape const& shape, size_t start, std::vector<bool>& printed,
                  std::string& out) {
    // Depth first with an explicit stack; a node is printed once, which
    // also ends any cycle of linked ids.
    std::vector<std::pair<size_t, size_t>> stack;  // node, depth
    stack.emplace_back(start, 0);
    while (!stack.empty()) {
        auto const [index, depth] = stack.back();
        stack.pop_back();
        if (printed[index]) {
            continue;
        }
        printed[index] = true;
        printNode(*shape.list[index], depth, out);
        auto const& below = shape.children[index];
        for (auto child = below.rbegin(); child != below.rend(); ++child) {
            if (!printed[*child]) {
                stack.emplace_back(*child, depth + 1);
            }
        }
    }
}

}  // namespace

std::string renderTree(std::vector<IC::Node*> const& nodes) {
    TreeShape const shape = treeShape(nodes);
    std::string out;
    std::vector<bool> printed(shape.list.size(), false);
    for (size_t i = 0; i < shape.list.size(); ++i) {
        if (shape.topLevel[i]) {
            printSubtree(shape, i, printed, out);
        }
    }
    // Nodes whose linked ids only lead round in a cycle start trees of
    // their own.
    for (size_t i = 0; i < shape.list.size(); ++i) {
        if (!printed[i]) {
            printSubtree(shape, i, printed, out);
        }
    }
    return out;
}

}  // namespace inventory
