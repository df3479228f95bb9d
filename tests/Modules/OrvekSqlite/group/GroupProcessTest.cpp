#include <algorithm>
#include <atomic>
#include <chrono>
#include <csignal>
#include <functional>
#include <memory>
#include <random>
#include <thread>

#include <pthread.h>
#include <sqlite3.h>
#include <sys/mman.h>

#include "tests/Modules/OrvekSqlite/SqliteFixture.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/WaitUntil.h"

// Groups and other processes: what a kill loses, how a process ends in the middle of a burst, and whether
// another program can write, too.
namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock; ///< the same in every process of the machine

/// How long the machine may delay the committer, in addition to the ten milliseconds.
constexpr auto SCHEDULING = 50ms;

/// How long a process may take to end. The thread sanitizer alone sleeps for a second before the end.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr auto END_LIMIT = 5s;
#else
constexpr auto END_LIMIT = 3s; // a second, and more for a busy disk, because the end writes the log back
#endif

/// What a child that stores rows tells its parent through shared memory, also when it is killed in the
/// middle.
struct Progress {
    static constexpr std::size_t MAX = 1'000'000;
    std::atomic<std::size_t> returned;         ///< statements whose ExecSql has returned true
    std::atomic<Clock::duration::rep> at[MAX]; ///< when each of them returned
    std::atomic<Clock::duration::rep> endedAt; ///< when the child began to end itself
    std::atomic<bool> failed;
};

class GroupAndProcesses : public SqliteFixture {
protected:
    void SetUp() override {
        SqliteFixture::SetUp();
        MakeStore(Store());
        void* memory =
            ::mmap(nullptr, sizeof(Progress), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
        ASSERT_NE(memory, MAP_FAILED);
        m_progress = static_cast<Progress*>(memory);
    }

    void TearDown() override { ::munmap(m_progress, sizeof(Progress)); }

    /// Stores numbered rows as fast as possible, in a child process, until the child ends.
    void Stream(ISqliteDatabase& database) {
        const auto first = m_progress->returned.load();
        for (auto i = first; i < first + Progress::MAX; ++i) {
            if (!database.ExecSql(Insert(std::to_string(i)))) {
                m_progress->failed = true;
                return;
            }
            if (i < Progress::MAX)
                m_progress->at[i] = Clock::now().time_since_epoch().count();
            m_progress->returned = i + 1;
        }
    }

    /// How many statements had returned at that time.
    std::size_t ReturnedBefore(Clock::time_point time) const {
        const std::atomic<Clock::duration::rep>* first = m_progress->at;
        const auto* end = first + std::min(m_progress->returned.load(), Progress::MAX);
        const auto* later = std::partition_point(
            first, end, [&](const auto& at) { return at <= time.time_since_epoch().count(); });
        return static_cast<std::size_t>(later - first);
    }

    void ForgetProgress() { m_progress->returned = 0; }
    Progress& Shared() const { return *m_progress; }

    /// A random life time. It is longer than the time whose rows may be lost, so that a larger loss would be
    /// seen.
    std::chrono::milliseconds ALifeTime() {
        return std::chrono::milliseconds(std::uniform_int_distribution(80, 160)(m_random));
    }

    bool WaitUntilItStreamedFor(std::chrono::milliseconds time) const {
        return WaitUntil([&] {
            return Shared().returned > 1 &&
                   Clock::now().time_since_epoch().count() - Shared().at[0] > Clock::duration(time).count();
        });
    }

    static bool IsPrefixInOrder(const std::string& path, const std::string& rows) {
        return Ask(path, "select count(*) from OperLog where eventID = id - 1 and id <= " + rows) == rows;
    }

private:
    std::mt19937 m_random{20261120};
    Progress* m_progress = nullptr;
};

TEST_F(GroupAndProcesses, LoseAtMostTenMillisecondsOfABurstByAKill) {
    for (int round = 0; round < 20; ++round) {
        ForgetProgress();
        ChildProcess writer([&](const auto& tell) {
            if (!Plugin()->Open(Store()))
                return 1;
            tell();
            Stream(*Plugin());
            return 2;
        });
        ASSERT_TRUE(writer.WaitUntilItTold());
        ASSERT_TRUE(WaitUntilItStreamedFor(ALifeTime()));
        const auto killed = Clock::now();
        ASSERT_EQ(writer.Kill(), 128 + SIGKILL);
        ASSERT_FALSE(Shared().failed);

        const auto rows = Rows(Store());
        EXPECT_GE(std::stoul(rows), ReturnedBefore(killed - 10ms - SCHEDULING)) << "of " << Shared().returned;
        EXPECT_LE(std::stoul(rows), Shared().returned + 1);
        EXPECT_TRUE(IsPrefixInOrder(Store(), rows));
        EXPECT_EQ(Ask(Store(), "pragma integrity_check"), "ok");
        SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec("delete from OperLog");
    }
}

/// A child process stores rows, and this process is the other program.
class AnotherProgram : public GroupAndProcesses {
protected:
    void SetUp() override {
        GroupAndProcesses::SetUp();
        m_writer = std::make_unique<ChildProcess>([&](const auto& tell) {
            if (!Plugin()->Open(Store()))
                return 1;
            tell();
            Stream(*Plugin());
            return 2;
        });
        ASSERT_TRUE(m_writer->WaitUntilItTold() && WaitUntil([&] { return Shared().returned > 5000; }));
    }

