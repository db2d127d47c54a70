// Speed and memory of the table parser, the dump-file import and the whole
// tree build, on a synthetic table, the example server and (when the corpus
// folder is there) the largest real table, a VMware machine's; the built
// plug-in's initialize, loaded as the agent loads it, on a realistic 64 KB
// table and on 10,000 small structures; smbios-inventory's two renderers on
// the VMware machine's tree; and the whole smbios-inventory process on the
// VMware machine's dump, beside dmidecode on the same file.
#include <benchmark/benchmark.h>
#include <dlfcn.h>
#include <fcntl.h>
#include <malloc.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <memory>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "IC/ManagementInterface.h"
#include "IC/Number.h"
#include "QNLog/QNLogger.h"
#include "inventory/Inventory.h"
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
        IC::StructureGroups groups(parsed);
        IC::TableLists const lists = groups.lists();
        makeRootNode(lists);
        return nodeList.size();
    }

    std::vector<IC::Node*> nodes() {
        std::vector<IC::Node*> list;
        getMap(list);
        return list;
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
// build minus before it), its node count and the heap per node.
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
    state.counters["heap_per_node"] =
        nodes != 0 ? static_cast<double>(heapBytes) / static_cast<double>(nodes) : 0.0;
}

void BM_BuildTreeExample(benchmark::State& state) { buildTree(state, exampleTable()); }
BENCHMARK(BM_BuildTreeExample);

void BM_BuildTreeVMware(benchmark::State& state) { buildTree(state, vmwareTable()); }
BENCHMARK(BM_BuildTreeVMware);

// The example's structures, without its end-of-table structure, repeated
// with fresh handles until the next copy would pass 64 KB, then an
// end-of-table structure: a large server's table of the usual kinds.
std::vector<unsigned char> realistic64KTable() {
    SD::SmBios const example(exampleTable());
    std::vector<unsigned char> raw;
    unsigned int handle = 0;
    size_t copySize = 0;
    for (SD::SmBios::Table const& table : example.getTables()) {
        copySize += table.getType() == 127 ? 0 : table.getData().size();
    }
    while (copySize != 0 && raw.size() + copySize + 6 <= 0xFFFF) {
        for (SD::SmBios::Table const& table : example.getTables()) {
            if (table.getType() == 127) {
                continue;
            }
            std::vector<unsigned char> bytes = table.getData();
            bytes[2] = static_cast<unsigned char>(handle & 0xFF);
            bytes[3] = static_cast<unsigned char>(handle >> 8);
            ++handle;
            raw.insert(raw.end(), bytes.begin(), bytes.end());
        }
    }
    for (unsigned char b :
         {127, 4, static_cast<int>(handle & 0xFF), static_cast<int>(handle >> 8), 0, 0}) {
        raw.push_back(static_cast<unsigned char>(b));
    }
    return raw;
}

// Appends a structure without strings: its header, the fields given, and
// the empty string set.
void appendStructure(std::vector<unsigned char>& raw, unsigned char type, unsigned int handle,
                     std::vector<unsigned char> const& fields) {
    raw.push_back(type);
    raw.push_back(static_cast<unsigned char>(4 + fields.size()));
    raw.push_back(static_cast<unsigned char>(handle & 0xFF));
    raw.push_back(static_cast<unsigned char>(handle >> 8));
    raw.insert(raw.end(), fields.begin(), fields.end());
    raw.push_back(0);
    raw.push_back(0);
}

// A computer system, a chassis and a baseboard, so that the whole tree is
// built under a planar, then count Inactive structures (type 126) of the
// smallest size and an end-of-table structure.
std::vector<unsigned char> inactiveTable(unsigned int count) {
    std::vector<unsigned char> raw;
    appendStructure(raw, 1, 0, {0, 0, 0, 0});
    // Chassis: no strings, type 0x17 (rack mount chassis).
    appendStructure(raw, 3, 1, {0, 0x17, 0, 0, 0});
    // Baseboard: no strings, no features, chassis handle 1, a motherboard,
    // no contained objects.
    appendStructure(raw, 2, 2, {0, 0, 0, 0, 0, 0, 0, 1, 0, 0x0A, 0});
    for (unsigned int i = 0; i < count; ++i) {
        appendStructure(raw, 126, 3 + i, {});
    }
    appendStructure(raw, 127, 3 + count, {});
    return raw;
}

