#include "Modules/MetrikSdk/outbox/Outbox.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <thread>

#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include "Modules/MetrikSdk/outbox/StoreError.h"
#include "tests/Modules/MetrikSdk/support/SettingsFor.h"
#include "tests/Modules/MetrikSdk/support/SmallDisk.h"
#include "tests/Modules/MetrikSdk/support/Told.h"
#include "tests/support/FileContent.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/WaitUntil.h"

using namespace MetrikSdk;
using namespace std::chrono_literals;

namespace {

const ModuleIdentity A759{"A759", "1", "default"};

class TheOutbox : public testing::Test {
protected:
    TheOutbox() {
        Told::Forget();
        m_notifier.Subscribe(&Told::OnFailure, &Told::OnSuccess);
        m_settings.file.reopenInterval = 0ms;
        m_settings.file.lockPatience = 100ms;
        m_settings.file.shortLockPatience = 1ms;
    }

    outbox::Outbox& Open() {
        m_outbox = std::make_unique<outbox::Outbox>(m_path, m_settings, m_notifier);
        m_outbox->Open();
        return *m_outbox;
    }

    bool Append(const std::string& payload = "{}") { return m_outbox->Append(A759, "A759|1", payload); }

    std::string File() const { return m_path + "/MetrikOutbox.db"; }

    std::vector<std::string> SetAsideFiles() const {
        std::vector<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(m_path))
            if (entry.path().filename().string().starts_with("MetrikOutbox.db.damaged-"))
                names.push_back(entry.path().filename());
        return names;
    }

    TemporaryDirectory m_directory;
    std::string m_path = m_directory.Path() + "/deep/database";
    OutboxSettings m_settings = SettingsFor(m_directory.Path());
    report::Notifier m_notifier{1min};
    std::unique_ptr<outbox::Outbox> m_outbox;
};

TEST_F(TheOutbox, MakesTheDirectoryAndPrivateFilesWhateverTheUmask) {
    const auto mode = [](const std::string& path) {
        struct stat status {};
        return ::stat(path.c_str(), &status) == 0 ? status.st_mode & 07777 : 0U;
    };
    for (const mode_t mask : {0, 0277, 0777}) {
        const auto before = ::umask(mask);
        Open();
        Append();
        ::umask(before);
        EXPECT_EQ(mode(m_directory.Path() + "/deep"), 0700U) << mask;
        EXPECT_EQ(mode(m_path), 0700U) << mask;
        for (const std::string suffix : {"", "-wal", "-shm"})
            EXPECT_EQ(mode(File() + suffix), 0600U) << suffix << " " << mask;
        m_outbox.reset();
        std::filesystem::remove_all(m_directory.Path() + "/deep");
    }
}

