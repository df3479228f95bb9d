#include "Modules/MetrikSdk/otlp/RetryAfter.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <system_error>

#include "Modules/MetrikSdk/otlp/CurlLibrary.h"

namespace MetrikSdk::otlp {

std::optional<std::chrono::milliseconds> ParseRetryAfter(const std::string& header, WallTime now) {
    if (header.empty())
        return std::nullopt;
    constexpr std::int64_t FAR = 1'000'000'000; // in seconds; keeps sums with a hostile number in range
    std::int64_t seconds = 0;
    const auto end = header.data() + header.size();
    const auto parsed = std::from_chars(header.data(), end, seconds);
    if (parsed.ec == std::errc::result_out_of_range)
        return header[0] == '-' ? std::chrono::milliseconds(0) : std::chrono::milliseconds::max();
    if (parsed.ec == std::errc() && parsed.ptr == end)
        return std::chrono::seconds(std::clamp<std::int64_t>(seconds, 0, FAR));
    const auto date = Curl().getdate(header.c_str(), nullptr);
    if (date < 0)
        return std::nullopt;
    const auto today = std::chrono::floor<std::chrono::seconds>(now).time_since_epoch().count();
    if (date > today + FAR) // the year of the date may have ten digits
        return std::chrono::seconds(FAR);
    const WallTime until{std::chrono::seconds(date)};
    return std::max(until - now, std::chrono::milliseconds(0));
}

} // namespace MetrikSdk::otlp
