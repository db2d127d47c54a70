// The sysfs source: the kernel's copy of the SMBIOS entry point and table
// (smbios_entry_point and DMI in PMEM_SYSFS_DIR), presented as firmware
// would: the entry point at 0xF0000, the table at the address it names, a
// 3.x entry point as the equivalent 2.x "_SM_" one.
#include <sys/stat.h>

#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "PMemTestSupport.h"

using pmemtest::byteSum;
using pmemtest::dword;
using pmemtest::kBiosArea;
using pmemtest::kTableAddress;
using pmemtest::PMemLibrary;
using pmemtest::readsBytes;
using pmemtest::slice;
using pmemtest::word;

namespace {

class SysfsSource : public pmemtest::PMemTest {
protected:
    // The library loaded with the entry point and the table as the kernel's
    // copies.
    PMemLibrary& loadServing(std::vector<uint8_t> const& entryPoint,
                             std::vector<uint8_t> const& table) {
        env("PMEM_SYSFS_DIR", sysfsFolder(&entryPoint, &table));
        return load();
    }
    // The presented entry point: the 64 bytes read where "_SM_" is found.
    std::vector<uint8_t> presentedSm(PMemLibrary& pm) {
        unsigned long const at = pm.search("_SM_", 0xF0000, 0xFFFFF, 16);
        EXPECT_EQ(at, kBiosArea);
        int status = -2;
        std::vector<uint8_t> bytes = pm.bytes(at, 64, status);
        EXPECT_EQ(status, 0);
        return bytes;
    }
    // A "_SM_" entry point presented for a 3.x one: anchor, length, version,
    // intermediate anchor and both checksums.
    static void expectEquivalentSm(std::vector<uint8_t> const& ep, uint8_t major, uint8_t minor,
                                   size_t tableSize) {
        EXPECT_EQ(std::string(ep.begin(), ep.begin() + 4), "_SM_");
        EXPECT_EQ(ep[5], 0x1F);
        EXPECT_EQ(ep[6], major);
        EXPECT_EQ(ep[7], minor);
        EXPECT_EQ(byteSum(ep, 0, 0x1F), 0) << "entry-point checksum";
        EXPECT_EQ(std::string(ep.begin() + 0x10, ep.begin() + 0x15), "_DMI_");
        EXPECT_EQ(byteSum(ep, 0x10, 0x1F), 0) << "intermediate checksum";
        EXPECT_EQ(word(ep, 0x16), tableSize);
    }
    // The sample table under the 3.x entry point `ep3` of version 3.minor
    // is served at 1 MiB, which the presented "_SM_" entry point names;
    // with `equivalent`, that is the equivalent entry point.
    void expectServedAt1MiB(std::vector<uint8_t> const& ep3, uint8_t minor, bool equivalent) {
        std::vector<uint8_t> const table = pmemtest::sampleTable();
        PMemLibrary& pm = loadServing(ep3, table);
        ASSERT_NE(pm.isInitialized(), 0);
        std::vector<uint8_t> const ep = presentedSm(pm);
        if (equivalent) {
            expectEquivalentSm(ep, 3, minor, table.size());
        }
        EXPECT_EQ(dword(ep, 0x18), 0x100000u);
        EXPECT_TRUE(readsBytes(pm, 0x100000, table));
    }
    // A table of exactly `size` bytes: the sample table, then a structure
    // of type 126 (inactive) whose strings fill the rest.
    static std::vector<uint8_t> tableOfSize(size_t size) {
        std::vector<uint8_t> table = pmemtest::sampleTable();
        size_t const filler = size - table.size();
        std::vector<uint8_t> inactive = {126, 4, 0xFE, 0xFF};
        inactive.resize(filler, 'x');
        inactive[filler - 1] = 0;
        inactive[filler - 2] = 0;
        table.insert(table.end(), inactive.begin(), inactive.end());
        return table;
    }
};

}  // namespace

