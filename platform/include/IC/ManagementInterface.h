// The base class of every management interface the agent loads. It owns the
// nodes in its node list and deletes them. The order of the virtual
// operations is part of the agent's interface and must not change.
//
// The agent may call an interface from several threads: every operation
// holds the interface's operation lock, a recursive mutex, for its whole
// run, so calls on one interface are serialised. A derived interface whose
// operation builds on the base's (an initialize that fills the node list)
// holds the same lock for its whole run too (operationLock()), so that no
// other call sees the node list half made.
#pragma once

#include <mutex>
#include <string>
#include <vector>

#include "IC/Alert.h"
#include "IC/Error.h"
#include "IC/Node.h"
#include "IC/Number.h"

namespace IC {

class ManagementInterface {
public:
    typedef Error (*AlertCallback)(std::vector<Alert> const& alerts, void const* context);
    typedef Error (*LoadCallback)(Node* const& node, void const* context);
    typedef Error (*FindCallback)(std::string const& name, Node** node);

    ManagementInterface();

    // Copies the node list, in creation order.
    virtual Error getMap(std::vector<Node*>& nodes);
    // Deletes the nodes of an earlier initialization, takes id as this
    // interface's own id, sets the interface id list to {id} and the next
    // node id to id + 1. Returns status 0.
    virtual Error initialize(unsigned int id, Number const& a, Number const& b);
    virtual Error registerForAlerts(AlertCallback callback, void const* context);
    virtual Error setLoadCallBack(LoadCallback load, void const* context, FindCallback find);
    virtual Error deRegisterForAlerts();
    // Deletes every node.
    virtual Error unload();
    virtual ~ManagementInterface();
    virtual operator std::string() const;
    // Appends a node to the node list; the list owns it from then on.
    virtual Error addNewNode(Node*& node);
    // Removes the node from the list and deletes it.
    virtual Error deleteNode(Node* node);
    // Finds a node by its path text, or by its node id written in decimal.
    virtual Error getNode(std::string const& name, Node*& node);

protected:
    // The lock every operation holds; see above.
    std::recursive_mutex& operationLock() const { return operationMutex_; }

    unsigned int miId;
    unsigned int nextNodeId;
    std::vector<unsigned int> miIdList;
    std::vector<Node*> nodeList;

private:
    ManagementInterface(ManagementInterface const&) = delete;
    ManagementInterface& operator=(ManagementInterface const&) = delete;
    void deleteNodes();

    mutable std::recursive_mutex operationMutex_;
    AlertCallback alertCallback_ = nullptr;
    void const* alertContext_ = nullptr;
    LoadCallback loadCallback_ = nullptr;
    void const* loadContext_ = nullptr;
    FindCallback findCallback_ = nullptr;
};

// The one entry point every management-interface plug-in exports, unmangled,
// under the name "OpenMI": it hands out the plug-in's management interface
// and the error record that goes with it, and returns 0.
typedef int (*OpenMIFunction)(ManagementInterface** mi, Error** err);

}  // namespace IC
