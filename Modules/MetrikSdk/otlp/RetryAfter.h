#pragma once

#include <chrono>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::otlp {

/// A Retry-After header: seconds, or a date. Nothing when it is neither.
std::optional<std::chrono::milliseconds> ParseRetryAfter(const std::string& header, WallTime now);

} // namespace MetrikSdk::otlp
