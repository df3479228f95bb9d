#include "Tools/reportctl/terminal/Quantity.h"

#include <fmt/format.h>

namespace reportctl::terminal {

std::string Bytes(std::uint64_t bytes) {
    if (bytes < 10'000)
        return fmt::format("{} B", bytes);
    if (bytes < 10'000'000)
        return fmt::format("{:.1f} KB", static_cast<double>(bytes) / 1e3);
    if (bytes < 10'000'000'000)
        return fmt::format("{:.1f} MB", static_cast<double>(bytes) / 1e6);
    return fmt::format("{:.1f} GB", static_cast<double>(bytes) / 1e9);
}

std::string Number(std::uint64_t number) {
    auto text = std::to_string(number);
    for (auto at = static_cast<std::ptrdiff_t>(text.size()) - 3; at > 0; at -= 3)
        text.insert(static_cast<std::size_t>(at), 1, ',');
    return text;
}

std::string Counted(std::uint64_t number, const std::string& thing) {
    return fmt::format("{} {}{}", Number(number), thing, number == 1 ? "" : "s");
}

std::string Duration(std::int64_t milliseconds) {
    constexpr std::int64_t MINUTE = 60;
    constexpr std::int64_t HOUR = 60 * MINUTE;
    constexpr std::int64_t DAY = 24 * HOUR;
    const auto seconds = milliseconds / 1000;
    if (seconds < 2 * MINUTE)
        return fmt::format("{} s", seconds);
    if (seconds < 2 * HOUR)
        return fmt::format("{} min", seconds / MINUTE);
    return seconds < 2 * DAY ? fmt::format("{} h", seconds / HOUR) : fmt::format("{} days", seconds / DAY);
}

} // namespace reportctl::terminal
