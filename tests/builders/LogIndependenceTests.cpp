// The inventory tree never depends on the log configuration. Each build
// below runs at the default levels, at the agent's thresholds and with every
// level on (see LogLevels.h); the trees must be equal, and so must the
// warnings and errors logged, since a read that throws inside a skipped
// detail line shows as an error only one run has.
//
// - Every structure of the demo table and of the real machines' dumps, cut
//   short in every way the table model can hold, through each builder that
//   takes its type and through the raw-table nodes, on its own.
// - The demo table's whole inventory (root, computer system, chassis,
//   planar and every builder under it, the BMC and sensor nodes) with each
//   of its structures cut short in place, and each dump's whole inventory.
// - The harness itself: builds that read inside a log line must show.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <functional>
#include <iostream>
#include <map>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <typeinfo>
#include <utility>
#include <vector>

#include "BuilderFixture.h"
#include "DumpFormat.h"
#include "LogLevels.h"
#include "PluginRead.h"
#include "TreeSnapshot.h"
#include "mi/BuilderSkeleton.h"
#include "smbios/Logging.h"

using buildertest::compareLevels;
using buildertest::LevelComparison;
using buildertest::LogToFile;
using buildertest::StructureLists;
using buildertest::TestMI;
using buildertest::treeSnapshot;
using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

typedef std::vector<uint8_t> Bytes;

// ---------------------------------------------------------------------------
// Where the structures come from

struct SourceTable {
    std::string name;
    Bytes table;
};

// The demo server's table, from the checked-in override dump, read as the
// plug-in reads it.
SourceTable demoTable() {
    char const* source = std::getenv("SMBIOS_SOURCE_DIR");
    if (source == nullptr || *source == '\0') {
        throw std::runtime_error("SMBIOS_SOURCE_DIR is not set");
    }
    smbiosdump::PluginRead const read =
        smbiosdump::readOverrideFile(std::string(source) + "/examples/demo-server.smbios.txt");
    if (!read.ok()) {
        throw std::runtime_error(
            "the demo dump does not read: import " + std::to_string(read.imported) + ", header " +
            std::to_string(read.head) + ", table " + std::to_string(read.tables));
    }
    return SourceTable{"demo-server", read.table};
}

// The table of one corpus dump.
SourceTable corpusTable(std::string const& name) {
    smbiosdump::DumpImage image;
    std::string error;
    if (!smbiosdump::readDumpBin(
            smbiostest::fileBytes(smbiostest::corpusDir() + "/" + name + ".bin"), image, error)) {
        throw std::runtime_error(name + ".bin does not read: " + error);
    }
    return SourceTable{name, image.table};
}

// The structures of a table, each as its bytes: the formatted area and the
// string set with its double NUL, as the table model parsed them.
std::vector<Bytes> structuresOf(Bytes const& table) {
    std::vector<Bytes> structures;
    SD::SmBios const parsed(table);
    for (SD::SmBios::Table const& structure : parsed.getTables()) {
        structures.push_back(structure.getData());
    }
    return structures;
}

// ---------------------------------------------------------------------------
// The ways a structure is cut short

struct Cut {
    std::string what;
    Bytes bytes;
    // Whether the bytes end without the string set's terminator, so that
    // nothing may follow them in a table.
    bool unterminated;
};

// Every shorter length with the length byte rewritten and the formatted
// area cut there, the string set kept (a structure keeps its 4-byte
// header); then the structure's first n bytes for every n from 4 on, the
// length byte as it was and no terminator, the table ending there: inside
// the formatted area (the length byte claims more than there is) and inside
// the string set.
std::vector<Cut> cutsOf(Bytes const& structure) {
    std::vector<Cut> cuts;
    if (structure.size() < 4) {
        return cuts;
    }
    size_t const length = std::min<size_t>(structure[1], structure.size());
    for (size_t cut = 4; cut < length; ++cut) {
        Cut shorter{"length byte " + std::to_string(cut),
                    Bytes(structure.begin(), structure.begin() + static_cast<std::ptrdiff_t>(cut)),
                    false};
        shorter.bytes[1] = static_cast<uint8_t>(cut);
        shorter.bytes.insert(shorter.bytes.end(),
                             structure.begin() + static_cast<std::ptrdiff_t>(length),
                             structure.end());
        cuts.push_back(shorter);
    }
    for (size_t cut = 4; cut < structure.size(); ++cut) {
        cuts.push_back(Cut{
            "first " + std::to_string(cut) + " bytes, unterminated",
            Bytes(structure.begin(), structure.begin() + static_cast<std::ptrdiff_t>(cut)), true});
    }
    return cuts;
}

