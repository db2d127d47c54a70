#include "inventory/DumpCheck.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <vector>

#include "DumpFormat.h"
#include "smbios/SmBiosInitializer.h"

namespace inventory {

namespace {

// Entry-point fields that announce the table's structure count.
size_t const SM_STRUCTURE_COUNT = 0x1C;
size_t const DMI_STRUCTURE_COUNT = 0x0C;

// Lines of the text, a last line without a line end included.
size_t lineCount(std::string const& text) {
    size_t const ends = static_cast<size_t>(std::count(text.begin(), text.end(), '\n'));
    return ends + (!text.empty() && text.back() != '\n' ? 1 : 0);
}

// The line of the text's last character that the grammar does not skip
// (blanks and line ends are skipped).
size_t lastTokenLine(std::string const& text) {
    size_t const last = text.find_last_not_of(" \n");
    if (last == std::string::npos) {
        return lineCount(text);
    }
    return 1 + static_cast<size_t>(std::count(text.begin(), text.begin() + last, '\n'));
}

// Why importSmBios gave up on the file.
std::string importFailure(std::vector<std::string> const& head, std::string const& text) {
    if (text.empty()) {
        return "the file is empty: no </EPHEADER>";
    }
    bool const headerEnded = !head.empty() && head.back().find("</EPHEADER>") != std::string::npos;
    if (headerEnded) {
        return "line " + std::to_string(lastTokenLine(text)) + ": nothing after </EPHEADER>";
    }
    return "line " + std::to_string(lineCount(text)) + ": no </EPHEADER>";
}

// The structure count that the entry point announces; false when it is
// neither a "_SM_" nor a "_DMI_" entry point long enough to hold one.
bool announcedCount(std::vector<unsigned char> const& header, unsigned int& count) {
    if (header.size() >= SM_STRUCTURE_COUNT + 2 && std::memcmp(header.data(), "_SM_", 4) == 0) {
        count = smbiosdump::getWord(header, SM_STRUCTURE_COUNT);
        return true;
    }
    if (header.size() >= DMI_STRUCTURE_COUNT + 2 && std::memcmp(header.data(), "_DMI_", 5) == 0) {
        count = smbiosdump::getWord(header, DMI_STRUCTURE_COUNT);
        return true;
    }
    return false;
}

// The warning for a table that is not whole; "" when it is.
std::string truncation(std::vector<unsigned char> const& header,
                       std::vector<unsigned char> const& table) {
    unsigned int announced = 0;
    if (!announcedCount(header, announced)) {
        return "";
    }
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
    std::string const held = std::to_string(stats.count);
    if (stats.count < announced) {
        return "warning: the entry point announces " + std::to_string(announced) +
               " structures; the table holds " + held +
               (stats.cut ? " and ends inside the next one" : "");
    }
    if (stats.cut) {
        return "warning: the table ends inside a structure, after " + held + " whole ones";
    }
    return "";
}

// The same for the file's entry point and table, decoded as the plug-in
// decodes them.
std::string truncation(std::vector<std::string> const& head,
                       std::vector<std::string> const& tables) {
    std::vector<unsigned char> header;
    std::vector<unsigned char> table;
    // A header or table the plug-in does not decode gives an empty table,
    // which the inventory shows for itself.
    if (SD::readHead(header, head) != 0 || SD::readTables(table, tables) != 0) {
        return "";
    }
    return truncation(header, table);
}

}  // namespace

DumpCheck checkOverrideFile(std::string const& path, std::string const& text) {
    DumpCheck check;
    std::vector<std::string> head;
    std::vector<std::string> tables;
    int const imported = SD::importSmBios(path, head, tables);
    if (imported == 8) {
        check.refusal = importFailure(head, text);
        return check;
    }
    if (imported != 0) {
        check.refusal = "cannot be opened as a dump file (code " + std::to_string(imported) + ")";
        return check;
    }
    size_t const odd = SD::oddHexRun(tables);
    if (odd != 0) {
        check.refusal = "table text has an odd number of hex digits (" + std::to_string(odd) + ")";
        return check;
    }
    check.warning = truncation(head, tables);
    return check;
}

DumpCheck checkImage(std::vector<std::uint8_t> const& header,
                     std::vector<std::uint8_t> const& table) {
    DumpCheck check;
    check.warning = truncation(header, table);
    return check;
}

}  // namespace inventory
