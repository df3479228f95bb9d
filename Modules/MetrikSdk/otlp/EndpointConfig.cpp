#include "Modules/MetrikSdk/otlp/EndpointConfig.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <memory>
#include <stdexcept>

#include "Modules/MetrikSdk/otlp/CurlLibrary.h"
#include "Modules/MetrikSdk/otlp/VariableText.h"

namespace MetrikSdk::otlp {
namespace {

constexpr const char* COMMON_PREFIX = "OTEL_EXPORTER_OTLP_";

/// What differs between the signals.
struct SignalNames {
    std::string prefix; ///< Of its own variables.
    std::string path;   ///< Behind the common endpoint.
    std::string exporter;
};

SignalNames NamesOf(Signal signal) {
    if (signal == Signal::Metrics)
        return {"OTEL_EXPORTER_OTLP_METRICS_", "v1/metrics", "OTEL_METRICS_EXPORTER"};
    return {"OTEL_EXPORTER_OTLP_LOGS_", "v1/logs", "OTEL_LOGS_EXPORTER"};
}

/// Variables of the same family that have no effect. Our own rules decide instead; docs/Outbox.md describes
/// them.
constexpr std::array NOT_HONOURED{"OTEL_CONFIG_FILE",
                                  "OTEL_BLRP_SCHEDULE_DELAY",
                                  "OTEL_BLRP_EXPORT_TIMEOUT",
                                  "OTEL_BLRP_MAX_QUEUE_SIZE",
                                  "OTEL_BLRP_MAX_EXPORT_BATCH_SIZE",
                                  "OTEL_ATTRIBUTE_VALUE_LENGTH_LIMIT",
                                  "OTEL_ATTRIBUTE_COUNT_LIMIT",
                                  "OTEL_LOGRECORD_ATTRIBUTE_VALUE_LENGTH_LIMIT",
                                  "OTEL_LOGRECORD_ATTRIBUTE_COUNT_LIMIT"};

/// The same for metrics: the caller decides when it sends them.
constexpr std::array NOT_HONOURED_FOR_METRICS{"OTEL_METRIC_EXPORT_INTERVAL", "OTEL_METRIC_EXPORT_TIMEOUT"};

using Url = std::unique_ptr<CURLU, decltype(&::curl_url_cleanup)>;

std::string Part(const Url& url, CURLUPart part) {
    char* text = nullptr;
    if (Curl().url_get(url.get(), part, &text, 0) != CURLUE_OK)
        return {};
    const std::unique_ptr<char, decltype(&::curl_free)> owner(text, Curl().free);
    return text;
}

/// Null when `text` is no http or https URL.
Url ParseUrl(const std::string& text) {
    Url url(Curl().url(), Curl().url_cleanup);
    const bool parsed = Curl().url_set(url.get(), CURLUPART_URL, text.c_str(), 0) == CURLUE_OK;
    const auto scheme = parsed ? Part(url, CURLUPART_SCHEME) : std::string();
    if (scheme != "http" && scheme != "https")
        url.reset();
    return url;
}

bool IsToken(const std::string& name) {
    return !name.empty() && name.find_first_not_of("!#$%&'*+-.^_`|~0123456789abcdefghijklmnopqrstuvwxyz"
                                                   "ABCDEFGHIJKLMNOPQRSTUVWXYZ") == std::string::npos;
}

/// A line feed in a value would add another header to the request.
bool IsHeaderValue(const std::string& value) {
    return std::none_of(value.begin(), value.end(), [](unsigned char c) { return c < 0x20 && c != '\t'; });
}

/// The name of a header that is no token, as people may see it; empty when it may be a part of a secret. The
/// '=' may be the end of a secret in base64. A text with a colon may be a whole header, of which only the
/// name is shown.
std::string ShownName(const std::string& name, const std::string& value) {
    if (value.find_first_not_of('=') == std::string::npos)
        return {};
    return Trimmed(name.substr(0, name.find(':')));
}

/// Whether the header describes the body. Only we set those headers.
bool IsReserved(const std::string& name) {
    const auto lower = LowerCase(name);
    return lower == "content-type" || lower == "content-encoding" || lower == "content-length" ||
           lower == "transfer-encoding";
}

class Reader {
public:
    Reader(const LookUp& lookUp, std::vector<std::string>& complaints, Signal signal)
        : m_names(NamesOf(signal)), m_lookUp(lookUp), m_complaints(complaints) {}

