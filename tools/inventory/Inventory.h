// Rendering of the inventory tree that a management interface builds: the
// JSON document and the indented text tree that smbios-inventory prints.
// Both are written as a stream, node after node, straight from each node's
// properties; every property carries its name, unit and the meaning of its
// value from the catalog (PropertyNames.h) where the catalog knows them.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "IC/Node.h"
#include "IC/PropertyValue.h"

namespace inventory {

// What the host shows of one node; type, path and parent are known only for
// the framework's ordinary nodes.
struct NodeFacts {
    unsigned int id = 0;
    unsigned int linked = 0;
    unsigned int type = 0;
    unsigned int index = 0;
    unsigned int status = 0;
    std::string description;
    std::string path;
    std::string parent;
};

// The facts of a node, read through its own operations.
NodeFacts readFacts(IC::Node const& node);

// The nodes of a tree printout and how they hang together: each node's
// children in list order, and whether it starts a tree of its own (its
// linked id names no node of the list).
struct TreeShape {
    std::vector<IC::Node const*> list;
    std::vector<std::vector<std::size_t>> children;
    std::vector<bool> topLevel;
};

// The shape of the node list (null entries left out); a node hangs under
// the first node of the list whose id is its linked id.
TreeShape treeShape(std::vector<IC::Node*> const& nodes);

// Writes the whole shape, tree by tree: writeSubtree(start) for each node
// that starts a tree, then for each node still not written (nodes whose
// linked ids only lead round in a cycle start trees of their own), in list
// order. writeSubtree marks in written what it wrote.
template <typename WriteSubtree>
void writeTrees(TreeShape const& shape, std::vector<bool>& written, WriteSubtree writeSubtree) {
    for (std::size_t i = 0; i < shape.list.size(); ++i) {
        if (shape.topLevel[i]) {
            writeSubtree(i);
        }
    }
    for (std::size_t i = 0; i < shape.list.size(); ++i) {
        if (!written[i]) {
            writeSubtree(i);
        }
    }
}

// The shortest text that reads back as the same double, without an
// exponent when one of up to 17 digits does (40 rather than 4e+01), as the
// tree writes it.
std::string formatDouble(double value);

// Treats every byte of the text as a Latin-1 character and returns the text
// as UTF-8 (bytes below 0x80 stay as they are).
std::string latin1ToUtf8(std::string const& text);

// The text as a person can read it on one line: control characters (and
// backslashes, and double quotes when quoted) are escaped, \xNN for the
// control characters; bytes from 0xA0 up are Latin-1 letters in UTF-8.
// With quoted, the result is enclosed in double quotes.
std::string escapeText(std::string const& text, bool quoted);

// The name that follows "type N" for a known node type, or "" when the type
// has no name.
std::string nodeTypeName(unsigned int type);

// "type N" followed by the type's name when it has one.
std::string nodeTypeLabel(unsigned int type);

// The kind name of a value as the JSON document and the tree show it:
// "string", "bool", "unsigned", "double", "version", "datetime", "none",
// "enum8", "enum16", "enum32", "byte", "bytes", "numbers", "strings", "kind".
std::string valueKindName(IC::PropertyValue const& value);

// The kind name of a scalar: "bool", "unsigned", "double", "version",
// "datetime" or "none".
std::string numberKindName(IC::Number const& number);

// Seconds since the epoch as "YYYY-MM-DD HH:MM:SS" (UTC).
std::string formatDateTime(std::int64_t seconds);

// The value as the tree shows it after the property's name.
std::string formatValue(IC::PropertyValue const& value);

// What the catalog says about one property value: its name ("" when the
// catalog does not know the property), its unit and the meaning of the
// value (nullptr when there is none, or when the value is not a number that
// a unit or a meaning applies to).
struct PropertyLabel {
    char const* name = "";
    char const* unit = nullptr;
    char const* meaning = nullptr;
};
PropertyLabel labelProperty(unsigned int nodeType, unsigned int id, IC::PropertyValue const& value);

// Calls visit(id, value) for every property of the node, ids ascending.
// The values are read where they are kept, without a copy: an ordinary
// node's from its stored properties; a node of a class of its own (one that
// may compute values when they are read, as the computer system does for
// its time) answers through getProperty for each id it lists, and a stored
// value stands where it does not answer.
void visitProperties(IC::Node const& node,
                     std::function<void(unsigned int, IC::PropertyValue const&)> const& visit);

// The properties of a node, ids ascending, as visitProperties gives them,
// copied.
std::vector<std::pair<unsigned int, IC::PropertyValue>> readProperties(IC::Node const& node);

// Receives rendered text in pieces, in order.
using TextSink = std::function<void(char const* data, std::size_t size)>;

// The whole node list as one JSON document, 2-space indentation, with a
// final newline. Each property is an object of "kind" and "value", then
// "name", "unit" and "meaning" where the catalog gives them.
void writeJson(std::vector<IC::Node*> const& nodes, TextSink const& sink);
std::string renderJson(std::vector<IC::Node*> const& nodes);

// The node list as an indented tree by linked id, one line a node and one
// line a property beneath it: id, name (the value's kind when the catalog
// has no name), value, unit and meaning.
void writeTree(std::vector<IC::Node*> const& nodes, TextSink const& sink);
std::string renderTree(std::vector<IC::Node*> const& nodes);

}  // namespace inventory
