#include "DumpFormat.h"

#include "format/Hex.h"

namespace smbiosdump {

namespace {

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
        if (smbiosformat::hexValue(c) >= 0) {
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
            } else if (smbiosformat::hexValue(c) >= 0) {
                if (high) {
                    token.bytes.push_back(static_cast<uint8_t>(smbiosformat::hexValue(c) << 4));
                } else {
                    token.bytes.back() =
                        static_cast<uint8_t>(token.bytes.back() | smbiosformat::hexValue(c));
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

bool parseOverride(std::string const& text, std::vector<uint8_t>& header,
                   std::vector<uint8_t>& table, std::string& error) {
    OverrideReader reader(text);
    OverrideReader::Token token;
    auto expectTag = [&](char const* tag) {
        if (!reader.next(token, error)) {
            return false;
        }
        if (token.kind != OverrideReader::Token::TAG || token.tag != tag) {
            error =
                OverrideReader::at(token.line) + "expected <" + tag + ">, found " + describe(token);
            return false;
        }
        return true;
    };

    if (!expectTag("SHOWSMBIOS") || !expectTag("EPHEADER")) {
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
    std::vector<uint8_t> newHeader = std::move(token.bytes);
    if (!expectTag("/EPHEADER")) {
        return false;
    }

    std::vector<uint8_t> newTable;
    bool sawSize = false;
    for (;;) {
        if (!reader.next(token, error)) {
            return false;
        }
        if (token.kind == OverrideReader::Token::DATA) {
            newTable.insert(newTable.end(), token.bytes.begin(), token.bytes.end());
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
            if (!expectTag("/SIZE")) {
                return false;
            }
            continue;
        }
        error = OverrideReader::at(token.line) + "unexpected tag " + describe(token) +
                " in the table section";
        return false;
    }
    if (newTable.empty()) {
        error = OverrideReader::at(token.line) + "the table section holds no data";
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
