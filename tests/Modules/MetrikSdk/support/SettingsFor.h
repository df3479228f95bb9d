#pragma once

#include <string>

#include "Modules/MetrikSdk/Settings.h"

/// The real settings, with `directory` as the user's data directory, where an outbox is allowed. An uploader
/// sends its first request at once.
inline MetrikSdk::OutboxSettings SettingsFor(const std::string& directory) {
    MetrikSdk::OutboxSettings settings;
    settings.file.dataDirectory = directory;
    settings.retry.startSpread = std::chrono::milliseconds(0);
    return settings;
}