// ---------------------------------------------------------------------------
// The builders that take each structure type

// One builder call under the given parent, on lists made for it alone; it
// may return text to add to the snapshot (what a lookup found).
typedef std::function<std::string(TestMI&, IC::TableLists, unsigned int)> Step;

uint16_t handleOf(Bytes const& structure) {
    return static_cast<uint16_t>(structure[2] | (structure[3] << 8));
}

// A probe's location (byte 5, low five bits), or 0 when the structure is
// too short to hold it.
unsigned int probeLocation(Bytes const& structure) {
    return structure.size() > 5 && structure[1] > 5 ? structure[5] & 0x1Fu : 0u;
}

// A builder of the plug-in that takes the structure lists and the parent
// alone.
typedef void (IC::SmBiosMI::*Build)(IC::TableLists, unsigned int);
// One that takes a third number: a cache handle or a probe location.
typedef void (IC::SmBiosMI::*BuildWith)(IC::TableLists, unsigned int, unsigned int);

// The step that runs the builder and adds nothing to the snapshot.
Step stepOf(Build build) {
    return [build](TestMI& mi, IC::TableLists lists, unsigned int parent) {
        (mi.*build)(lists, parent);
        return std::string();
    };
}
Step stepOf(BuildWith build, unsigned int with) {
    return [build, with](TestMI& mi, IC::TableLists lists, unsigned int parent) {
        (mi.*build)(lists, parent, with);
        return std::string();
    };
}

// The builders of lists and parent alone that read a structure of the type,
// in the order they run.
std::vector<Build> buildersOf(uint8_t type) {
    using MI = IC::SmBiosMI;
    static std::map<uint8_t, std::vector<Build>> const builders = {
        // The system's texts are read by the chassis and planar builders
        // too, whether or not there is a chassis or baseboard.
        {1, {&MI::makeComputerNodes, &MI::makeChassisNodes, &MI::makePlanarNodes}},
        {11, {&MI::makeDiskControllerNodes, &MI::makeFirmwareNodes, &MI::makeKVDNode}},
        // The types one builder reads.
        {0, {&MI::makeFirmwareNodes}},
        {2, {&MI::makePlanarNodes}},
        {3, {&MI::makeChassisNodes}},
        {4, {&MI::makeCpuNodes}},
        {8, {&MI::makeConnectorNodes}},
        {9, {&MI::makeSlotNodes}},
        {15, {&MI::makeLogNodes}},
        {16, {&MI::makeDimmNodes}},
        {17, {&MI::makeDimmNodes}},
        {38, {&MI::makeBMCNodes}},
    };
    auto const found = builders.find(type);
    return found == builders.end() ? std::vector<Build>() : found->second;
}

// The group lookup makes no node: what it finds for each item of the group
// goes into the snapshot.
Step groupLookups(Bytes const& group) {
    std::vector<std::pair<unsigned int, unsigned int>> items;
    for (size_t at = 5; at + 2 < group.size() && at + 2 < group[1]; at += 3) {
        items.push_back(std::make_pair(
            group[at], static_cast<unsigned int>(group[at + 1] | (group[at + 2] << 8))));
    }
    return [items](TestMI& mi, IC::TableLists lists, unsigned int) {
        std::ostringstream found;
        for (auto const& item : items) {
            found << "group lookup " << item.first << " " << item.second << ":";
            for (auto const& member : mi.findGroup(lists, item.first, item.second)) {
                found << " " << static_cast<unsigned int>(member.first) << "/" << member.second;
            }
            found << "\n";
        }
        return found.str();
    };
}

// The builders that read a structure of this type, given the structure as it
// was before any cut (the handle a processor would name, the location a
// host would ask for). The raw-table nodes of the frame come with every
// type; a type no builder takes gets them alone.
std::vector<Step> stepsFor(Bytes const& original) {
    std::vector<Step> steps;
    uint8_t const type = original[0];
    for (Build build : buildersOf(type)) {
        steps.push_back(stepOf(build));
    }
    if (type == 7) {
        steps.push_back(stepOf(&IC::SmBiosMI::makeCacheNodes, handleOf(original)));
    } else if (type == 14) {
        steps.push_back(groupLookups(original));
    } else if (type == 26) {
        steps.push_back(stepOf(&IC::SmBiosMI::makeVoltageSensorNodes, probeLocation(original)));
    } else if (type == 28) {
        steps.push_back(stepOf(&IC::SmBiosMI::makeTemperatureSensorNodes, probeLocation(original)));
    }
    if (type <= 31) {
        steps.push_back(stepOf(&IC::SmBiosMI::makeSMBIOSTableNodes));
    }
    return steps;
}

