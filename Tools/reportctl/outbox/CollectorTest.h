#pragma once

#include "Tools/reportctl/service/Environment.h"

namespace reportctl::outbox {

/// Sends one test event to the collector that `environment` names, as the service sends events, and prints
/// the result of each step on standard output. The event's id is "reportctl.test", and its data says that it
/// is a test. It does not go through the outbox. Returns true when the uploader would count it as delivered.
bool TestCollector(const service::Environment& environment);

} // namespace reportctl::outbox
