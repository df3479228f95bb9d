#include "Ledger/Reader.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <span>
#include <thread>

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>

#include "Ledger/FileState.h"
#include "SystemTool/IO/Descriptor.h"
#include "SystemTool/Platform.h"

namespace ReportLedger {
namespace {

constexpr int MOST_LOOKS = 100;
constexpr auto BETWEEN_LOOKS = std::chrono::microseconds(200);

Sight SightOf(FileState state) {
    switch (state) {
    case FileState::Sound:
        return Sight::Sound;
    case FileState::Unfinished:
        return Sight::Unfinished;
    case FileState::OtherVersion:
        return Sight::OtherVersion;
    case FileState::Damaged:
        break;
    }
    return Sight::Damaged;
}

/// The field's text up to its first zero byte. A character that cannot be printed becomes a question mark,
/// because the file may hold anything.
template <std::size_t SIZE>
std::string TextOf(const std::array<char, SIZE>& field) {
    std::string text(field.begin(), std::ranges::find(field, '\0'));
    std::ranges::replace_if(
        text, [](char character) { return character < ' ' || character > '~'; }, '?');
    return text;
}

/// The marks that were not written during the copy and whose time is not in the future, the oldest first.
std::vector<MarkAt> MarksOf(std::span<const Mark> marks, std::int64_t nowMs) {
    std::vector<MarkAt> found;
    for (const Mark& mark : marks) {
        const auto atMs = static_cast<std::int64_t>(mark.atMs.load(std::memory_order_acquire));
        const Counts counts = CopyOf(mark.counters);
        const auto after = static_cast<std::int64_t>(mark.atMs.load(std::memory_order_acquire));
        if (atMs > 0 && atMs <= nowMs && after == atMs)
            found.push_back({atMs, counts});
    }
    std::ranges::sort(found, {}, &MarkAt::atMs);
    return found;
}

/// When the process was last seen at work: when it counted last, or wrote a mark. It writes marks while no
/// report comes, too.
/// A time of the future is from before the clock was set back.
std::uint64_t LastSignOfWork(const Look& look) {
    std::uint64_t last = 0;
    for (const auto ms : look.lastMs)
        if (ms <= static_cast<std::uint64_t>(look.atMs))
            last = std::max(last, ms);
    for (const auto* marks : {&look.marks, &look.recent})
        if (!marks->empty())
            last = std::max(last, static_cast<std::uint64_t>(marks->back().atMs));
    return last;
}

/// Counts as lost what an ended process had received and not ended, in the same way as the next start will.
/// The process ended at an unknown time after it was last at work.
void CountAsLost(Look& look) {
    Counts& total = look.total;
    const std::uint64_t lost = total[RECEIVED] - EndedIn(total);
    if (lost != total[LOST_AT_ENDS])
        look.lastMs[LOST_AT_ENDS] = LastSignOfWork(look);
    total[LOST_AT_ENDS] = lost;
    total[HANDLED] = total[QUEUED];
    total[RECEIVING] = 0;
}

/// Copies the counters until they balance. Under much work that may never happen: the last copy may be off by
/// as much as was counted since the copy before it.
void TakeBalancedLook(const File& content, Look& look) {
    Counts before = CopyOf(content.total);
    for (int i = 0; i < MOST_LOOKS; ++i) {
        look.total = CopyOf(content.total);
        const auto missing = static_cast<std::uint64_t>(std::abs(UnaccountedIn(look.total)));
        const auto moved = look.total[RECEIVED] - before[RECEIVED] + look.total[HANDLED] - before[HANDLED];
        look.balanced = missing <= (i + 1 < MOST_LOOKS ? 0 : moved);
        if (look.balanced)
            return;
        before = look.total;
        std::this_thread::sleep_for(BETWEEN_LOOKS);
    }
}

void TakeProcess(const File& content, Look& look) {
    const Header& header = content.header;
    for (int i = 0; i < MOST_LOOKS; ++i) {
        const std::uint64_t before = header.starts.load(std::memory_order_acquire);
        look.process = header.process;
        look.startedAtMs = header.startedAtMs;
        look.programVersion = TextOf(header.programVersion);
        look.buildId = TextOf(header.buildId);
        look.atStart = CopyOf(content.atStart);
        if (before % 2 == 0 && header.starts.load(std::memory_order_acquire) == before)
            return;
        if (!look.counting) // the process was killed during its start, so no process will finish this
            return;
        std::this_thread::sleep_for(BETWEEN_LOOKS);
    }
}

/// A file that is open for reading.
class OpenFile {
public:
    explicit OpenFile(const std::string& path)
        : m_file(::open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC)),
          m_sight(errno == ENOENT ? Sight::Missing : Sight::Unreadable) {
        if (m_file.IsOpen())
            Map();
    }
    ~OpenFile() {
        if (m_memory != MAP_FAILED)
            ::munmap(m_memory, FILE_BYTES);
    }
    OpenFile(const OpenFile&) = delete;
    OpenFile& operator=(const OpenFile&) = delete;

