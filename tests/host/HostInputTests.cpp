// smbios-inventory and the files it is given: a dump file the plug-in would
// not take as its table is refused before the plug-in runs (so the host
// never answers about the machine it runs on instead), a table that is not
// whole is printed with a warning, a file that is not a regular file is
// refused without waiting on it, and an end signal removes the private data
// directory.

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <filesystem>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "DumpFormat.h"
#include "HostRunner.h"
#include "TableBuilder.h"
#include "TestSupport.h"

namespace {

using hosttest::Environment;
using hosttest::RunResult;
using smbiostest::Structure;
using smbiostest::TableBuilder;

std::string fakePlugin() { return hosttest::outDir() + "/" + HOST_FAKE_PLUGIN_FROM_OUT; }

// A small whole table: BIOS, system and the end-of-table structure.
TableBuilder smallTable() {
    TableBuilder table;
    table.add(Structure(0, 0x0000).str("Vendor").str("1.0").word(0xF000).str("01/01/2020").byte(0));
    table.add(Structure(1, 0x0001).str("Maker").str("Product").str("1").str("SN"));
    table.endOfTable(0x0002);
    return table;
}

// The override text of a table whose "_SM_" entry point announces `count`
// structures.
std::string overrideText(std::vector<uint8_t> const& table, uint16_t count) {
    std::vector<uint8_t> const header =
        smbiosdump::makeSmEntryPoint(2, 7, static_cast<uint16_t>(table.size()), 0x20, count, 0x40);
    return smbiosdump::formatOverride(header, table);
}

// Unblocks a reader of a FIFO that the program under test should never have
// opened: after the guard's time a writer opens and closes it, so a hung
// reader sees the end of the file and the test fails instead of hanging.
class FifoGuard {
public:
    explicit FifoGuard(std::string path) : path_(std::move(path)) {
        thread_ = std::thread([this] {
            std::unique_lock<std::mutex> lock(mutex_);
            if (!done_changed_.wait_for(lock, std::chrono::seconds(10), [this] { return done_; })) {
                fired_ = true;
                int const fd = ::open(path_.c_str(), O_WRONLY | O_NONBLOCK);
                if (fd >= 0) {
                    ::close(fd);
                }
            }
        });
    }
    ~FifoGuard() { stop(); }

    // Ends the guard; true when it had to unblock a reader.
    bool stop() {
        {
            std::lock_guard<std::mutex> lock(mutex_);
            done_ = true;
        }
        done_changed_.notify_all();
        if (thread_.joinable()) {
            thread_.join();
        }
        return fired_;
    }

private:
    std::string path_;
    std::mutex mutex_;
    std::condition_variable done_changed_;
    bool done_ = false;
    std::atomic<bool> fired_{false};
    std::thread thread_;
};

class HostInputTest : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_FALSE(hosttest::outDir().empty())
            << "SMBIOS_OUT_DIR is not set; run the tests through ctest";
        ASSERT_TRUE(std::filesystem::exists(fakePlugin()))
            << "the fake plug-in is not built: " << fakePlugin();
        environment_.set["TMPDIR"] = temporary_.path();
    }

    RunResult runOn(std::vector<std::string> const& args) {
        std::vector<std::string> line = {"--plugin", fakePlugin()};
        line.insert(line.end(), args.begin(), args.end());
        return hosttest::runHost(line, environment_);
    }

    // Expects the run refused with status 2: one line on standard error
    // holding `message`, no inventory, no temporary folder left.
    void expectRefused(RunResult const& run, std::string const& message) {
        EXPECT_EQ(run.exitStatus, 2) << hosttest::describe(run);
        EXPECT_NE(run.err.find(message), std::string::npos) << "expected '" << message << "' in\n"
                                                            << hosttest::describe(run);
        EXPECT_EQ(run.out, "") << hosttest::describe(run);
        EXPECT_TRUE(smbiostest::folderEntries(temporary_.path()).empty());
    }

    std::string writeInput(std::string const& name, std::string const& text) {
        std::string const path = input_.file(name);
        smbiostest::writeFile(path, text);
        return path;
    }

    smbiostest::TempDir input_;
    smbiostest::TempDir temporary_;
    Environment environment_;
};

// ---- files the plug-in would not take as its table --------------------------

TEST_F(HostInputTest, DumpWithoutTheHeaderEndIsRefusedWithTheLineWhereTheFileEnds) {
    std::string const dump = writeInput("noend.txt", "<SHOWSMBIOS>\n<EPHEADER>\n5F534D5F\n");
    expectRefused(runOn({"--dump", dump}), "--dump: " + dump + ": line 3: no </EPHEADER>");
}

