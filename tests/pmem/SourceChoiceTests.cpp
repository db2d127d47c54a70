// Which source libpmem.so serves, chosen when it is loaded: PMEM_SOURCE
// forces one; otherwise the image (when PMEM_IMAGE is set), then sysfs,
// then devmem, the first usable one. Also: what it does with bad arguments,
// and what it exports.
#include <elf.h>
#include <link.h>

#include <algorithm>
#include <cctype>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <iterator>

#include "PMemTestSupport.h"
#include "pmem/PMemContract.h"

using pmemtest::imageItem;
using pmemtest::kAnchor;
using pmemtest::kBiosArea;
using pmemtest::kTableAddress;
using pmemtest::PMemLibrary;

namespace {

class SourceChoice : public pmemtest::PMemTest {
protected:
    // An image with "_SM_" at kAnchor, a sysfs folder (presenting it at
    // 0xF0000) and a device file with it at 0xF0010: where the search finds
    // it tells which source serves.
    void offerImage() {
        std::vector<uint8_t> const table = pmemtest::sampleTable();
        std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 7, kTableAddress);
        env("PMEM_IMAGE", imageItem(file("bios.bin", pmemtest::biosArea(ep, kAnchor)), kBiosArea));
    }
    void offerSysfs() {
        std::vector<uint8_t> const table = pmemtest::sampleTable();
        std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 7, kTableAddress);
        env("PMEM_SYSFS_DIR", sysfsFolder(&ep, &table));
    }
    void offerDevice() {
        std::vector<uint8_t> const ep =
            pmemtest::smEntryPoint(pmemtest::sampleTable(), 2, 7, kTableAddress);
        // The device's byte N is address N: the first megabyte, zero but
        // for the entry point.
        std::vector<uint8_t> memory(kBiosArea, 0);
        std::vector<uint8_t> const area = pmemtest::biosArea(ep, kBiosArea + 0x10);
        memory.insert(memory.end(), area.begin(), area.end());
        env("PMEM_DEVMEM_FILE", file("mem", memory));
    }
    unsigned long whereSmIs() {
        PMemLibrary& pm = load();
        EXPECT_NE(pm.isInitialized(), 0);
        EXPECT_NE(pm.open(), 0);
        unsigned long const at = pm.search("_SM_", 0xF0000, 0xFFFFF, 16);
        EXPECT_NE(pm.close(), 0);
        return at;
    }
    // A usable image of 16 bytes 1, 2, ... at 0x1000.
    PMemLibrary& loadSmallImage() {
        std::vector<uint8_t> bytes(16);
        for (size_t i = 0; i < bytes.size(); ++i) {
            bytes[i] = static_cast<uint8_t>(i + 1);
        }
        env("PMEM_IMAGE", imageItem(file("small.bin", bytes), 0x1000));
        PMemLibrary& pm = load();
        EXPECT_NE(pm.isInitialized(), 0);
        return pm;
    }
};

}  // namespace

TEST_F(SourceChoice, NoSourceAtAllWhenSysfsIsForcedOnAnEmptyFolder) {
    env("PMEM_SOURCE", "sysfs");
    PMemLibrary& pm = load();
    EXPECT_EQ(pm.isInitialized(), 0);
    EXPECT_EQ(pm.open(), 0);
    unsigned char buffer[4] = {};
    EXPECT_NE(pm.read(buffer, 0xF0000, 4), 0);
    EXPECT_EQ(pm.search("_SM_", 0, ULONG_MAX, 16), 0ul);
    EXPECT_EQ(pm.close(), 0);
}

TEST_F(SourceChoice, NoSourceAtAllWhenNoneIsOffered) { EXPECT_EQ(load().isInitialized(), 0); }

// With no source at all, the report says for each source, in the order they
// are tried, why it cannot serve.
TEST_F(SourceChoice, NoSourceAtAllReportsWhyForEverySourceTried) {
    PMemLibrary& pm = load();
    EXPECT_EQ(pm.isInitialized(), 0);
    EXPECT_EQ(pm.sourceReport(),
              "image: PMEM_IMAGE is not set\n"
              "sysfs: " +
                  emptySysfs_.path() +
                  "/smbios_entry_point: No such file or directory\n"
                  "devmem: " +
                  work_.file("no-such-device") + ": No such file or directory\n");
    pmemtest::TableCutFigures cut;
    EXPECT_FALSE(pm.tableCut(cut));
}

