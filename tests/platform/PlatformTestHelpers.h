// Helpers of the platform library's tests that the shared test support
// (TestSupport.h: temporary folders, files, environment variables) does not
// already give.
#pragma once

#include <unistd.h>

#include <cstdint>
#include <string>
#include <vector>

#include "TestSupport.h"

namespace platform_test {

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

// The whole file as text; throws std::runtime_error when it cannot be read.
inline std::string fileText(std::string const& path) {
    std::vector<uint8_t> const bytes = smbiostest::fileBytes(path);
    return std::string(bytes.begin(), bytes.end());
}

}  // namespace platform_test
