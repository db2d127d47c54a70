#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIRoot");
}  // namespace

// The root of the inventory tree, under the management-interface node; the
// computer-system builder, and from it every other builder, hangs below it.
void SmBiosMI::makeRootNode(TableLists lists) {
    SMBIOS_DETAIL(logger, "makeRootNode entry");
    try {
        MutableNode* root = newNode(miId, 59, 0);
        root->setStatus(1);
        root->setDescription("ROOT Node");
        makeComputerNodes(lists, root->getNodeId());
    } catch (...) {
        SMBIOS_ERROR(logger, "Error in node creation");
    }
    SMBIOS_DETAIL(logger, "makeRootNode exit");
}

}  // namespace IC
