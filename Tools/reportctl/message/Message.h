#pragma once

#include <string>

namespace reportctl::message {

/// Where a text is meant to end.
enum class Kind {
    Report,  ///< the store
    Event,   ///< analytics
    Control, ///< a control message
    Other,   ///< no text that was sent to the service
};

/// The word for people and for JSON: "report", "event", "control" or "other".
const char* WordFor(Kind kind);

/// A datagram's text as the service reads it.
struct Message {
    Kind kind = Kind::Other;
    std::string eventID;
    std::string value;      ///< JSON of an object, the text of anything else
    std::string createTime; ///< in milliseconds, where it was given in seconds
    std::string control;    ///< the kind of control message, such as "init"
    std::string fault;      ///< the parser's words when it is no JSON

    /// What stands before the first bar of the event id, or the module that a control message announces;
    /// empty without one.
    std::string module;
};

Message Read(const std::string& text);

} // namespace reportctl::message
