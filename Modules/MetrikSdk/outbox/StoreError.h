#pragma once

#include <stdexcept>
#include <string>

#include "Modules/MetrikSdk/report/News.h"

namespace MetrikSdk::outbox {

/// What the holder of a store must do after an operation failed.
enum class StoreFault {
    TryLater, ///< Nothing was changed and the store is sound: a full disk, or another program's lock.
    Reopen,   ///< The store cannot be used any more. Open it again; later, if that fails, too.
    SetAside, ///< The file is damaged, or it is no outbox of ours.
    Unsafe,   ///< Another user could change the directory; the outbox must not be there.
};

class StoreError : public std::runtime_error {
public:
    StoreError(StoreFault kind, const std::string& text) : std::runtime_error(text), fault(kind) {}

    const StoreFault fault;
};

/// The cause under which the failure is reported.
inline report::Cause CauseOf(const StoreError& error) {
    return error.fault == StoreFault::Unsafe ? report::Cause::Directory : report::Cause::File;
}

} // namespace MetrikSdk::outbox
