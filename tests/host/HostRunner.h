// Runs a built program as a child process and captures what it writes to
// standard output and to standard error, each on its own. The host tests use
// it to run smbios-inventory; it serves any test that runs a built program.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace hosttest {

struct RunResult {
    // The exit status, or -1 when the child did not exit normally.
    int exitStatus = -1;
    // The signal that ended the child, or 0.
    int signal = 0;
    std::string out;
    std::string err;
    // Why the child could not be started; empty when it was.
    std::string startError;
};

// Changes to the environment of the child: variables to set (or replace)
// and variables to remove. Everything else is inherited.
struct Environment {
    std::map<std::string, std::string> set;
    std::vector<std::string> unset;
};

// SMBIOS_OUT_DIR, the folder of the built programs and libraries; "" when
// it is not set.
std::string outDir();

// The built smbios-inventory in SMBIOS_OUT_DIR.
std::string hostPath();

// Runs program with args (not counting the program name itself) and waits
// for it to end.
RunResult runProgram(std::string const& program, std::vector<std::string> const& args,
                     Environment const& environment = Environment());

// Runs the built smbios-inventory.
RunResult runHost(std::vector<std::string> const& args,
                  Environment const& environment = Environment());

// A readable account of a run, for failure messages.
std::string describe(RunResult const& result);

// A private folder that is removed with everything in it when the object
// goes away.
class TempDir {
public:
    TempDir();
    ~TempDir();
    TempDir(TempDir const&) = delete;
    TempDir& operator=(TempDir const&) = delete;

    // The folder, without a trailing separator; "" when it could not be made.
    std::string const& path() const { return path_; }
    // path() + "/" + name.
    std::string file(std::string const& name) const;

private:
    std::string path_;
};

// The whole content of a file; "" when it cannot be read.
std::string readFile(std::string const& path);
// Writes content to path; returns false when it cannot.
bool writeFile(std::string const& path, std::string const& content);
bool pathExists(std::string const& path);

}  // namespace hosttest
