// The inventory in the Prometheus text exposition format, for
// node_exporter's textfile collector: info metrics (value 1) whose labels
// are a component's texts, gauges of its sizes, speeds and counts in base
// units, each node's status, and a fingerprint of the whole inventory that
// changes when, and only when, the hardware it describes changes.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "IC/Node.h"

namespace inventory {

// The whole exposition, HELP and TYPE lines before each metric's samples,
// ending with a line feed.
std::string renderPrometheus(std::vector<IC::Node*> const& nodes);

// A hash of every node's place, type, status, description and properties,
// the computer system's clock and time-zone offset (126, 127) left out: the
// same table gives the same fingerprint at any time. 53 bits, so that the
// sample value, a double, holds it exactly.
std::uint64_t inventoryFingerprint(std::vector<IC::Node*> const& nodes);

// A property's name as a label name: lower case, every run of other
// characters than letters and digits one underscore ("Serial number" ->
// "serial_number"); "property_N" when the name gives nothing.
std::string labelName(char const* propertyName, unsigned int id);

// A label value as the format writes it between double quotes: backslash,
// double quote and line feed escaped; bytes that are not UTF-8 read as
// Latin-1, as in the JSON output.
std::string labelValue(std::string const& text);

}  // namespace inventory
