#include <filesystem>

#include "Tools/reportctl/status/Parts.h"
#include "Tools/reportctl/store/Store.h"

namespace reportctl::status {
namespace {

namespace fs = std::filesystem;

/// Up to so many rows are counted, which takes some milliseconds. Counting reads each page of the table. So
/// for more rows, the difference between the last and the first id is used: it is the number of rows as long
/// as only the oldest rows were deleted.
constexpr std::int64_t MOST_COUNTED = 50'000;

std::uint64_t SizeOf(const std::string& path) {
    std::error_code error;
    const auto size = fs::file_size(path, error);
    return error ? 0 : size;
}

void CountRows(SQLite::Database& database, Store& store) {
    const std::int64_t span =
        database
            .execAndGet("select coalesce(max(rowid), 0) - coalesce((select min(rowid) from OperLog), 1) + 1 "
                        "from OperLog")
            .getInt64();
    store.areRowsCounted = span <= MOST_COUNTED;
    store.rows = store.areRowsCounted ? database.execAndGet("select count(*) from OperLog").getInt64() : span;
}

void Read(SQLite::Database& database, Store& store) {
    store.schemaVersion = database.execAndGet("pragma user_version").getInt();
    store.hasTables = database.tableExists("OperLog") && database.tableExists("BaseInfo");
    if (!database.tableExists("OperLog"))
        return;
    CountRows(database, store);
    SQLite::Statement newest(database, "select createTime from OperLog order by rowid desc limit 1");
    if (newest.executeStep() && !newest.getColumn(0).isNull())
        store.newestCreateTime = newest.getColumn(0).getString();
}

} // namespace

bool IsFile(const std::string& path, std::string& problem) {
    std::error_code error;
    const bool isThere = fs::exists(path, error);
    if (error)
        problem = error.message();
    else if (isThere && !fs::is_regular_file(path, error))
        problem = "it is no file";
    return isThere && problem.empty();
}

Store LookAtStore(const std::string& path) {
    Store store;
    store.path = path;
    store.isPresent = IsFile(path, store.problem);
    if (!store.isPresent)
        return store;
    store.bytes = SizeOf(path);
    store.walBytes = SizeOf(path + "-wal");
    try {
        auto database = store::OpenToGlance(path);
        Read(database, store);
    } catch (const std::exception& failure) {
        store.problem = failure.what();
    }
    return store;
}

} // namespace reportctl::status
