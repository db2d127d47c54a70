// smbios-inventory: loads a management-interface plug-in the way the
// inventory agent does (dlopen, OpenMI, initialize, getMap) and prints the
// inventory tree that it builds, as a tree for people or as JSON.
//
// Exit status: 0 after printing, 1 when the plug-in cannot be loaded or
// fails, 2 for a wrong command line.

#include <dlfcn.h>
#include <limits.h>
#include <stdlib.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#include "IC/Error.h"
#include "IC/ManagementInterface.h"
#include "IC/Node.h"
#include "IC/Number.h"
#include "QNLog/QNLogger.h"
#include "inventory/Inventory.h"

namespace {

char const kProgram[] = "smbios-inventory";
char const kPluginName[] = "libsmbiosmi.so";

int const kExitFailure = 1;
int const kExitUsage = 2;

// The plug-in, its management interface and the error record it handed out
// stay alive until the process ends: the nodes belong to the plug-in, and it
// is never unloaded.
void* gPlugin = nullptr;
IC::ManagementInterface* gInterface = nullptr;
IC::Error* gOpenError = nullptr;

void complain(std::string const& message) { std::cerr << kProgram << ": " << message << std::endl; }

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

// The folder that holds this program.
std::string ownFolder() {
    std::vector<char> buffer(PATH_MAX + 1);
    ssize_t length = readlink("/proc/self/exe", buffer.data(), buffer.size() - 1);
    if (length <= 0) {
        return ".";
    }
    std::string path(buffer.data(), static_cast<size_t>(length));
    size_t slash = path.rfind('/');
    if (slash == std::string::npos) {
        return ".";
    }
    return slash == 0 ? std::string("/") : path.substr(0, slash);
}

// The plug-in beside this program, else the one in ../lib from it (an
// installed program in PREFIX/bin and the plug-in in PREFIX/lib).
std::string defaultPluginPath() {
    std::string folder = ownFolder();
    std::string beside = folder + "/" + kPluginName;
    if (access(beside.c_str(), F_OK) == 0) {
        return beside;
    }
    return folder + "/../lib/" + kPluginName;
}

bool readWholeFile(std::string const& path, std::string& content, std::string& why) {
    std::FILE* file = std::fopen(path.c_str(), "rb");
    if (file == nullptr) {
        why = "cannot read " + path + ": " + std::strerror(errno);
        return false;
    }
    content.clear();
    char buffer[65536];
    size_t count = 0;
    while ((count = std::fread(buffer, 1, sizeof buffer, file)) > 0) {
        content.append(buffer, count);
    }
    bool const failed = std::ferror(file) != 0;
    int const readErrno = errno;
    std::fclose(file);
    if (failed) {
        why = "cannot read " + path + ": " + std::strerror(readErrno);
        return false;
    }
    return true;
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

// Loads the plug-in, opens and initializes its management interface and
// fills nodes. Returns 0, or 1 after saying why.
int loadInventory(std::string const& pluginPath, std::vector<IC::Node*>& nodes) {
    // The plug-in and the framework may print while they start; that output
    // goes to standard error.
    StdoutToStderr redirect;
    if (!redirect.active()) {
        complain(std::string("cannot redirect standard output: ") + std::strerror(errno));
        return kExitFailure;
    }

    dlerror();
    gPlugin = dlopen(pluginPath.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (gPlugin == nullptr) {
        char const* why = dlerror();
        complain("cannot load the plug-in " + pluginPath + ": " +
                 (why != nullptr ? why : "unknown error"));
        return kExitFailure;
    }
    dlerror();
    void* symbol = dlsym(gPlugin, "OpenMI");
    if (symbol == nullptr) {
        char const* why = dlerror();
        complain("the plug-in " + pluginPath + " has no OpenMI entry point" +
                 (why != nullptr ? std::string(": ") + why : std::string()));
        return kExitFailure;
    }
    IC::OpenMIFunction openMI = nullptr;
    static_assert(sizeof openMI == sizeof symbol, "function and data pointers differ in size");
    std::memcpy(&openMI, &symbol, sizeof openMI);

    int opened = openMI(&gInterface, &gOpenError);
    if (opened != 0) {
        std::string message = "OpenMI of " + pluginPath + " returned " + std::to_string(opened);
        if (gOpenError != nullptr && !gOpenError->getMessage().empty()) {
            message += ": " + gOpenError->getMessage();
        }
        complain(message);
        return kExitFailure;
    }
    if (gInterface == nullptr) {
        complain("OpenMI of " + pluginPath + " gave no management interface");
        return kExitFailure;
    }

    IC::Error initialized = gInterface->initialize(1, IC::Number(0u), IC::Number(0u));
    if (initialized.getStatus() != 0) {
        complain("initialize failed with status " + std::to_string(initialized.getStatus()) + ": " +
                 initialized.getMessage());
        return kExitFailure;
    }
    IC::Error mapped = gInterface->getMap(nodes);
    if (mapped.getStatus() != 0) {
        complain("getMap failed with status " + std::to_string(mapped.getStatus()) + ": " +
                 mapped.getMessage());
        return kExitFailure;
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
    std::string dataDir;
    std::string codeDir;
    std::string pluginPath;
    std::string format = "tree";
    std::string logFile;
    std::string logLevel;
    std::string traceLevel;

    auto* dumpOption = app.add_option("--dump", dumpFile,
                                      "Run the plug-in on this dump file instead of the "
                                      "machine's own table")
                           ->type_name("FILE")
                           ->check(quiet(CLI::ExistingFile));
    auto* dataDirOption =
        app.add_option("--data-dir", dataDir, "Data directory of the agent (KESTREL_DATA_DIR)")
            ->type_name("DIR");
    dumpOption->excludes(dataDirOption);
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
    app.set_version_flag("--version", std::string(kProgram) + " " + PROJECT_VERSION,
                         "Print the version and exit");

    try {
        app.parse(argc, argv);
    } catch (CLI::CallForHelp const&) {
        std::cout << app.help();
        return 0;
    } catch (CLI::CallForAllHelp const&) {
        std::cout << app.help("", CLI::AppFormatMode::All);
        return 0;
    } catch (CLI::CallForVersion const& version) {
        std::cout << version.what() << std::endl;
        return 0;
    } catch (CLI::ParseError const& error) {
        std::string message = error.what();
        while (!message.empty() && (message.back() == '\n' || message.back() == '\r')) {
            message.pop_back();
        }
        for (char& c : message) {
            if (c == '\n' || c == '\r') {
                c = ' ';
            }
        }
        complain(message + " (see --help)");
        return kExitUsage;
    }

    if (!logLevel.empty() && !applyLevel("--log-level", logLevel, &QNLog::QNLogger::setLogLevel)) {
        return kExitUsage;
    }
    if (!traceLevel.empty() &&
        !applyLevel("--trace-level", traceLevel, &QNLog::QNLogger::setTraceLevel)) {
        return kExitUsage;
    }
    if (!logFile.empty() && !QNLog::QNLogger::setLogFile(logFile)) {
        complain("--log: cannot open " + logFile + " for appending");
        return kExitUsage;
    }

    // Read the dump before anything is created, so that an unreadable file
    // is a command-line error.
    std::string dumpContent;
    if (!dumpFile.empty()) {
        std::string why;
        if (!readWholeFile(dumpFile, dumpContent, why)) {
            complain("--dump: " + why);
            return kExitUsage;
        }
    }

    if (!dataDir.empty() && !setEnvironment("KESTREL_DATA_DIR", dataDir)) {
        return kExitFailure;
    }
    if (!codeDir.empty() && !setEnvironment("KESTREL_CODE_DIR", codeDir)) {
        return kExitFailure;
    }

    // A dump runs in a private data directory whose override file is a copy
    // of it; the real data directory is left alone.
    TemporaryDataDir temporary;
    if (!dumpFile.empty()) {
        std::string why;
        if (!temporary.create(why)) {
            complain(why);
            return kExitFailure;
        }
        std::string const overrideDir = temporary.path() + "/SmBiosOverride";
        std::error_code error;
        if (!std::filesystem::create_directory(overrideDir, error)) {
            complain("cannot create " + overrideDir + ": " + error.message());
            return kExitFailure;
        }
        if (!writeWholeFile(overrideDir + "/smbios.txt", dumpContent, why)) {
            complain(why);
            return kExitFailure;
        }
        if (!setEnvironment("KESTREL_DATA_DIR", temporary.path() + "/")) {
            return kExitFailure;
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
    int status = loadInventory(pluginPath, nodes);
    if (status != 0) {
        return status;
    }

    std::string const text =
        format == "json" ? inventory::renderJson(nodes) : inventory::renderTree(nodes);
    std::cout << text;
    std::cout.flush();
    if (!std::cout) {
        complain("cannot write the inventory to standard output");
        return kExitFailure;
    }
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    try {
        return run(argc, argv);
    } catch (std::exception const& error) {
        complain(std::string("unexpected failure: ") + error.what());
    } catch (...) {
        complain("unexpected failure");
    }
    return kExitFailure;
}
