// Conversions between narrow and wide strings. Each byte becomes one wide
// character of the same value and back, so any byte string survives the
// round trip unchanged.
#pragma once

#include <string>

namespace SD {

std::string make_string(std::wstring const& text);
std::wstring make_wstring(std::string const& text);

}  // namespace SD
