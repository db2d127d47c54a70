// smbios-dump: captures an SMBIOS table into the override dump file that the
// plug-in reads instead of physical memory ("SmBiosOverride/smbios.txt"
// under the agent's data directory), so that one machine's inventory can be
// reproduced on another.
//
// The table comes from a dmidecode --dump-bin image, from a raw structure
// table of a stated SMBIOS version, or from this machine through the
// physical-memory library libpmem.so. The input is read completely before
// anything is written, and the file is written all or nothing.
//
// Only a missing file, a regular file or a symbolic link is ever replaced
// (the last two with --force); a folder, FIFO, socket or device in the
// output's place is refused, --force or not.
//
// Exit status: 0 after writing, 1 when the input cannot be read or the file
// cannot be written (nothing is written then), 2 for a wrong command line.

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cstdint>
#include <cstdio>
#include <iostream>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "MachineReport.h"
#include "ToolSupport.h"
#include "dump/DumpInput.h"
#include "dump/DumpOutput.h"

namespace {

char const kProgram[] = "smbios-dump";

// Bytes of the table per line of the dump file: 64 hexadecimal digits.
size_t const kBytesPerLine = 32;

void complain(std::string const& message) { smbiostool::complain(kProgram, message); }

// The command line: the options' values, and which options were given (a
// given value may be empty: "--from-bin ''" names a source).
struct CommandLine {
    std::string fromBin;
    std::string fromTable;
    std::string tableVersion;
    bool fromMachine = false;
    std::string pmemPath;
    std::string output;
    bool install = false;
    std::string dataDir;
    bool force = false;

    bool fromBinGiven = false;
    bool fromTableGiven = false;
    bool versionGiven = false;
    bool outputGiven = false;

    int sources() const {
        return (fromBinGiven ? 1 : 0) + (fromTableGiven ? 1 : 0) + (fromMachine ? 1 : 0);
    }
};

// The options whose presence counts, not only their value; they live as
// long as the CLI::App that parses the command line.
struct CountedOptions {
    CLI::Option* fromBin = nullptr;
    CLI::Option* fromTable = nullptr;
    CLI::Option* version = nullptr;
    CLI::Option* output = nullptr;

