#pragma once

#include <string>

#include "Common/Paths.h"
#include "SystemTool/CommonTool.h"
#include "SystemTool/IO/Directory.h"

// Each source file has its own copy, for the same reason as in Constants.h.
namespace SyncServiceReport {

/// The directory of "Report.log".
static const std::string APP_LOG_DIR_PATH = Paths::ServiceLogs(SystemTool::CommonTool::GetUserDataDir());

/// The directory of the executable and its plug-ins, ending in a separator. The suite's programs share the
/// misspelling.
static const std::string ORVEK_EXCUTABLE_PATH = SystemTool::IO::Directory::GetExcutableDirectory();

/// Where reports are received: loopback only, deliberately.
static const std::string UDP_SERVER_IP = "127.0.0.1";

/// The analytics module that exists from the start.
static const std::string DEFAULT_MODULE_ID = "A759";
static const std::string DEFAULT_MODULE_VERSION = "1";
static const std::string DEFAULT_MODULE_NAME = "default";

/// The kinds of control message.
static const std::string ORVEK_REPORT_MODULEINIT = "init";
static const std::string ORVEK_REPORT_UPDATEOPENID = "updateOpenID";

} // namespace SyncServiceReport
