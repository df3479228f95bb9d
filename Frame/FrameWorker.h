#pragma once

#include <string>

#include <Poco/SharedPtr.h>

#include "Common/IWorker.h"
#include "Plugin/ISqliteDatabase.h"
#include "Plugin/ModuleLoader.h"

namespace SyncServiceReport {

class ReportServer;

/// The local store: appends each report to the table OperLog of "Report.db" in the user's data directory, and
/// reads the stored open id and suite version from the table BaseInfo at the start. It makes neither the file
/// nor the tables.
///
/// Life: constructed → initialised. Until Init has given the plug-in's object to DBHelper, every Send returns
/// false silently; when Init fails after that, Send still tries.
///
/// Ownership: keeps the server without owning it; owns the plug-in through its loader. The destructor unloads
/// the plug-in, and DBHelper must not be called from then on.
///
/// Threads: Init on the starting thread, before any report; Send on the consuming thread only.
///
/// Failure: no exception leaves Init or Send.
class FrameWorker : public IWorker {
public:
    explicit FrameWorker(ReportServer* server);
    ~FrameWorker() override;

    FrameWorker(const FrameWorker&) = delete;
    FrameWorker& operator=(const FrameWorker&) = delete;

    /// Loads the SQLite plug-in, opens the database and reads the base information. True when all of that ran
    /// to its end; a database that does not open shows later, as failing statements.
    bool Init();

    /// Reads the stored open id and suite version into the server; leaves the server's alone when there is no
    /// row at all. Exceptions go to the caller.
    void SetUserBaseInfo();

    /// Inserts one row. Nothing is retried or kept.
    bool Send(const ST_OptLog& log) override;

private:
    using SqliteLoader = SystemTool::ModuleLoader<ISqliteDatabase>;

    ReportServer* m_pServer;
    Poco::SharedPtr<SqliteLoader> m_pSqliteLoader;
    ISqliteDatabase* m_pSqliteDb = nullptr;
};

} // namespace SyncServiceReport
