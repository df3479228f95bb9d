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
    if (text.size() == Wire::SECONDS_LENGTH) // in bytes, a minus sign included
        text += "000"; // by length alone, deliberately: senders give seconds as a number or as a text
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
        // Both bases have a thread and a loop; this is the queue's pair. What is received before waits in the
        // queue.
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
    // The received text is the format string, deliberately. One that boost::format cannot make sense of is
    // found in the log by its "[BoostLogError]" mark; it is processed like any other.
    if (!WriteLog({LogLevel::Info, "Recv", 42}, msg))
        m_ledger.CouldNotFormat();
    Produce(msg);
    m_ledger.Queued();
    return true;
}

bool ReportServer::Consume(const std::string& msg) {
    // How a report ended is named where that is known; what is named here is what a destination's answer
    // alone tells.
    const ReportLedger::Handling handling(m_ledger);
    try {
        // A search of the raw text and no parse, deliberately: it is what tells the two kinds of message
        // apart.
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
            WriteLog({LogLevel::Error, "JsonToStruct", 123},
                     error); // the parser's text is the format, deliberately
            Ended(Outcome::NotJson);
            return false;
        }
        out.eventID = report.GetKeyValue(Wire::REPORT_MARK).ToString();
        const JsonDocument value = report.GetKeyValue("value");
        out.value = value.IsObject() ? value.ToJson() : value.ToString();
        out.createTime = TimeText(report.GetKeyValue("createTime"));
        out.pType = std::count(out.eventID.begin(), out.eventID.end(), '|') == 1 ? 0 : 1;
        out.isDayReport = report.GetKeyValue("isDayReport").ToInt() == 1;
        return true;
    } catch (...) {
        Ended(Outcome::Exception);
        return LogCaughtException({LogLevel::Warning, "JsonToStruct", 164});
    }
}

} // namespace SyncServiceReport
