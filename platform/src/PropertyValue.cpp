// IC::PropertyValue: construction, text form and comparison.
#include "IC/PropertyValue.h"

#include <new>
#include <ostream>
#include <utility>

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

// What the getters of one kind answer for a value of another kind. Made on
// first use, so that they exist whenever a value in another library's static
// object is read.
std::string const& noString() {
    static std::string const empty;
    return empty;
}

Number const& noNumber() {
    static Number const none;
    return none;
}

EnumValue const& noEnum() {
    static EnumValue const none;
    return none;
}

template <typename T>
std::vector<T> const& noVector() {
    static std::vector<T> const empty;
    return empty;
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

PropertyValue::PropertyValue(PropertyValue const& other) : kind_(other.kind_), flag_(other.flag_) {
    copyValue(other);
}

PropertyValue::PropertyValue(PropertyValue&& other) noexcept
    : kind_(other.kind_), flag_(other.flag_) {
    moveValue(other);
}

PropertyValue& PropertyValue::operator=(PropertyValue const& other) {
    if (this == &other) {
        return *this;
    }
    if (kind_ == other.kind_) {
        switch (kind_) {
            case STRING:
                string_ = other.string_;
                break;
            case NUMBER:
                number_ = other.number_;
                break;
            case ENUM:
                enum_ = other.enum_;
                break;
            case BYTE:
                byte_ = other.byte_;
                break;
            case BYTES:
                bytes_ = other.bytes_;
                break;
            case NUMBERS:
                numbers_ = other.numbers_;
                break;
            case STRINGS:
                strings_ = other.strings_;
                break;
            case KIND:
                kindValue_ = other.kindValue_;
                break;
            default:
                break;
        }
    } else {
        // Copied aside first: if the copy throws, this value stays as it was.
        PropertyValue copy(other);
        destroyValue();
        kind_ = copy.kind_;
        moveValue(copy);
    }
    flag_ = other.flag_;
    return *this;
}

PropertyValue& PropertyValue::operator=(PropertyValue&& other) noexcept {
    if (this != &other) {
        destroyValue();
        kind_ = other.kind_;
        moveValue(other);
        flag_ = other.flag_;
    }
    return *this;
}

PropertyValue::~PropertyValue() { destroyValue(); }

// Constructs this value's alternative (kind_ already set) from other's:
// copied from an lvalue, moved from an rvalue.
template <typename Other>
void PropertyValue::takeValue(Other&& other) {
    switch (kind_) {
        case STRING:
            new (&string_) std::string(std::forward<Other>(other).string_);
            break;
        case NUMBER:
            new (&number_) Number(other.number_);
            break;
        case ENUM:
            new (&enum_) EnumValue(other.enum_);
            break;
        case BYTE:
            byte_ = other.byte_;
            break;
        case BYTES:
            new (&bytes_) std::vector<unsigned char>(std::forward<Other>(other).bytes_);
            break;
        case NUMBERS:
            new (&numbers_) std::vector<Number>(std::forward<Other>(other).numbers_);
            break;
        case STRINGS:
            new (&strings_) std::vector<std::string>(std::forward<Other>(other).strings_);
            break;
        case KIND:
            kindValue_ = other.kindValue_;
            break;
        default:
            break;
    }
}

void PropertyValue::copyValue(PropertyValue const& other) { takeValue(other); }

// Moving a string or a vector never throws.
void PropertyValue::moveValue(PropertyValue& other) noexcept { takeValue(std::move(other)); }

void PropertyValue::destroyValue() noexcept {
    using String = std::string;
    using Bytes = std::vector<unsigned char>;
    using Numbers = std::vector<Number>;
    using Strings = std::vector<std::string>;
    switch (kind_) {
        case STRING:
            string_.~String();
            break;
        case BYTES:
            bytes_.~Bytes();
            break;
        case NUMBERS:
            numbers_.~Numbers();
            break;
        case STRINGS:
            strings_.~Strings();
            break;
        default:
            // Numbers, enumerated values, bytes and kinds need no ending.
            break;
    }
}

std::string const& PropertyValue::getString() const {
    return kind_ == STRING ? string_ : noString();
}

Number const& PropertyValue::getNumber() const { return kind_ == NUMBER ? number_ : noNumber(); }

EnumValue const& PropertyValue::getEnum() const { return kind_ == ENUM ? enum_ : noEnum(); }

std::vector<unsigned char> const& PropertyValue::getBytes() const {
    return kind_ == BYTES ? bytes_ : noVector<unsigned char>();
}

std::vector<Number> const& PropertyValue::getNumbers() const {
    return kind_ == NUMBERS ? numbers_ : noVector<Number>();
}

std::vector<std::string> const& PropertyValue::getStrings() const {
    return kind_ == STRINGS ? strings_ : noVector<std::string>();
}

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