TEST_F(SysfsSource, SmEntryPointIsPresentedAsItIsAtF0000AndItsTableAtItsAddress) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 8, kTableAddress);
    PMemLibrary& pm = loadServing(ep, table);
    ASSERT_NE(pm.isInitialized(), 0);
    ASSERT_NE(pm.open(), 0);
    std::vector<uint8_t> const presented = presentedSm(pm);
    EXPECT_EQ(slice(presented, 0, ep.size()), ep);
    EXPECT_EQ(slice(presented, ep.size(), 64), std::vector<uint8_t>(64 - ep.size(), 0));
    EXPECT_TRUE(readsBytes(pm, kTableAddress, table));
    EXPECT_EQ(pm.search("_DMI_", 0, 0xFFFFF, 16), kBiosArea + 0x10);
    EXPECT_NE(pm.close(), 0);
}

TEST_F(SysfsSource, SmTableOnTheEntryPointIsMovedAndTheEntryPointSaysWhere) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 7, 0xF0010);
    PMemLibrary& pm = loadServing(ep, table);
    ASSERT_NE(pm.isInitialized(), 0);
    std::vector<uint8_t> const presented = presentedSm(pm);
    unsigned long const address = dword(presented, 0x18);
    EXPECT_EQ(address, 0x100000ul);
    EXPECT_TRUE(readsBytes(pm, address, table));
    EXPECT_EQ(byteSum(presented, 0, 0x1F), 0);
    EXPECT_EQ(byteSum(presented, 0x10, 0x1F), 0);
    // Only the address and the two checksums changed.
    for (size_t i = 0; i < ep.size(); ++i) {
        if (i != 0x04 && i != 0x15 && (i < 0x18 || i > 0x1B)) {
            EXPECT_EQ(presented[i], ep[i]) << "byte " << i;
        }
    }
}

TEST_F(SysfsSource, SmTableInsideTheBiosAreaBesideTheEntryPointStaysWhereItIs) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 4, 0xF1000);
    PMemLibrary& pm = loadServing(ep, table);
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_EQ(slice(presentedSm(pm), 0, ep.size()), ep);
    EXPECT_TRUE(readsBytes(pm, 0xF1000, table));
}

TEST_F(SysfsSource, SmTableRunningOutOfTheBiosAreaIsServedWholeWithIt) {
    std::vector<uint8_t> const table = tableOfSize(0x200);
    std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 6, 0xFFF00);
    PMemLibrary& pm = loadServing(ep, table);
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_EQ(slice(presentedSm(pm), 0, ep.size()), ep);
    EXPECT_TRUE(readsBytes(pm, 0xFFF00, table));
    unsigned char byte = 0;
    EXPECT_NE(pm.read(&byte, 0xFFF00 + 0x200, 1), 0);
}

TEST_F(SysfsSource, Sm3EntryPointIsPresentedAsTheEquivalentSmEntryPoint) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
    std::vector<uint8_t> const ep3 = pmemtest::sm3EntryPoint(3, 2, 1, 0x10000, kTableAddress);
    PMemLibrary& pm = loadServing(ep3, table);
    ASSERT_NE(pm.isInitialized(), 0);
    ASSERT_NE(pm.open(), 0);
    EXPECT_EQ(pm.search("_SM3_", 0xF0000, 0xFFFFF, 16), 0ul);
    std::vector<uint8_t> const ep = presentedSm(pm);
    expectEquivalentSm(ep, 3, 2, table.size());
    EXPECT_EQ(dword(ep, 0x18), kTableAddress);
    EXPECT_EQ(word(ep, 0x1C), stats.count);
    EXPECT_EQ(word(ep, 0x08), stats.maxSize);
    EXPECT_EQ(ep[0x1E], 0x32) << "BCD revision";
    EXPECT_TRUE(readsBytes(pm, kTableAddress, table));
    EXPECT_NE(pm.close(), 0);
}

TEST_F(SysfsSource, Sm3TableAbove4GiBIsServedAt1MiB) {
    expectServedAt1MiB(pmemtest::sm3EntryPoint(3, 4, 0, 0x10000, 0x1234560000ull), 4, true);
}

