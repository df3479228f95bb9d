#pragma once

namespace reportctl::service {

/// Waits until no other process holds the lock of the machine's pid file, and then becomes the service. So on
/// a machine with several users, the second user's service starts when the first user's ends. It waits
/// without a time limit, in the kernel: it does not poll and writes nothing into any log.
///
/// When the pid file cannot be opened, it does not wait: the service then refuses to start and logs the
/// reason. Returns only when the service's program could not be run: it prints the failure and returns the
/// exit code 1.
int TakeTurn();

} // namespace reportctl::service
