#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>

namespace OrvekSqlite {

/// Bounds on the work and the memory of one statement. Any local program can put its text into a statement,
/// so there is a bound on everything that SQLite can be made to use.
struct Limits {
    /// The largest value, and the largest row. A report's datagram carries 10 KB, so this is a hundred times
    /// the longest text of a report.
    int valueBytes = 1'048'576;

    /// The longest text of one statement. It holds six values of a report, and leaves room for what another
    /// caller may write.
    int sqlBytes = 1'048'576;

    /// How deep an expression may nest: parsing needs stack for each level. The store's own statements have
    /// one level.
    int expressionDepth = 100;

    /// How many instructions a compiled statement may have. This bounds its memory. An INSERT of the store
    /// has 30.
    int instructions = 100'000;

    /// The longest pattern of a LIKE. Matching a pattern can take exponential time in the number of its
    /// wildcards.
    int likePatternBytes = 100;

    /// How deep triggers may start further triggers. Our table has none; a table that another program
    /// extended may have a few.
    int triggerDepth = 10;

    /// How many steps of the virtual machine an INSERT may take. Ours takes about 30. The bound leaves room
    /// for a thousand triggers, and is still reached within some 10 milliseconds.
    std::int64_t insertSteps = 1'000'000;

    /// How many steps any other statement may take. A whole pass over 5 million rows takes some 50 million.
    /// An endless statement is stopped after a second or two.
    std::int64_t statementSteps = 100'000'000;
};

/// When statements share a transaction, and for how long. When each statement has its own commit, the commit
/// takes three times as long as the statement.
struct GroupSettings {
    /// A statement that comes at least this long after the last one is alone, and is committed when ExecSql
    /// returns. So a person's click is stored at once, and only more than a hundred statements a second are a
    /// burst.
    std::chrono::milliseconds burstGap{10};

    /// How long a group stays open. A kill must lose no more than 10 milliseconds. Two of them are left for
    /// the committer to wake up and for the commit itself.
    std::chrono::milliseconds span{8};

    /// How many statements a group may have. From a hundred to ten thousand, the time for one statement is
    /// nearly the same, so this is small and surely enough.
    std::size_t statements = 1000;

    /// How many bytes of texts a group keeps until its commit, for running the statements again. A group
    /// exceeds this by one statement at most, so it has at most 5 MiB. Usual groups have 0.4 MB.
    std::size_t bytes = 4'194'304;

    /// How often a group that could not be committed is tried again. A person who has made room on the disk
    /// or ended a transaction does not notice a tenth of a second, and ten tries a second take hardly any
    /// time.
    std::chrono::milliseconds retry{100};

    /// The longest time for which the lock is left free for others after a group. Others get the lock for as
    /// long as the group had it. A group that was held up for seconds does not lead to a longer pause.
    std::chrono::milliseconds longestPause{10};

    /// How long Finish waits for an operation on another thread. A process that exits after a crash must end
    /// within a second, and the operation may never end.
    std::chrono::milliseconds exitWait{200};
};

/// How the database is opened.
struct Settings {
    /// How long a statement waits for another process's write lock before it fails. A backup or a person's
    /// open transaction of 10 seconds must not lose a row; 5 more seconds are the slack. A longer wait would
    /// only make the queue grow, because new reports are kept in memory meanwhile.
    std::chrono::milliseconds busyTimeout = std::chrono::seconds(15);

    /// A checkpoint cuts the write-ahead log back to this size. A reader that stayed for long may have made
    /// the log grow, and the disk space is the user's.
    std::int64_t journalBytes = 16'777'216;

    Limits limits;
    GroupSettings group;
};

} // namespace OrvekSqlite
