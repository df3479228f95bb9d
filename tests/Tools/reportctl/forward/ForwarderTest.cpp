#include "Tools/reportctl/forward/Forwarder.h"

#include <gmock/gmock.h>

#include "tests/Tools/reportctl/support/ForwardFixture.h"

using namespace std::chrono_literals;
using reportctl::forward::Step;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

using Forwarder = ForwardFixture;

TEST_F(Forwarder, SendsWhatIsNewOnceAndInOrder) {
    Insert(1, 3);
    Process process(*this);
    EXPECT_EQ(process.Drain().kind, Step::Kind::Idle);
    EXPECT_EQ(Taken(), "1 2 3");
    Insert(4, 5);
    process.Drain();
    EXPECT_EQ(Taken(), "1 2 3 4 5");
    EXPECT_EQ(process.Done().sent, 5);
    EXPECT_THAT(m_told, IsEmpty());
}

TEST_F(Forwarder, GoesOnWhereAnEarlierProcessWas) {
    Insert(1, 3);
    RunOnce();
    Insert(4, 4);
    RunOnce();
    EXPECT_EQ(Taken(), "1 2 3 4");
    EXPECT_EQ(AskState("select forwarded from place"), "4");
}

TEST_F(Forwarder, SendsBatchesBoundByCountAndByBytes) {
    Insert(1, 1000);
    m_settings.batch.maxBytes = 20'000;
    RunOnce();
    ASSERT_GT(m_sender.requests.size(), 2U);
    for (const auto& request : m_sender.requests)
        EXPECT_LE(request.size(), 20'000U / 120);
    EXPECT_EQ(AskState("select forwarded || ' ' || position from place"), "1000 1000");
}

TEST_F(Forwarder, WaitsWhileTheCollectorIsAwayAndTellsItOnce) {
    Insert(1, 2);
    AnswerAlways(503);
    Process process(*this);
    for (int pass = 0; pass < 5; ++pass)
        EXPECT_NE(process.Pass().kind, Step::Kind::Taken);
    EXPECT_EQ(AskState("select count(*) from refused"), "0");
    AnswerAlways(200);
    process.Drain();
    EXPECT_EQ(process.Done().sent, 2);
    EXPECT_THAT(m_told, ElementsAre("http://collector: HTTP status 503: {}; the rows wait",
                                    "http://collector: rows are taken again"));
}

TEST_F(Forwarder, TellsWhatToLookAtWhenTheCredentialsAreRefused) {
    Insert(1, 2);
    AnswerAlways(401);
    Process(*this).Pass();
    EXPECT_THAT(m_told, ElementsAre(HasSubstr("sets api-key")));
    EXPECT_EQ(AskState("select position is null from place"), "1");
}

TEST_F(Forwarder, RefusesTheOneRowThatTheCollectorRefusesAndSendsTheOthers) {
    Insert(1, 20);
    AnswerEvents({"B100|7"}, 400);
    Process process(*this);
    process.Drain();
    EXPECT_EQ(process.Done().sent, 19);
    EXPECT_EQ(process.Done().refused, 1);
    EXPECT_EQ(AskState("select first_row || ' ' || event || ' ' || status || ' ' || reason from refused"),
              "7 B100|7 400 HTTP status 400: {}");
    EXPECT_THAT(m_told, ElementsAre("row 7 was refused for good: HTTP status 400: {}"));
}

TEST_F(Forwarder, HoldsTheRowThatIsNotTakenWhileOthersAre) {
    Insert(1, 20);
    AnswerEvents({"B100|7"}, 503);
    RunOnce();
    EXPECT_EQ(AskState("select forwarded || ' ' || position from place"), "19 20");
    EXPECT_EQ(AskState("select row || ' ' || event from held"), "7 B100|7");
    EXPECT_EQ(AskState("select count(*) from refused"), "0");
}

TEST_F(Forwarder, SendsAHeldRowWhenTheCollectorIsMended) {
    Insert(1, 20);
    AnswerEvents({"B100|7"}, 503);
    RunOnce();
    AnswerAlways(200);
    Process process(*this);
    process.Drain();
    EXPECT_EQ(m_sender.requests.back().front().row, 7);
    EXPECT_EQ(process.Done().sent, 1);
    EXPECT_EQ(AskState("select count(*) from held"), "0");
}

TEST_F(Forwarder, RefusesAHeldRowAtLastAndSaysWhy) {
    m_settings.aside.tries = 10;
    AnswerEvents({"B100|7"}, 503);
    Insert(1, 20);
    for (int run = 1; run <= 10; ++run) {
        Insert(100 * run, 100 * run + 1);
        RunOnce();
    }
    EXPECT_EQ(AskState("select count(*) from held"), "0");
    EXPECT_EQ(AskState("select first_row || ' ' || reason from refused"),
              "7 not taken at 10 tries, while others were: HTTP status 503: {}");
    EXPECT_EQ(AskState("select forwarded from place"), "39");
}

TEST_F(Forwarder, CountsNoTryWhileTheCollectorTakesNothing) {
    AnswerEvents({"B100|7"}, 503);
    Insert(1, 20);
    RunOnce();
    const auto tries = AskState("select tries from held");
    for (int run = 0; run < 12; ++run)
        RunOnce();
    EXPECT_EQ(AskState("select tries from held"), tries);
}

TEST_F(Forwarder, NotesWhatAnAnswerRejectsOfARequest) {
    Insert(1, 5);
    m_sender.answer = [](const auto&) {
        return Status(200, R"({"partialSuccess":{"rejectedLogRecords":"2","errorMessage":"too old"}})");
    };
    RunOnce();
    EXPECT_EQ(AskState("select forwarded from place"), "3");
    EXPECT_EQ(AskState("select first_row || ' ' || last_row || ' ' || rows || ' ' || reason from refused"),
              "1 5 2 the collector rejected 2 of the 5 rows of a request: too old");
    EXPECT_THAT(m_told, ElementsAre("The collector rejected 2 of the 5 rows from 1 to 5 for good: too old"));
}

TEST_F(Forwarder, StepsOverARowThatIsTooLargeAndSaysSo) {
    Insert(1, 1);
    Sql("insert into OperLog (eventID, value) values ('B1|big', zeroblob(3000000))");
    Insert(3, 3);
    RunOnce();
    EXPECT_EQ(Taken(), "1 3");
    EXPECT_EQ(AskState("select first_row || ' ' || reason from refused"),
              "2 the row is too large to be sent");
    EXPECT_THAT(m_told, ElementsAre("row 2 will not be sent: the row is too large to be sent"));
}

TEST_F(Forwarder, BeginsAgainWhenTheStoreWasEmptiedAndItsIdsBeganAgain) {
    Insert(1, 5);
    RunOnce();
    Sql("delete from OperLog");
    Insert(11, 12);
    RunOnce();
    EXPECT_EQ(Taken(), "1 2 3 4 5 1 2");
    EXPECT_NE(m_sender.requests[0][0].uid, m_sender.requests[1][0].uid);
    EXPECT_THAT(m_told, ElementsAre(HasSubstr("The store is another one now, or its ids began again")));
    RunOnce();
    EXPECT_EQ(m_sender.requests.size(), 2U);
}

TEST_F(Forwarder, BeginsAgainWhenTheNewRowsHavePassedTheOldOnes) {
    Insert(1, 5);
    RunOnce();
    Sql("delete from OperLog");
    Insert(11, 30);
    RunOnce();
    EXPECT_EQ(m_sender.requests.back().size(), 20U);
    RunOnce();
    EXPECT_EQ(m_sender.requests.size(), 2U);
}

TEST_F(Forwarder, SendsAllOfAnotherStoreInItsPlace) {
    Insert(1, 5);
    RunOnce();
    RemoveStore();
    MakeStore();
    Insert(21, 28);
    RunOnce();
    EXPECT_EQ(Taken(), "1 2 3 4 5 1 2 3 4 5 6 7 8");
}

TEST_F(Forwarder, GoesOnBehindTheLastRowThatAnOlderCopyOfTheStoreHasAsItWasSent) {
    Insert(1, 5);
    RunOnce();
    std::filesystem::copy_file(Store(), Store() + ".copy");
    Insert(6, 9);
    RunOnce();
    RemoveStore();
    std::filesystem::rename(Store() + ".copy", Store());
    Insert(60, 61);
    RunOnce();
    EXPECT_EQ(Taken(), "1 2 3 4 5 6 7 8 9 6 7");
    EXPECT_EQ(m_sender.requests.back().front().event, "B100|60");
}

TEST_F(Forwarder, GoesOnWhenTheRowsThatWereSentWerePruned) {
    Insert(1, 5);
    RunOnce();
    Insert(6, 9);
    Sql("delete from OperLog where id <= 7");
    RunOnce();
    EXPECT_EQ(Taken(), "1 2 3 4 5 8 9");
    EXPECT_THAT(m_told, IsEmpty());
}

TEST_F(Forwarder, SaysSoWhenAHeldRowIsDeletedBeforeItWasTaken) {
    Insert(1, 20);
    AnswerEvents({"B100|7"}, 503);
    RunOnce();
    Sql("delete from OperLog where id = 7");
    m_told.clear();
    RunOnce();
    EXPECT_THAT(m_told, ElementsAre(HasSubstr("row 7 will not be sent: the row was deleted")));
    EXPECT_EQ(AskState("select count(*) from held"), "0");
}

TEST_F(Forwarder, WaitsForAStoreThatIsMissingAndTakesTheOneThatAppears) {
    RemoveStore();
    Process process(*this);
    EXPECT_EQ(process.Pass().kind, Step::Kind::Trouble);
    EXPECT_THAT(m_told, ElementsAre(HasSubstr("Report.db is missing")));
    MakeStore();
    Insert(1, 1);
    process.Drain();
    EXPECT_EQ(Taken(), "1");
}

TEST_F(Forwarder, SendsNothingTwiceWhenItsOwnFileCannotBeWrittenForAWhile) {
    Insert(1, 3);
    Process process(*this);
    std::optional<SQLite::Database> other;
    m_sender.answer = [&](const auto&) {
        other.emplace(StateFile(), SQLite::OPEN_READWRITE);
        other->exec("begin exclusive");
        return Status(200);
    };
    EXPECT_EQ(process.Pass().kind, Step::Kind::Trouble);
    other.reset();
    process.Drain();
    EXPECT_EQ(Taken(), "1 2 3");
    EXPECT_EQ(AskState("select forwarded from place"), "3");
}

} // namespace
