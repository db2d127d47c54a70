#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIMgmtController");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeBMCNodes(TableLists /*tables*/, unsigned int /*parentId*/) {
    SMBIOS_DETAIL(logger, "makeBMCNodes entry");
    SMBIOS_DETAIL(logger, "makeBMCNodes exit");
}

}  // namespace IC
