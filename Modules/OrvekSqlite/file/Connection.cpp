#include "Modules/OrvekSqlite/file/Connection.h"

#include <array>
#include <cstring>
#include <filesystem>
#include <string_view>

#include "Modules/Sqlite/DeletedLog.h"
#include "Modules/Sqlite/SideFiles.h"
#include "Modules/Sqlite/Trust.h"

namespace OrvekSqlite::file {
namespace {

namespace fs = std::filesystem;

constexpr auto PRIVATE = fs::perms::owner_read | fs::perms::owner_write;

/// Gives the file this mode. A file of another owner keeps its mode, because that owner decides about it.
void SetMode(const fs::path& path, fs::perms mode) {
    std::error_code ignored;
    const auto status = fs::status(path, ignored);
    if (fs::is_regular_file(status) && status.permissions() != mode)
        fs::permissions(path, mode, ignored);
}

fs::perms ModeOf(const fs::path& path) {
    std::error_code ignored;
    return fs::status(path, ignored).permissions();
}

/// Refuses files that SQLite would read or play back and that another user could have put there.
void RequireOurFiles(const std::string& path) {
    try {
        Sqlite::RequireOurFiles(path);
    } catch (const Sqlite::UnsafePath& refusal) {
        throw SQLite::Exception(refusal.what(), SQLITE_PERM);
    }
}

/// Takes all rights to the file away from other users. This must come before SQLite first looks at the file's
/// mode: SQLite gives that mode to the side files that it makes, under any umask of the process.
const std::string& MadePrivate(const std::string& path) {
    RequireOurFiles(path);
    SetMode(path, ModeOf(path) & PRIVATE);
    return path;
}

/// Gives side files that exist already the mode of the database, before SQLite opens them. Their mode may be
/// too wide, when another process made them before the database was private. It may be too narrow, when they
/// were made while the database was read-only. The path comes from SQLite, which has resolved symbolic links.
void AlignSideFiles(sqlite3* connection) {
    const std::string file = sqlite3_db_filename(connection, "main");
    for (const auto* suffix : Sqlite::SIDE_FILE_SUFFIXES)
        SetMode(file + suffix, ModeOf(file));
}

/// The schema comes from outside. It may not call functions that reach outside the database, and only CREATE
/// and DROP may change it. A text in double quotes is a name, never a literal.
void Harden(sqlite3* connection) {
    sqlite3_db_config(connection, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
    sqlite3_db_config(connection, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    sqlite3_db_config(connection, SQLITE_DBCONFIG_DQS_DML, 0, nullptr);
    sqlite3_db_config(connection, SQLITE_DBCONFIG_DQS_DDL, 0, nullptr);
}

/// SQLite's own mutexes are switched off, because the plug-in lets in one thread at a time.
constexpr int OPEN_FLAGS = SQLITE_OPEN_READWRITE | SQLITE_OPEN_NOMUTEX;

} // namespace

Connection::Connection(const std::string& path, const Settings& settings)
    : m_database(MadePrivate(path), OPEN_FLAGS, static_cast<int>(settings.busyTimeout.count())),
      m_insert(m_database.getHandle(), m_guard),
      m_others(sqlite3_db_filename(m_database.getHandle(), "main")) {
    auto* connection = m_database.getHandle();
    m_guard.Install(connection, settings.limits);
    Harden(connection);
    AlignSideFiles(connection);
    // This statement is the first one that reads the file, so it fails when the file is no database.
    m_database.exec("pragma journal_mode = wal");
    m_database.exec("pragma synchronous = normal");
    // SQLite does the checkpoints itself: one for every thousand pages, which are some 25,000 rows. A
    // checkpoint waits 25 ms for the disk, in the call of the statement that leads to a commit. A checkpoint
    // for every ten thousand pages saved 3 % of the thread's time, but took 40 MB of disk.
    m_database.exec("pragma journal_size_limit = " + std::to_string(settings.journalBytes));
    m_sideFiles.emplace(sqlite3_db_filename(connection, "main"));
}

/// SQLite does a checkpoint when it closes a file, unless the file has lost its name. Without the checkpoint,
/// the write-ahead log keeps its name and its rows. SQLite would then read the next database at that path
/// through this log, and damage that database. So we empty the log into the file that it belongs to, and both
/// databases stay whole. For the same reason, SQLite's own checkpoint also empties the log into a damaged
/// file that kept its name.
Connection::~Connection() {
    RollBack();
    if (!HasLostItsName())
        return;
    sqlite3_busy_timeout(m_database.getHandle(), 0); // do not wait here: a reader may stay for long
    sqlite3_wal_checkpoint_v2(m_database.getHandle(), "main", SQLITE_CHECKPOINT_TRUNCATE, nullptr, nullptr);
}

void Connection::RollBack() noexcept {
    if (InTransaction())
        sqlite3_exec(m_database.getHandle(), "rollback", nullptr, nullptr, nullptr);
}

bool Connection::IsInPlace() {
    return !HasLostItsName() && m_sideFiles->AreInPlace() && HasDatabaseHeader();
}

Connection::Rescue Connection::RescueRows() noexcept {
    RollBack();
    if (HasLostItsName() || m_sideFiles->AreInPlace()) // the destructor handles both cases
        return Rescue::NotNeeded;
    return Sqlite::RescueDeletedLog(m_database.getHandle(), *m_sideFiles) ? Rescue::Done : Rescue::Failed;
}

void Connection::RequireInPlace() {
    if (!IsInPlace())
        throw SQLite::Exception(sqlite3_errstr(SQLITE_CANTOPEN), SQLITE_CANTOPEN);
}

bool Connection::HasLostItsName() {
    int moved = 0;
    sqlite3_file_control(m_database.getHandle(), "main", SQLITE_FCNTL_HAS_MOVED, &moved);
    return moved != 0;
}

/// Reads through SQLite's own handle of the file. If we opened the file a second time and closed it, this
/// process would lose its POSIX locks on the file, SQLite's among them.
bool Connection::HasDatabaseHeader() {
    static constexpr std::string_view MAGIC("SQLite format 3\0", 16);
    sqlite3_file* file = nullptr;
    sqlite3_file_control(m_database.getHandle(), "main", SQLITE_FCNTL_FILE_POINTER, &file);
    if (file == nullptr || file->pMethods == nullptr)
        return false;
    std::array<char, MAGIC.size()> header{};
    if (file->pMethods->xRead(file, header.data(), static_cast<int>(header.size()), 0) != SQLITE_OK)
        return false;
    return std::string_view(header.data(), header.size()) == MAGIC;
}

} // namespace OrvekSqlite::file