TEST_F(SysfsSource, Sm3TableEndingAbove4GiBIsServedAt1MiB) {
    // The presented entry point is looked at for its table address alone.
    expectServedAt1MiB(pmemtest::sm3EntryPoint(3, 0, 0, 0x10000, 0xFFFFFFF0ull), 0, false);
}

TEST_F(SysfsSource, Sm3TableOnTheEntryPointIsServedAt1MiB) {
    expectServedAt1MiB(pmemtest::sm3EntryPoint(3, 1, 1, 0x10000, 0xF0000), 1, true);
}

TEST_F(SysfsSource, Sm3TableOf65535BytesIsServed) {
    std::vector<uint8_t> const table = tableOfSize(0xFFFF);
    PMemLibrary& pm = loadServing(pmemtest::sm3EntryPoint(3, 3, 0, 0x20000, kTableAddress), table);
    ASSERT_NE(pm.isInitialized(), 0);
    std::vector<uint8_t> const ep = presentedSm(pm);
    expectEquivalentSm(ep, 3, 3, 0xFFFF);
    EXPECT_TRUE(readsBytes(pm, kTableAddress, table));
}

// A 3.x table longer than a 2.x entry point can state is served as the
// whole structures of its start that fit in 65535 bytes, and the library
// says what it cut.
TEST_F(SysfsSource, Sm3TableLongerThan65535BytesIsServedAsTheWholeStructuresThatFit) {
    std::vector<uint8_t> const table = smbiostest::largeServerTable(1100);
    size_t const headSize = smbiostest::largeServerTable(0).size() - 6;  // less end-of-table
    size_t const deviceSize = smbiostest::largeServerTable(1).size() - 6 - headSize;
    ASSERT_GT(table.size(), 95000u);
    // The devices that fit after the head; the 5 head structures before them.
    size_t const devicesServed = (0xFFFF - headSize) / deviceSize;
    size_t const served = headSize + devicesServed * deviceSize;
    PMemLibrary& pm = loadServing(
        pmemtest::sm3EntryPoint(3, 3, 0, static_cast<uint32_t>(table.size()), kTableAddress),
        table);
    ASSERT_NE(pm.isInitialized(), 0) << pm.sourceReport();
    std::vector<uint8_t> const ep = presentedSm(pm);
    expectEquivalentSm(ep, 3, 3, served);
    EXPECT_EQ(word(ep, 0x1C), 5 + devicesServed) << "structure count";
    EXPECT_EQ(word(ep, 0x08), deviceSize) << "largest structure";
    EXPECT_TRUE(readsBytes(pm, dword(ep, 0x18), slice(table, 0, served)));
    pmemtest::TableCutFigures cut;
    ASSERT_TRUE(pm.tableCut(cut));
    EXPECT_EQ(cut.tableBytes, table.size());
    EXPECT_EQ(cut.tableStructures, 5u + 1100u + 1u);
    EXPECT_EQ(cut.servedBytes, served);
    EXPECT_EQ(cut.servedStructures, 5 + devicesServed);
    EXPECT_NE(pm.sourceReport().find("sysfs: serves "), std::string::npos) << pm.sourceReport();
}

// A table that fits is served whole and nothing is said to be cut.
TEST_F(SysfsSource, Sm3TableJustUnder64KiBIsServedWholeAndNotCut) {
    std::vector<uint8_t> const table = smbiostest::largeServerTable(680);
    ASSERT_GT(table.size(), 60000u);
    ASSERT_LE(table.size(), 0xFFFFu);
    PMemLibrary& pm = loadServing(
        pmemtest::sm3EntryPoint(3, 3, 0, static_cast<uint32_t>(table.size()), kTableAddress),
        table);
    ASSERT_NE(pm.isInitialized(), 0) << pm.sourceReport();
    std::vector<uint8_t> const ep = presentedSm(pm);
    expectEquivalentSm(ep, 3, 3, table.size());
    EXPECT_EQ(word(ep, 0x1C), 5u + 680u + 1u);
    EXPECT_TRUE(readsBytes(pm, dword(ep, 0x18), table));
    pmemtest::TableCutFigures cut;
    EXPECT_FALSE(pm.tableCut(cut));
}

