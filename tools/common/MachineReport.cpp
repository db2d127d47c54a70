#include "MachineReport.h"

#include <unistd.h>

#include "format/EntryPoint.h"
#include "pmem/PMemContract.h"

namespace smbiostool {

TableCut imageCut(size_t wholeTableBytes, unsigned wholeTableStructures,
                  std::vector<unsigned char> const& keptTable) {
    TableCut cut;
    cut.tableBytes = static_cast<unsigned long>(wholeTableBytes);
    cut.tableStructures = wholeTableStructures;
    cut.servedBytes = static_cast<unsigned long>(keptTable.size());
    cut.servedStructures = smbiosformat::tableStats(keptTable).count;
    return cut;
}

std::string cutWarning(std::string const& subject, TableCut const& cut) {
    return "warning: " + subject + " is " + std::to_string(cut.tableBytes) + " bytes (" +
           std::to_string(cut.tableStructures) +
           " structures); the 2.x entry point that the plug-in reads holds the first " +
           std::to_string(cut.servedBytes) + " bytes (" + std::to_string(cut.servedStructures) +
           " structures)";
}

MachineReport::MachineReport(std::string const& libraryPath) : libraryPath_(libraryPath) {
    pmem::BoundLibrary library(libraryPath);
    library.loadAndBind();
    if (library.getHandle() == nullptr) {
        return;
    }
    pmem::Functions const& functions = library.functions();
    if (functions.sourceReport != nullptr) {
        std::string const text = functions.sourceReport();
        size_t begin = 0;
        while (begin < text.size()) {
            size_t end = text.find('\n', begin);
            if (end == std::string::npos) {
                end = text.size();
            }
            if (end > begin) {
                sources_.push_back(text.substr(begin, end - begin));
            }
            begin = end + 1;
        }
    }
    cut_ = functions.tableCut != nullptr &&
           functions.tableCut(&figures_.tableBytes, &figures_.tableStructures,
                              &figures_.servedBytes, &figures_.servedStructures) != 0;
}

bool MachineReport::cut(TableCut& figures) const {
    if (cut_) {
        figures = figures_;
    }
    return cut_;
}

std::vector<std::string> noTableLines(MachineReport const& report,
                                      std::string const& savedTableOptions) {
    std::vector<std::string> lines;
    if (!report.sources().empty()) {
        lines.push_back(report.libraryPath() + " tried:");
        for (std::string const& source : report.sources()) {
            lines.push_back("  " + source);
        }
    }
    // Root is refused nothing the machine has: then it has no table to show
    // (a container without /sys/firmware/dmi or /dev/mem, say).
    lines.push_back(std::string(::geteuid() == 0
                                    ? "this machine shows no SMBIOS table, not even to root; "
                                    : "run it as root (the kernel's SMBIOS tables and /dev/mem "
                                      "are root's to read), or ") +
                    "read a saved table with " + savedTableOptions);
    return lines;
}

}  // namespace smbiostool
