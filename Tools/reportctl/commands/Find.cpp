#include <algorithm>
#include <deque>
#include <filesystem>
#include <functional>
#include <memory>
#include <set>
#include <string>
#include <thread>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/commands/FilterOptions.h"
#include "Tools/reportctl/log/Files.h"
#include "Tools/reportctl/log/FoundReports.h"
#include "Tools/reportctl/log/Show.h"
#include "Tools/reportctl/log/Stream.h"
#include "Tools/reportctl/outbox/Database.h"
#include "Tools/reportctl/outbox/Events.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/store/Search.h"
#include "Tools/reportctl/store/Store.h"
#include "Tools/reportctl/terminal/Columns.h"
#include "Tools/reportctl/terminal/Json.h"
#include "Tools/reportctl/terminal/Printable.h"
#include "Tools/reportctl/terminal/Result.h"
#include "Tools/reportctl/terminal/WrittenTime.h"

namespace reportctl::commands {
namespace {

constexpr auto HELP =
    "Examples:\n"
    "  reportctl find 'opened the door'\n"
    "  reportctl find 'B100|10001'\n"
    "  reportctl find 1700000000123 --json\n"
    "\n"
    "The text is searched as it is, upper and lower case apart: in the log for datagrams, in the store for "
    "rows, in the\n"
    "outbox for events that wait or are dead letters. The rows and events of the datagrams are shown too, "
    "where the\n"
    "text is spelt differently there. An event that was delivered is in the log alone.\n"
    "Exit code 1: it was found nowhere, or something could not be read.\n"
    "\n";

constexpr std::chrono::milliseconds LOOK_AGAIN{100};
constexpr std::size_t SHOWN_UNASKED = 1000;

struct FindOptions {
    std::string text;
    std::size_t limit = SHOWN_UNASKED;
    bool isJson = false;
};

/// The last ones of what was found in one place.
struct Place {
    std::size_t found = 0;
    std::string since; ///< how far back the place reaches; empty when nothing tells
    std::deque<std::string> lines;
    std::string error;
};

class Search {
public:
    explicit Search(const FindOptions& options) : m_options(options) {}

    void Run() {
        Try(m_log, [this] { SearchLog(); });
        Try(m_store, [this] { store::Naming(store::StorePath(), [this] { SearchStore(); }); });
        Try(m_outbox, [this] { SearchOutboxes(); });
    }

    void Print() const {
        terminal::Result output("");
        m_options.isJson ? PrintJson(output) : PrintText(output);
        output.Finish();
    }

    /// 0 when something was found and every place could be read.
    int ExitCode() const {
        const bool isFound = m_log.found + m_store.found + m_outbox.found > 0;
        return isFound && m_log.error.empty() && m_store.error.empty() && m_outbox.error.empty() ? 0 : 1;
    }

private:
    static void Try(Place& place, const std::function<void()>& search) {
        try {
            search();
        } catch (const std::exception& error) {
            place.error = error.what();
        }
    }

    void Add(Place& place, std::string line) const {
        ++place.found;
        place.lines.push_back(std::move(line));
        if (place.lines.size() > m_options.limit)
            place.lines.pop_front();
    }

    bool Holds(const std::string& text) const { return text.find(m_options.text) != std::string::npos; }

    bool IsHit(const log::Entry& entry) const {
        return entry.isDatagram && (Holds(entry.line.message) || Holds(entry.message.eventID) ||
                                    Holds(entry.message.value) || Holds(entry.message.createTime));
    }

    void SearchLog() {
        const auto directory = log::LogDirectory();
        if (const auto reason = log::ReasonAgainst(log::LiveFile(directory)); !reason.empty())
            throw std::runtime_error(fmt::format("{}: {}", log::LiveFile(directory), reason));
        log::Stream stream(directory, log::RotatedFiles(directory));
        auto left = stream.Begin();
        for (const auto& file : stream.OutboxFiles())
            m_outboxes.insert(file);
        const auto take = [&](const log::Entry& entry) {
            if (m_log.since.empty())
                m_log.since = (m_options.isJson ? terminal::ZonedTime : terminal::LocalTime)(entry.line.time);
            if (left > 0 && IsHit(entry)) {
                Add(m_log, m_options.isJson ? log::JsonOf(entry) : log::TextOf(entry, m_columns));
                m_reports.Add(entry);
            }
            left -= left > 0 ? 1 : 0;
        };
        for (bool isFirst = true; left > 0 && !stream.IsAtEnd(); isFirst = false) {
            if (!isFirst && !stream.HasMore())
                std::this_thread::sleep_for(LOOK_AGAIN); // the newest ones wait for their outcome
            stream.Read();
            stream.TakeFinished(take);
        }
    }

    void SearchStore() {
        auto database = store::OpenToRead(store::StorePath());
        if (const auto oldest = store::OldestRow(database))
            m_store.since = m_options.isJson ? oldest->at : TimeOf(*oldest);
        std::deque<store::FoundRow> last; // a line is made of those alone that are shown
        const store::IsWanted isWanted = [this](const auto& row) { return m_reports.HaveRow(row); };
        const auto take = [&](const store::FoundRow& row) {
            ++m_store.found;
            last.push_back(row);
            if (last.size() > m_options.limit)
                last.pop_front();
        };
        store::Search(database, m_options.text, m_reports.HaveRows() ? isWanted : nullptr, take);
        for (const auto& row : last)
            m_store.lines.push_back(m_options.isJson ? JsonOf(row) : TextOf(row));
    }

