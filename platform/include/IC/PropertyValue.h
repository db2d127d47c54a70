// The value of one node property: text, a number, an enumerated value, a
// byte, a byte vector, a vector of numbers or of strings, or a bare kind.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

#include "IC/EnumValue.h"
#include "IC/Number.h"

namespace IC {

class PropertyValue {
public:
    enum KindType {
        NONE = 0,
        STRING = 1,
        NUMBER = 2,
        ENUM = 3,
        BYTE = 4,
        BYTES = 5,
        NUMBERS = 6,
        STRINGS = 7,
        KIND = 8,
    };

    PropertyValue();
    PropertyValue(char const* value, bool flag);
    PropertyValue(std::string const& value, bool flag);
    PropertyValue(Number const& value, bool flag);
    PropertyValue(EnumValue const& value, bool flag);
    PropertyValue(unsigned char value, bool flag);
    PropertyValue(std::vector<unsigned char> const& value, bool flag);
    PropertyValue(std::vector<Number> const& value, bool flag);
    PropertyValue(std::vector<std::string> const& value, bool flag);
    PropertyValue(KindType kind, bool flag);

    KindType getKind() const { return kind_; }
    bool getFlag() const { return flag_; }

    std::string const& getString() const { return string_; }
    Number const& getNumber() const { return number_; }
    EnumValue const& getEnum() const { return enum_; }
    unsigned char getByte() const { return byte_; }
    std::vector<unsigned char> const& getBytes() const { return bytes_; }
    std::vector<Number> const& getNumbers() const { return numbers_; }
    std::vector<std::string> const& getStrings() const { return strings_; }
    // The kind carried by a bare-kind value.
    KindType getKindValue() const { return kindValue_; }

    // A readable text form: strings as they are, numbers in decimal, byte
    // vectors as upper-case hexadecimal pairs separated by blanks, vectors
    // between braces.
    std::string toString() const;
    operator std::string() const { return toString(); }

    bool operator==(PropertyValue const& other) const;
    bool operator!=(PropertyValue const& other) const { return !(*this == other); }

private:
    KindType kind_;
    bool flag_ = false;
    std::string string_;
    Number number_;
    EnumValue enum_;
    unsigned char byte_ = 0;
    std::vector<unsigned char> bytes_;
    std::vector<Number> numbers_;
    std::vector<std::string> strings_;
    KindType kindValue_ = NONE;
};

std::ostream& operator<<(std::ostream& out, PropertyValue const& value);

}  // namespace IC
