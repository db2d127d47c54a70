#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIDiskCtrlr");

unsigned char const OEM_COUNT = 0x04;
char const* const IDE_ENABLED = "$IS IDE Bus Enabled";
char const* const IDE_DISABLED = "$IS IDE Bus Disabled";

// The text without its trailing blanks; a text of blanks only stays as it is.
std::string withoutTrailingBlanks(std::string const& text) {
    size_t const last = text.find_last_not_of(' ');
    return last == std::string::npos ? text : text.substr(0, last + 1);
}

}  // namespace

// The on-board IDE bus, announced by an OEM string: one disk-controller node
// per OEM Strings structure that holds "$IS IDE Bus Enabled" or "... Disabled".
// Every OEM Strings structure uses up a node id, whether it makes a node or not.
void SmBiosMI::makeDiskControllerNodes(TableLists tables, unsigned int parentId) {
    SMBIOS_DETAIL(logger, "make"
                              << "DiskController"
                              << "Nodes entry");
    // Kept: a failure here is logged as one of table 8; log searches expect it.
    forEachStructure(SMBIOS_HERE, logger, tables, 11, 8, [&](TableData& entry, size_t) {
        SD::SmBios::Table const* t = entry.table;
        unsigned int const count = getNumber8(t, OEM_COUNT);
        // Kept: every structure uses up a node id before its strings are
        // looked at, so one without the IDE string leaves a gap in the ids;
        // the agent's stored trees carry these ids.
        unsigned int const nodeId = takeNodeId();
        if (count == 0) {
            return;
        }
        for (unsigned int i = 1; i <= count; ++i) {
            std::string const text =
                withoutTrailingBlanks(getStrByIdx(t, static_cast<unsigned char>(i)));
            bool const enabled = text == IDE_ENABLED;
            if (!enabled && text != IDE_DISABLED) {
                continue;
            }
            // Kept: the index is always 1.
            MutableNode* node =
                addNode(std::make_unique<MutableNode>(nodeId, parentId, miIdList, 50, 1));
            entry.node = node;
            node->setProperty(125,
                              PropertyValue(std::vector<Number>{Number(1u), Number(16u)}, true));
            node->setProperty(85, PropertyValue(Number(0u), true));
            node->setProperty(185, PropertyValue(Number(36u), true));
            node->setProperty(81, PropertyValue(Number(2u), true));
            node->setStatus(enabled ? 1 : 16);
            node->setProperty(128, PropertyValue("IDE Bus", true));
            node->setDescription("IDE Bus");
            node->setProperty(44, PropertyValue("Other", true));
            break;
        }
    });
    SMBIOS_DETAIL(logger, "make"
                              << "DiskController"
                              << "Nodes exit");
}

}  // namespace IC
