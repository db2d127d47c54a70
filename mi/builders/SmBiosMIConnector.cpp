#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIConnector");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeConnectorNodes(TableLists /*tables*/, unsigned int /*parentNodeId*/) {
    SMBIOS_DETAIL(logger, "makeConnectorNodes entry");
    SMBIOS_DETAIL(logger, "makeConnectorNodes exit");
}

}  // namespace IC
