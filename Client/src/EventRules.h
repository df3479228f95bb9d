#pragma once

#include <optional>
#include <string_view>

#include "hublink/report.hpp"
#include "wire/Buffer.h"

namespace hublink {

/// An event as a program gives it.
struct GivenEvent {
    std::string_view id;
    Value value;
    Reporter::Time time;
    bool isDayReport = false;
};

/// The id of the module that an event belongs to: the part of the event id before the bar for analytics, an
/// empty text for the store. Returns nothing when the service could not use the event id. `ownModule` is the
/// id of the program's own module, empty when it has none.
std::optional<std::string_view> ModuleOf(std::string_view eventId, std::string_view ownModule);

/// Writes an event's datagram so that its value arrives as it was given. ModuleOf must have accepted the
/// event id. Returns Sent when the datagram can be sent, else the reason why it cannot.
Result WriteEvent(wire::Buffer& buffer, const GivenEvent& event);

/// Writes the message that tells who is signed in. Returns what WriteEvent returns.
Result WriteUser(wire::Buffer& buffer, std::string_view openId, std::string_view suiteVersion);

/// Writes a module's announcement. Returns what WriteEvent returns.
Result WriteAnnouncement(wire::Buffer& buffer, const Module& module);

} // namespace hublink
