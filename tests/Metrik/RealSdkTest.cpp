#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <optional>
#include <set>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "Metrik/MetrikMgr.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/support/TemporaryDirectory.h"

// A function of the program's heap, jemalloc; null in a build with another heap.
extern "C" int mallctl(const char* name, void* old, std::size_t* oldSize, void* fresh, std::size_t freshSize)
    __attribute__((weak));

using namespace SyncServiceReport;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

// MetrikMgr and MetrikWorker with the real SDK plug-in and an outbox on a real file.

namespace {

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr int MANY_MODULES = 500;
#else
constexpr int MANY_MODULES = 10'000;
#endif

class RealSdk : public ::testing::Test {
protected:
    RealSdk() {
        ::setenv("XDG_DATA_HOME", m_data.Path().c_str(), 1);
        m_server.InitBaseInfo();
        EXPECT_TRUE(m_mgr.Init());
        FakeLogger().Clear();
    }

    bool Send(const std::string& eventID, const std::string& value = "") {
        ST_OptLog log;
        log.eventID = eventID;
        log.value = value;
        log.createTime = "1700000000123";
        return m_mgr.Send(log);
    }

    std::vector<std::string> Outbox(const std::string& sql) const {
        SQLite::Database database(m_data.Path() + "/hublink/database/MetrikOutbox.db", SQLite::OPEN_READWRITE,
                                  5000);
        SQLite::Statement query(database, sql);
        std::vector<std::string> rows;
        while (query.executeStep())
            rows.push_back(query.getColumn(0).getString());
        return rows;
    }

    std::set<std::string> Files() const {
        std::set<std::string> files;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(m_data.Path()))
            files.insert(entry.path().filename().string());
        return files;
    }

    TemporaryDirectory m_data;
    ReportServer m_server;
    MetrikMgr m_mgr{&m_server};
};

std::string InitMessage(const std::string& moduleID, const std::string& dbPath) {
    return R"({"msgType":"init","exdata":{"moduleID":")" + moduleID +
           R"(","moduleVersion":"1","moduleName":"m","dbPath":")" + dbPath + R"("}})";
}

std::ptrdiff_t ThreadCount() {
    return std::distance(std::filesystem::directory_iterator("/proc/self/task"), {});
}

} // namespace

TEST_F(RealSdk, KeepsAnEventOfTheDefaultModule) {
    EXPECT_TRUE(Send("A759|10001", R"({"a":1})"));
    EXPECT_THAT(Outbox("select event_id from event"), ElementsAre("A759|10001"));
    EXPECT_THAT(Outbox("select payload ->> '$.eventData.openid' from event"), ElementsAre("visitor"));
    EXPECT_THAT(FakeLogger().Records(), IsEmpty());
}

TEST_F(RealSdk, ManyModulesCostNeitherFilesNorThreads) {
    const auto files = Files();
    const auto threads = ThreadCount();
    for (int i = 0; i < MANY_MODULES; ++i)
        ASSERT_TRUE(m_mgr.Update(InitMessage("../A" + std::to_string(i) + "'; drop table event; --", "")));
    EXPECT_EQ(Files(), files);
    EXPECT_EQ(ThreadCount(), threads);
    EXPECT_TRUE(Send("../A7'; drop table event; --|1"));
    EXPECT_THAT(Outbox("select event_id from event"), ElementsAre("../A7'; drop table event; --|1"));
}

namespace {

/// Many modules. Each has its own id, version and name, longer than any real one.
class ModulesOfLongTexts : public RealSdk {
protected:
    static constexpr std::size_t ID_BYTES = 1000;

    /// How many bytes the program's heap has given out; nothing in a build with another heap.
    static std::optional<std::size_t> AllocatedBytes() {
        if (::mallctl == nullptr)
            return std::nullopt;
        std::uint64_t epoch = 1; // to write it refreshes the figures
        std::size_t bytes = 0;
        std::size_t size = sizeof bytes;
        ::mallctl("epoch", nullptr, nullptr, &epoch, sizeof epoch);
        ::mallctl("stats.allocated", &bytes, &size, nullptr, 0);
        return bytes;
    }

    void Announce(std::size_t modules) {
        for (std::size_t i = 0; i < modules; ++i) {
            const auto number = std::to_string(i);
            ST_InitMsg msg;
            msg.moduleID = msg.moduleVersion = msg.moduleName =
                number + std::string(ID_BYTES - number.size(), 'm');
            m_mgr.AddWorker(msg);
            FakeLogger().Clear();
        }
    }

    static std::size_t ModulesToAnnounce() {
        const char* modules = std::getenv("SSR_MODULES");
        return modules == nullptr ? 5'000 : std::stoul(modules);
    }
};

} // namespace

TEST_F(ModulesOfLongTexts, CostLittleMoreThanTheirIds) {
    constexpr std::size_t FOR_A_HUNDRED_THOUSAND = std::size_t{64} << 20;
    // Enough for the versions and names of the first thousand modules.
    constexpr std::size_t HOWEVER_MANY = std::size_t{1} << 20;
    const auto before = AllocatedBytes();
    if (!before)
        GTEST_SKIP() << "the figures are those of the program's own heap";
    const auto modules = ModulesToAnnounce();
    Announce(modules);
    const auto bytes = *AllocatedBytes() - *before - modules * ID_BYTES;
    std::cout << bytes / modules << " bytes a module\n";
    EXPECT_LT(bytes, modules < 100'000 ? FOR_A_HUNDRED_THOUSAND / 100'000 * modules + HOWEVER_MANY
                                       : FOR_A_HUNDRED_THOUSAND / 100'000 * modules);
}

TEST_F(RealSdk, AModuleWithARelativeDirectoryUsesTheFirstOne) {
    ASSERT_TRUE(m_mgr.Update(InitMessage("A100", "relative/path")));
    EXPECT_TRUE(Send("A100|1"));
    EXPECT_THAT(Outbox("select module_id from event join module on module.id = event.module"),
                ElementsAre("A100"));
    EXPECT_FALSE(std::filesystem::exists("relative"));
}
