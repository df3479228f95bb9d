#pragma once

#include <string>

#include "Modules/MetrikSdk/Settings.h"

/// Production's settings, with the user's data directory at `directory`: there an outbox may be.
inline MetrikSdk::OutboxSettings SettingsFor(const std::string& directory) {
    MetrikSdk::OutboxSettings settings;
    settings.file.dataDirectory = directory;
    return settings;
}
