#include "ToolSupport.h"

#include <limits.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <cerrno>
#include <cstring>
#include <exception>
#include <iostream>
#include <vector>

#include "SD/RegularFile.h"

namespace smbiostool {

void complain(char const* program, std::string const& message) {
    std::cerr << program << ": " << message << std::endl;
}

bool readInputFile(std::string const& path, std::vector<std::uint8_t>& bytes, std::string& error) {
    std::string why;
    int const fd = SD::openRegularFile(path.c_str(), why);
    if (fd < 0) {
        error = "cannot open: " + why;
        return false;
    }
    std::vector<std::uint8_t> content;
    int readErrno = 0;
    SD::ReadEnd const end = SD::readToEnd(fd, MAX_INPUT_FILE_SIZE, content, readErrno);
    ::close(fd);
    if (end == SD::ReadEnd::Failed) {
        error = std::string("cannot read: ") + std::strerror(readErrno);
        return false;
    }
    if (end == SD::ReadEnd::TooLarge) {
        error = "larger than " + std::to_string(MAX_INPUT_FILE_SIZE / (1024 * 1024)) +
                " MiB, too large for an SMBIOS table";
        return false;
    }
    bytes = std::move(content);
    return true;
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

std::string libraryFile(std::string const& name) {
    return name.find('/') == std::string::npos ? "./" + name : name;
}

std::string installedLibrary(std::string const& programFolder, std::string const& name) {
    std::string const beside = programFolder + "/" + name;
    if (access(beside.c_str(), F_OK) == 0) {
        return beside;
    }
    return programFolder + "/../lib/" + name;
}

}  // namespace smbiostool
