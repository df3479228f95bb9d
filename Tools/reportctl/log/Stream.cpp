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

Stream::Stream(std::string directory, std::vector<std::string> rotated)
    : m_directory(std::move(directory)), m_rotated(std::move(rotated)), m_follower(m_directory, m_rotated),
      m_outcomes(store::StorePath(), store::OutboxPath()) {}

/// Reads lines until there are no more or `pairing` is full. Returns true in the second case.
bool Stream::ReadLines(Follower& follower, Pairing& pairing) const {
    for (std::string text; !pairing.IsFull();) {
        if (!follower.Next(text))
            return false;
        if (auto line = ReadLine(text); line && line->time >= m_since)
            pairing.Take(std::move(*line));
    }
    return true;
}

/// Reads the whole log without keeping it. Only its end tells how far back the databases have to be read.
Survey Stream::TakeSurvey() const {
    Survey survey;
    Follower follower(m_directory, m_rotated);
    Pairing pairing;
    for (bool hasMore = true; hasMore;) {
        hasMore = ReadLines(follower, pairing);
        for (; !pairing.Entries().empty() && (!hasMore || pairing.IsHalfFull()); pairing.DropFront())
            survey.Add(pairing.Entries().front());
    }
    survey.analyticsFailures = pairing.AnalyticsFailures();
    return survey;
}

std::size_t Stream::Begin() {
    const auto survey = TakeSurvey();
    m_outcomes.Begin(survey);
    m_before = survey.entries;
    return m_before;
}

void Stream::Read() {
    m_outcomes.ReadNew();
    m_hasMore = ReadLines(m_follower, m_pairing);
    m_outcomes.Resolve(m_pairing, m_before);
}

/// In a log that is not read to its end, only the first half of what was read: a refusal comes some lines
/// later.
void Stream::TakeFinished(const std::function<void(Entry&)>& visit) {
    auto& entries = m_pairing.Entries();
    while (!entries.empty() && (m_hasMore ? m_pairing.IsHalfFull() : IsFinished(entries.front()))) {
        visit(entries.front());
        m_pairing.DropFront();
        m_before -= m_before > 0 ? 1 : 0;
    }
}

} // namespace reportctl::log
