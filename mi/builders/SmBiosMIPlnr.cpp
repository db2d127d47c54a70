#include <memory>

#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIPlnr");

// The builders a planar node runs under it, in order. Kept: the two orders
// differ (without a baseboard structure the firmware comes before the disk
// controller and the raw tables last); node ids, and so the agent's stored
// inventory, follow them.
using PlanarBuilder = void (SmBiosMI::*)(TableLists, unsigned int);
PlanarBuilder const BARE_PLANAR_ORDER[] = {
    &SmBiosMI::makeCpuNodes,  &SmBiosMI::makeSlotNodes,        &SmBiosMI::makeConnectorNodes,
    &SmBiosMI::makeDimmNodes, &SmBiosMI::makeFirmwareNodes,    &SmBiosMI::makeDiskControllerNodes,
    &SmBiosMI::makeKVDNode,   &SmBiosMI::makeSMBIOSTableNodes,
};
PlanarBuilder const BASEBOARD_PLANAR_ORDER[] = {
    &SmBiosMI::makeCpuNodes,
    &SmBiosMI::makeSlotNodes,
    &SmBiosMI::makeConnectorNodes,
    &SmBiosMI::makeDimmNodes,
    &SmBiosMI::makeDiskControllerNodes,
    &SmBiosMI::makeSMBIOSTableNodes,
    &SmBiosMI::makeFirmwareNodes,
    &SmBiosMI::makeKVDNode,
};

template <size_t N>
void runBuilders(SmBiosMI& mi, PlanarBuilder const (&order)[N], TableLists tables,
                 unsigned int planarId) {
    for (PlanarBuilder builder : order) {
        (mi.*builder)(tables, planarId);
    }
}

// Baseboard Information (type 2) fields.
unsigned char const HANDLE = 0x02, MANUFACTURER = 0x04, PRODUCT = 0x05;
// Kept: the Version string (0x06) is deliberately not read; the planar nodes
// that agents have stored carry no version, and adding one would change them.
unsigned char const SERIAL = 0x07, ASSET_TAG = 0x08, FEATURE_FLAGS = 0x09, LOCATION = 0x0A,
                    CHASSIS_HANDLE = 0x0B, BOARD_TYPE = 0x0D, CONTAINED_COUNT = 0x0E;
unsigned int const CONTAINED_HANDLES = 0x0F;

// Which baseboard becomes the planar: the first of these board types found
// in the list, in this order of preference. Kept: the preference order, not
// the list order, decides (a motherboard listed after a server blade wins),
// and the other baseboards get no node; the agent expects one planar.
unsigned int const BOARD_PRIORITY[] = {0x0A, 0x03, 0x0B, 0x0C, 0x06, 0x02, 0x09,
                                       0x05, 0x08, 0x07, 0x04, 0x0D, 0x01};

void makeBarePlanarNode(SmBiosMI& mi, TableLists tables, unsigned int parentNodeId) {
    MutableNode* node = mi.newNode(parentNodeId, 41, 0);
    node->setStatus(1);
    node->setDescription("Planar");
    unsigned int const planarId = node->getNodeId();
    runBuilders(mi, BARE_PLANAR_ORDER, tables, planarId);
}

size_t chooseBaseboard(SmBiosMI const& mi, TableLists tables) {
    for (unsigned int boardType : BOARD_PRIORITY) {
        for (size_t k = 0; k < tables[2]->size(); ++k) {
            if (mi.getNumber8((*tables[2])[k].table, BOARD_TYPE) == boardType) {
                return k;
            }
        }
    }
    return 0;
}

void logContainedHandles(SmBiosMI const& mi, SD::SmBios::Table const* t, TableLists groups) {
    unsigned int const count = mi.getNumber8(t, CONTAINED_COUNT);
    SMBIOS_DETAIL(logger, "Count of contained object handles=" << count);
    if (count == 0) {
        return;
    }
    unsigned int const needed = 15 + 2 * count;
    if (needed > 255) {
        SMBIOS_DETAIL(
            logger, "Length of contained object handles " << needed << " exceeds 255 table length");
        return;
    }
    std::vector<unsigned int> handles;
    std::string listed;
    for (unsigned int i = 0; i < count; ++i) {
        handles.push_back(mi.getNumber16(t, static_cast<unsigned char>(CONTAINED_HANDLES + 2 * i)));
        listed += std::to_string(handles.back()) + " ";
    }
    SMBIOS_DETAIL(logger, "Handles="
                              << "{ " << listed << "}");
    for (unsigned int contained : handles) {
        bool found = false;
        for (unsigned int type = 0; type < 256 && !found; ++type) {
            for (TableData const& member : *groups[type]) {
                if (mi.getNumber16(member.table, HANDLE) == contained) {
                    unsigned int const memberType = member.table->getByte(0);
                    SMBIOS_DETAIL(logger, "Planar contained element handle "
                                              << contained << " found in Bios table "
                                              << memberType);
                    found = true;
                    break;
                }
            }
        }
        if (!found) {
            SMBIOS_DETAIL(logger, "Planar contained element handle "
                                      << contained << " not found in Bios tables ");
        }
    }
}

