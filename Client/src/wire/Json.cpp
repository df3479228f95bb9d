#include "wire/Json.h"

#include <algorithm>
#include <array>
#include <cstdint>

#include "wire/ByteSet.h"

namespace hublink::wire {
namespace {

constexpr ByteSet WHITE_SPACE(" \t\r\n");
constexpr ByteSet STRING_STOPS = ByteSet("\"\\").AndControls();
constexpr ByteSet QUOTES_AND_ESCAPES("'\\");
constexpr ByteSet SPACE_AND_STRINGS(" \t\r\n\"");
constexpr std::string_view ESCAPED_QUOTE = "\\u0027";
constexpr std::size_t UNIT_LENGTH = ESCAPED_QUOTE.size();

int HexDigit(char c) {
    if (c >= '0' && c <= '9')
        return c - '0';
    const char lower = static_cast<char>(c | 0x20);
    return lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

/// The number in an escape such as \u00e4 at the start of the text; -1 when the text does not start with one.
int UnitAt(std::string_view text) {
    if (text.size() < UNIT_LENGTH || text[0] != '\\' || text[1] != 'u')
        return -1;
    int unit = 0;
    for (const char c : text.substr(2, 4)) {
        const int digit = HexDigit(c);
        if (digit < 0)
            return -1;
        unit = unit * 16 + digit;
    }
    return unit;
}

/// The length of the escape at the start of the text; 0 when there is no valid escape. A surrogate pair, two
/// escapes, counts as one.
std::size_t EscapeLength(std::string_view text) {
    constexpr std::string_view SIMPLE = "\"\\/bfnrt";
    if (text.size() > 1 && SIMPLE.find(text[1]) != std::string_view::npos)
        return 2;
    const int unit = UnitAt(text);
    if (unit < 0 || (unit >= 0xdc00 && unit <= 0xdfff))
        return 0;
    if (unit < 0xd800 || unit > 0xdbff)
        return UNIT_LENGTH;
    const int second = UnitAt(text.substr(UNIT_LENGTH));
    return second >= 0xdc00 && second <= 0xdfff ? 2 * UNIT_LENGTH : 0;
}

/// The length of the JSON string at the start of the text, with its quotation marks; 0 when it is not valid.
std::size_t StringLength(std::string_view text) {
    for (std::size_t at = STRING_STOPS.FindIn(text, 1); at < text.size();
         at = STRING_STOPS.FindIn(text, at)) {
        if (text[at] == '"')
            return at + 1;
        const std::size_t length = text[at] == '\\' ? EscapeLength(text.substr(at)) : 0;
        if (length == 0)
            return 0;
        at += length;
    }
    return 0;
}

/// One bit for each level. Only the words in use are written. A std::bitset would clear all of them first.
// NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init): a word is written when its first level is
class Levels {
public:
    void Set(std::size_t level, bool value) {
        std::uint64_t& word = m_words[level / WORD_BITS];
        const std::uint64_t bit = std::uint64_t{1} << (level % WORD_BITS);
        if (bit == 1)
            word = 0;
        word = value ? word | bit : word & ~bit;
    }
    bool operator[](std::size_t level) const {
        return (m_words[level / WORD_BITS] >> (level % WORD_BITS) & 1) != 0;
    }

private:
    static constexpr std::size_t WORD_BITS = 64;

    std::array<std::uint64_t, MAX_LEVELS / WORD_BITS> m_words;
};

/// Reads a text in one pass. It does not recurse, so deep nesting cannot exhaust the stack.
class Reader {
public:
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init): m_isObject, for the reason given at Levels
    explicit Reader(std::string_view text) : m_rest(text) {}

    JsonFacts Read() {
        SkipSpace();
        m_facts.isObject = Next() == '{';
        m_facts.isJson = TakeValue();
        while (m_facts.isJson && m_open > 0)
            m_facts.isJson = Continue();
        m_facts.isJson = m_facts.isJson && m_rest.empty();
        return m_facts;
    }

private:
    char Next() const { return m_rest.empty() ? '\0' : m_rest.front(); }

    void SkipSpace() {
        for (; !m_rest.empty() && WHITE_SPACE.Has(m_rest.front()); m_facts.isCompact = false)
            m_rest.remove_prefix(1);
    }

    bool Take(std::size_t length) {
        m_rest.remove_prefix(length);
        SkipSpace();
        return length > 0;
    }

    bool TakeIf(char c) { return Next() == c && Take(1); }

    bool TakeWord(std::string_view word) {
        return m_rest.substr(0, word.size()) == word && Take(word.size());
    }

    bool TakeNumber() {
        const std::size_t length = NumberLength(m_rest);
        if (length > 0)
            m_facts.fate = std::max(m_facts.fate, FateOf(m_rest.substr(0, length)));
        return Take(length);
    }

    bool TakeKey() { return Next() == '"' && Take(StringLength(m_rest)) && TakeIf(':'); }

    /// Takes a scalar, or the bracket that opens an object or an array.
    bool TakeValue() {
        switch (Next()) {
        case '{':
            return Open(true);
        case '[':
            return Open(false);
        case '"':
            return Take(StringLength(m_rest));
        case 't':
            return TakeWord("true");
        case 'f':
            return TakeWord("false");
        case 'n':
            return TakeWord("null");
        default:
            return TakeNumber();
        }
    }

    bool Open(bool isObject) {
        if (m_open == MAX_LEVELS)
            return false;
        m_isObject.Set(m_open++, isObject);
        m_facts.levels = std::max(m_facts.levels, m_open);
        m_isBegun = true;
        return Take(1);
    }

    bool Close() {
        --m_open;
        return Take(1);
    }

    /// Takes the end of the innermost level, or its next value.
    bool Continue() {
        const bool isObject = m_isObject[m_open - 1];
        const bool isFirst = m_isBegun;
        m_isBegun = false;
        if (Next() == (isObject ? '}' : ']'))
            return Close();
        if (!isFirst && !TakeIf(','))
            return false;
        return (!isObject || TakeKey()) && TakeValue();
    }

    std::string_view m_rest;
    JsonFacts m_facts;
    Levels m_isObject;
    std::size_t m_open = 0;
    bool m_isBegun = false; ///< The innermost level has no value yet.
};

/// Hands the parts of a JSON text to `take`, without white space: each string with its quotation marks, and
/// each piece between strings.
template <typename Take>
void ForEachPart(std::string_view json, Take take) {
    while (!json.empty()) {
        const char first = json.front();
        const std::size_t length = WHITE_SPACE.Has(first) ? 1
                                   : first == '"'         ? StringLength(json)
                                                          : SPACE_AND_STRINGS.FindIn(json, 1);
        if (!WHITE_SPACE.Has(first))
            take(json.substr(0, length));
        json.remove_prefix(length);
    }
}

/// Appends a part with each single quote written twice, also a quote that is written as an escape.
void AppendQuotesDoubled(Buffer& buffer, std::string_view part) {
    while (!part.empty()) {
        const std::size_t at = QUOTES_AND_ESCAPES.FindIn(part);
        buffer.Append(part.substr(0, at));
        part.remove_prefix(at);
        if (part.empty())
            return;
        const bool isEscaped = part.substr(0, ESCAPED_QUOTE.size()) == ESCAPED_QUOTE;
        const std::size_t length = isEscaped ? ESCAPED_QUOTE.size() : part.front() == '\\' ? 2 : 1;
        buffer.Append(isEscaped || part.front() == '\'' ? "''" : part.substr(0, length));
        part.remove_prefix(length);
    }
}

} // namespace

JsonFacts ReadJson(std::string_view text) {
    return Reader(text).Read();
}

void AppendJson(Buffer& buffer, std::string_view json, Quotes quotes, bool isCompact) {
    // Programs mostly write JSON without white space and without single quotes. It is copied as it is.
    const auto hasNone = [json](char c) { return json.find(c) == std::string_view::npos; };
    if (isCompact && (quotes == Quotes::AsTheyAre || (hasNone('\'') && hasNone('\\'))))
        return buffer.Append(json);
    ForEachPart(json, [&](std::string_view part) {
        if (quotes == Quotes::Doubled)
            AppendQuotesDoubled(buffer, part);
        else
            buffer.Append(part);
    });
}

void AppendJsonEscaped(Buffer& buffer, std::string_view json, Quotes quotes) {
    ForEachPart(json, [&](std::string_view part) { AppendEscaped(buffer, part, quotes); });
}

} // namespace hublink::wire
