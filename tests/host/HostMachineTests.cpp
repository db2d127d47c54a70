// smbios-inventory and smbios-dump on "this machine": the real
// physical-memory library, its sources pointed at test folders. Without a
// table both say which sources were tried and why each failed, and exit 1;
// with a 3.x table larger than a 2.x entry point can describe both read
// the whole structures of its first 65535 bytes and say so in one warning.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <nlohmann/json.hpp>
#include <regex>
#include <string>
#include <vector>

#include "HostRunner.h"
#include "TestSupport.h"

namespace {

using json = nlohmann::json;

// This machine, as the tests stage it: no image, a sysfs folder of their
// own (empty unless they fill it), a memory device that does not exist, an
// empty data directory and the built libpmem.so in the code directory.
class Machine {
public:
    Machine() {
        env_.set["KESTREL_DATA_DIR"] = data_.path() + "/";
        env_.set["KESTREL_CODE_DIR"] = hosttest::outDir() + "/";
        env_.set["PMEM_SYSFS_DIR"] = sysfs_.path();
        env_.set["PMEM_DEVMEM_FILE"] = data_.file("no-mem");
        env_.unset = {"PMEM_IMAGE", "PMEM_SOURCE", "QNLOG_LEVEL", "QNLOG_TRACE_LEVEL"};
    }

    // The kernel's copy of a 3.x table: a "_SM3_" entry point and the table.
    void sysfsTables(std::vector<uint8_t> const& table) {
        smbiostest::writeFile(
            sysfs_.file("smbios_entry_point"),
            smbiostest::sm3EntryPoint(3, 2, 0, static_cast<uint32_t>(table.size()), 0x200000));
        smbiostest::writeFile(sysfs_.file("DMI"), table);
    }

    hosttest::Environment const& env() const { return env_; }
    std::string sysfs() const { return sysfs_.path(); }
    smbiostest::TempDir& scratch() { return data_; }

private:
    smbiostest::TempDir data_;
    smbiostest::TempDir sysfs_;
    hosttest::Environment env_;
};

std::string pmemPath() { return hosttest::outDir() + "/libpmem.so"; }
std::string dumpToolPath() { return hosttest::outDir() + "/smbios-dump"; }

// The memory-device nodes (type 19) of a JSON inventory.
size_t memoryDevices(std::string const& out) {
    json const doc = json::parse(out, nullptr, false);
    size_t count = 0;
    if (doc.is_discarded()) {
        return 0;
    }
    for (json const& node : doc.at("nodes")) {
        count += node.at("type") == 19 ? 1 : 0;
    }
    return count;
}

// The figures of a largeServerTable: its size, the size of the structures
// before the first memory device and of one device.
struct LargeTable {
    explicit LargeTable(unsigned devices)
        : bytes(smbiostest::largeServerTable(devices)),
          head(smbiostest::largeServerTable(0).size() - 6),
          device(smbiostest::largeServerTable(1).size() - 6 - head) {}
    size_t devicesIn65535() const { return (0xFFFF - head) / device; }
    size_t bytesIn65535() const { return head + devicesIn65535() * device; }

    std::vector<uint8_t> bytes;
    size_t head;
    size_t device;
};

// "warning: SUBJECT is N bytes (S structures); ..." for a 1,100-device table.
std::string expectedWarning(std::string const& subject, LargeTable const& large) {
    return "warning: " + subject + " is " + std::to_string(large.bytes.size()) + " bytes (" +
           std::to_string(5 + 1100 + 1) +
           " structures); the 2.x entry point that the plug-in reads holds the first " +
           std::to_string(large.bytesIn65535()) + " bytes (" +
           std::to_string(5 + large.devicesIn65535()) + " structures)\n";
}

}  // namespace

