// smbios-inventory: loads a management-interface plug-in the way the
// inventory agent does (the library, OpenMI, initialize, getMap) and prints
// the inventory tree that it builds: as a tree for people, as JSON, as a
// one-screen summary, as one self-contained HTML page or in the Prometheus
// text exposition format. `smbios-inventory diff OLD NEW` compares two
// inventories.
//
// Exit status: 0 after printing, 1 when the plug-in cannot be loaded or
// fails, 2 for a wrong command line or a dump file that is not usable, and
// 128 + the signal's number when SIGINT, SIGTERM or SIGHUP ends the run.
// diff, like diff(1): 0 when the inventories are equal, 1 when they differ,
// 2 on an error.

#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <iostream>
#include <string>
#include <vector>

#include "AtomicFile.h"
#include "DumpFormat.h"
#include "IC/Node.h"
#include "MachineReport.h"
#include "QNLog/QNLogger.h"
#include "SD/PlatformUtilities.h"
#include "SD/RegularFile.h"
#include "ToolSupport.h"
#include "inventory/DiffInput.h"
#include "inventory/DumpCheck.h"
#include "inventory/HtmlPage.h"
#include "inventory/Inventory.h"
#include "inventory/InventoryDiff.h"
#include "inventory/PluginHost.h"
#include "inventory/PrivateDataDir.h"
#include "inventory/Prometheus.h"
#include "inventory/Summary.h"

namespace {

char const kProgram[] = "smbios-inventory";
char const kPluginName[] = "libsmbiosmi.so";

// The SMBIOS probe location codes by name, for --sensors: the low five bits
// of a probe's Location and Status byte.
struct NamedLocation {
    char const* name;
    unsigned int code;
};
NamedLocation const kLocations[] = {
    {"other", 1},       {"unknown", 2},        {"processor", 3},
    {"disk", 4},        {"peripheral-bay", 5}, {"system-management-module", 6},
    {"motherboard", 7}, {"memory-module", 8},  {"processor-module", 9},
    {"power-unit", 10}, {"add-in-card", 11},   {"front-panel", 12},
    {"back-panel", 13}, {"power-system", 14},  {"drive-back-plane", 15},
};
unsigned int const kLastLocation = 31;

void complain(std::string const& message) { smbiostool::complain(kProgram, message); }

// Sends whatever is written to standard output to standard error until it is
// ended: standard output carries nothing but the inventory.
class StdoutToStderr {
public:
    StdoutToStderr() {
        flushAll();
        saved_ = dup(STDOUT_FILENO);
        if (saved_ >= 0 && dup2(STDERR_FILENO, STDOUT_FILENO) < 0) {
            close(saved_);
            saved_ = -1;
        }
    }
    StdoutToStderr(StdoutToStderr const&) = delete;
    StdoutToStderr& operator=(StdoutToStderr const&) = delete;
    ~StdoutToStderr() { end(); }

    bool active() const { return saved_ >= 0; }

    void end() {
        if (saved_ < 0) {
            return;
        }
        flushAll();
        dup2(saved_, STDOUT_FILENO);
        close(saved_);
        saved_ = -1;
    }

private:
    static void flushAll() {
        std::cout.flush();
        std::fflush(stdout);
    }

