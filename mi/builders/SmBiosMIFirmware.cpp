#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIFirmware");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeFirmwareNodes(TableLists /*tables*/, unsigned int /*parentId*/) {
    SMBIOS_DETAIL(logger, "makeFirmwareNodes entry");
    SMBIOS_DETAIL(logger, "makeFirmwareNodes exit");
}

bool SmBiosMI::find_first_number(char const* /*text*/, unsigned* /*out*/) { return false; }

}  // namespace IC
