#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

#include "Ledger/Layout.h"

namespace ReportLedger {

/// The counters at a moment, as plain numbers in the places of Counter and Outcome.
using Counts = std::array<std::uint64_t, COUNTERS>;

/// Copies them one by one, the last first: how a datagram ended is copied before what was received, so that
/// no copy has more ends than datagrams, also when the service counts meanwhile.
Counts CopyOf(const Counters& counters);

/// Datagrams that have ended while a process ran: what was ignored, stored, handed on, understood or refused.
std::uint64_t EndedIn(const Counts& counts);

/// Reports in the queue, the one that is being handled included.
std::uint64_t WaitingIn(const Counts& counts);

/// What is received less what is known about it; 0 when the ledger balances, and also right after a datagram
/// or an end was counted in part.
std::int64_t UnaccountedIn(const Counts& counts);

} // namespace ReportLedger