    int saved_ = -1;
};

// An SMBIOS probe location: a name of kLocations, or a code from 0 to 31 in
// decimal or with 0x in hexadecimal.
bool parseLocation(std::string const& text, unsigned int& code) {
    for (NamedLocation const& location : kLocations) {
        if (text == location.name) {
            code = location.code;
            return true;
        }
    }
    bool const hex = text.size() > 2 && text[0] == '0' && (text[1] == 'x' || text[1] == 'X');
    std::string const digits = hex ? text.substr(2) : text;
    if (digits.empty()) {
        return false;
    }
    unsigned int value = 0;
    for (char c : digits) {
        int const digit = smbiosformat::hexValue(c);
        if (digit < 0 || (!hex && digit > 9)) {
            return false;
        }
        value = value * (hex ? 16u : 10u) + static_cast<unsigned int>(digit);
        if (value > kLastLocation) {
            return false;
        }
    }
    code = value;
    return true;
}

std::string locationNames() {
    std::string names;
    for (NamedLocation const& location : kLocations) {
        names += names.empty() ? "" : ", ";
        names += location.name;
    }
    return names;
}

// --sensors: a location name or code, turned into its decimal code.
CLI::Validator locationValidator() {
    return CLI::Validator(
        [](std::string& text) {
            unsigned int code = 0;
            if (!parseLocation(text, code)) {
                return "bad location '" + text + "' (a number from 0 to " +
                       std::to_string(kLastLocation) + ", or one of " + locationNames() + ")";
            }
            text = std::to_string(code);
            return std::string();
        },
        "");
}

// --log-level and --trace-level: a decimal number or "off".
CLI::Validator levelValidator() {
    return CLI::Validator(
        [](std::string& text) {
            int threshold = 0;
            return QNLog::QNLogger::parseLevel(text, threshold)
                       ? std::string()
                       : "bad level '" + text + "' (a decimal number or \"off\" expected)";
        },
        "");
}

// --log: appended to, so a regular file (made when it is not there) or a
// character device such as /dev/null or a terminal. Anything else (a FIFO
// would wait for a reader, a directory cannot take lines) is refused before
// the logger opens it.
CLI::Validator logFileValidator() {
    return CLI::Validator(
        [](std::string& path) {
            struct stat status;
            if (stat(path.c_str(), &status) != 0 || S_ISREG(status.st_mode) ||
                S_ISCHR(status.st_mode)) {
                return std::string();
            }
            return path + ": " + SD::fileKind(status.st_mode) + ", not a regular file";
        },
        "");
}

// --output: replaced only when it is a regular file or a symbolic link (the
// link itself is replaced), or made when nothing is there.
CLI::Validator outputFileValidator() {
    return CLI::Validator(
        [](std::string& path) {
            std::string why;
            return smbiostool::mayReplace(path, why) ? std::string() : why;
        },
        "");
}

// A validator that adds nothing to the value's name in the help text; the
// option's own type name says it all.
CLI::Validator quiet(CLI::Validator validator) {
    validator.description("");
    return validator;
}

// The command line.
struct Options {
    std::string dumpFile;
    std::string binFile;
    std::string dataDir;
    std::string codeDir;
    std::string pluginPath;
    std::string format = "tree";
    std::string outputFile;
    std::string logFile;
    std::string logLevel;
    std::string traceLevel;
    std::vector<unsigned int> sensorLocations;
    bool bmc = false;
};

// The command line of diff; --plugin and --code-dir go to Options.
struct DiffOptions {
    std::string oldFile;
    std::string newFile;
    std::string format = "text";
};

// The exit statuses of diff, as diff(1) has them.
constexpr int kDiffEqual = 0;
constexpr int kDiffDiffer = 1;
constexpr int kDiffTrouble = 2;

// The table's sources: the machine (through the data directory), --dump or
// --from-bin, one at a time.
void addSourceOptions(CLI::App& app, Options& options) {
    auto* dump = app.add_option("--dump", options.dumpFile,
                                "Run the plug-in on this dump file instead of the machine's own "
                                "table")
                     ->type_name("FILE")
                     ->check(quiet(CLI::ExistingFile));
    auto* dataDir = app.add_option("--data-dir", options.dataDir,
                                   "Data directory of the agent (KESTREL_DATA_DIR)")
                        ->type_name("DIR");
    auto* bin = app.add_option("--from-bin", options.binFile,
                               "Run the plug-in on this dmidecode --dump-bin file instead of the "
                               "machine's own table")
                    ->type_name("FILE")
                    ->check(quiet(CLI::ExistingFile));
    dump->excludes(dataDir);
    bin->excludes(dump);
    bin->excludes(dataDir);
}

void addOptions(CLI::App& app, Options& options) {
    addSourceOptions(app, options);
    app.add_option("--code-dir", options.codeDir, "Code directory of the agent (KESTREL_CODE_DIR)")
        ->type_name("DIR");
    app.add_option("--plugin", options.pluginPath,
                   std::string("The plug-in to load (default: ") + kPluginName +
                       " beside this program, else in ../lib from it)")
        ->type_name("PATH");
    app.add_option("--format", options.format,
                   "Output format: tree (default), json, summary (one screen of the main "
                   "facts), html (one self-contained page) or prometheus (the text exposition "
                   "format, for node_exporter's textfile collector)")
        ->type_name("tree|json|summary|html|prometheus")
        ->check(quiet(CLI::IsMember({"tree", "json", "summary", "html", "prometheus"})));
    app.add_option("--output", options.outputFile,
                   "Write the inventory to this file instead of standard output, all or nothing "
                   "(a temporary file in the same folder, renamed into place)")
        ->type_name("FILE")
        ->check(outputFileValidator());
    app.add_option("--log", options.logFile,
                   "Append log messages to this file instead of standard error")
        ->type_name("FILE")
        ->check(logFileValidator());
    struct Threshold {
        char const* option;
        std::string* value;
        char const* help;
    };
    for (Threshold const& threshold :
         {Threshold{"--log-level", &options.logLevel, "Log threshold: a decimal number or \"off\""},
          Threshold{"--trace-level", &options.traceLevel,
                    "Trace threshold: a decimal number or \"off\""}}) {
        app.add_option(threshold.option, *threshold.value, threshold.help)
            ->type_name("N")
            ->check(levelValidator());
    }
    app.add_option("--sensors", options.sensorLocations,
                   "Also make the temperature and voltage sensor nodes of the probes at this "
                   "location (repeatable): a code from 0 to 31 or one of " +
                       locationNames())
        ->type_name("LOCATION")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll)
        ->transform(locationValidator());
    app.add_flag("--bmc", options.bmc, "Also make the BMC nodes");
    app.set_version_flag("--version", std::string(kProgram) + " " + PROJECT_VERSION,
                         "Print the version and exit");
}

