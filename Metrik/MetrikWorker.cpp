#include "Metrik/MetrikWorker.h"

#include "App/ReportServer.h"
#include "Common/Common.h"
#include "Ledger/Outcome.h"
#include "SystemTool/IO/JsonDocument.h"

namespace SyncServiceReport {

using ReportLedger::Ended;
using ReportLedger::Outcome;
using SystemTool::IO::JsonDocument;

// NOLINTBEGIN(performance-unnecessary-value-param): the SDK's callbacks take their texts by value

void FailCallBackFun(std::string a, std::string b) {
    WriteLog({LogLevel::Error, "FailCallBackFun", 21}, "%s-%s", a, b);
}

void SuccCallBackFun(std::string, std::string) {}

// NOLINTEND(performance-unnecessary-value-param)

MetrikWorker::MetrikWorker(ReportServer* server) : m_pServer(server) {}

MetrikWorker::~MetrikWorker() = default;

bool MetrikWorker::InitDefalut() {
    try {
        IMetrikSdk* const sdk = LoadSdk("InitDefalut", 32, 38);
        if (sdk == nullptr)
            return false;
        const std::string& userDataDir = m_pServer->GetBaseInfo().userDataDir;
        sdk->InitSdk(DEFAULT_MODULE_ID, DEFAULT_MODULE_VERSION, DEFAULT_MODULE_NAME, Paths::Logs(userDataDir),
                     Paths::Databases(userDataDir), FailCallBackFun, SuccCallBackFun);
        m_pSdk = sdk;
        return true;
    } catch (...) {
        return LogCaughtException({LogLevel::Warning, "InitDefalut", 56});
    }
}

bool MetrikWorker::Init(const ST_InitMsg& msg) {
    IMetrikSdk* const sdk = LoadSdk("Init", 67, 73);
    if (sdk == nullptr)
        return false;
    sdk->InitSdk(msg.moduleID, msg.moduleVersion, msg.moduleName, msg.logPath, msg.dbPath, FailCallBackFun,
                 SuccCallBackFun);
    m_pSdk = sdk;
    return true;
}

/// Loads the plug-in for this worker alone and returns the plug-in's object. When something is missing, this
/// logs what, with `function` as the function's name, and returns null.
IMetrikSdk* MetrikWorker::LoadSdk(const char* function, int loaderLine, int interfaceLine) {
    m_pSdk = nullptr; // the old object is destroyed with the loader that held it
    const std::string library = ORVEK_EXCUTABLE_PATH + "libMetrikSdk.dylib";
    m_pSdkLoader = new SdkLoader(library);
    if (m_pSdkLoader.isNull()) {
        WriteLog({LogLevel::Error, function, loaderLine}, "Failed to load metrik sdk loader:%s", library);
        return nullptr;
    }
    if (m_pSdkLoader->GetModule() == nullptr)
        WriteLog({LogLevel::Error, function, interfaceLine}, "Failed to load metrik sdk interface:%s",
                 m_pSdkLoader->GetLastError());
    return m_pSdkLoader->GetModule();
}

bool MetrikWorker::Send(const ST_OptLog& log) {
    if (m_pSdk == nullptr)
        return false;
    try {
        const ST_BaseInfo& info = m_pServer->GetBaseInfo();
        JsonDocument extend;
        extend.SetKeyValue(Wire::HUBLINK_VERSION, info.suiteVersion);
        extend.SetKeyValue(Wire::CREATE_TIME, log.createTime);

        JsonDocument eventData;
        if (!log.value.empty()) {
            std::string error;
            eventData.FromJson(log.value, error);
            if (!error.empty()) {
                // The parser's error text is the format string, deliberately.
                WriteLog({LogLevel::Error, "Send", 107}, error);
                Ended(Outcome::ValueNotJson);
                return false;
            }
        }
        eventData.SetKeyValue(Wire::EVENT_OPEN_ID, info.openID);
        eventData.SetKeyValue(Wire::EVENT_SYSTEM, info.osVersion);

        JsonDocument root;
        root.SetKeyValue(Wire::EVENT_EXTEND, extend);
        root.SetKeyValue(Wire::EVENT_DATA, eventData);
        return m_pSdk->ReportEvent(log.eventID, root.ToJson());
    } catch (...) {
        Ended(Outcome::Exception);
        return LogCaughtException({LogLevel::Warning, "Send", 121});
    }
}

} // namespace SyncServiceReport
