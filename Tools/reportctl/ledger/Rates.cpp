#include "Tools/reportctl/ledger/Rates.h"

#include <algorithm>
#include <iterator>
#include <numeric>

namespace reportctl::ledger {
namespace {

using namespace std::chrono_literals;
using ReportLedger::Counts;
using ReportLedger::Look;
using ReportLedger::MarkAt;
using ReportLedger::Outcome;

/// Two marks may be one period and one poll apart, so the mark that is wanted may be a little older than a
/// minute or a second.
constexpr std::chrono::milliseconds MINUTE = 60s + 11s;
constexpr std::chrono::milliseconds SECOND = 1s + 1300ms;

/// The oldest mark that is not older than `time`; null when there is none.
const MarkAt* MarkWithin(const std::vector<MarkAt>& marks, std::int64_t nowMs,
                         std::chrono::milliseconds time) {
    const auto found = std::ranges::find_if(
        marks, [&](const MarkAt& mark) { return mark.atMs < nowMs && nowMs - mark.atMs <= time.count(); });
    return found == marks.end() ? nullptr : &*found;
}

/// The newest mark that is at least as old as `time`, or else the oldest mark; null when there is none. The
/// service may not have run when the time began: then the newest mark before it has the counts of that time.
const MarkAt* MarkBefore(const std::vector<MarkAt>& marks, std::int64_t nowMs,
                         std::chrono::milliseconds time) {
    const auto after =
        std::ranges::find_if(marks, [&](const MarkAt& mark) { return nowMs - mark.atMs < time.count(); });
    if (after != marks.begin())
        return &*std::prev(after);
    return marks.empty() ? nullptr : &marks.front();
}

Rates Since(const MarkAt* mark, const Look& look) {
    if (mark == nullptr || !look.counting)
        return {};
    return RatesBetween(mark->counts, look.total, std::chrono::milliseconds(look.atMs - mark->atMs));
}

} // namespace

std::uint64_t RefusedIn(const Counts& counts) {
    return std::accumulate(&counts[static_cast<unsigned>(Outcome::NotJson)],
                           &counts[static_cast<unsigned>(Outcome::Exception)] + 1, std::uint64_t{0});
}

Rates RatesBetween(const Counts& before, const Counts& after, std::chrono::milliseconds time) {
    const double seconds = std::chrono::duration<double>(time).count();
    if (seconds <= 0)
        return {};
    const auto rate = [&](std::uint64_t old, std::uint64_t now) {
        return static_cast<double>(now - std::min(old, now)) / seconds;
    };
    const auto stored = static_cast<unsigned>(Outcome::Stored);
    return {rate(before[ReportLedger::RECEIVED], after[ReportLedger::RECEIVED]),
            rate(before[stored], after[stored]), rate(RefusedIn(before), RefusedIn(after))};
}

Rates OfTheLastMinute(const Look& look) {
    return Since(MarkWithin(look.marks, look.atMs, MINUTE), look);
}

Rates OfTheLastSecond(const Look& look) {
    return Since(MarkWithin(look.recent, look.atMs, SECOND), look);
}

std::uint64_t GrownIn(const Look& look, unsigned place, std::chrono::milliseconds time) {
    const MarkAt* const mark = MarkBefore(look.marks, look.atMs, time);
    return mark == nullptr ? 0 : look.total[place] - std::min(mark->counts[place], look.total[place]);
}

} // namespace reportctl::ledger
