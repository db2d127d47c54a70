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

namespace {

// ---- Output -----------------------------------------------------------------

// The text being rendered, written straight into one buffer. With a sink
// the buffer is handed on whenever a node or a property leaves it past
// kChunk bytes, so that the whole text is never held; without one it
// collects everything.
class Output {
public:
    explicit Output(TextSink const* sink) : sink_(sink) {
        buffer_.resize(sink_ != nullptr ? kChunk + kChunk / 4 : 256);
    }
    Output(Output const&) = delete;
    Output& operator=(Output const&) = delete;

    void put(char c) {
        *room(1) = c;
        ++size_;
    }
    void put(char const* data, std::size_t size) {
        std::memcpy(room(size), data, size);
        size_ += size;
    }
    void put(std::string const& chars) { put(chars.data(), chars.size()); }
    // A string literal, its length known where it is written.
    template <std::size_t N>
    void literal(char const (&chars)[N]) {
        put(chars, N - 1);
    }
    // A C string of unknown length.
    void text(char const* chars) { put(chars, std::strlen(chars)); }
    void spaces(std::size_t count) {
        std::memset(room(count), ' ', count);
        size_ += count;
    }
    // A line end and the next line's indentation.
    void newline(std::size_t indent) {
        char* const at = room(indent + 1);
        *at = '\n';
        std::memset(at + 1, ' ', indent);
        size_ += indent + 1;
    }
    template <typename Integer>
    void integer(Integer value) {
        char* const at = room(kIntegerRoom);
        size_ += static_cast<std::size_t>(std::to_chars(at, at + kIntegerRoom, value).ptr - at);
    }
    void hexByte(unsigned char byte) {
        static char const kHexDigits[] = "0123456789ABCDEF";
        char* const at = room(2);
        at[0] = kHexDigits[byte >> 4];
        at[1] = kHexDigits[byte & 0x0F];
        size_ += 2;
    }

    // Hands the text on once there is enough of it.
    void pass() {
        if (sink_ != nullptr && size_ >= kChunk) {
            flush();
        }
    }

    void flush() {
        if (sink_ != nullptr && size_ != 0) {
            (*sink_)(buffer_.data(), size_);
            size_ = 0;
        }
    }

    // Everything written, when there is no sink.
    std::string take() {
        buffer_.resize(size_);
        size_ = 0;
        return std::move(buffer_);
    }

private:
    static constexpr std::size_t kChunk = 32 * 1024;
    // The longest decimal integer of 64 bits with its sign.
    static constexpr std::size_t kIntegerRoom = 20;

    // Room for count more characters at the end of the text.
    char* room(std::size_t count) {
        if (buffer_.size() - size_ < count) {
            buffer_.resize(std::max(2 * buffer_.size(), size_ + count));
        }
        return &buffer_[size_];
    }

