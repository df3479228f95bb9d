// The least that a receiver can do: one system call for each datagram. It runs until it is killed. The kernel
// knows how much it received and how much processor time it took.

#include <array>
#include <cstdio>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include "Common/Wire.h"

int main() {
    const int receiver = ::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    // The same as the service asks for, so the kernel grants the same.
    const int bufferBytes = 8 * 1024 * 1024;
    ::setsockopt(receiver, SOL_SOCKET, SO_RCVBUF, &bufferBytes, sizeof bufferBytes);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(Wire::PORT);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (::bind(receiver, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        std::perror("bind");
        return 1;
    }
    std::array<char, Wire::MAX_BYTES> buffer{};
    for (;;)
        ::recvfrom(receiver, buffer.data(), buffer.size(), 0, nullptr, nullptr);
}