    void TearDown() override {
        m_writer.reset();
        EXPECT_FALSE(Shared().failed);
        GroupAndProcesses::TearDown();
    }

private:
    std::unique_ptr<ChildProcess> m_writer;
};

TEST_F(AnotherProgram, FindsTheLockFreeForAboutHalfOfTheTime) {
    SQLite::Database other(Store(), SQLite::OPEN_READWRITE);
    constexpr int LOOKS = 500;
    int looks = 0;
    int free = 0;
    EXPECT_TRUE(WaitUntil([&] {
        free += other.tryExec("begin immediate; rollback") == SQLITE_OK ? 1 : 0;
        return ++looks == LOOKS;
    }));
    std::printf("the lock was free at %d of %d looks\n", free, LOOKS);
    EXPECT_GT(free, LOOKS * 3 / 10);
}

TEST_F(AnotherProgram, IsNotLockedOutForLongerThanAGroup) {
    SQLite::Database other(Store(), SQLite::OPEN_READWRITE);
    constexpr std::size_t STRETCHES = 100;
    // How long the lock was held each time: from the first try that found it held to the next that found it
    // free.
    std::vector<Clock::duration> taken;
    auto since = Clock::now();
    for (bool wasFree = true; taken.size() < STRETCHES;) {
        const auto now = Clock::now();
        const bool isFree = other.tryExec("begin immediate; rollback") == SQLITE_OK;
        if (isFree && !wasFree)
            taken.push_back(now - since);
        if (!isFree && wasFree)
            since = now;
        ASSERT_LT(now - since, 10s) << "no other program is writing, or none may";
        wasFree = isFree;
    }
    std::sort(taken.begin(), taken.end());
    const auto ms = [](auto stretch) { return std::chrono::duration<double, std::milli>(stretch).count(); };
    std::printf("the lock was taken: median %.1f ms, longest %.1f ms\n", ms(taken[STRETCHES / 2]),
                ms(taken.back()));
    EXPECT_LE(taken[STRETCHES / 4], 10ms) << "a busy machine may lengthen many, but not each";
    EXPECT_LT(taken.back(), 10ms + 1s);
}

/// Writes as an ordinary program does: with SQLite's own busy timeout, one insert after the other.
TEST_F(AnotherProgram, HasItsTurnUnderConstantLoad) {
    SQLite::Database other(Store(), SQLite::OPEN_READWRITE, 5000);
    std::vector<Clock::duration> waits;
    const auto before = Shared().returned.load();
    for (int i = 0; i < 100; ++i) {
        const auto start = Clock::now();
        ASSERT_NO_THROW(other.exec("insert into BaseInfo values ('other', '')")) << "number " << i;
        waits.push_back(Clock::now() - start);
    }
    EXPECT_GT(Shared().returned, before) << "no other program was writing";
    std::sort(waits.begin(), waits.end());
    const auto ms = [](auto wait) { return std::chrono::duration<double, std::milli>(wait).count(); };
    std::printf("waits for the lock: median %.1f ms, longest %.1f ms\n", ms(waits[50]), ms(waits.back()));
    EXPECT_LT(waits.back(), 1s);
}

/// A program whose plug-in exit destroys while another thread stores rows.
class ProcessThatExits : public GroupAndProcesses {
protected:
    static constexpr int ROUNDS = 10;

