#include <algorithm>
#include <cctype>

#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"
#include "mi/builders/DecodeTable.h"
#include "mi/builders/SmBiosMICmptr.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIChsss");

// Kept: without a System Information structure, the system's maker, model
// and serial number texts of every chassis are this sentence.
char const* const NO_SYSTEM_TABLE = "Bios system information table does not exist";

// System Enclosure or Chassis (type 3) fields.
unsigned char const MANUFACTURER = 0x04, TYPE = 0x05, VERSION = 0x06, SERIAL = 0x07,
                    ASSET_TAG = 0x08, BOOT_UP_STATE = 0x09, POWER_SUPPLY_STATE = 0x0A,
                    THERMAL_STATE = 0x0B, SECURITY_STATUS = 0x0C, OEM_DEFINED = 0x0D, HEIGHT = 0x11,
                    POWER_CORDS = 0x12, ELEMENT_COUNT = 0x13, ELEMENT_RECORD_LENGTH = 0x14;
unsigned int const ELEMENTS = 0x15;

unsigned int const EXPANSION_CHASSIS = 0x12;

// What a chassis type becomes: the package type (property 11), the kind of
// enclosure (213), the name (108, null: "Chassis") and whether it is a main
// chassis, one that may hold the baseboard.
struct ChassisKind {
    unsigned int packageType;
    unsigned int enclosure;
    char const* name;
    bool mainChassis;
};

// Kept as they stand: Rack Mount and Blade give package type 0x11,
// Multi-system 1, Blade Enclosure 0x1C and is no main chassis; the agent's
// chassis reports depend on these values. The Expansion Chassis row is never
// used: such a structure is skipped before its node is made.
constexpr decode::Row<ChassisKind> CHASSIS_KINDS[] = {
    {0x07, {0x07, 3, "Tower Chassis", true}},
    {0x11, {0x11, 3, "Main Server Chassis", true}},
    {0x12, {0x12, 3, "Expansion Chassis", false}},
    {0x17, {0x11, 3, "Rack Mount Chassis", true}},
    {0x19, {0x01, 3, "Multi System Chassis", true}},
    {0x1C, {0x11, 16, "Blade Chassis", true}},
    {0x1D, {0x1C, 17, "Blade Enclosure Chassis", false}},
};

// Any other type keeps its own code as the package type (0 for the codes
// below 0x03 and above 0x1D), a plain enclosure and the name "Chassis".
ChassisKind chassisKind(unsigned int type) {
    ChassisKind const other = {type <= 0x02 || type > 0x1D ? 0u : type, 3, nullptr, false};
    return decode::lookup(CHASSIS_KINDS, type, other);
}

// Baseboard types that make a chassis the planar's home when it contains
// one: Server Blade, Daughter board, Motherboard.
bool holdsBaseboard(unsigned int element) { return element == 3 || element == 9 || element == 10; }

std::string lowerCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return text;
}

// Maker, part number, chassis lock and name (108: kindName, or "Chassis").
void setChassisIdentity(SmBiosMI& mi, SD::SmBios::Table const* t, MutableNode* node,
                        std::string const& systemManufacturer, std::string const& systemProduct,
                        unsigned int type, char const* kindName) {
    std::string manufacturer = mi.getString(t, MANUFACTURER);
    if (manufacturer.empty() || manufacturer == " " || manufacturer == "none") {
        manufacturer = systemManufacturer;
    }
    node->setProperty(36, PropertyValue(manufacturer, true));
    std::string const partNumber = getPartNum(systemProduct);
    if (!partNumber.empty()) {
        node->setProperty(45, PropertyValue(partNumber, true));
    }
    mi.propBool8(t, TYPE, 0x80, 10, node);

    SMBIOS_DETAIL(logger, "Chassis Type = " << type);
    node->setProperty(108, PropertyValue("Chassis", true));
    if (kindName != nullptr) {
        node->setProperty(108, PropertyValue(kindName, true));
    }
}

// Model, package type, enclosure, version, serial number (the system's
// where the chassis has none), asset tag, states, OEM bytes, height and
// power cords.
void setChassisState(SmBiosMI& mi, SD::SmBios::Table const* t, MutableNode* node,
                     std::string const& systemProduct, std::string const& systemSerial,
                     unsigned int packageType, unsigned int enclosure) {
    node->setProperty(39, PropertyValue(systemProduct, true));
    node->setProperty(11, PropertyValue(EnumValue(packageType), true));
    node->setProperty(213, PropertyValue(EnumValue(enclosure), true));
    mi.propString(t, VERSION, 307, node);

    std::string serial = mi.getString(t, SERIAL);
    if (serial.empty() || serial == " " || lowerCase(serial) == "none") {
        serial = systemSerial;
    }
    node->setProperty(50, PropertyValue(serial, true));

    mi.propString(t, ASSET_TAG, 2, node);
    mi.propEnumValue(t, BOOT_UP_STATE, 4, node);
    mi.propEnumValue(t, POWER_SUPPLY_STATE, 46, node);
    mi.propEnumValue(t, THERMAL_STATE, 60, node);
    mi.propEnumValue(t, SECURITY_STATUS, 49, node);
    mi.propBuffer(t, OEM_DEFINED, 4, 43, node);
    mi.propNumber8(t, HEIGHT, 21, node);
    mi.propNumber8(t, POWER_CORDS, 42, node);
}

