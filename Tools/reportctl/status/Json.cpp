#include <algorithm>
#include <array>
#include <cmath>

#include <fmt/format.h>
#include <rapidjson/prettywriter.h>
#include <rapidjson/stringbuffer.h>

#include "SystemTool/Text/Utf8.h"
#include "Tools/reportctl/status/Names.h"
#include "Tools/reportctl/status/Status.h"
#include "Tools/reportctl/terminal/Json.h"
#include "Tools/reportctl/terminal/WrittenTime.h"

namespace reportctl::status {
namespace {

using ReportLedger::Counts;

constexpr std::array VERDICTS{"healthy", "degraded", "down"};

/// Writes JSON. The members are in the order in which they are added.
class Writer {
public:
    Writer() : m_writer(m_text) { m_writer.SetIndent(' ', 2); }

    void Begin(const char* key = nullptr) {
        Key(key);
        m_writer.StartObject();
    }
    void End() { m_writer.EndObject(); }
    void BeginList(const char* key) {
        Key(key);
        m_writer.StartArray();
    }
    void EndList() { m_writer.EndArray(); }

    void Add(const char* key, bool value) { Key(key), m_writer.Bool(value); }
    void Add(const char* key, int value) { Key(key), m_writer.Int(value); }
    void Add(const char* key, std::int64_t value) { Key(key), m_writer.Int64(value); }
    void Add(const char* key, std::uint64_t value) { Key(key), m_writer.Uint64(value); }
    void Add(const char* key, double value) { Key(key), m_writer.Double(value); }
    void Add(const char* key, const char* value) { Add(key, std::string(value)); }
    void Add(const char* key, const std::string& value) {
        const auto text = SystemTool::Text::ValidUtf8(value);
        Key(key);
        m_writer.String(text.data(), static_cast<rapidjson::SizeType>(text.size()));
    }
    void AddNull(const char* key) { Key(key), m_writer.Null(); }

    /// Writes null when there is no value.
    template <typename Value>
    void Add(const char* key, const std::optional<Value>& value) {
        value ? Add(key, *value) : AddNull(key);
    }

    /// Writes a time; 0 means never and is written as null.
    void AddTime(const char* key, std::int64_t ms) {
        ms == 0 ? AddNull(key) : Add(key, terminal::UtcTime(terminal::At(ms)));
    }

    std::string Text() const { return terminal::ShownJson({m_text.GetString(), m_text.GetSize()}) + "\n"; }

private:
    void Key(const char* key) {
        if (key != nullptr)
            m_writer.Key(key);
    }

