#include "mi/SmBiosMI.h"

#include <memory>
#include <mutex>

#include "IC/PropertyValue.h"
#include "IC/Version2.h"
#include "mi/BuilderSkeleton.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMI");
}  // namespace

SmBiosMI mysmbiosmi;
Error myerr(0, Number(0u), "");
std::string const myversionc = "1.0";
unsigned int tablecount[256];

SmBiosMI::SmBiosMI() = default;

SmBiosMI::~SmBiosMI() = default;

MutableNode* SmBiosMI::newNode(unsigned int parentId, unsigned int nodeType, unsigned int index) {
    unsigned int const nodeId = takeNodeId();
    return addNode(std::make_unique<MutableNode>(nodeId, parentId, miIdList, nodeType, index));
}

Error SmBiosMI::initialize(unsigned int id, Number const& a, Number const& b) {
    // One initialize at a time, and no other operation on this interface
    // while the node list is rebuilt: the agent may call from several threads.
    std::lock_guard<std::recursive_mutex> const guard(operationLock());
    SMBIOS_DETAIL(logger, "initialize entry");
    for (unsigned int type = 0; type < 256; ++type) {
        tablecount[type] = 0;
    }

    myerr = ManagementInterface::initialize(id, a, b);

    SD::SmBios smbios;
    if (smbios.getTables().empty()) {
        SMBIOS_WARNING(logger, "smbios table size zero");
    }

    MutableNode* miNode = addNode(std::make_unique<MutableNode>(miId, 0, miIdList, 15, 0));
    miNode->setStatus(1);
    miNode->setDescription("Corvane SMBIOS Management Interface");

    smbiosMajorVersion = smbios.getMajorVersion();
    smbiosMinorVersion = smbios.getMinorVersion();
    Number const version(Version2(smbiosMajorVersion, smbiosMinorVersion));
    SMBIOS_DETAIL(logger, "SmBios Major Version = " << smbiosMajorVersion);
    SMBIOS_DETAIL(logger, "SmBios Minor Version = " << smbiosMinorVersion);
    SMBIOS_DETAIL(logger, "SmBios Version = " << version);
    miNode->setProperty(306, PropertyValue(version, true));
    if (smbios.getRevision() != 0) {
        miNode->setProperty(307, PropertyValue(smbios.getRevision(), true));
    } else {
        SMBIOS_DETAIL(logger, "SmBiosMI Revision is 0 or NULL");
    }

    StructureGroups groups(smbios);
    TableLists const lists = groups.lists();

    makeRootNode(lists);
    logStructureLists(logger, lists);

    Error const result = myerr;
    SMBIOS_DETAIL(logger, "initialize exit");
    return result;
}

StructureGroups::StructureGroups() {
    for (unsigned int type = 0; type < 256; ++type) {
        lists_[type] = &groups_[type];
    }
}

StructureGroups::StructureGroups(SD::SmBios const& smbios) : StructureGroups() { file(smbios); }

StructureGroups::StructureGroups(std::unique_ptr<SD::SmBios const> held) : StructureGroups(*held) {
    held_ = std::move(held);
}

StructureGroups::~StructureGroups() = default;

void StructureGroups::file(SD::SmBios const& smbios) {
    SD::SourcePlace const here = SMBIOS_HERE;
    unsigned int type = 0;
    for (SD::SmBios::Table const& structure : smbios.getTables()) {
        guarded(
            [&] {
                type = structure.getType();
                unsigned int const length = structure.getLength();
                groups_[type].push_back(TableData(&structure, length));
            },
            // Filing names the type alone: a structure has no index yet.
            [&](Failure kind, char const* what, char const* typeName) {
                switch (kind) {
                    case Failure::STD_EXCEPTION:
                        SMBIOS_ERROR_AT(
                            here, logger,
                            "Exception=" << what << " Type=" << typeName << "Table " << type);
                        break;
                    case Failure::IC_EXCEPTION:
                        SMBIOS_ERROR_AT(here, logger, "ICException=" << what << "Table=" << type);
                        break;
                    case Failure::OTHER:
                        SMBIOS_ERROR_AT(here, logger, "Error in table " << type);
                        break;
                }
            });
    }
}

void logStructureLists(QNLog::QNLogger const& logger, TableLists lists) {
    for (unsigned int t = 0; t < 256; ++t) {
        if (!lists[t]->empty()) {
            SMBIOS_DETAIL(logger, "Table(s) for index " << t);
            for (TableData const& entry : *lists[t]) {
                SMBIOS_DETAIL(logger, "   Pointer = " << static_cast<void const*>(entry.table)
                                                      << " length = " << entry.length);
            }
        }
    }
}

void StructureGroups::takeOver(TableLists tables) {
    for (unsigned int type = 0; type < 256; ++type) {
        groups_[type].swap(*tables[type]);
    }
}

