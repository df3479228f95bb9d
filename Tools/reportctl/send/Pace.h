#pragma once

#include <algorithm>
#include <chrono>

namespace reportctl::send {

/// How fast many messages are sent.
struct PaceSettings {
    /// A datagram that finds the receiver's buffer full is lost without a word. The service asks for a large
    /// buffer, and gets what the system allows. Measured with the smallest that Linux gives without being
    /// asked (212,992 bytes): it holds 256 reports of 180 bytes, or 12 of the largest. So even with that one,
    /// the service may be kept from the processor for a quarter of a second at this pace, or for 12 ms when
    /// all reports are the largest.
    int perSecond = 1000;

    /// How much lateness is made up for. Each sleep ends a little late, which would slow down a quick pace;
    /// more than this at once would be the burst that the pace is there to prevent.
    std::chrono::microseconds catchUp = std::chrono::milliseconds(5);
};

/// When the next message may go, given when the last one was due.
inline std::chrono::steady_clock::time_point NextDue(std::chrono::steady_clock::time_point lastDue,
                                                     std::chrono::steady_clock::time_point now,
                                                     const PaceSettings& settings) {
    const std::chrono::nanoseconds interval =
        std::chrono::nanoseconds(std::chrono::seconds(1)) / settings.perSecond;
    return std::max(lastDue + interval, now - settings.catchUp);
}

} // namespace reportctl::send
