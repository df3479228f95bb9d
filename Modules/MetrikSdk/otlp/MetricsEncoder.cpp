#include "Modules/MetrikSdk/otlp/MetricsEncoder.h"

#include <cmath>

#include "Modules/MetrikSdk/otlp/Parts.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk::otlp {
namespace {

/// AGGREGATION_TEMPORALITY_CUMULATIVE. The protocol's JSON writes an enumerator as its number.
constexpr int CUMULATIVE = 2;

/// A start that is not known is left out.
constexpr WallTime UNKNOWN{};

class Encoder {
public:
    Encoder(const MetricsSender& sender, const ResourceConfig& config) : m_sender(sender), m_config(config) {}

    std::string operator()(const std::vector<Metric>& metrics) {
        m_writer.StartObject();
        m_writer.Key("resourceMetrics");
        m_writer.StartArray();
        m_writer.StartObject();
        m_writer.Key("resource");
        WriteResource(m_writer, m_config, m_sender.installation, m_sender.program);
        ScopeMetrics(metrics);
        WriteTextMember(m_writer, "schemaUrl", SCHEMA_URL);
        m_writer.EndObject();
        m_writer.EndArray();
        m_writer.EndObject();
        return {m_buffer.GetString(), m_buffer.GetSize()};
    }

private:
    void ScopeMetrics(const std::vector<Metric>& metrics) {
        m_writer.Key("scopeMetrics");
        m_writer.StartArray();
        m_writer.StartObject();
        m_writer.Key("scope");
        WriteScope(m_writer);
        m_writer.Key("metrics");
        m_writer.StartArray();
        for (const auto& metric : metrics)
            Write(metric);
        m_writer.EndArray();
        WriteTextMember(m_writer, "schemaUrl", SCHEMA_URL);
        m_writer.EndObject();
        m_writer.EndArray();
    }

    void Write(const Metric& metric) {
        m_writer.StartObject();
        WriteTextMember(m_writer, "name", SystemTool::Text::ValidUtf8(metric.name));
        WriteTextMember(m_writer, "description", SystemTool::Text::ValidUtf8(metric.description));
        WriteTextMember(m_writer, "unit", metric.unit);
        m_writer.Key(metric.countsSince ? "sum" : "gauge");
        m_writer.StartObject();
        if (metric.countsSince) {
            m_writer.Key("aggregationTemporality");
            m_writer.Int(CUMULATIVE);
            m_writer.Key("isMonotonic");
            m_writer.Bool(true);
        }
        m_writer.Key("dataPoints");
        m_writer.StartArray();
        for (const auto& point : metric.points)
            Write(point, metric.countsSince);
        m_writer.EndArray();
        m_writer.EndObject();
        m_writer.EndObject();
    }

    void Write(const MetricPoint& point, const std::optional<WallTime>& countsSince) {
        m_writer.StartObject();
        if (countsSince.value_or(UNKNOWN) != UNKNOWN)
            WriteTextMember(m_writer, "startTimeUnixNano", Nanoseconds(*countsSince));
        WriteTextMember(m_writer, "timeUnixNano", Nanoseconds(m_sender.now));
        Value(point);
        m_writer.Key("attributes");
        m_writer.StartArray();
        for (const auto& [key, value] : point.attributes)
            WriteTextAttribute(m_writer, SystemTool::Text::ValidUtf8(key), value);
        m_writer.EndArray();
        m_writer.EndObject();
    }

    void Value(const MetricPoint& point) {
        if (const auto* integer = std::get_if<std::int64_t>(&point.value)) {
            WriteTextMember(m_writer, "asInt", std::to_string(*integer));
            return;
        }
        const double number = std::get<double>(point.value);
        m_writer.Key("asDouble");
        m_writer.Double(std::isfinite(number) ? number : 0); // JSON has no other numbers
    }

    const MetricsSender& m_sender;
    const ResourceConfig& m_config;
    SystemTool::IO::JsonBuffer m_buffer;
    SystemTool::IO::JsonWriter m_writer{m_buffer};
};

} // namespace

std::string EncodeMetrics(const std::vector<Metric>& metrics, const MetricsSender& sender,
                          const ResourceConfig& config) {
    return Encoder(sender, config)(metrics);
}

} // namespace MetrikSdk::otlp