    rapidjson::StringBuffer m_text;
    rapidjson::PrettyWriter<rapidjson::StringBuffer> m_writer;
};

double Rounded(double value, double to) {
    return std::round(value * to) / to;
}

void Add(Writer& json, const char* key, const std::optional<PortHolder>& holder) {
    if (!holder)
        return json.AddNull(key);
    json.Begin(key);
    json.Add("pid", holder->process);
    json.Add("name", holder->name);
    holder->user.empty() ? json.AddNull("user") : json.Add("user", holder->user);
    json.End();
}

void Add(Writer& json, const Service& service, std::int64_t nowMs) {
    json.Begin("service");
    json.Add("running", service.isRunning);
    json.Add("pid", service.process);
    json.AddTime("startedAt", service.startedAtMs.value_or(0));
    if (service.startedAtMs)
        json.Add("uptimeSeconds",
                 static_cast<double>(std::max<std::int64_t>(0, nowMs - *service.startedAtMs)) / 1000);
    else
        json.AddNull("uptimeSeconds");
    json.Add("version", service.version);
    json.Add("buildId", service.buildId);
    json.Add("listening", service.isListening);
    Add(json, "portHolder", service.portHolder);
    Add(json, "lockHolder", service.lockHolder);
    json.Begin("plugins");
    json.Add("logger", service.hasLogger);
    json.Add("store", service.hasStore);
    json.Add("sdk", service.hasSdk);
    json.End();
    json.End();
}

void Add(Writer& json, const char* key, const Counts& counts) {
    json.Begin(key);
    for (const Name& name : COUNTERS) {
        if (name.place == Place(ReportLedger::Outcome::Stored)) {
            json.Add("waiting", ReportLedger::WaitingIn(counts));
            json.Add("mostWaiting", counts[ReportLedger::MOST_WAITING]);
        }
        if (name.place == ReportLedger::LOST_AT_ENDS) {
            json.Begin("refused");
            for (const Name& reason : REASONS)
                json.Add(reason.json, counts[reason.place]);
            json.End();
        }
        json.Add(name.json, counts[name.place]);
    }
    json.End();
}

std::int64_t LastRefusedMs(const ReportLedger::Look& look) {
    std::uint64_t last = 0;
    for (const Name& reason : REASONS)
        last = std::max(last, look.lastMs[reason.place]);
    return static_cast<std::int64_t>(last);
}

void Add(Writer& json, const ReportLedger::Look& look, const ledger::Rates& rates) {
    if (look.sight != ReportLedger::Sight::Sound)
        return json.AddNull("ledger");
    const auto last = [&](unsigned place) { return static_cast<std::int64_t>(look.lastMs[place]); };
    json.Begin("ledger");
    json.Add("balanced", look.balanced);
    Add(json, "total", look.total);
    if (look.counting)
        Add(json, "sinceStart", SinceStart(look));
    else
        json.AddNull("sinceStart");
    json.AddTime("lastReceivedAt", last(ReportLedger::RECEIVED));
    json.AddTime("lastStoredAt", last(Place(ReportLedger::Outcome::Stored)));
    json.AddTime("lastToAnalyticsAt", last(Place(ReportLedger::Outcome::ToAnalytics)));
    json.AddTime("lastRefusedAt", LastRefusedMs(look));
    json.Begin("perSecond");
    json.Add("received", Rounded(rates.received, 100));
    json.Add("stored", Rounded(rates.stored, 100));
    json.Add("refused", Rounded(rates.refused, 100));
    json.End();
    json.End();
}

void Add(Writer& json, const Store& store) {
    json.Begin("store");
    json.Add("path", store.path);
    json.Add("present", store.isPresent);
    json.Add("bytes", store.bytes);
    json.Add("walBytes", store.walBytes);
    json.Add("schemaVersion", store.schemaVersion);
    json.Add("rows", store.rows);
    json.Add("newestCreateTime", store.newestCreateTime);
    json.End();
}

void Add(Writer& json, const Outbox& outbox) {
    json.Begin("outbox");
    json.Add("path", outbox.path);
    json.Add("present", outbox.isPresent);
    json.Add("waiting", outbox.waiting);
    json.Add("waitingBytes", outbox.waitingBytes);
    json.Add("delivered", outbox.delivered);
    json.Add("refused", outbox.refused);
    json.Add("deadLetters", outbox.deadLetters);
    json.Add("dropped", outbox.dropped);
    json.BeginList("modules");
    for (const auto& module : outbox.modules) {
        json.Begin();
        json.Add("id", module.id);
        json.Add("waiting", module.waiting);
        json.Add("lastSequence", module.lastSequence);
        json.End();
    }
    json.EndList();
    json.Add("endpoint", outbox.endpoint);
    json.Add("lastFailure", outbox.lastFailure);
    json.Add("lastDeliveredAt",
             outbox.lastDeliveredAtMs
                 ? std::optional(terminal::UtcTime(terminal::At(*outbox.lastDeliveredAtMs)))
                 : std::nullopt);
    json.End();
}

void Add(Writer& json, const Log& log) {
    json.Begin("log");
    json.Add("directory", log.directory);
    json.Add("bytes", log.bytes);
    json.Add("errors", log.errors);
    json.Add("warnings", log.warnings);
    json.BeginList("last");
    for (const auto& line : log.last) {
        json.Begin();
        json.Add("time", terminal::UtcTime(terminal::At(line.atMs)));
        json.Add("level", line.level);
        json.Add("site", line.site);
        json.Add("text", line.text);
        json.End();
    }
    json.EndList();
    json.End();
}

} // namespace

std::string JsonOf(const Status& status, const Judgement& judgement) {
    Writer json;
    json.Begin();
    json.Add("verdict", VERDICTS[static_cast<std::size_t>(judgement.verdict)]);
    json.BeginList("reasons");
    for (const auto& reason : judgement.reasons)
        json.Add(nullptr, reason);
    json.EndList();
    Add(json, status.service, status.atMs);
    Add(json, status.ledger, status.lastMinute);
    Add(json, status.store);
    Add(json, status.outbox);
    Add(json, status.log);
    json.Begin("disk");
    json.Add("freeBytes", status.disk.freeBytes);
    json.End();
    json.End();
    return json.Text();
}

} // namespace reportctl::status
