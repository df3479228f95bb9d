#pragma once

#include "Ledger/Reader.h"
#include "Tools/reportctl/page/Page.h"

namespace reportctl::page {

/// Reads the state of this user's service, store, outbox and ledger, without changing any of them. A source
/// that cannot be read is missing from the page, and the page's status says so.
PageData Gather(int reloadSeconds);

/// How many reports were refused for each reason from one of the ledger's marks to the next, and from the
/// last one until now, as far as that was in the last ten minutes.
std::vector<RefusedAt> RefusedOverTime(const ReportLedger::Look& look);

} // namespace reportctl::page
