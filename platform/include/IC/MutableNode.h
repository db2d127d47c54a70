// The framework's ordinary node: a node whose status, description, path,
// parent text and properties can be set. Properties are kept by id; a later
// set of the same id replaces the earlier value.
#pragma once

#include <string>
#include <vector>

#include "IC/Node.h"

namespace IC {

class MutableNode : public Node {
public:
    MutableNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                unsigned int nodeType, unsigned int index);
    ~MutableNode() override;

    unsigned int getStatus() const override;
    std::string getDescription() const override;
    Error getProperty(unsigned int id, PropertyValue& value) const override;
    PropertyMap const& getProperties() const override;
    Error setProperty(unsigned int const& id, PropertyValue const& value) override;
    unsigned int getNodeId() const override;
    unsigned int getLinkedId() const override;
    unsigned int getIndex() const override;
    std::vector<unsigned int> const& getMIIds() const override;
    Error addMI(unsigned int miId) override;
    Error delMI(unsigned int miId) override;
    virtual Error setStatus(unsigned int const& status);
    virtual Error setDescription(std::string const& description);
    virtual Error setPath(std::string const& path);
    virtual Error setParent(std::string const& parent);

    // Read access for hosts that show the tree.
    virtual unsigned int getNodeType() const;
    virtual std::string getPath() const;
    virtual std::string getParent() const;

private:
    unsigned int nodeId_;
    unsigned int linkedId_;
    std::vector<unsigned int> miIds_;
    unsigned int nodeType_;
    unsigned int index_;
    unsigned int status_ = 0;
    std::string description_;
    std::string path_;
    std::string parent_;
    PropertyMap properties_;
};

}  // namespace IC
