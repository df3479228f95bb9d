#pragma once

#include <string>

#include <Poco/SharedPtr.h>

#include "Common/IWorker.h"
#include "Plugin/IMetrikSdk.h"
#include "Plugin/ModuleLoader.h"

namespace SyncServiceReport {

class ReportServer;

/// Told by the SDK, on any of its threads, that something failed: logged.
void FailCallBackFun(std::string a, std::string b);

/// Told by the SDK that something succeeded: ignored, the log is for what needs looking at.
void SuccCallBackFun(std::string a, std::string b);

/// Connects one module to the analytics SDK: each worker has an SDK object of its own.
///
/// Life: created → initialised by one successful InitDefalut or Init. A worker whose initialisation failed
/// answers every Send with false and is not tried again.
///
/// Ownership: keeps the server without owning it; owns the plug-in through its loader, which takes the SDK
/// object back when the worker goes.
///
/// Threads: one at a time, the consuming thread once the service runs.
///
/// Failure: no exception leaves InitDefalut or Send; one leaves Init, for the manager to log.
class MetrikWorker : public IWorker {
public:
    explicit MetrikWorker(ReportServer* server);
    ~MetrikWorker() override;

    MetrikWorker(const MetrikWorker&) = delete;
    MetrikWorker& operator=(const MetrikWorker&) = delete;

    /// Starts the SDK for the built-in module, in the user's data directory. The misspelling is part of the
    /// name.
    bool InitDefalut();

    /// Starts the SDK for a module that announced itself, with the texts as it gave them, empty ones
    /// included.
    bool Init(const ST_InitMsg& msg);

    /// Hands the report to the SDK and returns the SDK's answer.
    bool Send(const ST_OptLog& log) override;

private:
    using SdkLoader = SystemTool::ModuleLoader<IMetrikSdk>;

    IMetrikSdk* LoadSdk(const char* function, int loaderLine, int interfaceLine);

    ReportServer* m_pServer;
    Poco::SharedPtr<SdkLoader> m_pSdkLoader;
    IMetrikSdk* m_pSdk = nullptr; ///< Null until the SDK has been started.
};

} // namespace SyncServiceReport
