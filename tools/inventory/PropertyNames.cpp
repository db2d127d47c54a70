#include "inventory/PropertyNames.h"

#include <algorithm>
#include <iterator>

namespace inventory {

namespace {

// System wake-up types of the computer system (property 65).
constexpr ValueMeaning kWakeUpTypes[] = {
    {0, "Reserved"},     {1, "Other"},      {2, "Unknown"},
    {3, "APM Timer"},    {4, "Modem Ring"}, {5, "LAN Remote"},
    {6, "Power Switch"}, {7, "PCI PME#"},   {8, "AC Power Restored"},
};

#define MEANINGS(table) table, std::size(table)
#define NO_MEANINGS nullptr, 0

// Ordered by node type, then id: findProperty searches it by halves.
constexpr PropertyInfo kCatalog[] = {
    // computer system
    {40, 20, "Family", "", NO_MEANINGS},
    {40, 36, "Manufacturer", "", NO_MEANINGS},
    {40, 39, "Product name", "", NO_MEANINGS},
    {40, 45, "Part number", "", NO_MEANINGS},
    {40, 50, "Serial number", "", NO_MEANINGS},
    {40, 52, "SKU number", "", NO_MEANINGS},
    {40, 64, "UUID", "", NO_MEANINGS},
    {40, 65, "Wake-up type", "", MEANINGS(kWakeUpTypes)},
    {40, 125, "Capabilities", "", NO_MEANINGS},
    {40, 126, "Current time", "", NO_MEANINGS},
    {40, 127, "Time zone offset", "h", NO_MEANINGS},
    {40, 307, "Version", "", NO_MEANINGS},
};

#undef MEANINGS
#undef NO_MEANINGS

bool before(PropertyInfo const& entry, std::pair<unsigned int, unsigned int> key) {
    return entry.nodeType != key.first ? entry.nodeType < key.first : entry.id < key.second;
}

}  // namespace

PropertyInfo const* findProperty(unsigned int nodeType, unsigned int id) {
    auto const key = std::make_pair(nodeType, id);
    auto const found = std::lower_bound(std::begin(kCatalog), std::end(kCatalog), key, before);
    if (found == std::end(kCatalog) || found->nodeType != nodeType || found->id != id) {
        return nullptr;
    }
    return found;
}

char const* valueMeaning(PropertyInfo const& property, std::uint32_t value) {
    if (property.meanings == nullptr) {
        return nullptr;
    }
    ValueMeaning const* const end = property.meanings + property.meaningCount;
    ValueMeaning const* const found = std::lower_bound(
        property.meanings, end, value,
        [](ValueMeaning const& entry, std::uint32_t wanted) { return entry.value < wanted; });
    return found != end && found->value == value ? found->meaning : nullptr;
}

PropertyInfo const* propertyCatalog(std::size_t& count) {
    count = std::size(kCatalog);
    return kCatalog;
}

}  // namespace inventory
