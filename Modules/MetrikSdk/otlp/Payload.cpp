#include "Modules/MetrikSdk/otlp/Payload.h"

#include <charconv>
#include <cstdint>
#include <string_view>

#include <rapidjson/memorystream.h>
#include <rapidjson/reader.h>

namespace MetrikSdk::otlp {
namespace {

constexpr unsigned PARSE_FLAGS = rapidjson::kParseIterativeFlag | rapidjson::kParseFullPrecisionFlag |
                                 rapidjson::kParseValidateEncodingFlag;

/// The last millisecond whose nanoseconds fit 64 bits with a sign, which is what stores keep: the year 2262.
constexpr std::int64_t MAX_CREATE_TIME_MS = 9'223'372'036'854;

/// Ends a parse that goes too deep.
struct DepthProbe : rapidjson::BaseReaderHandler<rapidjson::UTF8<>, DepthProbe> {
    bool StartObject() { return ++depth <= Payload::MAX_DEPTH; }
    bool EndObject(rapidjson::SizeType) { return --depth, true; }
    bool StartArray() { return ++depth <= Payload::MAX_DEPTH; }
    bool EndArray(rapidjson::SizeType) { return --depth, true; }
    int depth = 0;
};

/// A parse without a result first: what follows it may use the call stack freely.
bool IsShallowJson(const std::string& text) {
    rapidjson::MemoryStream stream(text.data(), text.size());
    rapidjson::Reader reader;
    DepthProbe probe;
    const auto result = reader.Parse<PARSE_FLAGS>(stream, probe);
    return !result.IsError() && stream.Tell() == text.size(); // the parser takes a zero byte for the end
}

} // namespace

Payload::Payload(const std::string& text) {
    if (!IsShallowJson(text))
        return;
    m_document.Parse<PARSE_FLAGS>(text.data(), text.size());
    m_isObject = m_document.IsObject();
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
