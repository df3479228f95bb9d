#include "Ledger/Outcome.h"

#include <thread>

#include <gtest/gtest.h>

#include "tests/Ledger/LedgerFixture.h"

using namespace ReportLedger;

namespace {

class LedgerOutcome : public LedgerFixture {
protected:
    LedgerOutcome() {
        for (int i = 0; i < 10; ++i)
            Take(m_writer);
    }

    std::uint64_t Counted(Outcome outcome) const {
        return Of(LookAt(m_writer.Content(), true, NOW_MS).total, outcome);
    }

    Writer m_writer;
};

} // namespace

TEST_F(LedgerOutcome, TheFirstWordCounts) {
    {
        const Handling handling(m_writer);
        Ended(Outcome::ModuleNotInit);
        Ended(Outcome::Analytics);
    }
    EXPECT_EQ(Counted(Outcome::ModuleNotInit), 1U);
    EXPECT_EQ(Counted(Outcome::Analytics), 0U);
}

TEST_F(LedgerOutcome, OneReportsWordIsNotTheNextOnes) {
    Ended(Outcome::NoStore); // while no report is handled
    for (int i = 0; i < 2; ++i) {
        const Handling handling(m_writer);
        Ended(i == 0 ? Outcome::Stored : Outcome::Store);
    }
    EXPECT_EQ(Counted(Outcome::NoStore), 0U);
    EXPECT_EQ(Counted(Outcome::Stored), 1U);
    EXPECT_EQ(Counted(Outcome::Store), 1U);
}

TEST_F(LedgerOutcome, OneThreadsWordIsNotAnothers) {
    {
        const Handling handling(m_writer);
        std::thread([] { Ended(Outcome::NotJson); }).join();
        Ended(Outcome::Stored);
    }
    EXPECT_EQ(Counted(Outcome::Stored), 1U);
}

TEST_F(LedgerOutcome, AReportOfWhichNothingWasNamedEndsAsAnException) {
    { const Handling handling(m_writer); }
    EXPECT_EQ(Counted(Outcome::Exception), 1U);
    EXPECT_EQ(WaitingIn(LookAt(m_writer.Content(), true, NOW_MS).total), 9U);
}
