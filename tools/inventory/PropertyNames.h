// What the properties of the inventory tree mean: for every (node type,
// property id) that the SMBIOS plug-in can set, a short name, the unit where
// the value has one, and the meaning of each value of an enumerated
// property where it is known. The renderers, the summary, the page and the
// diff all take their names from here.
#pragma once

#include <cstddef>
#include <cstdint>

namespace inventory {

// One value of an enumerated property and what it stands for.
struct ValueMeaning {
    std::uint32_t value;
    char const* meaning;
};

// One property of one node type.
struct PropertyInfo {
    unsigned int nodeType;
    unsigned int id;
    char const* name;              // "Manufacturer", "Maximum speed"
    char const* unit;              // "KB", "MHz", "mV"; "" when none
    ValueMeaning const* meanings;  // sorted by value; nullptr when none
    std::size_t meaningCount;
};

// The property's entry, or nullptr when the catalog does not know it.
PropertyInfo const* findProperty(unsigned int nodeType, unsigned int id);

// The meaning of value for an enumerated property, or nullptr when the
// catalog gives none.
char const* valueMeaning(PropertyInfo const& property, std::uint32_t value);

// Every entry, ordered by node type and then id (for the tests and for the
// tools that list them).
PropertyInfo const* propertyCatalog(std::size_t& count);

}  // namespace inventory
