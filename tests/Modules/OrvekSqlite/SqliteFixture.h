#pragma once

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>
#include <gtest/gtest.h>

#include "Plugin/ISqliteDatabase.h"
#include "Plugin/ModuleLoader.h"
#include "SystemTool/IO/Directory.h"
#include "tests/support/StoreTables.h"
#include "tests/support/TemporaryDirectory.h"

/// The plug-in beside the test program, and a directory for its file. The tests examine the file through
/// their own connection, never through the plug-in.
class SqliteFixture : public testing::Test {
protected:
    using Loader = SystemTool::ModuleLoader<ISqliteDatabase>;

    void SetUp() override { ASSERT_NE(Plugin(), nullptr) << m_loader.GetLastError(); }

    static std::string PluginPath() {
        return SystemTool::IO::Directory::GetExcutableDirectory() + "libOrvekSqlite.dylib";
    }

    /// Makes a database as set-up leaves it.
    static void MakeStore(const std::string& path) {
        SQLite::Database database(path, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
        database.exec("pragma journal_mode = wal");
        database.exec(STORE_TABLES);
        database.exec("insert into BaseInfo values ('OpenID', 'u1')");
        std::filesystem::permissions(path, std::filesystem::perms{0600});
    }

    /// The service's own statement, character for character.
    static std::string Insert(const std::string& eventID, const std::string& value = "v",
                              const std::string& createTime = "1700000000000", const std::string& pType = "0",
                              const std::string& suiteVersion = "3.0.0.0",
                              const std::string& openID = "visitor") {
        return "insert into OperLog (eventID,value,createTime,pType,extData3,extData4) values('" + eventID +
               "', '" + value + "','" + createTime + "'," + pType + ",'" + suiteVersion + "','" + openID +
               "')";
    }

    /// The first cell that a query returns on the test's own connection; empty for NULL. It takes the write
    /// lock first, so that an open group of statements is committed before.
    static std::string Ask(const std::string& path, const std::string& query) {
        SQLite::Database database(path, SQLite::OPEN_READWRITE, 5000);
        database.exec("begin immediate");
        SQLite::Statement statement(database, query);
        return statement.executeStep() ? statement.getColumn(0).getString() : "(no row)";
    }

    static std::string Rows(const std::string& path) { return Ask(path, "select count(*) from OperLog"); }

    ISqliteDatabase* Plugin() { return m_loader.GetModule(); }
    const std::string& Store() const { return m_store; }
    const std::string& Directory() const { return m_directory.Path(); }

private:
    TemporaryDirectory m_directory;
    std::string m_store = m_directory.Path() + "/Report.db";
    Loader m_loader{PluginPath()};
};
