#include "Tools/reportctl/store/Unchanged.h"

#include <filesystem>

#include <sqlite3.h>

namespace reportctl::store {
namespace {

constexpr int BUSY_TIMEOUT_MS = 20; // reading must be quick; in WAL mode, a writer makes no reader wait

/// The path as a URI with parameters. The characters "?", "#" and "%" have a meaning there, so they are
/// escaped.
std::string UriOf(const std::string& path, const char* parameters) {
    static constexpr std::string_view DIGITS = "0123456789ABCDEF";
    std::string uri = "file:";
    for (const char character : path) {
        const auto byte = static_cast<unsigned char>(character);
        if (character == '?' || character == '#' || character == '%')
            (uri += '%', uri += DIGITS[byte >> 4U]) += DIGITS[byte & 15U];
        else
            uri += character;
    }
    return uri + "?" + parameters;
}

} // namespace

SQLite::Database OpenUnchanged(const std::string& path) {
    std::error_code error;
    const auto logBytes = std::filesystem::file_size(path + "-wal", error);
    const bool hasLog = !error;
    const bool hasIndex = std::filesystem::exists(path + "-shm", error);
    // SQLite would make a missing -wal or -shm. When there is no log, the database file alone has all rows,
    // and "immutable" keeps SQLite from making the files.
    const bool isWhole = !hasLog || (logBytes == 0 && !hasIndex);
    SQLite::Database database(UriOf(path, isWhole ? "immutable=1" : "mode=ro&readonly_shm=1"),
                              SQLite::OPEN_READONLY | SQLite::OPEN_URI, BUSY_TIMEOUT_MS);
    sqlite3_db_config(database.getHandle(), SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    sqlite3_db_config(database.getHandle(), SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
    return database;
}

} // namespace reportctl::store
