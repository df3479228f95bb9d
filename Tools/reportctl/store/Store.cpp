#include "Tools/reportctl/store/Store.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <iterator>
#include <stdexcept>
#include <system_error>

#include <SQLiteCpp/Exception.h>
#include <fmt/format.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include "Modules/Sqlite/ErrorKind.h"
#include "Modules/Sqlite/SideFiles.h"
#include "SystemTool/Errno.h"
#include "SystemTool/IO/Descriptor.h"
#include "Tools/reportctl/store/Schema.h"
#include "Tools/reportctl/store/Unchanged.h"

namespace reportctl::store {
namespace {

namespace fs = std::filesystem;

constexpr auto PRIVATE_FILE = fs::perms::owner_read | fs::perms::owner_write;

/// A running service holds the write lock only for moments. A person can wait for five seconds, but not
/// without an end.
constexpr int BUSY_TIMEOUT_MS = 5000;

/// The value of `pragma auto_vacuum` of a store whose free pages can be given back a few at a time.
constexpr int AUTO_VACUUM_INCREMENTAL = 2;

/// A store of this size is rewritten in less than a second.
constexpr std::uintmax_t MAX_BYTES_TO_REWRITE_UNASKED = std::uintmax_t{64} * 1024 * 1024;

/// A new, private, empty file in the directory of `path`. The destructor removes it and the files that SQLite
/// made beside it.
class DraftFile {
public:
    explicit DraftFile(const std::string& path) : m_path(path + ".new-XXXXXX") {
        const SystemTool::IO::Descriptor file(::mkstemp(m_path.data()));
        if (!file.IsOpen())
            SystemTool::ThrowErrno(errno);
    }

    ~DraftFile() {
        std::error_code ignored;
        fs::remove(m_path, ignored);
        for (const auto* suffix : Sqlite::SIDE_FILE_SUFFIXES)
            fs::remove(m_path + suffix, ignored);
    }

    DraftFile(const DraftFile&) = delete;
    DraftFile& operator=(const DraftFile&) = delete;

