#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/outbox/CollectorTest.h"
#include "Tools/reportctl/outbox/Database.h"
#include "Tools/reportctl/outbox/DeadLetters.h"
#include "Tools/reportctl/outbox/Events.h"
#include "Tools/reportctl/service/Environment.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/store/Store.h"
#include "Tools/reportctl/terminal/Json.h"
#include "Tools/reportctl/terminal/Printable.h"
#include "Tools/reportctl/terminal/Quantity.h"
#include "Tools/reportctl/terminal/Result.h"
#include "Tools/reportctl/terminal/WrittenTime.h"

namespace reportctl::commands {
namespace {

using outbox::Event;
using outbox::Where;

constexpr auto HELP =
    "Examples:\n"
    "  reportctl outbox list --dead\n"
    "  reportctl outbox retry --all\n"
    "  reportctl outbox test\n"
    "\n"
    "An event waits until the collector has taken it; one that the collector refuses for good becomes a dead "
    "letter.\n"
    "All of this may be done while the service runs. It notices what is put back within a minute, unless it "
    "waits "
    "for a\n"
    "collector that is away or refuses everything; then within five.\n"
    "\n";

struct OutboxOptions {
    std::string path;
    bool onlyDead = false;
    bool isJson = false;
    bool all = false;
    std::vector<std::string> ids;
};

std::string JsonOf(const Event& event) {
    terminal::JsonObject json;
    json.Add("id", event.uuid);
    json.Add("module", event.module);
    json.Add("sequence", event.sequence);
    json.Add("eventID", event.eventID);
    json.Add("storedAt", terminal::ZonedTime(terminal::At(event.storedMs)));
    json.Add("bytes", event.bytes);
    json.Add("state", event.isDead ? "dead" : "waiting");
    if (event.isDead) {
        json.Add("status", event.status);
        json.Add("reason", event.reason);
    } else {
        json.AddNull("status");
        json.AddNull("reason");
    }
    return json.Take();
}

std::string TextOf(const Event& event) {
    auto text = fmt::format("{}  {:<7}  {}  {:>9}  {}", event.uuid, event.isDead ? "dead" : "waiting",
                            terminal::LocalTime(terminal::At(event.storedMs)),
                            terminal::Bytes(static_cast<std::uint64_t>(event.bytes)),
                            terminal::Printable(event.eventID));
    if (event.isDead)
        text += fmt::format("  -> {}: {}", event.status, terminal::Printable(event.reason));
    return text;
}

/// Whether the service has not made its outbox yet. A file that --file names must exist, and so must the
/// directory of the databases: without it, set-up has not run, or the data directory is another one.
bool IsNotMadeYet(const std::string& path) {
    std::error_code error;
    return path == store::OutboxPath() && !std::filesystem::exists(path, error) && !error &&
           std::filesystem::is_directory(std::filesystem::path(path).parent_path(), error);
}

void List(const OutboxOptions& options) {
    terminal::Result output("");
    if (IsNotMadeYet(options.path)) {
        output.Write(options.isJson
                         ? "[]\n"
                         : "nothing waits, and there are no dead letters: there is no outbox yet\n");
        output.Finish();
        return;
    }
    auto database = outbox::OpenToLook(options.path);
    std::int64_t count = 0;
    const auto print = [&](const Event& event) {
        if (options.isJson)
            output.Write((count == 0 ? "[" : ",\n") + JsonOf(event));
        else
            output.Write(TextOf(event) + "\n");
        ++count;
    };
    database.exec("begin"); // reads both tables as of one moment, so that each event is listed once
    if (!options.onlyDead)
        outbox::ForEach(database, Where::Waiting, 0, print);
    outbox::ForEach(database, Where::Dead, 0, print);
    database.exec("commit");
    if (options.isJson)
        output.Write(count == 0 ? "[]\n" : "]\n");
    else if (count == 0)
        output.Write(options.onlyDead ? "no dead letters\n"
                                      : "nothing waits, and there are no dead letters\n");
    output.Finish();
}

int Retry(const OutboxOptions& options) {
    auto database = outbox::OpenToChange(options.path);
    if (options.all) {
        fmt::print("{} put back\n", outbox::RetryAll(database));
        return 0;
    }
    const auto retried = outbox::Retry(database, options.ids);
    fmt::print("{} put back\n", retried.events);
    for (const auto& id : retried.unknown)
        fmt::print(stderr, "error: no dead letter has the id {}\n", terminal::Printable(id));
    return retried.unknown.empty() ? 0 : 1;
}

int Purge(const OutboxOptions& options) {
    auto database = outbox::OpenToChange(options.path);
    fmt::print("{} deleted\n", outbox::Purge(database));
    return 0;
}

void AddExamples(CLI::App& command, const std::string& examples) {
    command.footer("Examples:\n" + examples + "\n" + command.get_footer());
}

void AddList(CLI::App& outbox, const std::shared_ptr<OutboxOptions>& options, int& exitCode) {
    auto* list =
        outbox.add_subcommand("list", "List the events that wait and the dead letters, oldest first")
            ->fallthrough();
    list->add_flag("--dead", options->onlyDead, "Only dead letters");
    list->add_flag("--json", options->isJson, "A JSON array");
    AddExamples(*list, "  reportctl outbox list\n"
                       "  reportctl outbox list --dead --json | jq -r '.[].reason'\n");
    list->callback([options, &exitCode] {
        store::Naming(options->path, [&] { List(*options); });
        exitCode = 0;
    });
}

void AddRetry(CLI::App& outbox, const std::shared_ptr<OutboxOptions>& options, int& exitCode) {
    auto* retry =
        outbox.add_subcommand("retry", "Put dead letters back, to be sent again under their old ids")
            ->fallthrough();
    auto* all = retry->add_flag("--all", options->all, "All of them");
    retry->add_option("ID", options->ids, "The ids, as `list` shows them")->excludes(all);
    AddExamples(*retry, "  reportctl outbox retry --all\n"
                        "  reportctl outbox retry 0190b6a3-02b4-7a10-8f64-31f6c0a5d9e7\n");
    retry->callback([options, &exitCode] {
        if (!options->all && options->ids.empty())
            throw CLI::RequiredError("Say which: --all, or ids", CLI::ExitCodes::RequiredError);
        exitCode = store::Naming(options->path, [&] { return Retry(*options); });
    });
}

void AddTest(CLI::App& outbox, int& exitCode) {
    auto* test =
        outbox.add_subcommand("test", "Send one marked test event to the collector that the running service "
                                      "uses, and tell what it answers");
    AddExamples(*test, "  reportctl outbox test\n");
    test->callback([&exitCode] { exitCode = outbox::TestCollector(service::OfTheService()) ? 0 : 1; });
}

void AddPurge(CLI::App& outbox, const std::shared_ptr<OutboxOptions>& options, int& exitCode) {
    auto* purge = outbox.add_subcommand("purge", "Delete dead letters")->fallthrough();
    purge->add_flag("--dead", options->onlyDead, "All dead letters; there is nothing else to delete")
        ->required();
    AddExamples(*purge, "  reportctl outbox purge --dead\n");
    purge->callback(
        [options, &exitCode] { exitCode = store::Naming(options->path, [&] { return Purge(*options); }); });
}

} // namespace

void AddOutbox(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<OutboxOptions>();
    options->path = store::OutboxPath();
    auto* outbox = app.add_subcommand(
        "outbox", "Look at the events for analytics, send the refused ones again, test the collector.");
    outbox->require_subcommand(1);
    outbox->add_option("--file", options->path,
                       "Another MetrikOutbox.db: that of a module with a directory of its own");
    AddList(*outbox, options, exitCode);
    AddRetry(*outbox, options, exitCode);
    AddTest(*outbox, exitCode);
    AddPurge(*outbox, options, exitCode);
    outbox->footer(HELP + app.get_footer());
}

} // namespace reportctl::commands
