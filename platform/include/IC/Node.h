// One node of the inventory tree as the agent reads it. The order of the
// virtual operations is part of the agent's interface and must not change.
#pragma once

#include <string>
#include <vector>

#include "IC/Error.h"
#include "IC/PropertyMap.h"
#include "IC/PropertyValue.h"

namespace IC {

class Node {
public:
    virtual ~Node();
    virtual unsigned int getStatus() const = 0;
    virtual std::string getDescription() const = 0;
    // Copies the property into value; a non-zero status when it is not set.
    virtual Error getProperty(unsigned int id, PropertyValue& value) const = 0;
    // The stored properties by id, in ascending id order. Values that a node
    // computes when they are read are only current through getProperty.
    virtual PropertyMap const& getProperties() const = 0;
    virtual Error setProperty(unsigned int const& id, PropertyValue const& value) = 0;
    virtual operator std::string() const;
    virtual unsigned int getNodeId() const = 0;
    virtual unsigned int getLinkedId() const = 0;
    virtual unsigned int getIndex() const = 0;
    virtual std::vector<unsigned int> const& getMIIds() const = 0;
    virtual Error addMI(unsigned int miId) = 0;
    virtual Error delMI(unsigned int miId) = 0;
};

}  // namespace IC
