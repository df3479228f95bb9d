#pragma once

#include <cstdint>

#include <sys/types.h>

namespace hublink {

inline constexpr std::uint16_t SERVICE_PORT = 9997; ///< On 127.0.0.1.

/// The program that has bound the service's port.
struct Listener {
    bool isThere = false;
    uid_t owner = 0;
    std::uint64_t socket = 0; ///< The socket's inode; it changes with each start of the service.
    std::uint64_t dropped =
        0; ///< The datagrams that the system dropped because the socket's buffer was full.
};

/// What a look at the system's table of sockets found.
struct Look {
    enum class Outcome {
        Done,
        NoTable, ///< This system has no such table, or the program may not read it. That does not change.
        Failed,  ///< The table cannot be read now, for example without a free descriptor.
    };

    Outcome outcome = Outcome::Done;
    Listener listener; ///< When the outcome is Done.
};

/// Asks the system who listens, which takes about 15 µs.
Look FindListener() noexcept;

} // namespace hublink
