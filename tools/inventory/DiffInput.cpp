#include "inventory/DiffInput.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "ToolSupport.h"

extern char** environ;

namespace inventory {

namespace {

// This program, whatever name it was started by.
char const kSelf[] = "/proc/self/exe";

bool startsWith(std::vector<std::uint8_t> const& bytes, char const* prefix) {
    size_t const length = std::strlen(prefix);
    return bytes.size() >= length && std::memcmp(bytes.data(), prefix, length) == 0;
}

// Runs this program with args and collects what it writes to standard
// output; its standard error is ours. Returns false and says why when it
// cannot be started or does not end with status 0.
bool runSelf(std::vector<std::string> const& args, std::string& out, std::string& why) {
    int pipeEnds[2];
    if (pipe2(pipeEnds, O_CLOEXEC) != 0) {
        why = std::string("cannot make a pipe: ") + std::strerror(errno);
        return false;
    }
    std::vector<char*> argv;
    std::string const name = "smbios-inventory";
    argv.push_back(const_cast<char*>(name.c_str()));
    for (std::string const& arg : args) {
        argv.push_back(const_cast<char*>(arg.c_str()));
    }
    argv.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, pipeEnds[1], STDOUT_FILENO);
    pid_t child = 0;
    int const started = posix_spawn(&child, kSelf, &actions, nullptr, argv.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    close(pipeEnds[1]);
    if (started != 0) {
        close(pipeEnds[0]);
        why = std::string("cannot run ") + kSelf + ": " + std::strerror(started);
        return false;
    }
    char buffer[65536];
    for (;;) {
        ssize_t const count = read(pipeEnds[0], buffer, sizeof buffer);
        if (count > 0) {
            out.append(buffer, static_cast<size_t>(count));
        } else if (count == 0 || errno != EINTR) {
            break;
        }
    }
    close(pipeEnds[0]);
    int status = 0;
    while (waitpid(child, &status, 0) < 0) {
        if (errno != EINTR) {
            why = std::string("cannot wait for the inventory run: ") + std::strerror(errno);
            return false;
        }
    }
    if (WIFEXITED(status) && WEXITSTATUS(status) == 0) {
        return true;
    }
    why = WIFEXITED(status)
              ? "the inventory run ended with exit status " + std::to_string(WEXITSTATUS(status))
              : "the inventory run ended by signal " + std::to_string(WTERMSIG(status));
    return false;
}

bool parseJson(std::string const& text, std::vector<InventoryNode>& nodes, std::string& why) {
    DiffJson document = DiffJson::parse(text, nullptr, false);
    if (document.is_discarded()) {
        why = "not valid JSON";
        return false;
    }
    if (!parseInventory(document, nodes, why)) {
        why = "not an inventory: " + why;
        return false;
    }
    return true;
}

}  // namespace

InputKind classifyInput(std::vector<std::uint8_t> const& bytes) {
    for (char const* anchor : {"_SM_", "_SM3_", "_DMI_"}) {
        if (startsWith(bytes, anchor)) {
            return InputKind::DUMP_BIN;
        }
    }
    size_t start = 0;
    while (start < bytes.size() && std::strchr(" \t\r\n", bytes[start]) != nullptr &&
           bytes[start] != 0) {
        ++start;
    }
    if (start < bytes.size() && bytes[start] == '{') {
        return InputKind::JSON_INVENTORY;
    }
    // The override text is ASCII; a NUL byte makes it something else.
    static char const kTag[] = "<EPHEADER>";
    std::string const text(bytes.begin(), bytes.end());
    if (text.find('\0') == std::string::npos && text.find(kTag) != std::string::npos) {
        return InputKind::OVERRIDE_DUMP;
    }
    return InputKind::UNKNOWN;
}

std::vector<std::string> childArguments(InputKind kind, std::string const& path,
                                        ChildOptions const& options) {
    // OPTION=VALUE, so that a value that starts with "-" stays a value.
    std::vector<std::string> args{"--format=json",
                                  (kind == InputKind::DUMP_BIN ? "--from-bin=" : "--dump=") + path};
    if (!options.pluginPath.empty()) {
        args.push_back("--plugin=" + options.pluginPath);
    }
    if (!options.codeDir.empty()) {
        args.push_back("--code-dir=" + options.codeDir);
    }
    return args;
}

bool readInventoryFile(std::string const& path, ChildOptions const& options,
                       std::vector<InventoryNode>& nodes, std::string& why) {
    std::vector<std::uint8_t> bytes;
    std::string problem;
    if (!smbiostool::readInputFile(path, bytes, problem)) {
        why = path + ": " + problem;
        return false;
    }
    InputKind const kind = classifyInput(bytes);
    std::string json;
    switch (kind) {
        case InputKind::UNKNOWN:
            why = path +
                  ": neither a JSON inventory (--format json), an override dump file nor a "
                  "--dump-bin file";
            return false;
        case InputKind::JSON_INVENTORY:
            json.assign(bytes.begin(), bytes.end());
            break;
        case InputKind::OVERRIDE_DUMP:
        case InputKind::DUMP_BIN:
            if (!runSelf(childArguments(kind, path, options), json, problem)) {
                why = path + ": no inventory: " + problem;
                return false;
            }
            break;
    }
    if (!parseJson(json, nodes, problem)) {
        why = path + ": " + problem;
        return false;
    }
    return true;
}

}  // namespace inventory
