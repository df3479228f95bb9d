#include "Modules/OrvekSqlite/group/Committer.h"

#include <exception>

#include "SystemTool/ThreadHeap.h"

namespace OrvekSqlite::group {

void Committer::Notice() {
    if (!m_isResting || !m_group.Due())
        return;
    if (m_thread.joinable())
        m_wake.notify_one();
    else
        Start();
    m_isResting = !m_thread.joinable();
}

void Committer::Start() {
    try {
        m_thread = std::thread(&Committer::Run, this);
    } catch (const std::exception&) {
        // No thread can be made: until one can, each group is a single statement.
        m_group.CommitWithoutWaiting();
    }
}

void Committer::Stop() {
    {
        const std::lock_guard lock(m_mutex);
        m_stop = true;
    }
    m_wake.notify_one();
    if (m_thread.joinable())
        m_thread.join();
}

void Committer::Run() {
    SystemTool::PrepareHeap();
    m_self = std::this_thread::get_id();
    std::unique_lock lock(m_mutex);
    while (!m_stop) {
        const auto due = m_group.Due();
        m_isResting = !due;
        if (!due)
            m_wake.wait(lock);
        else if (Clock::now() < *due)
            m_wake.wait_until(lock, *due);
        else
            m_group.CommitWithoutWaiting();
    }
}

} // namespace OrvekSqlite::group