TEST_F(HostInputTest, DumpWithNothingAfterTheHeaderIsRefusedWithTheHeaderEndsLine) {
    std::string const dump =
        writeInput("headonly.txt", "<SHOWSMBIOS>\n<EPHEADER>\n5F534D5F\n</EPHEADER>\n\n  \n");
    expectRefused(runOn({"--dump", dump}), "line 4: nothing after </EPHEADER>");
}

TEST_F(HostInputTest, EmptyDumpIsRefused) {
    std::string const dump = writeInput("empty.txt", "");
    expectRefused(runOn({"--dump", dump}), "the file is empty: no </EPHEADER>");
}

TEST_F(HostInputTest, DumpOfBlankLinesIsRefusedWithItsLastLine) {
    std::string const dump = writeInput("blank.txt", "\n   \n\n");
    expectRefused(runOn({"--dump", dump}), "line 3: no </EPHEADER>");
}

TEST_F(HostInputTest, DumpWhoseTableHasAnOddNumberOfHexDigitsIsRefusedWithTheCount) {
    std::vector<uint8_t> const table = smallTable().build();
    std::string text = overrideText(table, smallTable().count());
    // Drop the table's last digit: the run of 2 * size digits becomes odd.
    size_t const end = text.find("\n</SHOWSMBIOS>");
    ASSERT_NE(end, std::string::npos);
    text.erase(end - 1, 1);
    std::string const dump = writeInput("odd.txt", text);
    expectRefused(runOn({"--dump", dump}), "table text has an odd number of hex digits (" +
                                               std::to_string(2 * table.size() - 1) + ")");
}

TEST_F(HostInputTest, OddDigitsInTheSizeBlockAreNotTheTables) {
    std::vector<uint8_t> const table = smallTable().build();
    std::string text = overrideText(table, smallTable().count());
    text.replace(text.find("</EPHEADER>\n") + 12, 0, "<SIZE>\n123\n</SIZE>\n");
    std::string const dump = writeInput("size.txt", text);
    RunResult const run = runOn({"--dump", dump});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(run.err.find("odd number"), std::string::npos) << hosttest::describe(run);
}

// ---- tables that are not whole ------------------------------------------------

TEST_F(HostInputTest, DumpWithFewerStructuresThanAnnouncedWarnsAndPrintsTheInventory) {
    TableBuilder const table = smallTable();
    std::string const dump =
        writeInput("short.txt", overrideText(table.build(), static_cast<uint16_t>(81)));
    RunResult const run = runOn({"--dump", dump});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_NE(run.err.find("smbios-inventory: warning: the entry point announces 81 structures; "
                           "the table holds 3\n"),
              std::string::npos)
        << hosttest::describe(run);
    EXPECT_NE(run.out, "");
}

TEST_F(HostInputTest, DumpEndingInsideAStructureWarns) {
    std::vector<uint8_t> table = smallTable().build();
    table.resize(table.size() - 3);  // into the end-of-table structure
    std::string const dump = writeInput("cut.txt", overrideText(table, 3));
    RunResult const run = runOn({"--dump", dump});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_NE(run.err.find("warning: the entry point announces 3 structures; the table holds 2 "
                           "and ends inside the next one"),
              std::string::npos)
        << hosttest::describe(run);
}

TEST_F(HostInputTest, CutTableWithoutACountShortfallStillWarns) {
    std::vector<uint8_t> table = smallTable().build();
    table.resize(table.size() - 3);
    std::string const dump = writeInput("cut2.txt", overrideText(table, 2));
    RunResult const run = runOn({"--dump", dump});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_NE(run.err.find("warning: the table ends inside a structure, after 2 whole ones"),
              std::string::npos)
        << hosttest::describe(run);
}

TEST_F(HostInputTest, WholeTableGivesNoWarning) {
    std::string const dump =
        writeInput("whole.txt", overrideText(smallTable().build(), smallTable().count()));
    RunResult const run = runOn({"--dump", dump});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(run.err.find("warning"), std::string::npos) << hosttest::describe(run);
}

