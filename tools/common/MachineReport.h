// What the physical-memory library found on this machine, told to a person:
// why each source it tried could not serve, and what it cut from a table too
// large for the 2.x entry point the plug-in reads. The host program and
// smbios-dump say it when the machine gave no table, or only part of one.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace smbiostool {

// How much of a table a 2.x entry point describes when the table is larger
// than 65535 bytes: the whole table, and the whole structures of its start
// that fit.
struct TableCut {
    unsigned long tableBytes = 0;
    unsigned long tableStructures = 0;
    unsigned long servedBytes = 0;
    unsigned long servedStructures = 0;
};

// What a --dump-bin image kept of a table over 65535 bytes (its cut is set).
TableCut imageCut(size_t wholeTableBytes, unsigned wholeTableStructures,
                  std::vector<unsigned char> const& keptTable);

// "warning: SUBJECT is 100042 bytes (2184 structures); the 2.x entry point
// that the plug-in reads holds the first 65500 bytes (1421 structures)".
std::string cutWarning(std::string const& subject, TableCut const& cut);

// A copy of the physical-memory library, loaded to ask it what it found.
// Loaded afresh, it chooses its source as it did for the plug-in (the same
// environment, the same files).
class MachineReport {
public:
    explicit MachineReport(std::string const& libraryPath);

    // One line per source the library tried ("sysfs: /sys/firmware/dmi/
    // tables/DMI: Permission denied"); empty when the library could not be
    // loaded or does not say.
    std::vector<std::string> const& sources() const { return sources_; }
    // The library's file, as it was loaded.
    std::string const& libraryPath() const { return libraryPath_; }
    // Whether the table the library serves is cut, with its figures.
    bool cut(TableCut& figures) const;

private:
    std::string libraryPath_;
    std::vector<std::string> sources_;
    bool cut_ = false;
    TableCut figures_;
};

// What a person reads when this machine gave no table: "LIBRARY tried:" and
// the library's lines, indented (nothing when it says nothing), then the
// hint, which names the options that read a saved table instead.
std::vector<std::string> noTableLines(MachineReport const& report,
                                      std::string const& savedTableOptions);

}  // namespace smbiostool
