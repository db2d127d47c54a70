// QNLog::QNLogger: the agent's two-output logger and its in-memory capture.
#include "QNLog/QNLogger.h"

#include <atomic>
#include <cctype>
#include <chrono>
#include <climits>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <mutex>

namespace QNLog {

namespace {

int const kDefaultLogLevel = 5000;

// Everything the logger keeps. The thresholds and the capture flag are
// atomics so that isLevelEnabled never takes the lock; the output stream and
// the captured records are guarded by the mutex.
struct LoggerState {
    std::atomic<int> logThreshold{kDefaultLogLevel};
    std::atomic<int> traceThreshold{LEVEL_OFF};
    std::atomic<bool> capturing{false};
    std::mutex mutex;
    std::FILE* stream = nullptr;  // null: standard error
    std::vector<QNLogRecord> records;
};

LoggerState* readEnvironment(LoggerState* state) {
    int threshold = 0;
    char const* value = std::getenv("QNLOG_LEVEL");
    if (value != nullptr && QNLogger::parseLevel(value, threshold)) {
        state->logThreshold = threshold;
    }
    value = std::getenv("QNLOG_TRACE_LEVEL");
    if (value != nullptr && QNLogger::parseLevel(value, threshold)) {
        state->traceThreshold = threshold;
    }
    value = std::getenv("QNLOG_FILE");
    if (value != nullptr && value[0] != '\0') {
        state->stream = std::fopen(value, "a");
    }
    return state;
}

// The one state of the process, made on first use so that loggers defined
// at namespace scope in any library may log during static initialisation. It
// is never destroyed: messages written while the process exits still find it.
LoggerState& state() {
    static LoggerState* const instance = readEnvironment(new LoggerState);
    return *instance;
}

char const* orEmpty(char const* text) { return text != nullptr ? text : ""; }

std::string baseName(char const* path) {
    std::string const text = orEmpty(path);
    size_t const slash = text.find_last_of('/');
    return slash == std::string::npos ? text : text.substr(slash + 1);
}

// The current UTC time as YYYY-MM-DDThh:mm:ss.mmm.
std::string timestamp() {
    auto const now = std::chrono::system_clock::now();
    auto const sinceEpoch =
        std::chrono::duration_cast<std::chrono::milliseconds>(now.time_since_epoch()).count();
    std::int64_t const millis = static_cast<std::int64_t>(sinceEpoch);
    std::time_t const seconds = static_cast<std::time_t>(millis / 1000);
    std::tm parts{};
    gmtime_r(&seconds, &parts);
    char text[48];
    std::snprintf(text, sizeof text, "%04d-%02d-%02dT%02d:%02d:%02d.%03d", parts.tm_year + 1900,
                  parts.tm_mon + 1, parts.tm_mday, parts.tm_hour, parts.tm_min, parts.tm_sec,
                  static_cast<int>(millis % 1000));
    return text;
}

bool reaches(int level, int threshold) { return threshold != LEVEL_OFF && level >= threshold; }

void writeMessage(char const* output, bool enabled, char const* function, char const* file,
                  int line, QNLogger const& logger, int level, QNMessageBuffer const& message) {
    LoggerState& s = state();
    bool const capturing = s.capturing.load();
    if (!enabled && !capturing) {
        return;
    }
    QNLogRecord record;
    record.output = output;
    record.level = level;
    record.logger = logger.getName();
    record.function = orEmpty(function);
    record.file = baseName(file);
    record.line = line;
    record.text = message.text();

    std::string text;
    if (enabled) {
        text = timestamp() + " " + record.output + " " + std::to_string(level) + " " +
               record.logger + " " + record.function + " " + record.file + ":" +
               std::to_string(line) + " " + record.text + "\n";
    }
    std::lock_guard<std::mutex> guard(s.mutex);
    if (enabled) {
        std::FILE* stream = s.stream != nullptr ? s.stream : stderr;
        std::fwrite(text.data(), 1, text.size(), stream);
        std::fflush(stream);
    }
    // Checked again under the lock: a capture stopped meanwhile takes nothing.
    if (s.capturing.load()) {
        s.records.push_back(std::move(record));
    }
}

}  // namespace

void QNLogger::logLevelMessage(char const* function, char const* file, int line,
                               QNLogger const& logger, int level, QNMessageBuffer const& message) {
    writeMessage("log", isLogEnabled(level), function, file, line, logger, level, message);
}

void QNLogger::traceLevelMessage(char const* function, char const* file, int line,
                                 QNLogger const& logger, int level,
                                 QNMessageBuffer const& message) {
    writeMessage("trace", isTraceEnabled(level), function, file, line, logger, level, message);
}

bool QNLogger::isLevelEnabled(int level) {
    return state().capturing.load() || isLogEnabled(level) || isTraceEnabled(level);
}

bool QNLogger::isLogEnabled(int level) { return reaches(level, state().logThreshold.load()); }

bool QNLogger::isTraceEnabled(int level) { return reaches(level, state().traceThreshold.load()); }

void QNLogger::setLogLevel(int threshold) { state().logThreshold = threshold; }

void QNLogger::setTraceLevel(int threshold) { state().traceThreshold = threshold; }

int QNLogger::getLogLevel() { return state().logThreshold.load(); }

int QNLogger::getTraceLevel() { return state().traceThreshold.load(); }

bool QNLogger::setLogFile(std::string const& path) {
    LoggerState& s = state();
    std::FILE* stream = nullptr;
    if (!path.empty()) {
        stream = std::fopen(path.c_str(), "a");
        if (stream == nullptr) {
            return false;
        }
    }
    std::lock_guard<std::mutex> guard(s.mutex);
    if (s.stream != nullptr) {
        std::fclose(s.stream);
    }
    s.stream = stream;
    return true;
}

bool QNLogger::parseLevel(std::string const& text, int& threshold) {
    std::string lower;
    for (char c : text) {
        lower += static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    }
    if (lower == "off") {
        threshold = LEVEL_OFF;
        return true;
    }
    size_t position = 0;
    bool negative = false;
    if (position < text.size() && (text[position] == '-' || text[position] == '+')) {
        negative = text[position] == '-';
        ++position;
    }
    if (position == text.size()) {
        return false;
    }
    std::int64_t value = 0;
    for (; position < text.size(); ++position) {
        unsigned char const c = static_cast<unsigned char>(text[position]);
        if (!std::isdigit(c)) {
            return false;
        }
        if (value < INT_MAX) {  // beyond that the value only saturates
            value = value * 10 + (c - '0');
        }
    }
    if (negative) {
        threshold = 0;
    } else {
        threshold = value > INT_MAX ? INT_MAX : static_cast<int>(value);
    }
    return true;
}

void QNLogger::startCapture() {
    LoggerState& s = state();
    std::lock_guard<std::mutex> guard(s.mutex);
    s.records.clear();
    s.capturing = true;
}

void QNLogger::stopCapture() {
    LoggerState& s = state();
    std::lock_guard<std::mutex> guard(s.mutex);
    s.capturing = false;
}

std::vector<QNLogRecord> QNLogger::captured() {
    LoggerState& s = state();
    std::lock_guard<std::mutex> guard(s.mutex);
    return s.records;
}

void QNLogger::clearCapture() {
    LoggerState& s = state();
    std::lock_guard<std::mutex> guard(s.mutex);
    s.records.clear();
}

bool QNLogger::capturedContains(std::string const& text) {
    LoggerState& s = state();
    std::lock_guard<std::mutex> guard(s.mutex);
    for (QNLogRecord const& record : s.records) {
        if (record.text.find(text) != std::string::npos) {
            return true;
        }
    }
    return false;
}

size_t QNLogger::capturedCount(std::string const& text, std::string const& output) {
    LoggerState& s = state();
    std::lock_guard<std::mutex> guard(s.mutex);
    size_t count = 0;
    for (QNLogRecord const& record : s.records) {
        if (record.output == output && record.text.find(text) != std::string::npos) {
            ++count;
        }
    }
    return count;
}

}  // namespace QNLog
