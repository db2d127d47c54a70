#include "format/OverrideText.h"

#include <algorithm>

namespace smbiosformat {

namespace {

void appendHex(std::string& text, std::vector<uint8_t> const& bytes, size_t begin, size_t end) {
    static char const digits[] = "0123456789ABCDEF";
    for (size_t i = begin; i < end; ++i) {
        text += digits[bytes[i] >> 4];
        text += digits[bytes[i] & 0x0F];
    }
}

}  // namespace

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

}  // namespace smbiosformat
