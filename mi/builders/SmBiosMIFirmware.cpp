#include <cstdlib>

#include "IC/PropertyValue.h"
#include "IC/Version2.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIFirmware");

unsigned char const OEM_COUNT = 0x04;

// BIOS Information (type 0) fields.
unsigned char const VENDOR = 0x04, BIOS_VERSION = 0x05, RELEASE_DATE = 0x08, EC_MAJOR = 0x16,
                    EC_MINOR = 0x17;
unsigned int const EC_NOT_SUPPORTED = 255;

// strtol of a version text, as the unsigned property value.
unsigned int versionNumber(std::string const& text) {
    return static_cast<unsigned int>(std::strtol(text.c_str(), nullptr, 10));
}

// The minor version: the number after the first ".", or 0 without one.
unsigned int minorVersion(std::string const& version) {
    size_t const dot = version.find('.');
    return dot == std::string::npos ? 0 : versionNumber(version.substr(dot + 1));
}

// The build id (70) and version (134) from "[BUILD-VERSION]" in a BIOS
// version string; false when it holds no such part.
bool setBracketedVersion(std::string const& version, MutableNode* node) {
    size_t const p = version.find('[');
    size_t const q = version.find(']');
    if (p == std::string::npos || q == std::string::npos) {
        return false;
    }
    std::string const inner = version.substr(p + 1, q - p - 1);
    size_t const d = inner.find('-');
    if (d == std::string::npos) {
        return false;
    }
    node->setProperty(134, PropertyValue(inner.substr(d + 1), true));
    node->setProperty(70, PropertyValue(inner.substr(0, d), true));
    return true;
}

// The identification, build id and version of a firmware image from its OEM
// string: "... -[BUILD-VERSION]-", or "... (NAME) VERSION -[BUILD]-".
void parseFirmwareOemString(std::string const& s, MutableNode* node) {
    size_t const firstDash = s.find('-');
    if (firstDash != std::string::npos) {
        node->setProperty(307, PropertyValue(s.substr(firstDash), true));
    }
    if (s.find('[') == std::string::npos || s.find(']') == std::string::npos) {
        return;
    }
    size_t const p = s.find('[');
    size_t const q = s.find(']');
    std::string inner = s.substr(p + 1, q - p - 1);
    // Kept: the dash is looked for before trimming and its position applied
    // to the trimmed text; the firmware names the agent shows come out so.
    size_t const d = inner.find('-');
    inner = trimstr(inner);
    if (d != std::string::npos) {
        node->setProperty(70, PropertyValue(inner.substr(0, d), true));
        std::string const version = inner.substr(d + 1);
        node->setProperty(134, PropertyValue(version, true));
        node->setProperty(104, PropertyValue(Number(versionNumber(version)), true));
        node->setProperty(107, PropertyValue(Number(minorVersion(version)), true));
        return;
    }
    size_t const r = s.find(')');
    size_t const e = s.find('-');
    if (r != std::string::npos && e != std::string::npos) {
        std::string const version = s.substr(r + 2, e - r - 3);
        node->setProperty(70, PropertyValue(inner, true));
        node->setProperty(134, PropertyValue(version, true));
        node->setProperty(307, PropertyValue("-[" + inner + "-" + version + "]-", true));
        node->setProperty(104, PropertyValue(Number(versionNumber(version)), true));
        node->setProperty(107, PropertyValue(Number(minorVersion(version)), true));
    } else {
        node->setProperty(70, PropertyValue(inner, true));
        node->setProperty(134, PropertyValue("", true));
    }
}

void makeOemFirmwareNodes(SmBiosMI& mi, TableLists tables, TableData& entry, unsigned int parentId,
                          unsigned int& ordinal, bool& uefi) {
    SD::SmBios::Table const* t = entry.table;
    unsigned int const count = mi.getNumber8(t, OEM_COUNT);
    for (unsigned int i = 1; i <= count; ++i) {
        std::string const s = mi.getStrByIdx(t, static_cast<unsigned char>(i));
        if (s.empty()) {
            SMBIOS_DETAIL(logger, "OEM string is NULL");
            break;
        }
        bool const diagnostics = s.find("Diagnostics") != std::string::npos;
        bool const serviceProcessor = s.find("Ostrel") != std::string::npos;
        bool const uefiString = s.find("UEFI") != std::string::npos;
        if (!diagnostics && !serviceProcessor && !uefiString) {
            continue;
        }
        if (!diagnostics && uefiString) {
            uefi = true;
            continue;
        }
        std::string const name = diagnostics ? "Diagnostics" : "OTL";
        MutableNode* node = mi.newNode(parentId, 3, ordinal++);
        entry.node = node;
        node->setDescription(name);
        node->setProperty(108, PropertyValue(name, true));
        node->setStatus(1);
        node->setProperty(36, PropertyValue("Corvane", true));
        parseFirmwareOemString(s, node);
        mi.makeLogNodes(tables, node->getNodeId());
    }
}

