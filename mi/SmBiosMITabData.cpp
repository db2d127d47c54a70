#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMITabData");

// Raw nodes are made for the structure types up to this one.
unsigned int const LAST_RAW_TYPE = 31;

void makeSMBIOSTableNode(SmBiosMI& mi, SD::SmBios::Table const* t, unsigned int parentId,
                         unsigned int index) {
    MutableNode* node = mi.newNode(parentId, 55, index);
    node->setStatus(1);
    node->setDescription("SMBIOS Table");
    unsigned int const structureType = t->getType();
    unsigned int const length = t->getLength();
    unsigned int const handle = mi.getNumber16(t, 2);
    unsigned int const strCount = t->getStrCount();
    node->setProperty(177, PropertyValue(Number(structureType), true));
    node->setProperty(178, PropertyValue(Number(handle), true));
    node->setProperty(176, PropertyValue(Number(length), true));
    std::vector<Number> formatted;
    for (unsigned int i = 0; i < length; ++i) {
        unsigned int const byte = t->getByte(static_cast<unsigned char>(i));
        formatted.push_back(Number(byte));
    }
    node->setProperty(180, PropertyValue(formatted, true));
    std::vector<std::string> strings;
    for (unsigned int i = 1; i <= strCount && i <= 255; ++i) {
        std::string const s = mi.getStrByIdx(t, static_cast<unsigned char>(i));
        if (!s.empty()) {
            strings.push_back(s);
        }
    }
    unsigned int const kept = static_cast<unsigned int>(strings.size());
    node->setProperty(179, PropertyValue(strings, true));
    node->setProperty(181, PropertyValue(Number(kept), true));
}

}  // namespace

TableData::TableData(SD::SmBios::Table const* table_, unsigned int length_)
    : table(table_), length(length_), node(nullptr) {}

// One raw node per structure of types 0 to 31, with its header fields, its
// formatted bytes and its non-empty strings, so that the agent can read
// fields no component builder interprets.
void SmBiosMI::makeSMBIOSTableNodes(TableLists lists, unsigned int parentId) {
    SMBIOS_DETAIL(logger, "makeSMBIOSTableNodes entry");
    SD::SourcePlace const here = SMBIOS_HERE;
    unsigned int index = 0;
    size_t position = 0;
    // Kept: the raw nodes' failure lines name table 4 whatever the type;
    // log searches look for them so.
    auto const report = [&](Failure kind, char const* what, char const* typeName) {
        switch (kind) {
            case Failure::STD_EXCEPTION:
                SMBIOS_ERROR(
                    logger, "Exception=" << what << " Type=" << typeName << " index =" << position);
                break;
            case Failure::IC_EXCEPTION:
                SMBIOS_ERROR_AT(here, logger,
                                "ICException=" << what << "Table 4 index =" << position);
                break;
            case Failure::OTHER:
                SMBIOS_ERROR_AT(here, logger, "Error in table 4 index " << position);
                break;
        }
    };
    guarded(
        [&] {
            for (unsigned int type = 0; type <= LAST_RAW_TYPE; ++type) {
                std::vector<TableData> const& list = *lists[type];
                SMBIOS_DETAIL(logger, "Table " << type << " count =" << list.size());
                for (position = 0; position < list.size(); ++position) {
                    guarded(
                        [&] {
                            makeSMBIOSTableNode(*this, list[position].table, parentId, index++);
                        },
                        report);
                }
            }
        },
        [&](Failure, char const*, char const*) {
            SMBIOS_ERROR_AT(here, logger, "Error in table 4 index " << position);
        });
    SMBIOS_DETAIL(logger, "makeSMBIOSTableNodes exit");
}

}  // namespace IC
