#include <iostream>

#include <Poco/Event.h>
#include <Poco/SharedPtr.h>

#include "App/MiniDump.h"
#include "App/ReportServer.h"
#include "Common/Common.h"
#include "SystemTool/BSException.h"
#include "SystemTool/IO/StandardDescriptors.h"
#include "SystemTool/Platform.h"
#include "SystemTool/Version.h"

using namespace SyncServiceReport;

namespace {

constexpr std::int64_t LOG_FILE_BYTES = 10485760;   // 10 MiB, then the file is rotated
constexpr std::int64_t LOG_TOTAL_BYTES = 104857600; // 100 MiB, then the oldest rotated file is deleted
constexpr int FLUSH_EACH_RECORD = 1;
constexpr int COPY_TO_CONSOLE = 0;

/// Opens the log for the whole process. When that fails, only the log is missing; the service runs.
void ConfigureLog() {
    if (pSysLog == nullptr)
        return;
    try {
        pSysLog->InitLog(APP_LOG_DIR_PATH, "Report.log", "QUILLON", "APP", LOG_FILE_BYTES, LOG_TOTAL_BYTES,
                         FLUSH_EACH_RECORD, COPY_TO_CONSOLE);
    } catch (const SystemTool::BSException& error) {
        std::cout << "Error:" << error.ErrorMsg() << std::endl;
    }
}

/// Called after the instance check, so that a refused second instance does not touch the first one's
/// counters. When the file cannot be used, the ledger counts in memory only.
void OpenLedger(ReportLedger::Writer& ledger) {
    ledger.Open(Paths::Run(SystemTool::CommonTool::GetUserDataDir()), SystemTool::Version::Number(),
                SystemTool::Version::BuildId(), SystemTool::Platform::CoarseTimeMs());
}

} // namespace

int main() {
    SystemTool::IO::OpenClosedStandardDescriptors();
    // The log is opened before the instance check, so that a refused second instance can write its line into
    // the shared log.
    ConfigureLog();
    MiniDump::EnableAutoStack(APP_LOG_DIR_PATH, Paths::SERVICE);
    if (MiniDump::IsAlreadyRun()) {
        WriteLog({LogLevel::Info, "main", 14}, "Process is already running");
        return 1;
    }
    Poco::Event stopEvent(Poco::Event::EVENT_AUTORESET);
    Poco::SharedPtr<ReportServer> server(new ReportServer);
    OpenLedger(server->Ledger());
    server->Start(); // a failed start has been logged, and the parts that run are kept
    // The service mostly waits from here on. It need not keep the code in memory that only the start needed.
    SystemTool::Platform::LetGoOfCode();
    stopEvent.wait(); // for ever: the service ends by a signal
    return 0;
}
