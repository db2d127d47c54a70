// The plug-in's logging: every message is composed once in a
// QNMessageBuffer and written twice, through the log and through the trace,
// with the function, source file, line and the file's logger.
//
// Nothing is composed when no output takes the level, so the expression
// given to a log macro must have no effect: no structure read, no call that
// may throw or change state. A value a step reads for its log line is read
// into a local first and the local is logged, so that what is read, and
// every exception a read may raise, never depend on the log thresholds.
#pragma once

#include "QNLog/QNLogger.h"
#include "QNLog/QNMessageBuffer.h"

namespace SD {

// Levels: entry, exit and details; warnings; errors.
int const LOG_DETAIL = 3000;
int const LOG_WARNING = 5000;
int const LOG_ERROR = 6000;

}  // namespace SD

#define SMBIOS_LOG(logger, level, expr)                                                     \
    do {                                                                                    \
        if (QNLog::QNLogger::isLevelEnabled(level)) {                                       \
            QNLog::QNMessageBuffer smbiosLogBuffer_;                                        \
            smbiosLogBuffer_ << expr;                                                       \
            QNLog::QNLogger::logLevelMessage(__func__, __FILE__, __LINE__, logger, level,   \
                                             smbiosLogBuffer_);                             \
            QNLog::QNLogger::traceLevelMessage(__func__, __FILE__, __LINE__, logger, level, \
                                               smbiosLogBuffer_);                           \
        }                                                                                   \
    } while (0)

#define SMBIOS_DETAIL(logger, expr) SMBIOS_LOG(logger, SD::LOG_DETAIL, expr)
#define SMBIOS_WARNING(logger, expr) SMBIOS_LOG(logger, SD::LOG_WARNING, expr)
#define SMBIOS_ERROR(logger, expr) SMBIOS_LOG(logger, SD::LOG_ERROR, expr)
