#include "Tools/reportctl/store/Paths.h"

#include "Common/Paths.h"
#include "SystemTool/CommonTool.h"

namespace reportctl::store {

namespace Paths = SyncServiceReport::Paths;

std::string StorePath() {
    return Paths::Store(SystemTool::CommonTool::GetUserDataDir());
}

std::string OutboxPath() {
    return Paths::Databases(SystemTool::CommonTool::GetUserDataDir()) + "/MetrikOutbox.db";
}

} // namespace reportctl::store
