// QNLog::QNLogger: thresholds, line format, file output, capture and the
// set-up from the environment.
#include <gtest/gtest.h>

#include <climits>
#include <map>
#include <regex>
#include <thread>
#include <vector>

#include "HostRunner.h"
#include "PlatformTestHelpers.h"
#include "QNLog/QNLogger.h"

extern char** environ;

using QNLog::LEVEL_OFF;
using QNLog::QNLogger;
using QNLog::QNLogRecord;
using QNLog::QNMessageBuffer;
using smbiostest::fileText;

namespace {

QNLogger testLogger("TestLogger");

void logAt(int level, std::string const& text, char const* file = "/some/folder/Source.cpp",
           int line = 42) {
    QNMessageBuffer message;
    message << text;
    QNLogger::logLevelMessage("writer", file, line, testLogger, level, message);
}

void traceAt(int level, std::string const& text) {
    QNMessageBuffer message;
    message << text;
    QNLogger::traceLevelMessage("tracer", "folder/Traced.cpp", 7, testLogger, level, message);
}

std::vector<std::string> lines(std::string const& text) {
    std::vector<std::string> result;
    size_t start = 0;
    while (start < text.size()) {
        size_t const end = text.find('\n', start);
        if (end == std::string::npos) {
            result.push_back(text.substr(start));
            break;
        }
        result.push_back(text.substr(start, end - start));
        start = end + 1;
    }
    return result;
}

bool contains(std::string const& text, std::string const& part) {
    return text.find(part) != std::string::npos;
}

// Every case starts with both outputs off, writing to a scratch file, and
// puts standard error and the thresholds back when it ends.
class QNLoggerTest : public testing::Test {
protected:
    void SetUp() override {
        QNLogger::setLogLevel(LEVEL_OFF);
        QNLogger::setTraceLevel(LEVEL_OFF);
        ASSERT_TRUE(QNLogger::setLogFile(logFile_));
    }
    void TearDown() override {
        QNLogger::stopCapture();
        QNLogger::clearCapture();
        QNLogger::setLogFile("");
        QNLogger::setLogLevel(LEVEL_OFF);
        QNLogger::setTraceLevel(LEVEL_OFF);
    }

    smbiostest::TempDir scratch_;
    std::string const logFile_ = scratch_.file("qnlog.log");
};

}  // namespace

TEST(QNLoggerParse, AcceptsDecimalNumbers) {
    int threshold = -1;
    EXPECT_TRUE(QNLogger::parseLevel("3000", threshold));
    EXPECT_EQ(3000, threshold);
    EXPECT_TRUE(QNLogger::parseLevel("0", threshold));
    EXPECT_EQ(0, threshold);
}

TEST(QNLoggerParse, NegativeNumberMeansZero) {
    int threshold = -1;
    EXPECT_TRUE(QNLogger::parseLevel("-5", threshold));
    EXPECT_EQ(0, threshold);
}

TEST(QNLoggerParse, OffInAnyCaseMeansLevelOff) {
    for (char const* text : {"off", "OFF", "Off"}) {
        int threshold = 0;
        EXPECT_TRUE(QNLogger::parseLevel(text, threshold)) << text;
        EXPECT_EQ(LEVEL_OFF, threshold) << text;
    }
}

TEST(QNLoggerParse, RejectsOtherTextAndKeepsThreshold) {
    for (char const* text : {"", "abc", "12x", "-", "o ff", "5 000"}) {
        int threshold = 1234;
        EXPECT_FALSE(QNLogger::parseLevel(text, threshold)) << text;
        EXPECT_EQ(1234, threshold) << text;
    }
}

TEST_F(QNLoggerTest, MessageBelowThresholdIsNotWritten) {
    QNLogger::setLogLevel(5000);
    EXPECT_EQ(5000, QNLogger::getLogLevel());
    logAt(4999, "below-threshold");
    logAt(5000, "at-threshold");
    logAt(6000, "above-threshold");
    std::string const text = fileText(logFile_);
    EXPECT_FALSE(contains(text, "below-threshold")) << text;
    EXPECT_TRUE(contains(text, "at-threshold")) << text;
    EXPECT_TRUE(contains(text, "above-threshold")) << text;
    EXPECT_EQ(2u, lines(text).size()) << text;
}

