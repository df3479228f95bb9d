#pragma once

#include <string>

#include "Modules/MetrikSdk/Event.h"

namespace MetrikSdk::otlp {

/// The batch as the body of an OTLP/HTTP JSON logs request. Pure.
///
/// One resource for each module release: service.name (the module's id when it has no name), service.version,
/// service.instance.id (the module's id) and metrik.outbox.id, within which a module's sequence runs.
/// One log record for each event: eventName, the payload as a structured body, log.record.uid (the event's
/// own id, the same at every attempt) and metrik.sequence. timeUnixNano is the payload's extend.createTime;
/// where that makes no sense, it is the time at which the event was stored, which is also
/// observedTimeUnixNano. A payload that is no JSON object becomes a text body. What is not UTF-8 is replaced
/// by U+FFFD.
std::string EncodeOtlp(const Batch& batch);

} // namespace MetrikSdk::otlp
