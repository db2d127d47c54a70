// Arbitrary bytes as an override dump file: tokenized, its header and table
// section decoded, the decoded table parsed and every string looked up.
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "QNLog/QNLogger.h"
#include "smbios/SmBios.h"
#include "smbios/SmBiosInitializer.h"

namespace {
std::string scratchFile;
}

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    QNLog::QNLogger::setLogLevel(QNLog::LEVEL_OFF);
    QNLog::QNLogger::setTraceLevel(QNLog::LEVEL_OFF);
    char const* tmp = std::getenv("TMPDIR");
    scratchFile = std::string(tmp != nullptr ? tmp : "/tmp") + "/fuzz_import." +
                  std::to_string(static_cast<long>(getpid())) + ".txt";
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(uint8_t const* data, size_t size) {
    FILE* file = std::fopen(scratchFile.c_str(), "wb");
    if (file == nullptr) {
        return 0;
    }
    std::fwrite(data, 1, size, file);
    std::fclose(file);

    std::vector<std::string> head;
    std::vector<std::string> tables;
    if (SD::importSmBios(scratchFile, head, tables) == 0) {
        std::vector<unsigned char> header;
        SD::readHead(header, head);
        std::vector<unsigned char> raw;
        if (SD::readTables(raw, tables) == 0) {
            SD::SmBios parsed(raw);
            for (SD::SmBios::Table const& t : parsed.getTables()) {
                for (unsigned int i = 0; i <= t.getStrCount() && i < 256; ++i) {
                    try {
                        t.getString(static_cast<unsigned char>(i));
                    } catch (std::out_of_range const&) {
                    }
                }
            }
        }
    }
    std::remove(scratchFile.c_str());
    return 0;
}
