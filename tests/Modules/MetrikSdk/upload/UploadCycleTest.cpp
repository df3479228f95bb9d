#include "Modules/MetrikSdk/upload/UploadCycle.h"

#include <algorithm>
#include <deque>
#include <filesystem>
#include <functional>
#include <set>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gtest/gtest.h>

#include "tests/Modules/MetrikSdk/support/ReceivedEvents.h"
#include "tests/Modules/MetrikSdk/support/SettingsFor.h"
#include "tests/Modules/MetrikSdk/support/Told.h"
#include "tests/support/TemporaryDirectory.h"

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

/// Answers as the test says, and keeps the bodies that it got.
class FakeSender : public otlp::Sender {
public:
    otlp::HttpResult Post(const std::string& body) override {
        bodies.push_back(body);
        return answer(EventsOf(body));
    }
    void Abandon() override {}
    std::string Destination() const override { return "http://collector"; }
    std::vector<std::string> HeaderNames() const override { return {"api-key"}; }

    std::function<otlp::HttpResult(const std::vector<ReceivedEvent>&)> answer;
    std::deque<std::string> bodies;
};

otlp::HttpResult Status(long status) {
    otlp::HttpResult result;
    result.status = status;
    return result;
}

class TheUploadCycle : public testing::Test {
protected:
    TheUploadCycle() {
        Told::Forget();
        m_notifier.Subscribe(&Told::OnFailure, &Told::OnSuccess);
        AnswerAlways(Status(200));
    }

    void AnswerAlways(const otlp::HttpResult& result) {
        m_sender.answer = [result](const auto&) { return result; };
    }

    /// Lets the collector refuse every request that holds one of these numbers.
    void Refuse(const std::set<int>& numbers) {
        m_sender.answer = [numbers](const std::vector<ReceivedEvent>& events) {
            for (const auto& event : events)
                if (numbers.contains(event.number))
                    return Status(400);
            return Status(200);
        };
    }

    void Append(int count) {
        for (int i = 0; i < count; ++i)
            ASSERT_TRUE(m_outbox.Append({"A759", "1", "default"}, "A759|1", NumberedPayload(m_next++)));
    }

    /// Lets the collector answer such requests with `result`, which does not say that the events are at
    /// fault.
    void AnswerLaterTo(const std::set<int>& numbers, const otlp::HttpResult& result) {
        m_sender.answer = [numbers, result](const std::vector<ReceivedEvent>& events) {
            for (const auto& event : events)
                if (numbers.contains(event.number))
                    return result;
            return Status(200);
        };
    }

    /// Runs the cycle for this time on its own clock, with the pauses that the cycle asks for. Calls
    /// `eachMinute` about once a minute.
    void RunFor(
        std::chrono::hours duration, const std::function<void()>& eachMinute = [] {}) {
        RunFor(std::chrono::minutes(duration), eachMinute);
    }
    void RunFor(
        std::chrono::minutes duration, const std::function<void()>& eachMinute = [] {}) {
        const auto end = m_clock + duration;
        for (auto minute = m_clock; m_clock < end;) {
            m_clock += std::max(m_running->Pass(m_clock).duration, std::chrono::milliseconds(1));
            if (m_clock - minute < 1min)
                continue;
            minute = m_clock;
            eachMinute();
        }
    }

    /// Runs the cycle until it asks for a pause. The time is such that every event is old enough.
    upload::Pause RunUntilPause(int maxPasses = 1000) {
        for (int i = 0; i < maxPasses; ++i)
            if (const auto pause = m_cycle.Pass(WallNow() + 1h); pause.duration > 0ms)
                return pause;
        ADD_FAILURE() << "the cycle does not come to rest";
        return {};
    }

    TemporaryDirectory m_directory;
    OutboxSettings m_settings = SettingsFor(m_directory.Path());
    report::Notifier m_notifier{0ms};
    outbox::Outbox m_outbox{m_directory.Path(), m_settings, m_notifier};
    FakeSender m_sender;
    upload::UploadCycle m_cycle{m_outbox, m_sender, m_notifier, m_settings, [] { return 0.5; }};
    upload::UploadCycle* m_running = &m_cycle; ///< The cycle of RunFor.
    int m_next = 0;
    WallTime m_clock = WallNow() + 1h; ///< The clock of RunFor.
};

TEST_F(TheUploadCycle, SleepsUntilAnEventComesWhenTheOutboxIsEmpty) {
    const auto pause = m_cycle.Pass(WallNow());
    EXPECT_EQ(pause.untilWaiting, 1);
    EXPECT_GE(pause.duration, 1s);
    EXPECT_TRUE(m_sender.bodies.empty());
}

