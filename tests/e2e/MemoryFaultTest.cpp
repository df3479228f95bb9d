#include <algorithm>
#include <filesystem>
#include <optional>

#include <SQLiteCpp/SQLiteCpp.h>
#include <gtest/gtest.h>
#include <sys/resource.h>

#include "tests/e2e/support/Service.h"
#include "tests/support/ProcessStatus.h"
#include "tests/support/WaitUntil.h"

// The service when it reaches a limit on its memory: on its addresses (ulimit -v) or its data (ulimit -d).

namespace {

constexpr long ROOM_KILOBYTES = 16 * 1024; // what the limit leaves for a backlog

struct Limit {
    const char* name;
    decltype(RLIMIT_AS) resource;
    const char* usage; ///< Its name in the process's status.
};

class MemoryFault : public ::testing::TestWithParam<Limit> {
protected:
    MemoryFault() {
        m_service.Install();
        m_service.Start();
        m_arrayOfTwoThousand = "[1";
        for (int i = 1; i < 2000; ++i)
            m_arrayOfTwoThousand += ",1";
        m_arrayOfTwoThousand += "]";
        SendAndAwaitARow(); // now everything is loaded
    }

    void SetLimit(long roomKilobytes = ROOM_KILOBYTES) {
        m_limitKilobytes = NumberInStatusOf(m_service.Process(), GetParam().usage) + roomKilobytes;
        SetLimitTo(static_cast<rlim_t>(m_limitKilobytes) * 1024);
    }

    void SetLimitTo(rlim_t bytes) const {
        rlimit limit{};
        ASSERT_EQ(::prlimit(m_service.Process(), GetParam().resource, nullptr, &limit), 0);
        limit.rlim_cur = std::min(bytes, limit.rlim_max);
        ASSERT_EQ(::prlimit(m_service.Process(), GetParam().resource, &limit, nullptr), 0);
    }

    /// Sends what needs memory in each part of the service: for the tree of a value, for a module and its
    /// outbox, for the log.
    void SendAMix(int round) const {
        const std::string module = "AB" + std::to_string(round) + std::string(5000, 'z');
        SendLargeReports(1);
        Service::Send(R"({"msgType":"init","exdata":{"moduleID":")" + module +
                      R"(","moduleVersion":"1","dbPath":")" + m_service.DataDirectory() + "/hublink/m" +
                      std::to_string(round % 10) + "\"}}");
        Service::Send(R"({"eventID":")" + module + R"(|1","value":)" + m_arrayOfTwoThousand + "}");
        std::string directives;
        for (int i = 0; i < 4000; ++i)
            directives += "%s";
        Service::Send(directives);
        Service::Send(R"({"x":)" + m_arrayOfTwoThousand); // no JSON
        Service::Send(std::string(10240, 'x'));
    }

    void SendLargeReports(int count) const {
        for (int i = 0; i < count; ++i) {
            Service::Send(R"({"eventID":"B2","value":)" + m_arrayOfTwoThousand + "}");
            Service::Send(R"({"eventID":"A759|2","value":{"list":)" + m_arrayOfTwoThousand + "}}");
        }
    }

    bool HasRefusedAtTheReceiver() const {
        return m_service.Output().find("Std exception: std::bad_alloc\n") != std::string::npos;
    }

    bool HasRefusedAtTheParser() const {
        return m_service.Log().find(":164 JsonToStruct] Std exception :std::bad_alloc") != std::string::npos;
    }

    /// Sends reports until there is no memory to take another one.
    void FillTheMemory() {
        EXPECT_TRUE(WaitUntil([&] { return SendLargeReports(50), HasRefusedAtTheReceiver(); }));
    }

    /// Sends a report until it is stored, because a report that is sent while memory is short may be lost.
    void SendAndAwaitARow() {
        const std::string eventID = "marker" + std::to_string(++m_markers);
        EXPECT_TRUE(WaitUntil([&] {
            Service::Send(R"({"eventID":")" + eventID + "\"}");
            return WaitUntil([&] { return RowsOf(eventID) > 0; }, std::chrono::milliseconds(200));
        }));
    }

    std::int64_t RowsOf(const std::string& eventID) const {
        return m_service.Count(m_service.DatabaseFile(),
                               "select count(*) from OperLog where eventID='" + eventID + "'");
    }

    Service m_service;
    std::string m_arrayOfTwoThousand;
    long m_limitKilobytes = 0;
    int m_markers = 0;
};

} // namespace

TEST_P(MemoryFault, ABacklogThatFillsTheMemoryCostsReportsAndNotTheService) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "a sanitizer's own memory takes the addresses, and it ends the program without them";
#endif
    const pid_t process = m_service.Process();
    SetLimit();
    {
        SQLite::Database other(m_service.DatabaseFile(), SQLite::OPEN_READWRITE);
        other.exec("begin immediate"); // the store waits for this transaction, and the queue grows
        FillTheMemory();
        other.exec("commit");
    }
    EXPECT_TRUE(WaitUntil([&] { return SendLargeReports(5), HasRefusedAtTheParser(); }));
    SendAndAwaitARow();
    EXPECT_TRUE(m_service.IsRunning());
    EXPECT_EQ(m_service.Process(), process);
    EXPECT_EQ(m_service.Log().find("OnStackCallBack"), std::string::npos);
    EXPECT_EQ(m_service.Reportctl({"status"}), 1);
    EXPECT_NE(m_service.Output().find(" lost to an exception. "), std::string::npos) << m_service.Output();

    constexpr long FREED_KILOBYTES = 1024; // at least this much: the memory that stays in use is scattered
    EXPECT_TRUE(WaitUntil([&] {
        return NumberInStatusOf(m_service.Process(), GetParam().usage) < m_limitKilobytes - FREED_KILOBYTES;
    })) << NumberInStatusOf(m_service.Process(), GetParam().usage)
        << " of " << m_limitKilobytes << " KB are in use";
    for (const char* suffix : {"", "-wal", "-shm"})
        std::filesystem::remove(m_service.DatabaseFile() + suffix);
    m_service.Install();
    SendAndAwaitARow(); // SQLite must map memory for the new file
}

TEST_P(MemoryFault, ThatComesWithinTheHandlingOfAnyReportCostsReportsAndNotTheService) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
    GTEST_SKIP() << "a sanitizer's own memory takes the addresses, and it ends the program without them";
#endif
    SendLargeReports(100); // a burst: now all threads run
    for (const long room : {512, 1024, 2048, 4096}) {
        SetLimit(room);
        for (int round = 0; round < 150; ++round) {
            SendAMix(round);
            const auto areTaken = [&] { return !m_service.IsRunning() || Service::TookAllDatagrams(); };
            ASSERT_TRUE(round % 20 != 0 || WaitUntil(areTaken));
            ASSERT_TRUE(m_service.IsRunning()) << m_service.Output();
        }
        SetLimitTo(RLIM_INFINITY);
        SendAndAwaitARow();
        ASSERT_TRUE(m_service.IsRunning()) << room;
    }
    EXPECT_EQ(m_service.Log().find("OnStackCallBack"), std::string::npos);
}

INSTANTIATE_TEST_SUITE_P(AtALimitOf, MemoryFault,
                         ::testing::Values(Limit{"Addresses", RLIMIT_AS, "VmSize"},
                                           Limit{"Data", RLIMIT_DATA, "VmData"}),
                         [](const auto& test) { return test.param.name; });
