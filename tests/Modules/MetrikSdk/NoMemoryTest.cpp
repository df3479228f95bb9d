#include <cstdlib>
#include <filesystem>
#include <memory>
#include <string>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gtest/gtest.h>

#include "Modules/MetrikSdk/Sdk.h"
#include "tests/Modules/MetrikSdk/support/Told.h"
#include "tests/support/FailingMemory.h"
#include "tests/support/TemporaryDirectory.h"

// The analytics SDK while memory fails. In each test, one allocation fails, or one and all that follow it;
// then the same for the next allocation.

using namespace MetrikSdk;

namespace {

OutboxSettings ToldEachTime() {
    OutboxSettings settings;
    settings.tellInterval = std::chrono::milliseconds(0);
    return settings;
}

/// So little room that each new event pushes older ones out.
OutboxSettings RoomForThreeEvents() {
    OutboxSettings settings = ToldEachTime();
    settings.caps.maxWaitingBytes = 800;
    return settings;
}

/// How many allocations to go on by. To open an outbox takes some thousand allocations, so only every
/// thirteenth one is made to fail. With SSR_EVERY_ALLOCATION set, every one is.
int Step() {
    return std::getenv("SSR_EVERY_ALLOCATION") != nullptr ? 1 : 13;
}

class SdkWithoutMemory : public ::testing::TestWithParam<int> {
protected:
    SdkWithoutMemory() { Told::Forget(); }

    std::unique_ptr<process::OutboxRegistry> Registry(const OutboxSettings& settings = ToldEachTime()) {
        return std::make_unique<process::OutboxRegistry>(
            settings, [](const char*) -> const char* { return nullptr; },
            [this] { return m_directory.Path(); });
    }

    bool Init(Sdk& sdk, const std::string& module) {
        return sdk.InitSdk(module, "1.2.3", "a name of more than sixteen bytes", "", m_directory.Path(),
                           &Told::OnFailure, &Told::OnSuccess);
    }

    /// Runs `operation` while memory fails, and keeps its result in m_result. True when an allocation failed.
    template <typename Operation>
    bool WithoutMemory(int first, Operation operation) {
        Told::Forget();
        const FailingMemory memory(first, GetParam());
        m_result = operation();
        return FailingMemory::Failed() > 0;
    }

    /// The texts are copied by the caller, who has memory for them.
    bool ReportWithoutMemory(int first, Sdk& sdk, std::string event) {
        std::string payload = R"({"a":"a text of more than sixteen bytes"})";
        return WithoutMemory(first, [&] { return sdk.ReportEvent(std::move(event), std::move(payload)); });
    }

    /// Expects that the event is stored exactly when the operation succeeded. When only one allocation
    /// failed, a failure must also be reported; when all failed, there is no memory for such a text.
    void ExpectTheTruth(int first, const std::string& event) {
        EXPECT_EQ(Stored("event_id = '" + event + "'"), m_result ? 1 : 0) << "allocation " << first;
        if (GetParam() == 1) {
            EXPECT_TRUE(m_result || !Told::Failures().All().empty()) << "allocation " << first;
        }
    }

    int Stored(const std::string& condition) const {
        SQLite::Database database(m_directory.Path() + "/MetrikOutbox.db", SQLite::OPEN_READWRITE, 5000);
        return database
            .execAndGet("SELECT count(*) FROM event AS e JOIN module_release AS r ON r.id = e.release "
                        "JOIN module AS m ON m.id = e.module WHERE " +
                        condition)
            .getInt();
    }

    TemporaryDirectory m_directory;
    bool m_result = false;
};

} // namespace

TEST_P(SdkWithoutMemory, TellsTheTruthOfAnEventAndStoresTheNext) {
    const auto registry = Registry();
    Sdk sdk(*registry);
    ASSERT_TRUE(Init(sdk, "A_module_of_long_name"));
    int first = 1;
    for (bool failed = true; failed; ++first) {
        const std::string event = "A_module_of_long_name|" + std::to_string(first);
        failed = ReportWithoutMemory(first, sdk, event);
        ExpectTheTruth(first, event);
        ASSERT_TRUE(sdk.ReportEvent("next", "{}")) << "after allocation " << first;
        ASSERT_EQ(Stored("event_id = 'next'"), first);
    }
    EXPECT_GT(first, FailingMemory::FAILS_IN_C ? 5 : 2) << "allocations were made to fail";
}

