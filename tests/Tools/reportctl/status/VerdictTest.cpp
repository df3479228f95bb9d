#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Tools/reportctl/status/Status.h"

using namespace reportctl::status;
using ReportLedger::Outcome;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

// What makes a service degraded or down, and what does not.

namespace {

constexpr std::int64_t NOW_MS = 1'760'000'000'000;
constexpr std::int64_t TEN_MINUTES_MS = 600'000;

class StatusVerdict : public ::testing::Test {
protected:
    StatusVerdict() {
        m_status.atMs = NOW_MS;
        m_status.service.isRunning = true;
        m_status.service.isListening = true;
        m_status.service.process = 4711;
        m_status.service.hasLogger = m_status.service.hasStore = m_status.service.hasSdk = true;
        m_status.ledger.sight = ReportLedger::Sight::Sound;
        m_status.ledger.counting = true;
        m_status.ledger.balanced = true;
        m_status.ledger.atMs = NOW_MS;
        m_status.store.isPresent = true;
        m_status.store.hasTables = true;
        m_status.disk = {100'000'000'000, 200'000'000'000};
    }

    void Count(unsigned place, std::int64_t lastMs) {
        m_status.ledger.total[place] = 3;
        m_status.ledger.lastMs[place] = static_cast<std::uint64_t>(lastMs);
    }
    void Count(Outcome outcome, std::int64_t lastMs) { Count(static_cast<unsigned>(outcome), lastMs); }

    void ExpectDegraded(const std::string& words) {
        const auto judgement = Judge(m_status);
        EXPECT_EQ(judgement.verdict, Verdict::Degraded);
        EXPECT_THAT(judgement.reasons, ElementsAre(HasSubstr(words)));
    }
    void ExpectHealthy() {
        const auto judgement = Judge(m_status);
        EXPECT_EQ(judgement.verdict, Verdict::Healthy);
        EXPECT_THAT(judgement.reasons, ElementsAre());
    }

    Status m_status;
};

} // namespace

TEST_F(StatusVerdict, IsHealthyWhenNothingIsWrong) {
    ExpectHealthy();
}

TEST_F(StatusVerdict, IsDegradedForTenMinutesByEachLossThatIsNoSendersMistake) {
    for (const unsigned place :
         {unsigned{ReportLedger::DROPPED_BY_KERNEL}, unsigned{ReportLedger::LOST_AT_ENDS},
          static_cast<unsigned>(Outcome::Store), static_cast<unsigned>(Outcome::NoStore),
          static_cast<unsigned>(Outcome::Analytics), static_cast<unsigned>(Outcome::Exception)}) {
        Count(place, NOW_MS - TEN_MINUTES_MS + 1);
        ExpectDegraded("In the last ten minutes");
        Count(place, NOW_MS - TEN_MINUTES_MS - 1);
        ExpectHealthy();
    }
}

TEST_F(StatusVerdict, StaysHealthyWhateverSendersDoWrong) {
    for (const auto outcome :
         {Outcome::NotJson, Outcome::ModuleNotInit, Outcome::EventIdWithoutBar, Outcome::ValueNotJson})
        Count(outcome, NOW_MS);
    ExpectHealthy();
}

TEST_F(StatusVerdict, TellsHowManyByTheMarks) {
    Count(ReportLedger::DROPPED_BY_KERNEL, NOW_MS);
    m_status.ledger.total[ReportLedger::DROPPED_BY_KERNEL] = 20;
    ReportLedger::MarkAt mark{NOW_MS - TEN_MINUTES_MS, {}};
    mark.counts[ReportLedger::DROPPED_BY_KERNEL] = 3;
    m_status.ledger.marks = {mark};
    ExpectDegraded("17 reports were dropped by the kernel");
}

TEST_F(StatusVerdict, TellsHowManyWhenTheServiceDidNotRunForLongerThanTenMinutes) {
    Count(ReportLedger::LOST_AT_ENDS, NOW_MS);
    m_status.ledger.total[ReportLedger::LOST_AT_ENDS] = 956;
    ReportLedger::MarkAt afterTheStart{NOW_MS - 1, {}};
    afterTheStart.counts[ReportLedger::LOST_AT_ENDS] = 956;
    m_status.ledger.marks = {{NOW_MS - 2 * TEN_MINUTES_MS, {}}, afterTheStart};
    ExpectDegraded("956 reports were received and not handled");
}

TEST_F(StatusVerdict, SaysReportsWhenNoMarkTellsHowMany) {
    Count(ReportLedger::LOST_AT_ENDS, NOW_MS);
    ExpectDegraded("In the last ten minutes, reports were received and not handled");
    ReportLedger::MarkAt mark{NOW_MS - 1, {}};
    mark.counts[ReportLedger::LOST_AT_ENDS] = 2;
    m_status.ledger.marks = {mark};
    ExpectDegraded("In the last ten minutes, a report was received and not handled");
}

TEST_F(StatusVerdict, ForgetsAFaultOfTheTimeBeforeTheClockWasSetBack) {
    Count(Outcome::Store, NOW_MS + 3'600'000);
    ExpectHealthy();
    Count(Outcome::Store, NOW_MS + 100); // a fault that came while the status was gathered
    ExpectDegraded("refused by the store");
}

