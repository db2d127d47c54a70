#include "Inventory.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <limits>
#include <typeinfo>
#include <utility>

#include "IC/MutableNode.h"
#include "inventory/PropertyNames.h"

namespace inventory {

namespace {

// ---- Output -----------------------------------------------------------------

// The text being rendered. With a sink it is handed on whenever a node or
// property leaves it past kChunk bytes, so that the whole text is never
// held; without one it collects everything.
class Output {
public:
    explicit Output(TextSink const* sink) : sink_(sink) {
        if (sink_ != nullptr) {
            text_.reserve(kChunk + kChunk / 4);
        }
    }
    Output(Output const&) = delete;
    Output& operator=(Output const&) = delete;

    std::string& text() { return text_; }

    // Hands the text on once there is enough of it.
    void pass() {
        if (sink_ != nullptr && text_.size() >= kChunk) {
            flush();
        }
    }

    void flush() {
        if (sink_ != nullptr && !text_.empty()) {
            (*sink_)(text_.data(), text_.size());
            text_.clear();
        }
    }

private:
    static constexpr std::size_t kChunk = 64 * 1024;

    TextSink const* sink_;
    std::string text_;
};

void appendRaw(std::string& out, char const* text) { out.append(text, std::strlen(text)); }

template <typename Integer>
void appendInteger(std::string& out, Integer value) {
    char buffer[24];
    auto const result = std::to_chars(buffer, buffer + sizeof buffer, value);
    out.append(buffer, result.ptr);
}

char const kHexDigits[] = "0123456789ABCDEF";

void appendHexByte(std::string& out, unsigned char byte) {
    out += kHexDigits[byte >> 4];
    out += kHexDigits[byte & 0x0F];
}

void appendIndent(std::string& out, std::size_t width) { out.append(width, ' '); }

// ---- Node facts ---------------------------------------------------------------

// What the host shows of one node; type, path and parent are known only for
// the framework's ordinary nodes.
struct NodeFacts {
    unsigned int id = 0;
    unsigned int linked = 0;
    unsigned int type = 0;
    unsigned int index = 0;
    unsigned int status = 0;
    std::string description;
    std::string path;
    std::string parent;
};

NodeFacts readFacts(IC::Node const& node) {
    NodeFacts facts;
    facts.id = node.getNodeId();
    facts.linked = node.getLinkedId();
    facts.index = node.getIndex();
    facts.status = node.getStatus();
    facts.description = node.getDescription();
    if (auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(&node)) {
        facts.type = mutableNode->getNodeType();
        facts.path = mutableNode->getPath();
        facts.parent = mutableNode->getParent();
    }
    return facts;
}

// The property values of a node without copies where the node keeps them
// (see visitProperties).
template <typename Visit>
void eachProperty(IC::Node const& node, Visit&& visit) {
    IC::PropertyMap const& stored = node.getProperties();
    if (typeid(node) == typeid(IC::MutableNode)) {
        // The framework's own node answers getProperty from this very map.
        for (auto const& entry : stored) {
            visit(entry.first, entry.second);
        }
        return;
    }
    // A class of its own may compute any value when it is read. Such
    // nodes are few (one computer system), so asking each id costs little.
    IC::PropertyValue value;
    for (auto const& entry : stored) {
        IC::Error const error = node.getProperty(entry.first, value);
        visit(entry.first, error.getStatus() == 0 ? value : entry.second);
    }
}

// ---- Text of values -------------------------------------------------------------

std::string formatDouble(double value) {
    // The shortest text that reads back as the same value, without an
    // exponent when one of up to 17 digits does (40 rather than 4e+01).
    std::string shortest;
    char buffer[64];
    for (int precision = 1; precision <= 17; ++precision) {
        std::snprintf(buffer, sizeof buffer, "%.*g", precision, value);
        if (std::strtod(buffer, nullptr) != value) {
            continue;
        }
        if (std::strchr(buffer, 'e') == nullptr) {
            return buffer;
        }
        if (shortest.empty()) {
            shortest = buffer;
        }
    }
    return shortest.empty() ? std::string(buffer) : shortest;
}

// The text on one line: control characters as \xNN, a backslash (and a
// double quote when the text goes between quotes) behind a backslash,
// Latin-1 letters in UTF-8.
void appendEscaped(std::string& out, std::string const& text, bool quoted) {
    for (char c : text) {
        auto const byte = static_cast<unsigned char>(c);
        if (byte == '\\' || (quoted && byte == '"')) {
            out += '\\';
            out += c;
        } else if (byte < 0x20 || byte == 0x7F || (byte >= 0x80 && byte < 0xA0)) {
            out += "\\x";
            appendHexByte(out, byte);
        } else if (byte >= 0xA0) {
            out += static_cast<char>(0xC0 | (byte >> 6));
            out += static_cast<char>(0x80 | (byte & 0x3F));
        } else {
            out += c;
        }
    }
}

// escapeText's text with quoted set, appended.
void appendQuoted(std::string& out, std::string const& text) {
    out += '"';
    appendEscaped(out, text, true);
    out += '"';
}

void appendNumber(std::string& out, IC::Number const& number) {
    switch (number.getKind()) {
        case IC::Number::BOOL:
            appendRaw(out, number.getBool() ? "true" : "false");
            return;
        case IC::Number::UNSIGNED:
            appendInteger(out, number.getUnsigned());
            return;
        case IC::Number::DOUBLE:
            out += formatDouble(number.getDouble());
            return;
        case IC::Number::VERSION:
            appendInteger(out, number.getVersion().getMajor());
            out += '.';
            appendInteger(out, number.getVersion().getMinor());
            return;
        case IC::Number::DATETIME:
            out += formatDateTime(number.getDateTime());
            return;
        case IC::Number::NONE:
            break;
    }
    appendRaw(out, "(none)");
}

void appendValue(std::string& out, IC::PropertyValue const& value) {
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            appendQuoted(out, value.getString());
            return;
        case IC::PropertyValue::NUMBER:
            appendNumber(out, value.getNumber());
            return;
        case IC::PropertyValue::ENUM:
            appendInteger(out, value.getEnum().getValue());
            return;
        case IC::PropertyValue::BYTE:
            appendInteger(out, static_cast<unsigned int>(value.getByte()));
            return;
        case IC::PropertyValue::BYTES: {
            bool first = true;
            for (unsigned char byte : value.getBytes()) {
                if (!first) {
                    out += ' ';
                }
                first = false;
                appendHexByte(out, byte);
            }
            return;
        }
        case IC::PropertyValue::NUMBERS: {
            out += '{';
            bool first = true;
            for (IC::Number const& number : value.getNumbers()) {
                if (!first) {
                    out += ", ";
                }
                first = false;
                appendNumber(out, number);
            }
            out += '}';
            return;
        }
        case IC::PropertyValue::STRINGS: {
            out += '{';
            bool first = true;
            for (std::string const& text : value.getStrings()) {
                if (!first) {
                    out += ", ";
                }
                first = false;
                appendQuoted(out, text);
            }
            out += '}';
            return;
        }
        case IC::PropertyValue::KIND:
            appendInteger(out, static_cast<unsigned int>(value.getKindValue()));
            return;
        case IC::PropertyValue::NONE:
            break;
    }
    appendRaw(out, "(none)");
}

char const* numberKindText(IC::Number const& number) {
    switch (number.getKind()) {
        case IC::Number::BOOL:
            return "bool";
        case IC::Number::UNSIGNED:
            return "unsigned";
        case IC::Number::DOUBLE:
            return "double";
        case IC::Number::VERSION:
            return "version";
        case IC::Number::DATETIME:
            return "datetime";
        case IC::Number::NONE:
            break;
    }
    return "none";
}

char const* valueKindText(IC::PropertyValue const& value) {
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            return "string";
        case IC::PropertyValue::NUMBER:
            return numberKindText(value.getNumber());
        case IC::PropertyValue::ENUM:
            switch (value.getEnum().getWidth()) {
                case 1:
                    return "enum8";
                case 2:
                    return "enum16";
                default:
                    return "enum32";
            }
        case IC::PropertyValue::BYTE:
            return "byte";
        case IC::PropertyValue::BYTES:
            return "bytes";
        case IC::PropertyValue::NUMBERS:
            return "numbers";
        case IC::PropertyValue::STRINGS:
            return "strings";
        case IC::PropertyValue::KIND:
            return "kind";
        case IC::PropertyValue::NONE:
            break;
    }
    return "none";
}

