#pragma once

#include <memory>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Time.h"
#include "SystemTool/IO/JsonMemory.h"

namespace MetrikSdk::otlp {

/// The payload of an event. It is read once for everything that an upload needs from it.
class Payload {
public:
    /// How deep objects and arrays may be nested. One level of JSON takes three levels of the protocol's
    /// messages, and readers of these messages give up at a hundred levels.
    static constexpr int MAX_DEPTH = 24;

    explicit Payload(const std::string& text);

    /// The payload as a JSON object. Null when it is no object, when it is deeper than MAX_DEPTH, or when it
    /// is not UTF-8. Such a payload is not sent as an object.
    const SystemTool::IO::JsonValue* Object() const { return m_isShallow ? m_document.get() : nullptr; }

    /// When the event happened, as the module says: extend.createTime, decimal milliseconds as a text.
    /// Nothing when it is missing or makes no sense. Also works for a payload that is too deep.
    std::optional<WallTime> CreateTime() const;

    /// The object eventData; null when there is none. Also works for a payload that is too deep.
    const SystemTool::IO::JsonValue* EventData() const { return ObjectIn("eventData"); }

    /// The text `name` in the object `outer`; nothing when there is none.
    std::optional<std::string> TextIn(const char* outer, const char* name) const;

private:
    static std::unique_ptr<SystemTool::IO::JsonTree> Parsed(const std::string& text, int maxDepth);
    const SystemTool::IO::JsonValue* ObjectIn(const char* name) const;

    std::unique_ptr<SystemTool::IO::JsonTree> m_document; ///< Null: the text is no JSON object.
    bool m_isShallow;                                     ///< The object is not deeper than MAX_DEPTH.
};

} // namespace MetrikSdk::otlp
