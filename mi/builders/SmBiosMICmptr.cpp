#include "mi/builders/SmBiosMICmptr.h"

#include <ctime>
#include <iostream>

#include "IC/PropertyValue.h"
#include "SD/PlatformUtilities.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMICmptr");

// System Information (type 1) fields.
unsigned char const MANUFACTURER = 0x04, PRODUCT = 0x05, VERSION = 0x06, SERIAL = 0x07, UUID = 0x08,
                    UUID_SIZE = 16, WAKE_UP = 0x18, SKU = 0x19, FAMILY = 0x1A;

// The local offset from UTC in whole hours, truncated toward zero.
double timeZoneHours() {
    std::time_t const now = std::time(nullptr);
    std::tm local = {};
    localtime_r(&now, &local);
    long const hours = local.tm_gmtoff / 3600;
    return static_cast<double>(hours);
}

bool isDigit(char c) { return c >= '0' && c <= '9'; }

}  // namespace

CmptrNode::CmptrNode(unsigned int nodeId, unsigned int linkedId, std::vector<unsigned int> miIds,
                     unsigned int nodeType, unsigned int index)
    : MutableNode(nodeId, linkedId, miIds, nodeType, index) {}

CmptrNode::~CmptrNode() = default;

Error CmptrNode::getProperty(unsigned int id, PropertyValue& value) const {
    SMBIOS_DETAIL(logger, "getProperty entry");
    Error const result(0, Number(Number::NONE), "");
    if (id == 126) {
        value = PropertyValue(Number(Number::DATETIME), true);
        SMBIOS_DETAIL(logger, "   Time=" << value);
        return result;
    }
    if (id == 127) {
        value = PropertyValue(Number(timeZoneHours()), true);
        SMBIOS_DETAIL(logger, "   Timezone=" << value);
        return result;
    }
    Error const inherited = MutableNode::getProperty(id, value);
    SMBIOS_DETAIL(logger, "getProperty exit");
    return inherited;
}

std::string getPartNum(std::string const& name) {
    SMBIOS_DETAIL(logger, "getPartNum entry " << name);
    std::string result;
    size_t const bracket = name.find('[');
    size_t const start =
        bracket != std::string::npos && bracket + 5 < name.size() ? bracket + 1 : 0;
    for (size_t i = start; i < start + 4; ++i) {
        if (i >= name.size() || !isDigit(name[i])) {
            return std::string();
        }
        result += name[i];
    }
    return result;
}

// One computer-system node per System Information structure, under the
// root; each starts the chassis builder under itself. The list is walked by
// position with its size read again at every step: the planar builder,
// reached from the chassis builder, empties the shared lists meanwhile.
void SmBiosMI::makeComputerNodes(TableLists lists, unsigned int parentId) {
    SMBIOS_DETAIL(logger, "makeComputerNodes entry");
    forEachStructure(SMBIOS_HERE, logger, lists, 1, [&](TableData& /*entry*/, size_t p) {
        SD::SmBios::Table const* t = (*lists[1])[p].table;
        SMBIOS_DETAIL(logger, "Table 1 length = " << (*lists[1])[p].length);
        unsigned int const nodeId = takeNodeId();
        CmptrNode* node = addNode(std::make_unique<CmptrNode>(nodeId, parentId, miIdList, 40,
                                                              static_cast<unsigned int>(p)));
        node->setStatus(1);
        node->setDescription("Computer System");

        node->setProperty(
            125, PropertyValue(std::vector<Number>{Number(1u), Number(9u), Number(12u)}, true));
        node->setProperty(126, PropertyValue(Number(Number::DATETIME), true));
        node->setProperty(127, PropertyValue(Number(timeZoneHours()), true));

        propString(t, MANUFACTURER, 36, node);
        std::string const product = getString(t, PRODUCT);
        node->setProperty(39, PropertyValue(product, true));
        node->setProperty(45, PropertyValue(getPartNum(product), true));
        propString(t, VERSION, 307, node);
        propString(t, SERIAL, 50, node);

        std::vector<unsigned char> const uuidBytes = getBuffer(t, UUID, UUID_SIZE);
        std::string uuid;
        if (uuidBytes.size() == UUID_SIZE) {
            std::string const raw(uuidBytes.begin(), uuidBytes.end());
            uuid = SD::PlatformUtilities::uuid_unparse(raw.data(), static_cast<int>(raw.size()));
        }
        if (uuid.empty()) {
            SMBIOS_DETAIL(logger, "PlatformUtilities::uuid_unparse error ");
        } else {
            reverse_uuid_byte_order(uuid);
            node->setProperty(64, PropertyValue(uuid, true));
        }

        propEnumValue(t, WAKE_UP, 65, node);
        propString(t, SKU, 52, node);
        propString(t, FAMILY, 20, node);

        makeChassisNodes(lists, nodeId);

        unsigned int const handle = getNumber16(t, 2);
        for (auto const& member : findGroup(lists, 1, handle)) {
            std::cout << "Computer Node group member  Type="
                      << static_cast<unsigned int>(member.first) << " Handle=" << member.second
                      << std::endl;
        }
    });
    SMBIOS_DETAIL(logger, "makeComputerNodes exit");
}

// SMBIOS 2.6 and later store the first three UUID fields little-endian;
// their text is rewritten into the byte order people read.
void SmBiosMI::reverse_uuid_byte_order(std::string& uuid) {
    SMBIOS_DETAIL(logger, "reverse_uuid_byte_order entry");
    SD::SmBios const smbios;
    smbiosMajorVersion = smbios.getMajorVersion();
    smbiosMinorVersion = smbios.getMinorVersion();
    SMBIOS_DETAIL(logger, "SmBios Major Version = " << smbiosMajorVersion);
    SMBIOS_DETAIL(logger, "SmBios Minor Version = " << smbiosMinorVersion);
    bool const littleEndianFields =
        smbiosMajorVersion > 2 ||
        (smbiosMajorVersion == 2 && (smbiosMinorVersion == 6 || smbiosMinorVersion == 7 ||
                                     smbiosMinorVersion == 8 || smbiosMinorVersion > 60));
    if (littleEndianFields && uuid.size() > 19) {
        SMBIOS_DETAIL(logger, "Entering if condition UUID = " << uuid);
        std::string const old = uuid;
        uuid = old.substr(6, 2) + old.substr(4, 2) + old.substr(2, 2) + old.substr(0, 2) +
               old.substr(8, 1) + old.substr(11, 2) + old.substr(9, 2) + old.substr(13, 1) +
               old.substr(16, 2) + old.substr(14, 2) + old.substr(18);
        SMBIOS_DETAIL(logger, "Exiting if condition UUID = " << uuid);
    }
    SMBIOS_DETAIL(logger, "reverse_uuid_byte_order exit");
}

}  // namespace IC