    /// The variable that switches sending off, with its value; empty when none does.
    std::string DisabledBy() {
        const auto disabled = LowerCase(Value("OTEL_SDK_DISABLED"));
        if (!disabled.empty() && disabled != "true" && disabled != "false")
            m_complaints.emplace_back("OTEL_SDK_DISABLED is neither true nor false and counts as unset");
        if (disabled == "true")
            return "OTEL_SDK_DISABLED=true";
        return IsExporterNone() ? m_names.exporter + "=none" : "";
    }

    std::optional<EndpointConfig> Read() {
        EndpointConfig config;
        ReadUrl(config);
        if (config.url.empty())
            return std::nullopt;
        ReadHeaders(config);
        ReadTimeout(config);
        ReadCompression(config);
        config.certificate = Pair("CERTIFICATE").value;
        config.clientKey = Pair("CLIENT_KEY").value;
        config.clientCertificate = Pair("CLIENT_CERTIFICATE").value;
        ReadWhatIsNotHonoured();
        return config;
    }

private:
    struct Variable {
        std::string name;
        std::string value;
    };

    std::string Value(const std::string& name) const {
        const char* value = m_lookUp(name.c_str());
        return value == nullptr ? std::string() : Trimmed(value);
    }

    /// Of each pair of variables, the one for this signal wins.
    Variable Pair(const std::string& name) const {
        Variable variable{m_names.prefix + name, Value(m_names.prefix + name)};
        if (variable.value.empty())
            variable = {COMMON_PREFIX + name, Value(COMMON_PREFIX + name)};
        return variable;
    }

    /// Calls `accept` with the signal's own variable and then with the common one, as far as they are set,
    /// until it returns true.
    template <typename Accept>
    void OfferPair(const std::string& name, Accept accept) {
        for (const std::string& prefix : {m_names.prefix, std::string(COMMON_PREFIX)}) {
            const Variable variable{prefix + name, Value(prefix + name)};
            if (!variable.value.empty() && accept(variable))
                return;
        }
    }

    /// The variable is a list of exporters. The only exporter that we have is otlp.
    bool IsExporterNone() {
        const auto exporters = LowerCase(Value(m_names.exporter));
        if (!exporters.empty() && exporters != "none" && exporters != "otlp")
            m_complaints.push_back(m_names.exporter + ": only otlp and none are known, and otlp is used");
        return exporters == "none";
    }

    /// Complains about variables without effect, because a person who set one of them expects an effect.
    void ReadWhatIsNotHonoured() {
        if (const auto protocol = Pair("PROTOCOL");
            !protocol.value.empty() && LowerCase(protocol.value) != "http/json")
            m_complaints.push_back(protocol.name + ": only http/json is spoken, and is spoken all the same");
        if (const auto insecure = Pair("INSECURE"); !insecure.value.empty())
            m_complaints.push_back(insecure.name + " has no effect: the address says http or https");
        ComplainOf(NOT_HONOURED);
        if (m_names.exporter == "OTEL_METRICS_EXPORTER")
            ReadWhatMetricsDoNotHonour();
    }

    void ReadWhatMetricsDoNotHonour() {
        ComplainOf(NOT_HONOURED_FOR_METRICS);
        const auto temporality = m_names.prefix + "TEMPORALITY_PREFERENCE";
        if (const auto value = LowerCase(Value(temporality)); !value.empty() && value != "cumulative")
            m_complaints.push_back(temporality + ": only cumulative is known, and is used");
    }

    template <typename Names>
    void ComplainOf(const Names& names) {
        for (const char* name : names)
            if (!Value(name).empty())
                m_complaints.push_back(std::string(name) + " has no effect");
    }

    void ReadUrl(EndpointConfig& config) {
        OfferPair("ENDPOINT", [&](const Variable& endpoint) {
            config.variables.endpoint = endpoint.name;
            config.url = UrlOf(endpoint);
            if (config.url.empty())
                m_complaints.push_back(endpoint.name + " is no http or https URL and counts as unset");
            return !config.url.empty();
        });
    }

    /// The URL for the signal; empty when the variable is no http or https URL.
    std::string UrlOf(const Variable& endpoint) const {
        const auto url = ParseUrl(endpoint.value);
        if (!url)
            return {};
        if (endpoint.name.starts_with(m_names.prefix))
            return endpoint.value;
        auto path = Part(url, CURLUPART_PATH);
        path += (path.ends_with('/') ? "" : "/");
        Curl().url_set(url.get(), CURLUPART_PATH, (path + m_names.path).c_str(), 0);
        return Part(url, CURLUPART_URL);
    }

