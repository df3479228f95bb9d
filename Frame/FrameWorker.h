#pragma once

#include <string>

#include <Poco/SharedPtr.h>

#include "Common/IWorker.h"
#include "Plugin/ISqliteDatabase.h"
#include "Plugin/ModuleLoader.h"

namespace SyncServiceReport {

class ReportServer;

/// The local store. It appends each report to the table OperLog of "Report.db" in the user's data directory.
/// At the start it reads the stored open id and suite version from the table BaseInfo. It makes neither the
/// file nor the tables.
///
/// Life: constructed → initialised. Until Init has given the plug-in's object to DBHelper, every Send returns
/// false and logs nothing. When Init fails after that step, Send still tries.
///
/// Ownership: keeps the server without owning it; owns the plug-in through its loader. The destructor unloads
/// the plug-in; after that, DBHelper must not be called.
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

    /// Loads the SQLite plug-in, opens the database and reads the base information. False when there is no
    /// plug-in or a step threw. A database that cannot be opened does not make it false: the statements fail
    /// later.
    bool Init();

    /// Reads the stored open id and suite version and gives them to the server. When the table has no row at
    /// all, the server keeps its values. Exceptions go to the caller.
    void SetUserBaseInfo();

    /// Inserts one row. A row that fails is not kept here and not tried again.
    bool Send(const ST_OptLog& log) override;

private:
    using SqliteLoader = SystemTool::ModuleLoader<ISqliteDatabase>;

    ReportServer* m_pServer;
    Poco::SharedPtr<SqliteLoader> m_pSqliteLoader;
    ISqliteDatabase* m_pSqliteDb = nullptr;
};

} // namespace SyncServiceReport
