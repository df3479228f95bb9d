#include "SystemTool/IO/JsonDocument.h"

#include <cstddef>
#include <stdexcept>
#include <utility>

#include "SystemTool/IO/JsonMemory.h"
#include "SystemTool/IO/JsonParse.h"
#include "SystemTool/IO/JsonWalk.h"
#include "SystemTool/Text/Utf8.h"

namespace SystemTool::IO {
namespace {

using Value = JsonValue;

Value TextValue(const std::string& text, JsonPool& allocator) {
    const std::string valid = Text::ValidUtf8(text);
    return Value(valid.data(), static_cast<rapidjson::SizeType>(valid.size()), allocator);
}

Value::ConstMemberIterator Find(const Value& object, const std::string& key) {
    return object.FindMember(Value(rapidjson::StringRef(key.data(), key.size())));
}

} // namespace

/// `room` holds the values of a usual report within the tree itself. Without it, the allocator asks the heap
/// for a first chunk of 64 KiB. A heap does not keep chunks of that size ready for a thread, and this was a
/// quarter of the cost of a document in the program.
// NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init): the room is written before it is read
struct JsonDocument::Tree {
    static constexpr std::size_t ROOM_BYTES = 768;
    static constexpr std::size_t CHUNK_BYTES = 4096; ///< How much is allocated at once when `room` is full.

    std::size_t documents = 0; ///< How many share this tree.
    alignas(std::max_align_t) char room[ROOM_BYTES];
    JsonPool allocator{room, sizeof room, CHUNK_BYTES};
    JsonTree document{&allocator};
};

void intrusive_ptr_add_ref(JsonDocument::Tree* tree) noexcept {
    ++tree->documents;
}

void intrusive_ptr_release(JsonDocument::Tree* tree) noexcept {
    if (--tree->documents == 0)
        delete tree;
}

JsonDocument::JsonDocument(TreePointer tree, const Value* value) : m_tree(std::move(tree)), m_value(value) {}

JsonDocument JsonDocument::FromJson(const std::string& text, std::string& error) {
    const TreePointer tree(new Tree);
    error = ReadJson(text, tree->document);
    *this = error.empty() ? JsonDocument(tree, &tree->document) : JsonDocument();
    return *this;
}

JsonDocument JsonDocument::GetKeyValue(const std::string& key) const {
    if (!IsObject())
        return {};
    const auto member = Find(*m_value, key);
    return member == m_value->MemberEnd() ? JsonDocument() : JsonDocument(m_tree, &member->value);
}

/// Makes this document's value an object in a tree that no other document shares, and returns the object.
/// Copies the value when its tree is shared.
JsonDocument::Value& JsonDocument::Editable() {
    if (m_value != nullptr && !m_value->IsNull() && !m_value->IsObject())
        throw std::logic_error("A member cannot be set in a JSON value that is no object: " +
                               ToJson().substr(0, 100));
    const bool alone = m_tree && m_tree->documents == 1 && m_value == &m_tree->document;
    if (!alone) {
        TreePointer own(new Tree);
        if (m_value != nullptr) {
            JsonCopy copy{*m_value};
            own->document.Populate(copy);
        }
        m_tree = std::move(own);
        m_value = &m_tree->document;
    }
    if (m_value->IsNull())
        m_tree->document.SetObject();
    return m_tree->document;
}

/// Makes this document null after a change that ran out of memory. Its object may assume that it has room for
/// a member, although it did not get the memory.
void JsonDocument::Abandon() {
    *this = JsonDocument();
}

void JsonDocument::SetMember(const std::string& key, Value& value) {
    Value& object = m_tree->document;
    // Compares const iterators. A comparison of the others is ambiguous in C++20, where either operand may be
    // converted.
    const auto isEnd = [&object](Value::ConstMemberIterator member) {
        return member == std::as_const(object).MemberEnd();
    };
    const auto first = object.FindMember(Value(rapidjson::StringRef(key.data(), key.size())));
    if (isEnd(first)) {
        object.AddMember(TextValue(key, m_tree->document.GetAllocator()), value,
                         m_tree->document.GetAllocator());
        return;
    }
    first->value = value;
    for (auto other = first + 1; !isEnd(other);)
        other = other->name == first->name ? object.EraseMember(other) : other + 1;
}

void JsonDocument::SetKeyValue(const std::string& key, const std::string& value) {
    Editable();
    try {
        Value text = TextValue(value, m_tree->document.GetAllocator());
        SetMember(key, text);
    } catch (...) {
        Abandon();
        throw;
    }
}

void JsonDocument::SetKeyValue(const std::string& key, const JsonDocument& value) {
    const JsonDocument source = value; // keeps its tree when value is this document or a part of it
    Editable();
    try {
        JsonTree copied(&m_tree->document.GetAllocator());
        if (source.m_value != nullptr) {
            JsonCopy copy{*source.m_value};
            copied.Populate(copy);
        }
        SetMember(key, copied);
    } catch (...) {
        Abandon();
        throw;
    }
}

bool JsonDocument::IsObject() const {
    return m_value != nullptr && m_value->IsObject();
}

bool JsonDocument::IsLongLong() const {
    return m_value != nullptr && m_value->IsInt64();
}

std::int64_t JsonDocument::ToLongLong() const {
    return IsLongLong() ? m_value->GetInt64() : 0;
}

int JsonDocument::ToInt() const {
    return m_value != nullptr && m_value->IsInt() ? m_value->GetInt() : 0;
}

std::string JsonDocument::ToString() const {
    if (m_value == nullptr || m_value->IsNull())
        return {};
    return m_value->IsString() ? std::string(m_value->GetString(), m_value->GetStringLength()) : ToJson();
}

std::string JsonDocument::ToJson() const {
    if (m_value == nullptr)
        return "null";
    JsonBuffer buffer;
    JsonWriter writer(buffer);
    JsonWalk{writer}(*m_value);
    return {buffer.GetString(), buffer.GetSize()};
}

} // namespace SystemTool::IO
