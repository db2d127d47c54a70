#include "inventory/Summary.h"

#include <algorithm>
#include <functional>
#include <map>

#include "IC/PropertyValue.h"
#include "inventory/Inventory.h"
#include "inventory/PropertyNames.h"

namespace inventory {

namespace {

char const kUnknown[] = "unknown";

// The property's value through the node's getProperty; false when the node
// does not have it.
bool readValue(IC::Node const& node, unsigned int id, IC::PropertyValue& value) {
    return node.getProperty(id, value).getStatus() == 0;
}

// A text property; "" when the node does not have it or it is not text.
std::string textOf(IC::Node const& node, unsigned int id) {
    IC::PropertyValue value;
    if (!readValue(node, id, value) || value.getKind() != IC::PropertyValue::STRING) {
        return std::string();
    }
    return value.getString();
}

// An unsigned number, an enumerated value or a byte; false for anything
// else.
bool unsignedOf(IC::Node const& node, unsigned int id, std::uint64_t& number) {
    IC::PropertyValue value;
    if (!readValue(node, id, value)) {
        return false;
    }
    switch (value.getKind()) {
        case IC::PropertyValue::NUMBER:
            if (value.getNumber().getKind() != IC::Number::UNSIGNED) {
                return false;
            }
            number = value.getNumber().getUnsigned();
            return true;
        case IC::PropertyValue::ENUM:
            if (value.getEnum().getValue() < 0) {
                return false;
            }
            number = static_cast<std::uint64_t>(value.getEnum().getValue());
            return true;
        case IC::PropertyValue::BYTE:
            number = value.getByte();
            return true;
        default:
            return false;
    }
}

unsigned int unsignedOr(IC::Node const& node, unsigned int id, unsigned int otherwise) {
    std::uint64_t number = 0;
    return unsignedOf(node, id, number) ? static_cast<unsigned int>(number) : otherwise;
}

SystemFacts systemFacts(IC::Node const& node) {
    SystemFacts system;
    system.manufacturer = textOf(node, ids::kSystemManufacturer);
    system.product = textOf(node, ids::kSystemProduct);
    system.serialNumber = textOf(node, ids::kSystemSerial);
    system.uuid = textOf(node, ids::kSystemUuid);
    return system;
}

// The chassis type as the node names it; where it names only "Chassis",
// the meaning of its package type, which for most chassis types is the
// SMBIOS chassis type itself.
std::string chassisType(IC::Node const& node) {
    std::string name = textOf(node, ids::kChassisTypeName);
    std::uint64_t packageType = 0;
    PropertyInfo const* info = findProperty(ids::kChassisNode, ids::kChassisPackageType);
    if ((name.empty() || name == "Chassis") && info != nullptr &&
        unsignedOf(node, ids::kChassisPackageType, packageType) && packageType <= 0xFFFFFFFFu) {
        char const* meaning = valueMeaning(*info, static_cast<std::uint32_t>(packageType));
        if (meaning != nullptr && *meaning != '\0') {
            name = meaning;
        }
    }
    return name;
}

ProcessorFacts processorFacts(IC::Node const& node, std::vector<IC::Node const*> const& list) {
    ProcessorFacts processor;
    processor.description = node.getDescription();
    processor.model = textOf(node, ids::kProcessorVersion);
    if (processor.model.find_first_not_of(' ') == std::string::npos) {
        processor.model = textOf(node, ids::kProcessorManufacturer);
    }
    std::uint64_t cores = 0;
    if (unsignedOf(node, ids::kProcessorCores, cores) && cores != 0) {
        processor.coresKnown = true;
        processor.cores = static_cast<unsigned int>(cores);
        processor.enabledCores = unsignedOr(node, ids::kProcessorCoresEnabled, processor.cores);
    } else {
        // Without a core count, the core nodes beneath the processor.
        unsigned int const id = node.getNodeId();
        for (IC::Node const* other : list) {
            if (other->getLinkedId() == id && readFacts(*other).type == ids::kCoreNode) {
                ++processor.cores;
                processor.enabledCores += other->getStatus() == 1 ? 1 : 0;
            }
        }
        processor.coresKnown = processor.cores != 0;
    }
    processor.threads = unsignedOr(node, ids::kProcessorThreads, 0);
    processor.currentMhz = unsignedOr(node, ids::kProcessorCurrentSpeed, 0);
    processor.maxMhz = unsignedOr(node, ids::kProcessorMaxSpeed, 0);
    return processor;
}

FirmwareFacts firmwareFacts(IC::Node const& node) {
    FirmwareFacts firmware;
    firmware.name = textOf(node, ids::kFirmwareName);
    if (firmware.name.empty()) {
        firmware.name = node.getDescription();
    }
    firmware.version = textOf(node, ids::kFirmwareVersionText);
    if (firmware.version.empty()) {
        firmware.version = textOf(node, ids::kFirmwareVersion);
    }
    firmware.build = textOf(node, ids::kFirmwareBuild);
    return firmware;
}

// Counts a System Slots structure's usage from its raw table node.
void countSlotUsage(IC::Node const& node, SummaryFacts& facts) {
    std::uint64_t type = 0;
    if (!unsignedOf(node, ids::kRawType, type) || type != ids::kSlotStructureType) {
        return;
    }
    IC::PropertyValue bytes;
    if (!readValue(node, ids::kRawBytes, bytes) || bytes.getKind() != IC::PropertyValue::NUMBERS ||
        bytes.getNumbers().size() <= ids::kSlotUsageOffset) {
        return;
    }
    ++facts.slotsWithUsage;
    if (bytes.getNumbers()[ids::kSlotUsageOffset].getUnsigned() == ids::kSlotUsageInUse) {
        ++facts.slotsInUse;
    }
}

std::string plural(std::uint64_t count, char const* one, char const* many) {
    return std::to_string(count) + " " + (count == 1 ? one : many);
}

std::string orUnknown(std::string const& text) { return text.empty() ? kUnknown : text; }

std::string processorLine(ProcessorFacts const& processor) {
    std::string line = processor.description + ": " + orUnknown(processor.model);
    if (processor.coresKnown) {
        line += ", " + plural(processor.cores, "core", "cores");
        if (processor.enabledCores < processor.cores) {
            line += " (" + std::to_string(processor.enabledCores) + " enabled)";
        }
    }
    if (processor.threads != 0) {
        line += ", " + plural(processor.threads, "thread", "threads");
    }
    unsigned int const speed = processor.currentMhz != 0 ? processor.currentMhz : processor.maxMhz;
    if (speed != 0) {
        line += ", " + std::to_string(speed) + " MHz";
        if (processor.maxMhz > speed) {
            line += " (max " + std::to_string(processor.maxMhz) + " MHz)";
        }
    }
    return line;
}

std::string memoryLine(std::vector<std::uint64_t> const& devices) {
    if (devices.empty()) {
        return "no memory device installed";
    }
    std::uint64_t total = 0;
    // Devices of each size, largest first.
    std::map<std::uint64_t, unsigned int, std::greater<std::uint64_t>> bySize;
    for (std::uint64_t kb : devices) {
        total += kb;
        ++bySize[kb];
    }
    std::string sizes;
    for (auto const& size : bySize) {
        sizes += sizes.empty() ? "" : ", ";
        sizes += std::to_string(size.second) + " x " + formatKb(size.first);
    }
    return formatKb(total) + " in " + plural(devices.size(), "device", "devices") + " (" + sizes +
           ")";
}

std::string slotLine(SummaryFacts const& facts) {
    if (facts.slotsPresent == 0) {
        return "none";
    }
    if (facts.slotsWithUsage == 0) {
        return plural(facts.slotsPresent, "slot", "slots") + ", usage unknown";
    }
    std::string line = std::to_string(facts.slotsInUse) + " of " +
                       plural(facts.slotsPresent, "slot", "slots") + " in use";
    if (facts.slotsWithUsage < facts.slotsPresent) {
        line += " (usage unknown for " + std::to_string(facts.slotsPresent - facts.slotsWithUsage) +
                ")";
    }
    return line;
}

std::string firmwareLine(FirmwareFacts const& firmware) {
    std::string line = orUnknown(firmware.name);
    if (!firmware.version.empty()) {
        line += " " + firmware.version;
    }
    if (!firmware.build.empty()) {
        line += " (build " + firmware.build + ")";
    }
    return line;
}

}  // namespace

SummaryFacts collectSummary(std::vector<IC::Node*> const& nodes) {
    SummaryFacts facts;
    std::vector<IC::Node const*> list;
    std::map<unsigned int, unsigned int> typeById;
    for (IC::Node const* node : nodes) {
        if (node != nullptr) {
            list.push_back(node);
            typeById.emplace(node->getNodeId(), readFacts(*node).type);
        }
    }
    for (IC::Node const* node : list) {
        unsigned int const type = readFacts(*node).type;
        IC::PropertyValue value;
        std::uint64_t number = 0;
        switch (type) {
            case ids::kManagementInterfaceNode:
                if (!facts.versionKnown && readValue(*node, ids::kSmbiosVersion, value) &&
                    value.getKind() == IC::PropertyValue::NUMBER &&
                    value.getNumber().getKind() == IC::Number::VERSION) {
                    facts.versionKnown = true;
                    facts.smbiosMajor = value.getNumber().getVersion().getMajor();
                    facts.smbiosMinor = value.getNumber().getVersion().getMinor();
                    facts.revisionKnown = unsignedOf(*node, ids::kSmbiosRevision, number);
                    facts.smbiosRevision = static_cast<unsigned int>(number);
                }
                break;
            case ids::kComputerSystemNode:
                facts.systems.push_back(systemFacts(*node));
                break;
            case ids::kChassisNode:
                facts.chassisTypes.push_back(chassisType(*node));
                break;
            case ids::kProcessorNode:
                facts.processors.push_back(processorFacts(*node, list));
                break;
            case ids::kMemoryDeviceNode:
                if (unsignedOf(*node, ids::kMemoryDeviceSize, number)) {
                    facts.memoryDeviceKb.push_back(number);
                }
                break;
            case ids::kSlotNode:
                ++facts.slotsPresent;
                break;
            case ids::kRawTableNode:
                countSlotUsage(*node, facts);
                break;
            case ids::kFirmwareNode: {
                auto const parent = typeById.find(node->getLinkedId());
                if (parent != typeById.end() && parent->second == ids::kBmcNode) {
                    break;
                }
                FirmwareFacts firmware = firmwareFacts(*node);
                if (firmware.name == kBiosName || firmware.name == kUefiName) {
                    BiosFacts bios;
                    bios.vendor = textOf(*node, ids::kFirmwareVendor);
                    bios.version = textOf(*node, ids::kFirmwareVersion);
                    bios.date = textOf(*node, ids::kFirmwareDate);
                    facts.bios.push_back(std::move(bios));
                }
                facts.firmware.push_back(std::move(firmware));
                break;
            }
            default:
                break;
        }
    }
    return facts;
}

std::string formatKb(std::uint64_t kb) {
    std::uint64_t const mb = 1024;
    std::uint64_t const gb = mb * 1024;
    std::uint64_t const tb = gb * 1024;
    if (kb != 0 && kb % tb == 0) {
        return std::to_string(kb / tb) + " TB";
    }
    if (kb != 0 && kb % gb == 0) {
        return std::to_string(kb / gb) + " GB";
    }
    if (kb != 0 && kb % mb == 0) {
        return std::to_string(kb / mb) + " MB";
    }
    return std::to_string(kb) + " KB";
}

// The list, or one empty entry in its place: the summary shows the lines of
// a missing system, chassis or BIOS with "unknown" values.
template <typename Facts>
std::vector<Facts> orOneUnknown(std::vector<Facts> list) {
    if (list.empty()) {
        list.emplace_back();
    }
    return list;
}

std::vector<std::pair<std::string, std::string>> summaryLines(SummaryFacts const& facts) {
    std::vector<std::pair<std::string, std::string>> lines;
    std::string version = kUnknown;
    if (facts.versionKnown) {
        version = std::to_string(facts.smbiosMajor) + "." + std::to_string(facts.smbiosMinor);
        if (facts.revisionKnown) {
            version += "." + std::to_string(facts.smbiosRevision);
        }
    }
    lines.emplace_back("SMBIOS version", version);

    for (SystemFacts const& system : orOneUnknown(facts.systems)) {
        lines.emplace_back("Manufacturer", orUnknown(system.manufacturer));
        lines.emplace_back("Product", orUnknown(system.product));
        lines.emplace_back("Serial number", orUnknown(system.serialNumber));
        lines.emplace_back("UUID", orUnknown(system.uuid));
    }
    for (std::string const& chassis : orOneUnknown(facts.chassisTypes)) {
        lines.emplace_back("Chassis type", orUnknown(chassis));
    }

    for (BiosFacts const& image : orOneUnknown(facts.bios)) {
        lines.emplace_back("BIOS vendor", orUnknown(image.vendor));
        lines.emplace_back("BIOS version", orUnknown(image.version));
        lines.emplace_back("BIOS date", orUnknown(image.date));
    }

    if (facts.processors.empty()) {
        lines.emplace_back("Processor", "none");
    }
    for (ProcessorFacts const& processor : facts.processors) {
        lines.emplace_back("Processor", processorLine(processor));
    }
    lines.emplace_back("Memory", memoryLine(facts.memoryDeviceKb));
    lines.emplace_back("Slots", slotLine(facts));
    if (facts.firmware.empty()) {
        lines.emplace_back("Firmware", "none");
    }
    for (FirmwareFacts const& firmware : facts.firmware) {
        lines.emplace_back("Firmware", firmwareLine(firmware));
    }
    return lines;
}

std::string renderSummary(SummaryFacts const& facts) {
    auto const lines = summaryLines(facts);
    std::size_t width = 0;
    for (auto const& line : lines) {
        width = std::max(width, line.first.size());
    }
    std::string out;
    for (auto const& line : lines) {
        out += line.first + ":" + std::string(width - line.first.size() + 2, ' ') +
               escapeText(line.second, false) + "\n";
    }
    return out;
}

std::string renderSummary(std::vector<IC::Node*> const& nodes) {
    return renderSummary(collectSummary(nodes));
}

}  // namespace inventory