// smbios-inventory diff [--format text|json] [--plugin PATH] [--code-dir DIR] OLD NEW
CLI::App* addDiffCommand(CLI::App& app, DiffOptions& diff, Options& options) {
    CLI::App* command = app.add_subcommand(
        "diff", "Compares two inventories (JSON, override dump or --dump-bin files)");
    command->footer(
        "Each FILE is a JSON inventory (--format json), an override dump file or a dmidecode "
        "--dump-bin file. One line per added (+) or removed (-) component and per changed "
        "property (~). Exit status: 0 when the inventories are equal, 1 when they differ, 2 on "
        "an error.");
    command->add_option("OLD", diff.oldFile, "The inventory compared against")
        ->type_name("FILE")
        ->required();
    command->add_option("NEW", diff.newFile, "The inventory compared")
        ->type_name("FILE")
        ->required();
    command->add_option("--format", diff.format, "Output format: text (default) or json")
        ->type_name("text|json")
        ->check(quiet(CLI::IsMember({"text", "json"})));
    command->add_option("--plugin", options.pluginPath, "The plug-in that reads the dump files")
        ->type_name("PATH");
    command
        ->add_option("--code-dir", options.codeDir,
                     "Code directory of the agent (KESTREL_CODE_DIR) for the dump files")
        ->type_name("DIR");
    return command;
}

// The options before "diff" belong to the inventory run; diff takes its own
// after it. Returns 0, or the exit status after saying which one is wrong.
int checkNoRunOptions(CLI::App const& app) {
    for (CLI::Option const* option : app.get_options()) {
        if (option->count() > 0) {
            return smbiostool::usage(kProgram, option->get_name() +
                                                   " is not an option of diff (diff takes "
                                                   "--format, --plugin and --code-dir after "
                                                   "\"diff\")");
        }
    }
    return 0;
}

// diff: reads both inventories (a dump through a child run of this
// program), compares them and prints the differences.
int runDiff(DiffOptions const& diff, Options const& options) {
    inventory::ChildOptions const child{options.pluginPath, options.codeDir};
    std::vector<inventory::InventoryNode> before;
    std::vector<inventory::InventoryNode> after;
    std::string why;
    if (!inventory::readInventoryFile(diff.oldFile, child, before, why) ||
        !inventory::readInventoryFile(diff.newFile, child, after, why)) {
        complain("diff: " + why);
        return kDiffTrouble;
    }
    std::vector<inventory::Difference> const differences =
        inventory::compareInventories(before, after);
    std::cout << (diff.format == "json" ? inventory::renderDiffJson(differences)
                                        : inventory::renderDiffText(differences));
    std::cout.flush();
    if (!std::cout) {
        complain("diff: cannot write the differences to standard output");
        return kDiffTrouble;
    }
    return differences.empty() ? kDiffEqual : kDiffDiffer;
}

