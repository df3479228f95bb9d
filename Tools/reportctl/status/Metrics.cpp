#include <fmt/format.h>

#include "Tools/reportctl/status/Names.h"
#include "Tools/reportctl/status/Status.h"

namespace reportctl::status {
namespace {

using ReportLedger::Counts;

/// Writes families of samples, each with its help and type. A family whose value is not known is left out.
class Families {
public:
    void Begin(const std::string& name, const char* type, const char* help) {
        m_text +=
            fmt::format("# HELP hublink_report_{0} {1}\n# TYPE hublink_report_{0} {2}\n", name, help, type);
    }
    template <typename Value>
    void Sample(const std::string& nameAndLabels, Value value) {
        m_text += fmt::format("hublink_report_{} {}\n", nameAndLabels, value);
    }

    template <typename Value>
    void Add(const std::string& name, const char* type, const char* help, Value value) {
        Begin(name, type, help);
        Sample(name, value);
    }
    template <typename Value>
    void Add(const std::string& name, const char* type, const char* help, const std::optional<Value>& value) {
        if (value)
            Add(name, type, help, *value);
    }

    const std::string& Text() const { return m_text; }

private:
    std::string m_text;
};

void AddLedger(Families& families, const ReportLedger::Look& look) {
    if (look.sight != ReportLedger::Sight::Sound)
        return;
    for (const Name& name : COUNTERS)
        families.Add(fmt::format("{}_total", name.metric), "counter", name.help, look.total[name.place]);
    families.Begin("refused_total", "counter", "Reports that ended nowhere, by the reason.");
    for (const Name& reason : REASONS)
        families.Sample(fmt::format("refused_total{{reason=\"{}\"}}", reason.json), look.total[reason.place]);
    families.Add("waiting", "gauge", "Reports in the queue now.", ReportLedger::WaitingIn(look.total));
    families.Add("most_waiting", "gauge", "The most reports that ever were in the queue.",
                 look.total[ReportLedger::MOST_WAITING]);
}

void AddOutbox(Families& families, const Outbox& outbox) {
    families.Add("outbox_waiting", "gauge", "Events in the outbox that were not delivered yet.",
                 outbox.waiting);
    families.Add("outbox_waiting_bytes", "gauge", "Bytes of these events.", outbox.waitingBytes);
    families.Add("outbox_delivered_total", "counter", "Events that the collector took.", outbox.delivered);
    families.Add("outbox_refused_total", "counter",
                 "Events that the collector took in a request and rejected.", outbox.refused);
    families.Add("outbox_dropped_total", "counter", "Events that were dropped for a cap on size or age.",
                 outbox.dropped);
    families.Add("outbox_dead_letters", "gauge",
                 "Events that the collector refused for good and that are kept.", outbox.deadLetters);
}

} // namespace

std::string MetricsOf(const Status& status, const Judgement& judgement) {
    Families families;
    families.Add("up", "gauge", "1 while the service runs and listens, else 0.",
                 judgement.verdict == Verdict::Down ? 0 : 1);
    AddLedger(families, status.ledger);
    if (status.service.startedAtMs)
        families.Add("start_time_seconds", "gauge",
                     "When the running service started, in seconds since 1970.",
                     fmt::format("{:.3f}", static_cast<double>(*status.service.startedAtMs) / 1000));
    if (status.store.isPresent) {
        families.Add("store_bytes", "gauge", "Size of the store's file.", status.store.bytes);
        families.Add("store_wal_bytes", "gauge", "Size of the write-ahead log beside it.",
                     status.store.walBytes);
    }
    AddOutbox(families, status.outbox);
    families.Add("log_bytes", "gauge", "Size of all files of the log.", status.log.bytes);
    families.Add("disk_free_bytes", "gauge", "Room for this user where the service keeps its data.",
                 status.disk.freeBytes);
    return families.Text();
}

} // namespace reportctl::status