// The folder of this program, where the built plug-in lies beside it.
std::string programFolder() {
    char const* out = std::getenv("SMBIOS_OUT_DIR");
    if (out != nullptr) {
        return out;
    }
    std::vector<char> path(4096);
    ssize_t const length = readlink("/proc/self/exe", path.data(), path.size() - 1);
    std::string const self(path.data(), length > 0 ? static_cast<size_t>(length) : 0);
    size_t const slash = self.rfind('/');
    return slash == std::string::npos ? "." : self.substr(0, slash);
}

// The built plug-in, loaded with an override file of the given table in a
// private data folder, so that its acquisition takes that table; unloaded
// and the folder removed when the object goes.
class LoadedPlugin {
public:
    explicit LoadedPlugin(std::vector<unsigned char> const& raw) {
        char const* tmp = std::getenv("TMPDIR");
        std::string pattern =
            std::string(tmp != nullptr && *tmp != '\0' ? tmp : "/tmp") + "/smbios-bench-XXXXXX";
        if (mkdtemp(&pattern[0]) == nullptr) {
            return;
        }
        folder_ = pattern;
        overrideDir_ = folder_ + "/" + smbiosformat::OVERRIDE_FOLDER;
        overrideFile_ = overrideDir_ + "/" + smbiosformat::OVERRIDE_FILE;
        mkdir(overrideDir_.c_str(), 0700);
        std::vector<uint8_t> const table(raw.begin(), raw.end());
        std::vector<uint8_t> const header = smbiosdump::makeSmEntryPoint(
            2, 7, static_cast<uint16_t>(table.size() > 0xFFFF ? 0xFFFF : table.size()), 0x000E1000,
            0, 0);
        std::ofstream(overrideFile_) << smbiosdump::formatOverride(header, table);
        setenv("KESTREL_DATA_DIR", folder_.c_str(), 1);
        setenv("KESTREL_CODE_DIR", folder_.c_str(), 1);
        handle_ = dlopen((programFolder() + "/libsmbiosmi.so").c_str(), RTLD_NOW | RTLD_LOCAL);
        if (handle_ == nullptr) {
            return;
        }
        auto const openMI = reinterpret_cast<IC::OpenMIFunction>(dlsym(handle_, "OpenMI"));
        IC::Error* err = nullptr;
        if (openMI == nullptr || openMI(&mi_, &err) != 0) {
            mi_ = nullptr;
        }
    }
    ~LoadedPlugin() {
        if (handle_ != nullptr) {
            dlclose(handle_);
        }
        if (!folder_.empty()) {
            std::remove(overrideFile_.c_str());
            rmdir(overrideDir_.c_str());
            rmdir(folder_.c_str());
        }
        unsetenv("KESTREL_DATA_DIR");
        unsetenv("KESTREL_CODE_DIR");
    }
    LoadedPlugin(LoadedPlugin const&) = delete;
    LoadedPlugin& operator=(LoadedPlugin const&) = delete;

    IC::ManagementInterface* mi() const { return mi_; }

private:
    std::string folder_;
    std::string overrideDir_;
    std::string overrideFile_;
    void* handle_ = nullptr;
    IC::ManagementInterface* mi_ = nullptr;
};

// initialize of the built plug-in, after its one acquisition: the copy of
// the acquired table, the grouping and the whole tree.
void initializePlugin(benchmark::State& state, std::vector<unsigned char> const& raw) {
    LoadedPlugin plugin(raw);
    if (plugin.mi() == nullptr) {
        state.SkipWithError("the built plug-in could not be loaded");
        return;
    }
    plugin.mi()->initialize(1, IC::Number(0u), IC::Number(0u));
    for (auto _ : state) {
        plugin.mi()->initialize(1, IC::Number(0u), IC::Number(0u));
    }
    std::vector<IC::Node*> nodes;
    plugin.mi()->getMap(nodes);
    state.counters["nodes"] = static_cast<double>(nodes.size());
    state.counters["table_bytes"] = static_cast<double>(raw.size());
    state.counters["structures"] = static_cast<double>(SD::SmBios(raw).getTables().size());
}

void BM_InitializeRealistic64KTable(benchmark::State& state) {
    initializePlugin(state, realistic64KTable());
}
BENCHMARK(BM_InitializeRealistic64KTable)->Unit(benchmark::kMillisecond);

void BM_Initialize10000InactiveStructures(benchmark::State& state) {
    initializePlugin(state, inactiveTable(10000));
}
BENCHMARK(BM_Initialize10000InactiveStructures)->Unit(benchmark::kMillisecond);

// ---- smbios-inventory ------------------------------------------------------------

