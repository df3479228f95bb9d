#pragma once

#include <string>

namespace reportctl::setup {

struct SetupOptions {
    bool dryRun = false;
    bool quiet = false;         ///< tells failures and warnings only
    bool compact = false;       ///< rewrite a large store of an older set-up so that its file can shrink
    std::string openID;         ///< empty: not to be set
    std::string suiteVersion;   ///< empty: not to be set
    std::string preferencesDir; ///< where the service keeps its pid file
};

/// Makes what the service needs and finds missing: its directories, the store with its tables, and what is
/// told about the user. What is there already stays as it is. One failure does not keep the rest from being
/// made. Returns the exit code: 0, or 1 when something could not be done.
int RunSetup(const SetupOptions& options);

} // namespace reportctl::setup
