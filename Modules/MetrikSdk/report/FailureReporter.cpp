#include "Modules/MetrikSdk/report/FailureReporter.h"

#include <utility>

namespace MetrikSdk::report {

std::optional<std::string> FailureReporter::RecordFailure(Cause cause, const std::string& text,
                                                          SteadyTime now) {
    const std::lock_guard lock(m_mutex);
    auto& history = m_histories[static_cast<std::size_t>(cause)];
    if (history.lastTold && now - *history.lastTold < m_interval) {
        ++history.keptBack;
        return std::nullopt;
    }
    auto told = text;
    if (history.keptBack > 0)
        told += " (and " + std::to_string(history.keptBack) + " more of this kind since the last time)";
    history = {now, true, 0};
    return told;
}

bool FailureReporter::ReportEnd(Cause cause) {
    const std::lock_guard lock(m_mutex);
    return std::exchange(m_histories[static_cast<std::size_t>(cause)].endIsDue, false);
}

} // namespace MetrikSdk::report