TEST_F(QNLoggerTest, LineNamesOutputLevelLoggerFunctionFileBaseNameAndText) {
    QNLogger::setLogLevel(5000);
    logAt(6000, "hello world", "/some/folder/Source.cpp", 42);
    std::vector<std::string> const written = lines(fileText(logFile_));
    ASSERT_EQ(1u, written.size());
    EXPECT_TRUE(std::regex_match(
        written[0], std::regex(R"(\d{4}-\d{2}-\d{2}T\d{2}:\d{2}:\d{2}\.\d{3} )"
                               R"(log 6000 TestLogger writer Source\.cpp:42 hello world)")))
        << written[0];
    EXPECT_FALSE(contains(written[0], "/some/folder")) << written[0];
}

TEST_F(QNLoggerTest, TraceHasItsOwnThreshold) {
    QNLogger::setTraceLevel(3000);
    EXPECT_EQ(3000, QNLogger::getTraceLevel());
    traceAt(3000, "trace-written");
    traceAt(2999, "trace-below");
    logAt(6000, "log-off");
    std::vector<std::string> const written = lines(fileText(logFile_));
    ASSERT_EQ(1u, written.size());
    EXPECT_TRUE(contains(written[0], " trace 3000 TestLogger tracer Traced.cpp:7 trace-written"))
        << written[0];
}

TEST_F(QNLoggerTest, OffThresholdTakesNoLevel) {
    QNLogger::setLogLevel(LEVEL_OFF);
    EXPECT_FALSE(QNLogger::isLogEnabled(INT_MAX));
    EXPECT_FALSE(QNLogger::isTraceEnabled(INT_MAX));
    logAt(INT_MAX, "never-written");
    EXPECT_EQ("", fileText(logFile_));
}

TEST_F(QNLoggerTest, LevelEnabledWhenEitherOutputOrCaptureTakesIt) {
    EXPECT_FALSE(QNLogger::isLevelEnabled(6000));
    QNLogger::setLogLevel(5000);
    EXPECT_TRUE(QNLogger::isLevelEnabled(5000));
    EXPECT_FALSE(QNLogger::isLevelEnabled(4999));
    QNLogger::setLogLevel(LEVEL_OFF);
    QNLogger::setTraceLevel(100);
    EXPECT_TRUE(QNLogger::isLevelEnabled(100));
    EXPECT_FALSE(QNLogger::isLevelEnabled(99));
    QNLogger::setTraceLevel(LEVEL_OFF);
    QNLogger::startCapture();
    EXPECT_TRUE(QNLogger::isLevelEnabled(0));
    QNLogger::stopCapture();
    EXPECT_FALSE(QNLogger::isLevelEnabled(0));
}

TEST_F(QNLoggerTest, CaptureRecordsBothOutputsWhateverThresholds) {
    QNLogger::startCapture();
    logAt(10, "captured message", "/a/b/Logged.cpp", 12);
    traceAt(20, "captured message");
    QNLogger::stopCapture();
    std::vector<QNLogRecord> const records = QNLogger::captured();
    ASSERT_EQ(2u, records.size());
    EXPECT_EQ("log", records[0].output);
    EXPECT_EQ(10, records[0].level);
    EXPECT_EQ("TestLogger", records[0].logger);
    EXPECT_EQ("writer", records[0].function);
    EXPECT_EQ("Logged.cpp", records[0].file);
    EXPECT_EQ(12, records[0].line);
    EXPECT_EQ("captured message", records[0].text);
    EXPECT_EQ("trace", records[1].output);
    EXPECT_EQ(20, records[1].level);
    EXPECT_EQ("tracer", records[1].function);
    EXPECT_TRUE(QNLogger::capturedContains("captured"));
    EXPECT_FALSE(QNLogger::capturedContains("absent"));
    EXPECT_EQ(1u, QNLogger::capturedCount("captured"));
    EXPECT_EQ(1u, QNLogger::capturedCount("captured", "trace"));
    EXPECT_EQ(0u, QNLogger::capturedCount("absent", "log"));
    EXPECT_EQ("", fileText(logFile_));  // both outputs are off
}

