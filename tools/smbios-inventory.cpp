// smbios-inventory: loads a management-interface plug-in the way the
// inventory agent does (dlopen, OpenMI, initialize, getMap) and prints the
// inventory tree that it builds, as a tree for people or as JSON.
//
// Exit status: 0 after printing, 1 when the plug-in cannot be loaded or
// fails, 2 for a wrong command line or a dump file that is not usable, and
// 128 + the signal's number when SIGINT, SIGTERM or SIGHUP ends the run.

#include <dlfcn.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "IC/Error.h"
#include "IC/ManagementInterface.h"
#include "IC/MutableNode.h"
#include "IC/Node.h"
#include "IC/Number.h"
#include "QNLog/QNLogger.h"
#include "SD/RegularFile.h"
#include "ToolSupport.h"
#include "inventory/DumpCheck.h"
#include "inventory/Inventory.h"

namespace {

char const kProgram[] = "smbios-inventory";
char const kPluginName[] = "libsmbiosmi.so";
// The plug-in's optional entry point that makes the nodes its initialize
// does not: sensor nodes for the probes at given locations, and BMC nodes.
char const kExtraNodesEntry[] = "SmBiosMIExtraNodes";
typedef int (*ExtraNodesFunction)(unsigned int parentId, unsigned int const* locations,
                                  unsigned int locationCount, int bmc);

// Node types of the nodes the extra nodes hang under: the planar, else the
// root.
unsigned int const kPlanarNodeType = 41;
unsigned int const kRootNodeType = 59;

// The SMBIOS probe location codes by name, for --sensors.
struct NamedLocation {
    char const* name;
    unsigned int code;
};
NamedLocation const kLocations[] = {
    {"motherboard", 2},   {"processor", 3},        {"disk", 4},          {"peripheral-bay", 5},
    {"memory-module", 7}, {"processor-module", 8}, {"power-unit", 9},    {"add-in-card", 10},
    {"front-panel", 11},  {"back-panel", 12},      {"power-system", 13}, {"drive-back-plane", 14},
};
unsigned int const kLastLocation = 31;

// The plug-in, its management interface and the error record it handed out
// stay alive until the process ends: the nodes belong to the plug-in, and it
// is never unloaded.
void* gPlugin = nullptr;
IC::ManagementInterface* gInterface = nullptr;
IC::Error* gOpenError = nullptr;

void complain(std::string const& message) { smbiostool::complain(kProgram, message); }

// The private folder that stands in for the data directory when the host
// runs on a dump file; it is removed with everything in it when the run
// ends, whichever way it ends.
class TemporaryDataDir {
public:
    TemporaryDataDir() = default;
    TemporaryDataDir(TemporaryDataDir const&) = delete;
    TemporaryDataDir& operator=(TemporaryDataDir const&) = delete;
    ~TemporaryDataDir() {
        if (!path_.empty()) {
            std::error_code ignored;
            std::filesystem::remove_all(path_, ignored);
        }
    }

    // Creates the folder under $TMPDIR (or /tmp). Returns false and sets
    // why when it cannot.
    bool create(std::string& why) {
        char const* base = std::getenv("TMPDIR");
        std::string pattern = (base != nullptr && *base != '\0') ? base : "/tmp";
        if (pattern.back() != '/') {
            pattern += '/';
        }
        pattern += "smbios-inventory.XXXXXX";
        std::vector<char> buffer(pattern.begin(), pattern.end());
        buffer.push_back('\0');
        if (mkdtemp(buffer.data()) == nullptr) {
            why = "cannot create a temporary folder from " + pattern + ": " + std::strerror(errno);
            return false;
        }
        path_ = buffer.data();
        return true;
    }

