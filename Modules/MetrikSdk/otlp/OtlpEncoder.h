#pragma once

#include <string>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/otlp/ResourceConfig.h"

namespace MetrikSdk::otlp {

/// The batch as the body of an OTLP/HTTP JSON logs request. Pure. docs/Events.md shows one, and says what
/// each part means.
///
/// One resource for each module release, and one log record for each event. The payload is a structured body,
/// and what is worth a column of a table is an attribute, too: its first MAX_DATA_ATTRIBUTES scalar members
/// of eventData among it. timeUnixNano is the payload's extend.createTime; where that makes no sense, it is
/// the time at which the event was stored, which is also observedTimeUnixNano. A payload that is no JSON
/// object, or is too deep, becomes a text body. What is not UTF-8 is replaced by U+FFFD.
std::string EncodeOtlp(const Batch& batch, const ResourceConfig& config = {});

/// Collectors bound the attributes of a record at 128 by default, and columns are named after them.
constexpr int MAX_DATA_ATTRIBUTES = 64;
constexpr std::size_t MAX_DATA_NAME_BYTES = 128;

} // namespace MetrikSdk::otlp
