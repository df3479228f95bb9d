#pragma once

#include <array>
#include <chrono>
#include <cstddef>
#include <cstring>
#include <optional>
#include <string_view>

namespace BoostLogger {

/// The lines of a burst that wait for a common write, and the rules for waiting. The rules are functions of
/// the time:
///
///   the first 16 lines of a millisecond        do not wait, so a record that comes alone never waits
///   the further lines of that millisecond      wait until 16 lines wait, but no longer than a millisecond
///
/// Threads: one at a time. Failure: none. The buffer is a member, so no memory is allocated.
// NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init): the bytes are written before they are read
class WaitingLines {
public:
    using TimePoint = std::chrono::steady_clock::time_point;

    /// How many lines share a write. When two processes write to one file, each of them may exceed the file's
    /// size limit by as many lines; LiveFile::LINES_PER_LOOK is the same number. More lines for each write
    /// would save little.
    static constexpr unsigned LINES = 16;

    /// How long a line may wait. More than LINES lines within this time are a burst.
    static constexpr std::chrono::milliseconds SPAN{1};

    /// Copies the line, which then waits. Returns false, and does not copy the line, when the line must not
    /// wait or when there is no room for it.
    bool Take(std::string_view line, TimePoint now) {
        if (!IsBurst(now) || line.size() > m_room.size() - m_bytes)
            return false;
        if (m_lines++ == 0)
            m_due = now + SPAN;
        std::memcpy(m_room.data() + m_bytes, line.data(), line.size());
        m_bytes += line.size();
        return true;
    }

    /// Whether the waiting lines must be written now.
    bool AreDue(TimePoint now) const { return m_lines >= LINES || (m_lines > 0 && now >= m_due); }

    /// When the waiting lines must be written at the latest. Nothing when no line waits.
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

    TimePoint m_millisecondEnds;  ///< The end of the millisecond whose lines m_inMillisecond counts.
    unsigned m_inMillisecond = 0; ///< How many lines came in this millisecond.
    TimePoint m_due;              ///< When the waiting lines are due. Has no meaning while no line waits.
    unsigned m_lines = 0;
    std::size_t m_bytes = 0;
    std::array<char, 16384> m_room; ///< Holds 16 lines of 1,024 bytes; a usual line has 250 bytes.
};

} // namespace BoostLogger
