#include "Tools/reportctl/outbox/RecentEvents.h"

#include <algorithm>

#include "SystemTool/IO/JsonDocument.h"
#include "Tools/reportctl/outbox/Database.h"

namespace reportctl::outbox {
namespace {

using SystemTool::IO::JsonDocument;

/// Events that never match a line of the log must not fill the memory of a command that runs for days.
constexpr std::size_t MAX_EVENTS_KEPT = 200'000;

JsonDocument Parsed(const std::string& text) {
    std::string ignored; // a text that is not JSON becomes null, which equals no event's data
    return JsonDocument().FromJson(text, ignored);
}

std::string KeyOf(const std::string& eventID, const std::string& createTime) {
    return eventID + '\0' + createTime;
}

std::string TimeIn(const std::string& payload) {
    return Parsed(payload).GetKeyValue("extend").GetKeyValue("createTime").ToString();
}

/// Whether the payload was made of this value. The service sets two members in the value. When the same
/// members with the same texts are set in the report's value, the result must be the payload's data.
bool IsMadeOf(const std::string& payload, const std::string& value) {
    const auto data = Parsed(payload).GetKeyValue("eventData");
    auto expected = Parsed(value);
    if (!value.empty() && !expected.IsObject() && expected.ToJson() != "null")
        return false;
    for (const auto* added : {"openid", "sys_version"})
        expected.SetKeyValue(added, data.GetKeyValue(added).ToString());
    return expected.ToJson() == data.ToJson();
}

std::int64_t In(const std::map<std::string, std::int64_t>& counts, const std::string& module) {
    const auto found = counts.find(module);
    return found == counts.end() ? 0 : found->second;
}

} // namespace

void RecentEvents::ReadNew(std::int64_t before) {
    auto database = OpenToLook(m_path);
    database.exec("begin"); // so that the events and the counts are those of one moment
    Read(database, Where::Waiting, m_lastWaiting, before);
    Read(database, Where::Dead, m_lastDead, before);
    m_stored = StoredByModule(database);
    database.exec("commit");
    if (m_isFirst)
        m_before = m_stored;
    m_isFirst = false;
    Trim();
}

void RecentEvents::Read(SQLite::Database& database, Where where, std::int64_t& lastRow, std::int64_t before) {
    const auto last = LastRow(database, where);
    if (m_isFirst)
        lastRow = std::max<std::int64_t>(last - before, 0);
    if (last < lastRow) // the table was empty meanwhile, and its row numbers began at 1 again
        lastRow = 0;
    ForEach(database, where, lastRow, [this](const Event& event) { Add(event); });
    lastRow = last;
}

void RecentEvents::Add(const Event& event) {
    if (!m_uuids.insert(event.uuid).second)
        return;
    auto key = KeyOf(event.eventID, TimeIn(event.payload));
    m_events[key].push_back({event.uuid, event.payload, event.sequence});
    m_order.emplace_back(std::move(key), event.uuid);
}

void RecentEvents::Trim() {
    for (; m_order.size() > MAX_EVENTS_KEPT; m_order.pop_front()) {
        const auto& [key, uuid] = m_order.front();
        m_uuids.erase(uuid);
        const auto found = m_events.find(key);
        if (found == m_events.end())
            continue;
        std::erase_if(found->second, [&uuid = uuid](const Known& known) { return known.uuid == uuid; });
        if (found->second.empty())
            m_events.erase(found);
    }
}

bool RecentEvents::Take(const EventContent& report, const std::string& module) {
    const auto found = m_events.find(KeyOf(report.eventID, report.createTime));
    if (found == m_events.end())
        return false;
    auto& events = found->second;
    const auto event = std::find_if(events.begin(), events.end(), [&](const Known& known) {
        return IsMadeOf(known.payload, report.value);
    });
    if (event == events.end())
        return false;
    if (event->sequence > Before(module))
        ++m_counted[module];
    events.erase(event);
    if (events.empty())
        m_events.erase(found);
    return true;
}

std::int64_t RecentEvents::Before(const std::string& module) const {
    return In(m_before, module);
}

std::int64_t RecentEvents::Uncounted(const std::string& module) const {
    return In(m_stored, module) - Before(module) - In(m_counted, module);
}

} // namespace reportctl::outbox
