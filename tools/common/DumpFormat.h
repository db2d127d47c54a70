// The file formats around an SMBIOS table, under the names the tools and the
// tests call them by. They live in the format library: the entry points
// ("_SM_", the legacy "_DMI_", "_SM3_") in format/EntryPoint.h,
// dmidecode's --dump-bin image in format/DumpBin.h, and the override dump
// file ("smbios.txt") that the plug-in reads instead of physical memory in
// format/OverrideText.h; hex digits in format/Hex.h.
#pragma once

#include "format/DumpBin.h"
#include "format/EntryPoint.h"
#include "format/Hex.h"
#include "format/OverrideText.h"

namespace smbiosdump {

using smbiosformat::DMI_ENTRY_POINT_SIZE;
using smbiosformat::DUMP_BIN_TABLE_OFFSET;
using smbiosformat::DumpImage;
using smbiosformat::formatOverride;
using smbiosformat::getDword;
using smbiosformat::getWord;
using smbiosformat::makeDmiEntryPoint;
using smbiosformat::makeSmEntryPoint;
using smbiosformat::readDumpBin;
using smbiosformat::SM3_ENTRY_POINT_SIZE;
using smbiosformat::SM_ENTRY_POINT_SIZE;
using smbiosformat::TableStats;
using smbiosformat::tableStats;

}  // namespace smbiosdump
