#pragma once

#include <string>
#include <vector>

#include <SQLiteCpp/Database.h>

namespace reportctl::store {

/// The version of the store's tables that this program makes. The database keeps it in its user_version.
/// Version 0 has no tables, or tables that were made by hand. Version 1 has the tables. Version 2 also has
/// the view `reports`.
inline constexpr int SCHEMA_VERSION = 2;

/// The version that the database has in its user_version.
int SchemaVersionOf(SQLite::Database& database);

/// The statements that turn the database's tables into those of SCHEMA_VERSION. They keep every row and every
/// column. There are none when the database has the tables and the version already. Throws std::runtime_error
/// when a table cannot be turned into such a table, and SQLite::Exception when the database cannot be read.
std::vector<std::string> StatementsToCurrentSchema(SQLite::Database& database);

/// Runs the statements in one transaction: either all of them take effect or none. Throws SQLite::Exception.
void RunInTransaction(SQLite::Database& database, const std::vector<std::string>& statements);

} // namespace reportctl::store
