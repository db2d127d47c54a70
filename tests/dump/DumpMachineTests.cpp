// smbios-dump --from-machine, run as a child process on stand-in
// physical-memory libraries whose fake memory the environment names
// (FAKE_PMEM_IMAGE=FILE@BASE,...): a machine with a "_SM_" entry point
// in the BIOS area, one with only a legacy "_DMI_" entry point, libraries
// that fail, and a missing library.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "DumpTestSupport.h"
#include "HostRunner.h"
#include "TestSupport.h"

using dumptest::Bytes;
using hosttest::describe;
using hosttest::RunResult;

namespace {

unsigned long const kSmAnchor = 0xF5A30;  // 16-byte aligned, inside 0xF0000-0xFFFFF
uint32_t const kTableAddress = 0x7F6E0000;

std::string hex(unsigned long value) {
    char text[32];
    std::snprintf(text, sizeof text, "%lX", value);
    return text;
}

// A fake machine: memory regions written to files, and the environment that
// gives them to the stand-in library.
class FakeMachine {
public:
    void map(unsigned long base, Bytes const& bytes) {
        std::string const file = dir_.file("region-" + hex(base) + ".bin");
        smbiostest::writeFile(file, bytes);
        if (!regions_.empty()) {
            regions_ += ',';
        }
        regions_ += file + "@" + hex(base);
    }

    hosttest::Environment environment() const {
        hosttest::Environment env;
        env.set["FAKE_PMEM_IMAGE"] = regions_;
        return env;
    }

    // The folder for outputs; it holds the region files too.
    smbiostest::TempDir const& dir() const { return dir_; }
    // The dump file the tests write.
    std::string output() const { return dir_.file("smbios.txt"); }

private:
    smbiostest::TempDir dir_;
    std::string regions_;
};

// A machine with a 2.x entry point in the BIOS area and the sample table
// high up. Returns the entry point.
Bytes mapSmMachine(FakeMachine& machine, unsigned long anchor = kSmAnchor) {
    Bytes const table = dumptest::sampleTable();
    Bytes const ep = smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(table.size()),
                                                  kTableAddress, 3, 40);
    // The BIOS area around the anchor, as a machine has it.
    Bytes bios(0x10000, 0);
    std::copy(ep.begin(), ep.end(), bios.begin() + static_cast<long>(anchor - 0xF0000));
    machine.map(0xF0000, bios);
    machine.map(kTableAddress, table);
    return ep;
}

RunResult dumpMachine(FakeMachine const& machine, std::string const& library,
                      std::string const& out, hosttest::Environment env = hosttest::Environment()) {
    hosttest::Environment merged = machine.environment();
    for (auto const& variable : env.set) {
        merged.set[variable.first] = variable.second;
    }
    return dumptest::runDump({"--from-machine", "--pmem", library, "-o", out}, merged);
}

// The dump ran and wrote `out`, which the plug-in reads back as `header`
// and `table`.
void expectWritten(RunResult const& run, std::string const& out, Bytes const& header,
                   Bytes const& table) {
    ASSERT_EQ(run.exitStatus, 0) << describe(run);
    dumptest::ReadBack const back = dumptest::readBackThroughPlugin(out);
    ASSERT_TRUE(back.ok()) << back.imported << " " << back.head << " " << back.tables;
    EXPECT_EQ(back.header, header);
    EXPECT_EQ(back.table, table);
}

TEST(DumpMachine, SmEntryPointAndTableOfMachine) {
    FakeMachine machine;
    Bytes const ep = mapSmMachine(machine);
    RunResult const run = dumpMachine(machine, dumptest::fakePMem("full"), machine.output());
    expectWritten(run, machine.output(), ep, dumptest::sampleTable());
    EXPECT_EQ(run.err, "smbios-dump: wrote " + machine.output() + ": SMBIOS 2.7, 3 structures, " +
                           std::to_string(dumptest::sampleTable().size()) + " bytes\n");
}

TEST(DumpMachine, DmiOnlyMachineGivesLegacyEntryPoint) {
    FakeMachine machine;
    Bytes const table = dumptest::sampleTable();
    Bytes const dmi =
        smbiosdump::makeDmiEntryPoint(0x24, static_cast<uint16_t>(table.size()), 0x000E8000, 3);
    Bytes low(0x1000, 0);
    std::copy(dmi.begin(), dmi.end(), low.begin() + 0x9A0);
    machine.map(0x9000, low);  // the anchor at 0x99A0, far below the BIOS area
    machine.map(0xE8000, table);
    RunResult const run = dumpMachine(machine, dumptest::fakePMem("full"), machine.output());
    expectWritten(run, machine.output(), dmi, table);
    EXPECT_NE(run.err.find("SMBIOS 2.4, 3 structures"), std::string::npos) << describe(run);
}

