// IC::ManagementInterface: node-list ownership and the default behaviour of
// an interface's operations.
#include "IC/ManagementInterface.h"

#include <algorithm>

#include "IC/MutableNode.h"

namespace IC {

namespace {

Error success() { return Error(0, Number(0u), ""); }

typedef std::lock_guard<std::recursive_mutex> OperationGuard;

}  // namespace

ManagementInterface::ManagementInterface() : miId(0), nextNodeId(1) {}

ManagementInterface::~ManagementInterface() {
    OperationGuard guard(operationMutex_);
    deleteNodes();
}

void ManagementInterface::deleteNodes() {
    // Take the list first so that a node's destructor never sees a list that
    // still names nodes already deleted.
    std::vector<Node*> nodes;
    nodes.swap(nodeList);
    for (Node* node : nodes) {
        delete node;
    }
}

Error ManagementInterface::getMap(std::vector<Node*>& nodes) {
    OperationGuard guard(operationMutex_);
    nodes = nodeList;
    return success();
}

Error ManagementInterface::initialize(unsigned int id, Number const& /*a*/, Number const& /*b*/) {
    OperationGuard guard(operationMutex_);
    deleteNodes();
    miId = id;
    miIdList.assign(1, id);
    nextNodeId = id + 1;
    return success();
}

Error ManagementInterface::registerForAlerts(AlertCallback callback, void const* context) {
    OperationGuard guard(operationMutex_);
    alertCallback_ = callback;
    alertContext_ = context;
    return success();
}

Error ManagementInterface::setLoadCallBack(LoadCallback load, void const* context,
                                           FindCallback find) {
    OperationGuard guard(operationMutex_);
    loadCallback_ = load;
    loadContext_ = context;
    findCallback_ = find;
    return success();
}

Error ManagementInterface::deRegisterForAlerts() {
    OperationGuard guard(operationMutex_);
    alertCallback_ = nullptr;
    alertContext_ = nullptr;
    return success();
}

Error ManagementInterface::unload() {
    OperationGuard guard(operationMutex_);
    deleteNodes();
    return success();
}

ManagementInterface::operator std::string() const {
    OperationGuard guard(operationMutex_);
    return "ManagementInterface id=" + std::to_string(miId) +
           " nodes=" + std::to_string(nodeList.size());
}

Error ManagementInterface::addNewNode(Node*& node) {
    OperationGuard guard(operationMutex_);
    if (node == nullptr) {
        return Error(1, Number(0u), "no node to add");
    }
    nodeList.push_back(node);
    return success();
}

Error ManagementInterface::deleteNode(Node* node) {
    OperationGuard guard(operationMutex_);
    auto const found = std::find(nodeList.begin(), nodeList.end(), node);
    if (node == nullptr || found == nodeList.end()) {
        return Error(1, Number(0u), "node not in the node list");
    }
    nodeList.erase(found);
    delete node;
    return success();
}

Error ManagementInterface::getNode(std::string const& name, Node*& node) {
    OperationGuard guard(operationMutex_);
    for (Node* candidate : nodeList) {
        auto const* mutableNode = dynamic_cast<MutableNode const*>(candidate);
        if (mutableNode != nullptr && mutableNode->getPath() == name) {
            node = candidate;
            return success();
        }
    }
    for (Node* candidate : nodeList) {
        if (candidate != nullptr && std::to_string(candidate->getNodeId()) == name) {
            node = candidate;
            return success();
        }
    }
    node = nullptr;
    return Error(1, Number(0u), "no node named " + name);
}

}  // namespace IC
