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

/// The module whose event this is, of a program whose own module is `ownModule` (empty for none): the part
/// before the bar for analytics, empty for the store. Nothing for an id that the service could not use.
std::optional<std::string_view> ModuleOf(std::string_view eventId, std::string_view ownModule);

/// Writes the datagram of an event whose id is sound, so that its value arrives as it was given. Sent when it
/// can be sent; else why not.
Result WriteEvent(wire::Buffer& buffer, const GivenEvent& event);

/// The same of the message that tells who is signed in.
Result WriteUser(wire::Buffer& buffer, std::string_view openId, std::string_view suiteVersion);

/// The same of a module's announcement.
Result WriteAnnouncement(wire::Buffer& buffer, const Module& module);

} // namespace hublink
