#include "Modules/MetrikSdk/otlp/Payload.h"

#include <charconv>
#include <cstdint>
#include <string_view>

#include "SystemTool/IO/JsonParse.h"

namespace MetrikSdk::otlp {
namespace {

/// The last millisecond whose nanoseconds fit 64 bits with a sign, which is what stores keep: the year 2262.
constexpr std::int64_t MAX_CREATE_TIME_MS = 9'223'372'036'854;

} // namespace

/// Read by the service's own rules, and iteratively: what follows may use the call stack freely, since the depth is known.
Payload::Payload(const std::string& text) {
    SystemTool::IO::JsonParse parse(text, MAX_DEPTH);
    m_document.Populate(parse);
    m_isObject = parse.Error().empty() && m_document.IsObject();
}

std::optional<WallTime> Payload::CreateTime() const {
    if (!m_isObject)
        return std::nullopt;
    const auto extend = m_document.FindMember("extend");
    if (extend == m_document.MemberEnd() || !extend->value.IsObject())
        return std::nullopt;
    const auto time = extend->value.FindMember("createTime");
    if (time == extend->value.MemberEnd() || !time->value.IsString())
        return std::nullopt;
    const std::string_view text(time->value.GetString(), time->value.GetStringLength());
    std::int64_t milliseconds = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), milliseconds);
    const bool whole = error == std::errc() && end == text.data() + text.size();
    if (!whole || milliseconds <= 0 || milliseconds > MAX_CREATE_TIME_MS)
        return std::nullopt;
    return WallTime(std::chrono::milliseconds(milliseconds));
}

} // namespace MetrikSdk::otlp
