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
#include <cstdio>
#include <iostream>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "ToolSupport.h"
#include "dump/DumpInput.h"
#include "dump/DumpOutput.h"

namespace {

char const kProgram[] = "smbios-dump";

// Bytes of the table per line of the dump file: 64 hexadecimal digits.
size_t const kBytesPerLine = 32;

void complain(std::string const& message) { smbiostool::complain(kProgram, message); }

int usage(std::string const& message) { return smbiostool::usage(kProgram, message); }

bool writeToStandardOutput(std::string const& text) {
    std::fwrite(text.data(), 1, text.size(), stdout);
    return std::fflush(stdout) == 0 && std::ferror(stdout) == 0;
}

int run(int argc, char** argv) {
    CLI::App app{
        "Writes an SMBIOS table into the override dump file that the SMBIOS plug-in reads "
        "instead of physical memory.",
        kProgram};
    app.footer(
        "Exactly one source and one output. --install writes <data dir>/SmBiosOverride/"
        "smbios.txt, the data dir being --data-dir, else KESTREL_DATA_DIR, else "
        "/var/lib/kestrel/. --version without a value prints this program's version.");

    std::string fromBin;
    std::string fromTable;
    std::string tableVersion;
    bool fromMachine = false;
    std::string pmemPath;
    std::string output;
    bool install = false;
    std::string dataDir;
    bool force = false;

    auto* fromBinOption =
        app.add_option("--from-bin", fromBin, "Source: a dmidecode --dump-bin image")
            ->type_name("FILE");
    auto* fromTableOption =
        app.add_option("--from-table", fromTable,
                       "Source: a raw SMBIOS structure table (needs --version MAJ.MIN)")
            ->type_name("FILE");
    auto* versionOption =
        app.add_option("--version", tableVersion,
                       "The SMBIOS version of the --from-table table; without a value, print "
                       "this program's version and exit")
            ->type_name("MAJ.MIN")
            ->expected(0, 1);
    auto* fromMachineOption = app.add_flag("--from-machine", fromMachine,
                                           "Source: this machine, through the libpmem.so library");
    auto* pmemOption =
        app.add_option("--pmem", pmemPath,
                       "The physical-memory library for --from-machine (default: libpmem.so "
                       "beside this program, else in ../lib from it)")
            ->type_name("PATH");
    auto* outputOption =
        app.add_option("-o,--output", output, "Write the dump file here (- for standard output)")
            ->type_name("FILE");
    auto* installOption = app.add_flag("--install", install,
                                       "Write the dump file where the plug-in looks for it first");
    auto* dataDirOption =
        app.add_option("--data-dir", dataDir, "The agent's data directory for --install")
            ->type_name("DIR");
    app.add_flag("--force", force,
                 "Replace the output file when it exists (a regular file or a symbolic link; "
                 "nothing else is replaced)");

    fromBinOption->excludes(fromTableOption)->excludes(fromMachineOption);
    fromTableOption->excludes(fromMachineOption);
    pmemOption->needs(fromMachineOption);
    outputOption->excludes(installOption);
    dataDirOption->needs(installOption);

    int exitStatus = 0;
    if (!smbiostool::parseCommandLine(app, argc, argv, kProgram, exitStatus)) {
        return exitStatus;
    }

    int const sources = (fromBinOption->count() > 0 ? 1 : 0) +
                        (fromTableOption->count() > 0 ? 1 : 0) + (fromMachine ? 1 : 0);
    bool const versionGiven = versionOption->count() > 0;
    if (versionGiven && tableVersion.empty() && sources == 0) {
        std::cout << kProgram << " " << PROJECT_VERSION << std::endl;
        return 0;
    }
    if (sources != 1) {
        return usage(
            "exactly one source is needed: --from-bin FILE, --from-table FILE --version MAJ.MIN "
            "or --from-machine");
    }
    uint8_t major = 0;
    uint8_t minor = 0;
    if (fromTableOption->count() > 0) {
        if (tableVersion.empty()) {
            return usage("--from-table needs the table's SMBIOS version: --version MAJ.MIN");
        }
        if (!smbiosdump::parseSmbiosVersion(tableVersion, major, minor)) {
            return usage("--version: bad SMBIOS version '" + tableVersion +
                         "' (MAJ.MIN expected, each 0-255)");
        }
    } else if (versionGiven) {
        return usage("--version MAJ.MIN only goes with --from-table");
    }
    if (outputOption->count() == 0 && !install) {
        return usage("no output: give -o FILE, -o - (standard output) or --install");
    }
    if (outputOption->count() > 0 && output.empty()) {
        return usage("-o: empty file name");
    }

    // Where the file goes; an existing one is refused before any input is
    // read, and again (without a race) when it is put in place. What is not
    // a regular file or a symbolic link is never replaced: a device or FIFO
    // would be swapped for a plain file.
    bool const toStandardOutput = !install && output == "-";
    std::string target = output;
    std::string installDataDir;
    if (install) {
        installDataDir = smbiosdump::dataDirectory(dataDir);
        target = smbiosdump::overridePath(installDataDir);
    }
    std::string error;
    if (!toStandardOutput && !smbiosdump::mayReplace(target, error)) {
        complain(error);
        return smbiostool::EXIT_FAILED;
    }
    if (!toStandardOutput && !force && access(target.c_str(), F_OK) == 0) {
        complain(target + " exists; not replaced (use --force to replace it)");
        return smbiostool::EXIT_FAILED;
    }

    // The whole input, before anything is written.
    smbiosdump::Capture capture;
    if (fromBinOption->count() > 0 || fromTableOption->count() > 0) {
        std::string const& path = fromBinOption->count() > 0 ? fromBin : fromTable;
        std::vector<uint8_t> bytes;
        if (!smbiosdump::readInputFile(path, bytes, error)) {
            complain(path + ": " + error);
            return smbiostool::EXIT_FAILED;
        }
        bool const captured =
            fromBinOption->count() > 0
                ? smbiosdump::captureFromDumpBin(bytes, capture, error)
                : smbiosdump::captureFromTable(bytes, major, minor, capture, error);
        if (!captured) {
            complain(path + ": " + error);
            return smbiostool::EXIT_FAILED;
        }
    } else {
        std::string const library =
            pmemPath.empty() ? smbiosdump::defaultPMemPath(smbiostool::ownFolder()) : pmemPath;
        if (!smbiosdump::captureFromMachine(library, capture, error)) {
            // The library's sources (the kernel's tables, /dev/mem) are
            // root's to read.
            complain("cannot read this machine's SMBIOS table: " + error +
                     (geteuid() != 0 ? " (reading physical memory usually needs root)" : ""));
            return smbiostool::EXIT_FAILED;
        }
    }
    std::string const text =
        smbiosdump::formatOverride(capture.header, capture.table, kBytesPerLine);
    std::string const summary = smbiosdump::describeCapture(capture);

    if (toStandardOutput) {
        if (!writeToStandardOutput(text)) {
            complain("cannot write to standard output");
            return smbiostool::EXIT_FAILED;
        }
        std::cerr << kProgram << ": wrote standard output: " << summary << std::endl;
        return 0;
    }
    if (install && !smbiosdump::makeOverrideFolder(installDataDir, error)) {
        complain(error);
        return smbiostool::EXIT_FAILED;
    }
    switch (smbiosdump::writeFileAtomically(target, text, force, error)) {
        case smbiosdump::WriteResult::WRITTEN:
            break;
        case smbiosdump::WriteResult::EXISTS:
            complain(target + " exists; not replaced (use --force to replace it)");
            return smbiostool::EXIT_FAILED;
        case smbiosdump::WriteResult::FAILED:
            complain(error);
            return smbiostool::EXIT_FAILED;
    }
    std::cerr << kProgram << ": wrote " << target << ": " << summary << std::endl;
    return 0;
}

}  // namespace

int main(int argc, char** argv) { return smbiostool::runMain(kProgram, run, argc, argv); }
