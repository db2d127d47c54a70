// Running one build at several log settings and comparing what comes out.
//
// A builder's reads, and every exception they raise, must not depend on the
// log thresholds: the log macros compose nothing when no output takes the
// level. compareLevels runs a build (a callable that makes a fresh tree and
// returns its snapshot) three times:
//   - at the default levels: both thresholds off, no capture (nothing is
//     composed at all);
//   - at the agent's default thresholds (the log takes warnings and errors,
//     the trace is off), written to a private file: the failures a builder
//     catches are logged at error level, so this run shows every exception
//     that happened while the detail lines were skipped;
//   - with every level on, through the in-memory capture.
// The trees of the three runs must be equal, and so must the warnings and
// errors of the last two: a read hidden in a detail line either changes
// the tree or shows as an error that only one of the runs logged.
//
// Header-only and free of the test framework: the fuzz targets use it too.
#pragma once

#include <stdlib.h>
#include <unistd.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "QNLog/QNLogger.h"
#include "TreeSnapshot.h"
#include "smbios/Logging.h"

namespace buildertest {

// Sets the log and trace thresholds while it lives and puts back the ones
// it found, so that no test leaves its levels to the next.
class ScopedLogLevels {
public:
    ScopedLogLevels()
        : log_(QNLog::QNLogger::getLogLevel()), trace_(QNLog::QNLogger::getTraceLevel()) {}
    ScopedLogLevels(int logThreshold, int traceThreshold) : ScopedLogLevels() {
        set(logThreshold, traceThreshold);
    }
    ~ScopedLogLevels() { set(log_, trace_); }
    ScopedLogLevels(ScopedLogLevels const&) = delete;
    ScopedLogLevels& operator=(ScopedLogLevels const&) = delete;

    static void set(int logThreshold, int traceThreshold) {
        QNLog::QNLogger::setLogLevel(logThreshold);
        QNLog::QNLogger::setTraceLevel(traceThreshold);
    }

private:
    int log_;
    int trace_;
};

// The thresholds that take every level.
int const EVERY_LEVEL = 0;
// The agent's default log threshold: warnings and errors, no details.
int const AGENT_LOG_LEVEL = SD::LOG_WARNING;

// The in-memory capture while it lives (every level is enabled meanwhile).
class ScopedCapture {
public:
    ScopedCapture() { QNLog::QNLogger::startCapture(); }
    ~ScopedCapture() { QNLog::QNLogger::stopCapture(); }
    ScopedCapture(ScopedCapture const&) = delete;
    ScopedCapture& operator=(ScopedCapture const&) = delete;
};

// One message as the comparison sees it: its level, logger, function,
// source file, line and text (the time it was written left out).
inline std::string messageKey(std::string const& output, int level, std::string const& logger,
                              std::string const& function, std::string const& file, int line,
                              std::string const& text) {
    return output + " " + std::to_string(level) + " " + logger + " " + function + " " + file + ":" +
           std::to_string(line) + " " + text;
}

// The captured messages of the log output at or above minLevel, as keys.
inline std::vector<std::string> capturedMessages(int minLevel) {
    std::vector<std::string> keys;
    for (QNLog::QNLogRecord const& record : QNLog::QNLogger::captured()) {
        if (record.output == "log" && record.level >= minLevel) {
            keys.push_back(messageKey(record.output, record.level, record.logger, record.function,
                                      record.file, record.line, record.text));
        }
    }
    return keys;
}

// Sends the logger's output to a private file while it lives, then back to
// the file QNLOG_FILE names, or standard error. The file is made with
// mkstemp under $TMPDIR (or the system's temporary folder) and its name is
// removed as soon as the logger and the reader have it open, so that
// nothing is left behind, whatever way the process ends.
class LogToFile {
public:
    LogToFile() {
        char const* base = std::getenv("TMPDIR");
        std::string pattern = std::string(base != nullptr && *base != '\0' ? base : P_tmpdir) +
                              "/smbios-levels-XXXXXX";
        std::vector<char> name(pattern.begin(), pattern.end());
        name.push_back('\0');
        fd_ = ::mkstemp(name.data());
        if (fd_ < 0) {
            throw std::runtime_error("mkstemp failed for " + pattern);
        }
        path_ = name.data();
        bool const opened = QNLog::QNLogger::setLogFile(path_);
        if (opened) {
            in_.open(path_, std::ios::binary);
        }
        ::unlink(path_.c_str());
        if (!opened || !in_) {
            ::close(fd_);
            throw std::runtime_error("the logger cannot write to " + path_);
        }
    }
    ~LogToFile() {
        char const* previous = std::getenv("QNLOG_FILE");
        if (previous == nullptr || !QNLog::QNLogger::setLogFile(previous)) {
            QNLog::QNLogger::setLogFile("");
        }
        ::close(fd_);
    }
    LogToFile(LogToFile const&) = delete;
    LogToFile& operator=(LogToFile const&) = delete;

