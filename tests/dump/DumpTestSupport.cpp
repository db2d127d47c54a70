#include "DumpTestSupport.h"

#include <dirent.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <nlohmann/json.hpp>

#include "TestSupport.h"

namespace dumptest {

std::string toolPath() { return hosttest::outDir() + "/smbios-dump"; }

hosttest::RunResult runDump(std::vector<std::string> const& args,
                            hosttest::Environment const& environment) {
    return hosttest::runProgram(toolPath(), args, environment);
}

bool makeFifo(std::string const& path) { return mkfifo(path.c_str(), 0600) == 0; }

std::vector<std::string> temporaryFilesOf(std::string const& folder, std::string const& name) {
    std::string const prefix = "." + name + ".";
    std::vector<std::string> found;
    for (std::string const& entry : folderEntries(folder)) {
        if (entry.compare(0, prefix.size(), prefix) == 0) {
            found.push_back(entry);
        }
    }
    return found;
}

std::string fakePMem(std::string const& variant) {
    return hosttest::outDir() + "/" + DUMP_FAKE_PMEM_FROM_OUT + "/" + variant + "/libpmem.so";
}

bool exists(std::string const& path) {
    struct stat info;
    return lstat(path.c_str(), &info) == 0;
}

std::string readText(std::string const& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

std::string inventoryWithoutClock(std::string const& json, unsigned& masked) {
    masked = 0;
    nlohmann::ordered_json document = nlohmann::ordered_json::parse(json, nullptr, false);
    if (document.is_discarded() || !document.contains("nodes")) {
        return "";
    }
    for (auto& node : document["nodes"]) {
        if (node.value("type", 0u) != 40 || !node.contains("properties")) {
            continue;
        }
        masked += static_cast<unsigned>(node["properties"].erase("126"));
        masked += static_cast<unsigned>(node["properties"].erase("127"));
    }
    return document.dump(2);
}

Bytes sampleTable() {
    return smbiostest::TableBuilder()
        .add(smbiostest::Structure(0, 0x0000).str("Corvane").str("1.02").byte(0x0F))
        .add(smbiostest::Structure(1, 0x0001).str("Corvane").str("RS-7400").byte(6))
        .endOfTable(0x0002)
        .build();
}

}  // namespace dumptest
