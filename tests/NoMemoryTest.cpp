#include <algorithm>
#include <atomic>
#include <functional>
#include <optional>
#include <ostream>
#include <string>

#include <Poco/Event.h>
#include <Poco/Net/SocketAddress.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "App/ReportServer.h"
#include "Common/Common.h"
#include "Frame/DBHelper.h"
#include "tests/fakes/FakeLogger.h"
#include "tests/fakes/FakeSdk.h"
#include "tests/fakes/FakeSqlite.h"
#include "tests/support/CapturedOutput.h"
#include "tests/support/FailingMemory.h"
#include "tests/support/WaitUntil.h"

using namespace SyncServiceReport;
using ::testing::ElementsAre;

// The service with fake plug-ins while memory fails. In each test, one allocation fails, or one and all that
// follow it; then the same for the next allocation. This may lose the report but never a later one. The
// allocations of the fake plug-ins count, too.

namespace {

/// The service without its port and its threads.
class Server final : public ReportServer {
public:
    Server() {
        // A port of its own, so that Start cannot bind and starts no receiver.
        m_socket.bind(Poco::Net::SocketAddress("127.0.0.1", 0));
        const CapturedOutput complaint;
        Start();
        StopThread();
    }
    ~Server() override { DBHelper::instance().Init(nullptr); }

    /// The queued text; empty when there is none.
    std::string Dequeued() {
        const Poco::AutoPtr<Poco::Notification> item(m_queue.dequeueNotification());
        const auto* work = dynamic_cast<const WorkNotification<std::string>*>(item.get());
        return work != nullptr ? work->m_data : "";
    }
};

std::size_t Rows() {
    return static_cast<std::size_t>(
        std::ranges::count(FakeSqlite().calls, "ExecSql", &FakeSqliteState::Call::operation));
}

std::size_t SdkCalls(int slot) {
    return static_cast<std::size_t>(std::ranges::count(FakeSdk().calls, slot, &FakeSdkState::Call::slot));
}

/// Whether a record says that something failed.
bool IsTold() {
    const auto records = FakeLogger().Records();
    return std::ranges::any_of(records, [](const LogRecord& record) { return record.level >= 3; });
}

std::string ArrayOfTwoThousand() {
    std::string array = "[1";
    for (int i = 1; i < 2000; ++i)
        array += ",1";
    return array + "]";
}

/// A kind of text, and how a test sees that it was handled. `n` makes each text a different one.
struct Kind {
    std::string name;
    std::function<std::string(int n)> text;
    /// Changes with each text that is handled.
    std::function<std::size_t(const ReportServer&)> effect;

    friend std::ostream& operator<<(std::ostream& out, const Kind& kind) { return out << kind.name; }
};

std::vector<Kind> Kinds() {
    const auto always = [](std::string text) { return [text](int) { return text; }; };
    const auto rows = [](const ReportServer&) { return Rows(); };
    const auto events = [](const ReportServer&) { return SdkCalls(3); };
    const auto modules = [](const ReportServer&) { return SdkCalls(2); };
    const auto user = [](const ReportServer& server) {
        return std::hash<std::string>()(server.GetBaseInfo().openID);
    };
    const auto nothing = [](const ReportServer&) { return std::size_t{0}; };
    return {
        {"Row",
         always(R"({"eventID":"B100|10001","value":"a text of more than sixteen bytes",)"
                R"("createTime":1700000000})"),
         rows},
        {"RowWithAnObject", always(R"({"eventID":"B1","value":{"a":[1,2.5,null,{"b":"c"}],"t":"ü"}})"), rows},
        {"RowWithAnArrayOfTwoThousand", always(R"({"eventID":"B1","value":)" + ArrayOfTwoThousand() + "}"),
         rows},
        {"Event", always(R"({"eventID":"A759|10001","value":{"key":"a text of more than sixteen bytes"}})"),
         events},
        {"EventWithAnArrayOfTwoThousand",
         always(R"({"eventID":"A759|10001","value":{"key":)" + ArrayOfTwoThousand() + "}}"), events},
        {"EventOfAnUnknownModule", always(R"({"eventID":"A_module_that_nobody_announced|1"})"), nothing},
        {"ReportThatIsNoJson", always(R"({"eventID":"B1","value":)"), nothing},
        {"ControlThatIsNoJson", always("no JSON at all, and more than sixteen bytes"), nothing},
        {"Module",
         [](int n) {
             return R"({"msgType":"init","exdata":{"moduleID":"A_module_with_a_long_name)" +
                    std::to_string(n) +
                    R"(","moduleVersion":"1.2.3","moduleName":"a name of more than sixteen bytes"}})";
         },
         modules},
        {"User",
         [](int n) {
             return R"({"msgType":"updateOpenID","exdata":{"openID":"a user with a long id )" +
                    std::to_string(n) + R"(","hublinkVersion":"10.20.30.40000"}})";
         },
         user},
    };
}

