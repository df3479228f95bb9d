#include <fmt/format.h>

#include "SystemTool/Text/Utf8.h"
#include "Tools/reportctl/status/Names.h"
#include "Tools/reportctl/status/Status.h"
#include "Tools/reportctl/terminal/Columns.h"
#include "Tools/reportctl/terminal/Printable.h"
#include "Tools/reportctl/terminal/Quantity.h"
#include "Tools/reportctl/terminal/WrittenTime.h"

namespace reportctl::status {
namespace {

constexpr std::size_t NAME_WIDTH = 10;
constexpr std::size_t TEXT_WIDTH = 100; // how much of a long text is shown, in bytes

using terminal::Bytes;
using terminal::Counted;
using terminal::Number;

std::string Number(const std::optional<std::int64_t>& number) {
    return number ? Number(static_cast<std::uint64_t>(*number)) : "?";
}

std::string Time(std::int64_t ms) {
    constexpr std::size_t UP_TO_SECONDS = 19;
    return terminal::LocalTime(terminal::At(ms)).substr(0, UP_TO_SECONDS);
}

std::string TimeOfDay(std::int64_t ms) {
    constexpr std::size_t DATE = 11;
    return Time(ms).substr(DATE);
}

/// The beginning of a text that another program wrote, as a terminal may show it.
std::string Shown(const std::string& text) {
    return terminal::Printable(SystemTool::Text::CutUtf8(text, TEXT_WIDTH)) +
           (text.size() > TEXT_WIDTH ? " ..." : "");
}

class Screen {
public:
    Screen(const Status& status, const View& view) : m_status(status), m_view(view) {}

    std::string Text(const Judgement& judgement) {
        ShowVerdict(judgement);
        ShowService();
        ShowLedger();
        ShowStore();
        ShowOutbox();
        ShowLog();
        if (m_status.disk.freeBytes)
            Row("disk", Bytes(*m_status.disk.freeBytes) + " free");
        return m_text;
    }

private:
    std::string Coloured(const char* colour, const std::string& text) const {
        return m_view.isColoured ? fmt::format("\x1b[1;{}m{}\x1b[0m", colour, text) : text;
    }

    /// When the text takes more than one line, the others are indented, by `further` more than its begin.
    void Row(const char* name, const std::string& text, std::size_t further = 0) {
        m_text += terminal::Broken(fmt::format("{:<{}} {}", name, NAME_WIDTH, text), m_view.columns,
                                   NAME_WIDTH + 1 + further) +
                  "\n";
    }

    void ShowVerdict(const Judgement& judgement) {
        switch (judgement.verdict) {
        case Verdict::Healthy:
            Row("verdict", Coloured("32", "healthy"));
            break;
        case Verdict::Degraded:
            Row("verdict", Coloured("33", "degraded"));
            break;
        case Verdict::Down:
            Row("verdict", Coloured("31", "down"));
            break;
        }
        for (const auto& reason : judgement.reasons)
            Row("", "- " + terminal::Printable(reason), 2);
    }

    void ShowService() {
        const Service& service = m_status.service;
        if (!service.isRunning)
            Row("service", "not running");
        else
            Row("service",
                fmt::format("running as process {}{}, version {}, {}", *service.process,
                            service.startedAtMs
                                ? fmt::format(" for {} (since {})",
                                              terminal::Duration(m_status.atMs - *service.startedAtMs),
                                              Time(*service.startedAtMs))
                                : "",
                            service.version.value_or("unknown"),
                            service.isListening ? "listening" : "not listening"));
        if (service.buildId)
            Row("", "build " + *service.buildId);
        if (service.portHolder && !service.isListening)
            Row("port 9997",
                fmt::format("{} of user {}", Shown(service.portHolder->name.value_or("a program")),
                            Shown(service.portHolder->user)));
        const auto word = [](bool isThere) { return isThere ? "there" : "MISSING"; };
        Row("plug-ins", fmt::format("logger {}, store {}, SDK {}", word(service.hasLogger),
                                    word(service.hasStore), word(service.hasSdk)));
    }

