#include <chrono>
#include <functional>
#include <map>
#include <vector>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gtest/gtest.h>
#include <hublink/report.hpp>
#include <rapidjson/document.h>

#include "SystemTool/IO/JsonDocument.h"
#include "tests/Client/EventsInCProcess.h"
#include "tests/Client/RandomEvents.h"
#include "tests/Client/SameJson.h"
#include "tests/e2e/support/Service.h"
#include "tests/support/WaitUntil.h"

using hublink::Result;
using SystemTool::IO::JsonDocument;

// Every event that the library reports as sent arrives unchanged, through the real service.

namespace {

constexpr int EVENTS = SSR_RANDOM_EVENTS;
constexpr unsigned GRAMMAR_ONLY =
    rapidjson::kParseNumbersAsStringsFlag | rapidjson::kParseValidateEncodingFlag;

/// The JSON without white space between its parts.
std::string Compact(const std::string& json) {
    std::string compact;
    bool isInString = false;
    for (std::size_t at = 0; at < json.size(); ++at) {
        if (isInString && json[at] == '\\')
            compact += json[at++];
        else if (json[at] == '"')
            isInString = !isInString;
        if (isInString || std::string_view(" \t\r\n").find(json[at]) == std::string_view::npos)
            compact += json[at];
    }
    return compact;
}

struct Row {
    std::string id;
    std::string value;
};

class EventsArrive : public ::testing::Test {
protected:
    EventsArrive() {
        m_service.Install();
        m_service.Start();
    }

    /// Sends EVENTS random events at a rate that the service can take, and notes those that should arrive.
    void SendRandomEvents(std::uint64_t seed, bool mayHaveZeros,
                          const std::function<Result(const RandomEvent&)>& send) {
        RandomEvents events(seed);
        for (int i = 0; i < EVENTS;) {
            const RandomEvent event = events.Next();
            if (!mayHaveZeros && (event.id + event.value).find('\0') != std::string::npos)
                continue;
            ++i;
            const Result result = send(event);
            ++m_results[result];
            if (result == Result::Sent)
                Note(event);
            else
                ExpectThatItIsRefusedRightly(event, result);
            Pace(event);
        }
        m_service.AwaitQuiet();
    }

    void ExpectThatAllHaveArrived() {
        EXPECT_EQ(Service::DroppedByKernel(), 0);
        for (const auto result : {Result::Sent, Result::TooLong, Result::InvalidText, Result::InvalidJson,
                                  Result::InvalidEventId})
            EXPECT_GT(m_results[result], 0) << hublink::ToString(result);
        EXPECT_GT(m_results[Result::Sent], EVENTS / 2);
        ExpectRows(m_service.DatabaseFile(), "select eventID, value from OperLog order by id", m_forStore,
                   IsStored);
        ExpectRows(m_service.OutboxFile(), "select event_id, payload from event order by id", m_forAnalytics,
                   IsInOutbox);
    }

    Service m_service;

private:
    using Match = bool (*)(const RandomEvent& given, const std::string& value);

    void Note(const RandomEvent& event) {
        (event.id.starts_with("A") ? m_forAnalytics : m_forStore).push_back(event);
    }

    /// Expects that JSON which another parser accepts is not refused for its grammar. That parser accepts
    /// half of a surrogate pair, so texts with such escapes are left out.
    static void ExpectThatItIsRefusedRightly(const RandomEvent& event, Result result) {
        if (result != Result::InvalidJson || event.kind != RandomEvent::Kind::Json ||
            event.id.starts_with("A") || event.value.find("\\u") != std::string::npos)
            return;
        rapidjson::Document document;
        document.Parse<GRAMMAR_ONLY>(event.value.data(), event.value.size());
        EXPECT_TRUE(document.HasParseError()) << event.value;
    }

    /// Waits when the socket's buffer may be filling. The buffer holds 4 MiB where the machine allows it,
    /// otherwise 208 KiB.
    void Pace(const RandomEvent& event) {
        constexpr std::size_t BYTES = 50'000;
        m_unread += event.id.size() + event.value.size() + 1000; // plus what the kernel adds to a datagram
        if (m_unread < BYTES)
            return;
        ASSERT_TRUE(WaitUntil(&Service::TookAllDatagrams));
        m_unread = 0;
    }

    static bool IsStored(const RandomEvent& given, const std::string& value) {
        if (given.kind != RandomEvent::Kind::Json)
            return value == given.value;
        return value == Compact(given.value) || IsSameJson(given.value, value);
    }

    static bool IsInOutbox(const RandomEvent& given, const std::string& payload) {
        std::string error;
        const auto eventData = JsonDocument().FromJson(payload, error).GetKeyValue("eventData");
        JsonDocument expected;
        expected.FromJson(given.kind == RandomEvent::Kind::Nothing ? "{}" : given.value, error);
        for (const auto* name : {"openid", "sys_version"}) // the service sets these members
            expected.SetKeyValue(name, eventData.GetKeyValue(name));
        return error.empty() && eventData.ToJson() == expected.ToJson();
    }

    static void ExpectRows(const std::string& file, const std::string& query,
                           const std::vector<RandomEvent>& expected, Match isSame) {
        const SQLite::Database database(file, SQLite::OPEN_READWRITE, 10'000);
        SQLite::Statement rows(database, query);
        std::size_t count = 0;
        for (; rows.executeStep() && count < expected.size(); ++count) {
            const RandomEvent& given = expected[count];
            const Row row{rows.getColumn(0).getString(), rows.getColumn(1).getString()};
            ASSERT_EQ(row.id, given.id) << "event " << count;
            ASSERT_TRUE(isSame(given, row.value)) << "given:\n" << given.value << "\nthere:\n" << row.value;
        }
        EXPECT_TRUE(rows.isDone()) << "more rows than were sent";
        EXPECT_EQ(count, expected.size());
    }

    std::map<Result, int> m_results;
    std::vector<RandomEvent> m_forStore;
    std::vector<RandomEvent> m_forAnalytics;
    std::size_t m_unread = 0;
};

} // namespace

TEST_F(EventsArrive, AsTheyWereGivenInCpp) {
    hublink::Reporter reporter(hublink::Module{"A100", "2.1", "Painter"});
    SendRandomEvents(1, true, [&](const RandomEvent& event) {
        switch (event.kind) {
        case RandomEvent::Kind::Nothing:
            return reporter.Event(event.id);
        case RandomEvent::Kind::Text:
            return reporter.Event(event.id, event.value);
        default:
            return reporter.Event(event.id, hublink::Json{event.value});
        }
    });
    ExpectThatAllHaveArrived();
}

TEST_F(EventsArrive, AsTheyWereGivenInC) {
    const EventsInCProcess program;
    SendRandomEvents(2, false, [&](const RandomEvent& event) { return program.Send(event); });
    ExpectThatAllHaveArrived();
}
