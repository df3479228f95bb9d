#include "Tools/reportctl/setup/Setup.h"

#include <filesystem>

#include "Common/Paths.h"
#include "SystemTool/CommonTool.h"
#include "Tools/reportctl/setup/Directories.h"
#include "Tools/reportctl/setup/PidFile.h"
#include "Tools/reportctl/store/BaseInfo.h"
#include "Tools/reportctl/store/Store.h"
#include "Tools/reportctl/terminal/Worklog.h"

namespace reportctl::setup {
namespace {

namespace Paths = SyncServiceReport::Paths;

void SetUpBaseInfo(terminal::Worklog& log, const std::string& store, const SetupOptions& options) {
    if (!options.openID.empty())
        store::EnsureBaseInfo(log, store, store::OPEN_ID_KEY, options.openID);
    if (!options.suiteVersion.empty())
        store::EnsureBaseInfo(log, store, store::SUITE_VERSION_KEY, options.suiteVersion);
}

void SetUpUserData(terminal::Worklog& log, const SetupOptions& options) {
    const auto data = SystemTool::CommonTool::GetUserDataDir();
    if (data.empty()) {
        log.Fail("This user has no home directory. Set HOME or XDG_DATA_HOME and run this again.");
        return;
    }
    for (const auto& directory :
         {Paths::Suite(data), Paths::Databases(data), Paths::Logs(data), Paths::ServiceLogs(data)})
        EnsurePrivateDirectory(log, directory);
    const auto store = Paths::Store(data);
    if (store::EnsureStore(log, store))
        SetUpBaseInfo(log, store, options);
}

} // namespace

int RunSetup(const SetupOptions& options) {
    terminal::Worklog log(options.dryRun, options.quiet);
    const auto preferences = std::filesystem::absolute(options.preferencesDir).string();
    if (EnsureSharedDirectory(log, preferences))
        EnsurePidFile(log, preferences);
    SetUpUserData(log, options);
    return log.Summarise() ? 0 : 1;
}

} // namespace reportctl::setup
