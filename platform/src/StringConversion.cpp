// SD::make_string / SD::make_wstring: byte-for-character conversions.
#include "SD/StringConversion.h"

#include <cstdint>

namespace SD {

std::string make_string(std::wstring const& text) {
    std::string result;
    result.reserve(text.size());
    for (wchar_t c : text) {
        // Keep the low byte; wide text made by make_wstring holds only bytes.
        result +=
            static_cast<char>(static_cast<unsigned char>(static_cast<std::uint32_t>(c) & 0xffu));
    }
    return result;
}

std::wstring make_wstring(std::string const& text) {
    std::wstring result;
    result.reserve(text.size());
    for (char c : text) {
        result += static_cast<wchar_t>(static_cast<unsigned char>(c));
    }
    return result;
}

}  // namespace SD
