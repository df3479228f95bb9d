#pragma once

#include <cstddef>

/// What the service and its senders agree on about a datagram. `UDP_SERVER_IP` and the kinds of control
/// message are in ServiceConstants.h. docs/Sending.md describes the whole contract for people.
namespace Wire {

inline constexpr int PORT = 9997;

/// The receiver's room for one datagram. The service cuts off the bytes of a datagram beyond it, and
/// everything from the first zero byte on.
inline constexpr std::size_t MAX_BYTES = 10240;

/// A text that holds this anywhere is a report; every other text is a control message.
inline constexpr auto REPORT_MARK = "eventID";

/// An event id that begins with this goes to analytics, every other one to the local store.
inline constexpr auto ANALYTICS_PREFIX = "A";

/// A createTime of this many bytes counts as seconds since 1970, and gets "000" appended.
inline constexpr std::size_t SECONDS_LENGTH = 10;

/// The members of a control message.
inline constexpr auto MESSAGE_KIND = "msgType";
inline constexpr auto MESSAGE_DATA = "exdata";

} // namespace Wire
