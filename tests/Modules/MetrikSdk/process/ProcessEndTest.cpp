#include <filesystem>
#include <map>
#include <random>
#include <sstream>

#include <sys/wait.h>

#include "tests/Modules/MetrikSdk/support/ChildProgram.h"
#include "tests/Modules/MetrikSdk/support/PluginFixture.h"

using namespace std::chrono_literals;

namespace {

#ifdef __SANITIZE_THREAD__
constexpr int ROUNDS = 10; // with this sanitizer, it takes minutes to upload the events of fifty processes
#else
constexpr int ROUNDS = 50;
#endif

/// What happens to the outbox when its process ends, for every way in which a process can end.
class TheProcessEnd : public PluginFixture {
protected:
    TheProcessEnd() { Configure("ENDPOINT", m_server.Url()); }

    void AnswerWith(const Reply& reply) {
        const std::lock_guard lock(m_mutex);
        m_reply = reply;
    }

    Reply Take(const Request& request) {
        const std::lock_guard lock(m_mutex);
        for (const auto& event : EventsOf(request.body)) {
            m_uuids[event.number].insert(event.uuid);
            m_sequences.insert(event.sequence);
        }
        return m_reply;
    }

    enum class KillAfter { AnEvent, ARequest };

    /// Kills a "stream" child a moment after its first event, or after its first request at the server.
    /// Returns the numbers of the events that the child saw accepted.
    std::vector<int> KillAtARandomMoment(int firstNumber, KillAfter what) {
        const auto before = m_server.RequestCount();
        ChildProgram child(m_directory.Path(), firstNumber, "stream");
        child.AwaitOutput();
        if (what == KillAfter::ARequest) {
            EXPECT_TRUE(WaitUntil([&] { return m_server.RequestCount() > before; }));
        }
        const auto moment = std::chrono::steady_clock::now() +
                            std::chrono::microseconds(std::uniform_int_distribution(0, 120'000)(m_random));
        WaitUntil([&] { return std::chrono::steady_clock::now() > moment; });
        child.Kill();
        m_roundsWithRequests += m_server.RequestCount() > before ? 1 : 0;
        EXPECT_TRUE(WIFSIGNALED(child.AwaitEnd().value_or(0)));
        std::istringstream output(child.Output());
        std::vector<int> accepted;
        for (std::string line; std::getline(output, line);)
            accepted.push_back(std::stoi(line));
        return accepted;
    }

    void ExpectACleanExit(const std::string& way) {
        ChildProgram child(m_directory.Path(), 0, way);
        const auto status = child.AwaitEnd();
        ASSERT_TRUE(status) << "the process hangs";
        EXPECT_TRUE(WIFEXITED(*status)) << "signal " << WTERMSIG(*status);
        EXPECT_EQ(WEXITSTATUS(*status), 0);
        EXPECT_GT(Totals().stored, 0);
        EXPECT_EQ(SQLite::Database(File()).execAndGet("PRAGMA integrity_check").getString(), "ok");
    }

    /// Guards what the server's threads use; once the server is idle, no lock is needed.
    std::mutex m_mutex;
    Reply m_reply;
    std::map<int, std::set<std::string>> m_uuids; ///< The ids under which each number arrived.
    std::set<std::int64_t> m_sequences;
    LoopbackServer m_server{[this](const Request& request) { return Take(request); }};
    int m_roundsWithRequests = 0; ///< How many kills came after a request.
    std::mt19937 m_random{std::random_device{}()};
};

TEST_F(TheProcessEnd, LosesNothingThatWasAcceptedBeforeFiftyKills) {
    std::vector<int> accepted;
    for (int i = 0; i < ROUNDS; ++i) {
        const auto after = i % 4 == 0 ? KillAfter::AnEvent : KillAfter::ARequest;
        const auto more = KillAtARandomMoment(i * 1'000'000, after);
        ASSERT_FALSE(more.empty());
        accepted.insert(accepted.end(), more.begin(), more.end());
    }
    EXPECT_GE(m_roundsWithRequests, ROUNDS * 7 / 10) << "events went out while processes were killed";
    Start();
    ASSERT_TRUE(WaitUntilNothingWaits());
    Stop();
    for (const int number : accepted)
        ASSERT_EQ(m_uuids[number].size(), 1U) << number << " arrived under so many ids";
    const auto totals = Totals();
    EXPECT_GE(totals.stored, static_cast<std::int64_t>(accepted.size()));
    EXPECT_LE(totals.stored, static_cast<std::int64_t>(accepted.size()) + ROUNDS)
        << "one a kill was not reported";
    EXPECT_EQ(totals.delivered, totals.stored);
    EXPECT_EQ(static_cast<std::int64_t>(m_sequences.size()), totals.stored);
    EXPECT_EQ(*m_sequences.rbegin(), totals.stored) << "sequences have neither gaps nor repeats";
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(m_directory.Path()), {}), 1)
        << "nothing was taken for damaged";
    RecordProperty("accepted", static_cast<int>(accepted.size()));
}

TEST_F(TheProcessEnd, ExitsCleanlyWhileItUploads) {
    ExpectACleanExit("exit");
}

TEST_F(TheProcessEnd, ExitsCleanlyWhileTheCollectorKeepsItWaiting) {
    Reply never;
    never.manner = Reply::Manner::Never;
    AnswerWith(never);
    ExpectACleanExit("exit");
}

TEST_F(TheProcessEnd, ExitsCleanlyWhenTheLoaderIsDestroyedMeanwhile) {
    Reply never;
    never.manner = Reply::Manner::Never;
    AnswerWith(never);
    ExpectACleanExit("static");
}

TEST_F(TheProcessEnd, ExitsCleanlyFromTheHandlerOfACrashOnAnotherThread) {
    ExpectACleanExit("crash");
}

TEST_F(TheProcessEnd, ExitsCleanlyFromTheUploadersOwnThread) {
    Reply busy;
    busy.status = 503;
    AnswerWith(busy);
    ExpectACleanExit("callback");
}

TEST_F(TheProcessEnd, SharesItsFileWithAnotherProcessWithoutGapsOrRepeats) {
    SetVariable("OTEL_SDK_DISABLED", "true");
    Start();
    ChildProgram child(m_directory.Path(), 1'000'000, "exit");
    Report(3000);
    EXPECT_EQ(child.AwaitEnd(), 0);
    const auto batch = MetrikSdk::outbox::OutboxStore(File(), 5s).Oldest(10'000, 100'000'000);
    std::int64_t expected = 0;
    for (const auto& event : batch.events)
        EXPECT_EQ(event.sequence, ++expected);
    EXPECT_EQ(expected, 6000);
}

} // namespace