// Whether a contained element is a baseboard type that makes the chassis
// the planar's home. A record's first byte is an SMBIOS structure type
// (bit 7 set) or a baseboard type; the records are read as they stand, even
// past the structure's end.
bool containsBaseboard(SmBiosMI const& mi, SD::SmBios::Table const* t) {
    unsigned int const count = mi.getNumber8(t, ELEMENT_COUNT);
    unsigned int const recordLength = mi.getNumber8(t, ELEMENT_RECORD_LENGTH);
    SMBIOS_DETAIL(logger, "Contained Element Record count=" << count);
    SMBIOS_DETAIL(logger, "Contained Element Record Length=" << recordLength);
    if (count == 0 || recordLength == 0) {
        SMBIOS_DETAIL(logger, " < NONE > ");
        return false;
    }
    bool baseboard = false;
    std::string elements;
    for (unsigned int r = 0; r < count; ++r) {
        unsigned int const element = mi.getNumber8Unprot(t, ELEMENTS + r * recordLength);
        if ((element & 0x80) != 0) {
            elements += " " + std::to_string(element & 0x7F);
        } else {
            elements += " " + std::to_string(element);
            baseboard = baseboard || holdsBaseboard(element);
        }
    }
    SMBIOS_DETAIL(logger, "Contained Elements=" << elements);
    return baseboard;
}

}  // namespace

// One chassis node per System Enclosure structure (Expansion Chassis
// excepted) under the computer system, with the system's texts where the
// chassis leaves its own empty; then the planar builder, once, under the
// chassis chosen as the baseboard's home: the last chassis that contains a
// baseboard, else the first main chassis, else the first chassis.
void SmBiosMI::makeChassisNodes(TableLists lists, unsigned int parentId) {
    SMBIOS_DETAIL(logger, "makeChassisNodes entry");
    std::string systemManufacturer = NO_SYSTEM_TABLE;
    std::string systemProduct = NO_SYSTEM_TABLE;
    std::string systemSerial = NO_SYSTEM_TABLE;
    if (lists[1]->empty()) {
        SMBIOS_DETAIL(logger,
                      "makeChassisNodes Smbios required system information table does not exist");
    } else {
        SD::SmBios::Table const* system = (*lists[1])[0].table;
        systemManufacturer = getString(system, 0x04);
        systemProduct = getString(system, 0x05);
        systemSerial = getString(system, 0x07);
        SMBIOS_DETAIL(logger, "makeChassisNodes System model = "
                                  << systemProduct << " system serial = " << systemSerial);
    }
    if (lists[3]->empty()) {
        SMBIOS_DETAIL(logger, "makeChassisNodes exit");
        return;
    }

    unsigned int planarParentId = 0;
    bool mainChassis = false;
    bool homeFound = false;
    forEachStructure(SMBIOS_HERE, logger, lists, 3, [&](TableData& entry, size_t i) {
        SD::SmBios::Table const* t = entry.table;
        SMBIOS_DETAIL(logger, "Table 3 length = " << entry.length);
        unsigned int const type = getEnumValue(t, TYPE, 0x7F);
        if (type == EXPANSION_CHASSIS) {
            return;
        }
        MutableNode* node = newNode(parentId, 1, static_cast<unsigned int>(i));
        entry.node = node;
        node->setStatus(1);
        node->setDescription("Chassis");
        unsigned int const nodeId = node->getNodeId();
        ChassisKind const kind = chassisKind(type);
        setChassisIdentity(*this, t, node, systemManufacturer, systemProduct, type, kind.name);

        if (kind.mainChassis) {
            mainChassis = true;
        }
        if (i == 0) {
            planarParentId = nodeId;
        }
        if (mainChassis && !homeFound) {
            planarParentId = nodeId;
            homeFound = true;
        }

        setChassisState(*this, t, node, systemProduct, systemSerial, kind.packageType,
                        kind.enclosure);
        if (containsBaseboard(*this, t)) {
            planarParentId = nodeId;
            homeFound = true;
        }
    });
    makePlanarNodes(lists, planarParentId);
    SMBIOS_DETAIL(logger, "makeChassisNodes exit");
}

}  // namespace IC
