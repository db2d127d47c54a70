// Shared by the tests of the plug-in frame: a plug-in object whose base
// state (own id, next node id, id list, node list) the tests can reach, the
// 256 structure lists made from a parsed table the way initialize makes them,
// checks of the root node and of node properties, the captured log in order,
// and override files for the end-to-end tests that acquire a table.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "DumpFormat.h"
#include "IC/ManagementInterface.h"
#include "IC/MutableNode.h"
#include "IC/Node.h"
#include "IC/Number.h"
#include "IC/PropertyValue.h"
#include "IC/Version2.h"
#include "QNLog/QNLogger.h"
#include "TestSupport.h"
#include "mi/SmBiosMI.h"
#include "smbios/SmBios.h"

namespace frametest {

// The plug-in with its base state in reach. Construction sets the ids as the
// agent's initialize does (own id 1, next node id 2) through the base class
// alone, so no SMBIOS table is acquired.
struct TestMI : IC::SmBiosMI {
    using IC::SmBiosMI::miId;
    using IC::SmBiosMI::miIdList;
    using IC::SmBiosMI::nextNodeId;
    using IC::SmBiosMI::nodeList;

    explicit TestMI(unsigned int id = 1) {
        IC::ManagementInterface::initialize(id, IC::Number(0u), IC::Number(0u));
    }
};

// The structure lists of a parsed table: one list per SMBIOS type, each
// holding the structures of that type in table order with their
// formatted-area lengths. The table must outlive the lists.
class StructureLists {
public:
    explicit StructureLists(SD::SmBios const& parsed) {
        for (unsigned int type = 0; type < 256; ++type) {
            lists[type] = &storage[type];
        }
        for (SD::SmBios::Table const& table : parsed.getTables()) {
            storage[table.getType()].push_back(IC::TableData(&table, table.getLength()));
        }
    }
    StructureLists(StructureLists const&) = delete;
    StructureLists& operator=(StructureLists const&) = delete;

    IC::TableLists get() { return lists; }

