#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMILog");

// System Event Log (type 15) fields.
unsigned char const HANDLE = 0x02, AREA_LENGTH = 0x04, HEADER_START = 0x06, DATA_START = 0x08,
                    ACCESS_METHOD = 0x0A, LOG_STATUS = 0x0B, CHANGE_TOKEN = 0x0C,
                    ACCESS_ADDRESS = 0x10, HEADER_FORMAT = 0x14, DESCRIPTOR_COUNT = 0x15,
                    DESCRIPTOR_LENGTH = 0x16;
unsigned int const DESCRIPTORS = 0x17;

// The text a byte vector has as a property value.
std::string bytesText(std::vector<unsigned char> const& bytes) {
    return PropertyValue(bytes, true).toString();
}

}  // namespace

// One event-log node per System Event Log structure under the given parent.
// Kept: every firmware node and every BMC node gets its own node for the same
// structure, so a machine with three firmware images shows the log three
// times; the inventories agents have stored hold a log under each firmware
// node, and dropping the repeats would read as logs removed.
void SmBiosMI::makeLogNodes(TableLists tables, unsigned int parentId) {
    SMBIOS_DETAIL(logger, "make"
                              << "Log"
                              << "Nodes entry");
    forEachStructure(SMBIOS_HERE, logger, tables, 15, [&](TableData& entry, size_t k) {
        SD::SmBios::Table const* t = entry.table;
        SMBIOS_DETAIL(logger, "Table " << 15 << " length = " << entry.length);
        MutableNode* node = newNode(parentId, 35, static_cast<unsigned int>(k));
        entry.node = node;
        node->setDescription("SmBios System Event Log");
        node->setProperty(108, PropertyValue("System Management BIOS System Event Log", true));
        unsigned int const areaLength = getNumber16(t, AREA_LENGTH);
        node->setProperty(37, PropertyValue(Number(areaLength), true));
        if (areaLength == 0) {
            node->setStatus(16);
        } else {
            node->setStatus(30);
            if (getBool8(t, LOG_STATUS, 1)) {
                node->setStatus(getBool8(t, LOG_STATUS, 2) ? 31 : 1);
            }
        }
        node->setProperty(
            125, PropertyValue(
                     std::vector<Number>{Number(30u), Number(1u), Number(16u), Number(31u)}, true));

        // The header fields are only logged, but each is read whatever
        // the log thresholds: a field cut off by a short structure ends
        // this structure's handling at every level alike.
        unsigned int const handle = getNumber16(t, HANDLE);
        SMBIOS_DETAIL(logger, "Handle=" << handle);
        unsigned int const headerStart = getNumber16(t, HEADER_START);
        SMBIOS_DETAIL(logger, "Log Header Start offset=" << headerStart);
        unsigned int const dataStart = getNumber16(t, DATA_START);
        SMBIOS_DETAIL(logger, "Log Data Start offset=" << dataStart);
        unsigned int const accessMethod = getNumber8(t, ACCESS_METHOD);
        SMBIOS_DETAIL(logger, "Access Method=" << accessMethod);
        unsigned int const logStatus = getNumber8(t, LOG_STATUS);
        SMBIOS_DETAIL(logger, "Log Status=" << logStatus);
        std::vector<unsigned char> const changeToken = getBuffer(t, CHANGE_TOKEN, 4);
        SMBIOS_DETAIL(logger, "Log Change Status=" << bytesText(changeToken));
        std::vector<unsigned char> const accessAddress = getBuffer(t, ACCESS_ADDRESS, 4);
        SMBIOS_DETAIL(logger, "Access Method Address=" << bytesText(accessAddress));
        unsigned int const headerFormat = getNumber8(t, HEADER_FORMAT);
        SMBIOS_DETAIL(logger, "Log Header Format=" << headerFormat);
        unsigned int const descriptorCount = getNumber8(t, DESCRIPTOR_COUNT);
        unsigned int const descriptorLength = getNumber8(t, DESCRIPTOR_LENGTH);
        SMBIOS_DETAIL(logger, "Number of Log Type Descriptors=" << descriptorCount);
        SMBIOS_DETAIL(logger, "Log Type Descriptor Length=" << descriptorLength);
        std::vector<unsigned char> const descriptors =
            getBufferUnprot(t, DESCRIPTORS, descriptorCount * descriptorLength);
        SMBIOS_DETAIL(logger, "Log Type Descriptors=" << bytesText(descriptors));
    });
    SMBIOS_DETAIL(logger, "make"
                              << "Log"
                              << "Nodes exit");
}

}  // namespace IC
