// The devmem source: the kernel's memory device, opened read-only at
// PMemOpen and read with pread. PMEM_DEVMEM_FILE names the device; here a
// plain file stands in for it (its byte N is physical address N), since the
// real /dev/mem needs privileges and hardware the tests do not have.
#include <fcntl.h>
#include <unistd.h>

#include <climits>
#include <cstring>

#include "PMemTestSupport.h"

using pmemtest::kAnchor;
using pmemtest::PMemLibrary;

namespace {

class DevMemSource : public pmemtest::PMemTest {
protected:
    // A stand-in device of `size` bytes with the given texts at their offsets.
    std::string device(size_t size,
                       std::vector<std::pair<unsigned long, std::string>> const& texts) {
        std::vector<uint8_t> bytes(size, 0);
        for (auto const& text : texts) {
            std::memcpy(bytes.data() + text.first, text.second.data(), text.second.size());
        }
        std::string const path = file("mem", bytes);
        env("PMEM_DEVMEM_FILE", path);
        return path;
    }
};

}  // namespace

TEST_F(DevMemSource, ForcedWithoutTheDeviceIsUnusableAndEverythingFails) {
    env("PMEM_SOURCE", "devmem");  // PMEM_DEVMEM_FILE names no file
    PMemLibrary& pm = load();
    EXPECT_EQ(pm.isInitialized(), 0);
    EXPECT_EQ(pm.open(), 0);
    unsigned char buffer[16] = {};
    EXPECT_NE(pm.read(buffer, 0xF0000, 16), 0);
    EXPECT_EQ(pm.search("_SM_", 0xF0000, 0xFFFFF, 16), 0ul);
    EXPECT_EQ(pm.close(), 0);
}

TEST_F(DevMemSource, ForcedOnThisMachineIsUsableExactlyWhenDevMemOpensForReading) {
    env("PMEM_DEVMEM_FILE", nullptr);
    env("PMEM_SOURCE", "devmem");
    int const fd = ::open("/dev/mem", O_RDONLY | O_CLOEXEC);
    bool const readable = fd >= 0;
    if (readable) {
        ::close(fd);
    }
    PMemLibrary& pm = load();
    EXPECT_EQ(pm.isInitialized() != 0, readable);
    if (readable) {
        ASSERT_NE(pm.open(), 0);
        unsigned char buffer[2] = {};
        EXPECT_NE(pm.read(buffer, ULONG_MAX, 2), 0);
        EXPECT_NE(pm.close(), 0);
    } else {
        EXPECT_EQ(pm.open(), 0);
    }
}

TEST_F(DevMemSource, ServesReadsAndSearchesOnlyWhileOpen) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 7, 0x100000);
    std::string const path =
        device(0x100000 + table.size(), {{kAnchor, std::string(ep.begin(), ep.end())},
                                         {0x100000, std::string(table.begin(), table.end())}});
    PMemLibrary& pm = load();  // neither image nor sysfs serves: the device does
    ASSERT_NE(pm.isInitialized(), 0);
    unsigned char buffer[64] = {};
    EXPECT_NE(pm.read(buffer, kAnchor, 31), 0);
    EXPECT_EQ(pm.search("_SM_", 0xF0000, 0xFFFFF, 16), 0ul);

    ASSERT_NE(pm.open(), 0);
    EXPECT_EQ(pm.search("_SM_", 0xF0000, 0xFFFFF, 16), kAnchor);
    int status = -2;
    EXPECT_EQ(pmemtest::slice(pm.bytes(kAnchor, 64, status), 0, ep.size()), ep);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(pm.bytes(0x100000, table.size(), status), table);
    EXPECT_EQ(status, 0);
    // The device ends after the table.
    EXPECT_NE(pm.read(buffer, 0x100000 + table.size() - 1, 2), 0);
    EXPECT_NE(pm.read(buffer, 0x200000, 1), 0);
    EXPECT_NE(pm.close(), 0);

    EXPECT_NE(pm.read(buffer, kAnchor, 31), 0);
    EXPECT_EQ(pm.search("_SM_", 0xF0000, 0xFFFFF, 16), 0ul);
    ASSERT_NE(pm.open(), 0);
    EXPECT_EQ(pm.read(buffer, kAnchor, 31), 0);
}

TEST_F(DevMemSource, SearchFindsAnchorsAcrossPagesAndReadPieces) {
    // Across a page boundary, across the 64 KiB pieces a search reads, and
    // one cut off by the end of the device.
    device(0x30000, {{0x0FFE, "ANCH"}, {0x1FFFE, "ANCH"}, {0x2FFFD, "ANC"}, {0x20010, "STEP"}});
    PMemLibrary& pm = load();
    ASSERT_NE(pm.isInitialized(), 0);
    ASSERT_NE(pm.open(), 0);
    EXPECT_EQ(pm.search("ANCH", 0, ULONG_MAX, 1), 0x0FFEul);
    EXPECT_EQ(pm.search("ANCH", 0x0FFF, ULONG_MAX, 1), 0x1FFFEul);
    EXPECT_EQ(pm.search("ANCH", 0x1FFFF, ULONG_MAX, 1), 0ul);  // ends at the end of the device
    EXPECT_EQ(pm.search("ANC", 0x20000, ULONG_MAX, 1), 0x2FFFDul);
    EXPECT_EQ(pm.search("STEP", 0, 0x2FFFF, 16), 0x20010ul);
    EXPECT_EQ(pm.search("STEP", 0x10, 0x2FFFF, 0x10000), 0x20010ul);
    EXPECT_EQ(pm.search("STEP", 0, 0x2FFFF, 0x10000), 0ul);
    EXPECT_EQ(pm.search("STEP", 0, 0x2000F, 16), 0ul);
    EXPECT_EQ(pm.search("STEP", 0, 0x20010, 16), 0x20010ul);
    EXPECT_NE(pm.close(), 0);
}
