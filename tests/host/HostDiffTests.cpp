// smbios-inventory diff run as a person runs it, on a real machine's dump
// from the corpus and on copies of it altered with the table builder: a
// memory device emptied, the BIOS version changed, a processor disabled, a
// slot added. Each file may be a --dump-bin file, an override dump file or
// a JSON inventory; the lines printed and the exit status are checked
// exactly.

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <nlohmann/json.hpp>
#include <stdexcept>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "HostRunner.h"
#include "TableBuilder.h"
#include "TestSupport.h"
#include "inventory/PropertyNames.h"

namespace {

using hosttest::RunResult;
using Json = nlohmann::json;

// A dual-socket server with three slots and six memory devices.
char const kMachine[] = "SuperMicro-X9DBL";

// Handles of its structures that the tests change.
uint16_t const kBiosHandle = 0x0000;
uint16_t const kFirstProcessorHandle = 0x0004;
uint16_t const kFirstMemoryDeviceHandle = 0x002F;
uint16_t const kNewSlotHandle = 0x00F0;

std::string realPlugin() { return hosttest::outDir() + "/libsmbiosmi.so"; }

// The property's name as diff shows it: from the catalog, else its id.
std::string nameOf(unsigned int type, unsigned int id) {
    inventory::PropertyInfo const* info = inventory::findProperty(type, id);
    return info != nullptr ? std::string(info->name) : "property " + std::to_string(id);
}

// One structure of a table: its header, the fields after it, its strings.
struct Record {
    uint8_t type = 0;
    uint16_t handle = 0;
    std::vector<uint8_t> fields;
    std::vector<std::string> strings;
};

// The structures of a table, up to and including the end-of-table one.
std::vector<Record> recordsOf(std::vector<uint8_t> const& table) {
    std::vector<Record> records;
    size_t at = 0;
    while (at + 4 <= table.size()) {
        Record record;
        record.type = table[at];
        record.handle = static_cast<uint16_t>(table[at + 2] | table[at + 3] << 8);
        size_t const length = table[at + 1];
        record.fields.assign(table.begin() + static_cast<std::ptrdiff_t>(at + 4),
                             table.begin() + static_cast<std::ptrdiff_t>(at + length));
        size_t next = at + length;
        while (next < table.size() && table[next] != 0) {
            size_t end = next;
            while (end < table.size() && table[end] != 0) {
                ++end;
            }
            record.strings.emplace_back(table.begin() + static_cast<std::ptrdiff_t>(next),
                                        table.begin() + static_cast<std::ptrdiff_t>(end));
            next = end + 1;
        }
        // The set's closing NUL, and the second one of a structure without
        // strings.
        next += record.strings.empty() ? 2 : 1;
        records.push_back(record);
        if (record.type == 127) {
            break;
        }
        at = next;
    }
    return records;
}

smbiostest::TableBuilder tableOf(std::vector<Record> const& records) {
    smbiostest::TableBuilder table;
    for (Record const& record : records) {
        smbiostest::Structure structure(record.type, record.handle);
        structure.bytes(record.fields);
        for (std::string const& text : record.strings) {
            structure.addString(text);
        }
        table.add(structure);
    }
    return table;
}

Record& withHandle(std::vector<Record>& records, uint16_t handle) {
    for (Record& record : records) {
        if (record.handle == handle) {
            return record;
        }
    }
    throw std::runtime_error("no structure with handle " + std::to_string(handle));
}

// The structure's formatted area as the raw table node's property 180
// shows it: {type, length, handle, fields...}, one number a byte.
std::string formattedArea(Record const& record) {
    unsigned int const handle = record.handle;
    std::vector<unsigned int> bytes = {record.type,
                                       static_cast<unsigned int>(4 + record.fields.size()),
                                       handle & 0xFFu, handle >> 8};
    bytes.insert(bytes.end(), record.fields.begin(), record.fields.end());
    std::string text = "{";
    for (unsigned int byte : bytes) {
        text += (text.size() > 1 ? ", " : "") + std::to_string(byte);
    }
    return text + "}";
}

// The structure's strings as property 179 shows them.
std::string stringList(Record const& record) {
    std::string text = "{";
    for (std::string const& string : record.strings) {
        text += (text.size() > 1 ? ", \"" : "\"") + string + "\"";
    }
    return text + "}";
}

std::string planar() { return "Computer System/Chassis/Planar"; }

std::string rawPath(Record const& record) {
    char handle[16];
    std::snprintf(handle, sizeof handle, "0x%04X", record.handle);
    return planar() + "/SMBIOS Table type " + std::to_string(record.type) + " handle " + handle;
}

// The line of a raw structure whose formatted area changed.
std::string rawAreaLine(Record const& before, Record const& after) {
    return "~ " + rawPath(after) + ": " + nameOf(55, 180) + ": " + formattedArea(before) + " -> " +
           formattedArea(after) + "\n";
}

// ---- The alterations -----------------------------------------------------------

// The first memory device's socket emptied: size 0, no module installed.
void emptyMemoryDevice(std::vector<Record>& records) {
    Record& device = withHandle(records, kFirstMemoryDeviceHandle);
    device.fields[0x0C - 4] = 0;
    device.fields[0x0D - 4] = 0;
}

// The BIOS version string (string 2 of the BIOS structure) changed.
void changeBiosVersion(std::vector<Record>& records) {
    Record& bios = withHandle(records, kBiosHandle);
    ASSERT_EQ(bios.fields[0x05 - 4], 2);
    ASSERT_EQ(bios.strings.at(1), "3.00");
    bios.strings[1] = "3.10";
}

// The first processor disabled by the firmware: status 0x43 (socket
// populated, CPU disabled by BIOS) for 0x41.
void disableProcessor(std::vector<Record>& records) {
    Record& processor = withHandle(records, kFirstProcessorHandle);
    ASSERT_EQ(processor.fields[0x18 - 4], 0x41);
    processor.fields[0x18 - 4] = 0x43;
}

// A slot added after the last one: a PCI Express x8 slot, available,
// long, slot id 7.
void addSlot(std::vector<Record>& records) {
    size_t last = 0;
    for (size_t i = 0; i < records.size(); ++i) {
        if (records[i].type == 9) {
            last = i;
        }
    }
    Record slot;
    slot.type = 9;
    slot.handle = kNewSlotHandle;
    // designation, type, bus width, usage, length, id, characteristics
    // 1 and 2, segment, bus, device/function
    slot.fields = {1, 0xA9, 0x0B, 0x03, 0x04, 0x07, 0x00, 0x04, 0x01, 0x00, 0x00, 0x00, 0x00};
    slot.strings = {"CPU1 SLOT7 PCI-E 3.0 X8"};
    records.insert(records.begin() + static_cast<std::ptrdiff_t>(last + 1), slot);
}

class HostDiff : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_FALSE(hosttest::outDir().empty())
            << "SMBIOS_OUT_DIR is not set; run the tests through ctest";
        ASSERT_TRUE(std::filesystem::exists(realPlugin())) << realPlugin();
        char const* emulator = std::getenv("SMBIOS_TEST_EMULATOR");
        if (emulator != nullptr && *emulator != '\0') {
            // diff reads a dump through a run of its own program, which the
            // kernel cannot start for an emulated 32-bit host.
            GTEST_SKIP() << "the host runs under " << emulator
                         << " here, where its run of itself cannot start; the native builds "
                            "run these tests";
        }
        if (smbiostest::corpusDir().empty()) {
            GTEST_SKIP() << "no corpus of real SMBIOS dumps (SMBIOS_CORPUS_DIR)";
        }
        original_ = smbiostest::corpusDir() + "/" + kMachine + ".bin";
        if (!std::filesystem::exists(original_)) {
            GTEST_SKIP() << "the corpus has no " << kMachine << ".bin";
        }
        std::string error;
        ASSERT_TRUE(smbiosdump::readDumpBin(smbiostest::fileBytes(original_), image_, error))
            << error;
        records_ = recordsOf(image_.table);
        // Put together again unchanged, the structures give the same table.
        ASSERT_EQ(tableOf(records_).build(), image_.table);
    }

    // The records written as a --dump-bin file.
    std::string writeBin(std::string const& name, std::vector<Record> const& records) {
        smbiostest::TableBuilder const table = tableOf(records);
        std::vector<uint8_t> bin = smbiosdump::makeSmEntryPoint(
            image_.major, image_.minor, static_cast<uint16_t>(table.size()),
            smbiosdump::DUMP_BIN_TABLE_OFFSET, table.count(), table.maxSize());
        bin.resize(smbiosdump::DUMP_BIN_TABLE_OFFSET, 0);
        std::vector<uint8_t> const bytes = table.build();
        bin.insert(bin.end(), bytes.begin(), bytes.end());
        std::string const file = folder_.file(name + ".bin");
        smbiostest::writeFile(file, bin);
        return file;
    }

    // The records written as an override dump file.
    std::string writeOverride(std::string const& name, std::vector<Record> const& records) {
        smbiostest::TableBuilder const table = tableOf(records);
        std::vector<uint8_t> const header = smbiosdump::makeSmEntryPoint(
            image_.major, image_.minor, static_cast<uint16_t>(table.size()), 0x20, table.count(),
            table.maxSize());
        std::string const file = folder_.file(name + ".smbios.txt");
        smbiostest::writeFile(file, smbiosdump::formatOverride(header, table.build()));
        return file;
    }

    // The JSON inventory of a dump, as --format json writes it.
    std::string writeJson(std::string const& name, std::string const& dumpBin) {
        RunResult const run = hosttest::runHost(
            {"--plugin", realPlugin(), "--format", "json", "--from-bin", dumpBin});
        EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
        std::string const file = folder_.file(name + ".json");
        smbiostest::writeFile(file, run.out);
        return file;
    }

    static RunResult diff(std::string const& before, std::string const& after,
                          std::vector<std::string> const& options = {}) {
        std::vector<std::string> args = {"diff", "--plugin", realPlugin()};
        args.insert(args.end(), options.begin(), options.end());
        args.push_back(before);
        args.push_back(after);
        return hosttest::runHost(args);
    }

    static void expectDiffers(RunResult const& run, std::string const& lines) {
        EXPECT_EQ(run.exitStatus, 1) << hosttest::describe(run);
        EXPECT_EQ(run.out, lines);
        EXPECT_EQ(run.err, "");
    }

    static void expectEqual(RunResult const& run) {
        EXPECT_EQ(run.exitStatus, 0) << hosttest::describe(run);
        EXPECT_EQ(run.out, "");
        EXPECT_EQ(run.err, "");
    }

    // A failed diff: exit status 2, nothing on standard output, and a
    // message that names the file.
    static void expectTrouble(RunResult const& run, std::string const& file,
                              std::string const& message) {
        EXPECT_EQ(run.exitStatus, 2) << hosttest::describe(run);
        EXPECT_EQ(run.out, "");
        EXPECT_NE(run.err.find(file), std::string::npos) << run.err;
        EXPECT_NE(run.err.find(message), std::string::npos) << run.err;
    }

    std::string original_;
    smbiosdump::DumpImage image_;
    std::vector<Record> records_;
    smbiostest::TempDir folder_;
};

