#include "Frame/DBHelper.h"

#include <Poco/Thread.h>

#include "Common/Common.h"

namespace SyncServiceReport {
namespace {

constexpr int BATCH_ATTEMPTS = 3;
constexpr long BATCH_PAUSE_MS = 1000;

} // namespace

DBHelper& DBHelper::instance() {
    static DBHelper type_instance;
    return type_instance;
}

bool DBHelper::Init(ISqliteDatabase* db) {
    m_pSqliteDb = db;
    return true;
}

bool DBHelper::CreateTable(const std::string& sql) {
    if (m_pSqliteDb == nullptr)
        return false;
    return m_pSqliteDb->CreateTable(sql) || Report("CreateTable", __LINE__, sql);
}

bool DBHelper::ExecSql(const std::string& sql) const {
    if (m_pSqliteDb == nullptr)
        return false;
    return m_pSqliteDb->ExecSql(sql) || Report("ExecSql", __LINE__, sql);
}

bool DBHelper::QuerySql(const std::string& sql, std::vector<std::vector<std::string>>& rows) {
    rows.clear();
    if (m_pSqliteDb == nullptr)
        return false;
    return m_pSqliteDb->QuerySql(sql, rows) ? !rows.empty() : Report("QuerySql", __LINE__, sql);
}

// NOLINTNEXTLINE(performance-unnecessary-value-param): the helper's interface takes the list by value
bool DBHelper::BatExecSql(std::vector<std::string> sqls) {
    if (m_pSqliteDb == nullptr)
        return false;
    for (int attempt = 0; attempt < BATCH_ATTEMPTS; ++attempt) {
        if (m_pSqliteDb->BatExecSql(sqls))
            return true;
        // The error text is the format string, deliberately: people find an error text with a percent sign in
        // the log, by the mark "[BoostLogError]".
        WriteLog({LogLevel::Error, "BatExecSql"}, m_pSqliteDb->GetLastErrorMsg());
        // It pauses after the last failure, too: a caller that starts over at once must not overload a busy
        // database.
        Poco::Thread::sleep(BATCH_PAUSE_MS);
    }
    return false;
}

bool DBHelper::GetTotalCount(const std::string& sql, int& count) {
    count = 0;
    // There is no test for a null object here, deliberately: to count before Init is the caller's mistake,
    // and must not look like an ordinary failure.
    return m_pSqliteDb->GetTotalCount(sql, count) || Report("GetTotalCount", __LINE__, sql);
}

/// Logs why an operation of the plug-in failed; always false.
bool DBHelper::Report(const char* function, int line, const std::string& sql) const {
    WriteLog({LogLevel::Error, function, line}, "%s-%s", m_pSqliteDb->GetLastErrorMsg(), sql);
    return false;
}

} // namespace SyncServiceReport
