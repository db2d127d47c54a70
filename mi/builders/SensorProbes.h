// What the temperature and voltage sensor builders share: one builder turns
// the probes of one kind at a location into sensor nodes. Private to the
// plug-in.
#pragma once

#include "QNLog/QNLogger.h"
#include "mi/SmBiosMI.h"

namespace IC {

// A kind of probe: its SMBIOS structure type, the node type of its sensors,
// the divisor that turns a raw reading into the sensor's unit, and the log
// label of the nominal value.
struct ProbeKind {
    unsigned int smbiosType;
    unsigned int nodeType;
    double divisor;
    char const* nominalLabel;
};

// One sensor node per probe of kind at location, under parentId, logged
// through probeLogger (the calling builder's).
void makeProbeNodes(SmBiosMI& mi, TableLists tables, unsigned int parentId, unsigned int location,
                    ProbeKind const& kind, QNLog::QNLogger const& probeLogger);

}  // namespace IC
