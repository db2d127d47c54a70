#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIDimm");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeDimmNodes(TableLists /*tables*/, unsigned int /*parentNodeId*/) {
    SMBIOS_DETAIL(logger, "makeDimmNodes entry");
    SMBIOS_DETAIL(logger, "makeDimmNodes exit");
}

}  // namespace IC
