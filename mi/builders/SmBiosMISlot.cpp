#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMISlot");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeSlotNodes(TableLists /*tables*/, unsigned int /*parentNodeId*/) {
    SMBIOS_DETAIL(logger, "makeSlotNodes entry");
    SMBIOS_DETAIL(logger, "makeSlotNodes exit");
}

unsigned int SmBiosMI::getCIMSlotType(unsigned int /*smbiosSlotType*/) { return 1; }

}  // namespace IC