    void ReadHeaders(EndpointConfig& config) {
        const auto headers = Pair("HEADERS");
        config.variables.headers = headers.name;
        int number = 0;
        for (std::size_t start = 0; start < headers.value.size();) {
            const auto end = std::min(headers.value.find(',', start), headers.value.size());
            const auto text = Trimmed(headers.value.substr(start, end - start));
            const auto complaint = ReadHeader(text, ++number, config);
            if (!complaint.empty())
                m_complaints.push_back(headers.name + ": " + complaint + " and is not sent");
            start = end + 1;
        }
    }

    /// Returns what is wrong with the header; empty when it is right. A text without a name may be a secret,
    /// so it is not repeated.
    static std::string ReadHeader(const std::string& text, int number, EndpointConfig& config) {
        if (text.empty())
            return {};
        const auto equals = text.find('=');
        const auto name = Trimmed(text.substr(0, equals));
        const auto encoded = equals == std::string::npos ? "" : Trimmed(text.substr(equals + 1));
        if (!IsToken(name) || equals == std::string::npos)
            return WrongName(number, ShownName(name, encoded));
        const auto value = PercentDecoded(encoded);
        if (!IsHeaderValue(value))
            return "the value of header " + name + " has control characters";
        if (IsReserved(name))
            return "header " + name + " describes the body,";
        config.headers.emplace_back(name, value);
        return {};
    }

    static std::string WrongName(int number, const std::string& shown) {
        const auto header = "header " + std::to_string(number);
        return header + (shown.empty() ? " has no name and '='"
                                       : " has the name \"" + shown + "\", which no header can have,");
    }

    void ReadTimeout(EndpointConfig& config) {
        OfferPair("TIMEOUT", [&](const Variable& timeout) {
            const bool valid = ParseTimeout(timeout.value, config.timeout);
            if (!valid)
                m_complaints.push_back(timeout.name +
                                       " is no positive number of milliseconds and counts as unset");
            return valid;
        });
    }

    static bool ParseTimeout(const std::string& text, std::chrono::milliseconds& timeout) {
        constexpr std::int64_t MAX_MS = 600'000; // a request that takes longer than ten minutes never ends
        std::int64_t milliseconds = 0;
        const auto end = text.data() + text.size();
        const auto parsed = std::from_chars(text.data(), end, milliseconds);
        if (parsed.ec != std::errc() || parsed.ptr != end || milliseconds <= 0)
            return false;
        timeout = std::chrono::milliseconds(std::min(milliseconds, MAX_MS));
        return true;
    }

    void ReadCompression(EndpointConfig& config) {
        OfferPair("COMPRESSION", [&](const Variable& compression) {
            const auto word = LowerCase(compression.value);
            const bool valid = word == "gzip" || word == "none";
            if (valid) {
                config.gzip = word == "gzip";
                config.variables.compression = compression.name;
            } else {
                m_complaints.push_back(compression.name + " is neither gzip nor none and counts as unset");
            }
            return valid;
        });
    }

    const SignalNames m_names;
    const LookUp& m_lookUp;
    std::vector<std::string>& m_complaints;
};

} // namespace

std::optional<EndpointConfig> ReadEndpoint(const LookUp& lookUp, std::vector<std::string>& complaints,
                                           Signal signal) {
    Reader reader(lookUp, complaints, signal);
    if (!reader.DisabledBy().empty())
        return std::nullopt;
    try {
        return reader.Read();
    } catch (const std::runtime_error& error) { // libcurl cannot be opened; the events wait in the outbox
        complaints.push_back(std::string("No event is sent: ") + error.what());
        return std::nullopt;
    }
}

std::string DisabledBy(const LookUp& lookUp, Signal signal) {
    std::vector<std::string> complaints; // ReadEndpoint gives them to the caller
    return Reader(lookUp, complaints, signal).DisabledBy();
}

std::string WithoutSecrets(const std::string& url) {
    const auto parsed = ParseUrl(url);
    if (!parsed)
        return "(no URL)";
    for (const auto part : {CURLUPART_USER, CURLUPART_PASSWORD, CURLUPART_QUERY, CURLUPART_FRAGMENT})
        Curl().url_set(parsed.get(), part, nullptr, 0);
    return Part(parsed, CURLUPART_URL);
}

} // namespace MetrikSdk::otlp
