// IC::MutableNode: a node whose every part is set from outside.
#include "IC/MutableNode.h"

#include <algorithm>
#include <utility>

namespace IC {

namespace {

Error success() { return Error(0, Number(0u), ""); }

}  // namespace

MutableNode::MutableNode(unsigned int nodeId, unsigned int linkedId,
                         std::vector<unsigned int> miIds, unsigned int nodeType, unsigned int index)
    : nodeId_(nodeId),
      linkedId_(linkedId),
      miIds_(std::move(miIds)),
      nodeType_(nodeType),
      index_(index) {}

MutableNode::~MutableNode() = default;

unsigned int MutableNode::getStatus() const { return status_; }

std::string MutableNode::getDescription() const { return description_; }

Error MutableNode::getProperty(unsigned int id, PropertyValue& value) const {
    auto const found = properties_.find(id);
    if (found == properties_.end()) {
        return Error(1, Number(0u), "property " + std::to_string(id) + " not set");
    }
    value = found->second;
    return success();
}

PropertyMap const& MutableNode::getProperties() const { return properties_; }

Error MutableNode::setProperty(unsigned int const& id, PropertyValue const& value) {
    properties_.set(id, value);
    return success();
}

unsigned int MutableNode::getNodeId() const { return nodeId_; }

unsigned int MutableNode::getLinkedId() const { return linkedId_; }

unsigned int MutableNode::getIndex() const { return index_; }

std::vector<unsigned int> const& MutableNode::getMIIds() const { return miIds_; }

Error MutableNode::addMI(unsigned int miId) {
    if (std::find(miIds_.begin(), miIds_.end(), miId) == miIds_.end()) {
        miIds_.push_back(miId);
    }
    return success();
}

Error MutableNode::delMI(unsigned int miId) {
    auto const found = std::find(miIds_.begin(), miIds_.end(), miId);
    if (found == miIds_.end()) {
        return Error(1, Number(0u), "interface " + std::to_string(miId) + " not listed");
    }
    miIds_.erase(found);
    return success();
}

Error MutableNode::setStatus(unsigned int const& status) {
    status_ = status;
    return success();
}

Error MutableNode::setDescription(std::string const& description) {
    description_ = description;
    return success();
}

Error MutableNode::setPath(std::string const& path) {
    path_ = path;
    return success();
}

Error MutableNode::setParent(std::string const& parent) {
    parent_ = parent;
    return success();
}

unsigned int MutableNode::getNodeType() const { return nodeType_; }

std::string MutableNode::getPath() const { return path_; }

std::string MutableNode::getParent() const { return parent_; }

}  // namespace IC
