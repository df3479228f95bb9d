#pragma once

#include <optional>
#include <string>

#include <sys/types.h>

namespace reportctl::service {

/// The lock of the machine's pid file, which allows only one service on the machine. All users may write to
/// that file, so any program can hold the lock.
struct Lock {
    bool isHeld = false;
    std::optional<pid_t> holder; ///< Not known for some kinds of locks, and across containers.
    /// What is wrong with the file, so that a service of this user cannot lock it; empty when nothing is.
    std::string problem;
};

/// Nothing throws, and nothing is locked.
Lock LookAtLock();

/// The process that holds the lock, if it is a service. Nothing when the lock is free, and when another
/// program holds it.
std::optional<pid_t> LockedService();

} // namespace reportctl::service
