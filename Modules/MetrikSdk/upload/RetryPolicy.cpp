#include "Modules/MetrikSdk/upload/RetryPolicy.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <string_view>

#include <strings.h>

#include "Modules/MetrikSdk/otlp/RetryAfter.h"
#include "SystemTool/IO/JsonDocument.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk::upload::RetryPolicy {
namespace {

/// How much of an answer's text a person wants to read.
constexpr std::size_t MAX_QUOTED_BYTES = 300;

bool IsSuccess(long status) {
    return status >= 200 && status < 300;
}

/// A hotel's log-in page answers every plain request with 200 and a page. Collectors answer that with JSON, with
/// nothing, or with a word; a page of theirs comes with errors only, from the proxy before them.
bool IsWebPage(const otlp::HttpResult& result) {
    static constexpr std::string_view PAGE = "text/html"; // media types have no letter case
    return ::strncasecmp(result.contentType.c_str(), PAGE.data(), PAGE.size()) == 0;
}

bool AsksToWait(long status) {
    return status == 429 || status == 502 || status == 503 || status == 504;
}

std::string OneLine(const std::string& text) {
    auto line = SystemTool::Text::ValidUtf8(SystemTool::Text::CutUtf8(text, MAX_QUOTED_BYTES));
    std::replace_if(
        line.begin(), line.end(), [](char c) { return static_cast<unsigned char>(c) < 0x20; }, ' ');
    return line;
}

SystemTool::IO::JsonDocument ParseAnswer(const std::string& body) {
    SystemTool::IO::JsonDocument answer;
    std::string error;
    answer.FromJson(body, error);
    return answer;
}

} // namespace

Verdict Judge(const otlp::HttpResult& result) {
    if (!result.fault.empty())
        return result.began ? Verdict::WaitAndHalve : Verdict::Wait;
    if (IsSuccess(result.status))
        return IsWebPage(result) ? Verdict::Wait : Verdict::Delete;
    // A redirect is the address's fault and not the events'. It is not followed: it could carry the
    // credentials to another host.
    if (result.status < 400)
        return Verdict::Wait;
    if (AsksToWait(result.status))
        return Verdict::WaitThenHalve;
    return result.status == 413 ? Verdict::HalveForSize : Verdict::Halve;
}

PartialSuccess ReadPartialSuccess(const otlp::HttpResult& result, std::size_t sent) {
    const auto partial = ParseAnswer(result.body).GetKeyValue("partialSuccess");
    // A 64-bit integer, so a text by the protocol's rules; some collectors write a number.
    const auto text = partial.GetKeyValue("rejectedLogRecords").ToString();
    std::uint64_t rejected = 0;
    const auto parsed = std::from_chars(text.data(), text.data() + text.size(), rejected);
    if (parsed.ec != std::errc())
        return {0, {}};
    return {static_cast<std::size_t>(std::min<std::uint64_t>(rejected, sent)),
            OneLine(partial.GetKeyValue("errorMessage").ToString())};
}

std::chrono::milliseconds WaitBefore(const otlp::HttpResult& result, int failures, double random,
                                     WallTime now, const RetrySettings& settings) {
    const auto doubled = static_cast<double>(settings.firstWait.count()) * std::pow(2.0, failures - 1);
    const auto ceiling = std::min(doubled, static_cast<double>(settings.maxWait.count()));
    const std::chrono::milliseconds own(static_cast<std::int64_t>(random * ceiling));
    const auto wished = otlp::ParseRetryAfter(result.retryAfter, now).value_or(std::chrono::milliseconds(0));
    return std::max(own, std::min(wished, settings.maxRetryAfter));
}

std::string Describe(const otlp::HttpResult& result) {
    if (!result.fault.empty())
        return OneLine(result.fault);
    const auto status = "HTTP status " + std::to_string(result.status);
    const auto message = ParseAnswer(result.body).GetKeyValue("message").ToString();
    const auto text = OneLine(message.empty() ? result.body : message);
    return text.empty() ? status : status + ": " + text;
}

} // namespace MetrikSdk::upload::RetryPolicy
