#pragma once

#include <charconv>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>

#include <rapidjson/error/en.h>

#include "SystemTool/IO/JsonDocument.h"
#include "SystemTool/IO/JsonMemory.h"
#include "SystemTool/IO/JsonNumbers.h"
#include "SystemTool/Text/Utf8.h"

// How a JSON text is read. JsonDocument and the encoder of analytics events both use this, so that they read
// numbers in the same way.
namespace SystemTool::IO {

// The parser passes numbers on as texts, because its own conversion gets some numbers wrong:
// 1.84467440737095516155 overflows its 64 bits and gives an arbitrary value, 10e308 gives almost zero, and
// 17976931348623159e292 gives infinity, which JSON cannot hold.
//
// The parser works in situ: the values point into a copy of the text, which the tree owns. Otherwise the
// parser would copy each string byte by byte onto a stack and from the stack into the tree. The second copy
// waits until the bytes of the first copy have left the processor's store buffer. These copies took a third
// of the time for a usual report.
inline constexpr unsigned JSON_PARSE_FLAGS =
    rapidjson::kParseInsituFlag | rapidjson::kParseIterativeFlag | rapidjson::kParseNumbersAsStringsFlag;

/// Whether decoded text holds half a surrogate pair. A lone escape such as \udc00 decodes to that. It is not
/// valid UTF-8, but the parser accepts it.
inline bool HasLoneSurrogate(const char* text, rapidjson::SizeType length) {
    constexpr char LEAD = '\xed';
    const char* const end = text + length;
    while ((text = static_cast<const char*>(std::memchr(text, LEAD, static_cast<std::size_t>(end - text)))) !=
           nullptr)
        if (static_cast<unsigned char>(*++text) >= 0xa0) // in UTF-8, another byte always follows a lead byte
            return true;
    return false;
}

/// All of `text` as an integer; nothing when it is no integer or does not fit.
template <typename Integer>
std::optional<Integer> IntegerOf(std::string_view text) {
    Integer integer{};
    const char* const end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, integer);
    return result.ec == std::errc() && result.ptr == end ? std::optional(integer) : std::nullopt;
}

/// Passes the parser's events on to a document. Ends the parse at errors that the parser itself does not see.
class JsonGuard {
public:
    using Ch = char;

    /// `hasEscapes`: whether the text has an escape. Only an escape can give half a surrogate pair. So
    /// without escapes the strings are not searched, which took a third of the time for a usual report.
    JsonGuard(JsonTree& document, int maxDepth, bool hasEscapes)
        : m_document(document), m_maxDepth(maxDepth), m_hasEscapes(hasEscapes) {}

    bool Null() { return m_document.Null(); }
    bool Bool(bool value) { return m_document.Bool(value); }
    bool Int(int value) { return m_document.Int(value); }
    bool Uint(unsigned value) { return m_document.Uint(value); }
    bool Int64(std::int64_t value) { return m_document.Int64(value); }
    bool Uint64(std::uint64_t value) { return m_document.Uint64(value); }
    bool Double(double value) { return m_document.Double(value); }
    bool RawNumber(const Ch* text, rapidjson::SizeType length, bool) {
        if (const auto integer = IntegerOf<std::int64_t>({text, length}))
            return m_document.Int64(*integer);
        if (const auto integer = IntegerOf<std::uint64_t>({text, length}))
            return m_document.Uint64(*integer);
        // We do not use std::from_chars: macOS's standard library does not have it for doubles. strtod reads
        // the decimal point of the C locale, which all our programs keep. strtod gets a copy that ends where
        // the number ends, because it would read on: in the invalid text 0x1, it would read 0x1 as a number.
        const double number = std::strtod(std::string(text, length).c_str(), nullptr);
        return std::isinf(number) ? Refuse("Number too big to be stored in double.")
                                  : m_document.Double(number);
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

    /// Why this object ended the parse.
    const char* Refusal() const { return m_refusal; }

private:
    bool Enter() { return ++m_depth <= m_maxDepth || Refuse("Nested deeper than 128 levels."); }
    bool IsText(const Ch* text, rapidjson::SizeType length) {
        return !m_hasEscapes || !HasLoneSurrogate(text, length) || Refuse("Half a surrogate pair in string.");
    }
    bool Refuse(const char* refusal) {
        m_refusal = refusal;
        return false;
    }

    static_assert(JsonDocument::MAX_DEPTH == 128, "the refusal's text names the limit");

    JsonTree& m_document;
    const int m_maxDepth;
    const bool m_hasEscapes;
    int m_depth = 0;
    const char* m_refusal = "";
};

/// One parse, as the function object that JsonTree::Populate wants: Populate calls it with the tree as the
/// handler.
class JsonParse {
public:
    explicit JsonParse(const std::string& text, int maxDepth = JsonDocument::MAX_DEPTH)
        : m_text(text), m_maxDepth(maxDepth),
          m_start(text.starts_with(BYTE_ORDER_MARK) ? BYTE_ORDER_MARK.size() : 0) {}

