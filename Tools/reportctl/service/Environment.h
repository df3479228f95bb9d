#pragma once

#include <array>
#include <map>
#include <string>

namespace reportctl::service {

/// Environment variables, and the process that they belong to.
struct Environment {
    int process = 0; ///< the service's process, or 0 for this program's own environment
    std::map<std::string, std::string> variables;

    /// The variable's value, or null.
    const char* Find(const std::string& name) const;
};

/// This program's own environment.
Environment Own();

/// The environment that the running service was started with. This program's own environment when no service
/// runs, when the service is another user's, or when it has another XDG_DATA_HOME.
Environment OfTheService();

/// The variables that name proxies, of which the last two name what goes past them.
inline constexpr std::array PROXIES{"http_proxy", "https_proxy", "HTTPS_PROXY", "all_proxy",
                                    "ALL_PROXY",  "no_proxy",    "NO_PROXY"};

/// Puts the environment's proxies into that of this process, where libcurl looks them up. One thread.
void TakeOverProxies(const Environment& environment);

} // namespace reportctl::service