TEST_P(SdkWithoutMemory, TellsTheTruthOfAModulesFirstEventAndStoresTheNext) {
    const auto registry = Registry();
    Sdk other(*registry); // it keeps the outbox open
    ASSERT_TRUE(Init(other, "A"));
    int first = 1;
    for (bool failed = true; failed; ++first) {
        const std::string module = "A_module_of_long_name_" + std::to_string(first);
        Sdk sdk(*registry);
        ASSERT_TRUE(Init(sdk, module));
        failed = ReportWithoutMemory(first, sdk, module + "|1");
        ExpectTheTruth(first, module + "|1");
        ASSERT_TRUE(sdk.ReportEvent("next", "{}")) << "after allocation " << first;
        ASSERT_EQ(Stored("event_id = 'next' AND module_id = '" + module + "'"), 1);
        ASSERT_EQ(Stored("event_id = 'next'"), first);
    }
    EXPECT_GT(first, FailingMemory::FAILS_IN_C ? 5 : 2) << "allocations were made to fail";
}

TEST_P(SdkWithoutMemory, TellsTheTruthOfAnEventThatMakesOthersGo) {
    const auto registry = Registry(RoomForThreeEvents());
    Sdk sdk(*registry);
    ASSERT_TRUE(Init(sdk, "A"));
    for (int i = 0; i < 10; ++i)
        ASSERT_TRUE(sdk.ReportEvent("A|filler", R"({"a":"a text of more than sixteen bytes"})"));
    int first = 1;
    for (bool failed = true; failed; ++first) {
        const std::string event = "A|" + std::to_string(first);
        failed = ReportWithoutMemory(first, sdk, event);
        ExpectTheTruth(first, event);
        ASSERT_TRUE(sdk.ReportEvent("next", "{}")) << "after allocation " << first;
        ASSERT_GE(Stored("event_id = 'next'"), 1);
    }
    EXPECT_GT(first, FailingMemory::FAILS_IN_C ? 5 : 2) << "allocations were made to fail";
}

TEST_P(SdkWithoutMemory, AModuleThatFoundNoneToBeginWithBeginsWithItsNextEvent) {
    int first = 1;
    for (bool failed = true; failed; first += Step()) {
        const auto registry = Registry();
        const std::string module = "A_module_of_long_name_" + std::to_string(first);
        std::string directory = m_directory.Path();
        std::string version = "1.2.3";
        std::string name = "a name of more than sixteen bytes";
        Sdk sdk(*registry);
        failed = WithoutMemory(first, [&, id = module]() mutable {
            return sdk.InitSdk(std::move(id), std::move(version), std::move(name), {}, std::move(directory),
                               &Told::OnFailure, &Told::OnSuccess);
        });
        if (GetParam() == 1) {
            EXPECT_TRUE(m_result || !Told::Failures().All().empty()) << "allocation " << first;
        }
        ASSERT_TRUE(sdk.ReportEvent("next", "{}")) << "after allocation " << first;
        ASSERT_EQ(Stored("event_id = 'next' AND version = '1.2.3' AND name LIKE 'a name%' AND module_id = '" +
                         module + "'"),
                  1)
            << "after allocation " << first;
    }
    EXPECT_GT(first, 20) << "allocations were made to fail";
}

TEST_P(SdkWithoutMemory, AnOutboxIsOpenedAnewWithTheNextEvent) {
    const auto registry = Registry();
    Sdk sdk(*registry);
    ASSERT_TRUE(Init(sdk, "A"));
    int first = 1;
    for (bool failed = true; failed; first += Step()) {
        for (const char* suffix : {"", "-wal", "-shm"})
            std::filesystem::remove(m_directory.Path() + "/MetrikOutbox.db" + suffix);
        failed = ReportWithoutMemory(first, sdk, "A|1");
        ASSERT_TRUE(sdk.ReportEvent("next", "{}")) << "after allocation " << first;
        ExpectTheTruth(first, "A|1");
        ASSERT_EQ(Stored("event_id = 'next'"), 1);
    }
    EXPECT_GT(first, 20) << "allocations were made to fail";
}

INSTANTIATE_TEST_SUITE_P(Failing, SdkWithoutMemory, ::testing::Values(1, FailingMemory::ALL),
                         [](const auto& test) {
                             return test.param == 1 ? "AtOneAllocation" : "FromOneAllocationOn";
                         });
