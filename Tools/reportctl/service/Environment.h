#pragma once

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

/// The environment that the running service was started with. This program's own environment when no service
/// runs, when the service is another user's, or when it has another XDG_DATA_HOME.
Environment OfTheService();

} // namespace reportctl::service
