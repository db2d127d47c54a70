// The fleet, end to end, against the real engine: one node_exporter per
// simulated machine (textfile collector only, each reading its own folder,
// into which smbios-inventory writes the inventory of one corpus dump) and
// one Prometheus scraping them every second, all on 127.0.0.1 with ports
// chosen at run time. The fleet questions are asked through Prometheus'
// HTTP API and the answers held against dmidecode's decoding of the dumps.
// Every process is stopped when the test ends, passed or failed.

#include <arpa/inet.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <chrono>
#include <cstdio>
#include <fstream>
#include <functional>
#include <iostream>
#include <iterator>
#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "DmidecodeText.h"
#include "HostRunner.h"
#include "TestSupport.h"
#include "inventory/Prometheus.h"
#include "inventory/PropertyNames.h"

namespace {

using Json = nlohmann::json;
using Clock = std::chrono::steady_clock;

char const kPrometheus[] = "/usr/bin/prometheus";
char const kNodeExporter[] = "/usr/bin/prometheus-node-exporter";

std::string readFile(std::string const& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// A port on 127.0.0.1 that was free a moment ago.
unsigned int freePort() {
    int const fd = socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = 0;
    socklen_t size = sizeof address;
    unsigned int port = 0;
    if (fd >= 0 && bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof address) == 0 &&
        getsockname(fd, reinterpret_cast<sockaddr*>(&address), &size) == 0) {
        port = ntohs(address.sin_port);
    }
    if (fd >= 0) {
        close(fd);
    }
    return port;
}

// A server started for the test, its output in a log file; stopped (TERM,
// then KILL) when it goes out of scope, and killed by the kernel should
// this process die first.
class Server {
public:
    Server(std::vector<std::string> const& command, std::string const& logFile) : log_(logFile) {
        pid_t const parent = getpid();
        pid_ = fork();
        if (pid_ == 0) {
            prctl(PR_SET_PDEATHSIG, SIGKILL);
            if (getppid() != parent) {
                _exit(127);
            }
            int const out = open(logFile.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
            if (out >= 0) {
                dup2(out, STDOUT_FILENO);
                dup2(out, STDERR_FILENO);
            }
            std::vector<char*> argv;
            for (std::string const& word : command) {
                argv.push_back(const_cast<char*>(word.c_str()));
            }
            argv.push_back(nullptr);
            execv(argv[0], argv.data());
            _exit(127);
        }
    }
    Server(Server const&) = delete;
    Server& operator=(Server const&) = delete;
    ~Server() { stop(); }

    bool running() { return pid_ > 0 && waitpid(pid_, nullptr, WNOHANG) == 0; }

    void stop() {
        if (pid_ <= 0) {
            return;
        }
        kill(pid_, SIGTERM);
        Clock::time_point const deadline = Clock::now() + std::chrono::seconds(10);
        while (waitpid(pid_, nullptr, WNOHANG) == 0) {
            if (Clock::now() > deadline) {
                kill(pid_, SIGKILL);
                waitpid(pid_, nullptr, 0);
                break;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(20));
        }
        pid_ = -1;
    }

    std::string log() const { return readFile(log_); }

private:
    pid_t pid_ = -1;
    std::string log_;
};

// The characters of a URL's query that need no escape.
std::string urlEncode(std::string const& text) {
    static char const hex[] = "0123456789ABCDEF";
    std::string out;
    for (unsigned char c : text) {
        if (std::isalnum(c) || c == '-' || c == '_' || c == '.' || c == '~') {
            out += static_cast<char>(c);
        } else {
            out += '%';
            out += hex[c >> 4];
            out += hex[c & 0x0F];
        }
    }
    return out;
}

// GET http://127.0.0.1:port/target; the body, "" when there is no answer.
std::string httpGet(unsigned int port, std::string const& target) {
    int const fd = socket(AF_INET, SOCK_STREAM, 0);
    if (fd < 0) {
        return std::string();
    }
    timeval timeout{5, 0};
    setsockopt(fd, SOL_SOCKET, SO_RCVTIMEO, &timeout, sizeof timeout);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = htons(static_cast<uint16_t>(port));
    std::string response;
    if (connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof address) == 0) {
        std::string const request =
            "GET " + target + " HTTP/1.0\r\nHost: 127.0.0.1\r\nConnection: close\r\n\r\n";
        if (send(fd, request.data(), request.size(), MSG_NOSIGNAL) ==
            static_cast<ssize_t>(request.size())) {
            char buffer[65536];
            ssize_t count;
            while ((count = recv(fd, buffer, sizeof buffer, 0)) > 0) {
                response.append(buffer, static_cast<size_t>(count));
            }
        }
    }
    close(fd);
    size_t const body = response.find("\r\n\r\n");
    return body == std::string::npos ? std::string() : response.substr(body + 4);
}

// One sample of a query's answer: its labels and its value.
struct Sample {
    std::map<std::string, std::string> labels;
    double value = 0;
};

// What a label of a metric is called: the property's name as the exposition
// makes it.
std::string label(unsigned int nodeType, unsigned int id) {
    inventory::PropertyInfo const* info = inventory::findProperty(nodeType, id);
    return inventory::labelName(info != nullptr ? info->name : nullptr, id);
}

// A machine of the simulated fleet: its name, its dump, its textfile folder
// and exporter.
struct Machine {
    std::string name;
    std::string dump;
    std::string folder;
    unsigned int port = 0;
    std::unique_ptr<Server> exporter;
};

class Fleet : public ::testing::Test {
protected:
    void SetUp() override {
        if (access(kPrometheus, X_OK) != 0 || access(kNodeExporter, X_OK) != 0) {
            GTEST_SKIP() << kPrometheus << " or " << kNodeExporter
                         << " is absent (Debian packages prometheus and "
                            "prometheus-node-exporter): the fleet test needs the real engine";
        }
        if (smbiostest::corpusDir().empty()) {
            GTEST_SKIP() << "no SMBIOS corpus (SMBIOS_CORPUS_DIR)";
        }
        char const* emulator = std::getenv("SMBIOS_TEST_EMULATOR");
        if (emulator != nullptr && *emulator != '\0') {
            GTEST_SKIP() << "the host runs under an emulator here; the fleet test runs natively";
        }
    }

