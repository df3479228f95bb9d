#include <filesystem>
#include <fstream>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Modules/MetrikSdk/Sdk.h"
#include "Modules/Sqlite/SafeDirectory.h"
#include "tests/Modules/MetrikSdk/support/Told.h"
#include "tests/support/OtherUser.h"
#include "tests/support/TemporaryDirectory.h"

// Database directories come in datagrams, from any user of the machine.

using namespace MetrikSdk;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace fs = std::filesystem;

namespace {

std::string BigEndian(std::uint32_t number) {
    std::string bytes;
    for (int shift = 24; shift >= 0; shift -= 8)
        bytes += static_cast<char>(number >> shift);
    return bytes;
}

/// A rollback journal that names another file, which SQLite deletes after it has played the journal back.
std::string JournalThatDeletes(const std::string& file) {
    static const std::string MAGIC("\xd9\xd5\x05\xf9\x20\xa1\x63\xd7", 8);
    constexpr std::uint32_t PAGE = 1024;
    std::string journal =
        MAGIC + BigEndian(0) + BigEndian(1) + BigEndian(0) + BigEndian(512) + BigEndian(PAGE);
    journal.resize(512);
    std::uint32_t sum = 0;
    for (const char c : file)
        sum += static_cast<std::uint32_t>(static_cast<signed char>(c));
    return journal + BigEndian(0x40000000 / PAGE + 1) + file +
           BigEndian(static_cast<std::uint32_t>(file.size())) + BigEndian(sum) + MAGIC;
}

class HostileDirectory : public ::testing::Test {
protected:
    HostileDirectory() { Told::Forget(); }

    bool Announce(Sdk& sdk, const std::string& directory) {
        return sdk.InitSdk("A1", "1", "m", "", directory, &Told::OnFailure, &Told::OnSuccess);
    }

    /// Expects that a module with this directory shares the first outbox: its event goes there, and one line
    /// with the reason is logged.
    void ExpectToShareTheFirst(const std::string& directory, const std::string& reason) {
        Told::Forget();
        process::OutboxRegistry registry = Registry();
        Sdk first(registry);
        ASSERT_TRUE(Announce(first, First()));
        Sdk module(registry);
        EXPECT_TRUE(Announce(module, directory));
        EXPECT_TRUE(module.ReportEvent("A1|1", "{}"));
        EXPECT_EQ(first.GetPendingCount(), ++m_events);
        EXPECT_THAT(Told::Failures().All(),
                    ElementsAre("directory: The directory " + directory + " is not used: " + reason +
                                "; the module uses the first outbox"));
    }

    process::OutboxRegistry Registry() {
        return {OutboxSettings{}, [](const char*) -> const char* { return nullptr; },
                [this] { return m_home.Path(); }};
    }

    /// A directory of the test, such that no other user can change any part of its path. Empty when this user
    /// must not make one.
    std::string MakePlace() {
        m_place = "/run/ssr-hostile-" + std::to_string(::getpid());
        return ::mkdir(m_place.c_str(), 0755) == 0 ? m_place : "";
    }

    ~HostileDirectory() override {
        if (!m_place.empty())
            fs::remove_all(m_place);
    }

    std::string First() const { return m_home.Path() + "/first"; }

    TemporaryDirectory m_home;
    TemporaryDirectory m_elsewhere;
    std::string m_place;
    int m_events = 0;
};

} // namespace

TEST_F(HostileDirectory, SharesTheFirstOutboxAndIsToldOnce) {
    std::string deep = m_home.Path();
    for (int i = 0; i < 1900; ++i)
        deep += "/d";
    const std::string wide = "/tmp may be written by other users";
    ExpectToShareTheFirst(m_elsewhere.Path(), wide);
    ExpectToShareTheFirst(m_home.Path() + "/../x", wide);
    ExpectToShareTheFirst("relative", "not an absolute path");
    ExpectToShareTheFirst("../../x", "not an absolute path");
    ExpectToShareTheFirst("/none/x",
                          "/none does not exist, and is only made below the user's data directory");
    EXPECT_TRUE(fs::is_empty(m_elsewhere.Path()));
    Told::Forget();
    process::OutboxRegistry registry = Registry();
    Sdk first(registry);
    Sdk module(registry);
    EXPECT_TRUE(Announce(first, First()) && Announce(module, deep));
    EXPECT_THAT(Told::Failures().All(), ElementsAre(HasSubstr("the path has too many levels")));
    EXPECT_FALSE(fs::exists(m_home.Path() + "/d"));
}

