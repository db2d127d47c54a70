// The writer of smbios-dump, called directly: the install location under
// the data directory, the all-or-nothing write and the account of what was
// written.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "DumpTestSupport.h"
#include "HostRunner.h"
#include "TestSupport.h"
#include "dump/DumpOutput.h"

using smbiosdump::WriteResult;
using smbiostest::ScopedEnv;
using smbiostest::TempDir;

namespace {

std::vector<std::string> names(std::initializer_list<char const*> list) {
    return std::vector<std::string>(list.begin(), list.end());
}

// The folder holds the dump file smbios.txt alone, with `text` in it.
void expectOnlyDumpFile(TempDir const& dir, std::string const& text) {
    EXPECT_EQ(dumptest::readText(dir.file("smbios.txt")), text);
    EXPECT_EQ(dumptest::folderEntries(dir.path()), names({"smbios.txt"}));
}

TEST(DumpDataDir, OptionThenEnvironmentThenDefault) {
    {
        ScopedEnv env("KESTREL_DATA_DIR", "/srv/agent-data/");
        EXPECT_EQ(smbiosdump::dataDirectory("/opt/data"), "/opt/data");
        EXPECT_EQ(smbiosdump::dataDirectory(""), "/srv/agent-data/");
    }
    {
        ScopedEnv env("KESTREL_DATA_DIR", "");
        EXPECT_EQ(smbiosdump::dataDirectory(""), "/var/lib/kestrel/");
    }
    {
        ScopedEnv env("KESTREL_DATA_DIR", nullptr);
        EXPECT_EQ(smbiosdump::dataDirectory(""), "/var/lib/kestrel/");
    }
}

TEST(DumpDataDir, OverridePathWithOrWithoutSeparator) {
    EXPECT_EQ(smbiosdump::overridePath("/srv/data"), "/srv/data/SmBiosOverride/smbios.txt");
    EXPECT_EQ(smbiosdump::overridePath("/srv/data/"), "/srv/data/SmBiosOverride/smbios.txt");
    EXPECT_EQ(smbiosdump::overrideFolder("data"), "data/SmBiosOverride");
}

TEST(DumpDataDir, MakesOverrideFolderOnlyInsideExistingDataDir) {
    TempDir dir;
    std::string error;
    ASSERT_TRUE(smbiosdump::makeOverrideFolder(dir.path(), error)) << error;
    struct stat info;
    ASSERT_EQ(stat(dir.file("SmBiosOverride").c_str(), &info), 0);
    EXPECT_TRUE(S_ISDIR(info.st_mode));
    // Again: it is there already.
    EXPECT_TRUE(smbiosdump::makeOverrideFolder(dir.path() + "/", error)) << error;

    EXPECT_FALSE(smbiosdump::makeOverrideFolder(dir.file("missing"), error));
    EXPECT_NE(error.find(dir.file("missing")), std::string::npos) << error;
    EXPECT_FALSE(dumptest::exists(dir.file("missing")));

    smbiostest::writeFile(dir.file("plain"), "x");
    EXPECT_FALSE(smbiosdump::makeOverrideFolder(dir.file("plain"), error));
    EXPECT_NE(error.find("not a folder"), std::string::npos) << error;
}

TEST(DumpOverrideFolder, FileInItsPlaceIsAnError) {
    TempDir dir;
    smbiostest::writeFile(dir.file("SmBiosOverride"), "x");
    std::string error;
    EXPECT_FALSE(smbiosdump::makeOverrideFolder(dir.path(), error));
    EXPECT_NE(error.find("cannot create " + dir.file("SmBiosOverride")), std::string::npos)
        << error;
}

TEST(DumpWrite, WritesNewFileAndNothingElse) {
    TempDir dir;
    std::string error;
    EXPECT_EQ(smbiosdump::writeFileAtomically(dir.file("smbios.txt"), "content\n", false, error),
              WriteResult::WRITTEN)
        << error;
    expectOnlyDumpFile(dir, "content\n");
}

TEST(DumpWrite, NewFileGetsModeOfUmask) {
    TempDir dir;
    mode_t const old = umask(022);
    std::string error;
    WriteResult const result =
        smbiosdump::writeFileAtomically(dir.file("smbios.txt"), "x", false, error);
    umask(old);
    ASSERT_EQ(result, WriteResult::WRITTEN) << error;
    struct stat info;
    ASSERT_EQ(stat(dir.file("smbios.txt").c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 0777, 0644u);
}

TEST(DumpWrite, LeavesExistingFileAloneWithoutReplace) {
    TempDir dir;
    smbiostest::writeFile(dir.file("smbios.txt"), "old");
    std::string error;
    EXPECT_EQ(smbiosdump::writeFileAtomically(dir.file("smbios.txt"), "new", false, error),
              WriteResult::EXISTS);
    expectOnlyDumpFile(dir, "old");
}

TEST(DumpWrite, ReplacesExistingFileWhenAsked) {
    TempDir dir;
    smbiostest::writeFile(dir.file("smbios.txt"), "old");
    std::string error;
    EXPECT_EQ(smbiosdump::writeFileAtomically(dir.file("smbios.txt"), "new", true, error),
              WriteResult::WRITTEN)
        << error;
    expectOnlyDumpFile(dir, "new");
}

TEST(DumpWrite, FolderInPlaceIsNeverReplaced) {
    TempDir dir;
    std::string const folder = dir.file("smbios.txt");
    ASSERT_EQ(mkdir(folder.c_str(), 0755), 0);
    for (bool replace : {false, true}) {
        std::string error;
        EXPECT_EQ(smbiosdump::writeFileAtomically(folder, "new", replace, error),
                  WriteResult::FAILED);
        EXPECT_EQ(error, folder + " is a directory, not a regular file; nothing written");
        EXPECT_EQ(dumptest::folderEntries(dir.path()), names({"smbios.txt"}));
        EXPECT_TRUE(dumptest::folderEntries(folder).empty());
    }
}

TEST(DumpWrite, FifoInPlaceIsNeverReplaced) {
    TempDir dir;
    std::string const fifo = dir.file("smbios.txt");
    ASSERT_TRUE(dumptest::makeFifo(fifo));
    for (bool replace : {false, true}) {
        std::string error;
        WriteResult result = WriteResult::WRITTEN;
        EXPECT_FALSE(dumptest::waitedOnFifo(fifo, [&] {
            result = smbiosdump::writeFileAtomically(fifo, "new", replace, error);
        })) << "the writer waited on the FIFO";
        EXPECT_EQ(result, WriteResult::FAILED);
        EXPECT_EQ(error, fifo + " is a FIFO, not a regular file; nothing written");
        struct stat info;
        ASSERT_EQ(lstat(fifo.c_str(), &info), 0);
        EXPECT_TRUE(S_ISFIFO(info.st_mode));
        EXPECT_EQ(dumptest::folderEntries(dir.path()), names({"smbios.txt"}));
    }
}

TEST(DumpWrite, ReplacesSymbolicLinkItselfWhenAsked) {
    TempDir dir;
    smbiostest::writeFile(dir.file("real.txt"), "old");
    ASSERT_EQ(symlink("real.txt", dir.file("smbios.txt").c_str()), 0);
    std::string error;
    EXPECT_EQ(smbiosdump::writeFileAtomically(dir.file("smbios.txt"), "new", false, error),
              WriteResult::EXISTS);
    EXPECT_EQ(smbiosdump::writeFileAtomically(dir.file("smbios.txt"), "new", true, error),
              WriteResult::WRITTEN)
        << error;
    struct stat info;
    ASSERT_EQ(lstat(dir.file("smbios.txt").c_str(), &info), 0);
    EXPECT_TRUE(S_ISREG(info.st_mode));
    EXPECT_EQ(dumptest::readText(dir.file("smbios.txt")), "new");
    EXPECT_EQ(dumptest::readText(dir.file("real.txt")), "old");
    EXPECT_EQ(dumptest::folderEntries(dir.path()), names({"real.txt", "smbios.txt"}));
}

TEST(DumpMayReplace, NothingRegularFileOrLinkOnly) {
    TempDir dir;
    std::string error;
    EXPECT_TRUE(smbiosdump::mayReplace(dir.file("missing"), error));
    EXPECT_TRUE(smbiosdump::mayReplace(dir.file("missing/smbios.txt"), error));
    smbiostest::writeFile(dir.file("plain"), "x");
    EXPECT_TRUE(smbiosdump::mayReplace(dir.file("plain"), error));
    // A link is replaced itself, whatever it names.
    ASSERT_EQ(symlink(dir.path().c_str(), dir.file("link").c_str()), 0);
    EXPECT_TRUE(smbiosdump::mayReplace(dir.file("link"), error));
    EXPECT_TRUE(error.empty()) << error;
    EXPECT_FALSE(smbiosdump::mayReplace(dir.path(), error));
    EXPECT_EQ(error, dir.path() + " is a directory, not a regular file; nothing written");
}

TEST(DumpWrite, MissingFolderIsAnError) {
    TempDir dir;
    std::string error;
    EXPECT_EQ(smbiosdump::writeFileAtomically(dir.file("missing/smbios.txt"), "x", false, error),
              WriteResult::FAILED);
    EXPECT_NE(error.find(dir.file("missing")), std::string::npos) << error;
    EXPECT_TRUE(dumptest::folderEntries(dir.path()).empty());
}

// The write runs in a child as an unprivileged user (nobody when this
// process is root, since root may write anywhere), which answers with one
// of these.
enum UnwritableOutcome { kFailedAndSaidWhere = 0, kDidNotFail = 1, kSaidSomethingElse = 2 };

TEST(DumpWrite, UnwritableFolderLeavesNothing) {
    TempDir dir;
    ASSERT_EQ(chmod(dir.path().c_str(), 0755), 0);
    std::string const folder = dir.file("locked");
    ASSERT_EQ(mkdir(folder.c_str(), 0555), 0);
    int const outcome = smbiostest::runAsUnprivilegedUser([&folder] {
        std::string error;
        if (smbiosdump::writeFileAtomically(folder + "/smbios.txt", "x", false, error) !=
            WriteResult::FAILED) {
            return kDidNotFail;
        }
        return error.find("cannot create a temporary file in " + folder) != std::string::npos
                   ? kFailedAndSaidWhere
                   : kSaidSomethingElse;
    });
    chmod(folder.c_str(), 0755);
    if (outcome == smbiostest::kNoUnprivilegedUser) {
        GTEST_SKIP() << "running as root, this process cannot become nobody here";
    }
    EXPECT_EQ(outcome, kFailedAndSaidWhere)
        << "1: the write did not fail; 2: its message does not name the folder";
    EXPECT_TRUE(dumptest::folderEntries(folder).empty());
}

TEST(DumpWrite, PathEndingInSeparatorIsRefused) {
    TempDir dir;
    std::string error;
    EXPECT_EQ(smbiosdump::writeFileAtomically(dir.path() + "/", "x", true, error),
              WriteResult::FAILED);
    EXPECT_NE(error.find("names a folder"), std::string::npos) << error;
    EXPECT_TRUE(dumptest::folderEntries(dir.path()).empty());
}

TEST(DumpSummary, StatesVersionStructuresAndBytes) {
    smbiosdump::Capture capture;
    capture.table = dumptest::sampleTable();
    capture.major = 2;
    capture.minor = 7;
    EXPECT_EQ(smbiosdump::describeCapture(capture),
              "SMBIOS 2.7, 3 structures, " + std::to_string(capture.table.size()) + " bytes");
}

}  // namespace
