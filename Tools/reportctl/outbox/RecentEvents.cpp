#include "Tools/reportctl/outbox/RecentEvents.h"

#include <algorithm>

#include "Common/Wire.h"
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

/// The service adds these two members to a report's value, or replaces them there.
JsonDocument WithoutTheServicesOwn(JsonDocument data) {
    for (const auto* added : {Wire::EVENT_OPEN_ID, Wire::EVENT_SYSTEM})
        data.SetKeyValue(added, std::string());
    return data;
}

std::size_t HashOf(const std::string& eventID, const std::string& createTime, const JsonDocument& data) {
    return std::hash<std::string>()(eventID + '\0' + createTime + '\0' +
                                    WithoutTheServicesOwn(data).ToJson());
}

/// What the service takes as the data of an event.
bool IsData(const std::string& value, const JsonDocument& parsed) {
    return value.empty() || parsed.IsObject() || parsed.ToJson() == "null";
}

std::int64_t In(const std::map<std::string, std::int64_t>& counts, const std::string& module) {
    const auto found = counts.find(module);
    return found == counts.end() ? 0 : found->second;
}

} // namespace

std::optional<std::size_t> HashOf(const EventContent& report) {
    const auto data = Parsed(report.value);
    if (!IsData(report.value, data))
        return std::nullopt;
    return HashOf(report.eventID, report.createTime, data);
}

std::size_t HashOf(const Event& event) {
    const auto payload = Parsed(event.payload);
    return HashOf(event.eventID,
                  payload.GetKeyValue(Wire::EVENT_EXTEND).GetKeyValue(Wire::CREATE_TIME).ToString(),
                  payload.GetKeyValue(Wire::EVENT_DATA));
}

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
    const auto uuid = std::hash<std::string>()(event.uuid);
    if (!m_uuids.insert(uuid).second)
        return;
    const auto report = HashOf(event);
    m_events.emplace(report, Known{uuid, event.sequence});
    m_order.emplace_back(report, uuid);
}

void RecentEvents::Trim() {
    for (; m_order.size() > MAX_EVENTS_KEPT; m_order.pop_front()) {
        const auto [report, uuid] = m_order.front();
        m_uuids.erase(uuid);
        const auto [begin, end] = m_events.equal_range(report);
        const auto event =
            std::find_if(begin, end, [uuid = uuid](const auto& known) { return known.second.uuid == uuid; });
        if (event != end)
            m_events.erase(event);
    }
}

bool RecentEvents::Take(const EventContent& report, const std::string& module) {
    const auto hash = HashOf(report);
    if (!hash)
        return false;
    const auto [begin, end] = m_events.equal_range(*hash);
    const auto first = std::min_element(
        begin, end, [](const auto& a, const auto& b) { return a.second.sequence < b.second.sequence; });
    if (first == end)
        return false;
    if (first->second.sequence > Before(module))
        ++m_counted[module];
    m_events.erase(first);
    return true;
}

std::int64_t RecentEvents::Before(const std::string& module) const {
    return In(m_before, module);
}

std::int64_t RecentEvents::Uncounted(const std::string& module) const {
    return In(m_stored, module) - Before(module) - In(m_counted, module);
}

} // namespace reportctl::outbox
