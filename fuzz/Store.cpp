// Datagrams through the server into the real store. With every text of a report in the statement, the
// table must get one row at most, and nothing else in the database must change.

#include <filesystem>

#include <SQLiteCpp/SQLiteCpp.h>

#include "Frame/DBHelper.h"
#include "fuzz/support/FuzzedServer.h"
#include "fuzz/support/Input.h"
#include "fuzz/support/Report.h"
#include "fuzz/support/Require.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/support/StoreTables.h"
#include "tests/support/TemporaryDirectory.h"

using namespace SyncServiceReport;

namespace {

constexpr auto ROWS =
    "insert into BaseInfo values ('OpenID', 'u1');"
    "insert into OperLog values (1, 'kept', 'v', '1700000000000', 0, null, null, '3.0.0.0', 'u1')";

/// Everything in the database except the rows that reports add.
constexpr auto OTHERS =
    "select (select group_concat(name || sql) from sqlite_master) "
    "|| (select group_concat(key || value) from BaseInfo) || (select user_version from pragma_user_version) "
    "|| (select eventID || value || createTime || pType || extData3 || extData4 from OperLog where id = 1)";

constexpr auto NEWEST =
    "select eventID || char(10) || value || char(10) || createTime || char(10) || pType || char(10) "
    "|| extData3 || char(10) || extData4 from OperLog order by id desc limit 1";

/// The database, and the target's own connection to examine it.
class Store {
public:
    Store() {
        ::setenv("XDG_DATA_HOME", m_data.Path().c_str(), 1);
        m_look.exec("pragma journal_mode = wal");
        m_look.exec(STORE_TABLES);
        m_look.exec(ROWS);
        m_others = Ask(OTHERS);
    }

    /// How many rows are stored, including those of an open group.
    int Rows() {
        int committed = 0;
        Require(DBHelper::instance().GetTotalCount("select count(*) from OperLog", committed),
                "rows can be counted");
        RequireEqual(std::to_string(committed), Ask("select count(*) from OperLog"),
                     "both see the same rows");
        return committed;
    }

    std::string Newest() { return Ask(NEWEST); }

    void RequireUntouched() {
        RequireEqual(Ask(OTHERS), m_others, "nothing changes but the rows that reports add");
        if (++m_inputs % INPUTS_PER_LOOK == 0)
            LookCloser();
    }

private:
    static constexpr int INPUTS_PER_LOOK = 200;

    void LookCloser() {
        RequireEqual(Ask("pragma integrity_check"), "ok", "the database is sound");
        for (const auto& file : std::filesystem::directory_iterator(m_directory))
            Require(file.path().filename().string().starts_with("Report.db"), "no other file is made",
                    file.path().string());
        m_look.exec("delete from OperLog where id > 1"); // so that counting stays quick
    }

    std::string Ask(const std::string& query) {
        SQLite::Statement statement(m_look, query);
        return statement.executeStep() ? statement.getColumn(0).getString() : "(no row)";
    }

    std::string MadeDirectory() const {
        const std::string directory = m_data.Path() + "/hublink/database";
        std::filesystem::create_directories(directory);
        return directory;
    }

    TemporaryDirectory m_data;
    const std::string m_directory = MadeDirectory();
    SQLite::Database m_look{m_directory + "/Report.db", SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE, 5000};
    std::string m_others;
    int m_inputs = 0;
};

/// Whether no text in the statement can end its literal or the statement.
bool IsPlain(const ST_OptLog& report, const ST_BaseInfo& info) {
    const std::string texts =
        report.eventID + report.value + report.createTime + info.suiteVersion + info.openID;
    return texts.find_first_of(std::string_view("'\0", 2)) == std::string::npos;
}

/// The row of a report, in the form of Store::Newest; empty when the report is not stored as it is.
std::string PlainRowOf(const std::string& datagram, const ST_BaseInfo& info) {
    const auto report = IsEventReport(datagram) ? ReportIn(datagram) : std::nullopt;
    if (!report || IsForAnalytics(*report) || !IsPlain(*report, info))
        return "";
    return report->eventID + "\n" + report->value + "\n" + report->createTime + "\n" +
           std::to_string(report->pType) + "\n" + info.suiteVersion + "\n" + info.openID;
}

void Take(FuzzedServer& server, Store& store, const std::string& datagram) {
    const int before = store.Rows();
    const std::string plain = PlainRowOf(datagram, server.GetBaseInfo());
    server.Consume(datagram);
    const int added = store.Rows() - before;
    Require(added == 0 || added == 1, "a datagram is one row at most", std::to_string(added));
    if (plain.empty())
        return;
    RequireEqual(added, 1, "a report that leaves its literals alone is stored");
    RequireEqual(store.Newest(), plain, "its row is what it says");
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static FakeLoggerState& logger = FakeLogger();
    static Store store;
    static ServerPerInput servers;
    logger.Clear();
    FakeSdk().calls.clear();
    for (FuzzedServer& server = servers.Next(); const auto& datagram : DatagramsOf(data, size))
        Take(server, store, datagram);
    store.RequireUntouched();
    return 0;
}