TEST_F(HostInputTest, FromBinWithFewerStructuresThanAnnouncedWarns) {
    std::vector<uint8_t> const table = smallTable().build();
    std::vector<uint8_t> image = smbiosdump::makeSmEntryPoint(
        2, 7, static_cast<uint16_t>(table.size()), smbiosdump::DUMP_BIN_TABLE_OFFSET, 9, 0x40);
    image.resize(smbiosdump::DUMP_BIN_TABLE_OFFSET, 0);
    image.insert(image.end(), table.begin(), table.end());
    std::string const bin = input_.file("short.bin");
    smbiostest::writeFile(bin, image);
    RunResult const run = runOn({"--from-bin", bin});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_NE(run.err.find("warning: the entry point announces 9 structures; the table holds 3"),
              std::string::npos)
        << hosttest::describe(run);
}

// ---- files that are not regular files ------------------------------------------

// An input option and what the refusal of a FIFO there says after its path.
struct FifoCase {
    char const* option;
    char const* why;
};

class HostFifoTest : public HostInputTest, public ::testing::WithParamInterface<FifoCase> {};

TEST_P(HostFifoTest, FifoIsRefusedWithoutWaiting) {
    std::string const fifo = input_.file("fifo");
    ASSERT_EQ(::mkfifo(fifo.c_str(), 0600), 0);
    FifoGuard guard(fifo);
    RunResult const run = runOn({GetParam().option, fifo});
    EXPECT_FALSE(guard.stop()) << "the host waited on the FIFO";
    expectRefused(run, std::string(GetParam().option) + ": " + fifo + ": " + GetParam().why);
}

INSTANTIATE_TEST_SUITE_P(
    Options, HostFifoTest,
    ::testing::Values(FifoCase{"--dump", "cannot open: a FIFO, not a regular file"},
                      FifoCase{"--from-bin", "cannot open: a FIFO, not a regular file"},
                      FifoCase{"--log", "a FIFO, not a regular file"}),
    [](::testing::TestParamInfo<FifoCase> const& info) {
        std::string name = info.param.option + 2;
        name.erase(std::remove(name.begin(), name.end(), '-'), name.end());
        return name;
    });

TEST_F(HostInputTest, LogFileThatIsAFolderIsRefused) {
    expectRefused(runOn({"--log", input_.path()}),
                  "--log: " + input_.path() + ": a directory, not a regular file");
}

TEST_F(HostInputTest, LogToACharacterDeviceIsTaken) {
    RunResult const run = runOn({"--log", "/dev/null"});
    EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
}

TEST_F(HostInputTest, DumpLargerThanSixteenMebibytesIsRefused) {
    std::string const big = input_.file("big.txt");
    smbiostest::writeFile(big, "");
    ASSERT_EQ(::truncate(big.c_str(), 16 * 1024 * 1024 + 1), 0);
    expectRefused(runOn({"--dump", big}), "larger than 16 MiB");
}

// ---- end signals ----------------------------------------------------------------

class HostSignalTest : public HostInputTest, public ::testing::WithParamInterface<int> {};

// The run is held in the fake plug-in's initialize; the signal must remove
// the private data directory and end the host as that signal does.
TEST_P(HostSignalTest, RemovesTheTemporaryDataDirAndEndsWithTheSignal) {
    int const signalNumber = GetParam();
    std::string const dump =
        writeInput("whole.txt", overrideText(smallTable().build(), smallTable().count()));
    environment_.set["FAKE_MI_SLEEP"] = "1";
    std::string const temporary = temporary_.path();
    auto const overrideWritten = [&temporary] {
        for (std::string const& name : smbiostest::folderEntries(temporary)) {
            std::string const copy = temporary + "/" + name + "/SmBiosOverride/smbios.txt";
            struct stat status;
            if (::stat(copy.c_str(), &status) == 0 && status.st_size > 0) {
                return true;
            }
        }
        return false;
    };
    RunResult const run = hosttest::runProgramAndSignal(
        hosttest::hostPath(), {"--plugin", fakePlugin(), "--dump", dump}, environment_,
        signalNumber, overrideWritten);
    EXPECT_EQ(run.startError, "") << hosttest::describe(run);
    EXPECT_EQ(run.signal, signalNumber) << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
    EXPECT_TRUE(smbiostest::folderEntries(temporary).empty())
        << "left behind: "
        << (smbiostest::folderEntries(temporary).empty() ? ""
                                                         : smbiostest::folderEntries(temporary)[0]);
}

INSTANTIATE_TEST_SUITE_P(EndSignals, HostSignalTest, ::testing::Values(SIGINT, SIGTERM, SIGHUP),
                         [](::testing::TestParamInfo<int> const& info) {
                             return std::string(info.param == SIGINT    ? "SIGINT"
                                                : info.param == SIGTERM ? "SIGTERM"
                                                                        : "SIGHUP");
                         });

}  // namespace