    std::string const& path() const { return path_; }

private:
    std::string path_;
};

// The signals that end a run early; the temporary data directory must not
// outlive them.
int const kEndSignals[] = {SIGINT, SIGTERM, SIGHUP};

// What the signal handler removes: the override copy, its folder and the
// temporary data directory, made before the handler is installed so that the
// handler itself only calls unlink and rmdir.
struct SignalCleanup {
    std::string file;
    std::string folder;
    std::string dataDir;
};
SignalCleanup gSignalCleanup;
volatile sig_atomic_t gSignalCleanupReady = 0;

extern "C" void removeTemporaryDataDirAndEnd(int signalNumber) {
    if (gSignalCleanupReady != 0) {
        unlink(gSignalCleanup.file.c_str());
        rmdir(gSignalCleanup.folder.c_str());
        rmdir(gSignalCleanup.dataDir.c_str());
    }
    // The handler was reset to the default on entry and the signal is not
    // blocked inside it: raising it again ends the process as the signal
    // would have, with the status 128 + its number that a shell reports.
    raise(signalNumber);
}

// Holds the end signals back while the temporary data directory is made and
// its cleanup prepared; a signal that came meanwhile is delivered at the end.
class EndSignalsHeld {
public:
    EndSignalsHeld() {
        sigset_t held;
        sigemptyset(&held);
        for (int signalNumber : kEndSignals) {
            sigaddset(&held, signalNumber);
        }
        active_ = sigprocmask(SIG_BLOCK, &held, &saved_) == 0;
    }
    EndSignalsHeld(EndSignalsHeld const&) = delete;
    EndSignalsHeld& operator=(EndSignalsHeld const&) = delete;
    ~EndSignalsHeld() {
        if (active_) {
            sigprocmask(SIG_SETMASK, &saved_, nullptr);
        }
    }

private:
    sigset_t saved_;
    bool active_ = false;
};

// From here on an end signal removes the temporary data directory first.
// Signals that the caller ignores (a background job's SIGINT) stay ignored.
void removeOnEndSignals(std::string const& dataDir, std::string const& folder,
                        std::string const& file) {
    gSignalCleanup.dataDir = dataDir;
    gSignalCleanup.folder = folder;
    gSignalCleanup.file = file;
    gSignalCleanupReady = 1;
    for (int signalNumber : kEndSignals) {
        struct sigaction previous;
        if (sigaction(signalNumber, nullptr, &previous) == 0 && previous.sa_handler == SIG_IGN) {
            continue;
        }
        struct sigaction action;
        std::memset(&action, 0, sizeof action);
        action.sa_handler = removeTemporaryDataDirAndEnd;
        sigemptyset(&action.sa_mask);
        action.sa_flags = SA_RESETHAND | SA_NODEFER;
        sigaction(signalNumber, &action, nullptr);
    }
}

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

// The plug-in beside this program, else the one in ../lib from it (an
// installed program in PREFIX/bin and the plug-in in PREFIX/lib).
std::string defaultPluginPath() {
    return smbiostool::installedLibrary(smbiostool::ownFolder(), kPluginName);
}

// Reads a --dump or --from-bin file: a regular file of at most 16 MiB,
// never waiting on a FIFO or reading a device.
bool readInput(char const* option, std::string const& path, std::string& content) {
    std::vector<std::uint8_t> bytes;
    std::string why;
    if (!smbiostool::readInputFile(path, bytes, why)) {
        complain(std::string(option) + ": " + path + ": " + why);
        return false;
    }
    content.assign(bytes.begin(), bytes.end());
    return true;
}

// The --log file is appended to: a regular file (made when it is not
// there) or a character device such as /dev/null or a terminal. Anything
// else (a FIFO would wait for a reader, a directory cannot take lines) is
// refused before the logger opens it.
bool usableLogFile(std::string const& path, std::string& why) {
    struct stat status;
    if (stat(path.c_str(), &status) != 0) {
        return true;
    }
    if (S_ISREG(status.st_mode) || S_ISCHR(status.st_mode)) {
        return true;
    }
    why = std::string(SD::fileKind(status.st_mode)) + ", not a regular file";
    return false;
}

bool writeWholeFile(std::string const& path, std::string const& content, std::string& why) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out.write(content.data(), static_cast<std::streamsize>(content.size()));
    out.close();
    if (!out) {
        why = "cannot write " + path;
        return false;
    }
    return true;
}

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
        unsigned int digit = 0;
        if (c >= '0' && c <= '9') {
            digit = static_cast<unsigned int>(c - '0');
        } else if (hex && c >= 'a' && c <= 'f') {
            digit = static_cast<unsigned int>(c - 'a' + 10);
        } else if (hex && c >= 'A' && c <= 'F') {
            digit = static_cast<unsigned int>(c - 'A' + 10);
        } else {
            return false;
        }
        value = value * (hex ? 16u : 10u) + digit;
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

// What the user asked for beyond what initialize makes.
struct ExtraNodes {
    std::vector<unsigned int> locations;  // each once, in the order given
    bool bmc = false;

    bool requested() const { return bmc || !locations.empty(); }
};

// The id of the first node of the given type, or 0 when there is none.
unsigned int firstNodeOfType(std::vector<IC::Node*> const& nodes, unsigned int type) {
    for (IC::Node const* node : nodes) {
        auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
        if (mutableNode != nullptr && mutableNode->getNodeType() == type) {
            return mutableNode->getNodeId();
        }
    }
    return 0;
}