    /// Runs `end` in a child process while another thread of that process stores rows; `end` gets that
    /// thread. Returns what the child's Wait returned.
    int StreamAndEnd(const std::function<void(std::thread&)>& end) {
        ForgetProgress();
        const auto life = ALifeTime();
        ChildProcess program([&](const auto& tell) {
            static Loader loader(PluginPath()); // exit destroys it
            if (!loader.GetModule()->Open(Store()))
                return 1;
            std::thread consumer([&] {
                Stream(*loader.GetModule());
                ::pause(); // a service's thread does not end before its process
            });
            tell();
            if (!WaitUntilItStreamedFor(life))
                return 2;
            Shared().endedAt = Clock::now().time_since_epoch().count();
            end(consumer);
            consumer.join();
            return 3;
        });
        EXPECT_TRUE(program.WaitUntilItTold());
        const auto status = program.WaitFor(30s);
        EXPECT_TRUE(status) << "the child hangs";
        const auto alarm = status && *status > 128 ? 5s : 0s; // the alarm of the crash handler below
        EXPECT_LT(Clock::now() - EndBegan(), END_LIMIT + alarm);
        ExpectAllButTheLastTenMilliseconds();
        return status.value_or(-1);
    }

private:
    Clock::time_point EndBegan() const { return Clock::time_point(Clock::duration(Shared().endedAt)); }

    void ExpectAllButTheLastTenMilliseconds() const {
        const auto rows = Rows(Store());
        EXPECT_TRUE(IsPrefixInOrder(Store(), rows));
        EXPECT_GE(std::stoul(rows), ReturnedBefore(EndBegan() - 10ms - SCHEDULING))
            << "of " << Shared().returned;
    }
};

TEST_F(ProcessThatExits, EndsAtOnceThoughAnotherThreadIsWriting) {
    for (int round = 0; round < ROUNDS; ++round) {
        const int status = StreamAndEnd([](std::thread&) { std::exit(0); });
        EXPECT_EQ(status, 0);
        EXPECT_GE(std::stoul(Rows(Store())) + 1, Shared().returned) << "what had returned was not committed";
        SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec("delete from OperLog");
    }
}

/// Does what the service's crash handler does: it exits on the thread that crashed, wherever that thread was.
/// When the thread holds the allocator's lock, no exit handler can run, and the alarm ends the process.
void ExitAsTheCrashHandlerDoes(int) {
    ::alarm(5);
    std::exit(0);
}

TEST_F(ProcessThatExits, EndsFromTheCrashHandlerOfTheThreadThatIsWriting) {
#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)
    GTEST_SKIP() << "the sanitizer's allocator does not survive an exit out of its middle";
#endif
    ::signal(SIGSEGV, ExitAsTheCrashHandlerDoes);
    int alarms = 0;
    for (int round = 0; round < ROUNDS; ++round) {
        const int status =
            StreamAndEnd([](std::thread& consumer) { ::pthread_kill(consumer.native_handle(), SIGSEGV); });
        alarms += status == 128 + SIGALRM ? 1 : 0;
        EXPECT_TRUE(status == 0 || status == 128 + SIGALRM) << status;
        SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec("delete from OperLog");
    }
    EXPECT_LE(alarms, ROUNDS / 5);
}

TEST_F(ProcessThatExits, EndsFromACrashOnAnyOtherThread) {
#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)
    GTEST_SKIP() << "the sanitizers have the signal to themselves";
#endif
    ::signal(SIGSEGV, ExitAsTheCrashHandlerDoes);
    for (int round = 0; round < ROUNDS; ++round) {
        const int status = StreamAndEnd([](std::thread&) { ::raise(SIGSEGV); });
        EXPECT_EQ(status, 0);
        SQLite::Database(Store(), SQLite::OPEN_READWRITE).exec("delete from OperLog");
    }
}

} // namespace
