// The built smbios-dump run as a child process: its command line, its
// outputs (a file, the install location, standard output), its refusal to
// replace a file without --force and anything but a regular file or a
// symbolic link at all, and its exits on bad input with nothing written.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "DumpFormat.h"
#include "DumpTestSupport.h"
#include "HostRunner.h"
#include "PluginRead.h"
#include "TestSupport.h"

using dumptest::Bytes;
using dumptest::runDump;
using hosttest::describe;
using hosttest::RunResult;
using smbiostest::TempDir;

namespace {

// A folder holding the sample table as a raw table file "table.bin".
struct TableInput {
    TableInput() { smbiostest::writeFile(path(), dumptest::sampleTable()); }
    std::string path() const { return dir.file("table.bin"); }
    TempDir dir;
};

// A command line smbios-dump refuses, and what it says.
struct RefusedLine {
    std::vector<std::string> args;
    std::string says;
};

// The command line as a trace names it: smbios-dump 'ARG' 'ARG'...
std::string commandText(std::vector<std::string> const& args) {
    std::string text = "smbios-dump";
    for (std::string const& arg : args) {
        text += " '" + arg + "'";
    }
    return text;
}

// smbios-dump refuses the command line: exit status 2, nothing on standard
// output, nothing written beside the input. The run, for what it said.
RunResult expectRefusedLine(TableInput const& input, std::vector<std::string> const& args) {
    RunResult const run = runDump(args);
    EXPECT_EQ(run.exitStatus, 2) << describe(run);
    EXPECT_TRUE(run.out.empty()) << describe(run);
    EXPECT_EQ(dumptest::folderEntries(input.dir.path()), (std::vector<std::string>{"table.bin"}));
    return run;
}

std::string wroteLine(std::string const& target) {
    return "smbios-dump: wrote " + target + ": SMBIOS 2.7, 3 structures, " +
           std::to_string(dumptest::sampleTable().size()) + " bytes\n";
}

TEST(DumpTool, FromTableWritesFileAndSaysWhat) {
    TableInput input;
    std::string const out = input.dir.file("smbios.txt");
    RunResult const run = runDump({"--from-table", input.path(), "--version", "2.7", "-o", out});
    ASSERT_EQ(run.exitStatus, 0) << describe(run);
    EXPECT_EQ(run.err, wroteLine(out));
    EXPECT_TRUE(run.out.empty()) << describe(run);
    dumptest::ReadBack const back = dumptest::readBackThroughPlugin(out);
    ASSERT_TRUE(back.ok()) << back.imported << " " << back.head << " " << back.tables;
    EXPECT_EQ(back.table, dumptest::sampleTable());
    ASSERT_EQ(back.header.size(), 31u);
    EXPECT_EQ(back.header[6], 2);
    EXPECT_EQ(back.header[7], 7);
}

TEST(DumpTool, OutputLinesAreOfModerateLength) {
    TableInput input;
    smbiostest::TableBuilder big;
    for (uint16_t handle = 0; handle < 40; ++handle) {
        big.add(smbiostest::Structure(0x80, handle).bytes(Bytes(60, 0x5A)).str("text"));
    }
    smbiostest::writeFile(input.path(), big.endOfTable(0x100).build());
    std::string const out = input.dir.file("smbios.txt");
    RunResult const run =
        runDump({"--from-table", input.path(), "--version", "3.2", "--output", out});
    ASSERT_EQ(run.exitStatus, 0) << describe(run);
    std::string const text = dumptest::readText(out);
    ASSERT_GT(text.size(), 2000u);
    size_t longest = 0;
    size_t lines = 0;
    size_t begin = 0;
    while (begin < text.size()) {
        size_t const end = text.find('\n', begin);
        ASSERT_NE(end, std::string::npos) << "last line without a line end";
        longest = std::max(longest, end - begin);
        ++lines;
        begin = end + 1;
    }
    EXPECT_LE(longest, 80u);
    EXPECT_GT(lines, 30u);
    EXPECT_EQ(text.compare(text.size() - 14, 14, "</SHOWSMBIOS>\n"), 0);
}

TEST(DumpTool, RefusesToReplaceExistingFileWithoutForce) {
    TableInput input;
    std::string const out = input.dir.file("smbios.txt");
    smbiostest::writeFile(out, "keep me\n");
    RunResult const run = runDump({"--from-table", input.path(), "--version", "2.7", "-o", out});
    EXPECT_EQ(run.exitStatus, 1) << describe(run);
    EXPECT_NE(run.err.find(out + " exists"), std::string::npos) << describe(run);
    EXPECT_NE(run.err.find("--force"), std::string::npos) << describe(run);
    EXPECT_EQ(dumptest::readText(out), "keep me\n");
    EXPECT_EQ(dumptest::folderEntries(input.dir.path()),
              (std::vector<std::string>{"smbios.txt", "table.bin"}));
}

TEST(DumpTool, ForceReplacesExistingFile) {
    TableInput input;
    std::string const out = input.dir.file("smbios.txt");
    smbiostest::writeFile(out, "old\n");
    RunResult const run =
        runDump({"--from-table", input.path(), "--version", "2.7", "-o", out, "--force"});
    ASSERT_EQ(run.exitStatus, 0) << describe(run);
    EXPECT_EQ(run.err, wroteLine(out));
    dumptest::ReadBack const back = dumptest::readBackThroughPlugin(out);
    ASSERT_TRUE(back.ok());
    EXPECT_EQ(back.table, dumptest::sampleTable());
    EXPECT_EQ(dumptest::folderEntries(input.dir.path()),
              (std::vector<std::string>{"smbios.txt", "table.bin"}));
}

TEST(DumpTool, DashWritesToStandardOutput) {
    TableInput input;
    RunResult const run = runDump({"--from-table", input.path(), "--version", "2.7", "-o", "-"});
    ASSERT_EQ(run.exitStatus, 0) << describe(run);
    Bytes const table = dumptest::sampleTable();
    smbiosdump::PluginRead const back = smbiosdump::readOverrideText(run.out);
    ASSERT_TRUE(back.ok()) << back.imported << " " << back.head << " " << back.tables;
    EXPECT_EQ(back.table, table);
    EXPECT_EQ(run.out, smbiosdump::formatOverride(back.header, table));
    EXPECT_EQ(run.err, wroteLine("standard output"));
    EXPECT_EQ(dumptest::folderEntries(input.dir.path()), (std::vector<std::string>{"table.bin"}));
}

TEST(DumpTool, InstallWritesOverrideFileUnderDataDir) {
    TableInput input;
    TempDir data;
    RunResult const run = runDump(
        {"--from-table", input.path(), "--version", "2.7", "--install", "--data-dir", data.path()});
    ASSERT_EQ(run.exitStatus, 0) << describe(run);
    std::string const target = data.path() + "/SmBiosOverride/smbios.txt";
    EXPECT_EQ(run.err, wroteLine(target));
    EXPECT_EQ(dumptest::folderEntries(data.file("SmBiosOverride")),
              (std::vector<std::string>{"smbios.txt"}));
    dumptest::ReadBack const back = dumptest::readBackThroughPlugin(target);
    ASSERT_TRUE(back.ok());
    EXPECT_EQ(back.table, dumptest::sampleTable());

    // A second install refuses, a forced one replaces.
    RunResult const again = runDump(
        {"--from-table", input.path(), "--version", "2.7", "--install", "--data-dir", data.path()});
    EXPECT_EQ(again.exitStatus, 1) << describe(again);
    EXPECT_NE(again.err.find(target), std::string::npos) << describe(again);
    RunResult const forced = runDump({"--from-table", input.path(), "--version", "2.8", "--install",
                                      "--data-dir", data.path() + "/", "--force"});
    ASSERT_EQ(forced.exitStatus, 0) << describe(forced);
    dumptest::ReadBack const replaced = dumptest::readBackThroughPlugin(target);
    ASSERT_TRUE(replaced.ok());
    EXPECT_EQ(replaced.header.at(7), 8);
}

TEST(DumpTool, InstallUsesKestrelDataDirFromEnvironment) {
    TableInput input;
    TempDir data;
    hosttest::Environment env;
    env.set["KESTREL_DATA_DIR"] = data.path() + "/";
    RunResult const run =
        runDump({"--from-table", input.path(), "--version", "2.7", "--install"}, env);
    ASSERT_EQ(run.exitStatus, 0) << describe(run);
    std::string const target = data.path() + "/SmBiosOverride/smbios.txt";
    EXPECT_EQ(run.err, wroteLine(target));
    EXPECT_TRUE(dumptest::readBackThroughPlugin(target).ok());
}

TEST(DumpTool, InstalledFileIsWhatPluginReadsFirst) {
    if (hosttest::outDir().empty()) {
        GTEST_SKIP() << "SMBIOS_OUT_DIR is unset; no built host and plug-in to run";
    }
    TableInput input;
    TempDir data;
    std::string const file = input.dir.file("smbios.txt");
    ASSERT_EQ(runDump({"--from-table", input.path(), "--version", "2.7", "-o", file}).exitStatus,
              0);
    ASSERT_EQ(runDump({"--from-table", input.path(), "--version", "2.7", "--install", "--data-dir",
                       data.path()})
                  .exitStatus,
              0);
    // The plug-in in the data directory (no dump given) and the plug-in on
    // the written file agree.
    RunResult const installed =
        hosttest::runHost({"--data-dir", data.path() + "/", "--format", "json"});
    RunResult const dumped = hosttest::runHost({"--dump", file, "--format", "json"});
    ASSERT_EQ(installed.exitStatus, 0) << describe(installed);
    ASSERT_EQ(dumped.exitStatus, 0) << describe(dumped);
    // They agree but for the clock the plug-in reads.
    unsigned maskedInstalled = 0;
    unsigned maskedDumped = 0;
    std::string const fromInstalled =
        dumptest::inventoryWithoutClock(installed.out, maskedInstalled);
    std::string const fromDumped = dumptest::inventoryWithoutClock(dumped.out, maskedDumped);
    EXPECT_EQ(maskedInstalled, maskedDumped);
    EXPECT_EQ(fromInstalled, fromDumped);
    EXPECT_NE(fromInstalled.find("RS-7400"), std::string::npos) << installed.out;
}

TEST(DumpTool, InstallIntoMissingDataDirFails) {
    TableInput input;
    std::string const missing = input.dir.file("no-data");
    RunResult const run = runDump(
        {"--from-table", input.path(), "--version", "2.7", "--install", "--data-dir", missing});
    EXPECT_EQ(run.exitStatus, 1) << describe(run);
    EXPECT_NE(run.err.find(missing), std::string::npos) << describe(run);
    EXPECT_FALSE(dumptest::exists(missing));
}

// A folder the user may not write into, as an ordinary user meets it: as
// root the tool runs as nobody, since root may write anywhere.
TEST(DumpTool, UnwritableFolderLeavesNoFile) {
    TableInput input;
    ASSERT_EQ(chmod(input.dir.path().c_str(), 0755), 0);
    std::string const folder = input.dir.file("locked");
    ASSERT_EQ(mkdir(folder.c_str(), 0555), 0);
    RunResult const run = hosttest::runProgramUnprivileged(
        dumptest::toolPath(),
        {"--from-table", input.path(), "--version", "2.7", "-o", folder + "/smbios.txt"});
    chmod(folder.c_str(), 0755);
    if (!run.startError.empty()) {
        GTEST_SKIP() << run.startError;
    }
    EXPECT_EQ(run.exitStatus, 1) << describe(run);
    EXPECT_NE(run.err.find("cannot create a temporary file in " + folder), std::string::npos)
        << describe(run);
    EXPECT_TRUE(dumptest::folderEntries(folder).empty());
}

TEST(DumpTool, MissingOutputFolderFails) {
    TableInput input;
    std::string const target = input.dir.file("missing/smbios.txt");
    RunResult const run = runDump({"--from-table", input.path(), "--version", "2.7", "-o", target});
    EXPECT_EQ(run.exitStatus, 1) << describe(run);
    EXPECT_NE(run.err.find(input.dir.file("missing")), std::string::npos) << describe(run);
    EXPECT_EQ(dumptest::folderEntries(input.dir.path()), (std::vector<std::string>{"table.bin"}));
}

// --- an output place that holds no regular file: never replaced ----------

// The one line smbios-dump says when it refuses to replace `target`, which
// is `kind` ("a FIFO", ...).
std::string notRegularLine(std::string const& target, char const* kind) {
    return "smbios-dump: " + target + " is " + kind + ", not a regular file; nothing written\n";
}

// The runs of the tool at `target`, without and with --force.
std::vector<std::vector<std::string>> writesAt(TableInput const& input, std::string const& target) {
    std::vector<std::string> const args = {"--from-table", input.path(), "--version",
                                           "2.7",          "-o",         target};
    std::vector<std::string> forced = args;
    forced.push_back("--force");
    return {args, forced};
}

bool isKind(std::string const& path, mode_t kind) {
    struct stat info;
    return lstat(path.c_str(), &info) == 0 && (info.st_mode & S_IFMT) == kind;
}

TEST(DumpTool, OutputAtFifoIsNeverReplaced) {
    TableInput input;
    std::string const fifo = input.dir.file("smbios.txt");
    ASSERT_TRUE(dumptest::makeFifo(fifo));
    for (std::vector<std::string> const& args : writesAt(input, fifo)) {
        SCOPED_TRACE(args.back());
        RunResult run;
        bool const waited = dumptest::waitedOnFifo(fifo, [&] { run = runDump(args); });
        EXPECT_FALSE(waited) << "smbios-dump waited on the FIFO";
        EXPECT_EQ(run.exitStatus, 1) << describe(run);
        EXPECT_EQ(run.err, notRegularLine(fifo, "a FIFO")) << describe(run);
        EXPECT_TRUE(isKind(fifo, S_IFIFO)) << "the FIFO was replaced";
        EXPECT_EQ(dumptest::folderEntries(input.dir.path()),
                  (std::vector<std::string>{"smbios.txt", "table.bin"}));
    }
}

TEST(DumpTool, InstallOverFifoIsNeverReplaced) {
    TableInput input;
    TempDir data;
    ASSERT_EQ(mkdir(data.file("SmBiosOverride").c_str(), 0755), 0);
    std::string const fifo = data.file("SmBiosOverride/smbios.txt");
    ASSERT_TRUE(dumptest::makeFifo(fifo));
    RunResult run;
    bool const waited = dumptest::waitedOnFifo(fifo, [&] {
        run = runDump({"--from-table", input.path(), "--version", "2.7", "--install", "--data-dir",
                       data.path(), "--force"});
    });
    EXPECT_FALSE(waited) << "smbios-dump waited on the FIFO";
    EXPECT_EQ(run.exitStatus, 1) << describe(run);
    EXPECT_EQ(run.err, notRegularLine(fifo, "a FIFO")) << describe(run);
    EXPECT_TRUE(isKind(fifo, S_IFIFO)) << "the FIFO was replaced";
    EXPECT_EQ(dumptest::folderEntries(data.file("SmBiosOverride")),
              (std::vector<std::string>{"smbios.txt"}));
}

TEST(DumpTool, OutputAtFolderIsNeverReplaced) {
    TableInput input;
    std::string const folder = input.dir.file("smbios.txt");
    ASSERT_EQ(mkdir(folder.c_str(), 0755), 0);
    for (std::vector<std::string> const& args : writesAt(input, folder)) {
        SCOPED_TRACE(args.back());
        RunResult const run = runDump(args);
        EXPECT_EQ(run.exitStatus, 1) << describe(run);
        EXPECT_EQ(run.err, notRegularLine(folder, "a directory")) << describe(run);
        EXPECT_TRUE(isKind(folder, S_IFDIR));
        EXPECT_EQ(dumptest::folderEntries(input.dir.path()),
                  (std::vector<std::string>{"smbios.txt", "table.bin"}));
        EXPECT_TRUE(dumptest::folderEntries(folder).empty());
    }
}

// A character device to aim at: a node of its own in `dir` (the device of
// /dev/full) when this process may make one, else /dev/full or /dev/null
// when this process cannot write into /dev, so that a tool that replaced
// the device could not harm the system's. "" when there is none.
std::string characterDevice(TempDir const& dir) {
    std::string const own = dir.file("full");
    if (mknod(own.c_str(), S_IFCHR | 0600, makedev(1, 7)) == 0) {
        return own;
    }
    if (access("/dev", W_OK) == 0) {
        return "";
    }
    for (char const* device : {"/dev/full", "/dev/null"}) {
        if (isKind(device, S_IFCHR)) {
            return device;
        }
    }
    return "";
}

TEST(DumpTool, OutputAtCharacterDeviceIsNeverReplaced) {
    TableInput input;
    std::string const device = characterDevice(input.dir);
    if (device.empty()) {
        GTEST_SKIP() << "no character device to aim at: this process can make no device node "
                        "and could write into /dev";
    }
    struct stat before;
    ASSERT_EQ(lstat(device.c_str(), &before), 0);
    std::string const folder = device.substr(0, device.rfind('/'));
    std::string const name = device.substr(device.rfind('/') + 1);
    for (std::vector<std::string> const& args : writesAt(input, device)) {
        SCOPED_TRACE(device + " " + args.back());
        RunResult const run = runDump(args);
        EXPECT_EQ(run.exitStatus, 1) << describe(run);
        EXPECT_EQ(run.err, notRegularLine(device, "a character device")) << describe(run);
        struct stat after;
        ASSERT_EQ(lstat(device.c_str(), &after), 0);
        EXPECT_TRUE(S_ISCHR(after.st_mode)) << "the device node was replaced";
        EXPECT_EQ(after.st_rdev, before.st_rdev);
        EXPECT_TRUE(dumptest::temporaryFilesOf(folder, name).empty());
    }
}

TEST(DumpTool, OutputAtSymbolicLinkToFileIsReplacedOnlyWithForce) {
    TableInput input;
    std::string const real = input.dir.file("real.txt");
    std::string const link = input.dir.file("smbios.txt");
    smbiostest::writeFile(real, "keep me\n");
    ASSERT_EQ(symlink("real.txt", link.c_str()), 0);
    std::vector<std::vector<std::string>> const runs = writesAt(input, link);

    RunResult const refused = runDump(runs[0]);
    EXPECT_EQ(refused.exitStatus, 1) << describe(refused);
    EXPECT_NE(refused.err.find(link + " exists"), std::string::npos) << describe(refused);
    EXPECT_TRUE(isKind(link, S_IFLNK));

    // The link itself is replaced; the file it named stays as it was.
    RunResult const forced = runDump(runs[1]);
    ASSERT_EQ(forced.exitStatus, 0) << describe(forced);
    EXPECT_EQ(forced.err, wroteLine(link));
    EXPECT_TRUE(isKind(link, S_IFREG));
    dumptest::ReadBack const back = dumptest::readBackThroughPlugin(link);
    ASSERT_TRUE(back.ok());
    EXPECT_EQ(back.table, dumptest::sampleTable());
    EXPECT_EQ(dumptest::readText(real), "keep me\n");
    EXPECT_EQ(dumptest::folderEntries(input.dir.path()),
              (std::vector<std::string>{"real.txt", "smbios.txt", "table.bin"}));
}

// --- bad input: exit 1, the file and the reason named, nothing written ---

void expectInputRefused(RunResult const& run, std::string const& file, std::string const& reason,
                        TempDir const& dir, std::vector<std::string> const& entries) {
    EXPECT_EQ(run.exitStatus, 1) << describe(run);
    EXPECT_NE(run.err.find(file + ": "), std::string::npos) << describe(run);
    EXPECT_NE(run.err.find(reason), std::string::npos) << describe(run);
    EXPECT_TRUE(run.out.empty()) << describe(run);
    EXPECT_EQ(dumptest::folderEntries(dir.path()), entries);
}

TEST(DumpTool, UnreadableInputFails) {
    TempDir dir;
    std::string const missing = dir.file("missing.bin");
    expectInputRefused(runDump({"--from-bin", missing, "-o", dir.file("out.txt")}), missing,
                       "No such file or directory", dir, {});
    expectInputRefused(
        runDump({"--from-table", missing, "--version", "2.7", "-o", dir.file("out.txt")}), missing,
        "No such file or directory", dir, {});
    // A folder is not opened at all.
    ASSERT_EQ(mkdir(dir.file("folder").c_str(), 0755), 0);
    expectInputRefused(runDump({"--from-bin", dir.file("folder"), "-o", dir.file("out.txt")}),
                       dir.file("folder"), "a directory, not a regular file", dir, {"folder"});
}

TEST(DumpTool, FifoInputFailsAtOnce) {
    TempDir dir;
    std::string const fifo = dir.file("input.fifo");
    ASSERT_TRUE(dumptest::makeFifo(fifo));
    std::vector<std::vector<std::string>> const runs = {
        {"--from-bin", fifo, "-o", dir.file("out.txt")},
        {"--from-table", fifo, "--version", "2.7", "-o", dir.file("out.txt")}};
    for (std::vector<std::string> const& args : runs) {
        SCOPED_TRACE(args.front());
        RunResult run;
        bool const waited = dumptest::waitedOnFifo(fifo, [&] { run = runDump(args); });
        EXPECT_FALSE(waited) << "smbios-dump waited for a writer on its input";
        expectInputRefused(run, fifo, "a FIFO, not a regular file", dir, {"input.fifo"});
    }
}

TEST(DumpTool, MalformedImageFails) {
    TempDir dir;
    std::string const text = dir.file("text.bin");
    smbiostest::writeFile(text, "SMBIOS 2.7 present.\n");
    expectInputRefused(runDump({"--from-bin", text, "-o", dir.file("out.txt")}), text,
                       "no entry point anchor", dir, {"text.bin"});

    // The entry point names more table than the image holds.
    std::string const cut = dir.file("cut.bin");
    Bytes image = smbiosdump::makeSmEntryPoint(2, 7, 900, smbiosdump::DUMP_BIN_TABLE_OFFSET, 3, 40);
    image.resize(0x20 + 100, 0);
    smbiostest::writeFile(cut, image);
    expectInputRefused(runDump({"--from-bin", cut, "-o", dir.file("out.txt")}), cut,
                       "runs past the end", dir, {"cut.bin", "text.bin"});
}

TEST(DumpTool, MalformedRawTableFails) {
    TempDir dir;
    std::string const empty = dir.file("empty.bin");
    smbiostest::writeFile(empty, "");
    expectInputRefused(
        runDump({"--from-table", empty, "--version", "2.7", "-o", dir.file("out.txt")}), empty,
        "empty", dir, {"empty.bin"});
    std::string const junk = dir.file("junk.bin");
    smbiostest::writeFile(junk, Bytes{0x01, 0x02, 0x03});
    expectInputRefused(
        runDump({"--from-table", junk, "--version", "2.7", "-o", dir.file("out.txt")}), junk,
        "no whole SMBIOS structure", dir, {"empty.bin", "junk.bin"});
}

// --- the command line -------------------------------------------------------

TEST(DumpTool, HelpAndVersion) {
    RunResult const help = runDump({"--help"});
    EXPECT_EQ(help.exitStatus, 0) << describe(help);
    for (char const* option : {"--from-bin", "--from-table", "--from-machine", "--pmem", "--output",
                               "--install", "--data-dir", "--force", "--version"}) {
        EXPECT_NE(help.out.find(option), std::string::npos) << option << "\n" << help.out;
    }
    RunResult const version = runDump({"--version"});
    EXPECT_EQ(version.exitStatus, 0) << describe(version);
    EXPECT_EQ(version.out, std::string("smbios-dump ") + PROJECT_VERSION + "\n");
}

TEST(DumpTool, WrongCommandLinesExitTwoWithMessage) {
    TableInput input;
    std::string const out = input.dir.file("out.txt");
    std::string const table = input.path();
    std::vector<RefusedLine> const cases = {
        {{}, "exactly one source"},
        {{"-o", out}, "exactly one source"},
        {{"--from-table", table, "-o", out}, "--version MAJ.MIN"},
        {{"--from-table", table, "--version", "-o", out}, "--version MAJ.MIN"},
        {{"--from-table", table, "--version", "2.7.1", "-o", out}, "bad SMBIOS version '2.7.1'"},
        {{"--from-table", table, "--version", "2.256", "-o", out}, "bad SMBIOS version"},
        {{"--from-bin", table, "--version", "2.7", "-o", out}, "only goes with --from-table"},
        {{"--from-bin", table, "--from-table", table, "--version", "2.7", "-o", out}, "excludes"},
        {{"--from-bin", table, "--from-machine", "-o", out}, "excludes"},
        {{"--from-bin", table}, "no output"},
        {{"--from-bin", table, "-o", out, "--install"}, "excludes"},
        {{"--from-bin", table, "-o", out, "--data-dir", input.dir.path()}, "--install"},
        {{"--from-bin", table, "-o", out, "--pmem", table}, "--from-machine"},
        {{"--from-bin", table, "-o", ""}, "empty file name"},
        {{"--from-bin", table, "-o", out, "--bogus"}, "--bogus"},
        {{"--from-bin", table, "-o", out, "extra"}, "extra"},
        {{"--from-bin"}, "--from-bin"},
    };
    for (RefusedLine const& c : cases) {
        SCOPED_TRACE(commandText(c.args));
        RunResult const run = expectRefusedLine(input, c.args);
        EXPECT_EQ(run.err.rfind("smbios-dump: ", 0), 0u) << describe(run);
        EXPECT_NE(run.err.find(c.says), std::string::npos) << describe(run);
    }
}

TEST(DumpTool, VersionMayComeBeforeTableOption) {
    TableInput input;
    std::string const out = input.dir.file("smbios.txt");
    RunResult const run = runDump({"--version", "2.4", "--from-table", input.path(), "-o", out});
    ASSERT_EQ(run.exitStatus, 0) << describe(run);
    dumptest::ReadBack const back = dumptest::readBackThroughPlugin(out);
    ASSERT_TRUE(back.ok());
    EXPECT_EQ(back.header.at(6), 2);
    EXPECT_EQ(back.header.at(7), 4);
}

// The rules that tie the options together, each alone on the command line:
// the whole line each one says, exit status 2, nothing written.
TEST(DumpTool, EachCommandLineRuleSaysItsOwnLine) {
    TableInput input;
    std::string const out = input.dir.file("out.txt");
    std::string const table = input.path();
    std::vector<RefusedLine> const cases = {
        {{"-o", out},
         "exactly one source is needed: --from-bin FILE, --from-table FILE --version MAJ.MIN or "
         "--from-machine"},
        {{"--from-table", table, "-o", out},
         "--from-table needs the table's SMBIOS version: --version MAJ.MIN"},
        {{"--from-table", table, "--version", "2", "-o", out},
         "--version: bad SMBIOS version '2' (MAJ.MIN expected, each 0-255)"},
        {{"--from-table", table, "--version", "2.x", "-o", out},
         "--version: bad SMBIOS version '2.x' (MAJ.MIN expected, each 0-255)"},
        {{"--from-table", table, "--version", "256.0", "-o", out},
         "--version: bad SMBIOS version '256.0' (MAJ.MIN expected, each 0-255)"},
        {{"--from-machine", "--version", "2.7", "-o", out},
         "--version MAJ.MIN only goes with --from-table"},
        {{"--from-table", table, "--version", "2.7"},
         "no output: give -o FILE, -o - (standard output) or --install"},
        {{"--from-table", table, "--version", "2.7", "-o", ""}, "-o: empty file name"},
    };
    for (RefusedLine const& c : cases) {
        SCOPED_TRACE(commandText(c.args));
        RunResult const run = expectRefusedLine(input, c.args);
        EXPECT_EQ(run.err, "smbios-dump: " + c.says + " (see --help)\n");
    }
}

// --version with no value and no source prints the program's version,
// whatever output is named; with a source it is the table's version,
// missing.
TEST(DumpTool, VersionWithoutValueIsTheProgramsUnlessASourceIsGiven) {
    TableInput input;
    std::string const out = input.dir.file("out.txt");
    RunResult const version = runDump({"--version", "-o", out});
    EXPECT_EQ(version.exitStatus, 0) << describe(version);
    EXPECT_EQ(version.out, std::string("smbios-dump ") + PROJECT_VERSION + "\n");
    EXPECT_EQ(version.err, "");
    RunResult const missing = runDump({"--from-table", input.path(), "--version", "-o", out});
    EXPECT_EQ(missing.exitStatus, 2) << describe(missing);
    EXPECT_NE(missing.err.find("--from-table needs the table's SMBIOS version"), std::string::npos)
        << describe(missing);
    EXPECT_EQ(dumptest::folderEntries(input.dir.path()), (std::vector<std::string>{"table.bin"}));
}

}  // namespace
