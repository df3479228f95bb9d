#include "Tools/reportctl/log/Show.h"

#include <array>
#include <ctime>

#include <fmt/format.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include "SystemTool/Text/Utf8.h"
#include "Tools/reportctl/terminal/Printable.h"

namespace reportctl::log {
namespace {

/// So much of a value says what it is about, and leaves room on the line for where it ended.
constexpr std::size_t VALUE_BYTES = 48;

using Writer = rapidjson::Writer<rapidjson::StringBuffer>;

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

void Write(Writer& writer, const char* key, const std::string& text) {
    writer.Key(key);
    const auto utf8 = SystemTool::Text::ValidUtf8(text);
    writer.String(utf8.data(), static_cast<rapidjson::SizeType>(utf8.size()));
}

void WriteOrNull(Writer& writer, const char* key, const std::string& text) {
    if (!text.empty())
        return Write(writer, key, text);
    writer.Key(key);
    writer.Null();
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
    rapidjson::StringBuffer text;
    Writer writer(text);
    writer.StartObject();
    Write(writer, "time", IsoTime(entry.line.time));
    Write(writer, "kind", message::WordFor(entry.message.kind));
    WriteOrNull(writer, "eventID", entry.message.eventID);
    Write(writer, "outcome", WordFor(entry.outcome));
    WriteOrNull(writer, "reason", entry.reason);
    Write(writer, "text", entry.line.message);
    writer.EndObject();
    return {text.GetString(), text.GetSize()};
}

} // namespace reportctl::log
