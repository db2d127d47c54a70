// Builds SMBIOS structures and tables byte by byte for tests and example
// files. A structure is its formatted area (type, length, handle, fields)
// followed by its string set; string fields hold 1-based string numbers.
//
//   smbiostest::TableBuilder table;
//   table.add(smbiostest::Structure(1, 0x0001).str("Corvane").str("RS-7400").byte(6));
//   table.endOfTable(0x0002);
//   std::vector<uint8_t> bytes = table.build();
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace smbiostest {

class Structure {
public:
    Structure(uint8_t type, uint16_t handle);

    // Fields of the formatted area, appended in order, little-endian.
    Structure& byte(uint8_t value);
    Structure& word(uint16_t value);
    Structure& dword(uint32_t value);
    Structure& qword(uint64_t value);
    Structure& bytes(std::vector<uint8_t> const& values);
    // A string field: appends the text to the string set and writes its
    // number. "" writes 0 (no string) and adds nothing. Equal texts given
    // twice become two strings.
    Structure& str(std::string const& text);
    // A string-number field written as it is (it may name no string).
    Structure& strNumber(uint8_t number);
    // A string in the set that no field names. An empty text is added as it
    // is, which ends the set early: for malformed-table tests.
    Structure& addString(std::string const& text);
    // Writes this value into the length byte instead of the computed one;
    // the fields are written in full all the same.
    Structure& length(uint8_t value);
    // Leaves out the closing double NUL: the structure ends right after its
    // last string's text, or after its formatted area when it has no
    // strings. For truncated-table tests.
    Structure& noTerminator();

    uint8_t type() const { return type_; }
    uint16_t handle() const { return handle_; }
    // Formatted area size: 4 plus the fields.
    size_t formattedSize() const { return 4 + fields_.size(); }
    size_t stringCount() const { return strings_.size(); }

    // The structure's bytes. Throws std::length_error when the formatted area
    // exceeds 255 bytes and no length was forced.
    std::vector<uint8_t> build() const;

private:
    uint8_t type_;
    uint16_t handle_;
    std::vector<uint8_t> fields_;
    std::vector<std::string> strings_;
    bool forceLength_ = false;
    uint8_t forcedLength_ = 0;
    bool terminator_ = true;
};

class TableBuilder {
public:
    TableBuilder& add(Structure const& structure);
    // Bytes appended as they are; counted as one structure.
    TableBuilder& addRaw(std::vector<uint8_t> const& bytes);
    // Adds the end-of-table structure (type 127, no fields, no strings).
    TableBuilder& endOfTable(uint16_t handle);

    std::vector<uint8_t> build() const { return table_; }
    // The number of add, addRaw and endOfTable calls.
    uint16_t count() const { return count_; }
    // The largest piece added, in bytes.
    uint16_t maxSize() const { return maxSize_; }
    size_t size() const { return table_.size(); }

private:
    void append(std::vector<uint8_t> const& bytes);

    std::vector<uint8_t> table_;
    uint16_t count_ = 0;
    uint16_t maxSize_ = 0;
};

}  // namespace smbiostest
