// The computer-system node: a node that computes its time (126) and its
// local time-zone offset (127) each time they are read.
#pragma once

#include <string>
#include <vector>

#include "IC/MutableNode.h"

namespace IC {

class CmptrNode : public MutableNode {
public:
    CmptrNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
              unsigned int nodeType, unsigned int index);
    ~CmptrNode() override;

    Error getProperty(unsigned int id, PropertyValue& value) const override;
};

// A four-digit part number cut from a model name: the four digits after the
// first "[" when five or more characters follow it, else the first four
// characters when they are digits; "" otherwise.
std::string getPartNum(std::string const& name);

}  // namespace IC