TEST_F(StatusVerdict, IsDegradedByDropsThatAHangingServiceDoesNotCount) {
    m_status.ledger.total[ReportLedger::DROPPED_BY_KERNEL] = 7;
    m_status.ledger.atStart[ReportLedger::DROPPED_BY_KERNEL] = 4;
    m_status.service.intake = Intake{0, 3};
    ExpectHealthy();
    m_status.service.intake->dropped = 19'496;
    ExpectDegraded("19493 reports were dropped by the kernel");
    m_status.ledger.counting = false; // another process's ledger says nothing about this socket
    EXPECT_THAT(Judge(m_status).reasons, ElementsAre(HasSubstr("keeps no ledger")));
}

TEST_F(StatusVerdict, IsDegradedWhenReportsWaitInTheSocketForSeconds) {
    m_status.service.intake = Intake{200'000, 0};
    m_status.ledger.lastMs[ReportLedger::RECEIVED] = NOW_MS - 60'000;
    m_status.ledger.recent = {{NOW_MS - 4999, {}}}; // no report came for a minute, and then a burst
    ExpectHealthy();
    m_status.ledger.recent = {{NOW_MS - 5000, {}}};
    ExpectDegraded("has not read its socket for 5 seconds");
    m_status.service.intake->unreadBytes = 0;
    ExpectHealthy();
}

TEST_F(StatusVerdict, IsDegradedByAProgramThatSharesThePort) {
    m_status.service.portSharer = PortHolder{17, "other", "u2"};
    ExpectDegraded("shared with other of user u2 (process 17)");
}

TEST_F(StatusVerdict, IsDegradedByALedgerThatDoesNotBalance) {
    m_status.ledger.balanced = false;
    m_status.ledger.total[ReportLedger::RECEIVED] = 2;
    ExpectDegraded("2 reports are unaccounted for");
}

TEST_F(StatusVerdict, IsDegradedByWhatIsMissing) {
    m_status.service.hasStore = false;
    ExpectDegraded("libOrvekSqlite.dylib is missing");
    m_status.service.hasStore = true;
    m_status.service.hasSdk = false;
    ExpectDegraded("libMetrikSdk.dylib is missing");
    m_status.service.hasSdk = true;
    m_status.store.isPresent = false;
    ExpectDegraded("reportctl setup");
    m_status.store.isPresent = true;
    m_status.store.hasTables = false;
    ExpectDegraded("has not its tables");
}

TEST_F(StatusVerdict, IsDegradedByTooLittleRoom) {
    m_status.disk = {499'999'999, 200'000'000'000};
    ExpectDegraded("Only 499 MB are free");
    m_status.disk = {500'000'000, 200'000'000'000};
    ExpectHealthy();
    m_status.disk = {50'000'000, 1'000'000'000}; // a small disk: five per cent are free
    ExpectHealthy();
    m_status.disk = {49'999'999, 1'000'000'000};
    ExpectDegraded("Only 49 MB are free");
}

TEST_F(StatusVerdict, IsDegradedByDeadLettersAndByAFailureThatLasts) {
    m_status.outbox.deadLetters = 1;
    ExpectDegraded("refused 1 event for good");
    m_status.outbox.deadLetters = 0;
    m_status.outbox.lastFailure = "upload-https://collector: no connection";
    ExpectDegraded("no connection");
}

TEST_F(StatusVerdict, IsDownAndSaysWhyBeforeAllElse) {
    m_status.service.isListening = false;
    m_status.store.isPresent = false;
    m_status.service.portHolder = PortHolder{17, "other", "u2"};
    auto judgement = Judge(m_status);
    EXPECT_EQ(judgement.verdict, Verdict::Down);
    EXPECT_THAT(judgement.reasons.front(), HasSubstr("held by other of user u2 (process 17)"));

    m_status.service = {};
    m_status.service.otherUser = "u2";
    judgement = Judge(m_status);
    EXPECT_EQ(judgement.verdict, Verdict::Down);
    EXPECT_THAT(judgement.reasons.front(), HasSubstr("The service of user u2 runs"));

    m_status.service.lockHolder = PortHolder{17, "SyncServiceRepo", "u2"};
    judgement = Judge(m_status);
    EXPECT_THAT(judgement.reasons.front(),
                HasSubstr("The service of user u2 runs on this machine (process 17), and only one can."));
}

TEST(Rates, AreThoseOfTheMarkThatIsAMinuteOld) {
    ReportLedger::Look look;
    look.counting = true;
    look.atMs = NOW_MS;
    look.total[ReportLedger::RECEIVED] = 1000;
    for (const std::int64_t seconds : {300, 70, 60, 50}) {
        ReportLedger::MarkAt mark{NOW_MS - seconds * 1000, {}};
        mark.counts[ReportLedger::RECEIVED] = static_cast<std::uint64_t>(1000 - 5 * seconds);
        look.marks.push_back(mark);
    }
    EXPECT_DOUBLE_EQ(reportctl::ledger::OfTheLastMinute(look).received, 5.0);
    look.counting = false;
    EXPECT_DOUBLE_EQ(reportctl::ledger::OfTheLastMinute(look).received, 0.0);
}
