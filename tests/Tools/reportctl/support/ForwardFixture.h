#pragma once

#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include <SQLiteCpp/Database.h>
#include <SQLiteCpp/Statement.h>
#include <gtest/gtest.h>
#include <rapidjson/document.h>

#include "Tools/reportctl/forward/Forwarder.h"
#include "tests/support/StoreTables.h"
#include "tests/support/TemporaryDirectory.h"

/// The attributes of a log record that tell a row.
struct SentRow {
    std::int64_t row = 0;
    std::string uid;
    std::string event;
};

inline std::vector<SentRow> SentRowsOf(const std::string& body) {
    rapidjson::Document document;
    document.Parse(body.data(), body.size());
    std::vector<SentRow> rows;
    for (const auto& record : document["resourceLogs"][0]["scopeLogs"][0]["logRecords"].GetArray()) {
        SentRow sent;
        for (const auto& attribute : record["attributes"].GetArray()) {
            const std::string key = attribute["key"].GetString();
            if (key == "hublink.row")
                sent.row = std::stoll(attribute["value"]["intValue"].GetString());
            else if (key == "log.record.uid")
                sent.uid = attribute["value"]["stringValue"].GetString();
            else if (key == "metrik.event")
                sent.event = attribute["value"]["stringValue"].GetString();
        }
        rows.push_back(sent);
    }
    return rows;
}

/// A store, a state of our own, and what works between them and a collector with a script.
class ForwardFixture : public testing::Test {
protected:
    class FakeSender : public MetrikSdk::otlp::Sender {
    public:
        MetrikSdk::otlp::HttpResult Post(const std::string& body) override {
            requests.push_back(SentRowsOf(body));
            return answer(requests.back());
        }
        void Abandon() override {}
        std::string Destination() const override { return "http://collector"; }
        std::vector<std::string> HeaderNames() const override { return {"api-key"}; }

        std::function<MetrikSdk::otlp::HttpResult(const std::vector<SentRow>&)> answer;
        std::vector<std::vector<SentRow>> requests;
    };

    ForwardFixture() {
        std::filesystem::create_directories(m_directory.Path() + "/database");
        MakeStore();
        AnswerAlways(200);
    }

    static MetrikSdk::otlp::HttpResult Status(long status, const std::string& body = "{}") {
        MetrikSdk::otlp::HttpResult result;
        result.status = status;
        result.body = body;
        return result;
    }

    void AnswerAlways(long status) {
        m_sender.answer = [status](const auto&) { return Status(status); };
    }

    /// Answers so to each request with one of these events, and takes all others.
    void AnswerEvents(const std::set<std::string>& events, long status) {
        m_sender.answer = [=](const std::vector<SentRow>& rows) {
            for (const auto& row : rows)
                if (events.contains(row.event))
                    return Status(status);
            return Status(200);
        };
    }

    std::string Store() const { return m_directory.Path() + "/database/Report.db"; }
    std::string StateFile() const { return m_directory.Path() + "/forward/Forward.db"; }
    std::string Outbox() const { return m_directory.Path() + "/database/MetrikOutbox.db"; }

    void MakeStore() const {
        SQLite::Database(Store(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE).exec(STORE_TABLES);
    }

    void RemoveStore() const {
        for (const auto* suffix : {"", "-wal", "-shm", "-journal"})
            std::filesystem::remove(Store() + suffix);
    }

    void Sql(const std::string& sql) const { SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec(sql); }

    /// Rows with the events first to last, as the service writes them.
    void Insert(int first, int last, const std::string& prefix = "B100|") const {
        Sql("with recursive n(i) as (select " + std::to_string(first) +
            " union all select i + 1 from n where i < " + std::to_string(last) +
            ") insert into OperLog (eventID, value, createTime, pType, extData3, extData4) select '" +
            prefix + "' || i, 'value ' || i, 1700000000000 + i, 0, '5.1.0.2', 'u1' from n");
    }

    std::string AskState(const std::string& query) const {
        SQLite::Database database(StateFile(), SQLite::OPEN_READWRITE);
        SQLite::Statement statement(database, query);
        return statement.executeStep() ? statement.getColumn(0).getString() : "(no row)";
    }

    /// A run of the program, from its first look at our file to its end.
    class Process {
    public:
        explicit Process(ForwardFixture& fixture)
            : m_fixture(fixture), m_state(fixture.StateFile(), fixture.Outbox()),
              m_reader(fixture.Store(), fixture.m_settings.caps.maxEventBytes),
              m_queue(m_reader, m_state, fixture.m_settings.batch),
              m_teller([&fixture](const std::string& line) { fixture.m_told.push_back(line); }),
              m_forwarder(m_queue, fixture.m_sender, m_teller, fixture.m_settings, [] { return 0.0; }) {}

        reportctl::forward::Step Pass() { return m_forwarder.Pass(m_fixture.m_now); }

        /// Goes on until there is nothing to do, or nothing to be done now.
        reportctl::forward::Step Drain(int mostPasses = 200) {
            reportctl::forward::Step step;
            for (int pass = 0; pass < mostPasses; ++pass) {
                step = Pass();
                if (step.kind == reportctl::forward::Step::Kind::Idle)
                    break;
            }
            return step;
        }

        void EndRun() { m_forwarder.EndRun(); }
        const reportctl::forward::Forwarder::Counts& Done() const { return m_forwarder.Done(); }
        reportctl::forward::State& State() { return m_state; }

    private:
        ForwardFixture& m_fixture;
        reportctl::forward::State m_state;
        reportctl::forward::StoreReader m_reader;
        reportctl::forward::RowQueue m_queue;
        reportctl::forward::Teller m_teller;
        reportctl::forward::Forwarder m_forwarder;
    };

    void RunOnce() {
        Process process(*this);
        process.Drain();
        process.EndRun();
    }

    /// The rows of all requests that were taken, in order, as "1 2 3".
    std::string Taken() const {
        std::string text;
        for (const auto& request : m_sender.requests)
            for (const auto& row : request)
                text += (text.empty() ? "" : " ") + std::to_string(row.row);
        return text;
    }

    TemporaryDirectory m_directory;
    FakeSender m_sender;
    MetrikSdk::OutboxSettings m_settings;
    MetrikSdk::WallTime m_now{std::chrono::milliseconds(1'800'000'000'000)};
    std::vector<std::string> m_told;
};
