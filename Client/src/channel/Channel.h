#pragma once

#include <chrono>
#include <cstdint>
#include <string>
#include <string_view>

#include "channel/ForkGuard.h"
#include "channel/Socket.h"
#include "hublink/report.hpp"

namespace hublink {

/// Whom an announcement is due to, as far as it is known:
///
///     unknown ──► listens ──┬─► gone        a datagram was refused
///        ▲                  ├─► restarted   another socket is bound to the port
///        │                  └─► another user's
///        └── the next event asks anew
///
/// A datagram goes out behind the announcements that are due: the user, when one was set, and the module,
/// when the event is of that module. When one of these cannot be sent, neither is the event, which the
/// service would lose or give to the wrong user.
///
/// Threads: any.
class Channel final : private ForkGuard {
public:
    explicit Channel(const Options& options) noexcept;
    ~Channel();
    Channel(const Channel&) = delete;
    Channel& operator=(const Channel&) = delete;

    /// Before the first event. `announcement`: the datagram; when it cannot be written, why.
    void SetModule(std::string announcement, Result isWritten) noexcept;

    /// Sends an event's datagram.
    Result Send(std::string_view datagram, bool isOfModule) noexcept;

    /// Sends the datagram that tells who is signed in, now and whenever it is due again.
    Result SetUser(std::string datagram) noexcept;

private:
    using Clock = std::chrono::steady_clock;

    /// A message that the service forgets when it ends.
    struct Announcement {
        std::string datagram; ///< Empty: there is none.
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
    bool m_isOthers = false;       ///< Only while it is known.
    std::uint64_t m_listener = 0;  ///< Its socket's inode; 0 when it is not known.
    Clock::time_point m_lookAgain; ///< When to ask next who listens.
    Clock::time_point m_tellAgain; ///< When to announce again where that cannot be asked.
};

} // namespace hublink
