#pragma once

#include <cstddef>
#include <cstdint>

#include <Poco/Net/DatagramSocket.h>

#include "App/UDPServer.h"
#include "Ledger/Writer.h"

namespace SyncServiceReport {

/// Counts in the ledger what only the receiver sees: each datagram, also an empty or a cut one, and the
/// datagrams that the kernel dropped. It also calls the ledger's Tick, about once a second or more often.
///
/// Threads: the receiving thread only.
///
/// Ownership: keeps both references without owning them.
class IntakeWatch final : public DatagramWatch {
public:
    IntakeWatch(ReportLedger::Writer& ledger, const Poco::Net::DatagramSocket& socket)
        : m_ledger(ledger), m_socket(socket) {}

    void Received(std::size_t bytes) override;
    void Failed() override;
    void Idle() override;

private:
    void LookAtTheSocket(std::int64_t nowMs);

    ReportLedger::Writer& m_ledger;
    const Poco::Net::DatagramSocket& m_socket;
    std::int64_t m_lookedAtMs = 0;
    std::uint32_t m_dropped = 0; ///< The kernel's count of dropped datagrams when it was last read.
};

} // namespace SyncServiceReport
