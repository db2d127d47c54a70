#include "smbios/SmBiosInitializer.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <exception>
#include <memory>
#include <typeinfo>

#include "format/EntryPoint.h"
#include "format/Hex.h"
#include "format/OverrideText.h"
#include "smbios/Logging.h"
#include "smbios/PMem.h"

namespace SD {

namespace SMBIOS_MI_INIT {
std::vector<unsigned char> const _empty;
QNLog::QNLogger loggerSmBiosInitializer("Quillon.IC.SmBios.SmBiosInitializer");
}  // namespace SMBIOS_MI_INIT

using SMBIOS_MI_INIT::loggerSmBiosInitializer;

namespace {

// Entry-point layouts (offsets from the anchor).
unsigned int const SM_LENGTH = 0x05;
unsigned int const SM_MAJOR = 0x06;
unsigned int const SM_MINOR = 0x07;
unsigned int const SM_TABLE_LENGTH = 0x16;
unsigned int const SM_TABLE_ADDRESS = 0x18;
unsigned int const DMI_SIZE = 15;
unsigned int const DMI_TABLE_LENGTH = 0x06;
unsigned int const DMI_TABLE_ADDRESS = 0x08;
unsigned int const DMI_BCD_REVISION = 0x0E;

// The bytes read at a "_SM_" anchor; an entry point that states a greater
// length fails its checksum.
long const SM_READ_SIZE = 64;

// The 8-bit sum of bytes[0, count) is zero.
bool checksumIsZero(unsigned char const* bytes, size_t count) {
    unsigned int sum = 0;
    for (size_t i = 0; i < count; ++i) {
        sum += bytes[i];
    }
    return (sum & 0xFF) == 0;
}

}  // namespace

SmBiosInitializer::SmBiosInitializer() : SmBios(SMBIOS_MI_INIT::_empty) {
    SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor (void) entry");
    try {
        static std::string const confdir = PlatformUtilities::getKestrelDataDir();
        std::string const path = confdir + smbiosformat::OVERRIDE_FOLDER +
                                 PlatformUtilities::getSeparator() + smbiosformat::OVERRIDE_FILE;
        SMBIOS_DETAIL(loggerSmBiosInitializer,
                      "Constructor checking for " << path << " import smbios file");
        std::vector<std::string> head;
        std::vector<std::string> tables;
        if (importSmBios(path, head, tables) == 0) {
            SMBIOS_DETAIL(
                loggerSmBiosInitializer,
                "Constructor using " << path << " instead of this machine's SmBios Tables");
            acquireFromFile(path, head, tables);
        } else {
            acquireFromMemory();
        }
    } catch (std::exception const& e) {
        SMBIOS_ERROR(loggerSmBiosInitializer,
                     "Constructor Exception=" << e.what() << " Type=" << typeid(e).name());
        majorVersion_ = minorVersion_ = revision_ = 0;
        tables_.clear();
    } catch (...) {
        SMBIOS_ERROR(loggerSmBiosInitializer, "Constructor (void) unknown exception failed");
        majorVersion_ = minorVersion_ = revision_ = 0;
        tables_.clear();
    }
}

SmBiosInitializer::~SmBiosInitializer() {
    SMBIOS_DETAIL(loggerSmBiosInitializer, "Destructor entry-return");
}

void SmBiosInitializer::takeTables(std::vector<unsigned char> const& raw) {
    SmBios parsed(raw);
    tables_ = std::move(parsed.tables_);
}

// The override file was read: its header and table section decide alone;
// a failure leaves the table empty and the machine's memory is not tried
// (kept: an installed override that is broken must not silently give way to
// the machine's own table).
void SmBiosInitializer::acquireFromFile(std::string const&, std::vector<std::string> const& head,
                                        std::vector<std::string>& tableTokens) {
    std::vector<unsigned char> header;
    int const headResult = readHead(header, head);
    if (headResult != 0) {
        SMBIOS_WARNING(loggerSmBiosInitializer,
                       "Constructor readHead() return code " << headResult);
        return;
    }
    bool const smAnchor =
        header.size() > SM_MINOR && header[0] == '_' && std::memcmp(&header[1], "SM_", 3) == 0;
    bool const dmiAnchor = !smAnchor && header.size() >= 5 && header[0] == '_' &&
                           std::memcmp(&header[1], "DMI_", 4) == 0;
    unsigned char major = 0;
    unsigned char minor = 0;
    if (smAnchor) {
        unsigned int const length = header[SM_LENGTH];
        SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor found _SM_ header length=" << length);
        if (length > header.size() || !checksumIsZero(header.data(), length)) {
            SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor checksum 1 failed");
            return;
        }
        SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor checksum 1 good");
        major = header[SM_MAJOR];
        minor = header[SM_MINOR];
        SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor version good");
    } else if (dmiAnchor) {
        SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor found _DMI_ header length=0xf");
        if (header.size() < DMI_SIZE || !checksumIsZero(header.data(), DMI_SIZE)) {
            SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor checksum 2 failed");
            return;
        }
        SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor checksum 2 good");
        major = static_cast<unsigned char>(header[DMI_BCD_REVISION] >> 4);
        minor = static_cast<unsigned char>(header[DMI_BCD_REVISION] & 0x0F);
        SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor version good");
    } else {
        SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor _SM_ or _DMI_ signature failed");
        return;
    }
    std::vector<unsigned char> raw;
    int const tablesResult = readTables(raw, tableTokens);
    std::vector<std::string>().swap(tableTokens);
    if (tablesResult != 0) {
        SMBIOS_WARNING(loggerSmBiosInitializer,
                       "Constructor readTables() return code " << tablesResult);
        return;
    }
    majorVersion_ = major;
    minorVersion_ = minor;
    revision_ = 0;
    SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor going to SmBios.getTables()");
    takeTables(raw);
    std::vector<unsigned char>().swap(raw);
    SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor return from SmBios.getTables()");
    std::sort(tables_.begin(), tables_.end(), _sort_criterion_handle);
    SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor success");
}

// Finds the entry point in physical memory ("_SM_" in the BIOS area, else
// the legacy "_DMI_" in the whole first megabyte) and reads the table it
// names, with two zero bytes after it so that the last string set always
// ends for the parser.
void SmBiosInitializer::acquireFromMemory() {
    std::unique_ptr<PMem> pmem(new PMem());
    if (!pmem->open()) {
        SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor pmem.open failed");
        return;
    }
    unsigned char major = 0;
    unsigned char minor = 0;
    unsigned int tableLength = 0;
    unsigned long tableAddress = 0;
    unsigned long const smAddress =
        pmem->search("_SM_", smbiosformat::SM_SEARCH_START, smbiosformat::SM_SEARCH_END,
                     smbiosformat::SEARCH_STEP);
    if (smAddress != 0) {
        SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor found _SM_ header at " << smAddress);
        unsigned char entry[SM_READ_SIZE] = {};
        if (pmem->read(entry, smAddress, SM_READ_SIZE) != 0) {
            pmem->close();
            SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor pmem.read 1 failed");
            return;
        }
        unsigned int const length = entry[SM_LENGTH];
        if (length > static_cast<unsigned int>(SM_READ_SIZE) || !checksumIsZero(entry, length)) {
            pmem->close();
            SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor checksum 1 failed");
            return;
        }
        major = entry[SM_MAJOR];
        minor = entry[SM_MINOR];
        tableLength = smbiosformat::getWord(entry, SM_TABLE_LENGTH);
        tableAddress = smbiosformat::getDword(entry, SM_TABLE_ADDRESS);
    } else {
        unsigned long const dmiAddress =
            pmem->search("_DMI_", smbiosformat::DMI_SEARCH_START, smbiosformat::DMI_SEARCH_END,
                         smbiosformat::SEARCH_STEP);
        if (dmiAddress == 0) {
            pmem->close();
            SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor _SM_ or _DMI_ signature failed");
            return;
        }
        SMBIOS_DETAIL(loggerSmBiosInitializer,
                      "Constructo found _DMI_ header at " << std::hex << dmiAddress);
        unsigned char entry[DMI_SIZE] = {};
        if (pmem->read(entry, dmiAddress, DMI_SIZE) != 0) {
            pmem->close();
            SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor pmem.read 2 failed");
            return;
        }
        if (!checksumIsZero(entry, DMI_SIZE)) {
            pmem->close();
            SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor checksum 2 failed");
            return;
        }
        major = static_cast<unsigned char>(entry[DMI_BCD_REVISION] >> 4);
        minor = static_cast<unsigned char>(entry[DMI_BCD_REVISION] & 0x0F);
        tableLength = smbiosformat::getWord(entry, DMI_TABLE_LENGTH);
        tableAddress = smbiosformat::getDword(entry, DMI_TABLE_ADDRESS);
    }
    std::vector<unsigned char> raw(tableLength + 2u, 0);
    if (pmem->read(raw.data(), tableAddress, static_cast<long>(tableLength)) != 0) {
        pmem->close();
        SMBIOS_WARNING(loggerSmBiosInitializer, "Constructor pmem.read 3 failed");
        return;
    }
    pmem->close();
    majorVersion_ = major;
    minorVersion_ = minor;
    revision_ = 0;
    takeTables(raw);
    std::sort(tables_.begin(), tables_.end(), _sort_criterion_handle);
    pmem.reset();
    SMBIOS_DETAIL(loggerSmBiosInitializer, "Constructor success");
}

int importSmBios(std::string const& path, std::vector<std::string>& head,
                 std::vector<std::string>& tables) {
    SMBIOS_DETAIL(loggerSmBiosInitializer, "importSmBios() checking for " << path);
    _FileHandle* file = nullptr;
    int const openResult = PlatformUtilities::openFile(path.c_str(), &file, 0, 0);
    if (openResult != 0) {
        SMBIOS_DETAIL(loggerSmBiosInitializer,
                      "importSmBios() file not found, using machine SMBios" << openResult);
        return openResult;
    }
    bool headerEnded = false;
    bool tableRead = false;
    std::string token;
    // Each token moves into its list: a data run can be as long as the file.
    while (!headerEnded && readTableLine(file, token) == 0) {
        head.push_back(std::move(token));
        SMBIOS_DETAIL(loggerSmBiosInitializer, "importSmBios() header='" << head.back() << "'");
        headerEnded = head.back().find("</EPHEADER>") != std::string::npos;
    }
    while (headerEnded && readTableLine(file, token) == 0) {
        tables.push_back(std::move(token));
        tableRead = true;
        SMBIOS_DETAIL(loggerSmBiosInitializer, "importSmBios() table='" << tables.back() << "'");
    }
    int const closeResult = PlatformUtilities::closeFile(&file);
    SMBIOS_DETAIL(loggerSmBiosInitializer, "importSmBios() file close code " << closeResult);
    if (!headerEnded) {
        SMBIOS_WARNING(loggerSmBiosInitializer,
                       "importSmBios() </EPHEADER> not found, no tables made");
        return 8;
    }
    if (!tableRead) {
        SMBIOS_WARNING(loggerSmBiosInitializer,
                       "importSmBios() file ended before tables read, no tables made");
        return 8;
    }
    return 0;
}

// The tokenizer keeps its line and position in statics shared by every call
// of the process: a token may span lines, and a data run ends at the next
// "<", which is left for the next call.
int readTableLine(SD::_FileHandle* const& file, std::string& token) {
    enum State { START, TAG, DATA };
    static std::string datastr;
    static size_t datapos = 0;
    static std::string dataline;
    static bool emptybfr = true;

    token.clear();
    int state = START;
    for (;;) {
        while (emptybfr) {
            int length = 0;
            char* line = PlatformUtilities::readLine(file, length);
            if (line == nullptr) {
                return 8;
            }
            dataline.assign(line, length > 0 ? static_cast<size_t>(length) : 0);
            delete[] line;
            datastr.clear();
            for (char c : dataline) {
                if (c != ' ') {
                    datastr += static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
                }
            }
            if (!datastr.empty()) {
                datapos = 0;
                emptybfr = false;
            }
        }
        if (datapos >= datastr.size()) {
            emptybfr = true;
            datastr.clear();
            datapos = 0;
            continue;
        }
        char const c = datastr[datapos];
        bool complete = false;
        switch (state) {
            case START:
                state = c == '<' ? TAG : DATA;
                token += c;
                ++datapos;
                break;
            case TAG:
                token += c;
                ++datapos;
                complete = c == '>';
                break;
            case DATA:
                if (c == '<') {
                    complete = true;
                } else {
                    token += c;
                    ++datapos;
                }
                break;
            default:
                SMBIOS_ERROR(loggerSmBiosInitializer, "readTableLine() invalid state " << state);
                return 32;
        }
        if (datapos >= datastr.size()) {
            emptybfr = true;
            datastr.clear();
            datapos = 0;
        }
        if (complete) {
            return 0;
        }
    }
}

int readHead(std::vector<unsigned char>& bytes, std::vector<std::string> const& head) {
    if (head.empty() || head[0] != "<SHOWSMBIOS>") {
        SMBIOS_WARNING(loggerSmBiosInitializer, "readHead() first line '<SHOWSMBIOS>' missing ");
        return 4;
    }
    if (head.size() < 2 || head[1] != "<EPHEADER>") {
        SMBIOS_WARNING(loggerSmBiosInitializer, "readHead() second line '<EPHEADER>' missing ");
        return 8;
    }
    if (head.size() < 4 || head[3] != "</EPHEADER>") {
        SMBIOS_WARNING(loggerSmBiosInitializer, "readHead() fourth line '</EPHEADER>' missing ");
        return 12;
    }
    if (head[2].size() % 2 != 0) {
        SMBIOS_WARNING(loggerSmBiosInitializer, "readHead() third line odd number of hex digits ");
        return 16;
    }
    int const result = byteHex(head[2], bytes);
    SMBIOS_DETAIL(loggerSmBiosInitializer, "readHead() exit code " << result);
    return result;
}

namespace {

// Where a walk of the table section stopped.
struct TableWalk {
    bool endSeen = false;      // at </SHOWSMBIOS>
    bool inSizeBlock = false;  // inside a <SIZE> block that never ended
};

// Walks the table section's tokens as the acquisition reads them: <SIZE>
// blocks are skipped, every other data run goes to run(token), which
// returns false to stop the walk; </SHOWSMBIOS> ends it.
template <typename Run>
TableWalk walkTableRuns(std::vector<std::string> const& tables, Run run) {
    TableWalk walk;
    for (std::string const& token : tables) {
        if (walk.inSizeBlock) {
            walk.inSizeBlock = token != "</SIZE>";
        } else if (token == "<SIZE>") {
            walk.inSizeBlock = true;
        } else if (token.empty() || token[0] != '<') {
            if (!run(token)) {
                break;
            }
        } else if (token == "</SHOWSMBIOS>") {
            walk.endSeen = true;
            break;
        }
    }
    return walk;
}

}  // namespace

int readTables(std::vector<unsigned char>& bytes, std::vector<std::string> const& tables) {
    // Room for every data run at once (size blocks included, an overestimate
    // of a few bytes at most), so that the bytes are not copied as they grow.
    size_t hexDigits = 0;
    for (std::string const& token : tables) {
        if (!token.empty() && token[0] != '<') {
            hexDigits += token.size();
        }
    }
    bytes.reserve(bytes.size() + hexDigits / 2);
    TableWalk const walk = walkTableRuns(
        tables, [&bytes](std::string const& run) { return byteHex(run, bytes) == 0; });
    if (walk.inSizeBlock) {
        SMBIOS_WARNING(loggerSmBiosInitializer,
                       "readTables() terminating </SIZE> was not found " << 53);
    }
    if (!walk.endSeen) {
        SMBIOS_WARNING(loggerSmBiosInitializer,
                       "readTables() terminating </SHOWSMBIOS> was not found " << 55);
    }
    // Kept: an unterminated size block and a bad digit end with 55 too, the
    // one code the acquisition tests for.
    int const result = walk.endSeen ? 0 : 55;
    SMBIOS_DETAIL(loggerSmBiosInitializer, "readTables() exit" << result);
    return result;
}

// The same walk as readTables, up to the first run with a bad digit (where
// readTables stops too).
size_t oddHexRun(std::vector<std::string> const& tables) {
    size_t odd = 0;
    walkTableRuns(tables, [&odd](std::string const& run) {
        bool const allHex = std::all_of(run.begin(), run.end(),
                                        [](char c) { return smbiosformat::hexValue(c) >= 0; });
        if (allHex && run.size() % 2 != 0) {
            odd = run.size();
        }
        return allHex && odd == 0;
    });
    return odd;
}

int byteHex(std::string const& text, std::vector<unsigned char>& bytes) {
    SMBIOS_DETAIL(loggerSmBiosInitializer, "byteHex() entry for '" << text << "'");
    unsigned int accumulator = 0;
    bool highNibble = true;
    for (size_t i = 0; i < text.size(); ++i) {
        char const c = text[i];
        int const digit = smbiosformat::hexValue(c);
        if (digit < 0) {
            SMBIOS_WARNING(loggerSmBiosInitializer,
                           "byteHex: Invalid hexadecimal digit " << c << " at offset " << i);
            return 32;
        }
        unsigned int const value = static_cast<unsigned int>(digit);
        if (highNibble) {
            accumulator = (accumulator + value) * 16;
        } else {
            bytes.push_back(static_cast<unsigned char>(accumulator + value));
            accumulator = 0;
        }
        highNibble = !highNibble;
    }
    SMBIOS_DETAIL(loggerSmBiosInitializer, "byteHex() exit");
    return 0;
}

}  // namespace SD
