#include "Tools/reportctl/log/Show.h"

#include <array>
#include <ctime>

#include <fmt/format.h>

#include "SystemTool/Text/Utf8.h"
#include "Tools/reportctl/terminal/Json.h"
#include "Tools/reportctl/terminal/Printable.h"

namespace reportctl::log {
namespace {

/// The beginning of a value that is shown: enough to recognise it, and short enough that the outcome fits on
/// the line.
constexpr std::size_t VALUE_BYTES = 48;

std::string Short(const std::string& text) {
    const auto beginning = SystemTool::Text::CutUtf8(text, VALUE_BYTES);
    return terminal::Printable(beginning) + (beginning.size() < text.size() ? "..." : "");
}

std::string Subject(const Entry& entry) {
    const auto& message = entry.message;
    if (!entry.isDatagram || !entry.isReadable || !message.fault.empty())
        return terminal::Printable(entry.line.message);
    if (message.kind == message::Kind::Control)
        return terminal::Printable(message.control + (message.module.empty() ? "" : " " + message.module));
    return fmt::format("{:<14} {}", terminal::Printable(message.eventID), Short(message.value));
}

} // namespace

std::string IsoTime(terminal::TimePoint time) {
    const auto milliseconds = time.time_since_epoch().count();
    const auto fraction = (milliseconds % 1000 + 1000) % 1000;
    const auto seconds = static_cast<std::time_t>((milliseconds - fraction) / 1000);
    std::tm local{};
    if (::localtime_r(&seconds, &local) == nullptr)
        return {};
    std::array<char, 64> text{};
    std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%S", &local);
    const auto minutes = local.tm_gmtoff / 60;
    const auto size = minutes < 0 ? -minutes : minutes;
    return fmt::format("{}.{:03}{}{:02}:{:02}", text.data(), fraction, minutes < 0 ? '-' : '+', size / 60,
                       size % 60);
}

std::string TextOf(const Entry& entry) {
    auto text =
        fmt::format("{}  {:<7}  {}", entry.line.stamp, message::WordFor(entry.message.kind), Subject(entry));
    if (entry.isDatagram)
        text += fmt::format("  -> {}", WordFor(entry.outcome));
    if (!entry.reason.empty())
        text += fmt::format(": {}", terminal::Printable(entry.reason));
    return text;
}

std::string JsonOf(const Entry& entry) {
    terminal::JsonObject json;
    json.Add("time", IsoTime(entry.line.time));
    json.Add("kind", message::WordFor(entry.message.kind));
    json.AddOrNull("eventID", entry.message.eventID);
    json.Add("outcome", WordFor(entry.outcome));
    json.AddOrNull("reason", entry.reason);
    json.Add("text", entry.line.message);
    return json.Take();
}

} // namespace reportctl::log
