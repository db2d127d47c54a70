#include "inventory/InventoryDiff.h"

#include <climits>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <unordered_map>
#include <utility>

#include "inventory/Inventory.h"
#include "inventory/PropertyNames.h"

namespace inventory {

namespace {

// ---- How components are paired ----------------------------------------------

// How a key property's value names a component.
enum class KeyText {
    WHOLE,         // the value
    HEX,           // the value; a path shows the number in hexadecimal
    BEFORE_COLON,  // the text before the first ':' (a device locator of "device:bank")
};

// A property that tells apart siblings of one node type. A path shows it
// after its label ("" for none) unless the label is nullptr.
struct KeyField {
    unsigned int property;  // 0: none
    KeyText text;
    char const* label;
};

// What names a component of one node type besides the chain above it. By
// default a node is named by its type and description. A rule adds up to
// two properties; it may leave the description out where it is no name (a
// processor's "CPU 1" counts the enabled processors, so it shifts when one
// is disabled) and give the path a name in its place. The tie-breaker is
// added only among siblings that the rest leaves tied in either inventory.
// Siblings that still tie are numbered in list order (#2, #3, ...).
struct PairingRule {
    unsigned int nodeType;
    bool byDescription;  // the description is part of the key
    char const* name;    // shown in paths in place of the description; nullptr: the description
    KeyField fields[2];
    KeyField tieBreaker;
};

constexpr KeyField kNoField = {0, KeyText::WHOLE, nullptr};

constexpr PairingRule kPairingRules[] = {
    // processor: by socket designation
    {4, false, "CPU", {{53, KeyText::WHOLE, ""}, kNoField}, kNoField},
    // processor cache: by its own socket designation ("L1 Cache")
    {31, true, nullptr, {{53, KeyText::WHOLE, ""}, kNoField}, kNoField},
    // memory device: by device locator, and by bank locator too where the
    // device locators tie (its description is "device:bank")
    {19,
     false,
     nullptr,
     {{68, KeyText::BEFORE_COLON, nullptr}, kNoField},
     {68, KeyText::WHOLE, nullptr}},
    // system slot: by designation
    {62, true, nullptr, {{108, KeyText::WHOLE, ""}, kNoField}, kNoField},
    // port connector: by internal reference designator
    {70, true, nullptr, {{108, KeyText::WHOLE, ""}, kNoField}, kNoField},
    // firmware: by name (its description too)
    {3, true, nullptr, {{108, KeyText::WHOLE, nullptr}, kNoField}, kNoField},
    // raw SMBIOS structure: by structure type and handle
    {55, true, nullptr, {{177, KeyText::WHOLE, "type"}, {178, KeyText::HEX, "handle"}}, kNoField},
};

// The framework's own nodes above the components (management interface,
// root): every inventory has them, so paths leave them out below them.
constexpr unsigned int kFrameTypes[] = {15, 59};

// Properties left out of the comparison: the computer system's current time
// and time-zone offset, read from the clock when the inventory is written.
struct LeftOut {
    unsigned int nodeType;
    unsigned int property;
};
constexpr LeftOut kLeftOut[] = {{40, 126}, {40, 127}};

PairingRule const* pairingRule(unsigned int nodeType) {
    for (PairingRule const& rule : kPairingRules) {
        if (rule.nodeType == nodeType) {
            return &rule;
        }
    }
    return nullptr;
}

bool isFrame(unsigned int nodeType) {
    for (unsigned int type : kFrameTypes) {
        if (type == nodeType) {
            return true;
        }
    }
    return false;
}

bool isLeftOut(unsigned int nodeType, unsigned int property) {
    for (LeftOut const& entry : kLeftOut) {
        if (entry.nodeType == nodeType && entry.property == property) {
            return true;
        }
    }
    return false;
}

// ---- Text --------------------------------------------------------------------

// The Latin-1 text whose UTF-8 form `text` is, when every character of it
// is below U+0100 (what the host writes); false otherwise.
bool utf8ToLatin1(std::string const& text, std::string& latin1) {
    latin1.clear();
    for (size_t i = 0; i < text.size(); ++i) {
        auto const byte = static_cast<unsigned char>(text[i]);
        if (byte < 0x80) {
            latin1 += text[i];
            continue;
        }
        if ((byte != 0xC2 && byte != 0xC3) || i + 1 >= text.size()) {
            return false;
        }
        auto const next = static_cast<unsigned char>(text[i + 1]);
        if ((next & 0xC0) != 0x80) {
            return false;
        }
        latin1 += static_cast<char>(((byte & 0x03) << 6) | (next & 0x3F));
        ++i;
    }
    return true;
}

// A text of the document as the tree writes it: control characters as
// \xNN, and with quoted, in double quotes with \" and \\.
std::string showText(std::string const& utf8, bool quoted) {
    std::string latin1;
    if (utf8ToLatin1(utf8, latin1)) {
        return escapeText(latin1, quoted);
    }
    // Characters beyond Latin-1 (a document from elsewhere) stay as they
    // are; only the ASCII controls and the quoting are escaped.
    static char const digits[] = "0123456789ABCDEF";
    std::string out = quoted ? "\"" : "";
    for (char c : utf8) {
        auto const byte = static_cast<unsigned char>(c);
        if (byte == '\\' || (quoted && byte == '"')) {
            out += '\\';
            out += c;
        } else if (byte < 0x20 || byte == 0x7F) {
            out += "\\x";
            out += digits[byte >> 4];
            out += digits[byte & 0x0F];
        } else {
            out += c;
        }
    }
    return quoted ? out + "\"" : out;
}

// Upper-case hex of two digits a byte, as the document holds bytes, with a
// blank between the bytes as the tree shows them.
std::string spacedHex(std::string const& hex) {
    std::string out;
    for (size_t i = 0; i < hex.size(); i += 2) {
        if (!out.empty()) {
            out += ' ';
        }
        out += hex.substr(i, 2);
    }
    return out;
}

std::string showValue(std::string const& kind, DiffJson const& value);

// A list of values, each written after its own kind: {1, 9, 12}.
std::string showList(DiffJson const& list, bool ofStrings) {
    std::string out = "{";
    for (DiffJson const& element : list) {
        if (out.size() > 1) {
            out += ", ";
        }
        if (ofStrings) {
            out +=
                element.is_string() ? showText(element.get<std::string>(), true) : element.dump();
        } else if (element.is_object() && element.contains("kind") && element["kind"].is_string() &&
                   element.contains("value")) {
            out += showValue(element["kind"].get<std::string>(), element["value"]);
        } else {
            out += element.dump();
        }
    }
    return out + "}";
}

// The value of a value object, written as the tree writes it; a value that
// does not have its kind's shape is written as JSON.
std::string showValue(std::string const& kind, DiffJson const& value) {
    if (kind == "string" && value.is_string()) {
        return showText(value.get<std::string>(), true);
    }
    if (kind == "double" && value.is_number()) {
        return formatDouble(value.get<double>());
    }
    if (kind == "version" && value.is_array() && value.size() == 2 && value[0].is_number() &&
        value[1].is_number()) {
        return value[0].dump() + "." + value[1].dump();
    }
    if (kind == "datetime" && value.is_number_integer()) {
        return formatDateTime(value.get<std::int64_t>());
    }
    if (kind == "bytes" && value.is_string()) {
        return spacedHex(value.get<std::string>());
    }
    if ((kind == "numbers" || kind == "strings") && value.is_array()) {
        return showList(value, kind == "strings");
    }
    if (kind == "none") {
        return "(none)";
    }
    return value.dump();
}

// A whole number that is not negative (the parser holds those as unsigned,
// a document built in code may hold them as signed).
bool asUnsigned(DiffJson const& value, std::uint64_t& out) {
    if (value.is_number_unsigned()) {
        out = value.get<std::uint64_t>();
        return true;
    }
    if (value.is_number_integer() && value.get<std::int64_t>() >= 0) {
        out = static_cast<std::uint64_t>(value.get<std::int64_t>());
        return true;
    }
    return false;
}

// ---- Reading the document ----------------------------------------------------

bool readUnsigned(DiffJson const& node, char const* key, unsigned int& out, std::string& why) {
    auto const found = node.find(key);
    std::uint64_t value = 0;
    if (found == node.end() || !asUnsigned(*found, value) || value > UINT_MAX) {
        why = std::string("\"") + key + "\" is not an unsigned number";
        return false;
    }
    out = static_cast<unsigned int>(value);
    return true;
}

bool readText(DiffJson const& node, char const* key, bool required, std::string& out,
              std::string& why) {
    auto const found = node.find(key);
    if (found == node.end() && !required) {
        return true;
    }
    if (found == node.end() || !found->is_string()) {
        why = std::string("\"") + key + "\" is not a text";
        return false;
    }
    out = found->get<std::string>();
    return true;
}

// A property id as the document writes it: decimal digits.
bool readPropertyId(std::string const& text, unsigned int& id) {
    if (text.empty() || text.size() > 9) {
        return false;
    }
    id = 0;
    for (char c : text) {
        if (c < '0' || c > '9') {
            return false;
        }
        id = id * 10 + static_cast<unsigned int>(c - '0');
    }
    return true;
}

bool readValueObject(DiffJson const& value, std::string const& id, std::string& why) {
    if (!value.is_object() || !value.contains("kind") || !value["kind"].is_string() ||
        !value.contains("value")) {
        why = "property " + id + " is not a {\"kind\", \"value\"} object";
        return false;
    }
    return true;
}

// The properties: an object by id, as the host writes them, or a list of
// value objects that carry their "id".
bool readProperties(DiffJson const& node, InventoryNode& out, std::string& why) {
    auto const found = node.find("properties");
    if (found == node.end() || (!found->is_object() && !found->is_array())) {
        why = "\"properties\" is not an object";
        return false;
    }
    for (auto const& item : found->items()) {
        unsigned int id = 0;
        std::string idText = item.key();
        if (found->is_array()) {
            if (!item.value().is_object() || !readUnsigned(item.value(), "id", id, why)) {
                why = "property " + idText + ": \"id\" is not an unsigned number";
                return false;
            }
            idText = std::to_string(id);
        } else if (!readPropertyId(idText, id)) {
            why = "property id \"" + idText + "\" is not a decimal number";
            return false;
        }
        if (!readValueObject(item.value(), idText, why)) {
            return false;
        }
        out.properties[id] = item.value();
    }
    return true;
}

bool readNode(DiffJson const& node, InventoryNode& out, std::string& why) {
    if (!node.is_object()) {
        why = "not an object";
        return false;
    }
    return readUnsigned(node, "id", out.id, why) && readUnsigned(node, "linked", out.linked, why) &&
           readUnsigned(node, "type", out.type, why) &&
           readUnsigned(node, "status", out.status, why) &&
           readText(node, "description", true, out.description, why) &&
           readText(node, "path", false, out.path, why) &&
           readText(node, "parent", false, out.parent, why) && readProperties(node, out, why);
}

// ---- Shape and keys ----------------------------------------------------------

// The value of a key property as the key holds it ("" when the node lacks
// it).
std::string keyValue(InventoryNode const& node, KeyField const& field) {
    auto const found = node.properties.find(field.property);
    if (found == node.properties.end()) {
        return "";
    }
    DiffJson const& value = found->second["value"];
    if (!value.is_string()) {
        return value.dump();
    }
    std::string text = value.get<std::string>();
    return field.text == KeyText::BEFORE_COLON ? text.substr(0, text.find(':')) : text;
}

// How a key property appears in a path: `label "text"`, `label 0x002F`.
std::string showKeyField(InventoryNode const& node, KeyField const& field) {
    auto const found = node.properties.find(field.property);
    if (found == node.properties.end()) {
        return "";
    }
    DiffJson const& value = found->second["value"];
    std::string shown;
    std::uint64_t number = 0;
    if (value.is_string()) {
        shown = showText(keyValue(node, field), true);
    } else if (field.text == KeyText::HEX && asUnsigned(value, number)) {
        char buffer[32];
        std::snprintf(buffer, sizeof buffer, "0x%04llX", static_cast<unsigned long long>(number));
        shown = buffer;
    } else {
        shown = value.dump();
    }
    return *field.label != '\0' ? std::string(field.label) + " " + shown : shown;
}

// Appends a part to a key, its length first, so that no text can run into
// the next part.
void addKeyPart(std::string& key, std::string const& part) {
    key += std::to_string(part.size());
    key += ':';
    key += part;
}

// What names a node among its siblings, without the tie-breaker and the
// number among equals, and how its path shows it.
struct Segment {
    std::string key;
    std::string shown;
};

Segment segmentOf(InventoryNode const& node) {
    PairingRule const* const rule = pairingRule(node.type);
    Segment segment;
    addKeyPart(segment.key, std::to_string(node.type));
    if (rule == nullptr || rule->byDescription) {
        addKeyPart(segment.key, node.description);
    }
    if (rule != nullptr && rule->name != nullptr) {
        segment.shown = rule->name;
    } else {
        segment.shown =
            node.description.empty() ? nodeTypeLabel(node.type) : showText(node.description, false);
    }
    if (rule == nullptr) {
        return segment;
    }
    for (KeyField const& field : rule->fields) {
        if (field.property == 0) {
            continue;
        }
        std::string const value = keyValue(node, field);
        addKeyPart(segment.key, value);
        if (field.label != nullptr && !value.empty()) {
            segment.shown += " " + showKeyField(node, field);
        }
    }
    return segment;
}

// The tree of the nodes by linked id: a node hangs under the first node of
// the list with its linked id; nodes whose linked id names none are at the
// top, and so are nodes whose linked ids only lead round in a cycle.
// children[i] are the nodes under node i in list order, children[size] the
// nodes at the top.
std::vector<std::vector<size_t>> treeOf(std::vector<InventoryNode> const& nodes) {
    size_t const top = nodes.size();
    std::unordered_map<unsigned int, size_t> byId;
    for (size_t i = 0; i < nodes.size(); ++i) {
        byId.emplace(nodes[i].id, i);
    }
    std::vector<std::vector<size_t>> linkedTo(nodes.size());
    std::vector<size_t> roots;
    for (size_t i = 0; i < nodes.size(); ++i) {
        auto const parent = byId.find(nodes[i].linked);
        if (parent == byId.end() || parent->second == i) {
            roots.push_back(i);
        } else {
            linkedTo[parent->second].push_back(i);
        }
    }
    std::vector<std::vector<size_t>> children(nodes.size() + 1);
    std::vector<bool> placed(nodes.size(), false);
    auto const hang = [&](size_t start) {
        placed[start] = true;
        children[top].push_back(start);
        std::vector<size_t> pending{start};
        while (!pending.empty()) {
            size_t const at = pending.back();
            pending.pop_back();
            for (size_t child : linkedTo[at]) {
                if (!placed[child]) {
                    placed[child] = true;
                    children[at].push_back(child);
                    pending.push_back(child);
                }
            }
        }
    };
    for (size_t root : roots) {
        hang(root);
    }
    for (size_t i = 0; i < nodes.size(); ++i) {
        if (!placed[i]) {
            hang(i);
        }
    }
    return children;
}

// One inventory: its nodes and their tree.
struct Side {
    std::vector<InventoryNode> const& nodes;
    std::vector<std::vector<size_t>> children;
};

// The children of one node, each with its key among them and its segment
// of the path.
struct KeyedChildren {
    std::vector<size_t> nodes;
    std::vector<std::string> keys;
    std::vector<std::string> shown;
};

// Keys the children of one node of each inventory. The base keys that tie
// among the children of either side take the tie-breaker on both sides, so
// that a component is named alike in both; what still ties is numbered.
std::pair<KeyedChildren, KeyedChildren> keyChildren(Side const& old, size_t oldParent,
                                                    Side const& now, size_t newParent) {
    std::pair<KeyedChildren, KeyedChildren> keyed;
    std::unordered_map<std::string, unsigned int> counts[2];
    std::vector<Segment> segments[2];
    Side const* const sides[2] = {&old, &now};
    KeyedChildren* const out[2] = {&keyed.first, &keyed.second};
    size_t const parents[2] = {oldParent, newParent};
    for (int side = 0; side < 2; ++side) {
        out[side]->nodes = sides[side]->children[parents[side]];
        for (size_t child : out[side]->nodes) {
            segments[side].push_back(segmentOf(sides[side]->nodes[child]));
            ++counts[side][segments[side].back().key];
        }
    }
    for (int side = 0; side < 2; ++side) {
        std::unordered_map<std::string, unsigned int> seen;
        for (size_t i = 0; i < out[side]->nodes.size(); ++i) {
            InventoryNode const& node = sides[side]->nodes[out[side]->nodes[i]];
            Segment segment = segments[side][i];
            PairingRule const* const rule = pairingRule(node.type);
            if (rule != nullptr && rule->tieBreaker.property != 0 &&
                (counts[0][segment.key] > 1 || counts[1][segment.key] > 1)) {
                addKeyPart(segment.key, keyValue(node, rule->tieBreaker));
            }
            unsigned int const number = ++seen[segment.key];
            addKeyPart(segment.key, std::to_string(number));
            if (number > 1) {
                segment.shown += " #" + std::to_string(number);
            }
            out[side]->keys.push_back(std::move(segment.key));
            out[side]->shown.push_back(std::move(segment.shown));
        }
    }
    return keyed;
}

// ---- Comparison --------------------------------------------------------------

// The kind and value of a value object: what two values are compared by
// (names, units and meanings that a document adds are not).
bool sameValue(DiffJson const& a, DiffJson const& b) {
    return a["kind"] == b["kind"] && a["value"] == b["value"];
}

Difference component(Difference::Change change, std::string const& path,
                     InventoryNode const& node) {
    Difference difference;
    difference.change = change;
    difference.path = path;
    difference.nodeType = node.type;
    difference.description = node.description;
    return difference;
}

// The node fields that are compared besides the properties.
struct NodeField {
    char const* name;   // in the JSON output
    char const* label;  // in the text output
    DiffJson (*read)(InventoryNode const&);
};
NodeField const kNodeFields[] = {
    {"status", "Status", [](InventoryNode const& node) { return DiffJson(node.status); }},
    {"path", "Path", [](InventoryNode const& node) { return DiffJson(node.path); }},
    {"parent", "Parent", [](InventoryNode const& node) { return DiffJson(node.parent); }},
};

std::string fieldLabel(std::string const& name) {
    for (NodeField const& field : kNodeFields) {
        if (name == field.name) {
            return field.label;
        }
    }
    return name;
}

// A node field's value as the text output shows it.
std::string showField(DiffJson const& value) {
    return value.is_string() ? showText(value.get<std::string>(), true) : value.dump();
}

// The changes of one component present in both inventories, without their
// path.
void compareNode(InventoryNode const& before, InventoryNode const& after,
                 std::vector<Difference>& out) {
    std::string const path;
    for (NodeField const& field : kNodeFields) {
        DiffJson const old = field.read(before);
        DiffJson const now = field.read(after);
        if (old != now) {
            Difference difference = component(Difference::CHANGED, path, after);
            difference.field = field.name;
            difference.before = old;
            difference.after = now;
            out.push_back(std::move(difference));
        }
    }
    std::map<unsigned int, std::pair<DiffJson const*, DiffJson const*>> both;
    for (auto const& property : before.properties) {
        both[property.first].first = &property.second;
    }
    for (auto const& property : after.properties) {
        both[property.first].second = &property.second;
    }
    for (auto const& [id, values] : both) {
        if (isLeftOut(after.type, id) || (values.first != nullptr && values.second != nullptr &&
                                          sameValue(*values.first, *values.second))) {
            continue;
        }
        Difference difference = component(Difference::CHANGED, path, after);
        difference.property = id;
        difference.before = values.first != nullptr ? *values.first : DiffJson();
        difference.after = values.second != nullptr ? *values.second : DiffJson();
        out.push_back(std::move(difference));
    }
}

constexpr size_t kNone = static_cast<size_t>(-1);

// A component's place as a path shows it: its segment and the place its
// path continues from (kNone at the top; a frame node's children continue
// from the frame node's own place, since paths leave frame nodes out).
// Places are kept in one list and name the one above by its position, so
// that a deep tree holds no long text for every node.
struct Place {
    size_t up;
    std::string shown;
};

std::string pathOf(std::vector<Place> const& places, size_t place) {
    std::vector<std::string const*> segments;
    for (size_t at = place; at != kNone; at = places[at].up) {
        segments.push_back(&places[at].shown);
    }
    std::string path;
    for (auto segment = segments.rbegin(); segment != segments.rend(); ++segment) {
        path += (path.empty() ? "" : "/") + **segment;
    }
    return path;
}

// One step of the walk over both trees: a pair to compare (both set), or
// one component to report as removed (only `before`) or added (only
// `after`); kNone stands for "none", and the top of both trees is the pair
// (size, size). `place` is the component's own place, `prefix` where its
// children's paths continue from.
struct Step {
    size_t before;
    size_t after;
    size_t place;
    size_t prefix;
};

// The children of a pair in the order they are reported: the new
// inventory's children in its order, each removed child right after the
// child it followed in the old inventory.
std::vector<Step> childSteps(Side const& old, Side const& now, Step const& pair,
                             std::vector<Place>& places) {
    std::pair<KeyedChildren, KeyedChildren> const keyed =
        keyChildren(old, pair.before, now, pair.after);
    KeyedChildren const& oldKeyed = keyed.first;
    KeyedChildren const& newKeyed = keyed.second;
    std::unordered_map<std::string, size_t> oldByKey;
    for (size_t i = 0; i < oldKeyed.nodes.size(); ++i) {
        oldByKey.emplace(oldKeyed.keys[i], i);
    }
    std::unordered_map<std::string, size_t> newByKey;
    for (size_t i = 0; i < newKeyed.nodes.size(); ++i) {
        newByKey.emplace(newKeyed.keys[i], i);
    }
    auto const childStep = [&](size_t before, size_t after, std::string const& shown) {
        places.push_back(Place{pair.prefix, shown});
        size_t const place = places.size() - 1;
        unsigned int const type = after != kNone ? now.nodes[after].type : old.nodes[before].type;
        return Step{before, after, place, isFrame(type) ? pair.prefix : place};
    };
    // Removed children by the position of the paired old child they
    // follow (kNone: before the first).
    std::multimap<size_t, size_t> removedAfter;
    size_t lastPaired = kNone;
    for (size_t i = 0; i < oldKeyed.nodes.size(); ++i) {
        if (newByKey.count(oldKeyed.keys[i]) == 0) {
            removedAfter.emplace(lastPaired, i);
        } else {
            lastPaired = i;
        }
    }
    std::vector<Step> steps;
    auto const addRemoved = [&](size_t after) {
        auto const range = removedAfter.equal_range(after);
        for (auto it = range.first; it != range.second; ++it) {
            steps.push_back(
                childStep(oldKeyed.nodes[it->second], kNone, oldKeyed.shown[it->second]));
        }
    };
    addRemoved(kNone);
    for (size_t i = 0; i < newKeyed.nodes.size(); ++i) {
        auto const partner = oldByKey.find(newKeyed.keys[i]);
        size_t const before = partner != oldByKey.end() ? oldKeyed.nodes[partner->second] : kNone;
        steps.push_back(childStep(before, newKeyed.nodes[i], newKeyed.shown[i]));
        if (partner != oldByKey.end()) {
            addRemoved(partner->second);
        }
    }
    return steps;
}

}  // namespace

bool parseInventory(DiffJson const& document, std::vector<InventoryNode>& nodes, std::string& why) {
    if (!document.is_object() || !document.contains("nodes") || !document["nodes"].is_array()) {
        why = "no \"nodes\" list";
        return false;
    }
    std::vector<InventoryNode> read;
    read.reserve(document["nodes"].size());
    for (DiffJson const& node : document["nodes"]) {
        InventoryNode entry;
        std::string problem;
        if (!readNode(node, entry, problem)) {
            why = "node " + std::to_string(read.size() + 1) + " of the list: " + problem;
            return false;
        }
        read.push_back(std::move(entry));
    }
    nodes = std::move(read);
    return true;
}

std::vector<Difference> compareInventories(std::vector<InventoryNode> const& before,
                                           std::vector<InventoryNode> const& after) {
    Side const old{before, treeOf(before)};
    Side const now{after, treeOf(after)};
    std::vector<Difference> out;
    std::vector<Place> places;
    std::vector<Step> pending{{before.size(), after.size(), kNone, kNone}};
    while (!pending.empty()) {
        Step const step = pending.back();
        pending.pop_back();
        if (step.after == kNone) {
            out.push_back(
                component(Difference::REMOVED, pathOf(places, step.place), before[step.before]));
            continue;
        }
        if (step.before == kNone) {
            out.push_back(
                component(Difference::ADDED, pathOf(places, step.place), after[step.after]));
            continue;
        }
        if (step.after < after.size()) {
            size_t const first = out.size();
            compareNode(before[step.before], after[step.after], out);
            std::string const path =
                out.size() > first ? pathOf(places, step.place) : std::string();
            for (size_t i = first; i < out.size(); ++i) {
                out[i].path = path;
            }
        }
        std::vector<Step> const children = childSteps(old, now, step, places);
        pending.insert(pending.end(), children.rbegin(), children.rend());
    }
    return out;
}

std::string propertyName(unsigned int nodeType, unsigned int id) {
    PropertyInfo const* const info = findProperty(nodeType, id);
    return info != nullptr && info->name != nullptr && *info->name != '\0'
               ? std::string(info->name)
               : "property " + std::to_string(id);
}

std::string formatPropertyValue(unsigned int nodeType, unsigned int id, DiffJson const& value) {
    if (value.is_null()) {
        return "(absent)";
    }
    if (!value.is_object() || !value.contains("kind") || !value["kind"].is_string()) {
        return value.dump();
    }
    std::string const kind = value["kind"].get<std::string>();
    DiffJson const& raw = value.contains("value") ? value["value"] : value;
    std::string shown = showValue(kind, raw);
    PropertyInfo const* const info = findProperty(nodeType, id);
    if (info == nullptr) {
        return shown;
    }
    std::uint64_t number = 0;
    if (asUnsigned(raw, number) && number <= UINT32_MAX) {
        char const* const meaning = valueMeaning(*info, static_cast<std::uint32_t>(number));
        if (meaning != nullptr) {
            shown += std::string(" (") + meaning + ")";
        }
    }
    if (raw.is_number() && info->unit != nullptr && *info->unit != '\0') {
        shown += std::string(" ") + info->unit;
    }
    return shown;
}

std::string renderDiffText(std::vector<Difference> const& differences) {
    std::string out;
    for (Difference const& difference : differences) {
        switch (difference.change) {
            case Difference::ADDED:
                out += "+ " + difference.path + "\n";
                break;
            case Difference::REMOVED:
                out += "- " + difference.path + "\n";
                break;
            case Difference::CHANGED:
                out += "~ " + difference.path + ": ";
                if (!difference.field.empty()) {
                    out += fieldLabel(difference.field) + ": " + showField(difference.before) +
                           " -> " + showField(difference.after) + "\n";
                } else {
                    out += propertyName(difference.nodeType, difference.property) + ": " +
                           formatPropertyValue(difference.nodeType, difference.property,
                                               difference.before) +
                           " -> " +
                           formatPropertyValue(difference.nodeType, difference.property,
                                               difference.after) +
                           "\n";
                }
                break;
        }
    }
    return out;
}

namespace {

// A JSON string of UTF-8 text.
std::string jsonText(std::string const& text) {
    static char const digits[] = "0123456789abcdef";
    std::string out = "\"";
    for (char c : text) {
        auto const byte = static_cast<unsigned char>(c);
        if (byte == '"' || byte == '\\') {
            out += '\\';
            out += c;
        } else if (byte < 0x20) {
            out += "\\u00";
            out += digits[byte >> 4];
            out += digits[byte & 0x0F];
        } else {
            out += c;
        }
    }
    return out + "\"";
}

// A value as the difference's "old" or "new": a property's {"kind",
// "value"} (without what else the document added), or a field's value.
std::string jsonValue(DiffJson const& value, bool property) {
    if (value.is_null()) {
        return "null";
    }
    if (!property) {
        return value.is_string() ? jsonText(value.get<std::string>()) : value.dump();
    }
    auto const kind = value.find("kind");
    auto const held = value.find("value");
    return std::string("{\"kind\": ") + (kind != value.end() ? kind->dump() : "null") +
           ", \"value\": " + (held != value.end() ? held->dump() : "null") + "}";
}

char const* changeName(Difference::Change change) {
    switch (change) {
        case Difference::ADDED:
            return "added";
        case Difference::REMOVED:
            return "removed";
        case Difference::CHANGED:
            break;
    }
    return "changed";
}

}  // namespace

std::string renderDiffJson(std::vector<Difference> const& differences) {
    std::string out = "{\"differences\": [";
    char const* separator = "\n";
    for (Difference const& difference : differences) {
        out += separator;
        separator = ",\n";
        out += std::string("{\"change\": \"") + changeName(difference.change) +
               "\", \"path\": " + jsonText(difference.path) +
               ", \"type\": " + std::to_string(difference.nodeType) +
               ", \"description\": " + jsonText(difference.description);
        if (difference.change == Difference::CHANGED) {
            bool const property = difference.field.empty();
            if (property) {
                out += ", \"property\": " + std::to_string(difference.property);
                if (findProperty(difference.nodeType, difference.property) != nullptr) {
                    out += ", \"name\": " +
                           jsonText(propertyName(difference.nodeType, difference.property));
                }
            } else {
                out += ", \"field\": " + jsonText(difference.field);
            }
            out += ", \"old\": " + jsonValue(difference.before, property) +
                   ", \"new\": " + jsonValue(difference.after, property);
        }
        out += "}";
    }
    out += differences.empty() ? "]}\n" : "\n]}\n";
    return out;
}

}  // namespace inventory
