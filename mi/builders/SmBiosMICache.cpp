#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"
#include "mi/builders/DecodeTable.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMICache");

// Cache Information (type 7) fields.
unsigned char const HANDLE = 0x02, SOCKET = 0x04, CONFIGURATION = 0x05, MAXIMUM_SIZE = 0x07,
                    INSTALLED_SIZE = 0x09, SPEED = 0x0F, SYSTEM_CACHE_TYPE = 0x11,
                    ASSOCIATIVITY = 0x12;

// A size word in 1 KB blocks: the low 15 bits, times 64 when the
// granularity bit (15) is set.
unsigned int cacheSize(unsigned int word) {
    unsigned int const blocks = word & 0x7FFF;
    return (word & 0x8000) != 0 ? blocks << 6 : blocks;
}

// What a code that no table row holds becomes.
unsigned char const kUnknown = 0;

// Operational mode (configuration bits 8-9) to the agent's write policy.
constexpr decode::Row<unsigned char> OPERATIONAL_MODES[] = {
    {0, 2},  // write through
    {1, 1},  // write back
    {2, 3},  // varies with memory address
};

// System cache type to the agent's cache type.
constexpr decode::Row<unsigned char> SYSTEM_CACHE_TYPES[] = {
    {3, 1},  // instruction
    {4, 2},  // data
    {5, 3},  // unified
};

// Associativity to the agent's associativity.
constexpr decode::Row<unsigned char> ASSOCIATIVITIES[] = {
    {3, 1},  // direct mapped
    {4, 3},  // 2-way
    {5, 4},  // 4-way
    {6, 2},  // fully associative
    {7, 5},  // 8-way
    {8, 6},  // 16-way
};

}  // namespace

// The cache node(s) of one cache handle named by a processor: every Cache
// Information structure with that handle, under the processor.
void SmBiosMI::makeCacheNodes(TableLists tables, unsigned int parentNodeId, unsigned int handle) {
    SMBIOS_DETAIL(logger, "makeCacheNodes entry handle=" << handle);
    SMBIOS_DETAIL(logger, "Table 7 count =" << tables[7]->size());
    forEachStructure(SMBIOS_HERE, logger, tables, 7, [&](TableData& entry, size_t k) {
        SD::SmBios::Table const* t = entry.table;
        if (getNumber16(t, HANDLE) != handle) {
            return;
        }
        SMBIOS_DETAIL(logger, "Table 7 length = " << entry.length << " handle = " << handle);
        MutableNode* node = newNode(parentNodeId, 31, static_cast<unsigned int>(k));
        node->setStatus(getBool16(t, CONFIGURATION, 0x80) ? 1 : 16);
        node->setProperty(
            125, PropertyValue(std::vector<Number>{Number(1u), Number(14u), Number(16u)}, true));
        node->setDescription("Processor Cache");
        propString(t, SOCKET, 53, node);
        unsigned int const mode = getEnumValue16(t, CONFIGURATION, 0x0300, 8);
        node->setProperty(
            72, PropertyValue(EnumValue(decode::lookup(OPERATIONAL_MODES, mode, kUnknown)), true));

        if (entry.length > 6) {
            unsigned int const level = (getNumber16(t, CONFIGURATION) & 7) + 1;
            node->setProperty(30, PropertyValue(Number(level), true));
        }
        if (entry.length > 0x0A) {
            node->setProperty(69, PropertyValue(Number(1024u), true));
            unsigned int const maximum = cacheSize(t->getWord(MAXIMUM_SIZE));
            node->setProperty(112, PropertyValue(Number(maximum), true));
            node->setProperty(37, PropertyValue(Number(maximum), true));
            unsigned int const installed = cacheSize(t->getWord(INSTALLED_SIZE));
            if (installed == 0) {
                node->setStatus(14);
            }
            node->setProperty(73, PropertyValue(Number(installed), true));
            node->setProperty(173, PropertyValue(Number(installed), true));
        }

        node->setProperty(
            9, PropertyValue(EnumValue(decode::lookup(SYSTEM_CACHE_TYPES,
                                                      t->getByte(SYSTEM_CACHE_TYPE), kUnknown)),
                             true));
        node->setProperty(
            5, PropertyValue(
                   EnumValue(decode::lookup(ASSOCIATIVITIES, t->getByte(ASSOCIATIVITY), kUnknown)),
                   true));
        unsigned int const speed = getNumber8(t, SPEED);
        if (speed != 0) {
            node->setProperty(57, PropertyValue(Number(1000.0 / speed), true));
        }
    });
    SMBIOS_DETAIL(logger, "makeCacheNodes exit");
}

}  // namespace IC
