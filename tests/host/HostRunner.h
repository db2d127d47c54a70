// Runs a built program as a child process and captures what it writes to
// standard output and to standard error, each on its own. The host tests use
// it to run smbios-inventory; it serves any test that runs a built program.
#pragma once

#include <functional>
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
    // The child ran past its time limit and was killed (runProgramWithin).
    bool timedOut = false;
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

// SMBIOS_SOURCE_DIR, the root of the repository; "" when it is not set.
std::string sourceDir();

// The built smbios-inventory in SMBIOS_OUT_DIR.
std::string hostPath();

// Runs program with args (not counting the program name itself) and waits
// for it to end.
RunResult runProgram(std::string const& program, std::vector<std::string> const& args,
                     Environment const& environment = Environment());

// Runs program with args, waits until ready() says so (it is asked every
// 20 ms, for at most 30 s), sends it the signal and waits for it to end.
// When ready() never says so, the child is killed and startError says why.
RunResult runProgramAndSignal(std::string const& program, std::vector<std::string> const& args,
                              Environment const& environment, int signalNumber,
                              std::function<bool()> const& ready);

// Runs program with args; kills it (SIGKILL) and sets timedOut when it runs
// longer than `seconds`.
RunResult runProgramWithin(std::string const& program, std::vector<std::string> const& args,
                           Environment const& environment, double seconds);

// Runs program with args as an unprivileged user, to whom files and folders
// that only root may use are closed as to an ordinary user: as this
// process's user when it is not root, else as "nobody" (65534) through
// setpriv. When this process is root and cannot become nobody (no setpriv,
// or setpriv refused), nothing of the program ran and startError says why.
RunResult runProgramUnprivileged(std::string const& program, std::vector<std::string> const& args,
                                 Environment const& environment = Environment());

// Runs the built smbios-inventory.
RunResult runHost(std::vector<std::string> const& args,
                  Environment const& environment = Environment());

// A readable account of a run, for failure messages.
std::string describe(RunResult const& result);

}  // namespace hosttest
