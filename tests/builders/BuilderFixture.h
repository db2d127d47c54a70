// Shared by the tests of the component builders: on top of the frame's
// fixture (a plug-in object with its base state in reach, structure lists,
// property checks), checks for the remaining property kinds, lookups of the
// nodes a builder made, the structures several builders read, and the log
// texts of one builder. A test file takes the whole vocabulary with
// `using namespace buildertest;`.
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "FrameFixture.h"
#include "IC/EnumValue.h"
#include "mi/builders/SmBiosMICmptr.h"

namespace buildertest {

using frametest::firstLogged;
using frametest::group;
using frametest::hasNodeType;
using frametest::hasStrings;
using frametest::hasUnsigned;
using frametest::hasUnsignedList;
using frametest::hasVersion;
using frametest::isNode;
using frametest::lacksProperty;
using frametest::loggedLevels;
using frametest::loggedTexts;
using frametest::OverrideTable;
using frametest::readNumberOfKind;
using frametest::readOfKind;
using frametest::readProperty;
using frametest::StructureLists;
using frametest::tableOf;
using frametest::TestMI;
using smbiostest::LogCapture;
using smbiostest::Structure;
using smbiostest::TableBuilder;

// Property id holds text equal to expected.
inline ::testing::AssertionResult hasString(IC::Node const* node, unsigned int id,
                                            std::string const& expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult const read =
        readOfKind(node, id, IC::PropertyValue::STRING, "a string", value);
    if (read && value.getString() != expected) {
        return ::testing::AssertionFailure() << "property " << id << " is \"" << value.getString()
                                             << "\", expected \"" << expected << "\"";
    }
    return read;
}

// Property id holds an IC::EnumValue of the given width (1, 2 or 4 bytes)
// and value.
inline ::testing::AssertionResult hasEnum(IC::Node const* node, unsigned int id, unsigned int width,
                                          long long expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult const read =
        readOfKind(node, id, IC::PropertyValue::ENUM, "an enumerated value", value);
    if (read && (value.getEnum().getWidth() != width || value.getEnum().getValue() != expected)) {
        return ::testing::AssertionFailure()
               << "property " << id << " is " << value.getEnum().getValue() << " of width "
               << value.getEnum().getWidth() << ", expected " << expected << " of width " << width;
    }
    return read;
}

// Property id holds an IC::Number of kind DOUBLE equal to expected (within
// a millionth).
inline ::testing::AssertionResult hasDouble(IC::Node const* node, unsigned int id,
                                            double expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult const read =
        readNumberOfKind(node, id, IC::Number::DOUBLE, "a double", value);
    if (read && std::fabs(value.getNumber().getDouble() - expected) > 1e-6) {
        return ::testing::AssertionFailure()
               << "property " << id << " is " << value.getNumber().getDouble() << ", expected "
               << expected;
    }
    return read;
}

// Property id holds an IC::Number of kind BOOL equal to expected.
inline ::testing::AssertionResult hasBool(IC::Node const* node, unsigned int id, bool expected) {
    return frametest::hasNumber(node, id, IC::Number::BOOL, "a boolean", &IC::Number::getBool,
                                expected);
}

// Property id holds a byte vector equal to expected.
inline ::testing::AssertionResult hasBytes(IC::Node const* node, unsigned int id,
                                           std::vector<unsigned char> const& expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult const read =
        readOfKind(node, id, IC::PropertyValue::BYTES, "bytes", value);
    if (read && value.getBytes() != expected) {
        return ::testing::AssertionFailure() << "property " << id << " is " << value
                                             << ", expected " << IC::PropertyValue(expected, true);
    }
    return read;
}

// The text that names an input value in failure messages: numbers as
// decimal numbers, text as it is.
inline std::string inputText(std::string const& text) { return text; }
template <typename Number>
inline std::string inputText(Number value) {
    return std::to_string(value);
}

// One node per input, in order: the node made from inputs[i] holds
// values[i] in property id as `has` checks it (hasUnsigned, or an hasEnum of
// a given width), the failure naming "what inputs[i]".
template <typename Input, typename Value, typename Has>
void expectPerNode(std::vector<IC::Node*> const& nodes, std::vector<Input> const& inputs,
                   std::string const& what, unsigned int id, std::vector<Value> const& values,
                   Has has) {
    ASSERT_EQ(inputs.size(), values.size());
    ASSERT_EQ(inputs.size(), nodes.size());
    for (size_t i = 0; i < inputs.size(); ++i) {
        SCOPED_TRACE(what + " " + inputText(inputs[i]));
        EXPECT_TRUE(has(nodes[i], id, values[i]));
    }
}

// expectPerNode for a 1-byte enumerated property.
template <typename Input>
void expectEnumPerNode(std::vector<IC::Node*> const& nodes, std::vector<Input> const& inputs,
                       std::string const& what, unsigned int id,
                       std::vector<long long> const& values) {
    expectPerNode(nodes, inputs, what, id, values,
                  [](IC::Node const* node, unsigned int property, long long value) {
                      return hasEnum(node, property, 1, value);
                  });
}

// expectPerNode for an unsigned number property.
template <typename Input>
void expectUnsignedPerNode(std::vector<IC::Node*> const& nodes, std::vector<Input> const& inputs,
                           std::string const& what, unsigned int id,
                           std::vector<unsigned int> const& values) {
    expectPerNode(nodes, inputs, what, id, values, hasUnsigned);
}

// Node id and index in one check.
inline ::testing::AssertionResult hasIdAndIndex(IC::Node const* node, unsigned int id,
                                                unsigned int index) {
    if (node->getNodeId() != id || node->getIndex() != index) {
        return ::testing::AssertionFailure()
               << "node id " << node->getNodeId() << ", index " << node->getIndex()
               << "; expected id " << id << ", index " << index;
    }
    return ::testing::AssertionSuccess();
}

// One expected property of a node, for expectProperties: its id and the
// check of its value (one of the has... checks above, or lacksProperty).
struct PropertyCheck {
    unsigned int id;
    std::function<::testing::AssertionResult(IC::Node const*)> check;
};

inline PropertyCheck stringProp(unsigned int id, std::string const& value) {
    return {id, [id, value](IC::Node const* node) { return hasString(node, id, value); }};
}
inline PropertyCheck unsignedProp(unsigned int id, unsigned int value) {
    return {id, [id, value](IC::Node const* node) { return hasUnsigned(node, id, value); }};
}
inline PropertyCheck enumProp(unsigned int id, unsigned int width, long long value) {
    return {id,
            [id, width, value](IC::Node const* node) { return hasEnum(node, id, width, value); }};
}
inline PropertyCheck boolProp(unsigned int id, bool value) {
    return {id, [id, value](IC::Node const* node) { return hasBool(node, id, value); }};
}
inline PropertyCheck doubleProp(unsigned int id, double value) {
    return {id, [id, value](IC::Node const* node) { return hasDouble(node, id, value); }};
}
inline PropertyCheck bytesProp(unsigned int id, std::vector<unsigned char> const& value) {
    return {id, [id, value](IC::Node const* node) { return hasBytes(node, id, value); }};
}
inline PropertyCheck versionProp(unsigned int id, unsigned int major, unsigned int minor) {
    return {id, [id, major, minor](IC::Node const* node) {
                return hasVersion(node, id, major, minor);
            }};
}
inline PropertyCheck unsignedListProp(unsigned int id, std::vector<unsigned int> const& value) {
    return {id, [id, value](IC::Node const* node) { return hasUnsignedList(node, id, value); }};
}
inline PropertyCheck noProp(unsigned int id) {
    return {id, [id](IC::Node const* node) { return lacksProperty(node, id); }};
}

// Every check holds on the node.
inline void expectProperties(IC::Node const* node, std::vector<PropertyCheck> const& checks) {
    for (PropertyCheck const& property : checks) {
        EXPECT_TRUE(property.check(node)) << "property " << property.id;
    }
}

// Node id, index and status in one check.
inline ::testing::AssertionResult hasIdIndexAndStatus(IC::Node const* node, unsigned int id,
                                                      unsigned int index, unsigned int status) {
    ::testing::AssertionResult const placed = hasIdAndIndex(node, id, index);
    if (placed && node->getStatus() != status) {
        return ::testing::AssertionFailure()
               << "node " << id << " has status " << node->getStatus() << ", expected " << status;
    }
    return placed;
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

// A parsed table and its structure lists, as initialize hands them to the
// builders.
struct ParsedTable {
    explicit ParsedTable(TableBuilder const& table) : parsed(table.build()), lists(parsed) {}
    SD::SmBios parsed;
    StructureLists lists;
};

// The structures as a table ended by an End-of-Table structure (handle
// 0xFEFF).
inline TableBuilder endedTableOf(std::vector<Structure> const& structures) {
    TableBuilder table = tableOf(structures);
    table.endOfTable(0xFEFF);
    return table;
}

// A parsed table with its structure lists, and a plug-in with a parent node
// (id 2, a planar unless told otherwise; the next id is 3) for a builder to
// hang its nodes under.
struct BuilderSetup {
    explicit BuilderSetup(TableBuilder const& table, unsigned int parentType = 41)
        : parsed(table.build()), lists(parsed), parent(addParent(mi, parentType)) {}

    SD::SmBios parsed;
    StructureLists lists;
    TestMI mi;
    IC::MutableNode* parent;
};

// A BuilderSetup whose parent is a planar.
struct PlanarSetup : BuilderSetup {
    explicit PlanarSetup(TableBuilder const& table) : BuilderSetup(table), planar(parent) {}

    IC::MutableNode* planar;
};

// A parsed table with its structure lists, and a parent node added to mi
// (a planar unless told otherwise, node id 2) for the builder call that
// follows; the log is captured from then on.
struct ParentSetup {
    ParentSetup(TestMI& mi, TableBuilder const& table, unsigned int type = 41)
        : built(table), parent(addParent(mi, type)) {}

    ParsedTable built;
    IC::MutableNode* parent;
    LogCapture log;
};

// Puts the structure first in the list of its type, as if it stood first in
// the table.
inline void putFirst(StructureLists& lists, SD::SmBios::Table const& structure) {
    std::vector<IC::TableData>& list = lists.storage[structure.getType()];
    list.insert(list.begin(), IC::TableData(&structure, structure.getLength()));
}

// The first failure logged is a std::out_of_range caught by a builder
// ("Exception= Type=..."), naming the position (for example
// "Table 8 index =0"), and the only failure logged, at the error level.
inline ::testing::AssertionResult loggedOutOfRangeAt(std::string const& position) {
    std::string const failure = firstLogged("Exception=");
    if (failure.find("Exception= Type=") != 0 ||
        failure.find("out_of_range") == std::string::npos ||
        failure.find(position) == std::string::npos) {
        return ::testing::AssertionFailure()
               << "first failure logged is \"" << failure << "\", expected an out_of_range at \""
               << position << "\"";
    }
    std::vector<int> const levels = loggedLevels("Exception=");
    if (levels != std::vector<int>{6000}) {
        return ::testing::AssertionFailure()
               << levels.size() << " failure(s) logged, expected one at level 6000";
    }
    return ::testing::AssertionSuccess();
}

// The captured log-output texts written under one logger, in order.
inline std::vector<std::string> loggedBy(std::string const& loggerName) {
    std::vector<std::string> texts;
    for (QNLog::QNLogRecord const& record : QNLog::QNLogger::captured()) {
        if (record.output == "log" && record.logger == loggerName) {
            texts.push_back(record.text);
        }
    }
    return texts;
}

// The log-output texts `logged` (what `source` logged) are `texts`, in
// order.
inline ::testing::AssertionResult sameTexts(std::string const& source,
                                            std::vector<std::string> const& logged,
                                            std::vector<std::string> const& texts) {
    if (logged == texts) {
        return ::testing::AssertionSuccess();
    }
    ::testing::AssertionResult failure = ::testing::AssertionFailure();
    failure << source << " logged " << logged.size() << " line(s), expected " << texts.size()
            << ":";
    for (size_t i = 0; i < logged.size() || i < texts.size(); ++i) {
        failure << "\n  " << (i < logged.size() ? "\"" + logged[i] + "\"" : "(none)") << " / "
                << (i < texts.size() ? "\"" + texts[i] + "\"" : "(none)");
    }
    return failure;
}

// The captured log-output texts written under one logger are `texts`, in
// order.
inline ::testing::AssertionResult loggedExactly(std::string const& loggerName,
                                                std::vector<std::string> const& texts) {
    return sameTexts(loggerName, loggedBy(loggerName), texts);
}

// The captured log-output texts of every logger are `texts`, in order.
inline ::testing::AssertionResult loggedOnly(std::vector<std::string> const& texts) {
    return sameTexts("the plug-in", loggedTexts(), texts);
}

// The plug-in holds `count` nodes, and the next node id it gives is
// `nextId`.
inline ::testing::AssertionResult holdsNodes(TestMI const& mi, size_t count, unsigned int nextId) {
    if (mi.nodeList.size() != count || mi.nextNodeId != nextId) {
        return ::testing::AssertionFailure()
               << mi.nodeList.size() << " nodes, next id " << mi.nextNodeId << "; expected "
               << count << " nodes, next id " << nextId;
    }
    return ::testing::AssertionSuccess();
}

// How many captured log-output texts contain text.
inline size_t loggedCount(std::string const& text) {
    size_t n = 0;
    for (std::string const& logged : loggedTexts()) {
        if (logged.find(text) != std::string::npos) {
            ++n;
        }
    }
    return n;
}

// A structure's formatted area cut to length bytes (header included), with
// the given strings (the empty ones left out) as its string set; the whole
// structure when length reaches its end.
inline Structure cutTo(Structure const& full, size_t length,
                       std::vector<std::string> const& strings) {
    if (length >= full.formattedSize()) {
        return full;
    }
    std::vector<uint8_t> const bytes = full.build();
    Structure cut(full.type(), full.handle());
    cut.bytes(std::vector<uint8_t>(bytes.begin() + 4,
                                   bytes.begin() + static_cast<std::ptrdiff_t>(length)));
    for (std::string const& text : strings) {
        if (!text.empty()) {
            cut.addString(text);
        }
    }
    return cut;
}

// An OEM Strings structure (type 11) whose Count is the number of strings.
inline Structure oemStrings(uint16_t handle, std::vector<std::string> const& strings) {
    Structure structure(11, handle);
    structure.byte(static_cast<uint8_t>(strings.size()));
    for (std::string const& text : strings) {
        structure.addString(text);
    }
    return structure;
}

// A baseboard (type 2) of length 0x0C: every field up to the location,
// then the low byte of the chassis handle, whose word straddles the end of
// the formatted area.
inline Structure straddlingBaseboard(uint16_t handle) {
    Structure structure(2, handle);
    structure.str("Board Maker").str("MB-100").str("BV-1").str("BRD-1").str("BA-1");
    structure.byte(0x09).str("Slot A").byte(0x00);
    return structure;
}

}  // namespace buildertest