std::unique_ptr<StructureGroups> SmBiosMI::groupAcquiredTable() const {
    // The table initialize acquired: this copy reads nothing again.
    return std::unique_ptr<StructureGroups>(
        new StructureGroups(std::unique_ptr<SD::SmBios const>(new SD::SmBios())));
}

// Readers and writers. Offsets are checked against the formatted-area
// length on plain integers, so an offset near 255 fails rather than wraps.
// Kept: the 16-bit readers check only the offset itself, the 16-bit writers
// the whole word; the wide boolean writers check the whole field but test
// only the byte at the offset. A word straddling the end of the formatted
// area is therefore read (and bounded by Table::getWord) but never written.

#define SMBIOSMI_FAIL(text, off, length) \
    SMBIOS_DETAIL(logger, text << static_cast<unsigned int>(off) << " length=" << (length))

namespace {

// The one body of every checked reader: read() when the offset lies inside
// the formatted area, otherwise "<name>offset=... length=..." is logged and
// fallback returned. read() runs only after the check.
template <typename Value, typename Read>
Value readField(SD::SmBios::Table const* t, unsigned char off, char const* name, Value fallback,
                Read read) {
    unsigned int const length = t->getLength();
    if (off < length) {
        return read();
    }
    SMBIOSMI_FAIL(name, off, length);
    return fallback;
}

}  // namespace

bool SmBiosMI::getBool16(SD::SmBios::Table const* t, unsigned char off, unsigned short mask) const {
    return readField(t, off, "getBool16 offset=", false,
                     [&] { return (t->getWord(off) & mask) != 0; });
}

unsigned int SmBiosMI::getNumber16(SD::SmBios::Table const* t, unsigned char off) const {
    return readField(t, off, "getNumber16 offset=", 0u,
                     [&] { return static_cast<unsigned int>(t->getWord(off)); });
}

// Kept: "gtetEnumValue16" is the text the agent's log readers know.
unsigned int SmBiosMI::getEnumValue16(SD::SmBios::Table const* t, unsigned char off,
                                      unsigned short mask, unsigned char shift) const {
    return readField(t, off, "gtetEnumValue16 offset=", 0u,
                     [&] { return static_cast<unsigned int>(t->getWord(off) & mask) >> shift; });
}

bool SmBiosMI::getBool8(SD::SmBios::Table const* t, unsigned char off, unsigned char mask) const {
    return readField(t, off, "getBool8 offset=", false,
                     [&] { return (t->getByte(off) & mask) != 0; });
}

unsigned int SmBiosMI::getNumber8(SD::SmBios::Table const* t, unsigned char off) const {
    return readField(t, off, "getNumber8 offset=", 0u,
                     [&] { return static_cast<unsigned int>(t->getByte(off)); });
}

unsigned int SmBiosMI::getEnumValue(SD::SmBios::Table const* t, unsigned char off,
                                    unsigned char mask) const {
    return readField(t, off, "getEnumValue offset=", 0u,
                     [&] { return static_cast<unsigned int>(t->getByte(off) & mask); });
}

unsigned int SmBiosMI::getNumber8Unprot(SD::SmBios::Table const* t, unsigned int off) const {
    return t->getByteUnprot(off);
}

std::string SmBiosMI::getStrByIdx(SD::SmBios::Table const* t, unsigned char index) const {
    SD::SmBios::String const s = t->getString(index);
    return s != nullptr ? std::string(s) : std::string();
}

std::string SmBiosMI::getString(SD::SmBios::Table const* t, unsigned char off) const {
    return readField(t, off, "getString invalid offset=", std::string(),
                     [&] { return getStrByIdx(t, t->getByte(off)); });
}

std::vector<unsigned char> SmBiosMI::getBuffer(SD::SmBios::Table const* t, unsigned char off,
                                               unsigned char count) const {
    unsigned int const length = t->getLength();
    std::vector<unsigned char> bytes;
    if (static_cast<unsigned int>(off) + count <= length) {
        for (unsigned int i = 0; i < count; ++i) {
            bytes.push_back(t->getByte(static_cast<unsigned char>(off + i)));
        }
        return bytes;
    }
    SMBIOSMI_FAIL("propBuffer offset=", off, length);
    return bytes;
}

std::vector<unsigned char> SmBiosMI::getBufferUnprot(SD::SmBios::Table const* t, unsigned int off,
                                                     unsigned int count) const {
    std::vector<unsigned char> bytes;
    bytes.reserve(count);
    for (unsigned int i = 0; i < count; ++i) {
        bytes.push_back(t->getByteUnprot(off + i));
    }
    return bytes;
}

