#include "Tools/reportctl/Setup.h"

#include <filesystem>
#include <memory>

#include <CLI/CLI.hpp>

#include "Common/Constants.h"
#include "SystemTool/CommonTool.h"
#include "Tools/reportctl/BaseInfo.h"
#include "Tools/reportctl/Directories.h"
#include "Tools/reportctl/PidFile.h"
#include "Tools/reportctl/Store.h"
#include "Tools/reportctl/Worklog.h"

namespace reportctl {
namespace {

void SetUpBaseInfo(Worklog& log, const std::string& store, const SetupOptions& options) {
    if (!options.openID.empty())
        EnsureBaseInfo(log, store, OPEN_ID_KEY, options.openID);
    if (!options.suiteVersion.empty())
        EnsureBaseInfo(log, store, SUITE_VERSION_KEY, options.suiteVersion);
}

void SetUpUserData(Worklog& log, const SetupOptions& options) {
    const auto data = SystemTool::CommonTool::GetUserDataDir();
    if (data.empty()) {
        log.Fail("This user has no home directory. Set HOME or XDG_DATA_HOME and run this again.");
        return;
    }
    const auto root = data + "/hublink";
    for (const auto* directory : {"", "/database", "/log", "/log/metrik"})
        EnsurePrivateDirectory(log, root + directory);
    const auto store = root + "/database/Report.db";
    if (EnsureStore(log, store))
        SetUpBaseInfo(log, store, options);
}

} // namespace

int RunSetup(const SetupOptions& options) {
    Worklog log(options.dryRun);
    const auto preferences = std::filesystem::absolute(options.preferencesDir).string();
    if (EnsureSharedDirectory(log, preferences))
        EnsurePidFile(log, preferences);
    SetUpUserData(log, options);
    return log.Close() ? 0 : 1;
}

void AddSetup(CLI::App& app, int& exitCode) {
    auto options = std::make_shared<SetupOptions>();
    options->preferencesDir = MAC_REG_PATH;
    auto* setup = app.add_subcommand(
        "setup",
        "Make what the service needs: its directories, and the store Report.db with its tables. Run as "
        "the user whose reports are to be stored. Running it again changes nothing.");
    setup->add_flag("--dry-run", options->dryRun, "Say what would be done and change nothing");
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
    setup->callback([options, &exitCode] { exitCode = RunSetup(*options); });
}

} // namespace reportctl
