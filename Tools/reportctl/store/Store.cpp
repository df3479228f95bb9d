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

/// A running service holds the write lock for moments; a person can wait for five seconds, not for ever.
constexpr int BUSY_TIMEOUT_MS = 5000;

/// What `pragma auto_vacuum` says of a store whose free pages can be given back a few at a time.
constexpr int AUTO_VACUUM_INCREMENTAL = 2;

/// Rewritten in less than a second.
constexpr std::uintmax_t MAX_BYTES_TO_REWRITE_UNASKED = std::uintmax_t{64} * 1024 * 1024;

/// A new, private, empty file beside the one that it is for. Gone, with SQLite's files beside it, at the end.
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

/// A path beside the store's at which there is nothing, nor anything that would be taken for its side file.
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

/// Side files without their database: what a lost one left behind, or what a service that still has the
/// deleted one open goes on writing. SQLite would read the new database through them and damage it. They may
/// hold the newest rows, so they are kept, all under one new name: with their database beside them under that
/// name, SQLite reads them again.
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
        database.exec("pragma auto_vacuum = incremental"); // holds when it comes before everything else
        database.exec("pragma journal_mode = wal");
        RunInTransaction(database, StatementsToCurrentSchema(database));
    }
    fs::create_hard_link(draft.Path(), path); // fails rather than replacing one that has appeared
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

void EnsurePrivateFiles(terminal::Worklog& log, const std::string& path) {
    for (const auto* suffix : {"", "-wal", "-shm", "-journal"})
        if (const auto file = path + suffix; !IsPrivate(file))
            log.Run(
                terminal::CHANGE, fmt::format("mode of {} to 0600", file),
                [&] { fs::permissions(file, PRIVATE_FILE); }, "The file's owner must do that.");
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

/// A store of an older set-up keeps the size that it once had. It is rewritten so that `prune` can give space
/// back: at once when that is short, else when it is asked for, because the service can store nothing
/// meanwhile.
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

/// The modes are looked at while the store is closed: opening it makes side files of the mode that is about
/// to be changed.
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

/// What a full disk, and one that may only be read, answer to SQLite when it makes the -wal and the -shm.
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
    const auto log = path + "-wal";
    const bool hasRows = fs::exists(log) && fs::file_size(log) > 0;
    auto database = OpenStore(path);
    // Without rows in it the side files go away at the end, as they should: they were made by this opening.
    if (hasRows)
        sqlite3_db_config(database.getHandle(), SQLITE_DBCONFIG_NO_CKPT_ON_CLOSE, 1, nullptr);
    return database;
}

SQLite::Database OpenToRead(const std::string& path) {
    RequireStore(path);
    if (!IsOwner(path))
        return OpenUnchanged(path);
    try {
        auto database = OpenStoreToLook(path);
        database.execAndGet("pragma schema_version"); // reads, and so makes the side files
        return database;
    } catch (const SQLite::Exception& error) {
        if (!IsForWantOfSideFiles(error))
            throw;
        // No service can write beside this reader then, either.
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
