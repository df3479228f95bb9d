#pragma once

#include <chrono>
#include <string>

#include "Tools/reportctl/log/Line.h"
#include "Tools/reportctl/message/Message.h"

namespace reportctl::log {

/// Where a datagram ended.
enum class Outcome {
    Unknown,     ///< not told yet, or no source can tell
    Stored,      ///< its row is in the store
    ToAnalytics, ///< the outbox has its event, or has counted it
    Control,     ///< a control message that the service could read
    Refused,     ///< the service said so
};

/// The word of JSON: "unknown", "stored", "toAnalytics", "control" or "refused".
const char* WordFor(Outcome outcome);

/// A line of the log as a person wants it: a datagram with what became of it, or another line.
///
///     arrived (Unknown) ──┬─► Refused       by a line of the log: Pairing
///                         ├─► Control       it is one, and no line says otherwise: Pairing
///                         └─► Stored, ToAnalytics   by what the databases hold: Outcomes
struct Entry {
    Line line; ///< of its arrival; line.message is the datagram's text
    message::Message message;
    bool isDatagram = false;
    bool isReadable = true; ///< false: a datagram whose text the log could not write
    Outcome outcome = Outcome::Unknown;
    std::string reason;   ///< why it was refused, or what is odd about it; may be empty
    int refusedLevel = 0; ///< of the line that tells the refusal

    std::chrono::steady_clock::time_point readAt = std::chrono::steady_clock::now();

    bool IsOpen() const { return isDatagram && outcome == Outcome::Unknown; }
};

} // namespace reportctl::log