void setBiosFirmwareProperties(SmBiosMI& mi, TableData const& entry, std::string const& name,
                               MutableNode* node) {
    SD::SmBios::Table const* t = entry.table;
    node->setStatus(1);
    node->setDescription(name);
    mi.propString(t, VENDOR, 36, node);
    mi.propString(t, RELEASE_DATE, 164, node);
    node->setProperty(108, PropertyValue(name, true));
    std::string const version = mi.getString(t, BIOS_VERSION);
    node->setProperty(307, PropertyValue(version, true));
    if (!setBracketedVersion(version, node)) {
        SMBIOS_ERROR(logger,
                     "Error reading standard format of version and build number "
                     "for Planar Firmware");
        mi.propString(t, BIOS_VERSION, 134, node);
    }

    if (entry.length > 21) {
        node->setProperty(
            175,
            PropertyValue(Number(Version2(mi.getSmBiosMajorVersion(), mi.getSmBiosMinorVersion())),
                          true));
        // Kept: the BIOS node's 104 and 107 carry the SMBIOS version,
        // unlike the OEM-string images'; the agent's reports expect it.
        node->setProperty(104, PropertyValue(Number(mi.getSmBiosMajorVersion()), true));
        node->setProperty(107, PropertyValue(Number(mi.getSmBiosMinorVersion()), true));
    }
    if (entry.length > 22) {
        unsigned int const major = mi.getNumber8(t, EC_MAJOR);
        unsigned int const minor = mi.getNumber8(t, EC_MINOR);
        if (major < EC_NOT_SUPPORTED && minor < EC_NOT_SUPPORTED) {
            node->setProperty(187, PropertyValue(Number(major), true));
            node->setProperty(188, PropertyValue(Number(minor), true));
        }
    }
}

}  // namespace

std::string trimstr(std::string s) {
    // Walks up to the terminating NUL: the last non-blank character ends the
    // result; while no non-blank character has been seen, the latest blank
    // is its start, and the length is counted from there.
    char const* text = s.c_str();
    size_t last = 0;
    size_t start = 0;
    bool seen = false;
    for (size_t i = 0; text[i] != '\0'; ++i) {
        if (text[i] != ' ') {
            last = i;
            seen = true;
        } else if (!seen) {
            start = i;
        }
    }
    return s.substr(start, last + 1);
}

bool SmBiosMI::find_first_number(char const* text, unsigned* out) {
    if (text == nullptr) {
        return false;
    }
    for (char const* p = text; *p != '\0'; ++p) {
        if (*p >= '0' && *p <= '9') {
            *out = static_cast<unsigned>(std::strtol(p, nullptr, 10));
            return true;
        }
    }
    return false;
}

// One firmware node per recognised OEM string (diagnostics or service
// processor image), then one per BIOS Information structure, named "UEFI"
// when an OEM string says so; an event-log node hangs under each.
void SmBiosMI::makeFirmwareNodes(TableLists tables, unsigned int parentId) {
    // Kept: the entry and exit texts are composed from three pieces, as in
    // every builder; the line written is the one text "makeFirmwareNodes
    // entry" that log readers search for, and the pieces must stay joined.
    SMBIOS_DETAIL(logger, "make"
                              << "Firmware"
                              << "Nodes entry");
    bool uefi = false;
    unsigned int ordinal = 1;
    SD::SourcePlace const here = SMBIOS_HERE;
    for (size_t k = 0; k < tables[11]->size(); ++k) {
        TableData& entry = (*tables[11])[k];
        guarded([&] { makeOemFirmwareNodes(*this, tables, entry, parentId, ordinal, uefi); },
                // Kept: the failure messages of this phase name table 0 and
                // the firmware ordinal minus one, as log searches expect.
                [&](Failure kind, char const* what, char const* typeName) {
                    logStructureFailure(here, logger, 0, ordinal - 1, kind, what, typeName);
                });
    }

    std::string const baseName = uefi ? "UEFI" : "BIOS";
    forEachStructure(SMBIOS_HERE, logger, tables, 0, [&](TableData& entry, size_t) {
        SMBIOS_DETAIL(logger, "Table " << 0 << " length = " << entry.length);
        MutableNode* node = newNode(parentId, 3, ordinal++);
        entry.node = node;
        setBiosFirmwareProperties(*this, entry, baseName, node);
        makeLogNodes(tables, node->getNodeId());
    });
    SMBIOS_DETAIL(logger, "make"
                              << "Firmware"
                              << "Nodes exit");
}

}  // namespace IC
