#include "PluginLoader.h"

#include <dlfcn.h>

#include <cstdlib>

namespace plugintest {

std::string pluginPath() {
    char const* out = std::getenv("SMBIOS_OUT_DIR");
    return std::string(out != nullptr ? out : ".") + "/libsmbiosmi.so";
}

LoadedPlugin::LoadedPlugin() {
    handle_ = dlopen(pluginPath().c_str(), RTLD_NOW | RTLD_LOCAL);
    if (handle_ == nullptr) {
        char const* why = dlerror();
        error_ = why != nullptr ? why : "dlopen failed";
        return;
    }
    auto const openMI = reinterpret_cast<IC::OpenMIFunction>(dlsym(handle_, "OpenMI"));
    if (openMI == nullptr) {
        error_ = "no OpenMI in " + pluginPath();
        return;
    }
    if (openMI(&mi_, &err_) != 0 || mi_ == nullptr) {
        mi_ = nullptr;
        error_ = "OpenMI failed";
    }
}

LoadedPlugin::~LoadedPlugin() { unload(); }

void LoadedPlugin::unload() {
    mi_ = nullptr;
    err_ = nullptr;
    if (handle_ != nullptr) {
        dlclose(handle_);
        handle_ = nullptr;
    }
}

bool pluginIsMapped() {
    void* handle = dlopen(pluginPath().c_str(), RTLD_NOW | RTLD_NOLOAD);
    if (handle == nullptr) {
        return false;
    }
    dlclose(handle);
    return true;
}

}  // namespace plugintest
