// IC::Node: the parts every node shares.
#include "IC/Node.h"

namespace IC {

Node::~Node() = default;

Node::operator std::string() const {
    return "Node id=" + std::to_string(getNodeId()) + " linked=" + std::to_string(getLinkedId()) +
           " index=" + std::to_string(getIndex()) + " status=" + std::to_string(getStatus()) +
           " \"" + getDescription() + "\"";
}

}  // namespace IC
