#pragma once

#include <chrono>
#include <string>

#include "Tools/reportctl/log/Line.h"
#include "Tools/reportctl/message/Message.h"

namespace reportctl::log {

/// What the service did with a datagram.
enum class Outcome {
    Unknown,     ///< not known yet, or never known
    Stored,      ///< its row is in the store
    ToAnalytics, ///< its event is in the outbox, or was stored there and has left it
    Control,     ///< a control message that the service could read
    Refused,     ///< a line of the service's log says so
};

/// The word for people and for JSON: "unknown", "stored", "toAnalytics", "control" or "refused".
const char* WordFor(Outcome outcome);

/// One entry of the log as a person reads it: a datagram with its outcome, or another line.
///
///     arrived (Unknown) ──┬─► Refused       by a line of the log: Pairing
///                         ├─► Control       a control message that no line refuses: Pairing
///                         └─► Stored, ToAnalytics   by the rows and events of the databases: Outcomes
struct Entry {
    Line line; ///< for a datagram the line of its arrival: line.message is the datagram's text
    message::Message message;
    bool isDatagram = false;
    bool isReadable = true; ///< false: a datagram whose text the log could not write
    Outcome outcome = Outcome::Unknown;
    std::string reason;   ///< why it was refused, or what is unusual about it; may be empty
    int refusedLevel = 0; ///< the level of the line that reports the refusal

    std::chrono::steady_clock::time_point readAt = std::chrono::steady_clock::now();

    bool IsOpen() const { return isDatagram && outcome == Outcome::Unknown; }
};

} // namespace reportctl::log