// One of the host's renderers on the VMware machine's tree, its text handed
// to a sink that only counts it, as the host hands it to standard output.
void renderVMwareTree(benchmark::State& state, bool json) {
    std::vector<unsigned char> const raw = vmwareTable();
    if (raw.empty()) {
        state.SkipWithError("no corpus folder (SMBIOS_CORPUS_DIR)");
        return;
    }
    SD::SmBios const parsed(raw);
    BenchMI mi;
    mi.build(parsed);
    std::vector<IC::Node*> const nodes = mi.nodes();
    size_t bytes = 0;
    inventory::TextSink const count = [&bytes](char const*, size_t size) { bytes += size; };
    for (auto _ : state) {
        bytes = 0;
        if (json) {
            inventory::writeJson(nodes, count);
        } else {
            inventory::writeTree(nodes, count);
        }
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * static_cast<int64_t>(bytes));
    state.counters["nodes"] = static_cast<double>(nodes.size());
    state.counters["text_bytes"] = static_cast<double>(bytes);
}

void BM_RenderTreeVMware(benchmark::State& state) { renderVMwareTree(state, false); }
BENCHMARK(BM_RenderTreeVMware)->Unit(benchmark::kMillisecond);

void BM_RenderJsonVMware(benchmark::State& state) { renderVMwareTree(state, true); }
BENCHMARK(BM_RenderJsonVMware)->Unit(benchmark::kMillisecond);

// The program of that name in PATH, else in /usr/sbin; "" when there is none.
std::string findProgram(std::string const& name) {
    char const* path = std::getenv("PATH");
    std::string folders = std::string(path != nullptr ? path : "") + ":/usr/sbin";
    size_t start = 0;
    while (start <= folders.size()) {
        size_t const end = std::min(folders.find(':', start), folders.size());
        std::string const candidate = folders.substr(start, end - start) + "/" + name;
        if (end > start && access(candidate.c_str(), X_OK) == 0) {
            return candidate;
        }
        start = end + 1;
    }
    return "";
}

// Runs the program with its output thrown away and waits for it; its exit
// status, or -1 when it could not be run or did not exit.
int runQuietly(std::vector<std::string> const& argv) {
    std::vector<char*> args;
    for (std::string const& arg : argv) {
        args.push_back(const_cast<char*>(arg.c_str()));
    }
    args.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
    posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
    pid_t pid = 0;
    int const spawned = posix_spawn(&pid, args[0], &actions, nullptr, args.data(), environ);
    posix_spawn_file_actions_destroy(&actions);
    int status = 0;
    if (spawned != 0 || waitpid(pid, &status, 0) != pid || !WIFEXITED(status)) {
        return -1;
    }
    return WEXITSTATUS(status);
}

// The whole process, start to end, by wall time: what a person waits for.
void wholeProcess(benchmark::State& state, std::vector<std::string> const& argv) {
    if (access((corpusDir() + "/VMWare.bin").c_str(), R_OK) != 0) {
        state.SkipWithError("no corpus folder (SMBIOS_CORPUS_DIR)");
        return;
    }
    if (argv[0].empty() || access(argv[0].c_str(), X_OK) != 0) {
        state.SkipWithError("the program is not there (dmidecode: apt-get install dmidecode)");
        return;
    }
    if (runQuietly(argv) != 0) {
        state.SkipWithError("the program failed on the dump");
        return;
    }
    for (auto _ : state) {
        runQuietly(argv);
    }
}

void BM_ProcessDmidecodeVMware(benchmark::State& state) {
    wholeProcess(state, {findProgram("dmidecode"), "--from-dump", corpusDir() + "/VMWare.bin"});
}
BENCHMARK(BM_ProcessDmidecodeVMware)->UseRealTime()->Unit(benchmark::kMillisecond);

void BM_ProcessInventoryTreeVMware(benchmark::State& state) {
    wholeProcess(
        state, {programFolder() + "/smbios-inventory", "--from-bin", corpusDir() + "/VMWare.bin"});
}
BENCHMARK(BM_ProcessInventoryTreeVMware)->UseRealTime()->Unit(benchmark::kMillisecond);

void BM_ProcessInventoryJsonVMware(benchmark::State& state) {
    wholeProcess(state, {programFolder() + "/smbios-inventory", "--from-bin",
                         corpusDir() + "/VMWare.bin", "--format", "json"});
}
BENCHMARK(BM_ProcessInventoryJsonVMware)->UseRealTime()->Unit(benchmark::kMillisecond);

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