// ---- Equal inventories ---------------------------------------------------------

TEST_F(HostDiff, ADumpAgainstItselfIsEqual) {
    expectEqual(diff(original_, original_));
    // The same table as an override dump file.
    expectEqual(diff(original_, writeOverride("same", records_)));
}

TEST_F(HostDiff, AJsonInventoryAgainstItsOwnDumpIsEqual) {
    // The clock readings of the two runs differ and are left out.
    std::string const json = writeJson("original", original_);
    expectEqual(diff(json, original_));
    expectEqual(diff(original_, json));
    expectEqual(diff(json, json));
}

// ---- One change at a time ------------------------------------------------------

TEST_F(HostDiff, AnEmptiedMemoryDeviceIsRemoved) {
    std::vector<Record> after = records_;
    emptyMemoryDevice(after);
    std::string const lines = "- " + planar() + "/P1-DIMM1A:P0_Node0_Channel0_Dimm0\n" +
                              rawAreaLine(withHandle(records_, kFirstMemoryDeviceHandle),
                                          withHandle(after, kFirstMemoryDeviceHandle));
    // --dump-bin against --dump-bin.
    expectDiffers(diff(original_, writeBin("emptied", after)), lines);
}

TEST_F(HostDiff, AChangedBiosVersionIsAChangedProperty) {
    std::vector<Record> after = records_;
    changeBiosVersion(after);
    Record const& oldBios = withHandle(records_, kBiosHandle);
    Record const& newBios = withHandle(after, kBiosHandle);
    // The raw structure comes before the firmware node in the tree; the
    // version is also the version text (134) when it has no build number.
    std::string const lines = "~ " + rawPath(newBios) + ": " + nameOf(55, 179) + ": " +
                              stringList(oldBios) + " -> " + stringList(newBios) + "\n" + "~ " +
                              planar() + "/BIOS: " + nameOf(3, 134) + ": \"3.00\" -> \"3.10\"\n" +
                              "~ " + planar() + "/BIOS: " + nameOf(3, 307) +
                              ": \"3.00\" -> \"3.10\"\n";
    // A JSON inventory against a --dump-bin file.
    expectDiffers(diff(writeJson("original", original_), writeBin("bios", after)), lines);
}

