// What every component builder of the plug-in shares: the guard around the
// handling of one structure, with its three log lines, and the loop over the
// structures of one type. Private to the plug-in.
#pragma once

#include <exception>
#include <typeinfo>

#include "mi/SmBiosMI.h"

namespace IC {

// The three kinds of failure a guard tells apart in its log lines.
enum class Failure { IC_EXCEPTION, STD_EXCEPTION, OTHER };

// Runs step; a failure is handed to report(kind, what, typeName) (what and
// typeName are null where the kind has none) and goes no further.
template <typename Step, typename Report>
void guarded(Step&& step, Report&& report) {
    try {
        step();
    } catch (ICException const& e) {
        report(Failure::IC_EXCEPTION, e.what(), nullptr);
    } catch (std::exception const& e) {
        report(Failure::STD_EXCEPTION, e.what(), typeid(e).name());
    } catch (...) {
        report(Failure::OTHER, nullptr, nullptr);
    }
}

// The builders' report, written from the builder's place: the failure, the
// table type and the structure's index; the builder goes on with the next
// structure.
template <typename Index>
void logStructureFailure(SD::SourcePlace const& place, QNLog::QNLogger const& logger,
                         unsigned int tableType, Index index, Failure kind, char const* what,
                         char const* typeName) {
    switch (kind) {
        case Failure::IC_EXCEPTION:
            SMBIOS_ERROR_AT(place, logger,
                            "ICException=" << what << "Table " << tableType << " index =" << index);
            break;
        case Failure::STD_EXCEPTION:
            SMBIOS_ERROR_AT(place, logger,
                            "Exception=" << what << " Type=" << typeName << "Table " << tableType
                                         << " index =" << index);
            break;
        case Failure::OTHER:
            SMBIOS_ERROR_AT(place, logger, "Error in table " << tableType << " index " << index);
            break;
    }
}

// Runs step under the builders' guard, logging a failure with tableType and
// index.
template <typename Index, typename Step>
void guardStructure(SD::SourcePlace const& place, QNLog::QNLogger const& logger,
                    unsigned int tableType, Index index, Step&& step) {
    guarded(step, [&](Failure kind, char const* what, char const* typeName) {
        logStructureFailure(place, logger, tableType, index, kind, what, typeName);
    });
}

// Calls handle(entry, index) for every structure in the list of type, in
// order, each under the builders' guard; place is the builder's
// (SMBIOS_HERE). The failures name loggedType, which is type unless a
// builder's log says otherwise.
template <typename Handle>
void forEachStructure(SD::SourcePlace const& place, QNLog::QNLogger const& logger,
                      TableLists tables, unsigned int type, unsigned int loggedType,
                      Handle&& handle) {
    for (size_t index = 0; index < tables[type]->size(); ++index) {
        guardStructure(place, logger, loggedType, index,
                       [&] { handle((*tables[type])[index], index); });
    }
}

template <typename Handle>
void forEachStructure(SD::SourcePlace const& place, QNLog::QNLogger const& logger,
                      TableLists tables, unsigned int type, Handle&& handle) {
    forEachStructure(place, logger, tables, type, type, handle);
}

// Logs every non-empty list: its type, then each structure's address and
// length.
void logStructureLists(QNLog::QNLogger const& logger, TableLists lists);

}  // namespace IC
