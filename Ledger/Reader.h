#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "Ledger/Counts.h"
#include "Ledger/Layout.h"

namespace ReportLedger {

/// What was found at the ledger's path. Only Sound means that there are counters to read.
enum class Sight {
    Sound,
    Missing,    ///< There is no file.
    Unreadable, ///< There is something that this user cannot read or that is no file.
    Unfinished, ///< The file is being made, or its making was interrupted.
    Damaged,
    OtherVersion, ///< The file has a layout that this program does not know.
};

struct MarkAt {
    std::int64_t atMs;
    Counts counts;
};

/// The ledger at one moment. Times are milliseconds since 1970, 0 for never.
struct Look {
    Sight sight = Sight::Missing; ///< The other members have a meaning only when this is Sound.
    std::int64_t atMs = 0;        ///< When this look was taken.
    /// Whether the process that counts is running. When it is not, LOST_AT_ENDS already includes what that
    /// process had not ended.
    bool counting = false;
    bool balanced = false;    ///< Whether what was received is all ended, waiting or lost.
    std::int64_t process = 0; ///< The id of the process that counts, or counted last.
    std::int64_t startedAtMs = 0;
    std::int64_t begunAtMs = 0; ///< When the file's counting began.
    Begun begun = Begun::NoFile;
    std::string programVersion;
    std::string buildId;
    Counts total{};
    Counts atStart{};
    Counts lastMs{};
    std::vector<MarkAt> marks;  ///< One each ten seconds, the oldest first.
    std::vector<MarkAt> recent; ///< One each second, the oldest first.
};

/// Reads the ledger's file; changes neither the file nor its times. While a process counts, the look is
/// repeated until it balances, because a report may just be counted in part. This takes some tens of
/// milliseconds at most.
Look LookAt(const std::string& path);

/// The same for counters in this process's memory.
Look LookAt(const File& content, bool counting, std::int64_t nowMs);

/// What the running process, or the last one, has counted itself. LOST_AT_ENDS is then 0, and MOST_WAITING is
/// that of this process alone.
Counts SinceStart(const Look& look);

} // namespace ReportLedger
