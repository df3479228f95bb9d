#include "Frame/FrameWorker.h"

#include <map>
#include <vector>

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
        // The result is ignored, deliberately: the file may be made later. Until then, each insert fails and
        // logs that.
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
            settings[row[0]] = row[1]; // when rows have the same key, the last row counts

    // When a key is missing, `info` passes its default on, and the server accepts that: it ignores empty
    // texts but not defaults.
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
        // The texts are not escaped, deliberately: a sender may double its quotes itself, and to escape them
        // again would store them doubled. A text with a single quote makes a statement that the database
        // rejects. The plug-in limits what a text can do inside the statement. We use fmt because
        // Poco::format, which gives the same text, takes ten times as long: it makes a stream for each value.
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
