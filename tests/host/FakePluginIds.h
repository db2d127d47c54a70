// What the fake plug-in of the host tests builds: node ids, property ids and
// the values the tests expect to read back through smbios-inventory.
#pragma once

namespace fakeplugin {

// Nodes, in the order the plug-in creates them. The management-interface
// node is linked to 0; the plain node is linked to an id that no node has.
unsigned int const kMiNode = 2;
unsigned int const kRootNode = 3;
unsigned int const kKindsNode = 4;
unsigned int const kCpuNode = 5;
unsigned int const kCoreNode = 6;
unsigned int const kPlainNode = 7;
unsigned int const kMissingNode = 99;
unsigned int const kCycleNodeA = 20;
unsigned int const kCycleNodeB = 21;

char const kMiDescription[] = "Fake Management Interface";
char const kRootDescription[] = "Fake Root";
char const kKindsDescription[] = "Every Kind";
// A control character that the tree shows escaped.
char const kCpuDescription[] = "Fake CPU\x01";
char const kCoreDescription[] = "Computed Core";
char const kPlainDescription[] = "Plain Node";
char const kCycleDescriptionA[] = "Cycle Slot";
char const kCycleDescriptionB[] = "Cycle Port";

char const kCpuPath[] = "/fake/cpu0";
char const kCpuParent[] = "/fake";

// Properties of the root node: facts about the run.
unsigned int const kDataDirProperty = 1;
unsigned int const kOverrideLineProperty = 2;
unsigned int const kCodeDirProperty = 3;
unsigned int const kPluginFileProperty = 4;
unsigned int const kOverrideSizeProperty = 5;

// Properties of the node with one value of every kind. The ids are chosen so
// that their numeric and their text order differ.
unsigned int const kStringProperty = 2;
unsigned int const kBoolProperty = 3;
unsigned int const kUnsignedProperty = 4;
unsigned int const kDoubleProperty = 5;
unsigned int const kVersionProperty = 6;
unsigned int const kDateTimeProperty = 7;
unsigned int const kNoneNumberProperty = 8;
unsigned int const kNoneProperty = 9;
unsigned int const kEnum8Property = 10;
unsigned int const kEnum16Property = 11;
unsigned int const kEnum32Property = 12;
unsigned int const kByteProperty = 13;
unsigned int const kBytesProperty = 20;
unsigned int const kNumbersProperty = 30;
unsigned int const kStringsProperty = 100;
unsigned int const kKindProperty = 101;

// "Caf" and a Latin-1 e acute.
char const kLatin1Text[] = "Caf\xE9";
unsigned int const kUnsignedValue = 4294967295u;
double const kDoubleValue = 2.5;

// The property of the computed core whose value exists only when read.
unsigned int const kComputedProperty = 7;
char const kComputedValue[] = "computed at read";

char const kStdoutLine[] = "fake plug-in: initialize writes to stdout";
char const kStdoutLineCpp[] = "fake plug-in: initialize writes to std::cout";
char const kOpenStdoutLine[] = "fake plug-in: OpenMI writes to stdout";
char const kLogText[] = "fake plug-in: log message";
char const kTraceText[] = "fake plug-in: trace message";
char const kFailMessage[] = "fake failure requested by FAKE_MI_FAIL";
char const kOpenFailMessage[] = "fake OpenMI failure requested by FAKE_MI_OPEN";

}  // namespace fakeplugin
