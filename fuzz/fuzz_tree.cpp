// Arbitrary bytes as a raw structure table: parsed, grouped by type as the
// plug-in's initialize groups them, and turned into the whole inventory tree
// by every builder, including those the agent may call on its own.
//
// The tree must not depend on the log configuration: it is built at the
// default levels (nothing enabled), at the agent's thresholds (warnings and
// errors, written to a private file) and with every level on (the in-memory
// capture), and the target aborts when the trees, or the warnings and
// errors of the last two runs, differ (see tests/builders/LogLevels.h).
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "../tests/builders/LogLevels.h"
#include "../tests/builders/TreeSnapshot.h"
#include "IC/Number.h"
#include "QNLog/QNLogger.h"
#include "mi/SmBiosMI.h"
#include "smbios/SmBios.h"

namespace {

class FuzzMI : public IC::SmBiosMI {
public:
    // The whole tree of the table, as canonical text.
    std::string build(std::vector<unsigned char> const& raw) {
        SD::SmBios const parsed(raw);
        IC::ManagementInterface::initialize(1, IC::Number(0u), IC::Number(0u));
        IC::StructureGroups groups(parsed);
        IC::TableLists const lists = groups.lists();
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
        return buildertest::treeSnapshot(nodes);
    }
};

// Where the agent-threshold runs write: one file for the whole process,
// made before the first input.
buildertest::LogToFile& logFile() {
    static buildertest::LogToFile file;
    return file;
}

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
    logFile();
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(uint8_t const* data, size_t size) {
    std::vector<unsigned char> const raw(data, data + size);
    buildertest::LevelComparison const result = buildertest::compareLevels(
        [&raw] {
            FuzzMI mi;
            return mi.build(raw);
        },
        logFile());
    if (!result.same()) {
        std::fprintf(stderr, "the log settings change the inventory tree:\n%s\n",
                     result.difference().c_str());
        std::abort();
    }
    return 0;
}
