// Rendering of the inventory tree that a management interface builds: the
// JSON document and the indented text tree that smbios-inventory prints.
// Every property value is read through the node's getProperty, because some
// nodes compute values when they are read.
#pragma once

#include <cstddef>
#include <cstdint>
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

// The value as the tree shows it after its kind name.
std::string formatValue(IC::PropertyValue const& value);

// The properties of a node, ids ascending, each value read through the
// node's getProperty.
std::vector<std::pair<unsigned int, IC::PropertyValue>> readProperties(IC::Node const& node);

// The whole node list as one JSON document, 2-space indentation, with a final
// newline.
std::string renderJson(std::vector<IC::Node*> const& nodes);

// The node list as an indented tree by linked id, one line a node and one
// line a property beneath it.
std::string renderTree(std::vector<IC::Node*> const& nodes);

}  // namespace inventory