    // Writes the machine's inventory of `dump` into its textfile folder.
    void writeInventory(Machine const& machine, std::string const& dump) {
        hosttest::RunResult const run =
            hosttest::runHost({"--from-bin", dump, "--format", "prometheus", "--output",
                               machine.folder + "/smbios.prom"});
        ASSERT_EQ(run.exitStatus, 0) << machine.name << ": " << hosttest::describe(run);
    }

    void addMachine(std::string const& name, std::string const& corpusName) {
        Machine machine;
        machine.name = name;
        machine.dump = smbiostest::corpusDir() + "/" + corpusName + ".bin";
        machine.folder = scratch_.path() + "/" + name;
        ASSERT_EQ(mkdir(machine.folder.c_str(), 0755), 0);
        writeInventory(machine, machine.dump);
        machine.port = freePort();
        ASSERT_NE(machine.port, 0u);
        machine.exporter.reset(new Server(
            {kNodeExporter, "--web.listen-address=127.0.0.1:" + std::to_string(machine.port),
             "--collector.disable-defaults", "--collector.textfile",
             "--collector.textfile.directory=" + machine.folder},
            scratch_.path() + "/" + name + ".log"));
        decodings_[name] =
            dmitext::parse(readFile(smbiostest::corpusDir() + "/" + corpusName + ".orig.txt"));
        machines_.push_back(std::move(machine));
    }

    void startPrometheus() {
        std::string config =
            "global:\n  scrape_interval: 1s\n  evaluation_interval: 1s\n"
            "scrape_configs:\n  - job_name: smbios\n    static_configs:\n";
        for (Machine const& machine : machines_) {
            config += "      - targets: ['127.0.0.1:" + std::to_string(machine.port) +
                      "']\n        labels:\n          machine: '" + machine.name + "'\n";
        }
        std::string const configFile = scratch_.file("prometheus.yml");
        smbiostest::writeFile(configFile, config);
        std::string const storage = scratch_.file("data");
        ASSERT_EQ(mkdir(storage.c_str(), 0755), 0);
        prometheusPort_ = freePort();
        ASSERT_NE(prometheusPort_, 0u);
        prometheus_.reset(new Server(
            {kPrometheus, "--config.file=" + configFile, "--storage.tsdb.path=" + storage,
             "--web.listen-address=127.0.0.1:" + std::to_string(prometheusPort_)},
            scratch_.file("prometheus.log")));
    }

    // The answer to an instant query; false (with the body in why) when
    // Prometheus gives none, as while it starts.
    bool tryQuery(std::string const& promql, std::vector<Sample>& samples, std::string& why) {
        std::string const body =
            httpGet(prometheusPort_, "/api/v1/query?query=" + urlEncode(promql));
        Json const answer = Json::parse(body, nullptr, false);
        samples.clear();
        if (answer.is_discarded() || !answer.is_object() ||
            answer.value("status", "") != "success") {
            why = promql + ": " + body;
            return false;
        }
        for (Json const& result : answer["data"]["result"]) {
            Sample sample;
            for (auto const& item : result["metric"].items()) {
                sample.labels[item.key()] = item.value().get<std::string>();
            }
            sample.value = std::stod(result["value"][1].get<std::string>());
            samples.push_back(sample);
        }
        return true;
    }