    // Skips what the file holds so far: the next takeMessages returns only
    // what is written from now on. A file grown past a few megabytes is
    // emptied instead (the logger appends, so it writes from the start
    // again); emptying it every time would cost a file-system operation per
    // comparison.
    void reset() {
        in_.clear();
        in_.seekg(0, std::ios::end);
        std::streamoff const end = in_.tellg();
        if (end > kMaxSize) {
            if (::ftruncate(fd_, 0) != 0) {
                throw std::runtime_error("cannot empty " + path_);
            }
            read_ = 0;
        } else {
            read_ = end < 0 ? 0 : static_cast<size_t>(end);
        }
    }

    // The messages of the given output written since the last call, at or
    // above minLevel, as keys. A line is "TIME OUTPUT LEVEL LOGGER FUNCTION
    // FILE:LINE TEXT"; a line that does not start that way continues the
    // text of the message before it.
    std::vector<std::string> takeMessages(int minLevel, std::string const& output = "log") {
        in_.clear();
        in_.seekg(static_cast<std::streamoff>(read_));
        std::string rest((std::istreambuf_iterator<char>(in_)), std::istreambuf_iterator<char>());
        read_ += rest.size();
        std::vector<std::pair<int, std::string>> messages;  // level, key
        std::istringstream lines(rest);
        std::string line;
        while (std::getline(lines, line)) {
            std::istringstream fields(line);
            std::string time;
            std::string lineOutput;
            int level = 0;
            std::string logger;
            std::string function;
            std::string place;
            fields >> time >> lineOutput >> level >> logger >> function >> place;
            size_t const colon = place.rfind(':');
            bool const header = fields && (lineOutput == "log" || lineOutput == "trace") &&
                                colon != std::string::npos && time.size() == 23 && time[10] == 'T';
            if (!header) {
                if (!messages.empty()) {
                    messages.back().second += "\n" + line;
                }
                continue;
            }
            std::string text;
            std::getline(fields, text);
            if (!text.empty() && text[0] == ' ') {
                text.erase(0, 1);
            }
            if (lineOutput != output) {
                messages.push_back(std::make_pair(-1, std::string()));
                continue;
            }
            messages.push_back(std::make_pair(
                level, messageKey(lineOutput, level, logger, function, place.substr(0, colon),
                                  std::atoi(place.c_str() + colon + 1), text)));
        }
        std::vector<std::string> keys;
        for (auto const& message : messages) {
            if (message.first >= minLevel) {
                keys.push_back(message.second);
            }
        }
        return keys;
    }

private:
    static constexpr std::streamoff kMaxSize = 4 << 20;

    int fd_ = -1;
    std::string path_;
    std::ifstream in_;
    size_t read_ = 0;
};

// What one build gave at each log setting.
struct LevelComparison {
    std::string atDefault;                   // thresholds off, no capture
    std::string atAgentDefault;              // warnings and errors logged
    std::vector<std::string> agentMessages;  // the warnings and errors it logged
    std::string everyLevelOn;                // capture on
    std::vector<std::string> everyMessages;  // the warnings and errors captured

    bool treesEqual() const { return atDefault == everyLevelOn && atAgentDefault == everyLevelOn; }
    bool messagesEqual() const { return agentMessages == everyMessages; }
    bool same() const { return treesEqual() && messagesEqual(); }

    // What differs, for a failure message ("" when nothing does).
    std::string difference() const {
        std::string out;
        if (atDefault != everyLevelOn) {
            out += "trees at the default levels and with every level on:\n" +
                   snapshotDifference(atDefault, everyLevelOn, "default levels", "every level on");
        }
        if (atAgentDefault != everyLevelOn) {
            out += "trees at the agent's thresholds and with every level on:\n" +
                   snapshotDifference(atAgentDefault, everyLevelOn, "agent thresholds",
                                      "every level on");
        }
        if (agentMessages != everyMessages) {
            out += "warnings and errors at the agent's thresholds and with every level on:\n" +
                   snapshotDifference(lines(agentMessages), lines(everyMessages),
                                      "agent thresholds", "every level on");
        }
        return out;
    }

private:
    static std::string lines(std::vector<std::string> const& messages) {
        std::string text;
        for (std::string const& message : messages) {
            text += message + "\n";
        }
        return text;
    }
};

// Runs build at the three settings described at the top and puts the
// thresholds back afterwards. The agent-level run writes to file, and only
// what it wrote is read back (one file serves any number of comparisons).
// Not for use
// while a capture is active: the capture enables every level, so the first
// two runs would not be what they say.
template <class Build>
LevelComparison compareLevels(Build&& build, LogToFile& file) {
    LevelComparison result;
    ScopedLogLevels const restore;
    ScopedLogLevels::set(QNLog::LEVEL_OFF, QNLog::LEVEL_OFF);
    result.atDefault = build();

    file.reset();
    ScopedLogLevels::set(AGENT_LOG_LEVEL, QNLog::LEVEL_OFF);
    result.atAgentDefault = build();
    result.agentMessages = file.takeMessages(SD::LOG_WARNING);

    ScopedLogLevels::set(QNLog::LEVEL_OFF, QNLog::LEVEL_OFF);
    {
        ScopedCapture const capture;
        result.everyLevelOn = build();
        result.everyMessages = capturedMessages(SD::LOG_WARNING);
    }
    return result;
}

}  // namespace buildertest
