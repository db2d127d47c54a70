// A small reader of dmidecode's text output, for the tests that hold the
// plug-in's inventory of a real machine against dmidecode's decoding of the
// same table.
//
// dmidecode prints a few lines of preamble ("SMBIOS 2.7 present." among
// them), then one block per structure:
//
//   Handle 0x0004, DMI type 4, 42 bytes
//   Processor Information
//   	Socket Designation: SOCKET 0
//   	Flags:
//   		FPU (Floating-point unit on-chip)
//   	Max Speed: 4000 MHz
//
// that is the handle line, a title line, then "Key: Value" lines indented by
// one tab (lines indented by two tabs are list items of the key above them
// and are not kept). A blank line ends the block.
//
// Header-only, so that it needs no library of its own.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <regex>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

namespace dmitext {

// The text without trailing blanks, tabs and line ends.
inline std::string trimEnd(std::string const& text) {
    size_t end = text.size();
    while (end > 0 && (text[end - 1] == ' ' || text[end - 1] == '\t' || text[end - 1] == '\r' ||
                       text[end - 1] == '\n')) {
        --end;
    }
    return text.substr(0, end);
}

// One structure as dmidecode shows it.
struct Block {
    uint16_t handle = 0;
    unsigned int type = 0;
    unsigned int length = 0;  // the formatted area's length, "N bytes" of the handle line
    std::string title;
    // The one-tab "Key: Value" lines in the order printed; the value is kept
    // as printed (only a '\r' at the line end is dropped), "" for "Key:".
    std::vector<std::pair<std::string, std::string>> fields;

    bool has(std::string const& key) const {
        return std::any_of(fields.begin(), fields.end(),
                           [&key](std::pair<std::string, std::string> const& field) {
                               return field.first == key;
                           });
    }
    // The first value of `key`; "" when the block has no such line.
    std::string value(std::string const& key) const {
        for (std::pair<std::string, std::string> const& field : fields) {
            if (field.first == key) {
                return field.second;
            }
        }
        return std::string();
    }
};

struct Decoding {
    // From "SMBIOS 3.1.1 present.": 3 and 1; both 0 without such a line.
    unsigned int major = 0;
    unsigned int minor = 0;
    // Every block, in ascending handle order (blocks with equal handles
    // keep the order dmidecode printed them in).
    std::vector<Block> blocks;

