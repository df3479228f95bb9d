#pragma once

#include <chrono>

#include "Modules/MetrikSdk/Time.h"
#include "Tools/reportctl/forward/Forwarder.h"

namespace reportctl::forward {

/// When a run ends that is to send what waits and end (--once). A timer starts the next one, so it does not
/// wait for a collector to come back; but it goes on as long as it takes to find one row that is to blame.
/// Pure.
class EndOfRun {
public:
    explicit EndOfRun(MetrikSdk::WallTime begun) : m_progress(begun) {}

    /// Requests that fail in a row for a reason that has nothing to do with the rows. A store that cannot be
    /// read ends the run at once: it was waited for already.
    static constexpr int MOST_IN_VAIN = 3;
    /// Without a row taken. A search takes ten requests, each up to two seconds after the one before.
    static constexpr std::chrono::milliseconds PATIENCE = std::chrono::minutes(1);
    /// In a row: then it is not the rows' fault.
    static constexpr int MOST_REFUSALS = 10;

    bool IsOver(const Step& step, MetrikSdk::WallTime now);

    /// Whether it ended before everything was sent.
    bool HasFailed() const { return m_hasFailed; }

private:
    bool IsInVain(const Step& step, MetrikSdk::WallTime now);

    MetrikSdk::WallTime m_progress;
    int m_inVain = 0;
    int m_refusals = 0;
    bool m_hasFailed = false;
};

} // namespace reportctl::forward