    // The answer to an instant query; fails the test when there is none.
    std::vector<Sample> query(std::string const& promql) {
        std::vector<Sample> samples;
        std::string why;
        if (!tryQuery(promql, samples, why)) {
            ADD_FAILURE() << why;
        }
        return samples;
    }

    // Each machine's value of `promql`, by the machine label; empty while
    // Prometheus cannot answer.
    std::map<std::string, double> byMachineWhenReady(std::string const& promql) {
        std::vector<Sample> samples;
        std::string why;
        std::map<std::string, double> values;
        if (tryQuery(promql, samples, why)) {
            for (Sample const& sample : samples) {
                auto const machine = sample.labels.find("machine");
                values[machine == sample.labels.end() ? std::string() : machine->second] =
                    sample.value;
            }
        }
        return values;
    }

    // Waits (at most `seconds`) until done() says so.
    static bool waitFor(double seconds, std::function<bool()> const& done) {
        Clock::time_point const deadline =
            Clock::now() + std::chrono::milliseconds(static_cast<long>(seconds * 1000));
        while (Clock::now() < deadline) {
            if (done()) {
                return true;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(250));
        }
        return done();
    }

    // Each machine's value of `promql`, by the machine label.
    std::map<std::string, double> byMachine(std::string const& promql) {
        std::map<std::string, double> values;
        for (Sample const& sample : query(promql)) {
            auto const machine = sample.labels.find("machine");
            values[machine == sample.labels.end() ? std::string() : machine->second] = sample.value;
        }
        return values;
    }

    std::string logs() {
        std::string text = "prometheus:\n" + (prometheus_ ? prometheus_->log() : std::string());
        for (Machine const& machine : machines_) {
            text += machine.name + ":\n" + machine.exporter->log();
        }
        return text;
    }

    void TearDown() override {
        prometheus_.reset();
        for (Machine& machine : machines_) {
            machine.exporter.reset();
        }
    }

    smbiostest::TempDir scratch_;
    std::vector<Machine> machines_;
    std::map<std::string, dmitext::Decoding> decodings_;
    std::unique_ptr<Server> prometheus_;
    unsigned int prometheusPort_ = 0;
};

// dmidecode's account of a machine: its BIOS version, the total size of its
// memory devices, and the models of its populated, enabled processors.
std::string biosVersion(dmitext::Decoding const& decoding) {
    for (dmitext::Block const& block : decoding.blocks) {
        if (block.type == 0) {
            return block.value("Version");
        }
    }
    return std::string();
}

double memoryBytes(dmitext::Decoding const& decoding) {
    double total = 0;
    for (dmitext::Block const& block : decoding.blocks) {
        uint64_t kb = 0;
        if (block.type == 17 && dmitext::sizeInKb(block.value("Size"), kb)) {
            total += static_cast<double>(kb) * 1024;
        }
    }
    return total;
}

std::set<std::string> processorModels(dmitext::Decoding const& decoding) {
    std::set<std::string> models;
    for (dmitext::Block const& block : decoding.blocks) {
        if (block.type == 4 && block.value("Status") == "Populated, Enabled") {
            models.insert(block.value("Version"));
        }
    }
    return models;
}

// "name=value" pairs, each after a blank, for the test's account of its
// answers.
std::string shown(std::map<std::string, double> const& values) {
    std::string text;
    for (auto const& value : values) {
        char number[32];
        std::snprintf(number, sizeof number, "%.17g", value.second);
        text += " " + value.first + "=" + number;
    }
    return text;
}

// A copy of a dump whose BIOS version text `from` reads `to` (as long).
std::string alteredDump(std::string const& dump, std::string const& from, std::string const& to,
                        std::string const& path) {
    std::string bytes = readFile(dump);
    std::string const needle = std::string(1, '\0') + from + std::string(1, '\0');
    size_t const at = bytes.find(needle);
    if (at == std::string::npos || from.size() != to.size()) {
        return std::string();
    }
    bytes.replace(at + 1, from.size(), to);
    smbiostest::writeFile(path, bytes);
    return path;
}

}  // namespace