    /// The service's own, unless no event was ever stored, and those of modules that announced a directory.
    void SearchOutboxes() {
        std::error_code error;
        if (std::filesystem::exists(store::OutboxPath(), error) || error)
            m_outboxes.insert(store::OutboxPath());
        for (const auto& file : m_outboxes)
            store::Naming(file, [&] { SearchOutbox(file); });
    }

    void SearchOutbox(const std::string& file) {
        auto database = outbox::OpenToLook(file);
        const auto take = [this](const outbox::Event& event) {
            if (Holds(event.eventID) || Holds(event.payload) || Holds(event.uuid) ||
                m_reports.HaveEvent(event))
                Add(m_outbox, m_options.isJson ? JsonOf(event) : TextOf(event));
        };
        outbox::ForEach(database, outbox::Where::Waiting, 0, take);
        outbox::ForEach(database, outbox::Where::Dead, 0, take);
    }

    /// In local time, as the datagrams above it have it.
    static std::string TimeOf(const store::FoundRow& row) {
        auto time = row.atLocal.empty() ? "(no time)" : row.atLocal;
        std::replace(time.begin(), time.end(), 'T', ' ');
        return time;
    }

    static std::string TextOf(const store::FoundRow& row) {
        return fmt::format("row {}  {}  {:<14} {}", row.id, TimeOf(row), terminal::Printable(row.event),
                           terminal::Printable(row.value));
    }

    static std::string TextOf(const outbox::Event& event) {
        return fmt::format("{}  {:<14} {}{}", event.uuid, terminal::Printable(event.eventID),
                           terminal::Printable(event.payload),
                           event.isDead ? fmt::format("  -> dead letter: {}: {}", event.status,
                                                      terminal::Printable(event.reason))
                                        : "  -> waiting");
    }

    static std::string JsonOf(const store::FoundRow& row) {
        terminal::JsonObject json;
        json.Add("id", row.id);
        json.AddOrNull("at", row.at);
        json.Add("eventID", row.event);
        json.Add("value", row.value);
        json.Add("openid", row.openid);
        json.Add("createTime", row.createTime);
        json.Add("outcome", "stored");
        json.AddNull("reason"); // the store has no row of a report that it refused
        return json.Take();
    }

    static std::string JsonOf(const outbox::Event& event) {
        terminal::JsonObject json;
        json.Add("id", event.uuid);
        json.Add("module", event.module);
        json.Add("sequence", event.sequence);
        json.Add("eventID", event.eventID);
        json.Add("state", event.isDead ? "dead" : "waiting");
        json.Add("outcome", "toAnalytics");
        event.isDead ? json.Add("status", event.status) : json.AddNull("status");
        json.AddOrNull("reason", event.reason);
        json.Add("payload", event.payload);
        return json.Take();
    }

    void PrintText(terminal::Result& output) const {
        const auto print = [&output](const std::string& title, const Place& place) {
            output.Write(
                fmt::format("{}{}: {} found{}\n", title,
                            place.since.empty() ? "" : fmt::format(" (since {})", place.since), place.found,
                            place.lines.size() < place.found
                                ? fmt::format(", the last {} of them (see --limit)", place.lines.size())
                                : ""));
            if (!place.error.empty())
                output.Write(fmt::format("  could not be read: {}\n", place.error));
            for (const auto& line : place.lines)
                output.Write("  " + line + "\n");
        };
        print("Log", m_log);
        print("Store", m_store);
        print("Outbox", m_outbox);
    }

    void PrintJson(terminal::Result& output) const {
        const auto print = [&output](const char* name, const Place& place) {
            output.Write(fmt::format("\"{}\":[", name));
            for (std::size_t i = 0; i < place.lines.size(); ++i)
                output.Write((i == 0 ? "" : ",\n") + place.lines[i]);
            output.Write("],\n");
        };
        output.Write("{");
        print("datagrams", m_log);
        print("rows", m_store);
        print("events", m_outbox);
        terminal::JsonObject reach;
        reach.AddOrNull("logSince", m_log.since);
        reach.AddOrNull("storeSince", m_store.since);
        reach.AddOrNull("logError", m_log.error);
        reach.AddOrNull("storeError", m_store.error);
        reach.AddOrNull("outboxError", m_outbox.error);
        output.Write(fmt::format("\"reach\":{}}}\n", reach.Take()));
    }

    const FindOptions& m_options;
    std::size_t m_columns = terminal::Columns();
    Place m_log;
    Place m_store;
    Place m_outbox;
    log::FoundReports m_reports;      ///< those of m_log, to find their rows and events
    std::set<std::string> m_outboxes; ///< files
};

int RunFind(const FindOptions& options) {
    Search search(options);
    search.Run();
    search.Print();
    return search.ExitCode();
}

} // namespace

void AddFind(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<FindOptions>();
    auto* command =
        app.add_subcommand("find", "Find where a report ended: in the log, the store and the outbox.");
    const CLI::Validator notEmpty(
        [](const std::string& text) { return text.empty() ? "an empty text is in everything" : ""; }, "TEXT");
    command->add_option("TEXT", options->text, "A part of the datagram, the event id, the value or the time")
        ->required()
        ->check(notEmpty);
    command->add_option("--limit", options->limit, "Show so many of each place, the last ones")
        ->check(IsWholeNumber(0))
        ->capture_default_str();
    command->add_flag(
        "--json", options->isJson,
        "A JSON object with the arrays datagrams, rows and events, and reach, which says since when "
        "log and store tell");
    command->footer(HELP + app.get_footer());
    command->callback([options, &exitCode] { exitCode = RunFind(*options); });
}

} // namespace reportctl::commands
