#pragma once

#include "Tools/reportctl/page/Page.h"

namespace reportctl::page {

/// Reads the state of this user's service, store, outbox and ledger, without changing any of them. A source
/// that cannot be read is missing from the page, and the page's status says so.
PageData Gather(int reloadSeconds);

} // namespace reportctl::page