// The tree the steps make from a raw table under a parent node (as a
// planar or a computer system would be), with what the steps returned;
// each step gets structure lists of its own, as a builder that takes the
// lists over leaves nothing for the next.
std::string buildSteps(Bytes const& raw, std::vector<Step> const& steps) {
    SD::SmBios const parsed(raw);
    TestMI mi;
    IC::MutableNode* parent = buildertest::addParent(mi);
    std::string extra;
    for (size_t i = 0; i < steps.size(); ++i) {
        StructureLists lists(parsed);
        // A failure that leaves a builder (the plug-in's root catches it)
        // is part of the result, and must not depend on the levels either.
        try {
            extra += steps[i](mi, lists.get(), parent->getNodeId());
        } catch (std::exception const& e) {
            extra += "step " + std::to_string(i) + " threw " + typeid(e).name() + " " +
                     buildertest::quoted(e.what()) + "\n";
        } catch (...) {
            extra += "step " + std::to_string(i) + " threw\n";
        }
    }
    return treeSnapshot(mi.nodeList) + extra;
}

// The whole inventory of a raw table, as initialize makes it below the
// management-interface node (root, computer system, chassis, planar and
// everything the planar runs), then the nodes only a host asks for: the
// BMC nodes and the sensor nodes of every probe location the table uses,
// under the root.
std::string buildWholeTree(Bytes const& raw, std::set<unsigned int> const& locations) {
    SD::SmBios const parsed(raw);
    TestMI mi;
    {
        StructureLists lists(parsed);
        mi.makeRootNode(lists.get());
    }
    unsigned int const root = 2;
    {
        StructureLists lists(parsed);
        mi.makeBMCNodes(lists.get(), root);
    }
    for (unsigned int location : locations) {
        StructureLists lists(parsed);
        mi.makeTemperatureSensorNodes(lists.get(), root, location);
        mi.makeVoltageSensorNodes(lists.get(), root, location);
    }
    return treeSnapshot(mi.nodeList);
}

std::set<unsigned int> probeLocations(std::vector<Bytes> const& structures) {
    std::set<unsigned int> locations;
    for (Bytes const& structure : structures) {
        if (structure[0] == 26 || structure[0] == 28) {
            locations.insert(probeLocation(structure));
        }
    }
    return locations;
}

Bytes joined(std::vector<Bytes> const& structures) {
    Bytes table;
    for (Bytes const& structure : structures) {
        table.insert(table.end(), structure.begin(), structure.end());
    }
    return table;
}

// ---------------------------------------------------------------------------
// Running the comparisons

// The computer-system builder reads the process's table for its UUID rule.
// An empty table is acquired once, up front, from a folder with neither an
// override file nor libpmem.so: the builds then depend on nothing of this
// machine, and no acquisition (with its own log lines) happens inside one
// of the compared runs.
void acquireEmptyTable() {
    if (frametest::tableAlreadyAcquired()) {
        return;
    }
    smbiostest::TempDir dir;
    smbiostest::ScopedEnv data("KESTREL_DATA_DIR", dir.path() + "/");
    smbiostest::ScopedEnv code("KESTREL_CODE_DIR", dir.path() + "/");
    buildertest::ScopedLogLevels const quiet(QNLog::LEVEL_OFF, QNLog::LEVEL_OFF);
    SD::SmBios const acquired;
}

// Counts the comparisons and reports the first few that differ.
class Checker {
public:
    explicit Checker(std::string source) : source_(std::move(source)) {}

    template <class Build>
    void check(std::string const& what, Build&& build) {
        ++compared_;
        LevelComparison const result = compareLevels(build, file_);
        if (result.same()) {
            return;
        }
        ++differing_;
        if (differing_ <= kReported) {
            ADD_FAILURE() << source_ << ", " << what << ": the log settings change the result\n"
                          << result.difference();
        }
    }

    size_t compared() const { return compared_; }
    size_t differing() const { return differing_; }