// The value as a whole number that a unit or a meaning can go with: an
// enumerated value, a byte or an unsigned number. False for anything else.
bool wholeNumber(IC::PropertyValue const& value, std::int64_t& number) {
    switch (value.getKind()) {
        case IC::PropertyValue::ENUM:
            number = value.getEnum().getValue();
            return true;
        case IC::PropertyValue::BYTE:
            number = value.getByte();
            return true;
        case IC::PropertyValue::NUMBER:
            if (value.getNumber().getKind() == IC::Number::UNSIGNED) {
                number = value.getNumber().getUnsigned();
                return true;
            }
            return false;
        default:
            return false;
    }
}

// ---- JSON ---------------------------------------------------------------------
// The layout is that of a JSON library's 2-space pretty printing, byte for
// byte: the keys of an object each on a line of their own, "key": value,
// empty objects and arrays as {} and [].

// A JSON string of UTF-8 text: the quote, the backslash and the control
// characters escaped, everything else as it is.
void appendJsonUtf8(std::string& out, char const* text, std::size_t size) {
    out += '"';
    for (std::size_t i = 0; i < size; ++i) {
        auto const byte = static_cast<unsigned char>(text[i]);
        switch (byte) {
            case '"':
                out += "\\\"";
                break;
            case '\\':
                out += "\\\\";
                break;
            case '\b':
                out += "\\b";
                break;
            case '\f':
                out += "\\f";
                break;
            case '\n':
                out += "\\n";
                break;
            case '\r':
                out += "\\r";
                break;
            case '\t':
                out += "\\t";
                break;
            default:
                if (byte < 0x20) {
                    static char const kLowerHex[] = "0123456789abcdef";
                    out += "\\u00";
                    out += kLowerHex[byte >> 4];
                    out += kLowerHex[byte & 0x0F];
                } else {
                    out += static_cast<char>(byte);
                }
                break;
        }
    }
    out += '"';
}

