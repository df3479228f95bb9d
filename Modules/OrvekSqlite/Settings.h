#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>

namespace OrvekSqlite {

/// Bounds on the work and the memory of one statement. Any local program can put its text into a statement,
/// so there is a bound on everything that SQLite can be made to use.
struct Limits {
    /// One value, and one row. A report's datagram carries 10 KB, so that the longest text of it fits a
    /// hundred times.
    int valueBytes = 1'048'576;

    /// One statement's text: six values of a report, and room for what another caller may write.
    int sqlBytes = 1'048'576;

    /// How deep an expression may nest. The store's own statements nest one deep; parsing needs stack for
    /// each.
    int expressionDepth = 100;

    /// Instructions of a compiled statement, a bound on its memory. An insert of the store compiles to 30.
    int instructions = 100'000;

    /// Length of a LIKE pattern; matching one can take exponential time in the number of its wildcards.
    int likePatternBytes = 100;

    /// Triggers within triggers. Ours has none; a table that another program extended may have a few.
    int triggerDepth = 10;

    /// Steps of the virtual machine for an INSERT, which takes about 30; with a thousand triggers' worth of
    /// slack that is still some 10 milliseconds.
    std::int64_t insertSteps = 1'000'000;

    /// Steps for any other statement. A whole pass over 5 million rows takes some 50 million; an
    /// endless one ends after a second or two.
    std::int64_t statementSteps = 100'000'000;
};

/// When statements share a transaction, and for how long. A commit of its own costs a statement three times
/// what the statement does.
struct GroupSettings {
    /// A statement that comes after this long without one is alone, and committed when it returns. So a
    /// person's click is as safe as ever, and more than a hundred statements a second are a burst.
    std::chrono::milliseconds burstGap{10};

    /// How long a group stays open. What a kill may cost is 10 milliseconds; two of them are left for the
    /// committer to wake up and for the commit itself.
    std::chrono::milliseconds span{8};

    /// Statements in a group. From a hundred to ten thousand the cost of one is nearly the same, so the least
    /// that is surely enough.
    std::size_t statements = 1000;

    /// Bytes of the texts that are kept until the commit, for running them again. A group passes it by one
    /// statement at most, so that with the longest statement it is 5 MiB. Usual groups have 0.4 MB.
    std::size_t bytes = 4'194'304;

    /// How often a group that could not be committed is tried again. When a person has made room on the disk
    /// or ended a transaction, he does not notice a tenth of a second, and ten tries a second cost nothing.
    std::chrono::milliseconds retry{100};

    /// The longest that the lock is left free for others after a group. They get as long as the group had it;
    /// a group that was held up for seconds need not be made up for.
    std::chrono::milliseconds longestPause{10};

    /// How long the object's end waits for an operation on another thread. A process that exits after a crash
    /// must be gone within a second, and the operation may be one that never ends.
    std::chrono::milliseconds exitWait{200};
};

/// How the database is opened.
struct Settings {
    /// How long a statement waits for another process's write lock before it fails. A backup or a person's
    /// open transaction of 10 seconds must not lose a row, and half as much again is the slack. To wait
    /// longer would only make the queue grow: new reports are kept in memory meanwhile.
    std::chrono::milliseconds busyTimeout = std::chrono::seconds(15);

    /// The write-ahead log is cut back to this after a checkpoint. A reader that stayed for long may have let
    /// it grow; the disk space is the user's.
    std::int64_t journalBytes = 16'777'216;

    Limits limits;
    GroupSettings group;
};

} // namespace OrvekSqlite
