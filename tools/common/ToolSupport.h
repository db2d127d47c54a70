// What the command-line programs (smbios-dump, smbios-inventory) share: their
// exit statuses, their messages on standard error, the parsing of their
// command line, the run of main, and where they find the libraries
// installed with them.
#pragma once

#include <string>

namespace CLI {
class App;
}

namespace smbiostool {

// The exit statuses besides 0: a failure, and a wrong command line.
constexpr int EXIT_FAILED = 1;
constexpr int EXIT_USAGE = 2;

// Writes "program: message" and a line end to standard error.
void complain(char const* program, std::string const& message);

// Says what is wrong with the command line ("... (see --help)") and returns
// EXIT_USAGE.
int usage(char const* program, std::string const& message);

// The message on one line: line ends at its end are dropped, the others
// become blanks.
std::string oneLine(std::string message);

// Parses the command line. Returns true when the program goes on; else
// false and the status to exit with: 0 after printing the help or the
// version, EXIT_USAGE after saying what is wrong.
bool parseCommandLine(CLI::App& app, int argc, char** argv, char const* program, int& exitStatus);

// Runs the program's run(argc, argv) and returns its status. An exception
// that escapes it is said as an unexpected failure, and the status is then
// EXIT_FAILED.
int runMain(char const* program, int (*run)(int, char**), int argc, char** argv);

// The folder that holds this program ("." when it cannot be told).
std::string ownFolder();

// The library `name` in `programFolder` when it is there, else in
// programFolder/../lib (an installed program in PREFIX/bin, the libraries in
// PREFIX/lib).
std::string installedLibrary(std::string const& programFolder, std::string const& name);

}  // namespace smbiostool
