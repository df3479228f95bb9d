#pragma once

#include <stdexcept>
#include <string>

namespace MetrikSdk::outbox {

/// What the holder of a store does after an operation failed.
enum class StoreFault {
    TryLater, ///< Nothing was changed and the store is in order: a full disk, somebody else's lock.
    Reopen,   ///< The store cannot be used any more; open it again, later if that fails too.
    SetAside, ///< The file is damaged or none of ours.
};

class StoreError : public std::runtime_error {
public:
    StoreError(StoreFault kind, const std::string& text) : std::runtime_error(text), fault(kind) {}

    const StoreFault fault;
};

} // namespace MetrikSdk::outbox
