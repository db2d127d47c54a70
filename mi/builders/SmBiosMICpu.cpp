#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMICpu");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeCpuNodes(TableLists /*tables*/, unsigned int /*parentNodeId*/) {
    SMBIOS_DETAIL(logger, "makeCpuNodes entry");
    SMBIOS_DETAIL(logger, "makeCpuNodes exit");
}

}  // namespace IC
