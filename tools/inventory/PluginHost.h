// A management-interface plug-in loaded the way the inventory agent loads
// one: the library, its OpenMI entry point, the interface it hands out,
// initialize and getMap. For the SMBIOS plug-in this program is built with,
// it also makes the sensor and BMC nodes that nothing in the plug-in makes,
// by calling their builders itself.
#pragma once

#include <string>
#include <vector>

#include "IC/Error.h"
#include "IC/ManagementInterface.h"
#include "IC/Node.h"
#include "SD/DynamicLibrary.h"

namespace inventory {

// What the user asked for beyond what initialize makes.
struct ExtraNodes {
    std::vector<unsigned int> locations;  // probe locations, each once, in the order given
    bool bmc = false;

    bool requested() const { return bmc || !locations.empty(); }
};

// Every step returns false and sets why (one line) when it fails. The nodes
// belong to the plug-in: they stay valid while the host lives.
class PluginHost {
public:
    explicit PluginHost(std::string const& path);
    PluginHost(PluginHost const&) = delete;
    PluginHost& operator=(PluginHost const&) = delete;

    std::string const& path() const { return path_; }

    // Loads the library and finds OpenMI.
    bool load(std::string& why);
    // True when the loaded library is the SMBIOS plug-in this program is
    // linked with, whose sensor and BMC builders it can call.
    bool isLinkedSmBiosPlugin() const;
    // OpenMI, then initialize.
    bool initialize(std::string& why);
    // The sensor and BMC nodes under the planar node, else the root node.
    // Only for the linked SMBIOS plug-in, after initialize.
    bool makeExtraNodes(ExtraNodes const& extra, std::string& why);
    bool getNodes(std::vector<IC::Node*>& nodes, std::string& why);
    // After initialize, whether the linked SMBIOS plug-in acquired a table
    // without a single structure (from no source at all, or an empty one);
    // false for any other plug-in, which the host cannot ask.
    bool acquiredEmptyTable() const;

private:
    std::string path_;
    SD::DynamicLibrary library_;
    IC::OpenMIFunction openMI_ = nullptr;  // the library's OpenMI, once loaded
    IC::ManagementInterface* interface_ = nullptr;
    IC::Error* openError_ = nullptr;
};

}  // namespace inventory
