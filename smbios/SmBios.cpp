#include "smbios/SmBios.h"

#include <string>

#include "format/EntryPoint.h"
#include "smbios/Logging.h"
#include "smbios/SmBiosInitializer.h"

namespace SD {

namespace SMBIOS_CLASS {
SD::Mutex _initMutex;
SmBiosInitializer* _smbios = nullptr;
QNLog::QNLogger loggerSmBios("Quillon.IC.SmBios");

namespace {
// The acquisition is kept for the life of the process, which for a plug-in
// ends when the agent unloads it: then it is released, so that a load,
// initialize and unload cycle leaves nothing behind. Defined after the
// mutex, so it goes first when the statics are destroyed.
struct ReleaseAtUnload {
    ~ReleaseAtUnload() {
        delete _smbios;
        _smbios = nullptr;
    }
} releaseAtUnload;
}  // namespace
}  // namespace SMBIOS_CLASS

using SMBIOS_CLASS::loggerSmBios;

SmBios::Table::Table() = default;

SmBios::Table::Table(std::vector<unsigned char> const& bytes) : Table(bytes.data(), bytes.size()) {}

namespace {

// Where the string set that starts at bytes[start] ends: the position of its
// double NUL, or size when the bytes run out first (a missing byte after the
// last one counts as the end). nulCount is the number of NULs before it,
// each the end of one string.
size_t stringSetEnd(unsigned char const* bytes, size_t size, size_t start, unsigned int& nulCount) {
    nulCount = 0;
    size_t p = start;
    for (; p < size; ++p) {
        if (bytes[p] == 0 && (p + 1 >= size || bytes[p + 1] == 0)) {
            break;
        }
        if (bytes[p] == 0) {
            ++nulCount;
        }
    }
    return p;
}

// The size a structure parsed from bytes[0, size) gets: its formatted area
// as its length byte says (bounded by what is there), the string set's
// bytes, and the two NULs appended. 0 when fewer than four bytes are left.
size_t parsedSize(unsigned char const* bytes, size_t size) {
    if (size <= 3) {
        return 0;
    }
    size_t const length = bytes[1];
    size_t const formatted = length < size ? length : size;
    unsigned int nulCount = 0;
    size_t const end = stringSetEnd(bytes, size, length, nulCount);
    return formatted + (end > length ? end - length : 0) + 2;
}

}  // namespace

// Parses one structure from bytes[0, size): the formatted area as its length
// byte says (bounded by what is there), then the string set up to its double
// NUL, where a missing byte after the last one counts as the end. Each NUL
// inside the set ends one string; the count is one more than those, so an
// empty string set still counts one (empty) string. The data is allocated
// once, at its size.
SmBios::Table::Table(unsigned char const* bytes, size_t size) {
    if (size <= 3) {
        SMBIOS_DETAIL(loggerSmBios, "Table::Constructor vector<Byte> too small return");
        return;
    }
    type_ = bytes[0];
    length_ = bytes[1];
    handle_ = static_cast<unsigned short>(bytes[2] + 256u * bytes[3]);
    size_t const formatted = length_ < size ? length_ : size;
    unsigned int nulCount = 0;
    size_t const end = stringSetEnd(bytes, size, length_, nulCount);
    data_.reserve(parsedSize(bytes, size));
    data_.assign(bytes, bytes + formatted);
    if (end > length_) {
        data_.insert(data_.end(), bytes + length_, bytes + end);
    }
    strCount_ = nulCount + 1;
    data_.push_back(0);
    data_.push_back(0);
    SMBIOS_DETAIL(loggerSmBios, "Table::Constructor vector<Byte> good return");
}

SmBios::Table::~Table() = default;

// Kept: a byte is bounded by the whole structure, strings included, a word
// by the formatted area only; the builders' reads of the last fields rely on
// the difference.
unsigned char SmBios::Table::getByte(unsigned char off) const {
    if (off >= data_.size()) {
        throw std::out_of_range("");
    }
    return data_[off];
}

namespace {

// Throws std::out_of_range unless the `width` bytes at off lie inside both
// the formatted area (length) and the bytes held.
void checkField(unsigned char off, unsigned int width, unsigned int length, std::size_t held) {
    if (off + width > length || off + width > held) {
        throw std::out_of_range("");
    }
}

}  // namespace

unsigned short SmBios::Table::getWord(unsigned char off) const {
    checkField(off, 2, length_, data_.size());
    return smbiosformat::getWord(data_, off);
}

std::uint32_t SmBios::Table::getDWord(unsigned char off) const {
    checkField(off, 4, length_, data_.size());
    return smbiosformat::getDword(data_, off);
}

std::uint64_t SmBios::Table::getQWord(unsigned char off) const {
    checkField(off, 8, length_, data_.size());
    return smbiosformat::getQword(data_, off);
}

unsigned char SmBios::Table::getByteUnprot(unsigned int off) const {
    return off < data_.size() ? data_[off] : 0;
}

unsigned short SmBios::Table::getWordUnprot(unsigned int off) const {
    return static_cast<unsigned short>(getByteUnprot(off) | (getByteUnprot(off + 1) << 8));
}

SmBios::String SmBios::Table::getString(unsigned char index) const {
    if (index == 0) {
        SMBIOS_DETAIL(loggerSmBios, "Table::getString index 0, return null char* ponter");
        return nullptr;
    }
    if (index > strCount_) {
        SMBIOS_DETAIL(loggerSmBios, "Table::getString index " << static_cast<unsigned int>(index)
                                                              << " > max of " << strCount_
                                                              << " return null char* pointer");
        return nullptr;
    }
    // The string set starts right after the formatted area; the last byte of
    // the data is the limit no string may start at.
    size_t const limit = data_.empty() ? 0 : data_.size() - 1;
    size_t pos = length_;
    bool found = pos < limit;
    for (unsigned int skip = 1; found && skip < index; ++skip) {
        while (pos < limit && data_[pos] != 0) {
            ++pos;
        }
        if (pos < limit) {
            ++pos;
        }
        found = pos < limit;
    }
    if (!found) {
        SMBIOS_ERROR(loggerSmBios, "Table::getString throw out of range exception");
        throw std::out_of_range("");
    }
    String result = reinterpret_cast<String>(&data_[pos]);
    SMBIOS_DETAIL(loggerSmBios, "Table::getString return good string " << result);
    return result;
}

SmBios::SmBios() {
    SMBIOS_DETAIL(loggerSmBios, "Constructor (void) entry");
    SMBIOS_CLASS::_initMutex.lock(-1);
    try {
        if (SMBIOS_CLASS::_smbios == nullptr) {
            SMBIOS_CLASS::_smbios = new SmBiosInitializer();
        }
    } catch (...) {
        SMBIOS_CLASS::_initMutex.unlock();
        throw;
    }
    majorVersion_ = SMBIOS_CLASS::_smbios->getMajorVersion();
    minorVersion_ = SMBIOS_CLASS::_smbios->getMinorVersion();
    revision_ = SMBIOS_CLASS::_smbios->getRevision();
    tables_ = SMBIOS_CLASS::_smbios->getTables();
    SMBIOS_CLASS::_initMutex.unlock();
    SMBIOS_DETAIL(loggerSmBios, "Constructor (void) exit");
}

SmBios::SmBios(std::vector<unsigned char> const& raw) {
    SMBIOS_DETAIL(loggerSmBios, "Constructor (const vector<Byte>) entry");
    // Each structure is parsed from the remainder of the raw bytes and the
    // position advances by the size of its data. Parsing ends when fewer than
    // four bytes are left, or when a last structure without a string set got
    // a terminator appended that carries the position past the end.
    //
    // The structures are counted first, so that the list is allocated once
    // at its size: a large table of small structures costs no more than it
    // holds.
    size_t count = 0;
    for (size_t pos = 0; pos < raw.size();) {
        size_t const size = parsedSize(raw.data() + pos, raw.size() - pos);
        if (size == 0) {
            break;
        }
        pos += size;
        ++count;
    }
    tables_.reserve(count);
    size_t pos = 0;
    while (pos < raw.size()) {
        Table table(raw.data() + pos, raw.size() - pos);
        if (table.getData().empty()) {
            break;
        }
        pos += table.getData().size();
        tables_.push_back(std::move(table));
    }
    SMBIOS_DETAIL(loggerSmBios, "Constructor (const vector<Byte>) exit");
}

SmBios::SmBios(SmBios const& other)
    : majorVersion_(other.majorVersion_),
      minorVersion_(other.minorVersion_),
      revision_(other.revision_),
      tables_(other.tables_) {
    SMBIOS_DETAIL(loggerSmBios, "Constructor (const SmBios) entry");
    SMBIOS_DETAIL(loggerSmBios, "Constructor (const SmBios) exit");
}

SmBios::~SmBios() { SMBIOS_DETAIL(loggerSmBios, "Destructor  entry-exit"); }

SmBios::Table& SmBios::operator[](unsigned char pos) { return tables_[pos]; }

// Kept: the result is the count of tables from the first match on, not its
// position; the frame groups tables itself and never indexes with it.
unsigned char SmBios::find(unsigned char type) {
    unsigned int const shown = type;
    SMBIOS_DETAIL(loggerSmBios, "find " << shown << " entry");
    for (size_t pos = 0; pos < tables_.size(); ++pos) {
        if (tables_[pos].getType() == type) {
            SMBIOS_DETAIL(loggerSmBios, "find " << shown << " return found");
            return static_cast<unsigned char>(tables_.size() - pos);
        }
    }
    SMBIOS_DETAIL(loggerSmBios, "find " << shown << " return not found");
    return 255;
}

bool _sort_criterion_handle(SmBios::Table const& a, SmBios::Table const& b) {
    return a.getHandle() < b.getHandle();
}

namespace {

// Each item as "<item>", between the entry and return lines that name the
// list's type.
template <typename Item, typename Show>
std::ostream& writeList(std::ostream& out, std::vector<Item> const& items, char const* type,
                        Show show) {
    SMBIOS_DETAIL(loggerSmBios, "<< entry vector<SmBios::" << type << ">");
    for (Item const& item : items) {
        out << "<";
        show(item);
        out << ">";
    }
    SMBIOS_DETAIL(loggerSmBios, "<< return vector<SmBios::" << type << "> =");
    return out;
}

}  // namespace

std::ostream& operator<<(std::ostream& out, std::vector<SmBios::Byte> const& bytes) {
    return writeList(out, bytes, "Byte",
                     [&](SmBios::Byte b) { out << static_cast<unsigned int>(b); });
}

std::ostream& operator<<(std::ostream& out, std::vector<SmBios::Word> const& words) {
    return writeList(out, words, "Word",
                     [&](SmBios::Word w) { out << static_cast<unsigned int>(w); });
}

std::ostream& operator<<(std::ostream& out, std::vector<SmBios::String> const& strings) {
    return writeList(out, strings, "String",
                     [&](SmBios::String s) { out << (s != nullptr ? s : ""); });
}

}  // namespace SD
