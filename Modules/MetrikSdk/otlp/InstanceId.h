#pragma once

#include <string>

namespace MetrikSdk::otlp {

/// A UUID of version 5. For a module of an outbox it is always the same. Every other module, and every other
/// outbox of a fleet, has another one. `outboxId` is the UUID of the outbox. Pure.
std::string InstanceId(const std::string& outboxId, const std::string& moduleId);

} // namespace MetrikSdk::otlp
