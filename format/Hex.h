// Hexadecimal digits, as every reader of SMBIOS text and addresses takes
// them: '0'-'9', 'a'-'f' and 'A'-'F', nothing else (no locale, no sign, no
// blank).
#pragma once

namespace smbiosformat {

// The value 0-15 of a hexadecimal digit; -1 for any other character.
int hexValue(char c);

}  // namespace smbiosformat
