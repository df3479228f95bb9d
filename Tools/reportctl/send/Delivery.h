#pragma once

#include <string>

#include "Tools/reportctl/send/Pace.h"

namespace reportctl::send {

struct DeliverySettings {
    bool dryRun = false; ///< print what would be sent, and send nothing
    bool anyway = false; ///< send a message also when the service could not use it
    PaceSettings pace;   ///< how fast lines are sent
};

/// Judges `text`, sends it, and prints the result. Returns the exit code: 0, or 1 when it was not sent or no
/// program listens. Throws Poco::Exception when the system refuses to send it.
int DeliverOne(const std::string& text, const DeliverySettings& settings);

/// Judges and sends each line that is not blank, unchanged and without its line feed. A line with an error is
/// printed with its number and not sent. When no program listens, no further line is sent. Each line is sent
/// as soon as it is read, so the descriptor may be a pipe that is still being written. A line of any length
/// needs at most 64 KiB of memory.
int DeliverLines(int descriptor, const DeliverySettings& settings);

} // namespace reportctl::send