    bool operator()(JsonTree& document) {
        auto* const copy = static_cast<char*>(document.GetAllocator().Malloc(m_text.size() + END_BYTES));
        std::memcpy(copy, m_text.data(), m_text.size());
        std::memset(copy + m_text.size(), '\0', END_BYTES);
        rapidjson::InsituStringStream bytes(copy + m_start);
        JsonGuard guard(document, m_maxDepth, m_text.find('\\') != std::string::npos);
        JsonReader reader;
        m_result = Text::IsAscii(m_text)
                       ? reader.Parse<JSON_PARSE_FLAGS>(bytes, guard)
                       : reader.Parse<JSON_PARSE_FLAGS | rapidjson::kParseValidateEncodingFlag>(bytes, guard);
        m_refusal = guard.Refusal();
        // The parser takes a zero byte for the end of the text. When the text goes on after it, that is an
        // error.
        if (!m_result.IsError() && bytes.Tell() != m_text.size() - m_start)
            m_result.Set(rapidjson::kParseErrorDocumentRootNotSingular, bytes.Tell());
        return !m_result.IsError();
    }

    std::string Error() const {
        if (!m_result.IsError())
            return {};
        const bool refused = m_result.Code() == rapidjson::kParseErrorTermination;
        const std::string what = refused ? m_refusal : rapidjson::GetParseError_En(m_result.Code());
        return what + " At byte " + std::to_string(ErrorByte()) + ".";
    }

    std::size_t ErrorByte() const { return m_start + m_result.Offset(); }

    /// Whether the parser itself refused a number as too big. RewriteNumbers may help then.
    bool IsNumberRefused() const { return m_result.Code() == rapidjson::kParseErrorNumberTooBig; }

private:
    static constexpr std::string_view BYTE_ORDER_MARK = "\xef\xbb\xbf";

    /// How many zero bytes follow the text. When the text ends in the lead byte of a character, the parser
    /// goes on to that character's end before it notices: up to three bytes behind the text.
    static constexpr std::size_t END_BYTES = 4;

    const std::string& m_text;
    const int m_maxDepth;
    const std::size_t m_start; ///< Where the JSON begins: after a byte order mark, if there is one.
    rapidjson::ParseResult m_result;
    const char* m_refusal = "";
};

/// Fills `tree` with the value of `text`. Empty when `text` is JSON, and only then the tree has a value.
/// Otherwise the result says what is wrong and at which byte.
inline std::string ReadJson(const std::string& text, JsonTree& tree, int maxDepth = JsonDocument::MAX_DEPTH) {
    JsonParse parse(text, maxDepth);
    tree.Populate(parse);
    if (!parse.IsNumberRefused())
        return parse.Error();
    std::string rewritten = text;
    if (!RewriteNumbers(rewritten, parse.ErrorByte()))
        return parse.Error();
    JsonParse second(rewritten, maxDepth);
    tree.Populate(second);
    return second.Error();
}

} // namespace SystemTool::IO
