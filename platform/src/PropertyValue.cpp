// IC::PropertyValue: construction, text form and comparison.
#include "IC/PropertyValue.h"

#include <ostream>

namespace IC {

namespace {

template <typename T, typename ToText>
std::string braced(std::vector<T> const& values, ToText toText) {
    std::string text = "{";
    for (size_t i = 0; i < values.size(); ++i) {
        if (i != 0) {
            text += ", ";
        }
        text += toText(values[i]);
    }
    text += "}";
    return text;
}

std::string hexBytes(std::vector<unsigned char> const& bytes) {
    static char const digits[] = "0123456789ABCDEF";
    std::string text;
    text.reserve(bytes.size() * 3);
    for (size_t i = 0; i < bytes.size(); ++i) {
        if (i != 0) {
            text += ' ';
        }
        text += digits[(bytes[i] >> 4) & 0x0f];
        text += digits[bytes[i] & 0x0f];
    }
    return text;
}

}  // namespace

PropertyValue::PropertyValue() : kind_(NONE) {}

PropertyValue::PropertyValue(char const* value, bool flag)
    : kind_(STRING), flag_(flag), string_(value != nullptr ? value : "") {}

PropertyValue::PropertyValue(std::string const& value, bool flag)
    : kind_(STRING), flag_(flag), string_(value) {}

PropertyValue::PropertyValue(Number const& value, bool flag)
    : kind_(NUMBER), flag_(flag), number_(value) {}

PropertyValue::PropertyValue(EnumValue const& value, bool flag)
    : kind_(ENUM), flag_(flag), enum_(value) {}

PropertyValue::PropertyValue(unsigned char value, bool flag)
    : kind_(BYTE), flag_(flag), byte_(value) {}

PropertyValue::PropertyValue(std::vector<unsigned char> const& value, bool flag)
    : kind_(BYTES), flag_(flag), bytes_(value) {}

PropertyValue::PropertyValue(std::vector<Number> const& value, bool flag)
    : kind_(NUMBERS), flag_(flag), numbers_(value) {}

PropertyValue::PropertyValue(std::vector<std::string> const& value, bool flag)
    : kind_(STRINGS), flag_(flag), strings_(value) {}

PropertyValue::PropertyValue(KindType kind, bool flag)
    : kind_(KIND), flag_(flag), kindValue_(kind) {}

std::string PropertyValue::toString() const {
    switch (kind_) {
        case STRING:
            return string_;
        case NUMBER:
            return number_.toString();
        case ENUM:
            return enum_.toString();
        case BYTE:
            return std::to_string(static_cast<unsigned int>(byte_));
        case BYTES:
            return hexBytes(bytes_);
        case NUMBERS:
            return braced(numbers_, [](Number const& n) { return n.toString(); });
        case STRINGS:
            return braced(strings_, [](std::string const& s) { return s; });
        case KIND:
            return std::to_string(static_cast<int>(kindValue_));
        case NONE:
            break;
    }
    return "";
}

bool PropertyValue::operator==(PropertyValue const& other) const {
    if (kind_ != other.kind_ || flag_ != other.flag_) {
        return false;
    }
    switch (kind_) {
        case STRING:
            return string_ == other.string_;
        case NUMBER:
            return number_ == other.number_;
        case ENUM:
            return enum_ == other.enum_;
        case BYTE:
            return byte_ == other.byte_;
        case BYTES:
            return bytes_ == other.bytes_;
        case NUMBERS:
            return numbers_ == other.numbers_;
        case STRINGS:
            return strings_ == other.strings_;
        case KIND:
            return kindValue_ == other.kindValue_;
        case NONE:
            break;
    }
    return true;
}

std::ostream& operator<<(std::ostream& out, PropertyValue const& value) {
    return out << value.toString();
}

}  // namespace IC
