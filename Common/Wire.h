#pragma once

#include <cstddef>

/// What the service and its senders agree on: the facts of a datagram. `UDP_SERVER_IP` and the kinds of
/// control message are in ServiceConstants.h. For people, docs/Sending.md has the whole contract.
namespace Wire {

inline constexpr int PORT = 9997;

/// The room for one datagram. The service cuts off what is longer, and everything from the first zero byte
/// on.
inline constexpr std::size_t MAX_BYTES = 10240;

/// A text that holds this anywhere is a report; every other text is a control message.
inline constexpr auto REPORT_MARK = "eventID";

/// An event id that begins with this goes to analytics, every other one to the local store.
inline constexpr auto ANALYTICS_PREFIX = "A";

/// A createTime of so many characters counts as seconds since 1970, and gets "000" appended.
inline constexpr std::size_t SECONDS_LENGTH = 10;

/// The members of a control message.
inline constexpr auto MESSAGE_KIND = "msgType";
inline constexpr auto MESSAGE_DATA = "exdata";

} // namespace Wire
