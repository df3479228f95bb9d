#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <ostream>
#include <string>

#include <Poco/AutoPtr.h>
#include <Poco/Net/SocketAddress.h>
#include <SQLiteCpp/SQLiteCpp.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "Common/Common.h"
#include "Common/Paths.h"
#include "Frame/DBHelper.h"
#include "tests/support/CapturedOutput.h"
#include "tests/support/FailingMemory.h"
#include "tests/support/FileContent.h"
#include "tests/support/StoreTables.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/WaitUntil.h"

using namespace SyncServiceReport;

// The service with real plug-ins while memory fails. In each test, one allocation fails, or one and all that
// follow it; then the same for the next allocation. The allocations of the plug-ins, and of the libraries
// that they use, count, too.

namespace {

/// The service without its port and its threads, with its own store and log.
class Service final : public ReportServer {
public:
    Service() {
        m_socket.bind(Poco::Net::SocketAddress("127.0.0.1", 0)); // so that Start gets no port and no receiver
        ::setenv("XDG_DATA_HOME", m_data.Path().c_str(), 1);
        std::filesystem::create_directories(Paths::Databases(m_data.Path()));
        SQLite::Database store(Store(), SQLite::OPEN_READWRITE | SQLite::OPEN_CREATE);
        store.exec("pragma journal_mode = wal");
        store.exec(STORE_TABLES);
        std::filesystem::permissions(Store(), std::filesystem::perms{0600});
        const CapturedOutput complaint;
        Start();
        StopThread();
    }
    ~Service() override { DBHelper::instance().Init(nullptr); }

    /// The queued text; empty when there is none.
    std::string Dequeued() {
        const Poco::AutoPtr<Poco::Notification> item(m_queue.dequeueNotification());
        const auto* work = dynamic_cast<const WorkNotification<std::string>*>(item.get());
        return work != nullptr ? work->m_data : "";
    }

    /// The number of rows. The plug-in is asked, because it commits before it answers.
    static int Rows() {
        int rows = -1;
        DBHelper::instance().GetTotalCount("select count(*) from OperLog", rows);
        return rows;
    }

    int Events() const {
        SQLite::Database outbox(Paths::Databases(m_data.Path()) + "/MetrikOutbox.db", SQLite::OPEN_READWRITE,
                                5000);
        return outbox.execAndGet("select count(*) from event").getInt();
    }

private:
    std::string Store() const { return Paths::Store(m_data.Path()); }

    TemporaryDirectory m_data;
};

/// The log of the process. It is configured once.
class Log {
public:
    static Log& Instance() {
        static Log log;
        return log;
    }

    /// What was written since the last call.
    std::string News() {
        const std::string all = ContentOf(m_directory.Path() + "/Report.log");
        const std::string news = all.substr(m_read);
        m_read = all.size();
        return news;
    }

private:
    Log() {
        constexpr std::int64_t ENOUGH = 1'000'000'000;
        pSysLog->InitLog(m_directory.Path(), "Report.log", "test", "test", ENOUGH, ENOUGH, 1, 0);
    }

    TemporaryDirectory m_directory;
    std::size_t m_read = 0;
};

bool TellsOfAFailure(const std::string& lines) {
    return lines.find(" WARN ") != std::string::npos || lines.find(" ERROR ") != std::string::npos;
}

std::string ArrayOfTwoThousand() {
    std::string array = "[1";
    for (int i = 1; i < 2000; ++i)
        array += ",1";
    return array + "]";
}

/// A kind of text. `n` makes each text a different one.
struct Kind {
    std::string name;
    std::function<std::string(int n)> text;
    bool isRow = false;
    bool isEvent = false;

