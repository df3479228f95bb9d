#include "Tools/reportctl/status/OutboxFailure.h"

#include <algorithm>
#include <string_view>

#include <fmt/format.h>

#include "Tools/reportctl/status/Recent.h"

namespace reportctl::status {
namespace {

constexpr std::string_view UPLOAD = "upload";

/// The words with which the outbox tells that a failure is over.
constexpr std::string_view TAKEN_AGAIN = "events are taken again";
constexpr std::string_view STORED_AGAIN = "Events are stored again";

/// The log has the cause and a hyphen before the outbox's text (docs/Outbox.md).
std::string_view CauseIn(std::string_view text) {
    return text.substr(0, text.find('-'));
}

/// Whether something worked after the line. A time of the future is from before the clock was set back.
bool WorkedAfter(const Log::Line& line, std::int64_t workedMs, std::int64_t nowMs) {
    return workedMs > line.atMs && workedMs - nowMs <= LONGEST_LOOK.count();
}

/// The other causes are told once, and nothing goes on to fail: a variable that has no effect, what a
/// collector says about events that it took, and events that were dropped or refused, which are counted.
bool Lasts(const Log::Line& line, const OutboxWorked& worked, std::int64_t nowMs) {
    const auto cause = CauseIn(line.text);
    if (cause == UPLOAD)
        return line.text.find(TAKEN_AGAIN) == std::string::npos &&
               !WorkedAfter(line, worked.deliveredAtMs, nowMs);
    if (cause == "outbox file" || cause == "directory")
        return line.text.find(STORED_AGAIN) == std::string::npos &&
               !WorkedAfter(line, std::max(worked.storedAtMs, worked.deliveredAtMs), nowMs);
    return (cause == "outbox vanished" || cause == "outbox damaged") && IsRecent(line.atMs, nowMs);
}

} // namespace

void TakeOutboxLine(std::vector<Log::Line>& lines, Log::Line line) {
    const auto cause = std::string(CauseIn(line.text));
    std::erase_if(lines, [&](const Log::Line& earlier) { return CauseIn(earlier.text) == cause; });
    lines.push_back(std::move(line));
}

void AddNotedFailure(std::vector<Log::Line>& lines, const Outbox& outbox, const LogWriter& writer) {
    // Without a collector, nothing is sent: the failure is one of earlier settings.
    if (!outbox.uploadFailedAtMs || !outbox.endpoint || *outbox.uploadFailedAtMs < writer.startedAtMs)
        return;
    const auto isLater = [&](const Log::Line& line) {
        return CauseIn(line.text) == UPLOAD && line.atMs >= *outbox.uploadFailedAtMs;
    };
    if (std::ranges::none_of(lines, isLater))
        TakeOutboxLine(
            lines, {*outbox.uploadFailedAtMs, "", "", fmt::format("{}-{}", UPLOAD, outbox.uploadFailure)});
}

std::optional<std::string> LastingFailure(const std::vector<Log::Line>& lines, const OutboxWorked& worked,
                                          std::int64_t nowMs) {
    const auto newest = std::find_if(lines.rbegin(), lines.rend(),
                                     [&](const Log::Line& line) { return Lasts(line, worked, nowMs); });
    return newest == lines.rend() ? std::nullopt : std::optional(newest->text);
}

} // namespace reportctl::status
