#pragma once

#include <string>

#include <Poco/SharedPtr.h>

#include "App/IntakeWatch.h"
#include "App/PocoTasker.h"
#include "App/UDPServer.h"
#include "Common/Records.h"
#include "Ledger/Writer.h"

namespace SyncServiceReport {

class FrameWorker;
class MetrikMgr;

/// The service: receives reports, queues them, and passes each one to analytics or to the local store.
///
/// Life: constructed → started → stopped (receiver first, then the queue, whose backlog is dropped) →
/// destroyed.
///
/// Ownership: owns both destinations; they point back to it.
///
/// Threads: construction, Start and Stop on the owner's thread; Recv on the receiving thread; Consume on the
/// consuming thread. After the start, everything that reads or changes the base information runs in Consume.
/// The receiving and the consuming thread share the queue, the logger and the ledger, and nothing else.
///
/// Failure: no exception leaves Start or Consume. A caught exception is logged, and the result is then false.
class ReportServer : public PocoTasker<std::string>, public UDPServer {
public:
    /// Starts nothing and opens nothing.
    ReportServer();

    /// Calls Stop, then releases the destinations. An exception on the way ends the process.
    ~ReportServer() override;

    ReportServer(const ReportServer&) = delete;
    ReportServer& operator=(const ReportServer&) = delete;

    /// Makes and initialises the destinations, binds the socket and starts both threads. False when an
    /// exception was caught; the steps before the exception stay done. A destination or a socket that does
    /// not work throws no exception, so the result is true then.
    bool Start();

    void Stop();

    /// The ledger: counts every report and how it ended. It counts in memory only until its Open is called,
    /// which must be before Start.
    ReportLedger::Writer& Ledger() { return m_ledger; }

    /// Logs and queues a datagram's text; always true.
    bool Recv(const std::string& msg) override;

    /// Handles one text. A text that holds "eventID" anywhere is a report; every other text is a control
    /// message. False when a report could not be parsed or an exception was caught.
    bool Consume(const std::string& msg) override;

    /// Turns a report's text into a record. On failure it logs the reason and returns false; `out` then holds
    /// the members that were filled before, and defaults for the others.
    bool JsonToStruct(const std::string& json, ST_OptLog& out);

    /// Fills in the facts about the machine, once, before anything else is started.
    void InitBaseInfo();

    /// Takes the open id and the suite version from `info`, each unless it is empty. The facts about the
    /// machine cannot be changed from outside. Consuming thread only, once the service runs.
    void SetBaseInfo(const ST_BaseInfo& info);

    /// The facts that accompany every report. SetBaseInfo changes them. Consuming thread only, once the
    /// service runs.
    const ST_BaseInfo& GetBaseInfo() const { return m_baseInfo; }

private:
    using WorkQueue = PocoTasker<std::string>;

    Poco::SharedPtr<MetrikMgr> m_pMetrikMgr;
    Poco::SharedPtr<FrameWorker> m_pFrameWorker;
    ST_BaseInfo m_baseInfo;
    ReportLedger::Writer m_ledger;
    IntakeWatch m_intake{m_ledger, m_socket};
};

} // namespace SyncServiceReport
