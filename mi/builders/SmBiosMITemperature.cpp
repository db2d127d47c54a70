#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMITemperature");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeTemperatureSensorNodes(TableLists /*tables*/, unsigned int /*parentId*/, unsigned int /*location*/) {
    SMBIOS_DETAIL(logger, "makeTemperatureSensorNodes entry");
    SMBIOS_DETAIL(logger, "makeTemperatureSensorNodes exit");
}

}  // namespace IC
