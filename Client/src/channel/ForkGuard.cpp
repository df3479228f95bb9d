#include "channel/ForkGuard.h"

#include <pthread.h>

namespace hublink {
namespace {

/// Guards the list of all guards. A thread takes it before a guard's own lock. List and lock need no
/// destructor, because a static reporter may use them at the program's end.
std::mutex g_listMutex;
ForkGuard* g_first = nullptr;

} // namespace

/// The handlers are registered when the library is loaded. Registering them with the first guard would be too
/// late: another thread could fork at that moment. Without memory for the handlers, a child shares its
/// parent's socket, and each can get the error of the other's datagram; a lock that another thread held at
/// the fork stays locked in the child.
const int ForkGuard::HANDLERS = ::pthread_atfork(&BeforeFork, &AfterForkInParent, &AfterForkInChild);

void ForkGuard::Enlist() noexcept {
    const std::lock_guard lock(g_listMutex);
    m_next = g_first;
    if (m_next != nullptr)
        m_next->m_previous = this;
    g_first = this;
}

void ForkGuard::Delist() noexcept {
    const std::lock_guard lock(g_listMutex);
    if (m_next != nullptr)
        m_next->m_previous = m_previous;
    if (m_previous != nullptr)
        m_previous->m_next = m_next;
    else
        g_first = m_next;
}

void ForkGuard::BeforeFork() noexcept {
    g_listMutex.lock();
    for (ForkGuard* guard = g_first; guard != nullptr; guard = guard->m_next)
        guard->m_mutex.lock();
}

void ForkGuard::AfterForkInParent() noexcept {
    for (ForkGuard* guard = g_first; guard != nullptr; guard = guard->m_next)
        guard->m_mutex.unlock();
    g_listMutex.unlock();
}

void ForkGuard::AfterForkInChild() noexcept {
    for (ForkGuard* guard = g_first; guard != nullptr; guard = guard->m_next) {
        guard->BeginInChild();
        guard->m_mutex.unlock();
    }
    g_listMutex.unlock();
}

} // namespace hublink
