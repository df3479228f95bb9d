#include "Tools/reportctl/log/Stream.h"

#include <chrono>
#include <utility>

#include "Tools/reportctl/store/Paths.h"

namespace reportctl::log {
namespace {

bool IsFinished(const Entry& entry) {
    return !entry.IsOpen() || std::chrono::steady_clock::now() - entry.readAt >= Stream::PATIENCE ||
           // The log's local times can be an hour wrong after clocks are set back; the test above then
           // decides.
           std::chrono::system_clock::now() - entry.line.time >= Stream::PATIENCE;
}

} // namespace

Stream::Stream(const std::string& directory, const std::vector<std::string>& rotated)
    : m_follower(directory, rotated), m_outcomes(store::StorePath(), store::OutboxPath()) {}

void Stream::ReadLines() {
    std::string text;
    while (m_follower.Next(text))
        if (auto line = ReadLine(text); line && line->time >= m_since)
            m_pairing.Take(std::move(*line));
}

Backlog Stream::CountBacklog() {
    Backlog backlog;
    for (const auto& entry : m_pairing.Entries()) {
        backlog.reports += entry.message.kind == message::Kind::Report ? 1 : 0;
        backlog.events += entry.message.kind == message::Kind::Event ? 1 : 0;
    }
    return backlog;
}

std::size_t Stream::Read() {
    if (std::exchange(m_isFirst, false)) {
        ReadLines();
        m_outcomes.Read(CountBacklog());
    } else {
        m_outcomes.Read({});
        ReadLines();
    }
    m_outcomes.Resolve(m_pairing);
    return m_pairing.Entries().size();
}

void Stream::TakeFinished(const std::function<void(Entry&)>& visit) {
    auto& entries = m_pairing.Entries();
    while (!entries.empty() && IsFinished(entries.front())) {
        visit(entries.front());
        m_pairing.DropFront();
    }
}

} // namespace reportctl::log
