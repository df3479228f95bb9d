#include <filesystem>
#include <fstream>

#include <unistd.h>

#include "SystemTool/Platform.h"
#include "tests/Modules/MetrikSdk/support/PluginFixture.h"
#include "tests/support/Fastest.h"

using namespace std::chrono_literals;

namespace {

class TheMetrikSdk : public PluginFixture {
protected:
    static std::ptrdiff_t CountEntries(const std::string& directory) {
        return std::distance(std::filesystem::directory_iterator(directory), {});
    }
    /// Runs `test` in a new process that knows no directory yet, because the plug-in keeps its first
    /// directory for ever. It must be called first in a test, because the new process runs that whole test.
    template <typename Test>
    static void InAFreshProcess(Test test) {
        constexpr const char* MARK = "SSR_TEST_IS_FRESH";
        if (std::getenv(MARK) != nullptr)
            return test();
        const auto* info = testing::UnitTest::GetInstance()->current_test_info();
        const auto name = std::string(info->test_suite_name()) + "." + info->name();
        const auto program = SystemTool::Platform::ExecutablePath();
        EXPECT_EQ(std::system((MARK + ("=1 '" + program) + "' --gtest_filter=" + name).c_str()), 0);
    }

    static std::ptrdiff_t Threads() { return CountEntries("/proc/self/task"); }
};

TEST_F(TheMetrikSdk, TellsItsVersion) {
    EXPECT_FALSE(Load()->GetModule()->GetSdkVersion().empty());
}

TEST_F(TheMetrikSdk, AcceptsNothingBeforeItIsInitialised) {
    const auto loader = Load();
    EXPECT_FALSE(loader->GetModule()->ReportEvent("A759|1", "{}"));
    EXPECT_EQ(loader->GetModule()->GetPendingCount(), -1);
}

TEST_F(TheMetrikSdk, KeepsEventsWithoutThreadAndNetworkWhenNoEndpointIsSet) {
    const auto before = Threads();
    Start();
    Report(10);
    EXPECT_EQ(m_loader->GetModule()->GetPendingCount(), 10);
    EXPECT_EQ(Threads(), before);
    EXPECT_EQ(Told::Successes().All(), std::vector<std::string>{"init: A759"});
}

TEST_F(TheMetrikSdk, KeepsEventsWithoutThreadAndNetworkWhenItIsSwitchedOff) {
    LoopbackServer server([](const Request&) { return Reply(); });
    Configure("ENDPOINT", server.Url());
    SetVariable("OTEL_SDK_DISABLED", "true");
    const auto before = Threads();
    Start();
    Report(600);
    EXPECT_EQ(Threads(), before);
    Stop();
    EXPECT_EQ(server.RequestCount(), 0U);
    EXPECT_EQ(Totals().waiting, 600);
}

TEST_F(TheMetrikSdk, RefusesEventsAndTellsWhenNoDirectoryWasEverGiven) {
    InAFreshProcess([] {
        const auto loader = Load();
        for (const auto* directory : {"", "relative"}) {
            EXPECT_FALSE(
                loader->GetModule()->InitSdk("B1", "1", "b", "", directory, &Told::OnFailure, nullptr));
            EXPECT_FALSE(loader->GetModule()->ReportEvent("B1|1", "{}"));
        }
        EXPECT_EQ(Told::Failures().Count("directory: "), 1);
    });
}

TEST_F(TheMetrikSdk, PutsAModuleWithoutADirectoryIntoTheOutboxOfTheFirst) {
    InAFreshProcess([this] {
        Start();
        const auto other = Load();
        EXPECT_TRUE(other->GetModule()->InitSdk("B1", "1", "b", "", "", nullptr, nullptr));
        EXPECT_TRUE(other->GetModule()->ReportEvent("B1|1", "{}"));
        EXPECT_EQ(m_loader->GetModule()->GetPendingCount(), 1);
    });
}

TEST_F(TheMetrikSdk, BeginsAnewWhenItIsInitialisedAgain) {
    Start();
    Report(1);
    const auto other = m_directory.Path() + "/other";
    auto* sdk = m_loader->GetModule();
    EXPECT_TRUE(sdk->InitSdk("B1", "1", "b", "", other, nullptr, nullptr));
    EXPECT_TRUE(sdk->ReportEvent("B1|1", "{}"));
    EXPECT_EQ(sdk->GetPendingCount(), 1);
    EXPECT_EQ(Totals().waiting, 1);
    EXPECT_TRUE(std::filesystem::exists(other + "/MetrikOutbox.db"));
}

TEST_F(TheMetrikSdk, TakesTenThousandHostileModulesInOneFileWithOneThread) {
    LoopbackServer server([](const Request&) { return Reply(); });
    Configure("ENDPOINT", server.Url());
    Start();
    const auto threads = Threads();
    std::vector<std::unique_ptr<Loader>> modules;
    for (int i = 0; i < 10'000; ++i) {
        auto& module = modules.emplace_back(Load());
        const auto id = "../../x'; DROP TABLE event;--\n%s/" + std::to_string(i);
        ASSERT_TRUE(module->GetModule()->InitSdk(id, std::string(1000, 'v'), id, "/etc", m_directory.Path(),
                                                 &Told::OnFailure, &Told::OnSuccess));
    }
    EXPECT_EQ(Threads(), threads);
    for (int i = 0; i < 10'000; i += 50)
        EXPECT_TRUE(
            modules[static_cast<std::size_t>(i)]->GetModule()->ReportEvent("X|1", NumberedPayload(i)));
    EXPECT_TRUE(WaitUntilNothingWaits());
    EXPECT_EQ(Totals().delivered, 200);
    EXPECT_LE(CountEntries(m_directory.Path()), 3) << "the database and its two side files";
    EXPECT_TRUE(Told::Failures().All().empty());
}

TEST_F(TheMetrikSdk, TellsAFullOutboxOfAllModulesOnceAndNotTenThousandTimes) {
    std::filesystem::create_directories(File());
    std::vector<std::unique_ptr<Loader>> modules;
    for (int i = 0; i < 1000; ++i) {
        auto& module = modules.emplace_back(Load());
        EXPECT_FALSE(module->GetModule()->InitSdk(std::to_string(i), "", "", "", m_directory.Path(),
                                                  &Told::OnFailure, nullptr));
        EXPECT_FALSE(module->GetModule()->ReportEvent("X|1", "{}"));
    }
    EXPECT_EQ(Told::Failures().All().size(), 1U);
}

TEST_F(TheMetrikSdk, BoundsTheOutboxesThatHostileDirectoriesCanMake) {
    InAFreshProcess([this] {
        Start();
        std::vector<std::unique_ptr<Loader>> modules;
        for (int i = 0; i < 100; ++i) {
            auto& module = modules.emplace_back(Load());
            module->GetModule()->InitSdk("x", "", "", "", m_directory.Path() + "/" + std::to_string(i),
                                         nullptr, nullptr);
            EXPECT_TRUE(module->GetModule()->ReportEvent("X|1", "{}"));
        }
        EXPECT_LE(CountEntries(m_directory.Path()), 3 + 8);
        EXPECT_GT(m_loader->GetModule()->GetPendingCount(), 90) << "the others went where the first goes";
    });
}

TEST_F(TheMetrikSdk, CountsAModulesEventsOnAcrossRestarts) {
    Start();
    Report(5);
    Stop();
    Start();
    Report(5);
    Stop();
    const auto batch = MetrikSdk::outbox::OutboxStore(File(), 5s).Oldest(100, 1'000'000);
    for (std::size_t i = 0; i < batch.events.size(); ++i)
        EXPECT_EQ(batch.events[i].sequence, static_cast<std::int64_t>(i) + 1);
    EXPECT_EQ(batch.events.size(), 10U);
}

TEST_F(TheMetrikSdk, CountsTheEventsOfModulesTogetherWhoseIdsACollectorCannotTellApart) {
    Start();
    for (const std::string id : {"m\xff\xd3", "m\xff\xc3"}) {
        const auto module = Load();
        ASSERT_TRUE(module->GetModule()->InitSdk(id, "", "", "", m_directory.Path(), nullptr, nullptr));
        EXPECT_TRUE(module->GetModule()->ReportEvent("X|1", "{}"));
    }
    Stop();
    const auto batch = MetrikSdk::outbox::OutboxStore(File(), 5s).Oldest(100, 1'000'000);
    ASSERT_EQ(batch.events.size(), 2U);
    EXPECT_EQ(batch.releases.begin()->second.id, "m\uFFFD\uFFFD");
    EXPECT_EQ(batch.events[0].sequence, 1);
    EXPECT_EQ(batch.events[1].sequence, 2);
}

TEST_F(TheMetrikSdk, IsReleasedWithinASecondWhileTheCollectorKeepsItWaiting) {
    LoopbackServer server([](const Request&) {
        Reply never;
        never.manner = Reply::Manner::Never;
        return never;
    });
    Configure("ENDPOINT", server.Url());
    std::size_t tries = 0;
    std::ptrdiff_t threads = 0;
    const auto start = [&] {
        Start();
        Report(600);
        ASSERT_TRUE(WaitUntil([&] { return server.RequestCount() == tries + 1; }));
        ++tries;
        threads = Threads();
    };
    EXPECT_TRUE(CanEndWithin(1s, start, [&] { Stop(); }));
    EXPECT_LT(Threads(), threads);
    EXPECT_EQ(Totals().waiting, 600 * static_cast<int>(tries));
    EXPECT_TRUE(Told::Failures().All().empty());
}

TEST_F(TheMetrikSdk, IsReleasedAtOnceWhileItWaitsForTheNextAttempt) {
    LoopbackServer server([](const Request&) {
        Reply later;
        later.status = 503;
        later.headers = "Retry-After: 3600\r\n";
        return later;
    });
    Configure("ENDPOINT", server.Url());
    const auto start = [&] {
        Told::Forget();
        Start();
        Report(512);
        ASSERT_TRUE(WaitUntil([] { return Told::Failures().Count("upload: ") == 1; }));
    };
    EXPECT_TRUE(CanEndWithin(1s, start, [&] { Stop(); }));
}

TEST_F(TheMetrikSdk, SendsNothingBeforeARandomTimeAfterTheStartHasPassed) {
    LoopbackServer server([](const Request&) { return Reply(); });
    Configure("ENDPOINT", server.Url());
    SetVariable("METRIK_START_SPREAD", "3600000");
    const auto start = [&] {
        Start();
        Report(600); // a full batch, which would be sent at once otherwise
        EXPECT_FALSE(WaitUntil([&] { return server.RequestCount() > 0; }, 300ms));
    };
    EXPECT_TRUE(CanEndWithin(1s, start, [&] { Stop(); })) << "and is released at once meanwhile";
}

TEST_F(TheMetrikSdk, StoresEventsWhileItUploadsOthers) {
    LoopbackServer server([](const Request&) { return Reply(); });
    Configure("ENDPOINT", server.Url());
    Start();
    Report(5000);
    EXPECT_TRUE(WaitUntilNothingWaits());
    std::set<std::string> uuids;
    for (const auto& request : server.Requests())
        for (const auto& event : EventsOf(request.body))
            uuids.insert(event.uuid);
    EXPECT_EQ(uuids.size(), 5000U);
    EXPECT_EQ(Totals().delivered, 5000);
}

TEST_F(TheMetrikSdk, TellsEverythingThatIsWrongWithTheConfiguration) {
    Configure("ENDPOINT", "http://127.0.0.1:1");
    Configure("TIMEOUT", "soon");
    Configure("COMPRESSION", "zstd");
    Start();
    const auto told = Told::Failures().All();
    const auto complaint = std::find_if(told.begin(), told.end(),
                                        [](const auto& text) { return text.starts_with("configuration: "); });
    ASSERT_NE(complaint, told.end());
    EXPECT_NE(complaint->find("OTEL_EXPORTER_OTLP_TIMEOUT"), std::string::npos) << *complaint;
    EXPECT_NE(complaint->find("OTEL_EXPORTER_OTLP_COMPRESSION"), std::string::npos) << *complaint;
}

TEST_F(TheMetrikSdk, TellsAConfigurationThatMakesNoSenseAndKeepsTheEvents) {
    Configure("ENDPOINT", "gopher://x");
    Start();
    Report(1);
    EXPECT_EQ(Told::Failures().Count("configuration: OTEL_EXPORTER_OTLP_ENDPOINT"), 1);
    EXPECT_EQ(Totals().waiting, 1);
}

} // namespace