void appendJsonUtf8(std::string& out, char const* text) {
    appendJsonUtf8(out, text, std::strlen(text));
}

// A JSON string of Latin-1 text, turned into UTF-8 on the way.
void appendJsonLatin1(std::string& out, std::string const& text) {
    bool plain = true;
    for (char c : text) {
        auto const byte = static_cast<unsigned char>(c);
        if (byte < 0x20 || byte >= 0x80 || byte == '"' || byte == '\\') {
            plain = false;
            break;
        }
    }
    if (plain) {
        out += '"';
        out += text;
        out += '"';
        return;
    }
    std::string const utf8 = latin1ToUtf8(text);
    appendJsonUtf8(out, utf8.data(), utf8.size());
}

// A double as JSON: the shortest digits that read back as the value, in
// plain notation with ".0" for a whole number when the decimal point falls
// within 15 digits of the start and no more than 4 zeros after the point,
// else with an exponent of at least two digits ("1e+20", "1.5e-07");
// anything not finite is null.
void appendJsonDouble(std::string& out, double value) {
    if (!std::isfinite(value)) {
        appendRaw(out, "null");
        return;
    }
    if (std::signbit(value)) {
        out += '-';
        value = -value;
    }
    if (value == 0.0) {
        appendRaw(out, "0.0");
        return;
    }
    char scientific[40];
    auto const result = std::to_chars(scientific, scientific + sizeof scientific, value,
                                      std::chars_format::scientific);
    // d[.ddd]e±XX: the digits, then the exponent of the first one.
    char digits[24];
    int count = 0;
    char const* at = scientific;
    for (; at != result.ptr && *at != 'e'; ++at) {
        if (*at != '.') {
            digits[count++] = *at;
        }
    }
    int exponent = 0;
    std::from_chars(at + 1 + (at[1] == '+' ? 1 : 0), result.ptr, exponent);
    int const point = exponent + 1;  // digits before the decimal point
    int const kMaxDigitsBeforePoint = 15;
    int const kMinPoint = -4;
    if (count <= point && point <= kMaxDigitsBeforePoint) {
        out.append(digits, static_cast<std::size_t>(count));
        out.append(static_cast<std::size_t>(point - count), '0');
        appendRaw(out, ".0");
    } else if (0 < point && point <= kMaxDigitsBeforePoint) {
        out.append(digits, static_cast<std::size_t>(point));
        out += '.';
        out.append(digits + point, static_cast<std::size_t>(count - point));
    } else if (kMinPoint < point && point <= 0) {
        appendRaw(out, "0.");
        out.append(static_cast<std::size_t>(-point), '0');
        out.append(digits, static_cast<std::size_t>(count));
    } else {
        out += digits[0];
        if (count > 1) {
            out += '.';
            out.append(digits + 1, static_cast<std::size_t>(count - 1));
        }
        int const shown = point - 1;
        out += 'e';
        out += shown < 0 ? '-' : '+';
        unsigned int const magnitude = static_cast<unsigned int>(shown < 0 ? -shown : shown);
        if (magnitude < 10) {
            out += '0';
        }
        appendInteger(out, magnitude);
    }
}

