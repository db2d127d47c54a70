#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"
#include "mi/builders/SensorProbes.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMITemperature");

// Probe fields, shared by the temperature (type 28) and voltage (type 26)
// probes.
unsigned char const DESCRIPTION = 0x04, LOCATION_AND_STATUS = 0x05, MAXIMUM = 0x06, MINIMUM = 0x08,
                    OEM_DEFINED = 0x10, NOMINAL = 0x14;
// Kept: the nominal value's "unknown" is tested against 0x800, not 0x8000 as
// for the limits; the agent's sensor history was recorded with this test.
unsigned int const NOMINAL_UNKNOWN = 0x800;
unsigned int const LIMIT_UNKNOWN = 0x8000;

ProbeKind const TEMPERATURE_PROBE = {28, 22, 10.0, "Temperature in 0.1 degrees="};

}  // namespace

// One sensor node per probe at the given location, under the given parent.
// The readings are unsigned words scaled by the probe's divisor (kept: a
// negative temperature, a two's-complement word, becomes a large value).
void makeProbeNodes(SmBiosMI& mi, TableLists tables, unsigned int parentId, unsigned int location,
                    ProbeKind const& kind, QNLog::QNLogger const& probeLogger) {
    forEachStructure(
        SMBIOS_HERE, probeLogger, tables, kind.smbiosType, [&](TableData& entry, size_t k) {
            SD::SmBios::Table const* t = entry.table;
            SMBIOS_DETAIL(probeLogger, "Table " << kind.smbiosType << " length = " << entry.length);
            unsigned int const locationAndStatus = mi.getNumber8(t, LOCATION_AND_STATUS);
            if ((locationAndStatus & 0x1F) != location) {
                return;
            }
            MutableNode* node = mi.newNode(parentId, kind.nodeType, static_cast<unsigned int>(k));
            entry.node = node;
            // Kept as it stands: critical and non-recoverable run on into the
            // cases below them, so their final status is 0; the agent's
            // alerting was tuned on these statuses.
            switch ((locationAndStatus & 0xE0) >> 5) {
                case 3:  // OK
                    node->setStatus(1);
                    break;
                case 4:  // non-critical
                    node->setStatus(21);
                    break;
                case 5:  // critical
                    node->setStatus(24);
                    [[fallthrough]];
                case 6:  // non-recoverable
                    node->setStatus(27);
                    [[fallthrough]];
                default:
                    node->setStatus(0);
            }
            node->setProperty(125,
                              PropertyValue(std::vector<Number>{Number(1u), Number(0u), Number(21u),
                                                                Number(24u), Number(27u)},
                                            true));
            node->setDescription(mi.getString(t, DESCRIPTION));
            node->setProperty(31, PropertyValue(Number(locationAndStatus & 0x1F), true));
            mi.propBuffer(t, OEM_DEFINED, 4, 43, node);
            unsigned int const nominal = mi.getNumber16(t, NOMINAL);
            if (nominal != NOMINAL_UNKNOWN) {
                SMBIOS_DETAIL(probeLogger, kind.nominalLabel << nominal);
                node->setProperty(14, PropertyValue(Number(nominal / kind.divisor), true));
            }
            unsigned int const maximum = mi.getNumber16(t, MAXIMUM);
            if (maximum != LIMIT_UNKNOWN) {
                node->setProperty(23, PropertyValue(Number(maximum / kind.divisor), true));
            }
            unsigned int const minimum = mi.getNumber16(t, MINIMUM);
            if (minimum != LIMIT_UNKNOWN) {
                node->setProperty(33, PropertyValue(Number(minimum / kind.divisor), true));
            }
        });
}

// Temperature sensor nodes for the temperature probes at a location.
void SmBiosMI::makeTemperatureSensorNodes(TableLists tables, unsigned int parentId,
                                          unsigned int location) {
    // The entry and exit texts are composed of three parts, as every
    // builder's are; kept so that log searches find them the same way.
    SMBIOS_DETAIL(logger, "make"
                              << "TemperatureSensor"
                              << "Nodes entry");
    makeProbeNodes(*this, tables, parentId, location, TEMPERATURE_PROBE, logger);
    SMBIOS_DETAIL(logger, "make"
                              << "TemperatureSensor"
                              << "Nodes exit");
}

}  // namespace IC
