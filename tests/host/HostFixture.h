// The base of the tests that run the built programs: they need the folders
// CTest names (SMBIOS_OUT_DIR, SMBIOS_SOURCE_DIR) and fail at once, saying
// so, when they are run without them.
#pragma once

#include <gtest/gtest.h>

#include "HostRunner.h"

namespace hosttest {

class BuiltProgramsTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_FALSE(outDir().empty()) << "SMBIOS_OUT_DIR is not set; run the tests through ctest";
        ASSERT_FALSE(sourceDir().empty())
            << "SMBIOS_SOURCE_DIR is not set; run the tests through ctest";
    }
};

}  // namespace hosttest
