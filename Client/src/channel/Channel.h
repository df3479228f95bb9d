#pragma once

#include <chrono>
#include <string>
#include <string_view>

#include "channel/Announcement.h"
#include "channel/ForkGuard.h"
#include "channel/Listener.h"
#include "channel/Socket.h"
#include "hublink/report.hpp"

namespace hublink {

/// Sends datagrams to the service, and announces the module and the user whenever the service may not know
/// them. What the channel knows about the service:
///
///     unknown ──► usable ──┬─► unknown   a datagram was refused
///        │                 ├─► absent    no socket is bound to the port
///        │                 └─► others    another user's socket is bound to the port
///        └── until the service is usable, each event asks anew; then one event in each second asks
///
/// Both announcements are due after a refusal, when another socket is bound to the port than before, and when
/// the system has dropped datagrams to the socket, because an announcement may be among them. In any case
/// they are due every few minutes. The announcements that are due are sent before the datagram: the user,
/// when one was set, and the module, when the event belongs to it. When an announcement cannot be sent, the
/// event is not sent either: the service would lose it or store it for the wrong user.
///
/// While the system cannot be asked, what was known about a usable service holds on. Otherwise nothing is
/// sent: it could go to another user's service.
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

    /// Tells who is signed in, as Reporter::SetUser does. Later calls tell it again whenever it is due again,
    /// with the last version that was not empty: a service that was restarted knows none. Throws
    /// std::bad_alloc; nothing has changed then.
    Result SetUser(std::string_view openId, std::string_view suiteVersion);

private:
    using Clock = std::chrono::steady_clock;

    enum class Service {
        Unknown,
        Absent,
        Usable, ///< It is this user's, or others' are allowed, or this system does not show whose it is.
        Others,
    };

    Result Deliver(std::string_view datagram, bool isOfModule) noexcept;
    Socket::Outcome TryToDeliver(std::string_view datagram, bool isOfModule) noexcept;
    Socket::Outcome Announce(Announcement& announcement) noexcept;
    Result MaySend(Clock::time_point now) noexcept;
    bool IsNobodyThere() noexcept;
    void LookWhoListens(Clock::time_point now) noexcept;
    void TakeLook(const Look& look) noexcept;
    Service ServiceOf(const Look& look) const noexcept;
    void ForgetTheService() noexcept;
    void AnnounceAgain() noexcept;
    void BeginInChild() noexcept override;

    const bool m_allowsOthers;

    // Guarded by m_mutex.
    Socket m_socket;
    Announcement m_module;
    Announcement m_user;
    std::string m_suiteVersion; ///< The last one that was told and not empty.
    Service m_service = Service::Unknown;
    Listener m_listener;           ///< What the last look found that the system answered.
    Clock::time_point m_lookAgain; ///< When to look next who listens.
    Clock::time_point m_tellAgain; ///< When to announce again in any case.
};

} // namespace hublink
