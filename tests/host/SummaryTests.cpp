// smbios-inventory --format summary: the one screen an operator reads first.
// The real host runs on the example server, whose values are known, and on
// the corpus of real machines, whose summaries are held against dmidecode's
// decoding of the same tables. The collection itself is also called
// directly on nodes made here, for the cases the example does not have.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <memory>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

#include "DmidecodeText.h"
#include "HostFixture.h"
#include "HostRunner.h"
#include "IC/MutableNode.h"
#include "IC/Number.h"
#include "IC/PropertyValue.h"
#include "TestSupport.h"
#include "inventory/Summary.h"

namespace {

using Lines = std::vector<std::pair<std::string, std::string>>;

char const* const NO_CORPUS = "no SMBIOS corpus folder (SMBIOS_CORPUS_DIR); nothing to compare";

std::string demoPath() { return hosttest::sourceDir() + "/examples/demo-server.smbios.txt"; }

// The summary's lines as (label, value). Every value starts at one column,
// the one of the first line; a value may be blanks only.
Lines parseSummary(std::string const& text) {
    Lines lines;
    std::istringstream in(text);
    std::string line;
    std::size_t column = std::string::npos;
    while (std::getline(in, line)) {
        std::size_t const colon = line.find(':');
        if (colon == std::string::npos) {
            ADD_FAILURE() << "a summary line without a label: '" << line << "'";
            continue;
        }
        if (column == std::string::npos) {
            column = line.find_first_not_of(' ', colon + 1);
        }
        if (column == std::string::npos || line.size() < column ||
            line.find_first_not_of(' ', colon + 1) < column) {
            ADD_FAILURE() << "a summary line whose value is not in the column: '" << line << "'";
            continue;
        }
        lines.emplace_back(line.substr(0, colon), line.substr(column));
    }
    return lines;
}

std::vector<std::string> valuesOf(Lines const& lines, std::string const& label) {
    std::vector<std::string> values;
    for (auto const& line : lines) {
        if (line.first == label) {
            values.push_back(line.second);
        }
    }
    return values;
}

std::string valueOf(Lines const& lines, std::string const& label) {
    std::vector<std::string> const values = valuesOf(lines, label);
    return values.empty() ? "<no line '" + label + "'>" : values.front();
}

class SummaryHost : public hosttest::BuiltProgramsTest {
protected:
    // The host's summary; fails the test when the run fails.
    std::string summary(std::vector<std::string> args) {
        args.insert(args.end(), {"--format", "summary"});
        hosttest::RunResult const run = hosttest::runHost(args);
        EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
        EXPECT_EQ(run.err, "") << hosttest::describe(run);
        return run.out;
    }
};

TEST_F(SummaryHost, DemoServerShowsItsKnownValues) {
    std::string const text =
        summary({"--dump", demoPath(), "--sensors", "processor", "--sensors", "disk", "--bmc"});
    Lines const expected = {
        {"SMBIOS version", "2.7"},
        {"Manufacturer", "Corvane"},
        {"Product", "Corvane RS-7400 [7947AC1]"},
        {"Serial number", "KQ7X4R2"},
        {"UUID", "A4921F3E-075B-D84C-816A-F023C59DB274"},
        {"Chassis type", "Rack Mount Chassis"},
        {"BIOS vendor", "Corvane"},
        {"BIOS version", "CVE1.05 -[A1B2C3D-1.05]-"},
        {"BIOS date", "06/14/2013"},
        {"Processor",
         "CPU 1: Intel(R) Xeon(R) CPU E5-2670 0 @ 2.60GHz, 8 cores, 16 threads, 2600 MHz "
         "(max 4000 MHz)"},
        {"Processor",
         "CPU 2: Intel(R) Xeon(R) CPU E5-2670 0 @ 2.60GHz, 8 cores, 16 threads, 2600 MHz "
         "(max 4000 MHz)"},
        // DIMM_B1 is an empty socket.
        {"Memory", "40 GB in 3 devices (2 x 16 GB, 1 x 8 GB)"},
        // Slot 1 is in use, slots 2 and 3 are available.
        {"Slots", "1 of 3 slots in use"},
        {"Firmware", "Diagnostics 2.10 (build ABCD12X)"},
        {"Firmware", "OTL 3.04 (build SP12345)"},
        {"Firmware", "Diagnostics 3.10 (build AB12C)"},
        {"Firmware", "UEFI 1.05 (build A1B2C3D)"},
    };
    Lines const lines = parseSummary(text);
    ASSERT_EQ(lines.size(), expected.size()) << text;
    for (std::size_t i = 0; i < expected.size(); ++i) {
        EXPECT_EQ(lines[i], expected[i]) << "line " << i + 1 << " of\n" << text;
    }
}

TEST_F(SummaryHost, DemoLabelsAreAlignedAndTheSummaryFitsOneScreen) {
    std::string const text = summary({"--dump", demoPath()});
    std::istringstream in(text);
    std::string line;
    unsigned int count = 0;
    while (std::getline(in, line)) {
        ++count;
        // "SMBIOS version:" is the longest label, two blanks after it.
        EXPECT_EQ(line.find_first_not_of(' ', line.find(':') + 1), 17u) << line;
    }
    EXPECT_LE(count, 24u) << text;
    EXPECT_EQ(text.back(), '\n');
}

TEST_F(SummaryHost, FirmwareRepeatedUnderTheBmcIsListedOnce) {
    std::string const without = summary({"--dump", demoPath()});
    std::string const with = summary({"--dump", demoPath(), "--bmc"});
    EXPECT_EQ(with, without);
    EXPECT_EQ(valuesOf(parseSummary(with), "Firmware").size(), 4u) << with;
}

// A value as dmidecode prints it: "Not Specified" stands for a string the
// structure does not give, which the summary calls unknown.
void expectSameText(std::string const& ours, std::string const& dmidecode,
                    std::string const& what) {
    if (dmidecode == "Not Specified" && ours == "unknown") {
        return;
    }
    EXPECT_EQ(ours, dmidecode) << what;
}

TEST_F(SummaryHost, CorpusSummariesAgreeWithDmidecode) {
    std::vector<std::string> const names = smbiostest::corpusNames();
    if (names.empty()) {
        GTEST_SKIP() << NO_CORPUS;
    }
    for (std::string const& name : names) {
        SCOPED_TRACE(name);
        std::string const base = smbiostest::corpusDir() + "/" + name;
        Lines const lines = parseSummary(summary({"--from-bin", base + ".bin"}));
        dmitext::Decoding const dmi = dmitext::parse(smbiostest::fileText(base + ".orig.txt"));

        EXPECT_EQ(valueOf(lines, "SMBIOS version"),
                  std::to_string(dmi.major) + "." + std::to_string(dmi.minor));

        auto const systems = dmi.ofType(1);
        ASSERT_FALSE(systems.empty());
        expectSameText(valueOf(lines, "Manufacturer"), systems[0]->value("Manufacturer"),
                       "system manufacturer");
        expectSameText(valueOf(lines, "Product"), systems[0]->value("Product Name"), "product");
        expectSameText(valueOf(lines, "Serial number"), systems[0]->value("Serial Number"),
                       "serial number");

        auto const bios = dmi.ofType(0);
        ASSERT_FALSE(bios.empty());
        expectSameText(valueOf(lines, "BIOS vendor"), bios[0]->value("Vendor"), "BIOS vendor");
        expectSameText(valueOf(lines, "BIOS version"), bios[0]->value("Version"), "BIOS version");
        expectSameText(valueOf(lines, "BIOS date"), bios[0]->value("Release Date"), "BIOS date");

        // One processor line for each populated, enabled processor, with
        // the model dmidecode gives as its version.
        std::vector<std::string> dmiModels;
        for (dmitext::Block const* block : dmi.ofType(4)) {
            if (block->value("Status") == "Populated, Enabled") {
                dmiModels.push_back(block->value("Version"));
            }
        }
        std::vector<std::string> const processors = valuesOf(lines, "Processor");
        ASSERT_EQ(processors.size(), dmiModels.size());
        for (std::size_t i = 0; i < processors.size(); ++i) {
            std::string const prefix = "CPU " + std::to_string(i + 1) + ": " + dmiModels[i];
            EXPECT_EQ(processors[i].compare(0, prefix.size(), prefix), 0)
                << processors[i] << " does not start with " << prefix;
        }

        // The installed memory devices and their total.
        std::uint64_t totalKb = 0;
        unsigned int devices = 0;
        for (dmitext::Block const* block : dmi.ofType(17)) {
            std::uint64_t kb = 0;
            if (dmitext::sizeInKb(block->value("Size"), kb) && kb != 0) {
                totalKb += kb;
                ++devices;
            }
        }
        std::string const memory = valueOf(lines, "Memory");
        std::string const expectedStart = inventory::formatKb(totalKb) + " in " +
                                          std::to_string(devices) +
                                          (devices == 1 ? " device " : " devices ");
        EXPECT_EQ(memory.compare(0, expectedStart.size(), expectedStart), 0)
            << memory << " does not start with " << expectedStart;

        // The slots present and those dmidecode calls in use.
        auto const slots = dmi.ofType(9);
        auto const inUse = std::count_if(slots.begin(), slots.end(), [](dmitext::Block const* b) {
            return b->value("Current Usage") == "In Use";
        });
        EXPECT_EQ(valueOf(lines, "Slots"),
                  slots.empty() ? std::string("none")
                                : std::to_string(inUse) + " of " + std::to_string(slots.size()) +
                                      (slots.size() == 1 ? " slot" : " slots") + " in use");
    }
}

// Nodes made here, for the summary's own rules.
class SummaryNodes : public ::testing::Test {
protected:
    IC::MutableNode& add(unsigned int linked, unsigned int type, std::string const& description) {
        unsigned int const id = static_cast<unsigned int>(owned_.size()) + 1;
        owned_.push_back(
            std::make_unique<IC::MutableNode>(id, linked, std::vector<unsigned int>{1}, type, 0));
        owned_.back()->setDescription(description);
        nodes_.push_back(owned_.back().get());
        return *owned_.back();
    }

