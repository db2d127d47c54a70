// The plug-in's acquisition (SD::SmBios) reading physical memory through the
// built libpmem.so, found in the code directory (SMBIOS_OUT_DIR) as on an
// installed system: through an image, through a fake sysfs folder, with no
// source at all, and for every dump of the corpus of real machines.
#include <sys/stat.h>

#include <algorithm>
#include <map>

#include "PMemTestSupport.h"
#include "smbios/SmBios.h"

using pmemtest::imageItem;
using pmemtest::kAnchor;
using pmemtest::kBiosArea;
using pmemtest::kTableAddress;

namespace {

class PluginThroughPMem : public pmemtest::PMemTest {
protected:
    void SetUp() override {
        ASSERT_EQ(SD::SMBIOS_CLASS::_smbios, nullptr)
            << "the SMBIOS table is acquired once per process: run each test in a process of "
               "its own (ctest does)";
        ASSERT_FALSE(pmemtest::outDir().empty()) << "SMBIOS_OUT_DIR is not set";
    }

    smbiostest::TempDir dataDir_;
    smbiostest::ScopedEnv data_{"KESTREL_DATA_DIR", dataDir_.path() + "/"};
    smbiostest::ScopedEnv code_{"KESTREL_CODE_DIR", pmemtest::outDir() + "/"};
};

std::vector<unsigned int> handlesOf(SD::SmBios const& smbios) {
    std::vector<unsigned int> handles;
    for (SD::SmBios::Table const& table : smbios.getTables()) {
        handles.push_back(table.getHandle());
    }
    return handles;
}

// The plug-in acquired the sample table, of version major.minor, its
// structures in handle order.
void expectSampleTable(SD::SmBios const& smbios, int major, int minor) {
    EXPECT_EQ(smbios.getMajorVersion(), major);
    EXPECT_EQ(smbios.getMinorVersion(), minor);
    EXPECT_EQ(handlesOf(smbios),
              (std::vector<unsigned int>{0x0000, 0x0100, 0x0200, 0x0400, 0x0500}));
}

}  // namespace

TEST_F(PluginThroughPMem, ReadsTheTableThroughAnImage) {
    serveSampleImage();
    smbiostest::LogCapture log;
    SD::SmBios smbios;
    expectSampleTable(smbios, 2, 7);
    EXPECT_TRUE(log.contains("Constructor found _SM_ header at " + std::to_string(kAnchor)))
        << log.dump();
    EXPECT_TRUE(log.contains("Constructor success")) << log.dump();
}

TEST_F(PluginThroughPMem, FindsTheLegacyPartOfAnEntryPointBelowTheBiosArea) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> ep = pmemtest::smEntryPoint(table, 2, 7, kTableAddress);
    // A BCD revision that differs from the "_SM_" version shows which part
    // was used.
    ep[0x1E] = 0x26;
    pmemtest::setChecksum(ep, 0x15, 0x10, 0x1F);
    pmemtest::setChecksum(ep, 0x04, 0, 0x1F);
    env("PMEM_IMAGE", imageItem(file("ep.bin", ep), 0xE0000) + "," +
                          imageItem(file("table.bin", table), kTableAddress));
    smbiostest::LogCapture log;
    SD::SmBios smbios;
    EXPECT_EQ(smbios.getMajorVersion(), 2);
    EXPECT_EQ(smbios.getMinorVersion(), 6);
    EXPECT_EQ(smbios.getTables().size(), 5u);
    EXPECT_TRUE(log.contains("Constructo found _DMI_ header at ")) << log.dump();
}

TEST_F(PluginThroughPMem, ReadsA3xTableThroughAFakeSysfsFolder) {
    std::vector<uint8_t> const table = pmemtest::sampleTable();
    std::vector<uint8_t> const ep = pmemtest::sm3EntryPoint(3, 3, 0, 0x10000, 0x8F0000000ull);
    env("PMEM_SYSFS_DIR", sysfsFolder(&ep, &table));
    smbiostest::LogCapture log;
    SD::SmBios smbios;
    expectSampleTable(smbios, 3, 3);
    EXPECT_TRUE(log.contains("Constructor found _SM_ header at " + std::to_string(kBiosArea)))
        << log.dump();
}

