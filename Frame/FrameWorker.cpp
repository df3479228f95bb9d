#include "Frame/FrameWorker.h"

#include <map>
#include <vector>

#include <Poco/Format.h>
#include <fmt/format.h>

#include "App/ReportServer.h"
#include "Common/Common.h"
#include "Frame/DBHelper.h"
#include "Ledger/Outcome.h"

namespace SyncServiceReport {

using ReportLedger::Ended;
using ReportLedger::Outcome;

FrameWorker::FrameWorker(ReportServer* server) : m_pServer(server) {}

FrameWorker::~FrameWorker() = default;

bool FrameWorker::Init() {
    try {
        const std::string library = ORVEK_EXCUTABLE_PATH + "libOrvekSqlite.dylib";
        m_pSqliteLoader = new SqliteLoader(library);
        m_pSqliteDb = m_pSqliteLoader.isNull() ? nullptr : m_pSqliteLoader->GetModule();
        if (m_pSqliteDb == nullptr) {
            WriteLog({LogLevel::Error, "Init"}, "Failed to load sqlite plugin:" + library);
            return false;
        }
        // The result is not looked at, deliberately: the file may be made later, and until then each insert
        // that fails says so.
        m_pSqliteDb->Open(Paths::Store(m_pServer->GetBaseInfo().userDataDir));
        DBHelper::instance().Init(m_pSqliteDb);
        SetUserBaseInfo();
        WriteLog({LogLevel::Info, "Init"}, "FrameWorker load success");
        return true;
    } catch (...) {
        return LogCaughtException({LogLevel::Warning, "Init"});
    }
}

void FrameWorker::SetUserBaseInfo() {
    std::vector<std::vector<std::string>> rows;
    if (!DBHelper::instance().QuerySql("select key ,value from BaseInfo ;", rows))
        return;
    std::map<std::string, std::string> settings;
    for (const auto& row : rows)
        if (row.size() >= 2)
            settings[row[0]] = row[1]; // of rows with the same key, the last counts

    // A missing key passes the record's default on, and the server takes it over: it ignores empty texts, not
    // defaults.
    ST_BaseInfo info;
    if (const auto found = settings.find("OpenID"); found != settings.end())
        info.openID = found->second;
    if (const auto found = settings.find("HubLinkVersion"); found != settings.end())
        info.suiteVersion = found->second;
    m_pServer->SetBaseInfo(info);
}

bool FrameWorker::Send(const ST_OptLog& log) {
    try {
        const ST_BaseInfo& info = m_pServer->GetBaseInfo();
        // The texts go in as they are, deliberately: a sender may double its quotes itself, and escaping
        // again would store them doubled. A text with a lone quote makes a statement that the database
        // rejects. What a text may do inside the statement, the plug-in limits.
        // Poco::format would give the same text, ten times slower: it makes a stream for each value.
        const std::string sql =
            fmt::format("insert into OperLog (eventID,value,createTime,pType,extData3,extData4) "
                        "values('{}', '{}','{}',{},'{}','{}')",
                        log.eventID, log.value, log.createTime, log.pType, info.suiteVersion, info.openID);
        if (!DBHelper::instance().HasDatabase())
            Ended(Outcome::NoStore);
        return DBHelper::instance().ExecSql(sql);
    } catch (...) {
        Ended(Outcome::Exception);
        return LogCaughtException({LogLevel::Warning, "Send"});
    }
}

} // namespace SyncServiceReport
