#pragma once

#include "SystemTool/IO/JsonMemory.h"

namespace MetrikSdk::otlp {

using SystemTool::IO::JsonValue;
using SystemTool::IO::JsonWriter;

/// Writes a JSON value as the protocol's AnyValue: an object as a list of keys and values, an integer as a
/// decimal text, null as the empty value. An integer beyond 64 bits with a sign becomes a text, one beyond 64
/// bits without a sign is a double in the payload already. Of members
/// with the same key the first counts, as for the service's own reader; the protocol allows only one.
/// Calls itself for each level: the value's depth must be bounded (Payload::MAX_DEPTH).
void WriteAnyValue(JsonWriter& writer, const JsonValue& value);

} // namespace MetrikSdk::otlp
