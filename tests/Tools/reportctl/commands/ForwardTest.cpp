#include <csignal>
#include <thread>

#include <gmock/gmock.h>

#include "tests/Modules/MetrikSdk/support/LoopbackServer.h"
#include "tests/Modules/MetrikSdk/support/SmallDisk.h"
#include "tests/Tools/reportctl/support/ForwardFixture.h"
#include "tests/Tools/reportctl/support/RowsFixture.h"
#include "tests/support/WaitUntil.h"

using ::testing::EndsWith;
using ::testing::HasSubstr;

namespace {

class ForwardCommand : public RowsFixture {
protected:
    Outcome Forward(const std::string& arguments, const LoopbackServer& collector,
                    const std::string& variables = {}) const {
        return Reportctl("forward " + arguments,
                         "OTEL_EXPORTER_OTLP_ENDPOINT=" + collector.Url() + " " + variables);
    }

    /// Its process is known to Signal.
    Outcome ForwardAs(const std::string& arguments, const LoopbackServer& collector) const {
        return Run("echo $$ > '" + Data() + "/process'; OTEL_EXPORTER_OTLP_ENDPOINT=" + collector.Url() +
                   " XDG_DATA_HOME='" + Data() + "' exec '" REPORTCTL "' forward " + arguments);
    }

    void Signal(int signal) const { ::kill(std::stoi(ContentOf(Data() + "/process")), signal); }

    /// Whether the process of ForwardAs has the store open.
    bool HasStoreOpen() const {
        std::error_code error;
        const auto process = std::atoi(ContentOf(Data() + "/process").c_str());
        for (const auto& file :
             std::filesystem::directory_iterator("/proc/" + std::to_string(process) + "/fd", error))
            if (std::filesystem::read_symlink(file, error) == Store())
                return true;
        return false;
    }

    std::string StateFile() const { return Data() + "/hublink/forward/Forward.db"; }

    /// The uids of each row that arrived.
    static std::map<std::int64_t, std::set<std::string>> ArrivedAt(const LoopbackServer& collector) {
        std::map<std::int64_t, std::set<std::string>> rows;
        for (const auto& request : collector.Requests())
            for (const auto& row : SentRowsOf(request.body))
                rows[row.row].insert(row.uid);
        return rows;
    }

    static void ExpectArrived(const LoopbackServer& collector, std::size_t rows) {
        const auto arrived = ArrivedAt(collector);
        EXPECT_EQ(arrived.size(), rows);
        for (const auto& [row, uids] : arrived)
            EXPECT_EQ(uids.size(), 1U) << "a repetition has its old uid: row " << row;
    }

    static Reply Take(const Request&) { return {}; }
};

TEST_F(ForwardCommand, SendsNewRowsOnce) {
    InsertMany(700);
    const LoopbackServer collector(Take);
    const auto first = Forward("--once", collector);
    EXPECT_EQ(first.exitCode, 0);
    EXPECT_EQ(first.output, "700 rows sent to " + collector.Url() + "/v1/logs.\n");
    EXPECT_EQ(ArrivedAt(collector).size(), 700U);
    EXPECT_EQ(collector.Requests()[0].line, "POST /v1/logs HTTP/1.1");
    EXPECT_EQ(collector.Requests()[0].headers.at("content-encoding"), "gzip");
    const auto requests = collector.RequestCount();
    EXPECT_EQ(Forward("--once", collector).output, "0 rows sent to " + collector.Url() + "/v1/logs.\n");
    EXPECT_EQ(collector.RequestCount(), requests);
    Insert("'B1|new'", "'x'", "'1700000000123'");
    EXPECT_EQ(Forward("--once", collector).output, "1 row sent to " + collector.Url() + "/v1/logs.\n");
    EXPECT_EQ(ModeOf(StateFile()), 0600U);
}

TEST_F(ForwardCommand, ChangesNothingInTheStore) {
    InsertMany(10);
    const auto before = ContentOf(Store());
    const LoopbackServer collector(Take);
    Forward("--once", collector);
    EXPECT_TRUE(ContentOf(Store()) == before);
}

TEST_F(ForwardCommand, SaysInADryRunWhatItWouldSendAndSendsAndMakesNothing) {
    InsertMany(10);
    const LoopbackServer collector(Take);
    Reportctl("stats"); // opening the store for the first time may change it
    const auto before = Everything();
    const auto outcome = Forward("--dry-run --metrics", collector);
    EXPECT_EQ(outcome.exitCode, 0);
    EXPECT_EQ(outcome.output, "Would send 10 rows (ids 1 to 10) of " + Store() + " to " + collector.Url() +
                                  "/v1/logs.\nWould send the service's figures to " + collector.Url() +
                                  "/v1/metrics.\nNothing was sent.\n");
    EXPECT_EQ(Forward("--dry-run --json", collector).output,
              R"({"dryRun":true,"destination":")" + collector.Url() +
                  "/v1/logs\",\"rows\":10,\"firstRow\":1,\"lastRow\":10}\n");
    EXPECT_TRUE(Everything() == before);
    EXPECT_EQ(collector.RequestCount(), 0U);
    Forward("--once", collector);
    EXPECT_TRUE(Forward("--dry-run", collector).Says("There is nothing to send to "));
}

