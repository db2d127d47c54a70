// A typed scalar of the agent framework: boolean, unsigned, double, version
// or date-time, or no value at all.
#pragma once

#include <cstdint>
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

    KindType getKind() const { return kind_; }
    bool getBool() const { return boolValue_; }
    unsigned int getUnsigned() const { return unsignedValue_; }
    double getDouble() const { return doubleValue_; }
    Version2 const& getVersion() const { return versionValue_; }
    // Seconds since the epoch (date-time kind).
    std::int64_t getDateTime() const { return dateTimeValue_; }

    std::string toString() const;

    bool operator==(Number const& other) const;
    bool operator!=(Number const& other) const { return !(*this == other); }

private:
    KindType kind_;
    bool boolValue_ = false;
    unsigned int unsignedValue_ = 0;
    double doubleValue_ = 0.0;
    Version2 versionValue_;
    std::int64_t dateTimeValue_ = 0;
};

std::ostream& operator<<(std::ostream& out, Number const& number);

}  // namespace IC
