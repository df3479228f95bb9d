#include "Tools/reportctl/page/Gather.h"

#include <utility>

#include <SQLiteCpp/Exception.h>

#include "Ledger/Reader.h"
#include "Tools/reportctl/status/Names.h"
#include "Tools/reportctl/status/Status.h"
#include "Tools/reportctl/store/Paths.h"
#include "Tools/reportctl/store/Store.h"

namespace reportctl::page {
namespace {

/// The page shows the hours and days of this time, and this many of the most frequent events and modules.
constexpr std::int64_t SHOWN_MS = 90LL * 24 * 3600 * 1000;
constexpr std::size_t SHOWN_KEYS = 15;

constexpr std::int64_t REFUSED_MS = 600'000;

RefusedAt RefusedBetween(const ReportLedger::MarkAt& before, const ReportLedger::MarkAt& after) {
    RefusedAt refused{after.atMs, {}};
    for (const auto& reason : status::REASONS)
        refused.byReason.emplace_back(reason.json, after.counts[reason.place] - before.counts[reason.place]);
    return refused;
}

/// Runs `count` on the database. When the database cannot be read, nothing is counted, and the page's status
/// gives the reason.
template <typename Count>
void CountIn(const std::string& path, const Count& count) {
    try {
        auto database = store::OpenToGlance(path);
        count(database);
    } catch (const std::exception&) { // the page shows the other data
    }
}

void CountStore(PageData& data, store::Tally& events, store::Tally& modules) {
    CountIn(store::StorePath(), [&](SQLite::Database& database) {
        const store::ReportFilter recent{
            .sinceMs = data.generatedAtMs - SHOWN_MS, .untilMs = {}, .eventPrefix = {}};
        data.quarterHours = store::CountByQuarterHour(database, recent);
        store::CountRows(database, store::Grouping::Event, {}, store::Zone::Utc, events);
        store::CountRows(database, store::Grouping::Module, {}, store::Zone::Utc, modules);
    });
    for (const auto& [event, count] : events)
        data.rowsBefore += count;
    for (const auto& [quarterHour, count] : data.quarterHours)
        data.rowsBefore -= count;
}

} // namespace

std::vector<RefusedAt> RefusedOverTime(const ReportLedger::Look& look) {
    auto marks = look.marks;
    if (!marks.empty())
        marks.push_back({look.atMs, look.total});
    std::vector<RefusedAt> refused;
    for (std::size_t i = 1; i < marks.size(); ++i)
        if (look.atMs - marks[i].atMs < REFUSED_MS)
            refused.push_back(RefusedBetween(marks[i - 1], marks[i]));
    return refused;
}

PageData Gather(int reloadSeconds) {
    const auto status = status::Gather();
    PageData data;
    data.generatedAtMs = status.atMs;
    data.reloadSeconds = reloadSeconds;
    data.statusJson = status::JsonOf(status, status::Judge(status));
    data.refused = RefusedOverTime(status.ledger);
    store::Tally events;
    store::Tally modules;
    CountStore(data, events, modules);
    CountIn(store::OutboxPath(), [&](SQLite::Database& outbox) {
        store::CountEvents(outbox, store::Grouping::Event, {}, store::Zone::Utc, events);
        store::CountEvents(outbox, store::Grouping::Module, {}, store::Zone::Utc, modules);
    });
    data.events = store::Ranked(events, store::Grouping::Event, SHOWN_KEYS);
    data.modules = store::Ranked(modules, store::Grouping::Module, SHOWN_KEYS);
    return data;
}

} // namespace reportctl::page
