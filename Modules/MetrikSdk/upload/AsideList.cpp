#include "Modules/MetrikSdk/upload/AsideList.h"

#include <algorithm>
#include <utility>

namespace MetrikSdk::upload {

void AsideList::Add(const EventKey& event, WallTime now) {
    m_keys[event.row] = event.uuid;
    if (m_entries.size() < m_settings.maxEvents)
        m_entries[event.row] = {now + m_settings.firstPause};
}

void AsideList::Remove(std::int64_t row) {
    m_keys.erase(row);
    m_entries.erase(row);
    m_uncertain.erase(row);
    AdmitThePassed();
}

/// Lets events in that were passed while the list was full, the oldest first. They can be tried at once.
void AsideList::AdmitThePassed() {
    if (m_keys.size() == m_entries.size())
        return;
    for (const auto& [row, uuid] : m_keys) {
        if (m_entries.size() >= m_settings.maxEvents)
            return;
        m_entries.try_emplace(row);
    }
}

void AsideList::OtherWasTaken() {
    for (auto& [row, entry] : m_entries) {
        if (entry.tries == 0 && !entry.othersWereTaken)
            entry.notBefore = {};
        entry.othersWereTaken = true;
    }
    m_uncertain.clear();
}

void AsideList::OtherFailed() {
    for (const auto row : std::exchange(m_uncertain, {}))
        m_entries[row].strikes = 0;
}

void AsideList::Taken(std::int64_t row) {
    Remove(row);
    std::erase_if(m_entries, [](const auto& entry) { return entry.second.tries == 0; });
    std::erase_if(m_keys, [this](const auto& key) { return !m_entries.contains(key.first); });
    OtherWasTaken();
}

/// Whether the event may be tried. A clock that was set back must not hold it for longer than the longest
/// pause.
bool AsideList::IsDue(const Entry& entry, WallTime now) const {
    return entry.notBefore <= now || entry.notBefore - now > m_settings.maxPause;
}

std::optional<EventKey> AsideList::Due(WallTime now) const {
    for (const auto& [row, entry] : m_entries)
        if (IsDue(entry, now))
            return EventKey{row, m_keys.at(row)};
    return std::nullopt;
}

std::optional<std::chrono::milliseconds> AsideList::UntilDue(WallTime now) const {
    std::optional<std::chrono::milliseconds> soonest;
    for (const auto& [row, entry] : m_entries) {
        const auto wait = IsDue(entry, now) ? std::chrono::milliseconds(0) : entry.notBefore - now;
        soonest = std::min(soonest.value_or(wait), wait);
    }
    return soonest;
}

AsideList::Strikes AsideList::Failed(std::int64_t row, WallTime now) {
    auto& entry = m_entries[row];
    const bool counts = std::exchange(entry.othersWereTaken, false);
    if (counts)
        m_uncertain.insert(row);
    entry.tries += counts ? 1 : 0;
    entry.strikes += counts ? 1 : 0;
    entry.notBefore = now + PauseAfter(entry.tries);
    return {entry.tries, counts, entry.strikes >= m_settings.strikes || entry.tries >= m_settings.tries};
}

std::chrono::milliseconds AsideList::PauseAfter(int tries) const {
    auto pause = m_settings.firstPause;
    for (int i = 1; i < tries && pause < m_settings.maxPause; ++i)
        pause *= 2;
    return std::min(pause, m_settings.maxPause);
}

} // namespace MetrikSdk::upload
