#include "Tools/reportctl/store/Unchanged.h"

#include <cstdint>
#include <filesystem>
#include <string_view>

#include <sqlite3.h>

namespace reportctl::store {
namespace {

/// The header of a write-ahead log. A log that is no longer has no rows. A process that was killed in its
/// first commit leaves such a one, and SQLite would look for its index for ten seconds.
constexpr std::uintmax_t LOG_HEADER_BYTES = 32;

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

/// 0 when there is no log.
std::uintmax_t LogBytesOf(const std::string& path) {
    std::error_code error;
    const auto bytes = std::filesystem::file_size(path + "-wal", error);
    return error ? 0 : bytes;
}

bool HasIndex(const std::string& path) {
    std::error_code error;
    return std::filesystem::exists(path + "-shm", error);
}

} // namespace

bool LacksIndex(const std::string& path) {
    return LogBytesOf(path) > LOG_HEADER_BYTES && !HasIndex(path);
}

SQLite::Database OpenUnchanged(const std::string& path) {
    // SQLite would make a missing -wal or -shm. When there is no log with rows, the database file alone has
    // all rows, and "immutable" keeps SQLite from making the files. An empty log beside an index may get rows
    // at any moment.
    const auto logBytes = LogBytesOf(path);
    const bool isWhole = logBytes <= LOG_HEADER_BYTES && (logBytes > 0 || !HasIndex(path));
    SQLite::Database database(UriOf(path, isWhole ? "immutable=1" : "mode=ro&readonly_shm=1"),
                              SQLite::OPEN_READONLY | SQLite::OPEN_URI, BUSY_TIMEOUT_MS);
    sqlite3_db_config(database.getHandle(), SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    sqlite3_db_config(database.getHandle(), SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
    return database;
}

} // namespace reportctl::store
