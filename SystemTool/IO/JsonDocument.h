#pragma once

#include <cstdint>
#include <string>

#include <boost/smart_ptr/intrusive_ptr.hpp>
#include <rapidjson/fwd.h>

namespace SystemTool::IO {

class JsonAllocator;

/// A JSON value with reading and light editing.
///
/// Purpose: reads JSON from outside and never fails because of its shape. A member that is absent, or a
/// member of a value that is no object, reads as null. Null reads as empty text, 0 and false. So a caller can
/// write `document.GetKeyValue("a").GetKeyValue("b").ToString()` without a test in between.
///
/// Cost: all values of a text share one tree. Copying a JsonDocument or taking a member copies a pointer and
/// not the value, however large it is. Only SetKeyValue copies values: the one that it sets, and its own
/// document when another document shares the tree. No operation uses more of the call stack for a deeper
/// text.
///
/// Threads: one thread at a time for all documents that share a tree, which are a document, its copies and
/// its members.
///
/// Failure: an operation that needs memory throws std::bad_alloc when there is none. Only SetKeyValue throws
/// other exceptions.
class JsonDocument { // NOLINT(cppcoreguidelines-special-member-functions): see its copy constructor
public:
    /// How deep arrays and objects may be nested. FromJson refuses a deeper text.
    static constexpr int MAX_DEPTH = 128;

    /// The null value.
    JsonDocument() = default;

    /// A copy copies a pointer. There is no move: a document that was moved from would keep a value without
    /// its tree.
    JsonDocument(const JsonDocument&) = default;
    JsonDocument& operator=(const JsonDocument&) = default;

    /// Parses `text`, makes this document its value, and returns a copy of this document: some callers use
    /// the copy, others the document itself. Empties `error`. When `text` is no JSON, `error` receives what
    /// is wrong and at which byte (counted from 0), and the document becomes null. Errors besides bad
    /// grammar: text after the value, invalid UTF-8, a lone surrogate, a zero byte that is not escaped, a
    /// number beyond the range of a double, nesting deeper than MAX_DEPTH. A byte order mark at the start is
    /// skipped.
    JsonDocument FromJson(const std::string& text, std::string& error);

    /// The member `key`, or null. When several members have that key, the first of them.
    JsonDocument GetKeyValue(const std::string& key) const;

    /// Sets the member `key`. The new member takes the place of the first member with that key; further
    /// members with that key are removed. Without such a member, the new one is appended. A null document
    /// first becomes an object. A document that is neither null nor an object throws std::logic_error,
    /// because otherwise its content would be lost silently. In a text, bytes that are not UTF-8 are replaced
    /// by U+FFFD, so that the printed text can be parsed again. When memory runs out during the change, the
    /// document becomes null.
    void SetKeyValue(const std::string& key, const std::string& value);
    void SetKeyValue(const std::string& key, const JsonDocument& value);

    bool IsObject() const;

    /// Whether the value is an integer that fits 64 bits with a sign.
    bool IsLongLong() const;

    /// The integer, or 0 where IsLongLong is false.
    std::int64_t ToLongLong() const;

    /// The integer when it fits an int; 0 for a larger one and for all other types.
    int ToInt() const;

    /// The decoded text of a string; a number as JSON prints it (1.5 as 1.5, an integer of up to 64 bits with
    /// every digit); "true" or "false"; the compact JSON of an object or array; empty for null.
    std::string ToString() const;

    /// The value as compact JSON, members in their order; "null" for null.
    std::string ToJson() const;

private:
    using Value =
        rapidjson::GenericValue<rapidjson::UTF8<char>, rapidjson::MemoryPoolAllocator<JsonAllocator>>;
    struct Tree;
    /// Counts the documents that share a tree, without atomic operations: these took a ninth of the time for
    /// a usual report, and only one thread at a time may use the documents anyway.
    using TreePointer = boost::intrusive_ptr<Tree>;
    friend void intrusive_ptr_add_ref(Tree* tree) noexcept;
    friend void intrusive_ptr_release(Tree* tree) noexcept;

    JsonDocument(TreePointer tree, const Value* value);

    Value& Editable();
    void SetMember(const std::string& key, Value& value);
    void Abandon();

    /// Owns every value of the text that was parsed, or of the object that was built; null for the null
    /// value.
    TreePointer m_tree;
    /// This document's value within the tree.
    const Value* m_value = nullptr;
};

} // namespace SystemTool::IO
