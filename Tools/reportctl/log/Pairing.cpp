#include "Tools/reportctl/log/Pairing.h"

#include <algorithm>
#include <array>
#include <optional>

#include <fmt/format.h>

#include "Common/ServiceConstants.h"
#include "SystemTool/IO/JsonDocument.h"

namespace reportctl::log {
namespace {

using message::Kind;

constexpr std::string_view UNREADABLE = "[BoostLogError]";
constexpr std::string_view INSERT = "-insert into OperLog ";

bool IsFrom(const Line& line, std::string_view site, std::string_view function) {
    return line.site == site && line.function == function;
}

bool IsArrival(const Line& line) {
    return IsFrom(line, "App/ReportServer", "Recv");
}

/// Whether the service refuses the event's value: a value for analytics must be JSON.
bool HasBadValue(const Entry& entry) {
    if (entry.message.kind != Kind::Event || entry.message.value.empty())
        return false;
    std::string fault;
    SystemTool::IO::JsonDocument().FromJson(entry.message.value, fault);
    return !fault.empty();
}

bool IsReportWithFault(const Entry& entry) {
    return entry.message.kind != Kind::Control && !entry.message.fault.empty();
}

bool IsControlWithFault(const Entry& entry) {
    return entry.message.kind == Kind::Control && !entry.message.fault.empty();
}

std::function<bool(const Entry&)> IsOf(Kind kind) {
    return [kind](const Entry& entry) { return entry.message.kind == kind; };
}

std::optional<std::string> After(const std::string& text, std::string_view beginning) {
    if (!text.starts_with(beginning))
        return std::nullopt;
    return text.substr(beginning.size());
}

/// Whether events may have been refused after this line without a line of their own.
bool IsAnalyticsFailure(const Line& line) {
    if (line.site == "Metrik/MetrikWorker" && line.message.starts_with("Failed to load metrik sdk"))
        return true;
    if (!IsFrom(line, "Metrik/MetrikWorker", "FailCallBackFun"))
        return false;
    constexpr std::array CAUSES{"directory-",       "outbox file-", "outbox damaged-",
                                "outbox vanished-", "event-",       "init-"};
    return std::any_of(CAUSES.begin(), CAUSES.end(),
                       [&](const char* cause) { return line.message.starts_with(cause); });
}

/// Whether the line says that an event could not be stored. Other lines of FailCallBackFun are about the
/// outbox, for example about reading it.
bool IsEventNotKept(const Line& line) {
    return IsFrom(line, "Metrik/MetrikWorker", "FailCallBackFun") &&
           line.message.starts_with("outbox file-Cannot store an event");
}

/// Decides about a control message that is JSON. The service acts on it when it knows its kind, and ignores
/// it otherwise, without a line in the log.
void JudgeControl(Entry& entry) {
    if (entry.message.kind != Kind::Control || !entry.message.fault.empty())
        return;
    entry.outcome = Outcome::Control;
    const auto& control = entry.message.control;
    if (control != SyncServiceReport::ORVEK_REPORT_MODULEINIT &&
        control != SyncServiceReport::ORVEK_REPORT_UPDATEOPENID)
        entry.reason = "no report, and no control message that the service knows: it does nothing";
}

} // namespace

const char* WordFor(Outcome outcome) {
    switch (outcome) {
    case Outcome::Stored:
        return "stored";
    case Outcome::ToAnalytics:
        return "toAnalytics";
    case Outcome::Control:
        return "control";
    case Outcome::Refused:
        return "refused";
    default:
        return "unknown";
    }
}

void Pairing::Take(Line line) {
    m_analyticsFailures += IsAnalyticsFailure(line) ? 1 : 0;
    if (IsArrival(line))
        AddDatagram(std::move(line));
    else if (line.level < WARN || !Refuse(line))
        Add({.line = std::move(line), .message = {}, .reason = {}});
}

void Pairing::AddDatagram(Line line) {
    if (line.process != m_process) { // a restarted service handles no datagram of the process before it
        m_handled = m_entries.size();
        m_process = line.process;
    }
    Entry entry{.line = std::move(line), .message = {}, .isDatagram = true, .reason = {}};
    entry.isReadable = !entry.line.message.starts_with(UNREADABLE);
    if (entry.isReadable)
        entry.message = message::Read(entry.line.message);
    else
        entry.reason = "the log could not write its text";
    JudgeControl(entry);
    Add(std::move(entry));
}

void Pairing::Add(Entry entry) {
    m_bytes += entry.line.message.size();
    m_entries.push_back(std::move(entry));
}

void Pairing::DropFront() {
    m_bytes -= m_entries.front().line.message.size();
    m_entries.pop_front();
    m_handled -= m_handled > 0 ? 1 : 0;
}

void Pairing::Mark(std::size_t index, const Line& line, const std::string& reason) {
    auto& entry = m_entries[index];
    entry.outcome = Outcome::Refused;
    entry.reason = reason;
    entry.refusedLevel = line.level;
    m_handled = index + 1;
}

bool Pairing::RefuseFirst(const Line& line, const std::string& reason, const Fits& fits) {
    for (auto index = m_handled; index < m_entries.size(); ++index)
        if (m_entries[index].IsOpen() && m_entries[index].isReadable && fits(m_entries[index])) {
            Mark(index, line, reason);
            return true;
        }
    return RefuseUnreadable(line, reason);
}

/// Marks the one entry that the line can be about. Returns false when no entry or more than one can be meant.
/// An entry whose text the log could not write can always be meant.
bool Pairing::RefuseOnly(const Line& line, const std::string& reason, const Fits& fits) {
    std::optional<std::size_t> found;
    for (auto index = m_handled; index < m_entries.size(); ++index) {
        const auto& entry = m_entries[index];
        if (!entry.IsOpen() || (entry.isReadable && !fits(entry)))
            continue;
        if (found)
            return false;
        found = index;
    }
    if (found)
        Mark(*found, line, reason);
    return found.has_value();
}

bool Pairing::RefuseUnreadable(const Line& line, const std::string& reason) {
    return RefuseOnly(line, reason, [](const Entry&) { return false; });
}

bool Pairing::Refuse(const Line& line) {
    const auto& text = line.message;
    if (IsFrom(line, "Frame/DBHelper", "ExecSql"))
        if (const auto sql = text.find(INSERT); sql != std::string::npos)
            return RefuseFirst(line, text.substr(0, sql), [&](const Entry& entry) {
                const auto& report = entry.message;
                return report.kind == Kind::Report &&
                       text.find(fmt::format("values('{}', '{}','{}',", report.eventID, report.value,
                                             report.createTime),
                                 sql) != std::string::npos;
            });
    if (IsFrom(line, "App/ReportServer", "JsonToStruct"))
        return RefuseFirst(line, text, IsReportWithFault);
    if (IsFrom(line, "Metrik/MetrikMgr", "Update"))
        return RefuseFirst(line, text, IsControlWithFault);
    if (const auto id = After(text, "eventID error :"); id && IsFrom(line, "Metrik/MetrikMgr", "Send"))
        return RefuseFirst(line, text, [&](const Entry& entry) { return entry.message.eventID == *id; });
    if (const auto id = After(text, "module not init :"); id && IsFrom(line, "Metrik/MetrikMgr", "Send"))
        return RefuseFirst(line, text, [&](const Entry& entry) {
            return entry.message.kind == Kind::Event && entry.message.module == *id;
        });
    if (IsFrom(line, "Metrik/MetrikWorker", "Send") && line.level > WARN)
        return RefuseFirst(line, text, HasBadValue);
    if (IsEventNotKept(line) || IsFrom(line, "Metrik/MetrikWorker", "Send") ||
        IsFrom(line, "Metrik/MetrikMgr", "Send"))
        return RefuseOnly(line, text, IsOf(Kind::Event));
    if (IsFrom(line, "Frame/FrameWorker", "Send"))
        return RefuseOnly(line, text, IsOf(Kind::Report));
    return IsFrom(line, "App/ReportServer", "Consume") &&
           RefuseOnly(line, text, [](const Entry&) { return true; });
}

} // namespace reportctl::log
