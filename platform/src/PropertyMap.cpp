// IC::PropertyMap: a sorted vector of id-value pairs.
#include "IC/PropertyMap.h"

#include <algorithm>
#include <stdexcept>
#include <string>

namespace IC {

namespace {

bool idBelow(PropertyMap::value_type const& entry, unsigned int id) { return entry.first < id; }

}  // namespace

PropertyMap::const_iterator PropertyMap::find(unsigned int id) const {
    auto const found = std::lower_bound(entries_.begin(), entries_.end(), id, idBelow);
    return found != entries_.end() && found->first == id ? found : entries_.end();
}

PropertyValue const& PropertyMap::at(unsigned int id) const {
    auto const found = find(id);
    if (found == entries_.end()) {
        throw std::out_of_range("property " + std::to_string(id) + " not set");
    }
    return found->second;
}

PropertyValue& PropertyMap::operator[](unsigned int id) {
    auto found = lowerBound(id);
    if (found == entries_.end() || found->first != id) {
        size_t const position = static_cast<size_t>(found - entries_.begin());
        reserveOneMore();
        found = entries_.emplace(entries_.begin() + static_cast<std::ptrdiff_t>(position), id,
                                 PropertyValue());
    }
    return found->second;
}

void PropertyMap::set(unsigned int id, PropertyValue const& value) {
    auto found = lowerBound(id);
    if (found != entries_.end() && found->first == id) {
        found->second = value;
        return;
    }
    // Copied before the vector grows: value may be one of its own entries.
    value_type entry(id, value);
    size_t const position = static_cast<size_t>(found - entries_.begin());
    reserveOneMore();
    entries_.insert(entries_.begin() + static_cast<std::ptrdiff_t>(position), std::move(entry));
}

std::vector<PropertyMap::value_type>::iterator PropertyMap::lowerBound(unsigned int id) {
    return std::lower_bound(entries_.begin(), entries_.end(), id, idBelow);
}

void PropertyMap::reserveOneMore() {
    size_t const size = entries_.size();
    if (size == entries_.capacity()) {
        entries_.reserve(size + std::max<size_t>(2, size / 2));
    }
}

}  // namespace IC
