// SD::DynamicLibrary: loading and unloading shared libraries.
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <cstdlib>

#include "PlatformTestHelpers.h"
#include "SD/DynamicLibrary.h"
#include "SD/StringConversion.h"

using SD::DynamicLibrary;

namespace {

// The platform library in the build's output folder, or "" when the folder
// is not known.
std::wstring platformLibrary() {
    char const* outDir = std::getenv("SMBIOS_OUT_DIR");
    if (outDir == nullptr || outDir[0] == '\0') {
        return L"";
    }
    return SD::make_wstring(std::string(outDir) + "/libkestrel.so");
}

// A module built beside this test program that nothing else loads, so that
// whether it is in the process shows whether it was unloaded.
char const kModule[] = "libkestrel_test_module.so";

bool isResident(std::string const& path) {
    void* handle = dlopen(path.c_str(), RTLD_NOW | RTLD_NOLOAD);
    if (handle == nullptr) {
        return false;
    }
    dlclose(handle);
    return true;
}

}  // namespace

TEST(DynamicLibrary, LoadsPlatformLibrary) {
    std::wstring const path = platformLibrary();
    if (path.empty()) {
        GTEST_SKIP() << "SMBIOS_OUT_DIR is not set: the built libraries cannot be found";
    }
    DynamicLibrary library(path);
    EXPECT_EQ(path, library.getFileName());
    EXPECT_EQ(nullptr, library.getHandle());
    ASSERT_TRUE(library.load()) << library.getLastError();
    EXPECT_NE(nullptr, library.getHandle());
    EXPECT_EQ("", library.getLastError());
}

TEST(DynamicLibrary, SecondLoadKeepsHandle) {
    std::wstring const path = platformLibrary();
    if (path.empty()) {
        GTEST_SKIP() << "SMBIOS_OUT_DIR is not set: the built libraries cannot be found";
    }
    DynamicLibrary library(path);
    ASSERT_TRUE(library.load()) << library.getLastError();
    void* const handle = library.getHandle();
    EXPECT_TRUE(library.load());
    EXPECT_EQ(handle, library.getHandle());
}

TEST(DynamicLibrary, UnloadClearsHandleAndMayRepeat) {
    std::wstring const path = platformLibrary();
    if (path.empty()) {
        GTEST_SKIP() << "SMBIOS_OUT_DIR is not set: the built libraries cannot be found";
    }
    DynamicLibrary library(path);
    ASSERT_TRUE(library.load()) << library.getLastError();
    library.unload();
    EXPECT_EQ(nullptr, library.getHandle());
    library.unload();
    EXPECT_EQ(nullptr, library.getHandle());
    EXPECT_TRUE(library.load());
    EXPECT_NE(nullptr, library.getHandle());
}

TEST(DynamicLibrary, MissingFileFailsWithReason) {
    DynamicLibrary library(L"libkestrel-no-such-library.so");
    EXPECT_FALSE(library.load());
    EXPECT_EQ(nullptr, library.getHandle());
    EXPECT_FALSE(library.getLastError().empty());
    EXPECT_NE(std::string::npos, library.getLastError().find("libkestrel-no-such-library.so"))
        << library.getLastError();
}

TEST(DynamicLibrary, SymbolsAreFoundThroughHandle) {
    DynamicLibrary library(SD::make_wstring(platform_test::besideTestProgram(kModule)));
    ASSERT_TRUE(library.load()) << library.getLastError();
    using AnswerFunction = int (*)();
    auto const answer =
        reinterpret_cast<AnswerFunction>(dlsym(library.getHandle(), "kestrel_test_module_answer"));
    ASSERT_NE(nullptr, answer);
    EXPECT_EQ(42, answer());
}

TEST(DynamicLibrary, GetSymbolFindsFunction) {
    DynamicLibrary library(SD::make_wstring(platform_test::besideTestProgram(kModule)));
    ASSERT_TRUE(library.load()) << library.getLastError();
    void* const symbol = library.getSymbol("kestrel_test_module_answer");
    ASSERT_NE(nullptr, symbol) << library.getLastError();
    EXPECT_EQ(dlsym(library.getHandle(), "kestrel_test_module_answer"), symbol);
    EXPECT_EQ("", library.getLastError());
}

TEST(DynamicLibrary, GetSymbolOfMissingNameFailsWithReason) {
    DynamicLibrary library(SD::make_wstring(platform_test::besideTestProgram(kModule)));
    ASSERT_TRUE(library.load()) << library.getLastError();
    EXPECT_EQ(nullptr, library.getSymbol("kestrel_test_module_no_such_function"));
    EXPECT_NE(std::string::npos,
              library.getLastError().find("kestrel_test_module_no_such_function"))
        << library.getLastError();
}

TEST(DynamicLibrary, GetSymbolBeforeLoadFails) {
    DynamicLibrary library(SD::make_wstring(platform_test::besideTestProgram(kModule)));
    EXPECT_EQ(nullptr, library.getSymbol("kestrel_test_module_answer"));
    EXPECT_NE(std::string::npos, library.getLastError().find("not loaded"))
        << library.getLastError();
}

TEST(DynamicLibrary, UnloadReleasesLibrary) {
    std::string const path = platform_test::besideTestProgram(kModule);
    DynamicLibrary library(SD::make_wstring(path));
    ASSERT_TRUE(library.load()) << library.getLastError();
    EXPECT_TRUE(isResident(path));
    library.unload();
    EXPECT_FALSE(isResident(path));
}

TEST(DynamicLibrary, DestructorUnloadsLibrary) {
    std::string const path = platform_test::besideTestProgram(kModule);
    {
        DynamicLibrary library(SD::make_wstring(path));
        ASSERT_TRUE(library.load()) << library.getLastError();
        EXPECT_TRUE(isResident(path));
    }
    EXPECT_FALSE(isResident(path));
}