TEST_F(QNLoggerTest, CaptureAlsoWritesWhenOutputTakesLevel) {
    QNLogger::setLogLevel(5000);
    QNLogger::startCapture();
    logAt(6000, "both-ways");
    QNLogger::stopCapture();
    EXPECT_EQ(1u, QNLogger::capturedCount("both-ways"));
    EXPECT_TRUE(contains(fileText(logFile_), "both-ways"));
}

TEST_F(QNLoggerTest, StopCaptureKeepsRecordsAndTakesNoMore) {
    QNLogger::startCapture();
    logAt(1, "first");
    QNLogger::stopCapture();
    logAt(1, "second");
    EXPECT_TRUE(QNLogger::capturedContains("first"));
    EXPECT_FALSE(QNLogger::capturedContains("second"));
    EXPECT_EQ(1u, QNLogger::captured().size());
}

TEST_F(QNLoggerTest, StartCaptureClearsEarlierRecords) {
    QNLogger::startCapture();
    logAt(1, "old");
    QNLogger::startCapture();
    logAt(1, "new");
    EXPECT_FALSE(QNLogger::capturedContains("old"));
    EXPECT_TRUE(QNLogger::capturedContains("new"));
    QNLogger::clearCapture();
    EXPECT_TRUE(QNLogger::captured().empty());
}

TEST_F(QNLoggerTest, CapturedCountCountsEveryMatchingRecord) {
    QNLogger::startCapture();
    logAt(1, "repeat one");
    logAt(1, "repeat two");
    logAt(1, "other");
    traceAt(1, "repeat three");
    EXPECT_EQ(2u, QNLogger::capturedCount("repeat"));
    EXPECT_EQ(1u, QNLogger::capturedCount("repeat", "trace"));
}

TEST_F(QNLoggerTest, SetLogFileAppendsToExistingContent) {
    std::string const other = scratch_.file("append.log");
    smbiostest::writeFile(other, "earlier line\n");
    ASSERT_TRUE(QNLogger::setLogFile(other));
    QNLogger::setLogLevel(0);
    logAt(1, "appended line");
    std::vector<std::string> const written = lines(fileText(other));
    ASSERT_EQ(2u, written.size());
    EXPECT_EQ("earlier line", written[0]);
    EXPECT_TRUE(contains(written[1], "appended line"));
}

TEST_F(QNLoggerTest, SetLogFileFailureKeepsCurrentFile) {
    EXPECT_FALSE(QNLogger::setLogFile(scratch_.file("no-such-folder") + "/x.log"));
    QNLogger::setLogLevel(0);
    logAt(1, "still here");
    EXPECT_TRUE(contains(fileText(logFile_), "still here"));
}

TEST_F(QNLoggerTest, ConcurrentMessagesStayWholeLines) {
    QNLogger::setLogLevel(0);
    int const threads = 8;
    int const perThread = 200;
    std::vector<std::thread> workers;
    for (int t = 0; t < threads; ++t) {
        workers.emplace_back([t] {
            for (int i = 0; i < perThread; ++i) {
                logAt(1, "thread " + std::to_string(t) + " message " + std::to_string(i));
            }
        });
    }
    for (std::thread& worker : workers) {
        worker.join();
    }
    std::vector<std::string> const written = lines(fileText(logFile_));
    ASSERT_EQ(static_cast<size_t>(threads * perThread), written.size());
    std::regex const whole(R"(\S+ log 1 TestLogger writer Source\.cpp:42 thread \d+ message \d+)");
    for (std::string const& line : written) {
        ASSERT_TRUE(std::regex_match(line, whole)) << line;
    }
}

