// Reading smbios-inventory's JSON in tests: its nodes by type, and the
// document with the values that change from run to run masked, so that the
// output of two runs, or of a run and a golden file, compare as text.
#pragma once

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

namespace hosttest {

using Json = nlohmann::ordered_json;

// What the masked document holds in place of the computer system's current
// time (property 126, a date-time) and time-zone offset (property 127, a
// double), the two values the plug-in reads from the clock.
extern char const kRunTimePlaceholder[];
extern char const kRunTimeZonePlaceholder[];

// The host's JSON text with those two values of every computer-system node
// (type 40) replaced by the placeholders, in the host's own layout; nothing
// else changes. masked counts the values replaced. Throws
// nlohmann::json::exception when the text is not JSON.
std::string maskRunValues(std::string const& text, unsigned int& masked);

// The nodes of the document of the given node type, in node-list order.
std::vector<Json> nodesOfType(Json const& document, unsigned int type);

// The value object {"kind", "value"} of a property of a node, or null when
// the node does not have it.
Json propertyOf(Json const& node, unsigned int id);

// The keys the catalog adds to a property object beside "kind" and "value".
extern char const* const kLabelKeys[3];

// The value with the catalog's keys ("name", "unit", "meaning") taken out of
// every property object in it: a whole document, a node, a node's
// properties or one property.
Json withoutLabels(Json value);

// Where two texts first differ, line by line, with a few lines of each from
// there: a failure message that a long text would drown.
std::string firstDifference(std::string const& expected, std::string const& actual);

}  // namespace hosttest
