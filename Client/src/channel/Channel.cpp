#include "channel/Channel.h"

#include <utility>

#include <unistd.h>

#include "EventRules.h"
#include "wire/Datagram.h"

namespace hublink {
namespace {

/// The time between two looks for the listener while events are sent. After a restart between two events, and
/// after an announcement was dropped, the service can lose the events of this time, because it does not know
/// the module. A look takes 15 µs, so looking uses 15 millionths of the time.
constexpr std::chrono::seconds LOOK_INTERVAL{1};

/// How often everything is announced again in any case. Where a look cannot show that the service was
/// restarted or that an announcement was lost, the service can lose the events of this time, which is
/// accepted; two datagrams in this time are no load.
constexpr std::chrono::minutes TELL_INTERVAL{3};

/// Returns the datagram that tells who is signed in; an empty text when it cannot be sent.
std::string UserDatagram(std::string_view openId, std::string_view suiteVersion) {
    wire::Datagram datagram;
    const Result isWritten = WriteUser(datagram.Buffer(), openId, suiteVersion);
    return std::string(isWritten == Result::Sent ? datagram.Text() : std::string_view());
}

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
    m_module = Announcement(std::move(announcement), isWritten);
}

Result Channel::Send(std::string_view datagram, bool isOfModule) noexcept {
    const std::lock_guard lock(m_mutex);
    return Deliver(datagram, isOfModule);
}

Result Channel::SetUser(std::string_view openId, std::string_view suiteVersion) {
    wire::Datagram datagram;
    const Result isWritten = WriteUser(datagram.Buffer(), openId, suiteVersion);
    if (isWritten != Result::Sent)
        return isWritten;
    std::string change(datagram.Text());

    const std::lock_guard lock(m_mutex);
    std::string version(suiteVersion.empty() ? std::string_view(m_suiteVersion) : suiteVersion);
    std::string everything = UserDatagram(openId, version);
    if (everything.empty()) // id and version fit into a datagram each, but not together
        everything = change;
    m_suiteVersion = std::move(version);
    m_user.Replace(std::move(everything), std::move(change));
    return Deliver({}, false);
}

/// Sends the announcements that are due, then the datagram unless it is empty.
Result Channel::Deliver(std::string_view datagram, bool isOfModule) noexcept {
    if (isOfModule && m_module.IsWritten() != Result::Sent)
        return m_module.IsWritten();
    for (int attempt = 0; attempt < 2; ++attempt) {
        if (const Result result = MaySend(Clock::now()); result != Result::Sent)
            return result;
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
    if (!announcement.IsDue())
        return Socket::Outcome::Sent;
    const Socket::Outcome outcome = m_socket.Send(announcement.DueDatagram());
    if (outcome == Socket::Outcome::Sent)
        announcement.IsTold();
    return outcome;
}

/// Returns Sent, or the reason why nothing may be sent now.
Result Channel::MaySend(Clock::time_point now) noexcept {
    if (m_service != Service::Usable || now >= m_lookAgain)
        LookWhoListens(now);
    if (m_allowsOthers)
        return Result::Sent;
    if (m_service == Service::Others)
        return Result::OtherUsersService;
    return m_service == Service::Unknown ? Result::SystemError : Result::Sent;
}

/// The system can fail to report a refusal, because a flood of datagrams can fill the buffer for such
/// messages. So when the last look found no listener, we look again after the datagram was sent.
bool Channel::IsNobodyThere() noexcept {
    if (m_service == Service::Absent)
        LookWhoListens(Clock::now());
    return m_service == Service::Absent;
}

void Channel::LookWhoListens(Clock::time_point now) noexcept {
    m_socket.GiveUpAReusedNumber();
    m_lookAgain = now + LOOK_INTERVAL;
    if (now >= m_tellAgain) {
        AnnounceAgain();
        m_tellAgain = now + TELL_INTERVAL;
    }
    const Look look = FindListener();
    if (look.outcome != Look::Outcome::Failed)
        TakeLook(look);
    else if (m_service == Service::Absent) // another user's service may have come
        m_service = Service::Unknown;
}

/// A listener of which the system has dropped datagrams may have lost our announcements. After a restart, the
/// listener is another one.
void Channel::TakeLook(const Look& look) noexcept {
    if (look.listener.socket != m_listener.socket || look.listener.dropped != m_listener.dropped)
        AnnounceAgain();
    m_listener = look.listener;
    m_service = ServiceOf(look);
}

Channel::Service Channel::ServiceOf(const Look& look) const noexcept {
    if (look.outcome == Look::Outcome::NoTable)
        return Service::Usable;
    if (!look.listener.isThere)
        return Service::Absent;
    return m_allowsOthers || look.listener.owner == ::geteuid() ? Service::Usable : Service::Others;
}

void Channel::ForgetTheService() noexcept {
    m_service = Service::Unknown;
    AnnounceAgain();
}

void Channel::AnnounceAgain() noexcept {
    m_module.TellAgain();
    m_user.TellAgain();
}

/// The child opens a socket of its own. With a shared socket, parent and child could each get the error of
/// the other's datagram.
void Channel::BeginInChild() noexcept {
    m_socket.Close();
}

} // namespace hublink
