#pragma once

#include "Tools/reportctl/service/Environment.h"

namespace reportctl::outbox {

/// Sends one test event to the collector that `environment` names, in the way of the service, and tells on
/// standard output what came of it, step by step. The event's id is "reportctl.test", and its data says what
/// it is; it does not go through the outbox. True when the collector took it.
bool TestCollector(const service::Environment& environment);

} // namespace reportctl::outbox
