#include "Metrik/MetrikMgr.h"

#include "App/ReportServer.h"
#include "Common/Common.h"
#include "Ledger/Outcome.h"
#include "Metrik/MetrikWorker.h"
#include "SystemTool/IO/JsonDocument.h"

namespace SyncServiceReport {
namespace {

using ReportLedger::Ended;
using ReportLedger::Outcome;
using SystemTool::IO::JsonDocument;

ST_InitMsg InitMsgFrom(const JsonDocument& exdata) {
    const auto text = [&exdata](const char* key) { return exdata.GetKeyValue(key).ToString(); };
    return {.moduleID = text(Wire::MODULE_ID),
            .moduleVersion = text(Wire::MODULE_VERSION),
            .moduleName = text(Wire::MODULE_NAME),
            .logPath = text(Wire::LOG_PATH),
            .dbPath = text(Wire::DB_PATH),
            .openID = text(Wire::OPEN_ID),
            .hublinkVersion = text(Wire::HUBLINK_VERSION)};
}

} // namespace

MetrikMgr::MetrikMgr(ReportServer* server) : m_pServer(server) {}

bool MetrikMgr::Init() {
    ST_InitMsg msg;
    msg.moduleID = DEFAULT_MODULE_ID; // the worker knows the other settings of the default module itself
    AddWorker(msg);
    return true;
}

void MetrikMgr::AddWorker(const ST_InitMsg& msg) {
    if (m_mapWorkers.contains(msg.moduleID))
        return;
    Poco::SharedPtr<MetrikWorker> worker(new MetrikWorker(m_pServer));
    m_pNewest = worker;
    // The results below are ignored, deliberately: a worker whose SDK did not start is registered, too.
    // Otherwise a module that announces itself repeatedly would load the SDK each time.
    if (msg.moduleID == DEFAULT_MODULE_ID)
        worker->InitDefalut();
    else
        worker->Init(msg);
    m_mapWorkers[msg.moduleID] = worker;
    WriteLog({LogLevel::Info, "AddWorker", 41}, "Add metrik module :%s", msg.moduleID);
}

bool MetrikMgr::Update(const std::string& json) {
    try {
        std::string error;
        JsonDocument parser;
        const JsonDocument message = parser.FromJson(json, error);
        if (!error.empty()) {
            // People search the log for this spelling.
            WriteLog({LogLevel::Error, "Update", 53}, "json formate error :%s", error);
            Ended(Outcome::NotJson);
            return false;
        }
        const std::string msgType = message.GetKeyValue(Wire::MESSAGE_KIND).ToString();
        const JsonDocument exdata = message.GetKeyValue(Wire::MESSAGE_DATA);
        std::string openID;
        std::string version;
        if (msgType == ORVEK_REPORT_MODULEINIT) {
            const ST_InitMsg msg = InitMsgFrom(exdata);
            AddWorker(msg);
            openID = msg.openID;
            version = msg.hublinkVersion;
        } else if (msgType == ORVEK_REPORT_UPDATEOPENID) {
            openID = exdata.GetKeyValue(Wire::OPEN_ID).ToString();
            version = exdata.GetKeyValue(Wire::HUBLINK_VERSION).ToString();
        }
        // A version without an open id is not passed on, deliberately: it belongs to a user.
        if (!openID.empty()) {
            ST_BaseInfo info;
            info.openID = openID;
            info.suiteVersion = version;
            m_pServer->SetBaseInfo(info);
        }
        if (msgType == ORVEK_REPORT_MODULEINIT || msgType == ORVEK_REPORT_UPDATEOPENID)
            Ended(Outcome::Control);
        return true;
    } catch (...) {
        return LogCaughtException({LogLevel::Warning, "Update", 93});
    }
}

bool MetrikMgr::Send(const ST_OptLog& log) {
    try {
        const auto bar = log.eventID.find('|');
        if (bar == std::string::npos) {
            WriteLog({LogLevel::Warning, "Send", 107}, "eventID error :%s", log.eventID);
            Ended(Outcome::EventIdWithoutBar);
            return false;
        }
        const std::string module = log.eventID.substr(0, bar);
        const auto found = m_mapWorkers.find(module);
        if (found == m_mapWorkers.end()) {
            WriteLog({LogLevel::Warning, "Send", 115}, "module not init :%s", module);
            Ended(Outcome::ModuleNotInit);
            return false;
        }
        Poco::SharedPtr<IWorker> worker = found->second;
        return worker->Send(log);
    } catch (...) {
        Ended(Outcome::Exception);
        return LogCaughtException({LogLevel::Warning, "Send", 122});
    }
}

} // namespace SyncServiceReport