TEST_F(TheUploadCycle, GivesAnEventCompanyForASecondUnlessTheBatchIsFull) {
    Append(1);
    const auto pause = m_cycle.Pass(WallNow());
    EXPECT_GT(pause.duration, 0ms);
    EXPECT_LE(pause.duration, 1s);
    EXPECT_EQ(pause.untilWaiting, 512);
    EXPECT_TRUE(m_sender.bodies.empty());
    Append(511);
    m_cycle.Pass(WallNow());
    EXPECT_EQ(m_sender.bodies.size(), 1U);
}

TEST_F(TheUploadCycle, DeletesWhatWasTakenAndTellsTheSuccess) {
    Append(600);
    RunUntilPause();
    EXPECT_EQ(m_sender.bodies.size(), 2U);
    EXPECT_EQ(m_outbox.Status().delivered, 600);
    EXPECT_EQ(m_outbox.Status().waiting, 0);
    EXPECT_EQ(Told::Successes().All(), (std::vector<std::string>{"upload: 512 events", "upload: 88 events"}));
    EXPECT_TRUE(Told::Failures().All().empty());
}

TEST_F(TheUploadCycle, KeepsTheBatchAndWaitsLongerEachTime) {
    Append(3);
    AnswerAlways(Status(503));
    EXPECT_EQ(RunUntilPause().duration, 500ms);
    EXPECT_EQ(RunUntilPause().duration, 1s);
    const auto third = RunUntilPause();
    EXPECT_EQ(third.duration, 2s);
    EXPECT_EQ(third.untilWaiting, outbox::CountWaiter::NEVER) << "new events do not shorten the wait";
    EXPECT_EQ(m_outbox.Status().waiting, 3);
    EXPECT_EQ(Told::Failures().Count("upload: http://collector: HTTP status 503"), 3);
    AnswerAlways(Status(200));
    RunUntilPause();
    EXPECT_EQ(m_outbox.Status().delivered, 3);
    EXPECT_EQ(Told::Failures().All().back(), "upload: http://collector: events are taken again");
    Append(1);
    AnswerAlways(Status(503));
    EXPECT_EQ(RunUntilPause().duration, 500ms) << "a success begins anew";
}

TEST_F(TheUploadCycle, NotesTheFirstFailureSinceADeliveryInTheFile) {
    const auto noted = [this] {
        return SQLite::Database(m_directory.Path() + "/MetrikOutbox.db")
            .execAndGet("SELECT (SELECT count(*) FROM upload_failure) || ' ' || text || ' ' || "
                        "(at_ms > coalesce(last_delivered_ms, 0)) FROM upload_failure, totals")
            .getString();
    };
    Append(1);
    AnswerAlways(Status(503));
    RunUntilPause();
    const std::string first = "1 http://collector: HTTP status 503; the events stay in the outbox ";
    EXPECT_EQ(noted(), first + "1");
    AnswerAlways(Status(502));
    RunUntilPause();
    EXPECT_EQ(noted(), first + "1") << "one write for all failures of an outage";
    AnswerAlways(Status(200));
    RunUntilPause();
    EXPECT_EQ(noted(), first + "0") << "the delivery is later";
    Append(1);
    AnswerAlways(Status(502));
    RunUntilPause();
    EXPECT_EQ(noted().find("1 http://collector: HTTP status 502; the events stay in the outbox "), 0U);
}

TEST_F(TheUploadCycle, SendsTheSameEventsWithTheSameIdsAgain) {
    Append(3);
    AnswerAlways(Status(429));
    RunUntilPause();
    RunUntilPause();
    EXPECT_EQ(m_sender.bodies.at(0), m_sender.bodies.at(1));
}

TEST_F(TheUploadCycle, DeletesAPartialSuccessAndReportsTheRefusedCount) {
    Append(10);
    auto partial = Status(200);
    partial.body = R"({"partialSuccess":{"rejectedLogRecords":"4","errorMessage":"too old"}})";
    AnswerAlways(partial);
    RunUntilPause();
    const auto status = m_outbox.Status();
    EXPECT_EQ(status.delivered, 6);
    EXPECT_EQ(status.refused, 4);
    EXPECT_EQ(status.waiting, 0);
    EXPECT_EQ(
        Told::Failures().Count("events refused: The collector rejected 4 of 10 events for good: too old"), 1);
}

