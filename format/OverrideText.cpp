#include "format/OverrideText.h"

#include <algorithm>

namespace smbiosformat {

namespace {

void appendHex(std::string& text, std::vector<uint8_t> const& bytes, size_t begin, size_t end) {
    static char const digits[] = "0123456789ABCDEF";
    size_t at = text.size();
    text.resize(at + 2 * (end - begin));
    for (size_t i = begin; i < end; ++i) {
        text[at++] = digits[bytes[i] >> 4];
        text[at++] = digits[bytes[i] & 0x0F];
    }
}

}  // namespace

std::string formatOverride(std::vector<uint8_t> const& header, std::vector<uint8_t> const& table,
                           size_t bytesPerLine) {
    size_t const step = bytesPerLine == 0 ? std::max<size_t>(table.size(), 1) : bytesPerLine;
    std::string text;
    // The tags, the size and the hex digits with a line end per line.
    text.reserve(128 + 2 * header.size() + 2 * table.size() + table.size() / step + 1);
    text += "<SHOWSMBIOS>\n<EPHEADER>\n";
    appendHex(text, header, 0, header.size());
    text += "\n</EPHEADER>\n<SIZE>\n";
    text += std::to_string(table.size());
    text += "\n</SIZE>\n";
    for (size_t begin = 0; begin < table.size(); begin += step) {
        size_t const end = begin + std::min(step, table.size() - begin);
        appendHex(text, table, begin, end);
        text += '\n';
    }
    text += "</SHOWSMBIOS>\n";
    return text;
}

}  // namespace smbiosformat
