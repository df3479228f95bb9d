#pragma once

#include <cstdint>
#include <string>

namespace SyncServiceReport {

/// One event report, parsed. A plain value.
struct ST_OptLog {
    std::int32_t nReserved = 0; ///< Kept at 0; nothing reads it.
    std::string eventID;        ///< As the sender wrote it; one bar stands between a module and an event.
    std::string value;          ///< Plain text, or the JSON text of an object.
    std::string createTime;     ///< Decimal milliseconds since the Unix epoch, as text.
    std::int32_t pType = 1;     ///< 0 when eventID holds exactly one bar, else 1.
    bool isDayReport = false;
};

/// What a module announces itself with. An aggregate without defaults.
struct ST_InitMsg {
    std::string moduleID;
    std::string moduleVersion;
    std::string moduleName;
    std::string logPath;
    std::string dbPath;
    std::string openID;
    std::string hublinkVersion;
};

/// What accompanies every report: facts about the user and the machine. The defaults matter: a caller who
/// fills one field of a fresh record and hands it to ReportServer::SetBaseInfo passes the other field's
/// default on.
struct ST_BaseInfo {
    std::string userDataDir;              ///< The root of the suite's log and database folders.
    std::string openID = "visitor";       ///< The signed-in user; "visitor" when no user is.
    std::string suiteVersion = "3.0.0.0"; ///< The installed suite's version.
    std::string osVersion;                ///< The operating system with its version, for people.
};

} // namespace SyncServiceReport
