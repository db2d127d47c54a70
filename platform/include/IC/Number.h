// A typed scalar of the agent framework: boolean, unsigned, double, version
// or date-time, or no value at all.
#pragma once

#include <cstdint>
#include <cstring>
#include <iosfwd>
#include <string>

#include "IC/Version2.h"

namespace IC {

class Number {
public:
    // Kind 0 carries no value; kind 9 is a date-time that is filled with the
    // current time when the number is made.
    enum KindType {
        NONE = 0,
        BOOL = 1,
        UNSIGNED = 2,
        DOUBLE = 3,
        VERSION = 4,
        DATETIME = 9,
    };

    Number();
    explicit Number(bool value);
    explicit Number(unsigned int value);
    explicit Number(double value);
    explicit Number(Version2 const& value);
    // Makes a number of the given kind: a date-time kind takes the current
    // time, every other kind its zero value.
    explicit Number(KindType kind);

    // Each getter answers for its own kind; asked about a number of another
    // kind it gives that kind's zero value (false, 0, 0.0, version 0.0).
    KindType getKind() const { return kind_; }
    bool getBool() const { return kind_ == BOOL && words_[0] != 0; }
    unsigned int getUnsigned() const { return kind_ == UNSIGNED ? words_[0] : 0u; }
    double getDouble() const { return kind_ == DOUBLE ? wide<double>() : 0.0; }
    Version2 const& getVersion() const;
    // Seconds since the epoch (date-time kind).
    std::int64_t getDateTime() const { return kind_ == DATETIME ? wide<std::int64_t>() : 0; }

    std::string toString() const;

    bool operator==(Number const& other) const;
    bool operator!=(Number const& other) const { return !(*this == other); }

private:
    // The 8 bytes of a double or date-time, kept in the two words.
    template <typename T>
    T wide() const {
        static_assert(sizeof(T) == sizeof words_, "a wide value fills both words");
        T value;
        std::memcpy(&value, words_, sizeof value);
        return value;
    }
    template <typename T>
    void setWide(T value) {
        static_assert(sizeof(T) == sizeof words_, "a wide value fills both words");
        std::memcpy(words_, &value, sizeof value);
    }

    // One value at a time, which the kind names: a version in place, every
    // other kind in the two words (a bool or an unsigned in the first, a
    // double or a date-time in both). Words rather than a double or a 64-bit
    // integer keep the alignment at 4, so a number is 12 bytes on 32-bit and
    // 64-bit x86 alike; vectors of numbers (the raw table bytes) hold many.
    KindType kind_;
    union {
        Version2 version_;
        std::uint32_t words_[2];
    };
};

std::ostream& operator<<(std::ostream& out, Number const& number);

}  // namespace IC
