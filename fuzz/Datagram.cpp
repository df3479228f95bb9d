// A datagram through the server to fake destinations. What the text says must reach one destination, nothing
// must reach the other, and the log must have each datagram once.

#include <map>

#include "fuzz/support/FuzzedServer.h"
#include "fuzz/support/Input.h"
#include "fuzz/support/Report.h"
#include "fuzz/support/Require.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/fakes/FakeSqlite.h"

using namespace SyncServiceReport;
using SystemTool::IO::JsonDocument;

namespace {

constexpr int INIT_SDK = 2; // a place in the SDK's interface
constexpr int REPORT_EVENT = 3;

struct Fakes {
    void Clear() {
        logger.Clear();
        store.calls.clear();
        sdk.calls.clear();
    }

    FakeLoggerState& logger = FakeLogger();
    FakeSqliteState& store = FakeSqlite();
    FakeSdkState& sdk = FakeSdk();
};

/// One server: the modules that announced themselves, and checks of what each datagram caused.
class Session {
public:
    Session(FuzzedServer& server, Fakes& fakes) : m_server(server), m_fakes(fakes) {
        // The last object that a new server made is the default module's.
        m_modules["A759"] = fakes.sdk.created;
    }

    void Take(const std::string& datagram) {
        Receive(datagram);
        m_fakes.Clear();
        m_before = m_server.GetBaseInfo();
        const bool result = m_server.Consume(datagram);
        if (!IsEventReport(datagram)) {
            Require(result, "a control message is consumed", datagram);
            return ExpectControl(datagram);
        }
        const auto report = ReportIn(datagram);
        RequireEqual(result, report.has_value(), "a report is consumed when it is JSON");
        RequireEqual(m_server.HasChanged(), m_hasChanged, "a report changes nothing but its destination");
        if (!report)
            return ExpectNothing("JsonToStruct");
        IsForAnalytics(*report) ? ExpectEvent(*report) : ExpectRow(*report);
    }

private:
    void Receive(const std::string& datagram) {
        m_fakes.Clear();
        Require(m_server.Recv(datagram), "a datagram is received", datagram);
        const LogRecord record = OnlyRecord("Recv");
        if (datagram.find('%') == std::string::npos)
            RequireEqual(record, (LogRecord{2, "App/ReportServer", "Recv", 42, datagram}),
                         "a datagram without a percent sign is logged as it is");
        RequireEqual(m_server.Dequeued(), datagram, "a datagram is queued as it is");
        Require(m_server.IsQueueEmpty(), "a datagram is queued once", datagram);
    }

    LogRecord OnlyRecord(const std::string& function) const {
        const auto records = m_fakes.logger.Records();
        RequireEqual(records.size(), 1U, "one record is logged");
        RequireEqual(records.front().function, function, "the record is that function's");
        return records.front();
    }

    void ExpectNoStatement() const { Require(m_fakes.store.calls.empty(), "nothing reaches the store"); }

    /// Requires that the report goes to no destination, and that a line of `function` says why.
    void ExpectNothing(const std::string& function) const {
        ExpectNoStatement();
        Require(m_fakes.sdk.calls.empty(), "nothing reaches analytics");
        OnlyRecord(function);
    }

    void ExpectRow(const ST_OptLog& report) const {
        Require(m_fakes.sdk.calls.empty(), "a report for the store does not reach analytics");
        RequireEqual(m_fakes.logger.Records().size(), 0U, "a stored report is not logged again");
        RequireEqual(m_fakes.store.calls.size(), 1U, "a report for the store is one statement");
        RequireEqual(m_fakes.store.calls[0].operation, "ExecSql", "the statement is executed");
        RequireEqual(m_fakes.store.calls[0].argument, InsertOf(report, m_before),
                     "the statement is the report's");
    }

