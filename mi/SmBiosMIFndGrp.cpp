#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIFndGrp");

// Group Associations (type 14): the group's handle, its name, and from
// offset 5 on items of 3 bytes, the member's type and its handle.
unsigned char const GROUP_HANDLE = 2;
unsigned char const GROUP_NAME = 4;
unsigned int const FIRST_ITEM = 5;
unsigned int const ITEM_SIZE = 3;
}  // namespace

// Every other member of every group that holds the structure of the given
// type and handle, group after group, in the order the items stand.
std::vector<std::pair<unsigned char, unsigned int>> SmBiosMI::findGroup(TableLists lists,
                                                                        unsigned int type,
                                                                        unsigned int handle) {
    SMBIOS_DETAIL(logger, "findGroup entry");
    std::vector<std::pair<unsigned char, unsigned int>> result;
    forEachStructure(SMBIOS_HERE, logger, lists, 14, [&](TableData& group, size_t) {
        SD::SmBios::Table const* t = group.table;
        unsigned int const length = t->getLength();
        unsigned int const groupHandle = getNumber16(t, GROUP_HANDLE);
        std::string const name = getString(t, GROUP_NAME);
        SMBIOS_DETAIL(logger, "Table 14 length = " << length << " entries="
                                                   << (static_cast<int>(length) - 5) / 3);
        bool containsTarget = false;
        std::vector<std::pair<unsigned char, unsigned int>> members;
        if (length > FIRST_ITEM) {
            for (unsigned int off = FIRST_ITEM; off < length; off += ITEM_SIZE) {
                unsigned int const itemType = getNumber8(t, static_cast<unsigned char>(off));
                unsigned int const itemHandle = getNumber16(t, static_cast<unsigned char>(off + 1));
                if (itemType == type && itemHandle == handle) {
                    containsTarget = true;
                    SMBIOS_DETAIL(logger, "  Target " << type << " handle " << handle
                                                      << " found in group " << name << " handle "
                                                      << groupHandle);
                } else {
                    members.push_back(
                        std::make_pair(static_cast<unsigned char>(itemType), itemHandle));
                }
            }
        }
        if (containsTarget) {
            for (auto const& member : members) {
                SMBIOS_DETAIL(logger, "  Member " << static_cast<unsigned int>(member.first)
                                                  << " handle " << member.second
                                                  << " found in group " << name << " handle "
                                                  << groupHandle);
                result.push_back(member);
            }
        }
    });
    SMBIOS_DETAIL(logger, "findGroup exit");
    return result;
}

}  // namespace IC
