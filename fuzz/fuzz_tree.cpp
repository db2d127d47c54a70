// Arbitrary bytes as a raw structure table: parsed, grouped by type as the
// plug-in's initialize groups them, and turned into the whole inventory tree
// by every builder, including those the agent may call on its own.
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <vector>

#include "IC/Number.h"
#include "QNLog/QNLogger.h"
#include "mi/SmBiosMI.h"
#include "smbios/SmBios.h"

namespace {

class FuzzMI : public IC::SmBiosMI {
public:
    void build(SD::SmBios const& parsed) {
        IC::ManagementInterface::initialize(1, IC::Number(0u), IC::Number(0u));
        std::unique_ptr<std::vector<IC::TableData>> owners[256];
        std::vector<IC::TableData>* lists[256];
        groupStructures(parsed, owners, lists);
        makeRootNode(lists);
        makeBMCNodes(lists, 2);
        makeTemperatureSensorNodes(lists, 2, 3);
        makeVoltageSensorNodes(lists, 2, 3);
        std::vector<IC::Node*> nodes;
        getMap(nodes);
        for (IC::Node* node : nodes) {
            for (auto const& property : node->getProperties()) {
                IC::PropertyValue value;
                node->getProperty(property.first, value);
            }
        }
    }
};

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    // The computer-system builder reads the process's table once (for the
    // UUID rule). Point the acquisition at folders with neither an override
    // file nor libpmem.so: the table stays empty, and no instrumented
    // library is loaded and unloaded under the fuzzer, whose coverage
    // counters would then point at unmapped memory.
    setenv("KESTREL_DATA_DIR", "/nonexistent-smbios-fuzz-data/", 1);
    setenv("KESTREL_CODE_DIR", "/nonexistent-smbios-fuzz-code/", 1);
    QNLog::QNLogger::setLogLevel(QNLog::LEVEL_OFF);
    QNLog::QNLogger::setTraceLevel(QNLog::LEVEL_OFF);
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(uint8_t const* data, size_t size) {
    SD::SmBios parsed(std::vector<unsigned char>(data, data + size));
    FuzzMI mi;
    mi.build(parsed);
    return 0;
}