    static void set(IC::MutableNode& node, unsigned int id, unsigned int value) {
        node.setProperty(id, IC::PropertyValue(IC::Number(value), true));
    }

    static void set(IC::MutableNode& node, unsigned int id, char const* text) {
        node.setProperty(id, IC::PropertyValue(std::string(text), true));
    }

    // A raw table node of a System Slots structure whose Current Usage byte
    // is `usage`.
    void rawSlot(unsigned int linked, unsigned int usage) {
        IC::MutableNode& raw = add(linked, inventory::ids::kRawTableNode, "SMBIOS Table");
        set(raw, inventory::ids::kRawType, inventory::ids::kSlotStructureType);
        std::vector<IC::Number> bytes;
        for (unsigned int byte : {9u, 17u, 1u, 0u, 1u, 0xA5u, 13u, usage, 4u}) {
            bytes.emplace_back(byte);
        }
        raw.setProperty(inventory::ids::kRawBytes, IC::PropertyValue(bytes, true));
    }

    Lines lines() { return inventory::summaryLines(inventory::collectSummary(nodes_)); }

    std::vector<std::unique_ptr<IC::MutableNode>> owned_;
    std::vector<IC::Node*> nodes_;
};

TEST_F(SummaryNodes, AnEmptyListGivesUnknownsAndNones) {
    Lines const expected = {
        {"SMBIOS version", "unknown"},
        {"Manufacturer", "unknown"},
        {"Product", "unknown"},
        {"Serial number", "unknown"},
        {"UUID", "unknown"},
        {"Chassis type", "unknown"},
        {"BIOS vendor", "unknown"},
        {"BIOS version", "unknown"},
        {"BIOS date", "unknown"},
        {"Processor", "none"},
        {"Memory", "no memory device installed"},
        {"Slots", "none"},
        {"Firmware", "none"},
    };
    EXPECT_EQ(lines(), expected);
}

TEST_F(SummaryNodes, SlotsInUseComeFromTheirRawTableNodes) {
    IC::MutableNode& planar = add(0, 41, "Planar");
    for (int i = 0; i < 4; ++i) {
        add(planar.getNodeId(), inventory::ids::kSlotNode, "System Slot");
    }
    rawSlot(planar.getNodeId(), 4);  // in use
    rawSlot(planar.getNodeId(), 3);  // available
    rawSlot(planar.getNodeId(), 4);  // in use
    EXPECT_EQ(valueOf(lines(), "Slots"), "2 of 4 slots in use (usage unknown for 1)");
    rawSlot(planar.getNodeId(), 5);  // unavailable
    EXPECT_EQ(valueOf(lines(), "Slots"), "2 of 4 slots in use");
}

TEST_F(SummaryNodes, WithoutRawTableNodesSlotUsageIsUnknown) {
    add(0, inventory::ids::kSlotNode, "System Slot");
    EXPECT_EQ(valueOf(lines(), "Slots"), "1 slot, usage unknown");
}

TEST_F(SummaryNodes, ProcessorWithoutCoreCountCountsItsCoreNodes) {
    IC::MutableNode& cpu = add(0, inventory::ids::kProcessorNode, "CPU 1");
    set(cpu, inventory::ids::kProcessorVersion, "Model X");
    set(cpu, inventory::ids::kProcessorMaxSpeed, 3000u);
    for (int i = 0; i < 3; ++i) {
        IC::MutableNode& core = add(cpu.getNodeId(), inventory::ids::kCoreNode, "Core");
        core.setStatus(i == 2 ? 16 : 1);
    }
    EXPECT_EQ(valueOf(lines(), "Processor"), "CPU 1: Model X, 3 cores (2 enabled), 3000 MHz");
}

TEST_F(SummaryNodes, ProcessorWithoutVersionIsNamedByItsManufacturer) {
    IC::MutableNode& cpu = add(0, inventory::ids::kProcessorNode, "CPU 1");
    set(cpu, inventory::ids::kProcessorVersion, "   ");
    set(cpu, inventory::ids::kProcessorManufacturer, "Maker");
    set(cpu, inventory::ids::kProcessorCores, 1u);
    set(cpu, inventory::ids::kProcessorCoresEnabled, 1u);
    set(cpu, inventory::ids::kProcessorThreads, 1u);
    set(cpu, inventory::ids::kProcessorCurrentSpeed, 1000u);
    set(cpu, inventory::ids::kProcessorMaxSpeed, 1000u);
    EXPECT_EQ(valueOf(lines(), "Processor"), "CPU 1: Maker, 1 core, 1 thread, 1000 MHz");
}

TEST_F(SummaryNodes, SmbiosVersionAddsTheRevisionWhenTheNodeHasOne) {
    IC::MutableNode& mi = add(0, inventory::ids::kManagementInterfaceNode, "MI");
    mi.setProperty(inventory::ids::kSmbiosVersion,
                   IC::PropertyValue(IC::Number(IC::Version2(3, 2)), true));
    EXPECT_EQ(valueOf(lines(), "SMBIOS version"), "3.2");
    mi.setProperty(inventory::ids::kSmbiosRevision,
                   IC::PropertyValue(static_cast<unsigned char>(1), true));
    EXPECT_EQ(valueOf(lines(), "SMBIOS version"), "3.2.1");
}

TEST_F(SummaryNodes, TextIsEscapedAsTheTreeEscapesIt) {
    IC::MutableNode& system = add(0, inventory::ids::kComputerSystemNode, "Computer System");
    set(system, inventory::ids::kSystemManufacturer, "Caf\xE9\x01");
    std::string const text = inventory::renderSummary(nodes_);
    EXPECT_NE(text.find("Manufacturer:    Caf\xC3\xA9\\x01\n"), std::string::npos) << text;
}

TEST(SummaryFormat, SizesUseTheLargestUnitThatDividesThem) {
    EXPECT_EQ(inventory::formatKb(0), "0 KB");
    EXPECT_EQ(inventory::formatKb(512), "512 KB");
    EXPECT_EQ(inventory::formatKb(1536), "1536 KB");
    EXPECT_EQ(inventory::formatKb(2048), "2 MB");
    EXPECT_EQ(inventory::formatKb(UINT64_C(1536) * 1024), "1536 MB");
    EXPECT_EQ(inventory::formatKb(UINT64_C(16) * 1024 * 1024), "16 GB");
    EXPECT_EQ(inventory::formatKb(UINT64_C(2) * 1024 * 1024 * 1024), "2 TB");
}

}  // namespace
