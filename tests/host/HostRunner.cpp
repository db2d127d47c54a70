#include "HostRunner.h"

#include <errno.h>
#include <fcntl.h>
#include <spawn.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <sstream>

extern char** environ;

namespace hosttest {

namespace {

std::string tempBase() {
    char const* base = std::getenv("TMPDIR");
    std::string folder = (base != nullptr && *base != '\0') ? base : "/tmp";
    if (folder.back() != '/') {
        folder += '/';
    }
    return folder;
}

// A file that takes one output of the child; it is removed when done.
class CaptureFile {
public:
    CaptureFile() {
        std::string pattern = tempBase() + "host-capture.XXXXXX";
        std::vector<char> buffer(pattern.begin(), pattern.end());
        buffer.push_back('\0');
        fd_ = mkstemp(buffer.data());
        if (fd_ >= 0) {
            path_ = buffer.data();
        }
    }
    ~CaptureFile() {
        if (fd_ >= 0) {
            close(fd_);
            unlink(path_.c_str());
        }
    }
    CaptureFile(CaptureFile const&) = delete;
    CaptureFile& operator=(CaptureFile const&) = delete;

    int fd() const { return fd_; }
    std::string content() const { return readFile(path_); }

private:
    int fd_ = -1;
    std::string path_;
};

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

std::string hostPath() { return outDir() + "/smbios-inventory"; }

RunResult runProgram(std::string const& program, std::vector<std::string> const& args,
                     Environment const& environment) {
    RunResult result;
    CaptureFile out;
    CaptureFile err;
    if (out.fd() < 0 || err.fd() < 0) {
        result.startError = std::string("cannot create capture files: ") + std::strerror(errno);
        return result;
    }

    std::vector<std::string> argStrings;
    argStrings.push_back(program);
    argStrings.insert(argStrings.end(), args.begin(), args.end());
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
    posix_spawn_file_actions_adddup2(&actions, out.fd(), STDOUT_FILENO);
    posix_spawn_file_actions_adddup2(&actions, err.fd(), STDERR_FILENO);

    pid_t pid = 0;
    int spawned = posix_spawn(&pid, program.c_str(), &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    if (spawned != 0) {
        result.startError = "cannot start " + program + ": " + std::strerror(spawned);
        return result;
    }

    int status = 0;
    pid_t waited = 0;
    do {
        waited = waitpid(pid, &status, 0);
    } while (waited < 0 && errno == EINTR);
    if (waited < 0) {
        result.startError = std::string("cannot wait for the child: ") + std::strerror(errno);
        return result;
    }
    if (WIFEXITED(status)) {
        result.exitStatus = WEXITSTATUS(status);
    } else if (WIFSIGNALED(status)) {
        result.signal = WTERMSIG(status);
    }
    result.out = out.content();
    result.err = err.content();
    return result;
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

TempDir::TempDir() {
    std::string pattern = tempBase() + "host-test.XXXXXX";
    std::vector<char> buffer(pattern.begin(), pattern.end());
    buffer.push_back('\0');
    if (mkdtemp(buffer.data()) != nullptr) {
        path_ = buffer.data();
    }
}

TempDir::~TempDir() {
    if (!path_.empty()) {
        std::error_code ignored;
        std::filesystem::remove_all(path_, ignored);
    }
}

std::string TempDir::file(std::string const& name) const { return path_ + "/" + name; }

std::string readFile(std::string const& path) {
    std::FILE* file = std::fopen(path.c_str(), "rb");
    if (file == nullptr) {
        return std::string();
    }
    std::string content;
    char buffer[65536];
    size_t count = 0;
    while ((count = std::fread(buffer, 1, sizeof buffer, file)) > 0) {
        content.append(buffer, count);
    }
    std::fclose(file);
    return content;
}

bool writeFile(std::string const& path, std::string const& content) {
    std::FILE* file = std::fopen(path.c_str(), "wb");
    if (file == nullptr) {
        return false;
    }
    bool ok = std::fwrite(content.data(), 1, content.size(), file) == content.size();
    ok = std::fclose(file) == 0 && ok;
    return ok;
}

bool pathExists(std::string const& path) {
    struct stat info;
    return stat(path.c_str(), &info) == 0;
}

}  // namespace hosttest