// No source at all (a container without /sys/firmware/dmi or /dev/mem):
// one line per source with its reason, the hint, exit 1, no inventory.
TEST(HostOnThisMachine, NoSourceAtAllSaysWhyForEachSourceAndExits1) {
    Machine machine;
    hosttest::RunResult const run = hosttest::runHost({}, machine.env());
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_EQ(run.out, "") << "no inventory is printed for a machine without a table";
    std::string const hint = ::geteuid() == 0
                                 ? "this machine shows no SMBIOS table, not even to root; "
                                 : "run it as root (the kernel's SMBIOS tables and /dev/mem are "
                                   "root's to read), or ";
    EXPECT_EQ(run.err,
              "smbios-inventory: no SMBIOS table could be read from this machine\n"
              "smbios-inventory: " +
                  pmemPath() +
                  " tried:\n"
                  "smbios-inventory:   image: PMEM_IMAGE is not set\n"
                  "smbios-inventory:   sysfs: " +
                  machine.sysfs() +
                  "/smbios_entry_point: No such file or directory\n"
                  "smbios-inventory:   devmem: " +
                  machine.scratch().file("no-mem") +
                  ": No such file or directory\n"
                  "smbios-inventory: " +
                  hint + "read a saved table with --dump FILE or --from-bin FILE\n");
}

TEST(DumpOnThisMachine, NoSourceAtAllSaysWhyForEachSourceAndExits1) {
    Machine machine;
    std::string const out = machine.scratch().file("smbios.txt");
    hosttest::RunResult const run =
        hosttest::runProgram(dumpToolPath(), {"--from-machine", "-o", out}, machine.env());
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("smbios-dump: " + pmemPath() +
                           " tried:\n"
                           "smbios-dump:   image: PMEM_IMAGE is not set\n"
                           "smbios-dump:   sysfs: " +
                           machine.sysfs() + "/smbios_entry_point: No such file or directory\n"),
              std::string::npos)
        << hosttest::describe(run);
    EXPECT_NE(run.err.find("read a saved table with --from-bin FILE (from dmidecode --dump-bin)"),
              std::string::npos)
        << hosttest::describe(run);
    struct stat status;
    EXPECT_NE(::stat(out.c_str(), &status), 0) << "nothing is written";
}

// An ordinary user on a server: the kernel's tables are there but root's
// only. As root the host runs as nobody, as anyone else as itself.
TEST(HostOnThisMachine, TablesOnlyRootMayReadArePermissionDenied) {
    Machine machine;
    machine.sysfsTables(smbiostest::largeServerTable(4));
    ASSERT_EQ(::chmod((machine.sysfs() + "/smbios_entry_point").c_str(), 0), 0);
    ASSERT_EQ(::chmod((machine.sysfs() + "/DMI").c_str(), 0), 0);
    ASSERT_EQ(::chmod(machine.sysfs().c_str(), 0755), 0);
    ASSERT_EQ(::chmod(machine.scratch().path().c_str(), 0755), 0);
    hosttest::RunResult const run =
        hosttest::runProgramUnprivileged(hosttest::hostPath(), {}, machine.env());
    if (!run.startError.empty()) {
        GTEST_SKIP() << run.startError;
    }
    EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    EXPECT_NE(run.err.find("smbios-inventory:   sysfs: " + machine.sysfs() +
                           "/smbios_entry_point: Permission denied\n"),
              std::string::npos)
        << hosttest::describe(run);
    EXPECT_NE(run.err.find("run it as root"), std::string::npos) << hosttest::describe(run);
}

// A 3.x table of about 100 KB: the host reads the structures of its first
// 65535 bytes and warns once, exit 0.
TEST(HostOnThisMachine, LargeTableIsReadUpTo65535BytesWithOneWarning) {
    Machine machine;
    LargeTable const large(1100);
    ASSERT_GT(large.bytes.size(), 95000u);
    machine.sysfsTables(large.bytes);
    hosttest::RunResult const run = hosttest::runHost({"--format", "json"}, machine.env());
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(run.err,
              "smbios-inventory: " + expectedWarning("this machine's SMBIOS table", large));
    EXPECT_EQ(memoryDevices(run.out), large.devicesIn65535());
}

// A table just under 64 KB is read whole, without a word.
TEST(HostOnThisMachine, TableJustUnder64KiBIsReadWholeWithoutWarning) {
    Machine machine;
    LargeTable const large(700);
    ASSERT_LE(large.bytes.size(), 0xFFFFu);
    ASSERT_GT(large.bytes.size(), 60000u);
    machine.sysfsTables(large.bytes);
    hosttest::RunResult const run = hosttest::runHost({"--format", "json"}, machine.env());
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(run.err, "");
    EXPECT_EQ(memoryDevices(run.out), 700u);
}

