#include "Tools/reportctl/status/OutboxFailure.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using namespace reportctl::status;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::Optional;

// Which failures of the outbox last, by the lines of the log.

namespace {

constexpr std::int64_t NOW_MS = 1'760'000'000'000;
constexpr std::int64_t DAY_MS = 86'400'000;
constexpr auto UPLOAD = "upload-http://127.0.0.1:9/v1/logs: Failed to connect; the events stay in the outbox";

class OutboxFailure : public ::testing::Test {
protected:
    void Tell(const std::string& text, std::int64_t atMs) {
        TakeOutboxLine(m_lines, {atMs, "ERROR", "Metrik/MetrikWorker:21 FailCallBackFun", text});
    }

    /// Adds what the outbox noted at this time.
    void Note(std::int64_t atMs, std::int64_t startedAtMs) {
        Outbox outbox;
        outbox.endpoint = m_endpoint;
        outbox.uploadFailedAtMs = atMs;
        outbox.uploadFailure = "noted";
        AddNotedFailure(m_lines, outbox, {"4711", startedAtMs});
    }

    std::optional<std::string> Lasting() const { return LastingFailure(m_lines, m_worked, NOW_MS); }

    std::vector<Log::Line> m_lines;
    OutboxWorked m_worked;
    std::optional<std::string> m_endpoint = "http://127.0.0.1:9/v1/logs";
};

} // namespace

TEST_F(OutboxFailure, OfTheUploadLastsUntilEventsAreTaken) {
    Tell(UPLOAD, NOW_MS - DAY_MS);
    EXPECT_THAT(Lasting(), Optional(std::string(UPLOAD)));
    Tell("upload-http://127.0.0.1:9/v1/logs: events are taken again", NOW_MS - 1000);
    EXPECT_EQ(Lasting(), std::nullopt);
}

TEST_F(OutboxFailure, OfTheUploadEndsWithALaterDelivery) {
    Tell(UPLOAD, NOW_MS - 1000);
    m_worked.deliveredAtMs = NOW_MS - 1001;
    EXPECT_TRUE(Lasting());
    m_worked.deliveredAtMs = NOW_MS - 999;
    EXPECT_FALSE(Lasting());
    m_worked.deliveredAtMs = NOW_MS + DAY_MS; // before the clock was set back
    EXPECT_TRUE(Lasting());
}

TEST_F(OutboxFailure, OfTheUploadDoesNotEndBecauseEventsAreStored) {
    Tell(UPLOAD, NOW_MS - 1000);
    Tell("outbox file-Events are stored again; 3 were refused meanwhile", NOW_MS - 500);
    m_worked.storedAtMs = NOW_MS;
    EXPECT_THAT(Lasting(), Optional(std::string(UPLOAD)));
}

TEST_F(OutboxFailure, OfTheUploadIsKnownFromTheOutboxWhenTheLogHasLostIt) {
    Note(NOW_MS - 1000, NOW_MS - 1000);
    EXPECT_THAT(Lasting(), Optional(std::string("upload-noted")));
    m_worked.deliveredAtMs = NOW_MS - 999;
    EXPECT_EQ(Lasting(), std::nullopt);
}

TEST_F(OutboxFailure, ThatIsNotedIsOfThisProcessAndItsCollector) {
    Note(NOW_MS - 1001, NOW_MS - 1000);
    EXPECT_EQ(Lasting(), std::nullopt);
    m_endpoint.reset();
    Note(NOW_MS, NOW_MS - 1000);
    EXPECT_EQ(Lasting(), std::nullopt);
}

TEST_F(OutboxFailure, ThatIsNotedCountsWhenItIsLaterThanTheLogsLine) {
    Tell(UPLOAD, NOW_MS - 500);
    Note(NOW_MS - 1000, 0);
    EXPECT_THAT(Lasting(), Optional(std::string(UPLOAD)));
    Tell("upload-http://127.0.0.1:9/v1/logs: events are taken again", NOW_MS - 400);
    Note(NOW_MS - 1000, 0);
    EXPECT_EQ(Lasting(), std::nullopt);
    m_worked.deliveredAtMs = NOW_MS - 400;
    Note(NOW_MS - 300, 0);
    EXPECT_THAT(Lasting(), Optional(std::string("upload-noted")));
}

TEST_F(OutboxFailure, OfTheFileLastsUntilAnEventIsStored) {
    for (const auto* text : {"outbox file-Cannot store an event: disk is full",
                             "directory-The directory /x is not used: others may write to it"}) {
        m_lines.clear();
        m_worked = {};
        Tell(text, NOW_MS - DAY_MS);
        EXPECT_THAT(Lasting(), Optional(std::string(text)));
        m_worked.storedAtMs = NOW_MS - 1;
        EXPECT_FALSE(Lasting());
    }
    m_worked = {};
    Tell("outbox file-Events are stored again; 3 were refused meanwhile", NOW_MS - 500);
    Tell("directory-The directory /x is not used: others may write to it", NOW_MS - DAY_MS);
    EXPECT_TRUE(Lasting()) << "which is another cause";
}

TEST_F(OutboxFailure, IsNoLineThatIsToldOnce) {
    for (const auto* text : {"configuration-OTEL_BLRP_SCHEDULE_DELAY has no effect",
                             "collector warning-The collector took 1 events and says: be nice",
                             "events refused-The collector rejected 1 of 2 events for good: no",
                             "events dropped-No events are dropped any more; lost: 3 events from",
                             "event-An event is too large", "init-out of memory", "without a cause"})
        Tell(text, NOW_MS);
    EXPECT_EQ(Lasting(), std::nullopt);
}

TEST_F(OutboxFailure, IsALossForTenMinutes) {
    for (const auto* text :
         {"outbox vanished-The file was deleted or replaced", "outbox damaged-set aside"}) {
        m_lines.clear();
        Tell(text, NOW_MS - 599'000);
        EXPECT_THAT(Lasting(), Optional(std::string(text)));
        Tell(text, NOW_MS - 601'000);
        EXPECT_EQ(Lasting(), std::nullopt);
    }
}

TEST_F(OutboxFailure, ThatIsToldIsTheNewestOfThoseThatLast) {
    Tell(UPLOAD, NOW_MS - 3000);
    Tell("outbox file-Cannot store an event: disk is full", NOW_MS - 2000);
    Tell("configuration-a variable has no effect", NOW_MS - 1000);
    EXPECT_THAT(Lasting(), Optional(std::string("outbox file-Cannot store an event: disk is full")));
    Tell(UPLOAD, NOW_MS - 500);
    EXPECT_THAT(Lasting(), Optional(std::string(UPLOAD)));
    EXPECT_THAT(m_lines,
                ElementsAre(Field(&Log::Line::atMs, NOW_MS - 2000), Field(&Log::Line::atMs, NOW_MS - 1000),
                            Field(&Log::Line::atMs, NOW_MS - 500)));
}