TEST_F(TheUploadCycle, MovesTheOnePoisonousEventToTheDeadLettersAndDeliversTheOthers) {
    Append(500);
    Refuse({321});
    RunUntilPause();
    const auto status = m_outbox.Status();
    EXPECT_EQ(status.delivered, 499);
    EXPECT_EQ(status.deadLettered, 1);
    EXPECT_EQ(status.waiting, 0);
    EXPECT_LE(m_sender.bodies.size(), 20U);
}

TEST_F(TheUploadCycle, FindsSeveralPoisonousEvents) {
    Append(500);
    Refuse({0, 1, 250, 499});
    RunUntilPause();
    EXPECT_EQ(m_outbox.Status().delivered, 496);
    EXPECT_EQ(m_outbox.Status().deadLettered, 4);
}

/// A request that was sent and got no answer.
otlp::HttpResult TimedOut() {
    otlp::HttpResult result;
    result.fault = "timed out";
    result.began = true;
    return result;
}

TEST_F(TheUploadCycle, LetsOthersGoPastAnEventToWhichTheCollectorSaysLaterForEver) {
    Append(500);
    AnswerLaterTo({321, 322}, Status(503));
    RunFor(1h);
    const auto status = m_outbox.Status();
    EXPECT_EQ(status.delivered, 498);
    EXPECT_EQ(status.waiting, 2) << "kept";
    EXPECT_LE(m_sender.bodies.size(), 70U);
    EXPECT_EQ(
        Told::Failures().Count("events refused: An event is not taken while others are, and will be tried "
                               "again from time to time: HTTP status 503"),
        2);
}

TEST_F(TheUploadCycle, MovesSuchAnEventToTheDeadLettersAtLast) {
    Append(20);
    AnswerLaterTo({13}, TimedOut());
    RunFor(6h, [&] { Append(1); });
    RunFor(1min);
    const auto status = m_outbox.Status();
    EXPECT_EQ(status.deadLettered, 1);
    EXPECT_EQ(status.waiting, 0);
    SQLite::Database file(m_directory.Path() + "/MetrikOutbox.db");
    EXPECT_EQ(file.execAndGet("SELECT reason FROM dead_letter").getString(),
              "not taken at 10 tries, while others were: timed out");
    EXPECT_EQ(file.execAndGet("SELECT payload FROM dead_letter").getString(), NumberedPayload(13));
}

TEST_F(TheUploadCycle, DeliversAnEventThatSteppedAsideOnceTheCollectorTakesIt) {
    Append(20);
    AnswerLaterTo({13}, Status(503));
    RunFor(10min);
    EXPECT_EQ(m_outbox.Status().waiting, 1);
    AnswerAlways(Status(200));
    RunFor(1h);
    EXPECT_EQ(m_outbox.Status().delivered, 20);
}

TEST_F(TheUploadCycle, SendsFewRequestsOnceACollectorThatAnswered503ForADayIsBack) {
    Append(200);
    AnswerAlways(Status(503));
    RunFor(24h);
    m_sender.bodies.clear();
    AnswerAlways(Status(200));
    RunFor(10min);
    EXPECT_EQ(m_outbox.Status().delivered, 200);
    EXPECT_LE(m_sender.bodies.size(), 4U) << "one event, the oldest alone, and all others together";
}

TEST_F(TheUploadCycle, BlamesNoEventWhileACollectorIsAwayForADay) {
    Append(600);
    for (const auto& away : {Status(503), TimedOut()}) {
        AnswerAlways(away);
        RunFor(24h);
        EXPECT_EQ(m_outbox.Status().deadLettered, 0);
    }
    const auto before = m_sender.bodies.size();
    AnswerAlways(Status(200));
    RunFor(10min);
    EXPECT_EQ(m_outbox.Status().delivered, 600);
    EXPECT_LE(m_sender.bodies.size() - before, 600U);
}

TEST_F(TheUploadCycle, KeepsItsBatchesWhileTheCollectorCannotBeReached) {
    Append(600);
    otlp::HttpResult unreachable;
    unreachable.fault = "no route";
    AnswerAlways(unreachable);
    RunFor(2h);
    const auto before = m_sender.bodies.size();
    AnswerAlways(Status(200));
    RunFor(10min);
    EXPECT_EQ(m_sender.bodies.size() - before, 2U);
}

TEST_F(TheUploadCycle, GetsEverythingOverALineThatIsTooSlowForAFullBatch) {
    Append(2000);
    m_sender.answer = [&](const auto&) {
        return m_sender.bodies.back().size() > 100'000 ? TimedOut() : Status(200);
    };
    RunFor(1h);
    EXPECT_EQ(m_outbox.Status().delivered, 2000);
    EXPECT_LE(m_sender.bodies.size(), 40U);
}

