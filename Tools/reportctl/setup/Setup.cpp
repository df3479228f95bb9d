#include "Tools/reportctl/setup/Setup.h"

#include <filesystem>

#include <fcntl.h>
#include <sys/file.h>

#include "Common/Paths.h"
#include "SystemTool/CommonTool.h"
#include "SystemTool/IO/Descriptor.h"
#include "Tools/reportctl/setup/Directories.h"
#include "Tools/reportctl/setup/HomeOwner.h"
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

/// Waits for the lock that lets only one set-up at a time make or change the store. A second set-up would
/// take the files beside the store for remains of a lost store. The lock is held as long as the result lives.
/// When there is no directory, as in a dry run, there is no lock.
SystemTool::IO::Descriptor WaitForTurn(const std::string& directory) {
    SystemTool::IO::Descriptor lock(::open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (lock.IsOpen())
        ::flock(lock.Number(), LOCK_EX); // fails on a file system without locks: set-up goes on without one
    return lock;
}

void SetUpUserData(terminal::Worklog& log, const SetupOptions& options) {
    const auto data = SystemTool::CommonTool::GetUserDataDir();
    if (data.empty()) {
        log.Fail("This user has no home directory. Set HOME or XDG_DATA_HOME and run this again.");
        return;
    }
    if (const auto reason = ReasonAgainstRoot(data)) {
        log.Fail(*reason);
        return;
    }
    for (const auto& directory :
         {Paths::Suite(data), Paths::Databases(data), Paths::Logs(data), Paths::ServiceLogs(data)})
        EnsurePrivateDirectory(log, directory);
    const auto turn = WaitForTurn(Paths::Databases(data));
    const auto store = Paths::Store(data);
    if (store::EnsureStore(log, store, options.compact))
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
