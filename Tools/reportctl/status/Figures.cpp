#include "Tools/reportctl/status/Figures.h"

#include <utility>

#include "Tools/reportctl/status/Names.h"

namespace reportctl::status {
namespace {

constexpr auto BYTES = "By";
constexpr auto REPORTS = "{report}";
constexpr auto EVENTS = "{event}";

class Figures {
public:
    Figure& Begin(Figure figure) { return m_figures.emplace_back(std::move(figure)); }

    template <typename Value>
    void Add(Figure figure, Value value) {
        Begin(std::move(figure)).samples.push_back({{}, static_cast<std::int64_t>(value)});
    }
    template <typename Value>
    void Add(Figure figure, const std::optional<Value>& value) {
        if (value)
            Add(std::move(figure), *value);
    }

    std::vector<Figure> Take() { return std::move(m_figures); }

private:
    std::vector<Figure> m_figures;
};

Figure Gauge(const char* name, const char* unit, const char* help) {
    return {.name = name, .help = help, .unit = unit, .countsSinceMs = {}, .samples = {}};
}

Figure Counter(const char* name, const char* unit, const char* help, std::optional<std::int64_t> sinceMs) {
    return {
        .name = name, .help = help, .unit = unit, .isCounter = true, .countsSinceMs = sinceMs, .samples = {}};
}

void AddLedger(Figures& figures, const ReportLedger::Look& look) {
    if (look.sight != ReportLedger::Sight::Sound)
        return;
    for (const Name& name : COUNTERS)
        figures.Add(Counter(name.metric, name.place == ReportLedger::RECEIVED_BYTES ? BYTES : REPORTS,
                            name.help, look.begunAtMs),
                    look.total[name.place]);
    auto& refused = figures.Begin(
        Counter("refused", REPORTS, "Reports that ended nowhere, by the reason.", look.begunAtMs));
    for (const Name& reason : REASONS)
        refused.samples.push_back({reason.json, static_cast<std::int64_t>(look.total[reason.place])});
    figures.Add(Gauge("waiting", REPORTS, "Reports in the queue now."), ReportLedger::WaitingIn(look.total));
    figures.Add(Gauge("most_waiting", REPORTS, "The most reports that ever were in the queue."),
                look.total[ReportLedger::MOST_WAITING]);
}

void AddOutbox(Figures& figures, const Outbox& outbox) {
    figures.Add(Gauge("outbox.waiting", EVENTS, "Events in the outbox that were not delivered yet."),
                outbox.waiting);
    figures.Add(Gauge("outbox.waiting_bytes", BYTES, "Bytes of these events."), outbox.waitingBytes);
    figures.Add(Counter("outbox.delivered", EVENTS, "Events that the collector took.", outbox.begunAtMs),
                outbox.delivered);
    figures.Add(Counter("outbox.refused", EVENTS, "Events that the collector took in a request and rejected.",
                        outbox.begunAtMs),
                outbox.refused);
    figures.Add(Counter("outbox.dropped", EVENTS, "Events that were dropped for a cap on size or age.",
                        outbox.begunAtMs),
                outbox.dropped);
    figures.Add(
        Gauge("outbox.dead_letters", EVENTS, "Events that the collector refused for good and that are kept."),
        outbox.deadLetters);
}

} // namespace

std::vector<Figure> FiguresOf(const Status& status, const Judgement& judgement) {
    Figures figures;
    figures.Add(Gauge("up", "1", "1 while the service runs and listens, else 0."),
                judgement.verdict == Verdict::Down ? 0 : 1);
    AddLedger(figures, status.ledger);
    if (status.service.startedAtMs)
        figures
            .Begin(
                Gauge("start_time_seconds", "s", "When the running service started, in seconds since 1970."))
            .samples.push_back({{}, static_cast<double>(*status.service.startedAtMs) / 1000});
    if (status.store.isPresent) {
        figures.Add(Gauge("store.bytes", BYTES, "Size of the store's file."), status.store.bytes);
        figures.Add(Gauge("store.wal_bytes", BYTES, "Size of the write-ahead log beside it."),
                    status.store.walBytes);
    }
    AddOutbox(figures, status.outbox);
    figures.Add(Gauge("log.bytes", BYTES, "Size of all files of the log."), status.log.bytes);
    figures.Add(Gauge("disk.free_bytes", BYTES, "Room for this user where the service keeps its data."),
                status.disk.freeBytes);
    return figures.Take();
}

} // namespace reportctl::status
