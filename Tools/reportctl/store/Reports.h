#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include <SQLiteCpp/Statement.h>

/// The rows of the store with the columns that an analyst needs. The view `reports` of the store and the
/// commands that read rows use the same SELECT, so the columns mean the same everywhere.
namespace reportctl::store {

/// The SQL expression for a row's time in milliseconds since 1970. `createTime` is the column or expression
/// that holds the time as a text. The result is NULL when the text is not a number, or not a date between the
/// years 0 and 9999. A row with NULL matches no bound on time.
std::string TimeOf(const std::string& createTime);

/// The SELECT of all rows with the columns id, at, at_local, event, module, action, value, value_json,
/// openid, suite_version, create_time and time. docs/Database.md explains them.
const std::string& ReportsSelect();

/// The statement that makes the view `reports` of the first ten of these columns. Each letter is as SQLite
/// keeps it, because set-up compares this text with the view that is there.
const std::string& ReportsView();

/// Which rows a command reads. A bound on time is in milliseconds since 1970.
struct ReportFilter {
    std::optional<std::int64_t> sinceMs; ///< the first moment that is included
    std::optional<std::int64_t> untilMs; ///< the first moment that is no longer included
    std::string eventPrefix;             ///< the beginning of the event ids; empty for every event

    /// The condition for a WHERE clause, with the parameters :since, :until and :prefix; "1" when every row
    /// matches.
    std::string Condition() const;

    void BindTo(SQLite::Statement& statement) const;
};

} // namespace reportctl::store
