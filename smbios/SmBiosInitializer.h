// The one acquisition of the SMBIOS table per process: from the override
// dump file "SmBiosOverride/smbios.txt" under the agent's data directory
// when it is there, else from the entry point and structure table in
// physical memory. Every failure is logged and leaves an empty table.
#pragma once

#include <string>
#include <vector>

#include "QNLog/QNLogger.h"
#include "SD/PlatformUtilities.h"
#include "smbios/SmBios.h"

namespace SD {

class SmBiosInitializer : public SmBios {
public:
    SmBiosInitializer();
    ~SmBiosInitializer() override;

private:
    // Takes the override file's header and table tokens; the table tokens
    // are released once decoded.
    void acquireFromFile(std::string const& path, std::vector<std::string> const& head,
                         std::vector<std::string>& tables);
    void acquireFromMemory();
    void takeTables(std::vector<unsigned char> const& raw);
};

namespace SMBIOS_MI_INIT {
extern std::vector<unsigned char> const _empty;
extern QNLog::QNLogger loggerSmBiosInitializer;
}  // namespace SMBIOS_MI_INIT

// Dump-file import. importSmBios reads the file's tokens (0 on success, else
// the open code or 8); readHead and readTables decode the header and the
// table section; readTableLine delivers the next token (0, 8 at the end of
// the file, 32 on a state fault); byteHex appends the bytes a hexadecimal
// text spells (0, or 32 on a bad digit).
int importSmBios(std::string const& path, std::vector<std::string>& head,
                 std::vector<std::string>& tables);
int readTableLine(SD::_FileHandle* const& file, std::string& token);
int readHead(std::vector<unsigned char>& bytes, std::vector<std::string> const& head);
int readTables(std::vector<unsigned char>& bytes, std::vector<std::string> const& tables);
int byteHex(std::string const& text, std::vector<unsigned char>& bytes);

// The digit count of the first data run of the table section that readTables
// decodes with an odd number of hex digits (byteHex drops its last digit, so
// every byte after it shifts); 0 when there is none. The host uses it to
// refuse such a dump file; the acquisition itself never calls it.
size_t oddHexRun(std::vector<std::string> const& tables);

}  // namespace SD