// The source that serves ends the report, with what it serves.
TEST_F(SourceChoice, ReportEndsWithTheSourceThatServes) {
    offerDevice();
    PMemLibrary& pm = load();
    EXPECT_NE(pm.isInitialized(), 0);
    std::string const report = pm.sourceReport();
    EXPECT_EQ(report.substr(0, report.find('\n') + 1), "image: PMEM_IMAGE is not set\n");
    std::string const last =
        "devmem: serves " + std::string(std::getenv("PMEM_DEVMEM_FILE")) + "\n";
    ASSERT_GE(report.size(), last.size());
    EXPECT_EQ(report.substr(report.size() - last.size()), last) << report;
}

// An image without an entry point where the plug-in looks serves all the
// same, and the report says it holds none.
TEST_F(SourceChoice, ImageWithoutAnEntryPointIsReportedSo) {
    PMemLibrary& pm = loadSmallImage();
    EXPECT_NE(pm.sourceReport().find("which holds no entry point in 0xF0000-0xFFFFF"),
              std::string::npos)
        << pm.sourceReport();
}

// Malformed and unreadable image items are named with what is wrong.
TEST_F(SourceChoice, UnusableImageItemsAreReportedWithTheirReason) {
    env("PMEM_SOURCE", "image");
    env("PMEM_IMAGE", "no-at-sign");
    EXPECT_EQ(load().sourceReport(), "image: PMEM_IMAGE item 'no-at-sign' is not FILE@BASE\n");
}

TEST_F(SourceChoice, MissingImageFileIsReportedWithTheSystemsReason) {
    env("PMEM_SOURCE", "image");
    env("PMEM_IMAGE", work_.file("missing.bin") + "@F0000");
    EXPECT_EQ(load().sourceReport(),
              "image: " + work_.file("missing.bin") + ": No such file or directory\n");
}

TEST_F(SourceChoice, ImageComesBeforeSysfsAndDevMem) {
    offerImage();
    offerSysfs();
    offerDevice();
    EXPECT_EQ(whereSmIs(), kAnchor);
}

TEST_F(SourceChoice, SysfsServesWhenNoImageIsSet) {
    offerSysfs();
    offerDevice();
    EXPECT_EQ(whereSmIs(), kBiosArea);
}

TEST_F(SourceChoice, DevMemServesWhenNeitherImageNorSysfsCan) {
    offerDevice();
    EXPECT_EQ(whereSmIs(), kBiosArea + 0x10);
}

TEST_F(SourceChoice, UnusableImageLeavesTheChoiceToSysfsUnlessForced) {
    env("PMEM_IMAGE", work_.file("missing.bin") + "@F0000");
    offerSysfs();
    EXPECT_EQ(whereSmIs(), kBiosArea);
}

TEST_F(SourceChoice, ForcedSysfsIgnoresTheImage) {
    offerImage();
    offerSysfs();
    env("PMEM_SOURCE", "sysfs");
    EXPECT_EQ(whereSmIs(), kBiosArea);
}

TEST_F(SourceChoice, ForcedDevMemIgnoresImageAndSysfs) {
    offerImage();
    offerSysfs();
    offerDevice();
    env("PMEM_SOURCE", "devmem");
    EXPECT_EQ(whereSmIs(), kBiosArea + 0x10);
}

TEST_F(SourceChoice, ForcedImageWithoutPMemImageIsUnusable) {
    offerSysfs();
    env("PMEM_SOURCE", "image");
    EXPECT_EQ(load().isInitialized(), 0);
}

TEST_F(SourceChoice, UnknownPMemSourceServesNothing) {
    offerImage();
    offerSysfs();
    env("PMEM_SOURCE", "memory");
    PMemLibrary& pm = load();
    EXPECT_EQ(pm.isInitialized(), 0);
    EXPECT_EQ(pm.sourceReport(), "PMEM_SOURCE: 'memory' names no source (image, sysfs, devmem)\n");
}

TEST_F(SourceChoice, ReadWithNullBufferFails) {
    PMemLibrary& pm = loadSmallImage();
    EXPECT_NE(pm.read(nullptr, 0x1000, 4), 0);
    EXPECT_NE(pm.read(nullptr, 0x1000, 0), 0);
}

