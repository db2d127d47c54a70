#include "inventory/PropertyNames.h"

#include <algorithm>
#include <iterator>
#include <utility>

namespace inventory {

namespace {

// ---- Value meanings ---------------------------------------------------------
// Each table is sorted by value. Where a builder passes an SMBIOS field on
// unchanged, the table gives the SMBIOS meaning of the field's values; where
// it maps the field to the inventory's own numbering, the table gives what
// each mapped value stands for.

// System wake-up types of the computer system (property 65).
constexpr ValueMeaning kWakeUpTypes[] = {
    {0, "Reserved"},     {1, "Other"},      {2, "Unknown"},
    {3, "APM Timer"},    {4, "Modem Ring"}, {5, "LAN Remote"},
    {6, "Power Switch"}, {7, "PCI PME#"},   {8, "AC Power Restored"},
};

// The chassis type as the chassis builder maps it (property 11).
constexpr ValueMeaning kChassisTypes[] = {
    {0, "Unknown"},
    {1, "Other, or a multi-system chassis"},
    {3, "Desktop"},
    {4, "Low profile desktop"},
    {5, "Pizza box"},
    {6, "Mini tower"},
    {7, "Tower"},
    {8, "Portable"},
    {9, "Laptop"},
    {10, "Notebook"},
    {11, "Hand held"},
    {12, "Docking station"},
    {13, "All in one"},
    {14, "Sub notebook"},
    {15, "Space-saving"},
    {16, "Lunch box"},
    {17, "Main server chassis (also rack mount and blade)"},
    {19, "Sub chassis"},
    {20, "Bus expansion chassis"},
    {21, "Peripheral chassis"},
    {22, "RAID chassis"},
    {24, "Sealed-case PC"},
    {26, "CompactPCI"},
    {27, "AdvancedTCA"},
    {28, "Blade enclosure"},
};

// The kind of package a chassis is (property 213).
constexpr ValueMeaning kPackageTypes[] = {
    {3, "Chassis"},
    {16, "Blade"},
    {17, "Blade enclosure"},
};

// Boot-up, power supply and thermal state of a chassis (4, 46, 60).
constexpr ValueMeaning kChassisStates[] = {
    {1, "Other"},   {2, "Unknown"},  {3, "Safe"},
    {4, "Warning"}, {5, "Critical"}, {6, "Non-recoverable"},
};

// Security status of a chassis (49).
constexpr ValueMeaning kSecurityStatuses[] = {
    {1, "Other"},
    {2, "Unknown"},
    {3, "None"},
    {4, "External interface locked out"},
    {5, "External interface enabled"},
};

// Feature flags of a baseboard (planar property 44): one bit each.
constexpr ValueMeaning kBoardFeatures[] = {
    {0, "No features"},
    {1, "Hosting board"},
    {2, "Needs a daughter board"},
    {3, "Hosting board, needs a daughter board"},
    {4, "Removable"},
    {5, "Hosting board, removable"},
    {6, "Needs a daughter board, removable"},
    {7, "Hosting board, needs a daughter board, removable"},
    {8, "Replaceable"},
    {9, "Hosting board, replaceable"},
    {10, "Needs a daughter board, replaceable"},
    {11, "Hosting board, needs a daughter board, replaceable"},
    {12, "Removable, replaceable"},
    {13, "Hosting board, removable, replaceable"},
    {14, "Needs a daughter board, removable, replaceable"},
    {15, "Hosting board, needs a daughter board, removable, replaceable"},
    {16, "Hot swappable"},
    {17, "Hosting board, hot swappable"},
    {18, "Needs a daughter board, hot swappable"},
    {19, "Hosting board, needs a daughter board, hot swappable"},
    {20, "Removable, hot swappable"},
    {21, "Hosting board, removable, hot swappable"},
    {22, "Needs a daughter board, removable, hot swappable"},
    {23, "Hosting board, needs a daughter board, removable, hot swappable"},
    {24, "Replaceable, hot swappable"},
    {25, "Hosting board, replaceable, hot swappable"},
    {26, "Needs a daughter board, replaceable, hot swappable"},
    {27, "Hosting board, needs a daughter board, replaceable, hot swappable"},
    {28, "Removable, replaceable, hot swappable"},
    {29, "Hosting board, removable, replaceable, hot swappable"},
    {30, "Needs a daughter board, removable, replaceable, hot swappable"},
    {31, "Hosting board, needs a daughter board, removable, replaceable, hot swappable"},
};

// Baseboard types (planar property 128).
constexpr ValueMeaning kBoardTypes[] = {
    {1, "Unknown"},
    {2, "Other"},
    {3, "Server blade"},
    {4, "Connectivity switch"},
    {5, "System management module"},
    {6, "Processor module"},
    {7, "I/O module"},
    {8, "Memory module"},
    {9, "Daughter board"},
    {10, "Motherboard"},
    {11, "Processor and memory module"},
    {12, "Processor and I/O module"},
    {13, "Interconnect board"},
};

// Processor types (296).
constexpr ValueMeaning kProcessorTypes[] = {
    {1, "Other"},          {2, "Unknown"},       {3, "Central processor"},
    {4, "Math processor"}, {5, "DSP processor"}, {6, "Video processor"},
};

// Processor families (298).
constexpr ValueMeaning kProcessorFamilies[] = {
    {0x01, "Other"},
    {0x02, "Unknown"},
    {0x03, "8086"},
    {0x04, "80286"},
    {0x05, "Intel386"},
    {0x06, "Intel486"},
    {0x07, "8087"},
    {0x08, "80287"},
    {0x09, "80387"},
    {0x0A, "80487"},
    {0x0B, "Pentium"},
    {0x0C, "Pentium Pro"},
    {0x0D, "Pentium II"},
    {0x0E, "Pentium with MMX"},
    {0x0F, "Celeron"},
    {0x10, "Pentium II Xeon"},
    {0x11, "Pentium III"},
    {0x12, "M1"},
    {0x13, "M2"},
    {0x14, "Celeron M"},
    {0x15, "Pentium 4 HT"},
    {0x18, "Duron"},
    {0x19, "K5"},
    {0x1A, "K6"},
    {0x1B, "K6-2"},
    {0x1C, "K6-3"},
    {0x1D, "Athlon"},
    {0x1E, "AMD29000"},
    {0x1F, "K6-2+"},
    {0x20, "Power PC"},
    {0x21, "Power PC 601"},
    {0x22, "Power PC 603"},
    {0x23, "Power PC 603+"},
    {0x24, "Power PC 604"},
    {0x25, "Power PC 620"},
    {0x26, "Power PC x704"},
    {0x27, "Power PC 750"},
    {0x28, "Core Duo"},
    {0x29, "Core Duo mobile"},
    {0x2A, "Core Solo mobile"},
    {0x2B, "Atom"},
    {0x2C, "Core M"},
    {0x2D, "Core m3"},
    {0x2E, "Core m5"},
    {0x2F, "Core m7"},
    {0x30, "Alpha"},
    {0x31, "Alpha 21064"},
    {0x32, "Alpha 21066"},
    {0x33, "Alpha 21164"},
    {0x34, "Alpha 21164PC"},
    {0x35, "Alpha 21164a"},
    {0x36, "Alpha 21264"},
    {0x37, "Alpha 21364"},
    {0x38, "Turion II Ultra dual-core mobile M"},
    {0x39, "Turion II dual-core mobile M"},
    {0x3A, "Athlon II dual-core M"},
    {0x3B, "Opteron 6100"},
    {0x3C, "Opteron 4100"},
    {0x3D, "Opteron 6200"},
    {0x3E, "Opteron 4200"},
    {0x3F, "FX"},
    {0x40, "MIPS"},
    {0x41, "MIPS R4000"},
    {0x42, "MIPS R4200"},
    {0x43, "MIPS R4400"},
    {0x44, "MIPS R4600"},
    {0x45, "MIPS R10000"},
    {0x46, "C-Series"},
    {0x47, "E-Series"},
    {0x48, "A-Series"},
    {0x49, "G-Series"},
    {0x4A, "Z-Series"},
    {0x4B, "R-Series"},
    {0x4C, "Opteron 4300"},
    {0x4D, "Opteron 6300"},
    {0x4E, "Opteron 3300"},
    {0x4F, "FirePro"},
    {0x50, "SPARC"},
    {0x51, "SuperSPARC"},
    {0x52, "microSPARC II"},
    {0x53, "microSPARC IIep"},
    {0x54, "UltraSPARC"},
    {0x55, "UltraSPARC II"},
    {0x56, "UltraSPARC IIi"},
    {0x57, "UltraSPARC III"},
    {0x58, "UltraSPARC IIIi"},
    {0x60, "68040"},
    {0x61, "68xxx"},
    {0x62, "68000"},
    {0x63, "68010"},
    {0x64, "68020"},
    {0x65, "68030"},
    {0x66, "Athlon X4 quad-core"},
    {0x67, "Opteron X1000"},
    {0x68, "Opteron X2000 APU"},
    {0x69, "Opteron A-Series"},
    {0x6A, "Opteron X3000 APU"},
    {0x6B, "Zen"},
    {0x70, "Hobbit"},
    {0x78, "Crusoe TM5000"},
    {0x79, "Crusoe TM3000"},
    {0x7A, "Efficeon TM8000"},
    {0x80, "Weitek"},
    {0x82, "Itanium"},
    {0x83, "Athlon 64"},
    {0x84, "Opteron"},
    {0x85, "Sempron"},
    {0x86, "Turion 64 mobile"},
    {0x87, "Dual-core Opteron"},
    {0x88, "Athlon 64 X2 dual-core"},
    {0x89, "Turion 64 X2 mobile"},
    {0x8A, "Quad-core Opteron"},
    {0x8B, "Third-generation Opteron"},
    {0x8C, "Phenom FX quad-core"},
    {0x8D, "Phenom X4 quad-core"},
    {0x8E, "Phenom X2 dual-core"},
    {0x8F, "Athlon X2 dual-core"},
    {0x90, "PA-RISC"},
    {0x91, "PA-RISC 8500"},
    {0x92, "PA-RISC 8000"},
    {0x93, "PA-RISC 7300LC"},
    {0x94, "PA-RISC 7200"},
    {0x95, "PA-RISC 7100LC"},
    {0x96, "PA-RISC 7100"},
    {0xA0, "V30"},
    {0xA1, "Quad-core Xeon 3200"},
    {0xA2, "Dual-core Xeon 3000"},
    {0xA3, "Quad-core Xeon 5300"},
    {0xA4, "Dual-core Xeon 5100"},
    {0xA5, "Dual-core Xeon 5000"},
    {0xA6, "Dual-core Xeon LV"},
    {0xA7, "Dual-core Xeon ULV"},
    {0xA8, "Dual-core Xeon 7100"},
    {0xA9, "Quad-core Xeon 5400"},
    {0xAA, "Quad-core Xeon"},
    {0xAB, "Dual-core Xeon 5200"},
    {0xAC, "Dual-core Xeon 7200"},
    {0xAD, "Quad-core Xeon 7300"},
    {0xAE, "Quad-core Xeon 7400"},
    {0xAF, "Multi-core Xeon 7400"},
    {0xB0, "Pentium III Xeon"},
    {0xB1, "Pentium III with SpeedStep"},
    {0xB2, "Pentium 4"},
    {0xB3, "Xeon"},
    {0xB4, "AS400"},
    {0xB5, "Xeon MP"},
    {0xB6, "Athlon XP"},
    {0xB7, "Athlon MP"},
    {0xB8, "Itanium 2"},
    {0xB9, "Pentium M"},
    {0xBA, "Celeron D"},
    {0xBB, "Pentium D"},
    {0xBC, "Pentium Extreme Edition"},
    {0xBD, "Core Solo"},
    {0xBF, "Core 2 Duo"},
    {0xC0, "Core 2 Solo"},
    {0xC1, "Core 2 Extreme"},
    {0xC2, "Core 2 Quad"},
    {0xC3, "Core 2 Extreme mobile"},
    {0xC4, "Core 2 Duo mobile"},
    {0xC5, "Core 2 Solo mobile"},
    {0xC6, "Core i7"},
    {0xC7, "Dual-core Celeron"},
    {0xC8, "IBM390"},
    {0xC9, "G4"},
    {0xCA, "G5"},
    {0xCB, "ESA/390 G6"},
    {0xCC, "z/Architecture"},
    {0xCD, "Core i5"},
    {0xCE, "Core i3"},
    {0xCF, "Core i9"},
    {0xD2, "C7-M"},
    {0xD3, "C7-D"},
    {0xD4, "C7"},
    {0xD5, "Eden"},
    {0xD6, "Multi-core Xeon"},
    {0xD7, "Dual-core Xeon 3xxx"},
    {0xD8, "Quad-core Xeon 3xxx"},
    {0xD9, "Nano"},
    {0xDA, "Dual-core Xeon 5xxx"},
    {0xDB, "Quad-core Xeon 5xxx"},
    {0xDD, "Dual-core Xeon 7xxx"},
    {0xDE, "Quad-core Xeon 7xxx"},
    {0xDF, "Multi-core Xeon 7xxx"},
    {0xE0, "Multi-core Xeon 3400"},
    {0xE4, "Opteron 3000"},
    {0xE5, "Sempron II"},
    {0xE6, "Embedded quad-core Opteron"},
    {0xE7, "Phenom triple-core"},
    {0xE8, "Turion Ultra dual-core mobile"},
    {0xE9, "Turion dual-core mobile"},
    {0xEA, "Athlon dual-core"},
    {0xEB, "Sempron SI"},
    {0xEC, "Phenom II"},
    {0xED, "Athlon II"},
    {0xEE, "Six-core Opteron"},
    {0xEF, "Sempron M"},
    {0xFA, "i860"},
    {0xFB, "i960"},
    {0xFE, "Given by the processor family 2 field"},
};

// Processor upgrade (socket) as the processor builder maps it: the SMBIOS
// value less 2 (304).
constexpr ValueMeaning kProcessorUpgrades[] = {
    {0, "Unknown or other"},
    {1, "Daughter board"},
    {2, "ZIF socket"},
    {3, "Replaceable piggy back"},
    {4, "None"},
    {5, "LIF socket"},
    {6, "Slot 1"},
    {7, "Slot 2"},
    {8, "370-pin socket"},
    {9, "Slot A"},
    {10, "Slot M"},
    {11, "Socket 423"},
    {12, "Socket A (462)"},
    {13, "Socket 478"},
    {14, "Socket 754"},
    {15, "Socket 940"},
    {16, "Socket 939"},
    {17, "Socket mPGA604"},
    {18, "Socket LGA771"},
    {19, "Socket LGA775"},
    {20, "Socket S1"},
};

// Cache write policy as the cache builder maps it (72).
constexpr ValueMeaning kCacheModes[] = {
    {0, "Unknown"},
    {1, "Write back"},
    {2, "Write through"},
    {3, "Varies with memory address"},
};

// Cache types as the cache builder maps them (9).
constexpr ValueMeaning kCacheTypes[] = {
    {0, "Other or unknown"},
    {1, "Instruction"},
    {2, "Data"},
    {3, "Unified"},
};

// Cache associativity as the cache builder maps it (5).
constexpr ValueMeaning kAssociativities[] = {
    {0, "Other or unknown"},
    {1, "Direct mapped"},
    {2, "Fully associative"},
    {3, "2-way"},
    {4, "4-way"},
    {5, "8-way"},
    {6, "16-way"},
};

// Where a memory array sits (302).
constexpr ValueMeaning kArrayLocations[] = {
    {0x01, "Other"},
    {0x02, "Unknown"},
    {0x03, "System board or motherboard"},
    {0x04, "ISA add-on card"},
    {0x05, "EISA add-on card"},
    {0x06, "PCI add-on card"},
    {0x07, "MCA add-on card"},
    {0x08, "PCMCIA add-on card"},
    {0x09, "Proprietary add-on card"},
    {0x0A, "NuBus"},
    {0xA0, "PC-98/C20 add-on card"},
    {0xA1, "PC-98/C24 add-on card"},
    {0xA2, "PC-98/E add-on card"},
    {0xA3, "PC-98/Local bus add-on card"},
    {0xA4, "CXL add-on card"},
};

// What a memory array is used for (303).
constexpr ValueMeaning kArrayUses[] = {
    {1, "Other"},        {2, "Unknown"},          {3, "System memory"}, {4, "Video memory"},
    {5, "Flash memory"}, {6, "Non-volatile RAM"}, {7, "Cache memory"},
};

// Error correction of a memory array (300).
constexpr ValueMeaning kErrorCorrections[] = {
    {1, "Other"},          {2, "Unknown"},       {3, "None"}, {4, "Parity"},
    {5, "Single-bit ECC"}, {6, "Multi-bit ECC"}, {7, "CRC"},
};

// Memory device form factors as the memory builder maps them (85).
constexpr ValueMeaning kFormFactors[] = {
    {0, "Unknown"}, {1, "Other (also chip, row of chips, FB-DIMM)"},
    {2, "SIP"},     {3, "DIP"},
    {4, "ZIP"},     {6, "Proprietary card"},
    {7, "SIMM"},    {8, "DIMM"},
    {9, "TSOP"},    {11, "RIMM"},
    {12, "SODIMM"}, {13, "SRIMM"},
};

// Memory types as the memory builder maps them (295).
constexpr ValueMeaning kMemoryTypes[] = {
    {0, "Unknown"},
    {1, "Other (also 3DRAM, DDR4 and later types)"},
    {2, "DRAM (also EPROM)"},
    {6, "EDRAM"},
    {7, "VRAM"},
    {8, "SRAM"},
    {9, "RAM"},
    {10, "ROM"},
    {11, "Flash"},
    {12, "EEPROM"},
    {13, "FEPROM"},
    {15, "CDRAM"},
    {17, "SDRAM"},
    {18, "SGRAM"},
    {19, "RDRAM"},
    {20, "DDR"},
    {21, "DDR2"},
    {23, "DDR2 FB-DIMM"},
    {24, "DDR3"},
    {25, "FBD2"},
};

// Slot types as the slot builder maps them (62/128).
constexpr ValueMeaning kSlotTypes[] = {
    {0, "Unknown"},
    {1, "Other (also legacy buses, AGP and newer slot types)"},
    {7, "Processor, memory or I/O riser card slot"},
    {16, "PCI"},
    {17, "PCI-X"},
    {18, "PCI Express"},
    {19, "PCI Express x1"},
    {20, "PCI Express x2"},
    {21, "PCI Express x4"},
    {22, "PCI Express x8"},
    {23, "PCI Express x16"},
};

// Port types of a port connector (70/128).
constexpr ValueMeaning kPortTypes[] = {
    {0x00, "None"},
    {0x01, "Parallel port XT/AT compatible"},
    {0x02, "Parallel port PS/2"},
    {0x03, "Parallel port ECP"},
    {0x04, "Parallel port EPP"},
    {0x05, "Parallel port ECP/EPP"},
    {0x06, "Serial port XT/AT compatible"},
    {0x07, "Serial port 16450 compatible"},
    {0x08, "Serial port 16550 compatible"},
    {0x09, "Serial port 16550A compatible"},
    {0x0A, "SCSI port"},
    {0x0B, "MIDI port"},
    {0x0C, "Joystick port"},
    {0x0D, "Keyboard port"},
    {0x0E, "Mouse port"},
    {0x0F, "SSA SCSI"},
    {0x10, "USB"},
    {0x11, "FireWire (IEEE 1394)"},
    {0x12, "PCMCIA type I"},
    {0x13, "PCMCIA type II"},
    {0x14, "PCMCIA type III"},
    {0x15, "CardBus"},
    {0x16, "Access bus port"},
    {0x17, "SCSI II"},
    {0x18, "SCSI wide"},
    {0x19, "PC-98"},
    {0x1A, "PC-98 Hireso"},
    {0x1B, "PC-H98"},
    {0x1C, "Video port"},
    {0x1D, "Audio port"},
    {0x1E, "Modem port"},
    {0x1F, "Network port"},
    {0x20, "SATA"},
    {0x21, "SAS"},
    {0x22, "Multi-function display port"},
    {0x23, "Thunderbolt"},
    {0xA0, "8251 compatible"},
    {0xA1, "8251 FIFO compatible"},
    {0xFF, "Other"},
};

// Where a temperature or voltage probe sits (21/31, 22/31).
constexpr ValueMeaning kProbeLocations[] = {
    {1, "Other"},
    {2, "Unknown"},
    {3, "Processor"},
    {4, "Disk"},
    {5, "Peripheral bay"},
    {6, "System management module"},
    {7, "Motherboard"},
    {8, "Memory module"},
    {9, "Processor module"},
    {10, "Power unit"},
    {11, "Add-in card"},
    {12, "Front panel board"},
    {13, "Back panel board"},
    {14, "Power system board"},
    {15, "Drive back plane"},
};

// SMBIOS structure types that get a raw table node (55/177).
constexpr ValueMeaning kStructureTypes[] = {
    {0, "BIOS information"},
    {1, "System information"},
    {2, "Baseboard information"},
    {3, "System enclosure or chassis"},
    {4, "Processor information"},
    {5, "Memory controller information"},
    {6, "Memory module information"},
    {7, "Cache information"},
    {8, "Port connector information"},
    {9, "System slots"},
    {10, "On board devices information"},
    {11, "OEM strings"},
    {12, "System configuration options"},
    {13, "BIOS language information"},
    {14, "Group associations"},
    {15, "System event log"},
    {16, "Physical memory array"},
    {17, "Memory device"},
    {18, "32-bit memory error information"},
    {19, "Memory array mapped address"},
    {20, "Memory device mapped address"},
    {21, "Built-in pointing device"},
    {22, "Portable battery"},
    {23, "System reset"},
    {24, "Hardware security"},
    {25, "System power controls"},
    {26, "Voltage probe"},
    {27, "Cooling device"},
    {28, "Temperature probe"},
    {29, "Electrical current probe"},
    {30, "Out-of-band remote access"},
    {31, "Boot integrity services entry point"},
};

#define MEANINGS(table) table, std::size(table)
#define NO_MEANINGS nullptr, 0

// Units, spelled once.
char const kNoUnit[] = "";
char const kKB[] = "KB";
char const kMHz[] = "MHz";
char const kBits[] = "bits";
char const kBytes[] = "bytes";
char const kCelsius[] =
    "\xC2\xB0"
    "C";
char const kVolts[] = "V";

// Every property any builder sets, ordered by node type, then id:
// findProperty searches it by halves.
constexpr PropertyInfo kCatalog[] = {
    // chassis
    {1, 2, "Asset tag", kNoUnit, NO_MEANINGS},
    {1, 4, "Boot-up state", kNoUnit, MEANINGS(kChassisStates)},
    {1, 10, "Lock present", kNoUnit, NO_MEANINGS},
    {1, 11, "Chassis type", kNoUnit, MEANINGS(kChassisTypes)},
    {1, 21, "Height", "U", NO_MEANINGS},
    {1, 31, "Board location", kNoUnit, NO_MEANINGS},
    {1, 36, "Manufacturer", kNoUnit, NO_MEANINGS},
    {1, 39, "Product name", kNoUnit, NO_MEANINGS},
    {1, 42, "Power cords", kNoUnit, NO_MEANINGS},
    {1, 43, "OEM-defined", kNoUnit, NO_MEANINGS},
    {1, 45, "Part number", kNoUnit, NO_MEANINGS},
    {1, 46, "Power supply state", kNoUnit, MEANINGS(kChassisStates)},
    {1, 49, "Security status", kNoUnit, MEANINGS(kSecurityStatuses)},
    {1, 50, "Serial number", kNoUnit, NO_MEANINGS},
    {1, 60, "Thermal state", kNoUnit, MEANINGS(kChassisStates)},
    {1, 108, "Name", kNoUnit, NO_MEANINGS},
    {1, 172, "Board product", kNoUnit, NO_MEANINGS},
    {1, 213, "Package type", kNoUnit, MEANINGS(kPackageTypes)},
    {1, 307, "Version", kNoUnit, NO_MEANINGS},

    // firmware
    {3, 36, "Manufacturer", kNoUnit, NO_MEANINGS},
    {3, 70, "Build", kNoUnit, NO_MEANINGS},
    {3, 104, "Major version", kNoUnit, NO_MEANINGS},
    {3, 107, "Minor version", kNoUnit, NO_MEANINGS},
    {3, 108, "Name", kNoUnit, NO_MEANINGS},
    {3, 134, "Version number", kNoUnit, NO_MEANINGS},
    {3, 164, "Release date", kNoUnit, NO_MEANINGS},
    {3, 175, "SMBIOS version", kNoUnit, NO_MEANINGS},
    {3, 187, "Embedded controller major release", kNoUnit, NO_MEANINGS},
    {3, 188, "Embedded controller minor release", kNoUnit, NO_MEANINGS},
    {3, 307, "Version", kNoUnit, NO_MEANINGS},

    // processor
    {4, 2, "Asset tag", kNoUnit, NO_MEANINGS},
    {4, 15, "Data width", kBits, NO_MEANINGS},
    {4, 19, "External clock", kMHz, NO_MEANINGS},
    {4, 36, "Manufacturer", kNoUnit, NO_MEANINGS},
    {4, 38, "Maximum speed", kMHz, NO_MEANINGS},
    {4, 45, "Part number", kNoUnit, NO_MEANINGS},
    {4, 50, "Serial number", kNoUnit, NO_MEANINGS},
    {4, 53, "Socket", kNoUnit, NO_MEANINGS},
    {4, 55, "Socket populated", kNoUnit, NO_MEANINGS},
    {4, 80, "Current speed", kMHz, NO_MEANINGS},
    {4, 87, "Thread count", kNoUnit, NO_MEANINGS},
    {4, 89, "Processor ID", kNoUnit, NO_MEANINGS},
    {4, 124, "Stepping", kNoUnit, NO_MEANINGS},
    {4, 125, "Possible statuses", kNoUnit, NO_MEANINGS},
    {4, 189, "Cores enabled", kNoUnit, NO_MEANINGS},
    {4, 190, "Core count", kNoUnit, NO_MEANINGS},
    {4, 296, "Processor type", kNoUnit, MEANINGS(kProcessorTypes)},
    {4, 298, "Family", kNoUnit, MEANINGS(kProcessorFamilies)},
    {4, 304, "Upgrade", kNoUnit, MEANINGS(kProcessorUpgrades)},
    {4, 307, "Version", kNoUnit, NO_MEANINGS},

    // management interface
    {15, 306, "SMBIOS version", kNoUnit, NO_MEANINGS},
    {15, 307, "SMBIOS revision", kNoUnit, NO_MEANINGS},

    // memory device
    {19, 15, "Data width", kBits, NO_MEANINGS},
    {19, 36, "Manufacturer", kNoUnit, NO_MEANINGS},
    {19, 45, "Part number", kNoUnit, NO_MEANINGS},
    {19, 50, "Serial number", kNoUnit, NO_MEANINGS},
    {19, 57, "Speed", "MT/s", NO_MEANINGS},
    {19, 61, "Total width", kBits, NO_MEANINGS},
    {19, 68, "Locator", kNoUnit, NO_MEANINGS},
    {19, 69, "Block size", kBytes, NO_MEANINGS},
    {19, 73, "Installed size", kKB, NO_MEANINGS},
    {19, 85, "Form factor", kNoUnit, MEANINGS(kFormFactors)},
    {19, 112, "Size", kKB, NO_MEANINGS},
    {19, 125, "Possible statuses", kNoUnit, NO_MEANINGS},
    {19, 135, "Registered", kNoUnit, NO_MEANINGS},
    {19, 295, "Memory type", kNoUnit, MEANINGS(kMemoryTypes)},

    // voltage sensor
    {21, 14, "Nominal value", kVolts, NO_MEANINGS},
    {21, 23, "Maximum value", kVolts, NO_MEANINGS},
    {21, 31, "Location", kNoUnit, MEANINGS(kProbeLocations)},
    {21, 33, "Minimum value", kVolts, NO_MEANINGS},
    {21, 43, "OEM-defined", kNoUnit, NO_MEANINGS},
    {21, 125, "Possible statuses", kNoUnit, NO_MEANINGS},

    // temperature sensor
    {22, 14, "Nominal value", kCelsius, NO_MEANINGS},
    {22, 23, "Maximum value", kCelsius, NO_MEANINGS},
    {22, 31, "Location", kNoUnit, MEANINGS(kProbeLocations)},
    {22, 33, "Minimum value", kCelsius, NO_MEANINGS},
    {22, 43, "OEM-defined", kNoUnit, NO_MEANINGS},
    {22, 125, "Possible statuses", kNoUnit, NO_MEANINGS},

    // processor cache
    {31, 5, "Associativity", kNoUnit, MEANINGS(kAssociativities)},
    {31, 9, "Cache type", kNoUnit, MEANINGS(kCacheTypes)},
    {31, 30, "Level", kNoUnit, NO_MEANINGS},
    {31, 37, "Maximum size", kKB, NO_MEANINGS},
    {31, 53, "Socket", kNoUnit, NO_MEANINGS},
    {31, 57, "Speed", kMHz, NO_MEANINGS},
    {31, 69, "Block size", kBytes, NO_MEANINGS},
    {31, 72, "Write policy", kNoUnit, MEANINGS(kCacheModes)},
    {31, 73, "Installed size", kKB, NO_MEANINGS},
    {31, 112, "Size", kKB, NO_MEANINGS},
    {31, 125, "Possible statuses", kNoUnit, NO_MEANINGS},
    {31, 173, "Current size", kKB, NO_MEANINGS},

    // memory array
    {32, 37, "Maximum capacity", kKB, NO_MEANINGS},
    {32, 300, "Error correction", kNoUnit, MEANINGS(kErrorCorrections)},
    {32, 301, "Error information handle", kNoUnit, NO_MEANINGS},
    {32, 302, "Location", kNoUnit, MEANINGS(kArrayLocations)},
    {32, 303, "Use", kNoUnit, MEANINGS(kArrayUses)},

    // system event log
    {35, 37, "Log area length", kBytes, NO_MEANINGS},
    {35, 108, "Name", kNoUnit, NO_MEANINGS},
    {35, 125, "Possible statuses", kNoUnit, NO_MEANINGS},

    // computer system
    {40, 20, "Family", kNoUnit, NO_MEANINGS},
    {40, 36, "Manufacturer", kNoUnit, NO_MEANINGS},
    {40, 39, "Product name", kNoUnit, NO_MEANINGS},
    {40, 45, "Part number", kNoUnit, NO_MEANINGS},
    {40, 50, "Serial number", kNoUnit, NO_MEANINGS},
    {40, 52, "SKU number", kNoUnit, NO_MEANINGS},
    {40, 64, "UUID", kNoUnit, NO_MEANINGS},
    {40, 65, "Wake-up type", kNoUnit, MEANINGS(kWakeUpTypes)},
    {40, 125, "Capabilities", kNoUnit, NO_MEANINGS},
    {40, 126, "Current time", kNoUnit, NO_MEANINGS},
    {40, 127, "Time zone offset", "h", NO_MEANINGS},
    {40, 307, "Version", kNoUnit, NO_MEANINGS},

    // planar
    {41, 2, "Asset tag", kNoUnit, NO_MEANINGS},
    {41, 31, "Location in chassis", kNoUnit, NO_MEANINGS},
    {41, 36, "Manufacturer", kNoUnit, NO_MEANINGS},
    {41, 39, "Product name", kNoUnit, NO_MEANINGS},
    {41, 44, "Features", kNoUnit, MEANINGS(kBoardFeatures)},
    {41, 50, "Serial number", kNoUnit, NO_MEANINGS},
    {41, 128, "Board type", kNoUnit, MEANINGS(kBoardTypes)},
    {41, 172, "Board product", kNoUnit, NO_MEANINGS},

    // processor core
    {42, 87, "Thread count", kNoUnit, NO_MEANINGS},
    {42, 125, "Possible statuses", kNoUnit, NO_MEANINGS},
    {42, 128, "Core type", kNoUnit, NO_MEANINGS},

    // disk controller
    {50, 44, "Features", kNoUnit, NO_MEANINGS},
    {50, 81, "Maximum devices", kNoUnit, NO_MEANINGS},
    {50, 85, "Form factor", kNoUnit, NO_MEANINGS},
    {50, 125, "Possible statuses", kNoUnit, NO_MEANINGS},
    {50, 128, "Controller type", kNoUnit, NO_MEANINGS},
    {50, 185, "Protocol", kNoUnit, NO_MEANINGS},

    // diagnostics firmware
    {53, 104, "Major version", kNoUnit, NO_MEANINGS},
    {53, 107, "Minor version", kNoUnit, NO_MEANINGS},
    {53, 134, "Version", kNoUnit, NO_MEANINGS},
    {53, 171, "Build", kNoUnit, NO_MEANINGS},

    // raw SMBIOS table
    {55, 176, "Length", kBytes, NO_MEANINGS},
    {55, 177, "Structure type", kNoUnit, MEANINGS(kStructureTypes)},
    {55, 178, "Handle", kNoUnit, NO_MEANINGS},
    {55, 179, "Strings", kNoUnit, NO_MEANINGS},
    {55, 180, "Formatted bytes", kNoUnit, NO_MEANINGS},
    {55, 181, "String count", kNoUnit, NO_MEANINGS},

    // system slot
    {62, 108, "Designation", kNoUnit, NO_MEANINGS},
    {62, 128, "Slot type", kNoUnit, MEANINGS(kSlotTypes)},
    {62, 270, "Slot ID", kNoUnit, NO_MEANINGS},

    // port connector
    {70, 108, "Internal designator", kNoUnit, NO_MEANINGS},
    {70, 128, "Port type", kNoUnit, MEANINGS(kPortTypes)},
};

#undef MEANINGS
#undef NO_MEANINGS

bool before(PropertyInfo const& entry, std::pair<unsigned int, unsigned int> key) {
    return entry.nodeType != key.first ? entry.nodeType < key.first : entry.id < key.second;
}

}  // namespace

PropertyInfo const* findProperty(unsigned int nodeType, unsigned int id) {
    auto const key = std::make_pair(nodeType, id);
    auto const found = std::lower_bound(std::begin(kCatalog), std::end(kCatalog), key, before);
    if (found == std::end(kCatalog) || found->nodeType != nodeType || found->id != id) {
        return nullptr;
    }
    return found;
}

char const* valueMeaning(PropertyInfo const& property, std::uint32_t value) {
    if (property.meanings == nullptr) {
        return nullptr;
    }
    ValueMeaning const* const end = property.meanings + property.meaningCount;
    ValueMeaning const* const found = std::lower_bound(
        property.meanings, end, value,
        [](ValueMeaning const& entry, std::uint32_t wanted) { return entry.value < wanted; });
    return found != end && found->value == value ? found->meaning : nullptr;
}

PropertyInfo const* propertyCatalog(std::size_t& count) {
    count = std::size(kCatalog);
    return kCatalog;
}

}  // namespace inventory
