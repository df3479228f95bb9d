#include "tests/Client/RandomEvents.h"

#include <array>
#include <string_view>

using std::string_view_literals::operator""sv;

namespace {

constexpr std::array PIECES = {
    "'"sv,   "''"sv,     "\""sv,   "\\"sv,          "%"sv,      "%s"sv,     "%n%1%"sv,      "\n"sv,
    "\r"sv,  "\t"sv,     "\x01"sv, "\x1f"sv,        "\x7f"sv,   "/"sv,      "eventID"sv,    "\\u0027"sv,
    "{"sv,   "}"sv,      "["sv,    "]"sv,           ","sv,      ":"sv,      "null"sv,       "1"sv,
    ";--"sv, "');"sv,    "|"sv,    "\u00e4"sv,      "\u20ac"sv, "\ufffd"sv, "\U0001F600"sv, "\U0010ffff"sv,
    " "sv,   "openid"sv, "a"sv,    "some words "sv, "\ufeff"sv, "\u2028"sv, "\\ud83d"sv,    "\u0000x"sv};

// Pieces that make a text one that cannot be sent. They are used less often than the others; otherwise no
// event could be sent.
constexpr std::array BAD_PIECES = {"\0"sv,  "\x80"sv, "\xc0\xaf"sv, "\xed\xa0\x80"sv, "\xf4\x90\x80\x80"sv,
                                   "\xff"sv};

constexpr std::array NUMBERS = {"0"sv,
                                "-0"sv,
                                "1"sv,
                                "-1"sv,
                                "1.5"sv,
                                "18446744073709551615"sv,
                                "9223372036854775807"sv,
                                "-9223372036854775808"sv,
                                "18446744073709551616"sv,
                                "-9223372036854775809"sv,
                                "0.1"sv,
                                "1e2"sv,
                                "1E-7"sv,
                                "1.7976931348623157e308"sv,
                                "1e309"sv,
                                "2.5e-324"sv,
                                "0.12345678901234567890"sv,
                                "100.0"sv,
                                "-0.0"sv};

constexpr std::array ESCAPES = {
    "\\\""sv,    "\\\\"sv,           "\\/"sv,     "\\b"sv,     "\\n"sv,    "\\u0000"sv, "\\u0027"sv,
    "\\u00e4"sv, "\\ud83d\\ude00"sv, "\\u0022"sv, "\\u005c"sv, "\\uFFFF"sv};

} // namespace

RandomEvent RandomEvents::Next() {
    RandomEvent event;
    event.id = Id();
    switch (Below(10)) {
    case 0:
        return event;
    case 1:
    case 2:
    case 3:
    case 4:
        event.kind = RandomEvent::Kind::Text;
        event.value = OneIn(30) ? LongText() : Text(Below(30));
        return event;
    default:
        event.kind = RandomEvent::Kind::Json;
        event.value = OneIn(4) ? Json(4) : JsonObject(4);
        if (OneIn(20)) // breaks the JSON
            event.value.erase(Below(event.value.size()), 1);
        return event;
    }
}

std::string RandomEvents::Id() {
    switch (Below(10)) {
    case 0:
        return Text(Below(5));
    case 1:
    case 2:
    case 3:
        return "A100|" + Text(Below(4));
    case 4:
        return "A759|" + Text(Below(4));
    case 5:
        return "B'1|" + Text(Below(4));
    default:
        return "B" + std::to_string(Below(1000)) + "|10001";
    }
}

std::string RandomEvents::Text(std::size_t pieces) {
    std::string text;
    for (std::size_t i = 0; i < pieces; ++i)
        text += OneIn(300) ? BAD_PIECES[Below(BAD_PIECES.size())] : PIECES[Below(PIECES.size())];
    return text;
}

/// A text about as long as a datagram: some are over the limit, some under it.
std::string RandomEvents::LongText() {
    const std::string_view piece = PIECES[Below(PIECES.size())];
    std::string text = Text(10);
    for (const std::size_t length = 4000 + Below(6400); text.size() < length;)
        text += piece;
    return text;
}

std::string RandomEvents::Space() {
    constexpr std::array SPACES = {" "sv, "\n"sv, "\t"sv, "\r\n  "sv};
    return OneIn(4) ? std::string(SPACES[Below(SPACES.size())]) : std::string();
}

std::string RandomEvents::JsonString() {
    std::string text = "\"";
    for (std::size_t pieces = Below(4); pieces > 0; --pieces) {
        const std::string_view piece = PIECES[Below(PIECES.size())];
        const bool isPlain = piece.find_first_of("\"\\\n\r\t\x01\x1f") == std::string_view::npos;
        text += isPlain && !OneIn(3) ? piece : ESCAPES[Below(ESCAPES.size())];
    }
    return text + '"';
}

std::string RandomEvents::JsonNumber() {
    return OneIn(3) ? std::to_string(static_cast<std::int64_t>(m_random()))
                    : std::string(NUMBERS[Below(NUMBERS.size())]);
}

std::string RandomEvents::JsonObject(int levels) {
    std::string text = Space() + "{" + Space();
    for (std::size_t members = Below(5), i = 0; i < members; ++i)
        text += (i > 0 ? "," : "") + Space() + JsonString() + Space() + ":" + Json(levels - 1);
    return text + "}" + Space();
}

std::string RandomEvents::Json(int levels) {
    constexpr std::array WORDS = {"true"sv, "false"sv, "null"sv};
    switch (Below(levels > 0 ? 5 : 3)) {
    case 0:
        return Space() + JsonString() + Space();
    case 1:
        return JsonNumber();
    case 2:
        return std::string(WORDS[Below(WORDS.size())]);
    case 3:
        return JsonObject(levels);
    default:
        break;
    }
    std::string text = "[";
    for (std::size_t elements = Below(4), i = 0; i < elements; ++i)
        text += (i > 0 ? "," : "") + Json(levels - 1);
    return text + Space() + "]";
}
