// SD::PlatformUtilities: the agent's folders, line reading and UUID text.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <vector>

#include "PlatformTestHelpers.h"
#include "SD/PlatformUtilities.h"

using SD::_FileHandle;
using SD::PlatformUtilities;
using smbiostest::ScopedEnv;

namespace {

bool isFolder(std::string const& path) {
    struct stat info;
    return stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode);
}

bool isFile(std::string const& path) {
    struct stat info;
    return stat(path.c_str(), &info) == 0 && S_ISREG(info.st_mode);
}

std::string canonical(std::string const& path) {
    char resolved[PATH_MAX];
    return realpath(path.c_str(), resolved) != nullptr ? std::string(resolved) : std::string();
}

// Reads every line of the file; each entry is the text readLine returned.
std::vector<std::string> readAll(std::string const& path) {
    std::vector<std::string> result;
    _FileHandle* file = nullptr;
    EXPECT_EQ(0, PlatformUtilities::openFile(path.c_str(), &file, 0, 0));
    if (file == nullptr) {
        return result;
    }
    int length = -1;
    while (char* line = PlatformUtilities::readLine(file, length)) {
        EXPECT_EQ('\0', line[length]);
        result.emplace_back(line, static_cast<size_t>(length));
        delete[] line;
    }
    EXPECT_EQ(0, PlatformUtilities::closeFile(&file));
    EXPECT_EQ(nullptr, file);
    return result;
}

// The lines readLine gives for a file with this content.
std::vector<std::string> linesOf(std::string const& content) {
    smbiostest::TempDir scratch;
    std::string const file = scratch.file("lines.txt");
    smbiostest::writeFile(file, content);
    return readAll(file);
}

}  // namespace

TEST(PlatformUtilities, DataDirComesFromEnvironmentWithSeparator) {
    ScopedEnv env("KESTREL_DATA_DIR", "relative/data");
    EXPECT_EQ("relative/data/", PlatformUtilities::getKestrelDataDir());
}

TEST(PlatformUtilities, DataDirFromEnvironmentKeepsItsSeparator) {
    ScopedEnv env("KESTREL_DATA_DIR", "relative/data/");
    EXPECT_EQ("relative/data/", PlatformUtilities::getKestrelDataDir());
}

TEST(PlatformUtilities, DataDirDefaultsWhenUnsetOrEmpty) {
    {
        ScopedEnv env("KESTREL_DATA_DIR", nullptr);
        EXPECT_EQ("/var/lib/kestrel/", PlatformUtilities::getKestrelDataDir());
    }
    ScopedEnv env("KESTREL_DATA_DIR", "");
    EXPECT_EQ("/var/lib/kestrel/", PlatformUtilities::getKestrelDataDir());
}

TEST(PlatformUtilities, CodeDirComesFromEnvironmentWithSeparator) {
    ScopedEnv env("KESTREL_CODE_DIR", "relative/code");
    EXPECT_EQ("relative/code/", PlatformUtilities::getKestrelCodeDir());
}

TEST(PlatformUtilities, CodeDirDefaultsToFolderOfPlatformLibrary) {
    ScopedEnv env("KESTREL_CODE_DIR", "");
    std::string const folder = PlatformUtilities::getKestrelCodeDir();
    ASSERT_FALSE(folder.empty());
    EXPECT_EQ('/', folder.back());
    EXPECT_TRUE(isFolder(folder)) << folder;
    EXPECT_TRUE(isFile(folder + "libkestrel.so")) << folder;
    char const* outDir = std::getenv("SMBIOS_OUT_DIR");
    if (outDir != nullptr) {
        EXPECT_EQ(canonical(outDir), canonical(folder));
    }
}

TEST(PlatformUtilities, CodeDirDefaultWhenUnset) {
    ScopedEnv env("KESTREL_CODE_DIR", nullptr);
    std::string const folder = PlatformUtilities::getKestrelCodeDir();
    EXPECT_EQ('/', folder.back());
    EXPECT_TRUE(isFile(folder + "libkestrel.so")) << folder;
}

