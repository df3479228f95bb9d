#pragma once

#include <string>

namespace reportctl::setup {

struct SetupOptions {
    bool dryRun = false;
    bool quiet = false;         ///< print failures and warnings only
    bool compact = false;       ///< rewrite a large store of an older set-up so that its file can shrink
    std::string openID;         ///< empty: do not set it
    std::string suiteVersion;   ///< empty: do not set it
    std::string preferencesDir; ///< where the service keeps its pid file
};

/// Makes everything that the service needs: its directories, its pid file, the store with its tables, and the
/// rows about the user. Data that is there already stays. After a failure, the other things are still made.
/// Returns the exit code: 0, or 1 when something could not be done.
int RunSetup(const SetupOptions& options);

} // namespace reportctl::setup
