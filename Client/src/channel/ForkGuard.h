#pragma once

#include <mutex>

namespace hublink {

/// A lock that also works in the child of a fork. A plain lock that another thread holds at the fork would
/// stay locked in the child for ever. So the fork's handlers lock all guards before the fork, and unlock them
/// after it in the parent and in the child.
///
/// Threads: any. Destroy it when no thread uses it any more.
class ForkGuard {
public:
    ForkGuard(const ForkGuard&) = delete;
    ForkGuard& operator=(const ForkGuard&) = delete;

protected:
    ForkGuard() = default;
    ~ForkGuard() = default;

    /// Puts the guard into the list that the fork's handlers use, and takes it out again. The derived class
    /// calls Enlist last in its constructor and Delist first in its destructor, because another thread may
    /// fork at any moment, and BeginInChild needs a complete object.
    void Enlist() noexcept;
    void Delist() noexcept;

    std::mutex m_mutex; ///< The derived class says what it guards.

private:
    /// Runs in the child with m_mutex locked, before any other code of the program runs there. It must not
    /// allocate memory.
    virtual void BeginInChild() noexcept = 0;

    static const int HANDLERS; ///< What pthread_atfork returned: 0 when the handlers are registered.
    static void BeforeFork() noexcept;
    static void AfterForkInParent() noexcept;
    static void AfterForkInChild() noexcept;

    ForkGuard* m_next = nullptr;     ///< Guarded by the list's lock.
    ForkGuard* m_previous = nullptr; ///< Guarded by the list's lock.
};

} // namespace hublink
