// The contract of the physical-memory library libpmem.so: the five plain C
// functions it exports (and its version script, libpmem.map, exports
// nothing else), their pointer types and symbol names, and the binding of
// them from a loaded copy of the library. The library defines the functions
// against these declarations; the plug-in, smbios-dump and the tests load
// the library at run time and bind them by name.
#pragma once

#include <dlfcn.h>

#include <cstddef>
#include <iterator>
#include <string>

#include "SD/DynamicLibrary.h"
#include "SD/StringConversion.h"

// Non-zero when the library has a source of physical memory to serve.
extern "C" __attribute__((visibility("default"))) int PMemIsInitialized(void);
// Non-zero when the memory could be made readable.
extern "C" __attribute__((visibility("default"))) int PMemOpen(void);
// Non-zero when what PMemOpen started has ended.
extern "C" __attribute__((visibility("default"))) int PMemClose(void);
// 0 when exactly `count` bytes from `address` on were copied to `buffer`;
// any other value is a failure.
extern "C" __attribute__((visibility("default"))) int PMemRead(void* buffer, unsigned long address,
                                                               long count);
// The first address from `start`, advancing by `step` while not past `end`,
// where the anchor's characters (without its terminating NUL) occur; 0 when
// there is none.
extern "C" __attribute__((visibility("default"))) unsigned long PMemSearch(char const* anchor,
                                                                           unsigned long start,
                                                                           unsigned long end,
                                                                           long step);

// What the library found when it chose its source, for a person: one line
// per source it tried, in order, saying why that source cannot serve
// ("sysfs: /sys/firmware/dmi/tables/DMI: Permission denied") or what it
// serves ("sysfs: serves /sys/firmware/dmi/tables"). Never null. The tools
// show it; the plug-in never calls it.
extern "C" __attribute__((visibility("default"))) char const* PMemSourceReport(void);
// Non-zero when the table the library serves is the start of a larger one
// that a 2.x entry point cannot describe (over 65535 bytes): the whole
// table's bytes and structures, and those of the whole structures served.
extern "C" __attribute__((visibility("default"))) int PMemTableCut(unsigned long* tableBytes,
                                                                   unsigned long* tableStructures,
                                                                   unsigned long* servedBytes,
                                                                   unsigned long* servedStructures);

namespace pmem {

using IsInitializedFn = decltype(&PMemIsInitialized);
using OpenFn = decltype(&PMemOpen);
using CloseFn = decltype(&PMemClose);
using ReadFn = decltype(&PMemRead);
using SearchFn = decltype(&PMemSearch);
using SourceReportFn = decltype(&PMemSourceReport);
using TableCutFn = decltype(&PMemTableCut);

// The symbol names, as the library exports them and a loader looks them up.
constexpr char kIsInitializedName[] = "PMemIsInitialized";
constexpr char kOpenName[] = "PMemOpen";
constexpr char kCloseName[] = "PMemClose";
constexpr char kReadName[] = "PMemRead";
constexpr char kSearchName[] = "PMemSearch";
constexpr char kSourceReportName[] = "PMemSourceReport";
constexpr char kTableCutName[] = "PMemTableCut";

// Every function a usable library exports, in the order they are bound (and
// a missing one reported). A function the library may lack without being
// unusable gets a list of its own, bound without being reported missing;
// the version script exports both lists.
constexpr char const* kRequiredExports[] = {kIsInitializedName, kOpenName, kCloseName, kReadName,
                                            kSearchName};
// What the library tells the tools beyond the contract; a library without
// them is still usable.
constexpr char const* kReportExports[] = {kSourceReportName, kTableCutName};

// The functions of a loaded library; null where it lacks one.
struct Functions {
    IsInitializedFn isInitialized = nullptr;
    OpenFn open = nullptr;
    CloseFn close = nullptr;
    ReadFn read = nullptr;
    SearchFn search = nullptr;
    SourceReportFn sourceReport = nullptr;
    TableCutFn tableCut = nullptr;
};

// The function `name` of the library loaded as `handle` (from dlopen), null
// when the library does not export it.
template <typename Fn>
Fn lookUp(void* handle, char const* name) {
    return reinterpret_cast<Fn>(dlsym(handle, name));
}

// Binds every function of the library loaded as `handle`, each one found or
// null. Returns the name of the first one (in kRequiredExports' order) that
// the library does not export, null when it exports them all.
inline char const* bindFunctions(void* handle, Functions& out) {
    out.isInitialized = lookUp<IsInitializedFn>(handle, kIsInitializedName);
    out.open = lookUp<OpenFn>(handle, kOpenName);
    out.close = lookUp<CloseFn>(handle, kCloseName);
    out.read = lookUp<ReadFn>(handle, kReadName);
    out.search = lookUp<SearchFn>(handle, kSearchName);
    out.sourceReport = lookUp<SourceReportFn>(handle, kSourceReportName);
    out.tableCut = lookUp<TableCutFn>(handle, kTableCutName);
    bool const found[] = {out.isInitialized != nullptr, out.open != nullptr, out.close != nullptr,
                          out.read != nullptr, out.search != nullptr};
    static_assert(std::size(found) == std::size(kRequiredExports),
                  "a bound function for every required export");
    for (std::size_t i = 0; i < std::size(found); ++i) {
        if (!found[i]) {
            return kRequiredExports[i];
        }
    }
    return nullptr;
}

// A library file loaded with SD::DynamicLibrary and its functions bound.
class BoundLibrary : public SD::DynamicLibrary {
public:
    explicit BoundLibrary(std::string const& path) : SD::DynamicLibrary(SD::make_wstring(path)) {}

    // Loads the library and binds its functions. False when it cannot be
    // loaded (getLastError says why) or lacks a function (missing() names
    // the first one); the library stays loaded in that case, until unload()
    // or the end of this object.
    bool loadAndBind() {
        missing_ = nullptr;
        functions_ = Functions();
        if (!load()) {
            return false;
        }
        missing_ = bindFunctions(getHandle(), functions_);
        return missing_ == nullptr;
    }

    Functions const& functions() const { return functions_; }
    // The first function the loaded library lacks; null when none is.
    char const* missing() const { return missing_; }

private:
    Functions functions_;
    char const* missing_ = nullptr;
};

}  // namespace pmem
