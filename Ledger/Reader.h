#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "Ledger/Counts.h"
#include "Ledger/Layout.h"

namespace ReportLedger {

/// Why there is nothing to see.
enum class Sight {
    Sound,
    Missing,    ///< There is no file.
    Unreadable, ///< There is something that this user cannot read, or that is no file.
    Unfinished, ///< The file is being made, or its making was cut short.
    Damaged,
    OtherVersion, ///< Of a layout that this program does not know.
};

struct MarkAt {
    std::int64_t atMs;
    Counts counts;
};

/// The ledger at a moment. Times are milliseconds since 1970, 0 for never.
struct Look {
    Sight sight = Sight::Missing; ///< The rest means something when this is Sound.
    std::int64_t atMs = 0;        ///< When it was taken.
    bool counting =
        false; ///< The process that counts lives. Else what it had not ended is in LOST_AT_ENDS already.
    bool balanced = false;    ///< Received is what ended, waits and was lost.
    std::int64_t process = 0; ///< That counts, or counted last.
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

/// Looks at the file, without changing it or its times. Beside a process that counts it takes some
/// milliseconds at the most: a look that does not balance is repeated, because a report may just be half
/// counted.
Look LookAt(const std::string& path);

/// The same at counters in this process's memory.
Look LookAt(const File& content, bool counting, std::int64_t nowMs);

/// What the running process, or the last one, has counted itself: LOST_AT_ENDS is 0, and MOST_WAITING its
/// own.
Counts SinceStart(const Look& look);

} // namespace ReportLedger
