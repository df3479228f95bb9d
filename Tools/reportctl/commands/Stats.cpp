#include <algorithm>
#include <filesystem>
#include <map>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Ledger/Reader.h"
#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/commands/FilterOptions.h"
#include "Tools/reportctl/status/Names.h"
#include "Tools/reportctl/status/Status.h"
#include "Tools/reportctl/store/Csv.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/store/Store.h"
#include "Tools/reportctl/store/Tally.h"
#include "Tools/reportctl/terminal/Columns.h"
#include "Tools/reportctl/terminal/Json.h"
#include "Tools/reportctl/terminal/Printable.h"
#include "Tools/reportctl/terminal/Quantity.h"
#include "Tools/reportctl/terminal/Result.h"
#include "Tools/reportctl/terminal/WrittenTime.h"

namespace reportctl::commands {
namespace {

using store::Count;
using store::Grouping;

constexpr auto HELP =
    "Examples:\n"
    "  reportctl stats                                   # events, the most frequent first\n"
    "  reportctl stats --by hour --since 2026-11-21\n"
    "  reportctl stats --by event --top 10 --since \"$(date +%F)\"     # today\n"
    "  reportctl stats --by event --event 'B100|' --csv\n"
    "  reportctl stats --by outcome                      # where reports ended, as the service counted them\n"
    "\n"
    "Counted are the rows of the store, and the events that the outbox has: those that wait and the dead "
    "letters. Events\n"
    "that a collector took have left the outbox; `--by outcome` counts them too, as toAnalytics. Outcomes "
    "come from the\n"
    "service's ledger, which counts since it was begun and knows no event ids.\n"
    "\n"
    "Times are createTime. A row or event whose createTime is no number is within no bound; `--by hour` and "
    "`--by day`\n"
    "count it as (no time), in JSON under null.\n"
    "\n";

const std::map<std::string, Grouping> GROUPINGS{{"hour", Grouping::Hour},
                                                {"day", Grouping::Day},
                                                {"event", Grouping::Event},
                                                {"module", Grouping::Module}};

constexpr std::size_t BAR_WIDTH = 30;

struct StatsOptions {
    FilterOptions filter;
    std::string by = "event";
    std::size_t top = 0;
    bool isUtc = false;
    bool isJson = false;
    bool isCsv = false;
};

/// The counts, and a text that says what was counted.
struct Stats {
    std::vector<Count> counts;
    std::string sources;
};

std::int64_t Sum(const store::Tally& tally) {
    std::int64_t sum = 0;
    for (const auto& [key, count] : tally)
        sum += count;
    return sum;
}

Stats CountReports(const StatsOptions& options) {
    const auto grouping = GROUPINGS.at(options.by);
    const auto filter = options.filter.Read();
    const auto zone = options.isUtc ? store::Zone::Utc : store::Zone::Local;
    store::Tally tally;
    store::Naming(store::StorePath(), [&] {
        auto database = store::OpenToRead(store::StorePath());
        store::CountRows(database, grouping, filter, zone, tally);
    });
    const auto rows = Sum(tally);
    std::error_code error;
    if (std::filesystem::exists(store::OutboxPath(), error) || error)
        store::Naming(store::OutboxPath(), [&] {
            auto outbox = store::OpenToRead(store::OutboxPath());
            store::CountEvents(outbox, grouping, filter, zone, tally);
        });
    return {store::Ranked(tally, grouping, options.top),
            fmt::format("{} of the store, {} of the outbox (waiting, or dead letters)",
                        terminal::Counted(static_cast<std::uint64_t>(rows), "row"),
                        terminal::Counted(static_cast<std::uint64_t>(Sum(tally) - rows), "event"))};
}

constexpr auto OUTCOME = "outcome";

/// Refuses filters: the ledger does not count by event id, and has counters of earlier times for the last ten
/// minutes only.
void RequireNoFilter(const FilterOptions& filter) {
    if (!filter.since.empty() || !filter.until.empty() || !filter.event.empty())
        throw CLI::ValidationError("--by outcome",
                                   "the ledger counts since it was begun, and all events together: leave "
                                   "--since, --until and --event out");
}

/// Counts by outcome: the datagrams that the service received, and those that the system dropped before. The
/// keys are the names in `reportctl status --json`.
Stats CountOutcomes(const StatsOptions& options) {
    const auto look = ReportLedger::LookAt(store::LedgerPath());
    if (look.sight != ReportLedger::Sight::Sound)
        throw std::runtime_error(store::LedgerPath() + " cannot be read: `reportctl status` says more");
    store::Tally tally;
    const auto add = [&](const std::string& key, unsigned place) {
        if (look.total[place] > 0)
            tally[{0, key}] = static_cast<std::int64_t>(look.total[place]);
    };
    for (const auto place :
         {status::Place(ReportLedger::Outcome::Stored), status::Place(ReportLedger::Outcome::ToAnalytics),
          status::Place(ReportLedger::Outcome::Control), status::Place(ReportLedger::Outcome::OtherControl),
          unsigned{ReportLedger::EMPTY}, unsigned{ReportLedger::LOST_AT_ENDS},
          unsigned{ReportLedger::DROPPED_BY_KERNEL}})
        for (const auto& name : status::COUNTERS)
            if (name.place == place)
                add(name.json, place);
    for (const auto& reason : status::REASONS)
        add(std::string("refused.") + reason.json, reason.place);
    return {store::Ranked(tally, Grouping::Event, options.top),
            fmt::format("{} of the ledger since {}",
                        terminal::Counted(look.total[ReportLedger::RECEIVED], "datagram"),
                        terminal::LocalTime(terminal::At(look.begunAtMs)))};
}

void PrintJson(const Stats& stats, terminal::Result& output) {
    output.Write("[");
    for (std::size_t i = 0; i < stats.counts.size(); ++i) {
        const auto& [key, count] = stats.counts[i];
        terminal::JsonObject json;
        key ? json.Add("key", *key) : json.AddNull("key");
        json.Add("count", count);
        output.Write((i == 0 ? "" : ",") + json.Take());
    }
    output.Write("]\n");
}

void PrintCsv(const Stats& stats, terminal::Result& output) {
    std::string text = "key,count\n";
    for (const auto& [key, count] : stats.counts) {
        store::AppendCsvField(text, key);
        text += fmt::format(",{}\n", count);
    }
    output.Write(text);
}

std::string Label(const Count& count, const std::string& by) {
    if (count.key)
        return terminal::Printable(*count.key);
    return by == "module" ? "(no bar in the event id)" : "(no time)";
}

void PrintTable(const Stats& stats, const StatsOptions& options, terminal::Result& output) {
    std::size_t width = 0;
    std::int64_t most = 1;
    for (const auto& count : stats.counts) {
        width = std::max(width, Label(count, options.by).size());
        most = std::max(most, count.count);
    }
    for (const auto& count : stats.counts)
        output.Write(fmt::format(
            "{:<{}}  {:>12}  {}\n", Label(count, options.by), width, count.count,
            std::string(BAR_WIDTH * static_cast<std::size_t>(count.count) / static_cast<std::size_t>(most),
                        '#')));
    output.Write((stats.counts.empty() ? "" : "\n") +
                 terminal::Broken(fmt::format("Counted: {}.", stats.sources), terminal::Columns()) + "\n");
}

void Print(const Stats& stats, const StatsOptions& options) {
    terminal::Result output("");
    if (options.isJson)
        PrintJson(stats, output);
    else if (options.isCsv)
        PrintCsv(stats, output);
    else
        PrintTable(stats, options, output);
    output.Finish();
}

int RunStats(const StatsOptions& options) {
    if (options.by == OUTCOME)
        RequireNoFilter(options.filter);
    Print(options.by == OUTCOME ? CountOutcomes(options) : CountReports(options), options);
    return 0;
}

} // namespace

void AddStats(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<StatsOptions>();
    auto* command = app.add_subcommand("stats", "Count reports by hour, day, event, module or outcome.");
    command->add_option("--by", options->by, "What to count by")
        ->check(CLI::IsMember({"hour", "day", "event", "module", OUTCOME}))
        ->capture_default_str();
    options->filter.AddTo(*command);
    command->add_option("--top", options->top, "Only so many, the most frequent ones")
        ->check(IsWholeNumber(1));
    command->add_flag("--utc", options->isUtc, "Hours and days of UTC, not of local time");
    auto* json = command->add_flag("--json", options->isJson, "A JSON array of {\"key\", \"count\"}");
    command->add_flag("--csv", options->isCsv, "CSV with a header")->excludes(json);
    command->footer(HELP + app.get_footer());
    command->callback([options, &exitCode] { exitCode = RunStats(*options); });
}

} // namespace reportctl::commands