bool setEnvironment(char const* name, std::string const& value) {
    if (setenv(name, value.c_str(), 1) != 0) {
        complain(std::string("cannot set ") + name + ": " + std::strerror(errno));
        return false;
    }
    return true;
}

// A validator that adds nothing to the value's name in the help text; the
// option's own type name says it all.
CLI::Validator quiet(CLI::Validator validator) {
    validator.description("");
    return validator;
}

bool applyLevel(char const* option, std::string const& text, void (*apply)(int)) {
    int threshold = 0;
    if (!QNLog::QNLogger::parseLevel(text, threshold)) {
        complain(std::string(option) + ": bad level '" + text +
                 "' (a decimal number or \"off\" expected)");
        return false;
    }
    apply(threshold);
    return true;
}

// Asks the plug-in for the extra nodes under the planar node, else the root.
// Returns 0, or 1 after saying why.
int makeExtraNodes(ExtraNodesFunction extraNodes, ExtraNodes const& extra) {
    std::vector<IC::Node*> nodes;
    IC::Error mapped = gInterface->getMap(nodes);
    if (mapped.getStatus() != 0) {
        complain("getMap failed with status " + std::to_string(mapped.getStatus()) + ": " +
                 mapped.getMessage());
        return smbiostool::EXIT_FAILED;
    }
    unsigned int parentId = firstNodeOfType(nodes, kPlanarNodeType);
    if (parentId == 0) {
        parentId = firstNodeOfType(nodes, kRootNodeType);
    }
    if (parentId == 0) {
        complain("the inventory has neither a planar nor a root node for the sensor and BMC nodes");
        return smbiostool::EXIT_FAILED;
    }
    int const made =
        extraNodes(parentId, extra.locations.data(),
                   static_cast<unsigned int>(extra.locations.size()), extra.bmc ? 1 : 0);
    if (made != 0) {
        complain(std::string(kExtraNodesEntry) + " returned " + std::to_string(made) +
                 " for the parent node " + std::to_string(parentId));
        return smbiostool::EXIT_FAILED;
    }
    return 0;
}

