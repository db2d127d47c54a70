// Writes the demo override dump: the SMBIOS 2.7 table of a fictional
// two-socket rack server, a Corvane RS-7400, in the override file format
// the plug-in reads. The checked-in examples/demo-server.smbios.txt is this
// program's output; a test regenerates it and compares the two.
//
//   make-demo-example OUTPUT-FILE
#include <cstdint>
#include <cstdio>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#include "DumpFormat.h"
#include "TableBuilder.h"

using smbiostest::Structure;
using smbiostest::TableBuilder;

namespace {

// Handles, unique and ascending in table order.
enum Handle : uint16_t {
    H_BIOS = 0x0000,
    H_SYSTEM,
    H_BASEBOARD,
    H_CHASSIS,
    H_CPU1,
    H_CPU2,
    H_CPU1_L1,
    H_CPU1_L2,
    H_CPU1_L3,
    H_CPU2_L1,
    H_CPU2_L2,
    H_CPU2_L3,
    H_MEMORY_ARRAY,
    H_DIMM_A1,
    H_DIMM_A2,
    H_DIMM_B1,
    H_DIMM_B2,
    H_SLOT1,
    H_SLOT2,
    H_SLOT3,
    H_CONNECTOR1,
    H_CONNECTOR2,
    H_CONNECTOR3,
    H_CONNECTOR4,
    H_OEM_STRINGS,
    H_GROUP,
    H_EVENT_LOG,
    H_VOLTAGE1,
    H_VOLTAGE2,
    H_TEMPERATURE1,
    H_TEMPERATURE2,
    H_IPMI,
    H_BOOT_INFO,
    H_END,
};

// Type 0: firmware.
Structure bios() {
    return Structure(0, H_BIOS)
        .str("Corvane")                   // vendor
        .str("CVE1.05 -[A1B2C3D-1.05]-")  // version, with the build version in brackets
        .word(0xF000)                     // starting address segment
        .str("06/14/2013")                // release date
        .byte(0x7F)                       // ROM size: (0x7F + 1) * 64 KB = 8 MB
        .qword(0x000000005C099880ull)     // characteristics: PCI, flash, shadowing, CD and
                                          // selectable boot, EDD, print screen, 8042, serial,
                                          // CGA/mono video
        .byte(0x03)                       // extension byte 1: ACPI, USB legacy
        .byte(0x0D)                       // extension byte 2: boot, content distribution, UEFI
        .byte(0x01)                       // firmware major release
        .byte(0x05)                       // firmware minor release
        .byte(0x01)                       // embedded controller major release
        .byte(0x02);                      // embedded controller minor release
}

// Type 1: the system.
Structure system() {
    return Structure(1, H_SYSTEM)
        .str("Corvane")                    // manufacturer
        .str("Corvane RS-7400 [7947AC1]")  // product name, with the machine type in brackets
        .str("01")                         // version
        .str("KQ7X4R2")                    // serial number
        .bytes({0x3E, 0x1F, 0x92, 0xA4, 0x5B, 0x07, 0x4C, 0xD8, 0x81, 0x6A, 0xF0, 0x23, 0xC5, 0x9D,
                0xB2, 0x74})  // UUID
        .byte(0x06)           // wake-up type: power switch
        .str("7947AC1")       // SKU number
        .str("Corvane RS");   // family
}

// Type 2: the main board, holding the two processors.
Structure baseboard() {
    return Structure(2, H_BASEBOARD)
        .str("Corvane")       // manufacturer
        .str("CB-7400")       // product
        .str("Rev 1.02")      // version
        .str("CB74A0012345")  // serial number
        .str("CB74-AT-0042")  // asset tag
        .byte(0x09)           // features: hosting board, replaceable
        .str("Mainboard")     // location in the chassis
        .word(H_CHASSIS)      // chassis handle
        .byte(0x0A)           // board type: motherboard
        .byte(2)              // contained object handles
        .word(H_CPU1)
        .word(H_CPU2);
}

// Type 3: the chassis.
Structure chassis() {
    return Structure(3, H_CHASSIS)
        .str("Corvane")        // manufacturer
        .byte(0x17)            // type: rack mount chassis, no lock
        .str("RS-7400 2U")     // version
        .str("CVN7400X0042")   // serial number
        .str("CVN-AT-0042")    // asset tag
        .byte(0x03)            // boot-up state: safe
        .byte(0x03)            // power supply state: safe
        .byte(0x03)            // thermal state: safe
        .byte(0x03)            // security status: none
        .dword(0x00000000)     // OEM-defined
        .byte(2)               // height in rack units
        .byte(2)               // power cords
        .byte(1)               // contained elements
        .byte(3)               // contained element record length
        .bytes({0x0A, 1, 1})   // a motherboard (board type 0x0A), at least and at most 1
        .str("RS-7400-2U-R");  // SKU number
}

// Type 4: one of the two processors.
Structure processor(uint16_t handle, char const* socket, uint16_t l1, uint16_t l2, uint16_t l3,
                    char const* assetTag) {
    return Structure(4, handle)
        .str(socket)  // socket designation
        .byte(0x03)   // type: central processor
        .byte(0xB3)   // family: Xeon
        .str("Intel")
        .bytes({0xD7, 0x06, 0x02, 0x00, 0xFF, 0xFB, 0xEB, 0xBF})  // processor ID
        .str("Intel(R) Xeon(R) CPU E5-2670 0 @ 2.60GHz")          // version
        .byte(0x8C)                                               // voltage: 1.2 V
        .word(100)                                                // external clock, MHz
        .word(4000)                                               // maximum speed, MHz
        .word(2600)                                               // current speed, MHz
        .byte(0x41)                     // status: socket populated, enabled
        .byte(0x2B)                     // upgrade: socket LGA2011-3
        .word(l1)                       // L1 cache handle
        .word(l2)                       // L2 cache handle
        .word(l3)                       // L3 cache handle
        .str("To Be Filled By O.E.M.")  // serial number
        .str(assetTag)                  // asset tag
        .str("SR0KX")                   // part number
        .byte(8)                        // cores
        .byte(8)                        // cores enabled
        .byte(16)                       // threads
        .word(0x00FC);                  // characteristics: 64-bit, multi-core, hardware threads,
                        // execute protection, virtualization, power/performance control
}

// Type 7: a processor cache.
Structure cache(uint16_t handle, char const* designation, uint16_t configuration, uint16_t size,
                uint8_t errorCorrection, uint8_t systemType, uint8_t associativity) {
    return Structure(7, handle)
        .str(designation)
        .word(configuration)  // enabled, internal, write back, level in bits 0-2
        .word(size)           // maximum size
        .word(size)           // installed size
        .word(0x0002)         // supported SRAM types: unknown
        .word(0x0002)         // current SRAM type: unknown
        .byte(0)              // speed: unknown
        .byte(errorCorrection)
        .byte(systemType)
        .byte(associativity);
}

// Type 16: the memory array.
Structure memoryArray() {
    return Structure(16, H_MEMORY_ARRAY)
        .byte(0x03)         // location: system board
        .byte(0x03)         // use: system memory
        .byte(0x06)         // error correction: multi-bit ECC
        .dword(0x08000000)  // maximum capacity, KB: 128 GB
        .word(0xFFFE)       // error information handle: none provided
        .word(4);           // memory devices
}

struct Dimm {
    uint16_t handle;
    char const* locator;
    char const* bank;
    uint16_t sizeMb;  // 0: the slot is empty
    char const* serial;
    char const* assetTag;
    char const* part;
};

// Type 17: a memory device (a DIMM slot).
Structure memoryDevice(Dimm const& dimm) {
    bool const present = dimm.sizeMb != 0;
    return Structure(17, dimm.handle)
        .word(H_MEMORY_ARRAY)                  // memory array handle
        .word(0xFFFE)                          // error information handle: none provided
        .word(present ? 72 : 0xFFFF)           // total width, bits
        .word(present ? 64 : 0xFFFF)           // data width, bits
        .word(dimm.sizeMb)                     // size, MB
        .byte(0x09)                            // form factor: DIMM
        .byte(0)                               // device set: none
        .str(dimm.locator)                     // device locator
        .str(dimm.bank)                        // bank locator
        .byte(0x18)                            // memory type: DDR3
        .word(present ? 0x2080 : 0x0004)       // type detail: registered, synchronous / unknown
        .word(present ? 1600 : 0)              // speed, MHz
        .str(present ? "Samsung" : "NO DIMM")  // manufacturer
        .str(dimm.serial)
        .str(dimm.assetTag)
        .str(dimm.part)
        .byte(present ? 2 : 0)      // attributes: rank
        .dword(0)                   // extended size: not used
        .word(present ? 1600 : 0);  // configured clock speed, MHz
}

// Type 9: a system slot.
Structure slot(uint16_t handle, char const* designation, uint8_t type, uint8_t width, bool inUse,
               uint8_t length, uint16_t id, uint8_t characteristics1, uint8_t bus) {
    return Structure(9, handle)
        .str(designation)
        .byte(type)
        .byte(width)                    // data bus width
        .byte(inUse ? 0x04 : 0x03)      // current usage: in use / available
        .byte(length)                   // slot length
        .word(id)                       // slot ID
        .byte(characteristics1)         // characteristics 1: 0x02 5.0 V, 0x04 3.3 V
        .byte(0x01)                     // characteristics 2: PME signal
        .word(inUse ? 0x0000 : 0xFFFF)  // segment group
        .byte(bus)                      // bus number
        .byte(inUse ? 0x00 : 0xFF);     // device/function number
}

// Type 8: a port connector.
Structure connector(uint16_t handle, char const* internal, uint8_t internalType,
                    char const* external, uint8_t externalType, uint8_t portType) {
    return Structure(8, handle)
        .str(internal)  // internal reference designator
        .byte(internalType)
        .str(external)  // external reference designator
        .byte(externalType)
        .byte(portType);
}

// Type 11: OEM strings.
Structure oemStrings() {
    std::vector<std::string> const texts = {
        "Corvane Diagnostics -[ABCD12X-2.10]-",
        "Ostrel Service Processor -[SP12345-3.04]-",
        "UEFI Boot Services Present",
        "$IS IDE Bus Enabled",
        "$DS Corvane Preboot Diagnostics (KVD) 3.10 -[AB12C-3.10]-",
        "Corvane Asset Services",
    };
    Structure s(11, H_OEM_STRINGS);
    s.byte(static_cast<uint8_t>(texts.size()));
    for (std::string const& text : texts) {
        s.addString(text);
    }
    return s;
}

// Type 14: the processor module group.
Structure groupAssociation() {
    return Structure(14, H_GROUP)
        .str("Cpu Module")  // group name
        .byte(4)            // item: a processor
        .word(H_CPU1)
        .byte(2)  // item: the main board
        .word(H_BASEBOARD);
}

// Type 15: the system event log.
Structure eventLog() {
    return Structure(15, H_EVENT_LOG)
        .word(0x1000)          // log area length
        .word(0x0000)          // log header start offset
        .word(0x0010)          // log data start offset
        .byte(0x03)            // access method: 32-bit physical address
        .byte(0x01)            // log status: valid, not full
        .dword(0x0000002A)     // log change token
        .dword(0xFED90000)     // access method address
        .byte(0x01)            // log header format: type 1
        .byte(2)               // supported event log type descriptors
        .byte(2)               // descriptor length
        .bytes({0x01, 0x01,    // single-bit ECC memory error, with a handle
                0x02, 0x01});  // multi-bit ECC memory error, with a handle
}

// Types 26 and 28: a voltage (millivolts) or temperature (tenths of a
// degree Celsius) probe.
Structure probe(uint8_t type, uint16_t handle, char const* description, uint8_t status,
                uint8_t location, uint16_t maximum, uint16_t minimum, uint16_t resolution,
                uint16_t tolerance, uint16_t accuracy, uint16_t nominal) {
    return Structure(type, handle)
        .str(description)
        .byte(static_cast<uint8_t>((status << 5) | location))
        .word(maximum)
        .word(minimum)
        .word(resolution)
        .word(tolerance)
        .word(accuracy)
        .dword(0)  // OEM-defined
        .word(nominal);
}

// Type 38: the baseboard management controller's IPMI interface.
Structure ipmiDevice() {
    return Structure(38, H_IPMI)
        .byte(0x01)                    // interface: KCS
        .byte(0x20)                    // IPMI revision 2.0
        .byte(0x20)                    // I2C target address
        .byte(0xFF)                    // NV storage device: none
        .qword(0x0000000000000CA3ull)  // base address 0xCA2, bit 0: I/O space
        .byte(0x00)                    // register spacing: successive bytes; no interrupt
        .byte(0x00);                   // interrupt number
}

// Type 32: system boot information.
Structure bootInfo() {
    return Structure(32, H_BOOT_INFO)
        .bytes({0, 0, 0, 0, 0, 0})  // reserved
        .byte(0x00);                // boot status: no errors
}

std::vector<uint8_t> demoTable() {
    TableBuilder table;
    table.add(bios()).add(system()).add(baseboard()).add(chassis());
    table.add(processor(H_CPU1, "CPU1", H_CPU1_L1, H_CPU1_L2, H_CPU1_L3, "CPU1 AssetTag"));
    table.add(processor(H_CPU2, "CPU2", H_CPU2_L1, H_CPU2_L2, H_CPU2_L3, "CPU2 AssetTag"));
    uint16_t const l3Size = 0x8000 | 320;  // 64 KB granularity: 20 MB
    for (uint16_t first : {static_cast<uint16_t>(H_CPU1_L1), static_cast<uint16_t>(H_CPU2_L1)}) {
        table.add(cache(first, "L1-Cache", 0x0180, 0x0020, 0x04, 0x04, 0x07));
        table.add(
            cache(static_cast<uint16_t>(first + 1), "L2-Cache", 0x0181, 0x0100, 0x05, 0x05, 0x07));
        table.add(
            cache(static_cast<uint16_t>(first + 2), "L3-Cache", 0x0182, l3Size, 0x05, 0x05, 0x08));
    }
    table.add(memoryArray());
    Dimm const dimms[] = {
        {H_DIMM_A1, "DIMM_A1", "BANK 0", 16384, "35A1C2F0", "DIMM_A1_AssetTag", "M393B2G70BH0-YK0"},
        {H_DIMM_A2, "DIMM_A2", "BANK 1", 16384, "35A1C31E", "DIMM_A2_AssetTag", "M393B2G70BH0-YK0"},
        {H_DIMM_B1, "DIMM_B1", "BANK 2", 0, "NO DIMM", "NO DIMM", "NO DIMM"},
        {H_DIMM_B2, "DIMM_B2", "BANK 3", 8192, "1B7E90D4", "DIMM_B2_AssetTag", "M393B1K70DH0-YK0"},
    };
    for (Dimm const& dimm : dimms) {
        table.add(memoryDevice(dimm));
    }
    table.add(slot(H_SLOT1, "PCIE Slot 1", 0xB6, 0x0D, true, 0x04, 1, 0x04, 0x03));
    table.add(slot(H_SLOT2, "PCIE Slot 2", 0xB4, 0x0A, false, 0x03, 2, 0x04, 0xFF));
    table.add(slot(H_SLOT3, "PCI Slot 3", 0x06, 0x05, false, 0x03, 3, 0x06, 0xFF));
    table.add(connector(H_CONNECTOR1, "Compute ITE 1", 0xFF, "", 0x00, 0xFF));
    table.add(connector(H_CONNECTOR2, "Rear Compute ITE 2", 0xFF, "", 0x00, 0xFF));
    table.add(connector(H_CONNECTOR3, "J1A1 USB", 0x00, "Front USB", 0x12, 0x10));
    table.add(connector(H_CONNECTOR4, "J2A1 COM", 0x00, "Rear COM 1", 0x08, 0x09));
    table.add(oemStrings()).add(groupAssociation()).add(eventLog());
    // Voltage probes: status 3 is OK; locations 3 processor, 4 disk.
    table.add(probe(26, H_VOLTAGE1, "CPU1 Vcore", 3, 3, 1500, 900, 10, 50, 100, 1200));
    table.add(probe(26, H_VOLTAGE2, "Backplane 12V", 3, 4, 13200, 10800, 10, 500, 100, 12000));
    // Temperature probes: the second one reports non-critical (status 4).
    table.add(
        probe(28, H_TEMPERATURE1, "CPU1 Temp", 3, 3, 0x03E8, 0x0000, 500, 20, 0x8000, 0x0190));
    table.add(
        probe(28, H_TEMPERATURE2, "CPU2 Temp", 4, 3, 0x03E8, 0x0000, 500, 20, 0x8000, 0x0190));
    table.add(ipmiDevice()).add(bootInfo());
    table.endOfTable(H_END);
    return table.build();
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::cerr << "usage: make-demo-example OUTPUT-FILE\n";
        return 2;
    }
    std::vector<uint8_t> const table = demoTable();
    smbiosdump::TableStats const stats = smbiosdump::tableStats(table);
    std::vector<uint8_t> const header = smbiosdump::makeSmEntryPoint(
        2, 7, static_cast<uint16_t>(table.size()), 0x000F0000, stats.count, stats.maxSize);
    std::string const text = smbiosdump::formatOverride(header, table);

    std::ofstream out(argv[1], std::ios::binary | std::ios::trunc);
    out << text;
    out.close();
    if (!out) {
        std::cerr << "make-demo-example: cannot write " << argv[1] << "\n";
        return 1;
    }
    return 0;
}
