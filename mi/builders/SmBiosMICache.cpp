#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMICache");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeCacheNodes(TableLists /*tables*/, unsigned int /*parentNodeId*/, unsigned int /*handle*/) {
    SMBIOS_DETAIL(logger, "makeCacheNodes entry");
    SMBIOS_DETAIL(logger, "makeCacheNodes exit");
}

}  // namespace IC
