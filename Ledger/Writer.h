#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

#include "Ledger/Layout.h"
#include "Ledger/MappedFile.h"
#include "Ledger/Outcome.h"

namespace ReportLedger {

/// Counts every report of the running service: where it came from, where it ended, and when.
///
/// Life: counts in memory of its own from the beginning; Open moves it to a file, whose counts it goes on
/// with. What a process had received and not ended when it ended, the next one's Open counts as lost.
///
/// Threads: Received, CouldNotFormat, Queued, CouldNotQueue, Dropped and Tick on the receiving thread; Ended
/// on the consuming thread; Open before both. Each counter is written by one thread only (a report's end as
/// an exception is not, and is added atomically), so that counting costs no lock and no bus-locked
/// instruction. Readers of the file need no lock either.
///
/// Order, which keeps the books true at whichever instruction the process is killed: a datagram is counted as
/// received before it is counted as anything else, and what is lost is not counted but computed, as what is
/// missing.
///
/// Failure: a file that cannot be had costs the file. Nothing throws once the object is made, and nothing
/// waits.
class Writer {
public:
    Writer();

    /// Goes on in the file of `directory`, before anything is counted. False when that cannot be had; the
    /// counts then stay in memory.
    bool Open(const std::string& directory, const std::string& programVersion, const std::string& buildId,
              std::int64_t nowMs);

    /// A datagram was taken from the socket; `atLimit` when it filled the receiver's buffer.
    void Received(std::size_t bytes, bool atLimit, std::int64_t nowMs) noexcept;

    /// Its text is no format for the log.
    void CouldNotFormat() noexcept;

    /// It is in the queue now.
    void Queued() noexcept;

    /// It did not come that far.
    void CouldNotQueue(std::int64_t nowMs) noexcept;

    /// A report from the queue has ended.
    void Ended(Outcome outcome, std::int64_t nowMs) noexcept;

    /// The kernel has dropped so many datagrams more.
    void Dropped(std::uint64_t datagrams, std::int64_t nowMs) noexcept;

    /// Keeps the marks, from which rates are computed; to be called at least once a second or so.
    void Tick(std::int64_t nowMs) noexcept;

    /// What has been counted.
    const File& Content() const { return *m_content; }

private:
    void BeginProcess(const std::string& programVersion, const std::string& buildId, std::int64_t nowMs);
    void CountWhatWasLost(std::int64_t nowMs);
    void NoteMostWaiting(std::uint64_t queued) noexcept;

    std::unique_ptr<File> m_memory;     ///< Without a file.
    std::unique_ptr<MappedFile> m_file; ///< Else empty.
    File* m_content;

    std::uint64_t m_handledSeen = 0; ///< What HANDLED was when the receiving thread last looked.
};

} // namespace ReportLedger
