#include "Modules/MetrikSdk/upload/RetryPolicy.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <string_view>

#include <strings.h>

#include "Modules/MetrikSdk/otlp/RetryAfter.h"
#include "SystemTool/IO/JsonDocument.h"
#include "SystemTool/Text/Utf8.h"

namespace MetrikSdk::upload::RetryPolicy {
namespace {

/// How much of an answer's text goes into a message for people.
constexpr std::size_t MAX_QUOTED_BYTES = 300;

bool IsSuccess(long status) {
    return status >= 200 && status < 300;
}

/// Whether the answer is a web page. The log-in page of a hotel's network answers every plain request with
/// 200 and a page. A collector answers with JSON, with nothing, or with a word. Pages from a collector's
/// address come only with errors, from the proxy in front of it. A page may come without its type.
bool IsWebPage(const otlp::HttpResult& result) {
    static constexpr std::string_view PAGE = "text/html"; // media types may be in upper or lower case
    if (::strncasecmp(result.contentType.c_str(), PAGE.data(), PAGE.size()) == 0)
        return true;
    static constexpr std::string_view BYTE_ORDER_MARK = "\xef\xbb\xbf";
    std::string_view text = result.body;
    if (text.starts_with(BYTE_ORDER_MARK))
        text.remove_prefix(BYTE_ORDER_MARK.size());
    const auto first = text.find_first_not_of(" \t\r\n");
    return first != std::string_view::npos && text[first] == '<';
}

bool AsksToWait(long status) {
    return status == 429 || status == 502 || status == 503 || status == 504;
}

/// Whether the sender or the address is wrong, and not the events. (A firewall that dislikes one event
/// answers like this, too. So an event that is never taken while others are goes aside, as with any other
/// "later".)
bool IsConfigurationsFault(long status) {
    static constexpr std::array STATUSES{401L, 403L, 404L, 405L, 407L, 415L, 511L};
    return std::find(STATUSES.begin(), STATUSES.end(), status) != STATUSES.end();
}

std::string Credentials(const std::vector<std::string>& headers, const std::string& variable) {
    if (headers.empty())
        return "look at the credentials: " + variable + " names no header";
    std::string names;
    for (const auto& name : headers)
        names += (names.empty() ? "" : ", ") + name;
    return "look at the credentials: " + variable + " sets " + names;
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

std::chrono::milliseconds Part(double part, std::chrono::milliseconds whole) {
    return std::chrono::milliseconds(static_cast<std::int64_t>(part * static_cast<double>(whole.count())));
}

} // namespace

Verdict Judge(const otlp::HttpResult& result) {
    if (!result.fault.empty())
        return result.began ? Verdict::WaitAndHalve : Verdict::Wait;
    // A page or a redirect is rarely about the events. But a firewall that forbids one event may answer so.
    if (IsSuccess(result.status))
        return IsWebPage(result) ? Verdict::WaitThenHalve : Verdict::Delete;
    // We do not follow a redirect: it could carry the credentials to another host.
    if (result.status < 400)
        return Verdict::WaitThenHalve;
    if (AsksToWait(result.status) || IsConfigurationsFault(result.status))
        return Verdict::WaitThenHalve;
    return result.status == 413 ? Verdict::HalveForSize : Verdict::Halve;
}

PartialSuccess ReadPartialSuccess(const otlp::HttpResult& result, std::size_t sent) {
    if (result.body.empty())
        return {};
    const auto partial = ParseAnswer(result.body).GetKeyValue("partialSuccess");
    // By the protocol's rules, a 64-bit integer is a text. Some collectors write a number.
    const auto text = partial.GetKeyValue("rejectedLogRecords").ToString();
    std::uint64_t rejected = 0;
    const auto end = text.data() + text.size();
    const auto parsed = std::from_chars(text.data(), end, rejected);
    const bool isNumber = parsed.ec == std::errc() && parsed.ptr == end;
    if (parsed.ec != std::errc()) // a negative number, or a word
        rejected = 0;
    return {static_cast<std::size_t>(std::min<std::uint64_t>(rejected, sent)),
            OneLine(partial.GetKeyValue("errorMessage").ToString()),
            text.empty() || (isNumber && rejected <= sent) ? std::string() : OneLine(text)};
}

std::chrono::milliseconds WishedWait(const otlp::HttpResult& result, double random, WallTime now,
                                     const RetrySettings& settings) {
    const auto parsed = otlp::ParseRetryAfter(result.retryAfter, now).value_or(std::chrono::milliseconds(0));
    const auto wished = std::min(parsed, settings.maxRetryAfter);
    return wished + Part(random, std::min(wished, settings.maxRetryAfterSpread));
}

std::chrono::milliseconds WaitAtStart(double random, const RetrySettings& settings) {
    return Part(random, settings.startSpread);
}

std::chrono::milliseconds WaitBefore(const otlp::HttpResult& result, int failures, double random,
                                     WallTime now, const RetrySettings& settings) {
    const auto doubled = static_cast<double>(settings.firstWait.count()) * std::pow(2.0, failures - 1);
    const auto ceiling = std::min(doubled, static_cast<double>(settings.maxWait.count()));
    const std::chrono::milliseconds own(static_cast<std::int64_t>(random * ceiling));
    return std::max(own, WishedWait(result, random, now, settings));
}

std::string Describe(const otlp::HttpResult& result) {
    if (!result.fault.empty())
        return OneLine(result.fault);
    const auto status = "HTTP status " + std::to_string(result.status);
    const auto message = ParseAnswer(result.body).GetKeyValue("message").ToString();
    const auto text = OneLine(message.empty() ? result.body : message);
    return text.empty() ? status : status + ": " + text;
}

std::string LookAt(const otlp::HttpResult& result, const std::vector<std::string>& headers,
                   const otlp::VariableNames& variables) {
    if (result.status == 407 || result.proxyStatus == 407)
        return "look at the proxy and its credentials: https_proxy, http_proxy";
    if (!result.fault.empty())
        return {};
    if (result.status == 511 || (IsSuccess(result.status) && IsWebPage(result)))
        return "this is a page: the network may want a log-in, or the address be no collector's";
    if (result.status == 401 || result.status == 403)
        return Credentials(headers, variables.headers);
    if (result.status == 415)
        return "look at " + variables.compression + ": the collector may not unpack, or take no JSON";
    if (result.status == 404 || result.status == 405 || (result.status >= 300 && result.status < 400))
        return "look at the address: " + variables.endpoint;
    return {};
}

} // namespace MetrikSdk::upload::RetryPolicy
