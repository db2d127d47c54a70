#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIMgmtController");
}  // namespace

// One BMC node per IPMI Device Information structure under the given parent,
// with the event-log and firmware nodes under it.
void SmBiosMI::makeBMCNodes(TableLists tables, unsigned int parentId) {
    SMBIOS_DETAIL(logger, "make"
                              << "BMC"
                              << "Nodes entry");
    forEachStructure(SMBIOS_HERE, logger, tables, 38, [&](TableData& /*entry*/, size_t k) {
        SMBIOS_DETAIL(logger, "Table " << 38 << " length = " << (*tables[38])[k].length);
        MutableNode* node = newNode(parentId, 13, static_cast<unsigned int>(k));
        node->setStatus(1);
        node->setDescription("BMC");
        makeLogNodes(tables, node->getNodeId());
        makeFirmwareNodes(tables, node->getNodeId());
    });
    SMBIOS_DETAIL(logger, "make"
                              << "BMC"
                              << "Nodes exit");
}

}  // namespace IC