TEST_F(TheUploadCycle, StaysBelowTheLengthThatWasRefusedOnce) {
    Append(2000);
    int tooLarge = 0;
    m_sender.answer = [&](const auto&) {
        const bool isTooLarge = m_sender.bodies.back().size() > 150'000;
        tooLarge += isTooLarge ? 1 : 0;
        return Status(isTooLarge ? 413 : 200);
    };
    RunUntilPause();
    EXPECT_EQ(m_outbox.Status().delivered, 2000);
    EXPECT_LE(tooLarge, 3);
}

TEST_F(TheUploadCycle, LosesNoEventToAWrongConfigurationAndTellsWhatToLookAt) {
    Append(100);
    for (const long status : {401, 403, 404, 405, 407, 415}) {
        AnswerAlways(Status(status));
        RunFor(1h);
        EXPECT_EQ(m_outbox.Status().waiting, 100) << status;
    }
    EXPECT_GE(
        Told::Failures().Count("upload: http://collector: HTTP status 401; look at the credentials: "
                               "OTEL_EXPORTER_OTLP_HEADERS sets api-key; the events stay in the outbox"),
        1);
    AnswerAlways(Status(200));
    RunFor(1h);
    EXPECT_EQ(m_outbox.Status().delivered, 100);
    EXPECT_EQ(Told::Failures().All().back(), "upload: http://collector: events are taken again");
}

TEST_F(TheUploadCycle, LetsOthersGoPastAnEventThatAFirewallForbids) {
    Append(100);
    AnswerLaterTo({13}, Status(403));
    RunFor(1h);
    EXPECT_EQ(m_outbox.Status().delivered, 99);
}

TEST_F(TheUploadCycle, LetsOthersGoPastAnEventThatIsAnsweredWithAPageOrARedirect) {
    auto page = Status(200);
    page.contentType = "text/html";
    for (const auto& answer : {page, Status(302)}) {
        AnswerLaterTo({m_next + 13}, answer);
        Append(100);
        RunFor(1h);
        EXPECT_EQ(m_outbox.Status().delivered, m_next - 1) << answer.status;
        EXPECT_EQ(m_outbox.Status().waiting, 1) << "kept, for the address may be wrong";
    }
}

TEST_F(TheUploadCycle, LetsOthersGoPastMoreBadEventsThanAreTriedInTurns) {
    constexpr int BAD = 600;
    m_settings.batch.maxEvents = 4; // finds a bad event in a few requests
    upload::UploadCycle cycle{m_outbox, m_sender, m_notifier, m_settings, [] { return 0.5; }};
    m_running = &cycle;
    m_sender.answer = [&](const std::vector<ReceivedEvent>& events) {
        m_sender.bodies.clear();
        const bool isBad = std::any_of(events.begin(), events.end(), [](const auto& event) {
            return event.number < 2 * BAD && event.number % 2 == 1;
        });
        return Status(isBad ? 503 : 200);
    };
    Append(2 * BAD);
    RunFor(24h);
    Append(50);
    RunFor(1h);
    EXPECT_EQ(m_outbox.Status().delivered, BAD + 50);
    AnswerAlways(Status(200));
    Append(1);
    RunFor(72h);
    EXPECT_EQ(m_outbox.Status().waiting, 0);
}

TEST_F(TheUploadCycle, TriesWhatStandsAsideAlsoWhileNothingButABadEventIsLeft) {
    Append(20);
    AnswerLaterTo({13, 19}, Status(503));
    RunFor(30min);
    EXPECT_EQ(m_outbox.Status().delivered, 18);
    AnswerLaterTo({19}, Status(503));
    RunFor(2h);
    EXPECT_EQ(m_outbox.Status().delivered, 19);
    EXPECT_EQ(m_outbox.Status().waiting, 1);
}

TEST_F(TheUploadCycle, HeedsARetryAfterInEveryAnswer) {
    for (const long status : {200, 400, 404, 413, 503}) {
        Append(2);
        auto answer = Status(status);
        answer.retryAfter = "100";
        AnswerAlways(answer);
        const auto pause = m_cycle.Pass(WallNow() + 1h);
        EXPECT_EQ(pause.duration, 150s) << status << ", half as long again by chance";
        EXPECT_EQ(pause.untilWaiting, outbox::CountWaiter::NEVER) << status;
        AnswerAlways(Status(200));
        RunUntilPause();
    }
}