TEST_F(PluginThroughPMem, WithoutAnySourceGetsAnEmptyTable) {
    env("PMEM_SOURCE", "sysfs");
    smbiostest::LogCapture log;
    SD::SmBios smbios;
    EXPECT_TRUE(smbios.getTables().empty());
    EXPECT_EQ(smbios.getMajorVersion(), 0);
    EXPECT_TRUE(log.contains("Constructor Exception=PMEM: library '" + pmemtest::outDir() +
                             "/libpmem.so' did not initialize."))
        << log.dump();
}

namespace {

// The version dmidecode printed for a dump: "SMBIOS 3.1.1 present." gives 3.1.
std::pair<unsigned int, unsigned int> dmidecodeVersion(std::string const& name) {
    std::pair<unsigned int, unsigned int> version(0, 0);
    EXPECT_TRUE(smbiostest::dmidecodeVersion(name, version.first, version.second))
        << "no version line in " << name << ".orig.txt";
    return version;
}

// The acquisition from an override file made of a dump (the entry point
// and table smbios_dumpformat reads from it), in a child process.
pmemtest::Acquired throughOverrideFile(std::vector<uint8_t> const& bin, std::string const& name,
                                       smbiostest::TempDir const& work) {
    smbiosdump::DumpImage image;
    std::string error;
    EXPECT_TRUE(smbiosdump::readDumpBin(bin, image, error)) << name << ": " << error;
    std::string const dataDir = work.file("data-" + name);
    smbiostest::writeOverrideDir(dataDir, image.header, image.table);
    // A code folder without libpmem.so: only the override file can serve.
    return pmemtest::acquireInChild({{"KESTREL_DATA_DIR", dataDir + "/"},
                                     {"KESTREL_CODE_DIR", work.file("no-code-here") + "/"}});
}

// The acquisition through the built libpmem.so (in the code directory
// SMBIOS_OUT_DIR) from the forced source PMEM_SOURCE=source, with the
// source's own variable set, in a child process whose data directory holds
// no override file.
pmemtest::Acquired throughLibrary(std::string const& source,
                                  std::pair<std::string, std::string> const& sourceVariable) {
    smbiostest::TempDir noOverride;
    return pmemtest::acquireInChild({{"KESTREL_DATA_DIR", noOverride.path() + "/"},
                                     {"KESTREL_CODE_DIR", pmemtest::outDir() + "/"},
                                     {"PMEM_SOURCE", source},
                                     sourceVariable});
}

// The corpus's --dump-bin images, by dump name, that start with the
// entry-point anchor `anchor` and hold at least the 0x20 bytes in front of
// their table.
std::map<std::string, std::vector<uint8_t>> corpusImagesStartingWith(std::string const& anchor) {
    std::map<std::string, std::vector<uint8_t>> images;
    for (std::string const& name : smbiostest::corpusNames()) {
        std::vector<uint8_t> bin =
            smbiostest::fileBytes(smbiostest::corpusDir() + "/" + name + ".bin");
        if (bin.size() >= 0x20 && std::string(bin.begin(), bin.begin() + anchor.size()) == anchor) {
            images[name] = std::move(bin);
        }
    }
    return images;
}

}  // namespace

