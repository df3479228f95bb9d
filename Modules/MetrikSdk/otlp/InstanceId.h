#pragma once

#include <string>

namespace MetrikSdk::otlp {

/// A UUID of version 5 that is the same for a module of an outbox for ever, and another one for each other
/// module and each other outbox of a fleet. `outboxId` is the outbox's own UUID. Pure.
std::string InstanceId(const std::string& outboxId, const std::string& moduleId);

} // namespace MetrikSdk::otlp
