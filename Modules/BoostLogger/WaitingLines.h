#pragma once

#include <array>
#include <chrono>
#include <cstddef>
#include <cstring>
#include <optional>
#include <string_view>

namespace BoostLogger {

/// The lines of a burst that wait for their common write, and the decisions about them as functions of the
/// time:
///
///   the first 16 lines of a millisecond   do not wait, so that a lone record never does
///   those that follow in it               wait until there are 16 of them, for a millisecond at most
///
/// Threads: one at a time. Never fails: its room is its own.
class WaitingLines {
public:
    using TimePoint = std::chrono::steady_clock::time_point;

    /// As many lines as the file may pass its limit by where two processes write it
    /// (LiveFile::LINES_PER_LOOK). To share a write among more of them would save little.
    static constexpr unsigned LINES = 16;

    /// How long a line waits at most, and the time in which more than LINES are a burst.
    static constexpr std::chrono::milliseconds SPAN{1};

    /// Takes a line over that comes now. False when it is not to wait, or has no room here.
    bool Take(std::string_view line, TimePoint now) {
        if (!IsBurst(now) || line.size() > m_room.size() - m_bytes)
            return false;
        if (m_lines++ == 0)
            m_due = now + SPAN;
        std::memcpy(m_room.data() + m_bytes, line.data(), line.size());
        m_bytes += line.size();
        return true;
    }

    /// Whether they are to be written now.
    bool AreDue(TimePoint now) const { return m_lines >= LINES || (m_lines > 0 && now >= m_due); }

    /// When they are to be written at the latest; nothing when none waits.
    std::optional<TimePoint> Due() const { return m_lines > 0 ? std::optional(m_due) : std::nullopt; }

    std::string_view Text() const { return {m_room.data(), m_bytes}; }

    void Clear() {
        m_bytes = 0;
        m_lines = 0;
    }

private:
    bool IsBurst(TimePoint now) {
        if (now >= m_millisecondEnds) {
            m_millisecondEnds = now + SPAN;
            m_inMillisecond = 0;
        }
        return ++m_inMillisecond > LINES;
    }

    TimePoint m_millisecondEnds; ///< Of the one that is counted.
    unsigned m_inMillisecond = 0;
    TimePoint m_due; ///< While a line waits.
    unsigned m_lines = 0;
    std::size_t m_bytes = 0;
    std::array<char, 16384> m_room; ///< 16 lines of the usual 250 bytes, and of four times as many.
};

} // namespace BoostLogger