    TextSink const* sink_;
    std::string buffer_;
    std::size_t size_ = 0;
};

// ---- Node facts ---------------------------------------------------------------

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

// The text on one line: control characters as \xNN, a backslash (and a
// double quote when the text goes between quotes) behind a backslash,
// Latin-1 letters in UTF-8.
void putEscaped(Output& out, std::string const& text, bool quoted) {
    for (char c : text) {
        auto const byte = static_cast<unsigned char>(c);
        if (byte == '\\' || (quoted && byte == '"')) {
            out.put('\\');
            out.put(c);
        } else if (byte < 0x20 || byte == 0x7F || (byte >= 0x80 && byte < 0xA0)) {
            out.literal("\\x");
            out.hexByte(byte);
        } else if (byte >= 0xA0) {
            out.put(static_cast<char>(0xC0 | (byte >> 6)));
            out.put(static_cast<char>(0x80 | (byte & 0x3F)));
        } else {
            out.put(c);
        }
    }
}

// escapeText's text with quoted set.
void putQuoted(Output& out, std::string const& text) {
    out.put('"');
    putEscaped(out, text, true);
    out.put('"');
}

void putNumber(Output& out, IC::Number const& number) {
    switch (number.getKind()) {
        case IC::Number::BOOL:
            if (number.getBool()) {
                out.literal("true");
            } else {
                out.literal("false");
            }
            return;
        case IC::Number::UNSIGNED:
            out.integer(number.getUnsigned());
            return;
        case IC::Number::DOUBLE:
            out.put(formatDouble(number.getDouble()));
            return;
        case IC::Number::VERSION:
            out.integer(number.getVersion().getMajor());
            out.put('.');
            out.integer(number.getVersion().getMinor());
            return;
        case IC::Number::DATETIME:
            out.put(formatDateTime(number.getDateTime()));
            return;
        case IC::Number::NONE:
            break;
    }
    out.literal("(none)");
}

// Each item put by putItem, separator between two.
template <typename Items, typename PutItem, std::size_t N>
void putEach(Output& out, Items const& items, char const (&separator)[N], PutItem putItem) {
    bool first = true;
    for (auto const& item : items) {
        if (!first) {
            out.literal(separator);
        }
        first = false;
        putItem(item);
    }
}

// The value as the tree shows it.
void putValue(Output& out, IC::PropertyValue const& value) {
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            putQuoted(out, value.getString());
            return;
        case IC::PropertyValue::NUMBER:
            putNumber(out, value.getNumber());
            return;
        case IC::PropertyValue::ENUM:
            out.integer(value.getEnum().getValue());
            return;
        case IC::PropertyValue::BYTE:
            out.integer(static_cast<unsigned int>(value.getByte()));
            return;
        case IC::PropertyValue::BYTES:
            putEach(out, value.getBytes(), " ", [&out](unsigned char byte) { out.hexByte(byte); });
            return;
        case IC::PropertyValue::NUMBERS:
            out.put('{');
            putEach(out, value.getNumbers(), ", ",
                    [&out](IC::Number const& number) { putNumber(out, number); });
            out.put('}');
            return;
        case IC::PropertyValue::STRINGS:
            out.put('{');
            putEach(out, value.getStrings(), ", ",
                    [&out](std::string const& text) { putQuoted(out, text); });
            out.put('}');
            return;
        case IC::PropertyValue::KIND:
            out.integer(static_cast<unsigned int>(value.getKindValue()));
            return;
        case IC::PropertyValue::NONE:
            break;
    }
    out.literal("(none)");
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
// byte: every member of an object and every element of an array on a line
// of its own, "key": value, empty objects and arrays as {} and []. The
// document's depth is fixed, so is the indentation of each part.

std::size_t const kNodeIndent = 4;          // a node's braces
std::size_t const kNodeKeyIndent = 6;       // its keys
std::size_t const kPropertyIndent = 8;      // a property's key and braces
std::size_t const kPropertyKeyIndent = 10;  // "kind", "value", "name", ...
std::size_t const kElementIndent = 12;      // elements of a value that is an array
std::size_t const kElementKeyIndent = 14;   // keys of a number in such an array

// A JSON string of UTF-8 text: the quote, the backslash and the control
// characters escaped, everything else as it is.
void putJsonUtf8(Output& out, char const* text, std::size_t size) {
    static char const kLowerHex[] = "0123456789abcdef";
    out.put('"');
    for (std::size_t i = 0; i < size; ++i) {
        auto const byte = static_cast<unsigned char>(text[i]);
        if (byte >= 0x20 && byte != '"' && byte != '\\') {
            out.put(static_cast<char>(byte));
            continue;
        }
        // The two-character escapes JSON has, else \u00XX.
        static char const kEscaped[] = "\"\\\b\f\n\r\t";
        static char const kLetters[] = "\"\\bfnrt";
        char const* const known = byte != 0 ? std::strchr(kEscaped, byte) : nullptr;
        out.put('\\');
        if (known != nullptr) {
            out.put(kLetters[known - kEscaped]);
        } else {
            out.literal("u00");
            out.put(kLowerHex[byte >> 4]);
            out.put(kLowerHex[byte & 0x0F]);
        }
    }
    out.put('"');
}

void putJsonUtf8(Output& out, char const* text) { putJsonUtf8(out, text, std::strlen(text)); }

// A JSON string of Latin-1 text, turned into UTF-8 on the way.
void putJsonLatin1(Output& out, std::string const& text) {
    bool const plain = std::all_of(text.begin(), text.end(), [](char c) {
        auto const byte = static_cast<unsigned char>(c);
        return byte >= 0x20 && byte < 0x80 && byte != '"' && byte != '\\';
    });
    if (plain) {
        out.put('"');
        out.put(text);
        out.put('"');
        return;
    }
    std::string const utf8 = latin1ToUtf8(text);
    putJsonUtf8(out, utf8.data(), utf8.size());
}

// A double as JSON: the shortest digits that read back as the value, in
// plain notation with ".0" for a whole number when the decimal point falls
// within 15 digits of the start and no more than 4 zeros after the point,
// else with an exponent of at least two digits ("1e+20", "1.5e-07");
// anything not finite is null.
void putJsonDouble(Output& out, double value) {
    if (!std::isfinite(value)) {
        out.literal("null");
        return;
    }
    if (std::signbit(value)) {
        out.put('-');
        value = -value;
    }
    if (value == 0.0) {
        out.literal("0.0");
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
        out.put(digits, static_cast<std::size_t>(count));
        for (int zeros = point - count; zeros > 0; --zeros) {
            out.put('0');
        }
        out.literal(".0");
    } else if (0 < point && point <= kMaxDigitsBeforePoint) {
        out.put(digits, static_cast<std::size_t>(point));
        out.put('.');
        out.put(digits + point, static_cast<std::size_t>(count - point));
    } else if (kMinPoint < point && point <= 0) {
        out.literal("0.");
        for (int zeros = -point; zeros > 0; --zeros) {
            out.put('0');
        }
        out.put(digits, static_cast<std::size_t>(count));
    } else {
        out.put(digits[0]);
        if (count > 1) {
            out.put('.');
            out.put(digits + 1, static_cast<std::size_t>(count - 1));
        }
        int const shown = point - 1;
        out.put('e');
        out.put(shown < 0 ? '-' : '+');
        unsigned int const magnitude = static_cast<unsigned int>(shown < 0 ? -shown : shown);
        if (magnitude < 10) {
            out.put('0');
        }
        out.integer(magnitude);
    }
}

// The value of a number as JSON; a version is an array of its two parts,
// whose brackets go at the given indentation.
void putJsonNumberValue(Output& out, IC::Number const& number, std::size_t indent) {
    switch (number.getKind()) {
        case IC::Number::BOOL:
            if (number.getBool()) {
                out.literal("true");
            } else {
                out.literal("false");
            }
            return;
        case IC::Number::UNSIGNED:
            out.integer(number.getUnsigned());
            return;
        case IC::Number::DOUBLE:
            putJsonDouble(out, number.getDouble());
            return;
        case IC::Number::VERSION:
            out.put('[');
            out.newline(indent + 2);
            out.integer(number.getVersion().getMajor());
            out.put(',');
            out.newline(indent + 2);
            out.integer(number.getVersion().getMinor());
            out.newline(indent);
            out.put(']');
            return;
        case IC::Number::DATETIME:
            out.integer(number.getDateTime());
            return;
        case IC::Number::NONE:
            break;
    }
    out.literal("null");
}

// A number as an element of a value that is an array: {"kind", "value"}.
void putJsonNumberElement(Output& out, IC::Number const& number) {
    out.put('{');
    out.newline(kElementKeyIndent);
    out.literal("\"kind\": \"");
    out.text(numberKindText(number));
    out.literal("\",");
    out.newline(kElementKeyIndent);
    out.literal("\"value\": ");
    putJsonNumberValue(out, number, kElementKeyIndent);
    out.newline(kElementIndent);
    out.put('}');
}

// A value that is an array: "[]", or each element on a line of its own.
template <typename Element, typename PutElement>
void putJsonArray(Output& out, std::vector<Element> const& elements, PutElement&& putElement) {
    if (elements.empty()) {
        out.literal("[]");
        return;
    }
    out.put('[');
    bool first = true;
    for (Element const& element : elements) {
        if (!first) {
            out.put(',');
        }
        first = false;
        out.newline(kElementIndent);
        putElement(element);
    }
    out.newline(kPropertyKeyIndent);
    out.put(']');
}

// The "value" of a property.
void putJsonValue(Output& out, IC::PropertyValue const& value) {
    switch (value.getKind()) {
        case IC::PropertyValue::STRING:
            putJsonLatin1(out, value.getString());
            return;
        case IC::PropertyValue::NUMBER:
            putJsonNumberValue(out, value.getNumber(), kPropertyKeyIndent);
            return;
        case IC::PropertyValue::ENUM:
            out.integer(value.getEnum().getValue());
            return;
        case IC::PropertyValue::BYTE:
            out.integer(static_cast<unsigned int>(value.getByte()));
            return;
        case IC::PropertyValue::BYTES:
            out.put('"');
            for (unsigned char byte : value.getBytes()) {
                out.hexByte(byte);
            }
            out.put('"');
            return;
        case IC::PropertyValue::NUMBERS:
            putJsonArray(out, value.getNumbers(),
                         [&out](IC::Number const& number) { putJsonNumberElement(out, number); });
            return;
        case IC::PropertyValue::STRINGS:
            putJsonArray(out, value.getStrings(),
                         [&out](std::string const& text) { putJsonLatin1(out, text); });
            return;
        case IC::PropertyValue::KIND:
            out.integer(static_cast<unsigned int>(value.getKindValue()));
            return;
        case IC::PropertyValue::NONE:
            break;
    }
    out.literal("null");
}

// "key": at a property's member indentation, after the line end of the
// member before it.
template <std::size_t N>
void putJsonMemberKey(Output& out, char const (&key)[N]) {
    out.put(',');
    out.newline(kPropertyKeyIndent);
    out.literal(key);
}

// One property: its id as the key, then kind, value, and the catalog's
// name, unit and meaning where it has them.
void putJsonProperty(Output& out, unsigned int type, unsigned int id,
                     IC::PropertyValue const& value) {
    out.put('"');
    out.integer(id);
    out.literal("\": {");
    out.newline(kPropertyKeyIndent);
    out.literal("\"kind\": \"");
    out.text(valueKindText(value));
    out.put('"');
    putJsonMemberKey(out, "\"value\": ");
    putJsonValue(out, value);
    PropertyLabel const label = labelProperty(type, id, value);
    if (*label.name != '\0') {
        putJsonMemberKey(out, "\"name\": ");
        putJsonUtf8(out, label.name);
    }
    if (label.unit != nullptr) {
        putJsonMemberKey(out, "\"unit\": ");
        putJsonUtf8(out, label.unit);
    }
    if (label.meaning != nullptr) {
        putJsonMemberKey(out, "\"meaning\": ");
        putJsonUtf8(out, label.meaning);
    }
    out.newline(kPropertyIndent);
    out.put('}');
}

// "key": at a node's member indentation, on a line of its own.
template <std::size_t N>
void putJsonNodeKey(Output& out, char const (&key)[N]) {
    out.newline(kNodeKeyIndent);
    out.literal(key);
}

void putJsonNode(Output& out, IC::Node const& node) {
    NodeFacts const facts = readFacts(node);
    out.put('{');
    putJsonNodeKey(out, "\"id\": ");
    out.integer(facts.id);
    out.put(',');
    putJsonNodeKey(out, "\"linked\": ");
    out.integer(facts.linked);
    out.put(',');
    putJsonNodeKey(out, "\"type\": ");
    out.integer(facts.type);
    out.put(',');
    putJsonNodeKey(out, "\"index\": ");
    out.integer(facts.index);
    out.put(',');
    putJsonNodeKey(out, "\"status\": ");
    out.integer(facts.status);
    out.put(',');
    putJsonNodeKey(out, "\"description\": ");
    putJsonLatin1(out, facts.description);
    out.put(',');
    if (!facts.path.empty()) {
        putJsonNodeKey(out, "\"path\": ");
        putJsonLatin1(out, facts.path);
        out.put(',');
    }
    if (!facts.parent.empty()) {
        putJsonNodeKey(out, "\"parent\": ");
        putJsonLatin1(out, facts.parent);
        out.put(',');
    }
    putJsonNodeKey(out, "\"properties\": ");
    // The ids come in ascending numeric order.
    bool first = true;
    eachProperty(node, [&](unsigned int id, IC::PropertyValue const& value) {
        out.put(first ? '{' : ',');
        first = false;
        out.newline(kPropertyIndent);
        putJsonProperty(out, facts.type, id, value);
        out.pass();
    });
    if (first) {
        out.literal("{}");
    } else {
        out.newline(kNodeKeyIndent);
        out.put('}');
    }
    out.newline(kNodeIndent);
    out.put('}');
}

void writeJsonTo(std::vector<IC::Node*> const& nodes, Output& out) {
    out.literal("{\n  \"nodes\": [");
    bool first = true;
    for (IC::Node const* node : nodes) {
        if (node == nullptr) {
            continue;
        }
        if (!first) {
            out.put(',');
        }
        first = false;
        out.newline(kNodeIndent);
        putJsonNode(out, *node);
        out.pass();
    }
    if (first) {
        out.literal("]\n}\n");
    } else {
        out.literal("\n  ]\n}\n");
    }
    out.flush();
}

// ---- Tree ---------------------------------------------------------------------

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

// The name of a node type, or nullptr.
char const* typeName(unsigned int type) {
    auto const found = std::lower_bound(
        std::begin(kNodeTypeNames), std::end(kNodeTypeNames), type,
        [](TypeName const& entry, unsigned int wanted) { return entry.type < wanted; });
    return found != std::end(kNodeTypeNames) && found->type == type ? found->name : nullptr;
}

void putNodeLine(Output& out, NodeFacts const& facts, bool topLevel) {
    putEscaped(out, facts.description, false);
    out.literal("  [type ");
    out.integer(facts.type);
    if (char const* const name = typeName(facts.type)) {
        out.put(' ');
        out.text(name);
    }
    out.literal(", index ");
    out.integer(facts.index);
    out.literal(", id ");
    out.integer(facts.id);
    out.literal(", status ");
    out.integer(facts.status);
    if (topLevel && facts.linked != 0) {
        // Linked to a node that is not in the list.
        out.literal(", linked ");
        out.integer(facts.linked);
    }
    if (!facts.path.empty()) {
        out.literal(", path ");
        putQuoted(out, facts.path);
    }
    if (!facts.parent.empty()) {
        out.literal(", parent ");
        putQuoted(out, facts.parent);
    }
    out.literal("]\n");
}

// One property line: id, name, value, unit and meaning.
void putPropertyLine(Output& out, std::size_t indent, unsigned int type, unsigned int id,
                     IC::PropertyValue const& value) {
    PropertyLabel const label = labelProperty(type, id, value);
    out.spaces(indent);
    out.integer(id);
    out.put(' ');
    out.text(*label.name != '\0' ? label.name : valueKindText(value));
    out.literal("  ");
    putValue(out, value);
    if (label.unit != nullptr) {
        out.put(' ');
        out.text(label.unit);
    }
    if (label.meaning != nullptr) {
        out.literal(" (");
        out.text(label.meaning);
        out.put(')');
    }
    out.put('\n');
}

// One node's line and its property lines beneath it, indented by depth.
void putTreeNode(Output& out, IC::Node const& node, std::size_t depth) {
    NodeFacts const facts = readFacts(node);
    out.spaces(2 * depth);
    putNodeLine(out, facts, depth == 0);
    std::size_t const indent = 2 * depth + 2;
    eachProperty(node, [&](unsigned int id, IC::PropertyValue const& value) {
        putPropertyLine(out, indent, facts.type, id, value);
        out.pass();
    });
}

// The node at `start` and everything below it that is not printed yet.
void putSubtree(TreeShape const& shape, std::size_t start, std::vector<bool>& printed,
                Output& out) {
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
        putTreeNode(out, *shape.list[index], depth);
        out.pass();
        auto const& below = shape.children[index];
        for (auto child = below.rbegin(); child != below.rend(); ++child) {
            if (!printed[*child]) {
                stack.emplace_back(*child, depth + 1);
            }
        }
    }
}