    void record(CommandLine& line) const {
        line.fromBinGiven = fromBin->count() > 0;
        line.fromTableGiven = fromTable->count() > 0;
        line.versionGiven = version->count() > 0;
        line.outputGiven = output->count() > 0;
    }
};

// --version MAJ.MIN: each part a decimal number from 0 to 255. Without a
// value the option asks for the program's version; that is not checked
// here.
CLI::Validator smbiosVersionValidator() {
    return CLI::Validator(
        [](std::string& text) {
            uint8_t major = 0;
            uint8_t minor = 0;
            if (smbiosdump::parseSmbiosVersion(text, major, minor)) {
                return std::string();
            }
            return "bad SMBIOS version '" + text + "' (MAJ.MIN expected, each 0-255)";
        },
        "");
}

// The sources, one of which is needed: --from-bin, --from-table with its
// --version, --from-machine with its --pmem.
void addSourceOptions(CLI::App& app, CommandLine& line, CountedOptions& counted) {
    counted.fromBin =
        app.add_option("--from-bin", line.fromBin, "Source: a dmidecode --dump-bin image")
            ->type_name("FILE");
    counted.fromTable =
        app.add_option("--from-table", line.fromTable,
                       "Source: a raw SMBIOS structure table (needs --version MAJ.MIN)")
            ->type_name("FILE");
    counted.version =
        app.add_option("--version", line.tableVersion,
                       "The SMBIOS version of the --from-table table; without a value, print "
                       "this program's version and exit")
            ->type_name("MAJ.MIN")
            ->expected(0, 1)
            ->check(smbiosVersionValidator());
    auto* fromMachineOption = app.add_flag("--from-machine", line.fromMachine,
                                           "Source: this machine, through the libpmem.so library");
    auto* pmemOption =
        app.add_option("--pmem", line.pmemPath,
                       "The physical-memory library for --from-machine (default: libpmem.so "
                       "beside this program, else in ../lib from it)")
            ->type_name("PATH");
    counted.fromBin->excludes(counted.fromTable)->excludes(fromMachineOption);
    counted.fromTable->excludes(fromMachineOption);
    pmemOption->needs(fromMachineOption);
}

// The outputs, one of which is needed: -o FILE or --install (with its
// --data-dir); and --force.
void addOutputOptions(CLI::App& app, CommandLine& line, CountedOptions& counted) {
    counted.output = app.add_option("-o,--output", line.output,
                                    "Write the dump file here (- for standard output)")
                         ->type_name("FILE");
    auto* installOption = app.add_flag("--install", line.install,
                                       "Write the dump file where the plug-in looks for it first");
    auto* dataDirOption =
        app.add_option("--data-dir", line.dataDir, "The agent's data directory for --install")
            ->type_name("DIR");
    app.add_flag("--force", line.force,
                 "Replace the output file when it exists (a regular file or a symbolic link; "
                 "nothing else is replaced)");
    counted.output->excludes(installOption);
    dataDirOption->needs(installOption);
}

// The rules across options that CLI11's exclusions and requirements cannot
// say in this program's words, checked once those have passed: --version
// alone prints the program's version; exactly one source (the exclusions
// refuse a second one); --version MAJ.MIN with --from-table and only with
// it; exactly one output (the exclusions refuse a second one).
void checkCombination(CommandLine const& line) {
    if (line.versionGiven && line.tableVersion.empty() && line.sources() == 0) {
        throw CLI::CallForVersion(std::string(kProgram) + " " + PROJECT_VERSION,
                                  CLI::ExitCodes::Success);
    }
    if (line.sources() != 1) {
        throw CLI::RequiredError(
            "exactly one source is needed: --from-bin FILE, --from-table FILE --version MAJ.MIN "
            "or --from-machine",
            CLI::ExitCodes::RequiredError);
    }
    if (line.fromTableGiven && line.tableVersion.empty()) {
        throw CLI::RequiredError("--from-table needs the table's SMBIOS version: --version MAJ.MIN",
                                 CLI::ExitCodes::RequiredError);
    }
    if (!line.fromTableGiven && line.versionGiven) {
        throw CLI::ValidationError("--version MAJ.MIN only goes with --from-table");
    }
    if (!line.outputGiven && !line.install) {
        throw CLI::RequiredError("no output: give -o FILE, -o - (standard output) or --install",
                                 CLI::ExitCodes::RequiredError);
    }
    if (line.outputGiven && line.output.empty()) {
        throw CLI::ValidationError("-o: empty file name");
    }
}

// Parses the command line into `line`. Returns true when the program goes
// on; else false and the status to exit with (0 after the help or the
// version, EXIT_USAGE after saying what is wrong).
bool parseOptions(int argc, char** argv, CommandLine& line, int& exitStatus) {
    CLI::App app{
        "Writes an SMBIOS table into the override dump file that the SMBIOS plug-in reads "
        "instead of physical memory.",
        kProgram};
    app.footer(
        "Exactly one source and one output. --install writes <data dir>/SmBiosOverride/"
        "smbios.txt, the data dir being --data-dir, else KESTREL_DATA_DIR, else "
        "/var/lib/kestrel/. --version without a value prints this program's version.");
    CountedOptions counted;
    addSourceOptions(app, line, counted);
    addOutputOptions(app, line, counted);
    app.callback([&line, &counted]() {
        counted.record(line);
        checkCombination(line);
    });
    return smbiostool::parseCommandLine(app, argc, argv, kProgram, exitStatus);
}

// Where the dump file goes: standard output, the -o file, or the override
// file under the data directory for --install.
struct Target {
    bool toStandardOutput = false;
    std::string path;
    bool install = false;
    std::string installDataDir;
};

Target chooseTarget(CommandLine const& line) {
    Target target;
    target.toStandardOutput = !line.install && line.output == "-";
    target.path = line.output;
    target.install = line.install;
    if (line.install) {
        target.installDataDir = smbiosdump::dataDirectory(line.dataDir);
        target.path = smbiosdump::overridePath(target.installDataDir);
    }
    return target;
}

// An existing file is refused before any input is read, and again (without
// a race) when it is put in place. What is not a regular file or a symbolic
// link is never replaced: a device or FIFO would be swapped for a plain
// file. Returns 0, or the exit status after saying why.
int checkTarget(Target const& target, bool force) {
    if (target.toStandardOutput) {
        return 0;
    }
    std::string error;
    if (!smbiosdump::mayReplace(target.path, error)) {
        complain(error);
        return smbiostool::EXIT_FAILED;
    }
    if (!force && access(target.path.c_str(), F_OK) == 0) {
        complain(target.path + " exists; not replaced (use --force to replace it)");
        return smbiostool::EXIT_FAILED;
    }
    return 0;
}

// --from-bin or --from-table: the whole file, then its entry point and
// table. Returns 0, or the exit status after saying why.
int captureFromFile(CommandLine const& line, smbiosdump::Capture& capture) {
    std::string const& path = line.fromBinGiven ? line.fromBin : line.fromTable;
    std::vector<uint8_t> bytes;
    std::string error;
    if (!smbiosdump::readInputFile(path, bytes, error)) {
        complain(path + ": " + error);
        return smbiostool::EXIT_FAILED;
    }
    bool captured = false;
    if (line.fromBinGiven) {
        captured = smbiosdump::captureFromDumpBin(bytes, capture, error);
    } else {
        uint8_t major = 0;
        uint8_t minor = 0;
        // Checked on the command line already.
        smbiosdump::parseSmbiosVersion(line.tableVersion, major, minor);
        captured = smbiosdump::captureFromTable(bytes, major, minor, capture, error);
    }
    if (!captured) {
        complain(path + ": " + error);
        return smbiostool::EXIT_FAILED;
    }
    if (capture.cut) {
        complain(smbiostool::cutWarning(
            "the SMBIOS table in " + path,
            smbiostool::imageCut(capture.wholeTableBytes, capture.wholeTableStructures,
                                 capture.table)));
    }
    return 0;
}

// --from-machine: this machine's table through the physical-memory library.
// Without a table, says which sources the library tried and why each could
// not serve; with the start of a table too large for a 2.x entry point,
// says what was left out. Returns 0, or the exit status after saying why.
int captureFromMachine(CommandLine const& line, smbiosdump::Capture& capture) {
    std::string const library = line.pmemPath.empty()
                                    ? smbiosdump::defaultPMemPath(smbiostool::ownFolder())
                                    : line.pmemPath;
    std::string error;
    bool const captured = smbiosdump::captureFromMachine(library, capture, error);
    // Asked afresh, the library tells what it found when it chose its source.
    smbiostool::MachineReport const report(smbiostool::libraryFile(library));
    if (!captured) {
        complain("cannot read this machine's SMBIOS table: " + error);
        for (std::string const& text :
             smbiostool::noTableLines(report, "--from-bin FILE (from dmidecode --dump-bin)")) {
            complain(text);
        }
        return smbiostool::EXIT_FAILED;
    }
    smbiostool::TableCut cut;
    if (report.cut(cut)) {
        complain(smbiostool::cutWarning("this machine's SMBIOS table", cut));
    }
    return 0;
}

bool writeToStandardOutput(std::string const& text) {
    std::fwrite(text.data(), 1, text.size(), stdout);
    return std::fflush(stdout) == 0 && std::ferror(stdout) == 0;
}

// Writes the dump file where the target says, all or nothing, and says
// what was written. Returns 0, or the exit status after saying why.
int writeDump(Target const& target, bool force, smbiosdump::Capture const& capture) {
    std::string const text =
        smbiosdump::formatOverride(capture.header, capture.table, kBytesPerLine);
    std::string const summary = smbiosdump::describeCapture(capture);
    if (target.toStandardOutput) {
        if (!writeToStandardOutput(text)) {
            complain("cannot write to standard output");
            return smbiostool::EXIT_FAILED;
        }
        std::cerr << kProgram << ": wrote standard output: " << summary << std::endl;
        return 0;
    }
    std::string error;
    if (target.install && !smbiosdump::makeOverrideFolder(target.installDataDir, error)) {
        complain(error);
        return smbiostool::EXIT_FAILED;
    }
    switch (smbiosdump::writeFileAtomically(target.path, text, force, error)) {
        case smbiosdump::WriteResult::WRITTEN:
            break;
        case smbiosdump::WriteResult::EXISTS:
            complain(target.path + " exists; not replaced (use --force to replace it)");
            return smbiostool::EXIT_FAILED;
        case smbiosdump::WriteResult::FAILED:
            complain(error);
            return smbiostool::EXIT_FAILED;
    }
    std::cerr << kProgram << ": wrote " << target.path << ": " << summary << std::endl;
    return 0;
}

int run(int argc, char** argv) {
    CommandLine line;
    int status = 0;
    if (!parseOptions(argc, argv, line, status)) {
        return status;
    }
    Target const target = chooseTarget(line);
    if ((status = checkTarget(target, line.force)) != 0) {
        return status;
    }
    // The whole input, before anything is written.
    smbiosdump::Capture capture;
    status = line.fromMachine ? captureFromMachine(line, capture) : captureFromFile(line, capture);
    if (status != 0) {
        return status;
    }
    return writeDump(target, line.force, capture);
}

}  // namespace

int main(int argc, char** argv) { return smbiostool::runMain(kProgram, run, argc, argv); }
