#include "Tools/reportctl/store/Copy.h"

#include <stdexcept>

#include <SQLiteCpp/Backup.h>
#include <SQLiteCpp/Database.h>
#include <fmt/format.h>
#include <sqlite3.h>

#include "Tools/reportctl/store/Store.h"

namespace reportctl::store {
namespace {

constexpr int PAGES_AT_ONCE = 2048;

/// The result of SQLite's check: "ok" when the database is sound, else the first fault, which is enough for a
/// message.
std::string CheckOf(SQLite::Database& database) {
    return database.execAndGet("pragma integrity_check(1)").getString();
}

} // namespace

void CopyDatabase(const std::string& from, const std::string& to,
                  const std::function<void(int done, int total)>& progress) {
    auto source = OpenToRead(from);
    // This read transaction lasts as long as the copying. Without it, SQLite would begin the copy again after
    // each write of the service and might never finish.
    source.exec("begin");
    source.execAndGet("select count(*) from sqlite_master");
    SQLite::Database copy(to, SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
    {
        SQLite::Backup backup(copy, source);
        while (backup.executeStep(PAGES_AT_ONCE) != SQLITE_DONE)
            progress(backup.getTotalPageCount() - backup.getRemainingPageCount(), backup.getTotalPageCount());
    }
    source.exec("commit");
    if (const auto check = CheckOf(copy); check != "ok")
        throw std::runtime_error(fmt::format("{} is damaged: {}", from, check));
}

} // namespace reportctl::store