// "key": at the given indentation.
void appendJsonKey(std::string& out, std::size_t indent, char const* key) {
    appendIndent(out, indent);
    out += '"';
    appendRaw(out, key);
    appendRaw(out, "\": ");
}

// The value of a number as JSON; a version is an array of its two parts at
// the given indentation.
void appendJsonNumberValue(std::string& out, IC::Number const& number, std::size_t indent) {
    switch (number.getKind()) {
        case IC::Number::BOOL:
            appendRaw(out, number.getBool() ? "true" : "false");
            return;
        case IC::Number::UNSIGNED:
            appendInteger(out, number.getUnsigned());
            return;
        case IC::Number::DOUBLE:
            appendJsonDouble(out, number.getDouble());
            return;
        case IC::Number::VERSION:
            appendRaw(out, "[\n");
            appendIndent(out, indent + 2);
            appendInteger(out, number.getVersion().getMajor());
            appendRaw(out, ",\n");
            appendIndent(out, indent + 2);
            appendInteger(out, number.getVersion().getMinor());
            out += '\n';
            appendIndent(out, indent);
            out += ']';
            return;
        case IC::Number::DATETIME:
            appendInteger(out, number.getDateTime());
            return;
        case IC::Number::NONE:
            break;
    }
    appendRaw(out, "null");
}

// {"kind": ..., "value": ...} of a number at the given indentation (of its
// braces).
void appendJsonNumber(std::string& out, IC::Number const& number, std::size_t indent) {
    appendRaw(out, "{\n");
    appendJsonKey(out, indent + 2, "kind");
    appendJsonUtf8(out, numberKindText(number));
    appendRaw(out, ",\n");
    appendJsonKey(out, indent + 2, "value");
    appendJsonNumberValue(out, number, indent + 2);
    out += '\n';
    appendIndent(out, indent);
    out += '}';
}

