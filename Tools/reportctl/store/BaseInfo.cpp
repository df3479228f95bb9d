#include "Tools/reportctl/store/BaseInfo.h"

#include <filesystem>

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <fmt/format.h>

#include "Tools/reportctl/store/SqlText.h"
#include "Tools/reportctl/store/Store.h"

namespace reportctl::store {
namespace {

/// Warns of single quotes: the service puts these texts into its statements without escaping them. With a
/// lone one, the database would refuse every report. It is a warning and no error, because the suite chooses
/// its ids.
void WarnOfQuotes(const terminal::Worklog& log, const std::string& text) {
    if (HasDoubledQuotes(text))
        log.Warn(
            fmt::format("\"{}\" holds a single quote written twice: it is stored as one quote, and goes to "
                        "analytics as two",
                        text));
    if (HasLoneQuote(text))
        log.Warn(fmt::format("\"{}\" holds a single quote: the service will not be able to store any report "
                             "while it is set",
                             text));
}

bool HasBaseInfo(SQLite::Database& database, const std::string& key, const std::string& value) {
    if (!database.tableExists("BaseInfo"))
        return false; // a dry run would make it
    SQLite::Statement query(database, "select count(*), total(value is ?) from BaseInfo where key = ?");
    query.bind(1, value);
    query.bind(2, key);
    query.executeStep();
    return query.getColumn(0).getInt() > 0 && query.getColumn(0).getInt() == query.getColumn(1).getInt();
}

/// Updates all rows of the key: other programs may have left several, and the service takes the last of them.
void WriteBaseInfo(SQLite::Database& database, const std::string& key, const std::string& value) {
    SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
    SQLite::Statement update(database, "update BaseInfo set value = ? where key = ?");
    update.bind(1, value);
    update.bind(2, key);
    if (update.exec() == 0) {
        SQLite::Statement insert(database, "insert into BaseInfo (key, value) values (?, ?)");
        insert.bind(1, key);
        insert.bind(2, value);
        insert.exec();
    }
    transaction.commit();
}

} // namespace

void EnsureBaseInfo(terminal::Worklog& log, const std::string& path, const std::string& key,
                    const std::string& value) {
    const auto thing = fmt::format("{} to \"{}\" in the table BaseInfo", key, value);
    WarnOfQuotes(log, value);
    try {
        if (log.IsDryRun() && !std::filesystem::exists(path)) {
            log.Run(terminal::SET, thing, [] {});
            return;
        }
        if (auto database = OpenStoreToLook(path); HasBaseInfo(database, key, value))
            log.AlreadyDone(fmt::format("{} \"{}\" in the table BaseInfo", key, value));
        else
            log.Run(
                terminal::SET, thing,
                [&] {
                    auto store = OpenStore(path);
                    WriteBaseInfo(store, key, value);
                },
                "Run this again.");
    } catch (const std::exception& error) {
        log.Fail(fmt::format("{}: {}.", path, error.what()));
    }
}

} // namespace reportctl::store
