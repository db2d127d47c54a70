#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIVoltage");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeVoltageSensorNodes(TableLists /*tables*/, unsigned int /*parentId*/, unsigned int /*location*/) {
    SMBIOS_DETAIL(logger, "makeVoltageSensorNodes entry");
    SMBIOS_DETAIL(logger, "makeVoltageSensorNodes exit");
}

}  // namespace IC