class NoMemory : public ::testing::TestWithParam<Kind> {
protected:
    /// Consumes a text while memory fails. True when an allocation failed.
    bool Consume(int first, int count) {
        const std::string text = GetParam().text(first);
        FakeLogger().Clear();
        const FailingMemory memory(first, count);
        m_result = m_server.Consume(text);
        return FailingMemory::Failed() > 0;
    }

    void ExpectTheNextReportIsHandled() {
        const auto before = Rows();
        ASSERT_TRUE(m_server.Consume(R"({"eventID":"B2","value":"the next report"})"));
        ASSERT_EQ(Rows(), before + 1);
    }

    FakeSqliteState& m_db = FakeSqlite(); ///< Loaded before the server, so that the fakes outlive it.
    FakeSdkState& m_sdk = FakeSdk();
    Server m_server;
    bool m_result = false;
};

} // namespace

TEST_P(NoMemory, AtOneAllocationLetsTheReportArriveOrTellsOfIt) {
    int first = 1;
    for (auto before = GetParam().effect(m_server); Consume(first, 1); ++first) {
        const auto after = GetParam().effect(m_server);
        EXPECT_TRUE(after != before || IsTold()) << "allocation " << first << " costs it without a word";
        before = after;
        ExpectTheNextReportIsHandled();
    }
    EXPECT_GT(first, 5) << "allocations were made to fail";
}

TEST_P(NoMemory, FromOneAllocationOnCostsThatReportOnly) {
    int first = 1;
    for (; Consume(first, FailingMemory::ALL); ++first)
        ExpectTheNextReportIsHandled();
    EXPECT_GT(first, 5) << "allocations were made to fail";
}

INSTANTIATE_TEST_SUITE_P(EachText, NoMemory, ::testing::ValuesIn(Kinds()),
                         [](const auto& test) { return test.param.name; });

namespace {

class NoMemoryFor : public ::testing::Test {
protected:
    Server m_server;
};

} // namespace

TEST_F(NoMemoryFor, ParsingAReportIsToldAndTheResultIsFalse) {
    const std::string report =
        R"({"eventID":"B100|10001","value":)" + ArrayOfTwoThousand() + R"(,"createTime":1})";
    const LogRecord line{3, "App/ReportServer", "JsonToStruct", 164, "Std exception :std::bad_alloc "};
    for (const int count : {1, FailingMemory::ALL}) {
        int first = 1;
        for (;; ++first) {
            ST_OptLog log;
            FakeLogger().Clear();
            bool result = true;
            {
                const FailingMemory memory(first, count);
                result = m_server.JsonToStruct(report, log);
                if (FailingMemory::Failed() == 0)
                    break;
            }
            EXPECT_FALSE(result) << "allocation " << first;
            if (count == 1) {
                EXPECT_THAT(FakeLogger().Records(), ElementsAre(line)) << "allocation " << first;
            }
        }
        EXPECT_GT(first, 5);
    }
}

