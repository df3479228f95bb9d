#include "bench/simulation/Output.h"

#include <fmt/format.h>

namespace Fleet {
namespace {

std::string Clock(Tick tick) {
    const auto seconds = tick / SECOND;
    return fmt::format("{}:{:02}:{:02}", seconds / 3600, seconds / 60 % 60, seconds % 60);
}

std::string Clock(const std::optional<Tick>& tick) {
    return tick ? Clock(*tick) : "not by the end";
}

std::string RatesLine(const std::string& name, const Rates& rates) {
    return fmt::format("{:<24}{:>10.0f}{:>10}{:>11.0f}{:>11}{:>9.2f}{:>9.2f}{:>12}{:>12}\n", name,
                       rates.requests, rates.peakRequests, rates.events, rates.peakEvents, rates.bytes / 1e6,
                       static_cast<double>(rates.peakBytes) / 1e6, rates.later, rates.noAnswer);
}

std::string RatesHead() {
    return fmt::format("{:<24}{:>10}{:>10}{:>11}{:>11}{:>9}{:>9}{:>12}{:>12}\n", "", "requests/s", "peak",
                       "events/s", "peak", "MB/s", "peak", "\"later\"", "no answer");
}

std::string Hours(const Summary& summary) {
    auto text = "\n" + RatesHead();
    for (std::size_t i = 0; i < summary.hours.size(); ++i)
        text +=
            RatesLine(fmt::format("day {} {:02}:00{:>12}", i / 24 + 1, i % 24, summary.hours[i].waitingAtEnd),
                      summary.hours[i]);
    return text + "(behind the hour: events that wait at its end)\n";
}

std::string Sizes(const Result& result) {
    std::string text = "bytes of a request, compressed (plain):";
    for (const std::size_t n : {1, 20, 200, 512})
        text += fmt::format(" {} events {} ({})", n, result.sizes.Of(n).sent, result.sizes.Of(n).plain);
    return text + fmt::format("; an event counts for {} in the outbox\n", result.sizes.EventBytes());
}

double Part(double of, double whole) {
    return whole > 0 ? of / whole : 0;
}

std::string Times(double peak, double normal) {
    return fmt::format("{:.1f}", Part(peak, normal));
}

std::string Outage(const Summary& summary, const Tally& tally) {
    return fmt::format(
        "waiting when the collector came back: {} events; 50 % left after {}, 99 % after {}, all after {}\n"
        "peak after the return against the busiest hour's mean: {} x requests, {} x events, {} x bytes\n",
        tally.backlog, Clock(summary.drainedHalf), Clock(summary.drainedMost), Clock(summary.drainedAll),
        Times(static_cast<double>(summary.after->peakRequests), summary.normal.requests),
        Times(static_cast<double>(summary.after->peakEvents), summary.normal.events),
        Times(static_cast<double>(summary.after->peakBytes), summary.normal.bytes));
}

std::string JsonRates(const Rates& rates) {
    return fmt::format("{{\"stored_per_s\":{:.3f},\"requests_per_s\":{:.3f},\"events_per_s\":{:.3f},"
                       "\"bytes_per_s\":{:.1f},\"peak_requests_per_s\":{},\"peak_events_per_s\":{},"
                       "\"peak_bytes_per_s\":{},\"answered_later\":{},\"unanswered\":{}}}",
                       rates.stored, rates.requests, rates.events, rates.bytes, rates.peakRequests,
                       rates.peakEvents, rates.peakBytes, rates.later, rates.noAnswer);
}

std::string JsonRates(const std::optional<Rates>& rates) {
    return rates ? JsonRates(*rates) : "null";
}

std::string JsonSeconds(const std::optional<Tick>& tick) {
    return tick ? fmt::format("{}", *tick / SECOND) : "null";
}

std::string JsonSizes(const BodySizes& sizes) {
    std::string text;
    for (const std::size_t n : {1, 2, 5, 10, 20, 50, 100, 200, 512})
        text += fmt::format("{}\"{}\":{{\"plain\":{},\"sent\":{}}}", text.empty() ? "" : ",", n,
                            sizes.Of(n).plain, sizes.Of(n).sent);
    return text;
}

std::string JsonCounts(const Tally& tally) {
    return fmt::format(
        "{{\"stored\":{},\"delivered\":{},\"waiting\":{},\"dropped\":{},\"dead_lettered\":{},"
        "\"taken\":{},\"duplicates\":{},\"unconfirmed\":{},\"dropped_taken\":{},\"drop_runs\":{},"
        "\"tried_alone\":{},\"waiting_at_return\":{}}}",
        tally.stored, tally.delivered, tally.waiting, tally.dropped, tally.deadLettered, tally.taken,
        tally.duplicates, tally.unconfirmed, tally.droppedTaken, tally.dropRuns, tally.triedAlone,
        tally.backlog);
}

} // namespace

std::string AsTable(const Result& result, bool hours) {
    const auto& [config, sizes, tally, summary, took] = result;
    auto text =
        fmt::format("{} desktops, {} day{}, {} events a desktop and day, seed {}; took {:.1f} s, {} bytes a "
                    "desktop\n",
                    config.desktops, config.days, config.days == 1 ? "" : "s", config.eventsPerDay,
                    config.seed, took, tally.desktopBytes / config.desktops);
    text += Sizes(result) + "\n" + RatesHead() + RatesLine("the whole time", summary.day) +
            RatesLine("the busiest usual hour", summary.normal);
    if (summary.away)
        text += RatesLine("the collector is away", *summary.away) +
                RatesLine("from then until drained", *summary.after);
    if (summary.restart)
        text += RatesLine("10 min after a restart", *summary.restart);
    if (hours)
        text += Hours(summary);
    text += fmt::format(
        "\nstored {} = delivered {} + waiting {} + dropped {} + dead letters {}\n"
        "taken by the collectors {}: {} of them again (duplicates); taken, and the desktop does not "
        "know yet: {}\nrequests with one event that had stepped aside: {}\n",
        tally.stored, tally.delivered, tally.waiting, tally.dropped, tally.deadLettered, tally.taken,
        tally.duplicates, tally.unconfirmed, tally.triedAlone);
    return summary.away ? text + Outage(summary, tally) : text;
}

std::string AsJson(const Result& result) {
    const auto& [config, sizes, tally, summary, took] = result;
    std::string hours;
    for (const auto& hour : summary.hours)
        hours += (hours.empty() ? "" : ",") + JsonRates(hour);
    return fmt::format("{{\"desktops\":{},\"days\":{},\"seed\":{},\"events_per_day\":{},\"counts\":{},"
                       "\"whole\":{},\"normal\":{},\"away\":{},\"after\":{},\"restart\":{},"
                       "\"drained_50_s\":{},\"drained_99_s\":{},\"drained_s\":{},\"event_bytes\":{},"
                       "\"request_bytes\":{{{}}},\"hours\":[{}]}}\n",
                       config.desktops, config.days, config.seed, config.eventsPerDay, JsonCounts(tally),
                       JsonRates(summary.day), JsonRates(summary.normal), JsonRates(summary.away),
                       JsonRates(summary.after), JsonRates(summary.restart), JsonSeconds(summary.drainedHalf),
                       JsonSeconds(summary.drainedMost), JsonSeconds(summary.drainedAll), sizes.EventBytes(),
                       JsonSizes(sizes), hours);
}

} // namespace Fleet
