#include "Tools/reportctl/store/Paths.h"

#include "Common/Paths.h"
#include "Ledger/Layout.h"
#include "SystemTool/CommonTool.h"

namespace reportctl::store {

namespace Paths = SyncServiceReport::Paths;

std::string StorePath() {
    return Paths::Store(SystemTool::CommonTool::GetUserDataDir());
}

std::string OutboxPath() {
    return Paths::Databases(SystemTool::CommonTool::GetUserDataDir()) + "/" + OUTBOX_FILE;
}

std::string LedgerPath() {
    return Paths::Run(SystemTool::CommonTool::GetUserDataDir()) + "/" + ReportLedger::FILE_NAME;
}

std::string ForwardPath() {
    return Paths::Forward(SystemTool::CommonTool::GetUserDataDir());
}

} // namespace reportctl::store
