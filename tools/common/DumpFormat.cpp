#include "DumpFormat.h"

#include <algorithm>
#include <cstring>

#include "format/EntryPoint.h"

namespace smbiosdump {

using namespace smbiosformat;

namespace {

bool startsWith(std::vector<uint8_t> const& bytes, size_t offset, char const* anchor) {
    size_t const n = std::strlen(anchor);
    if (bytes.size() < offset || bytes.size() - offset < n) {
        return false;
    }
    return std::memcmp(bytes.data() + offset, anchor, n) == 0;
}

std::string hex(uint64_t value) {
    static char const digits[] = "0123456789ABCDEF";
    std::string text;
    do {
        text.insert(text.begin(), digits[value & 0xF]);
        value >>= 4;
    } while (value != 0);
    if (text.size() % 2 != 0) {
        text.insert(text.begin(), '0');
    }
    return "0x" + text;
}

// The table of `length` bytes at `address` in the image, when it lies
// wholly inside the file.
bool cutTable(std::vector<uint8_t> const& file, uint64_t address, uint64_t length,
              std::vector<uint8_t>& table, std::string& error) {
    uint64_t const size = file.size();
    if (length == 0) {
        error = "the entry point gives an empty structure table";
        return false;
    }
    if (address > size || length > size - address) {
        error = "structure table of " + std::to_string(length) + " bytes at " + hex(address) +
                " runs past the end of the " + std::to_string(size) + "-byte file";
        return false;
    }
    table.assign(file.begin() + static_cast<std::ptrdiff_t>(address),
                 file.begin() + static_cast<std::ptrdiff_t>(address + length));
    return true;
}

std::string tooShort(std::vector<uint8_t> const& file, size_t needed, char const* anchor) {
    return "file of " + std::to_string(file.size()) + " bytes is too short for the " +
           std::to_string(needed) + "-byte " + anchor + " entry point";
}

bool readSm(std::vector<uint8_t> const& file, DumpImage& image, std::string& error) {
    if (file.size() < SM_ENTRY_POINT_SIZE) {
        error = tooShort(file, SM_ENTRY_POINT_SIZE, "_SM_");
        return false;
    }
    uint8_t const length = file[5];
    // 0x1E is accepted as well: some firmware states it for the 31-byte
    // entry point.
    if (length < 0x1E) {
        error = "_SM_ entry point length " + hex(length) + " is below 0x1E";
        return false;
    }
    if (!startsWith(file, 0x10, "_DMI_")) {
        error = "_SM_ entry point has no _DMI_ anchor at offset 0x10";
        return false;
    }
    size_t const headerSize = std::min<size_t>(length, file.size());
    image.header.assign(file.begin(), file.begin() + static_cast<std::ptrdiff_t>(headerSize));
    image.major = file[6];
    image.minor = file[7];
    return cutTable(file, getDword(file, 0x18), getWord(file, 0x16), image.table, error);
}

bool readDmi(std::vector<uint8_t> const& file, DumpImage& image, std::string& error) {
    if (file.size() < DMI_ENTRY_POINT_SIZE) {
        error = tooShort(file, DMI_ENTRY_POINT_SIZE, "_DMI_");
        return false;
    }
    image.header.assign(file.begin(),
                        file.begin() + static_cast<std::ptrdiff_t>(DMI_ENTRY_POINT_SIZE));
    uint8_t const bcd = file[14];
    image.major = static_cast<uint8_t>(bcd >> 4);
    image.minor = static_cast<uint8_t>(bcd & 0x0F);
    return cutTable(file, getDword(file, 8), getWord(file, 6), image.table, error);
}

bool readSm3(std::vector<uint8_t> const& file, DumpImage& image, std::string& error) {
    if (file.size() < SM3_ENTRY_POINT_SIZE) {
        error = tooShort(file, SM3_ENTRY_POINT_SIZE, "_SM3_");
        return false;
    }
    uint8_t const length = file[6];
    if (length < SM3_ENTRY_POINT_SIZE) {
        error = "_SM3_ entry point length " + hex(length) + " is below 0x18";
        return false;
    }
    uint64_t const maxSize = getDword(file, 0x0C);
    uint64_t const address = getQword(file, 0x10);
    uint64_t const size = file.size();
    if (maxSize == 0) {
        error = "the entry point gives an empty structure table";
        return false;
    }
    if (address >= size) {
        error = "structure table at " + hex(address) + " starts past the end of the " +
                std::to_string(size) + "-byte file";
        return false;
    }
    // The maximum size is an upper bound: take what the file holds of it.
    uint64_t const tableSize = std::min(maxSize, size - address);
    if (tableSize > 0xFFFF) {
        error = "SMBIOS 3.x table of " + std::to_string(tableSize) +
                " bytes does not fit a 2.x entry point";
        return false;
    }
    if (!cutTable(file, address, tableSize, image.table, error)) {
        return false;
    }
    image.major = file[7];
    image.minor = file[8];
    TableStats const stats = tableStats(image.table);
    image.header = makeSmEntryPoint(image.major, image.minor, static_cast<uint16_t>(tableSize),
                                    DUMP_BIN_TABLE_OFFSET, stats.count, stats.maxSize);
    return true;
}

bool isHexDigit(char c) {
    return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

uint8_t hexValue(char c) {
    if (c >= '0' && c <= '9') {
        return static_cast<uint8_t>(c - '0');
    }
    if (c >= 'a' && c <= 'f') {
        return static_cast<uint8_t>(c - 'a' + 10);
    }
    return static_cast<uint8_t>(c - 'A' + 10);
}

void appendHex(std::string& text, std::vector<uint8_t> const& bytes, size_t begin, size_t end) {
    static char const digits[] = "0123456789ABCDEF";
    for (size_t i = begin; i < end; ++i) {
        text += digits[bytes[i] >> 4];
        text += digits[bytes[i] & 0x0F];
    }
}

// Reads the override text token by token.
class OverrideReader {
public:
    struct Token {
        enum Kind { END, TAG, DATA } kind = END;
        std::string tag;  // upper case, blanks removed
        std::vector<uint8_t> bytes;
        size_t line = 0;
    };

    explicit OverrideReader(std::string const& text) : text_(text) {}

    // The next token, or false with a message on a lexical error.
    bool next(Token& token, std::string& error) {
        skipSpace();
        token = Token();
        token.line = line_;
        if (pos_ >= text_.size()) {
            token.kind = Token::END;
            return true;
        }
        char const c = text_[pos_];
        if (c == '<') {
            return readTag(token, error);
        }
        if (isHexDigit(c)) {
            return readData(token, error);
        }
        error = at(line_) + unexpected(c);
        return false;
    }

    // Skips the content of a <SIZE> block: everything up to the next tag.
    void skipToTag() {
        while (pos_ < text_.size() && text_[pos_] != '<') {
            if (text_[pos_] == '\n') {
                ++line_;
            }
            ++pos_;
        }
    }

    static std::string at(size_t line) { return "line " + std::to_string(line) + ": "; }

private:
    void skipSpace() {
        while (pos_ < text_.size() && (text_[pos_] == ' ' || text_[pos_] == '\n')) {
            if (text_[pos_] == '\n') {
                ++line_;
            }
            ++pos_;
        }
    }

    static std::string unexpected(char c) {
        auto const u = static_cast<unsigned char>(c);
        if (u > 0x20 && u < 0x7F) {
            return std::string("unexpected character '") + c + "'";
        }
        return "unexpected character " + hex(u);
    }

    bool readTag(Token& token, std::string& error) {
        token.kind = Token::TAG;
        ++pos_;  // '<'
        while (pos_ < text_.size() && text_[pos_] != '>') {
            char const c = text_[pos_];
            if (c == '\n') {
                error = at(line_) + "tag not closed on its line";
                return false;
            }
            if (c == '<') {
                error = at(line_) + "'<' inside a tag";
                return false;
            }
            if (c != ' ') {
                token.tag += (c >= 'a' && c <= 'z') ? static_cast<char>(c - 'a' + 'A') : c;
            }
            ++pos_;
        }
        if (pos_ >= text_.size()) {
            error = at(line_) + "tag not closed at the end of the file";
            return false;
        }
        ++pos_;  // '>'
        return true;
    }

    bool readData(Token& token, std::string& error) {
        token.kind = Token::DATA;
        bool high = true;
        while (pos_ < text_.size()) {
            char const c = text_[pos_];
            if (c == '<') {
                break;
            }
            if (c == ' ' || c == '\n') {
                if (c == '\n') {
                    ++line_;
                }
            } else if (isHexDigit(c)) {
                if (high) {
                    token.bytes.push_back(static_cast<uint8_t>(hexValue(c) << 4));
                } else {
                    token.bytes.back() = static_cast<uint8_t>(token.bytes.back() | hexValue(c));
                }
                high = !high;
            } else {
                error = at(line_) + unexpected(c) + " in a data run";
                return false;
            }
            ++pos_;
        }
        if (!high) {
            error = at(token.line) + "data run has an odd number of hex digits";
            return false;
        }
        return true;
    }

    std::string const& text_;
    size_t pos_ = 0;
    size_t line_ = 1;
};

std::string describe(OverrideReader::Token const& token) {
    switch (token.kind) {
        case OverrideReader::Token::END:
            return "the end of the file";
        case OverrideReader::Token::TAG:
            return "<" + token.tag + ">";
        case OverrideReader::Token::DATA:
            break;
    }
    return "a data run";
}

}  // namespace

bool readDumpBin(std::vector<uint8_t> const& file, DumpImage& out, std::string& error) {
    DumpImage image;
    bool ok = false;
    if (startsWith(file, 0, "_SM3_")) {
        image.anchor = "_SM3_";
        ok = readSm3(file, image, error);
    } else if (startsWith(file, 0, "_SM_")) {
        image.anchor = "_SM_";
        ok = readSm(file, image, error);
    } else if (startsWith(file, 0, "_DMI_")) {
        image.anchor = "_DMI_";
        ok = readDmi(file, image, error);
    } else if (file.size() < 5) {
        error = "file of " + std::to_string(file.size()) + " bytes is too short for an entry point";
    } else {
        error = "no entry point anchor (_SM_, _SM3_ or _DMI_) at offset 0";
    }
    if (ok) {
        out = std::move(image);
    }
    return ok;
}

std::string formatOverride(std::vector<uint8_t> const& header, std::vector<uint8_t> const& table,
                           size_t bytesPerLine) {
    std::string text = "<SHOWSMBIOS>\n<EPHEADER>\n";
    appendHex(text, header, 0, header.size());
    text += "\n</EPHEADER>\n<SIZE>\n";
    text += std::to_string(table.size());
    text += "\n</SIZE>\n";
    size_t const step = bytesPerLine == 0 ? std::max<size_t>(table.size(), 1) : bytesPerLine;
    for (size_t begin = 0; begin < table.size(); begin += step) {
        size_t const end = begin + std::min(step, table.size() - begin);
        appendHex(text, table, begin, end);
        text += '\n';
    }
    text += "</SHOWSMBIOS>\n";
    return text;
}

namespace {

// Reads the next token, which must be the tag <tag>.
bool expectTag(OverrideReader& reader, OverrideReader::Token& token, char const* tag,
               std::string& error) {
    if (!reader.next(token, error)) {
        return false;
    }
    if (token.kind != OverrideReader::Token::TAG || token.tag != tag) {
        error = OverrideReader::at(token.line) + "expected <" + tag + ">, found " + describe(token);
        return false;
    }
    return true;
}

// <SHOWSMBIOS><EPHEADER>, the entry point's bytes, </EPHEADER>.
bool readHeaderSection(OverrideReader& reader, OverrideReader::Token& token,
                       std::vector<uint8_t>& header, std::string& error) {
    if (!expectTag(reader, token, "SHOWSMBIOS", error) ||
        !expectTag(reader, token, "EPHEADER", error)) {
        return false;
    }
    if (!reader.next(token, error)) {
        return false;
    }
    if (token.kind != OverrideReader::Token::DATA) {
        error = OverrideReader::at(token.line) + "expected the entry point's bytes, found " +
                describe(token);
        return false;
    }
    header = std::move(token.bytes);
    return expectTag(reader, token, "/EPHEADER", error);
}

// The table's bytes up to and including </SHOWSMBIOS>, with at most one
// <SIZE> block among them (its content skipped); at least one byte.
bool readTableSection(OverrideReader& reader, OverrideReader::Token& token,
                      std::vector<uint8_t>& table, std::string& error) {
    bool sawSize = false;
    for (;;) {
        if (!reader.next(token, error)) {
            return false;
        }
        if (token.kind == OverrideReader::Token::DATA) {
            table.insert(table.end(), token.bytes.begin(), token.bytes.end());
            continue;
        }
        if (token.kind == OverrideReader::Token::END) {
            error = OverrideReader::at(token.line) + "the file ends without </SHOWSMBIOS>";
            return false;
        }
        if (token.tag == "/SHOWSMBIOS") {
            break;
        }
        if (token.tag == "SIZE") {
            if (sawSize) {
                error = OverrideReader::at(token.line) + "a second <SIZE> block";
                return false;
            }
            sawSize = true;
            reader.skipToTag();
            if (!expectTag(reader, token, "/SIZE", error)) {
                return false;
            }
            continue;
        }
        error = OverrideReader::at(token.line) + "unexpected tag " + describe(token) +
                " in the table section";
        return false;
    }
    if (table.empty()) {
        error = OverrideReader::at(token.line) + "the table section holds no data";
        return false;
    }
    return true;
}

}  // namespace

bool parseOverride(std::string const& text, std::vector<uint8_t>& header,
                   std::vector<uint8_t>& table, std::string& error) {
    OverrideReader reader(text);
    OverrideReader::Token token;
    std::vector<uint8_t> newHeader;
    std::vector<uint8_t> newTable;
    if (!readHeaderSection(reader, token, newHeader, error) ||
        !readTableSection(reader, token, newTable, error)) {
        return false;
    }
    if (!reader.next(token, error)) {
        return false;
    }
    if (token.kind != OverrideReader::Token::END) {
        error = OverrideReader::at(token.line) + describe(token) + " after </SHOWSMBIOS>";
        return false;
    }
    header = std::move(newHeader);
    table = std::move(newTable);
    return true;
}

}  // namespace smbiosdump
