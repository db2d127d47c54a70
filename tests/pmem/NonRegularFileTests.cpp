// Files that are not regular files where libpmem.so expects its sources: a
// FIFO, a folder, a device. The library opens them when it is loaded, so a
// FIFO opened for reading would make the load wait for a writer forever;
// each load runs in a child process that is killed when it takes too long
// (runInChild), and such a source must be unusable at once, as any other
// bad file makes it. The memory device may be a character device, as
// /dev/mem is.
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "PMemTestSupport.h"

using pmemtest::isInitializedInChild;
using pmemtest::kChildHung;
using pmemtest::PMemLibrary;

namespace {

bool makeFifo(std::string const& path) { return ::mkfifo(path.c_str(), 0600) == 0; }
bool makeFolder(std::string const& path) { return ::mkdir(path.c_str(), 0755) == 0; }

class NonRegularFile : public pmemtest::PMemTest {
protected:
    // A FIFO in the test's folder; returns its path.
    std::string fifo(std::string const& name) {
        std::string const path = work_.file(name);
        if (!makeFifo(path)) {
            ADD_FAILURE() << "cannot make the FIFO " << path << ": " << std::strerror(errno);
        }
        return path;
    }
    // A folder in the test's folder; returns its path.
    std::string folder(std::string const& name) {
        std::string const path = work_.file(name);
        if (!makeFolder(path)) {
            ADD_FAILURE() << "cannot make " << path << ": " << std::strerror(errno);
        }
        return path;
    }
    // A sysfs folder of a good 2.7 table but for the file `odd`
    // ("smbios_entry_point" or "DMI"), which `make` makes (a FIFO, a folder).
    std::string sysfsWithOdd(std::string const& name, std::string const& odd,
                             bool (*make)(std::string const&)) {
        std::vector<uint8_t> const table = pmemtest::sampleTable();
        std::string const dir = folder(name);
        if (odd != "smbios_entry_point") {
            smbiostest::writeFile(dir + "/smbios_entry_point",
                                  pmemtest::smEntryPoint(table, 2, 7, 0x100000));
        }
        if (odd != "DMI") {
            smbiostest::writeFile(dir + "/DMI", table);
        }
        std::string const path = dir + "/" + odd;
        EXPECT_TRUE(make(path)) << "cannot make " << path << ": " << std::strerror(errno);
        return dir;
    }
    // The sysfs folder of a good 2.7 table.
    std::string goodSysfs() {
        std::vector<uint8_t> const table = pmemtest::sampleTable();
        std::vector<uint8_t> const ep = pmemtest::smEntryPoint(table, 2, 7, 0x100000);
        return sysfsFolder(&ep, &table);
    }
};

bool isCharacterDevice(char const* path) {
    struct stat info;
    return ::stat(path, &info) == 0 && S_ISCHR(info.st_mode);
}

}  // namespace

TEST_F(NonRegularFile, FifoAsImageFileMakesImageUnusableAtOnce) {
    std::vector<uint8_t> const area(0x10000, 0);
    std::string const good = file("area.bin", area);
    std::string const pipe = fifo("image.fifo");
    env("PMEM_SOURCE", "image");
    env("PMEM_IMAGE", pmemtest::imageItem(pipe, 0xF0000));
    EXPECT_EQ(isInitializedInChild(), 0) << "(" << kChildHung << ": the load waited on the FIFO)";
    // One FIFO spoils the whole list.
    env("PMEM_IMAGE", pmemtest::imageItem(good, 0xF0000) + "," + pmemtest::imageItem(pipe, 0));
    EXPECT_EQ(isInitializedInChild(), 0);
}

TEST_F(NonRegularFile, FifoAsImageFileLetsTheNextSourceServe) {
    env("PMEM_IMAGE", pmemtest::imageItem(fifo("image.fifo"), 0xF0000));
    env("PMEM_SYSFS_DIR", goodSysfs());
    EXPECT_EQ(isInitializedInChild(), 1);
}

TEST_F(NonRegularFile, FifoAsDevMemFileMakesDevMemUnusableAtOnce) {
    env("PMEM_SOURCE", "devmem");
    env("PMEM_DEVMEM_FILE", fifo("mem.fifo"));
    EXPECT_EQ(isInitializedInChild(), 0) << "(" << kChildHung << ": the load waited on the FIFO)";
}

TEST_F(NonRegularFile, FifoInSysfsFolderMakesSysfsUnusableAtOnce) {
    env("PMEM_SOURCE", "sysfs");
    env("PMEM_SYSFS_DIR", sysfsWithOdd("dmi-fifo", "DMI", makeFifo));
    EXPECT_EQ(isInitializedInChild(), 0) << "(" << kChildHung << ": the load waited on the FIFO)";
    env("PMEM_SYSFS_DIR", sysfsWithOdd("entry-fifo", "smbios_entry_point", makeFifo));
    EXPECT_EQ(isInitializedInChild(), 0);
}

TEST_F(NonRegularFile, FolderAsAnySourceFileMakesThatSourceUnusable) {
    std::string const dir = folder("a-folder");
    env("PMEM_SOURCE", "image");
    env("PMEM_IMAGE", pmemtest::imageItem(dir, 0));
    EXPECT_EQ(isInitializedInChild(), 0) << "image";
    env("PMEM_SOURCE", "sysfs");
    env("PMEM_SYSFS_DIR", sysfsWithOdd("dmi-folder", "DMI", makeFolder));
    EXPECT_EQ(isInitializedInChild(), 0) << "sysfs, DMI a folder";
    env("PMEM_SYSFS_DIR", sysfsWithOdd("entry-folder", "smbios_entry_point", makeFolder));
    EXPECT_EQ(isInitializedInChild(), 0) << "sysfs, smbios_entry_point a folder";
    // A folder opens for reading: only its kind tells it from a device.
    env("PMEM_SOURCE", "devmem");
    env("PMEM_DEVMEM_FILE", dir);
    EXPECT_EQ(isInitializedInChild(), 0) << "devmem";
}

TEST_F(NonRegularFile, CharacterDeviceServesAsMemoryDeviceOnly) {
    if (!isCharacterDevice("/dev/zero") || !isCharacterDevice("/dev/null")) {
        GTEST_SKIP() << "this system has no /dev/zero or /dev/null character device";
    }
    env("PMEM_SOURCE", "devmem");
    env("PMEM_DEVMEM_FILE", "/dev/zero");
    EXPECT_EQ(isInitializedInChild(), 1) << "devmem on /dev/zero";
    // An image file must be a regular file: /dev/null would serve nothing.
    env("PMEM_SOURCE", "image");
    env("PMEM_IMAGE", pmemtest::imageItem("/dev/null", 0xF0000));
    EXPECT_EQ(isInitializedInChild(), 0) << "image of /dev/null";
}

TEST_F(NonRegularFile, MemoryDeviceReplacedByFifoAfterLoadDoesNotOpen) {
    std::string const device = file("mem", std::vector<uint8_t>(0x1000, 0));
    env("PMEM_SOURCE", "devmem");
    env("PMEM_DEVMEM_FILE", device);
    int const result = pmemtest::runInChild([&device] {
        PMemLibrary pm;
        if (!pm.loaded() || pm.isInitialized() == 0) {
            return 10;
        }
        if (::unlink(device.c_str()) != 0 || !makeFifo(device)) {
            return 11;
        }
        return pm.open();
    });
    EXPECT_EQ(result, 0) << "(" << kChildHung << ": PMemOpen waited on the FIFO; 10: not loaded "
                         << "or not initialized; 11: no FIFO made)";
}