// The "value" of a property; indent is that of its key.
void appendJsonValue(std::string& out, IC::PropertyValue const& value, std::size_t indent) {
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            appendJsonLatin1(out, value.getString());
            return;
        case IC::PropertyValue::NUMBER:
            appendJsonNumberValue(out, value.getNumber(), indent);
            return;
        case IC::PropertyValue::ENUM:
            appendInteger(out, value.getEnum().getValue());
            return;
        case IC::PropertyValue::BYTE:
            appendInteger(out, static_cast<unsigned int>(value.getByte()));
            return;
        case IC::PropertyValue::BYTES:
            out += '"';
            for (unsigned char byte : value.getBytes()) {
                appendHexByte(out, byte);
            }
            out += '"';
            return;
        case IC::PropertyValue::NUMBERS: {
            std::vector<IC::Number> const& numbers = value.getNumbers();
            if (numbers.empty()) {
                appendRaw(out, "[]");
                return;
            }
            appendRaw(out, "[\n");
            bool first = true;
            for (IC::Number const& number : numbers) {
                if (!first) {
                    appendRaw(out, ",\n");
                }
                first = false;
                appendIndent(out, indent + 2);
                appendJsonNumber(out, number, indent + 2);
            }
            out += '\n';
            appendIndent(out, indent);
            out += ']';
            return;
        }
        case IC::PropertyValue::STRINGS: {
            std::vector<std::string> const& strings = value.getStrings();
            if (strings.empty()) {
                appendRaw(out, "[]");
                return;
            }
            appendRaw(out, "[\n");
            bool first = true;
            for (std::string const& text : strings) {
                if (!first) {
                    appendRaw(out, ",\n");
                }
                first = false;
                appendIndent(out, indent + 2);
                appendJsonLatin1(out, text);
            }
            out += '\n';
            appendIndent(out, indent);
            out += ']';
            return;
        }
        case IC::PropertyValue::KIND:
            appendInteger(out, static_cast<unsigned int>(value.getKindValue()));
            return;
        case IC::PropertyValue::NONE:
            break;
    }
    appendRaw(out, "null");
}

// Indentation of the parts of the document: a node's braces, its keys, its
// properties' keys and their members.
std::size_t const kNodeIndent = 4;
std::size_t const kNodeKeyIndent = 6;
std::size_t const kPropertyIndent = 8;
std::size_t const kPropertyKeyIndent = 10;

void appendJsonProperty(std::string& out, unsigned int type, unsigned int id,
                        IC::PropertyValue const& value) {
    appendIndent(out, kPropertyIndent);
    out += '"';
    appendInteger(out, id);
    appendRaw(out, "\": {\n");
    appendJsonKey(out, kPropertyKeyIndent, "kind");
    appendJsonUtf8(out, valueKindText(value));
    appendRaw(out, ",\n");
    appendJsonKey(out, kPropertyKeyIndent, "value");
    appendJsonValue(out, value, kPropertyKeyIndent);
    PropertyLabel const label = labelProperty(type, id, value);
    if (*label.name != '\0') {
        appendRaw(out, ",\n");
        appendJsonKey(out, kPropertyKeyIndent, "name");
        appendJsonUtf8(out, label.name);
    }
    if (label.unit != nullptr) {
        appendRaw(out, ",\n");
        appendJsonKey(out, kPropertyKeyIndent, "unit");
        appendJsonUtf8(out, label.unit);
    }
    if (label.meaning != nullptr) {
        appendRaw(out, ",\n");
        appendJsonKey(out, kPropertyKeyIndent, "meaning");
        appendJsonUtf8(out, label.meaning);
    }
    out += '\n';
    appendIndent(out, kPropertyIndent);
    out += '}';
}

void appendJsonNode(Output& output, IC::Node const& node) {
    NodeFacts const facts = readFacts(node);
    std::string& out = output.text();
    appendIndent(out, kNodeIndent);
    appendRaw(out, "{\n");
    struct Field {
        char const* key;
        unsigned int value;
    };
    Field const fields[] = {{"id", facts.id},
                            {"linked", facts.linked},
                            {"type", facts.type},
                            {"index", facts.index},
                            {"status", facts.status}};
    for (Field const& field : fields) {
        appendJsonKey(out, kNodeKeyIndent, field.key);
        appendInteger(out, field.value);
        appendRaw(out, ",\n");
    }
    appendJsonKey(out, kNodeKeyIndent, "description");
    appendJsonLatin1(out, facts.description);
    appendRaw(out, ",\n");
    if (!facts.path.empty()) {
        appendJsonKey(out, kNodeKeyIndent, "path");
        appendJsonLatin1(out, facts.path);
        appendRaw(out, ",\n");
    }
    if (!facts.parent.empty()) {
        appendJsonKey(out, kNodeKeyIndent, "parent");
        appendJsonLatin1(out, facts.parent);
        appendRaw(out, ",\n");
    }
    appendJsonKey(out, kNodeKeyIndent, "properties");
    // The ids come in ascending numeric order.
    bool first = true;
    eachProperty(node, [&](unsigned int id, IC::PropertyValue const& value) {
        std::string& text = output.text();
        appendRaw(text, first ? "{\n" : ",\n");
        first = false;
        appendJsonProperty(text, facts.type, id, value);
        output.pass();
    });
    std::string& tail = output.text();
    if (first) {
        appendRaw(tail, "{}");
    } else {
        tail += '\n';
        appendIndent(tail, kNodeKeyIndent);
        tail += '}';
    }
    tail += '\n';
    appendIndent(tail, kNodeIndent);
    tail += '}';
}

