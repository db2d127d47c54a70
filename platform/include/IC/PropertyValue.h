// The value of one node property: text, a number, an enumerated value, a
// byte, a byte vector, a vector of numbers or of strings, or a bare kind.
#pragma once

#include <cstdint>
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

    PropertyValue(PropertyValue const& other);
    // A moved-from value keeps its kind and flag; its text or vector is left
    // empty.
    PropertyValue(PropertyValue&& other) noexcept;
    PropertyValue& operator=(PropertyValue const& other);
    PropertyValue& operator=(PropertyValue&& other) noexcept;
    ~PropertyValue();

    KindType getKind() const { return static_cast<KindType>(kind_); }
    bool getFlag() const { return flag_; }

    // Each getter answers for its own kind; asked about a value of another
    // kind it gives an empty text or vector, a number of no kind, a default
    // enumerated value, byte 0 or kind NONE.
    std::string const& getString() const;
    Number const& getNumber() const;
    EnumValue const& getEnum() const;
    unsigned char getByte() const { return kind_ == BYTE ? byte_ : 0; }
    std::vector<unsigned char> const& getBytes() const;
    std::vector<Number> const& getNumbers() const;
    std::vector<std::string> const& getStrings() const;
    // The kind carried by a bare-kind value.
    KindType getKindValue() const { return kind_ == KIND ? kindValue_ : NONE; }

    // A readable text form: strings as they are, numbers in decimal, byte
    // vectors as upper-case hexadecimal pairs separated by blanks, vectors
    // between braces.
    std::string toString() const;
    operator std::string() const { return toString(); }

    bool operator==(PropertyValue const& other) const;
    bool operator!=(PropertyValue const& other) const { return !(*this == other); }

private:
    // Makes the member of kind_ from the same member of other, by copy or by
    // move; the kind must already be set and no member alive.
    template <typename Other>
    void takeValue(Other&& other);
    void copyValue(PropertyValue const& other);
    void moveValue(PropertyValue& other) noexcept;
    // Ends the life of the member of kind_.
    void destroyValue() noexcept;

    // One value at a time, which the kind names. The kind is held in a byte
    // so that kind and flag share the space before the value: 40 bytes on
    // x86-64 (the text is the largest member), 28 on 32-bit x86.
    std::uint8_t kind_;
    bool flag_ = false;
    union {
        std::string string_;
        Number number_;
        EnumValue enum_;
        unsigned char byte_;
        std::vector<unsigned char> bytes_;
        std::vector<Number> numbers_;
        std::vector<std::string> strings_;
        KindType kindValue_;
    };
};

std::ostream& operator<<(std::ostream& out, PropertyValue const& value);

}  // namespace IC
