#pragma once

#include <chrono>

#include "Ledger/Reader.h"

namespace reportctl::ledger {

struct Rates { ///< A second.
    double received = 0;
    double stored = 0;
    double refused = 0;
};

/// All that was refused, for whichever reason.
std::uint64_t RefusedIn(const ReportLedger::Counts& counts);

/// Between two looks.
Rates RatesBetween(const ReportLedger::Counts& before, const ReportLedger::Counts& after,
                   std::chrono::milliseconds time);

/// Of about the last minute and the last second, by the marks that the ledger keeps. Zeros when nothing
/// counts.
Rates OfTheLastMinute(const ReportLedger::Look& look);
Rates OfTheLastSecond(const ReportLedger::Look& look);

/// What a counter grew by in about so long, or since the oldest mark.
std::uint64_t GrownIn(const ReportLedger::Look& look, unsigned place, std::chrono::milliseconds time);

} // namespace reportctl::ledger
