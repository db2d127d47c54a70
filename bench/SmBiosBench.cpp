// Speed and memory of the table parser, the dump-file import and the whole
// tree build, on a synthetic table, the example server and (when the corpus
// folder is there) the largest real table, a VMware machine's.
#include <benchmark/benchmark.h>
#include <malloc.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <memory>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "IC/Number.h"
#include "QNLog/QNLogger.h"
#include "mi/SmBiosMI.h"
#include "smbios/SmBios.h"
#include "smbios/SmBiosInitializer.h"

namespace {

// A table of count structures of 0x20 formatted bytes and three strings each.
std::vector<unsigned char> syntheticTable(unsigned int count) {
    std::vector<unsigned char> raw;
    for (unsigned int i = 0; i < count; ++i) {
        size_t const start = raw.size();
        raw.resize(start + 0x20, 0);
        raw[start] = static_cast<unsigned char>(i % 40);
        raw[start + 1] = 0x20;
        raw[start + 2] = static_cast<unsigned char>(i & 0xFF);
        raw[start + 3] = static_cast<unsigned char>(i >> 8);
        for (char const* s : {"Manufacturer Name", "Product 1234", "Serial0001"}) {
            for (; *s != '\0'; ++s) {
                raw.push_back(static_cast<unsigned char>(*s));
            }
            raw.push_back(0);
        }
        raw.push_back(0);
    }
    return raw;
}

std::string sourceDir() {
    char const* dir = std::getenv("SMBIOS_SOURCE_DIR");
    return dir != nullptr ? dir : SMBIOS_BENCH_SOURCE_DIR;
}

std::string corpusDir() {
    char const* dir = std::getenv("SMBIOS_CORPUS_DIR");
    return dir != nullptr ? dir : SMBIOS_BENCH_CORPUS_DIR;
}

std::string const examplePath() { return sourceDir() + "/examples/demo-server.smbios.txt"; }

// The raw table of the example dump file, through the plug-in's import.
std::vector<unsigned char> exampleTable() {
    std::vector<std::string> head;
    std::vector<std::string> tables;
    std::vector<unsigned char> raw;
    if (SD::importSmBios(examplePath(), head, tables) == 0) {
        SD::readTables(raw, tables);
    }
    return raw;
}

// The VMware machine's table (620 structures), or empty without the corpus.
std::vector<unsigned char> vmwareTable() {
    std::ifstream in(corpusDir() + "/VMWare.bin", std::ios::binary);
    std::vector<uint8_t> const file((std::istreambuf_iterator<char>(in)),
                                    std::istreambuf_iterator<char>());
    smbiosdump::DumpImage image;
    std::string error;
    if (file.empty() || !smbiosdump::readDumpBin(file, image, error)) {
        return {};
    }
    return std::vector<unsigned char>(image.table.begin(), image.table.end());
}

// Builds the whole tree from a parsed table as initialize does, plus the
// sensor and BMC nodes an agent may ask for.
class BenchMI : public IC::SmBiosMI {
public:
    size_t build(SD::SmBios const& parsed) {
        IC::ManagementInterface::initialize(1, IC::Number(0u), IC::Number(0u));
        std::unique_ptr<std::vector<IC::TableData>> owners[256];
        std::vector<IC::TableData>* lists[256];
        groupStructures(parsed, owners, lists);
        makeRootNode(lists);
        return nodeList.size();
    }
};

void BM_ParseSyntheticTable(benchmark::State& state) {
    std::vector<unsigned char> const raw =
        syntheticTable(static_cast<unsigned int>(state.range(0)));
    for (auto _ : state) {
        SD::SmBios parsed(raw);
        benchmark::DoNotOptimize(parsed.getTables().data());
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) *
                            static_cast<int64_t>(raw.size()));
}
BENCHMARK(BM_ParseSyntheticTable)->Arg(64)->Arg(620)->Arg(2000);

void BM_ParseVMwareTable(benchmark::State& state) {
    std::vector<unsigned char> const raw = vmwareTable();
    if (raw.empty()) {
        state.SkipWithError("no corpus folder (SMBIOS_CORPUS_DIR)");
        return;
    }
    for (auto _ : state) {
        SD::SmBios parsed(raw);
        benchmark::DoNotOptimize(parsed.getTables().data());
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) *
                            static_cast<int64_t>(raw.size()));
}
BENCHMARK(BM_ParseVMwareTable);

void BM_ImportExampleDumpFile(benchmark::State& state) {
    for (auto _ : state) {
        std::vector<std::string> head;
        std::vector<std::string> tables;
        std::vector<unsigned char> header;
        std::vector<unsigned char> raw;
        SD::importSmBios(examplePath(), head, tables);
        SD::readHead(header, head);
        SD::readTables(raw, tables);
        benchmark::DoNotOptimize(raw.data());
    }
}
BENCHMARK(BM_ImportExampleDumpFile);

// The tree build, with the heap it holds once built (bytes in use after the
// build minus before it) and its node count.
void buildTree(benchmark::State& state, std::vector<unsigned char> const& raw) {
    if (raw.empty()) {
        state.SkipWithError("no table");
        return;
    }
    SD::SmBios const parsed(raw);
    size_t nodes = 0;
    size_t heapBytes = 0;
    for (auto _ : state) {
        size_t const before = mallinfo2().uordblks;
        BenchMI mi;
        nodes = mi.build(parsed);
        heapBytes = mallinfo2().uordblks - before;
    }
    state.counters["nodes"] = static_cast<double>(nodes);
    state.counters["tree_heap_bytes"] = static_cast<double>(heapBytes);
}

void BM_BuildTreeExample(benchmark::State& state) { buildTree(state, exampleTable()); }
BENCHMARK(BM_BuildTreeExample);

void BM_BuildTreeVMware(benchmark::State& state) { buildTree(state, vmwareTable()); }
BENCHMARK(BM_BuildTreeVMware);

}  // namespace

int main(int argc, char** argv) {
    // The benchmarks measure the work, not the writing of log lines.
    QNLog::QNLogger::setLogLevel(QNLog::LEVEL_OFF);
    QNLog::QNLogger::setTraceLevel(QNLog::LEVEL_OFF);
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
