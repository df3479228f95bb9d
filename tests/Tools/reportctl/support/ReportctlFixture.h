#pragma once

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <map>
#include <string>

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>
#include <gtest/gtest.h>
#include <sys/wait.h>

#include "tests/support/FileContent.h"
#include "tests/support/ModeOf.h"
#include "tests/support/TemporaryDirectory.h"

/// Runs reportctl with a data directory and a preferences directory of the test.
class ReportctlFixture : public testing::Test {
protected:
    struct Outcome {
        int exitCode = -1;
        std::string output; ///< standard output and standard error

        bool Says(const std::string& text) const { return output.find(text) != std::string::npos; }
    };

    /// Runs `reportctl setup` with these arguments. `shell` is shell text that comes before the command, such
    /// as "umask 0 &&".
    Outcome RunSetup(const std::string& arguments = {}, const std::string& shell = {}) const {
        return Reportctl("setup --preferences-dir '" + Preferences() + "' " + arguments, shell);
    }

    Outcome Reportctl(const std::string& arguments, const std::string& shell = {}) const {
        return Run(shell + " XDG_DATA_HOME='" + Data() + "' '" REPORTCTL "' " + arguments);
    }

    static Outcome Run(const std::string& command) {
        Outcome outcome;
        FILE* pipe = ::popen((command + " 2>&1").c_str(), "r");
        if (pipe == nullptr)
            return outcome;
        for (int c = std::fgetc(pipe); c != EOF; c = std::fgetc(pipe))
            outcome.output += static_cast<char>(c);
        const int status = ::pclose(pipe);
        outcome.exitCode = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
        return outcome;
    }

    std::string Data() const { return m_directory.Path() + "/data"; }
    std::string Preferences() const { return m_directory.Path() + "/preferences/hublink"; }
    std::string Database() const { return Data() + "/hublink/database"; }
    std::string Store() const { return Database() + "/Report.db"; }

    /// All that is below the test's directory: each path with its mode, and each file with its content.
    std::map<std::string, std::string> Everything() const {
        std::map<std::string, std::string> all;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(m_directory.Path()))
            all[entry.path()] = std::to_string(ModeOf(entry.path())) +
                                (entry.is_regular_file() ? ContentOf(entry.path()) : "");
        return all;
    }

    /// Makes a database by hand, as a user may have done, at the place where set-up looks for one.
    void MakeStore(const std::string& sql) const {
        std::filesystem::create_directories(Database());
        SQLite::Database(Store(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE).exec(sql);
    }

    /// The first cell that the query returns.
    std::string Ask(const std::string& query) const {
        SQLite::Database database(Store(), SQLite::OPEN_READWRITE);
        SQLite::Statement statement(database, query);
        return statement.executeStep() ? statement.getColumn(0).getString() : "(no row)";
    }

    std::string ColumnsOf(const std::string& table) const {
        return Ask("select group_concat(name || ' ' || type || pk) from pragma_table_info('" + table + "')");
    }

    static constexpr auto OPER_LOG_COLUMNS =
        "id INTEGER1,eventID TEXT0,value TEXT0,createTime TEXT0,pType INTEGER0,extData1 TEXT0,"
        "extData2 TEXT0,extData3 TEXT0,extData4 TEXT0";

private:
    TemporaryDirectory m_directory;
};