    // Every structure of the table, cut in every way, through the builders
    // of its type on its own.
    void checkStructuresAlone(Bytes const& table) {
        std::vector<Bytes> const structures = structuresOf(table);
        std::set<Bytes> seen;
        for (size_t i = 0; i < structures.size(); ++i) {
            Bytes const& structure = structures[i];
            // A structure repeated byte for byte (many in a virtual
            // machine's table) gives the same runs again.
            if (structure.size() < 4 || !seen.insert(structure).second) {
                continue;
            }
            std::vector<Step> const steps = stepsFor(structure);
            std::string const where = "structure " + std::to_string(i) + " (type " +
                                      std::to_string(structure[0]) + ", handle " +
                                      std::to_string(handleOf(structure)) + ")";
            check(where + " whole", [&] { return buildSteps(structure, steps); });
            for (Cut const& cut : cutsOf(structure)) {
                check(where + ", " + cut.what, [&] { return buildSteps(cut.bytes, steps); });
            }
        }
    }

    void finish() const {
        EXPECT_GT(compared_, 0u) << source_ << ": nothing was compared";
        EXPECT_EQ(0u, differing_) << source_ << ": " << differing_ << " of " << compared_
                                  << " comparisons differ (the first " << kReported
                                  << " are reported)";
    }

private:
    static constexpr size_t kReported = 5;
    std::string source_;
    LogToFile file_;
    size_t compared_ = 0;
    size_t differing_ = 0;
};

// Calls `use` on the table of every corpus dump, once the empty table is
// acquired. Skips the test (there being no real dumps to `what`) without a
// corpus; fails it when the corpus holds no dump.
void forEachCorpusDump(std::string const& what,
                       std::function<void(SourceTable const&)> const& use) {
    if (smbiostest::corpusDir().empty()) {
        GTEST_SKIP() << "SMBIOS_CORPUS_DIR is unset or not a folder; no real dumps to " << what;
    }
    std::vector<std::string> const names = smbiostest::corpusNames();
    ASSERT_FALSE(names.empty()) << "no .bin dumps in " << smbiostest::corpusDir();
    acquireEmptyTable();
    for (std::string const& name : names) {
        use(corpusTable(name));
    }
}

double secondsSince(std::chrono::steady_clock::time_point start) {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

}  // namespace

// ---------------------------------------------------------------------------
// The harness itself: a read inside a log line is what it must notice.

namespace {

QNLog::QNLogger probeLogger("Quillon.IC.MI.SmBiosMI.LogIndependenceProbe");

// Deliberately reads a field only inside a detail line, as a builder must
// not: the harness must tell these builds apart from correct ones.
struct ReadsInLogLines : TestMI {
    // A node per baseboard, then the chassis handle read only for the log,
    // then a second node: at the default levels the read never happens.
    void buildChangingTheTree(IC::TableLists lists, unsigned int parentId) {
        IC::forEachStructure(SMBIOS_HERE, probeLogger, lists, 2, [&](IC::TableData& entry, size_t) {
            newNode(parentId, 41, 0);
            SMBIOS_DETAIL(probeLogger, "Handle=" << getNumber16(entry.table, 0x0B));
            newNode(parentId, 41, 1);
        });
    }
    // The read comes last: the tree is the same either way, only the
    // failure the read raises tells.
    void buildKeepingTheTree(IC::TableLists lists, unsigned int parentId) {
        IC::forEachStructure(SMBIOS_HERE, probeLogger, lists, 2, [&](IC::TableData& entry, size_t) {
            newNode(parentId, 41, 0);
            SMBIOS_DETAIL(probeLogger, "Handle=" << getNumber16(entry.table, 0x0B));
        });
    }
};

// The table of one baseboard of length 0x0C: the word at 0x0B straddles the
// end.
Bytes straddlingBaseboardTable() {
    return buildertest::tableOf({buildertest::straddlingBaseboard(0x0200)}).build();
}

size_t lineCount(std::string const& text) {
    return static_cast<size_t>(std::count(text.begin(), text.end(), '\n'));
}

template <void (ReadsInLogLines::*build)(IC::TableLists, unsigned int)>
std::string buildReadingInLogLines(Bytes const& raw) {
    SD::SmBios const parsed(raw);
    ReadsInLogLines mi;
    IC::MutableNode* parent = buildertest::addParent(mi);
    StructureLists lists(parsed);
    (mi.*build)(lists.get(), parent->getNodeId());
    return treeSnapshot(mi.nodeList);
}

}  // namespace

