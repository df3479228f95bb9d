#include "Tools/reportctl/outbox/CollectorTest.h"

#include <array>
#include <memory>
#include <vector>

#include <Poco/URI.h>
#include <Poco/UUIDGenerator.h>
#include <fmt/format.h>
#include <netdb.h>

#include "Common/Wire.h"
#include "Modules/MetrikSdk/otlp/HttpSender.h"
#include "Modules/MetrikSdk/otlp/OtlpEncoder.h"
#include "Modules/MetrikSdk/upload/RetryPolicy.h"
#include "SystemTool/IO/JsonDocument.h"
#include "SystemTool/Text/Utf8.h"
#include "SystemTool/Version.h"
#include "Tools/reportctl/terminal/Printable.h"

namespace reportctl::outbox {
namespace {

using MetrikSdk::otlp::EndpointConfig;
using MetrikSdk::otlp::HttpResult;
namespace RetryPolicy = MetrikSdk::upload::RetryPolicy;

constexpr std::size_t BODY_BYTES = 500;

bool HasProxy(const service::Environment& environment) {
    for (std::size_t i = 0; i < service::PROXIES.size() - 2; ++i)
        if (environment.Find(service::PROXIES[i]) != nullptr)
            return true;
    return false;
}

std::string TestEvent() {
    const auto now = MetrikSdk::WallNow();
    SystemTool::IO::JsonDocument extend;
    extend.SetKeyValue(Wire::CREATE_TIME, std::to_string(now.time_since_epoch().count()));
    SystemTool::IO::JsonDocument data;
    data.SetKeyValue("test", "sent by `reportctl outbox test`; no report");
    SystemTool::IO::JsonDocument payload;
    payload.SetKeyValue(Wire::EVENT_EXTEND, extend);
    payload.SetKeyValue(Wire::EVENT_DATA, data);
    return MetrikSdk::otlp::EncodeOtlp(
        {.outboxId = "reportctl-test",
         .events = {{.row = 1,
                     .uuid = Poco::UUIDGenerator::defaultGenerator().createRandom().toString(),
                     .release = 1,
                     .sequence = 1,
                     .eventId = "reportctl.test",
                     .payload = payload.ToJson(),
                     .storedAt = now,
                     .bytes = 0}},
         .releases = {{1, {"reportctl", SystemTool::Version::Number(), "reportctl"}}}});
}

/// Looks up the collector's name and prints the result. Returns false when the name has no address. With a
/// proxy, the proxy looks the name up.
bool TellNameResolution(const EndpointConfig& config, const service::Environment& environment) {
    const auto host = Poco::URI(config.url).getHost();
    if (HasProxy(environment)) {
        fmt::print("name resolution: by the proxy\n");
        return true;
    }
    addrinfo hints{};
    hints.ai_socktype = SOCK_STREAM;
    addrinfo* found = nullptr;
    const int code = ::getaddrinfo(host.c_str(), nullptr, &hints, &found);
    const std::unique_ptr<addrinfo, decltype(&::freeaddrinfo)> owner(found, &::freeaddrinfo);
    if (code != 0) {
        fmt::print("name resolution: failed: {}: {}\n", host, ::gai_strerror(code));
        return false;
    }
    std::array<char, NI_MAXHOST> address{};
    ::getnameinfo(found->ai_addr, found->ai_addrlen, address.data(), address.size(), nullptr, 0,
                  NI_NUMERICHOST);
    fmt::print("name resolution: {} is {}\n", host, address.data());
    return true;
}

std::string Beginning(const std::string& body) {
    const auto text = SystemTool::Text::CutUtf8(body, BODY_BYTES);
    return terminal::Printable(text) + (text.size() < body.size() ? "..." : "");
}

/// What becomes of the event, and what to say about it.
struct Told {
    bool isTaken = false;
    std::string words;
};

/// An answer of 200 may say in its body that the event was rejected.
Told TellSuccess(const HttpResult& result) {
    const auto partial = RetryPolicy::ReadPartialSuccess(result, 1);
    const auto message = terminal::Printable(partial.message);
    if (partial.rejected > 0)
        return {false, "refused for good, though the request was taken: events would be lost" +
                           (message.empty() ? "" : ": " + message)};
    if (!partial.impossible.empty())
        return {true, "taken, but the number of rejected events in the answer is none: " +
                          terminal::Printable(partial.impossible)};
    return {true, message.empty() ? "taken" : "taken, with a warning: " + message};
}

std::vector<std::string> HeaderNames(const EndpointConfig& config) {
    std::vector<std::string> names;
    for (const auto& [name, value] : config.headers)
        names.push_back(name);
    return names;
}

/// Judges by the uploader's own rules, because the test is to say what would become of the user's events.
Told Tell(const HttpResult& result, const EndpointConfig& config) {
    using MetrikSdk::upload::Verdict;
    switch (RetryPolicy::Judge(result)) {
    case Verdict::Delete:
        return TellSuccess(result);
    case Verdict::Halve:
    case Verdict::HalveForSize:
        return {false, "refused: events would become dead letters"};
    default:
        const auto advice = RetryPolicy::LookAt(result, HeaderNames(config), config.variables);
        return {false, "not taken: events would wait in the outbox" + (advice.empty() ? "" : "; " + advice)};
    }
}

bool TellAnswer(const EndpointConfig& config, const HttpResult& result) {
    const bool isTls = config.url.starts_with("https:");
    if (!result.fault.empty()) {
        const bool isFaultOfTls = isTls && (result.fault.find("SSL") != std::string::npos ||
                                            result.fault.find("certificate") != std::string::npos);
        fmt::print("{}: {}\n", isFaultOfTls ? "TLS: failed" : "no answer", terminal::Printable(result.fault));
        return false;
    }
    fmt::print("TLS: {}\n",
               isTls ? "the collector's certificate is trusted" : "none, the address begins with http:");
    const auto told = Tell(result, config);
    fmt::print("status: {}, {}\n", result.status, told.words);
    if (!result.body.empty())
        fmt::print("body: {}\n", Beginning(result.body));
    return told.isTaken;
}

} // namespace

bool TestCollector(const service::Environment& environment) {
    std::vector<std::string> complaints;
    const auto config =
        MetrikSdk::otlp::ReadEndpoint([&](const char* name) { return environment.Find(name); }, complaints);
    fmt::print("settings: {}\n",
               environment.process == 0
                   ? "of this environment; no service of this user runs"
                   : fmt::format("of the running service, process {}", environment.process));
    for (const auto& complaint : complaints)
        fmt::print("settings: {}\n", terminal::Printable(complaint));
    if (!config) {
        fmt::print("No collector is configured (OTEL_EXPORTER_OTLP_ENDPOINT): events stay in the outbox.\n");
        return false;
    }
    service::TakeOverProxies(environment);
    MetrikSdk::otlp::HttpSender sender(*config);
    fmt::print("collector: {}\n", terminal::Printable(sender.Destination()));
    return TellNameResolution(*config, environment) && TellAnswer(*config, sender.Post(TestEvent()));
}

} // namespace reportctl::outbox
