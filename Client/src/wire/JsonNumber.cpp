#include "wire/JsonNumber.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>

namespace hublink::wire {
namespace {

bool IsDigit(char c) {
    return c >= '0' && c <= '9';
}

std::size_t DigitsAt(std::string_view text, std::size_t at) {
    std::size_t end = at;
    while (end < text.size() && IsDigit(text[end]))
        ++end;
    return end - at;
}

char At(std::string_view text, std::size_t at) {
    return at < text.size() ? text[at] : '\0';
}

bool FitsIn64Bits(std::string_view digits, bool isNegative) {
    const std::string_view most = isNegative ? "9223372036854775808" : "18446744073709551615";
    return digits.size() < most.size() || (digits.size() == most.size() && digits <= most);
}

Fate FateOfInteger(std::string_view number) {
    if (number == "-0") // the service keeps it as the integer 0, which has no sign
        return Fate::Rounded;
    const bool isNegative = number.front() == '-';
    return FitsIn64Bits(number.substr(isNegative ? 1 : 0), isNegative) ? Fate::Exact : Fate::Lost;
}

/// A number with a fraction or an exponent, taken apart: its digits from the first that is not zero to the
/// last that is not zero, and the power of ten of the first of these digits. The sign is dropped.
class Decimal {
public:
    explicit Decimal(std::string_view number) {
        if (number.front() == '-')
            number.remove_prefix(1);
        const auto mark = std::min(number.find_first_of("eE"), number.size());
        ReadMantissa(number.substr(0, mark));
        if (mark < number.size())
            m_power += Exponent(number.substr(mark + 1));
    }

    bool IsZero() const { return m_length == 0; }
    std::size_t Length() const { return m_length; }
    std::int64_t Power() const { return m_power; }

    /// The first digits, at most MOST of them.
    std::string_view Digits() const { return {m_digits, std::min(m_length, MOST)}; }

private:
    static constexpr std::size_t MOST = 20;

    void ReadMantissa(std::string_view mantissa) {
        const auto first = mantissa.find_first_of("123456789");
        if (first == std::string_view::npos)
            return;
        const auto point = std::min(mantissa.find('.'), mantissa.size());
        m_power =
            static_cast<std::int64_t>(point) - static_cast<std::int64_t>(first) - (first < point ? 1 : 0);
        const auto last = mantissa.find_last_of("123456789");
        for (const char c : mantissa.substr(first, last - first + 1))
            if (IsDigit(c) && m_length++ < MOST)
                m_digits[m_length - 1] = c;
    }

    static std::int64_t Exponent(std::string_view text) {
        constexpr std::int64_t ENOUGH = 1'000'000'000; // no text here has so many digits
        std::int64_t exponent = 0;
        for (const char c : text)
            if (IsDigit(c))
                exponent = std::min(exponent * 10 + (c - '0'), ENOUGH);
        return text.front() == '-' ? -exponent : exponent;
    }

    char m_digits[MOST] = {};
    std::size_t m_length = 0;
    std::int64_t m_power = 0;
};

Fate FateOfDecimal(const Decimal& decimal) {
    // A double keeps every number of 15 digits whose power of ten is not close to the double's limits.
    constexpr std::size_t DIGITS_OF_DOUBLE = 15;
    constexpr std::int64_t SAFE_POWER = 300;
    constexpr std::int64_t LARGEST_POWER = 308;
    // From these digits on, a number of the largest power is infinity as a double.
    constexpr std::string_view ROUNDS_TO_INFINITY = "17976931348623158079";
    if (decimal.IsZero())
        return Fate::Exact;
    if (decimal.Power() > LARGEST_POWER ||
        (decimal.Power() == LARGEST_POWER && decimal.Digits() >= ROUNDS_TO_INFINITY))
        return Fate::Lost;
    const bool isSafe = decimal.Power() >= -SAFE_POWER && decimal.Power() <= SAFE_POWER;
    return isSafe && decimal.Length() <= DIGITS_OF_DOUBLE ? Fate::Exact : Fate::Rounded;
}

} // namespace

Fate FateOf(std::string_view number) {
    if (number.find_first_of(".eE") == std::string_view::npos)
        return FateOfInteger(number);
    return FateOfDecimal(Decimal(number));
}

std::size_t NumberLength(std::string_view text) {
    std::size_t at = At(text, 0) == '-' ? 1 : 0;
    const std::size_t integer = At(text, at) == '0' ? 1 : DigitsAt(text, at);
    if (integer == 0)
        return 0;
    at += integer;
    if (At(text, at) == '.') {
        const std::size_t fraction = DigitsAt(text, at + 1);
        if (fraction == 0)
            return 0;
        at += 1 + fraction;
    }
    if (At(text, at) != 'e' && At(text, at) != 'E')
        return at;
    ++at;
    if (At(text, at) == '+' || At(text, at) == '-')
        ++at;
    const std::size_t exponent = DigitsAt(text, at);
    return exponent == 0 ? 0 : at + exponent;
}

} // namespace hublink::wire
