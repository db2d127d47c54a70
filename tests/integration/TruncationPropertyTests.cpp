// The host on every real machine's table cut short: for every corpus dump and
// every length of its table in steps of 7 bytes, smbios-inventory run on the
// override file of the entry point and the cut table exits 0 (an inventory,
// with a warning when structures are missing) or 2 (a refusal with a
// message), never crashes or trips a sanitizer, and never runs longer than
// 5 s. Built for the sanitizer run only: it starts a few thousand hosts.

#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "HostRunner.h"
#include "TestSupport.h"

namespace {

size_t const kStep = 7;
double const kTimeLimitSeconds = 5.0;

class TruncationProperty : public ::testing::TestWithParam<std::string> {};

TEST_P(TruncationProperty, EveryCutOfTheTableExitsZeroOrTwoWithinFiveSeconds) {
    std::string const name = GetParam();
    if (name.empty()) {
        GTEST_SKIP() << "no corpus of real dumps at SMBIOS_CORPUS_DIR ("
                     << (std::getenv("SMBIOS_CORPUS_DIR") ? std::getenv("SMBIOS_CORPUS_DIR") : "")
                     << ")";
    }
    smbiosdump::DumpImage image;
    std::string error;
    ASSERT_TRUE(smbiosdump::readDumpBin(
        smbiostest::fileBytes(smbiostest::corpusDir() + "/" + name + ".bin"), image, error))
        << error;

    smbiostest::TempDir folder;
    std::string const dump = folder.file("cut.txt");
    hosttest::Environment environment;
    environment.set["TMPDIR"] = folder.path();
    size_t runs = 0;
    size_t warned = 0;
    double slowest = 0;
    for (size_t length = 0; length <= image.table.size(); length += kStep) {
        std::vector<uint8_t> const cut(image.table.begin(),
                                       image.table.begin() + static_cast<std::ptrdiff_t>(length));
        smbiostest::writeFile(dump, smbiosdump::formatOverride(image.header, cut));
        auto const start = std::chrono::steady_clock::now();
        hosttest::RunResult const run =
            hosttest::runProgramWithin(hosttest::hostPath(), {"--dump", dump, "--format", "json"},
                                       environment, kTimeLimitSeconds);
        double const seconds =
            std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
        slowest = std::max(slowest, seconds);
        ++runs;
        std::string const where = name + " cut to " + std::to_string(length) + " of " +
                                  std::to_string(image.table.size()) + " bytes";
        ASSERT_FALSE(run.timedOut)
            << where << ": still running after " << kTimeLimitSeconds << " s";
        ASSERT_EQ(run.signal, 0) << where << "\n" << hosttest::describe(run);
        ASSERT_TRUE(run.exitStatus == 0 || run.exitStatus == 2) << where << "\n"
                                                                << hosttest::describe(run);
        ASSERT_EQ(run.err.find("Sanitizer"), std::string::npos) << where << "\n" << run.err;
        ASSERT_EQ(run.err.find("runtime error"), std::string::npos) << where << "\n" << run.err;
        if (run.exitStatus == 2) {
            ASSERT_NE(run.err, "") << where << ": refused without a message";
        } else {
            ASSERT_NE(run.out, "") << where << ": exit 0 without an inventory";
        }
        if (run.err.find("warning: ") != std::string::npos) {
            ++warned;
        }
    }
    // Most cuts fall inside the structures (a cut in padding after the
    // end-of-table structure misses none).
    EXPECT_GT(warned, runs / 2) << name;
    std::printf("%s: %zu runs, %zu with a warning, slowest %.2f s\n", name.c_str(), runs, warned,
                slowest);
}

std::vector<std::string> corpusOrNone() {
    std::vector<std::string> names = smbiostest::corpusNames();
    if (names.empty()) {
        names.push_back("");
    }
    return names;
}

INSTANTIATE_TEST_SUITE_P(Corpus, TruncationProperty, ::testing::ValuesIn(corpusOrNone()),
                         [](::testing::TestParamInfo<std::string> const& info) {
                             std::string id = info.param.empty() ? "none" : info.param;
                             for (char& c : id) {
                                 if (!std::isalnum(static_cast<unsigned char>(c))) {
                                     c = '_';
                                 }
                             }
                             return id;
                         });

}  // namespace
