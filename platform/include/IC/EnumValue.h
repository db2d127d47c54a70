// An enumerated value of the agent framework; it remembers the width (1, 2
// or 4 bytes) of the integer it was made from.
#pragma once

#include <cstdint>
#include <iosfwd>
#include <string>

namespace IC {

class EnumValue {
public:
    EnumValue() = default;
    explicit EnumValue(unsigned char value) : value_(value), width_(1) {}
    explicit EnumValue(unsigned short value) : value_(value), width_(2) {}
    explicit EnumValue(short value) : value_(value), width_(2) {}
    explicit EnumValue(unsigned int value) : value_(value), width_(4) {}
    explicit EnumValue(int value) : value_(value), width_(4) {}

    std::int64_t getValue() const { return value_; }
    // Width in bytes of the integer the value was made from: 1, 2 or 4.
    unsigned int getWidth() const { return width_; }

    std::string toString() const;

    bool operator==(EnumValue const& other) const {
        return value_ == other.value_ && width_ == other.width_;
    }
    bool operator!=(EnumValue const& other) const { return !(*this == other); }

private:
    std::int64_t value_ = 0;
    unsigned int width_ = 4;
};

std::ostream& operator<<(std::ostream& out, EnumValue const& value);

}  // namespace IC
