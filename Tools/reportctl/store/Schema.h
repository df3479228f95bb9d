#pragma once

#include <string>
#include <vector>

#include <SQLiteCpp/Database.h>

namespace reportctl::store {

/// The version of the store's tables that this program makes, kept in the database's user_version. 0 is a
/// database whose tables, if any, were made by hand; 1 has the tables; 2 also has the view `reports`.
inline constexpr int SCHEMA_VERSION = 2;

/// The version that the database says it has.
int SchemaVersionOf(SQLite::Database& database);

/// The statements that turn the database's tables into those of SCHEMA_VERSION, keeping every row and every
/// column that is there; none when it has them and the version already. Throws std::runtime_error when a
/// table is such that no statement could do that, and SQLite::Exception when the database cannot be read.
std::vector<std::string> StatementsToCurrentSchema(SQLite::Database& database);

/// Runs the statements in one transaction: all or nothing. Throws SQLite::Exception.
void RunInTransaction(SQLite::Database& database, const std::vector<std::string>& statements);

} // namespace reportctl::store