void writeJsonTo(std::vector<IC::Node*> const& nodes, Output& output) {
    appendRaw(output.text(), "{\n  \"nodes\": [");
    bool first = true;
    for (IC::Node const* node : nodes) {
        if (node == nullptr) {
            continue;
        }
        appendRaw(output.text(), first ? "\n" : ",\n");
        first = false;
        appendJsonNode(output, *node);
        output.pass();
    }
    appendRaw(output.text(), first ? "]\n}\n" : "\n  ]\n}\n");
    output.flush();
}

// ---- Tree ---------------------------------------------------------------------

void appendNodeLine(std::string& out, NodeFacts const& facts, bool topLevel) {
    appendEscaped(out, facts.description, false);
    appendRaw(out, "  [type ");
    appendInteger(out, facts.type);
    std::string const name = nodeTypeName(facts.type);
    if (!name.empty()) {
        out += ' ';
        out += name;
    }
    appendRaw(out, ", index ");
    appendInteger(out, facts.index);
    appendRaw(out, ", id ");
    appendInteger(out, facts.id);
    appendRaw(out, ", status ");
    appendInteger(out, facts.status);
    if (topLevel && facts.linked != 0) {
        // Linked to a node that is not in the list.
        appendRaw(out, ", linked ");
        appendInteger(out, facts.linked);
    }
    if (!facts.path.empty()) {
        appendRaw(out, ", path ");
        appendQuoted(out, facts.path);
    }
    if (!facts.parent.empty()) {
        appendRaw(out, ", parent ");
        appendQuoted(out, facts.parent);
    }
    appendRaw(out, "]\n");
}

// One property line: id, name, value, unit and meaning.
void appendPropertyLine(std::string& out, std::size_t indent, unsigned int type, unsigned int id,
                        IC::PropertyValue const& value) {
    PropertyLabel const label = labelProperty(type, id, value);
    appendIndent(out, indent);
    appendInteger(out, id);
    out += ' ';
    appendRaw(out, *label.name != '\0' ? label.name : valueKindText(value));
    appendRaw(out, "  ");
    appendValue(out, value);
    if (label.unit != nullptr) {
        out += ' ';
        appendRaw(out, label.unit);
    }
    if (label.meaning != nullptr) {
        appendRaw(out, " (");
        appendRaw(out, label.meaning);
        out += ')';
    }
    out += '\n';
}

// One node's line and its property lines beneath it, indented by depth.
void appendTreeNode(Output& output, IC::Node const& node, std::size_t depth) {
    NodeFacts const facts = readFacts(node);
    std::string& out = output.text();
    appendIndent(out, 2 * depth);
    appendNodeLine(out, facts, depth == 0);
    std::size_t const indent = 2 * depth + 2;
    eachProperty(node, [&](unsigned int id, IC::PropertyValue const& value) {
        appendPropertyLine(output.text(), indent, facts.type, id, value);
        output.pass();
    });
}

// The nodes of a tree printout and how they hang together: each node's
// children in list order, and whether it starts a tree of its own (its
// linked id names no node of the list).
struct TreeShape {
    std::vector<IC::Node const*> list;
    std::vector<std::vector<std::size_t>> children;
    std::vector<bool> topLevel;
};

