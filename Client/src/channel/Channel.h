#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <string_view>

#include "channel/ForkGuard.h"
#include "channel/Socket.h"
#include "hublink/report.hpp"

namespace hublink {

/// Sends datagrams to the service, and announces the module and the user whenever the service may not know
/// them. What the channel knows about the service:
///
///     unknown ──► listens ──┬─► gone        a datagram was refused
///        ▲                  ├─► restarted   another socket is bound to the port
///        │                  └─► another user's
///        └── the next event asks anew
///
/// After "gone" and "restarted", both announcements are due. The announcements that are due are sent before
/// the datagram: the user, when one was set, and the module, when the event belongs to it. When an
/// announcement cannot be sent, the event is not sent either: the service would lose it or store it for the
/// wrong user.
///
/// Threads: any.
class Channel final : private ForkGuard {
public:
    explicit Channel(const Options& options) noexcept;
    ~Channel();
    Channel(const Channel&) = delete;
    Channel& operator=(const Channel&) = delete;

    /// Call it before the first event. `announcement`: the datagram that announces the module. `isWritten`:
    /// Sent, or the reason why the datagram could not be written; Send then returns it for the module's
    /// events.
    void SetModule(std::string announcement, Result isWritten) noexcept;

    /// Sends an event's datagram. `isOfModule`: whether the event belongs to the module of SetModule.
    Result Send(std::string_view datagram, bool isOfModule) noexcept;

    /// Sends the datagram that tells who is signed in. Later calls send it again whenever it is due again.
    Result SetUser(std::string datagram) noexcept;

private:
    using Clock = std::chrono::steady_clock;

    /// A message with something that the service forgets when it ends.
    struct Announcement {
        std::string datagram; ///< Empty when there is nothing to announce.
        Result isWritten = Result::Sent;
        bool isDue = true;
    };

    Result Deliver(std::string_view datagram, bool isOfModule) noexcept;
    Socket::Outcome TryToDeliver(std::string_view datagram, bool isOfModule) noexcept;
    Socket::Outcome Announce(Announcement& announcement) noexcept;
    bool IsOthersService(Clock::time_point now) noexcept;
    bool IsNobodyThere() noexcept;
    void LookWhoListens(Clock::time_point now) noexcept;
    void ForgetTheService() noexcept;
    void AnnounceAgain() noexcept;
    void BeginInChild() noexcept override;

    const bool m_allowsOthers;

    // Guarded by m_mutex.
    Socket m_socket;
    Announcement m_module;
    Announcement m_user;
    bool m_isServiceKnown = false;
    bool m_isOthers = false;       ///< The service was another user's at the last look.
    std::uint64_t m_listener = 0;  ///< The inode of the service's socket; 0 when it is not known.
    Clock::time_point m_lookAgain; ///< When to look next who listens.
    Clock::time_point m_tellAgain; ///< When to announce again while the listener is not known.
};

} // namespace hublink
