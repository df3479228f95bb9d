#pragma once

#include <string>

#include <Poco/SharedPtr.h>

#include "Common/IWorker.h"
#include "Plugin/IMetrikSdk.h"
#include "Plugin/ModuleLoader.h"

namespace SyncServiceReport {

class ReportServer;

/// The SDK calls this, on any of its threads, when something failed. Logs both texts.
void FailCallBackFun(std::string a, std::string b);

/// The SDK calls this when something succeeded. Does nothing: the log is for what needs attention.
void SuccCallBackFun(std::string a, std::string b);

/// Connects one module to the analytics SDK: each worker has an SDK object of its own.
///
/// Life: created → initialised by one successful InitDefalut or Init. A worker whose initialisation failed
/// answers every Send with false and is not tried again.
///
/// Ownership: keeps the server without owning it; owns the plug-in through its loader. The destructor gives
/// the SDK object back to the plug-in.
///
/// Threads: one at a time; once the service runs, only the consuming thread.
///
/// Failure: no exception leaves InitDefalut or Send. Exceptions leave Init, and the manager logs them.
class MetrikWorker : public IWorker {
public:
    explicit MetrikWorker(ReportServer* server);
    ~MetrikWorker() override;

    MetrikWorker(const MetrikWorker&) = delete;
    MetrikWorker& operator=(const MetrikWorker&) = delete;

    /// Starts the SDK for the default module, in the user's data directory. The misspelling is part of the
    /// name.
    bool InitDefalut();

    /// Starts the SDK for a module that announced itself. The SDK gets the module's texts unchanged, also
    /// empty ones.
    bool Init(const ST_InitMsg& msg);

    /// Passes the report to the SDK and returns the SDK's answer.
    bool Send(const ST_OptLog& log) override;

private:
    using SdkLoader = SystemTool::ModuleLoader<IMetrikSdk>;

    IMetrikSdk* LoadSdk(const char* function, int loaderLine, int interfaceLine);

    ReportServer* m_pServer;
    Poco::SharedPtr<SdkLoader> m_pSdkLoader;
    IMetrikSdk* m_pSdk = nullptr; ///< Null until the SDK has been started.
};

} // namespace SyncServiceReport