namespace {

// Runs the probe program beside this test program with the QNLOG_ variables
// replaced by the given ones.
hosttest::RunResult runProbe(std::map<std::string, std::string> const& settings) {
    hosttest::Environment environment;
    environment.set = settings;
    for (char** entry = environ; *entry != nullptr; ++entry) {
        std::string const variable = *entry;
        if (variable.compare(0, 6, "QNLOG_") == 0) {
            environment.unset.push_back(variable.substr(0, variable.find('=')));
        }
    }
    hosttest::RunResult const run =
        hosttest::runProgram(platform_test::besideTestProgram("qnlog_env_probe"), {}, environment);
    if (!run.startError.empty()) {
        ADD_FAILURE() << run.startError;
    }
    return run;
}

}  // namespace

TEST(QNLoggerEnvironment, DefaultsLogFrom5000ToStandardErrorAndTraceOff) {
    hosttest::RunResult const run = runProbe({});
    ASSERT_EQ(0, run.exitStatus);
    EXPECT_EQ("log=5000 trace=" + std::to_string(LEVEL_OFF) + "\n", run.out);
    EXPECT_TRUE(contains(run.err, " log 6000 EnvProbe writeMessages ")) << run.err;
    EXPECT_TRUE(contains(run.err, "probe-log-high")) << run.err;
    EXPECT_FALSE(contains(run.err, "probe-log-low")) << run.err;
    EXPECT_FALSE(contains(run.err, "probe-trace")) << run.err;
}

TEST(QNLoggerEnvironment, LevelsAndFileComeFromEnvironment) {
    smbiostest::TempDir scratch;
    std::string const logFile = scratch.file("env.log");
    hosttest::RunResult const run =
        runProbe({{"QNLOG_LEVEL", "50"}, {"QNLOG_TRACE_LEVEL", "5000"}, {"QNLOG_FILE", logFile}});
    ASSERT_EQ(0, run.exitStatus);
    EXPECT_EQ("log=50 trace=5000\n", run.out);
    EXPECT_EQ("", run.err);
    std::string const text = fileText(logFile);
    EXPECT_TRUE(contains(text, "probe-log-low")) << text;
    EXPECT_TRUE(contains(text, "probe-log-high")) << text;
    EXPECT_TRUE(contains(text, "probe-trace-high")) << text;
    EXPECT_FALSE(contains(text, "probe-trace-low")) << text;
    EXPECT_TRUE(contains(text, " trace 6000 EnvProbe writeMessages QNLogEnvProbe.cpp:")) << text;
    EXPECT_FALSE(contains(text, "/QNLogEnvProbe.cpp")) << text;  // base name only
}

TEST(QNLoggerEnvironment, OffTurnsOutputOff) {
    smbiostest::TempDir scratch;
    std::string const logFile = scratch.file("off.log");
    hosttest::RunResult const run =
        runProbe({{"QNLOG_LEVEL", "Off"}, {"QNLOG_TRACE_LEVEL", "off"}, {"QNLOG_FILE", logFile}});
    ASSERT_EQ(0, run.exitStatus);
    EXPECT_EQ("log=" + std::to_string(LEVEL_OFF) + " trace=" + std::to_string(LEVEL_OFF) + "\n",
              run.out);
    EXPECT_EQ("", fileText(logFile));
}

TEST(QNLoggerEnvironment, InvalidValuesKeepDefaults) {
    hosttest::RunResult const run =
        runProbe({{"QNLOG_LEVEL", "loud"}, {"QNLOG_TRACE_LEVEL", "12abc"}});
    ASSERT_EQ(0, run.exitStatus);
    EXPECT_EQ("log=5000 trace=" + std::to_string(LEVEL_OFF) + "\n", run.out);
}

TEST(QNLoggerEnvironment, NegativeLevelTakesEveryMessage) {
    hosttest::RunResult const run = runProbe({{"QNLOG_LEVEL", "-3"}});
    ASSERT_EQ(0, run.exitStatus);
    EXPECT_EQ("log=0 trace=" + std::to_string(LEVEL_OFF) + "\n", run.out);
    EXPECT_TRUE(contains(run.err, "probe-log-low")) << run.err;
}
