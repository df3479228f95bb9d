#pragma once

#include <cstdint>
#include <string>

#include "Common/Records.h"

namespace reportctl::send {

/// An event report, as a person describes one.
struct Report {
    std::string eventID;
    std::string value;           ///< JSON of an object is sent as an object, any other text as a string
    std::int64_t createTime = 0; ///< since 1970: ten digits are seconds, thirteen milliseconds; sent as it is
    bool isDayReport = false;
};

// The texts that the service reads, as the client library writes them. They are built, not judged: what
// cannot work (see Judgement.h) is built all the same, so that the service can be shown it.

std::string BuildReport(const Report& report);

/// Announces an analytics module.
std::string BuildInit(const SyncServiceReport::ST_InitMsg& module);

/// Tells who is signed in; an empty version leaves the one that is known.
std::string BuildOpenIdUpdate(const std::string& openID, const std::string& suiteVersion);

} // namespace reportctl::send
