#pragma once

#include <string>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/otlp/ResourceConfig.h"

namespace MetrikSdk::otlp {

/// The batch as the body of an OTLP/HTTP JSON logs request. Pure. docs/Events.md shows an example, and says
/// what each part means.
///
/// There is one resource for each module release, and one log record for each event. The payload becomes a
/// structured body. What deserves a column of a table becomes an attribute, too. The first
/// MAX_DATA_ATTRIBUTES scalar members of eventData are among these attributes. timeUnixNano is the payload's
/// extend.createTime. When that makes no sense, timeUnixNano is the time at which the event was stored, like
/// observedTimeUnixNano. A payload that is no JSON object, or is too deep, becomes a text body. Bytes that
/// are not UTF-8 are replaced by U+FFFD.
std::string EncodeOtlp(const Batch& batch, const ResourceConfig& config = {});

/// By default, collectors allow 128 attributes for a record. Columns are named after the attributes, so the
/// names are bounded, too.
constexpr int MAX_DATA_ATTRIBUTES = 64;
constexpr std::size_t MAX_DATA_NAME_BYTES = 128;

} // namespace MetrikSdk::otlp
