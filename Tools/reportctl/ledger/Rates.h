#pragma once

#include <chrono>

#include "Ledger/Reader.h"

namespace reportctl::ledger {

struct Rates { ///< In reports per second.
    double received = 0;
    double stored = 0;
    double refused = 0;
};

/// The sum of the refused reports, for all reasons.
std::uint64_t RefusedIn(const ReportLedger::Counts& counts);

/// The rates between two readings of the counters that are `time` apart.
Rates RatesBetween(const ReportLedger::Counts& before, const ReportLedger::Counts& after,
                   std::chrono::milliseconds time);

/// The rates of about the last minute and of about the last second, from the marks that the ledger keeps.
/// Zeros when no service is counting.
Rates OfTheLastMinute(const ReportLedger::Look& look);
Rates OfTheLastSecond(const ReportLedger::Look& look);

/// How much a counter grew in about the last `time`, or since the oldest mark when that is younger. 0 when no
/// mark tells it.
std::uint64_t GrownIn(const ReportLedger::Look& look, unsigned place, std::chrono::milliseconds time);

} // namespace reportctl::ledger