void logGroupAssociations(SmBiosMI& mi, TableLists groups, unsigned int handle) {
    // The baseboard's handle goes where the lookup takes a type, and 2 where
    // it takes a handle: the lookup serves the log only.
    std::vector<std::pair<unsigned char, unsigned int>> const associations =
        mi.findGroup(groups, handle, 2);
    if (!associations.empty()) {
        SMBIOS_DETAIL(logger, " Planar Group Associations Exist: ");
        for (auto const& member : associations) {
            SMBIOS_DETAIL(logger, "    Table Type=" << static_cast<unsigned int>(member.first)
                                                    << " Handle=" << member.second);
        }
    }
}

// A text the planar shares with its chassis, set on both when there is one.
void setOnPlanarAndChassis(MutableNode* node, Node* parent, unsigned int id,
                           std::string const& text) {
    if (!text.empty()) {
        node->setProperty(id, PropertyValue(text, true));
        parent->setProperty(id, PropertyValue(text, true));
    }
}

void makeBaseboardPlanarNode(SmBiosMI& mi, TableLists tables, TableData& entry, Node* parent,
                             unsigned int parentNodeId, StructureGroups& owned) {
    SD::SmBios::Table const* t = entry.table;
    SMBIOS_DETAIL(logger, "Table 2 length = " << entry.length);
    MutableNode* node = mi.newNode(parentNodeId, 41, 0);
    entry.node = node;
    node->setStatus(1);
    node->setDescription("Planar");
    unsigned int const planarId = node->getNodeId();
    unsigned int const handle = mi.getNumber16(t, HANDLE);

    mi.propString(t, MANUFACTURER, 36, node);
    mi.propString(t, PRODUCT, 39, node);
    std::string const product = mi.getString(t, PRODUCT);
    setOnPlanarAndChassis(node, parent, 172, product);
    mi.propString(t, SERIAL, 50, node);
    mi.propString(t, ASSET_TAG, 2, node);
    mi.propEnumValue(t, FEATURE_FLAGS, 44, node);
    std::string const location = mi.getString(t, LOCATION);
    setOnPlanarAndChassis(node, parent, 31, location);
    // Read whatever the log thresholds: a chassis handle cut off by a short
    // structure ends the planar here at every level alike.
    unsigned int const chassisHandle = mi.getNumber16(t, CHASSIS_HANDLE);
    SMBIOS_DETAIL(logger, "Handle=" << chassisHandle);
    node->setProperty(128, PropertyValue(Number(mi.getNumber8(t, BOARD_TYPE)), true));

    // The planar takes every structure over into groups of its own; the
    // shared groups are left empty. Each group moves whole, in its order.
    owned.takeOver(tables);
    TableLists const groups = owned.lists();
    logContainedHandles(mi, t, groups);
    logGroupAssociations(mi, groups, handle);

    runBuilders(mi, BASEBOARD_PLANAR_ORDER, groups, planarId);
    logStructureLists(logger, groups);
}

}  // namespace

// The planar (baseboard) node under the chassis chosen as its home, and the
// hub of the component builders: they all hang under the planar. With a
// baseboard structure the planar takes the structures over into groups of
// its own; without one a bare planar node is made and the builders run, in
// another order, on the shared groups.
void SmBiosMI::makePlanarNodes(TableLists tables, unsigned int parentNodeId) {
    SMBIOS_DETAIL(logger, "makePlanarNodes entry");
    std::string manufacturer = "Bios system information table does not exist";
    if (tables[1]->empty()) {
        SMBIOS_DETAIL(logger,
                      "makePlanarNodes Smbios required system information table does not exist");
    } else {
        manufacturer = getString((*tables[1])[0].table, 0x04);
        SMBIOS_DETAIL(logger, "makePlanarNodes system manufacturer = " << manufacturer);
    }

    Node* parent = nullptr;
    for (Node* candidate : nodeList) {
        if (candidate->getNodeId() == parentNodeId) {
            parent = candidate;
            break;
        }
    }
    if (parent == nullptr) {
        SMBIOS_DETAIL(
            logger, "makePlanarNodes Exit: failed to find parent node for nodeid " << parentNodeId);
        return;
    }
    if (manufacturer.empty()) {
        PropertyValue value;
        if (parent->getProperty(36, value).getStatus() == 0) {
            manufacturer = value.getString();
        }
        SMBIOS_DETAIL(logger, "makePlanarNodes chassis manufacturer = " << manufacturer);
    }

    if (tables[2]->empty()) {
        SMBIOS_DETAIL(logger, "No Table 2 for Planar");
        guardStructure(SMBIOS_HERE, logger, 2, 0,
                       [&] { makeBarePlanarNode(*this, tables, parentNodeId); });
    } else {
        size_t const chosen = chooseBaseboard(*this, tables);
        StructureGroups owned;
        guardStructure(SMBIOS_HERE, logger, 2, chosen, [&] {
            makeBaseboardPlanarNode(*this, tables, (*tables[2])[chosen], parent, parentNodeId,
                                    owned);
        });
    }
    SMBIOS_DETAIL(logger, "makePlanarNodes exit");
}

}  // namespace IC
