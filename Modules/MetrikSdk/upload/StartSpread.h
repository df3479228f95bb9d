#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <vector>

#include "Modules/MetrikSdk/otlp/EndpointConfig.h"

namespace MetrikSdk::upload {

/// What METRIK_START_SPREAD says of RetrySettings::startSpread, in milliseconds; nothing when it is not set.
/// A value that makes no sense is described in `complaints` and counts as unset; one of more than an hour
/// counts as an hour.
std::optional<std::chrono::milliseconds> ReadStartSpread(const otlp::LookUp& lookUp,
                                                         std::vector<std::string>& complaints);

} // namespace MetrikSdk::upload