TEST(LogIndependenceHarness, NoticesAReadInsideALogLineThatChangesTheTree) {
    Bytes const raw = straddlingBaseboardTable();
    ASSERT_EQ(0x0C, raw[1]);
    LogToFile file;
    LevelComparison const result = compareLevels(
        [&] { return buildReadingInLogLines<&ReadsInLogLines::buildChangingTheTree>(raw); }, file);
    EXPECT_FALSE(result.treesEqual()) << result.atDefault;
    EXPECT_FALSE(result.same());
    // Parent and two nodes at the default levels; the read throws with
    // every level on and the second node is never made.
    EXPECT_EQ(3u, lineCount(result.atDefault)) << result.atDefault;
    EXPECT_EQ(2u, lineCount(result.everyLevelOn)) << result.everyLevelOn;
    EXPECT_NE("", result.difference());
}

TEST(LogIndependenceHarness, NoticesAReadInsideALogLineThatOnlyRaisesAFailure) {
    Bytes const raw = straddlingBaseboardTable();
    LogToFile file;
    LevelComparison const result = compareLevels(
        [&] { return buildReadingInLogLines<&ReadsInLogLines::buildKeepingTheTree>(raw); }, file);
    EXPECT_TRUE(result.treesEqual()) << result.difference();
    EXPECT_FALSE(result.messagesEqual());
    EXPECT_FALSE(result.same());
    EXPECT_TRUE(result.agentMessages.empty()) << result.difference();
    ASSERT_EQ(1u, result.everyMessages.size()) << result.difference();
    EXPECT_NE(std::string::npos, result.everyMessages[0].find("Exception="))
        << result.everyMessages[0];
}

TEST(LogIndependenceHarness, AgentThresholdsRunLogsTheFailuresARealReadRaises) {
    // The same straddling word read before the log line: every run fails
    // alike, and the agent-level run writes the failure to its file.
    Bytes const raw = straddlingBaseboardTable();
    int const logLevel = QNLog::QNLogger::getLogLevel();
    int const traceLevel = QNLog::QNLogger::getTraceLevel();
    LogToFile file;
    LevelComparison const result = compareLevels(
        [&] {
            SD::SmBios const parsed(raw);
            TestMI mi;
            IC::MutableNode* parent = buildertest::addParent(mi);
            StructureLists lists(parsed);
            mi.makePlanarNodes(lists.get(), parent->getNodeId());
            return treeSnapshot(mi.nodeList);
        },
        file);
    EXPECT_TRUE(result.same()) << result.difference();
    ASSERT_EQ(1u, result.agentMessages.size()) << result.difference();
    EXPECT_EQ(0u, result.agentMessages[0].find("log 6000 Quillon.IC.MI.SmBiosMI.SmBiosMIPlnr "
                                               "makePlanarNodes SmBiosMIPlnr.cpp:"))
        << result.agentMessages[0];
    EXPECT_NE(std::string::npos, result.agentMessages[0].find(" Exception= Type="))
        << result.agentMessages[0];
    // The thresholds are back as they were.
    EXPECT_EQ(logLevel, QNLog::QNLogger::getLogLevel());
    EXPECT_EQ(traceLevel, QNLog::QNLogger::getTraceLevel());
}

TEST(LogIndependenceHarness, LogFileReadsBackTheMessagesWrittenSinceTheLastRead) {
    buildertest::ScopedLogLevels const levels(SD::LOG_WARNING, SD::LOG_DETAIL);
    LogToFile file;
    SMBIOS_ERROR(probeLogger, "before the reset");
    file.reset();
    SMBIOS_DETAIL(probeLogger, "a detail: the trace only");
    SMBIOS_WARNING(probeLogger, "a warning");
    SMBIOS_ERROR(probeLogger, "an error\nover two lines");
    std::vector<std::string> const messages = file.takeMessages(SD::LOG_WARNING);
    ASSERT_EQ(2u, messages.size());
    std::string const where =
        " Quillon.IC.MI.SmBiosMI.LogIndependenceProbe TestBody "
        "LogIndependenceTests.cpp:";
    EXPECT_EQ(0u, messages[0].find("log 5000" + where)) << messages[0];
    EXPECT_NE(std::string::npos, messages[0].find(" a warning")) << messages[0];
    EXPECT_EQ(0u, messages[1].find("log 6000" + where)) << messages[1];
    EXPECT_NE(std::string::npos, messages[1].find(" an error\nover two lines")) << messages[1];
    // Only the errors, and nothing again once read.
    EXPECT_TRUE(file.takeMessages(SD::LOG_WARNING).empty());
    SMBIOS_ERROR(probeLogger, "later");
    std::vector<std::string> const later = file.takeMessages(SD::LOG_ERROR);
    ASSERT_EQ(1u, later.size());
    EXPECT_NE(std::string::npos, later[0].find(" later")) << later[0];
    // The trace output's messages, when asked for.
    SMBIOS_DETAIL(probeLogger, "traced");
    std::vector<std::string> const traced = file.takeMessages(0, "trace");
    ASSERT_EQ(1u, traced.size());
    EXPECT_EQ(0u, traced[0].find("trace 3000" + where)) << traced[0];
}

