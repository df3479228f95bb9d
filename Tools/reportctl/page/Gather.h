#pragma once

#include "Tools/reportctl/page/Page.h"

namespace reportctl::page {

/// Looks at the service, the store, the outbox and the ledger of this user, without changing any of them.
/// What is missing or cannot be read is missing from the page, and its status tells so.
PageData Gather(int reloadSeconds);

} // namespace reportctl::page
