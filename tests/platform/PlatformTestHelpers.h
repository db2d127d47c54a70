// Helpers shared by the platform library's tests: scratch files and
// environment variables that are put back when a test ends.
#pragma once

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <string>

namespace platform_test {

// A file name in the test scratch folder, unique to this process and test;
// the file is removed when the object goes.
class ScratchFile {
public:
    explicit ScratchFile(std::string const& stem) {
        testing::TestInfo const* info = testing::UnitTest::GetInstance()->current_test_info();
        std::string folder = testing::TempDir();
        if (!folder.empty() && folder.back() != '/') {
            folder += '/';
        }
        path_ = folder + "kestrel-" + std::to_string(getpid()) + "-" +
                (info != nullptr ? std::string(info->name()) : std::string("test")) + "-" + stem;
        std::remove(path_.c_str());
    }
    ~ScratchFile() { std::remove(path_.c_str()); }
    ScratchFile(ScratchFile const&) = delete;
    ScratchFile& operator=(ScratchFile const&) = delete;

    std::string const& path() const { return path_; }

    void write(std::string const& content) const {
        std::ofstream out(path_, std::ios::binary | std::ios::trunc);
        out << content;
    }

    std::string read() const {
        std::ifstream in(path_, std::ios::binary);
        std::ostringstream content;
        content << in.rdbuf();
        return content.str();
    }

private:
    std::string path_;
};

// The path of a file built into the folder of this test program.
inline std::string besideTestProgram(std::string const& name) {
    char self[4096];
    ssize_t const length = readlink("/proc/self/exe", self, sizeof self - 1);
    if (length <= 0) {
        return name;
    }
    std::string const program(self, static_cast<size_t>(length));
    return program.substr(0, program.rfind('/') + 1) + name;
}

// Sets (or with a null value unsets) an environment variable and restores
// the earlier state when the object goes.
class ScopedEnv {
public:
    ScopedEnv(char const* name, char const* value) : name_(name) {
        char const* old = std::getenv(name);
        hadValue_ = old != nullptr;
        if (hadValue_) {
            oldValue_ = old;
        }
        if (value != nullptr) {
            setenv(name, value, 1);
        } else {
            unsetenv(name);
        }
    }
    ~ScopedEnv() {
        if (hadValue_) {
            setenv(name_.c_str(), oldValue_.c_str(), 1);
        } else {
            unsetenv(name_.c_str());
        }
    }
    ScopedEnv(ScopedEnv const&) = delete;
    ScopedEnv& operator=(ScopedEnv const&) = delete;

private:
    std::string name_;
    bool hadValue_ = false;
    std::string oldValue_;
};

}  // namespace platform_test
