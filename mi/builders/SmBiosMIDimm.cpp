#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIDimm");

// Physical Memory Array (type 16) fields.
unsigned char const ARRAY_LOCATION = 0x04, ARRAY_USE = 0x05, ARRAY_ERROR_CORRECTION = 0x06,
                    ARRAY_MAXIMUM_CAPACITY = 0x07, ARRAY_ERROR_HANDLE = 0x0B;
unsigned int const CAPACITY_UNKNOWN = 0x80000000u;

// Memory Device (type 17) fields.
unsigned char const TOTAL_WIDTH = 0x08, DATA_WIDTH = 0x0A, SIZE = 0x0C, FORM_FACTOR = 0x0E,
                    DEVICE_LOCATOR = 0x10, BANK_LOCATOR = 0x11, MEMORY_TYPE = 0x12,
                    TYPE_DETAIL = 0x13, SPEED = 0x15, MANUFACTURER = 0x17, SERIAL = 0x18,
                    PART_NUMBER = 0x1A;

// Form factor byte to property 85 (bytes above 0x0F give 0). Kept with its
// irregular rows (Row of chips gives 1), as the agent's reports expect.
unsigned char const FORM_FACTORS[] = {0, 1, 0, 7, 2, 1, 3, 4, 6, 8, 9, 1, 11, 12, 13, 1};

// Memory type byte to property 295 (bytes above 0x19 give 1). Kept with its
// irregular rows (EPROM gives what DRAM gives, FB-DIMM gives 1).
unsigned char const MEMORY_TYPES[] = {1,  1, 0,  2,  6,  7,  8,  9,  10, 11, 12, 13, 2,
                                      15, 1, 17, 18, 19, 20, 21, 23, 1,  1,  1,  24, 25};

// The device's size in KB, 0 for an empty socket, an unknown size or a
// structure too short to hold the size. The Size word counts MB, or KB when
// its bit 15 is set.
unsigned int deviceSize(SD::SmBios::Table const* t, unsigned int length) {
    if (length <= 0x0D) {
        return 0;
    }
    unsigned int const size = t->getWord(SIZE);
    if (size == 0xFFFF) {
        return 0;
    }
    if ((size & 0x8000) != 0) {
        return size & 0x7FFF;
    }
    return size << 10;
}

// The properties of an installed memory device's node (size in KB).
void setMemoryDeviceProperties(SmBiosMI& mi, TableData const& entry, unsigned int size,
                               MutableNode* node) {
    SD::SmBios::Table const* t = entry.table;
    node->setStatus(1);
    node->setProperty(125, PropertyValue(std::vector<Number>{Number(1u), Number(14u)}, true));
    node->setProperty(112, PropertyValue(Number(size), true));
    node->setProperty(73, PropertyValue(Number(size), true));
    mi.propNumber16(t, TOTAL_WIDTH, 61, node);
    mi.propNumber16(t, DATA_WIDTH, 15, node);
    node->setProperty(69, PropertyValue(Number(1024u), true));
    unsigned int const formFactor = mi.getNumber8(t, FORM_FACTOR);
    node->setProperty(85,
                      PropertyValue(EnumValue(formFactor <= 0x0F ? FORM_FACTORS[formFactor]
                                                                 : static_cast<unsigned char>(0)),
                                    true));
    if (entry.length > 0x11) {
        std::string const device = mi.getString(t, DEVICE_LOCATOR);
        std::string const bank = mi.getString(t, BANK_LOCATOR);
        std::string const locator =
            !device.empty() && !bank.empty() ? device + ":" + bank : device + bank;
        if (!locator.empty()) {
            node->setProperty(68, PropertyValue(locator, true));
            node->setDescription(locator);
        }
    }
    unsigned int const memoryType = mi.getNumber8(t, MEMORY_TYPE);
    node->setProperty(295,
                      PropertyValue(EnumValue(memoryType <= 0x19 ? MEMORY_TYPES[memoryType]
                                                                 : static_cast<unsigned char>(1)),
                                    true));
    node->setProperty(135, PropertyValue(Number(mi.getBool16(t, TYPE_DETAIL, 0x1000)), true));
    mi.propNumber16(t, SPEED, 57, node);
    mi.propString(t, MANUFACTURER, 36, node);
    mi.propString(t, SERIAL, 50, node);
    mi.propString(t, PART_NUMBER, 45, node);
}

}  // namespace

// One node per memory array and one per installed memory device, all
// directly under the planar.
void SmBiosMI::makeDimmNodes(TableLists tables, unsigned int parentNodeId) {
    SMBIOS_DETAIL(logger, "makeDimmNodes entry");
    SMBIOS_DETAIL(logger, "Table 5 count =" << tables[5]->size());
    SMBIOS_DETAIL(logger, "Table 6 count =" << tables[6]->size());
    SMBIOS_DETAIL(logger, "Table 16 count =" << tables[16]->size());
    forEachStructure(SMBIOS_HERE, logger, tables, 16, [&](TableData& entry, size_t p) {
        SD::SmBios::Table const* t = entry.table;
        MutableNode* node = newNode(parentNodeId, 32, static_cast<unsigned int>(p));
        node->setStatus(1);
        node->setDescription("Memory Array");
        propEnumValue(t, ARRAY_LOCATION, 302, node);
        propEnumValue(t, ARRAY_USE, 303, node);
        propEnumValue(t, ARRAY_ERROR_CORRECTION, 300, node);
        if (entry.length > 0x0A) {
            unsigned int const capacity = t->getDWord(ARRAY_MAXIMUM_CAPACITY);
            if (capacity != CAPACITY_UNKNOWN) {
                node->setProperty(37, PropertyValue(Number(capacity), true));
            }
        }
        // Kept: property 301 comes from the error-information handle at
        // 0x0B, not the device count at 0x0D; the agent's reports use it so.
        propNumber16(t, ARRAY_ERROR_HANDLE, 301, node);
        SMBIOS_DETAIL(logger, "Table 16 length = " << entry.length);
    });

    SMBIOS_DETAIL(logger, "Table 17 count =" << tables[17]->size());
    unsigned int deviceIndex = 0;
    forEachStructure(SMBIOS_HERE, logger, tables, 17, [&](TableData& entry, size_t) {
        SD::SmBios::Table const* t = entry.table;
        SMBIOS_DETAIL(logger, "Table 17 length = " << entry.length);
        unsigned int const size = deviceSize(t, entry.length);
        if (size == 0) {
            return;
        }
        MutableNode* node = newNode(parentNodeId, 19, deviceIndex++);
        setMemoryDeviceProperties(*this, entry, size, node);
    });
    SMBIOS_DETAIL(logger, "makeDimmNodes exit");
}

}  // namespace IC
