#include "Modules/MetrikSdk/process/OutboxRegistry.h"

#include <filesystem>
#include <set>

#include <gtest/gtest.h>

#include "tests/Modules/MetrikSdk/support/Told.h"
#include "tests/support/TemporaryDirectory.h"

using namespace MetrikSdk;

namespace {

class TheOutboxRegistry : public testing::Test {
protected:
    TemporaryDirectory m_directory;
    process::OutboxRegistry m_registry{OutboxSettings{}, [](const char*) -> const char* { return nullptr; },
                                       [this] { return m_directory.Path(); }};
};

TEST_F(TheOutboxRegistry, SharesOneOutboxForADirectoryHoweverItIsWritten) {
    const auto path = m_directory.Path();
    std::filesystem::create_directory_symlink(path, path + "/link");
    const auto one = m_registry.Acquire(path + "/db");
    for (const std::string same : {"/db/", "/./db", "/x/../db", "//db", "/link/db"})
        EXPECT_EQ(m_registry.Acquire(path + same), one) << same;
    EXPECT_NE(m_registry.Acquire(path + "/other"), one);
}

TEST_F(TheOutboxRegistry, HasNoneUntilADirectoryWasGiven) {
    EXPECT_EQ(m_registry.Acquire(""), nullptr);
    EXPECT_EQ(m_registry.Acquire("relative/path"), nullptr);
    EXPECT_TRUE(m_registry.ReportNoDirectory());
    EXPECT_FALSE(m_registry.ReportNoDirectory()) << "told once a minute";
}

TEST_F(TheOutboxRegistry, FallsBackToTheFirstDirectoryAlsoAfterItsRelease) {
    const auto path = m_directory.Path() + "/first";
    auto first = m_registry.Acquire(path);
    const auto second = m_registry.Acquire(m_directory.Path() + "/second");
    for (const auto& bad : {std::string(), std::string("relative"), std::string("../up"),
                            std::string("/a\0b", 4), std::string("/") + std::string(10'000, 'x')})
        EXPECT_EQ(m_registry.Acquire(bad), first) << bad;
    m_registry.Release(first);
    auto again = m_registry.Acquire("");
    EXPECT_EQ(again, m_registry.Acquire(path));
}

TEST_F(TheOutboxRegistry, TellsTheSameCauseOnceForAllOutboxes) {
    Told::Forget();
    std::vector<std::shared_ptr<process::OutboxEngine>> engines;
    for (const std::string name : {"/1", "/2", "/3"}) {
        std::filesystem::create_directories(m_directory.Path() + name + "/MetrikOutbox.db");
        auto& engine = engines.emplace_back(m_registry.Acquire(m_directory.Path() + name));
        engine->Listeners().Subscribe(&Told::OnFailure, nullptr);
        EXPECT_FALSE(engine->Open());
    }
    EXPECT_EQ(Told::Failures().All().size(), 1U);
    EXPECT_TRUE(m_registry.RecordFailure(report::Cause::Init, "why"));
    EXPECT_FALSE(m_registry.RecordFailure(report::Cause::Init, "why"));
}

TEST_F(TheOutboxRegistry, BoundsTheOutboxesOfAProcess) {
    const auto first = m_registry.Acquire(m_directory.Path() + "/0");
    std::vector<std::shared_ptr<process::OutboxEngine>> held;
    for (int i = 1; i < 1000; ++i)
        held.push_back(m_registry.Acquire(m_directory.Path() + "/" + std::to_string(i)));
    EXPECT_EQ(std::set<std::shared_ptr<process::OutboxEngine>>(held.begin(), held.end()).size(),
              process::OutboxRegistry::MAX_OUTBOXES);
    EXPECT_EQ(held.back(), first);
}

TEST_F(TheOutboxRegistry, ForgetsAnOutboxThatNobodyUses) {
    const auto first = m_registry.Acquire(m_directory.Path() + "/0");
    for (int i = 1; i < 100; ++i) {
        auto engine = m_registry.Acquire(m_directory.Path() + "/" + std::to_string(i));
        EXPECT_NE(engine, first);
        m_registry.Release(engine);
        EXPECT_EQ(engine, nullptr);
    }
}

} // namespace
