#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIConnector");

// Port Connector Information (type 8) fields.
unsigned char const INTERNAL_DESIGNATOR = 0x04;
unsigned char const PORT_TYPE = 0x08;

// Only connectors whose internal designator names this become nodes.
char const* const REPORTED_CONNECTOR = "Compute ITE";
}  // namespace

// One node per port connector whose internal designator contains
// "Compute ITE", under the planar.
void SmBiosMI::makeConnectorNodes(TableLists tables, unsigned int parentNodeId) {
    SMBIOS_DETAIL(logger, "makeConnectorNodes entry");
    forEachStructure(SMBIOS_HERE, logger, tables, 8, [&](TableData& entry, size_t i) {
        SD::SmBios::Table const* t = entry.table;
        SMBIOS_DETAIL(logger, "Table " << 8 << " length = " << entry.length);
        std::string const designator = getString(t, INTERNAL_DESIGNATOR);
        if (designator.find(REPORTED_CONNECTOR) == std::string::npos) {
            return;
        }
        MutableNode* node = newNode(parentNodeId, 70, static_cast<unsigned int>(i));
        entry.node = node;
        node->setStatus(1);
        node->setDescription("Port Connector");
        node->setProperty(108, PropertyValue(designator, true));
        unsigned char const portType = static_cast<unsigned char>(getNumber8(t, PORT_TYPE));
        node->setProperty(128, PropertyValue(EnumValue(portType), true));
    });
    SMBIOS_DETAIL(logger, "makeConnectorNodes exit");
}

}  // namespace IC
