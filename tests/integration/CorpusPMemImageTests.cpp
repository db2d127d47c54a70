// A 2.x machine's dmidecode --dump-bin image served as physical memory at
// address 0 through libpmem.so (PMEM_IMAGE=FILE@0) gives the same tree as
// the override dump file made from it, apart from what the legacy entry
// point's BCD revision changes.
//
// Why it differs at all: the image holds its "_SM_" entry point at 0, outside
// the 0xF0000-0xFFFFF area the plug-in searches for it, so the plug-in finds
// the legacy "_DMI_" part at 0x10 in its search of the first megabyte and
// takes the SMBIOS version from that part's BCD revision byte (offset 0x1E of
// the image), where the override file gives the 2.x entry point's own major
// and minor bytes. The version shows in the management-interface node (306),
// the BIOS nodes' 104, 107 and 175, and in whether the first three UUID
// fields of the computer system (64) are written byte-reversed.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "HostRunner.h"
#include "TestSupport.h"

using nlohmann::json;

namespace {

// Whether the plug-in writes the first three UUID fields byte-reversed for
// this SMBIOS version.
bool reversesUuid(unsigned int major, unsigned int minor) {
    return major > 2 || (major == 2 && (minor == 6 || minor == 7 || minor == 8 || minor > 60));
}

std::string reversedUuid(std::string const& u) {
    return u.substr(6, 2) + u.substr(4, 2) + u.substr(2, 2) + u.substr(0, 2) + u.substr(8, 1) +
           u.substr(11, 2) + u.substr(9, 2) + u.substr(13, 1) + u.substr(16, 2) + u.substr(14, 2) +
           u.substr(18);
}

json inventory(std::vector<std::string> const& args, hosttest::Environment const& env) {
    hosttest::RunResult const result = hosttest::runHost(args, env);
    EXPECT_EQ(result.exitStatus, 0) << hosttest::describe(result);
    return json::parse(result.out, nullptr, false);
}

// Takes out of the tree what the SMBIOS version decides (and the clock), and
// hands back the computer systems' UUIDs.
std::vector<std::string> withoutVersionEffects(json& doc) {
    std::vector<std::string> uuids;
    for (json& node : doc.at("nodes")) {
        json& properties = node.at("properties");
        unsigned int const type = node.at("type");
        if (type == 15) {
            properties.erase("306");
        } else if (type == 40) {
            if (properties.contains("64")) {
                uuids.push_back(properties.at("64").at("value"));
            }
            properties.erase("64");
            properties.erase("126");
            properties.erase("127");
        } else if (type == 3 &&
                   (node.at("description") == "BIOS" || node.at("description") == "UEFI")) {
            properties.erase("104");
            properties.erase("107");
            properties.erase("175");
        }
    }
    return uuids;
}

}  // namespace

TEST(CorpusThroughPMemImage, LegacyEntryPointAtZeroGivesTheOverrideTreeApartFromTheVersion) {
    std::vector<std::string> const names = smbiostest::corpusNames();
    if (names.empty()) {
        GTEST_SKIP() << "no SMBIOS corpus folder (SMBIOS_CORPUS_DIR); nothing to read";
    }
    unsigned int compared = 0;
    for (std::string const& name : names) {
        std::string const bin = smbiostest::corpusDir() + "/" + name + ".bin";
        std::vector<uint8_t> const bytes = smbiostest::fileBytes(bin);
        smbiosdump::DumpImage image;
        std::string error;
        ASSERT_TRUE(smbiosdump::readDumpBin(bytes, image, error)) << name << ": " << error;
        if (image.anchor != "_SM_") {
            continue;  // 3.x images have no legacy part; they are served through sysfs
        }
        ++compared;
        smbiostest::TempDir dir;
        std::string const dump = dir.file(name + ".smbios.txt");
        smbiostest::writeFile(dump, smbiosdump::formatOverride(image.header, image.table));
        json fromFile = inventory({"--dump", dump, "--format", "json"}, {});

        hosttest::Environment env;
        env.set["PMEM_SOURCE"] = "image";
        env.set["PMEM_IMAGE"] = bin + "@0";
        env.set["KESTREL_DATA_DIR"] = dir.path() + "/";  // no override file there
        env.set["KESTREL_CODE_DIR"] = hosttest::outDir() + "/";
        json fromMemory = inventory({"--format", "json"}, env);
        ASSERT_FALSE(fromFile.is_discarded()) << name;
        ASSERT_FALSE(fromMemory.is_discarded()) << name;

        // The version each path reports: the entry point's own bytes, and
        // the legacy part's BCD revision.
        unsigned int const bcd = bytes.at(0x1E);
        json const fileVersion = fromFile.at("nodes")[0].at("properties").at("306").at("value");
        json const memoryVersion = fromMemory.at("nodes")[0].at("properties").at("306").at("value");
        EXPECT_EQ(fileVersion, json::array({image.major, image.minor})) << name;
        EXPECT_EQ(memoryVersion, json::array({bcd >> 4, bcd & 0x0F})) << name;

        std::vector<std::string> const fileUuids = withoutVersionEffects(fromFile);
        std::vector<std::string> const memoryUuids = withoutVersionEffects(fromMemory);
        EXPECT_EQ(fromFile, fromMemory) << name;
        ASSERT_EQ(fileUuids.size(), memoryUuids.size()) << name;
        bool const sameOrder =
            reversesUuid(image.major, image.minor) == reversesUuid(bcd >> 4, bcd & 0x0F);
        for (size_t i = 0; i < fileUuids.size(); ++i) {
            EXPECT_EQ(sameOrder ? fileUuids[i] : reversedUuid(fileUuids[i]), memoryUuids[i])
                << name;
        }
    }
    EXPECT_GT(compared, 0u) << "the corpus holds no 2.x machine";
}