TEST_F(HostDiff, ADisabledProcessorIsRemovedAndTheOtherKeepsItsSocket) {
    std::vector<Record> after = records_;
    disableProcessor(after);
    // The second processor, "CPU 2" before, is "CPU 1" now: it is paired by
    // its socket and nothing of it is reported.
    std::string const lines = "- " + planar() + "/CPU \"SOCKET 0\"\n" +
                              rawAreaLine(withHandle(records_, kFirstProcessorHandle),
                                          withHandle(after, kFirstProcessorHandle));
    // A --dump-bin file against an override dump file.
    expectDiffers(diff(original_, writeOverride("disabled", after)), lines);
}

TEST_F(HostDiff, AnAddedSlotIsAdded) {
    std::vector<Record> after = records_;
    addSlot(after);
    std::string const lines = "+ " + planar() + "/System Slot \"CPU1 SLOT7 PCI-E 3.0 X8\"\n" +
                              "+ " + rawPath(withHandle(after, kNewSlotHandle)) + "\n";
    // JSON against JSON, and the other way round.
    std::string const before = writeJson("original", original_);
    std::string const now = writeJson("slot", writeBin("slot", after));
    expectDiffers(diff(before, now), lines);
    expectDiffers(diff(now, before), "- " + planar() +
                                         "/System Slot \"CPU1 SLOT7 PCI-E 3.0 X8\"\n" + "- " +
                                         rawPath(withHandle(after, kNewSlotHandle)) + "\n");
}