// A 2.x dump served as an image at 0: dmidecode's --dump-bin layout puts the
// "_SM_" entry point at 0 and the table at 0x20. The plug-in's "_SM_" search
// (0xF0000-0xFFFFF) misses it, and the legacy search from 0 finds its
// "_DMI_" part at 0x10. The structures are the same as from the dump's
// override file; the version is the one the legacy part states in its BCD
// byte (0x1E of the dump), which for some machines differs from the "_SM_"
// version (a BCD byte of 0 gives 0.0).
TEST(PluginThroughPMemCorpus, Sm2DumpsServedAsAnImageAtZeroGiveTheOverrideFilesStructures) {
    SMBIOS_SKIP_WITHOUT_CORPUS("to serve");
    smbiostest::TempDir work;
    std::map<std::string, std::vector<uint8_t>> const images = corpusImagesStartingWith("_SM_");
    for (auto const& [name, bin] : images) {
        pmemtest::Acquired const expected = throughOverrideFile(bin, name, work);
        ASSERT_EQ(expected.failure, "") << name;
        pmemtest::Acquired const got = throughLibrary(
            "image", {"PMEM_IMAGE", smbiostest::corpusDir() + "/" + name + ".bin@0"});
        ASSERT_EQ(got.failure, "") << name;
        EXPECT_FALSE(got.structures.empty()) << name;
        EXPECT_EQ(got.structures, expected.structures) << name;
        EXPECT_EQ(expected.major, bin[6]) << name;
        EXPECT_EQ(expected.minor, bin[7]) << name;
        EXPECT_EQ(got.major, static_cast<unsigned int>(bin[0x1E] >> 4)) << name;
        EXPECT_EQ(got.minor, static_cast<unsigned int>(bin[0x1E] & 0x0F)) << name;
        EXPECT_EQ(got.revision, 0u) << name;
    }
    EXPECT_GT(images.size(), 0u) << "the corpus holds no 2.x dump";
}

// A 3.x dump served through a fake sysfs folder: its first 0x18 bytes are
// the "_SM3_" entry point (its table address set to 0x7F6E0000 here, the
// checksum kept right), the table is what follows 0x20 up to the entry
// point's maximum size. The plug-in sees the equivalent "_SM_" entry point
// and gets the dump's structures and the version dmidecode printed.
TEST(PluginThroughPMemCorpus, Sm3DumpsServedThroughSysfsGiveTheirStructuresAndVersion) {
    SMBIOS_SKIP_WITHOUT_CORPUS("to serve");
    smbiostest::TempDir work;
    std::map<std::string, std::vector<uint8_t>> const images = corpusImagesStartingWith("_SM3_");
    for (auto const& [name, bin] : images) {
        std::vector<uint8_t> ep = pmemtest::slice(bin, 0, 0x18);
        pmemtest::putQword(ep, 0x10, kTableAddress);
        pmemtest::setChecksum(ep, 5, 0, 0x18);
        size_t const tableSize = std::min<size_t>(pmemtest::dword(bin, 0x0C), bin.size() - 0x20);
        std::vector<uint8_t> const table = pmemtest::slice(bin, 0x20, 0x20 + tableSize);
        std::string const folder = work.file("sysfs-" + name);
        ASSERT_EQ(::mkdir(folder.c_str(), 0755), 0) << folder;
        smbiostest::writeFile(folder + "/smbios_entry_point", ep);
        smbiostest::writeFile(folder + "/DMI", table);

        pmemtest::Acquired const expected = throughOverrideFile(bin, name, work);
        ASSERT_EQ(expected.failure, "") << name;
        pmemtest::Acquired const got = throughLibrary("sysfs", {"PMEM_SYSFS_DIR", folder});
        ASSERT_EQ(got.failure, "") << name;
        EXPECT_FALSE(got.structures.empty()) << name;
        EXPECT_EQ(got.structures, expected.structures) << name;
        std::pair<unsigned int, unsigned int> const version = dmidecodeVersion(name);
        EXPECT_EQ(got.major, version.first) << name;
        EXPECT_EQ(got.minor, version.second) << name;
        EXPECT_EQ(got.revision, 0u) << name;
    }
    EXPECT_GT(images.size(), 0u) << "the corpus holds no 3.x dump";
}