// The logger's thresholds and file, as the options ask. Quiet unless asked:
// without --log, --log-level or --trace-level (or QNLOG_LEVEL or
// QNLOG_TRACE_LEVEL in the environment) the plug-in's log is not written,
// so that standard error carries this program's own messages only. Returns
// 0, or the exit status after saying why.
int applyLogOptions(Options const& options) {
    int threshold = 0;
    bool const asked = !options.logFile.empty() || !options.logLevel.empty() ||
                       !options.traceLevel.empty() || std::getenv("QNLOG_LEVEL") != nullptr ||
                       std::getenv("QNLOG_TRACE_LEVEL") != nullptr;
    if (!asked && QNLog::QNLogger::parseLevel("off", threshold)) {
        QNLog::QNLogger::setLogLevel(threshold);
        QNLog::QNLogger::setTraceLevel(threshold);
        return 0;
    }
    if (QNLog::QNLogger::parseLevel(options.logLevel, threshold)) {
        QNLog::QNLogger::setLogLevel(threshold);
    }
    if (QNLog::QNLogger::parseLevel(options.traceLevel, threshold)) {
        QNLog::QNLogger::setTraceLevel(threshold);
    }
    if (!options.logFile.empty() && !QNLog::QNLogger::setLogFile(options.logFile)) {
        complain("--log: cannot open " + options.logFile + " for appending");
        return smbiostool::EXIT_USAGE;
    }
    return 0;
}

// Reads a --dump or --from-bin file: a regular file of at most 16 MiB,
// never waiting on a FIFO or reading a device.
bool readInput(char const* option, std::string const& path, std::vector<std::uint8_t>& bytes) {
    std::string why;
    if (!smbiostool::readInputFile(path, bytes, why)) {
        complain(std::string(option) + ": " + path + ": " + why);
        return false;
    }
    return true;
}

// The dump the plug-in is to read: the text of its override file, and for a
// --from-bin file the image that text is made from.
struct DumpInput {
    std::string content;
    smbiosdump::DumpImage image;
};

// The --dump file, or a --from-bin file as --dump would have given it. False
// after saying why.
bool readDumpContent(Options const& options, DumpInput& input) {
    std::vector<std::uint8_t> bytes;
    if (!options.dumpFile.empty()) {
        if (!readInput("--dump", options.dumpFile, bytes)) {
            return false;
        }
        input.content.assign(bytes.begin(), bytes.end());
        return true;
    }
    if (!readInput("--from-bin", options.binFile, bytes)) {
        return false;
    }
    smbiosdump::DumpImage& image = input.image;
    std::string why;
    if (!smbiosdump::readDumpBin(bytes, image, why)) {
        complain("--from-bin: " + options.binFile + ": " + why);
        return false;
    }
    if (image.cut) {
        complain(smbiostool::cutWarning(
            "the SMBIOS table in " + options.binFile,
            smbiostool::imageCut(image.wholeTableBytes, image.wholeTableStructures, image.table)));
    }
    input.content = smbiosdump::formatOverride(image.header, image.table);
    return true;
}

bool setEnvironment(char const* name, std::string const& value) {
    if (setenv(name, value.c_str(), 1) != 0) {
        complain(std::string("cannot set ") + name + ": " + std::strerror(errno));
        return false;
    }
    return true;
}