TEST_F(TheOutbox, NarrowsAFileThatOthersCouldRead) {
    std::filesystem::create_directories(m_path);
    std::ofstream(File()).close();
    ::chmod(File().c_str(), 0644);
    Open();
    struct stat status {};
    ASSERT_EQ(::stat(File().c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0600U);
}

TEST_F(TheOutbox, DoesNotFollowALinkInTheFilesPlace) {
    std::filesystem::create_directories(m_path);
    const auto target = m_directory.Path() + "/victim";
    std::ofstream(target) << "precious";
    std::filesystem::create_symlink(target, File());
    Open();
    EXPECT_FALSE(Append());
    EXPECT_EQ(ContentOf(target), "precious");
}

TEST_F(TheOutbox, KeepsEventsAcrossRestarts) {
    Open();
    EXPECT_TRUE(Append());
    EXPECT_TRUE(Append());
    EXPECT_EQ(Open().Status().waiting, 2);
}

TEST_F(TheOutbox, RefusesAnEventOverTheBoundAndTellsIt) {
    m_settings.caps.maxEventBytes = 1000;
    Open();
    EXPECT_FALSE(Append(std::string(1000, 'x')));
    EXPECT_TRUE(Append(std::string(900, 'x')));
    EXPECT_EQ(Told::Failures().Count("event: "), 1);
}

TEST_F(TheOutbox, StaysWithinItsCapTellsARunOfDropsOnceAndCountsEveryOne) {
    m_settings.caps.maxWaitingBytes = 100'000;
    Open();
    for (int i = 0; i < 1000; ++i)
        ASSERT_TRUE(Append(std::string(500, 'x')));
    const auto status = m_outbox->Status();
    EXPECT_LE(status.waitingBytes, 100'000);
    EXPECT_GT(status.waitingBytes, 95'000);
    EXPECT_EQ(status.dropped + status.waiting, 1000);
    EXPECT_EQ(m_outbox->Take(1).events.at(0).sequence, status.dropped + 1) << "the oldest went first";
    EXPECT_EQ(Told::Failures().Count("events dropped: "), 1);
}

TEST_F(TheOutbox, TakesItsCapFromTheModuleThatFillsIt) {
    m_settings.caps.maxWaitingBytes = 100'000;
    Open();
    const ModuleIdentity quiet{"QUIET", "1", "quiet"};
    for (int i = 0; i < 1000; ++i) {
        ASSERT_TRUE(Append(std::string(500, 'x')));
        const bool isQuietsTurn = i % 100 == 0;
        EXPECT_TRUE(!isQuietsTurn || m_outbox->Append(quiet, "QUIET|1", "{}"));
    }
    std::vector<std::int64_t> quietSequences;
    std::vector<std::int64_t> loudSequences;
    const auto all = m_outbox->Take(1000);
    for (const auto& event : all.events)
        (all.releases.at(event.release) == quiet ? quietSequences : loudSequences).push_back(event.sequence);
    EXPECT_EQ(quietSequences, (std::vector<std::int64_t>{1, 2, 3, 4, 5, 6, 7, 8, 9, 10}));
    EXPECT_EQ(loudSequences.back(), 1000);
    EXPECT_EQ(loudSequences.back() - loudSequences.front() + 1,
              static_cast<std::int64_t>(loudSequences.size()))
        << "its oldest went, and no other";
}

TEST_F(TheOutbox, DropsTheOthersWhenAllOfTheLargestModuleIsUnderWay) {
    m_settings.caps.maxWaitingBytes = 10'000;
    Open();
    ASSERT_TRUE(m_outbox->Append({"LARGE", "1", ""}, "LARGE|1", std::string(8000, 'x')));
    EXPECT_EQ(m_outbox->Take(1).events.size(), 1U);
    for (int i = 0; i < 10; ++i)
        ASSERT_TRUE(Append(std::string(500, 'x')));
    EXPECT_LE(m_outbox->Status().waitingBytes, 10'000);
    EXPECT_EQ(m_outbox->Take(1).events.at(0).payload.size(), 8000U);
}

TEST_F(TheOutbox, TellsTheTotalsOfItsLosses) {
    m_settings.caps.maxWaitingBytes = 100'000;
    Open();
    for (int i = 0; i < 1000; ++i)
        ASSERT_TRUE(Append(std::string(500, 'x')));
    m_notifier.TellFailure({report::Cause::Refusal, "not this one"});
    for (int i = 0; i < 3; ++i)
        m_outbox->MoveToDeadLetters(m_outbox->Take(1).events.at(0), {400, "bad"});
    m_outbox->EndRuns();
    const auto dropped = std::to_string(m_outbox->Status().dropped);
    const auto told = Told::Failures().All();
    const auto& drops = told.at(told.size() - 2);
    EXPECT_TRUE(drops.starts_with("events dropped: No events are dropped any more; lost: " + dropped +
                                  " events from 20"))
        << drops;
    EXPECT_TRUE(drops.ends_with("Z: A759 " + dropped)) << drops;
    EXPECT_TRUE(told.back().starts_with("events refused: Moved to the dead letters: 3 events from 20"))
        << told.back();
    m_outbox->EndRuns();
    EXPECT_EQ(Told::Failures().All().size(), told.size()) << "once";
}

TEST_F(TheOutbox, TellsItsTotalsAlsoWhenAnotherOutboxLostEventsAtTheSameTime) {
    const auto reporter = std::make_shared<report::FailureReporter>(1min);
    std::vector<std::string> modules{"A100", "A200"};
    std::vector<std::unique_ptr<report::Notifier>> notifiers;
    std::vector<std::unique_ptr<outbox::Outbox>> outboxes;
    for (const auto& module : modules) {
        auto& notifier = *notifiers.emplace_back(std::make_unique<report::Notifier>(reporter));
        notifier.Subscribe(&Told::OnFailure, &Told::OnSuccess);
        auto& outbox = *outboxes.emplace_back(
            std::make_unique<outbox::Outbox>(m_directory.Path() + "/" + module, m_settings, notifier));
        ASSERT_TRUE(outbox.Append({module, "1", ""}, module + "|1", "{}"));
        outbox.MoveToDeadLetters(outbox.Take(1).events.at(0), {400, "bad"});
        notifier.TellFailure({report::Cause::Refusal, "An event was refused for good"});
    }
    for (const auto& outbox : outboxes)
        outbox->EndRuns();
    const auto told = Told::Failures().All();
    for (const auto& module : modules)
        EXPECT_EQ(std::count_if(told.begin(), told.end(),
                                [&](const auto& text) {
                                    return text.starts_with(
                                               "events refused: Moved to the dead letters: 1 event from ") &&
                                           text.ends_with(": " + module + " 1");
                                }),
                  1)
            << module;
}

TEST_F(TheOutbox, TellsTheTotalsOnceARunOfDropsIsOver) {
    m_settings.caps.maxWaitingBytes = 10'000;
    m_settings.caps.dropRunEnds = 0ms;
    Open();
    for (int i = 0; i < 100; ++i)
        ASSERT_TRUE(Append(std::string(500, 'x')));
    m_outbox->Take(1);
    EXPECT_GE(Told::Failures().Count("events dropped: No events are dropped any more; lost: "), 1);
}

TEST_F(TheOutbox, DropsNothingByAgeBeforeItsClockHasProvedItself) {
    Open();
    Append();
    SQLite::Database(File(), SQLite::OPEN_READWRITE).exec("UPDATE event SET stored_ms = 1000");
    Open();
    Append();
    EXPECT_EQ(m_outbox->Status().waiting, 2);
}

TEST_F(TheOutbox, DropsEventsThatAreTooOld) {
    m_settings.caps.clockAgreement = 0ms;
    Open();
    Append();
    Append();
    m_outbox.reset();
    SQLite::Database(File(), SQLite::OPEN_READWRITE).exec("UPDATE event SET stored_ms = 1000 WHERE id = 1");
    Open();
    Append();
    const auto status = m_outbox->Status();
    EXPECT_EQ(status.dropped, 1);
    EXPECT_EQ(status.waiting, 2);
}

TEST_F(TheOutbox, KeepsWhatIsUnderWayWhenACapDrops) {
    m_settings.caps.maxWaitingBytes = 10'000;
    Open();
    for (int i = 0; i < 10; ++i)
        Append(std::string(500, 'x'));
    const auto underWay = m_outbox->Take(5);
    for (int i = 0; i < 100; ++i)
        Append(std::string(500, 'x'));
    m_outbox->RemoveDelivered(underWay, 0);
    EXPECT_EQ(m_outbox->Status().delivered, 5);
}

TEST_F(TheOutbox, SetsADamagedFileAsideBeginsANewOneAndTells) {
    std::filesystem::create_directories(m_path);
    std::ofstream(File()) << std::string(10'000, 'x');
    std::ofstream(File() + "-wal") << "its log";
    Open();
    EXPECT_TRUE(Append());
    const auto files = SetAsideFiles();
    EXPECT_EQ(std::count_if(files.begin(), files.end(), [](const auto& f) { return f.ends_with("Z"); }), 1);
    EXPECT_EQ(std::count_if(files.begin(), files.end(), [](const auto& f) { return f.ends_with("Z-wal"); }),
              1)
        << "its log goes with it";
    EXPECT_EQ(Told::Failures().Count("outbox damaged: "), 1);
    EXPECT_EQ(m_outbox->Status().waiting, 1);
}

TEST_F(TheOutbox, SetsAFileAsideThatIsDamagedWhileInUse) {
    Open();
    for (int i = 0; i < 200; ++i)
        Append(std::string(1000, 'x'));
    SQLite::Database(File(), SQLite::OPEN_READWRITE).exec("PRAGMA wal_checkpoint(TRUNCATE)");
    {
        std::fstream file(File(), std::ios::in | std::ios::out);
        file.seekp(4096);
        const std::string rubbish(static_cast<std::size_t>(std::filesystem::file_size(File())) - 4096,
                                  '\x7f');
        file.write(rubbish.data(), static_cast<std::streamsize>(rubbish.size()));
    }
    // The cache may hide the damage for a while. A connection that reads the file sees it.
    EXPECT_TRUE(WaitUntil([&] {
        EXPECT_TRUE(Append(std::string(1000, 'y')))
            << "an event that meets the damage goes into the new file";
        try {
            m_outbox->Take(512);
        } catch (const outbox::StoreError&) {
        }
        return !SetAsideFiles().empty();
    }));
    EXPECT_EQ(Told::Failures().Count("outbox damaged: "), 1);
    EXPECT_GE(m_outbox->Status().waiting, 1);
}

TEST_F(TheOutbox, BeginsAnewWhenTheFileIsDeletedAndTells) {
    Open();
    Append();
    for (const std::string suffix : {"", "-wal", "-shm"})
        std::filesystem::remove(File() + suffix);
    EXPECT_TRUE(Append());
    EXPECT_EQ(Told::Failures().Count("outbox vanished: "), 1);
    EXPECT_EQ(Open().Status().waiting, 1) << "the event is in the new file";
}

TEST_F(TheOutbox, WritesNoEventIntoADeletedFileHoweverSoonItComes) {
    m_settings.file.reopenInterval = OutboxSettings().file.reopenInterval;
    Open();
    for (int i = 0; i < 20; ++i) {
        Append();
        for (const std::string suffix : {"", "-wal", "-shm"})
            std::filesystem::remove(File() + suffix);
        ASSERT_TRUE(Append());
        ASSERT_EQ(MetrikSdk::outbox::OutboxStore(File(), 1s).Status().stored, 1) << "round " << i;
    }
}

TEST_F(TheOutbox, StaysWithinItsCapThoughEachEventIsOfAnotherModule) {
    m_settings.caps.maxWaitingBytes = 8 << 20;
    Open();
    for (int i = 0; i < 6'000; ++i) {
        const auto text = std::to_string(i) + std::string(250, 'x');
        ASSERT_TRUE(m_outbox->Append({text.substr(0, 64), text, text}, "A1|1", "{}"));
    }
    const auto status = m_outbox->Status();
    EXPECT_LE(status.waitingBytes + status.moduleBytes, 8 << 20);
    EXPECT_GT(status.waiting, 1000);
    m_outbox.reset();
    EXPECT_LT(std::filesystem::file_size(File()), 12U << 20);
}

TEST_F(TheOutbox, KeepsItsEventsWhenTheFilesBesideItAreDeleted) {
    Open();
    for (const std::string suffix : {"-wal", "-shm"}) {
        ASSERT_TRUE(Append());
        ASSERT_TRUE(std::filesystem::remove(File() + suffix));
        ASSERT_TRUE(Append());
        EXPECT_TRUE(std::filesystem::exists(File() + suffix)) << "a new one";
    }
    EXPECT_EQ(m_outbox->Status().waiting, 4);
    EXPECT_TRUE(Told::Failures().All().empty()) << "nothing is lost";
}

TEST_F(TheOutbox, TellsTheLossWhenAnotherProgramHasBegunALogOfItsOwn) {
    Open();
    ASSERT_TRUE(Append());
    for (const std::string suffix : {"-wal", "-shm"})
        ASSERT_TRUE(std::filesystem::remove(File() + suffix));
    // An empty file is enough: the outbox cannot know which program made it.
    std::ofstream(File() + "-wal").close();
    ::chmod((File() + "-wal").c_str(), 0600);
    EXPECT_TRUE(Append());
    EXPECT_EQ(Told::Failures().Count("outbox vanished: " + File() +
                                     "-wal was deleted, with the events that were only in it"),
              1);
}

TEST_F(TheOutbox, BeginsAnewWhenTheWholeDirectoryIsDeleted) {
    Open();
    Append();
    std::filesystem::remove_all(m_path);
    EXPECT_TRUE(Append());
    EXPECT_EQ(Open().Status().waiting, 1);
}

TEST_F(TheOutbox, GoesOnWithTheFileThatWasPutInItsPlace) {
    Open();
    Append();
    const auto first = m_outbox->Status().outboxId;
    std::filesystem::rename(File(), File() + ".backup");
    std::ofstream(File()).close();
    for (const std::string suffix : {"-wal", "-shm"})
        std::filesystem::remove(File() + suffix);
    EXPECT_TRUE(Append());
    EXPECT_NE(m_outbox->Status().outboxId, first);
}

TEST_F(TheOutbox, StoresAgainOnceADirectoryThatWasInTheWayIsGone) {
    std::filesystem::create_directories(File());
    EXPECT_FALSE(Open().Open());
    for (int i = 0; i < 10'000; ++i)
        EXPECT_FALSE(Append());
    EXPECT_EQ(Told::Failures().Count("outbox file: "), 1) << "told once, not ten thousand times";
    std::filesystem::remove(File());
    EXPECT_TRUE(Append());
}

TEST_F(TheOutbox, DoesNotLookAtAFailingFileMoreOftenThanItsInterval) {
    m_settings.file.reopenInterval = 1h;
    std::filesystem::create_directories(File());
    Open();
    std::filesystem::remove(File());
    EXPECT_FALSE(Append());
}

TEST_F(TheOutbox, WaitsForALockOnceAndNotForEveryEvent) {
    Open();
    Append();
    SQLite::Database other(File(), SQLite::OPEN_READWRITE);
    other.exec("BEGIN IMMEDIATE");
    const auto start = std::chrono::steady_clock::now();
    for (int i = 0; i < 10; ++i)
        EXPECT_FALSE(Append());
    const auto took = std::chrono::steady_clock::now() - start;
    EXPECT_GE(took, 100ms);
    EXPECT_LT(took, 900ms) << "ten times the patience";
    other.exec("COMMIT");
    EXPECT_TRUE(Append());
    EXPECT_EQ(Told::Failures().Count("outbox file: "), 2) << "its beginning and its end";
}

TEST_F(TheOutbox, OpensAnExistingFileWhileAnotherProcessHoldsTheLock) {
    Open();
    Append();
    SQLite::Database other(File(), SQLite::OPEN_READWRITE);
    other.exec("BEGIN IMMEDIATE");
    EXPECT_TRUE(Open().Open());
    other.exec("COMMIT");
}

TEST_F(TheOutbox, WaitsForALockOnceAndNotForEveryOpening) {
    std::filesystem::create_directories(m_path);
    SQLite::Database other(File(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
    other.exec("PRAGMA journal_mode = WAL"); // without tables, so that opening has to write
    other.exec("BEGIN IMMEDIATE");
    m_settings.file.lockPatience = 1s;
    m_outbox = std::make_unique<outbox::Outbox>(m_path, m_settings, m_notifier);
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(m_outbox->Open());
    EXPECT_FALSE(m_outbox->Open());
    const auto took = std::chrono::steady_clock::now() - start;
    EXPECT_GE(took, 900ms);
    EXPECT_LT(took, 1900ms) << "twice the patience";
    other.exec("COMMIT");
    EXPECT_TRUE(m_outbox->Open());
}

TEST_F(TheOutbox, StoresAnEventOnceTheLockIsReleasedWithinThePatience) {
    m_settings.file.lockPatience = 20s;
    Open();
    SQLite::Database other(File(), SQLite::OPEN_READWRITE);
    other.exec("BEGIN IMMEDIATE");
    std::thread releaser([&] {
        // Releases the lock a little later, when the event below is probably waiting: a wait cannot be seen
        // from outside.
        const auto soon = std::chrono::steady_clock::now() + 50ms;
        WaitUntil([&] { return std::chrono::steady_clock::now() > soon; });
        other.exec("COMMIT");
    });
    EXPECT_TRUE(Append());
    releaser.join();
}

TEST_F(TheOutbox, SurvivesAFullDiskWithoutCallingItDamageAndGoesOnWhenThereIsSpace) {
    std::filesystem::create_directories(m_path);
    const auto result = RunOnSmallDisk(m_path, 400'000, [this] {
        Open();
        int stored = 0;
        while (Append(std::string(2000, 'x')) && stored < 1000)
            ++stored;
        EXPECT_GT(stored, 10);
        EXPECT_LT(stored, 1000) << "the disk never became full";
        for (int i = 0; i < 1000; ++i)
            EXPECT_FALSE(Append(std::string(2000, 'x')));
        EXPECT_EQ(Told::Failures().Count("outbox file: "), 1);
        EXPECT_TRUE(SetAsideFiles().empty());
        EXPECT_EQ(m_outbox->Status().waiting, stored) << "what was accepted is still there";

        ASSERT_EQ(::mount("tmpfs", m_path.c_str(), "tmpfs", MS_REMOUNT, "size=4000000"), 0);
        EXPECT_TRUE(Append(std::string(2000, 'x')));
        EXPECT_EQ(m_outbox->Status().waiting, stored + 1);
        EXPECT_EQ(Told::Failures().Count("outbox file: Events are stored again; 1001 were refused meanwhile"),
                  1);
        EXPECT_TRUE(Append());
        EXPECT_EQ(Told::Failures().Count("outbox file: "), 2) << "its beginning and its end, once each";
        m_outbox.reset();
    });
    if (result == SmallDiskResult::Unavailable)
        GTEST_SKIP() << "no right to mount a file system here";
    EXPECT_EQ(result, SmallDiskResult::Passed);
}

TEST_F(TheOutbox, OpensLaterOnADiskThatIsFullAtFirst) {
    std::filesystem::create_directories(m_path);
    const auto result = RunOnSmallDisk(m_path, 64'000, [this] {
        std::ofstream(m_path + "/filler") << std::string(100'000, 'x');
        EXPECT_FALSE(Open().Open());
        EXPECT_FALSE(Append());
        EXPECT_TRUE(SetAsideFiles().empty());
        std::filesystem::remove(m_path + "/filler");
        ASSERT_EQ(::mount("tmpfs", m_path.c_str(), "tmpfs", MS_REMOUNT, "size=4000000"), 0);
        EXPECT_TRUE(Append());
        m_outbox.reset();
    });
    if (result == SmallDiskResult::Unavailable)
        GTEST_SKIP() << "no right to mount a file system here";
    EXPECT_EQ(result, SmallDiskResult::Passed);
}

TEST_F(TheOutbox, TakesEventsFromSeveralThreads) {
    Open();
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i)
        threads.emplace_back([this] {
            for (int j = 0; j < 100; ++j)
                EXPECT_TRUE(Append());
        });
    for (auto& thread : threads)
        thread.join();
    EXPECT_EQ(m_outbox->Status().waiting, 400);
}

} // namespace