// Loads the plug-in, opens and initializes its management interface, makes
// the extra nodes when asked to and fills nodes. Returns 0, or 1 after
// saying why.
int loadInventory(std::string const& pluginPath, ExtraNodes const& extra,
                  std::vector<IC::Node*>& nodes) {
    // The plug-in and the framework may print while they start; that output
    // goes to standard error.
    StdoutToStderr redirect;
    if (!redirect.active()) {
        complain(std::string("cannot redirect standard output: ") + std::strerror(errno));
        return smbiostool::EXIT_FAILED;
    }

    dlerror();
    gPlugin = dlopen(pluginPath.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (gPlugin == nullptr) {
        char const* why = dlerror();
        complain("cannot load the plug-in " + pluginPath + ": " +
                 (why != nullptr ? why : "unknown error"));
        return smbiostool::EXIT_FAILED;
    }
    dlerror();
    void* symbol = dlsym(gPlugin, "OpenMI");
    if (symbol == nullptr) {
        char const* why = dlerror();
        complain("the plug-in " + pluginPath + " has no OpenMI entry point" +
                 (why != nullptr ? std::string(": ") + why : std::string()));
        return smbiostool::EXIT_FAILED;
    }
    IC::OpenMIFunction openMI = nullptr;
    static_assert(sizeof openMI == sizeof symbol, "function and data pointers differ in size");
    std::memcpy(&openMI, &symbol, sizeof openMI);

    // The extra entry point is looked for only when it is needed: a
    // plug-in without it serves every other run.
    ExtraNodesFunction extraNodes = nullptr;
    if (extra.requested()) {
        dlerror();
        void* extraSymbol = dlsym(gPlugin, kExtraNodesEntry);
        if (extraSymbol == nullptr) {
            complain("the plug-in " + pluginPath + " has no " + kExtraNodesEntry +
                     " entry point, which --sensors and --bmc need");
            return smbiostool::EXIT_FAILED;
        }
        static_assert(sizeof extraNodes == sizeof extraSymbol,
                      "function and data pointers differ in size");
        std::memcpy(&extraNodes, &extraSymbol, sizeof extraNodes);
    }

    int opened = openMI(&gInterface, &gOpenError);
    if (opened != 0) {
        std::string message = "OpenMI of " + pluginPath + " returned " + std::to_string(opened);
        if (gOpenError != nullptr && !gOpenError->getMessage().empty()) {
            message += ": " + gOpenError->getMessage();
        }
        complain(message);
        return smbiostool::EXIT_FAILED;
    }
    if (gInterface == nullptr) {
        complain("OpenMI of " + pluginPath + " gave no management interface");
        return smbiostool::EXIT_FAILED;
    }

    IC::Error initialized = gInterface->initialize(1, IC::Number(0u), IC::Number(0u));
    if (initialized.getStatus() != 0) {
        complain("initialize failed with status " + std::to_string(initialized.getStatus()) + ": " +
                 initialized.getMessage());
        return smbiostool::EXIT_FAILED;
    }
    if (extraNodes != nullptr) {
        int const status = makeExtraNodes(extraNodes, extra);
        if (status != 0) {
            return status;
        }
    }
    IC::Error mapped = gInterface->getMap(nodes);
    if (mapped.getStatus() != 0) {
        complain("getMap failed with status " + std::to_string(mapped.getStatus()) + ": " +
                 mapped.getMessage());
        return smbiostool::EXIT_FAILED;
    }
    redirect.end();
    return 0;
}

int run(int argc, char** argv) {
    CLI::App app{
        "Loads a management-interface plug-in the way the inventory agent does and prints "
        "the inventory tree that it builds.",
        kProgram};
    std::string dumpFile;
    std::string binFile;
    std::string dataDir;
    std::string codeDir;
    std::string pluginPath;
    std::string format = "tree";
    std::string logFile;
    std::string logLevel;
    std::string traceLevel;
    std::vector<std::string> sensorLocations;
    bool bmc = false;

    auto* dumpOption = app.add_option("--dump", dumpFile,
                                      "Run the plug-in on this dump file instead of the "
                                      "machine's own table")
                           ->type_name("FILE")
                           ->check(quiet(CLI::ExistingFile));
    auto* dataDirOption =
        app.add_option("--data-dir", dataDir, "Data directory of the agent (KESTREL_DATA_DIR)")
            ->type_name("DIR");
    dumpOption->excludes(dataDirOption);
    auto* binOption = app.add_option("--from-bin", binFile,
                                     "Run the plug-in on this dmidecode --dump-bin file instead "
                                     "of the machine's own table")
                          ->type_name("FILE")
                          ->check(quiet(CLI::ExistingFile));
    binOption->excludes(dumpOption);
    binOption->excludes(dataDirOption);
    app.add_option("--code-dir", codeDir, "Code directory of the agent (KESTREL_CODE_DIR)")
        ->type_name("DIR");
    app.add_option("--plugin", pluginPath,
                   std::string("The plug-in to load (default: ") + kPluginName +
                       " beside this program, else in ../lib from it)")
        ->type_name("PATH");
    app.add_option("--format", format, "Output format: tree (default) or json")
        ->type_name("tree|json")
        ->check(quiet(CLI::IsMember({"tree", "json"})));
    app.add_option("--log", logFile, "Append log messages to this file instead of standard error")
        ->type_name("FILE");
    app.add_option("--log-level", logLevel, "Log threshold: a decimal number or \"off\"")
        ->type_name("N");
    app.add_option("--trace-level", traceLevel, "Trace threshold: a decimal number or \"off\"")
        ->type_name("N");
    app.add_option("--sensors", sensorLocations,
                   "Also make the temperature and voltage sensor nodes of the probes at this "
                   "location (repeatable): a code from 0 to 31 or one of " +
                       locationNames())
        ->type_name("LOCATION")
        ->expected(1)
        ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
    app.add_flag("--bmc", bmc, "Also make the BMC nodes");
    app.set_version_flag("--version", std::string(kProgram) + " " + PROJECT_VERSION,
                         "Print the version and exit");

    int exitStatus = 0;
    if (!smbiostool::parseCommandLine(app, argc, argv, kProgram, exitStatus)) {
        return exitStatus;
    }

    if (!logLevel.empty() && !applyLevel("--log-level", logLevel, &QNLog::QNLogger::setLogLevel)) {
        return smbiostool::EXIT_USAGE;
    }
    if (!traceLevel.empty() &&
        !applyLevel("--trace-level", traceLevel, &QNLog::QNLogger::setTraceLevel)) {
        return smbiostool::EXIT_USAGE;
    }
    if (!logFile.empty()) {
        std::string why;
        if (!usableLogFile(logFile, why)) {
            complain("--log: " + logFile + ": " + why);
            return smbiostool::EXIT_USAGE;
        }
    }
    if (!logFile.empty() && !QNLog::QNLogger::setLogFile(logFile)) {
        complain("--log: cannot open " + logFile + " for appending");
        return smbiostool::EXIT_USAGE;
    }

    ExtraNodes extra;
    extra.bmc = bmc;
    for (std::string const& text : sensorLocations) {
        unsigned int code = 0;
        if (!parseLocation(text, code)) {
            complain("--sensors: bad location '" + text + "' (a number from 0 to " +
                     std::to_string(kLastLocation) + ", or one of " + locationNames() + ")");
            return smbiostool::EXIT_USAGE;
        }
        if (std::find(extra.locations.begin(), extra.locations.end(), code) ==
            extra.locations.end()) {
            extra.locations.push_back(code);
        }
    }

    // Read the dump before anything is created, so that an unreadable file
    // is a command-line error. A --dump-bin file becomes the text of an
    // override file, as --dump would have given it.
    std::string dumpContent;
    if (!dumpFile.empty()) {
        if (!readInput("--dump", dumpFile, dumpContent)) {
            return smbiostool::EXIT_USAGE;
        }
    } else if (!binFile.empty()) {
        std::string bytes;
        std::string why;
        if (!readInput("--from-bin", binFile, bytes)) {
            return smbiostool::EXIT_USAGE;
        }
        smbiosdump::DumpImage image;
        if (!smbiosdump::readDumpBin(std::vector<std::uint8_t>(bytes.begin(), bytes.end()), image,
                                     why)) {
            complain("--from-bin: " + binFile + ": " + why);
            return smbiostool::EXIT_USAGE;
        }
        dumpContent = smbiosdump::formatOverride(image.header, image.table);
    }
    bool const onDump = !dumpFile.empty() || !binFile.empty();

    if (!dataDir.empty() && !setEnvironment("KESTREL_DATA_DIR", dataDir)) {
        return smbiostool::EXIT_FAILED;
    }
    if (!codeDir.empty() && !setEnvironment("KESTREL_CODE_DIR", codeDir)) {
        return smbiostool::EXIT_FAILED;
    }

    // A dump runs in a private data directory whose override file is a copy
    // of it; the real data directory is left alone.
    TemporaryDataDir temporary;
    if (onDump) {
        EndSignalsHeld held;
        std::string why;
        if (!temporary.create(why)) {
            complain(why);
            return smbiostool::EXIT_FAILED;
        }
        std::string const overrideDir = temporary.path() + "/SmBiosOverride";
        std::error_code error;
        if (!std::filesystem::create_directory(overrideDir, error)) {
            complain("cannot create " + overrideDir + ": " + error.message());
            return smbiostool::EXIT_FAILED;
        }
        std::string const overrideFile = overrideDir + "/smbios.txt";
        removeOnEndSignals(temporary.path(), overrideDir, overrideFile);
        if (!writeWholeFile(overrideFile, dumpContent, why)) {
            complain(why);
            return smbiostool::EXIT_FAILED;
        }
        // The copy is what the plug-in reads: check it with the plug-in's
        // own grammar, so that the host never answers about another table.
        inventory::DumpCheck const check = inventory::checkOverrideFile(overrideFile, dumpContent);
        if (!check.refusal.empty()) {
            complain((dumpFile.empty() ? "--from-bin: " + binFile : "--dump: " + dumpFile) + ": " +
                     check.refusal);
            return smbiostool::EXIT_USAGE;
        }
        if (!check.warning.empty()) {
            complain(check.warning);
        }
        if (!setEnvironment("KESTREL_DATA_DIR", temporary.path() + "/")) {
            return smbiostool::EXIT_FAILED;
        }
    }

    if (pluginPath.empty()) {
        pluginPath = defaultPluginPath();
    } else if (pluginPath.find('/') == std::string::npos) {
        // A bare file name means the file in the current folder, not a
        // search of the library path.
        pluginPath = "./" + pluginPath;
    }

    std::vector<IC::Node*> nodes;
    int status = loadInventory(pluginPath, extra, nodes);
    if (status != 0) {
        return status;
    }

    std::string const text =
        format == "json" ? inventory::renderJson(nodes) : inventory::renderTree(nodes);
    std::cout << text;
    std::cout.flush();
    if (!std::cout) {
        complain("cannot write the inventory to standard output");
        return smbiostool::EXIT_FAILED;
    }
    return 0;
}

}  // namespace

int main(int argc, char** argv) { return smbiostool::runMain(kProgram, run, argc, argv); }
