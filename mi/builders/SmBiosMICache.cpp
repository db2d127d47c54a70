#include "IC/PropertyValue.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMICache");

// Cache Information (type 7) fields.
unsigned char const HANDLE = 0x02;
unsigned char const SOCKET = 0x04;
unsigned char const CONFIGURATION = 0x05;
unsigned char const MAXIMUM_SIZE = 0x07;
unsigned char const INSTALLED_SIZE = 0x09;
unsigned char const SPEED = 0x0F;
unsigned char const SYSTEM_CACHE_TYPE = 0x11;
unsigned char const ASSOCIATIVITY = 0x12;

// A size word in 1 KB blocks: the low 15 bits, times 64 when the
// granularity bit (15) is set.
unsigned int cacheSize(unsigned int word) {
    unsigned int const blocks = word & 0x7FFF;
    return (word & 0x8000) != 0 ? blocks << 6 : blocks;
}

unsigned char operationalMode(unsigned int mode) {
    switch (mode) {
        case 0:  // write through
            return 2;
        case 1:  // write back
            return 1;
        case 2:  // varies with memory address
            return 3;
        default:  // unknown
            return 0;
    }
}

unsigned char systemCacheType(unsigned int type) {
    switch (type) {
        case 3:  // instruction
            return 1;
        case 4:  // data
            return 2;
        case 5:  // unified
            return 3;
        default:
            return 0;
    }
}

unsigned char associativity(unsigned int value) {
    switch (value) {
        case 3:  // direct mapped
            return 1;
        case 4:  // 2-way
            return 3;
        case 5:  // 4-way
            return 4;
        case 6:  // fully associative
            return 2;
        case 7:  // 8-way
            return 5;
        case 8:  // 16-way
            return 6;
        default:
            return 0;
    }
}

}  // namespace

// The cache node(s) of one cache handle named by a processor: every Cache
// Information structure with that handle, under the processor.
void SmBiosMI::makeCacheNodes(TableLists tables, unsigned int parentNodeId, unsigned int handle) {
    SMBIOS_DETAIL(logger, "makeCacheNodes entry handle=" << handle);
    SMBIOS_DETAIL(logger, "Table 7 count =" << tables[7]->size());
    for (size_t k = 0; k < tables[7]->size(); ++k) {
        try {
            TableData const& entry = (*tables[7])[k];
            SD::SmBios::Table const* t = entry.table;
            if (getNumber16(t, HANDLE) != handle) {
                continue;
            }
            SMBIOS_DETAIL(logger, "Table 7 length = " << entry.length << " handle = " << handle);
            MutableNode* node = newNode(parentNodeId, 31, static_cast<unsigned int>(k));
            node->setStatus(getBool16(t, CONFIGURATION, 0x80) ? 1 : 16);
            node->setProperty(
                125,
                PropertyValue(std::vector<Number>{Number(1u), Number(14u), Number(16u)}, true));
            node->setDescription("Processor Cache");
            propString(t, SOCKET, 53, node);
            unsigned int const mode = getEnumValue16(t, CONFIGURATION, 0x0300, 8);
            node->setProperty(72, PropertyValue(EnumValue(operationalMode(mode)), true));

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
                9, PropertyValue(EnumValue(systemCacheType(t->getByte(SYSTEM_CACHE_TYPE))), true));
            node->setProperty(
                5, PropertyValue(EnumValue(associativity(t->getByte(ASSOCIATIVITY))), true));
            unsigned int const speed = getNumber8(t, SPEED);
            if (speed != 0) {
                node->setProperty(57, PropertyValue(Number(1000.0 / speed), true));
            }
        }
        SMBIOSMI_CATCH_STRUCTURE(logger, 7, k)
    }
    SMBIOS_DETAIL(logger, "makeCacheNodes exit");
}

}  // namespace IC
