#include "Ledger/Writer.h"

#include <algorithm>
#include <span>

#include <unistd.h>

#include "Ledger/Counts.h"

namespace ReportLedger {
namespace {

/// Adds to a counter. Only the thread that owns the counter may call it. The release order makes sure that a
/// reader, also after a kill at any instruction, never sees this store without what the thread counted before
/// it. On processors that keep stores in order anyway, this costs nothing.
void Add(Word& word, std::uint64_t count) noexcept {
    word.store(word.load(std::memory_order_relaxed) + count, std::memory_order_release);
}

void Set(Word& word, std::int64_t value) noexcept {
    word.store(static_cast<std::uint64_t>(value), std::memory_order_release);
}

template <std::size_t SIZE>
void SetText(std::array<char, SIZE>& field, const std::string& text) {
    field.fill('\0');
    std::copy_n(text.begin(), std::min(text.size(), SIZE - 1), field.begin());
}

/// The newest mark's time; 0 when there is none.
std::int64_t NewestOf(std::span<const Mark> marks) noexcept {
    std::uint64_t newest = 0;
    for (const Mark& mark : marks)
        newest = std::max(newest, mark.atMs.load(std::memory_order_relaxed));
    return static_cast<std::int64_t>(newest);
}

Mark& OldestOf(std::span<Mark> marks) noexcept {
    return *std::ranges::min_element(
        marks, {}, [](const Mark& mark) { return mark.atMs.load(std::memory_order_relaxed); });
}

/// Overwrites the oldest mark. Its time is 0 during that, so that a reader ignores the mark; the next start
/// after a kill ignores it, too.
void Write(std::span<Mark> marks, const Counters& counters, std::int64_t nowMs) noexcept {
    Mark& mark = OldestOf(marks);
    Set(mark.atMs, 0);
    const Counts counts = CopyOf(counters);
    for (unsigned i = 0; i < COUNTERS; ++i)
        mark.counters[i].store(counts[i], std::memory_order_release);
    Set(mark.atMs, nowMs);
}

/// Writes a mark once in each period. When the clock was set back, it first discards all marks: a mark of the
/// future is useless for a rate.
void WriteWhenDue(std::span<Mark> marks, const Counters& counters, std::int64_t periodMs,
                  std::int64_t nowMs) noexcept {
    const std::int64_t newest = NewestOf(marks);
    if (newest > nowMs)
        for (Mark& mark : marks)
            Set(mark.atMs, 0);
    if (newest > nowMs || nowMs - newest >= periodMs)
        Write(marks, counters, nowMs);
}

} // namespace

Writer::Writer() : m_memory(std::make_unique<File>()), m_content(m_memory.get()) {}

bool Writer::Open(const std::string& directory, const std::string& programVersion, const std::string& buildId,
                  std::int64_t nowMs) {
    m_file = MappedFile::Open(directory, nowMs);
    if (m_file) {
        m_content = &m_file->Content();
        m_memory.reset();
    }
    BeginProcess(programVersion, buildId, nowMs);
    return m_file != nullptr;
}

void Writer::BeginProcess(const std::string& programVersion, const std::string& buildId, std::int64_t nowMs) {
    Header& header = m_content->header;
    // `starts` is already odd when a kill interrupted the last start.
    const std::uint64_t odd = header.starts.load(std::memory_order_relaxed) | 1U;
    header.starts.store(odd, std::memory_order_seq_cst);
    CountWhatWasLost(nowMs);
    const Counts total = CopyOf(m_content->total);
    for (unsigned i = 0; i < COUNTERS; ++i)
        m_content->atStart[i].store(total[i], std::memory_order_release);
    header.startedAtMs = nowMs;
    header.process = ::getpid();
    SetText(header.programVersion, programVersion);
    SetText(header.buildId, buildId);
    m_handledSeen = total[HANDLED];
    header.starts.store(odd + 1, std::memory_order_seq_cst);
    Tick(nowMs);
}

/// Counts the datagrams that were received and did not end. The number is computed from the totals and not
/// added to the old number. So nothing is counted twice when a kill comes between two of these stores.
void Writer::CountWhatWasLost(std::int64_t nowMs) {
    Counters& total = m_content->total;
    const Counts counts = CopyOf(total);
    const std::uint64_t lost = counts[RECEIVED] - EndedIn(counts);
    if (lost != counts[LOST_AT_ENDS])
        Set(m_content->lastMs[LOST_AT_ENDS], nowMs);
    total[LOST_AT_ENDS].store(lost, std::memory_order_release);
    total[RECEIVING].store(0, std::memory_order_release);
    total[HANDLED].store(counts[QUEUED], std::memory_order_release);
    total[MOST_WAITING_SINCE_START].store(0, std::memory_order_release);
}

void Writer::Received(std::size_t bytes, bool atLimit, std::int64_t nowMs) noexcept {
    Counters& total = m_content->total;
    if (bytes > 0)
        total[RECEIVING].store(1, std::memory_order_release);
    Add(total[RECEIVED], 1);
    Add(total[RECEIVED_BYTES], bytes);
    if (bytes == 0)
        Add(total[EMPTY], 1);
    if (atLimit)
        Add(total[AT_SIZE_LIMIT], 1);
    Set(m_content->lastMs[RECEIVED], nowMs);
}

void Writer::CouldNotFormat() noexcept {
    Add(m_content->total[UNFORMATTABLE], 1);
}

void Writer::Queued() noexcept {
    Counters& total = m_content->total;
    Add(total[QUEUED], 1);
    total[RECEIVING].store(0, std::memory_order_release);
    NoteMostWaiting(total[QUEUED].load(std::memory_order_relaxed));
}

/// Reads HANDLED only when the number may be a new maximum: the cache line of HANDLED belongs to the
/// consuming thread, and to read it takes as long as everything else here.
void Writer::NoteMostWaiting(std::uint64_t queued) noexcept {
    Counters& total = m_content->total;
    if (queued - m_handledSeen <= total[MOST_WAITING_SINCE_START].load(std::memory_order_relaxed))
        return;
    m_handledSeen = std::min(queued, total[HANDLED].load(std::memory_order_relaxed));
    for (const auto most : {MOST_WAITING_SINCE_START, MOST_WAITING})
        if (queued - m_handledSeen > total[most].load(std::memory_order_relaxed))
            total[most].store(queued - m_handledSeen, std::memory_order_release);
}

void Writer::CouldNotQueue(std::int64_t nowMs) noexcept {
    const auto exception = static_cast<unsigned>(Outcome::Exception);
    // Added atomically, because the consuming thread changes this counter, too.
    m_content->total[exception].fetch_add(1, std::memory_order_release);
    Set(m_content->lastMs[exception], nowMs);
    m_content->total[RECEIVING].store(0, std::memory_order_release);
}

void Writer::Ended(Outcome outcome, std::int64_t nowMs) noexcept {
    const auto place = static_cast<unsigned>(outcome);
    Word& counter = m_content->total[place];
    if (outcome == Outcome::Exception)
        counter.fetch_add(1, std::memory_order_release);
    else
        Add(counter, 1);
    Set(m_content->lastMs[place], nowMs);
    Add(m_content->total[HANDLED], 1);
}

void Writer::Dropped(std::uint64_t datagrams, std::int64_t nowMs) noexcept {
    if (datagrams == 0)
        return;
    Add(m_content->total[DROPPED_BY_KERNEL], datagrams);
    Set(m_content->lastMs[DROPPED_BY_KERNEL], nowMs);
}

void Writer::Tick(std::int64_t nowMs) noexcept {
    WriteWhenDue(m_content->recent, m_content->total, 1000, nowMs);
    WriteWhenDue(m_content->marks, m_content->total, std::int64_t{MARK_SECONDS} * 1000, nowMs);
}

} // namespace ReportLedger
