#include "channel/Channel.h"

#include <utility>

#include <unistd.h>

#include "channel/Listener.h"

namespace hublink {
namespace {

/// The time between two looks for the listener while events are sent. After a restart between two events, the
/// service can lose the events of this time, because it does not know the module yet. A look takes 15 µs, so
/// looking uses 15 millionths of the time.
constexpr std::chrono::seconds LOOK_INTERVAL{1};

/// How often everything is announced again on a system where a restart cannot be seen. A restarted service
/// can lose the events of this time, which is accepted; one datagram in this time is no load.
constexpr std::chrono::minutes TELL_INTERVAL{3};

Result ResultOf(Socket::Outcome outcome) {
    switch (outcome) {
    case Socket::Outcome::Sent:
        return Result::Sent;
    case Socket::Outcome::Refused:
    case Socket::Outcome::RefusedEarlier:
        return Result::NobodyListens;
    case Socket::Outcome::Full:
        return Result::WouldBlock;
    case Socket::Outcome::TooLong:
        return Result::TooLong;
    case Socket::Outcome::Failed:
        break;
    }
    return Result::SystemError;
}

} // namespace

Channel::Channel(const Options& options) noexcept : m_allowsOthers(options.allowOtherUsersService) {
    Enlist();
}

Channel::~Channel() {
    Delist();
}

void Channel::SetModule(std::string announcement, Result isWritten) noexcept {
    const std::lock_guard lock(m_mutex);
    m_module.datagram = std::move(announcement);
    m_module.isWritten = isWritten;
}

Result Channel::Send(std::string_view datagram, bool isOfModule) noexcept {
    const std::lock_guard lock(m_mutex);
    return Deliver(datagram, isOfModule);
}

Result Channel::SetUser(std::string datagram) noexcept {
    const std::lock_guard lock(m_mutex);
    m_user.datagram = std::move(datagram);
    m_user.isDue = true;
    return Deliver({}, false);
}

/// Sends the announcements that are due, then the datagram unless it is empty.
Result Channel::Deliver(std::string_view datagram, bool isOfModule) noexcept {
    if (isOfModule && m_module.isWritten != Result::Sent)
        return m_module.isWritten;
    for (int attempt = 0; attempt < 2; ++attempt) {
        if (IsOthersService(Clock::now()))
            return Result::OtherUsersService;
        Socket::Outcome outcome = TryToDeliver(datagram, isOfModule);
        if (outcome == Socket::Outcome::Sent && IsNobodyThere())
            outcome = Socket::Outcome::Refused;
        if (outcome != Socket::Outcome::RefusedEarlier && outcome != Socket::Outcome::Refused)
            return ResultOf(outcome);
        ForgetTheService();
        if (outcome == Socket::Outcome::Refused)
            break;
    }
    return Result::NobodyListens;
}

Socket::Outcome Channel::TryToDeliver(std::string_view datagram, bool isOfModule) noexcept {
    Socket::Outcome outcome = Announce(m_user);
    if (outcome == Socket::Outcome::Sent && isOfModule)
        outcome = Announce(m_module);
    if (outcome == Socket::Outcome::Sent && !datagram.empty())
        outcome = m_socket.Send(datagram);
    return outcome;
}

Socket::Outcome Channel::Announce(Announcement& announcement) noexcept {
    if (!announcement.isDue || announcement.datagram.empty())
        return Socket::Outcome::Sent;
    const Socket::Outcome outcome = m_socket.Send(announcement.datagram);
    announcement.isDue = outcome != Socket::Outcome::Sent;
    return outcome;
}

bool Channel::IsOthersService(Clock::time_point now) noexcept {
    if (!m_isServiceKnown || m_isOthers || now >= m_lookAgain)
        LookWhoListens(now);
    return m_isOthers && !m_allowsOthers;
}

/// The system can fail to report a refusal, because a flood of datagrams can fill the buffer for such
/// messages. So when the last look found no listener, we look again after the datagram was sent.
bool Channel::IsNobodyThere() noexcept {
    if (!m_isServiceKnown)
        LookWhoListens(Clock::now());
    return !m_isServiceKnown;
}

void Channel::LookWhoListens(Clock::time_point now) noexcept {
    const auto listener = FindListener();
    const std::uint64_t socket = listener ? listener->socket : 0;
    if (socket != m_listener || (socket == 0 && now >= m_tellAgain)) {
        AnnounceAgain();
        m_tellAgain = now + TELL_INTERVAL;
    }
    m_listener = socket;
    m_lookAgain = now + LOOK_INTERVAL;
    m_isServiceKnown = !listener || listener->isThere;
    m_isOthers = listener && listener->isThere && listener->owner != ::geteuid();
}

void Channel::ForgetTheService() noexcept {
    m_isServiceKnown = false;
    AnnounceAgain();
}

void Channel::AnnounceAgain() noexcept {
    m_module.isDue = true;
    m_user.isDue = true;
}

/// The child opens a socket of its own. With a shared socket, parent and child could each get the error of
/// the other's datagram.
void Channel::BeginInChild() noexcept {
    m_socket.Close();
}

} // namespace hublink
