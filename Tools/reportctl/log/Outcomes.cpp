#include "Tools/reportctl/log/Outcomes.h"

#include <algorithm>
#include <exception>
#include <filesystem>
#include <utility>

#include "Modules/Sqlite/SafeDirectory.h"
#include "SystemTool/CommonTool.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/store/Store.h"

namespace reportctl::log {
namespace {

using message::Kind;

/// So many more rows and events are read than the log has datagrams, because some arrive after the log was
/// read and before the databases are.
constexpr std::int64_t SLACK = 1000;

/// The service itself opens no more outboxes. Any program can announce directories.
constexpr std::size_t MOST_OUTBOXES = 8;

bool IsOpenEvent(const Entry& entry) {
    return entry.IsOpen() && entry.isReadable && entry.message.kind == Kind::Event;
}

bool IsFile(const std::string& path) {
    std::error_code error;
    return std::filesystem::is_regular_file(path, error);
}

/// The path of the outbox in an announced directory. Empty when other users may write to the directory: the
/// service then does not use it.
std::string OutboxIn(const std::string& directory) {
    try {
        const auto path = Sqlite::SafeDirectory::Resolve(directory, SystemTool::CommonTool::GetUserDataDir());
        return path + "/" + store::OUTBOX_FILE;
    } catch (const std::exception&) {
        return {};
    }
}

} // namespace

void Survey::Add(const Entry& entry) {
    ++entries;
    const auto& message = entry.message;
    reports += message.kind == Kind::Report ? 1 : 0;
    if (entry.isDatagram && message.kind == Kind::Event && entry.outcome != Outcome::Refused)
        ++events[message.module];
    if (!message.directory.empty())
        directories.insert(message.directory);
}

Outcomes::Outcomes(std::string storePath, const std::string& outboxPath)
    : m_storePath(std::move(storePath)), m_rows(m_storePath) {
    m_outboxes.push_back({outboxPath, outbox::RecentEvents(outboxPath)});
}

void Outcomes::Complain(const std::string& reason) {
    if (m_told.insert(reason).second)
        m_complaints.push_back(reason);
}

std::vector<std::string> Outcomes::TakeComplaints() {
    return std::exchange(m_complaints, {});
}

std::vector<std::string> Outcomes::OutboxFiles() const {
    std::vector<std::string> files;
    for (const auto& outbox : m_outboxes)
        if (IsFile(outbox.path))
            files.push_back(outbox.path);
    return files;
}

/// Adds the outbox of an announced directory. While there is none, the next announcement tries again.
void Outcomes::Know(const std::string& directory) {
    if (m_outboxes.size() >= MOST_OUTBOXES || m_known.contains(directory))
        return;
    const auto path = OutboxIn(directory);
    if (path.empty() || !IsFile(path))
        return;
    m_known.insert(directory);
    const auto isSame = [&](const Outbox& outbox) { return outbox.path == path; };
    if (std::none_of(m_outboxes.begin(), m_outboxes.end(), isSame))
        m_outboxes.push_back({path, outbox::RecentEvents(path)});
}

void Outcomes::ReadRows(std::int64_t before) {
    try {
        store::Naming(m_storePath, [&] { m_rows.ReadNew(before); });
    } catch (const std::exception& error) {
        Complain(error.what());
    }
}

void Outcomes::ReadEvents(std::int64_t before) {
    for (auto& outbox : m_outboxes)
        try {
            store::Naming(outbox.path, [&] { outbox.events.ReadNew(before); });
        } catch (const std::exception& error) {
            Complain(error.what());
        }
}

/// Of the events that came before the first reading, nothing tells how many the module had stored before
/// each. When it has stored as many as the log has of it, and no line tells of one that could not be kept,
/// these are among them.
void Outcomes::Begin(const Survey& survey) {
    for (const auto& directory : survey.directories)
        Know(directory);
    std::int64_t events = 0;
    for (const auto& [module, count] : survey.events)
        events += count;
    ReadRows(survey.reports + SLACK);
    ReadEvents(events + SLACK);
    for (const auto& [module, count] : survey.events) {
        std::int64_t stored = 0;
        for (const auto& outbox : m_outboxes)
            stored += outbox.events.Before(module);
        if (survey.analyticsFailures == 0 && stored >= count)
            m_allStored.insert(module);
    }
}

void Outcomes::ReadNew() {
    ReadRows(SLACK);
    ReadEvents(SLACK);
}

bool Outcomes::TakeEvent(const message::Message& report) {
    return std::any_of(m_outboxes.begin(), m_outboxes.end(), [&](Outbox& outbox) {
        return outbox.events.Take({report.eventID, report.value, report.createTime}, report.module);
    });
}

void Outcomes::Find(Entry& entry) {
    const auto& report = entry.message;
    if (!entry.IsOpen() || !entry.isReadable || !report.fault.empty())
        return;
    if (report.kind == Kind::Report && m_rows.Take({report.eventID, report.value, report.createTime}))
        entry.outcome = Outcome::Stored;
    if (report.kind == Kind::Event && TakeEvent(report))
        entry.outcome = Outcome::ToAnalytics;
}

void Outcomes::Resolve(Pairing& pairing, std::size_t before) {
    auto& entries = pairing.Entries();
    for (std::size_t index = 0; index < entries.size(); ++index) {
        auto& entry = entries[index];
        if (index >= before && !entry.message.directory.empty())
            Know(entry.message.directory);
        Find(entry);
        if (index < before && IsOpenEvent(entry) && m_allStored.contains(entry.message.module))
            entry.outcome = Outcome::ToAnalytics;
    }
    CountSince(pairing, before);
}

void Outcomes::CountSince(Pairing& pairing, std::size_t before) {
    std::map<std::string, std::vector<Entry*>> open;
    auto& entries = pairing.Entries();
    for (auto index = before; index < entries.size(); ++index)
        if (IsOpenEvent(entries[index]))
            open[entries[index].message.module].push_back(&entries[index]);
    for (auto& [module, events] : open) {
        const auto count = static_cast<std::int64_t>(events.size());
        const auto isAll = [&, &id = module](const Outbox& outbox) {
            return outbox.events.Uncounted(id) == count;
        };
        const auto outbox = std::find_if(m_outboxes.begin(), m_outboxes.end(), isAll);
        if (outbox == m_outboxes.end())
            continue;
        outbox->events.Count(module, count);
        for (auto* entry : events)
            entry->outcome = Outcome::ToAnalytics;
    }
}

} // namespace reportctl::log