TEST_F(NoMemoryFor, ReceivingATextThrowsOrQueuesIt) {
    for (const std::string text : {"a text of more than sixteen bytes", "100%% of a text with a percent sign",
                                   "a text that cannot be built: %s %s %s"})
        for (const int count : {1, FailingMemory::ALL})
            for (int first = 1, failed = 1; failed > 0; ++first) {
                bool isQueued = true;
                {
                    const FailingMemory memory(first, count);
                    try {
                        m_server.Recv(text);
                    } catch (const std::bad_alloc&) { // the receiver prints this one
                        isQueued = false;
                    }
                    failed = FailingMemory::Failed();
                }
                EXPECT_EQ(m_server.Dequeued(), isQueued ? text : "") << "allocation " << first;
                EXPECT_TRUE(m_server.Recv(text));
                EXPECT_EQ(m_server.Dequeued(), text);
            }
}

TEST_F(NoMemoryFor, TheTextOfACaughtExceptionEndsNothing) {
    const auto caught = [](int first, int count) {
        FakeLogger().Clear();
        try {
            throw Poco::IOException("a reason of more than sixteen bytes");
        } catch (...) {
            const FailingMemory memory(first, count);
            EXPECT_FALSE(LogCaughtException({LogLevel::Warning, "Consume", 76}));
            return FailingMemory::Failed() > 0;
        }
    };
    for (int first = 1; caught(first, 1); ++first)
        EXPECT_EQ(FakeLogger().Records().size(), 1U)
            << "a line can be built when allocation " << first << " fails";
    for (int first = 1; caught(first, FailingMemory::ALL); ++first) {
    }
}

namespace {

/// A queue whose consumer has no memory after it handled a value: for example, none to wait for the next one.
class Tasker final : public PocoTasker<int> {
public:
    ~Tasker() override { StopThread(); }

    void Start() { m_thread.start(*this); }

    bool Consume(const int& value) override {
        m_memory.reset();
        m_consumed = value;
        m_memory.emplace(1, 3);
        return true;
    }

    int Consumed() const { return m_consumed; }

private:
    std::optional<FailingMemory> m_memory; ///< Used on the consuming thread.
    std::atomic<int> m_consumed = 0;
};

/// A receiver that has no memory for the text that it has to print.
class Receiver final : public UDPServer {
public:
    ~Receiver() override { Stop(); }

    bool Recv(const std::string& msg) override {
        m_memory.reset();
        ++m_received;
        if (msg == "stop")
            StopSelf();
        if (msg != "throw")
            return true;
        // Three allocations fail, each time beginning with a later one: in the exception's text, in the
        // printing, in the loop.
        m_memory.emplace(m_received, 3);
        throw Poco::IOException("a reason of more than sixteen bytes");
    }

    int Received() const { return m_received; }

private:
    std::optional<FailingMemory> m_memory; ///< Used on the receiving thread.
    std::atomic<int> m_received = 0;
};

} // namespace

TEST(NoMemoryForWaiting, DoesNotEndTheConsumer) {
    Tasker tasker;
    tasker.Start();
    for (int value = 1; value <= 5; ++value) {
        tasker.Produce(value);
        EXPECT_TRUE(WaitUntil([&] { return tasker.Consumed() == value; }));
    }
}

TEST(NoMemoryForPrinting, DoesNotEndTheReceiver) {
    const CapturedOutput output;
    Receiver receiver;
    ASSERT_TRUE(receiver.Start("127.0.0.1", 9997));
    Poco::Net::DatagramSocket sender(Poco::Net::SocketAddress("127.0.0.1", 0));
    const auto send = [&](const std::string& text) {
        sender.sendTo(text.data(), static_cast<int>(text.size()),
                      Poco::Net::SocketAddress("127.0.0.1", 9997));
    };
    // The missing memory may also lose a datagram after the one that threw. A further datagram then arrives.
    const auto comesThrough = [&](const std::string& text) {
        const int before = receiver.Received();
        send(text);
        return WaitUntil([&] { return receiver.Received() > before; }, std::chrono::milliseconds(300));
    };
    for (int i = 1; i <= 12; ++i)
        EXPECT_TRUE(comesThrough("throw") || comesThrough("throw") || comesThrough("throw")) << i;
    EXPECT_TRUE(comesThrough("stop") || comesThrough("stop") || comesThrough("stop"));
    EXPECT_THAT(output.Text(), ::testing::HasSubstr("exception: "));
}
