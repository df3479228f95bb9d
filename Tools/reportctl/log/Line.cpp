#include "Tools/reportctl/log/Line.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <ctime>

namespace reportctl::log {
namespace {

constexpr std::string_view STAMP_FORM = "0000-00-00 00:00:00.000";
constexpr std::size_t SECONDS_SIZE = STAMP_FORM.size() - 4;
constexpr std::array<std::string_view, 5> LEVELS{"DEBUG", "INFO", "WARN", "ERROR", "FATAL"};

bool IsDigit(char c) {
    return c >= '0' && c <= '9';
}

bool IsStamp(std::string_view text) {
    return text.size() == STAMP_FORM.size() &&
           std::equal(text.begin(), text.end(), STAMP_FORM.begin(),
                      [](char c, char form) { return form == '0' ? IsDigit(c) : c == form; });
}

int NumberAt(std::string_view text, std::size_t at, std::size_t size) {
    int number = 0;
    std::from_chars(text.data() + at, text.data() + at + size, number);
    return number;
}

/// The seconds since 1970 of a local time. It keeps the last result: a busy log has thousands of lines of the
/// same second, and the conversion takes longer than all other work on a line.
std::time_t SecondsOf(std::string_view stamp) {
    thread_local std::string lastText;
    thread_local std::time_t lastSeconds = 0;
    const auto text = stamp.substr(0, SECONDS_SIZE);
    if (text == lastText)
        return lastSeconds;
    std::tm local{};
    local.tm_year = NumberAt(text, 0, 4) - 1900;
    local.tm_mon = NumberAt(text, 5, 2) - 1;
    local.tm_mday = NumberAt(text, 8, 2);
    local.tm_hour = NumberAt(text, 11, 2);
    local.tm_min = NumberAt(text, 14, 2);
    local.tm_sec = NumberAt(text, 17, 2);
    local.tm_isdst = -1;
    lastText = text;
    lastSeconds = std::mktime(&local);
    return lastSeconds;
}

terminal::TimePoint TimeOf(std::string_view stamp) {
    return terminal::TimePoint(std::chrono::seconds(SecondsOf(stamp)) +
                               std::chrono::milliseconds(NumberAt(stamp, SECONDS_SIZE + 1, 3)));
}

/// Removes the text before `end`, and `end` itself, from `rest`. Returns that text, or nothing when `rest`
/// has no such `end`.
std::optional<std::string_view> TakeUntil(std::string_view& rest, std::string_view end) {
    const auto at = rest.find(end);
    if (at == std::string_view::npos)
        return std::nullopt;
    const auto taken = rest.substr(0, at);
    rest.remove_prefix(at + end.size());
    return taken;
}

int HexDigit(char c) {
    constexpr std::string_view DIGITS = "0123456789abcdef";
    const auto found = DIGITS.find(c);
    return found == std::string_view::npos ? -1 : static_cast<int>(found);
}

/// Appends the character that the escape at the start of `text` stands for. Returns the escape's size. A
/// backslash that begins no escape is appended itself.
std::size_t AppendOriginal(std::string& out, std::string_view text) {
    constexpr std::string_view LETTERS = "\\nrt";
    constexpr std::string_view ORIGINALS = "\\\n\r\t";
    if (text.size() > 1)
        if (const auto letter = LETTERS.find(text[1]); letter != std::string_view::npos) {
            out += ORIGINALS[letter];
            return 2;
        }
    if (text.size() > 3 && text[1] == 'x' && HexDigit(text[2]) >= 0 && HexDigit(text[3]) >= 0) {
        out += static_cast<char>(HexDigit(text[2]) * 16 + HexDigit(text[3]));
        return 4;
    }
    out += text.front();
    return 1;
}

} // namespace

std::string Unescaped(std::string_view text) {
    std::string out;
    out.reserve(text.size());
    while (!text.empty()) {
        const auto plain = std::min(text.find('\\'), text.size());
        out += text.substr(0, plain);
        text.remove_prefix(plain);
        if (!text.empty())
            text.remove_prefix(AppendOriginal(out, text));
    }
    return out;
}

int LevelOf(std::string_view word) {
    const auto found = std::find(LEVELS.begin(), LEVELS.end(), word);
    if (found != LEVELS.end())
        return static_cast<int>(found - LEVELS.begin()) + 1;
    return NumberAt(word, 0, word.size());
}

std::string WordFor(int level) {
    const auto place = static_cast<std::size_t>(level - 1);
    return std::string(place < LEVELS.size() ? LEVELS[place] : "");
}

int LevelIn(std::string_view text) {
    if (text.size() <= STAMP_FORM.size())
        return 0;
    auto word = text.substr(STAMP_FORM.size() + 1);
    word.remove_prefix(std::min(word.find_first_not_of(' '), word.size()));
    word = word.substr(0, word.find(' '));
    return LevelOf(word);
}

std::optional<Line> ReadLine(std::string_view text) {
    if (!IsStamp(text.substr(0, STAMP_FORM.size())))
        return std::nullopt;
    auto rest = text.substr(STAMP_FORM.size());
    const auto level = TakeUntil(rest, " [");
    const auto process = level ? TakeUntil(rest, ":") : std::nullopt;
    const auto thread = process ? TakeUntil(rest, "] [") : std::nullopt;
    const auto site = thread ? TakeUntil(rest, ":") : std::nullopt;
    const auto number = site ? TakeUntil(rest, " ") : std::nullopt;
    const auto function = number ? TakeUntil(rest, "] ") : std::nullopt;
    if (!function)
        return std::nullopt;
    const auto stamp = text.substr(0, STAMP_FORM.size());
    return Line{.time = TimeOf(stamp),
                .stamp = std::string(stamp),
                .level = LevelIn(text),
                .process = std::string(*process),
                .site = Unescaped(*site),
                .number = std::string(*number),
                .function = Unescaped(function->substr(0, function->find(" #"))),
                .message = Unescaped(rest)};
}

} // namespace reportctl::log
