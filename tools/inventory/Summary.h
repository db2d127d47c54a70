// The one screen an operator reads first: the facts of the inventory tree
// that say what machine this is (SMBIOS version, system, chassis, BIOS,
// processors, memory, slots, firmware), collected from the nodes the
// plug-in returns and shown as text (--format summary) or at the top of the
// HTML page.
#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "IC/Node.h"

namespace inventory {

// The node types and property ids that the summary and the page read.
namespace ids {

// Node types.
constexpr unsigned int kChassisNode = 1;
constexpr unsigned int kFirmwareNode = 3;
constexpr unsigned int kProcessorNode = 4;
constexpr unsigned int kBmcNode = 13;
constexpr unsigned int kManagementInterfaceNode = 15;
constexpr unsigned int kMemoryDeviceNode = 19;
constexpr unsigned int kMemoryArrayNode = 32;
constexpr unsigned int kComputerSystemNode = 40;
constexpr unsigned int kCoreNode = 42;
constexpr unsigned int kRawTableNode = 55;
constexpr unsigned int kSlotNode = 62;

// Management-interface node.
constexpr unsigned int kSmbiosVersion = 306;   // version major.minor
constexpr unsigned int kSmbiosRevision = 307;  // byte, only when not 0

// Computer-system node.
constexpr unsigned int kSystemManufacturer = 36;
constexpr unsigned int kSystemProduct = 39;
constexpr unsigned int kSystemSerial = 50;
constexpr unsigned int kSystemUuid = 64;

// Chassis node.
constexpr unsigned int kChassisPackageType = 11;  // enumerated, the chassis type mapped
constexpr unsigned int kChassisTypeName = 108;    // "Rack Mount Chassis", or "Chassis"

// Processor node.
constexpr unsigned int kProcessorManufacturer = 36;
constexpr unsigned int kProcessorMaxSpeed = 38;      // MHz
constexpr unsigned int kProcessorCurrentSpeed = 80;  // MHz
constexpr unsigned int kProcessorThreads = 87;
constexpr unsigned int kProcessorCoresEnabled = 189;
constexpr unsigned int kProcessorCores = 190;
constexpr unsigned int kProcessorVersion = 307;  // the model text

// Memory device node.
constexpr unsigned int kMemoryDeviceSize = 112;  // KB

// Firmware node.
constexpr unsigned int kFirmwareVendor = 36;
constexpr unsigned int kFirmwareBuild = 70;
constexpr unsigned int kFirmwareName = 108;  // "BIOS", "UEFI", "Diagnostics", "OTL"
constexpr unsigned int kFirmwareVersionText = 134;
constexpr unsigned int kFirmwareDate = 164;
constexpr unsigned int kFirmwareVersion = 307;  // the whole version string

// Raw SMBIOS table node.
constexpr unsigned int kRawType = 177;
constexpr unsigned int kRawBytes = 180;  // the formatted area, one number a byte

// The System Slots structure (SMBIOS type 9): the Current Usage byte and
// its "in use" value.
constexpr unsigned int kSlotStructureType = 9;
constexpr unsigned int kSlotUsageOffset = 0x07;
constexpr unsigned int kSlotUsageInUse = 4;  // 3 is available, 5 unavailable

}  // namespace ids

// The firmware names the BIOS node carries.
constexpr char kBiosName[] = "BIOS";
constexpr char kUefiName[] = "UEFI";

// One computer system. Texts are as the node holds them (bytes, not
// escaped); "" when the node does not have the property.
struct SystemFacts {
    std::string manufacturer;
    std::string product;
    std::string serialNumber;
    std::string uuid;
};

// One BIOS (or UEFI) firmware image.
struct BiosFacts {
    std::string vendor;
    std::string version;
    std::string date;
};

// One processor node.
struct ProcessorFacts {
    std::string description;  // "CPU 1"
    std::string model;        // the version text, else the manufacturer
    bool coresKnown = false;
    unsigned int cores = 0;
    unsigned int enabledCores = 0;
    unsigned int threads = 0;
    unsigned int currentMhz = 0;
    unsigned int maxMhz = 0;
};

// One firmware image as its node names it.
struct FirmwareFacts {
    std::string name;  // "UEFI", "Diagnostics"
    std::string version;
    std::string build;
};

struct SummaryFacts {
    bool versionKnown = false;
    unsigned int smbiosMajor = 0;
    unsigned int smbiosMinor = 0;
    bool revisionKnown = false;
    unsigned int smbiosRevision = 0;
    std::vector<SystemFacts> systems;
    std::vector<std::string> chassisTypes;
    // The firmware nodes under the BMC repeat those of the planar and are
    // left out.
    std::vector<BiosFacts> bios;
    std::vector<ProcessorFacts> processors;
    // The size of each installed memory device, in KB, in node order.
    std::vector<std::uint64_t> memoryDeviceKb;
    unsigned int slotsPresent = 0;
    // Slots whose raw table node tells their usage, and those of them in use.
    unsigned int slotsWithUsage = 0;
    unsigned int slotsInUse = 0;
    std::vector<FirmwareFacts> firmware;
};

// Reads the facts from the nodes, every value through the node's
// getProperty.
SummaryFacts collectSummary(std::vector<IC::Node*> const& nodes);

// A size given in KB as a person reads it: "16 GB", "512 MB", "96 KB" (the
// largest unit that divides it), "0 KB".
std::string formatKb(std::uint64_t kb);

// The summary as labelled lines, in the order they are shown: ("SMBIOS
// version", "2.7"), ("Manufacturer", "Corvane"), ... A label repeats for
// each processor, BIOS and firmware image. Values are raw text (bytes as the
// nodes hold them); each renderer escapes them its own way.
std::vector<std::pair<std::string, std::string>> summaryLines(SummaryFacts const& facts);

// The summary as text for a terminal: one "Label:  value" line each, values
// aligned and escaped as the tree escapes them.
std::string renderSummary(SummaryFacts const& facts);

// collectSummary, then renderSummary.
std::string renderSummary(std::vector<IC::Node*> const& nodes);

}  // namespace inventory
