#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIDiag");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeKVDNode(TableLists /*tables*/, unsigned int /*parentId*/) {
    SMBIOS_DETAIL(logger, "makeKVDNode entry");
    SMBIOS_DETAIL(logger, "makeKVDNode exit");
}

}  // namespace IC
