// smbios-inventory --format prometheus and --output: the exposition's
// names, escapes and fingerprint on nodes made here, and the real program's
// output checked by Prometheus' own promtool on the demo, every corpus dump
// and random tables.

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <iterator>
#include <memory>
#include <random>
#include <sstream>
#include <string>
#include <vector>

#include "HostRunner.h"
#include "IC/MutableNode.h"
#include "IC/Number.h"
#include "IC/PropertyValue.h"
#include "TableBuilder.h"
#include "TestSupport.h"
#include "inventory/Prometheus.h"

namespace {

using smbiostest::Structure;
using smbiostest::TableBuilder;

char const kPromtool[] = "/usr/bin/promtool";

std::string readFile(std::string const& path) {
    std::ifstream in(path, std::ios::binary);
    return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

bool havePromtool() { return access(kPromtool, X_OK) == 0; }

// promtool check metrics on text: "" when it passes, else what it said.
std::string promtoolComplaints(std::string const& text) {
    smbiostest::TempDir scratch;
    std::string const file = scratch.file("metrics.prom");
    smbiostest::writeFile(file, text);
    hosttest::RunResult const run = hosttest::runProgram(
        "/bin/sh", {"-c", std::string(kPromtool) + " check metrics < " + file});
    if (run.exitStatus == 0 && run.out.empty() && run.err.empty()) {
        return std::string();
    }
    return hosttest::describe(run);
}

std::string demoExample() { return hosttest::sourceDir() + "/examples/demo-server.smbios.txt"; }

// The sample lines of one metric.
std::vector<std::string> samples(std::string const& text, std::string const& metric) {
    std::vector<std::string> lines;
    size_t start = 0;
    while (start < text.size()) {
        size_t end = text.find('\n', start);
        end = end == std::string::npos ? text.size() : end;
        std::string const line = text.substr(start, end - start);
        if (line.compare(0, metric.size(), metric) == 0 &&
            (line.size() > metric.size() &&
             (line[metric.size()] == '{' || line[metric.size()] == ' '))) {
            lines.push_back(line);
        }
        start = end + 1;
    }
    return lines;
}

// Nodes of a tiny inventory: a computer system with the clock properties,
// and a memory device.
struct TinyInventory {
    TinyInventory() {
        std::vector<unsigned int> const mi = {1};
        system.reset(new IC::MutableNode(3, 2, mi, 40, 0));
        system->setDescription("Computer System");
        system->setProperty(36, IC::PropertyValue("Corvane", true));
        system->setProperty(126, IC::PropertyValue(IC::Number(IC::Number::DATETIME), true));
        system->setProperty(127, IC::PropertyValue(IC::Number(2.0), true));
        device.reset(new IC::MutableNode(4, 3, mi, 19, 0));
        device->setDescription("Memory Device");
        device->setProperty(68, IC::PropertyValue("DIMM_A1", true));
        device->setProperty(112, IC::PropertyValue(IC::Number(16777216u), true));
    }
    std::vector<IC::Node*> nodes() { return {system.get(), device.get()}; }

    std::unique_ptr<IC::MutableNode> system;
    std::unique_ptr<IC::MutableNode> device;
};

}  // namespace

TEST(PrometheusNames, LabelNamesAreThePropertyNamesInSnakeCase) {
    EXPECT_EQ(inventory::labelName("Serial number", 50), "serial_number");
    EXPECT_EQ(inventory::labelName("  Maximum speed (MHz) ", 38), "maximum_speed_mhz");
    EXPECT_EQ(inventory::labelName("L2-Cache / size", 1), "l2_cache_size");
    EXPECT_EQ(inventory::labelName("3rd field", 7), "_3rd_field");
    EXPECT_EQ(inventory::labelName("", 37), "property_37");
    EXPECT_EQ(inventory::labelName(nullptr, 37), "property_37");
    EXPECT_EQ(inventory::labelName("--", 9), "property_9");
}

TEST(PrometheusNames, LabelValuesEscapeBackslashQuoteAndLineFeedAndReadLatin1) {
    EXPECT_EQ(inventory::labelValue("a\\b\"c\nd"), "a\\\\b\\\"c\\nd");
    EXPECT_EQ(inventory::labelValue(std::string("Gr\xFC\xDF") + "e"),
              "Gr\xC3\xBC\xC3\x9F"
              "e");
    EXPECT_EQ(inventory::labelValue("plain text"), "plain text");
}

TEST(PrometheusFingerprint, TheClockDoesNotCountAnythingElseDoes) {
    TinyInventory inventory;
    std::uint64_t const before = inventory::inventoryFingerprint(inventory.nodes());
    EXPECT_LT(before, std::uint64_t(1) << 53) << "a double holds it exactly";
    inventory.system->setProperty(127, IC::PropertyValue(IC::Number(-5.0), true));
    inventory.system->setProperty(126, IC::PropertyValue(IC::Number(IC::Number::NONE), true));
    EXPECT_EQ(inventory::inventoryFingerprint(inventory.nodes()), before);
    inventory.device->setProperty(112, IC::PropertyValue(IC::Number(8388608u), true));
    std::uint64_t const resized = inventory::inventoryFingerprint(inventory.nodes());
    EXPECT_NE(resized, before);
    inventory.device->setStatus(16);
    EXPECT_NE(inventory::inventoryFingerprint(inventory.nodes()), resized);
}

TEST(PrometheusRender, SizesAreInBytesAndEverySeriesHasHelpAndType) {
    TinyInventory inventory;
    std::string const text = inventory::renderPrometheus(inventory.nodes());
    std::vector<std::string> const sizes = samples(text, "smbios_memory_device_size_bytes");
    ASSERT_EQ(sizes.size(), 1u) << text;
    EXPECT_NE(sizes[0].find("=\"DIMM_A1\"} 17179869184"), std::string::npos) << sizes[0];
    EXPECT_NE(text.find("# TYPE smbios_memory_device_size_bytes gauge\n"), std::string::npos);
    EXPECT_NE(text.find("# HELP smbios_inventory_fingerprint "), std::string::npos);
    std::vector<std::string> const fingerprint = samples(text, "smbios_inventory_fingerprint");
    ASSERT_EQ(fingerprint.size(), 1u);
    EXPECT_EQ(fingerprint[0],
              "smbios_inventory_fingerprint " +
                  std::to_string(inventory::inventoryFingerprint(inventory.nodes())));
    EXPECT_EQ(samples(text, "smbios_node_status").size(), 2u) << text;
}

TEST(PrometheusRender, TwinComponentsStayTwoSeries) {
    TinyInventory inventory;
    IC::MutableNode twin(5, 3, {1}, 19, 1);
    twin.setDescription("Memory Device");
    twin.setProperty(68, IC::PropertyValue("DIMM_A1", true));
    twin.setProperty(112, IC::PropertyValue(IC::Number(16777216u), true));
    std::vector<IC::Node*> nodes = inventory.nodes();
    nodes.push_back(&twin);
    std::string const text = inventory::renderPrometheus(nodes);
    std::vector<std::string> const sizes = samples(text, "smbios_memory_device_size_bytes");
    ASSERT_EQ(sizes.size(), 2u) << text;
    EXPECT_NE(sizes[0], sizes[1]);
    EXPECT_NE(sizes[1].find("occurrence=\"2\""), std::string::npos) << sizes[1];
}

TEST(PrometheusHost, DemoPassesPromtoolAndShowsItsMemoryInBytes) {
    hosttest::RunResult const run = hosttest::runHost(
        {"--dump", demoExample(), "--format", "prometheus", "--sensors", "processor", "--bmc"});
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    std::vector<std::string> const sizes = samples(run.out, "smbios_memory_device_size_bytes");
    ASSERT_EQ(sizes.size(), 3u) << run.out;
    // The demo's three devices: 16 GB, 16 GB and 8 GB.
    std::vector<std::string> values;
    for (std::string const& line : sizes) {
        values.push_back(line.substr(line.rfind(' ') + 1));
    }
    EXPECT_EQ(values, (std::vector<std::string>{"17179869184", "17179869184", "8589934592"}));
    EXPECT_EQ(samples(run.out, "smbios_processor_max_speed_hertz").size(), 2u);
    EXPECT_EQ(samples(run.out, "smbios_system_info").size(), 1u);
    if (!havePromtool()) {
        GTEST_SKIP() << kPromtool << " is absent (Debian package prometheus); not checked with it";
    }
    EXPECT_EQ(promtoolComplaints(run.out), "");
}

TEST(PrometheusHost, EveryCorpusDumpPassesPromtool) {
    if (smbiostest::corpusDir().empty()) {
        GTEST_SKIP() << "no SMBIOS corpus (SMBIOS_CORPUS_DIR)";
    }
    if (!havePromtool()) {
        GTEST_SKIP() << kPromtool << " is absent (Debian package prometheus)";
    }
    for (std::string const& name : smbiostest::corpusNames()) {
        hosttest::RunResult const run =
            hosttest::runHost({"--from-bin", smbiostest::corpusDir() + "/" + name + ".bin",
                               "--format", "prometheus"});
        ASSERT_EQ(run.exitStatus, 0) << name << ": " << hosttest::describe(run);
        EXPECT_EQ(samples(run.out, "smbios_inventory_fingerprint").size(), 1u) << name;
        EXPECT_EQ(promtoolComplaints(run.out), "") << name;
    }
}

namespace {

// A random text of SMBIOS string bytes (never NUL), quotes, backslashes,
// line feeds and Latin-1 letters among them.
std::string randomText(std::mt19937& random) {
    static char const pool[] = "ab Z09\"\\\n\t{}=,#\xE9\xFC\x7F\x01";
    std::uniform_int_distribution<size_t> length(1, 12);
    std::uniform_int_distribution<size_t> pick(0, sizeof pool - 2);
    std::string text;
    for (size_t n = length(random); n > 0; --n) {
        text += pool[pick(random)];
    }
    return text;
}

// A table of the structures the metrics read (system, baseboard, chassis,
// processor, memory array and devices, slots), their fields random.
std::vector<uint8_t> randomTable(std::mt19937& random) {
    std::uniform_int_distribution<unsigned> byte(0, 255);
    auto bytes = [&](size_t count) {
        std::vector<uint8_t> values;
        for (size_t i = 0; i < count; ++i) {
            values.push_back(static_cast<uint8_t>(byte(random)));
        }
        return values;
    };
    TableBuilder table;
    uint16_t handle = 0;
    table.add(Structure(0, handle++)
                  .str(randomText(random))
                  .str(randomText(random))
                  .word(0xE800)
                  .str(randomText(random))
                  .bytes(bytes(14)));
    table.add(Structure(1, handle++)
                  .str(randomText(random))
                  .str(randomText(random))
                  .str(randomText(random))
                  .str(randomText(random))
                  .bytes(bytes(17))
                  .str(randomText(random))
                  .str(randomText(random)));
    table.add(Structure(3, handle++)
                  .str(randomText(random))
                  .byte(0x17)
                  .str(randomText(random))
                  .str(randomText(random))
                  .str(randomText(random))
                  .bytes(bytes(13)));
    table.add(Structure(2, handle++)
                  .str(randomText(random))
                  .str(randomText(random))
                  .str(randomText(random))
                  .str(randomText(random))
                  .str(randomText(random))
                  .byte(0x09)
                  .str(randomText(random))
                  .word(2)
                  .byte(0x0A)
                  .byte(0));
    table.add(Structure(4, handle++)
                  .str(randomText(random))
                  .byte(3)
                  .byte(0xB3)
                  .str(randomText(random))
                  .bytes(bytes(8))
                  .str(randomText(random))
                  .byte(0x8C)
                  .word(100)
                  .word(4000)
                  .word(2600)
                  .byte(0x41)
                  .byte(0x2B)
                  .word(0xFFFF)
                  .word(0xFFFF)
                  .word(0xFFFF)
                  .str(randomText(random))
                  .str(randomText(random))
                  .str(randomText(random))
                  .byte(static_cast<uint8_t>(byte(random)))
                  .byte(static_cast<uint8_t>(byte(random)))
                  .byte(static_cast<uint8_t>(byte(random)))
                  .word(0x00FC));
    uint16_t const array = handle++;
    table.add(Structure(16, array).byte(3).byte(3).byte(6).dword(0x4000000).word(0xFFFE).word(2));
    for (int device = 0; device < 2; ++device) {
        table.add(Structure(17, handle++)
                      .word(array)
                      .word(0xFFFE)
                      .word(72)
                      .word(64)
                      .word(static_cast<uint16_t>(byte(random) << 4))
                      .byte(9)
                      .byte(0)
                      .str(randomText(random))
                      .str(randomText(random))
                      .byte(0x18)
                      .word(0x80)
                      .word(1600)
                      .str(randomText(random))
                      .str(randomText(random))
                      .str(randomText(random))
                      .str(randomText(random)));
    }
    table.add(Structure(9, handle++)
                  .str(randomText(random))
                  .byte(0xAB)
                  .byte(0x0D)
                  .byte(4)
                  .byte(3)
                  .word(1)
                  .byte(0x04)
                  .byte(0x01));
    table.endOfTable(handle);
    return table.build();
}

}  // namespace

TEST(PrometheusHost, RandomTablesPassPromtool) {
    if (!havePromtool()) {
        GTEST_SKIP() << kPromtool << " is absent (Debian package prometheus)";
    }
    smbiostest::TempDir scratch;
    std::mt19937 random(20261125);
    for (int round = 0; round < 12; ++round) {
        std::string const bin = scratch.file("random" + std::to_string(round) + ".bin");
        smbiostest::writeFile(bin, smbiostest::sm3DumpBin(randomTable(random)));
        hosttest::RunResult const run =
            hosttest::runHost({"--from-bin", bin, "--format", "prometheus"});
        ASSERT_EQ(run.exitStatus, 0) << "round " << round << ": " << hosttest::describe(run);
        ASSERT_EQ(samples(run.out, "smbios_memory_device_info").size(), 2u) << run.out;
        EXPECT_EQ(promtoolComplaints(run.out), "") << "round " << round << ":\n" << run.out;
    }
}

TEST(HostOutput, WritesTheFileWholeAndLeavesNoTemporaryFile) {
    smbiostest::TempDir scratch;
    std::string const file = scratch.file("inventory.prom");
    smbiostest::writeFile(file, "old content\n");
    hosttest::RunResult const run =
        hosttest::runHost({"--dump", demoExample(), "--format", "prometheus", "--output", file});
    ASSERT_EQ(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
    std::string const written = readFile(file);
    EXPECT_EQ(written.compare(0, 7, "# HELP "), 0) << written;
    EXPECT_EQ(written.back(), '\n');
    EXPECT_EQ(smbiostest::folderEntries(scratch.path()),
              std::vector<std::string>{"inventory.prom"});
}

TEST(HostOutput, TheTreeGoesToTheFileAsItWouldToStandardOutput) {
    smbiostest::TempDir scratch;
    std::string const file = scratch.file("inventory.json");
    hosttest::RunResult const toFile =
        hosttest::runHost({"--dump", demoExample(), "--format", "json", "--output", file});
    hosttest::RunResult const toOut =
        hosttest::runHost({"--dump", demoExample(), "--format", "json"});
    ASSERT_EQ(toFile.exitStatus, 0) << hosttest::describe(toFile);
    ASSERT_EQ(toOut.exitStatus, 0) << hosttest::describe(toOut);
    std::string const written = readFile(file);
    // The current time (a "YYYY-MM-DD HH:MM:SS" value) may tick between the runs.
    auto const withoutClock = [](std::string text) {
        size_t const at = text.find("\"datetime\"");
        return at == std::string::npos ? text : text.substr(0, at);
    };
    EXPECT_EQ(withoutClock(written), withoutClock(toOut.out));
    EXPECT_NE(written.find("\"nodes\""), std::string::npos);
}

TEST(HostOutput, RefusesAFolderOrAFifoBeforeLoadingThePlugin) {
    smbiostest::TempDir scratch;
    std::string const fifo = scratch.file("pipe");
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    for (std::string const& target : {scratch.path(), fifo}) {
        hosttest::RunResult const run = hosttest::runProgramWithin(
            hosttest::hostPath(), {"--dump", demoExample(), "--output", target}, {}, 30);
        EXPECT_FALSE(run.timedOut) << target;
        EXPECT_EQ(run.exitStatus, 2) << hosttest::describe(run);
        EXPECT_NE(run.err.find("not a regular file"), std::string::npos) << hosttest::describe(run);
        EXPECT_EQ(run.out, "");
    }
    struct stat info;
    ASSERT_EQ(stat(fifo.c_str(), &info), 0);
    EXPECT_TRUE(S_ISFIFO(info.st_mode)) << "the FIFO is left as it was";
}

TEST(HostOutput, AFailedRunLeavesTheOldFileAlone) {
    smbiostest::TempDir scratch;
    std::string const file = scratch.file("inventory.prom");
    smbiostest::writeFile(file, "last good inventory\n");
    std::string const broken = scratch.file("broken.txt");
    smbiostest::writeFile(broken, "<SHOWSMBIOS>\n</SHOWSMBIOS>\n");
    hosttest::RunResult const run =
        hosttest::runHost({"--dump", broken, "--format", "prometheus", "--output", file});
    EXPECT_NE(run.exitStatus, 0) << hosttest::describe(run);
    EXPECT_EQ(readFile(file), "last good inventory\n");
    EXPECT_EQ(smbiostest::folderEntries(scratch.path()),
              (std::vector<std::string>{"broken.txt", "inventory.prom"}));
}
