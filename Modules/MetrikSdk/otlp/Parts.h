#pragma once

#include <string>

#include "Modules/MetrikSdk/Event.h"
#include "Modules/MetrikSdk/otlp/ResourceConfig.h"
#include "SystemTool/IO/JsonMemory.h"

/// What requests with log records and requests with metrics have in common. Pure.
namespace MetrikSdk::otlp {

/// Whose names the attributes are, as far as they are common ones.
inline constexpr const char* SCHEMA_URL = "https://opentelemetry.io/schemas/1.30.0";

/// `text` must be UTF-8.
void WriteTextMember(SystemTool::IO::JsonWriter& writer, const char* name, const std::string& text);

/// An attribute of the type that `type` names, such as "intValue", whose value is written as a text.
void WriteAttribute(SystemTool::IO::JsonWriter& writer, const std::string& key, const char* type,
                    const std::string& value);

/// What is not UTF-8 is replaced by U+FFFD.
void WriteTextAttribute(SystemTool::IO::JsonWriter& writer, const std::string& key, const std::string& text);

/// Who sends: docs/Events.md, "The resource".
void WriteResource(SystemTool::IO::JsonWriter& writer, const ResourceConfig& config,
                   const std::string& outboxId, const ModuleIdentity& module);

void WriteScope(SystemTool::IO::JsonWriter& writer);

/// The protocol's JSON writes 64-bit integers as texts, because many readers' numbers are doubles.
std::string Nanoseconds(WallTime time);

} // namespace MetrikSdk::otlp
