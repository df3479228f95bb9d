#include <chrono>
#include <cstdlib>
#include <memory>
#include <string_view>

#include <CLI/CLI.hpp>
#include <fmt/format.h>
#include <unistd.h>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/status/Status.h"
#include "Tools/reportctl/terminal/Columns.h"
#include "Tools/reportctl/terminal/Result.h"
#include "Tools/reportctl/terminal/Watch.h"

namespace reportctl::commands {
namespace {

constexpr auto HELP = "Examples:\n"
                      "  reportctl status\n"
                      "  reportctl status --watch 5\n"
                      "  reportctl status --json | jq -r '.reasons[]'\n"
                      "\n"
                      "Exit codes: 0 healthy; 1 degraded; 2 down; 100 and above: the command line was not "
                      "understood.";

struct Options {
    bool isJson = false;
    bool isWatch = false;
    double seconds = 2;
};

/// Whether the output is a terminal that knows colours, and the user has not switched them off with NO_COLOR.
bool WantsColours() {
    // NOLINTBEGIN(concurrency-mt-unsafe): one thread
    const char* const noColour = std::getenv("NO_COLOR");
    const char* const terminal = std::getenv("TERM");
    // NOLINTEND(concurrency-mt-unsafe)
    return ::isatty(STDOUT_FILENO) == 1 && (noColour == nullptr || *noColour == '\0') &&
           terminal != nullptr && std::string_view(terminal) != "dumb";
}

status::View ViewHere() {
    return {WantsColours(), terminal::Columns()};
}

int ShowOnce(const Options& options) {
    const auto status = status::Gather();
    const auto judgement = Judge(status);
    fmt::print("{}", options.isJson ? JsonOf(status, judgement) : ScreenOf(status, judgement, ViewHere()));
    return static_cast<int>(judgement.verdict);
}

/// The text with the control sequences that draw it over the last screen. It starts at the top left, clears
/// the rest of each line and everything below. Clearing the whole screen first would make it flicker.
std::string InPlace(const std::string& text) {
    auto screen = terminal::FirstRows(text, terminal::Rows(), terminal::Columns());
    for (std::size_t at = 0; (at = screen.find('\n', at)) != std::string::npos; at += 4)
        screen.insert(at, "\x1b[K");
    return "\x1b[H" + screen + "\x1b[J";
}

/// Shows the status again and again, until a signal comes or the reader closes the pipe. From the second time
/// on, the current rates are those since the time before.
int Watch(const Options& options) {
    terminal::Watch watch;
    const auto pause =
        std::chrono::round<std::chrono::milliseconds>(std::chrono::duration<double>(options.seconds));
    const bool isTerminal = ::isatty(STDOUT_FILENO) == 1;
    terminal::Result output("");
    if (isTerminal)
        output.Write("\x1b[2J");
    ReportLedger::Look before;
    for (;;) {
        auto status = status::Gather();
        if (before.counting && status.ledger.counting)
            status.lastSecond =
                ledger::RatesBetween(before.total, status.ledger.total,
                                     std::chrono::milliseconds(status.ledger.atMs - before.atMs));
        before = status.ledger;
        const auto judgement = Judge(status);
        const auto text =
            options.isJson ? JsonOf(status, judgement) : ScreenOf(status, judgement, ViewHere());
        output.Write(isTerminal && !options.isJson ? InPlace(text) : text);
        output.Flush();
        if (!watch.Wait(pause))
            return 0;
    }
}

} // namespace

void AddStatus(CLI::App& app, int& exitCode) {
    auto* status = app.add_subcommand(
        "status",
        "Show whether the service is healthy: what runs, what it has counted, its store, outbox and log, and "
        "what to do about what is wrong. Changes no file. The exit code is 0 for healthy, 1 for degraded and "
        "2 "
        "for down.");
    auto options = std::make_shared<Options>();
    status->add_flag("--json", options->isJson, "Write one JSON object (docs/Status.md).");
    auto* const watch =
        status
            ->add_option("--watch", options->seconds,
                         "Show it again every SECONDS (2 unless given), until a signal ends it.")
            ->type_name("SECONDS")
            ->expected(0, 1)
            ->default_str(fmt::format("{}", options->seconds)) // else it is 0 when the number is left out
            ->check(CLI::Range(0.1, 86400.0));
    status->footer(HELP);
    status->callback([options, watch, &exitCode] {
        options->isWatch = watch->count() > 0;
        exitCode = options->isWatch ? Watch(*options) : ShowOnce(*options);
    });
}

} // namespace reportctl::commands