TEST_F(SysfsSource, LegacyDmiEntryPointIsPresentedAsItIs) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep =
        smbiosdump::makeDmiEntryPoint(0x21, static_cast<uint16_t>(table.size()), kTableAddress, 5);
    PMemLibrary& pm = loadServing(ep, table);
    ASSERT_NE(pm.isInitialized(), 0);
    EXPECT_EQ(pm.search("_SM_", 0xF0000, 0xFFFFF, 16), 0ul);
    EXPECT_EQ(pm.search("_DMI_", 0, 0xFFFFF, 16), kBiosArea);
    EXPECT_TRUE(readsBytes(pm, kBiosArea, ep));
    EXPECT_TRUE(readsBytes(pm, kTableAddress, table));
}

TEST_F(SysfsSource, LegacyDmiTableOnTheEntryPointIsMovedAndItsChecksumKeptRight) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep =
        smbiosdump::makeDmiEntryPoint(0x21, static_cast<uint16_t>(table.size()), 0xF0008, 5);
    PMemLibrary& pm = loadServing(ep, table);
    ASSERT_NE(pm.isInitialized(), 0);
    int status = -2;
    std::vector<uint8_t> const presented = pm.bytes(kBiosArea, 15, status);
    ASSERT_EQ(status, 0);
    EXPECT_EQ(dword(presented, 8), 0x100000u);
    EXPECT_EQ(byteSum(presented, 0, 15), 0);
    EXPECT_EQ(slice(presented, 0, 5), slice(ep, 0, 5));
    EXPECT_EQ(slice(presented, 6, 8), slice(ep, 6, 8));
    EXPECT_EQ(slice(presented, 12, 15), slice(ep, 12, 15));
    EXPECT_TRUE(readsBytes(pm, 0x100000, table));
}

// As an ordinary user, on a machine whose kernel tables only root may read,
// the source cannot serve, and the report names the file and the reason.
TEST_F(SysfsSource, TablesOnlyRootMayReadAreReportedAsPermissionDenied) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 7, kTableAddress);
    std::string const folder = sysfsFolder(&ep, &table);
    ASSERT_EQ(::chmod((folder + "/smbios_entry_point").c_str(), 0), 0);
    ASSERT_EQ(::chmod((folder + "/DMI").c_str(), 0), 0);
    // The folders on the way are open to everyone, as /sys/firmware/dmi/tables is.
    ASSERT_EQ(::chmod(work_.path().c_str(), 0755), 0);
    env("PMEM_SYSFS_DIR", folder);
    env("PMEM_SOURCE", "sysfs");
    std::string const expected = "sysfs: " + folder + "/smbios_entry_point: Permission denied\n";
    int const result = pmemtest::runAsUnprivilegedUser([&expected] {
        PMemLibrary pm;
        if (!pm.loaded()) {
            return 3;
        }
        if (pm.isInitialized() != 0) {
            return 4;
        }
        if (pm.sourceReport() != expected) {
            std::fprintf(stderr, "report:\n%s", pm.sourceReport().c_str());
            return 5;
        }
        return 0;
    });
    if (result == pmemtest::kNoUnprivilegedUser) {
        GTEST_SKIP() << "cannot become an unprivileged user (nobody) here";
    }
    EXPECT_EQ(result, 0) << "3: not loaded, 4: initialized, 5: another report";
}

// Folders the forced sysfs source cannot serve from.
struct BadSysfs {
    char const* name;
    std::vector<uint8_t> entryPoint;  // empty: no smbios_entry_point file
    size_t tableSize;                 // 0 with hasTable: an empty DMI file
    bool hasTable;
    char const* why;  // what the library's report says after "sysfs: FOLDER/"
};

