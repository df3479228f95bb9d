#include "SystemTool/IO/JsonNumbers.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string_view>

namespace SystemTool::IO {
namespace {

constexpr std::string_view DIGITS = "0123456789";

bool IsDigit(std::string_view json, std::size_t at) {
    return at < json.size() && DIGITS.find(json[at]) != std::string_view::npos;
}

std::size_t SkipDigits(std::string_view json, std::size_t at) {
    return std::min(json.find_first_not_of(DIGITS, at), json.size());
}

/// The place after the string that begins at `at`.
std::size_t SkipString(std::string_view json, std::size_t at) {
    for (++at; at < json.size() && json[at] != '"'; ++at)
        at += json[at] == '\\' ? 1 : 0;
    return at + 1;
}

/// The place after the number that begins at `at`. Characters that JSON does not allow in a number are left
/// to the parser.
std::size_t SkipNumber(std::string_view json, std::size_t at) {
    at += json[at] == '-' ? 1 : 0;
    at = json.substr(at, 1) == "0" ? at + 1 : SkipDigits(json, at); // no digit may follow a leading zero
    if (json.substr(at, 1) == "." && IsDigit(json, at + 1))
        at = SkipDigits(json, at + 1);
    if (json.substr(at, 1) != "e" && json.substr(at, 1) != "E")
        return at;
    const bool hasSign = json.substr(at + 1, 1) == "-" || json.substr(at + 1, 1) == "+";
    const std::size_t exponent = at + (hasSign ? 2 : 1);
    return IsDigit(json, exponent) ? SkipDigits(json, exponent) : at;
}

/// A text with the number's value that the parser accepts. Empty when the value is beyond the range of a
/// double, and for a zero without an exponent, which the parser accepts as it is.
///
/// The text of a zero has an exponent, too. Without one, the invalid 0e0e309 would become 0.0e309, and the
/// parser would call that a number that is too big.
std::string StandIn(const std::string& number) {
    const double value = std::strtod(number.c_str(), nullptr);
    if (value == 0)
        return number.find_first_of("eE") == std::string::npos ? "" : std::signbit(value) ? "-0e0" : "0e0";
    std::array<char, 32> text{};
    // Seventeen digits identify each double exactly.
    if (std::isfinite(value))
        std::snprintf(text.data(), text.size(), "%.16e", value);
    return text.data();
}

/// Replaces the number, if it can. The new text is filled up with spaces, which JSON allows after a number,
/// so that everything after the number stays at its byte.
bool Rewrite(std::string& json, std::size_t begin, std::size_t end) {
    std::string text = StandIn(json.substr(begin, end - begin));
    if (text.empty() || text.size() > end - begin)
        return false;
    text.resize(end - begin, ' ');
    json.replace(begin, text.size(), text);
    return true;
}

} // namespace

bool RewriteNumbers(std::string& json, std::size_t from) {
    bool isRewritten = false;
    for (std::size_t at = from; at < json.size();) {
        if (json[at] == '"') {
            at = SkipString(json, at);
        } else if (json[at] == '-' || IsDigit(json, at)) {
            const std::size_t end = SkipNumber(json, at);
            isRewritten |= Rewrite(json, at, end);
            at = end;
        } else {
            ++at;
        }
    }
    return isRewritten;
}

} // namespace SystemTool::IO
