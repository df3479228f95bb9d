#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include <SQLiteCpp/Statement.h>

/// The rows of the store as an analyst wants them. One statement says what the columns mean; the view
/// `reports` of the store and the commands that read rows use the same text.
namespace reportctl::store {

/// SQL for the time of a row, in milliseconds since 1970, by the column or expression `createTime` that holds
/// it as a text; NULL when that is no number, or no date between the years 0 and 9999. Such a row matches no
/// bound on time.
std::string TimeOf(const std::string& createTime);

/// `select` of all rows with the columns id, at, at_local, event, module, action, value, value_json, openid,
/// suite_version, create_time and time. docs/Database.md tells what they mean.
const std::string& ReportsSelect();

/// The statement that makes the view `reports` of the first ten of these columns, to the letter as SQLite
/// keeps it.
const std::string& ReportsView();

/// Which rows a command is about. A bound on time is in milliseconds since 1970.
struct ReportFilter {
    std::optional<std::int64_t> sinceMs; ///< the first moment that counts
    std::optional<std::int64_t> untilMs; ///< the first moment that does not count any more
    std::string eventPrefix;             ///< empty: every event

    /// For `where`, with the parameters :since, :until and :prefix; "1" when nothing is asked for.
    std::string Condition() const;

    void BindTo(SQLite::Statement& statement) const;
};

} // namespace reportctl::store
