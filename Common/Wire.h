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

/// The members of a report, beside REPORT_MARK.
inline constexpr auto VALUE = "value";
inline constexpr auto CREATE_TIME = "createTime"; ///< Also in an event's EVENT_EXTEND.
inline constexpr auto IS_DAY_REPORT = "isDayReport";

/// The members of a control message's data. Those of the user are in both kinds, the others in "init".
inline constexpr auto MODULE_ID = "moduleID";
inline constexpr auto MODULE_VERSION = "moduleVersion";
inline constexpr auto MODULE_NAME = "moduleName";
inline constexpr auto LOG_PATH = "logPath";
inline constexpr auto DB_PATH = "dbPath";
inline constexpr auto OPEN_ID = "openID";
inline constexpr auto HUBLINK_VERSION = "hublinkVersion"; ///< Also in an event's EVENT_EXTEND.

/// The members of an event's payload, as it goes to analytics (docs/Outbox.md), and what the service adds to
/// the members of EVENT_DATA, which are those of the report's value.
inline constexpr auto EVENT_EXTEND = "extend";
inline constexpr auto EVENT_DATA = "eventData";
inline constexpr auto EVENT_OPEN_ID = "openid";
inline constexpr auto EVENT_SYSTEM = "sys_version";

} // namespace Wire
