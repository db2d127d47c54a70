// The SMBIOS management interface: the plug-in object the agent receives
// from OpenMI. Its initialize acquires the SMBIOS table, groups the
// structures by type and builds the inventory tree through one builder per
// kind of hardware component.
#pragma once

#include <exception>
#include <map>
#include <memory>
#include <string>
#include <typeinfo>
#include <utility>
#include <vector>

#include "IC/Error.h"
#include "IC/ManagementInterface.h"
#include "IC/MutableNode.h"
#include "IC/Number.h"
#include "smbios/Logging.h"
#include "smbios/SmBios.h"

namespace IC {

// The plug-in's own exception: one message.
class ICException {
public:
    explicit ICException(std::string const& message) : message_(message) {}
    virtual ~ICException() = default;
    virtual char const* what() const { return message_.c_str(); }

private:
    std::string message_;
};

// One entry of a structure list: the structure, its formatted-area length
// and the node a builder made from it (null until then).
struct TableData {
    TableData(SD::SmBios::Table const* table, unsigned int length);

    SD::SmBios::Table const* table;
    unsigned int length;
    IC::MutableNode* node;
};

// The structure lists: 256 lists, one per SMBIOS type, indexed by type.
typedef std::vector<TableData>** TableLists;

// What the plug-in hands the host program beyond OpenMI: C++ members it
// calls directly, never a C entry point. The agent calls none of them.
#define SMBIOSMI_HOST_API __attribute__((visibility("default")))

// The structures of a table grouped by SMBIOS type: 256 lists, one per type,
// each in table order, owned here; lists() is the builders' view of them.
class StructureGroups {
public:
    // 256 empty lists.
    StructureGroups();
    // Files every structure of smbios in the list of its type; a structure
    // that cannot be read is logged and left out. smbios must outlive the
    // groups.
    explicit StructureGroups(SD::SmBios const& smbios);
    // The same over a table the groups hold themselves.
    explicit StructureGroups(std::unique_ptr<SD::SmBios const> held);
    SMBIOSMI_HOST_API ~StructureGroups();
    StructureGroups(StructureGroups const&) = delete;
    StructureGroups& operator=(StructureGroups const&) = delete;

    TableLists lists() { return lists_; }

    // Takes every list of tables over, whole and in order, leaving those
    // lists empty.
    void takeOver(TableLists tables);

private:
    void file(SD::SmBios const& smbios);

    std::unique_ptr<SD::SmBios const> held_;
    std::vector<TableData> groups_[256];
    std::vector<TableData>* lists_[256];
};

// The class itself is visible too: the host program holds the interface
// OpenMI hands out as an SmBiosMI, and its type information must resolve
// (UBSan's vptr checks look it up on every member call).
class SMBIOSMI_HOST_API SmBiosMI : public ManagementInterface {
public:
    SmBiosMI();
    ~SmBiosMI() override;

    Error initialize(unsigned int id, Number const& a, Number const& b) override;

    // After initialize: the structures of the table initialize acquired,
    // grouped, holding their own copy of it. Nothing in the plug-in makes
    // the sensor and BMC nodes; the host program that asks for them calls
    // their builders on these groups.
    SMBIOSMI_HOST_API std::unique_ptr<StructureGroups> groupAcquiredTable() const;

    // Builders.
    void makeRootNode(TableLists lists);
    void makeComputerNodes(TableLists lists, unsigned int parentId);
    void makeChassisNodes(TableLists lists, unsigned int parentId);
    void makePlanarNodes(TableLists tables, unsigned int parentNodeId);
    void makeCpuNodes(TableLists tables, unsigned int parentNodeId);
    void makeCacheNodes(TableLists tables, unsigned int parentNodeId, unsigned int handle);
    void makeSlotNodes(TableLists tables, unsigned int parentNodeId);
    void makeConnectorNodes(TableLists tables, unsigned int parentNodeId);
    void makeDimmNodes(TableLists tables, unsigned int parentNodeId);
    void makeDiskControllerNodes(TableLists tables, unsigned int parentId);
    void makeFirmwareNodes(TableLists tables, unsigned int parentId);
    void makeLogNodes(TableLists tables, unsigned int parentId);
    void makeKVDNode(TableLists tables, unsigned int parentId);
    SMBIOSMI_HOST_API void makeTemperatureSensorNodes(TableLists tables, unsigned int parentId,
                                                      unsigned int location);
    SMBIOSMI_HOST_API void makeVoltageSensorNodes(TableLists tables, unsigned int parentId,
                                                  unsigned int location);
    SMBIOSMI_HOST_API void makeBMCNodes(TableLists tables, unsigned int parentId);
    void makeSMBIOSTableNodes(TableLists lists, unsigned int parentId);
    std::vector<std::pair<unsigned char, unsigned int>> findGroup(TableLists lists,
                                                                  unsigned int type,
                                                                  unsigned int handle);
    void reverse_uuid_byte_order(std::string& uuid);
    static unsigned int getCIMSlotType(unsigned int smbiosSlotType);
    bool find_first_number(char const* text, unsigned* out);

