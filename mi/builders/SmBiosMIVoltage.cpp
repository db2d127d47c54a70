#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIVoltage");
}  // namespace

SmBiosMI::ProbeKind const SmBiosMI::voltageProbe = {26, 21, 1000.0, "Millivolts="};

// Voltage sensor nodes for the voltage probes at a location.
void SmBiosMI::makeVoltageSensorNodes(TableLists tables, unsigned int parentId,
                                      unsigned int location) {
    SMBIOS_DETAIL(logger, "make"
                              << "VoltageSensor"
                              << "Nodes entry");
    makeProbeNodes(tables, parentId, location, voltageProbe, logger);
    SMBIOS_DETAIL(logger, "make"
                              << "VoltageSensor"
                              << "Nodes exit");
}

}  // namespace IC
