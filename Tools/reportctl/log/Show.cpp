#include "Tools/reportctl/log/Show.h"

#include <algorithm>

#include <fmt/format.h>

#include "SystemTool/Text/Utf8.h"
#include "Tools/reportctl/terminal/Json.h"
#include "Tools/reportctl/terminal/Printable.h"
#include "Tools/reportctl/terminal/WrittenTime.h"

namespace reportctl::log {
namespace {

/// The beginning of a value that is shown: enough to recognise it, and short enough that the outcome fits on
/// the line.
constexpr std::size_t VALUE_BYTES = 48;
constexpr std::size_t LEAST_VALUE_BYTES = 12;
/// What a usual line has beside the value: time, kind, an event id of 14 characters, and "  -> toAnalytics".
constexpr std::size_t BESIDE_THE_VALUE = 68;

std::string Short(const std::string& text, std::size_t columns) {
    const auto room = columns == 0 ? VALUE_BYTES
                                   : std::clamp(columns, BESIDE_THE_VALUE + LEAST_VALUE_BYTES,
                                                BESIDE_THE_VALUE + VALUE_BYTES) -
                                         BESIDE_THE_VALUE;
    const auto beginning = SystemTool::Text::CutUtf8(text, room);
    return terminal::Printable(beginning) + (beginning.size() < text.size() ? "..." : "");
}

std::string Subject(const Entry& entry, std::size_t columns) {
    const auto& message = entry.message;
    if (!entry.isDatagram || !entry.isReadable || !message.fault.empty())
        return terminal::Printable(entry.line.message);
    if (message.kind == message::Kind::Control)
        return terminal::Printable(message.control + (message.module.empty() ? "" : " " + message.module));
    return fmt::format("{:<14} {}", terminal::Printable(message.eventID), Short(message.value, columns));
}

} // namespace

std::string TextOf(const Entry& entry, std::size_t columns) {
    auto text = fmt::format("{}  {:<7}  {}", entry.line.stamp, message::WordFor(entry.message.kind),
                            Subject(entry, columns));
    if (entry.isDatagram)
        text += fmt::format("  -> {}", WordFor(entry.outcome));
    if (!entry.reason.empty())
        text += fmt::format(": {}", terminal::Printable(entry.reason));
    return text;
}

std::string JsonOf(const Entry& entry) {
    terminal::JsonObject json;
    json.Add("time", terminal::ZonedTime(entry.line.time));
    json.Add("kind", message::WordFor(entry.message.kind));
    json.AddOrNull("eventID", entry.message.eventID);
    json.Add("outcome", WordFor(entry.outcome));
    json.AddOrNull("reason", entry.reason);
    json.Add("text", entry.line.message);
    return json.Take();
}

} // namespace reportctl::log
