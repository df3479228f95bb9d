#include "Tools/reportctl/store/Schema.h"

#include <algorithm>
#include <stdexcept>

#include <SQLiteCpp/Statement.h>
#include <SQLiteCpp/Transaction.h>
#include <fmt/format.h>
#include <fmt/ranges.h>
#include <sqlite3.h>

#include "Tools/reportctl/store/Reports.h"

namespace reportctl::store {
namespace {

struct Column {
    std::string name;
    std::string type; ///< as the table's definition writes it
    bool isKey = false;
};
using Columns = std::vector<Column>;

struct Table {
    std::string name;
    Columns columns;
};

/// The table that has one row for each stored report.
const Table OPER_LOG{"OperLog",
                     {{"id", "INTEGER", true},
                      {"eventID", "TEXT"},
                      {"value", "TEXT"},
                      {"createTime", "TEXT"},
                      {"pType", "INTEGER"},
                      {"extData1", "TEXT"},
                      {"extData2", "TEXT"},
                      {"extData3", "TEXT"},
                      {"extData4", "TEXT"}}};

/// The keys are not unique, deliberately. The service takes the last row of a key, so another program of the
/// suite may append a row instead of updating one.
const Table BASE_INFO{"BaseInfo", {{"key", "TEXT"}, {"value", "TEXT"}}};

std::string Quoted(const std::string& name) {
    std::string quoted = "\"";
    for (const char c : name)
        quoted += c == '"' ? "\"\"" : std::string(1, c);
    return quoted + "\"";
}

std::string DefinitionOf(const Column& column) {
    return fmt::format("{} {}{}", Quoted(column.name), column.type, column.isKey ? " primary key" : "");
}

std::string NamesOf(const Columns& columns) {
    std::vector<std::string> names;
    std::transform(columns.begin(), columns.end(), std::back_inserter(names),
                   [](const Column& column) { return Quoted(column.name); });
    return fmt::format("{}", fmt::join(names, ", "));
}

std::string Create(const std::string& table, const Columns& columns) {
    std::vector<std::string> definitions;
    std::transform(columns.begin(), columns.end(), std::back_inserter(definitions), DefinitionOf);
    return fmt::format("create table {} ({})", table, fmt::join(definitions, ", "));
}

Columns ColumnsIn(SQLite::Database& database, const std::string& table) {
    SQLite::Statement query(database, "select name, type, pk from pragma_table_info(?)");
    query.bind(1, table);
    Columns columns;
    while (query.executeStep())
        columns.push_back({query.getColumn(0), query.getColumn(1), query.getColumn(2).getInt() != 0});
    return columns;
}

/// Finds a column by its name. In SQL, upper and lower case are the same in column names.
const Column* Find(const Columns& columns, const std::string& name) {
    const auto found = std::find_if(columns.begin(), columns.end(), [&](const Column& column) {
        return sqlite3_stricmp(column.name.c_str(), name.c_str()) == 0;
    });
    return found == columns.end() ? nullptr : &*found;
}

/// Appends the statements that move the rows into a new table with a key, because SQLite cannot add a key to
/// a table that exists. The rows keep all their columns. Their row numbers become the key, which keeps their
/// order.
void AppendRebuild(std::vector<std::string>& statements, const Table& table, const Columns& present) {
    Columns all = table.columns;
    for (const auto& column : present)
        if (Find(all, column.name) == nullptr)
            all.push_back({column.name, column.type});
    const auto old = table.name + "_before";
    statements.push_back(fmt::format("alter table {} rename to {}", table.name, old));
    statements.push_back(Create(table.name, all));
    statements.push_back(fmt::format("insert into {0} (id, {1}) select rowid, {1} from {2} order by rowid",
                                     table.name, NamesOf(present), old));
    statements.push_back(fmt::format("drop table {}", old));
}

void AppendMissingColumns(std::vector<std::string>& statements, const Table& table, const Columns& present) {
    for (const auto& column : table.columns)
        if (Find(present, column.name) == nullptr)
            statements.push_back(
                fmt::format("alter table {} add column {}", table.name, DefinitionOf(column)));
}

void AppendTable(std::vector<std::string>& statements, SQLite::Database& database, const Table& table) {
    const auto present = ColumnsIn(database, table.name);
    const auto& first = table.columns.front();
    const auto* key = Find(present, first.name);
    if (present.empty())
        statements.push_back(Create(table.name, table.columns));
    else if (first.isKey && key == nullptr)
        AppendRebuild(statements, table, present);
    else if (first.isKey && (!key->isKey || sqlite3_stricmp(key->type.c_str(), first.type.c_str()) != 0))
        throw std::runtime_error(
            fmt::format("the column {} of {} is not its integer primary key", first.name, table.name));
    else
        AppendMissingColumns(statements, table, present);
}

/// The definition of the view `reports` as SQLite keeps it; empty when there is no such view.
std::string ViewIn(SQLite::Database& database) {
    SQLite::Statement query(database,
                            "select type, sql from sqlite_master where name = 'reports' collate nocase");
    if (!query.executeStep())
        return {};
    if (query.getColumn(0).getString() != "view")
        throw std::runtime_error("there is something else than a view of the name reports");
    return query.getColumn(1);
}

/// Puts statements around the others that drop the view and make it again. Otherwise SQLite would change the
/// view's text when a table is renamed.
void WrapInView(std::vector<std::string>& statements, SQLite::Database& database) {
    const auto present = ViewIn(database);
    if (statements.empty() && present == ReportsView())
        return;
    if (!present.empty())
        statements.insert(statements.begin(), "drop view reports");
    statements.push_back(ReportsView());
}

} // namespace

int SchemaVersionOf(SQLite::Database& database) {
    return database.execAndGet("pragma user_version").getInt();
}

std::vector<std::string> StatementsToCurrentSchema(SQLite::Database& database) {
    std::vector<std::string> statements;
    AppendTable(statements, database, OPER_LOG);
    AppendTable(statements, database, BASE_INFO);
    WrapInView(statements, database);
    if (SchemaVersionOf(database) != SCHEMA_VERSION)
        statements.push_back(fmt::format("pragma user_version = {}", SCHEMA_VERSION));
    return statements;
}

void RunInTransaction(SQLite::Database& database, const std::vector<std::string>& statements) {
    SQLite::Transaction transaction(database, SQLite::TransactionBehavior::IMMEDIATE);
    for (const auto& statement : statements)
        database.exec(statement);
    transaction.commit();
}

} // namespace reportctl::store
