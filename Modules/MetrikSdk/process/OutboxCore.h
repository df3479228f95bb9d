#pragma once

#include <memory>
#include <string>
#include <utility>

#include "Modules/MetrikSdk/Settings.h"
#include "Modules/MetrikSdk/outbox/Outbox.h"
#include "Modules/MetrikSdk/report/Notifier.h"

namespace MetrikSdk::process {

/// What the users of an outbox and its uploader share. It lives as long as any of them.
struct OutboxCore {
    OutboxCore(const std::string& directory, const OutboxSettings& outboxSettings,
               std::shared_ptr<report::FailureReporter> reporter)
        : settings(outboxSettings), notifier(std::move(reporter)), outbox(directory, settings, notifier) {}

    const OutboxSettings settings;
    report::Notifier notifier;
    outbox::Outbox outbox;
};

} // namespace MetrikSdk::process
