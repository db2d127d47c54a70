// The comparison of two inventories, as `smbios-inventory diff` makes it:
// the two JSON documents that --format json writes are read into node
// lists, their components are paired by what names them (the chain of node
// types and descriptions from the top, and for siblings that share it a
// property such as a processor's socket or a slot's designation; never the
// node ids, which follow the order of building), and what was added,
// removed or changed comes out as a list of differences, rendered as lines
// for people or as JSON for tools.
#pragma once

#include <map>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

namespace inventory {

using DiffJson = nlohmann::ordered_json;

// One node of an inventory document, as far as the comparison needs it.
struct InventoryNode {
    unsigned int id = 0;
    unsigned int linked = 0;
    unsigned int type = 0;
    unsigned int status = 0;
    std::string description;  // UTF-8, as in the document
    std::string path;         // "" when the document has none
    std::string parent;       // "" when the document has none
    // The properties by id, each the document's value object ({"kind",
    // "value"} and whatever else the document adds).
    std::map<unsigned int, DiffJson> properties;
};

// Reads the node list of a document written by --format json:
// {"nodes": [{"id", "linked", "type", "status", "description", "path"?,
// "parent"?, "properties": {"<id>": {"kind", "value", ...}}}, ...]}.
// Unknown keys are ignored. Returns false and says why in `why` when the
// document does not have that shape.
bool parseInventory(DiffJson const& document, std::vector<InventoryNode>& nodes, std::string& why);

struct Difference {
    enum Change { ADDED, REMOVED, CHANGED };
    Change change = CHANGED;
    // Where the component sits, as people read it:
    // "Computer System/Chassis/Planar/CPU \"SOCKET 0\"".
    std::string path;
    // The component's node type and description (of the new inventory, or
    // of the old one for a removed component).
    unsigned int nodeType = 0;
    std::string description;
    // CHANGED only: the node field that changed ("status", "path" or
    // "parent"), or "" when it is the property `property`.
    std::string field;
    unsigned int property = 0;
    // CHANGED only: the value before and after; a property's value object,
    // a field's number or text; null when the node does not have it.
    DiffJson before;
    DiffJson after;
};

// The differences between two inventories, in the order of the tree: a
// component's own changes, then its children's, a removed child where it
// stood among its siblings. An added or removed component is one
// difference; what hangs below it is not listed again. The computer
// system's clock readings (the current time and the time-zone offset) are
// left out: they differ from one run to the next.
std::vector<Difference> compareInventories(std::vector<InventoryNode> const& before,
                                           std::vector<InventoryNode> const& after);

// The property's name from the catalog, or "property N" when it has none.
std::string propertyName(unsigned int nodeType, unsigned int id);

// A property's value as the diff shows it: the value written as the tree
// writes it, with its unit and the meaning of an enumerated value when the
// catalog gives them ("1024 KB", "6 (Power Switch)"); "(absent)" for null.
std::string formatPropertyValue(unsigned int nodeType, unsigned int id, DiffJson const& value);

// One line a difference: "+ PATH", "- PATH", "~ PATH: NAME: OLD -> NEW".
std::string renderDiffText(std::vector<Difference> const& differences);

// {"differences": [...]}, one difference a line: {"change": "added" |
// "removed" | "changed", "path", "type", "description"}, and for a change
// "property" (with "name" when the catalog has one) or "field", and "old"
// and "new".
std::string renderDiffJson(std::vector<Difference> const& differences);

}  // namespace inventory
