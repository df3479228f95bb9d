#include "Tools/reportctl/commands/Commands.h"

#include <memory>

#include <CLI/CLI.hpp>

#include "Common/Constants.h"
#include "Tools/reportctl/setup/Setup.h"

namespace reportctl::commands {

void AddSetup(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<setup::SetupOptions>();
    options->preferencesDir = MAC_REG_PATH;
    auto* setup = app.add_subcommand(
        "setup",
        "Make what the service needs: its directories, and the store Report.db with its tables. Run as "
        "the user whose reports are to be stored. Running it again changes nothing.");
    auto* dryRun = setup->add_flag("--dry-run", options->dryRun, "Say what would be done and change nothing");
    setup->add_flag("--quiet", options->quiet, "Say only what goes wrong")->excludes(dryRun);
    setup->add_flag(
        "--compact", options->compact,
        "Rewrite a large store of an older set-up, so that its file can shrink when `prune` deletes rows. "
        "Stop the service first: it would wait. Takes the disk space of a second store meanwhile");
    const CLI::Validator notEmpty(
        [](const std::string& text) { return text.empty() ? "an empty text would have no effect" : ""; },
        "TEXT");
    setup->add_option("--open-id", options->openID, "Store the signed-in user's open id")->check(notEmpty);
    setup->add_option("--suite-version", options->suiteVersion, "Store the installed suite's version")
        ->check(notEmpty);
    setup
        ->add_option("--preferences-dir", options->preferencesDir,
                     "Another place for the pid file's directory. The service looks at " + MAC_REG_PATH +
                         " alone: this is for testing set-up itself")
        ->group("For tests");
    setup->footer("Examples:\n"
                  "  reportctl setup\n"
                  "  reportctl setup --dry-run\n"
                  "  reportctl setup --open-id u1 --suite-version 5.1.0.2\n"
                  "\n" +
                  app.get_footer());
    setup->callback([options, &exitCode] { exitCode = setup::RunSetup(*options); });
}

} // namespace reportctl::commands
