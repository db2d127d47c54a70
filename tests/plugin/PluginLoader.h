// Loads the built plug-in the way the agent does: dlopen, then OpenMI.
#pragma once

#include <string>

#include "IC/Error.h"
#include "IC/ManagementInterface.h"
#include "TestSupport.h"

namespace plugintest {

// The built plug-in's path (SMBIOS_OUT_DIR/libsmbiosmi.so).
std::string pluginPath();

// A loaded plug-in and the interface its OpenMI handed out; unloaded when
// the object goes (or by unload()).
class LoadedPlugin : smbiostest::NonCopyable {
public:
    LoadedPlugin();
    ~LoadedPlugin();

    // Whether dlopen and OpenMI succeeded; error() says why not.
    bool loaded() const { return mi_ != nullptr; }
    std::string const& error() const { return error_; }
    IC::ManagementInterface& mi() { return *mi_; }
    void unload();

private:
    void* handle_ = nullptr;
    IC::ManagementInterface* mi_ = nullptr;
    IC::Error* err_ = nullptr;
    std::string error_;
};

// Whether the plug-in's file is mapped in this process now (dlopen with
// RTLD_NOLOAD).
bool pluginIsMapped();

}  // namespace plugintest
