#include "SystemTool/IO/JsonDocument.h"

#include <cstring>
#include <stdexcept>
#include <string_view>
#include <vector>

#include <rapidjson/document.h>
#include <rapidjson/error/en.h>
#include <rapidjson/memorystream.h>
#include <rapidjson/reader.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

namespace SystemTool::IO {
namespace {

constexpr unsigned PARSE_FLAGS = rapidjson::kParseIterativeFlag | rapidjson::kParseFullPrecisionFlag |
                                 rapidjson::kParseValidateEncodingFlag;

using Value = rapidjson::Value;

/// Whether decoded text holds half a surrogate pair: what an escape such as \udc00 on its own decodes to,
/// which is no UTF-8 and which the parser lets pass.
bool HasLoneSurrogate(const char* text, rapidjson::SizeType length) {
    constexpr char LEAD = '\xed';
    const char* const end = text + length;
    while ((text = static_cast<const char*>(std::memchr(text, LEAD, static_cast<std::size_t>(end - text)))) !=
           nullptr)
        if (static_cast<unsigned char>(*++text) >= 0xa0) // in a valid text, a lead byte is never the last
            return true;
    return false;
}

/// Hands a parser's events on to a document, and ends the parse for what the parser itself would let pass.
class Guard {
public:
    using Ch = char;

    explicit Guard(rapidjson::Document& document) : m_document(document) {}

    bool Null() { return m_document.Null(); }
    bool Bool(bool value) { return m_document.Bool(value); }
    bool Int(int value) { return m_document.Int(value); }
    bool Uint(unsigned value) { return m_document.Uint(value); }
    bool Int64(std::int64_t value) { return m_document.Int64(value); }
    bool Uint64(std::uint64_t value) { return m_document.Uint64(value); }
    bool Double(double value) { return m_document.Double(value); }
    bool RawNumber(const Ch* text, rapidjson::SizeType length, bool copy) {
        return m_document.RawNumber(text, length, copy);
    }
    bool String(const Ch* text, rapidjson::SizeType length, bool copy) {
        return IsText(text, length) && m_document.String(text, length, copy);
    }
    bool Key(const Ch* text, rapidjson::SizeType length, bool copy) {
        return IsText(text, length) && m_document.Key(text, length, copy);
    }
    bool StartObject() { return Enter() && m_document.StartObject(); }
    bool EndObject(rapidjson::SizeType members) { return --m_depth, m_document.EndObject(members); }
    bool StartArray() { return Enter() && m_document.StartArray(); }
    bool EndArray(rapidjson::SizeType elements) { return --m_depth, m_document.EndArray(elements); }

    /// Why the parse was ended.
    const char* Refusal() const { return m_refusal; }

private:
    bool Enter() { return ++m_depth <= JsonDocument::MAX_DEPTH || Refuse("Nested deeper than 128 levels."); }
    bool IsText(const Ch* text, rapidjson::SizeType length) {
        return !HasLoneSurrogate(text, length) || Refuse("Half a surrogate pair in string.");
    }
    bool Refuse(const char* refusal) {
        m_refusal = refusal;
        return false;
    }

    static_assert(JsonDocument::MAX_DEPTH == 128, "the refusal's text names the limit");

    rapidjson::Document& m_document;
    int m_depth = 0;
    const char* m_refusal = "";
};

/// One parse, in the shape that rapidjson::Document::Populate wants: it calls this with itself as the handler.
class Parse {
public:
    explicit Parse(const std::string& text)
        : m_text(text), m_start(text.starts_with(BYTE_ORDER_MARK) ? BYTE_ORDER_MARK.size() : 0) {}

    bool operator()(rapidjson::Document& document) {
        rapidjson::MemoryStream bytes(m_text.data() + m_start, m_text.size() - m_start);
        Guard guard(document);
        rapidjson::Reader reader;
        m_result = reader.Parse<PARSE_FLAGS>(bytes, guard);
        m_refusal = guard.Refusal();
        // The parser takes a zero byte for the end of the text; the text says where it really ends.
        if (!m_result.IsError() && bytes.Tell() != m_text.size() - m_start)
            m_result.Set(rapidjson::kParseErrorDocumentRootNotSingular, bytes.Tell());
        return !m_result.IsError();
    }

    std::string Error() const {
        if (!m_result.IsError())
            return {};
        const bool refused = m_result.Code() == rapidjson::kParseErrorTermination;
        const std::string what = refused ? m_refusal : rapidjson::GetParseError_En(m_result.Code());
        return what + " At byte " + std::to_string(m_start + m_result.Offset()) + ".";
    }

private:
    static constexpr std::string_view BYTE_ORDER_MARK = "\xef\xbb\xbf";

    const std::string& m_text;
    const std::size_t m_start; ///< Behind a byte order mark.
    rapidjson::ParseResult m_result;
    const char* m_refusal = "";
};

/// Tells `handler` the whole of `root`, in order, as a parser would. The open arrays and objects are kept on
/// the heap, where rapidjson's own Accept and CopyFrom call themselves for each level.
template <typename Handler>
class Walk {
public:
    explicit Walk(Handler& handler) : m_handler(handler) {}

