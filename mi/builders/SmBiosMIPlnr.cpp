#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIPlnr");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makePlanarNodes(TableLists /*tables*/, unsigned int /*parentNodeId*/) {
    SMBIOS_DETAIL(logger, "makePlanarNodes entry");
    SMBIOS_DETAIL(logger, "makePlanarNodes exit");
}

}  // namespace IC
