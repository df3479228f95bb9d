#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "Ledger/Layout.h"
#include "Ledger/MappedFile.h"
#include "Ledger/Outcome.h"

namespace ReportLedger {

/// Counts every report of the running service: that it was received, how it ended, and when.
///
/// Life: first counts in its own memory. Open switches to a file and goes on from the counts in it. Open also
/// counts as lost what the previous process had received and not ended.
///
/// Threads: Received, CouldNotFormat, Queued, CouldNotQueue, Dropped and Tick on the receiving thread; Ended
/// on the consuming thread; Open before both threads. Only one thread writes a counter, so that counting
/// needs no lock and no bus-locked instruction. The counter of Outcome::Exception is different: both threads
/// add to it, atomically. Readers of the file need no lock either.
///
/// Order: the counts are right at whichever instruction the process is killed. For that, a datagram is
/// counted as received before it is counted as anything else. Lost datagrams are not counted one by one:
/// their number is computed as what is missing.
///
/// Failure: when the file cannot be used, the counts stay in memory. The functions that count neither throw
/// nor wait.
class Writer {
public:
    Writer();

    /// Switches to the file in `directory` and goes on from its counts. To be called before anything is
    /// counted. False when the file cannot be used; the counts then stay in memory.
    bool Open(const std::string& directory, const std::string& programVersion, const std::string& buildId,
              std::int64_t nowMs);

    /// A datagram was taken from the socket; `atLimit` when it filled the receiver's buffer.
    void Received(std::size_t bytes, bool atLimit, std::int64_t nowMs) noexcept;

    /// The text of the datagram cannot be used as a format for the log.
    void CouldNotFormat() noexcept;

    /// The report is in the queue now.
    void Queued() noexcept;

    /// The report was lost before it was in the queue.
    void CouldNotQueue(std::int64_t nowMs) noexcept;

    /// A report from the queue has ended.
    void Ended(Outcome outcome, std::int64_t nowMs) noexcept;

    /// The kernel has dropped this many more datagrams.
    void Dropped(std::uint64_t datagrams, std::int64_t nowMs) noexcept;

    /// Writes the marks that are due, from which rates are computed. To be called about once a second at
    /// least.
    void Tick(std::int64_t nowMs) noexcept;

    /// All that has been counted.
    const File& Content() const { return *m_content; }

private:
    void BeginProcess(const std::string& programVersion, const std::string& buildId, std::int64_t nowMs);
    void CountWhatWasLost(std::int64_t nowMs);
    void NoteMostWaiting(std::uint64_t queued) noexcept;

    std::unique_ptr<File> m_memory;     ///< The counters while there is no file.
    std::unique_ptr<MappedFile> m_file; ///< Null while there is no file.
    File* m_content;

    std::uint64_t m_handledSeen = 0; ///< What HANDLED was when the receiving thread last looked.
};

} // namespace ReportLedger
