#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

#include "Ledger/Layout.h"

namespace ReportLedger {

/// The values of all counters at one moment, as plain numbers. Counter and Outcome give their places.
using Counts = std::array<std::uint64_t, COUNTERS>;

/// Copies the counters one by one, from the last to the first. So the counters of how datagrams ended are
/// copied before the counter of received datagrams. A copy therefore never has more ends than datagrams, also
/// when the service counts meanwhile.
Counts CopyOf(const Counters& counters);

/// The number of datagrams that have ended while a process ran: the empty ones, and those of every Outcome.
std::uint64_t EndedIn(const Counts& counts);

/// The number of reports in the queue, including the one that is being handled.
std::uint64_t WaitingIn(const Counts& counts);

/// The number of received datagrams minus the number of those that the ledger knows the fate of. 0 when the
/// ledger balances. It is not 0 for a moment while a datagram or its end has been counted only in part.
std::int64_t UnaccountedIn(const Counts& counts);

} // namespace ReportLedger
