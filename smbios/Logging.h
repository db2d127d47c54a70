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

// Where a message is written from: the function, source file and line the
// log line names. Shared code that writes on behalf of a builder takes the
// builder's place, so that the line names the builder.
struct SourcePlace {
    char const* function;
    char const* file;
    int line;
};

}  // namespace SD

#define SMBIOS_HERE (SD::SourcePlace{__func__, __FILE__, __LINE__})

#define SMBIOS_LOG_AT(place, logger, level, expr)                                              \
    do {                                                                                       \
        if (QNLog::QNLogger::isLevelEnabled(level)) {                                          \
            SD::SourcePlace const smbiosLogPlace_ = (place);                                   \
            QNLog::QNMessageBuffer smbiosLogBuffer_;                                           \
            smbiosLogBuffer_ << expr;                                                          \
            QNLog::QNLogger::logLevelMessage(smbiosLogPlace_.function, smbiosLogPlace_.file,   \
                                             smbiosLogPlace_.line, logger, level,              \
                                             smbiosLogBuffer_);                                \
            QNLog::QNLogger::traceLevelMessage(smbiosLogPlace_.function, smbiosLogPlace_.file, \
                                               smbiosLogPlace_.line, logger, level,            \
                                               smbiosLogBuffer_);                              \
        }                                                                                      \
    } while (0)

#define SMBIOS_LOG(logger, level, expr) SMBIOS_LOG_AT(SMBIOS_HERE, logger, level, expr)
#define SMBIOS_ERROR_AT(place, logger, expr) SMBIOS_LOG_AT(place, logger, SD::LOG_ERROR, expr)

#define SMBIOS_DETAIL(logger, expr) SMBIOS_LOG(logger, SD::LOG_DETAIL, expr)
#define SMBIOS_WARNING(logger, expr) SMBIOS_LOG(logger, SD::LOG_WARNING, expr)
#define SMBIOS_ERROR(logger, expr) SMBIOS_LOG(logger, SD::LOG_ERROR, expr)
