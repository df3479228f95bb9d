#pragma once

#include <string>

#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::store {

/// The keys that the service looks for. Their spelling must stay exactly this.
inline constexpr auto OPEN_ID_KEY = "OpenID";
inline constexpr auto SUITE_VERSION_KEY = "HubLinkVersion";

/// Sets `key` to `value` in the table BaseInfo of the database at `path`. When the key has several rows, all
/// of them get the value. A failure is printed by `log`.
void EnsureBaseInfo(terminal::Worklog& log, const std::string& path, const std::string& key,
                    const std::string& value);

} // namespace reportctl::store