void writeTreeTo(std::vector<IC::Node*> const& nodes, Output& out) {
    TreeShape const shape = treeShape(nodes);
    std::vector<bool> printed(shape.list.size(), false);
    writeTrees(shape, printed, [&](std::size_t start) { putSubtree(shape, start, printed, out); });
    out.flush();
}

}  // namespace

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
    Output out(nullptr);
    if (quoted) {
        putQuoted(out, text);
    } else {
        putEscaped(out, text, false);
    }
    return out.take();
}

std::string nodeTypeName(unsigned int type) {
    char const* const name = typeName(type);
    return name != nullptr ? std::string(name) : std::string();
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
    Output out(nullptr);
    putValue(out, value);
    return out.take();
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
    Output out(&sink);
    writeJsonTo(nodes, out);
}

std::string renderJson(std::vector<IC::Node*> const& nodes) {
    Output out(nullptr);
    writeJsonTo(nodes, out);
    return out.take();
}

void writeTree(std::vector<IC::Node*> const& nodes, TextSink const& sink) {
    Output out(&sink);
    writeTreeTo(nodes, out);
}

std::string renderTree(std::vector<IC::Node*> const& nodes) {
    Output out(nullptr);
    writeTreeTo(nodes, out);
    return out.take();
}

}  // namespace inventory
