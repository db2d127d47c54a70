// A two-part version number (major.minor) as the agent framework carries it.
#pragma once

namespace IC {

class Version2 {
public:
    Version2() = default;
    Version2(unsigned int majorPart, unsigned int minorPart) : majorPart_(majorPart), minorPart_(minorPart) {}

    unsigned int getMajor() const { return majorPart_; }
    unsigned int getMinor() const { return minorPart_; }

    bool operator==(Version2 const& other) const {
        return majorPart_ == other.majorPart_ && minorPart_ == other.minorPart_;
    }
    bool operator!=(Version2 const& other) const { return !(*this == other); }

private:
    unsigned int majorPart_ = 0;
    unsigned int minorPart_ = 0;
};

}  // namespace IC
