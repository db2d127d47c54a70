#include "HostRunner.h"

#include <errno.h>
#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <stdlib.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstring>
#include <exception>
#include <memory>
#include <sstream>

#include "TestSupport.h"

extern char** environ;

namespace hosttest {

namespace {

std::vector<std::string> childEnvironment(Environment const& environment) {
    std::vector<std::string> entries;
    for (char** entry = environ; entry != nullptr && *entry != nullptr; ++entry) {
        std::string text = *entry;
        std::string name = text.substr(0, text.find('='));
        bool const dropped = environment.set.count(name) != 0 ||
                             std::find(environment.unset.begin(), environment.unset.end(), name) !=
                                 environment.unset.end();
        if (!dropped) {
            entries.push_back(text);
        }
    }
    for (auto const& variable : environment.set) {
        entries.push_back(variable.first + "=" + variable.second);
    }
    return entries;
}

}  // namespace

std::string outDir() {
    char const* dir = std::getenv("SMBIOS_OUT_DIR");
    return dir != nullptr ? dir : "";
}

std::string sourceDir() {
    char const* dir = std::getenv("SMBIOS_SOURCE_DIR");
    return dir != nullptr ? dir : "";
}

std::string hostPath() { return outDir() + "/smbios-inventory"; }

namespace {

// Runs the program; while it runs, once ready() says so, sends it the
// signal (0: none).
RunResult runChild(std::string const& program, std::vector<std::string> const& args,
                   Environment const& environment, int signalNumber,
                   std::function<bool()> const& ready, double timeLimit = 0) {
    RunResult result;
    // The child's outputs go to two files of a private folder.
    std::unique_ptr<smbiostest::TempDir> captures;
    try {
        captures.reset(new smbiostest::TempDir());
    } catch (std::exception const& error) {
        result.startError = std::string("cannot create the capture folder: ") + error.what();
        return result;
    }
    std::string const outPath = captures->file("stdout");
    std::string const errPath = captures->file("stderr");

    std::vector<std::string> argStrings = smbiostest::commandLine(program, args);
    std::vector<char*> argv;
    for (std::string& arg : argStrings) {
        argv.push_back(&arg[0]);
    }
    argv.push_back(nullptr);

    std::vector<std::string> envStrings = childEnvironment(environment);
    std::vector<char*> envp;
    for (std::string& entry : envStrings) {
        envp.push_back(&entry[0]);
    }
    envp.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, outPath.c_str(),
                                     O_WRONLY | O_CREAT | O_TRUNC, 0600);
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, errPath.c_str(),
                                     O_WRONLY | O_CREAT | O_TRUNC, 0600);

    pid_t pid = 0;
    int spawned =
        posix_spawn(&pid, argStrings[0].c_str(), &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    if (spawned != 0) {
        result.startError = "cannot start " + program + ": " + std::strerror(spawned);
        return result;
    }

    if (signalNumber != 0) {
        int const tries = 30 * 50;
        int tried = 0;
        while (tried < tries && !ready()) {
            usleep(20000);
            ++tried;
        }
        if (tried == tries) {
            result.startError = "the child was never ready for the signal; killed";
            signalNumber = SIGKILL;
        }
        kill(pid, signalNumber);
    }

    int status = 0;
    pid_t waited = 0;
    bool reaped = false;
    if (timeLimit > 0) {
        // Polled every millisecond: a child that ends is seen at once, one
        // that hangs is killed at the limit.
        auto const deadline = std::chrono::steady_clock::now() +
                              std::chrono::duration_cast<std::chrono::steady_clock::duration>(
                                  std::chrono::duration<double>(timeLimit));
        for (;;) {
            waited = waitpid(pid, &status, WNOHANG);
            if (waited == pid) {
                reaped = true;
                break;
            }
            if (waited < 0 && errno != EINTR) {
                break;
            }
            if (std::chrono::steady_clock::now() >= deadline) {
                result.timedOut = true;
                kill(pid, SIGKILL);
                break;
            }
            usleep(1000);
        }
    }
    if (!reaped) {
        do {
            waited = waitpid(pid, &status, 0);
        } while (waited < 0 && errno == EINTR);
    }
    if (waited < 0) {
        result.startError = std::string("cannot wait for the child: ") + std::strerror(errno);
        return result;
    }
    if (WIFEXITED(status)) {
        result.exitStatus = WEXITSTATUS(status);
    } else if (WIFSIGNALED(status)) {
        result.signal = WTERMSIG(status);
    }
    result.out = smbiostest::fileText(outPath);
    result.err = smbiostest::fileText(errPath);
    return result;
}

}  // namespace

RunResult runProgram(std::string const& program, std::vector<std::string> const& args,
                     Environment const& environment) {
    return runChild(program, args, environment, 0, std::function<bool()>());
}

RunResult runProgramAndSignal(std::string const& program, std::vector<std::string> const& args,
                              Environment const& environment, int signalNumber,
                              std::function<bool()> const& ready) {
    return runChild(program, args, environment, signalNumber, ready);
}

RunResult runProgramWithin(std::string const& program, std::vector<std::string> const& args,
                           Environment const& environment, double seconds) {
    return runChild(program, args, environment, 0, std::function<bool()>(), seconds);
}

RunResult runProgramUnprivileged(std::string const& program, std::vector<std::string> const& args,
                                 Environment const& environment) {
    if (::geteuid() != 0) {
        return runProgram(program, args, environment);
    }
    char const setpriv[] = "/usr/bin/setpriv";
    if (::access(setpriv, X_OK) != 0) {
        RunResult missing;
        missing.startError =
            std::string("running as root without ") + setpriv + " to become an unprivileged user";
        return missing;
    }
    // setpriv starts the program itself, so the program's own command line
    // (with the emulator in front in a 32-bit build on a 64-bit-only kernel)
    // follows setpriv's options.
    std::vector<std::string> line = {"--reuid=65534", "--regid=65534", "--clear-groups"};
    for (std::string const& part : smbiostest::commandLine(program, args)) {
        line.push_back(part);
    }
    RunResult run = runProgram(setpriv, line, environment);
    if (run.startError.empty() && run.err.rfind("setpriv: ", 0) == 0) {
        run.startError = "cannot become nobody here: " + run.err;
    }
    return run;
}

RunResult runHost(std::vector<std::string> const& args, Environment const& environment) {
    return runProgram(hostPath(), args, environment);
}

std::string describe(RunResult const& result) {
    std::ostringstream text;
    if (!result.startError.empty()) {
        text << "not started: " << result.startError << "\n";
    }
    text << "exit status " << result.exitStatus;
    if (result.signal != 0) {
        text << ", signal " << result.signal;
    }
    text << "\n--- stdout ---\n" << result.out << "\n--- stderr ---\n" << result.err;
    return text.str();
}

}  // namespace hosttest
