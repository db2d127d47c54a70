#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <stdexcept>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "PluginRead.h"
#include "QNLog/QNLogger.h"
#include "QNLog/QNMessageBuffer.h"
#include "TestSupport.h"

namespace {

bool exists(std::string const& path) {
    struct stat st;
    return ::stat(path.c_str(), &st) == 0;
}

bool isDirectory(std::string const& path) {
    struct stat st;
    return ::stat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

char const* const VARIABLE = "SMBIOS_SUPPORT_TEST_VARIABLE";

}  // namespace

TEST(TempDir, CreatesPrivateFolderWithoutTrailingSlash) {
    smbiostest::TempDir dir;
    EXPECT_TRUE(isDirectory(dir.path()));
    ASSERT_FALSE(dir.path().empty());
    EXPECT_NE(dir.path().back(), '/');
    EXPECT_EQ(dir.file("x.txt"), dir.path() + "/x.txt");
    struct stat st;
    ASSERT_EQ(::stat(dir.path().c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0700u);
}

TEST(TempDir, RemovesEverythingInsideOnDestruction) {
    std::string path;
    {
        smbiostest::TempDir dir;
        path = dir.path();
        ASSERT_EQ(::mkdir((path + "/sub").c_str(), 0755), 0);
        smbiostest::writeFile(path + "/sub/file.bin", std::vector<uint8_t>{1, 2, 3});
        smbiostest::writeFile(path + "/top.txt", "text");
        ASSERT_TRUE(exists(path + "/sub/file.bin"));
    }
    EXPECT_FALSE(exists(path));
}

TEST(TempDir, TwoFoldersAreDistinct) {
    smbiostest::TempDir a;
    smbiostest::TempDir b;
    EXPECT_NE(a.path(), b.path());
}

TEST(Files, WrittenBytesReadBackExactly) {
    smbiostest::TempDir dir;
    std::vector<uint8_t> bytes;
    for (int i = 0; i < 256; ++i) {
        bytes.push_back(static_cast<uint8_t>(i));
    }
    smbiostest::writeFile(dir.file("all.bin"), bytes);
    EXPECT_EQ(smbiostest::fileBytes(dir.file("all.bin")), bytes);
    smbiostest::writeFile(dir.file("all.bin"), std::vector<uint8_t>{9});
    EXPECT_EQ(smbiostest::fileBytes(dir.file("all.bin")), std::vector<uint8_t>{9});
}

TEST(Files, WrittenTextReadsBackAsItsBytes) {
    smbiostest::TempDir dir;
    smbiostest::writeFile(dir.file("a.txt"), std::string("A\nB"));
    EXPECT_EQ(smbiostest::fileBytes(dir.file("a.txt")), (std::vector<uint8_t>{'A', '\n', 'B'}));
    EXPECT_EQ(smbiostest::fileText(dir.file("a.txt")), "A\nB");
    smbiostest::writeFile(dir.file("b.txt"), "");
    EXPECT_TRUE(smbiostest::fileBytes(dir.file("b.txt")).empty());
    EXPECT_EQ(smbiostest::fileText(dir.file("b.txt")), "");
}

TEST(Files, MissingFileOrFolderThrows) {
    smbiostest::TempDir dir;
    EXPECT_THROW(smbiostest::fileBytes(dir.file("absent")), std::runtime_error);
    EXPECT_THROW(smbiostest::fileText(dir.file("absent")), std::runtime_error);
    EXPECT_THROW(smbiostest::writeFile(dir.file("no/such/folder.txt"), "x"), std::runtime_error);
}

TEST(ScopedEnv, SetsThenRestoresPreviousValue) {
    ::setenv(VARIABLE, "before", 1);
    {
        smbiostest::ScopedEnv env(VARIABLE, "during");
        ASSERT_NE(std::getenv(VARIABLE), nullptr);
        EXPECT_STREQ(std::getenv(VARIABLE), "during");
    }
    ASSERT_NE(std::getenv(VARIABLE), nullptr);
    EXPECT_STREQ(std::getenv(VARIABLE), "before");
    ::unsetenv(VARIABLE);
}

TEST(ScopedEnv, UnsetsAgainWhenNotSetBefore) {
    ::unsetenv(VARIABLE);
    {
        smbiostest::ScopedEnv env(VARIABLE, std::string("during"));
        EXPECT_STREQ(std::getenv(VARIABLE), "during");
    }
    EXPECT_EQ(std::getenv(VARIABLE), nullptr);
}

TEST(ScopedEnv, NullValueUnsetsMeanwhile) {
    ::setenv(VARIABLE, "before", 1);
    {
        smbiostest::ScopedEnv env(VARIABLE, nullptr);
        EXPECT_EQ(std::getenv(VARIABLE), nullptr);
    }
    EXPECT_STREQ(std::getenv(VARIABLE), "before");
    ::unsetenv(VARIABLE);
}

TEST(CorpusHelpers, DirIsEmptyWhenUnsetOrMissing) {
    {
        smbiostest::ScopedEnv env("SMBIOS_CORPUS_DIR", nullptr);
        EXPECT_EQ(smbiostest::corpusDir(), "");
        EXPECT_TRUE(smbiostest::corpusNames().empty());
    }
    smbiostest::TempDir dir;
    smbiostest::ScopedEnv env("SMBIOS_CORPUS_DIR", dir.path() + "/absent");
    EXPECT_EQ(smbiostest::corpusDir(), "");
    EXPECT_TRUE(smbiostest::corpusNames().empty());
}

TEST(CorpusHelpers, NamesAreSortedBinBaseNames) {
    smbiostest::TempDir dir;
    for (char const* file :
         {"Zeta.bin", "alpha.bin", "Beta.bin", "Beta.orig.txt", "notes.md", ".bin", "x.bin.txt"}) {
        smbiostest::writeFile(dir.file(file), "");
    }
    smbiostest::ScopedEnv env("SMBIOS_CORPUS_DIR", dir.path() + "/");
    EXPECT_EQ(smbiostest::corpusDir(), dir.path());
    EXPECT_EQ(smbiostest::corpusNames(), (std::vector<std::string>{"Beta", "Zeta", "alpha"}));
}

TEST(WriteOverrideDir, WritesParsableSmbiosTxtInSmBiosOverride) {
    std::vector<uint8_t> const header = smbiosdump::makeSmEntryPoint(2, 7, 6, 0x20, 1, 6);
    std::vector<uint8_t> const table = {0x7F, 0x04, 0x00, 0x00, 0x00, 0x00};
    for (char const* suffix : {"", "/"}) {
        smbiostest::TempDir dir;
        smbiostest::writeOverrideDir(dir.path() + suffix, header, table);
        std::string const path = dir.path() + "/SmBiosOverride/smbios.txt";
        std::vector<uint8_t> const bytes = smbiostest::fileBytes(path);
        std::string const text(bytes.begin(), bytes.end());
        EXPECT_EQ(text, smbiosdump::formatOverride(header, table));
        smbiosdump::PluginRead const back = smbiosdump::readOverrideFile(path);
        ASSERT_TRUE(back.ok()) << back.imported << " " << back.head << " " << back.tables;
        EXPECT_EQ(back.header, header);
        EXPECT_EQ(back.table, table);
    }
}

TEST(LogCapture, CapturesWhileAliveAndStartsEmpty) {
    QNLog::QNLogger const logger("support-tests");
    auto log = [&logger](std::string const& text) {
        QNLog::QNMessageBuffer message;
        message << text;
        QNLog::QNLogger::logLevelMessage(__func__, __FILE__, __LINE__, logger, 5000, message);
    };
    {
        smbiostest::LogCapture capture;
        log("first capture message 7781");
        EXPECT_TRUE(capture.contains("capture message 7781")) << capture.dump();
        EXPECT_EQ(capture.count("first capture message 7781"), 1u) << capture.dump();
        EXPECT_FALSE(capture.contains("never logged 4411"));
        EXPECT_EQ(capture.count("never logged 4411"), 0u);
        EXPECT_NE(capture.dump().find("first capture message 7781"), std::string::npos);
    }
    log("outside any capture 9902");
    smbiostest::LogCapture capture;
    EXPECT_FALSE(capture.contains("first capture message 7781")) << capture.dump();
    EXPECT_FALSE(capture.contains("outside any capture 9902")) << capture.dump();
    log("second capture 5150");
    log("second capture 5150");
    EXPECT_EQ(capture.count("second capture 5150"), 2u) << capture.dump();
}
