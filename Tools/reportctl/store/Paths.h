#pragma once

#include <string>

namespace reportctl::store {

/// The path of the store of this user's service. The file need not exist.
std::string StorePath();

/// The name of an outbox's file, in whichever directory.
inline constexpr auto OUTBOX_FILE = "MetrikOutbox.db";

/// The outbox that all modules share which name no directory of their own.
std::string OutboxPath();

/// The path of the ledger of this user's service.
std::string LedgerPath();

/// How far `reportctl forward` has sent the store.
std::string ForwardPath();

} // namespace reportctl::store
