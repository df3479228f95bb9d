#pragma once

#include <chrono>
#include <optional>
#include <string>

#include "Modules/MetrikSdk/Time.h"

namespace MetrikSdk::otlp {

/// The wait that a Retry-After header asks for, in seconds or until a date. Nothing when it is neither.
std::optional<std::chrono::milliseconds> ParseRetryAfter(const std::string& header, WallTime now);

} // namespace MetrikSdk::otlp