    // Readers: a field of the structure, or 0, false or empty when the
    // offset fails the check against the formatted-area length (logged).
    bool getBool16(SD::SmBios::Table const* t, unsigned char off, unsigned short mask) const;
    unsigned int getNumber16(SD::SmBios::Table const* t, unsigned char off) const;
    unsigned int getEnumValue16(SD::SmBios::Table const* t, unsigned char off, unsigned short mask,
                                unsigned char shift) const;
    bool getBool8(SD::SmBios::Table const* t, unsigned char off, unsigned char mask) const;
    unsigned int getNumber8(SD::SmBios::Table const* t, unsigned char off) const;
    unsigned int getEnumValue(SD::SmBios::Table const* t, unsigned char off,
                              unsigned char mask) const;
    unsigned int getNumber8Unprot(SD::SmBios::Table const* t, unsigned int off) const;
    std::string getStrByIdx(SD::SmBios::Table const* t, unsigned char index) const;
    std::string getString(SD::SmBios::Table const* t, unsigned char off) const;
    std::vector<unsigned char> getBuffer(SD::SmBios::Table const* t, unsigned char off,
                                         unsigned char count) const;
    std::vector<unsigned char> getBufferUnprot(SD::SmBios::Table const* t, unsigned int off,
                                               unsigned int count) const;

    // Writers: set property id on node from a field, or set nothing when the
    // field fails the check against the formatted-area length (logged).
    void propBool64(SD::SmBios::Table const* t, unsigned char off, unsigned long long mask,
                    unsigned int id, IC::MutableNode* node);
    void propBool32(SD::SmBios::Table const* t, unsigned char off, unsigned int mask,
                    unsigned int id, IC::MutableNode* node);
    void propBool16(SD::SmBios::Table const* t, unsigned char off, unsigned short mask,
                    unsigned int id, IC::MutableNode* node);
    void propBool8(SD::SmBios::Table const* t, unsigned char off, unsigned char mask,
                   unsigned int id, IC::MutableNode* node);
    void propNumber16(SD::SmBios::Table const* t, unsigned char off, unsigned int id,
                      IC::MutableNode* node);
    void propNumber8(SD::SmBios::Table const* t, unsigned char off, unsigned int id,
                     IC::MutableNode* node);
    void propEnumValue16(SD::SmBios::Table const* t, unsigned char off, unsigned short mask,
                         unsigned char shift, unsigned int id, IC::MutableNode* node);
    void propEnumValue(SD::SmBios::Table const* t, unsigned char off, unsigned char mask,
                       unsigned int id, IC::MutableNode* node);
    void propEnumValue(SD::SmBios::Table const* t, unsigned char off, unsigned int id,
                       IC::MutableNode* node);
    void propString(SD::SmBios::Table const* t, unsigned char off, unsigned int id,
                    IC::MutableNode* node);
    void propBuffer(SD::SmBios::Table const* t, unsigned char off, unsigned char count,
                    unsigned int id, IC::MutableNode* node);

    // Two upper-case hexadecimal digits of b; the digits of every character
    // of s.
    static std::string pB(unsigned char b);
    static std::string pS(char const* s);

    // The eye-catcher of the preboot diagnostics image's OEM string, and
    // what such a string carries.
    static std::string const eyecat;
    struct KVDVersion {
        std::string text;
        unsigned int major = 0;
        unsigned int minor = 0;
        std::string build;
    };
    // Parses a string holding the eye-catcher; false (logged) when it does
    // not follow the grammar.
    bool parseKVDString(std::string const& s, KVDVersion& version);

    unsigned int getSmBiosMajorVersion() const { return smbiosMajorVersion; }
    unsigned int getSmBiosMinorVersion() const { return smbiosMinorVersion; }

    // Node creation, shared by the builders. Takes the next node id.
    unsigned int takeNodeId() { return nextNodeId++; }
    // Hands a node made by a builder to the node list, which owns it from
    // then on (also when the list cannot take it), and returns it.
    template <typename NodeType>
    NodeType* addNode(std::unique_ptr<NodeType> node) {
        IC::Node* added = node.get();
        addNewNode(added);
        return node.release();
    }
    // Makes a node with the next node id under parentId and appends it.
    IC::MutableNode* newNode(unsigned int parentId, unsigned int nodeType, unsigned int index);

protected:
    unsigned int smbiosMajorVersion = 0;
    unsigned int smbiosMinorVersion = 0;
};

// A copy of s without its trailing blanks, or, when s starts with blanks,
// from its last leading blank on, as long as s counted from its start.
std::string trimstr(std::string s);

namespace SMBIOS_MI_SLOT {
// SMBIOS slot type to the agent's slot type.
extern std::map<unsigned int, unsigned int> const slotMap;
}  // namespace SMBIOS_MI_SLOT

extern SmBiosMI mysmbiosmi;
extern Error myerr;
extern std::string const myversionc;
extern unsigned int tablecount[256];

}  // namespace IC

// The exported entry point: hands the agent the plug-in object and its
// error record, and returns 0.
extern "C" __attribute__((visibility("default"))) int OpenMI(IC::ManagementInterface** mi,
                                                             IC::Error** err);
