#include "Tools/reportctl/outbox/Database.h"

#include <filesystem>
#include <stdexcept>

#include <fmt/format.h>

#include "Modules/MetrikSdk/outbox/OutboxSchema.h"
#include "Tools/reportctl/store/Store.h"

namespace reportctl::outbox {
namespace {

void RequireFile(const std::string& path) {
    std::error_code error;
    if (std::filesystem::exists(path, error))
        return;
    if (error)
        throw std::runtime_error(path + ": " + error.message());
    throw std::runtime_error(
        fmt::format("there is no outbox: {} is missing. The service makes it when a module is "
                    "announced with that directory, its own at its start.",
                    path));
}

SQLite::Database Checked(const std::string& path, SQLite::Database database) {
    const auto application = database.execAndGet("pragma application_id").getInt();
    const auto version = database.execAndGet("pragma user_version").getInt();
    if (application != MetrikSdk::outbox::APPLICATION_ID || version != MetrikSdk::outbox::SCHEMA_VERSION)
        throw std::runtime_error(
            fmt::format("{} is no outbox of schema version {}, the one that this program knows.", path,
                        MetrikSdk::outbox::SCHEMA_VERSION));
    return database;
}

} // namespace

SQLite::Database OpenToLook(const std::string& path) {
    RequireFile(path);
    return Checked(path, store::OpenToRead(path));
}

SQLite::Database OpenToChange(const std::string& path) {
    RequireFile(path);
    return Checked(path, store::OpenStore(path));
}

} // namespace reportctl::outbox