    const std::string& Path() const { return m_path; }

private:
    std::string m_path;
};

/// A path beside the store that no file has, and whose side files do not exist either.
std::string FreeName(const std::string& path) {
    const auto isTaken = [](const std::string& name) {
        return fs::exists(name) ||
               std::any_of(std::begin(Sqlite::SIDE_FILE_SUFFIXES), std::end(Sqlite::SIDE_FILE_SUFFIXES),
                           [&](const char* suffix) { return fs::exists(name + suffix); });
    };
    for (int number = 1;; ++number)
        if (auto name = fmt::format("{}.left-{}", path, number); !isTaken(name))
            return name;
}

/// Renames side files whose database is gone. Either a lost database left them, or a service that still has
/// the deleted database open writes them. SQLite would use them with the new database and damage it. They may
/// hold the newest rows, so they are kept, all under one new name: when their database gets that name, too,
/// SQLite reads them again. Returns false when a file could not be renamed.
bool MoveOrphanedSideFilesAway(terminal::Worklog& log, const std::string& path) {
    const auto name = FreeName(path);
    bool areAway = true;
    for (const auto* suffix : Sqlite::SIDE_FILE_SUFFIXES)
        if (const auto file = path + suffix; fs::exists(file))
            areAway &= log.Run(
                terminal::RENAME,
                fmt::format("{}, which belonged to a store that is gone, to {}{}", file, name, suffix),
                [&] { fs::rename(file, name + suffix); }, "Move it away and run this again.");
    return areAway;
}

void CreateStore(const std::string& path) {
    const DraftFile draft(path);
    {
        auto database = OpenStore(draft.Path());
        database.exec("pragma auto_vacuum = incremental"); // has an effect only before all other statements
        database.exec("pragma journal_mode = wal");
        RunInTransaction(database, StatementsToCurrentSchema(database));
    }
    fs::create_hard_link(draft.Path(), path); // fails when a store has appeared, and so never replaces it
}

bool EnsureNewStore(terminal::Worklog& log, const std::string& path) {
    if (!MoveOrphanedSideFilesAway(log, path))
        return false;
    return log.Run(
        terminal::MAKE, fmt::format("store {} (mode 0600, schema version {})", path, SCHEMA_VERSION),
        [&] { CreateStore(path); }, "Run this again once that is remedied.");
}

bool EnsureSchema(terminal::Worklog& log, const std::string& path) {
    auto database = OpenStoreToLook(path);
    const int version = SchemaVersionOf(database);
    if (version > SCHEMA_VERSION) {
        log.Fail(fmt::format("{} has schema version {}, this program knows {}: it was left as it is. Use the "
                             "reportctl of the newer installation.",
                             path, version, SCHEMA_VERSION));
        return false;
    }
    const auto statements = StatementsToCurrentSchema(database);
    const auto thing = fmt::format("store {} (schema version {})", path, SCHEMA_VERSION);
    if (statements.empty()) {
        log.AlreadyDone(thing);
        return true;
    }
    return log.Run(
        terminal::MIGRATE, fmt::format("{} from version {}, keeping its rows", thing, version),
        [&] {
            auto store = OpenStore(path);
            RunInTransaction(store, statements);
        },
        "The store was left as it is.");
}

bool IsPrivate(const std::string& file) {
    return !fs::exists(file) || fs::status(file).permissions() == PRIVATE_FILE;
}

void EnsurePrivateFile(terminal::Worklog& log, const std::string& file) {
    if (!IsPrivate(file))
        log.Run(
            terminal::CHANGE, fmt::format("mode of {} to 0600", file),
            [&] { fs::permissions(file, PRIVATE_FILE); }, "The file's owner must do that.");
}

void EnsurePrivateFiles(terminal::Worklog& log, const std::string& path) {
    EnsurePrivateFile(log, path);
    for (const auto* suffix : Sqlite::SIDE_FILE_SUFFIXES)
        EnsurePrivateFile(log, path + suffix);
}

void EnsureWriteAheadLog(terminal::Worklog& log, const std::string& path) {
    if (OpenStoreToLook(path).execAndGet("pragma journal_mode").getString() != "wal")
        log.Run(
            terminal::CHANGE, fmt::format("journal of {} to a write-ahead log", path),
            [&] { OpenStore(path).exec("pragma journal_mode = wal"); },
            "Stop who uses it and run this again.");
}

bool CanShrink(const std::string& path) {
    return OpenStoreToLook(path).execAndGet("pragma auto_vacuum").getInt() == AUTO_VACUUM_INCREMENTAL;
}

/// Rewrites the store of an older set-up, whose file cannot shrink, so that `prune` can give space back. A
/// large store is rewritten only when `mayTakeLong`, because the service can store nothing meanwhile.
void EnsureThatItCanShrink(terminal::Worklog& log, const std::string& path, bool mayTakeLong) {
    if (CanShrink(path) || (!mayTakeLong && fs::file_size(path) > MAX_BYTES_TO_REWRITE_UNASKED))
        return;
    log.Run(
        terminal::CHANGE, fmt::format("{}, rewritten, so that its file can shrink", path),
        [&] {
            auto store = OpenStore(path);
            store.exec("pragma auto_vacuum = incremental");
            store.exec("vacuum");
        },
        "Stop the service and run this again.");
}

/// The modes are checked while the store is closed: opening it would make side files with the mode that the
/// store has before the change.
bool EnsureExistingStore(terminal::Worklog& log, const std::string& path, bool compact) {
    if (!EnsureSchema(log, path))
        return false;
    EnsurePrivateFiles(log, path);
    EnsureWriteAheadLog(log, path);
    EnsureThatItCanShrink(log, path, compact);
    return true;
}

bool IsOwner(const std::string& path) {
    struct stat file {};
    return ::stat(path.c_str(), &file) != 0 || file.st_uid == ::geteuid();
}

/// Whether SQLite failed because it could not make the -wal and the -shm: on a full disk, or on a disk that
/// is read-only.
bool IsForWantOfSideFiles(const SQLite::Exception& error) {
    switch (error.getErrorCode() & 0xff) {
    case SQLITE_IOERR:
    case SQLITE_CANTOPEN:
    case SQLITE_FULL:
    case SQLITE_READONLY:
        return true;
    default:
        return false;
    }
}

} // namespace

void RequireStore(const std::string& path) {
    std::error_code error;
    if (!fs::exists(path, error))
        throw std::runtime_error(
            path + (error ? ": " + error.message() : " is missing. `reportctl setup` makes it."));
}

SQLite::Database OpenStore(const std::string& path) {
    RequireStore(path);
    return SQLite::Database(path, SQLite::OPEN_READWRITE, BUSY_TIMEOUT_MS);
}

SQLite::Database OpenStoreToLook(const std::string& path) {
    RequireStore(path);
    const bool isInUse = fs::exists(path + "-wal");
    auto database = OpenStore(path);
    database.exec("pragma query_only = on");
    // A log that is there is the service's, also when it is still empty. When there is none, this opening
    // makes the side files, and SQLite removes them at the end.
    if (isInUse)
        sqlite3_db_config(database.getHandle(), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
    return database;
}

SQLite::Database OpenToGlance(const std::string& path) {
    return LacksIndex(path) && IsOwner(path) ? OpenStoreToLook(path) : OpenUnchanged(path);
}

SQLite::Database OpenToRead(const std::string& path) {
    RequireStore(path);
    if (!IsOwner(path))
        return OpenUnchanged(path);
    try {
        auto database = OpenStoreToLook(path);
        database.execAndGet("pragma schema_version"); // reads the file, which makes the side files
        return database;
    } catch (const SQLite::Exception& error) {
        if (!IsForWantOfSideFiles(error))
            throw;
        // The service cannot write on such a disk either, so reading without locks is safe.
        return OpenUnchanged(path);
    }
}

bool EnsureStore(terminal::Worklog& log, const std::string& path, bool compact) {
    try {
        if (!fs::exists(path))
            return EnsureNewStore(log, path);
        return EnsureExistingStore(log, path, compact);
    } catch (const SQLite::Exception& error) {
        const bool isDatabase = Sqlite::KindOf(error.getErrorCode()) != Sqlite::ErrorKind::Damage;
        log.Fail(fmt::format("{}: {}. It was left as it is.{}", path, error.what(),
                             isDatabase ? "" : " Move it away and run this again to get a new store."));
    } catch (const std::exception& error) {
        log.Fail(fmt::format("{}: {}. It was left as it is.", path, error.what()));
    }
    return false;
}

} // namespace reportctl::store
