// A node tree as canonical text, so that two trees compare as strings and a
// difference shows as the lines that differ: one line per node in node-list
// order (id, parent id, node type, index, status, interface ids,
// description, path and parent texts), then one line per stored property in
// ascending id order (id, kind, value).
//
// Header-only and free of the test framework: the fuzz targets render trees
// with it too.
#pragma once

#include <cstdint>
#include <cstdio>
#include <sstream>
#include <string>
#include <vector>

#include "IC/EnumValue.h"
#include "IC/MutableNode.h"
#include "IC/Node.h"
#include "IC/Number.h"
#include "IC/PropertyValue.h"
#include "IC/Version2.h"

namespace buildertest {

// A text between double quotes, with the quote, the backslash and every byte
// outside printable ASCII escaped, so that any bytes a structure carries
// render on one line and unambiguously.
inline std::string quoted(std::string const& text) {
    std::string out = "\"";
    for (char c : text) {
        unsigned char const byte = static_cast<unsigned char>(c);
        if (c == '"' || c == '\\') {
            out += '\\';
            out += c;
        } else if (byte < 0x20 || byte > 0x7E) {
            char escaped[8];
            std::snprintf(escaped, sizeof escaped, "\\x%02X", static_cast<unsigned int>(byte));
            out += escaped;
        } else {
            out += c;
        }
    }
    return out + "\"";
}

// A number with its kind. A date-time is filled with the clock when it is
// made, so two builds a second apart differ in it: it renders as its kind
// alone unless withDateTime asks for the value.
inline std::string numberText(IC::Number const& number, bool withDateTime = false) {
    switch (number.getKind()) {
        case IC::Number::NONE:
            return "none";
        case IC::Number::BOOL:
            return number.getBool() ? "bool true" : "bool false";
        case IC::Number::UNSIGNED:
            return "unsigned " + std::to_string(number.getUnsigned());
        case IC::Number::DOUBLE: {
            // Every bit of the value: two doubles that print alike in
            // decimal may still differ.
            char text[64];
            std::snprintf(text, sizeof text, "double %.17g", number.getDouble());
            return text;
        }
        case IC::Number::VERSION:
            return "version " + std::to_string(number.getVersion().getMajor()) + "." +
                   std::to_string(number.getVersion().getMinor());
        case IC::Number::DATETIME:
            return withDateTime
                       ? "datetime " + std::to_string(static_cast<long long>(number.getDateTime()))
                       : "datetime";
    }
    return "number-kind-" + std::to_string(static_cast<int>(number.getKind()));
}

// A property value with its kind: an enumerated value with its width, a byte
// vector as upper-case hexadecimal pairs, vectors element by element. A value
// whose flag is false says so.
inline std::string valueText(IC::PropertyValue const& value, bool withDateTime = false) {
    std::string out;
    switch (value.getKind()) {
        case IC::PropertyValue::NONE:
            out = "none";
            break;
        case IC::PropertyValue::STRING:
            out = "string " + quoted(value.getString());
            break;
        case IC::PropertyValue::NUMBER:
            out = numberText(value.getNumber(), withDateTime);
            break;
        case IC::PropertyValue::ENUM:
            out = "enum" + std::to_string(8 * value.getEnum().getWidth()) + " " +
                  std::to_string(static_cast<long long>(value.getEnum().getValue()));
            break;
        case IC::PropertyValue::BYTE:
            out = "byte " + std::to_string(static_cast<unsigned int>(value.getByte()));
            break;
        case IC::PropertyValue::BYTES: {
            static char const digits[] = "0123456789ABCDEF";
            out = "bytes[" + std::to_string(value.getBytes().size()) + "]";
            for (unsigned char b : value.getBytes()) {
                out += ' ';
                out += digits[b >> 4];
                out += digits[b & 0x0F];
            }
            break;
        }
        case IC::PropertyValue::NUMBERS: {
            out = "numbers {";
            char const* separator = "";
            for (IC::Number const& number : value.getNumbers()) {
                out += separator + numberText(number, withDateTime);
                separator = ", ";
            }
            out += "}";
            break;
        }
        case IC::PropertyValue::STRINGS: {
            out = "strings {";
            char const* separator = "";
            for (std::string const& text : value.getStrings()) {
                out += separator + quoted(text);
                separator = ", ";
            }
            out += "}";
            break;
        }
        case IC::PropertyValue::KIND:
            out = "kind " + std::to_string(static_cast<int>(value.getKindValue()));
            break;
        default:
            out = "value-kind-" + std::to_string(static_cast<int>(value.getKind()));
            break;
    }
    if (!value.getFlag()) {
        out += " (flag false)";
    }
    return out;
}

// One node and its stored properties, each on a line of its own. Values a
// node computes when they are read (the computer system's time) are not
// rendered: only what the builder stored.
inline std::string nodeText(IC::Node const* node, bool withDateTime = false) {
    if (node == nullptr) {
        return "node (null)\n";
    }
    std::string out = "node " + std::to_string(node->getNodeId()) + " parent " +
                      std::to_string(node->getLinkedId());
    IC::MutableNode const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
    out += mutableNode != nullptr ? " type " + std::to_string(mutableNode->getNodeType())
                                  : std::string(" type ?");
    out += " index " + std::to_string(node->getIndex()) + " status " +
           std::to_string(node->getStatus()) + " mi {";
    char const* separator = "";
    for (unsigned int id : node->getMIIds()) {
        out += separator + std::to_string(id);
        separator = " ";
    }
    out += "} " + quoted(node->getDescription());
    if (mutableNode != nullptr) {
        if (!mutableNode->getPath().empty()) {
            out += " path " + quoted(mutableNode->getPath());
        }
        if (!mutableNode->getParent().empty()) {
            out += " parent-text " + quoted(mutableNode->getParent());
        }
    }
    out += "\n";
    for (auto const& property : node->getProperties()) {
        out += "  " + std::to_string(property.first) + " " +
               valueText(property.second, withDateTime) + "\n";
    }
    return out;
}

// Every node of the list, in its order.
inline std::string treeSnapshot(std::vector<IC::Node*> const& nodes, bool withDateTime = false) {
    std::string text;
    for (IC::Node const* node : nodes) {
        text += nodeText(node, withDateTime);
    }
    return text;
}

// Where two snapshots first differ, with a few lines of each around it, for
// failure messages ("" when they are equal).
inline std::string snapshotDifference(std::string const& expected, std::string const& actual,
                                      char const* expectedName = "first",
                                      char const* actualName = "second") {
    if (expected == actual) {
        return "";
    }
    auto lines = [](std::string const& text) {
        std::vector<std::string> result;
        std::istringstream in(text);
        std::string line;
        while (std::getline(in, line)) {
            result.push_back(line);
        }
        return result;
    };
    std::vector<std::string> const a = lines(expected);
    std::vector<std::string> const b = lines(actual);
    size_t first = 0;
    while (first < a.size() && first < b.size() && a[first] == b[first]) {
        ++first;
    }
    size_t const from = first >= 3 ? first - 3 : 0;
    std::ostringstream out;
    out << "the snapshots differ from line " << first + 1 << " (" << a.size() << " lines "
        << expectedName << ", " << b.size() << " lines " << actualName << ")\n";
    for (int side = 0; side < 2; ++side) {
        std::vector<std::string> const& text = side == 0 ? a : b;
        out << "--- " << (side == 0 ? expectedName : actualName) << ":\n";
        for (size_t i = from; i < text.size() && i < first + 8; ++i) {
            out << (i == first ? "> " : "  ") << text[i] << "\n";
        }
        if (first >= text.size()) {
            out << "> (ends here)\n";
        }
    }
    return out.str();
}

}  // namespace buildertest
