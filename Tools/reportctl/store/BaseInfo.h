#pragma once

#include <string>

#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::store {

/// The keys that the service looks for, to the letter.
inline constexpr auto OPEN_ID_KEY = "OpenID";
inline constexpr auto SUITE_VERSION_KEY = "HubLinkVersion";

/// Makes sure that the table BaseInfo of the database at `path` holds `value` under `key`, and no other value
/// under it.
void EnsureBaseInfo(terminal::Worklog& log, const std::string& path, const std::string& key,
                    const std::string& value);

} // namespace reportctl::store
