#pragma once

#include <cstdint>
#include <optional>

#include <sys/types.h>

namespace hublink {

inline constexpr std::uint16_t SERVICE_PORT = 9997; ///< On 127.0.0.1.

/// The program that has bound the service's port.
struct Listener {
    bool isThere = false;
    uid_t owner = 0;
    std::uint64_t socket = 0; ///< The socket's inode; it changes with each start of the service.
};

/// Asks the system who listens, which takes about 15 µs. Returns nothing when the system cannot be asked;
/// isThere is false when no program listens.
std::optional<Listener> FindListener() noexcept;

} // namespace hublink