TreeShape treeShape(std::vector<IC::Node*> const& nodes) {
    TreeShape shape;
    shape.list.reserve(nodes.size());
    for (IC::Node const* node : nodes) {
        if (node != nullptr) {
            shape.list.push_back(node);
        }
    }
    // The first node with an id is the one its linked nodes hang under.
    std::vector<std::pair<unsigned int, std::size_t>> byId;
    byId.reserve(shape.list.size());
    for (std::size_t i = 0; i < shape.list.size(); ++i) {
        byId.emplace_back(shape.list[i]->getNodeId(), i);
    }
    std::stable_sort(byId.begin(), byId.end(),
                     [](auto const& a, auto const& b) { return a.first < b.first; });
    shape.children.resize(shape.list.size());
    shape.topLevel.assign(shape.list.size(), false);
    for (std::size_t i = 0; i < shape.list.size(); ++i) {
        unsigned int const linked = shape.list[i]->getLinkedId();
        auto const parent = std::lower_bound(byId.begin(), byId.end(), linked,
                                             [](std::pair<unsigned int, std::size_t> const& entry,
                                                unsigned int id) { return entry.first < id; });
        if (parent == byId.end() || parent->first != linked) {
            shape.topLevel[i] = true;
        } else {
            shape.children[parent->second].push_back(i);
        }
    }
    return shape;
}

// The node at `start` and everything below it that is not printed yet.
void appendSubtree(TreeShape const& shape, std::size_t start, std::vector<bool>& printed,
                   Output& output) {
    // Depth first with an explicit stack; a node is printed once, which
    // also ends any cycle of linked ids.
    std::vector<std::pair<std::size_t, std::size_t>> stack;  // node, depth
    stack.emplace_back(start, 0);
    while (!stack.empty()) {
        auto const [index, depth] = stack.back();
        stack.pop_back();
        if (printed[index]) {
            continue;
        }
        printed[index] = true;
        appendTreeNode(output, *shape.list[index], depth);
        output.pass();
        auto const& below = shape.children[index];
        for (auto child = below.rbegin(); child != below.rend(); ++child) {
            if (!printed[*child]) {
                stack.emplace_back(*child, depth + 1);
            }
        }
    }
}

void writeTreeTo(std::vector<IC::Node*> const& nodes, Output& output) {
    TreeShape const shape = treeShape(nodes);
    std::vector<bool> printed(shape.list.size(), false);
    for (std::size_t i = 0; i < shape.list.size(); ++i) {
        if (shape.topLevel[i]) {
            appendSubtree(shape, i, printed, output);
        }
    }
    // Nodes whose linked ids only lead round in a cycle start trees of
    // their own.
    for (std::size_t i = 0; i < shape.list.size(); ++i) {
        if (!printed[i]) {
            appendSubtree(shape, i, printed, output);
        }
    }
    output.flush();
}

// Node type names by type, ascending.
struct TypeName {
    unsigned int type;
    char const* name;
};
TypeName const kNodeTypeNames[] = {
    {1, "chassis"},
    {3, "firmware"},
    {4, "processor"},
    {13, "BMC"},
    {15, "management interface"},
    {19, "memory device"},
    {21, "voltage sensor"},
    {22, "temperature sensor"},
    {31, "processor cache"},
    {32, "memory array"},
    {35, "system event log"},
    {40, "computer system"},
    {41, "planar"},
    {42, "processor core"},
    {50, "disk controller"},
    {53, "diagnostics firmware"},
    {55, "raw SMBIOS table"},
    {59, "root"},
    {62, "system slot"},
    {70, "port connector"},
};

}  // namespace

std::string latin1ToUtf8(std::string const& text) {
    std::string out;
    out.reserve(text.size());
    for (char c : text) {
        auto byte = static_cast<unsigned char>(c);
        if (byte < 0x80) {
            out += c;
        } else {
            out += static_cast<char>(0xC0 | (byte >> 6));
            out += static_cast<char>(0x80 | (byte & 0x3F));
        }
    }
    return out;
}

std::string escapeText(std::string const& text, bool quoted) {
    std::string out;
    if (quoted) {
        appendQuoted(out, text);
    } else {
        appendEscaped(out, text, false);
    }
    return out;
}

std::string nodeTypeName(unsigned int type) {
    auto const found = std::lower_bound(
        std::begin(kNodeTypeNames), std::end(kNodeTypeNames), type,
        [](TypeName const& entry, unsigned int wanted) { return entry.type < wanted; });
    return found != std::end(kNodeTypeNames) && found->type == type ? std::string(found->name)
                                                                    : std::string();
}

