#pragma once

#include <string>

#include "Tools/reportctl/send/Pace.h"

namespace reportctl::send {

struct DeliverySettings {
    bool dryRun = false; ///< print what would be sent, and send nothing
    bool anyway = false; ///< send also what the service would not use
    PaceSettings pace;   ///< of many messages
};

/// Judges `text`, sends it, and tells the person what came of it. Returns the exit code: 0, or 1 when it was
/// not sent or no program listens. Throws Poco::Exception for what the system refuses to send.
int DeliverOne(const std::string& text, const DeliverySettings& settings);

/// The same for each line that is not blank, as it stands, without its line feed. A line that is judged bad
/// is told with its number and left out. The first line that no program takes is the last that is sent. Each
/// line goes out as soon as it is read, so that the descriptor may be that of a pipe that is still being
/// written. A line of any length takes no more memory than 64 KiB.
int DeliverLines(int descriptor, const DeliverySettings& settings);

} // namespace reportctl::send
