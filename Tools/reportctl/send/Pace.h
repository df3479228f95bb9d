#pragma once

#include <algorithm>
#include <chrono>

namespace reportctl::send {

/// How fast many messages are sent.
struct PaceSettings {
    /// When the receiver's buffer is full, a datagram is lost, and the sender gets no error. The service asks
    /// for a large buffer and gets what the system allows. Measured with the buffer that Linux gives a
    /// program that does not ask (212,992 bytes): it holds 256 reports of 180 bytes, or 12 of the largest
    /// reports. So even with that buffer, the service may get no processor time for a quarter of a second at
    /// this pace, or for 12 ms when all reports are the largest.
    int perSecond = 1000;

    /// How much delay is caught up. Each sleep ends a little late, which would slow down a fast pace.
    /// Catching up more than this at once would be the burst that the pace shall prevent.
    std::chrono::microseconds catchUp = std::chrono::milliseconds(5);
};

/// The time at which the next message may be sent. `lastDue`: the time that this function returned for the
/// message before.
inline std::chrono::steady_clock::time_point NextDue(std::chrono::steady_clock::time_point lastDue,
                                                     std::chrono::steady_clock::time_point now,
                                                     const PaceSettings& settings) {
    const std::chrono::nanoseconds interval =
        std::chrono::nanoseconds(std::chrono::seconds(1)) / settings.perSecond;
    return std::max(lastDue + interval, now - settings.catchUp);
}

} // namespace reportctl::send