// ---------------------------------------------------------------------------
// The demo table

TEST(LogIndependence, DemoInventoryIsTheSameAtEveryLogSetting) {
    acquireEmptyTable();
    SourceTable const demo = demoTable();
    std::vector<Bytes> const structures = structuresOf(demo.table);
    std::set<unsigned int> const locations = probeLocations(structures);
    Checker checker(demo.name);
    checker.check("whole table", [&] { return buildWholeTree(demo.table, locations); });
    checker.finish();

    // The whole tree is there: every builder made its nodes.
    std::string const tree = buildWholeTree(demo.table, locations);
    for (unsigned int type :
         {59u, 40u, 1u, 41u, 4u, 42u, 31u, 32u, 19u, 62u, 3u, 35u, 53u, 55u, 13u, 21u, 22u}) {
        EXPECT_NE(std::string::npos, tree.find(" type " + std::to_string(type) + " "))
            << "no node of type " << type << " in\n"
            << tree;
    }
}

TEST(LogIndependence, DemoInventoryWithEachStructureCutShortIsTheSameAtEveryLogSetting) {
    acquireEmptyTable();
    auto const start = std::chrono::steady_clock::now();
    SourceTable const demo = demoTable();
    std::vector<Bytes> const structures = structuresOf(demo.table);
    std::set<unsigned int> const locations = probeLocations(structures);
    Checker checker(demo.name + " in place");
    for (size_t i = 0; i < structures.size(); ++i) {
        for (Cut const& cut : cutsOf(structures[i])) {
            std::vector<Bytes> table = structures;
            table[i] = cut.bytes;
            if (cut.unterminated) {
                // Nothing may follow bytes without their terminator: the
                // cut structure goes last.
                table.erase(table.begin() + static_cast<std::ptrdiff_t>(i));
                table.push_back(cut.bytes);
            }
            Bytes const raw = joined(table);
            checker.check("structure " + std::to_string(i) + " (type " +
                              std::to_string(structures[i][0]) + "), " + cut.what,
                          [&] { return buildWholeTree(raw, locations); });
        }
    }
    checker.finish();
    std::cout << "[ info     ] " << checker.compared() << " whole-table comparisons in "
              << secondsSince(start) << " s" << std::endl;
}

TEST(LogIndependence, DemoStructuresCutShortGiveTheSameTreesAtEveryLogSetting) {
    acquireEmptyTable();
    auto const start = std::chrono::steady_clock::now();
    SourceTable const demo = demoTable();
    Checker checker(demo.name);
    checker.checkStructuresAlone(demo.table);
    checker.finish();
    std::cout << "[ info     ] " << checker.compared() << " comparisons in " << secondsSince(start)
              << " s" << std::endl;
}

// ---------------------------------------------------------------------------
// The real machines' dumps

TEST(LogIndependence, CorpusStructuresCutShortGiveTheSameTreesAtEveryLogSetting) {
    auto const start = std::chrono::steady_clock::now();
    size_t dumps = 0;
    size_t compared = 0;
    forEachCorpusDump("cut", [&](SourceTable const& dump) {
        Checker checker(dump.name);
        checker.checkStructuresAlone(dump.table);
        checker.finish();
        compared += checker.compared();
        ++dumps;
    });
    if (dumps > 0) {
        std::cout << "[ info     ] " << dumps << " dumps, " << compared << " comparisons in "
                  << secondsSince(start) << " s" << std::endl;
    }
}

TEST(LogIndependence, CorpusInventoriesAreTheSameAtEveryLogSetting) {
    forEachCorpusDump("build", [](SourceTable const& dump) {
        std::set<unsigned int> const locations = probeLocations(structuresOf(dump.table));
        Checker checker(dump.name);
        checker.check("whole table", [&] { return buildWholeTree(dump.table, locations); });
        checker.finish();
    });
}
