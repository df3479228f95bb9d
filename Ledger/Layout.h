#pragma once

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>

#include "Ledger/Outcome.h"

/// The ledger's file, byte for byte; docs/Ledger.md describes it for other readers. All numbers are in the
/// machine's own byte order, because the file stays on its machine.
///
/// Every field that changes while the service runs is an atomic word of eight bytes. One thread writes a
/// counter, and the counters of each thread have their own cache lines. So to count takes one load and one
/// store, and no thread waits for another.
namespace ReportLedger {

inline constexpr std::array<char, 8> MAGIC = {'H', 'L', 'L', 'E', 'D', 'G', 'E', 'R'};
inline constexpr std::uint32_t VERSION = 1;

using Word = std::atomic<std::uint64_t>;
static_assert(Word::is_always_lock_free && sizeof(Word) == 8, "a file has plain words only");

/// The places of the counters. Outcome has the places of the counters of how reports ended.
enum Counter : unsigned {
    // Written by the receiving thread:
    RECEIVED = 0,   ///< Datagrams.
    RECEIVED_BYTES, ///< The bytes of all datagrams.
    EMPTY,          ///< Datagrams without any byte, which are ignored.
    AT_SIZE_LIMIT,  ///< Datagrams as long as the receiver's buffer: longer ones were cut.
    UNFORMATTABLE,  ///< Texts that cannot be used as a format for the log.
    QUEUED,         ///< Reports that were put into the queue.
    RECEIVING,      ///< 1 while the receiving thread has a report that is not in the queue yet.
    // Written by the consuming thread (8 to 19 are the places of Outcome):
    HANDLED = 20, ///< Reports that were taken from the queue and have ended.
    // Changed seldom:
    DROPPED_BY_KERNEL = 24,
    LOST_AT_ENDS,             ///< Datagrams that had not ended when their process ended.
    MOST_WAITING,             ///< The largest number of reports that ever waited.
    MOST_WAITING_SINCE_START, ///< The largest number since the process was started.
    COUNTERS = 32,
};

inline constexpr unsigned FIRST_OUTCOME = static_cast<unsigned>(Outcome::Stored);
inline constexpr unsigned LAST_OUTCOME = static_cast<unsigned>(Outcome::Exception);
static_assert(FIRST_OUTCOME == 8 && LAST_OUTCOME == 19);

/// Why the file's counts begin where they do.
enum class Begun : std::uint64_t {
    NoFile = 0,       ///< There was no file, or one whose making was interrupted.
    Damaged = 1,      ///< There was a damaged or cut file; it was set aside.
    OtherVersion = 2, ///< There was a file with another layout; it was set aside.
};

// NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init): it lies in a mapped file, and is never constructed
struct Header {
    std::array<char, 8> magic; ///< Written last: a file without it is unfinished.
    std::uint32_t version;     ///< The version of the layout.
    std::uint32_t fileBytes;
    std::uint32_t counters; ///< How many words `total`, `lastMs` and `atStart` have each.
    std::uint32_t marks;    ///< The number of marks in `marks`, one for each ten seconds.
    std::uint32_t markSeconds;
    std::uint32_t recentMarks; ///< The number of marks in `recent`, one for each second.
    std::int64_t begunAtMs;    ///< When the file's counting began.
    Begun begun;
    Word starts;              ///< Odd while a starting process writes the fields below and `atStart`.
    std::int64_t startedAtMs; ///< When the process that counts, or counted last, was started.
    std::int64_t process;     ///< The id of that process.
    std::array<char, 32> programVersion; ///< The version of its program, padded with zero bytes.
    std::array<char, 64> buildId; ///< The build id of its program, in hexadecimal digits, padded likewise.
    std::array<std::byte, 88> reserved;
};
static_assert(sizeof(Header) == 256 && offsetof(Header, starts) == 48 &&
              offsetof(Header, programVersion) == 72);

using Counters = std::array<Word, COUNTERS>;

/// All counters at one moment. `atMs` is 0 while the mark is written, and in a mark that was never written.
struct Mark {
    Word atMs;
    Counters counters;
};

inline constexpr unsigned MARKS = 60;
inline constexpr unsigned MARK_SECONDS = 10;
inline constexpr unsigned RECENT_MARKS = 4; ///< One each second, for the rate of the last second.

/// The whole file. It is aligned to a cache line (64 bytes, eight words), so each group of Counter has cache
/// lines of its own.
struct alignas(64) File {
    Header header;
    alignas(64) Counters total; ///< Since the counting began.
    /// When a counter last changed, in milliseconds since 1970; 0 for never. Only the places of RECEIVED, of
    /// each Outcome, of DROPPED_BY_KERNEL and of LOST_AT_ENDS are written.
    alignas(64) Counters lastMs;
    alignas(64) Counters atStart; ///< The value of `total` when the process that counts was started.
    std::array<Mark, MARKS> marks;
    std::array<Mark, RECENT_MARKS> recent;
};
static_assert(offsetof(File, total) == 256 && offsetof(File, lastMs) == 512 &&
              offsetof(File, atStart) == 768);
static_assert(offsetof(File, marks) == 1024 && sizeof(Mark) == 264);
static_assert(offsetof(File, recent) == 1024 + MARKS * sizeof(Mark));

/// The size is rounded up to whole cache lines.
inline constexpr std::size_t FILE_BYTES = sizeof(File);
static_assert(FILE_BYTES == 17920);

inline constexpr auto FILE_NAME = "Report.ledger";

/// Appended to the name of a file that is damaged or has another layout, so that it can be examined. The next
/// such file replaces it.
inline constexpr auto SET_ASIDE_SUFFIX = ".set-aside";

} // namespace ReportLedger