    void operator()(const Value& root) {
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
        const Value* value;
        rapidjson::SizeType next;
    };

    static rapidjson::SizeType SizeOf(const Value& value) {
        return value.IsObject() ? value.MemberCount() : value.Size();
    }

    void Tell(const Value& value) {
        if (value.IsObject() ? m_handler.StartObject() : value.IsArray() && m_handler.StartArray())
            m_open.push_back({&value, 0});
        else
            value.Accept(m_handler); // a scalar: one event
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
        const Value& value = *m_open.back().value;
        m_open.pop_back();
        if (value.IsObject())
            m_handler.EndObject(value.MemberCount());
        else
            m_handler.EndArray(value.Size());
    }

    Handler& m_handler;
    std::vector<Level> m_open;
};

/// Fills a document with a copy of a value, for rapidjson::Document::Populate.
struct Copy {
    const Value& source;

    bool operator()(rapidjson::Document& document) const {
        Walk{document}(source);
        return true;
    }
};

/// `text` with each byte that is no part of valid UTF-8 replaced by U+FFFD.
std::string ValidUtf8(const std::string& text) {
    rapidjson::MemoryStream bytes(text.data(), text.size());
    rapidjson::StringBuffer valid;
    while (bytes.Tell() < text.size()) {
        const char* const begin = bytes.src_;
        const auto length = valid.GetSize();
        if (!rapidjson::UTF8<>::Validate(bytes, valid)) {
            valid.Pop(valid.GetSize() - length);
            for (const char byte : std::string_view("\xef\xbf\xbd"))
                valid.Put(byte);
            bytes.src_ = begin + 1;
        }
    }
    return {valid.GetString(), valid.GetSize()};
}

Value TextValue(const std::string& text, rapidjson::Document::AllocatorType& allocator) {
    const std::string valid = ValidUtf8(text);
    return Value(valid.data(), static_cast<rapidjson::SizeType>(valid.size()), allocator);
}

Value::ConstMemberIterator Find(const Value& object, const std::string& key) {
    return object.FindMember(Value(rapidjson::StringRef(key.data(), key.size())));
}

} // namespace

struct JsonDocument::Tree {
    rapidjson::Document document;
};

JsonDocument::JsonDocument(std::shared_ptr<Tree> tree, const Value* value)
    : m_tree(std::move(tree)), m_value(value) {}

JsonDocument JsonDocument::FromJson(const std::string& text, std::string& error) {
    auto tree = std::make_shared<Tree>();
    Parse parse(text);
    tree->document.Populate(parse);
    error = parse.Error();
    *this = error.empty() ? JsonDocument(tree, &tree->document) : JsonDocument();
    return *this;
}

JsonDocument JsonDocument::GetKeyValue(const std::string& key) const {
    if (!IsObject())
        return {};
    const auto member = Find(*m_value, key);
    return member == m_value->MemberEnd() ? JsonDocument() : JsonDocument(m_tree, &member->value);
}

/// This document's value, in a tree that nobody else holds, as an object.
JsonDocument::Value& JsonDocument::Editable() {
    if (m_value != nullptr && !m_value->IsNull() && !m_value->IsObject())
        throw std::logic_error("A member cannot be set in a JSON value that is no object: " +
                               ToJson().substr(0, 100));
    const bool alone = m_tree.use_count() == 1 && m_value == &m_tree->document;
    if (!alone) {
        auto own = std::make_shared<Tree>();
        if (m_value != nullptr) {
            Copy copy{*m_value};
            own->document.Populate(copy);
        }
        m_tree = std::move(own);
        m_value = &m_tree->document;
    }
    if (m_value->IsNull())
        m_tree->document.SetObject();
    return m_tree->document;
}

void JsonDocument::SetMember(const std::string& key, Value& value) {
    Value& object = m_tree->document;
    const auto first = object.FindMember(Value(rapidjson::StringRef(key.data(), key.size())));
    if (first == object.MemberEnd()) {
        object.AddMember(TextValue(key, m_tree->document.GetAllocator()), value,
                         m_tree->document.GetAllocator());
        return;
    }
    first->value = value;
    for (auto other = first + 1; other != object.MemberEnd();)
        other = other->name == first->name ? object.EraseMember(other) : other + 1;
}

void JsonDocument::SetKeyValue(const std::string& key, const std::string& value) {
    Editable();
    Value text = TextValue(value, m_tree->document.GetAllocator());
    SetMember(key, text);
}

void JsonDocument::SetKeyValue(const std::string& key, const JsonDocument& value) {
    const JsonDocument source = value; // keeps its tree when value is this document or a part of it
    Editable();
    rapidjson::Document copied(&m_tree->document.GetAllocator());
    if (source.m_value != nullptr) {
        Copy copy{*source.m_value};
        copied.Populate(copy);
    }
    SetMember(key, copied);
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
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    Walk{writer}(*m_value);
    return {buffer.GetString(), buffer.GetSize()};
}

} // namespace SystemTool::IO