// ---- All four at once ------------------------------------------------------------

TEST_F(HostDiff, AllFourChangesComeInTheOrderOfTheTree) {
    std::vector<Record> after = records_;
    emptyMemoryDevice(after);
    changeBiosVersion(after);
    disableProcessor(after);
    addSlot(after);
    Record const& oldBios = withHandle(records_, kBiosHandle);
    Record const& newBios = withHandle(after, kBiosHandle);
    // Under the planar: processors, slots, memory devices, raw structures
    // (by type), firmware.
    std::string const lines =
        "- " + planar() + "/CPU \"SOCKET 0\"\n" + "+ " + planar() +
        "/System Slot \"CPU1 SLOT7 PCI-E 3.0 X8\"\n" + "- " + planar() +
        "/P1-DIMM1A:P0_Node0_Channel0_Dimm0\n" + "~ " + rawPath(newBios) + ": " + nameOf(55, 179) +
        ": " + stringList(oldBios) + " -> " + stringList(newBios) + "\n" +
        rawAreaLine(withHandle(records_, kFirstProcessorHandle),
                    withHandle(after, kFirstProcessorHandle)) +
        "+ " + rawPath(withHandle(after, kNewSlotHandle)) + "\n" +
        rawAreaLine(withHandle(records_, kFirstMemoryDeviceHandle),
                    withHandle(after, kFirstMemoryDeviceHandle)) +
        "~ " + planar() + "/BIOS: " + nameOf(3, 134) + ": \"3.00\" -> \"3.10\"\n" + "~ " +
        planar() + "/BIOS: " + nameOf(3, 307) + ": \"3.00\" -> \"3.10\"\n";
    expectDiffers(diff(original_, writeBin("all", after)), lines);
}

