// A stand-in for the physical-memory library, for the tests of
// smbios-dump --from-machine, which run the tool as a child process. Its
// fake physical memory and behaviour come from the environment:
//   DUMP_FAKE_PMEM_IMAGE        FILE@BASE[,FILE@BASE...]: each file's bytes
//                               appear at physical address BASE (hexadecimal);
//                               other addresses hold nothing (a read touching
//                               them fails, a search does not match there)
//   DUMP_FAKE_PMEM_INITIALIZED  "0": PMemIsInitialized returns 0
//   DUMP_FAKE_PMEM_OPEN         "0": PMemOpen returns 0
//   DUMP_FAKE_PMEM_CLOSE        "0": PMemClose returns 0
// Built with DUMP_FAKE_PMEM_NO_SEARCH it does not export PMemSearch.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>
#include <vector>

#define FAKE_EXPORT extern "C" __attribute__((visibility("default")))

namespace {

typedef std::map<unsigned long, std::vector<unsigned char>> Regions;

bool isSet(char const* name, char const* value) {
    char const* text = std::getenv(name);
    return text != nullptr && std::strcmp(text, value) == 0;
}

bool readFile(std::string const& path, std::vector<unsigned char>& bytes) {
    std::FILE* file = std::fopen(path.c_str(), "rb");
    if (file == nullptr) {
        return false;
    }
    unsigned char buffer[65536];
    size_t count = 0;
    while ((count = std::fread(buffer, 1, sizeof buffer, file)) > 0) {
        bytes.insert(bytes.end(), buffer, buffer + count);
    }
    bool const ok = std::ferror(file) == 0;
    std::fclose(file);
    return ok;
}

// The regions named by DUMP_FAKE_PMEM_IMAGE; false when it is unset or a
// file cannot be read.
bool loadRegions(Regions& regions) {
    char const* regionList = std::getenv("DUMP_FAKE_PMEM_IMAGE");
    if (regionList == nullptr) {
        return false;
    }
    std::string const text = regionList;
    size_t begin = 0;
    while (begin <= text.size()) {
        size_t end = text.find(',', begin);
        if (end == std::string::npos) {
            end = text.size();
        }
        std::string const item = text.substr(begin, end - begin);
        size_t const at = item.rfind('@');
        if (at == std::string::npos) {
            return false;
        }
        unsigned long const base = std::strtoul(item.c_str() + at + 1, nullptr, 16);
        if (!readFile(item.substr(0, at), regions[base])) {
            return false;
        }
        begin = end + 1;
    }
    return true;
}

Regions& memory() {
    static Regions regions;
    return regions;
}

bool gOpen = false;

bool byteAt(unsigned long address, unsigned char& value) {
    Regions const& regions = memory();
    auto it = regions.upper_bound(address);
    if (it == regions.begin()) {
        return false;
    }
    --it;
    unsigned long const offset = address - it->first;
    if (offset >= it->second.size()) {
        return false;
    }
    value = it->second[offset];
    return true;
}

}  // namespace

FAKE_EXPORT int PMemIsInitialized() { return isSet("DUMP_FAKE_PMEM_INITIALIZED", "0") ? 0 : 1; }

FAKE_EXPORT int PMemOpen() {
    if (isSet("DUMP_FAKE_PMEM_OPEN", "0")) {
        return 0;
    }
    memory().clear();
    gOpen = loadRegions(memory());
    return gOpen ? 1 : 0;
}

FAKE_EXPORT int PMemClose() {
    gOpen = false;
    return isSet("DUMP_FAKE_PMEM_CLOSE", "0") ? 0 : 1;
}

FAKE_EXPORT int PMemRead(void* buffer, unsigned long address, long count) {
    if (!gOpen || buffer == nullptr || count < 0) {
        return -1;
    }
    unsigned char* out = static_cast<unsigned char*>(buffer);
    for (long i = 0; i < count; ++i) {
        if (!byteAt(address + static_cast<unsigned long>(i), out[i])) {
            return -1;
        }
    }
    return 0;
}

#ifndef DUMP_FAKE_PMEM_NO_SEARCH
FAKE_EXPORT unsigned long PMemSearch(char const* anchor, unsigned long start, unsigned long end,
                                     long step) {
    if (!gOpen || anchor == nullptr || step <= 0) {
        return 0;
    }
    size_t const length = std::strlen(anchor);
    for (unsigned long address = start; address <= end;
         address += static_cast<unsigned long>(step)) {
        bool match = true;
        for (size_t i = 0; i < length && match; ++i) {
            unsigned char value = 0;
            match = byteAt(address + i, value) && value == static_cast<unsigned char>(anchor[i]);
        }
        if (match) {
            return address;
        }
        if (end - address < static_cast<unsigned long>(step)) {
            break;
        }
    }
    return 0;
}
#endif
