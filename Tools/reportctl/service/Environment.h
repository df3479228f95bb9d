#pragma once

#include <map>
#include <string>

namespace reportctl::service {

/// Where settings were read from.
struct Environment {
    int process = 0; ///< the service's, or 0 for this program's own environment
    std::map<std::string, std::string> variables;

    /// The variable's value, or null.
    const char* Find(const std::string& name) const;
};

/// The environment of the running service, as it was at its start; where there is none, or it is another
/// user's, this program's own.
Environment OfTheService();

} // namespace reportctl::service
