#pragma once

#include <cstdint>
#include <string>

#include "Common/Records.h"

namespace reportctl::send {

/// An event report, as a person describes one.
struct Report {
    std::string eventID;
    std::string value;           ///< a JSON object is sent as an object, any other text as a string
    std::int64_t createTime = 0; ///< since 1970: ten digits are seconds, thirteen milliseconds; sent as it is
    bool isDayReport = false;
};

// These functions write the messages that the service reads, as the client library writes them. They do not
// judge: a message that cannot work (see Judgement.h) is written, too, so that a person can see what the
// service does with it.

std::string BuildReport(const Report& report);

/// Announces an analytics module.
std::string BuildInit(const SyncServiceReport::ST_InitMsg& module);

/// Tells who is signed in. With an empty version, the service keeps the version that it knows.
std::string BuildOpenIdUpdate(const std::string& openID, const std::string& suiteVersion);

} // namespace reportctl::send
