#include "Tools/reportctl/log/Outcomes.h"

#include <exception>
#include <map>
#include <utility>

#include "Tools/reportctl/store/Store.h"

namespace reportctl::log {
namespace {

using message::Kind;

/// How many more rows and events are read than the log has datagrams. Some datagrams arrive after the log was
/// read and before the databases are read.
constexpr std::int64_t SLACK = 1000;

bool IsOpenEvent(const Entry& entry) {
    return entry.IsOpen() && entry.isReadable && entry.message.kind == Kind::Event;
}

std::map<std::string, std::vector<Entry*>> OpenEvents(Pairing& pairing) {
    std::map<std::string, std::vector<Entry*>> byModule;
    for (auto& entry : pairing.Entries())
        if (IsOpenEvent(entry))
            byModule[entry.message.module].push_back(&entry);
    return byModule;
}

} // namespace

void Outcomes::Complain(const std::string& reason) {
    if (m_told.insert(reason).second)
        m_complaints.push_back(reason);
}

std::vector<std::string> Outcomes::TakeComplaints() {
    return std::exchange(m_complaints, {});
}

void Outcomes::Read(const Backlog& backlog) {
    try {
        store::Naming(m_storePath, [&] { m_rows.ReadNew(backlog.reports + SLACK); });
    } catch (const std::exception& error) {
        Complain(error.what());
    }
    try {
        store::Naming(m_outboxPath, [&] { m_events.ReadNew(backlog.events + SLACK); });
    } catch (const std::exception& error) {
        Complain(error.what());
    }
}

void Outcomes::Find(Entry& entry) {
    const auto& report = entry.message;
    if (!entry.IsOpen() || !entry.isReadable || !report.fault.empty())
        return;
    if (report.kind == Kind::Report && m_rows.Take({report.eventID, report.value, report.createTime}) != 0)
        entry.outcome = Outcome::Stored;
    if (report.kind == Kind::Event &&
        m_events.Take({report.eventID, report.value, report.createTime}, report.module))
        entry.outcome = Outcome::ToAnalytics;
}

void Outcomes::Resolve(Pairing& pairing) {
    for (auto& entry : pairing.Entries())
        Find(entry);
    if (std::exchange(m_isFirst, false))
        CountBefore(pairing);
    else
        CountSince(pairing);
}

/// Decides about the events that arrived before the first reading. For such an event, it is not known how
/// many events its module had stored before it. When a module has stored at least as many events as the log
/// has datagrams of it, and no line of the log says that an event could not be kept, all of them were stored.
void Outcomes::CountBefore(Pairing& pairing) {
    if (pairing.AnalyticsFailures() > 0)
        return;
    std::map<std::string, std::int64_t> handled;
    for (const auto& entry : pairing.Entries())
        if (entry.isDatagram && entry.message.kind == Kind::Event && entry.outcome != Outcome::Refused)
            ++handled[entry.message.module];
    for (auto& [module, entries] : OpenEvents(pairing))
        if (m_events.Before(module) >= handled[module])
            for (auto* entry : entries)
                entry->outcome = Outcome::ToAnalytics;
}

void Outcomes::CountSince(Pairing& pairing) {
    for (auto& [module, entries] : OpenEvents(pairing)) {
        const auto count = static_cast<std::int64_t>(entries.size());
        if (m_events.Uncounted(module) != count)
            continue;
        m_events.Count(module, count);
        for (auto* entry : entries)
            entry->outcome = Outcome::ToAnalytics;
    }
}

} // namespace reportctl::log
