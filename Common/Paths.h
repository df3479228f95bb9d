#pragma once

#include <string>

/// Where the service keeps its files: below the user's data directory, and where the machine's users share
/// something. `userData` is what SystemTool::CommonTool::GetUserDataDir returns. These functions create
/// nothing.
namespace SyncServiceReport::Paths {

/// The directory that all users of the machine share: the suite's settings, and the pid file.
inline constexpr auto SHARED = "/Library/Preferences/hublink";

/// The service in the names of its log and of its pid file.
inline constexpr auto SERVICE = "Report";

inline std::string PidFileName(const std::string& service = SERVICE) {
    return service + ".pid";
}

/// The file that a running service locks. There is one for all users.
inline std::string PidFile(const std::string& directory = SHARED, const std::string& service = SERVICE) {
    return directory + "/" + PidFileName(service);
}

/// The directory of all files of the suite.
inline std::string Suite(const std::string& userData) {
    return userData + "/hublink";
}

/// The databases: the store, and the analytics outbox of each module that names no other directory.
inline std::string Databases(const std::string& userData) {
    return Suite(userData) + "/database";
}

/// The file of the local store.
inline std::string Store(const std::string& userData) {
    return Databases(userData) + "/Report.db";
}

/// The suite's logs.
inline std::string Logs(const std::string& userData) {
    return Suite(userData) + "/log";
}

/// The service's own log, "Report.log", and its rotated files.
inline std::string ServiceLogs(const std::string& userData) {
    return Logs(userData) + "/metrik";
}

/// The directory of the running service's own files: its ledger.
inline std::string Run(const std::string& userData) {
    return Suite(userData) + "/run";
}

/// How far `reportctl forward` has sent the store.
inline std::string Forward(const std::string& userData) {
    return Suite(userData) + "/forward/Forward.db";
}

} // namespace SyncServiceReport::Paths