TEST_F(Fleet, PrometheusAnswersFleetQuestionsFromTheMachinesInventories) {
    // Two machines share a model (and a BIOS version) on purpose.
    std::vector<std::pair<std::string, std::string>> const fleet = {
        {"laptop", "Asus-UX307LA"},
        {"storage", "Synology-RS3614xsp"},
        {"server", "SuperMicro-X9DBL"},
        {"vm-a", "VMWare"},
        {"vm-b", "VMWare"},
    };
    for (auto const& machine : fleet) {
        addMachine(machine.first, machine.second);
    }
    startPrometheus();
    ASSERT_TRUE(waitFor(
        40,
        [&] {
            std::map<std::string, double> const up = byMachineWhenReady("up");
            return up.size() == fleet.size() &&
                   std::all_of(up.begin(), up.end(), [](auto const& m) { return m.second == 1; }) &&
                   byMachineWhenReady("smbios_inventory_fingerprint").size() == fleet.size();
        }))
        << "the targets never came up\n"
        << logs();

    std::string const firmwareName = label(3, 108);
    std::string const firmwareVersion = label(3, 307);
    std::string const processorModel = label(4, 307);

    // How many machines run each BIOS version.
    std::map<std::string, double> expectedVersions;
    for (auto const& machine : fleet) {
        expectedVersions[biosVersion(decodings_[machine.first])] += 1;
    }
    std::map<std::string, double> versions;
    for (Sample& sample :
         query("count by (" + firmwareVersion + ") (count by (machine, " + firmwareVersion +
               ") (smbios_firmware_info{" + firmwareName + "=~\"BIOS|UEFI\"}))")) {
        versions[sample.labels[firmwareVersion]] = sample.value;
    }
    EXPECT_EQ(versions, expectedVersions);
    std::cout << "machines per BIOS version:" << shown(versions) << "\n";
    EXPECT_EQ(versions["6.00"], 2) << "both VMware machines";

    // The total memory of each machine.
    std::map<std::string, double> expectedMemory;
    for (auto const& machine : fleet) {
        expectedMemory[machine.first] = memoryBytes(decodings_[machine.first]);
    }
    std::map<std::string, double> const memory =
        byMachine("sum by (machine) (smbios_memory_device_size_bytes)");
    EXPECT_EQ(memory, expectedMemory);
    std::cout << "memory per machine (bytes):" << shown(memory) << "\n";
    EXPECT_EQ(expectedMemory["server"], 48.0 * 1024 * 1024 * 1024);

    // The machines with a given processor model.
    std::string const model = *processorModels(decodings_["vm-a"]).begin();
    std::set<std::string> expectedMachines;
    for (auto const& machine : fleet) {
        if (processorModels(decodings_[machine.first]).count(model) != 0) {
            expectedMachines.insert(machine.first);
        }
    }
    std::set<std::string> machines;
    for (auto const& found : byMachine("count by (machine) (smbios_processor_info{" +
                                       processorModel + "=\"" + model + "\"})")) {
        machines.insert(found.first);
    }
    EXPECT_EQ(machines, expectedMachines);
    std::cout << "machines with " << model << ":";
    for (std::string const& machine : machines) {
        std::cout << " " << machine;
    }
    std::cout << "\n";
    // The laptop has the VMware host's processor.
    EXPECT_EQ(machines, (std::set<std::string>{"laptop", "vm-a", "vm-b"}));

    // One machine's BIOS is updated: its fingerprint changes, and only its.
    std::map<std::string, double> const before = byMachine("smbios_inventory_fingerprint");
    Machine const& updated = machines_.back();
    std::string const altered =
        alteredDump(updated.dump, "6.00", "6.01", scratch_.file("vm-b-updated.bin"));
    ASSERT_FALSE(altered.empty()) << "no BIOS version 6.00 in " << updated.dump;
    writeInventory(updated, altered);
    std::string const changed = "changes(smbios_inventory_fingerprint[2m]) > 0";
    ASSERT_TRUE(waitFor(20, [&] { return !byMachineWhenReady(changed).empty(); }))
        << "no fingerprint change seen\n"
        << logs();
    std::map<std::string, double> const changes = byMachine(changed);
    EXPECT_EQ(changes.size(), 1u);
    std::cout << "fingerprint changed:" << shown(changes) << "\n";
    EXPECT_EQ(changes.count("vm-b"), 1u);
    std::map<std::string, double> const after = byMachine("smbios_inventory_fingerprint");
    EXPECT_NE(after.at("vm-b"), before.at("vm-b"));
    EXPECT_EQ(after.at("vm-a"), before.at("vm-a"));
    EXPECT_EQ(
        byMachine("count by (machine) (smbios_firmware_info{" + firmwareVersion + "=\"6.01\"})"),
        (std::map<std::string, double>{{"vm-b", 1}}));
}
