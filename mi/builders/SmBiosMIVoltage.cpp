#include "mi/SmBiosMI.h"
#include "mi/builders/SensorProbes.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIVoltage");

ProbeKind const VOLTAGE_PROBE = {26, 21, 1000.0, "Millivolts="};
}  // namespace

// Voltage sensor nodes for the voltage probes at a location.
void SmBiosMI::makeVoltageSensorNodes(TableLists tables, unsigned int parentId,
                                      unsigned int location) {
    SMBIOS_DETAIL(logger, "make"
                              << "VoltageSensor"
                              << "Nodes entry");
    makeProbeNodes(*this, tables, parentId, location, VOLTAGE_PROBE, logger);
    SMBIOS_DETAIL(logger, "make"
                              << "VoltageSensor"
                              << "Nodes exit");
}

}  // namespace IC
