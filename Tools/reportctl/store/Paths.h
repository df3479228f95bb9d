#pragma once

#include <string>

namespace reportctl::store {

/// The store of this user's service, whether it is there or not.
std::string StorePath();

/// The outbox that all modules share which name no directory of their own.
std::string OutboxPath();

/// The ledger of this user's service.
std::string LedgerPath();

} // namespace reportctl::store