    Sight GetSight() const { return m_sight; }
    const File& Content() const { return *static_cast<const File*>(m_memory); }
    bool IsLocked() const { return SystemTool::Platform::IsFileLocked(m_file.Number()); }

private:
    /// Does not map a file of another size: reading after the end of a shorter file would end this program.
    void Map() {
        struct stat status {};
        m_sight = Sight::Unreadable;
        if (::fstat(m_file.Number(), &status) != 0 || !S_ISREG(status.st_mode))
            return;
        if (status.st_size != off_t{FILE_BYTES}) {
            if (const auto state = StateOf(m_file.Number()))
                m_sight = SightOf(*state);
            return;
        }
        m_memory = ::mmap(nullptr, FILE_BYTES, PROT_READ, MAP_SHARED, m_file.Number(), 0);
        if (m_memory != MAP_FAILED)
            m_sight = SightOf(Judge(Content(), FILE_BYTES));
    }

    SystemTool::IO::Descriptor m_file;
    void* m_memory = MAP_FAILED;
    Sight m_sight;
};

} // namespace

Look LookAt(const std::string& path) {
    const OpenFile file(path);
    if (file.GetSight() == Sight::Sound) {
        // We test the lock before we read the counters. If we tested it afterwards, a process that counted
        // more and then ended would look dead, and the reports that it ended meanwhile would look lost.
        const bool counting = file.IsLocked();
        return LookAt(file.Content(), counting, SystemTool::Platform::CoarseTimeMs());
    }
    Look nothing;
    nothing.sight = file.GetSight();
    return nothing;
}

Look LookAt(const File& content, bool counting, std::int64_t nowMs) {
    Look look;
    look.sight = Sight::Sound;
    look.atMs = nowMs;
    look.counting = counting;
    look.begunAtMs = content.header.begunAtMs;
    look.begun = content.header.begun;
    TakeProcess(content, look);
    if (counting) {
        TakeBalancedLook(content, look);
    } else {
        look.total = CopyOf(content.total);
        look.balanced = true;
    }
    look.lastMs = CopyOf(content.lastMs);
    look.marks = MarksOf(content.marks, nowMs);
    look.recent = MarksOf(content.recent, nowMs);
    if (!counting)
        CountAsLost(look);
    return look;
}

Counts SinceStart(const Look& look) {
    Counts counts{};
    // An interrupted start may have left some values of an earlier start in `atStart`.
    for (unsigned i = 0; i < COUNTERS; ++i)
        counts[i] = look.total[i] - std::min(look.atStart[i], look.total[i]);
    counts[MOST_WAITING] = look.total[MOST_WAITING_SINCE_START];
    counts[LOST_AT_ENDS] = 0;
    return counts;
}

} // namespace ReportLedger
