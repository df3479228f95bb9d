#include <algorithm>
#include <memory>
#include <optional>
#include <string>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Tools/reportctl/commands/Commands.h"
#include "Tools/reportctl/commands/FilterOptions.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/store/Prune.h"
#include "Tools/reportctl/store/Store.h"
#include "Tools/reportctl/terminal/Progress.h"
#include "Tools/reportctl/terminal/TimeArgument.h"

namespace reportctl::commands {
namespace {

constexpr double MIB = 1024.0 * 1024.0;
constexpr std::int64_t LARGEST_MIB = 1'000'000'000;

constexpr auto HELP = "Examples:\n"
                      "  reportctl prune --older-than 90d                  # says what would go\n"
                      "  reportctl prune --older-than 90d --yes\n"
                      "  reportctl prune --keep-rows 1000000 --yes\n"
                      "  reportctl prune --keep-mib 200 --yes\n"
                      "\n"
                      "The service goes on storing meanwhile: rows are deleted in short transactions, and "
                      "the space is given back in\n"
                      "others. By age, a row whose createTime is no number stays. What is deleted is gone: "
                      "`reportctl export` or\n"
                      "`reportctl backup` first keeps it.\n"
                      "\n";

struct PruneOptions {
    std::string olderThan;
    std::optional<std::int64_t> keepRows;
    std::optional<std::int64_t> keepMib;
    bool isAllowed = false;
};

store::PruneRule RuleOf(const PruneOptions& options) {
    store::PruneRule rule;
    if (!options.olderThan.empty())
        rule.olderThanMs = MillisecondsOf(options.olderThan);
    rule.keepRows = options.keepRows;
    if (options.keepMib)
        rule.keepBytes = *options.keepMib * static_cast<std::int64_t>(MIB);
    return rule;
}

void TellPlan(const store::PrunePlan& plan, const PruneOptions& options) {
    fmt::print("Would delete {}{} of {} rows of {}.\n", options.keepMib && plan.removed > 0 ? "about " : "",
               plan.removed, plan.rows, store::StorePath());
    if (plan.removed > 0)
        fmt::print("Nothing was deleted. To delete them, give --yes.\n");
}

void TellResult(const store::PruneResult& result, const store::PrunePlan& plan) {
    fmt::print("Deleted {} of {} rows. Freed {:.1f} MiB: {} went from {:.1f} to {:.1f} MiB.\n",
               result.removed, plan.rows,
               double(std::max<std::int64_t>(result.bytesBefore - result.bytesAfter, 0)) / MIB,
               store::StorePath(), double(result.bytesBefore) / MIB, double(result.bytesAfter) / MIB);
    if (!result.canShrink && result.removed > 0)
        fmt::print("The file keeps its size, and the rows to come use the space: it was made by an older "
                   "set-up. To have "
                   "it shrink, stop the service and run `reportctl setup --compact` once.\n");
}

void RequireRule(const PruneOptions& options) {
    if (options.olderThan.empty() && !options.keepRows && !options.keepMib)
        throw CLI::RequiredError("Say what may go: --older-than, --keep-rows or --keep-mib",
                                 CLI::ExitCodes::RequiredError);
}

store::PruneResult Delete(SQLite::Database& database, const store::PruneRule& rule,
                          const store::PrunePlan& plan) {
    terminal::Progress progress("deleting");
    return store::Prune(database, rule, plan, {},
                        [&](std::int64_t done, std::int64_t total) { progress.Show(done, total); });
}

void Prune(const PruneOptions& options) {
    const auto rule = RuleOf(options);
    auto database = (options.isAllowed ? store::OpenStore : store::OpenToRead)(store::StorePath());
    const auto plan = store::PlanPrune(database, rule);
    if (options.isAllowed)
        TellResult(Delete(database, rule, plan), plan);
    else
        TellPlan(plan, options);
}

int RunPrune(const PruneOptions& options) {
    RequireRule(options);
    store::Naming(store::StorePath(), [&] { Prune(options); });
    return 0;
}

} // namespace

void AddPrune(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<PruneOptions>();
    auto* command = app.add_subcommand(
        "prune", "Delete old rows of the store and give their space back, while the "
                 "service goes on. It says what would go, and deletes it when you say yes.");
    auto* age =
        command->add_option("--older-than", options->olderThan,
                            std::string("Delete rows from before this time: ") + terminal::TIME_FORMS);
    age->check(IsTime());
    auto* rows =
        command->add_option("--keep-rows", options->keepRows, "Delete all rows but the newest so many");
    rows->check(IsWholeNumber(0))->excludes(age);
    command
        ->add_option("--keep-mib", options->keepMib,
                     "Delete the oldest rows, until the others fit into so many MiB")
        ->check(CLI::Range(std::int64_t{0}, LARGEST_MIB))
        ->excludes(age)
        ->excludes(rows);
    command->add_flag("--yes", options->isAllowed, "Delete");
    command->footer(HELP + app.get_footer());
    command->callback([options, &exitCode] { exitCode = RunPrune(*options); });
}

} // namespace reportctl::commands
