#pragma once

#include <cstdint>
#include <string>

namespace SyncServiceReport {

/// One event report, parsed. A plain value.
struct ST_OptLog {
    std::int32_t nReserved = 0; ///< Kept at 0; nothing reads it.
    std::string eventID;        ///< As the sender wrote it; a bar separates the module from the event.
    std::string value;          ///< Plain text, or the JSON text of an object.
    std::string createTime;     ///< Decimal milliseconds since the Unix epoch, as text.
    std::int32_t pType = 1;     ///< 0 when eventID holds exactly one bar, else 1.
    bool isDayReport = false;
};

/// The content of a module's announcement. An aggregate without defaults.
struct ST_InitMsg {
    std::string moduleID;
    std::string moduleVersion;
    std::string moduleName;
    std::string logPath;
    std::string dbPath;
    std::string openID;
    std::string hublinkVersion;
};

/// The facts about the user and the machine that accompany every report. The defaults matter: a caller who
/// fills in one member of a fresh record and gives it to ReportServer::SetBaseInfo passes on the default of
/// the other member.
struct ST_BaseInfo {
    std::string userDataDir;              ///< The root of the suite's log and database folders.
    std::string openID = "visitor";       ///< The signed-in user; "visitor" when no user is.
    std::string suiteVersion = "3.0.0.0"; ///< The installed suite's version.
    std::string osVersion;                ///< Name and version of the operating system, in words for people.
};

} // namespace SyncServiceReport