void PrintTo(BadSysfs const& bad, std::ostream* out) { *out << bad.name; }

class BadSysfsFolder : public pmemtest::PMemTest, public ::testing::WithParamInterface<BadSysfs> {};

TEST_P(BadSysfsFolder, MakesTheSysfsSourceUnusable) {
    BadSysfs const& bad = GetParam();
    std::vector<uint8_t> const table(bad.tableSize, 0);
    env("PMEM_SYSFS_DIR", sysfsFolder(bad.entryPoint.empty() ? nullptr : &bad.entryPoint,
                                      bad.hasTable ? &table : nullptr));
    env("PMEM_SOURCE", "sysfs");
    PMemLibrary& pm = load();
    EXPECT_EQ(pm.isInitialized(), 0);
    EXPECT_EQ(pm.open(), 0);
    unsigned char buffer[16] = {};
    EXPECT_NE(pm.read(buffer, kBiosArea, 16), 0);
    EXPECT_EQ(pm.search("_SM_", 0xF0000, 0xFFFFF, 16), 0ul);
    // The report names the file and what is wrong with it.
    std::string const folder = std::getenv("PMEM_SYSFS_DIR");
    EXPECT_EQ(pm.sourceReport(), "sysfs: " + folder + "/" + bad.why + "\n");
}

namespace {

std::vector<uint8_t> sized(std::vector<uint8_t> bytes, size_t size) {
    bytes.resize(size);
    return bytes;
}

std::vector<uint8_t> withAnchor(char const* anchor) {
    std::vector<uint8_t> ep(0x1F, 0);
    std::memcpy(ep.data(), anchor, std::strlen(anchor));
    return ep;
}

}  // namespace

INSTANTIATE_TEST_SUITE_P(
    SysfsSource, BadSysfsFolder,
    ::testing::Values(
        BadSysfs{"EmptyFolder", {}, 0, false, "smbios_entry_point: No such file or directory"},
        BadSysfs{"NoEntryPoint", {}, 64, true, "smbios_entry_point: No such file or directory"},
        BadSysfs{"NoTable", pmemtest::smEntryPoint(std::vector<uint8_t>(64, 0), 2, 7, 0x100000),
                 0, false, "DMI: No such file or directory"},
        BadSysfs{"EmptyTable",
                 pmemtest::smEntryPoint(std::vector<uint8_t>(64, 0), 2, 7, 0x100000), 0, true,
                 "DMI: empty"},
        BadSysfs{"UnknownAnchor", withAnchor("_XM_"), 64, true,
                 "smbios_entry_point: neither a _SM3_, _SM_ nor _DMI_ entry point"},
        BadSysfs{"ShortSmEntryPoint",
                 sized(pmemtest::smEntryPoint(std::vector<uint8_t>(64, 0), 2, 7, 0x100000), 0x1D),
                 64, true, "smbios_entry_point: shorter than its entry point"},
        BadSysfs{"ShortSm3EntryPoint",
                 sized(pmemtest::sm3EntryPoint(3, 0, 0, 64, 0x100000), 0x17), 64, true,
                 "smbios_entry_point: shorter than its entry point"},
        BadSysfs{"Sm3EntryPointStatingAShortLength",
                 [] {
                     std::vector<uint8_t> ep = pmemtest::sm3EntryPoint(3, 0, 0, 64, 0x100000);
                     ep[6] = 0x10;
                     pmemtest::setChecksum(ep, 5, 0, 0x18);
                     return ep;
                 }(),
                 64, true, "smbios_entry_point: shorter than its entry point"},
        BadSysfs{"ShortDmiEntryPoint",
                 sized(smbiosdump::makeDmiEntryPoint(0x21, 64, 0x100000, 1), 14), 64, true,
                 "smbios_entry_point: shorter than its entry point"}),
    [](::testing::TestParamInfo<BadSysfs> const& info) { return std::string(info.param.name); });