// A dump runs in a private data directory whose override file is a copy of
// it; the real data directory is left alone. A --dump file is checked with
// the plug-in's own grammar, so that the host never answers about another
// table; the text the host writes itself from a --from-bin image always
// passes, and only whether its table is whole is left to check. Returns 0,
// or the exit status after saying why.
int prepareDumpRun(Options const& options, DumpInput const& input,
                   inventory::PrivateDataDir& folder) {
    std::string why;
    if (!folder.create(input.content, why)) {
        complain(why);
        return smbiostool::EXIT_FAILED;
    }
    inventory::DumpCheck const check =
        options.dumpFile.empty()
            ? inventory::checkImage(input.image.header, input.image.table)
            : inventory::checkOverrideFile(folder.overrideFile(), input.content);
    if (!check.refusal.empty()) {
        complain((options.dumpFile.empty() ? "--from-bin: " + options.binFile
                                           : "--dump: " + options.dumpFile) +
                 ": " + check.refusal);
        return smbiostool::EXIT_USAGE;
    }
    if (!check.warning.empty()) {
        complain(check.warning);
    }
    return setEnvironment("KESTREL_DATA_DIR", folder.dataDir()) ? 0 : smbiostool::EXIT_FAILED;
}

// The plug-in to load: --plugin, where a bare file name means the file in
// the current folder (not a search of the library path), else the one
// beside this program, else in ../lib from it (an installed program in
// PREFIX/bin and the plug-in in PREFIX/lib).
std::string pluginPath(std::string const& option) {
    if (option.empty()) {
        return smbiostool::installedLibrary(smbiostool::ownFolder(), kPluginName);
    }
    return smbiostool::libraryFile(option);
}

// Loads the plug-in, initializes it, makes the extra nodes when asked to
// and fills nodes. Returns 0, or 1 after saying why.
int loadInventory(inventory::PluginHost& host, Options const& options,
                  std::vector<IC::Node*>& nodes) {
    // The plug-in and the framework may print while they start; that output
    // goes to standard error.
    StdoutToStderr redirect;
    if (!redirect.active()) {
        complain(std::string("cannot redirect standard output: ") + std::strerror(errno));
        return smbiostool::EXIT_FAILED;
    }
    inventory::ExtraNodes extra;
    extra.bmc = options.bmc;
    for (unsigned int code : options.sensorLocations) {
        if (std::find(extra.locations.begin(), extra.locations.end(), code) ==
            extra.locations.end()) {
            extra.locations.push_back(code);
        }
    }
    std::string why;
    bool done = host.load(why);
    if (done && extra.requested() && !host.isLinkedSmBiosPlugin()) {
        why = "--sensors and --bmc need the SMBIOS plug-in this program is built with (" +
              std::string(kPluginName) + " beside it); " + host.path() + " is another one";
        done = false;
    }
    done = done && host.initialize(why) &&
           (!extra.requested() || host.makeExtraNodes(extra, why)) && host.getNodes(nodes, why);
    if (!done) {
        complain(why);
        return smbiostool::EXIT_FAILED;
    }
    return 0;
}

// After the plug-in read this machine (no dump given): when it got no table,
// says why (the physical-memory library's sources, or the override file in
// the data directory) and returns 1; when it got only the start of a table
// too large for its 2.x entry point, warns. Returns 0 otherwise.
int checkMachineAnswer(inventory::PluginHost const& host) {
    std::string const codeDir = SD::PlatformUtilities::getKestrelCodeDir();
    std::string const overrideFile =
        SD::PlatformUtilities::getKestrelDataDir() + "SmBiosOverride/smbios.txt";
    struct stat status;
    // The plug-in reads the file only when it is a regular file.
    bool const fromFile = stat(overrideFile.c_str(), &status) == 0 && S_ISREG(status.st_mode);
    if (!host.acquiredEmptyTable()) {
        smbiostool::TableCut cut;
        if (!fromFile && smbiostool::MachineReport(codeDir + "libpmem.so").cut(cut)) {
            complain(smbiostool::cutWarning("this machine's SMBIOS table", cut));
        }
        return 0;
    }
    if (fromFile) {
        complain("no SMBIOS table: the override file " + overrideFile +
                 " holds none the plug-in can use (--log-level 3000 shows why)");
        return smbiostool::EXIT_FAILED;
    }
    complain("no SMBIOS table could be read from this machine");
    smbiostool::MachineReport const report(codeDir + "libpmem.so");
    for (std::string const& line :
         smbiostool::noTableLines(report, "--dump FILE or --from-bin FILE")) {
        complain(line);
    }
    return smbiostool::EXIT_FAILED;
}