std::string nodeTypeLabel(unsigned int type) {
    std::string label = "type " + std::to_string(type);
    std::string name = nodeTypeName(type);
    if (!name.empty()) {
        label += " " + name;
    }
    return label;
}

std::string numberKindName(IC::Number const& number) { return numberKindText(number); }

std::string valueKindName(IC::PropertyValue const& value) { return valueKindText(value); }

std::string formatDateTime(std::int64_t seconds) {
    // Whole days since 1970-01-01 and the time of that day, then the civil
    // date of the day count (400-year eras of 146097 days, years starting
    // on 1 March so that the leap day ends the year).
    std::int64_t days = seconds / 86400;
    std::int64_t rest = seconds % 86400;
    if (rest < 0) {
        rest += 86400;
        days -= 1;
    }
    std::int64_t const shifted = days + 719468;
    std::int64_t const era = (shifted >= 0 ? shifted : shifted - 146096) / 146097;
    std::int64_t const dayOfEra = shifted - era * 146097;
    std::int64_t const yearOfEra =
        (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
    std::int64_t const dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
    std::int64_t const monthIndex = (5 * dayOfYear + 2) / 153;
    std::int64_t const day = dayOfYear - (153 * monthIndex + 2) / 5 + 1;
    std::int64_t const month = monthIndex < 10 ? monthIndex + 3 : monthIndex - 9;
    std::int64_t const year = yearOfEra + era * 400 + (month <= 2 ? 1 : 0);

    char buffer[64];
    std::snprintf(buffer, sizeof buffer, "%04lld-%02lld-%02lld %02lld:%02lld:%02lld",
                  static_cast<long long>(year), static_cast<long long>(month),
                  static_cast<long long>(day), static_cast<long long>(rest / 3600),
                  static_cast<long long>(rest % 3600 / 60), static_cast<long long>(rest % 60));
    return buffer;
}

std::string formatValue(IC::PropertyValue const& value) {
    std::string out;
    appendValue(out, value);
    return out;
}

PropertyLabel labelProperty(unsigned int nodeType, unsigned int id,
                            IC::PropertyValue const& value) {
    PropertyLabel label;
    PropertyInfo const* const info = findProperty(nodeType, id);
    if (info == nullptr) {
        return label;
    }
    label.name = info->name;
    std::int64_t number = 0;
    bool const whole = wholeNumber(value, number);
    bool const scalar = whole || (value.getKind() == IC::PropertyValue::NUMBER &&
                                  value.getNumber().getKind() == IC::Number::DOUBLE);
    if (scalar && *info->unit != '\0') {
        label.unit = info->unit;
    }
    if (whole && number >= 0 && number <= std::numeric_limits<std::uint32_t>::max()) {
        label.meaning = valueMeaning(*info, static_cast<std::uint32_t>(number));
    }
    return label;
}

void visitProperties(IC::Node const& node,
                     std::function<void(unsigned int, IC::PropertyValue const&)> const& visit) {
    eachProperty(node, visit);
}

std::vector<std::pair<unsigned int, IC::PropertyValue>> readProperties(IC::Node const& node) {
    std::vector<std::pair<unsigned int, IC::PropertyValue>> properties;
    eachProperty(node, [&](unsigned int id, IC::PropertyValue const& value) {
        properties.emplace_back(id, value);
    });
    return properties;
}

void writeJson(std::vector<IC::Node*> const& nodes, TextSink const& sink) {
    Output output(&sink);
    writeJsonTo(nodes, output);
}

std::string renderJson(std::vector<IC::Node*> const& nodes) {
    Output output(nullptr);
    writeJsonTo(nodes, output);
    return std::move(output.text());
}

void writeTree(std::vector<IC::Node*> const& nodes, TextSink const& sink) {
    Output output(&sink);
    writeTreeTo(nodes, output);
}

std::string renderTree(std::vector<IC::Node*> const& nodes) {
    Output output(nullptr);
    writeTreeTo(nodes, output);
    return std::move(output.text());
}

}  // namespace inventory
