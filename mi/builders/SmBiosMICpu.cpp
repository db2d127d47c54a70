#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"
#include "mi/builders/DecodeTable.h"

namespace SD {

// A Processor Information structure, copied for the processor builder.
class TableType4 : public SmBios::Table {
public:
    explicit TableType4(SmBios::Table const& table) : SmBios::Table(table) {}
    ~TableType4() override = default;
};

}  // namespace SD

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMICpu");

// Processor Information (type 4) fields.
unsigned char const SOCKET = 0x04, PROCESSOR_TYPE = 0x05, FAMILY = 0x06, MANUFACTURER = 0x07,
                    PROCESSOR_ID = 0x08, VERSION = 0x10, VOLTAGE = 0x11, EXTERNAL_CLOCK = 0x12,
                    MAX_SPEED = 0x14, CURRENT_SPEED = 0x16, STATUS = 0x18, UPGRADE = 0x19;
unsigned char const CACHE_HANDLES[] = {0x1A, 0x1C, 0x1E};
char const* const CACHE_LABELS[] = {
    " L1 Cache handle = ", " L2 Cache handle = ", " L3 Cache handle = "};
unsigned char const SERIAL = 0x20, ASSET_TAG = 0x21, PART_NUMBER = 0x22, CORE_COUNT = 0x23,
                    CORE_ENABLED = 0x24, THREAD_COUNT = 0x25, CHARACTERISTICS = 0x26;

// Socket populated (bit 6) and CPU enabled (status 1).
unsigned int const STATUS_MASK = 0x47;
unsigned int const POPULATED_AND_ENABLED = 0x41;

// The node status of a processor from its CPU status bits (0 for the rest).
constexpr decode::Row<unsigned int> PROCESSOR_STATUSES[] = {
    {1, 1},   // enabled
    {2, 16},  // disabled by the user
    {3, 24},  // disabled by the firmware (POST error)
    {4, 7},   // idle, waiting to be enabled
};

std::vector<Number> numbers(std::initializer_list<unsigned int> values) {
    std::vector<Number> list;
    for (unsigned int v : values) {
        list.push_back(Number(v));
    }
    return list;
}

// The core counts of a processor node and one core node per core.
void makeCoreNodes(SmBiosMI& mi, SD::SmBios::Table const* t, MutableNode* processor) {
    unsigned int const cores = mi.getNumber8(t, CORE_COUNT);
    unsigned int const enabled = mi.getNumber8(t, CORE_ENABLED);
    unsigned int const threads = mi.getNumber8(t, THREAD_COUNT);
    SMBIOS_DETAIL(logger, " Cores =" << cores << " enabled=" << enabled
                                     << " thread count=" << threads
                                     << (cores == 0 ? " - no core data in smbios tables" : ""));
    processor->setProperty(190, PropertyValue(Number(cores), true));
    processor->setProperty(189, PropertyValue(Number(enabled), true));
    processor->setProperty(87, PropertyValue(Number(threads), true));

    for (unsigned int c = 0; c < cores; ++c) {
        MutableNode* core = mi.newNode(processor->getNodeId(), 42, c);
        core->setDescription("CPU Core Information");
        core->setStatus(c < enabled ? 1 : 16);
        core->setProperty(125, PropertyValue(numbers({1, 16}), true));
        core->setProperty(128, PropertyValue(EnumValue(static_cast<unsigned char>(0)), true));
        if (threads != 0) {
            // Kept: every core carries the whole processor's thread
            // count, as the agent's reports expect.
            core->setProperty(87, PropertyValue(Number(threads), true));
        }
    }
}

}  // namespace

// One node per populated, enabled processor under the planar, with its L1,
// L2 and L3 caches and one node per core.
void SmBiosMI::makeCpuNodes(TableLists tables, unsigned int parentNodeId) {
    SMBIOS_DETAIL(logger, "makeCpuNodes entry");
    SMBIOS_DETAIL(logger, "Table 4 count =" << tables[4]->size());
    unsigned int cpuIndex = 0;
    forEachStructure(SMBIOS_HERE, logger, tables, 4, [&](TableData& entry, size_t) {
        SD::SmBios::Table const* t = entry.table;
        if (t->getType() != 4) {
            return;
        }
        SD::TableType4 const copy(*t);
        unsigned int const status = copy.getByte(STATUS);
        SMBIOS_DETAIL(logger, "Table 4 length = " << entry.length);
        std::string const socket = getString(t, SOCKET);
        if ((status & STATUS_MASK) != POPULATED_AND_ENABLED) {
            return;
        }

        MutableNode* node = newNode(parentNodeId, 4, cpuIndex);
        ++cpuIndex;
        unsigned int const nodeId = node->getNodeId();
        node->setStatus(decode::lookup(PROCESSOR_STATUSES, status & 0x07, 0u));
        node->setProperty(125, PropertyValue(numbers({0, 1, 16, 24, 7}), true));
        // Kept: the description counts from 1 ("CPU 1") while the index
        // counts from 0; the agent shows the description to people.
        node->setDescription("CPU " + std::to_string(cpuIndex));

        propString(t, SOCKET, 53, node);
        propEnumValue(t, PROCESSOR_TYPE, 296, node);
        propNumber8(t, FAMILY, 298, node);
        propString(t, MANUFACTURER, 36, node);
        propBuffer(t, PROCESSOR_ID, 8, 89, node);
        unsigned int const stepping = getNumber8(t, PROCESSOR_ID) & 0x0F;
        SMBIOS_DETAIL(logger, "Processor ID byte1 " << stepping);
        node->setProperty(124, PropertyValue(std::to_string(stepping), true));
        if (entry.length > VOLTAGE) {
            getNumber8(t, VOLTAGE);
        }
        propString(t, VERSION, 307, node);
        propNumber16(t, EXTERNAL_CLOCK, 19, node);
        propNumber16(t, MAX_SPEED, 38, node);
        propNumber16(t, CURRENT_SPEED, 80, node);
        propBool8(t, STATUS, 0x40, 55, node);
        unsigned int const upgrade = getNumber8(t, UPGRADE);
        unsigned char const upgradeValue =
            upgrade >= 2 && upgrade <= 22 ? static_cast<unsigned char>(upgrade - 2) : 0;
        node->setProperty(304, PropertyValue(EnumValue(upgradeValue), true));

        for (unsigned int level = 0; level < 3; ++level) {
            unsigned int const cacheHandle = getNumber16(t, CACHE_HANDLES[level]);
            SMBIOS_DETAIL(logger, CACHE_LABELS[level] << cacheHandle);
            makeCacheNodes(tables, nodeId, cacheHandle);
        }

        propString(t, SERIAL, 50, node);
        propString(t, ASSET_TAG, 2, node);
        propString(t, PART_NUMBER, 45, node);
        bool const wide = getBool16(t, CHARACTERISTICS, 4);
        SMBIOS_DETAIL(logger, " 64 bit = " << wide);
        node->setProperty(15, PropertyValue(Number(wide ? 64u : 32u), true));

        makeCoreNodes(*this, t, node);
    });
    SMBIOS_DETAIL(logger, "makeCpuNodes exit");
}

}  // namespace IC