TEST(PlatformUtilities, SeparatorIsSlash) { EXPECT_EQ('/', PlatformUtilities::getSeparator()); }

TEST(PlatformUtilities, OpenMissingFileReportsErrno) {
    smbiostest::TempDir scratch;
    std::string const missing = scratch.file("never-written");
    _FileHandle* file = reinterpret_cast<_FileHandle*>(&scratch);
    EXPECT_EQ(ENOENT, PlatformUtilities::openFile(missing.c_str(), &file, 0, 0));
    EXPECT_EQ(nullptr, file);
}

TEST(PlatformUtilities, OpenFifoIsRefusedWithoutWaitingForAWriter) {
    smbiostest::TempDir scratch;
    std::string const fifo = scratch.file("smbios.txt");
    ASSERT_EQ(0, mkfifo(fifo.c_str(), 0600));
    _FileHandle* file = reinterpret_cast<_FileHandle*>(&scratch);
    // An open that waits for a writer is released by one coming and going,
    // so that the test fails instead of hanging.
    int result = 0;
    bool const waited = smbiostest::waitedOnFifo(fifo, [&fifo, &file, &result] {
        result = PlatformUtilities::openFile(fifo.c_str(), &file, 0, 0);
    });
    EXPECT_FALSE(waited) << "openFile waited for a writer on the FIFO";
    EXPECT_EQ(EINVAL, result);
    EXPECT_EQ(nullptr, file);
    if (result == 0 && file != nullptr) {
        PlatformUtilities::closeFile(&file);
    }
}

TEST(PlatformUtilities, OpenFolderIsRefused) {
    smbiostest::TempDir scratch;
    _FileHandle* file = reinterpret_cast<_FileHandle*>(&scratch);
    int const result = PlatformUtilities::openFile(scratch.path().c_str(), &file, 0, 0);
    EXPECT_EQ(EINVAL, result);
    EXPECT_EQ(nullptr, file);
    if (result == 0 && file != nullptr) {
        PlatformUtilities::closeFile(&file);
    }
}

TEST(PlatformUtilities, OpenCharacterDeviceIsRefused) {
    struct stat info;
    if (stat("/dev/null", &info) != 0 || !S_ISCHR(info.st_mode)) {
        GTEST_SKIP() << "this system has no /dev/null character device";
    }
    _FileHandle* file = nullptr;
    int const result = PlatformUtilities::openFile("/dev/null", &file, 0, 0);
    EXPECT_EQ(EINVAL, result);
    EXPECT_EQ(nullptr, file);
    if (result == 0 && file != nullptr) {
        PlatformUtilities::closeFile(&file);
    }
}

TEST(PlatformUtilities, OpenSymbolicLinkToRegularFileReadsTheFile) {
    smbiostest::TempDir scratch;
    smbiostest::writeFile(scratch.file("real.txt"), "first\nsecond\n");
    ASSERT_EQ(0, symlink("real.txt", scratch.file("link.txt").c_str()));
    EXPECT_EQ((std::vector<std::string>{"first", "second"}), readAll(scratch.file("link.txt")));
}

TEST(PlatformUtilities, OpenNullPathIsInvalid) {
    _FileHandle* file = nullptr;
    EXPECT_EQ(EINVAL, PlatformUtilities::openFile(nullptr, &file, 0, 0));
    EXPECT_EQ(nullptr, file);
}

TEST(PlatformUtilities, ReadLineStripsLineFeeds) {
    EXPECT_EQ((std::vector<std::string>{"first", "second", "third"}),
              linesOf("first\nsecond\nthird\n"));
}

TEST(PlatformUtilities, ReadLineStripsCarriageReturnLineFeeds) {
    EXPECT_EQ((std::vector<std::string>{"first", "second"}), linesOf("first\r\nsecond\r\n"));
}