TEST_F(TheUploadCycle, TellsWhatTheCollectorHasToSayAboutEventsThatItTook) {
    const auto answer = [&](const std::string& partialSuccess) {
        Append(10);
        auto partial = Status(200);
        partial.body = R"({"partialSuccess":)" + partialSuccess + "}";
        AnswerAlways(partial);
        RunUntilPause();
    };
    answer(R"({"errorMessage":"use v2"})");
    answer(R"({"rejectedLogRecords":"77","errorMessage":"?"})");
    EXPECT_EQ(Told::Failures().All(),
              (std::vector<std::string>{
                  "collector warning: The collector took 10 events and says: use v2",
                  "events refused: The collector says that it rejected 77 of 10 events, which cannot be; "
                  "10 count as refused: ?"}));
    EXPECT_EQ(m_outbox.Status().delivered, 10);
    EXPECT_EQ(m_outbox.Status().refused, 10);
}

TEST_F(TheUploadCycle, SlowsDownWhenEverythingIsRefused) {
    Append(500);
    AnswerAlways(Status(400));
    EXPECT_EQ(RunUntilPause().duration, 500ms);
    EXPECT_EQ(m_outbox.Status().deadLettered, m_settings.retry.refusalsBeforeWaiting);
    EXPECT_EQ(RunUntilPause().duration, 1s);
    EXPECT_EQ(m_outbox.Status().deadLettered, m_settings.retry.refusalsBeforeWaiting + 1);
    AnswerAlways(Status(200));
    RunUntilPause();
    EXPECT_EQ(m_outbox.Status().waiting, 0);
}

TEST_F(TheUploadCycle, WaitsInTheMiddleOfASearchWithoutLosingIt) {
    Append(8);
    Refuse({5});
    m_cycle.Pass(WallNow() + 1h);
    AnswerAlways(Status(503));
    RunUntilPause();
    Refuse({5});
    RunUntilPause();
    EXPECT_EQ(m_outbox.Status().delivered, 7);
    EXPECT_EQ(m_outbox.Status().deadLettered, 1);
}

TEST_F(TheUploadCycle, DeletesWhatWasDeliveredBeforeItSendsAnythingElse) {
    Append(2);
    SQLite::Database other(m_directory.Path() + "/MetrikOutbox.db", SQLite::OPEN_READWRITE);
    m_sender.answer = [&](const auto&) {
        // The collector has accepted the events, and now the outbox cannot be written.
        other.exec("BEGIN IMMEDIATE");
        return Status(200);
    };
    EXPECT_GT(RunUntilPause().duration, 0ms);
    EXPECT_GT(RunUntilPause().duration, 0ms);
    EXPECT_EQ(m_sender.bodies.size(), 1U) << "sent once";
    other.exec("COMMIT");
    RunUntilPause();
    EXPECT_EQ(m_sender.bodies.size(), 1U);
    EXPECT_EQ(m_outbox.Status().delivered, 2);
}

TEST_F(TheUploadCycle, DoesNotDropForACapWhatWasDeliveredAndIsNotDeletedYet) {
    const TemporaryDirectory directory;
    m_settings = SettingsFor(directory.Path());
    m_settings.caps.maxWaitingBytes = 10'000;
    outbox::Outbox outbox(directory.Path(), m_settings, m_notifier);
    upload::UploadCycle cycle(outbox, m_sender, m_notifier, m_settings, [] { return 0.5; });
    const auto append = [&](int count) {
        for (int i = 0; i < count; ++i)
            ASSERT_TRUE(outbox.Append({"A759", "1", "default"}, "A759|1", NumberedPayload(i)));
    };
    append(5);
    SQLite::Database other(directory.Path() + "/MetrikOutbox.db", SQLite::OPEN_READWRITE);
    m_sender.answer = [&](const auto&) {
        other.exec("BEGIN IMMEDIATE");
        return Status(200);
    };
    EXPECT_GT(cycle.Pass(WallNow() + 1h).duration, 0ms) << "taken, and cannot be deleted";
    other.exec("COMMIT");
    append(200);
    EXPECT_GT(outbox.Status().dropped, 0) << "the cap dropped others";
    AnswerAlways(Status(503));
    cycle.Pass(WallNow() + 1h);
    EXPECT_EQ(outbox.Status().delivered, 5);
}

TEST_F(TheUploadCycle, SaysNothingWhenARequestEndsBecauseItIsToStop) {
    Append(1);
    otlp::HttpResult abandoned;
    abandoned.fault = "stopped";
    abandoned.abandoned = true;
    AnswerAlways(abandoned);
    RunUntilPause();
    EXPECT_TRUE(Told::Failures().All().empty());
    EXPECT_EQ(m_outbox.Status().waiting, 1);
}

} // namespace
