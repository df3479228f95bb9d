#pragma once

#include <mutex>

namespace hublink {

/// A lock that is usable in the child of a fork, also when other threads held it then: each fork takes the
/// locks of all guards first and gives them back on both sides.
///
/// Threads: any. Destroy it when no thread uses it any more.
class ForkGuard {
public:
    ForkGuard(const ForkGuard&) = delete;
    ForkGuard& operator=(const ForkGuard&) = delete;

protected:
    ForkGuard() = default;
    ~ForkGuard() = default;

    /// Forks know the guard between these two: the last thing that its constructor does, and the first of its
    /// destructor, since another thread may fork at any moment.
    void Enlist() noexcept;
    void Delist() noexcept;

    std::mutex m_mutex; ///< Guards what the derived class says.

private:
    /// In the child, with the lock held and before anything else of the program runs there. No memory may be
    /// allocated.
    virtual void BeginInChild() noexcept = 0;

    static const int HANDLERS; ///< Of forks; 0 when they are there.
    static void BeforeFork() noexcept;
    static void AfterForkInParent() noexcept;
    static void AfterForkInChild() noexcept;

    ForkGuard* m_next = nullptr; ///< Guarded by the lock of the list.
    ForkGuard* m_previous = nullptr;
};

} // namespace hublink
