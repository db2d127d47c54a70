#include "IC/PropertyValue.h"
#include "mi/BuilderSkeleton.h"
#include "mi/SmBiosMI.h"

namespace IC {

namespace {
QNLog::QNLogger logger("Quillon.IC.MI.SmBiosMI.SmBiosMIDiag");

unsigned char const OEM_COUNT = 0x04;

bool isDigit(char c) { return c >= '0' && c <= '9'; }

// The decimal number whose digits start at p (0 when none); p is left on
// the first character after them.
unsigned int readDecimal(std::string const& s, size_t& p) {
    unsigned int value = 0;
    while (p < s.length() && isDigit(s[p])) {
        value = value * 10 + static_cast<unsigned int>(s[p] - '0');
        ++p;
    }
    return value;
}

void makeKVDNodeOf(SmBiosMI& mi, TableData& entry, unsigned int parentId, unsigned int index,
                   unsigned int& ix) {
    SD::SmBios::Table const* t = entry.table;
    unsigned int const count = mi.getNumber8(t, OEM_COUNT);
    SMBIOS_DETAIL(logger, "String count = " << count);
    bool accepted = false;
    SmBiosMI::KVDVersion version;
    for (ix = 1; ix <= count && !accepted; ++ix) {
        SMBIOS_DETAIL(logger, "Reading ix = " << ix);
        std::string const s = mi.getStrByIdx(t, static_cast<unsigned char>(ix));
        SMBIOS_DETAIL(logger, "Read string " << ix << ": " << s);
        if (s.find(SmBiosMI::eyecat) == std::string::npos) {
            continue;
        }
        SMBIOS_DETAIL(logger, "Found KVD string: " << s);
        accepted = mi.parseKVDString(s, version);
    }
    if (!accepted) {
        return;
    }
    SMBIOS_DETAIL(logger, "Table " << 11 << " length = " << entry.length);
    MutableNode* node = mi.newNode(parentId, 53, index);
    entry.node = node;
    node->setStatus(1);
    node->setDescription("Corvane Preboot Diagnostics (KVD)");
    node->setProperty(134, PropertyValue(version.text, true));
    node->setProperty(104, PropertyValue(Number(version.major), true));
    node->setProperty(107, PropertyValue(Number(version.minor), true));
    node->setProperty(171, PropertyValue(version.build, true));
}

}  // namespace

// The eye-catcher the preboot diagnostics image leaves in an OEM string.
std::string const SmBiosMI::eyecat = "$DS Corvane Preboot Diagnostics (KVD)";

// The version and build id of a preboot-diagnostics string:
// eye-catcher, blanks, MAJOR "." MINOR, blanks, "-[" BUILD "]-".
bool SmBiosMI::parseKVDString(std::string const& s, KVDVersion& version) {
    size_t const length = s.size();
    size_t p = s.find(SmBiosMI::eyecat) + eyecat.size();
    while (p < length && s[p] == ' ') {
        ++p;
    }
    if (p >= length) {
        SMBIOS_DETAIL(logger, "KVD string missing major version info: " << s);
        return false;
    }
    version.text = s.substr(p);
    SMBIOS_DETAIL(logger, "Found KVD version string: " << version.text);
    version.major = readDecimal(s, p);
    if (p >= length || s[p] != '.') {
        SMBIOS_DETAIL(logger, "KVD string version number is not x.y form: " << s);
        return false;
    }
    ++p;
    version.minor = readDecimal(s, p);
    if (p >= length || s[p] != ' ') {
        SMBIOS_DETAIL(logger, "KVD string version number missing blank termination: " << s);
        return false;
    }
    while (p < length && s[p] == ' ') {
        ++p;
    }
    if (!(p + 4 < length && s.compare(p, 2, "-[") == 0)) {
        SMBIOS_DETAIL(logger, "KVD version string missing build id: " << s);
        return false;
    }
    size_t const q = p + 2;
    size_t i = q + 1;
    while (i < length && s.compare(i, 2, "]-") != 0) {
        ++i;
    }
    if (i >= length) {
        SMBIOS_DETAIL(logger, "KVD version string missing build id end ']-': " << s);
        return false;
    }
    version.build = s.substr(q, i - q);
    return true;
}

// One diagnostics node per OEM Strings structure holding an accepted
// preboot-diagnostics string (the first one wins), under the planar.
void SmBiosMI::makeKVDNode(TableLists tables, unsigned int parentId) {
    SMBIOS_DETAIL(logger, "make"
                              << "KVD"
                              << "Nodes entry");
    SD::SourcePlace const here = SMBIOS_HERE;
    for (size_t k = 0; k < tables[11]->size(); ++k) {
        unsigned int ix = 0;
        TableData& entry = (*tables[11])[k];
        // The diagnostics' failure lines also name the string index reached.
        guarded([&] { makeKVDNodeOf(*this, entry, parentId, static_cast<unsigned int>(k), ix); },
                [&](Failure kind, char const* what, char const* typeName) {
                    switch (kind) {
                        case Failure::IC_EXCEPTION:
                            SMBIOS_ERROR_AT(here, logger,
                                            "ICException=" << what << " Table " << 11 << " index ="
                                                           << k << "string index = " << ix);
                            break;
                        case Failure::STD_EXCEPTION:
                            SMBIOS_ERROR_AT(here, logger,
                                            "Exception=" << what << " Type=" << typeName
                                                         << " Table " << 11 << " index =" << k
                                                         << "string index = " << ix);
                            break;
                        case Failure::OTHER:
                            SMBIOS_ERROR_AT(here, logger,
                                            "Error in table " << 11 << " index " << k
                                                              << "string index = " << ix);
                            break;
                    }
                });
    }
    SMBIOS_DETAIL(logger, "make"
                              << "KVD"
                              << "Nodes exit");
}

}  // namespace IC
