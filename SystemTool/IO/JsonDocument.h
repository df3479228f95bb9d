#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include <rapidjson/fwd.h>

namespace SystemTool::IO {

class JsonAllocator;

/// A JSON value with reading and light editing.
///
/// Purpose: reads what comes from outside without ever failing on its shape. Asking for a member that is
/// absent, or for a member of what is no object, gives the null value; a null gives empty text, 0 and false.
/// So a caller reads `document.GetKeyValue("a").GetKeyValue("b").ToString()` without a test in between.
///
/// Cost: a value shares its text's tree. Copying a JsonDocument, or taking a member, copies a pointer and not
/// the value, however large; only SetKeyValue copies, and only what it is about to change while another
/// document holds it. Nothing here recurses on the call stack with the depth of the input.
///
/// Threads: one thread at a time for a document and all that were copied or taken from it, since they share a
/// tree.
///
/// Failure: what needs memory throws std::bad_alloc when there is none. Nothing else but SetKeyValue throws.
class JsonDocument { // NOLINT(cppcoreguidelines-special-member-functions): see its copy constructor
public:
    /// Arrays and objects within each other; a text that goes deeper is refused.
    static constexpr int MAX_DEPTH = 128;

    /// The null value.
    JsonDocument() = default;

    /// A copy costs a pointer; there is no cheaper move, which would leave a value without its tree behind.
    JsonDocument(const JsonDocument&) = default;
    JsonDocument& operator=(const JsonDocument&) = default;

    /// Parses `text`, fills this document with the result and returns it, since some callers use it one way
    /// and some the other. `error` is emptied; for a text that is no JSON it receives what is wrong and at
    /// which byte (counted from 0), and the document becomes null. Errors besides bad grammar: text behind
    /// the value, invalid UTF-8, a lone surrogate, a zero byte outside a string's escapes, a number beyond
    /// the range of a double, nesting deeper than MAX_DEPTH. A byte order mark at the start is skipped.
    JsonDocument FromJson(const std::string& text, std::string& error);

    /// The member `key`, or null. Of members with the same key, the first.
    JsonDocument GetKeyValue(const std::string& key) const;

    /// Sets the member `key`. All members of that name are replaced by one, in the first one's place; a new
    /// one goes to the end. A null document becomes an object first; any other that is no object throws
    /// std::logic_error, because its content would be lost silently. In a text, bytes that are no UTF-8 are
    /// replaced by U+FFFD, so that what is printed parses again. A document whose memory ran out on the way
    /// is null.
    void SetKeyValue(const std::string& key, const std::string& value);
    void SetKeyValue(const std::string& key, const JsonDocument& value);

    bool IsObject() const;

    /// Whether the value is an integer that fits 64 bits with a sign.
    bool IsLongLong() const;

    /// The integer, or 0 where IsLongLong is false.
    std::int64_t ToLongLong() const;

    /// The integer when it fits an int; else, and for all other types, 0.
    int ToInt() const;

    /// A string's text, decoded; a number as JSON prints it (1.5 as 1.5, an integer of up to 64 bits with
    /// every digit); true or false; the compact JSON of an object or array; empty for null.
    std::string ToString() const;

    /// The value as compact JSON, members in their order; "null" for null.
    std::string ToJson() const;

private:
    using Value =
        rapidjson::GenericValue<rapidjson::UTF8<char>, rapidjson::MemoryPoolAllocator<JsonAllocator>>;
    struct Tree;

    JsonDocument(std::shared_ptr<Tree> tree, const Value* value);

    Value& Editable();
    void SetMember(const std::string& key, Value& value);
    void Abandon();

    /// Owns every value of the text that was parsed, or of the object that was built; null for the null
    /// value.
    std::shared_ptr<Tree> m_tree;
    /// This document's value within the tree.
    const Value* m_value = nullptr;
};

} // namespace SystemTool::IO
