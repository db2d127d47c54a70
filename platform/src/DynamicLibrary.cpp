// SD::DynamicLibrary: dlopen/dlsym/dlclose behind the agent's library interface.
#include "SD/DynamicLibrary.h"

#include <dlfcn.h>

#include "SD/StringConversion.h"

namespace SD {

DynamicLibrary::DynamicLibrary(std::wstring const& fileName) : fileName_(fileName) {}

DynamicLibrary::~DynamicLibrary() { unload(); }

bool DynamicLibrary::load() {
    if (handle_ != nullptr) {
        return true;
    }
    std::string const path = make_string(fileName_);
    dlerror();  // forget any earlier failure
    handle_ = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (handle_ == nullptr) {
        char const* reason = dlerror();
        lastError_ = reason != nullptr ? reason : "cannot load " + path;
        return false;
    }
    lastError_.clear();
    return true;
}

void* DynamicLibrary::getSymbol(std::string const& name) {
    if (handle_ == nullptr) {
        lastError_ = make_string(fileName_) + " is not loaded";
        return nullptr;
    }
    dlerror();  // forget any earlier failure
    void* const symbol = dlsym(handle_, name.c_str());
    char const* reason = symbol == nullptr ? dlerror() : nullptr;
    lastError_ = reason != nullptr ? reason : "";
    return symbol;
}

void DynamicLibrary::unload() {
    if (handle_ != nullptr) {
        dlclose(handle_);
        handle_ = nullptr;
    }
}

}  // namespace SD
