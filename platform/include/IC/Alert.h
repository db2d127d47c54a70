// An alert that a management interface raises about one of its nodes.
#pragma once

#include <string>

namespace IC {

class Alert {
public:
    Alert() = default;
    Alert(unsigned int nodeId, unsigned int severity, std::string const& message)
        : nodeId_(nodeId), severity_(severity), message_(message) {}

    unsigned int getNodeId() const { return nodeId_; }
    unsigned int getSeverity() const { return severity_; }
    std::string const& getMessage() const { return message_; }

private:
    unsigned int nodeId_ = 0;
    unsigned int severity_ = 0;
    std::string message_;
};

}  // namespace IC
