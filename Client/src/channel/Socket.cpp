#include "channel/Socket.h"

#include <cerrno>

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include "channel/Listener.h"

namespace hublink {
namespace {

#ifdef MSG_NOSIGNAL
constexpr int SEND_FLAGS = MSG_NOSIGNAL | MSG_DONTWAIT;
#else
constexpr int SEND_FLAGS = MSG_DONTWAIT;
#endif

/// Room for more than four of the longest reports. The default of macOS, 9216 bytes, is less than one report
/// can have.
constexpr int LEAST_SEND_BUFFER_BYTES = 65536;

int NewSocket() {
#ifdef SOCK_CLOEXEC
    return ::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
#else
    const int descriptor = ::socket(AF_INET, SOCK_DGRAM, 0);
    if (descriptor >= 0) {
        ::fcntl(descriptor, F_SETFD, FD_CLOEXEC);
        ::fcntl(descriptor, F_SETFL, O_NONBLOCK);
    }
    return descriptor;
#endif
}

/// The inode of an open file or socket; 0 when the number belongs to none.
ino_t InodeOf(int descriptor) {
    struct stat status {};
    return ::fstat(descriptor, &status) == 0 ? status.st_ino : 0;
}

bool Connect(int descriptor) {
    sockaddr_in service{};
    service.sin_family = AF_INET;
    service.sin_port = htons(SERVICE_PORT);
    service.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return ::connect(descriptor, reinterpret_cast<const sockaddr*>(&service), sizeof service) == 0;
}

/// Whether the error is one that a connected socket of ours never returns. Then the program has closed our
/// descriptor, and its number may belong to another file of the program now.
bool IsNotOurs(int error) {
    return error == EBADF || error == ENOTSOCK || error == EDESTADDRREQ || error == ENOTCONN;
}

} // namespace

bool Socket::Open() noexcept {
    if (m_descriptor >= 0)
        return true;
    m_descriptor = NewSocket();
    if (m_descriptor < 0)
        return false;
    m_inode = InodeOf(m_descriptor);
    EnlargeSendBuffer();
    if (Connect(m_descriptor))
        return true;
    Close();
    return false;
}

void Socket::EnlargeSendBuffer() const noexcept {
    int bytes = 0;
    socklen_t length = sizeof bytes;
    if (::getsockopt(m_descriptor, SOL_SOCKET, SO_SNDBUF, &bytes, &length) == 0 &&
        bytes >= LEAST_SEND_BUFFER_BYTES)
        return;
    bytes = LEAST_SEND_BUFFER_BYTES;
    ::setsockopt(m_descriptor, SOL_SOCKET, SO_SNDBUF, &bytes, sizeof bytes);
}

void Socket::GiveUpAReusedNumber() noexcept {
    if (m_descriptor >= 0 && InodeOf(m_descriptor) != m_inode)
        m_descriptor = -1; // we do not close it: it is the program's
}

void Socket::Close() noexcept {
    if (m_descriptor >= 0)
        ::close(m_descriptor);
    m_descriptor = -1;
}

/// Returns the socket's pending error, 0 when there is none. Reading the error also clears it.
int Socket::TakeError() const noexcept {
    int error = 0;
    socklen_t length = sizeof error;
    return ::getsockopt(m_descriptor, SOL_SOCKET, SO_ERROR, &error, &length) == 0 ? error : errno;
}

/// Returns 0, or the error number.
int Socket::SendOnce(std::string_view datagram) const noexcept {
    while (::send(m_descriptor, datagram.data(), datagram.size(), SEND_FLAGS) < 0)
        if (errno != EINTR)
            return errno;
    return 0;
}

Socket::Outcome Socket::Send(std::string_view datagram) noexcept {
    if (!Open())
        return Outcome::Failed;
    int error = SendOnce(datagram);
    if (IsNotOurs(error)) {
        m_descriptor = -1; // we do not close it: the number may belong to another file of the program now
        if (!Open())
            return Outcome::Failed;
        error = SendOnce(datagram);
    }
    if (error != 0)
        return OutcomeOf(error);
    switch (TakeError()) { // over loopback, Linux has set the error of a refusal before send returns
    case 0:
        return Outcome::Sent;
    case ECONNREFUSED:
        return Outcome::Refused;
    default:
        return Outcome::Failed;
    }
}

Socket::Outcome Socket::OutcomeOf(int error) noexcept {
    switch (error) {
    case EAGAIN:
    case ENOBUFS:
        return Outcome::Full;
    case ECONNREFUSED:
        return Outcome::RefusedEarlier;
    case EMSGSIZE:
        return Outcome::TooLong;
    default:
        return Outcome::Failed;
    }
}

} // namespace hublink
