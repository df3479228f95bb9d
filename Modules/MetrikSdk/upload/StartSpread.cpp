#include "Modules/MetrikSdk/upload/StartSpread.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <string_view>
#include <system_error>

namespace MetrikSdk::upload {

std::optional<std::chrono::milliseconds> ReadStartSpread(const otlp::LookUp& lookUp,
                                                         std::vector<std::string>& complaints) {
    constexpr const char* NAME = "METRIK_START_SPREAD";
    constexpr std::chrono::milliseconds MOST = std::chrono::hours(1);
    const char* value = lookUp(NAME);
    const std::string_view text = value == nullptr ? "" : value;
    if (text.empty())
        return std::nullopt;
    std::int64_t milliseconds = 0;
    const auto* end = text.data() + text.size();
    const auto parsed = std::from_chars(text.data(), end, milliseconds);
    if (parsed.ec != std::errc() || parsed.ptr != end || milliseconds < 0) {
        complaints.push_back(std::string(NAME) + " is no number of milliseconds and counts as unset");
        return std::nullopt;
    }
    return std::chrono::milliseconds(std::min<std::int64_t>(milliseconds, MOST.count()));
}

} // namespace MetrikSdk::upload
