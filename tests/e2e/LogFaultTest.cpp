#include <algorithm>
#include <filesystem>
#include <sstream>

#include <Poco/RegularExpression.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/e2e/support/Disk.h"
#include "tests/e2e/support/FileSizeLimit.h"
#include "tests/e2e/support/Ledger.h"
#include "tests/support/WaitUntil.h"

using ::testing::IsEmpty;
using ::testing::MatchesRegex;

// A log that cannot be written loses lines of the log and nothing else, and recovers by itself.

namespace {

using namespace std::chrono_literals;

class LogFault : public ::testing::Test {
protected:
    void InstallAndStart() {
        m_service.Install();
        m_service.Start();
    }

    /// Sends this many reports, and expects that all are stored.
    void Store(int count) {
        m_ledger.Report(count);
        EXPECT_TRUE(WaitUntil([&] { return m_ledger.Stored() == Ledger::Range(0, m_ledger.Next()); }, 60s));
    }

    /// Expects that a new report gets its line in the log. The logger needs a moment to try again, so several
    /// reports are sent.
    void ExpectToGoOn() {
        EXPECT_TRUE(WaitUntil([&] {
            Store(1);
            return m_service.Log().ends_with(TextOfTheLast() + "\n");
        }));
    }

    std::string TextOfTheLast() const {
        return std::to_string(m_ledger.Next() - 1) + R"(","value":{"text":"as people write it"}})";
    }

    /// How many reports have a line in the log.
    int Received() const { return Matches(R"(App/ReportServer:42 Recv\] .*as people write it"\}\}$)"); }

    int Matches(const std::string& form) const {
        const Poco::RegularExpression regex(form);
        std::istringstream log(m_service.Log());
        int matches = 0;
        Poco::RegularExpression::Match match;
        for (std::string line; std::getline(log, line);)
            matches += regex.match(line, match);
        return matches;
    }

    /// Expects that the log says once how many records are missing, that this number is right, and that no
    /// more are missing.
    void ExpectOneGap(const std::string& reason) {
        const Poco::RegularExpression form(R"(WARN  \[\d+:\d+\] \[Modules/BoostLogger:\d+ ReportLoss\] )"
                                           R"((\d+) records could not be written: (.*))");
        std::vector<std::string> gap;
        ASSERT_EQ(form.split(m_service.Log(), gap), 3);
        EXPECT_THAT(gap[2], MatchesRegex(reason));
        const int found = std::stoi(gap[1]) + Received();
        EXPECT_GE(found, m_ledger.Next());
        EXPECT_LE(found, m_ledger.Next() + 1) << "a line of which the newline alone was lost";
        EXPECT_EQ(Matches("records could not"), 1);
    }

    bool HasTheLogOpen() const {
        const std::filesystem::directory_iterator descriptors("/proc/" + std::to_string(m_service.Process()) +
                                                              "/fd");
        return std::ranges::any_of(descriptors, [this](const auto& descriptor) {
            std::error_code closed;
            return std::filesystem::read_symlink(descriptor.path(), closed) == m_service.LogFile();
        });
    }

    std::string Directory() const { return m_service.DataDirectory() + "/hublink/log/metrik"; }

    Service m_service;
    Ledger m_ledger{m_service};
};

} // namespace

TEST_F(LogFault, AFullDiskCostsLinesWhoseNumberIsLoggedOnce) {
    const Disk disk(Directory(), 1'000'000);
    InstallAndStart();
    Store(20);
    const auto output = m_service.Output();
    disk.Fill();
    Store(2000);
    EXPECT_LT(Received(), 200);
    EXPECT_EQ(m_service.Output(), output) << "nor are they written anywhere else";
    disk.MakeRoom();
    ExpectToGoOn();
    ExpectOneGap("cannot write (to|a whole line to) the file: No space left on device");
}

TEST_F(LogFault, WhatAFullDiskKeepsOutOfTheLogIsNotKeptInMemory) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "the sanitizers keep memory of their own";
#endif
    const Disk disk(Directory(), 1'000'000);
    InstallAndStart();
    disk.Fill();
    const auto send = [&](int portions) {
        for (int i = 0; i < portions; ++i) {
            for (int j = 0; j < 20; ++j)
                Service::Send(R"({"eventID":"B2|1","value":")" + std::string(10'000, 'x') + "\"}");
            m_service.AwaitQuiet();
        }
    };
    send(10);
    const auto before = m_service.ResidentKilobytes();
    send(50); // these are 10 MB of lines
    EXPECT_LT(m_service.ResidentKilobytes() - before, 5'000);
}

