#include "App/ReportServer.h"

#include <algorithm>

#include "Common/Common.h"
#include "Frame/FrameWorker.h"
#include "Ledger/Outcome.h"
#include "Metrik/MetrikMgr.h"
#include "SystemTool/IO/JsonDocument.h"

namespace SyncServiceReport {
namespace {

using ReportLedger::Ended;
using ReportLedger::Outcome;
using SystemTool::IO::JsonDocument;

std::string TimeText(const JsonDocument& createTime) {
    std::string text =
        createTime.IsLongLong() ? std::to_string(createTime.ToLongLong()) : createTime.ToString();
    // Ten bytes, a minus sign included, count as seconds. We look at the length alone, deliberately: senders
    // give seconds as a number or as a text.
    if (text.size() == Wire::SECONDS_LENGTH)
        text += "000";
    return text;
}

} // namespace

ReportServer::ReportServer() {
    WatchBy(m_intake);
}

ReportServer::~ReportServer() {
    Stop();
}

bool ReportServer::Start() {
    try {
        InitBaseInfo();
        m_pMetrikMgr = new MetrikMgr(this);
        m_pMetrikMgr->Init();
        m_pFrameWorker = new FrameWorker(this);
        m_pFrameWorker->Init();
        UDPServer::Start(UDP_SERVER_IP, Wire::PORT);
        // Both base classes have a thread and a loop. This starts the thread of the queue. A report that
        // arrives earlier waits in the queue.
        WorkQueue::m_thread.start(static_cast<WorkQueue&>(*this));
        return true;
    } catch (...) {
        return LogCaughtException({LogLevel::Warning, "Start", 35});
    }
}

void ReportServer::Stop() {
    UDPServer::Stop();
    StopThread();
}

bool ReportServer::Recv(const std::string& msg) {
    // The received text is the format string, deliberately. People find a text that is no valid format in the
    // log, by its mark "[BoostLogError]". Such a text is then handled like any other.
    if (!WriteLog({LogLevel::Info, "Recv", 42}, msg))
        m_ledger.CouldNotFormat();
    Produce(msg);
    m_ledger.Queued();
    return true;
}

bool ReportServer::Consume(const std::string& msg) {
    // The ledger counts the first outcome that is named with Ended. The destinations name the causes that
    // they know. The calls below name an outcome when there is only the destination's result.
    const ReportLedger::Handling handling(m_ledger);
    try {
        // We search the raw text and do not parse it, deliberately: this rule separates reports from control
        // messages, and senders rely on it.
        if (msg.find(Wire::REPORT_MARK) == std::string::npos) {
            Ended(m_pMetrikMgr->Update(msg) ? Outcome::OtherControl : Outcome::Exception);
            return true;
        }
        ST_OptLog log;
        if (!JsonToStruct(msg, log))
            return false;
        if (log.eventID.substr(0, 1) == Wire::ANALYTICS_PREFIX)
            Ended(m_pMetrikMgr->Send(log) ? Outcome::ToAnalytics : Outcome::Analytics);
        else
            Ended(m_pFrameWorker->Send(log) ? Outcome::Stored : Outcome::Store);
        return true;
    } catch (...) {
        Ended(Outcome::Exception);
        return LogCaughtException({LogLevel::Warning, "Consume", 76});
    }
}

void ReportServer::InitBaseInfo() {
    m_baseInfo.userDataDir = SystemTool::CommonTool::GetUserDataDir();
    m_baseInfo.osVersion = SystemTool::CommonTool::GetOSVersionString();
}

void ReportServer::SetBaseInfo(const ST_BaseInfo& info) {
    if (!info.openID.empty())
        m_baseInfo.openID = info.openID;
    if (!info.suiteVersion.empty())
        m_baseInfo.suiteVersion = info.suiteVersion;
    WriteLog({LogLevel::Info, "SetBaseInfo", 111}, "SetBaseInfo %s-%s", m_baseInfo.openID,
             m_baseInfo.suiteVersion);
}

bool ReportServer::JsonToStruct(const std::string& json, ST_OptLog& out) {
    try {
        out = ST_OptLog();
        std::string error;
        JsonDocument report;
        report.FromJson(json, error);
        if (!error.empty()) {
            // The parser's error text is the format string, deliberately.
            WriteLog({LogLevel::Error, "JsonToStruct", 123}, error);
            Ended(Outcome::NotJson);
            return false;
        }
        out.eventID = report.GetKeyValue(Wire::REPORT_MARK).ToString();
        const JsonDocument value = report.GetKeyValue(Wire::VALUE);
        out.value = value.IsObject() ? value.ToJson() : value.ToString();
        out.createTime = TimeText(report.GetKeyValue(Wire::CREATE_TIME));
        out.pType = std::count(out.eventID.begin(), out.eventID.end(), '|') == 1 ? 0 : 1;
        out.isDayReport = report.GetKeyValue(Wire::IS_DAY_REPORT).ToInt() == 1;
        return true;
    } catch (...) {
        Ended(Outcome::Exception);
        return LogCaughtException({LogLevel::Warning, "JsonToStruct", 164});
    }
}

} // namespace SyncServiceReport
