#pragma once

#include "SystemTool/IO/JsonMemory.h"

namespace MetrikSdk::otlp {

using SystemTool::IO::JsonValue;
using SystemTool::IO::JsonWriter;

/// Writes a JSON value as the protocol's AnyValue: an object as a list of keys and values, an integer as a
/// decimal text, null as the empty value. An integer that fits into 64 bits only without a sign becomes a
/// text. A larger integer is a double in the payload already. When members have the same key, the first one
/// counts, as for the service's own reader; the protocol allows only one. The function calls itself for each
/// level, so the depth of the value must be bounded (Payload::MAX_DEPTH).
void WriteAnyValue(JsonWriter& writer, const JsonValue& value);

} // namespace MetrikSdk::otlp