TEST(DumpMachine, SmAnchorBelowBiosAreaIsFoundByItsDmiPart) {
    // Outside 0xF0000-0xFFFFF the "_SM_" search misses; the legacy search
    // finds the "_DMI_" anchor 16 bytes into the same entry point.
    FakeMachine machine;
    Bytes const table = dumptest::sampleTable();
    Bytes const ep = smbiosdump::makeSmEntryPoint(2, 6, static_cast<uint16_t>(table.size()),
                                                  kTableAddress, 3, 40);
    machine.map(0xE0000, ep);
    machine.map(kTableAddress, table);
    RunResult const run = dumpMachine(machine, dumptest::fakePMem("full"), machine.output());
    expectWritten(run, machine.output(), Bytes(ep.begin() + 0x10, ep.end()), table);
    EXPECT_NE(run.err.find("SMBIOS 2.6"), std::string::npos) << describe(run);
}

void expectMachineRefused(RunResult const& run, std::string const& says,
                          FakeMachine const& machine) {
    EXPECT_EQ(run.exitStatus, 1) << describe(run);
    EXPECT_EQ(run.err.rfind("smbios-dump: cannot read this machine's SMBIOS table: ", 0), 0u)
        << describe(run);
    EXPECT_NE(run.err.find(says), std::string::npos) << describe(run);
    EXPECT_FALSE(dumptest::exists(machine.output()));
    for (std::string const& name : dumptest::folderEntries(machine.dir().path())) {
        EXPECT_EQ(name.rfind("region-", 0), 0u) << "left behind: " << name;
    }
}

// The stand-in library, told by `variable`=0 to fail, fails the dump of a
// machine with a table with a message that says `says`.
void expectLibraryFailure(std::string const& variable, std::string const& says) {
    FakeMachine machine;
    mapSmMachine(machine);
    hosttest::Environment env;
    env.set[variable] = "0";
    expectMachineRefused(dumpMachine(machine, dumptest::fakePMem("full"), machine.output(), env),
                         says, machine);
}

TEST(DumpMachine, LibraryThatDoesNotInitializeFails) {
    expectLibraryFailure("FAKE_PMEM_INITIALIZED", "PMemIsInitialized returned 0");
}

TEST(DumpMachine, FailingOpenFails) {
    expectLibraryFailure("FAKE_PMEM_OPEN", "PMemOpen returned 0");
}

TEST(DumpMachine, FailingCloseFails) {
    expectLibraryFailure("FAKE_PMEM_CLOSE", "PMemClose returned 0");
}

TEST(DumpMachine, UnreadableTableFails) {
    FakeMachine machine;
    Bytes const table = dumptest::sampleTable();
    Bytes const ep = smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(table.size()),
                                                  kTableAddress, 3, 40);
    machine.map(kSmAnchor, ep);  // no table where it points
    expectMachineRefused(dumpMachine(machine, dumptest::fakePMem("full"), machine.output()),
                         "PMemRead of the structure table", machine);
}

TEST(DumpMachine, MachineWithoutEntryPointFails) {
    FakeMachine machine;
    machine.map(0, Bytes(0x100000, 0));
    expectMachineRefused(dumpMachine(machine, dumptest::fakePMem("full"), machine.output()),
                         "no _SM_ entry point", machine);
}

TEST(DumpMachine, MissingLibraryFails) {
    FakeMachine machine;
    mapSmMachine(machine);
    std::string const missing = machine.dir().file("lib/libpmem.so");
    RunResult const run = dumpMachine(machine, missing, machine.output());
    expectMachineRefused(run, "cannot load the physical-memory library " + missing, machine);
}

TEST(DumpMachine, LibraryWithoutSearchFails) {
    FakeMachine machine;
    mapSmMachine(machine);
    expectMachineRefused(dumpMachine(machine, dumptest::fakePMem("nosearch"), machine.output()),
                         "does not export PMemSearch", machine);
}

// The default library: beside the program, else in ../lib from it. A copy
// of the program in a private folder gets a stand-in in either place.
void expectDefaultLibraryFound(std::string const& programFolder, std::string const& libFolder) {
    namespace fs = std::filesystem;
    FakeMachine machine;
    Bytes const ep = mapSmMachine(machine);
    std::string const root = machine.dir().file("install");
    fs::create_directories(root + "/" + programFolder);
    fs::create_directories(root + "/" + libFolder);
    std::string const program = root + "/" + programFolder + "/smbios-dump";
    fs::copy_file(dumptest::toolPath(), program);
    fs::copy_file(dumptest::fakePMem("full"), root + "/" + libFolder + "/libpmem.so");
    RunResult const run = hosttest::runProgram(program, {"--from-machine", "-o", machine.output()},
                                               machine.environment());
    expectWritten(run, machine.output(), ep, dumptest::sampleTable());

    // Without the library the default is named.
    fs::remove(root + "/" + libFolder + "/libpmem.so");
    RunResult const missing = hosttest::runProgram(
        program, {"--from-machine", "-o", machine.dir().file("other.txt")}, machine.environment());
    EXPECT_EQ(missing.exitStatus, 1) << describe(missing);
    EXPECT_NE(missing.err.find("/bin/../lib/libpmem.so"), std::string::npos) << describe(missing);
}

TEST(DumpMachine, DefaultLibraryBesideProgram) { expectDefaultLibraryFound("bin", "bin"); }

TEST(DumpMachine, DefaultLibraryInLibFolderBesideBin) { expectDefaultLibraryFound("bin", "lib"); }

}  // namespace
