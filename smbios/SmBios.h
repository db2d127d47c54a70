// The in-memory model of the machine's SMBIOS structure table: the SMBIOS
// version and the structures, in ascending handle order. The table is
// acquired once per process (from the override dump file or from physical
// memory); every SmBios made afterwards is a copy of that acquisition.
#pragma once

#include <cstddef>
#include <cstdint>
#include <ostream>
#include <stdexcept>
#include <vector>

#include "QNLog/QNLogger.h"
#include "SD/Mutex.h"

namespace SD {

class SmBiosInitializer;

class SmBios {
public:
    typedef unsigned char Byte;
    typedef unsigned short Word;
    typedef char const* String;

    // One structure: a formatted area (type, length, handle, fields)
    // followed by its string set.
    class Table {
    public:
        Table();
        // Parses one structure from the front of bytes.
        explicit Table(std::vector<unsigned char> const& bytes);
        virtual ~Table();
        Table(Table const&) = default;
        Table& operator=(Table const&) = default;
        Table(Table&&) = default;
        Table& operator=(Table&&) = default;

        unsigned char getType() const { return type_; }
        unsigned char getLength() const { return length_; }
        unsigned short getHandle() const { return handle_; }
        unsigned int getStrCount() const { return strCount_; }
        std::vector<unsigned char> const& getData() const { return data_; }

        // Bounded by the whole structure, string set included.
        unsigned char getByte(unsigned char off) const;
        // Bounded by the formatted area: off + width must not pass the length.
        unsigned short getWord(unsigned char off) const;
        std::uint32_t getDWord(unsigned char off) const;
        std::uint64_t getQWord(unsigned char off) const;
        // No length check; a byte beyond the structure's data reads as 0.
        unsigned char getByteUnprot(unsigned int off) const;
        unsigned short getWordUnprot(unsigned int off) const;
        // The index-th string (1-based), null for index 0 or an index above
        // the string count; std::out_of_range when the string set runs out.
        String getString(unsigned char index) const;

    private:
        friend class SmBios;
        Table(unsigned char const* bytes, size_t size);

        unsigned char type_ = 0;
        unsigned char length_ = 0;
        unsigned short handle_ = 0;
        unsigned int strCount_ = 0;
        std::vector<unsigned char> data_;
    };

    // The table of this machine (or of the override dump file).
    SmBios();
    // Parses a raw structure table; the version bytes are 0.
    explicit SmBios(std::vector<unsigned char> const& raw);
    SmBios(SmBios const& other);
    virtual ~SmBios();
    SmBios& operator=(SmBios const&) = default;

    std::vector<Table> const& getTables() const { return tables_; }
    unsigned char getMajorVersion() const { return majorVersion_; }
    unsigned char getMinorVersion() const { return minorVersion_; }
    unsigned char getRevision() const { return revision_; }

    // The table at a position, unchecked: the caller keeps pos below the count.
    Table& operator[](unsigned char pos);
    // For the first table of the type: the number of tables minus its
    // position (so the first table gives the count and the last gives 1),
    // truncated to 8 bits; 255 when no table has the type. Not an index.
    unsigned char find(unsigned char type);

protected:
    // The acquisition moves a parsed table's structures into itself.
    friend class SmBiosInitializer;

    unsigned char majorVersion_ = 0;
    unsigned char minorVersion_ = 0;
    unsigned char revision_ = 0;
    std::vector<Table> tables_;
};

// Ascending handle, the order of the tables after acquisition.
bool _sort_criterion_handle(SmBios::Table const& a, SmBios::Table const& b);

// Each element as "<" element ">": numbers in the stream's base, strings as text.
std::ostream& operator<<(std::ostream& out, std::vector<SmBios::Byte> const& bytes);
std::ostream& operator<<(std::ostream& out, std::vector<SmBios::Word> const& words);
std::ostream& operator<<(std::ostream& out, std::vector<SmBios::String> const& strings);

namespace SMBIOS_CLASS {
// Guards the first acquisition of the process.
extern SD::Mutex _initMutex;
// The one acquisition, null until the first SmBios() completes it;
// released when the library is unloaded.
extern SmBiosInitializer* _smbios;
extern QNLog::QNLogger loggerSmBios;
}  // namespace SMBIOS_CLASS

}  // namespace SD