TEST(DumpOnThisMachine, LargeTableIsCapturedUpTo65535BytesWithOneWarning) {
    Machine machine;
    LargeTable const large(1100);
    machine.sysfsTables(large.bytes);
    std::string const out = machine.scratch().file("smbios.txt");
    hosttest::RunResult const run =
        hosttest::runProgram(dumpToolPath(), {"--from-machine", "-o", out}, machine.env());
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_NE(run.err.find("smbios-dump: " + expectedWarning("this machine's SMBIOS table", large)),
              std::string::npos)
        << hosttest::describe(run);
    EXPECT_NE(run.err.find(std::to_string(large.bytesIn65535()) + " bytes"), std::string::npos)
        << hosttest::describe(run);
    // The captured file gives the same devices as the machine.
    hosttest::RunResult const view = hosttest::runHost({"--dump", out, "--format", "json"});
    ASSERT_EQ(view.exitStatus, 0) << hosttest::describe(view);
    EXPECT_EQ(memoryDevices(view.out), large.devicesIn65535());
}

// Quiet by default: the plug-in's log reaches standard error only when asked.
TEST(HostOnThisMachine, PluginLogIsWrittenOnlyWhenAsked) {
    Machine machine;
    LargeTable const small(2);
    machine.sysfsTables(small.bytes);
    hosttest::RunResult const quiet = hosttest::runHost({}, machine.env());
    ASSERT_EQ(quiet.exitStatus, 0) << hosttest::describe(quiet);
    EXPECT_EQ(quiet.err, "");
    hosttest::RunResult const asked = hosttest::runHost({"--log-level", "3000"}, machine.env());
    ASSERT_EQ(asked.exitStatus, 0) << hosttest::describe(asked);
    EXPECT_NE(asked.err.find("initialize entry"), std::string::npos) << hosttest::describe(asked);
    // The computer system's current time (property 126) may tick between
    // the two runs; the rest never changes with the log.
    std::regex const clock("[0-9]{4}-[0-9]{2}-[0-9]{2} [0-9]{2}:[0-9]{2}:[0-9]{2}");
    EXPECT_EQ(std::regex_replace(asked.out, clock, "<time>"),
              std::regex_replace(quiet.out, clock, "<time>"))
        << "the log never changes the inventory";
}

// --from-bin of a large 3.x table takes the structures of its first 65535
// bytes and names the file in the warning.
TEST(HostOnThisMachine, FromBinOfALargeTableIsReadUpTo65535BytesWithOneWarning) {
    Machine machine;
    LargeTable const large(1100);
    std::string const bin = machine.scratch().file("large.bin");
    smbiostest::writeFile(bin, smbiostest::sm3DumpBin(large.bytes));
    hosttest::RunResult const run =
        hosttest::runHost({"--from-bin", bin, "--format", "json"}, machine.env());
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(run.err, "smbios-inventory: " + expectedWarning("the SMBIOS table in " + bin, large));
    EXPECT_EQ(memoryDevices(run.out), large.devicesIn65535());
}

TEST(DumpOnThisMachine, FromBinOfALargeTableIsCapturedUpTo65535BytesWithOneWarning) {
    Machine machine;
    LargeTable const large(1100);
    std::string const bin = machine.scratch().file("large.bin");
    smbiostest::writeFile(bin, smbiostest::sm3DumpBin(large.bytes));
    std::string const out = machine.scratch().file("smbios.txt");
    hosttest::RunResult const run =
        hosttest::runProgram(dumpToolPath(), {"--from-bin", bin, "-o", out}, machine.env());
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_NE(run.err.find("smbios-dump: " + expectedWarning("the SMBIOS table in " + bin, large)),
              std::string::npos)
        << hosttest::describe(run);
    hosttest::RunResult const view = hosttest::runHost({"--dump", out, "--format", "json"});
    ASSERT_EQ(view.exitStatus, 0) << hosttest::describe(view);
    EXPECT_EQ(memoryDevices(view.out), large.devicesIn65535());
}
