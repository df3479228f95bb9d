#include "channel/ForkGuard.h"

#include <pthread.h>

namespace hublink {
namespace {

/// Guards the list and is taken before any guard's own lock. Both are never destroyed: a reporter may be
/// static.
std::mutex g_listMutex;
ForkGuard* g_first = nullptr;

} // namespace

/// When the library is loaded, and not with the first guard, which a fork might fall into. Without memory for
/// the handlers a child shares its parent's socket, which works, but mixes up their errors.
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