TEST_F(HostDiff, JsonOutputListsTheSameDifferences) {
    std::vector<Record> after = records_;
    disableProcessor(after);
    changeBiosVersion(after);
    RunResult const run = diff(original_, writeBin("two", after), {"--format", "json"});
    ASSERT_EQ(run.exitStatus, 1) << hosttest::describe(run);
    Json const document = Json::parse(run.out);
    Json const& list = document.at("differences");
    ASSERT_EQ(list.size(), 5u) << run.out;
    EXPECT_EQ(list[0], Json::parse(R"({"change": "removed", "type": 4, "description": "CPU 1",
        "path": "Computer System/Chassis/Planar/CPU \"SOCKET 0\""})"));
    EXPECT_EQ(list[1]["change"], "changed");
    EXPECT_EQ(list[1]["path"], rawPath(withHandle(after, kBiosHandle)));
    EXPECT_EQ(list[1]["property"], 179);
    EXPECT_EQ(list[1]["old"]["value"], Json(withHandle(records_, kBiosHandle).strings));
    EXPECT_EQ(list[1]["new"]["value"], Json(withHandle(after, kBiosHandle).strings));
    EXPECT_EQ(list[2]["property"], 180);
    EXPECT_EQ(list[2]["path"], rawPath(withHandle(after, kFirstProcessorHandle)));
    Json const version = list[4];
    EXPECT_EQ(version["path"], planar() + "/BIOS");
    EXPECT_EQ(version["type"], 3);
    EXPECT_EQ(version["property"], 307);
    EXPECT_EQ(version["old"], Json::parse(R"({"kind": "string", "value": "3.00"})"));
    EXPECT_EQ(version["new"], Json::parse(R"({"kind": "string", "value": "3.10"})"));
    EXPECT_EQ(version.contains("name"), inventory::findProperty(3, 307) != nullptr);

    // Equal inventories: an empty list and exit status 0.
    RunResult const same = diff(original_, original_, {"--format", "json"});
    EXPECT_EQ(same.exitStatus, 0) << hosttest::describe(same);
    EXPECT_EQ(same.out, "{\"differences\": []}\n");
}

// ---- Files that are not inventories ----------------------------------------------

TEST_F(HostDiff, AFileOfNoKnownKindExitsTwo) {
    std::string const text = folder_.file("notes.txt");
    smbiostest::writeFile(text, "hello\n");
    expectTrouble(diff(original_, text), text,
                  "neither a JSON inventory (--format json), an override dump file nor a "
                  "--dump-bin file");
    std::string const other = folder_.file("other.json");
    smbiostest::writeFile(other, "{\"machines\": []}\n");
    expectTrouble(diff(other, original_), other, "not an inventory: no \"nodes\" list");
    std::string const broken = folder_.file("broken.json");
    smbiostest::writeFile(broken, "{\"nodes\": [\n");
    expectTrouble(diff(original_, broken), broken, "not valid JSON");
    std::string const missing = folder_.file("missing.bin");
    expectTrouble(diff(missing, original_), missing, "cannot open: No such file or directory");
}

TEST_F(HostDiff, ADumpThePlugInWouldNotTakeExitsTwo) {
    std::string const dump = folder_.file("cut.smbios.txt");
    smbiostest::writeFile(dump, "<SHOWSMBIOS>\n<EPHEADER>\n5F534D5F\n");
    RunResult const run = diff(original_, dump);
    expectTrouble(run, dump, "no inventory: the inventory run ended with exit status 2");
    // The child run said why first.
    EXPECT_NE(run.err.find("no </EPHEADER>"), std::string::npos) << run.err;

    std::string const bin = folder_.file("short.bin");
    smbiostest::writeFile(bin, "_SM_");
    expectTrouble(diff(bin, original_), bin, "no inventory");
}

TEST_F(HostDiff, AFifoIsRefusedWithoutWaitingOnIt) {
    std::string const fifo = folder_.file("pipe");
    ASSERT_EQ(mkfifo(fifo.c_str(), 0600), 0);
    RunResult const run = hosttest::runProgramWithin(
        hosttest::hostPath(), {"diff", "--plugin", realPlugin(), fifo, original_}, {}, 60);
    ASSERT_FALSE(run.timedOut);
    expectTrouble(run, fifo, "a FIFO, not a regular file");
}

TEST_F(HostDiff, OptionsOfTheInventoryRunAreRefused) {
    RunResult const run =
        hosttest::runHost({"--bmc", "diff", "--plugin", realPlugin(), original_, original_});
    EXPECT_EQ(run.exitStatus, 2) << hosttest::describe(run);
    EXPECT_EQ(run.out, "");
    EXPECT_NE(run.err.find("--bmc is not an option of diff"), std::string::npos) << run.err;
    RunResult const one = hosttest::runHost({"diff", original_});
    EXPECT_EQ(one.exitStatus, 2) << hosttest::describe(one);
    EXPECT_NE(one.err.find("NEW is required"), std::string::npos) << one.err;
}

}  // namespace
