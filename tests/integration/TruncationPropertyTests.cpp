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
#include <exception>
#include <ostream>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "HostRunner.h"
#include "TestSupport.h"

namespace {

size_t const kStep = 7;
double const kTimeLimitSeconds = 5.0;

// Each test takes a slice of one dump's cut lengths, so that CTest spreads a
// large table over the cores.
size_t const kRunsPerShard = 300;

struct Shard {
    std::string name;  // "" when there is no corpus
    size_t firstRun = 0;
    size_t runs = 0;
};

// How a failing test names its shard.
void PrintTo(Shard const& shard, std::ostream* out) {
    *out << (shard.name.empty() ? "no corpus" : shard.name) << ", cuts from byte "
         << shard.firstRun * kStep;
}

class TruncationProperty : public ::testing::TestWithParam<Shard> {};

TEST_P(TruncationProperty, EveryCutOfTheTableExitsZeroOrTwoWithinFiveSeconds) {
    Shard const shard = GetParam();
    std::string const& name = shard.name;
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
    // Leaks are the sanitizer suite's business; here a run must only end
    // well, and the leak check at every exit would cost a quarter of the time.
    char const* asanOptions = std::getenv("ASAN_OPTIONS");
    environment.set["ASAN_OPTIONS"] =
        std::string(asanOptions != nullptr ? asanOptions : "") + ":detect_leaks=0";
    size_t runs = 0;
    size_t warned = 0;
    double slowest = 0;
    size_t const end = std::min(shard.firstRun + shard.runs, image.table.size() / kStep + 1);
    for (size_t runIndex = shard.firstRun; runIndex < end; ++runIndex) {
        size_t const length = runIndex * kStep;
        std::vector<uint8_t> const cut(image.table.begin(),
                                       image.table.begin() + static_cast<std::ptrdiff_t>(length));
        smbiostest::writeFile(dump, smbiosdump::formatOverride(image.header, cut));
        auto const start = std::chrono::steady_clock::now();
        hosttest::RunResult const run = hosttest::runProgramWithin(
            hosttest::hostPath(), {"--dump", dump}, environment, kTimeLimitSeconds);
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
    std::printf("%s from byte %zu: %zu runs, %zu with a warning, slowest %.2f s\n", name.c_str(),
                shard.firstRun * kStep, runs, warned, slowest);
}

std::vector<Shard> shards() {
    std::vector<Shard> all;
    for (std::string const& name : smbiostest::corpusNames()) {
        smbiosdump::DumpImage image;
        std::string error;
        size_t runs = 1;
        try {
            if (smbiosdump::readDumpBin(
                    smbiostest::fileBytes(smbiostest::corpusDir() + "/" + name + ".bin"), image,
                    error)) {
                runs = image.table.size() / kStep + 1;
            }
        } catch (std::exception const&) {
            // The test of the first shard says what is wrong with the file.
        }
        for (size_t first = 0; first < runs; first += kRunsPerShard) {
            all.push_back(Shard{name, first, kRunsPerShard});
        }
    }
    if (all.empty()) {
        all.push_back(Shard{"", 0, 0});
    }
    return all;
}

INSTANTIATE_TEST_SUITE_P(Corpus, TruncationProperty, ::testing::ValuesIn(shards()),
                         [](::testing::TestParamInfo<Shard> const& info) {
                             std::string id = info.param.name.empty() ? "none" : info.param.name;
                             for (char& c : id) {
                                 if (!std::isalnum(static_cast<unsigned char>(c))) {
                                     c = '_';
                                 }
                             }
                             return id + "_from" + std::to_string(info.param.firstRun * kStep);
                         });

}  // namespace
