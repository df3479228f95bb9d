#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk {

/// The module that reports an event. Its texts come from outside. They are used only as bound values of SQL
/// statements and as JSON strings.
struct ModuleIdentity {
    std::string id;
    std::string version;
    std::string name;

    // clang-tidy takes the 0 with which the compiler compares for a pointer.
    auto operator<=>(const ModuleIdentity&) const = default; // NOLINT(modernize-use-nullptr)
};

/// An event that is to be stored in the outbox.
struct NewEvent {
    std::string uuid;    ///< The event's own id; the same at every attempt to deliver it.
    std::string eventId; ///< The module's name for what happened.
    std::string payload; ///< The text that the module gave; usually a JSON object.
    WallTime storedAt;
};

/// Where an event waits.
enum class Source {
    Outbox,
    Store ///< It is a row of the local store, which `reportctl forward` sends.
};

/// An event that waits in the outbox.
struct StoredEvent {
    std::int64_t row = 0;
    std::string uuid;
    std::int64_t release = 0;  ///< The release of the module; a key of Batch::releases.
    std::int64_t sequence = 0; ///< Counts the events of one module in one outbox from 1, without gaps.
    std::string eventId;
    std::string payload;
    WallTime storedAt;
    std::size_t bytes = 0; ///< How many bytes the event counts in every limit on bytes.
    Source source = Source::Outbox;
};

/// Identifies a stored event. The row alone is not enough: in a new file, another event may have the same
/// row.
struct EventKey {
    std::int64_t row = 0;
    std::string uuid;
};
using EventKeys = std::map<std::int64_t, std::string>; ///< The uuid of each row.

/// The oldest waiting events, in the order in which they were stored.
struct Batch {
    std::string outboxId; ///< The id of the outbox file; no other outbox file of a fleet has it.
    std::vector<StoredEvent> events;
    std::map<std::int64_t, ModuleIdentity> releases;
};

} // namespace MetrikSdk