TEST_F(ForwardCommand, EndsWithOneWhenTheCollectorIsAwayAndSendsEverythingTheNextTime) {
    InsertMany(3);
    const auto away = Reportctl("forward --once", "OTEL_EXPORTER_OTLP_ENDPOINT=http://127.0.0.1:1");
    EXPECT_EQ(away.exitCode, 1);
    EXPECT_THAT(away.output, HasSubstr("http://127.0.0.1:1/v1/logs: Failed to connect"));
    EXPECT_THAT(away.output, HasSubstr("error: not everything was sent; the next run goes on"));
    const LoopbackServer collector(Take);
    EXPECT_EQ(Forward("--once", collector).exitCode, 0);
    EXPECT_EQ(ArrivedAt(collector).size(), 3U);
}

TEST_F(ForwardCommand, TellsTheResultAsJson) {
    InsertMany(3);
    const LoopbackServer collector(
        [](const Request&) { return Reply{.status = 400, .body = "no", .headers = {}}; });
    const auto outcome = Forward("--once --json", collector);
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_THAT(outcome.output, HasSubstr("row 1 was refused for good: HTTP status 400: no\n"));
    EXPECT_THAT(outcome.output,
                EndsWith(R"({"dryRun":false,"destination":")" + collector.Url() +
                         R"(/v1/logs","sent":0,"refused":3,"held":0,"sentEver":0,"refusedEver":3,)"
                         R"("complete":true,"failure":null,"metricsFailure":null})"
                         "\n"));
    EXPECT_EQ(Forward("--once", collector).exitCode, 0) << "what was refused is not tried again";
}

TEST_F(ForwardCommand, LosesNoRowWhenItIsKilledWhileTheCollectorHasARequest) {
    InsertMany(2000);
    int number = 0;
    LoopbackServer collector([&](const Request&) {
        if (++number == 3)
            Signal(SIGKILL);
        return Reply();
    });
    EXPECT_EQ(ForwardAs("--once", collector).exitCode, -1);
    EXPECT_LT(ArrivedAt(collector).size(), 2000U);
    EXPECT_EQ(ForwardAs("--once", collector).exitCode, 0);
    ExpectArrived(collector, 2000U);
}

TEST_F(ForwardCommand, GoesOnUntilItIsToldToEndAndEndsARequestUnderWay) {
    InsertMany(3);
    for (const int signal : {SIGINT, SIGTERM}) {
        LoopbackServer collector([&](const Request&) {
            Signal(signal);
            return Reply{.body = {}, .headers = {}, .manner = Reply::Manner::Never};
        });
        const auto begun = std::chrono::steady_clock::now();
        const auto outcome = ForwardAs("", collector);
        EXPECT_LT(std::chrono::steady_clock::now() - begun, std::chrono::seconds(8)) << "a time-out is ten";
        EXPECT_EQ(outcome.exitCode, 0);
        EXPECT_THAT(outcome.output, HasSubstr("Ctrl-C ends it.\n"));
        EXPECT_THAT(outcome.output, HasSubstr("0 rows sent"));
    }
}

