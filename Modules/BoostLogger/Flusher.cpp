#include "Modules/BoostLogger/Flusher.h"

#include <exception>

#include "Modules/BoostLogger/InsideLog.h"
#include "SystemTool/ThreadHeap.h"

namespace BoostLogger {

Flusher::~Flusher() {
    {
        const std::lock_guard lock(m_mutex);
        m_stop = true;
    }
    m_wake.notify_one();
    if (m_thread.joinable())
        m_thread.join();
}

void Flusher::Start() noexcept {
    try {
        m_thread = std::thread(&Flusher::Run, this);
    } catch (const std::exception&) { // no thread, no memory: each line is written at once
    }
}

bool Flusher::Notice() {
    if (m_isResting)
        m_wake.notify_one();
    m_isResting = false;
    return m_thread.joinable();
}

void Flusher::Run() {
    SystemTool::PrepareHeap();
    const InsideLog inside;
    std::unique_lock lock(m_mutex);
    while (!m_stop) {
        const auto due = m_lines.Due();
        m_isResting = !due;
        if (!due)
            m_wake.wait(lock);
        else if (std::chrono::steady_clock::now() < *due)
            m_wake.wait_until(lock, *due);
        else
            m_write();
    }
}

} // namespace BoostLogger
