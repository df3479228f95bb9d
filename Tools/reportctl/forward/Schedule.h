#pragma once

#include <algorithm>
#include <chrono>

namespace reportctl::forward {

/// When rows and figures are sent next. Each has its own pause: a collector that wants to wait for the one
/// may take the other. Pure: the caller passes the time.
class Schedule {
public:
    using Time = std::chrono::steady_clock::time_point;

    explicit Schedule(bool hasFigures) : m_figures(hasFigures ? Time::min() : Time::max()) {}

    bool RowsAreDue(Time now) const { return m_rows <= now; }
    bool FiguresAreDue(Time now) const { return m_figures <= now; }

    /// They were sent; the next ones go after this pause.
    void RowsWait(Time now, std::chrono::milliseconds pause) { m_rows = now + pause; }
    void FiguresWait(Time now, std::chrono::milliseconds pause) { m_figures = now + pause; }

    /// How long to wait until something is due, rounded up.
    std::chrono::milliseconds UntilDue(Time now) const {
        const auto next = std::max(std::min(m_rows, m_figures), now);
        return std::chrono::ceil<std::chrono::milliseconds>(next - now);
    }

private:
    Time m_rows = Time::min();
    Time m_figures;
};

} // namespace reportctl::forward
