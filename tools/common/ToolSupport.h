// What the command-line programs (smbios-dump, smbios-inventory) share: their
// exit statuses, their messages on standard error, the parsing of their
// command line, the run of main, and where they find the libraries
// installed with them.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

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

// The largest input file the tools accept: a --dump-bin image, a raw table
// or an override dump is at most some hundreds of kilobytes, so anything this
// size is the wrong file.
constexpr size_t MAX_INPUT_FILE_SIZE = 16u * 1024u * 1024u;

// Reads the whole regular file into `bytes`, up to MAX_INPUT_FILE_SIZE,
// without ever blocking on a FIFO or opening a device. Returns false and the
// reason in `error` (without the file's name): "cannot open: No such file or
// directory", "a FIFO, not a regular file", "larger than 16 MiB, ...".
bool readInputFile(std::string const& path, std::vector<std::uint8_t>& bytes, std::string& error);

// The folder that holds this program ("." when it cannot be told).
std::string ownFolder();

// The library `name` in `programFolder` when it is there, else in
// programFolder/../lib (an installed program in PREFIX/bin, the libraries in
// PREFIX/lib).
std::string installedLibrary(std::string const& programFolder, std::string const& name);

// A library named on the command line as a path to load: a bare file name
// means the file in the current folder ("./name"), never a search of the
// library path.
std::string libraryFile(std::string const& name);

}  // namespace smbiostool
