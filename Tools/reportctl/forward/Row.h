#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Event.h"

/// A row of the store on its way to a collector. Pure.
namespace reportctl::forward {

struct Row {
    using Text = std::optional<std::string>; ///< Nothing for NULL.

    std::int64_t id = 0;
    Text eventID;
    Text value;
    Text createTime;
    Text suiteVersion;
    Text openid;
};

/// What the row counts for in a bound on bytes.
std::size_t BytesOf(const Row& row);

/// The row's uid: a UUID of version 5, in the namespace of the installation, of the row's id and of
/// everything that the row holds. So it tells a repetition, also one from a restored copy of the store, and
/// another row that got the same id after the store was emptied or replaced has another uid.
std::string UidOf(const std::string& installation, const Row& row);

/// The row as the encoder takes it. Its payload has the shape that the service gives to an event for
/// analytics: `extend` with the version and the time, `eventData` with the members of the value where that is
/// a JSON object, else the value itself under "value", and the open id. `now` stands for a time that the row
/// does not have.
MetrikSdk::StoredEvent EventOf(const std::string& installation, const Row& row, MetrikSdk::WallTime now);

} // namespace reportctl::forward