TEST_F(ForwardCommand, WaitsForALockOnTheStore) {
    InsertMany(3);
    const LoopbackServer collector(Take);
    std::optional<SQLite::Database> locker(std::in_place, Store(), SQLite::OPEN_READWRITE);
    locker->exec("pragma locking_mode = exclusive");
    locker->exec("begin exclusive");
    bool isWaitedFor = false;
    std::thread releases([&] {
        constexpr int LOOKS = 20; // without the wait, the store would be closed again at once
        int looks = 0;
        isWaitedFor = WaitUntil([&] { return (looks = HasStoreOpen() ? looks + 1 : 0) == LOOKS; });
        locker->exec("commit");
        locker.reset();
    });
    const auto outcome = ForwardAs("--once", collector);
    releases.join();
    EXPECT_TRUE(isWaitedFor);
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_EQ(ArrivedAt(collector).size(), 3U);
}

TEST_F(ForwardCommand, LosesNothingWhileTheDiskIsFullForItsOwnFile) {
    InsertMany(700);
    const auto directory = Data() + "/hublink/forward";
    std::filesystem::create_directory(directory);
    const LoopbackServer collector(Take);
    const auto result = RunOnSmallDisk(directory, 1 << 20, [&] {
        const auto filler = directory + "/filler";
        const auto forwardOnAFullDisk = [&] {
            std::ofstream(filler) << std::string(2 << 20, 'x');
            const auto outcome = Forward("--once", collector);
            EXPECT_EQ(outcome.exitCode, 1);
            EXPECT_THAT(outcome.output, EndsWith("error: " + StateFile() + ": database or disk is full\n"));
            std::filesystem::remove(filler);
        };
        forwardOnAFullDisk();
        EXPECT_TRUE(Forward("--once", collector).Says("700 rows sent"));
        Insert("'B1|new'", "'x'", "'1700000000123'");
        forwardOnAFullDisk();
        EXPECT_TRUE(Forward("--once", collector).Says("1 row sent")) << "what was not noted is sent again";
        EXPECT_TRUE(Forward("--once", collector).Says("0 rows sent"));
    });
    if (result == SmallDiskResult::Unavailable)
        GTEST_SKIP() << "this machine does not allow mounting";
    EXPECT_EQ(result, SmallDiskResult::Passed);
    EXPECT_EQ(collector.RequestCount(), 4U) << "700 rows are two; the new one was sent twice";
    ExpectArrived(collector, 701U);
}

TEST_F(ForwardCommand, NotesWhatWasTakenThoughNobodyReadsItsResult) {
    InsertMany(3);
    const LoopbackServer collector(Take);
    EXPECT_NE(Forward("--once >/dev/full", collector).exitCode, 0);
    EXPECT_TRUE(Forward("--once", collector).Says("0 rows sent"));
    EXPECT_EQ(ArrivedAt(collector).size(), 3U);
}

TEST_F(ForwardCommand, SaysWhatIsWrongWithTheStore) {
    const LoopbackServer collector(Take);
    std::ofstream(Store(), std::ios::trunc) << std::string(4096, 'x');
    const auto damaged = Forward("--once", collector);
    EXPECT_EQ(damaged.exitCode, 1);
    EXPECT_TRUE(damaged.Says(Store() + ": file is not a database")) << damaged.output;
    std::filesystem::remove(Store());
    const auto missing = Forward("--once", collector);
    EXPECT_EQ(missing.exitCode, 1);
    EXPECT_TRUE(missing.Says("Report.db is missing. `reportctl setup` makes it.")) << missing.output;
    EXPECT_EQ(collector.RequestCount(), 0U);
}

