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

/// Gives the file this mode; one of another owner stays as it is, as that owner decides.
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

/// What SQLite would read or play back, and another user could have put there, is not opened.
void RequireOurFiles(const std::string& path) {
    try {
        Sqlite::RequireOurFiles(path);
    } catch (const Sqlite::UnsafePath& refusal) {
        throw SQLite::Exception(refusal.what(), SQLITE_PERM);
    }
}

/// Takes the right to read the file away from everybody but its owner, before SQLite first looks at its mode:
/// SQLite gives the side files that it makes the mode of the database, under any umask of the process.
const std::string& MadePrivate(const std::string& path) {
    RequireOurFiles(path);
    SetMode(path, ModeOf(path) & PRIVATE);
    return path;
}

/// Gives the side files that are there already the database's mode, before SQLite opens them. They may be too
/// wide, made by another process before the database was private, or too narrow, made while the database was
/// read-only. Named by SQLite, which resolved symbolic links first.
void AlignSideFiles(sqlite3* connection) {
    const std::string file = sqlite3_db_filename(connection, "main");
    for (const auto* suffix : Sqlite::SIDE_FILE_SUFFIXES)
        SetMode(file + suffix, ModeOf(file));
}

/// The schema is a text from outside: it may not call functions that reach outside the database, and only
/// CREATE and DROP may change it. A text in double quotes is a name, never a literal.
void Harden(sqlite3* connection) {
    sqlite3_db_config(connection, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
    sqlite3_db_config(connection, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
    sqlite3_db_config(connection, SQLITE_DBCONFIG_DQS_DML, 0, nullptr);
    sqlite3_db_config(connection, SQLITE_DBCONFIG_DQS_DDL, 0, nullptr);
}

/// The library's own mutexes are left out: one thread at a time is the plug-in's rule.
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
    // The first statement that reads the file: what is no database is found out here.
    m_database.exec("pragma journal_mode = wal");
    m_database.exec("pragma synchronous = normal");
    // Checkpoints stay SQLite's: one in a thousand pages, which is some 25,000 rows and 25 ms of waiting for
    // the disk, within the call of the statement whose commit is due. Ten times as many pages saved 3 % of
    // the thread's time, and cost 40 MB of disk.
    m_database.exec("pragma journal_size_limit = " + std::to_string(settings.journalBytes));
    m_sideFiles.emplace(sqlite3_db_filename(connection, "main"));
}

/// SQLite checkpoints on closing, unless the file has lost its name. Then the write-ahead log keeps its own
/// name and its rows, and SQLite would read the next database at that path through it and damage that
/// database. Emptying the log into the file that it belongs to keeps both databases whole. A file that kept
/// its name and was damaged gets its rows, too, for the same reason.
Connection::~Connection() {
    RollBack();
    if (!HasLostItsName())
        return;
    sqlite3_busy_timeout(m_database.getHandle(), 0); // a reader that stays is no reason to wait here
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
    if (HasLostItsName() || m_sideFiles->AreInPlace()) // the destructor knows what to do
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

/// Read through SQLite's own handle of the file: opening the file a second time and closing it would drop
/// this process's POSIX locks on it, SQLite's among them.
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
