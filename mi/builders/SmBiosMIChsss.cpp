#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIChsss");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeChassisNodes(TableLists /*lists*/, unsigned int /*parentId*/) {
    SMBIOS_DETAIL(logger, "makeChassisNodes entry");
    SMBIOS_DETAIL(logger, "makeChassisNodes exit");
}

}  // namespace IC