    std::vector<Block const*> ofType(unsigned int type) const {
        std::vector<Block const*> found;
        for (Block const& block : blocks) {
            if (block.type == type) {
                found.push_back(&block);
            }
        }
        return found;
    }
    // Every block of `type` whose handle is `handle`.
    std::vector<Block const*> withHandle(unsigned int type, uint16_t handle) const {
        std::vector<Block const*> found;
        for (Block const& block : blocks) {
            if (block.type == type && block.handle == handle) {
                found.push_back(&block);
            }
        }
        return found;
    }
};

// Reads dmidecode's whole output.
inline Decoding parse(std::string const& text) {
    static std::regex const present(R"(^SMBIOS (\d+)\.(\d+)(\.\d+)? present\.)");
    static std::regex const handleLine(
        R"(^Handle 0x([0-9A-Fa-f]{4}), DMI type (\d+), (\d+) bytes)");
    Decoding decoding;
    std::istringstream in(text);
    std::string line;
    Block* current = nullptr;
    bool wantTitle = false;
    while (std::getline(in, line)) {
        if (!line.empty() && line.back() == '\r') {
            line.pop_back();
        }
        std::smatch m;
        if (std::regex_search(line, m, handleLine)) {
            decoding.blocks.emplace_back();
            current = &decoding.blocks.back();
            current->handle = static_cast<uint16_t>(std::stoul(m[1].str(), nullptr, 16));
            current->type = static_cast<unsigned int>(std::stoul(m[2].str()));
            current->length = static_cast<unsigned int>(std::stoul(m[3].str()));
            wantTitle = true;
            continue;
        }
        if (current == nullptr) {
            if (std::regex_search(line, m, present)) {
                decoding.major = static_cast<unsigned int>(std::stoul(m[1].str()));
                decoding.minor = static_cast<unsigned int>(std::stoul(m[2].str()));
            }
            continue;
        }
        if (line.empty()) {
            current = nullptr;
            continue;
        }
        if (wantTitle) {
            current->title = line;
            wantTitle = false;
            continue;
        }
        if (line.size() < 2 || line[0] != '\t' || line[1] == '\t') {
            continue;  // a list item under a key, or nothing dmidecode writes
        }
        size_t const colon = line.find(':');
        if (colon == std::string::npos) {
            continue;
        }
        std::string key = line.substr(1, colon - 1);
        std::string value = line.substr(colon + 1);
        if (!value.empty() && value[0] == ' ') {
            value.erase(0, 1);
        }
        current->fields.emplace_back(std::move(key), std::move(value));
    }
    std::stable_sort(decoding.blocks.begin(), decoding.blocks.end(),
                     [](Block const& a, Block const& b) { return a.handle < b.handle; });
    return decoding;
}

// Whether `pattern` is found in `text`; the match in `m`, and the decimal
// number of its first group in `number`.
inline bool searchNumber(std::string const& text, std::regex const& pattern, std::smatch& m,
                         uint64_t& number) {
    if (!std::regex_search(text, m, pattern)) {
        return false;
    }
    number = std::stoull(m[1].str());
    return true;
}

// A size as dmidecode prints it ("32 kB", "4 MB", "16 GB", "1024 MB (Single-
// bank Connection)") in KB. False when the text is not a number and a unit
// or the size is not a whole number of KB.
inline bool sizeInKb(std::string const& text, uint64_t& kb) {
    static std::regex const size(R"(^(\d+) (bytes|kB|MB|GB|TB)\b)");
    std::smatch m;
    uint64_t number = 0;
    if (!searchNumber(text, size, m, number)) {
        return false;
    }
    std::string const unit = m[2].str();
    if (unit == "bytes") {
        if (number % 1024 != 0) {
            return false;
        }
        kb = number / 1024;
    } else if (unit == "kB") {
        kb = number;
    } else if (unit == "MB") {
        kb = number << 10;
    } else if (unit == "GB") {
        kb = number << 20;
    } else {
        kb = number << 30;
    }
    return true;
}

// A leading decimal number ("100 MHz", "50 bytes", "7"). False when the text
// does not start with a digit.
inline bool leadingNumber(std::string const& text, uint64_t& number) {
    static std::regex const digits(R"(^(\d+))");
    std::smatch m;
    return searchNumber(text, digits, m, number);
}

// A handle value as dmidecode prints it ("0x0005"). False for the other
// forms ("Not Provided", "No L3 Cache").
inline bool handleValue(std::string const& text, uint16_t& handle) {
    static std::regex const hex(R"(^0x([0-9A-Fa-f]{4})$)");
    std::smatch m;
    std::string const trimmed = trimEnd(text);
    if (!std::regex_match(trimmed, m, hex)) {
        return false;
    }
    handle = static_cast<uint16_t>(std::stoul(m[1].str(), nullptr, 16));
    return true;
}

// The SMBIOS slot type that dmidecode names in a System Slot's "Type:" line,
// for the common kinds. dmidecode writes the bus width in front of the name
// ("32-bit PCI", "x16 PCI Express x16", "x8 PCI Express 3 x8"); it is
// dropped first. False for a name not in this list.
inline bool slotTypeCode(std::string const& text, unsigned int& code) {
    static std::regex const width(R"(^(\d+-bit |x\d+ ))");
    static std::pair<char const*, unsigned int> const names[] = {
        {"Other", 0x01},
        {"Unknown", 0x02},
        {"ISA", 0x03},
        {"MCA", 0x04},
        {"EISA", 0x05},
        {"PCI", 0x06},
        {"PC Card (PCMCIA)", 0x07},
        {"VLB", 0x08},
        {"Proprietary", 0x09},
        {"Processor Card", 0x0A},
        {"Proprietary Memory Card", 0x0B},
        {"I/O Riser Card", 0x0C},
        {"NuBus", 0x0D},
        {"PCI-66", 0x0E},
        {"AGP", 0x0F},
        {"AGP 2x", 0x10},
        {"AGP 4x", 0x11},
        {"PCI-X", 0x12},
        {"AGP 8x", 0x13},
        {"M.2 Socket 1-DP", 0x14},
        {"M.2 Socket 1-SD", 0x15},
        {"M.2 Socket 2", 0x16},
        {"M.2 Socket 3", 0x17},
        {"PCI Express", 0xA5},
        {"PCI Express x1", 0xA6},
        {"PCI Express x2", 0xA7},
        {"PCI Express x4", 0xA8},
        {"PCI Express x8", 0xA9},
        {"PCI Express x16", 0xAA},
        {"PCI Express 2", 0xAB},
        {"PCI Express 2 x1", 0xAC},
        {"PCI Express 2 x2", 0xAD},
        {"PCI Express 2 x4", 0xAE},
        {"PCI Express 2 x8", 0xAF},
        {"PCI Express 2 x16", 0xB0},
        {"PCI Express 3", 0xB1},
        {"PCI Express 3 x1", 0xB2},
        {"PCI Express 3 x2", 0xB3},
        {"PCI Express 3 x4", 0xB4},
        {"PCI Express 3 x8", 0xB5},
        {"PCI Express 3 x16", 0xB6},
    };
    std::string const name =
        std::regex_replace(trimEnd(text), width, "", std::regex_constants::format_first_only);
    for (std::pair<char const*, unsigned int> const& entry : names) {
        if (name == entry.first) {
            code = entry.second;
            return true;
        }
    }
    return false;
}

}  // namespace dmitext