TEST_F(SourceChoice, ReadWithNegativeCountFails) {
    PMemLibrary& pm = loadSmallImage();
    unsigned char buffer[4] = {9, 9, 9, 9};
    EXPECT_NE(pm.read(buffer, 0x1000, -1), 0);
    EXPECT_NE(pm.read(buffer, 0x1000, LONG_MIN), 0);
    EXPECT_EQ(buffer[0], 9);
}

TEST_F(SourceChoice, ReadOfNoBytesSucceeds) {
    PMemLibrary& pm = loadSmallImage();
    unsigned char buffer[1] = {9};
    EXPECT_EQ(pm.read(buffer, 0x1000, 0), 0);
    EXPECT_EQ(buffer[0], 9);
}

TEST_F(SourceChoice, ReadAtHugeAddressesFails) {
    PMemLibrary& pm = loadSmallImage();
    unsigned char buffer[4] = {};
    EXPECT_NE(pm.read(buffer, ULONG_MAX, 1), 0);
    EXPECT_NE(pm.read(buffer, ULONG_MAX, 4), 0);
    EXPECT_NE(pm.read(buffer, ULONG_MAX - 1, LONG_MAX), 0);
    EXPECT_NE(pm.read(buffer, 0x80000000ul, 4), 0);
}

TEST_F(SourceChoice, ReadFarBeyondTheBytesPresentFailsWithoutWritingAnything) {
    PMemLibrary& pm = loadSmallImage();
    unsigned char buffer[32];
    std::memset(buffer, 0xAA, sizeof buffer);
    // The count claims a buffer far larger than the one passed: the read
    // fails before it copies a byte.
    EXPECT_NE(pm.read(buffer + 8, 0x1000, LONG_MAX), 0);
    EXPECT_NE(pm.read(buffer + 8, 0x1000, 17), 0);
    for (unsigned char byte : buffer) {
        ASSERT_EQ(byte, 0xAA);
    }
}

TEST_F(SourceChoice, SearchWithNullOrEmptyAnchorFindsNothing) {
    PMemLibrary& pm = loadSmallImage();
    EXPECT_EQ(pm.search(nullptr, 0, ULONG_MAX, 1), 0ul);
    EXPECT_EQ(pm.search("", 0x1000, 0x2000, 1), 0ul);
    EXPECT_EQ(pm.search("\x01\x02", 0x1000, 0x2000, 1), 0x1000ul);
}

TEST_F(SourceChoice, SearchWithStepZeroOrNegativeFindsNothing) {
    PMemLibrary& pm = loadSmallImage();
    EXPECT_EQ(pm.search("\x03", 0x1000, 0x2000, 0), 0ul);
    EXPECT_EQ(pm.search("\x03", 0x1000, 0x2000, -1), 0ul);
    EXPECT_EQ(pm.search("\x03", 0x1000, 0x2000, LONG_MIN), 0ul);
    EXPECT_EQ(pm.search("\x03", 0x1000, 0x2000, 1), 0x1002ul);
}

TEST_F(SourceChoice, BadArgumentsOnAnUnusableLibraryFailQuietly) {
    PMemLibrary& pm = load();
    ASSERT_EQ(pm.isInitialized(), 0);
    EXPECT_NE(pm.read(nullptr, ULONG_MAX, -5), 0);
    EXPECT_EQ(pm.search(nullptr, ULONG_MAX, 0, 0), 0ul);
}

