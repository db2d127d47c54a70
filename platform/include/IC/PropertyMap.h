// The properties of a node by id, in ascending id order, read the way a
// std::map of id to value is read (iteration over id-value pairs, find, at,
// count, size). Held as one sorted vector: a node keeps a few properties for
// its whole life, and a vector holds each in its value's size plus the id,
// where a tree map spends a node allocation of its own on every entry.
#pragma once

#include <cstddef>
#include <utility>
#include <vector>

#include "IC/PropertyValue.h"

namespace IC {

class PropertyMap {
public:
    using key_type = unsigned int;
    using mapped_type = PropertyValue;
    using value_type = std::pair<unsigned int, PropertyValue>;
    using size_type = std::size_t;
    // Entries are read only: their order depends on their ids.
    using const_iterator = std::vector<value_type>::const_iterator;
    using iterator = const_iterator;

    const_iterator begin() const { return entries_.begin(); }
    const_iterator end() const { return entries_.end(); }
    const_iterator cbegin() const { return entries_.begin(); }
    const_iterator cend() const { return entries_.end(); }
    bool empty() const { return entries_.empty(); }
    size_type size() const { return entries_.size(); }

    // The entry of id, or end().
    const_iterator find(unsigned int id) const;
    size_type count(unsigned int id) const { return find(id) == end() ? 0 : 1; }
    // The value of id; throws std::out_of_range when it is not set.
    PropertyValue const& at(unsigned int id) const;
    // The value of id, set to an empty value first when it is not set.
    PropertyValue& operator[](unsigned int id);
    // Sets id to value, replacing an earlier value of the same id.
    void set(unsigned int id, PropertyValue const& value);
    void clear() { entries_.clear(); }

    bool operator==(PropertyMap const& other) const { return entries_ == other.entries_; }
    bool operator!=(PropertyMap const& other) const { return !(*this == other); }

private:
    // The first entry whose id is not below id.
    std::vector<value_type>::iterator lowerBound(unsigned int id);
    // Makes room for one more entry, growing by half rather than doubling:
    // the room is kept for the node's whole life.
    void reserveOneMore();

    std::vector<value_type> entries_;
};

}  // namespace IC