    void ExpectEvent(const ST_OptLog& report) const {
        const auto bar = report.eventID.find('|');
        const auto module = m_modules.find(report.eventID.substr(0, bar));
        if (bar == std::string::npos || module == m_modules.end())
            return ExpectNothing("Send");
        std::string error;
        JsonDocument value;
        if (!report.value.empty())
            value.FromJson(report.value, error);
        if (!error.empty() || (!value.IsObject() && value.ToJson() != "null"))
            return ExpectNothing("Send");
        ExpectNoStatement();
        RequireEqual(m_fakes.logger.Records().size(), 0U, "an accepted event is not logged again");
        RequireEqual(m_fakes.sdk.calls.size(), 1U, "a report for analytics is one event");
        const auto& call = m_fakes.sdk.calls.front();
        RequireEqual(call.slot, REPORT_EVENT, "an event is reported");
        RequireEqual(call.object, module->second, "it is its module's object that gets the event");
        RequireEqual(call.arguments[0], report.eventID, "the event has the report's id");
        ExpectContent(call.arguments[1], report, value);
    }

    void ExpectContent(const std::string& json, const ST_OptLog& report, JsonDocument value) const {
        std::string error;
        JsonDocument event;
        event.FromJson(json, error);
        RequireEqual(error, "", "an event is JSON");
        const auto extend = event.GetKeyValue("extend");
        RequireEqual(extend.GetKeyValue("hublinkVersion").ToString(), m_before.suiteVersion, "the version");
        RequireEqual(extend.GetKeyValue("createTime").ToString(), report.createTime, "the time");
        value.SetKeyValue("openid", m_before.openID);
        value.SetKeyValue("sys_version", m_before.osVersion);
        RequireEqual(event.GetKeyValue("eventData").ToJson(), value.ToJson(), "the value, user and system");
    }

    void ExpectControl(const std::string& datagram) {
        ExpectNoStatement();
        std::string error;
        JsonDocument message;
        message.FromJson(datagram, error);
        if (!error.empty())
            return ExpectNothing("Update");
        const std::string type = message.GetKeyValue("msgType").ToString();
        const auto text = [exdata = message.GetKeyValue("exdata")](const char* key) {
            return exdata.GetKeyValue(key).ToString();
        };
        const bool isInit = type == "init";
        const bool isNew = isInit && !m_modules.contains(text("moduleID"));
        if (isNew)
            ExpectModule({text("moduleID"), text("moduleVersion"), text("moduleName"), text("logPath"),
                          text("dbPath")});
        else
            Require(m_fakes.sdk.calls.empty(), "no module is made", datagram);
        const std::string openID = isInit || type == "updateOpenID" ? text("openID") : "";
        ExpectUser(openID, text("hublinkVersion"));
        RequireEqual(m_fakes.logger.Records().size(), (isNew ? 1U : 0U) + (openID.empty() ? 0U : 1U),
                     "a line for a new module and one for a user");
        m_hasChanged = m_server.HasChanged();
    }

    void ExpectModule(const std::vector<std::string>& settings) {
        m_modules[settings[0]] = m_fakes.sdk.created;
        RequireEqual(m_fakes.sdk.calls.size(), 1U, "a new module is initialised once");
        Require(m_fakes.sdk.calls[0] == FakeSdkState::Call{INIT_SDK, m_fakes.sdk.created, settings},
                "a new module gets its own settings");
    }

    void ExpectUser(const std::string& openID, const std::string& version) const {
        const ST_BaseInfo& info = m_server.GetBaseInfo();
        RequireEqual(info.openID, openID.empty() ? m_before.openID : openID, "the user");
        RequireEqual(info.suiteVersion, openID.empty() || version.empty() ? m_before.suiteVersion : version,
                     "the suite's version");
        RequireEqual(info.osVersion, m_before.osVersion, "the system stays");
        RequireEqual(info.userDataDir, m_before.userDataDir, "the directory stays");
    }

    FuzzedServer& m_server;
    Fakes& m_fakes;
    std::map<std::string, int> m_modules; ///< The number of each module's SDK object.
    ST_BaseInfo m_before;                 ///< As it was before the datagram.
    bool m_hasChanged = false;
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static Fakes fakes;
    static ServerPerInput servers;
    Session session(servers.Next(), fakes);
    for (const auto& datagram : DatagramsOf(data, size))
        session.Take(datagram);
    return 0;
}
