// The result of a framework operation: a status (0 = success), a code and a
// message.
#pragma once

#include <string>

#include "IC/Number.h"

namespace IC {

class Error {
public:
    Error() : code_(0u) {}
    Error(unsigned int status, Number const& code, std::string const& message)
        : status_(status), code_(code), message_(message) {}

    unsigned int getStatus() const { return status_; }
    Number const& getCode() const { return code_; }
    std::string const& getMessage() const { return message_; }

private:
    unsigned int status_ = 0;
    Number code_;
    std::string message_;
};

}  // namespace IC
