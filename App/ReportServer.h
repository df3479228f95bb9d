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

/// The service: receives reports, queues them, and routes each one to the analytics side or to the local
/// store.
///
/// Life: constructed → started → stopped (receiver first, then the queue, whose backlog is dropped) →
/// destroyed.
///
/// Ownership: owns both destinations; they point back to it.
///
/// Threads: construction, Start and Stop on the owner's thread; Recv on the receiving thread; Consume, and
/// through it everything that reads or changes the base information after the start, on the consuming thread.
/// The queue between the two is all that they share.
///
/// Failure: no exception leaves Start or Consume; one is logged and makes the result false.
class ReportServer : public PocoTasker<std::string>, public UDPServer {
public:
    /// Starts nothing and opens nothing.
    ReportServer();

    /// As Stop, then releases the destinations. An exception on the way ends the process.
    ~ReportServer() override;

    ReportServer(const ReportServer&) = delete;
    ReportServer& operator=(const ReportServer&) = delete;

    /// Makes and initialises the destinations, binds the socket and starts both threads. True unless an
    /// exception was caught; a destination or a socket that does not work is no exception, and what was done
    /// before one stays.
    bool Start();

    void Stop();

    /// Counts every report, and what became of it. In memory only, until its owner opens its file, which is
    /// before Start.
    ReportLedger::Writer& Ledger() { return m_ledger; }

    /// Logs and queues a datagram's text; always true.
    bool Recv(const std::string& msg) override;

    /// Routes one text: with "eventID" anywhere in it, it is a report; else a control message. False when a
    /// report could not be parsed or an exception was caught.
    bool Consume(const std::string& msg) override;

    /// Turns a report's text into a record. On false `out` holds what was filled before the failure, at least
    /// the defaults; the reason is logged.
    bool JsonToStruct(const std::string& json, ST_OptLog& out);

    /// Fills the facts about the machine, once, before anything else is started.
    void InitBaseInfo();

    /// Takes over the open id and the suite version, each unless it is empty. The facts about the machine
    /// cannot be changed from outside. Consuming thread only, once the service runs.
    void SetBaseInfo(const ST_BaseInfo& info);

    /// What accompanies every report; changes with SetBaseInfo. Consuming thread only, once the service runs.
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