// Writes all of the text to standard output; false when it cannot.
bool writeOut(char const* data, size_t size) {
    while (size > 0) {
        ssize_t const written = write(STDOUT_FILENO, data, size);
        if (written < 0 && errno == EINTR) {
            continue;
        }
        if (written <= 0) {
            return false;
        }
        data += written;
        size -= static_cast<size_t>(written);
    }
    return true;
}

// The inventory in the format asked for, as one text.
std::string renderInventory(std::string const& format, std::vector<IC::Node*> const& nodes) {
    if (format == "json") {
        return inventory::renderJson(nodes);
    }
    if (format == "summary") {
        return inventory::renderSummary(nodes);
    }
    if (format == "html") {
        return inventory::renderHtml(nodes);
    }
    if (format == "prometheus") {
        return inventory::renderPrometheus(nodes);
    }
    return inventory::renderTree(nodes);
}

// The inventory in the format asked for, on standard output (the tree and
// the JSON written as they are rendered, each piece straight to the file
// descriptor) or, with --output, all or nothing into the file, so that a
// collector reading it never sees a part of it. Returns 0, or 1 after
// saying why.
int writeInventory(Options const& options, std::vector<IC::Node*> const& nodes) {
    if (!options.outputFile.empty()) {
        std::string why;
        if (smbiostool::writeFileAtomically(options.outputFile,
                                            renderInventory(options.format, nodes), true,
                                            why) != smbiostool::WriteResult::WRITTEN) {
            complain("--output: " + why);
            return smbiostool::EXIT_FAILED;
        }
        return 0;
    }
    bool written = std::fflush(stdout) == 0;
    inventory::TextSink const toStdout = [&written](char const* data, size_t size) {
        written = written && writeOut(data, size);
    };
    if (options.format == "json") {
        inventory::writeJson(nodes, toStdout);
    } else if (options.format == "tree") {
        inventory::writeTree(nodes, toStdout);
    } else {
        std::string const text = renderInventory(options.format, nodes);
        toStdout(text.data(), text.size());
    }
    if (!written) {
        complain("cannot write the inventory to standard output");
        return smbiostool::EXIT_FAILED;
    }
    return 0;
}

int run(int argc, char** argv) {
    CLI::App app{
        "Loads a management-interface plug-in the way the inventory agent does and prints "
        "the inventory tree that it builds.",
        kProgram};
    Options options;
    addOptions(app, options);
    DiffOptions diff;
    CLI::App const* const diffCommand = addDiffCommand(app, diff, options);
    int status = 0;
    if (!smbiostool::parseCommandLine(app, argc, argv, kProgram, status)) {
        return status;
    }
    if (diffCommand->parsed()) {
        return (status = checkNoRunOptions(app)) != 0 ? status : runDiff(diff, options);
    }
    if ((status = applyLogOptions(options)) != 0) {
        return status;
    }
    // Read the dump before anything is created, so that an unreadable file
    // is a command-line error.
    bool const onDump = !options.dumpFile.empty() || !options.binFile.empty();
    DumpInput dump;
    if (onDump && !readDumpContent(options, dump)) {
        return smbiostool::EXIT_USAGE;
    }
    if ((!options.dataDir.empty() && !setEnvironment("KESTREL_DATA_DIR", options.dataDir)) ||
        (!options.codeDir.empty() && !setEnvironment("KESTREL_CODE_DIR", options.codeDir))) {
        return smbiostool::EXIT_FAILED;
    }
    inventory::PrivateDataDir folder;
    if (onDump && (status = prepareDumpRun(options, dump, folder)) != 0) {
        return status;
    }
    // The file holds the dump from here on; its memory goes back for the
    // plug-in to use.
    dump = DumpInput();
    inventory::PluginHost host(pluginPath(options.pluginPath));
    std::vector<IC::Node*> nodes;
    if ((status = loadInventory(host, options, nodes)) != 0 ||
        (!onDump && (status = checkMachineAnswer(host)) != 0)) {
        return status;
    }
    return writeInventory(options, nodes);
}

}  // namespace

int main(int argc, char** argv) { return smbiostool::runMain(kProgram, run, argc, argv); }
