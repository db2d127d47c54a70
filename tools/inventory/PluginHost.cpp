#include "inventory/PluginHost.h"

#include <cstring>
#include <memory>

#include "IC/MutableNode.h"
#include "IC/Number.h"
#include "SD/StringConversion.h"
#include "mi/SmBiosMI.h"

namespace inventory {

namespace {

char const kEntryPoint[] = "OpenMI";

// Node types of the nodes the extra nodes hang under: the planar, else the
// root.
unsigned int const kPlanarNodeType = 41;
unsigned int const kRootNodeType = 59;

// The id of the first node of the given type, or 0 when there is none.
unsigned int firstNodeOfType(std::vector<IC::Node*> const& nodes, unsigned int type) {
    for (IC::Node const* node : nodes) {
        auto const* mutableNode = dynamic_cast<IC::MutableNode const*>(node);
        if (mutableNode != nullptr && mutableNode->getNodeType() == type) {
            return mutableNode->getNodeId();
        }
    }
    return 0;
}

std::string failed(char const* step, IC::Error const& error) {
    return std::string(step) + " failed with status " + std::to_string(error.getStatus()) + ": " +
           error.getMessage();
}

}  // namespace

PluginHost::PluginHost(std::string const& path) : path_(path), library_(SD::make_wstring(path)) {}

bool PluginHost::load(std::string& why) {
    if (!library_.load()) {
        why = "cannot load the plug-in " + path_ + ": " + library_.getLastError();
        return false;
    }
    void* const symbol = library_.getSymbol(kEntryPoint);
    if (symbol == nullptr) {
        std::string const& reason = library_.getLastError();
        why = "the plug-in " + path_ + " has no OpenMI entry point" +
              (!reason.empty() ? ": " + reason : std::string());
        return false;
    }
    static_assert(sizeof openMI_ == sizeof symbol, "function and data pointers differ in size");
    std::memcpy(&openMI_, &symbol, sizeof openMI_);
    return true;
}

bool PluginHost::isLinkedSmBiosPlugin() const {
    // The SMBIOS plug-in this program links is the one whose OpenMI this
    // program calls by name; a plug-in loaded from a path is the same one
    // only when the loader found it to be the same file.
    return openMI_ != nullptr && openMI_ == &OpenMI;
}

bool PluginHost::initialize(std::string& why) {
    int const opened = openMI_(&interface_, &openError_);
    if (opened != 0) {
        why = "OpenMI of " + path_ + " returned " + std::to_string(opened);
        if (openError_ != nullptr && !openError_->getMessage().empty()) {
            why += ": " + openError_->getMessage();
        }
        return false;
    }
    if (interface_ == nullptr) {
        why = "OpenMI of " + path_ + " gave no management interface";
        return false;
    }
    IC::Error const initialized = interface_->initialize(1, IC::Number(0u), IC::Number(0u));
    if (initialized.getStatus() != 0) {
        why = failed("initialize", initialized);
        return false;
    }
    return true;
}

bool PluginHost::makeExtraNodes(ExtraNodes const& extra, std::string& why) {
    std::vector<IC::Node*> nodes;
    if (!getNodes(nodes, why)) {
        return false;
    }
    unsigned int parentId = firstNodeOfType(nodes, kPlanarNodeType);
    if (parentId == 0) {
        parentId = firstNodeOfType(nodes, kRootNodeType);
    }
    if (parentId == 0) {
        why = "the inventory has neither a planar nor a root node for the sensor and BMC nodes";
        return false;
    }
    // The interface OpenMI of the linked plug-in hands out is its SmBiosMI.
    auto* const smbiosMI = static_cast<IC::SmBiosMI*>(interface_);
    std::unique_ptr<IC::StructureGroups> const groups = smbiosMI->groupAcquiredTable();
    for (unsigned int location : extra.locations) {
        smbiosMI->makeTemperatureSensorNodes(groups->lists(), parentId, location);
        smbiosMI->makeVoltageSensorNodes(groups->lists(), parentId, location);
    }
    if (extra.bmc) {
        smbiosMI->makeBMCNodes(groups->lists(), parentId);
    }
    return true;
}

bool PluginHost::acquiredEmptyTable() const {
    if (interface_ == nullptr || !isLinkedSmBiosPlugin()) {
        return false;
    }
    std::unique_ptr<IC::StructureGroups> const groups =
        static_cast<IC::SmBiosMI*>(interface_)->groupAcquiredTable();
    IC::TableLists const lists = groups->lists();
    for (unsigned int type = 0; type < 256; ++type) {
        if (!lists[type]->empty()) {
            return false;
        }
    }
    return true;
}

bool PluginHost::getNodes(std::vector<IC::Node*>& nodes, std::string& why) {
    IC::Error const mapped = interface_->getMap(nodes);
    if (mapped.getStatus() != 0) {
        why = failed("getMap", mapped);
        return false;
    }
    return true;
}

}  // namespace inventory
