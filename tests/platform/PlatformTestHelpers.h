// Helpers of the platform library's tests that the shared test support
// (TestSupport.h: temporary folders, files, environment variables) does not
// already give.
#pragma once

#include <unistd.h>

#include <string>

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

}  // namespace platform_test
