#pragma once

namespace reportctl::service {

/// Becomes the service once no other process holds the lock of the machine's pid file, and waits for that as
/// long as it takes: on a machine with several users, the second user's service takes over when the first
/// user's ends. Waits in the kernel, without looking again and again and without a line in any log.
///
/// A pid file that cannot be opened is not waited for: the service refuses to start by itself, and logs why.
/// Returns only when the service's program could not be run, with the exit code 1; the failure has been told.
int TakeTurn();

} // namespace reportctl::service
