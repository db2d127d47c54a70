#include <iterator>
#include <map>

#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMISlot");

// System Slots (type 9) fields.
unsigned char const DESIGNATION = 0x04, SLOT_TYPE = 0x05, SLOT_ID = 0x09;

// SMBIOS slot type to the agent's slot type.
constexpr std::pair<unsigned int, unsigned int> SLOT_TYPES[] = {
    {0x01, 1},  {0x02, 0},  {0x03, 1},  {0x04, 1},  {0x05, 1},  {0x06, 16}, {0x07, 1},
    {0x08, 1},  {0x09, 1},  {0x0A, 7},  {0x0B, 7},  {0x0C, 7},  {0x0D, 1},  {0x0E, 16},
    {0x0F, 1},  {0x10, 1},  {0x11, 1},  {0x12, 17}, {0x13, 1},  {0xA0, 1},  {0xA1, 1},
    {0xA2, 1},  {0xA3, 1},  {0xA4, 1},  {0xA5, 18}, {0xA6, 19}, {0xA7, 20}, {0xA8, 21},
    {0xA9, 22}, {0xAA, 23}, {0xAB, 18}, {0xAC, 19}, {0xAD, 20}, {0xAE, 21}, {0xAF, 22},
    {0xB0, 23}, {0xB1, 18}, {0xB2, 19}, {0xB3, 20}, {0xB4, 21}, {0xB5, 22}, {0xB6, 23},
};

// Filled once at load time, in table order; the codes are unique.
std::map<unsigned int, unsigned int> makeSlotMap() {
    return std::map<unsigned int, unsigned int>(std::begin(SLOT_TYPES), std::end(SLOT_TYPES));
}

}  // namespace

namespace SMBIOS_MI_SLOT {
std::map<unsigned int, unsigned int> const slotMap = makeSlotMap();
}  // namespace SMBIOS_MI_SLOT

// The agent's slot type of an SMBIOS slot type; 1 (other) for a type the map
// does not hold.
unsigned int SmBiosMI::getCIMSlotType(unsigned int smbiosSlotType) {
    auto const entry = SMBIOS_MI_SLOT::slotMap.find(smbiosSlotType);
    return entry != SMBIOS_MI_SLOT::slotMap.end() ? entry->second : 1;
}

// One node per System Slots structure, under the planar.
void SmBiosMI::makeSlotNodes(TableLists tables, unsigned int parentNodeId) {
    SMBIOS_DETAIL(logger, "makeSlotNodes entry");
    forEachStructure(SMBIOS_HERE, logger, tables, 9, [&](TableData& entry, size_t i) {
        SD::SmBios::Table const* t = entry.table;
        SMBIOS_DETAIL(logger, "Table " << 9 << " length = " << entry.length);
        MutableNode* node = newNode(parentNodeId, 62, static_cast<unsigned int>(i));
        entry.node = node;
        node->setStatus(1);
        node->setDescription("System Slot");
        propString(t, DESIGNATION, 108, node);
        unsigned int const slotType = getCIMSlotType(getNumber8(t, SLOT_TYPE));
        node->setProperty(128, PropertyValue(EnumValue(slotType), true));
        node->setProperty(270, PropertyValue(Number(getNumber16(t, SLOT_ID)), true));
    });
    SMBIOS_DETAIL(logger, "makeSlotNodes exit");
}

}  // namespace IC
