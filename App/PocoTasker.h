#pragma once

#include <new>

#include <Poco/AutoPtr.h>
#include <Poco/Notification.h>
#include <Poco/NotificationQueue.h>
#include <Poco/Runnable.h>
#include <Poco/Thread.h>

/// A value on its way through the queue.
template <typename T>
class WorkNotification : public Poco::Notification {
public:
    explicit WorkNotification(const T& data) : m_data(data) {}

    T m_data;
};

/// Its arrival ends the consumer's loop.
class StopNotification : public Poco::Notification {};

/// Takes values from any thread and hands them, in the order of their arrival and one at a time, to Consume
/// on a thread of its own. The queue has no bound.
///
/// Life: constructed → running (the derived class starts m_thread with this object) → stopped by StopThread.
/// There is no restart. Values produced before the start wait; those that wait when it stops are dropped. A
/// derived class calls StopThread in its own destructor: this one's would be too late, Consume is gone by
/// then.
template <typename T>
class PocoTasker : public Poco::Runnable {
public:
    /// The consumer's loop. Catches nothing: Consume does.
    void run() override {
        for (;;) {
            const Poco::AutoPtr<Poco::Notification> item(Next());
            if (!item)
                continue; // woken without an item
            if (dynamic_cast<const StopNotification*>(item.get()) != nullptr)
                return;
            if (const auto* work = dynamic_cast<const WorkNotification<T>*>(item.get()))
                Consume(work->m_data);
        }
    }

    /// Queues a copy of `data`; from any thread, and without waiting. Throws std::bad_alloc, and what copying
    /// throws.
    void Produce(const T& data) { m_queue.enqueueNotification(new WorkNotification<T>(data)); }

    /// Drops what is waiting, lets the consumer finish the value it works on, and joins it. Returns at once
    /// when nothing runs. From any thread but the consuming one.
    void StopThread() {
        if (!m_thread.isRunning())
            return;
        m_queue.clear();
        m_queue.wakeUpAll();
        m_queue.enqueueNotification(new StopNotification);
        m_thread.join();
    }

protected:
    /// Called on the consuming thread once for each value. The result is ignored. Must not throw.
    virtual bool Consume(const T& data) = 0;

    Poco::NotificationQueue m_queue;
    Poco::Thread m_thread;

private:
    /// The next item, waited for. To wait takes memory; where there is none, the thread looks again later and
    /// does not end.
    Poco::Notification* Next() {
        constexpr long NO_MEMORY_PAUSE_MS = 10;
        try {
            return m_queue.waitDequeueNotification();
        } catch (const std::bad_alloc&) {
            Poco::Thread::sleep(NO_MEMORY_PAUSE_MS);
            return nullptr;
        }
    }
};
