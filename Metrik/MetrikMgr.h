#pragma once

#include <map>
#include <string>

#include <Poco/SharedPtr.h>

#include "Common/IWorker.h"

namespace SyncServiceReport {

class ReportServer;

/// Keeps one analytics worker for each module that announced itself, and routes reports and control messages.
///
/// Ownership: owns the workers; keeps the server without owning it.
///
/// Threads: no lock. Init on the starting thread before any report; Update and Send on the consuming thread
/// only.
///
/// Failure: no exception leaves Update or Send. One leaves AddWorker, and Init, when a worker cannot be made;
/// the map then is as it was.
class MetrikMgr {
public:
    explicit MetrikMgr(ReportServer* server);
    virtual ~MetrikMgr() = default;

    MetrikMgr(const MetrikMgr&) = delete;
    MetrikMgr& operator=(const MetrikMgr&) = delete;

    /// Registers the default module, whose reports need no announcement. Always true.
    bool Init();

    /// Makes, initialises and registers the worker of `msg.moduleID`; does nothing when there is one.
    void AddWorker(const ST_InitMsg& msg);

    /// Handles one control message: "init" registers a module, "updateOpenID" changes the user; both pass a
    /// new open id and suite version on to the server. True also for a message of another kind, which is
    /// ignored.
    bool Update(const std::string& json);

    /// Hands a report to the worker of its module, the text before the first bar of its event id, and returns
    /// the worker's answer. A report of a module that is not registered is lost.
    bool Send(const ST_OptLog& log);

protected:
    std::map<std::string, Poco::SharedPtr<IWorker>> m_mapWorkers; ///< By module id.

private:
    ReportServer* m_pServer;

    /// The worker that was made last. One that failed is kept until the next: the exception that its SDK
    /// threw may be of a class of the plug-in, whose code must be there until the exception has been logged.
    Poco::SharedPtr<IWorker> m_pNewest;
};

} // namespace SyncServiceReport