    void ShowLedger() {
        const auto& look = m_status.ledger;
        if (look.sight != ReportLedger::Sight::Sound)
            return Row("ledger", "there is none that can be read");
        const auto sinceStart = SinceStart(look);
        m_text +=
            fmt::format("\n{:<{}} {:<20}{:>16}{:>16}\n", "ledger", NAME_WIDTH, "", "in all", "since start");
        const auto row = [&](const char* name, std::uint64_t total, std::uint64_t since) {
            m_text += fmt::format("{:<{}} {:<20}{:>16}{:>16}\n", "", NAME_WIDTH, name, Number(total),
                                  look.counting ? Number(since) : "-");
        };
        for (const Name& name : COUNTERS)
            if (IsMain(name) || look.total[name.place] != 0)
                row(name.json, look.total[name.place], sinceStart[name.place]);
        row("refused", ledger::RefusedIn(look.total), ledger::RefusedIn(sinceStart));
        for (const Name& reason : REASONS)
            if (look.total[reason.place] != 0)
                row(fmt::format("  {}", reason.json).c_str(), look.total[reason.place],
                    sinceStart[reason.place]);
        row("waiting", ReportLedger::WaitingIn(look.total), ReportLedger::WaitingIn(look.total));
        row("mostWaiting", look.total[ReportLedger::MOST_WAITING], sinceStart[ReportLedger::MOST_WAITING]);
        ShowRates("a second, now", m_status.lastSecond);
        ShowRates("in the last minute", m_status.lastMinute);
        m_text += "\n";
    }

    static bool IsMain(const Name& name) {
        return name.place == ReportLedger::RECEIVED || name.place == ReportLedger::DROPPED_BY_KERNEL ||
               name.place == ReportLedger::LOST_AT_ENDS ||
               name.place == Place(ReportLedger::Outcome::Stored) ||
               name.place == Place(ReportLedger::Outcome::ToAnalytics);
    }

    void ShowRates(const char* name, const ledger::Rates& rates) {
        m_text += fmt::format("{:<{}} {:<20}{:.1f} received, {:.1f} stored, {:.1f} refused\n", "", NAME_WIDTH,
                              name, rates.received, rates.stored, rates.refused);
    }

    static std::string Missing(const std::string& problem) {
        return problem.empty() ? "missing: " : "cannot be read: ";
    }

    void ShowStore() {
        const Store& store = m_status.store;
        if (!store.isPresent)
            return Row("store", Missing(store.problem) + terminal::Printable(store.path));
        Row("store", fmt::format("{}{} rows, {}, -wal {}, schema version {}, newest createTime {}",
                                 store.areRowsCounted ? "" : "up to ", Number(store.rows), Bytes(store.bytes),
                                 Bytes(store.walBytes),
                                 store.schemaVersion ? std::to_string(*store.schemaVersion) : "?",
                                 store.newestCreateTime ? Shown(*store.newestCreateTime) : "-"));
        Row("", terminal::Printable(store.path));
    }

    void ShowOutbox() {
        const Outbox& outbox = m_status.outbox;
        if (!outbox.isPresent)
            return Row("outbox", Missing(outbox.problem) + terminal::Printable(outbox.path));
        Row("outbox",
            fmt::format("{} waiting ({}), {} delivered, {} refused, {} dead letter{}, {} dropped",
                        Number(outbox.waiting),
                        outbox.waitingBytes ? Bytes(static_cast<std::uint64_t>(*outbox.waitingBytes)) : "?",
                        Number(outbox.delivered), Number(outbox.refused), Number(outbox.deadLetters),
                        outbox.deadLetters == 1 ? "" : "s", Number(outbox.dropped)));
        Row("", fmt::format("{}; {}", Counted(outbox.modules.size(), "module"),
                            outbox.endpoint ? "sent to " + Shown(*outbox.endpoint)
                                            : std::string("no collector is set: events stay here")));
        if (outbox.endpoint || outbox.lastDeliveredAtMs)
            Row("", "last delivery " + (outbox.lastDeliveredAtMs ? Time(*outbox.lastDeliveredAtMs) : "-") +
                        ", last failure " + (outbox.lastFailure ? Shown(*outbox.lastFailure) : "-"));
    }

    /// Shows the last of the different warnings and errors, each with how often it came.
    void ShowLog() {
        const Log& log = m_status.log;
        Row("log", fmt::format("{}; in the last ten minutes {}, {}", Bytes(log.bytes),
                               Counted(static_cast<std::uint64_t>(log.errors), "error"),
                               Counted(static_cast<std::uint64_t>(log.warnings), "warning")));
        for (auto text = log.lastTexts.rbegin(); text != log.lastTexts.rend(); ++text)
            Row("",
                fmt::format("{} {}{:<5} [{}] {}", TimeOfDay(text->line.atMs),
                            text->times > 1 ? fmt::format("{}x ", text->times) : "", text->line.level,
                            Shown(text->line.site), Shown(text->line.text)),
                2);
    }

    const Status& m_status;
    View m_view;
    std::string m_text;
};

} // namespace

std::string ScreenOf(const Status& status, const Judgement& judgement, const View& view) {
    return Screen(status, view).Text(judgement);
}

} // namespace reportctl::status