TEST_F(LogFault, ADeletedFileIsMadeAgain) {
    InstallAndStart();
    Store(20);
    std::filesystem::remove(m_service.LogFile());
    ExpectToGoOn();
    EXPECT_EQ(Matches("records could not"), 0);
}

TEST_F(LogFault, ADeletedDirectoryIsMadeAgain) {
    InstallAndStart();
    Store(20);
    std::filesystem::remove_all(m_service.DataDirectory() + "/hublink/log");
    ExpectToGoOn();
    EXPECT_EQ(Matches("records could not"), 0);
}

TEST_F(LogFault, ADirectoryThatMayOnlyBeReadForATimeCostsLinesWhoseNumberIsLoggedOnce) {
    InstallAndStart();
    Store(20);
    {
        // Mounted over the log's directory until the end of this block.
        const Disk other(Directory(), 1'000'000);
        other.ForbidWriting();
        EXPECT_TRUE(WaitUntil([&] {
            Store(1);
            return !HasTheLogOpen();
        }));
        Store(500);
        EXPECT_TRUE(std::filesystem::is_empty(Directory()));
    }
    ExpectToGoOn();
    ExpectOneGap("cannot open the file: Read-only file system");
}

TEST_F(LogFault, ALogThatCannotBeOpenedAtTheStartBeginsWhenItCan) {
    const Disk disk(Directory(), 1'000'000);
    m_service.Install();
    disk.ForbidWriting();
    const auto before = m_service.Output().size();
    m_service.Start();
    Store(200);
    EXPECT_THAT(m_service.Output().substr(before),
                MatchesRegex("Error:.*cannot open the file: Read-only file system, .*\n\n"));
    EXPECT_THAT(m_service.Log(), IsEmpty());
    disk.AllowWriting();
    ExpectToGoOn();
    EXPECT_EQ(Matches("records could not be written: cannot open the file: Read-only file system"), 1);
}

TEST_F(LogFault, AFileSizeLimitDoesNotEndTheService) {
    constexpr rlim_t LIMIT = 1'000'000;
    m_service.Install();
    {
        const FileSizeLimit limit(LIMIT); // the service inherits it
        m_service.Start();
    }
    const auto rotated = m_service.DataDirectory() + "/hublink/log/metrik/Report_2.log";
    ASSERT_TRUE(WaitUntil([&] {
        Service::Send(std::string(10'000, 'x'));
        return std::filesystem::exists(rotated) || !m_service.IsRunning();
    }));
    EXPECT_TRUE(m_service.IsRunning());
    EXPECT_LE(std::filesystem::file_size(rotated), LIMIT);
    EXPECT_GE(std::filesystem::file_size(rotated), LIMIT - 11'000);
}

TEST_F(LogFault, ADiskThatIsFullForLogAndStoreCostsReportsWithoutATrace) {
    const Disk disk(m_service.DataDirectory() + "/hublink", 4'000'000);
    InstallAndStart();
    Store(20);
    disk.Fill();
    m_ledger.Report(1000);
    EXPECT_TRUE(WaitUntil(&Service::TookAllDatagrams));
    disk.MakeRoom();
    EXPECT_TRUE(m_ledger.ReportUntilOneIsStored());
    const int first = m_ledger.Next();
    m_ledger.Report(20);
    EXPECT_TRUE(m_ledger.AwaitEachStoredOrLogged(first));
    const auto stored = m_ledger.Stored();
    EXPECT_TRUE(std::ranges::includes(stored, Ledger::Range(0, 20)));
    EXPECT_TRUE(std::ranges::includes(stored, Ledger::Range(first, m_ledger.Next())));
    EXPECT_LT(stored.size() + m_ledger.Lost().size(), 1000U);
    const auto isTold = [this] {
        m_ledger.Report(); // each new line lets the logger try again, four times a second at most
        return Matches("records could not") >= 1;
    };
    EXPECT_TRUE(WaitUntil(isTold));
}
