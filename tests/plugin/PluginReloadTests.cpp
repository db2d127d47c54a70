// The plug-in loaded, initialised and unloaded again and again, as an agent
// that reloads its plug-ins does: every unload really unloads the library,
// and a cycle leaves nothing behind on the heap. Under LeakSanitizer (the
// sanitizer build) any byte left behind fails the test program at exit.
#include <gtest/gtest.h>
#include <malloc.h>
#include <sys/stat.h>

#include <string>
#include <vector>

#include "DumpFormat.h"
#include "IC/Number.h"
#include "PluginLoader.h"
#include "TestSupport.h"

#if defined(__SANITIZE_ADDRESS__)
#define PLUGIN_TEST_SANITIZED 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define PLUGIN_TEST_SANITIZED 1
#endif
#endif

namespace {

int const kCycles = 200;

// Bytes in use on the heap, large blocks (mapped of their own) included.
size_t heapInUse() {
    struct mallinfo2 const info = mallinfo2();
    return info.uordblks + info.hblkhd;
}

// One cycle: load, OpenMI, initialize, unload. Returns the number of nodes
// the initialize made, 0 when a step failed (reported).
size_t cycle() {
    plugintest::LoadedPlugin plugin;
    EXPECT_TRUE(plugin.loaded()) << plugin.error();
    if (!plugin.loaded()) {
        return 0;
    }
    IC::Error const result = plugin.mi().initialize(1, IC::Number(0u), IC::Number(0u));
    EXPECT_EQ(result.getStatus(), 0u);
    std::vector<IC::Node*> nodes;
    plugin.mi().getMap(nodes);
    return nodes.size();
}

// Runs the cycles and checks each made the same tree and unloaded the
// library; outside the sanitizer build also that the heap in use did not
// grow from the tenth cycle to the last (the first ones fill the runtimes'
// own caches) by more than the C library's loader keeps for its own
// bookkeeping, a few bytes a load, given back at exit. A leak of the
// plug-in's shows as kilobytes a cycle.
void runCycles(size_t minimumNodes) {
    size_t const firstNodes = cycle();
    ASSERT_GE(firstNodes, minimumNodes);
    ASSERT_FALSE(plugintest::pluginIsMapped()) << "dlclose left the plug-in loaded";
    size_t heapAfterWarmUp = 0;
    for (int i = 1; i < kCycles; ++i) {
        ASSERT_EQ(cycle(), firstNodes) << "cycle " << i;
        ASSERT_FALSE(plugintest::pluginIsMapped()) << "cycle " << i;
        if (i == 9) {
            heapAfterWarmUp = heapInUse();
        }
    }
#ifndef PLUGIN_TEST_SANITIZED
    size_t const heapAtEnd = heapInUse();
    size_t const measuredCycles = kCycles - 10;
    EXPECT_LE(heapAtEnd, heapAfterWarmUp + 64 * measuredCycles)
        << "the heap grew by " << (heapAtEnd - heapAfterWarmUp) << " bytes over " << measuredCycles
        << " cycles";
#else
    (void)heapAfterWarmUp;
#endif
}

class PluginReload : public ::testing::Test {
protected:
    smbiostest::TempDir data_;
    smbiostest::TempDir code_;
    smbiostest::ScopedEnv dataDir_{"KESTREL_DATA_DIR", data_.path()};
};

// The table from the override file each time.
TEST_F(PluginReload, TwoHundredCyclesOnTheOverrideFileLeaveNothingBehind) {
    std::string const example =
        std::string(std::getenv("SMBIOS_SOURCE_DIR")) + "/examples/demo-server.smbios.txt";
    mkdir((data_.path() + "/SmBiosOverride").c_str(), 0700);
    smbiostest::writeFile(data_.path() + "/SmBiosOverride/smbios.txt",
                          smbiostest::fileText(example));
    smbiostest::ScopedEnv codeDir("KESTREL_CODE_DIR", code_.path());
    runCycles(70);
}

// The table from memory through libpmem.so each time (its sysfs source on
// files of the test's own), so that the physical-memory library is loaded
// and unloaded in every cycle too.
TEST_F(PluginReload, TwoHundredCyclesThroughThePhysicalMemoryLibraryLeaveNothingBehind) {
    smbiostest::TableBuilder table;
    table.add(
        smbiostest::Structure(0, 0x0000).str("Corvane").str("1.0").word(0xE000).str("").byte(0));
    table.add(smbiostest::Structure(1, 0x0001)
                  .str("Corvane")
                  .str("RS-7400")
                  .str("1")
                  .str("S1")
                  .bytes(std::vector<uint8_t>(16, 0x11))
                  .byte(6));
    table.add(smbiostest::Structure(3, 0x0003).str("Corvane").byte(0x17).str("").str("C1").str(""));
    table.endOfTable(0x0004);
    std::vector<uint8_t> const bytes = table.build();
    std::vector<uint8_t> const entryPoint = smbiosdump::makeSmEntryPoint(
        2, 7, static_cast<uint16_t>(bytes.size()), 0x000E1000, table.count(), table.maxSize());
    smbiostest::TempDir tables;
    smbiostest::writeFile(tables.file("smbios_entry_point"), entryPoint);
    smbiostest::writeFile(tables.file("DMI"), bytes);
    smbiostest::ScopedEnv source("PMEM_SOURCE", "sysfs");
    smbiostest::ScopedEnv sysfs("PMEM_SYSFS_DIR", tables.path());
    smbiostest::ScopedEnv codeDir("KESTREL_CODE_DIR", std::getenv("SMBIOS_OUT_DIR"));
    runCycles(5);
}

}  // namespace