    friend std::ostream& operator<<(std::ostream& out, const Kind& kind) { return out << kind.name; }
};

std::vector<Kind> Kinds() {
    const auto always = [](const std::string& text) { return [text](int) { return text; }; };
    return {
        {"Row", always(R"({"eventID":"B100|10001","value":"a text of it''s own","createTime":1700000000})"),
         true},
        {"RowWithAnArrayOfTwoThousand", always(R"({"eventID":"B1","value":)" + ArrayOfTwoThousand() + "}"),
         true},
        {"RowThatTheStoreRefuses", always(R"({"eventID":"B1","value":"a quote that isn't doubled"})")},
        {"Event", always(R"({"eventID":"A759|10001","value":{"key":"a text of more than sixteen bytes"}})"),
         false, true},
        {"EventWithAnArrayOfTwoThousand",
         always(R"({"eventID":"A759|10001","value":{"key":)" + ArrayOfTwoThousand() + "}}"), false, true},
        {"ReportThatIsNoJson", always(R"({"eventID":"B1","value":)")},
        {"Module",
         [](int n) {
             return R"({"msgType":"init","exdata":{"moduleID":"A_module_with_a_long_name)" +
                    std::to_string(n) +
                    R"(","moduleVersion":"1.2.3","moduleName":"a name of more than sixteen bytes"}})";
         }},
        {"User",
         [](int n) {
             return R"({"msgType":"updateOpenID","exdata":{"openID":"a user with a long id )" +
                    std::to_string(n) + R"(","hublinkVersion":"10.20.30.40000"}})";
         }},
    };
}

class NoMemoryBesidePlugins : public ::testing::TestWithParam<Kind> {
protected:
    /// Consumes a text while memory fails. True when an allocation failed.
    bool Consume(int first, int count) {
        const std::string text = GetParam().text(first);
        Log::Instance().News();
        const FailingMemory memory(first, count);
        m_service.Consume(text);
        return FailingMemory::Failed() > 0;
    }

    int Arrived() const {
        return GetParam().isRow ? Service::Rows() : GetParam().isEvent ? m_service.Events() : 0;
    }

    void ExpectTheNextReportsAreHandled(int after) {
        const int rows = Service::Rows();
        const int events = m_service.Events();
        ASSERT_TRUE(m_service.Consume(R"({"eventID":"B2","value":"the next report"})"));
        ASSERT_TRUE(m_service.Consume(R"({"eventID":"A759|2","value":{}})"));
        ASSERT_EQ(Service::Rows(), rows + 1) << "after allocation " << after;
        ASSERT_EQ(m_service.Events(), events + 1) << "after allocation " << after;
    }

    Service m_service;
};

} // namespace

TEST_P(NoMemoryBesidePlugins, AtOneAllocationLetsTheReportArriveOrTellsOfIt) {
    int first = 1;
    int told = 0;
    int untold = 0;
    for (int before = Arrived(); Consume(first, 1); ++first) {
        const int arrived = Arrived() - before;
        const bool isTold = TellsOfAFailure(Log::Instance().News());
        if (GetParam().isRow) {
            EXPECT_NE(arrived == 1, isTold) << "allocation " << first;
        }
        (isTold ? told : untold) += GetParam().isEvent && arrived == 0 ? 1 : 0;
        ExpectTheNextReportsAreHandled(first);
        before = Arrived();
    }
    EXPECT_GT(first, 5) << "allocations were made to fail";
    EXPECT_TRUE(untold == 0 || told > 0) << untold; // the SDK reports the same cause once a minute only
}

TEST_P(NoMemoryBesidePlugins, FromOneAllocationOnCostsThatReportOnly) {
    int first = 1;
    for (; Consume(first, FailingMemory::ALL); ++first)
        ExpectTheNextReportsAreHandled(first);
    EXPECT_GT(first, 5) << "allocations were made to fail";
}

INSTANTIATE_TEST_SUITE_P(EachText, NoMemoryBesidePlugins, ::testing::ValuesIn(Kinds()),
                         [](const auto& test) { return test.param.name; });

TEST(NoMemoryBesideTheLogger, ReceivingATextThrowsOrQueuesIt) {
    Service service;
    for (const std::string text : {"a text of more than sixteen bytes", "100%% of a text with a percent sign",
                                   "a text that cannot be built: %s %s %s"})
        for (const int count : {1, FailingMemory::ALL})
            for (int first = 1, failed = 1; failed > 0; ++first) {
                Log::Instance().News();
                bool isQueued = true;
                {
                    const FailingMemory memory(first, count);
                    try {
                        service.Recv(text);
                    } catch (const std::bad_alloc&) { // the receiver prints this one
                        isQueued = false;
                    }
                    failed = FailingMemory::Failed();
                }
                EXPECT_EQ(service.Dequeued(), isQueued ? text : "") << "allocation " << first;
                EXPECT_TRUE(service.Recv("the next one"));
                EXPECT_EQ(service.Dequeued(), "the next one");
                EXPECT_TRUE(WaitUntil([] { // these are a burst, so that a record may wait for a millisecond
                    return Log::Instance().News().find("the next one\n") != std::string::npos;
                })) << "allocation "
                    << first;
            }
}
