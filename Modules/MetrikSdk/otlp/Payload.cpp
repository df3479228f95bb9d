#include "Modules/MetrikSdk/otlp/Payload.h"

#include <charconv>
#include <cstdint>
#include <utility>

#include "SystemTool/IO/JsonParse.h"

namespace MetrikSdk::otlp {
namespace {

/// The last millisecond, in the year 2262, whose nanoseconds fit into 64 bits with a sign. Stores keep times
/// in that form.
constexpr std::int64_t MAX_CREATE_TIME_MS = 9'223'372'036'854;

} // namespace

/// Reads the text by the service's own rules, and without recursion. Later functions may use the call stack
/// freely, because the depth is known then.
///
/// A value of a report that the service accepts is one level deeper in the payload, so the second attempt
/// allows one level more.
Payload::Payload(const std::string& text)
    : m_document(Parsed(text, MAX_DEPTH)), m_isShallow(m_document != nullptr) {
    if (!m_isShallow)
        m_document = Parsed(text, SystemTool::IO::JsonDocument::MAX_DEPTH + 1);
}

std::unique_ptr<SystemTool::IO::JsonTree> Payload::Parsed(const std::string& text, int maxDepth) {
    auto document = std::make_unique<SystemTool::IO::JsonTree>();
    const bool isObject = SystemTool::IO::ReadJson(text, *document, maxDepth).empty() && document->IsObject();
    return isObject ? std::move(document) : nullptr;
}

const SystemTool::IO::JsonValue* Payload::ObjectIn(const char* name) const {
    if (!m_document)
        return nullptr;
    const SystemTool::IO::JsonValue& document = *m_document;
    const auto member = document.FindMember(name);
    return member != document.MemberEnd() && member->value.IsObject() ? &member->value : nullptr;
}

std::optional<std::string> Payload::TextIn(const char* outer, const char* name) const {
    const auto* object = ObjectIn(outer);
    if (object == nullptr)
        return std::nullopt;
    const auto member = object->FindMember(name);
    if (member == object->MemberEnd() || !member->value.IsString())
        return std::nullopt;
    return std::string(member->value.GetString(), member->value.GetStringLength());
}

std::optional<WallTime> Payload::CreateTime() const {
    const auto text = TextIn("extend", "createTime");
    if (!text)
        return std::nullopt;
    std::int64_t milliseconds = 0;
    const auto [end, error] = std::from_chars(text->data(), text->data() + text->size(), milliseconds);
    const bool whole = error == std::errc() && end == text->data() + text->size();
    if (!whole || milliseconds <= 0 || milliseconds > MAX_CREATE_TIME_MS)
        return std::nullopt;
    return WallTime(std::chrono::milliseconds(milliseconds));
}

} // namespace MetrikSdk::otlp
