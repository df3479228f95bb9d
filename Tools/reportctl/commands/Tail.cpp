#include <cstdio>
#include <deque>
#include <memory>
#include <optional>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/commands/FilterOptions.h"
#include "Tools/reportctl/log/Files.h"
#include "Tools/reportctl/log/Show.h"
#include "Tools/reportctl/log/Stream.h"
#include "Tools/reportctl/terminal/Columns.h"
#include "Tools/reportctl/terminal/Result.h"
#include "Tools/reportctl/terminal/Watch.h"

namespace reportctl::commands {
namespace {

using std::chrono::milliseconds;

constexpr auto HELP =
    "Examples:\n"
    "  reportctl tail\n"
    "  reportctl tail --module B100 --since 10m\n"
    "  reportctl tail --refused --since 2026-11-20 --no-follow\n"
    "  reportctl tail --json | jq -r .eventID\n"
    "\n"
    "Each line: the time of arrival, \"report\" for the store, \"event\" for analytics or "
    "\"control\", the event id, the\n"
    "beginning of the value, and where it ended: \"stored\" when its row was found in the "
    "store, \"toAnalytics\" when an\n"
    "outbox has it or has counted it, \"refused\" with the reason, else \"unknown\". A "
    "line waits up to a second for that.\n"
    "Unknown stay: what the log could not write (\"[BoostLogError]\", a percent sign in the "
    "text), a report whose row\n"
    "was deleted since, and an event of a module whose announcement, with a directory of its "
    "own, is older than the log.\n"
    "Ctrl-C ends it.\n"
    "\n";

constexpr milliseconds LOOK_AGAIN{200};
constexpr std::size_t LINES_UNASKED = 10;
/// How many rotated files are read without --since. With the live file, that is at least 10 MiB: tens of
/// thousands of lines.
constexpr std::size_t ROTATED_FILES_UNASKED = 1;

struct TailOptions {
    std::string event;
    std::string module;
    bool onlyRefused = false;
    std::string level;
    std::string since;
    std::optional<std::size_t> lines;
    bool isJson = false;
    bool noFollow = false;
};

bool IsWanted(const log::Entry& entry, const TailOptions& options) {
    const auto level = std::max(entry.line.level, entry.refusedLevel);
    return (options.event.empty() ||
            (!entry.message.eventID.empty() && entry.message.eventID.starts_with(options.event))) &&
           (options.module.empty() || entry.message.module == options.module) &&
           (!options.onlyRefused || entry.outcome == log::Outcome::Refused) &&
           (options.level.empty() || level >= log::LevelOf(options.level));
}

/// Prints entries. Of the entries that were in the log at the start, it prints only the last ones. It prints
/// all later entries.
class Tail {
public:
    Tail(const TailOptions& options, std::size_t before)
        : m_options(options), m_output(""), m_before(before), m_kept(options.lines           ? *options.lines
                                                                     : options.since.empty() ? LINES_UNASKED
                                                                                             : SIZE_MAX) {}

    void Take(const log::Entry& entry) {
        const bool isBefore = m_before > 0;
        m_before -= isBefore ? 1 : 0;
        if (IsWanted(entry, m_options))
            m_lines.push_back(
                (m_options.isJson ? log::JsonOf(entry) : log::TextOf(entry, terminal::Columns())) + '\n');
        if (isBefore && m_lines.size() > m_kept)
            m_lines.pop_front();
    }

    /// Whether Take has got all of the entries that were in the log at the start.
    bool HasAllOfBefore() const { return m_before == 0; }

    /// Nothing more of what was there at the start will come.
    void EndBefore() { m_before = 0; }

    void Print() {
        if (!HasAllOfBefore() && m_kept != SIZE_MAX)
            return;
        for (; !m_lines.empty(); m_lines.pop_front())
            m_output.Write(m_lines.front());
        m_output.Flush();
    }

private:
    const TailOptions& m_options;
    terminal::Result m_output;
    std::size_t m_before;
    std::size_t m_kept;
    std::deque<std::string> m_lines;
};

void TellComplaints(log::Stream& stream) {
    for (const auto& complaint : stream.TakeComplaints())
        fmt::print(stderr, "note: some outcomes stay unknown: {}\n", complaint);
}

int Follow(const TailOptions& options, log::Stream& stream) {
    terminal::Watch watch;
    Tail tail(options, stream.Begin());
    for (;;) {
        stream.Read();
        TellComplaints(stream);
        stream.TakeFinished([&](const log::Entry& entry) { tail.Take(entry); });
        if (stream.IsAtEnd())
            tail.EndBefore(); // a file may have been deleted since the count
        tail.Print();
        if (options.noFollow && tail.HasAllOfBefore())
            return 0;
        if (!watch.Wait(stream.HasMore() ? milliseconds(0) : LOOK_AGAIN))
            return 0;
    }
}

int RunTail(const TailOptions& options) {
    const auto directory = log::LogDirectory();
    const auto live = log::LiveFile(directory);
    const bool isSince = !options.since.empty();
    const auto since = isSince ? terminal::TimePoint(milliseconds(MillisecondsOf(options.since)))
                               : terminal::TimePoint::min();
    log::Stream stream(directory, isSince ? log::RotatedFilesSince(directory, since)
                                          : log::LastRotatedFiles(directory, ROTATED_FILES_UNASKED));
    stream.SetSince(since);
    if (const auto reason = log::ReasonAgainst(live); !reason.empty()) {
        fmt::print(stderr, "{}: {}: {}\n", options.noFollow ? "error" : "waiting for the log", live, reason);
        if (options.noFollow)
            return 1;
    }
    return Follow(options, stream);
}

} // namespace

void AddTail(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<TailOptions>();
    auto* command = app.add_subcommand(
        "tail", "Follow the log: what arrives, where it ends, and why something is refused.");
    command->add_option("--event", options->event, "Only events whose id begins with this");
    command->add_option("--module", options->module,
                        "Only this module: what stands before an event id's first bar");
    command->add_flag("--refused", options->onlyRefused, "Only what was refused");
    command->add_option("--level", options->level, "Only lines of this level or a higher one")
        ->check(CLI::IsMember({"DEBUG", "INFO", "WARN", "ERROR", "FATAL"}));
    command
        ->add_option("--since", options->since,
                     std::string("Begin with the lines of this time: ") + terminal::TIME_FORMS)
        ->check(IsTime());
    command
        ->add_option("--lines", options->lines,
                     "Begin with so many lines of before. Without it, 10, or all since --since")
        ->check(IsWholeNumber(0));
    command->add_flag("--json", options->isJson, "One JSON object a line");
    command->add_flag("--no-follow", options->noFollow, "End after the lines that are there");
    command->footer(HELP + app.get_footer());
    command->callback([options, &exitCode] { exitCode = RunTail(*options); });
}

} // namespace reportctl::commands
