#pragma once

#include <string>

#include "SystemTool/IO/JsonDocument.h"

namespace reportctl::message {

/// What kind of message a text is.
enum class Kind {
    Report,  ///< a report for the store
    Event,   ///< a report for analytics
    Control, ///< a control message
    Other,   ///< not a message to the service
};

/// The word for people and for JSON: "report", "event", "control" or "other".
const char* WordFor(Kind kind);

/// A datagram's text as the service reads it.
struct Message {
    Kind kind = Kind::Other;
    std::string eventID;
    std::string value;      ///< an object as JSON, any other value as a text
    std::string createTime; ///< in milliseconds; seconds were converted
    std::string control;    ///< the kind of control message, such as "init"
    std::string fault;      ///< the parser's error when the text is not JSON, else empty

    /// The part of the event id before its first bar, or the module that a control message announces. Empty
    /// when there is none.
    std::string module;
    std::string directory; ///< that an announcement names for the module's events; empty without one
};

/// The value as the service reads it: an object as JSON, any other value as a text.
std::string ValueText(const SystemTool::IO::JsonDocument& value);

Message Read(const std::string& text);

} // namespace reportctl::message