    std::vector<IC::TableData> storage[256];
    std::vector<IC::TableData>* lists[256];
};

// The raw table of the builder's structures, parsed (version bytes 0, no
// sorting: the structures stay in the order they were added).
inline SD::SmBios parse(smbiostest::TableBuilder const& builder) {
    return SD::SmBios(builder.build());
}

// A table of the structures, in order.
inline smbiostest::TableBuilder tableOf(std::vector<smbiostest::Structure> const& structures) {
    smbiostest::TableBuilder table;
    for (smbiostest::Structure const& structure : structures) {
        table.add(structure);
    }
    return table;
}

// A group association (type 14) with its items, each (type, handle).
inline smbiostest::Structure group(uint16_t handle, std::string const& name,
                                   std::vector<std::pair<uint8_t, uint16_t>> const& items) {
    smbiostest::Structure structure(14, handle);
    structure.str(name);
    for (auto const& item : items) {
        structure.byte(item.first).word(item.second);
    }
    return structure;
}

inline IC::MutableNode const* asMutable(IC::Node const* node) {
    return dynamic_cast<IC::MutableNode const*>(node);
}

// The node's type, or a failure when it is not a MutableNode.
inline ::testing::AssertionResult hasNodeType(IC::Node const* node, unsigned int type) {
    IC::MutableNode const* mutableNode = asMutable(node);
    if (mutableNode == nullptr) {
        return ::testing::AssertionFailure() << "node is not an IC::MutableNode";
    }
    if (mutableNode->getNodeType() != type) {
        return ::testing::AssertionFailure()
               << "node type " << mutableNode->getNodeType() << ", expected " << type;
    }
    return ::testing::AssertionSuccess();
}

// Node id, linked id, type, index, status and description in one check.
inline ::testing::AssertionResult isNode(IC::Node const* node, unsigned int id,
                                         unsigned int linkedId, unsigned int type,
                                         unsigned int index, unsigned int status,
                                         std::string const& description) {
    if (node == nullptr) {
        return ::testing::AssertionFailure() << "no node";
    }
    ::testing::AssertionResult typed = hasNodeType(node, type);
    if (!typed) {
        return typed;
    }
    if (node->getNodeId() != id || node->getLinkedId() != linkedId || node->getIndex() != index ||
        node->getStatus() != status || node->getDescription() != description) {
        return ::testing::AssertionFailure()
               << "node {id " << node->getNodeId() << ", linked " << node->getLinkedId()
               << ", index " << node->getIndex() << ", status " << node->getStatus() << ", \""
               << node->getDescription() << "\"}, expected {id " << id << ", linked " << linkedId
               << ", index " << index << ", status " << status << ", \"" << description << "\"}";
    }
    return ::testing::AssertionSuccess();
}

// The root node of a plug-in whose own id is 1, made first after the
// interface node: type 59, id 2, linked to the interface node 1, index 0,
// status 1, "ROOT Node", the interface ids {1}, no property.
inline ::testing::AssertionResult isFirstRootNode(IC::Node const* node) {
    ::testing::AssertionResult type = hasNodeType(node, 59);
    if (!type) {
        return type;
    }
    std::ostringstream wrong;
    if (node->getNodeId() != 2u) {
        wrong << " id " << node->getNodeId() << ", expected 2;";
    }
    if (node->getLinkedId() != 1u) {
        wrong << " linked id " << node->getLinkedId() << ", expected 1;";
    }
    if (node->getIndex() != 0u) {
        wrong << " index " << node->getIndex() << ", expected 0;";
    }
    if (node->getStatus() != 1u) {
        wrong << " status " << node->getStatus() << ", expected 1;";
    }
    if (node->getDescription() != "ROOT Node") {
        wrong << " description \"" << node->getDescription() << "\", expected \"ROOT Node\";";
    }
    if (node->getMIIds() != std::vector<unsigned int>{1}) {
        wrong << " interface ids {";
        for (unsigned int id : node->getMIIds()) {
            wrong << " " << id;
        }
        wrong << " }, expected {1};";
    }
    if (!node->getProperties().empty()) {
        wrong << " " << node->getProperties().size() << " properties, expected none;";
    }
    if (!wrong.str().empty()) {
        return ::testing::AssertionFailure() << "root node:" << wrong.str();
    }
    return ::testing::AssertionSuccess();
}

// The property as the agent reads it, checked to be set with its flag true.
inline ::testing::AssertionResult readProperty(IC::Node const* node, unsigned int id,
                                               IC::PropertyValue& value) {
    IC::Error const error = node->getProperty(id, value);
    if (error.getStatus() != 0) {
        return ::testing::AssertionFailure() << "property " << id << " not set";
    }
    if (!value.getFlag()) {
        return ::testing::AssertionFailure() << "property " << id << " has its flag false";
    }
    return ::testing::AssertionSuccess();
}

inline ::testing::AssertionResult lacksProperty(IC::Node const* node, unsigned int id) {
    IC::PropertyValue value;
    if (node->getProperty(id, value).getStatus() == 0) {
        return ::testing::AssertionFailure() << "property " << id << " is set: " << value;
    }
    return ::testing::AssertionSuccess();
}

// The property as readProperty reads it, checked to be of `kind` (named
// `kindName` in the failure message).
inline ::testing::AssertionResult readOfKind(IC::Node const* node, unsigned int id,
                                             IC::PropertyValue::KindType kind, char const* kindName,
                                             IC::PropertyValue& value) {
    ::testing::AssertionResult read = readProperty(node, id, value);
    if (!read) {
        return read;
    }
    if (value.getKind() != kind) {
        return ::testing::AssertionFailure()
               << "property " << id << " is of kind " << value.getKind() << ", not " << kindName;
    }
    return ::testing::AssertionSuccess();
}

// The property as readProperty reads it, checked to be an IC::Number of
// `kind` (named `kindName` in the failure message).
inline ::testing::AssertionResult readNumberOfKind(IC::Node const* node, unsigned int id,
                                                   IC::Number::KindType kind, char const* kindName,
                                                   IC::PropertyValue& value) {
    ::testing::AssertionResult const read =
        readOfKind(node, id, IC::PropertyValue::NUMBER, "a number", value);
    if (read && value.getNumber().getKind() != kind) {
        return ::testing::AssertionFailure() << "property " << id << " is a number of kind "
                                             << value.getNumber().getKind() << ", not " << kindName;
    }
    return read;
}

// Property id holds an IC::Number of `kind` (named `kindName` in the
// failure message) whose value, as `get` reads it, equals expected.
template <typename T>
inline ::testing::AssertionResult hasNumber(IC::Node const* node, unsigned int id,
                                            IC::Number::KindType kind, char const* kindName,
                                            T (IC::Number::*get)() const, T expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult const read = readNumberOfKind(node, id, kind, kindName, value);
    if (read && (value.getNumber().*get)() != expected) {
        return ::testing::AssertionFailure()
               << "property " << id << " is " << (value.getNumber().*get)() << ", expected "
               << expected;
    }
    return read;
}

// Property id holds an IC::Number of kind UNSIGNED with the given value.
inline ::testing::AssertionResult hasUnsigned(IC::Node const* node, unsigned int id,
                                              unsigned int expected) {
    return hasNumber(node, id, IC::Number::UNSIGNED, "unsigned", &IC::Number::getUnsigned,
                     expected);
}

// Property id holds a vector of IC::Number, each of kind UNSIGNED, with the
// given values in order.
inline ::testing::AssertionResult hasUnsignedList(IC::Node const* node, unsigned int id,
                                                  std::vector<unsigned int> const& expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult read =
        readOfKind(node, id, IC::PropertyValue::NUMBERS, "a vector of numbers", value);
    if (!read) {
        return read;
    }
    std::vector<IC::Number> const& numbers = value.getNumbers();
    if (numbers.size() != expected.size()) {
        return ::testing::AssertionFailure()
               << "property " << id << " holds " << numbers.size() << " numbers, expected "
               << expected.size() << ": " << value;
    }
    for (size_t i = 0; i < numbers.size(); ++i) {
        if (numbers[i].getKind() != IC::Number::UNSIGNED ||
            numbers[i].getUnsigned() != expected[i]) {
            return ::testing::AssertionFailure()
                   << "property " << id << " element " << i << " is " << numbers[i] << " (kind "
                   << numbers[i].getKind() << "), expected unsigned " << expected[i];
        }
    }
    return ::testing::AssertionSuccess();
}

// Property id holds a vector of strings equal to the given one.
inline ::testing::AssertionResult hasStrings(IC::Node const* node, unsigned int id,
                                             std::vector<std::string> const& expected) {
    IC::PropertyValue value;
    ::testing::AssertionResult read =
        readOfKind(node, id, IC::PropertyValue::STRINGS, "a vector of strings", value);
    if (!read) {
        return read;
    }
    if (value.getStrings() != expected) {
        std::ostringstream wanted;
        for (std::string const& s : expected) {
            wanted << "\"" << s << "\" ";
        }
        return ::testing::AssertionFailure()
               << "property " << id << " is " << value << ", expected " << wanted.str();
    }
    return ::testing::AssertionSuccess();
}

// Property id holds an IC::Number of kind VERSION with the given parts.
inline ::testing::AssertionResult hasVersion(IC::Node const* node, unsigned int id,
                                             unsigned int major, unsigned int minor) {
    IC::PropertyValue value;
    ::testing::AssertionResult read =
        readNumberOfKind(node, id, IC::Number::VERSION, "a version", value);
    if (!read) {
        return read;
    }
    IC::Version2 const& version = value.getNumber().getVersion();
    if (version != IC::Version2(major, minor)) {
        return ::testing::AssertionFailure()
               << "property " << id << " is version " << version.getMajor() << "."
               << version.getMinor() << ", expected " << major << "." << minor;
    }
    return ::testing::AssertionSuccess();
}

// Each text is in `times` captured messages (LogCapture::count: the log and
// the trace output each count).
inline ::testing::AssertionResult loggedTimes(smbiostest::LogCapture const& log, size_t times,
                                              std::vector<std::string> const& texts) {
    for (std::string const& text : texts) {
        if (log.count(text) != times) {
            return ::testing::AssertionFailure() << "\"" << text << "\" is in " << log.count(text)
                                                 << " messages, expected " << times << "\n"
                                                 << log.dump();
        }
    }
    return ::testing::AssertionSuccess();
}

// The texts of the captured messages written through the log output (each
// message is also written through the trace; this keeps one copy), in the
// order they were written.
inline std::vector<std::string> loggedTexts() {
    std::vector<std::string> texts;
    for (QNLog::QNLogRecord const& record : QNLog::QNLogger::captured()) {
        if (record.output == "log") {
            texts.push_back(record.text);
        }
    }
    return texts;
}

// The levels of the captured log-output messages whose text contains text.
inline std::vector<int> loggedLevels(std::string const& text) {
    std::vector<int> levels;
    for (QNLog::QNLogRecord const& record : QNLog::QNLogger::captured()) {
        if (record.output == "log" && record.text.find(text) != std::string::npos) {
            levels.push_back(record.level);
        }
    }
    return levels;
}

// The first captured log-output message that contains text, or "".
inline std::string firstLogged(std::string const& text) {
    for (std::string const& logged : loggedTexts()) {
        if (logged.find(text) != std::string::npos) {
            return logged;
        }
    }
    return "";
}

// Whether this process has acquired its SMBIOS table already. The table is
// acquired once per process, so an end-to-end test that brings its own
// override file must be the first to construct an SD::SmBios; CTest runs
// every test case in a process of its own.
inline bool tableAlreadyAcquired() { return SD::SMBIOS_CLASS::_smbios != nullptr; }

// Fails the test when an earlier test of this process acquired the table:
// it could not see its own table, and a skip would hide that it did not run.
// Run the test binary through ctest, or one test case at a time
// (--gtest_filter).
#define REQUIRE_FRESH_TABLE()                                                              \
    do {                                                                                   \
        if (frametest::tableAlreadyAcquired()) {                                           \
            GTEST_FAIL() << "the SMBIOS table of this process was acquired by an earlier " \
                            "test; run each test case in a process of its own (ctest, or " \
                            "--gtest_filter with one test)";                               \
        }                                                                                  \
    } while (0)

// Writes dataDir/SmBiosOverride/smbios.txt with an "_SM_" entry point of
// the given version that describes the table.
inline void writeOverride(std::string const& dataDir, std::vector<uint8_t> const& table,
                          uint8_t major, uint8_t minor) {
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
    std::vector<uint8_t> const header =
        smbiosdump::makeSmEntryPoint(major, minor, static_cast<uint16_t>(table.size()),
                                     smbiosdump::DUMP_BIN_TABLE_OFFSET, stats.count, stats.maxSize);
    smbiostest::writeOverrideDir(dataDir, header, table);
}

// Writes the override file of the table at the given version and points the
// data folder at it; both stay while the object lives.
class OverrideTable {
public:
    OverrideTable(std::vector<uint8_t> const& table, uint8_t major, uint8_t minor)
        : env_("KESTREL_DATA_DIR", dir_.path() + "/") {
        writeOverride(dir_.path(), table, major, minor);
    }

private:
    smbiostest::TempDir dir_;
    smbiostest::ScopedEnv env_;
};

}  // namespace frametest
