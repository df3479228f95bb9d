#pragma once

#include <string>

#include "Modules/MetrikSdk/Settings.h"

/// The real settings, with `directory` as the user's data directory, where an outbox is allowed.
inline MetrikSdk::OutboxSettings SettingsFor(const std::string& directory) {
    MetrikSdk::OutboxSettings settings;
    settings.file.dataDirectory = directory;
    return settings;
}