namespace {

// The one body of every property writer: when the field of `width` bytes at
// off lies inside the formatted area, property id is set to what read()
// makes of it; otherwise nothing is set and "<name>offset=... length=..." is
// logged. read() runs only after the check, so a field outside the area is
// never read.
template <typename Read>
void writeField(SD::SmBios::Table const* t, unsigned char off, unsigned int width, char const* name,
                unsigned int id, MutableNode* node, Read read) {
    unsigned int const length = t->getLength();
    if (static_cast<unsigned int>(off) + width <= length) {
        node->setProperty(id, PropertyValue(read(), true));
        return;
    }
    SMBIOSMI_FAIL(name, off, length);
}

// The wide boolean writers check the whole field but test only its first
// byte against the mask.
template <typename Mask>
Number firstByteBit(SD::SmBios::Table const* t, unsigned char off, Mask mask) {
    return Number((t->getByte(off) & mask) != 0);
}

}  // namespace

void SmBiosMI::propBool64(SD::SmBios::Table const* t, unsigned char off, unsigned long long mask,
                          unsigned int id, MutableNode* node) {
    writeField(t, off, 8, "propBool64 offset=", id, node,
               [&] { return firstByteBit(t, off, mask); });
}

void SmBiosMI::propBool32(SD::SmBios::Table const* t, unsigned char off, unsigned int mask,
                          unsigned int id, MutableNode* node) {
    writeField(t, off, 4, "propBool32 offset=", id, node,
               [&] { return firstByteBit(t, off, mask); });
}

void SmBiosMI::propBool16(SD::SmBios::Table const* t, unsigned char off, unsigned short mask,
                          unsigned int id, MutableNode* node) {
    writeField(t, off, 2, "propBool16 offset=", id, node,
               [&] { return firstByteBit(t, off, mask); });
}

void SmBiosMI::propBool8(SD::SmBios::Table const* t, unsigned char off, unsigned char mask,
                         unsigned int id, MutableNode* node) {
    writeField(t, off, 1, "propBool8 offset=", id, node,
               [&] { return firstByteBit(t, off, mask); });
}

void SmBiosMI::propNumber16(SD::SmBios::Table const* t, unsigned char off, unsigned int id,
                            MutableNode* node) {
    writeField(t, off, 2, "propNumber16 offset=", id, node,
               [&] { return Number(static_cast<unsigned int>(t->getWord(off))); });
}

void SmBiosMI::propNumber8(SD::SmBios::Table const* t, unsigned char off, unsigned int id,
                           MutableNode* node) {
    writeField(t, off, 1, "propNumber8 offset=", id, node,
               [&] { return Number(static_cast<unsigned int>(t->getByte(off))); });
}

void SmBiosMI::propEnumValue16(SD::SmBios::Table const* t, unsigned char off, unsigned short mask,
                               unsigned char shift, unsigned int id, MutableNode* node) {
    writeField(t, off, 2, "propEnumValue16 offset=", id, node, [&] {
        return EnumValue(static_cast<unsigned short>(
            static_cast<unsigned int>(t->getWord(off) & mask) >> shift));
    });
}

void SmBiosMI::propEnumValue(SD::SmBios::Table const* t, unsigned char off, unsigned char mask,
                             unsigned int id, MutableNode* node) {
    writeField(t, off, 1, "propEnumValue offset=", id, node,
               [&] { return EnumValue(static_cast<unsigned char>(t->getByte(off) & mask)); });
}

void SmBiosMI::propEnumValue(SD::SmBios::Table const* t, unsigned char off, unsigned int id,
                             MutableNode* node) {
    writeField(t, off, 1, "propEnumValue offset=", id, node,
               [&] { return EnumValue(t->getByte(off)); });
}

void SmBiosMI::propString(SD::SmBios::Table const* t, unsigned char off, unsigned int id,
                          MutableNode* node) {
    writeField(t, off, 1, "propString offset=", id, node, [&] {
        SD::SmBios::String const s = t->getString(t->getByte(off));
        return std::string(s != nullptr ? s : "");
    });
}

void SmBiosMI::propBuffer(SD::SmBios::Table const* t, unsigned char off, unsigned char count,
                          unsigned int id, MutableNode* node) {
    writeField(t, off, count, "propBuffer offset=", id, node, [&] {
        // Stored backwards, deliberately unlike getBuffer: a little-endian
        // field becomes its big-endian bytes, which the agent shows as is.
        std::vector<unsigned char> bytes;
        for (unsigned int i = count; i-- > 0;) {
            bytes.push_back(t->getByte(static_cast<unsigned char>(off + i)));
        }
        return bytes;
    });
}

std::string SmBiosMI::pB(unsigned char b) {
    static char const digits[] = "0123456789ABCDEF";
    std::string text;
    text += digits[b >> 4];
    text += digits[b & 0x0F];
    return text;
}

std::string SmBiosMI::pS(char const* s) {
    std::string text;
    for (; *s != '\0'; ++s) {
        text += pB(static_cast<unsigned char>(*s));
    }
    return text;
}

}  // namespace IC

extern "C" int OpenMI(IC::ManagementInterface** mi, IC::Error** err) {
    SMBIOS_DETAIL(IC::logger, "OpenMI entry");
    *mi = &IC::mysmbiosmi;
    *err = &IC::myerr;
    SMBIOS_DETAIL(IC::logger, "OpenMI exit");
    return 0;
}
