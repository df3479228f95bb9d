#pragma once

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>

#include "Ledger/Outcome.h"

/// The ledger's file, byte for byte; docs/Ledger.md describes it for other readers. Everything is in the
/// machine's own byte order: the file is its machine's.
///
/// Every field that changes while the service runs is an atomic word of eight bytes. A counter belongs to one
/// thread, and each thread's counters have cache lines of their own, so that counting is a load and a store
/// that no other thread waits for.
namespace ReportLedger {

inline constexpr std::array<char, 8> MAGIC = {'H', 'L', 'L', 'E', 'D', 'G', 'E', 'R'};
inline constexpr std::uint32_t VERSION = 1;

using Word = std::atomic<std::uint64_t>;
static_assert(Word::is_always_lock_free && sizeof(Word) == 8, "a file has plain words only");

/// The places of the counters; those of Outcome are the places of how reports ended.
enum Counter : unsigned {
    // The receiving thread's.
    RECEIVED = 0,   ///< Datagrams.
    RECEIVED_BYTES, ///< Of all datagrams.
    EMPTY,          ///< Datagrams of no bytes, which are ignored.
    AT_SIZE_LIMIT,  ///< Datagrams as long as the receiver's buffer: longer ones were cut.
    UNFORMATTABLE,  ///< Texts that are no format for the log.
    QUEUED,         ///< Reports that were put into the queue.
    RECEIVING,      ///< 1 while the receiving thread has a report that is not in the queue yet.
    // The consuming thread's: 8 to 19 are Outcome, then
    HANDLED = 20, ///< Reports that were taken from the queue and have ended.
    // What changes seldom.
    DROPPED_BY_KERNEL = 24,
    LOST_AT_ENDS,             ///< Received and not ended when a process ended.
    MOST_WAITING,             ///< The most that ever waited in the queue.
    MOST_WAITING_SINCE_START, ///< The same of the running process.
    COUNTERS = 32,
};

inline constexpr unsigned FIRST_OUTCOME = static_cast<unsigned>(Outcome::Stored);
inline constexpr unsigned LAST_OUTCOME = static_cast<unsigned>(Outcome::Exception);
static_assert(FIRST_OUTCOME == 8 && LAST_OUTCOME == 19);

/// Why the file's counting began where it did.
enum class Begun : std::uint64_t {
    NoFile = 0,       ///< There was none, or one whose making was cut short.
    Damaged = 1,      ///< There was one that made no sense, or that was cut; it was set aside.
    OtherVersion = 2, ///< There was one of another layout; it was set aside.
};

// NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init): it lies in a mapped file, and is never constructed
struct Header {
    std::array<char, 8> magic; ///< Written last when a file is made: without it, its making was cut short.
    std::uint32_t version;     ///< Of the layout.
    std::uint32_t fileBytes;
    std::uint32_t counters; ///< How many words of counters, of times and of counters at the start.
    std::uint32_t marks;    ///< How many marks of ten seconds.
    std::uint32_t markSeconds;
    std::uint32_t recentMarks; ///< How many marks of one second.
    std::int64_t begunAtMs;    ///< When the counting began.
    Begun begun;
    Word starts; ///< Odd while a start writes what follows up to the counters, and the counters at the start.
    std::int64_t startedAtMs;            ///< Of the process that counts, or counted last.
    std::int64_t process;                ///< Its id.
    std::array<char, 32> programVersion; ///< Its version, padded with zero bytes.
    std::array<char, 64> buildId;        ///< Its build id in hexadecimal digits, padded likewise.
    std::array<std::byte, 88> reserved;
};
static_assert(sizeof(Header) == 256 && offsetof(Header, starts) == 48 &&
              offsetof(Header, programVersion) == 72);

using Counters = std::array<Word, COUNTERS>;

/// All counters at a moment. Its time is 0 while it is written, or when there is none yet.
struct Mark {
    Word atMs;
    Counters counters;
};

inline constexpr unsigned MARKS = 60;
inline constexpr unsigned MARK_SECONDS = 10;
inline constexpr unsigned RECENT_MARKS = 4; ///< One a second, for the rate of the last second.

/// As a whole. The alignment is a cache line's, from which the groups of Counter follow.
struct alignas(64) File {
    Header header;
    alignas(64) Counters total;   ///< Since the counting began.
    alignas(64) Counters lastMs;  ///< When each was last counted, in milliseconds since 1970; 0 for never.
    alignas(64) Counters atStart; ///< What total was when the process started that counts.
    std::array<Mark, MARKS> marks;
    std::array<Mark, RECENT_MARKS> recent;
};
static_assert(offsetof(File, total) == 256 && offsetof(File, lastMs) == 512 &&
              offsetof(File, atStart) == 768);
static_assert(offsetof(File, marks) == 1024 && sizeof(Mark) == 264);
static_assert(offsetof(File, recent) == 1024 + MARKS * sizeof(Mark));

/// Rounded up to whole cache lines.
inline constexpr std::size_t FILE_BYTES = sizeof(File);
static_assert(FILE_BYTES == 17920);

inline constexpr auto FILE_NAME = "Report.ledger";

/// Appended to the name of a file that makes no sense, so that it can be looked at; the next such file
/// replaces it.
inline constexpr auto SET_ASIDE_SUFFIX = ".set-aside";

} // namespace ReportLedger
