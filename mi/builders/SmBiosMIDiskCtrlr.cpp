#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIDiskCtrlr");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeDiskControllerNodes(TableLists /*tables*/, unsigned int /*parentId*/) {
    SMBIOS_DETAIL(logger, "makeDiskControllerNodes entry");
    SMBIOS_DETAIL(logger, "makeDiskControllerNodes exit");
}

}  // namespace IC
