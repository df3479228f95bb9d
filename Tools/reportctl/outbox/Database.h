#pragma once

#include <string>

#include <SQLiteCpp/Database.h>

/// The analytics outbox's database, as docs/Outbox.md describes it.
namespace reportctl::outbox {

/// Opens the outbox for reading. Throws std::runtime_error when it is missing, or when it is not an outbox of
/// the version that this program knows. Throws SQLite::Exception for other errors.
SQLite::Database OpenToLook(const std::string& path);

/// Opens the outbox for changes. Throws what OpenToLook throws.
SQLite::Database OpenToChange(const std::string& path);

} // namespace reportctl::outbox