TEST_F(ForwardCommand, NeedsACollector) {
    InsertMany(1);
    const auto none = Reportctl("forward --once", "env -u OTEL_EXPORTER_OTLP_ENDPOINT");
    EXPECT_EQ(none.exitCode, 1);
    EXPECT_EQ(none.output,
              "error: no collector is configured: set OTEL_EXPORTER_OTLP_ENDPOINT; nothing was sent\n");
    const LoopbackServer collector(Take);
    const auto noMetrics = Forward("--once --metrics", collector, "OTEL_METRICS_EXPORTER=none");
    EXPECT_EQ(noMetrics.exitCode, 1);
    EXPECT_TRUE(noMetrics.Says("no collector for metrics is configured")) << noMetrics.output;
    EXPECT_EQ(collector.RequestCount(), 0U);
    EXPECT_FALSE(std::filesystem::exists(StateFile()));
    const auto dry = Reportctl("forward --dry-run", "env -u OTEL_EXPORTER_OTLP_ENDPOINT");
    EXPECT_EQ(dry.exitCode, 1);
    EXPECT_EQ(dry.output, "Would send 1 row (id 1) of " + Store() +
                              ".\nNothing was sent.\n"
                              "error: no collector is configured: set OTEL_EXPORTER_OTLP_ENDPOINT\n");
}

TEST_F(ForwardCommand, SaysWhatSwitchesItOff) {
    InsertMany(1);
    const LoopbackServer collector(Take);
    for (const std::string variable : {"OTEL_SDK_DISABLED=true", "OTEL_LOGS_EXPORTER=none"}) {
        const auto outcome = Forward("--once", collector, variable);
        EXPECT_EQ(outcome.exitCode, 1);
        EXPECT_EQ(outcome.output, "error: sending is switched off by " + variable + "; nothing was sent\n");
    }
    EXPECT_EQ(collector.RequestCount(), 0U);
}

TEST_F(ForwardCommand, SendsTheFiguresToTheirOwnEndpoint) {
    InsertMany(1);
    const LoopbackServer collector(Take);
    const LoopbackServer metrics(Take);
    const auto outcome = Forward("--once --metrics", collector,
                                 "OTEL_EXPORTER_OTLP_METRICS_ENDPOINT=" + metrics.Url() + "/here");
    EXPECT_EQ(outcome.exitCode, 0) << outcome.output;
    EXPECT_TRUE(outcome.Says("The service's figures were sent to " + metrics.Url() + "/here.\n"));
    EXPECT_EQ(collector.RequestCount(), 1U);
    ASSERT_EQ(metrics.RequestCount(), 1U);
    const auto request = metrics.Requests()[0];
    EXPECT_EQ(request.line, "POST /here HTTP/1.1");
    EXPECT_THAT(request.body, HasSubstr(R"("name":"hublink.report.up")"));
    EXPECT_THAT(request.body, HasSubstr(R"("gauge":{"dataPoints":[{"timeUnixNano":")"));
    EXPECT_THAT(request.body, HasSubstr(R"("name":"hublink.report.store.bytes")"));
}

TEST_F(ForwardCommand, EndsWithOneWhenOnlyTheFiguresAreNotTaken) {
    const LoopbackServer collector([](const Request& request) {
        return request.line.find("/v1/metrics") == std::string::npos
                   ? Reply()
                   : Reply{.status = 404, .body = "no such path", .headers = {}};
    });
    const auto outcome = Forward("--once --metrics", collector);
    EXPECT_EQ(outcome.exitCode, 1);
    EXPECT_THAT(outcome.output, HasSubstr("/v1/metrics: HTTP status 404: no such path; look at the address"));
    EXPECT_THAT(outcome.output, HasSubstr("error: the figures were not sent\n"));
}

TEST_F(ForwardCommand, IsRefusedForAWrongCommandLine) {
    EXPECT_GE(Reportctl("forward --twice").exitCode, 100);
}

} // namespace
