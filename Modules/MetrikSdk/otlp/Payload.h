#pragma once

#include <memory>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Time.h"
#include "SystemTool/IO/JsonMemory.h"

namespace MetrikSdk::otlp {

/// An event's payload, read once for everything that an upload needs of it.
class Payload {
public:
    /// Objects and arrays within each other. A level of JSON is three levels of the protocol's messages, and
    /// readers of those give up at a hundred.
    static constexpr int MAX_DEPTH = 24;

    explicit Payload(const std::string& text);

    /// The payload as a JSON object; null when it is none, or one that is not sent as one: deeper than
    /// MAX_DEPTH, or not UTF-8.
    const SystemTool::IO::JsonValue* Object() const { return m_isShallow ? m_document.get() : nullptr; }

    /// When the event happened, by the module's word: extend.createTime, decimal milliseconds as a text.
    /// Nothing when there is none or it makes no sense. Deep payloads have one, too.
    std::optional<WallTime> CreateTime() const;

    /// The object eventData; null when there is none. Deep payloads have one, too.
    const SystemTool::IO::JsonValue* EventData() const { return ObjectIn("eventData"); }

    /// A text of the object `outer`; nothing when there is none.
    std::optional<std::string> TextIn(const char* outer, const char* name) const;

private:
    static std::unique_ptr<SystemTool::IO::JsonTree> Parsed(const std::string& text, int maxDepth);
    const SystemTool::IO::JsonValue* ObjectIn(const char* name) const;

    std::unique_ptr<SystemTool::IO::JsonTree> m_document; ///< Null: the text is no JSON object.
    bool m_isShallow;                                     ///< The object is not deeper than MAX_DEPTH.
};

} // namespace MetrikSdk::otlp
