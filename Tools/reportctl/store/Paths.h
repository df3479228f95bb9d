#pragma once

#include <string>

namespace reportctl::store {

/// The path of the store of this user's service. The file need not exist.
std::string StorePath();

/// The path of the service's own outbox. All modules that name no directory of their own share it.
std::string OutboxPath();

/// The path of the ledger of this user's service.
std::string LedgerPath();

} // namespace reportctl::store
