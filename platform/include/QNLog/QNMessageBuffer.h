// The stream in which a log message is composed before it is handed to a
// logger.
#pragma once

#include <sstream>
#include <string>

namespace QNLog {

class QNMessageBuffer : public std::ostringstream {
public:
    QNMessageBuffer() = default;
    std::string text() const { return str(); }
};

}  // namespace QNLog
