#include "ToolSupport.h"

#include <limits.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <exception>
#include <iostream>
#include <vector>

namespace smbiostool {

void complain(char const* program, std::string const& message) {
    std::cerr << program << ": " << message << std::endl;
}

int usage(char const* program, std::string const& message) {
    complain(program, message + " (see --help)");
    return EXIT_USAGE;
}

std::string oneLine(std::string message) {
    while (!message.empty() && (message.back() == '\n' || message.back() == '\r')) {
        message.pop_back();
    }
    for (char& c : message) {
        if (c == '\n' || c == '\r') {
            c = ' ';
        }
    }
    return message;
}

bool parseCommandLine(CLI::App& app, int argc, char** argv, char const* program, int& exitStatus) {
    try {
        app.parse(argc, argv);
        return true;
    } catch (CLI::CallForHelp const&) {
        std::cout << app.help();
        exitStatus = 0;
    } catch (CLI::CallForAllHelp const&) {
        std::cout << app.help("", CLI::AppFormatMode::All);
        exitStatus = 0;
    } catch (CLI::CallForVersion const& version) {
        std::cout << version.what() << std::endl;
        exitStatus = 0;
    } catch (CLI::ParseError const& error) {
        exitStatus = usage(program, oneLine(error.what()));
    }
    return false;
}

int runMain(char const* program, int (*run)(int, char**), int argc, char** argv) {
    try {
        return run(argc, argv);
    } catch (std::exception const& error) {
        complain(program, std::string("unexpected failure: ") + error.what());
    } catch (...) {
        complain(program, "unexpected failure");
    }
    return EXIT_FAILED;
}

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

std::string installedLibrary(std::string const& programFolder, std::string const& name) {
    std::string const beside = programFolder + "/" + name;
    if (access(beside.c_str(), F_OK) == 0) {
        return beside;
    }
    return programFolder + "/../lib/" + name;
}

}  // namespace smbiostool
