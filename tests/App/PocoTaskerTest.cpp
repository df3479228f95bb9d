#include "App/PocoTasker.h"

#include <atomic>
#include <mutex>
#include <string>
#include <vector>

#include <Poco/Event.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/support/Fastest.h"
#include "tests/support/WaitUntil.h"

using ::testing::ElementsAre;

namespace {

class Tasker final : public PocoTasker<std::string> {
public:
    ~Tasker() override { StopThread(); }

    void Start() { m_thread.start(*this); }
    bool IsRunning() const { return m_thread.isRunning(); }
    void Enqueue(Poco::Notification* notification) { m_queue.enqueueNotification(notification); }
    void WakeUp() { m_queue.wakeUpAll(); }
    int Waiting() const { return m_queue.size(); }

    bool Consume(const std::string& data) override {
        EXPECT_FALSE(m_inside.exchange(true)) << "one at a time";
        if (data == "block") {
            m_entered.set();
            m_release.wait();
        }
        const std::lock_guard lock(m_mutex);
        m_consumed.push_back(data);
        m_inside = false;
        return data != "false";
    }

    std::vector<std::string> Consumed() {
        const std::lock_guard lock(m_mutex);
        return m_consumed;
    }
    std::vector<std::string> Await(std::size_t count) {
        EXPECT_TRUE(WaitUntil([&] { return Consumed().size() >= count; }));
        return Consumed();
    }

    Poco::Event m_entered; ///< Consume sets it when it has the text "block".
    Poco::Event m_release; ///< Consume then waits for it.

private:
    std::atomic<bool> m_inside = false;
    std::mutex m_mutex; ///< Guards the texts.
    std::vector<std::string> m_consumed;
};

class Counter final : public PocoTasker<int> {
public:
    ~Counter() override { StopThread(); }

    void Start() { m_thread.start(*this); }

    bool Consume(const int& data) override {
        m_inOrder = m_inOrder && data == m_next;
        m_next = data + 1;
        return true;
    }

    std::atomic<int> m_next = 0;
    std::atomic<bool> m_inOrder = true;
};

class OtherNotification : public Poco::Notification {};

/// Sets `deleted` when it is deleted.
class Witness : public Poco::Notification {
public:
    explicit Witness(std::atomic<bool>& deleted) : m_deleted(deleted) {}
    ~Witness() override { m_deleted = true; }

private:
    std::atomic<bool>& m_deleted;
};

} // namespace

TEST(PocoTasker, ConsumesInTheOrderOfProduction) {
    Tasker tasker;
    tasker.Start();
    for (const std::string text : {"a", "b", "c"})
        tasker.Produce(text);
    EXPECT_THAT(tasker.Await(3), ElementsAre("a", "b", "c"));
}

TEST(PocoTasker, KeepsTheOrderOfAMillionItems) {
    constexpr int ITEMS = 1'000'000;
    Counter counter;
    counter.Start();
    for (int i = 0; i < ITEMS; ++i)
        counter.Produce(i);
    EXPECT_TRUE(WaitUntil([&] { return counter.m_next == ITEMS; }, std::chrono::seconds(60)));
    EXPECT_TRUE(counter.m_inOrder);
}

TEST(PocoTasker, KeepsWhatWasProducedBeforeTheStart) {
    Tasker tasker;
    tasker.Produce("early");
    EXPECT_THAT(tasker.Consumed(), ElementsAre());
    tasker.Start();
    EXPECT_THAT(tasker.Await(1), ElementsAre("early"));
}

TEST(PocoTasker, GoesOnAfterAConsumeThatReturnsFalse) {
    Tasker tasker;
    tasker.Start();
    tasker.Produce("false");
    tasker.Produce("next");
    EXPECT_THAT(tasker.Await(2), ElementsAre("false", "next"));
}

TEST(PocoTasker, ReleasesOtherNotificationsUnused) {
    Tasker tasker;
    std::atomic<bool> deleted = false;
    tasker.Start();
    tasker.Enqueue(new Witness(deleted));
    tasker.Produce("next");
    EXPECT_THAT(tasker.Await(1), ElementsAre("next"));
    EXPECT_TRUE(deleted);
}

TEST(PocoTasker, GoesOnAfterAWakeUpWithoutAnItem) {
    Tasker tasker;
    tasker.Start();
    tasker.Produce("first");
    tasker.Await(1);
    tasker.WakeUp();
    tasker.Produce("second");
    EXPECT_THAT(tasker.Await(2), ElementsAre("first", "second"));
}

TEST(PocoTasker, StopsPromptlyWhileIdle) {
    const auto startAndStop = [] {
        Tasker tasker;
        tasker.Start();
        tasker.Produce("the loop runs");
        tasker.Await(1);
        tasker.StopThread();
        EXPECT_FALSE(tasker.IsRunning());
    };
    EXPECT_LT(Fastest(startAndStop), std::chrono::milliseconds(100));
}

TEST(PocoTasker, AStopWaitsForTheItemUnderWayAndDropsTheBacklog) {
    Tasker tasker;
    tasker.Start();
    tasker.Produce("block");
    for (int i = 0; i < 100; ++i)
        tasker.Produce("waiting");
    tasker.m_entered.wait();

    Poco::Event stopped;
    Poco::Thread stopper;
    stopper.startFunc([&] {
        tasker.StopThread();
        stopped.set();
    });
    EXPECT_TRUE(WaitUntil([&] { return tasker.Waiting() == 1; })) << "the backlog is gone, the stop waits";
    EXPECT_FALSE(stopped.tryWait(50)) << "the item under way has not been released yet";
    tasker.m_release.set();
    EXPECT_TRUE(stopped.tryWait(10'000));
    stopper.join();
    EXPECT_THAT(tasker.Consumed(), ElementsAre("block"));
}

TEST(PocoTasker, StopBeforeStartDoesNothing) {
    Tasker tasker;
    tasker.Produce("waiting");
    tasker.StopThread();
    tasker.Start();
    EXPECT_THAT(tasker.Await(1), ElementsAre("waiting")) << "the backlog was not cleared, no stop was queued";
}

TEST(PocoTasker, ASecondStopDoesNothing) {
    Tasker tasker;
    tasker.Start();
    tasker.StopThread();
    tasker.StopThread();
    EXPECT_FALSE(tasker.IsRunning());
}

TEST(PocoTasker, WhatIsProducedAfterAStopIsNotConsumed) {
    Tasker tasker;
    tasker.Start();
    tasker.StopThread();
    tasker.Produce("late");
    EXPECT_THAT(tasker.Consumed(), ElementsAre());
}

TEST(PocoTasker, CopiesWhatIsProduced) {
    Tasker tasker;
    std::string text = "original";
    tasker.Produce(text);
    text = "changed";
    tasker.Start();
    EXPECT_THAT(tasker.Await(1), ElementsAre("original"));
}