TEST_F(HostileDirectory, IsNoDirectoryWhenItComesFirst) {
    process::OutboxRegistry registry = Registry();
    Sdk module(registry);
    EXPECT_FALSE(Announce(module, m_elsewhere.Path()));
    EXPECT_FALSE(module.ReportEvent("A1|1", "{}"));
    EXPECT_THAT(Told::Failures().All(), ElementsAre(HasSubstr("events of this module are refused")));
}

TEST_F(HostileDirectory, OfAnotherUserIsNotEvenLookedInto) {
    if (!OtherUser::CanBeMade() || MakePlace().empty())
        GTEST_SKIP() << "only root can play another user";
    const auto victim = m_home.Path() + "/authorized_keys";
    const auto theirs = m_place + "/theirs";
    std::ofstream(victim) << "key";
    fs::create_directory(theirs);
    OtherUser::Give(theirs);
    ASSERT_TRUE(OtherUser::Does([&] {
        std::ofstream(theirs + "/MetrikOutbox.db") << std::string(1024, 'x');
        std::ofstream(theirs + "/MetrikOutbox.db-journal", std::ios::binary) << JournalThatDeletes(victim);
        fs::permissions(theirs, fs::perms{0777});
        return true;
    }));
    ExpectToShareTheFirst(theirs, theirs + " belongs to another user");
    EXPECT_TRUE(fs::exists(victim));
    EXPECT_TRUE(fs::exists(theirs + "/MetrikOutbox.db-journal"));
}

TEST_F(HostileDirectory, WithFilesThatAnotherUserLeftIsNotOpened) {
    if (!OtherUser::CanBeMade())
        GTEST_SKIP() << "only root can play another user";
    const auto victim = m_home.Path() + "/authorized_keys";
    std::ofstream(victim) << "key";
    fs::create_directory(First());
    for (const std::string suffix : {"-journal", "-shm", "-wal", ""}) {
        const auto planted = First() + "/MetrikOutbox.db" + suffix;
        std::ofstream(First() + "/MetrikOutbox.db") << std::string(suffix == "-journal" ? 1024 : 0, 'x');
        fs::permissions(First() + "/MetrikOutbox.db", fs::perms{0600});
        std::ofstream(planted, std::ios::binary) << JournalThatDeletes(victim);
        OtherUser::Give(planted);
        Told::Forget();
        process::OutboxRegistry registry = Registry();
        Sdk module(registry);
        EXPECT_FALSE(Announce(module, First()));
        EXPECT_FALSE(module.ReportEvent("A1|1", "{}"));
        EXPECT_THAT(Told::Failures().All(), ElementsAre("outbox file: Cannot use the outbox: " + planted +
                                                        " belongs to another user"));
        EXPECT_TRUE(fs::exists(victim)) << suffix;
        fs::remove(planted);
        Told::Forget();
        EXPECT_TRUE(Announce(module, First())) << "once the file is gone";
    }
}

TEST_F(HostileDirectory, SwappedAfterItsAnnouncementIsLeftForTheFirstOutbox) {
    if (!OtherUser::CanBeMade() || MakePlace().empty())
        GTEST_SKIP() << "only root can play another user";
    process::OutboxRegistry registry = Registry();
    Sdk first(registry);
    Sdk module(registry);
    fs::create_directories(m_place + "/module");
    fs::create_directories(m_place + "/theirs");
    ASSERT_TRUE(Announce(first, First()) && Announce(module, m_place + "/module"));
    EXPECT_TRUE(module.ReportEvent("A1|1", "{}"));
    EXPECT_EQ(first.GetPendingCount(), 0);

    fs::rename(m_place + "/module", m_place + "/old");
    fs::create_directory_symlink(m_place + "/theirs", m_place + "/module");
    OtherUser::Give(m_place + "/module");
    EXPECT_TRUE(module.ReportEvent("A1|2", "{}"));
    EXPECT_TRUE(module.ReportEvent("A1|3", "{}"));
    EXPECT_EQ(first.GetPendingCount(), 2);
    EXPECT_TRUE(fs::is_empty(m_place + "/theirs"));
    EXPECT_THAT(Told::Failures().All(),
                ElementsAre(HasSubstr("outbox vanished: "), "directory: The directory " + m_place +
                                                                "/module is not used: the link " + m_place +
                                                                "/module belongs to another user"));
}
