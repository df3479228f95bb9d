#include <chrono>
#include <exception>
#include <memory>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/page/Gather.h"
#include "Tools/reportctl/page/Page.h"
#include "Tools/reportctl/terminal/Result.h"
#include "Tools/reportctl/terminal/Watch.h"

namespace reportctl::commands {
namespace {

constexpr int SECONDS_BETWEEN_PAGES = 5;
constexpr int MOST_SECONDS = 24 * 3600;

constexpr auto HELP = "Examples:\n"
                      "  reportctl page reports.html && xdg-open reports.html\n"
                      "  reportctl page reports.html --watch 10            # writes it anew each 10 s; the "
                      "page reloads itself\n"
                      "\n"
                      "The file holds everything that it shows and asks nothing of any network. It has event "
                      "ids and log lines of this\n"
                      "machine in it, so it is readable by its owner alone (mode 0600).\n"
                      "\n";

struct PageOptions {
    std::string file;
    int watchSeconds = 0;
};

void WritePage(const PageOptions& options) {
    terminal::Result file(options.file);
    file.Write(page::ComposePage(page::Gather(options.watchSeconds), page::RandomNonce()));
    file.Finish();
}

int RunPage(const PageOptions& options) {
    WritePage(options);
    if (options.watchSeconds == 0)
        return 0;
    terminal::Watch watch;
    while (watch.Wait(std::chrono::seconds(options.watchSeconds)))
        WritePage(options);
    return 0;
}

} // namespace

void AddPage(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<PageOptions>();
    auto* command =
        app.add_subcommand("page", "Write a page to look at: is it healthy, where did the reports end, "
                                   "what was reported when. One file, which opens in any browser.");
    command->add_option("FILE", options->file, "The file to write, whole or not at all, mode 0600")
        ->required();
    command
        ->add_option("--watch", options->watchSeconds,
                     fmt::format("Write it anew each so many seconds, {} without a number, until Ctrl-C",
                                 SECONDS_BETWEEN_PAGES))
        ->expected(0, 1)
        ->default_str(std::to_string(SECONDS_BETWEEN_PAGES))
        ->check(CLI::Range(1, MOST_SECONDS));
    command->footer(HELP + app.get_footer());
    command->callback([options, &exitCode] { exitCode = RunPage(*options); });
}

} // namespace reportctl::commands
