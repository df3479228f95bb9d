#pragma once

#include <string>

#include <SQLiteCpp/Database.h>

/// The analytics outbox's database, as docs/Outbox.md describes it.
namespace reportctl::outbox {

/// Opens the outbox to read in it. Throws std::runtime_error when it is missing or is none of a version that
/// this program knows, SQLite::Exception for the rest.
SQLite::Database OpenToLook(const std::string& path);

/// The same to change it.
SQLite::Database OpenToChange(const std::string& path);

} // namespace reportctl::outbox
