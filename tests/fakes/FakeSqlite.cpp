#include "tests/fakes/FakeSqlite.h"

#include <numeric>

#include "Plugin/ISqliteDatabase.h"

namespace {

FakeSqliteState& State() {
    static FakeSqliteState state;
    return state;
}

bool Record(const std::string& operation, const std::string& argument) {
    State().calls.push_back({operation, argument});
    return State().Answer();
}

class Database final : public ISqliteDatabase {
public:
    bool Open(const std::string& path) override { return Record("Open", path); }
    bool CreateTable(const std::string& sql) override { return Record("CreateTable", sql); }
    bool ExecSql(const std::string& sql) override {
        if (State().onExec)
            State().onExec();
        return Record("ExecSql", sql);
    }

    bool BatExecSql(const std::vector<std::string>& sqls) override {
        const auto join = [](const std::string& all, const std::string& sql) {
            return all + (all.empty() ? "" : " ") + sql;
        };
        return Record("BatExecSql", std::accumulate(sqls.begin(), sqls.end(), std::string(), join));
    }

    bool QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows) override {
        rows.insert(rows.end(), State().rows.begin(), State().rows.end());
        return Record("QuerySql", sql);
    }

    bool GetTotalCount(const std::string& sql, int& count) override {
        State().calls.push_back({"count was", std::to_string(count)});
        if (State().count >= 0)
            count = State().count;
        return Record("GetTotalCount", sql);
    }

    std::string GetLastErrorMsg() override { return State().errorText; }
};

} // namespace

FAKE_EXPORT FakeSqliteState* FakeState() {
    return &State();
}

#ifndef WITHOUT_CREATE
FAKE_EXPORT ISqliteDatabase* CreateModule() {
    return State().Create() ? new Database : nullptr;
}
#endif

FAKE_EXPORT void DestoryModule(ISqliteDatabase* database) {
    State().Destroy();
    delete static_cast<Database*>(database);
}
