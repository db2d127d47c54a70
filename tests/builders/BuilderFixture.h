// Shared by the tests of the component builders: on top of the frame's
// fixture (a plug-in object with its base state in reach, structure lists,
// property checks), checks for the remaining property kinds and lookups of
// the nodes a builder made.
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "FrameFixture.h"
#include "IC/EnumValue.h"
#include "mi/builders/SmBiosMICmptr.h"

namespace buildertest {

using frametest::hasNodeType;
using frametest::hasStrings;
using frametest::hasUnsigned;
using frametest::hasUnsignedList;
using frametest::hasVersion;
using frametest::lacksProperty;
using frametest::readProperty;
using frametest::StructureLists;
using frametest::TestMI;

// Property id holds text equal to expected.
inline ::testing::AssertionResult hasString(IC::Node const* node, unsigned int id,
                                            std::string const& expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult read = readProperty(node, id, value);
    if (!read) {
        return read;
    }
    if (value.getKind() != IC::PropertyValue::STRING) {
        return ::testing::AssertionFailure()
               << "property " << id << " is of kind " << value.getKind() << ", not a string";
    }
    if (value.getString() != expected) {
        return ::testing::AssertionFailure() << "property " << id << " is \"" << value.getString()
                                             << "\", expected \"" << expected << "\"";
    }
    return ::testing::AssertionSuccess();
}

// Property id holds an IC::EnumValue of the given width (1, 2 or 4 bytes)
// and value.
inline ::testing::AssertionResult hasEnum(IC::Node const* node, unsigned int id,
                                          unsigned int width, long long expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult read = readProperty(node, id, value);
    if (!read) {
        return read;
    }
    if (value.getKind() != IC::PropertyValue::ENUM) {
        return ::testing::AssertionFailure() << "property " << id << " is of kind "
                                             << value.getKind() << ", not an enumerated value";
    }
    if (value.getEnum().getWidth() != width || value.getEnum().getValue() != expected) {
        return ::testing::AssertionFailure()
               << "property " << id << " is " << value.getEnum().getValue() << " of width "
               << value.getEnum().getWidth() << ", expected " << expected << " of width "
               << width;
    }
    return ::testing::AssertionSuccess();
}

// Property id holds an IC::Number of kind DOUBLE equal to expected (within
// a millionth).
inline ::testing::AssertionResult hasDouble(IC::Node const* node, unsigned int id,
                                            double expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult read = readProperty(node, id, value);
    if (!read) {
        return read;
    }
    if (value.getKind() != IC::PropertyValue::NUMBER ||
        value.getNumber().getKind() != IC::Number::DOUBLE) {
        return ::testing::AssertionFailure() << "property " << id << " is " << value
                                             << ", not a double number";
    }
    if (std::fabs(value.getNumber().getDouble() - expected) > 1e-6) {
        return ::testing::AssertionFailure() << "property " << id << " is "
                                             << value.getNumber().getDouble() << ", expected "
                                             << expected;
    }
    return ::testing::AssertionSuccess();
}

// Property id holds an IC::Number of kind BOOL equal to expected.
inline ::testing::AssertionResult hasBool(IC::Node const* node, unsigned int id, bool expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult read = readProperty(node, id, value);
    if (!read) {
        return read;
    }
    if (value.getKind() != IC::PropertyValue::NUMBER ||
        value.getNumber().getKind() != IC::Number::BOOL) {
        return ::testing::AssertionFailure() << "property " << id << " is " << value
                                             << ", not a boolean number";
    }
    if (value.getNumber().getBool() != expected) {
        return ::testing::AssertionFailure() << "property " << id << " is "
                                             << value.getNumber().getBool() << ", expected "
                                             << expected;
    }
    return ::testing::AssertionSuccess();
}

// Property id holds a byte vector equal to expected.
inline ::testing::AssertionResult hasBytes(IC::Node const* node, unsigned int id,
                                           std::vector<unsigned char> const& expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult read = readProperty(node, id, value);
    if (!read) {
        return read;
    }
    if (value.getKind() != IC::PropertyValue::BYTES) {
        return ::testing::AssertionFailure()
               << "property " << id << " is of kind " << value.getKind() << ", not bytes";
    }
    if (value.getBytes() != expected) {
        return ::testing::AssertionFailure()
               << "property " << id << " is " << value << ", expected "
               << IC::PropertyValue(expected, true);
    }
    return ::testing::AssertionSuccess();
}

// The property ids set on a node, ascending.
inline std::vector<unsigned int> propertyIds(IC::Node const* node) {
    std::vector<unsigned int> ids;
    for (auto const& property : node->getProperties()) {
        ids.push_back(property.first);
    }
    return ids;
}

inline unsigned int nodeType(IC::Node const* node) {
    IC::MutableNode const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
    return mutableNode == nullptr ? 0 : mutableNode->getNodeType();
}

// The nodes of a type in node-list order.
inline std::vector<IC::Node*> nodesOfType(TestMI const& mi, unsigned int type) {
    std::vector<IC::Node*> found;
    for (IC::Node* node : mi.nodeList) {
        if (nodeType(node) == type) {
            found.push_back(node);
        }
    }
    return found;
}

// The nodes linked to parentId in node-list order.
inline std::vector<IC::Node*> childrenOf(TestMI const& mi, unsigned int parentId) {
    std::vector<IC::Node*> found;
    for (IC::Node* node : mi.nodeList) {
        if (node->getLinkedId() == parentId) {
            found.push_back(node);
        }
    }
    return found;
}

// A parent node for a builder to hang its nodes under, as the planar or
// root would be: added to the node list with the next node id.
inline IC::MutableNode* addParent(TestMI& mi, unsigned int type = 41) {
    IC::MutableNode* parent = new IC::MutableNode(mi.nextNodeId++, mi.miId, mi.miIdList, type, 0);
    IC::Node* added = parent;
    mi.addNewNode(added);
    return parent;
}

}  // namespace buildertest
