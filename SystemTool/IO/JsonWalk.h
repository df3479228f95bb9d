#pragma once

#include <vector>

#include "SystemTool/IO/JsonMemory.h"

// How JsonDocument goes through a value. Only JsonDocument uses it.
namespace SystemTool::IO {

/// Sends the events of the whole value `root` to `handler`, in order, as a parser would. It keeps the open
/// arrays and objects on the heap. RapidJSON's own Accept and CopyFrom call themselves for each level
/// instead, and would need a deep stack for a deep value.
template <typename Handler>
class JsonWalk {
public:
    explicit JsonWalk(Handler& handler) : m_handler(handler) {}

    void operator()(const JsonValue& root) {
        Tell(root);
        while (!m_open.empty()) {
            if (m_open.back().next == SizeOf(*m_open.back().value))
                Close();
            else
                TellNextChild(m_open.back());
        }
    }

private:
    struct Level {
        const JsonValue* value;
        rapidjson::SizeType next;
    };

    static rapidjson::SizeType SizeOf(const JsonValue& value) {
        return value.IsObject() ? value.MemberCount() : value.Size();
    }

    void Tell(const JsonValue& value) {
        if (value.IsObject() ? m_handler.StartObject() : value.IsArray() && m_handler.StartArray())
            m_open.push_back({&value, 0});
        else if (value.IsString())
            // Of a string that was read in place, Accept would say that the handler need not copy it. Then a
            // copy of the value would point into the tree that it was copied from.
            m_handler.String(value.GetString(), value.GetStringLength(), true);
        else
            value.Accept(m_handler); // another scalar: one event
    }

    void TellNextChild(Level& level) {
        const auto index = level.next++;
        if (level.value->IsArray())
            return Tell((*level.value)[index]);
        const auto& member = *(level.value->MemberBegin() + index);
        m_handler.Key(member.name.GetString(), member.name.GetStringLength(), true);
        Tell(member.value);
    }

    void Close() {
        const JsonValue& value = *m_open.back().value;
        m_open.pop_back();
        if (value.IsObject())
            m_handler.EndObject(value.MemberCount());
        else
            m_handler.EndArray(value.Size());
    }

    Handler& m_handler;
    std::vector<Level> m_open;
};

/// Fills a document with a copy of a value, for JsonTree::Populate.
struct JsonCopy {
    const JsonValue& source;

    bool operator()(JsonTree& document) const {
        JsonWalk{document}(source);
        return true;
    }
};

} // namespace SystemTool::IO
