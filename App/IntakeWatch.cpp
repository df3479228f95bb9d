#include "App/IntakeWatch.h"

#include "Common/Wire.h"
#include "SystemTool/Platform.h"

namespace SyncServiceReport {
namespace {

namespace Platform = SystemTool::Platform;

/// Under load, we ask the kernel for its dropped datagrams once in this time. A system call for each datagram
/// would take longer than all the counting.
constexpr std::int64_t LOOK_EACH_MS = 1000;

} // namespace

void IntakeWatch::Received(std::size_t bytes) {
    const std::int64_t nowMs = Platform::CoarseTimeMs();
    m_ledger.Received(bytes, bytes == Wire::MAX_BYTES, nowMs);
    if (nowMs - m_lookedAtMs >= LOOK_EACH_MS || nowMs < m_lookedAtMs) // or the clock was set back
        LookAtTheSocket(nowMs);
}

void IntakeWatch::Failed() {
    m_ledger.CouldNotQueue(Platform::CoarseTimeMs());
}

void IntakeWatch::Idle() {
    LookAtTheSocket(Platform::CoarseTimeMs());
}

void IntakeWatch::LookAtTheSocket(std::int64_t nowMs) {
    m_lookedAtMs = nowMs;
    if (const auto dropped = Platform::DatagramsDropped(m_socket.impl()->sockfd())) {
        m_ledger.Dropped(*dropped - m_dropped, nowMs); // right also when the kernel's counter wraps around
        m_dropped = *dropped;
    }
    m_ledger.Tick(nowMs);
}

} // namespace SyncServiceReport
