#include "Ledger/Reader.h"

#include <atomic>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <thread>

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tests/Ledger/LedgerFixture.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/WaitUntil.h"

using namespace ReportLedger;

// What a reader sees, also while a process counts, and after a process was killed.

namespace {

class LedgerReader : public LedgerFixture {};

/// Counts what both threads of a service count, as fast as possible.
class BusyService {
public:
    explicit BusyService(Writer& writer) : m_writer(writer) {
        m_receiving = std::thread([this] { Receive(); });
        m_consuming = std::thread([this] { Consume(); });
    }
    ~BusyService() {
        m_stop = true;
        m_receiving.join();
        m_consuming.join();
    }
    BusyService(const BusyService&) = delete;
    BusyService& operator=(const BusyService&) = delete;

private:
    void Receive() {
        for (std::uint64_t i = 0; !m_stop; ++i) {
            const bool empty = i % 10 == 0;
            m_writer.Received(empty ? 0 : 100, false, 1);
            if (empty)
                continue;
            // Stands for the synchronisation of the real queue.
            m_queued.fetch_add(1, std::memory_order_release);
            m_writer.Queued();
        }
    }
    void Consume() {
        for (std::uint64_t handled = 0; !m_stop;)
            if (handled < m_queued.load(std::memory_order_acquire)) {
                m_writer.Ended(static_cast<Outcome>(FIRST_OUTCOME + handled % 12), 1);
                ++handled;
            }
    }

    Writer& m_writer;
    std::atomic<bool> m_stop = false;
    std::atomic<std::uint64_t> m_queued = 0;
    std::thread m_receiving;
    std::thread m_consuming;
};

} // namespace

TEST_F(LedgerReader, OfAMissingFileSeesThatItIsMissingAndMakesNone) {
    EXPECT_EQ(Look().sight, Sight::Missing);
    EXPECT_FALSE(std::filesystem::exists(Directory()));
}

TEST_F(LedgerReader, ChangesNothingAboutTheFile) {
    {
        Writer writer;
        ASSERT_TRUE(Open(writer));
    }
    struct stat before {};
    struct stat after {};
    ASSERT_EQ(::stat(Path().c_str(), &before), 0);
    EXPECT_EQ(Look().sight, Sight::Sound);
    ASSERT_EQ(::stat(Path().c_str(), &after), 0);
    EXPECT_EQ(before.st_mtim.tv_nsec, after.st_mtim.tv_nsec);
    EXPECT_EQ(before.st_ctim.tv_nsec, after.st_ctim.tv_nsec);
}

TEST_F(LedgerReader, SeesABalanceAtEachMomentOfAServiceAtFullSpeed) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    const BusyService service(writer);
    ASSERT_TRUE(WaitUntil([&] { return Look().total[RECEIVED] > 1000; }));
    std::uint64_t received = 0;
    for (int i = 0; i < 500; ++i) {
        const auto look = Look();
        ASSERT_EQ(look.sight, Sight::Sound);
        ASSERT_TRUE(look.balanced) << "look " << i << ", " << UnaccountedIn(look.total) << " missing";
        ASSERT_GE(look.total[RECEIVED], received);
        ASSERT_GE(look.total[RECEIVED], EndedIn(look.total));
        received = look.total[RECEIVED];
    }
}

TEST_F(LedgerReader, SeesThatAReportIsMissingWhenNothingIsUnderWay) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    Take(writer);
    EXPECT_TRUE(Look().balanced);
    writer.Received(100, false, NOW_MS);
    writer.Received(100, false, NOW_MS); // so the ledger misses the first one
    EXPECT_FALSE(Look().balanced);
}

TEST_F(LedgerReader, LeavesOutMarksOfTheFutureAndHalfWrittenOnes) {
    Writer writer;
    ASSERT_TRUE(Open(writer));
    writer.Tick(NOW_MS + 10'000);
    writer.Tick(NOW_MS + 20'000);
    EXPECT_EQ(LookAt(writer.Content(), true, NOW_MS + 15'000).marks.size(), 2U);
    const auto file = std::make_unique<File>();
    file->marks[0].atMs = 0; // as during a write of the mark
    file->marks[0].counters[RECEIVED] = 5;
    EXPECT_TRUE(LookAt(*file, false, NOW_MS).marks.empty());
}

TEST_F(LedgerReader, PutsWhatCannotBePrintedOutOfTheTexts) {
    {
        Writer writer;
        ASSERT_TRUE(writer.Open(Directory(), "1\x1b[31m\xff", "id", NOW_MS));
    }
    EXPECT_EQ(Look().programVersion, "1?[31m?");
}

TEST_F(LedgerReader, SeesATrueLedgerAfterAKillAtAnyMoment) {
    std::uint64_t received = 0;
    for (int kill = 0; kill < 30; ++kill) {
        ChildProcess process([&] {
            Writer writer;
            if (!Open(writer, NOW_MS + kill))
                return 1;
            const BusyService service(writer);
            return ::pause();
        });
        EXPECT_TRUE(WaitUntil([&] { return Look().counting && Look().total[RECEIVED] > received; }));
        ASSERT_EQ(process.Kill(), 128 + SIGKILL);
        const auto look = Look();
        ASSERT_EQ(look.sight, Sight::Sound) << "after kill " << kill;
        ASSERT_FALSE(look.counting);
        ASSERT_EQ(look.total[RECEIVED], EndedIn(look.total) + look.total[LOST_AT_ENDS]);
        ASSERT_GT(look.total[RECEIVED], received);
        received = look.total[RECEIVED];
    }
    Writer writer;
    ASSERT_TRUE(Open(writer));
    EXPECT_TRUE(Look().balanced);
    EXPECT_EQ(Look().total[RECEIVED], received);
}
