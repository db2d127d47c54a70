// The checked-in demo override dump (examples/demo-server.smbios.txt) is
// make-demo-example's output, byte for byte, and describes the demo server.
#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "PluginRead.h"
#include "TestSupport.h"

extern char** environ;

namespace {

std::string envPath(char const* name) {
    char const* value = std::getenv(name);
    return value != nullptr ? value : "";
}

std::string checkedInPath() {
    return envPath("SMBIOS_SOURCE_DIR") + "/examples/demo-server.smbios.txt";
}

// Runs the program with its arguments; returns its exit status, or -1.
int run(std::vector<std::string> const& args, std::string& error) {
    std::vector<std::string> const line =
        smbiostest::commandLine(args[0], std::vector<std::string>(args.begin() + 1, args.end()));
    std::vector<char*> argv;
    for (std::string const& arg : line) {
        argv.push_back(const_cast<char*>(arg.c_str()));
    }
    argv.push_back(nullptr);
    pid_t pid = 0;
    int const rc = ::posix_spawn(&pid, argv[0], nullptr, nullptr, argv.data(), environ);
    if (rc != 0) {
        error = std::string("cannot start ") + argv[0] + ": " + std::strerror(rc);
        return -1;
    }
    int status = 0;
    while (::waitpid(pid, &status, 0) < 0) {
        if (errno != EINTR) {
            error = "waitpid failed";
            return -1;
        }
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

struct Parsed {
    uint8_t type;
    uint8_t length;
    uint16_t handle;
    std::vector<uint8_t> area;  // formatted area
    std::vector<std::string> strings;
};

// Splits a well-formed table into structures; fails the test otherwise.
std::vector<Parsed> split(std::vector<uint8_t> const& table) {
    std::vector<Parsed> out;
    size_t pos = 0;
    while (pos < table.size()) {
        EXPECT_GE(table.size() - pos, 4u);
        if (table.size() - pos < 4) {
            break;
        }
        Parsed p;
        p.type = table[pos];
        p.length = table[pos + 1];
        p.handle = static_cast<uint16_t>(table[pos + 2] | (table[pos + 3] << 8));
        EXPECT_GE(p.length, 4);
        if (p.length < 4 || pos + p.length > table.size()) {
            ADD_FAILURE() << "bad structure at " << pos;
            break;
        }
        p.area.assign(table.begin() + pos, table.begin() + pos + p.length);
        size_t at = pos + p.length;
        std::string current;
        bool ended = false;
        if (at + 1 < table.size() && table[at] == 0 && table[at + 1] == 0) {
            at += 2;
            ended = true;
        } else {
            while (at < table.size()) {
                uint8_t const c = table[at++];
                if (c != 0) {
                    current += static_cast<char>(c);
                    continue;
                }
                if (current.empty()) {
                    ended = true;
                    break;
                }
                p.strings.push_back(current);
                current.clear();
            }
        }
        if (!ended) {
            ADD_FAILURE() << "unterminated structure at " << pos;
            break;
        }
        out.push_back(p);
        pos = at;
    }
    return out;
}

std::string stringAt(Parsed const& p, size_t offset) {
    uint8_t const n = p.area.at(offset);
    if (n == 0 || n > p.strings.size()) {
        return "";
    }
    return p.strings[n - 1];
}

uint16_t wordAt(Parsed const& p, size_t offset) {
    return static_cast<uint16_t>(p.area.at(offset) | (p.area.at(offset + 1) << 8));
}

}  // namespace

TEST(DemoExample, GeneratorReproducesCheckedInFileByteForByte) {
    ASSERT_FALSE(envPath("SMBIOS_OUT_DIR").empty()) << "SMBIOS_OUT_DIR is not set";
    ASSERT_FALSE(envPath("SMBIOS_SOURCE_DIR").empty()) << "SMBIOS_SOURCE_DIR is not set";
    smbiostest::TempDir dir;
    std::string const output = dir.file("demo-server.smbios.txt");
    std::string error;
    int const status = run({envPath("SMBIOS_OUT_DIR") + "/make-demo-example", output}, error);
    ASSERT_EQ(status, 0) << error;
    std::vector<uint8_t> const generated = smbiostest::fileBytes(output);
    std::vector<uint8_t> const checkedIn = smbiostest::fileBytes(checkedInPath());
    EXPECT_EQ(generated.size(), checkedIn.size());
    EXPECT_TRUE(generated == checkedIn)
        << "examples/demo-server.smbios.txt differs from make-demo-example's output; "
           "regenerate it with `cmake --build build --target demo-example`";
}

TEST(DemoExample, GeneratorWithoutOutputArgumentFails) {
    ASSERT_FALSE(envPath("SMBIOS_OUT_DIR").empty()) << "SMBIOS_OUT_DIR is not set";
    std::string error;
    EXPECT_EQ(run({envPath("SMBIOS_OUT_DIR") + "/make-demo-example"}, error), 2) << error;
}

TEST(DemoExample, CheckedInFileIsConsistentSmbios27Dump) {
    ASSERT_FALSE(envPath("SMBIOS_SOURCE_DIR").empty()) << "SMBIOS_SOURCE_DIR is not set";
    smbiosdump::PluginRead const back = smbiosdump::readOverrideFile(checkedInPath());
    ASSERT_TRUE(back.ok()) << back.imported << " " << back.head << " " << back.tables;
    std::vector<uint8_t> const& header = back.header;
    std::vector<uint8_t> const& table = back.table;
    ASSERT_EQ(header.size(), 31u);
    uint8_t total = 0;
    for (uint8_t b : header) {
        total = static_cast<uint8_t>(total + b);
    }
    EXPECT_EQ(total, 0);
    EXPECT_EQ(header[6], 2);
    EXPECT_EQ(header[7], 7);
    EXPECT_EQ(header[0x1E], 0x27);
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
    EXPECT_EQ(header[0x16] | (header[0x17] << 8), static_cast<int>(table.size()));
    EXPECT_EQ(header[0x1C] | (header[0x1D] << 8), stats.count);
    EXPECT_EQ(header[0x08] | (header[0x09] << 8), stats.maxSize);

    std::vector<Parsed> const structures = split(table);
    ASSERT_EQ(structures.size(), stats.count);
    std::vector<int> types;
    std::set<uint16_t> handles;
    for (size_t i = 0; i < structures.size(); ++i) {
        types.push_back(structures[i].type);
        if (i > 0) {
            EXPECT_GT(structures[i].handle, structures[i - 1].handle) << "structure " << i;
        }
        handles.insert(structures[i].handle);
    }
    std::vector<int> const expectedTypes = {0,  1,  2,  3,  4,  4,  7,  7,  7,  7,  7, 7,
                                            16, 17, 17, 17, 17, 9,  9,  9,  8,  8,  8, 8,
                                            11, 14, 15, 26, 26, 28, 28, 38, 32, 127};
    EXPECT_EQ(types, expectedTypes);
    ASSERT_EQ(structures.size(), expectedTypes.size());

    std::map<int, int> const lengths = {{0, 0x18},  {1, 0x1B},  {2, 0x13},  {3, 0x19},  {4, 0x28},
                                        {7, 0x13},  {16, 0x0F}, {17, 0x22}, {9, 0x11},  {8, 0x09},
                                        {11, 0x05}, {14, 0x0B}, {15, 0x1B}, {26, 0x16}, {28, 0x16},
                                        {38, 0x12}, {32, 0x0B}, {127, 0x04}};
    for (Parsed const& p : structures) {
        EXPECT_EQ(p.length, lengths.at(p.type)) << "type " << int(p.type);
    }

    // Cross-references name existing structures of the right types.
    std::map<uint16_t, uint8_t> typeOf;
    for (Parsed const& p : structures) {
        typeOf[p.handle] = p.type;
    }
    Parsed const& bios = structures[0];
    EXPECT_EQ(stringAt(bios, 0x04), "Corvane");
    EXPECT_EQ(stringAt(bios, 0x05), "CVE1.05 -[A1B2C3D-1.05]-");
    Parsed const& system = structures[1];
    EXPECT_EQ(stringAt(system, 0x05), "Corvane RS-7400 [7947AC1]");
    std::set<uint8_t> const uuid(system.area.begin() + 8, system.area.begin() + 24);
    EXPECT_EQ(uuid.size(), 16u);
    Parsed const& board = structures[2];
    EXPECT_EQ(stringAt(board, 0x05), "CB-7400");
    EXPECT_EQ(typeOf.at(wordAt(board, 0x0B)), 3);
    EXPECT_EQ(typeOf.at(wordAt(board, 0x0F)), 4);
    EXPECT_EQ(typeOf.at(wordAt(board, 0x11)), 4);
    for (size_t i : {size_t{4}, size_t{5}}) {
        Parsed const& cpu = structures[i];
        EXPECT_EQ(stringAt(cpu, 0x04), i == 4 ? "CPU1" : "CPU2");
        for (size_t offset : {size_t{0x1A}, size_t{0x1C}, size_t{0x1E}}) {
            EXPECT_EQ(typeOf.at(wordAt(cpu, offset)), 7);
        }
    }
    EXPECT_EQ(wordAt(structures[8], 0x07), 0x8000 | 320);
    Parsed const& oem = structures[24];
    EXPECT_EQ(oem.area.at(4), 6);
    ASSERT_EQ(oem.strings.size(), 6u);
    EXPECT_EQ(oem.strings[0], "Corvane Diagnostics -[ABCD12X-2.10]-");
    EXPECT_EQ(oem.strings[4], "$DS Corvane Preboot Diagnostics (KVD) 3.10 -[AB12C-3.10]-");
    Parsed const& group = structures[25];
    EXPECT_EQ(stringAt(group, 0x04), "Cpu Module");
    EXPECT_EQ(group.area.at(5), 4);
    EXPECT_EQ(typeOf.at(wordAt(group, 6)), 4);
    EXPECT_EQ(group.area.at(8), 2);
    EXPECT_EQ(typeOf.at(wordAt(group, 9)), 2);
    for (size_t i = 13; i < 17; ++i) {
        EXPECT_EQ(typeOf.at(wordAt(structures[i], 0x04)), 16);
    }
}
