#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMICmptr");
}  // namespace

// Not built yet: logs its entry and exit only.
void SmBiosMI::makeComputerNodes(TableLists /*lists*/, unsigned int /*parentId*/) {
    SMBIOS_DETAIL(logger, "makeComputerNodes entry");
    SMBIOS_DETAIL(logger, "makeComputerNodes exit");
}

void SmBiosMI::reverse_uuid_byte_order(std::string& /*uuid*/) {
    SMBIOS_DETAIL(logger, "reverse_uuid_byte_order entry");
    SMBIOS_DETAIL(logger, "reverse_uuid_byte_order exit");
}

}  // namespace IC
