#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMILog");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeLogNodes(TableLists /*tables*/, unsigned int /*parentId*/) {
    SMBIOS_DETAIL(logger, "makeLogNodes entry");
    SMBIOS_DETAIL(logger, "makeLogNodes exit");
}

}  // namespace IC