TEST(PlatformUtilities, ReadLineStripsFinalLoneCarriageReturn) {
    EXPECT_EQ((std::vector<std::string>{"first", "last"}), linesOf("first\nlast\r"));
}

TEST(PlatformUtilities, ReadLineReturnsEmptyLinesAsEmptyStrings) {
    EXPECT_EQ((std::vector<std::string>{"a", "", "", "b"}), linesOf("a\n\n\r\nb\n"));
}

TEST(PlatformUtilities, ReadLineReturnsLastLineWithoutTerminator) {
    EXPECT_EQ((std::vector<std::string>{"a", "last"}), linesOf("a\nlast"));
}

TEST(PlatformUtilities, ReadLineOfEmptyFileEndsAtOnce) { EXPECT_TRUE(linesOf("").empty()); }

TEST(PlatformUtilities, ReadLineReadsLongLines) {
    std::string const longLine(10000, 'x');
    std::vector<std::string> const read = linesOf(longLine + "\nshort\n" + longLine);
    ASSERT_EQ(3u, read.size());
    EXPECT_EQ(longLine, read[0]);
    EXPECT_EQ("short", read[1]);
    EXPECT_EQ(longLine, read[2]);
}

TEST(PlatformUtilities, ReadLineSetsLength) {
    smbiostest::TempDir scratch;
    std::string const file = scratch.file("length.txt");
    smbiostest::writeFile(file, "abc\r\n\n");
    _FileHandle* handle = nullptr;
    ASSERT_EQ(0, PlatformUtilities::openFile(file.c_str(), &handle, 0, 0));
    int length = -1;
    char* line = PlatformUtilities::readLine(handle, length);
    ASSERT_NE(nullptr, line);
    EXPECT_EQ(3, length);
    EXPECT_STREQ("abc", line);
    delete[] line;
    line = PlatformUtilities::readLine(handle, length);
    ASSERT_NE(nullptr, line);
    EXPECT_EQ(0, length);
    EXPECT_STREQ("", line);
    delete[] line;
    EXPECT_EQ(nullptr, PlatformUtilities::readLine(handle, length));
    EXPECT_EQ(0, PlatformUtilities::closeFile(&handle));
}

TEST(PlatformUtilities, ReadLineOfNullHandleIsNull) {
    int length = -1;
    EXPECT_EQ(nullptr, PlatformUtilities::readLine(nullptr, length));
}

TEST(PlatformUtilities, CloseNullHandleIsBadFile) {
    _FileHandle* file = nullptr;
    EXPECT_EQ(EBADF, PlatformUtilities::closeFile(&file));
    EXPECT_EQ(EBADF, PlatformUtilities::closeFile(nullptr));
}

TEST(PlatformUtilities, UuidIsUpperCaseGroupsInByteOrder) {
    char const bytes[16] = {0x00,
                            0x11,
                            0x22,
                            0x33,
                            0x44,
                            0x55,
                            0x66,
                            0x77,
                            static_cast<char>(0x88),
                            static_cast<char>(0x99),
                            static_cast<char>(0xAA),
                            static_cast<char>(0xBB),
                            static_cast<char>(0xCC),
                            static_cast<char>(0xDD),
                            static_cast<char>(0xEE),
                            static_cast<char>(0xFF)};
    EXPECT_EQ("00112233-4455-6677-8899-AABBCCDDEEFF", PlatformUtilities::uuid_unparse(bytes, 16));
}

TEST(PlatformUtilities, UuidNeedsSixteenBytes) {
    char const bytes[17] = {};
    EXPECT_EQ("", PlatformUtilities::uuid_unparse(bytes, 15));
    EXPECT_EQ("", PlatformUtilities::uuid_unparse(bytes, 17));
    EXPECT_EQ("", PlatformUtilities::uuid_unparse(nullptr, 16));
    EXPECT_EQ("00000000-0000-0000-0000-000000000000", PlatformUtilities::uuid_unparse(bytes, 16));
}
