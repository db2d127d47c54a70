// Logs a fixed set of messages with the logger set up from the environment
// alone, and prints the thresholds it found: "log=<n> trace=<n>".
#include <cstdio>

#include "QNLog/QNLogger.h"
#include "QNLog/QNMessageBuffer.h"

namespace {

QNLog::QNLogger probeLogger("EnvProbe");

void writeMessages() {
    QNLog::QNMessageBuffer low;
    low << "probe-log-low";
    QNLog::QNLogger::logLevelMessage(__func__, __FILE__, __LINE__, probeLogger, 100, low);
    QNLog::QNMessageBuffer high;
    high << "probe-log-high";
    QNLog::QNLogger::logLevelMessage(__func__, __FILE__, __LINE__, probeLogger, 6000, high);
    QNLog::QNMessageBuffer traceLow;
    traceLow << "probe-trace-low";
    QNLog::QNLogger::traceLevelMessage(__func__, __FILE__, __LINE__, probeLogger, 100, traceLow);
    QNLog::QNMessageBuffer traceHigh;
    traceHigh << "probe-trace-high";
    QNLog::QNLogger::traceLevelMessage(__func__, __FILE__, __LINE__, probeLogger, 6000, traceHigh);
}

}  // namespace

int main() {
    std::printf("log=%d trace=%d\n", QNLog::QNLogger::getLogLevel(),
                QNLog::QNLogger::getTraceLevel());
    std::fflush(stdout);
    writeMessages();
    return 0;
}
