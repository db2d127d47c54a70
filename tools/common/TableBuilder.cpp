#include "TableBuilder.h"

#include <algorithm>
#include <stdexcept>

namespace smbiostest {

Structure::Structure(uint8_t type, uint16_t handle) : type_(type), handle_(handle) {}

Structure& Structure::byte(uint8_t value) {
    fields_.push_back(value);
    return *this;
}

Structure& Structure::word(uint16_t value) {
    fields_.push_back(static_cast<uint8_t>(value & 0xFF));
    fields_.push_back(static_cast<uint8_t>(value >> 8));
    return *this;
}

Structure& Structure::dword(uint32_t value) {
    for (int i = 0; i < 4; ++i) {
        fields_.push_back(static_cast<uint8_t>((value >> (8 * i)) & 0xFF));
    }
    return *this;
}

Structure& Structure::qword(uint64_t value) {
    for (int i = 0; i < 8; ++i) {
        fields_.push_back(static_cast<uint8_t>((value >> (8 * i)) & 0xFF));
    }
    return *this;
}

Structure& Structure::bytes(std::vector<uint8_t> const& values) {
    fields_.insert(fields_.end(), values.begin(), values.end());
    return *this;
}

Structure& Structure::str(std::string const& text) {
    if (text.empty()) {
        return byte(0);
    }
    strings_.push_back(text);
    return byte(static_cast<uint8_t>(strings_.size()));
}

Structure& Structure::strNumber(uint8_t number) { return byte(number); }

Structure& Structure::addString(std::string const& text) {
    strings_.push_back(text);
    return *this;
}

Structure& Structure::length(uint8_t value) {
    forceLength_ = true;
    forcedLength_ = value;
    return *this;
}

Structure& Structure::noTerminator() {
    terminator_ = false;
    return *this;
}

std::vector<uint8_t> Structure::build() const {
    size_t const formatted = formattedSize();
    if (!forceLength_ && formatted > 0xFF) {
        throw std::length_error("SMBIOS structure of type " + std::to_string(type_) + " has a " +
                                std::to_string(formatted) +
                                "-byte formatted area; its length byte holds at most 255");
    }
    std::vector<uint8_t> out;
    out.reserve(formatted + 2);
    out.push_back(type_);
    out.push_back(forceLength_ ? forcedLength_ : static_cast<uint8_t>(formatted));
    out.push_back(static_cast<uint8_t>(handle_ & 0xFF));
    out.push_back(static_cast<uint8_t>(handle_ >> 8));
    out.insert(out.end(), fields_.begin(), fields_.end());
    for (std::string const& text : strings_) {
        out.insert(out.end(), text.begin(), text.end());
        out.push_back(0);
    }
    out.push_back(0);
    if (strings_.empty()) {
        out.push_back(0);
    }
    if (!terminator_) {
        out.resize(out.size() - 2);
    }
    return out;
}

TableBuilder& TableBuilder::add(Structure const& structure) {
    append(structure.build());
    return *this;
}

TableBuilder& TableBuilder::addRaw(std::vector<uint8_t> const& bytes) {
    append(bytes);
    return *this;
}

TableBuilder& TableBuilder::endOfTable(uint16_t handle) { return add(Structure(127, handle)); }

void TableBuilder::append(std::vector<uint8_t> const& bytes) {
    table_.insert(table_.end(), bytes.begin(), bytes.end());
    if (count_ < 0xFFFF) {
        ++count_;
    }
    maxSize_ =
        static_cast<uint16_t>(std::max<size_t>(maxSize_, std::min<size_t>(bytes.size(), 0xFFFF)));
}

}  // namespace smbiostest
