#pragma once

#include "tests/Tools/reportctl/support/ReportctlFixture.h"

/// A store that set-up made, and rows in it.
class RowsFixture : public ReportctlFixture {
protected:
    void SetUp() override { ASSERT_EQ(RunSetup().exitCode, 0); }

    void Sql(const std::string& sql) const { SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec(sql); }

    /// Inserts a row. The arguments are SQL literals; the other columns are as the service writes them.
    void Insert(const std::string& event, const std::string& value, const std::string& createTime) const {
        Sql("insert into OperLog (eventID, value, createTime, pType, extData3, extData4) values (" + event +
            ", " + value + ", " + createTime + ", 0, '5.1.0.2', 'u1')");
    }

    /// Inserts this many rows, one second apart, from 2023-11-14T22:13:20Z on.
    void InsertMany(int rows) const {
        Sql("with recursive n(i) as (select 0 union all select i + 1 from n where i + 1 < " +
            std::to_string(rows) +
            ") insert into OperLog (eventID, value, createTime, pType, extData3, extData4) "
            "select 'B100|' || (i % 3), 'value ' || i, 1700000000000 + i * 1000, 0, '5.1.0.2', 'u1' from n");
    }

    /// The standard output of reportctl, without its standard error.
    std::string OutputOf(const std::string& arguments, const std::string& shell = {}) const {
        return Reportctl(arguments + " 2>'" + Errors() + "'; }", "{ " + shell).output;
    }

    std::string Errors() const { return Data() + "/errors"; }
};
