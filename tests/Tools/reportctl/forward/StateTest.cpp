#include "Tools/reportctl/forward/State.h"

#include <gmock/gmock.h>

#include "Modules/MetrikSdk/outbox/OutboxSchema.h"
#include "tests/Tools/reportctl/support/ForwardFixture.h"
#include "tests/support/FileContent.h"
#include "tests/support/ModeOf.h"

using reportctl::forward::Place;
using reportctl::forward::State;
using ::testing::HasSubstr;

namespace {

using ForwardState = ForwardFixture;

std::string ErrorOf(const std::function<void()>& action) {
    try {
        action();
    } catch (const std::exception& error) {
        return error.what();
    }
    return "(none)";
}

TEST_F(ForwardState, IsItsUsersAloneUnderAnyUmask) {
    const auto before = ::umask(0);
    const State state(StateFile(), Outbox());
    ::umask(before);
    EXPECT_EQ(ModeOf(StateFile()), 0600U);
    EXPECT_EQ(ModeOf(m_directory.Path() + "/forward"), 0700U);
}

TEST_F(ForwardState, HasTheOutboxsIdentityWhereThereIsAnOutbox) {
    {
        SQLite::Database outbox(Outbox(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
        outbox.exec(MetrikSdk::outbox::TABLES);
        outbox.exec("insert into totals(id, outbox_id) values (1, '0190b6a2-6f1e-7c55-9a3e-5d1c1f0a7b42')");
        outbox.exec("pragma application_id = " + std::to_string(MetrikSdk::outbox::APPLICATION_ID));
        outbox.exec("pragma user_version = " + std::to_string(MetrikSdk::outbox::SCHEMA_VERSION));
    }
    EXPECT_EQ(State(StateFile(), Outbox()).Where().installation, "0190b6a2-6f1e-7c55-9a3e-5d1c1f0a7b42");
}

TEST_F(ForwardState, MakesAnIdentityOnceWhereThereIsNoOutbox) {
    const auto first = State(StateFile(), Outbox()).Where().installation;
    EXPECT_EQ(first.size(), 36U);
    EXPECT_EQ(State(StateFile(), Outbox()).Where().installation, first);
}

TEST_F(ForwardState, IsOneProcesssAtATime) {
    const State state(StateFile(), Outbox());
    EXPECT_EQ(ErrorOf([&] { State(StateFile(), Outbox()); }),
              "another `reportctl forward` is at work; this one did nothing");
}

TEST_F(ForwardState, LeavesAFileAloneThatIsNotItsOwn) {
    std::filesystem::create_directories(m_directory.Path() + "/forward");
    SQLite::Database(StateFile(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE)
        .exec("create table other (a)");
    std::filesystem::permissions(StateFile(), std::filesystem::perms(0600));
    EXPECT_THAT(ErrorOf([&] { State(StateFile(), Outbox()); }),
                HasSubstr("is none of this program's, or of another version's"));
    EXPECT_EQ(AskState("select count(*) from other"), "0");
}

TEST_F(ForwardState, LeavesADamagedFileAlone) {
    std::filesystem::create_directories(m_directory.Path() + "/forward");
    std::ofstream(StateFile()) << std::string(4096, 'x');
    std::filesystem::permissions(StateFile(), std::filesystem::perms(0600));
    EXPECT_THAT(ErrorOf([&] { State(StateFile(), Outbox()); }), HasSubstr("not a database"));
    EXPECT_EQ(ContentOf(StateFile()), std::string(4096, 'x'));
}

TEST_F(ForwardState, IsMadeWholeAfterAProcessThatEndedBetweenMakingAndFillingIt) {
    std::filesystem::create_directories(m_directory.Path() + "/forward");
    std::ofstream(StateFile()).flush();
    std::filesystem::permissions(StateFile(), std::filesystem::perms(0600));
    EXPECT_EQ(State::LookAt(StateFile()).position, Place::BEGINNING);
    EXPECT_EQ(State(StateFile(), Outbox()).Where().position, Place::BEGINNING);
}

TEST_F(ForwardState, KeepsTheLastAnchorsAndForgetsThoseOfAnotherStore) {
    State state(StateFile(), Outbox());
    std::int64_t from = Place::BEGINNING;
    for (int row = 1; row <= 40; ++row) {
        state.Commit(
            {.from = from, .position = row, .forwarded = 1, .sent = {{row, "u"}}, .held = {}, .refused = {}});
        from = row;
    }
    EXPECT_EQ(state.Where().anchors.size(), 32U);
    EXPECT_EQ(state.Where().anchors.front().row, 40);
    state.Commit(
        {.from = 30, .position = 31, .forwarded = 1, .sent = {{31, "v"}}, .held = {}, .refused = {}});
    EXPECT_EQ(state.Where().anchors.front().uid, "v");
    EXPECT_EQ(state.Where().anchors[1].row, 30);
    EXPECT_EQ(state.Where().position, 31);
    EXPECT_EQ(state.Sums().forwarded, 41);
}

} // namespace
