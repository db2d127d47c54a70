// A shared library loaded at run time (dlopen, dlsym, dlclose).
#pragma once

#include <string>

namespace SD {

class DynamicLibrary {
public:
    explicit DynamicLibrary(std::wstring const& fileName);
    // Unloads the library when it is still loaded.
    virtual ~DynamicLibrary();

    // Loads the library; false when it cannot be loaded (getLastError says
    // why). Loading an already loaded library succeeds without effect.
    bool load();
    void unload();
    // The handle for symbol lookup, null while not loaded.
    void* getHandle() const { return handle_; }
    // The address of the symbol `name` in the loaded library, through the
    // handle; null while not loaded or when the library does not define it
    // (getLastError says why). The plug-in keeps to load, getHandle and
    // unload, the members the agent's own library offers; this one serves
    // the tools.
    void* getSymbol(std::string const& name);
    std::wstring const& getFileName() const { return fileName_; }
    std::string const& getLastError() const { return lastError_; }

private:
    DynamicLibrary(DynamicLibrary const&) = delete;
    DynamicLibrary& operator=(DynamicLibrary const&) = delete;

    std::wstring fileName_;
    void* handle_ = nullptr;
    std::string lastError_;
};

}  // namespace SD
