#include "Modules/MetrikSdk/outbox/OutboxStore.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <limits>

#include <gtest/gtest.h>
#include <sys/stat.h>

#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "tests/support/TemporaryDirectory.h"

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

const ModuleIdentity A759{"A759", "1", "default"};
/// Written by a program of version 1: three events of A759, of which the first was delivered.
constexpr auto VERSION_1 = SSR_SOURCE_DIR "/tests/Modules/MetrikSdk/outbox/outbox-1.sql";
const WallTime NOW{1'800'000'000s};
constexpr WallTime NEVER_TOO_OLD{};
constexpr std::size_t ANY_BYTES = std::numeric_limits<std::size_t>::max();

class TheOutboxStore : public testing::Test {
protected:
    TheOutboxStore() {
        std::ofstream(m_path).close();
        Open();
    }

    void Open() { m_store = std::make_unique<outbox::OutboxStore>(m_path, 50ms); }

    void Store(const ModuleIdentity& module, const std::string& payload, WallTime at = NOW) {
        m_store->Store(module, {"uuid-" + std::to_string(++m_count), "A759|1", payload, at});
    }

    TemporaryDirectory m_directory;
    const std::string m_path = m_directory.Path() + "/o.db";
    std::unique_ptr<outbox::OutboxStore> m_store;
    int m_count = 0;
};

TEST_F(TheOutboxStore, GivesEventsBackAsTheyCameInTheirOrder) {
    const std::string odd("a\0'\";DROP TABLE event;--\xff", 26);
    Store(A759, odd);
    Store(A759, "second");
    const auto batch = m_store->Oldest(10, ANY_BYTES);
    ASSERT_EQ(batch.events.size(), 2U);
    EXPECT_EQ(batch.events[0].payload, odd);
    EXPECT_EQ(batch.events[0].uuid, "uuid-1");
    EXPECT_EQ(batch.events[0].eventId, "A759|1");
    EXPECT_EQ(batch.events[0].storedAt, NOW);
    EXPECT_EQ(batch.events[1].payload, "second");
    EXPECT_EQ(batch.releases.at(batch.events[0].release), A759);
    EXPECT_FALSE(batch.outboxId.empty());
}

TEST_F(TheOutboxStore, KnowsWhenItsCollectorTookEventsLast) {
    const auto last = [this] {
        return SQLite::Database(m_path)
            .execAndGet("SELECT coalesce(last_delivered_ms, 0) FROM totals")
            .getInt64();
    };
    const auto now = [] {
        return std::chrono::duration_cast<std::chrono::milliseconds>(
                   std::chrono::system_clock::now().time_since_epoch())
            .count();
    };
    Store(A759, "refused");
    m_store->RemoveDelivered(m_store->Oldest(1, ANY_BYTES), 1);
    EXPECT_EQ(last(), 0) << "what the collector refuses it has not taken";
    Store(A759, "taken");
    const auto before = now();
    m_store->RemoveDelivered(m_store->Oldest(1, ANY_BYTES), 0);
    EXPECT_GE(last(), before);
    EXPECT_LE(last(), now());
}

TEST_F(TheOutboxStore, CountsEachModulesEventsFromOneAcrossRestartsDeletionsAndVersions) {
    const ModuleIdentity other{"B'; --", "1", "x"};
    Store(A759, "1");
    Store(other, "1");
    Store(A759, "2");
    m_store->RemoveDelivered(m_store->Oldest(10, ANY_BYTES), 0);
    Open();
    Store({"A759", "2", "renamed"}, "3");
    Store(A759, "4");
    Store(other, "2");
    std::vector<std::int64_t> sequences;
    const auto batch = m_store->Oldest(10, ANY_BYTES);
    for (const auto& event : batch.events)
        sequences.push_back(event.sequence);
    EXPECT_EQ(sequences, (std::vector<std::int64_t>{3, 4, 2}));
    EXPECT_EQ(batch.releases.at(batch.events[0].release).version, "2");
    EXPECT_EQ(batch.releases.at(batch.events[1].release).version, "1");
}

TEST_F(TheOutboxStore, ForgetsModulesOfWhichNothingWaitsOnceThereAreTooMany) {
    Store(A759, "1");
    Store(A759, "2");
    const auto many = outbox::OutboxStore::MAX_IDLE_MODULES + 500;
    for (int i = 0; i < many; ++i)
        Store({"M" + std::to_string(i), "1", "m"}, "x");
    EXPECT_EQ(m_store->Status().modules, many + 1) << "something of each waits";
    m_store->MoveToDeadLetters(m_store->Oldest(1, ANY_BYTES).events[0], {400, "bad"}, NOW);
    while (m_store->Status().waiting > 100)
        m_store->RemoveDelivered(m_store->Oldest(100, ANY_BYTES), 0);
    const auto status = m_store->Status();
    EXPECT_EQ(status.modules, outbox::OutboxStore::MAX_IDLE_MODULES);
    EXPECT_EQ(status.stored, many + 2) << "their events are counted for ever";
    EXPECT_EQ(status.delivered + status.deadLettered + status.waiting, status.stored);
    const auto left = m_store->Oldest(100, ANY_BYTES);
    EXPECT_EQ(left.releases.at(left.events.front().release).id, "M" + std::to_string(many - 1));
    Store(A759, "3");
    EXPECT_EQ(m_store->Oldest(1000, ANY_BYTES).events.back().sequence, 3) << "it has a dead letter";
}

TEST_F(TheOutboxStore, CountsWhatModulesTakeOnTheDisk) {
    const auto before = m_store->Status().moduleBytes;
    for (int i = 0; i < 2000; ++i) {
        const auto text = std::to_string(i) + std::string(250, 'x');
        Store({text.substr(0, 64), text, text}, "");
    }
    const auto status = m_store->Status();
    SQLite::Database file(m_path, SQLite::OPEN_READWRITE);
    file.exec("PRAGMA wal_checkpoint(TRUNCATE)");
    const auto onDisk = static_cast<std::int64_t>(std::filesystem::file_size(m_path));
    EXPECT_GT(status.waitingBytes + status.moduleBytes - before, onDisk * 9 / 10);
    EXPECT_LT(status.waitingBytes + status.moduleBytes - before, onDisk * 2);
}

TEST_F(TheOutboxStore, TakesAnOutboxOfTheFirstVersionOver) {
    m_store.reset();
    std::filesystem::remove(m_path);
    ASSERT_EQ(std::system(("sqlite3 " + m_path + " < " + std::string(VERSION_1)).c_str()), 0);
    ::chmod(m_path.c_str(), 0600);
    Open();
    auto status = m_store->Status();
    EXPECT_EQ(status.stored, 3);
    EXPECT_EQ(status.delivered, 1);
    EXPECT_EQ(status.waiting, 2);
    Store(A759, "next");
    EXPECT_EQ(m_store->Oldest(10, ANY_BYTES).events.back().sequence, 4);
    SQLite::Database file(m_path);
    EXPECT_EQ(file.execAndGet("SELECT stored_bytes - removed_bytes FROM module").getInt64(),
              m_store->Status().waitingBytes);
    m_store->RemoveDelivered(m_store->Oldest(10, ANY_BYTES), 0);
    EXPECT_EQ(m_store->Status().waiting, 0);
}

TEST_F(TheOutboxStore, KeepsItsIdentityAcrossRestarts) {
    const auto id = m_store->Status().outboxId;
    Open();
    EXPECT_EQ(m_store->Status().outboxId, id);
}

TEST_F(TheOutboxStore, EndsABatchWithTheEventThatReachesTheBytes) {
    for (int i = 0; i < 5; ++i)
        Store(A759, std::string(1000, 'x'));
    EXPECT_EQ(m_store->Oldest(10, 2500).events.size(), 3U);
    EXPECT_EQ(m_store->Oldest(10, 1).events.size(), 1U);
    EXPECT_EQ(m_store->Oldest(2, ANY_BYTES).events.size(), 2U);
}

TEST_F(TheOutboxStore, CountsEveryEventInExactlyOnePlace) {
    for (int i = 0; i < 20; ++i)
        Store(A759, std::to_string(i), NOW + std::chrono::hours(i));
    m_store->RemoveDelivered(m_store->Oldest(5, ANY_BYTES), 2);
    m_store->MoveToDeadLetters(m_store->Oldest(1, ANY_BYTES).events[0], {400, "bad"}, NOW);
    EXPECT_EQ(m_store->DropOldest(0, NOW + std::chrono::hours(9), 0, 100).events, 3U);
    const auto status = m_store->Status();
    EXPECT_EQ(status.stored, 20);
    EXPECT_EQ(status.delivered, 3);
    EXPECT_EQ(status.refused, 2);
    EXPECT_EQ(status.deadLettered, 1);
    EXPECT_EQ(status.dropped, 3);
    EXPECT_EQ(status.waiting, 11);
    EXPECT_EQ(status.deadLetters, 1);
    std::int64_t bytes = 0;
    for (const auto& event : m_store->Oldest(100, ANY_BYTES).events)
        bytes += static_cast<std::int64_t>(event.bytes);
    EXPECT_EQ(status.waitingBytes, bytes);
}

TEST_F(TheOutboxStore, DoesNotRemoveWhatIsNotTheSameEventAnyMore) {
    Store(A759, "old");
    const auto taken = m_store->Oldest(1, ANY_BYTES);
    m_store->RemoveDelivered(taken, 0); // as another process would do it; the next event gets the same row
    Store(A759, "new");
    m_store->RemoveDelivered(taken, 0);
    m_store->MoveToDeadLetters(taken.events[0], {400, "bad"}, NOW);
    EXPECT_EQ(m_store->Oldest(10, ANY_BYTES).events.at(0).payload, "new");
    EXPECT_EQ(m_store->Status().delivered, 1);
    EXPECT_EQ(m_store->Status().deadLetters, 0);
}

TEST_F(TheOutboxStore, DropsTheOldestFirstAndNoMoreThanAsked) {
    for (int i = 0; i < 10; ++i)
        Store(A759, std::to_string(i));
    EXPECT_EQ(m_store->DropOldest(0, NEVER_TOO_OLD, 1, 100).events, 1U);
    EXPECT_EQ(m_store->DropOldest(0, NEVER_TOO_OLD, 1'000'000, 4).events, 4U);
    EXPECT_EQ(m_store->Oldest(1, ANY_BYTES).events.at(0).payload, "5");
    EXPECT_EQ(m_store->DropOldest(0, NEVER_TOO_OLD, 0, 100).events, 0U);
}

TEST_F(TheOutboxStore, DoesNotDropWhatIsUnderWay) {
    for (int i = 0; i < 4; ++i)
        Store(A759, std::to_string(i));
    const auto underWay = m_store->Oldest(2, ANY_BYTES);
    EXPECT_EQ(m_store->DropOldest(underWay.events.back().row, NEVER_TOO_OLD, 1, 100).events, 1U);
    const auto left = m_store->Oldest(10, ANY_BYTES);
    ASSERT_EQ(left.events.size(), 3U);
    EXPECT_EQ(left.events[0].payload, "0");
    EXPECT_EQ(left.events[2].payload, "3");
}

TEST_F(TheOutboxStore, DropsTheOldestOfTheLargestModuleAlsoAfterTheOutboxWasEmpty) {
    for (int i = 0; i < 10; ++i)
        Store(A759, "first" + std::to_string(i));
    m_store->DropOldest(0, NEVER_TOO_OLD, 1'000'000, 8); // no module has so much, so all modules' go
    m_store->DropOldest(0, NEVER_TOO_OLD, 1, 1);
    m_store->RemoveDelivered(m_store->Oldest(10, ANY_BYTES), 0);
    Store({"QUIET", "1", "quiet"}, "quiet");
    for (int i = 0; i < 5; ++i)
        Store(A759, "again" + std::to_string(i));
    EXPECT_EQ(m_store->DropOldest(0, NEVER_TOO_OLD, 1, 100).events, 1U);
    const auto left = m_store->Oldest(10, ANY_BYTES);
    ASSERT_EQ(left.events.size(), 5U);
    EXPECT_EQ(left.events[0].payload, "quiet");
    EXPECT_EQ(left.events[1].payload, "again1");
}

TEST_F(TheOutboxStore, DropsTheOldestAlsoWhenItWasUnderWayBefore) {
    for (int i = 0; i < 6; ++i)
        Store(A759, std::to_string(i));
    const auto underWay = m_store->Oldest(3, ANY_BYTES).events.back().row;
    EXPECT_EQ(m_store->DropOldest(underWay, NEVER_TOO_OLD, 1, 100).events, 1U);
    EXPECT_EQ(m_store->DropOldest(0, NEVER_TOO_OLD, 1, 100).events, 1U);
    EXPECT_EQ(m_store->Oldest(1, ANY_BYTES).events.at(0).payload, "1");
}

TEST_F(TheOutboxStore, KeepsTheNewestDeadLettersWithinBothBounds) {
    for (int i = 0; i < 10; ++i) {
        Store(A759, std::string(100, static_cast<char>('0' + i)));
        m_store->MoveToDeadLetters(m_store->Oldest(1, ANY_BYTES).events[0], {400, "bad"}, NOW);
    }
    EXPECT_EQ(m_store->TrimDeadLetters(6, ANY_BYTES / 2), 4U);
    EXPECT_EQ(m_store->Status().deadLetters, 6);
    m_store->TrimDeadLetters(100, 400);
    const auto status = m_store->Status();
    EXPECT_EQ(status.deadLetters, 2);
    EXPECT_LE(status.deadLetterBytes, 400);
    EXPECT_EQ(status.deadLettered, 10);
    SQLite::Database reader(m_path);
    EXPECT_EQ(reader.execAndGet("SELECT payload FROM dead_letter LIMIT 1").getString(),
              std::string(100, '8'));
    EXPECT_EQ(reader.execAndGet("SELECT status || reason FROM dead_letter LIMIT 1").getString(), "400bad");
}

TEST_F(TheOutboxStore, TrimsATableThatAPersonHasEmptied) {
    Store(A759, "x");
    m_store->MoveToDeadLetters(m_store->Oldest(1, ANY_BYTES).events[0], {400, "bad"}, NOW);
    SQLite::Database(m_path, SQLite::OPEN_READWRITE).exec("DELETE FROM dead_letter");
    m_store->TrimDeadLetters(0, 0);
    EXPECT_EQ(m_store->Status().deadLetters, 0);
}

TEST_F(TheOutboxStore, CallsAFileThatIsNoDatabaseDamaged) {
    m_store.reset();
    std::ofstream(m_path, std::ios::trunc) << std::string(8192, 'x');
    try {
        Open();
        FAIL() << "opened";
    } catch (const outbox::StoreError& error) {
        EXPECT_EQ(error.fault, outbox::StoreFault::SetAside);
    }
}

TEST_F(TheOutboxStore, CallsAnotherProgramsDatabaseNotItsOwn) {
    m_store.reset();
    std::ofstream(m_path, std::ios::trunc).close();
    SQLite::Database(m_path, SQLite::OPEN_READWRITE).exec("CREATE TABLE theirs(x)");
    try {
        Open();
        FAIL() << "opened";
    } catch (const outbox::StoreError& error) {
        EXPECT_EQ(error.fault, outbox::StoreFault::SetAside);
    }
}

TEST_F(TheOutboxStore, AsksToTryLaterWhileAnotherProcessHoldsTheLock) {
    SQLite::Database other(m_path, SQLite::OPEN_READWRITE);
    other.exec("BEGIN IMMEDIATE");
    try {
        Store(A759, "x");
        FAIL() << "stored";
    } catch (const outbox::StoreError& error) {
        EXPECT_EQ(error.fault, outbox::StoreFault::TryLater);
    }
    other.exec("COMMIT");
    Store(A759, "x");
    EXPECT_EQ(m_store->Status().waiting, 1);
}

TEST_F(TheOutboxStore, IsSharedByTwoProcessesWithoutGapsOrRepeats) {
    outbox::OutboxStore other(m_path, 5s);
    for (int i = 0; i < 10; ++i) {
        Store(A759, "mine");
        other.Store(A759, {"other-" + std::to_string(i), "A759|1", "theirs", NOW});
    }
    std::int64_t expected = 0;
    for (const auto& event : m_store->Oldest(100, ANY_BYTES).events)
        EXPECT_EQ(event.sequence, ++expected);
    EXPECT_EQ(expected, 20);
}

} // namespace
