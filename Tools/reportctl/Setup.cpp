#include "Tools/reportctl/Setup.h"

#include <filesystem>
#include <memory>

#include <CLI/CLI.hpp>
#include <fmt/format.h>

#include "Common/Constants.h"
#include "SystemTool/CommonTool.h"
#include "Tools/reportctl/Directories.h"
#include "Tools/reportctl/Store.h"
#include "Tools/reportctl/Worklog.h"

namespace reportctl {
namespace {

/// The keys that the service looks for, to the letter.
constexpr auto OPEN_ID_KEY = "OpenID";
constexpr auto SUITE_VERSION_KEY = "HubLinkVersion";

/// The service puts both texts into its statements without escaping them, and the database then refuses every
/// report. What the suite uses as an id is its own affair, so this is no error here.
void WarnOfQuotes(Worklog& log, const std::string& text) {
    if (text.find('\'') != std::string::npos)
        log.Warn(fmt::format("\"{}\" holds a single quote: the service will not be able to store any report "
                             "while it is set",
                             text));
}

void SetUpBaseInfo(Worklog& log, const std::string& store, const char* key, const std::string& value) {
    if (value.empty())
        return;
    WarnOfQuotes(log, value);
    EnsureBaseInfo(log, store, key, value);
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
    if (!EnsureStore(log, store))
        return;
    SetUpBaseInfo(log, store, OPEN_ID_KEY, options.openID);
    SetUpBaseInfo(log, store, SUITE_VERSION_KEY, options.suiteVersion);
}

} // namespace

int RunSetup(const SetupOptions& options) {
    Worklog log(options.dryRun);
    EnsureSharedDirectory(log, std::filesystem::absolute(options.preferencesDir).string());
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