namespace {

// The names of the symbols a shared library defines in its dynamic symbol
// table (the ones another module can bind to).
std::vector<std::string> exportedSymbols(std::string const& path) {
    std::vector<uint8_t> const image = smbiostest::fileBytes(path);
    std::vector<std::string> names;
    ElfW(Ehdr) header;
    if (image.size() < sizeof header) {
        ADD_FAILURE() << path << " is too short for an ELF file";
        return names;
    }
    std::memcpy(&header, image.data(), sizeof header);
    if (std::memcmp(header.e_ident, ELFMAG, SELFMAG) != 0 ||
        header.e_shentsize != sizeof(ElfW(Shdr)) ||
        header.e_shoff + static_cast<uint64_t>(header.e_shnum) * sizeof(ElfW(Shdr)) >
            image.size()) {
        ADD_FAILURE() << path << " is not an ELF file of this architecture";
        return names;
    }
    std::vector<ElfW(Shdr)> sections(header.e_shnum);
    std::memcpy(sections.data(), image.data() + header.e_shoff,
                header.e_shnum * sizeof(ElfW(Shdr)));
    for (ElfW(Shdr) const& section : sections) {
        if (section.sh_type != SHT_DYNSYM || section.sh_link >= sections.size()) {
            continue;
        }
        ElfW(Shdr) const& strings = sections[section.sh_link];
        size_t const count = section.sh_size / sizeof(ElfW(Sym));
        for (size_t i = 0; i < count; ++i) {
            ElfW(Sym) symbol;
            std::memcpy(&symbol, image.data() + section.sh_offset + i * sizeof symbol,
                        sizeof symbol);
            unsigned const binding = symbol.st_info >> 4;
            if (symbol.st_shndx == SHN_UNDEF || (binding != STB_GLOBAL && binding != STB_WEAK) ||
                symbol.st_name == 0) {
                continue;
            }
            size_t const at = strings.sh_offset + symbol.st_name;
            if (at >= image.size()) {
                ADD_FAILURE() << "symbol name out of the file";
                continue;
            }
            char const* name = reinterpret_cast<char const*>(image.data() + at);
            names.emplace_back(name, strnlen(name, image.size() - at));
        }
    }
    std::sort(names.begin(), names.end());
    return names;
}

// The names in the global list of a linker version script ("global:" up to
// "local:"), in order. Comments (C style) are left out.
std::vector<std::string> versionScriptGlobals(std::string const& text) {
    std::string code;
    for (size_t at = 0; at < text.size();) {
        if (text.compare(at, 2, "/*") == 0) {
            size_t const end = text.find("*/", at + 2);
            at = end == std::string::npos ? text.size() : end + 2;
            code += ' ';
        } else {
            code += text[at++];
        }
    }
    std::vector<std::string> names;
    bool inGlobal = false;
    std::string word;
    for (char c : code) {
        bool const partOfName =
            std::isalnum(static_cast<unsigned char>(c)) || c == '_' || c == '*' || c == ':';
        if (partOfName) {
            word += c;
            continue;
        }
        if (word == "global:") {
            inGlobal = true;
        } else if (word == "local:") {
            inGlobal = false;
        } else if (inGlobal && !word.empty()) {
            names.push_back(word);
        }
        word.clear();
    }
    return names;
}

// The contract's exports, required and reporting, sorted.
std::vector<std::string> contractExports() {
    std::vector<std::string> names(std::begin(pmem::kRequiredExports),
                                   std::end(pmem::kRequiredExports));
    names.insert(names.end(), std::begin(pmem::kReportExports), std::end(pmem::kReportExports));
    std::sort(names.begin(), names.end());
    return names;
}

}  // namespace

// The built library exports the contract's functions and nothing else: the
// five the plug-in binds and the two that tell the tools what it found.
TEST(PMemExports, TheFiveFunctionsAndTheTwoReports) {
    EXPECT_EQ(exportedSymbols(pmemtest::libraryPath()), contractExports());
    EXPECT_EQ(contractExports(),
              (std::vector<std::string>{"PMemClose", "PMemIsInitialized", "PMemOpen", "PMemRead",
                                        "PMemSearch", "PMemSourceReport", "PMemTableCut"}));
    std::vector<std::string> required(std::begin(pmem::kRequiredExports),
                                      std::end(pmem::kRequiredExports));
    EXPECT_EQ(required, (std::vector<std::string>{"PMemIsInitialized", "PMemOpen", "PMemClose",
                                                  "PMemRead", "PMemSearch"}));
}

// The version script, which decides what the library exports, lists the
// contract's functions.
TEST(PMemExports, VersionScriptListsTheContractsFunctions) {
    char const* source = std::getenv("SMBIOS_SOURCE_DIR");
    ASSERT_NE(source, nullptr) << "SMBIOS_SOURCE_DIR is not set";
    std::string const script = std::string(source) + "/pmem/libpmem.map";
    std::vector<uint8_t> const bytes = smbiostest::fileBytes(script);
    ASSERT_FALSE(bytes.empty()) << "cannot read " << script;
    std::vector<std::string> globals =
        versionScriptGlobals(std::string(bytes.begin(), bytes.end()));
    std::sort(globals.begin(), globals.end());
    EXPECT_EQ(globals, contractExports()) << script;
}
