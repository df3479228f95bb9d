#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk {

/// Who reports. The texts come from outside; they are only ever bound values and JSON strings.
struct ModuleIdentity {
    std::string id;
    std::string version;
    std::string name;

    // The check takes for a pointer the 0 that the compiler compares with.
    auto operator<=>(const ModuleIdentity&) const = default; // NOLINT(modernize-use-nullptr)
};

/// An event on its way into the outbox.
struct NewEvent {
    std::string uuid;    ///< The event's own id, the same at every attempt to deliver it.
    std::string eventId; ///< What happened, as the module names it.
    std::string payload; ///< As given; usually a JSON object.
    WallTime storedAt;
};

/// An event that waits in the outbox.
struct StoredEvent {
    std::int64_t row = 0;
    std::string uuid;
    std::int64_t release = 0;  ///< Key of Batch::releases.
    std::int64_t sequence = 0; ///< Counts the events of one module in one outbox from 1, without gaps.
    std::string eventId;
    std::string payload;
    WallTime storedAt;
    std::size_t bytes = 0; ///< What the event counts for in every bound on bytes.
};

/// Finds an event again: another one may have its row in a file that was begun anew.
struct EventKey {
    std::int64_t row = 0;
    std::string uuid;
};
using EventKeys = std::map<std::int64_t, std::string>; ///< The uuid of each row.

/// The oldest waiting events, in the order in which they were stored.
struct Batch {
    std::string outboxId; ///< Tells one outbox file of a fleet from all others.
    std::vector<StoredEvent> events;
    std::map<std::int64_t, ModuleIdentity> releases;
};

} // namespace MetrikSdk
