// The agent's logger library. A QNLogger is a named logger; messages are
// written through two outputs, the log and the trace, each with its own
// threshold: a message is written when its level is at or above the
// output's threshold. One line a message: time, output, level, logger name,
// function, file:line and text.
//
// Defaults: the log takes level 5000 and up, the trace is off, both go to
// standard error. The environment sets them when the library is first used:
// QNLOG_LEVEL and QNLOG_TRACE_LEVEL (a number, or "off"), QNLOG_FILE (a file
// to append to instead of standard error).
//
// For tests an in-memory capture takes every message of every level while it
// is active.
#pragma once

#include <string>
#include <vector>

#include "QNLog/QNMessageBuffer.h"

namespace QNLog {

// A threshold that no level reaches: the output is off.
int const LEVEL_OFF = 0x7fffffff;

struct QNLogRecord {
    std::string output;  // "log" or "trace"
    int level = 0;
    std::string logger;
    std::string function;
    std::string file;
    int line = 0;
    std::string text;
};

// A logger keeps only a pointer to its name, which must outlive it (a
// string literal): a logger has nothing to destroy, so a message written
// while a library's statics are being destroyed still finds its logger
// whole, whatever order the statics go in.
class QNLogger {
public:
    // Constant-initialised for a literal name: usable from any static
    // initialiser, before or after its own turn.
    constexpr explicit QNLogger(char const* name) : name_(name != nullptr ? name : "") {}
    char const* getName() const { return name_; }

    static void logLevelMessage(char const* function, char const* file, int line,
                                QNLogger const& logger, int level, QNMessageBuffer const& message);
    static void traceLevelMessage(char const* function, char const* file, int line,
                                  QNLogger const& logger, int level,
                                  QNMessageBuffer const& message);

    // Whether either output (or the capture) takes a message of this level;
    // callers compose nothing when it does not.
    static bool isLevelEnabled(int level);
    static bool isLogEnabled(int level);
    static bool isTraceEnabled(int level);

    static void setLogLevel(int threshold);
    static void setTraceLevel(int threshold);
    static int getLogLevel();
    static int getTraceLevel();
    // Appends to the named file from now on; "" means standard error.
    // Returns false (and keeps the current output) when it cannot be opened.
    static bool setLogFile(std::string const& path);
    // Parses a threshold as the environment gives it: a decimal number or
    // "off". Returns false when the text is neither.
    static bool parseLevel(std::string const& text, int& threshold);

    // In-memory capture: every message written while it is active is kept,
    // once per output it was written through.
    static void startCapture();
    static void stopCapture();
    static std::vector<QNLogRecord> captured();
    static void clearCapture();
    // Whether any captured message's text contains the given text.
    static bool capturedContains(std::string const& text);
    // How many captured messages of the given output contain the text.
    static size_t capturedCount(std::string const& text, std::string const& output = "log");

private:
    char const* name_;
};

}  // namespace QNLog
