#pragma once

#include <map>
#include <string>

#include <Poco/SharedPtr.h>

#include "Common/IWorker.h"

namespace SyncServiceReport {

class ReportServer;

/// Keeps one analytics worker for each module that announced itself, passes reports to the workers, and
/// handles control messages.
///
/// Ownership: owns the workers; keeps the server without owning it.
///
/// Threads: no lock. Init on the starting thread, before any report. Update and Send on the consuming thread
/// only.
///
/// Failure: no exception leaves Update or Send. AddWorker and Init throw when a worker cannot be made; the
/// map is unchanged then.
class MetrikMgr {
public:
    explicit MetrikMgr(ReportServer* server);
    virtual ~MetrikMgr() = default;

    MetrikMgr(const MetrikMgr&) = delete;
    MetrikMgr& operator=(const MetrikMgr&) = delete;

    /// Registers the default module, which needs no announcement. Always true.
    bool Init();

    /// Makes, initialises and registers the worker of the module `msg.moduleID`. Does nothing when that
    /// module already has a worker.
    void AddWorker(const ST_InitMsg& msg);

    /// Handles one control message: "init" registers a module, "updateOpenID" changes the user. Both pass a
    /// new open id, and the suite version with it, on to the server. A message of another kind is ignored;
    /// the result is true then, too.
    bool Update(const std::string& json);

    /// Passes a report to the worker of its module and returns the worker's answer. The module is the text
    /// before the first bar of the event id. A report of a module that is not registered is lost.
    bool Send(const ST_OptLog& log);

protected:
    std::map<std::string, Poco::SharedPtr<IWorker>> m_mapWorkers; ///< By module id.

private:
    ReportServer* m_pServer;

    /// The worker that was made last. A worker whose SDK threw an exception is not registered; this member
    /// keeps it until the next worker is made. The exception may be of a class of the plug-in, whose code
    /// must stay loaded until the exception has been logged.
    Poco::SharedPtr<IWorker> m_pNewest;
};

} // namespace SyncServiceReport
